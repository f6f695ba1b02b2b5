// Questions about trees, congruence, and the two forms of compound assignment.

#include "tree_builder.h"

using namespace test_trees;

namespace {

class TreeQuery : public Trees {
protected:
    SYMTAB *a = symbol("a", tp->int_t), *b = symbol("b", tp->int_t), *c = symbol("c", tp->int_t);
    SYMTAB* v = symbol("v", tp->mk_qual(tp->int_t, QUAL_VOLATILE));
    SYMTAB *x = symbol("x", tp->double_t), *y = symbol("y", tp->double_t), *z = symbol("z", tp->double_t);
    SYMTAB* p = symbol("p", tp->mk_ptr(tp->int_t));
    NODE* A() { return name(a); }
    NODE* B() { return name(b); }
    NODE* C() { return name(c); }
};

TEST_F(TreeQuery, SideEffects) {
    struct {
        NODE* tree;
        bool has;
    } cases[] = {
        {bin(PLUS, A(), B()), false},
        {bin(PLUS, A(), name(v)), true},
        {address(name(v)), false},
        {address(member(deref(name(symbol("q", tp->mk_ptr(sample_struct())))), sample_member(0))), false},
        {address(deref(bin(PLUS, name(p), call("f", tp->int_t), p->type))), true},
        {deref(name(symbol("vp", tp->mk_ptr(tp->mk_qual(tp->int_t, QUAL_VOLATILE))))), true},
        {mk_ICALL("g", A(), tp->int_t), false},
        {mk_ICALL("g", bin(ASG, A(), B()), tp->int_t), true},
        {mk_ICALL("def$assert", bin(COMMA, bin(COMMA, A(), call("f", tp->int_t), tp->int_t), B(), tp->int_t),
                  tp->int_t),
         false},
        {mk_MCALL("g", A(), tp->int_t), true},
        {maketree(CSE_DUPE, call("f", tp->int_t), A(), tp->int_t), false},
    };
    for (const auto& c : cases) EXPECT_EQ(tree_has_side_effects(c.tree), c.has) << show(c.tree);
}

TEST_F(TreeQuery, CongruenceOfSumsAndProducts) {
    auto X = [&] { return name(x); };
    auto Y = [&] { return name(y); };
    auto Z = [&] { return name(z); };
    struct {
        NODE *left, *right;
        bool congruent;
    } cases[] = {
        {bin(PLUS, A(), B()), bin(PLUS, B(), A()), true},
        {bin(MINUS, A(), B()), bin(MINUS, B(), A()), false},
        {bin(LT, A(), B()), bin(GT, B(), A()), true},
        {bin(LT, A(), B()), bin(GT, A(), B()), false},
        {bin(PLUS, bin(PLUS, A(), B()), C()), bin(PLUS, A(), bin(PLUS, B(), C())), true},
        {bin(PLUS, bin(PLUS, A(), B()), C()), bin(PLUS, C(), bin(PLUS, B(), A())), true},
        {bin(PLUS, bin(PLUS, A(), B()), B()), bin(PLUS, A(), bin(PLUS, A(), B())), false},
        {bin(PLUS, bin(PLUS, X(), Y()), Z()), bin(PLUS, X(), bin(PLUS, Y(), Z())), false},
        {bin(PLUS, X(), Y()), bin(PLUS, Y(), X()), true},
        {un(SCONV, A(), tp->long_t), un(SCONV, A(), tp->ulong_t), false},
        {icon(1), icon(1, tp->long_t), false},
        {un(IDENTITY, A()), A(), true},
        {fcon("0.0"), fcon("-0.0"), false},
        {name(v), name(v), false},
        {mk_ICALL("f1", A(), tp->int_t), mk_ICALL("f1", A(), tp->int_t), true},
        {mk_ICALL("f1", A(), tp->int_t), mk_ICALL("f2", A(), tp->int_t), false},
        {member(name(symbol("s", sample_struct())), sample_member(0)), member(name(a), sample_member(0)), false},
    };
    for (const auto& c : cases)
        EXPECT_EQ(trees_are_congruent(c.left, c.right, false), c.congruent) << show(c.left) << " | " << show(c.right);
    EXPECT_TRUE(trees_are_congruent_se_ok(name(v), name(v)));
}

// Exchanged operands would also exchange the effects.
TEST_F(TreeQuery, EffectsKeepTheirOrder) {
    NODE* fg = bin(PLUS, call("f", tp->int_t), bin(ASG, A(), B()));
    NODE* gf = bin(PLUS, copy_tree(fg->right), copy_tree(fg->left));
    EXPECT_TRUE(trees_are_congruent_se_ok(fg, copy_tree(fg)));
    EXPECT_FALSE(trees_are_congruent_se_ok(fg, gf));
    EXPECT_FALSE(trees_are_congruent(fg, fg, false));
}

TEST_F(TreeQuery, OppositesOfConditions) {
    NODE* lt = bin(LT, A(), B());
    EXPECT_TRUE(bools_are_congruent(mk_EXCLAIM(copy_tree(lt)), bin(GE, A(), B()), false, false));
    EXPECT_TRUE(bools_are_congruent(lt, bin(LE, B(), A()), true, false));
    EXPECT_TRUE(bools_are_congruent(bin(EQ, copy_tree(lt), icon(0)), lt, true, false));
    EXPECT_TRUE(bools_are_congruent(bin(NEQ, A(), icon(0)), A(), false, false));
    EXPECT_FALSE(bools_are_congruent(A(), A(), true, false));
    NODE* flt = bin(FLT, name(x), name(y));
    EXPECT_TRUE(bools_are_congruent(flt, bin(FGEN, name(x), name(y)), true, false));
    EXPECT_FALSE(bools_are_congruent(flt, bin(FGE, name(x), name(y)), true, false));
}

// An inner variable may have a parameter's name: only the prolog's copy is the parameter's value.
TEST_F(TreeQuery, ParameterAndItsCopyAreToldByTheProlog) {
    TYPE* const_int = tp->mk_qual(tp->int_t, QUAL_CONST);
    SYMTAB *parm = symbol("n", tp->int_t, 1, SC_PARM), *local = symbol("n", const_int), *inner = symbol("n", const_int);
    NODE* prolog = bin(ASG, name(local), name(parm), const_int);
    EXPECT_TRUE(tree_is_arg_prolog(prolog));
    EXPECT_EQ(map_sym_to_parm(local), nullptr);
    currfuninfo->arg_prolog = maketree(PCOMMA, bin(ASG, A(), B()), prolog, tp->void_t);
    EXPECT_EQ(map_sym_to_parm(local), parm);
    EXPECT_EQ(map_parm_to_sym(parm), local);
    EXPECT_EQ(map_sym_to_parm(inner), nullptr);
    EXPECT_TRUE(trees_are_congruent(name(local), name(parm), false));
    EXPECT_FALSE(trees_are_congruent(name(inner), name(parm), false));
    erase_tree(currfuninfo->arg_prolog);
    currfuninfo->arg_prolog = nullptr;
}

TEST_F(TreeQuery, ConstantsAndAddresses) {
    SYMTAB* global = symbol("g", tp->mk_qual(tp->int_t, QUAL_CONST), 0, SC_EXTDEF);
    EXPECT_TRUE(expr_is_constant(bin(PLUS, icon(1), un(SCONV, icon(2), tp->int_t))));
    EXPECT_TRUE(expr_is_constant(address(A())));
    EXPECT_TRUE(expr_is_constant(name(global)));
    EXPECT_FALSE(expr_is_constant(A()));
    EXPECT_FALSE(expr_is_constant(mk_ICALL("g", nullptr, tp->int_t)));
    NODE* adcon = bin(PLUS, address(name(global)), icon(3), tp->mk_ptr(tp->int_t));
    EXPECT_TRUE(pointer_is_an_adcon(adcon));
    EXPECT_TRUE(pointer_contains_adcon_term(bin(PLUS, copy_tree(adcon), A(), adcon->type)));
    EXPECT_TRUE(pointer_is_an_adcon(un(PCONV, icon(0), p->type)));
    EXPECT_FALSE(pointer_contains_adcon_term(un(PCONV, icon(0), p->type))); // null is no object
    EXPECT_EQ(byte_offset_on_indirection(deref(bin(MINUS, bin(PLUS, name(p), icon(7), p->type), icon(2), p->type))), 5);
    NODE* s = name(symbol("q", tp->mk_ptr(sample_struct())));
    EXPECT_EQ(byte_offset_on_indirection(member(s, sample_member(2), STREF)), 2);
    INT65 offset;
    // An unsigned index may have wrapped below the pointer's width.
    NODE* wraps = bin(PLUS, name(p), bin(PLUS, name(symbol("u", tp->uint_t)), icon(65535, tp->uint_t)), p->type);
    EXPECT_FALSE(total_pointer_offset_value(wraps, &offset));
    EXPECT_TRUE(total_pointer_offset_value(bin(PLUS, name(p), icon(-4), p->type), &offset));
    EXPECT_EQ(offset, INT65(-4));
    EXPECT_EQ(object_name_if_known(deref(bin(PLUS, address(A()), B(), p->type))), a);
    EXPECT_EQ(object_name_if_known(deref(name(p))), nullptr);
}

TEST_F(TreeQuery, CompoundAssignments) {
    currfuninfo->facts |= fact::alias_marks; // no variable of the fixture has its address taken
    SYMTAB *i = symbol("i", tp->int_t), *l = symbol("l", tp->long_t), *f = symbol("f", tp->float_t);
    struct {
        NODE* tree;
        const char* text;
    } to_compound[] = {
        {bin(ASG, A(), bin(PLUS, A(), B())), "a += b"},
        {bin(ASG, A(), bin(PLUS, B(), A())), "a += b"},
        {bin(ASG, A(), bin(MINUS, B(), A())), "a = b - a"},
        {bin(ASG, A(), bin(MINUS, A(), call("f", tp->int_t))), "a = a - f()"},
        {bin(ASG, name(v), bin(PLUS, name(v), icon(1)), tp->int_t), "v = v + 1"},
        {bin(ASG, A(), un(SCONV, bin(PLUS, un(SCONV, A(), tp->long_t), name(l)), tp->int_t)), "a = (int)((long)a + l)"},
        {bin(ASG, A(), bin(SRL, A(), icon(2))), "a >>= 2"},
        {bin(ASG, name(p), bin(PLUS, name(p), icon(2), p->type), p->type), "p += 2"},
    };
    for (const auto& c : to_compound) EXPECT_EQ(show(ASG_to_opASG(c.tree)), c.text);
    struct {
        NODE* tree;
        const char* text;
    } to_plain[] = {
        {bin(PLUSASG, A(), B()), "a = a + b"},
        {bin(DIVASG, name(i), name(l)), "i = (int)((long)i / l)"},
        {bin(MULTASG, name(i), name(f)), "i = (int)((float)i * f)"},
        {bin(SRLASG, name(i), name(l)), "i = i >> (int)l"},
        {bin(PLUSASG, name(p), icon(2), p->type), "p = p + 2"},
        {bin(PLUSASG, deref(bin(PLUSASG, name(p), icon(1), p->type)), A()), "*(p += 1) += a"},
        {bin(PLUSASG, deref(name(p)), call("f", tp->int_t)), "*p += f()"},
        {bin(PLUSASG, A(), call("f", tp->int_t)), "a = a + f()"},
        {bin(PLUSASG, A(), bin(ASG, A(), icon(1))), "a += a = 1"},
    };
    for (const auto& c : to_plain) EXPECT_EQ(show(opASG_to_ASG(c.tree)), c.text);
}

TEST_F(TreeQuery, SubstitutionsSpareLvalues) {
    NODE* t = bin(ASG, A(), bin(PLUS, A(), un(UAND, A(), p->type), p->type), tp->int_t);
    EXPECT_EQ(show(subst_tree_for_lvalue_in_tree(icon(5), A(), t)), "a = 5 + &a");
    EXPECT_EQ(show(subst_tree_for_lvalue_in_tree(B(), A(), t)), "b = 5 + &b");
    EXPECT_EQ(show(subst_sym_for_sym_in_tree(b, c, t)), "c = 5 + &c");
    EXPECT_EQ(show(expunge_IDENTITY_ops_from_tree(un(IDENTITY, un(UMINUS, un(IDENTITY, un(IDENTITY, A())))))), "-a");
}

} // namespace
