// The C type rules, casts, and the shapes of types.

#include "tree_builder.h"

#include <cstring>

using namespace test_trees;

namespace {

class TypeOps : public Trees {
protected:
    void TearDown() override { kr_flag = 0; }
};

TEST_F(TypeOps, Coercion) {
    SYMTAB *i = symbol("i", tp->int_t), *l = symbol("l", tp->long_t), *s = symbol("s", sample_struct());
    SYMTAB* p = symbol("p", tp->mk_ptr(tp->int_t));
    TYPE *to_long = tp->mk_ptr(tp->long_t), *to_char = tp->mk_ptr(tp->schar_t);
    struct {
        TYPE* to;
        NODE* tree;
        const char* text;
    } cases[] = {
        {tp->int_t, name(i), "i"},
        {tp->long_t, name(i), "(long)i"},
        {tp->int_t, un(SCONV, name(l), tp->llong_t), "(int)l"},
        {tp->long_t, un(SCONV, name(l), tp->llong_t), "l"},
        {tp->long_t, un(SCONV, name(l), tp->int_t), "(long)(int)l"},
        {tp->long_t, un(SCONV, name(l), tp->bool_t), "(long)(bool)l"},
        {tp->bool_t, un(SCONV, name(l), tp->int_t), "(bool)(int)l"},
        {tp->uint_t, member(name(s), sample_member(1)), "(unsigned int)s.bits"}, // a bit-field is read through a cast
        {tp->mk_ptr(sample_struct()), name(s), "&s"},
        {to_long, un(PCONV, name(p), tp->mk_ptr(tp->float_t)), "(long *)p"},
        {to_long, un(PCONV, name(p), to_char), "(long *)(signed char *)p"},
        {tp->long_t, bin(QUEST, name(i), bin(COLON, name(i), icon(3)), tp->int_t), "i ? (long)i : (long)3"},
        {tp->long_t, bin(QUEST, name(i), bin(COLON, name(i), name(i)), tp->int_t), "(long)(i ? i : i)"},
    };
    for (const auto& c : cases) {
        NODE* t = coerce_to_type(c.to, c.tree);
        EXPECT_EQ(show(t), c.text);
        EXPECT_EQ(show(coerce_to_type(c.to, t)), c.text) << "twice";
    }
}

bool divides_by_constant(INT65 c, const NODE* t) { return t->op == ICON && (t->u.lval % c).is_zero(); }

TEST_F(TypeOps, PointerCastsGoDownAndUp) {
    SYMTAB* p = symbol("p", tp->mk_ptr(tp->int_t));
    TYPE* to_long = tp->mk_ptr(tp->long_t);
    auto sum = [&](long n) { return bin(PLUS, name(p), icon(n), p->type); };
    EXPECT_EQ(show(push_down_pointer_cast(to_long, sum(4))), "(long *)(p + 4)"); // nothing is known of the offset
    type_ops_callbacks.constant_divides_expr = divides_by_constant;
    EXPECT_EQ(show(push_down_pointer_cast(to_long, sum(3))), "(long *)(p + 3)");
    NODE* t = push_down_pointer_cast(to_long, sum(4));
    type_ops_callbacks.constant_divides_expr = nullptr;
    EXPECT_EQ(show(t), "(long *)p + 4");
    EXPECT_EQ(t->type, to_long);
    t = remove_pushed_down_casts(t);
    EXPECT_EQ(show(t), "(long *)(p + 4)");
    EXPECT_EQ(t->left->type, p->type);
}

// Whatever the widened type of a variable: reads convert back, and the variable itself never stands under a cast on the
// left.
TEST_F(TypeOps, NamesFollowTheirSymbol) {
    SYMTAB *x = symbol("x", tp->int_t), *p = symbol("p", tp->mk_ptr(tp->int_t));
    NODE* t = bin(ASG, name(x), bin(MULT, name(x), icon(3)));
    NODE* through = bin(ASG, deref(name(p)), address(name(x)), tp->int_t);
    x->type = tp->long_t;
    EXPECT_EQ(show(insert_mandatory_casts(t)), "x = (long)((int)x * 3)");
    insert_mandatory_casts(through);
    EXPECT_EQ(through->left->op, UMULT);
}

TEST_F(TypeOps, ComparisonsTakeTheSignOfTheirType) {
    SYMTAB *i = symbol("i", tp->int_t), *u = symbol("u", tp->uint_t), *p = symbol("p", tp->mk_ptr(tp->int_t));
    EXPECT_EQ(insert_mandatory_casts(bin(LT, name(i), name(u)))->op, ULT);
    EXPECT_EQ(insert_mandatory_casts(bin(ULT, name(i), name(i)))->op, LT);
    EXPECT_EQ(insert_mandatory_casts(bin(LT, name(p), name(p)))->op, ULT);
    EXPECT_EQ(insert_mandatory_casts(bin(LT, name(i), fcon("1")))->op, FLT);
    EXPECT_EQ(show(insert_mandatory_casts(bin(EQ, name(p), icon(0)))), "p == (int *)0");
}

TEST_F(TypeOps, TruthValues) {
    SYMTAB *b = symbol("b", tp->bool_t), *i = symbol("i", tp->int_t), *s = symbol("s", sample_struct());
    NODE* bit = member(name(s), sample_member(1));
    struct {
        NODE* tree;
        bool is_truth;
    } cases[] = {
        {name(b), true},
        {name(i), false},
        {icon(1), true},
        {icon(-1), false},
        {bin(MINUS, icon(1), bin(LT, name(i), icon(3))), true},
        {bin(ANDB, name(i), bin(LT, name(i), icon(3))), true},
        {bin(ORB, name(i), bin(LT, name(i), icon(3))), false},
        {un(ABS, bin(PLUS, bin(LT, name(i), icon(3)), icon(-1))), true},
        {un(ABS, bin(PLUS, un(SCONV, name(b), tp->uint_t), icon(-1, tp->uint_t))), false}, // wraps, not negative
        {bit, false},
        {un(SCONV, name(i), tp->bool_t), true},
        {un(SCONV, bin(LT, name(i), icon(3)), tp->double_t), false},
    };
    for (const auto& c : cases) EXPECT_EQ(returns_1_or_0(c.tree), c.is_truth) << show(c.tree);
}

TEST_F(TypeOps, ValuesThatFit) {
    NODE *i = name(symbol("i", tp->int_t)), *u = name(symbol("u", tp->uint_t)), *l = name(symbol("l", tp->long_t));
    EXPECT_TRUE(value_fits_in_type(i, tp->long_t, nullptr));
    EXPECT_TRUE(value_fits_in_type(u, tp->long_t, nullptr));
    EXPECT_FALSE(value_fits_in_type(i, tp->ulong_t, nullptr)); // may be negative
    EXPECT_FALSE(value_fits_in_type(l, tp->int_t, nullptr));
    EXPECT_FALSE(value_fits_in_type(u, tp->int_t, nullptr));
    EXPECT_TRUE(value_fits_in_type(icon(100, tp->long_t), tp->int_t, nullptr));
    EXPECT_FALSE(value_fits_in_type(icon(40000, tp->long_t), tp->int_t, nullptr));
    EXPECT_TRUE(value_fits_in_type(fcon("1", tp->float_t), tp->double_t, nullptr));
    EXPECT_FALSE(value_fits_in_type(i, tp->double_t, nullptr));
}

TEST_F(TypeOps, ShapesOfTypes) {
    TYPE* s = sample_struct();
    EXPECT_TRUE(is_type_component_of_type(tp->long_t, tp->mk_array(s, false, 3, true)));
    EXPECT_FALSE(is_type_component_of_type(tp->float_t, s));
    EXPECT_TRUE(type_may_alias_type(tp->ulong_t, s)); // the unsigned form of a member
    EXPECT_FALSE(type_may_alias_type(tp->float_t, tp->long_t));
    EXPECT_FALSE(csu_type_has_only_simple_scalar_members(s, 9)); // a bit-field
    EXPECT_TRUE(type_may_contain_volatile(tp->mk_array(tp->mk_qual(tp->int_t, QUAL_VOLATILE), false, 2, true)));
    EXPECT_FALSE(type_may_contain_volatile(s));
    EXPECT_TRUE(type_could_be_an_array(tp->mk_array(tp->int_t, false, 2, true)));
    EXPECT_FALSE(type_could_be_an_array(s));
    EXPECT_TRUE(is_field_member_of_type(sample_member(2), s));

    TYPE* u = tp->mk_union("both", 32, 32, false);
    fkMDATA* f = new fkMDATA("f", tp->float_t, 0, 0, 0, false, false, false, false);
    f->next = new fkMDATA("l", tp->llong_t, 0, 0, 0, false, false, false, false);
    tp->set_mdata(u, f);
    tp->type_frozen(u);
    EXPECT_TRUE(types_contained_in_union(tp->float_t, tp->llong_t));
    EXPECT_FALSE(types_contained_in_union(tp->float_t, tp->long_t));

    EXPECT_TRUE(bits_of_var_are_immutable(tp->mk_array(tp->mk_qual(tp->int_t, QUAL_CONST), false, 4, true), 16, 32));
    EXPECT_FALSE(bits_of_var_are_immutable(s, 0, 16));
}

TEST_F(TypeOps, MembersTakeQualifiers) {
    NODE* packed = name(symbol("s", tp->mk_qual(sample_struct(), QUAL_VOLATILE | QUAL_PACKED)));
    NODE* m = member(packed, sample_member(0));
    EXPECT_TRUE(lvalue_is_volatile(m));
    TYPE* t = merge_qualifiers_for_STDOT(tp->int_t, m);
    EXPECT_EQ(t->qual_kind(false), unsigned(QUAL_VOLATILE));
    EXPECT_TRUE(must_preserve_STDOT(m));
    EXPECT_FALSE(must_preserve_STDOT(member(name(symbol("s", sample_struct())), sample_member(0))));
    volit_vars = 1;
    NODE* p = deref(name(symbol("p", tp->mk_ptr(tp->int_t))));
    EXPECT_TRUE(fix_type_info(p)->type->is_volatile());
    EXPECT_TRUE(fix_type_info(name(symbol("g", tp->int_t, 0, SC_EXTDEF)))->type->is_volatile());
    EXPECT_FALSE(fix_type_info(name(symbol("a", tp->int_t)))->type->is_volatile());
    volit_vars = 0;
}

} // namespace
