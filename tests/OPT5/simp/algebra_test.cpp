// Rules of integer algebra: exact by an evaluator of its own, and effects that must stay.

#include "../ir/evaluator.h"

#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/simp.h"

using namespace test_trees;

namespace {

class Algebra : public Trees {
protected:
    static std::vector<TYPE*> integer_types() {
        return {tp->int_t, tp->uint_t, tp->long_t, tp->ulong_t, tp->llong_t, tp->ullong_t};
    }
    // Values around every boundary of a type.
    static std::vector<INT65> boundaries(TYPE* t) {
        const INT65 min = int_type_min(t), max = int_type_max(t), half = (max >> INT65(1)) + INT65(1);
        std::vector<INT65> out;
        for (INT65 v : {INT65(0), INT65(1), INT65(2), INT65(3), INT65(7), INT65(8), INT65(15), INT65(255), INT65(-1),
                        INT65(-2), INT65(-8), min, min + INT65(1), max, max - INT65(1), half})
            out.push_back(truncate_to_type(v, t));
        return out;
    }
    static VALUE at(const NODE* t, SYMTAB* x, INT65 v) {
        EVALUATOR env;
        NODE* c = mk_ICON(v, x->type);
        env.variables[x] = EVALUATOR().eval(c);
        erase_tree(c);
        return env.eval(t);
    }
    // The tree and what it simplifies to agree for every boundary value of x.
    static void check(NODE* t, SYMTAB* x) {
        NODE* s = simp_tree(copy_tree(t), nullptr);
        for (INT65 v : boundaries(x->type)) {
            const VALUE expected = at(t, x, v);
            if (expected.undefined) continue;
            ASSERT_EQ(at(s, x, v), expected)
                << show(t) << " -> " << show(s) << " at " << static_cast<long long>(v.value);
        }
        erase_tree(s);
        erase_tree(t);
    }
};

constexpr int binaries[] = {PLUS, MINUS, MULT, DIV, MOD, ANDB, ORB, XORB, SLL, SRL};

bool is_shift(int op) { return op == SLL || op == SRL; }

// (x op1 c1) op2 c2, and with the constants on the left, for all pairs of operators and boundary constants of every
// type.
TEST_F(Algebra, PairsOfOperatorsWithConstantsKeepValues) {
    for (TYPE* type : integer_types()) {
        SYMTAB* x = symbol("x", type);
        for (int op1 : binaries)
            for (int op2 : binaries)
                for (INT65 c1 : boundaries(type))
                    for (INT65 c2 : boundaries(type)) {
                        auto constant = [&](int op, INT65 c) {
                            return is_shift(op) ? mk_ICON(INT65(c.value & (type->size - 1)), tp->int_t)
                                                : mk_ICON(c, type);
                        };
                        check(bin(op2, bin(op1, name(x), constant(op1, c1), type), constant(op2, c2), type), x);
                        if (!is_shift(op1) && !is_shift(op2))
                            check(bin(op2, constant(op2, c2), bin(op1, constant(op1, c1), name(x), type), type), x);
                        if (HasFatalFailure()) return;
                    }
    }
}

// Compares of x, and of x under one operator, with every boundary constant.
TEST_F(Algebra, ComparesWithConstantsKeepValues) {
    for (TYPE* type : integer_types()) {
        SYMTAB* x = symbol("x", type);
        for (int relop = EQ; relop <= GT; ++relop) {
            const int op = relop >= LE && type->is_unsigned() ? relop + (ULE - LE) : relop;
            for (INT65 c1 : boundaries(type))
                for (INT65 c2 : boundaries(type)) {
                    check(bin(op, bin(PLUS, name(x), mk_ICON(c1, type), type), mk_ICON(c2, type), tp->int_t), x);
                    check(bin(op, bin(ANDB, name(x), mk_ICON(c1, type), type), mk_ICON(c2, type), tp->int_t), x);
                    check(bin(op, mk_ICON(c2, type), bin(XORB, name(x), mk_ICON(c1, type), type), tp->int_t), x);
                    if (HasFatalFailure()) return;
                }
        }
    }
}

TEST_F(Algebra, CastsOfCastsKeepValues) {
    std::vector<TYPE*> types = integer_types();
    types.push_back(tp->bool_t);
    for (TYPE* from : types)
        for (TYPE* middle : types)
            for (TYPE* to : types) {
                SYMTAB* x = symbol("x", from);
                if (from->is_bool()) continue;
                check(un(SCONV, un(SCONV, name(x), middle), to), x);
                if (HasFatalFailure()) return;
            }
}

// A bit that is said to be known is what is said, for every value of the variables.
TEST_F(Algebra, KnownBitsAreTrue) {
    TREE_MAKER make(2718);
    make.types = integer_types();
    make.types.push_back(tp->bool_t);
    for (TYPE* t : make.types) make.variables.push_back(symbol("x", t));
    EVALUATOR env;
    int known = 0;
    for (int round = 0; round < 60000; ++round) {
        NODE* t = insert_mandatory_casts(make.expression(1 + static_cast<int>(make.pick(5))));
        if (t->type->is_int()) {
            const KNOWN_BITS k = known_bits(t);
            ASSERT_EQ(k.zeros & k.ones, 0u) << show(t);
            known += (k.zeros | k.ones) != 0;
            for (int assignment = 0; assignment < 6; ++assignment) {
                for (SYMTAB* s : make.variables) {
                    NODE* c = make.constant(s->type);
                    env.variables[s] = EVALUATOR().eval(c);
                    erase_tree(c);
                }
                const VALUE v = env.eval(t);
                if (v.undefined) continue;
                const uint64_t mask = type_mask(t->type).value, bits = static_cast<uint64_t>(v.i) & mask;
                ASSERT_EQ(bits & k.zeros, 0u) << show(t);
                ASSERT_EQ(~bits & k.ones, 0u) << show(t);
            }
            EXPECT_FALSE(tree_is_negative(t, nullptr) && tree_is_non_negative(t, nullptr));
        }
        erase_tree(t);
    }
    EXPECT_GT(known, 20000) << "the masks say something";
}

TEST_F(Algebra, RangesGiveTheirCommonBits) {
    for (long low = -20; low <= 20; ++low)
        for (long high = low; high <= 20; ++high) {
            const INT65 zeros = find_known_zeros_in_range(INT65(low), INT65(high)),
                        ones = find_known_ones_in_range(INT65(low), INT65(high));
            for (long v = low; v <= high; ++v) {
                EXPECT_TRUE((INT65(v) & zeros).is_zero());
                EXPECT_TRUE((~INT65(v) & ones).is_zero());
            }
        }
    EXPECT_EQ(find_known_zeros_in_range(INT65(0), INT65(7)), ~INT65(7));
    EXPECT_EQ(find_known_ones_in_range(INT65(8), INT65(11)), INT65(8));
}

// What has an effect, or could change in between, is not joined or dropped.
TEST_F(Algebra, EffectsStay) {
    SYMTAB* v = symbol("v", tp->mk_qual(tp->int_t, QUAL_VOLATILE));
    SYMTAB* x = symbol("x", tp->int_t);
    struct ROW {
        NODE* tree;
        int calls_and_reads;
    } rows[] = {
        {bin(MINUS, name(v), name(v), tp->int_t), 2},
        {bin(XORB, name(v), name(v), tp->int_t), 2},
        {bin(MULT, name(v), icon(0), tp->int_t), 1},
        {bin(ANDB, call("f", tp->int_t), icon(0)), 1},
        {bin(EQ, call("f", tp->int_t), call("f", tp->int_t)), 2},
        {bin(PLUS, un(UMINUS, call("f", tp->int_t)), call("g", tp->int_t)), 2},
    };
    for (ROW& row : rows) {
        const std::string before = show(row.tree);
        row.tree = simp_tree(row.tree, nullptr);
        int n = 0;
        for_each_node(row.tree, [&](NODE* t) { n += op_is_call(t->op) || (t->op == NAME && t->u.sym == v); });
        EXPECT_EQ(n, row.calls_and_reads) << before << " -> " << show(row.tree);
        erase_tree(row.tree);
    }
    // -f() + g() calls f first.
    NODE* t = simp_tree(bin(PLUS, un(UMINUS, call("f", tp->int_t)), name(x)), nullptr);
    EXPECT_EQ(t->op, PLUS) << show(t);
    erase_tree(t);
}

// ---- A known value in place of a tree

TEST_F(Algebra, KnownValuesReplaceTrees) {
    SYMTAB *xs = symbol("x", tp->int_t), *ys = symbol("y", tp->int_t), *ps = symbol("p", tp->mk_ptr(tp->int_t));
    auto x = [&] { return name(xs); };
    auto y = [&] { return name(ys); };
    NODE* target = x();
    struct ROW {
        NODE* tree;
        const char* expected;
    } rows[] = {
        {bin(PLUS, x(), y()), "y + 7"},
        {bin(MULT, bin(PLUS, x(), icon(1)), y()), "y * 8"},
        {bin(LT, x(), icon(8)), "1"},
        {bin(ASG, y(), x(), tp->int_t), "y = 7"},
        {bin(ASG, x(), bin(PLUS, x(), icon(1)), tp->int_t), "x = 8"}, // the place stays
        {address(x()), "&x"},
        {bin(PLUS, y(), icon(1)), "y + 1"},
    };
    for (ROW& row : rows) {
        const std::string before = show(row.tree);
        row.tree = simp_subst_icon(INT65(7), tp->int_t, target, row.tree);
        EXPECT_EQ(tree_to_infix(row.tree), row.expected) << before;
        erase_tree(row.tree);
    }
    erase_tree(target);

    // Effects of what is replaced stay.
    NODE* call_target = call("f", tp->int_t);
    NODE* t = simp_subst_icon(INT65(3), tp->int_t, call_target, bin(PLUS, call("f", tp->int_t), y()));
    EXPECT_EQ(count_calls_in_tree(t), 1) << show(t);
    erase_tree(t);
    erase_tree(call_target);

    // A pointer found to be a plain number: the compare is of numbers.
    NODE* pointer = name(ps);
    t = simp_subst_icon(INT65(-5), tp->long_t, pointer, bin(ULT, name(ps), un(SCONV, y(), tp->long_t), tp->int_t));
    EXPECT_TRUE(t->op == LT || t->op == GT) << show(t);
    erase_tree(t);
    erase_tree(pointer);
}

} // namespace
