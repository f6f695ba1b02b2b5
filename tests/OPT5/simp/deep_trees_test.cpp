// Trees as large as generated programs have them: the simplifier ends, does not run out of stack, and gives the value.

#include "../ir/tree_builder.h"

#include "OPT5/simp/patterns.h"
#include "OPT5/simp/simp.h"

using namespace test_trees;

namespace {

class DeepTrees : public Trees {
protected:
    static void SetUpTestSuite() {
        start();
        rules::compile_patterns();
    }
    static constexpr int LEVELS = 50000; // two nodes or more each

    SYMTAB *xs = symbol("x", tp->int_t), *ys = symbol("y", tp->int_t), *ps = symbol("p", tp->mk_ptr(tp->int_t));
    NODE* x() { return name(xs); }
    NODE* y() { return name(ys); }
    NODE* leaf(int i) { return i % 3 ? x() : y(); }

    static int depth_first_count(const NODE* t) {
        std::vector<const NODE*> open{t};
        int n = 0;
        while (!open.empty()) {
            const NODE* at = open.back();
            open.pop_back();
            ++n;
            for (const NODE* operand : {at->left, at->right})
                if (operand) open.push_back(operand);
        }
        return n;
    }
    // The least and most nodes that the result may have.
    static void expect_nodes(NODE* t, int least, int most) {
        t = simp_tree(t, nullptr);
        const int n = depth_first_count(t);
        EXPECT_GE(n, least);
        EXPECT_LE(n, most);
        erase_tree(t);
    }
};

TEST_F(DeepTrees, SumsOfConstantsAndVariables) {
    NODE* t = x();
    for (int i = 0; i < LEVELS; ++i) t = bin(PLUS, t, icon(1));
    t = simp_tree(t, nullptr);
    EXPECT_EQ(show(t), "x + 32767 + 17233") << "50000, as sums that do not wrap";
    erase_tree(t);
    t = x();
    for (int i = 0; i < LEVELS; ++i) t = bin(i % 2 ? PLUS : MINUS, t, leaf(i));
    expect_nodes(t, 3, 2 * LEVELS + 1);
    t = x();
    for (int i = 0; i < LEVELS; ++i) t = bin(PLUS, leaf(i), t);
    expect_nodes(t, 3, 2 * LEVELS + 3);
}

TEST_F(DeepTrees, ProductsAndBits) {
    for (int op : {MULT, ANDB, ORB, XORB}) {
        NODE* t = x();
        for (int i = 0; i < LEVELS; ++i) t = bin(op, t, leaf(i));
        expect_nodes(t, 1, 2 * LEVELS + 1);
        t = x();
        for (int i = 0; i < LEVELS; ++i) t = bin(op, bin(PLUS, t, y()), icon(3));
        expect_nodes(t, 1, 5 * LEVELS + 1);
    }
}

TEST_F(DeepTrees, Conditionals) {
    for (bool on_left : {false, true}) {
        NODE* t = icon(0);
        for (int i = 0; i < LEVELS / 2; ++i) {
            NODE *arm = bin(PLUS, leaf(i), icon(i % 100 + 2)), *test = bin(LT, leaf(i + 1), icon(i % 1000));
            t = bin(QUEST, test, on_left ? bin(COLON, t, arm) : bin(COLON, arm, t), tp->int_t);
        }
        expect_nodes(t, LEVELS, 5 * LEVELS);
    }
    NODE* t = icon(2); // arms that look like truth values to the end
    for (int i = 0; i < LEVELS / 2; ++i)
        t = bin(QUEST, bin(LT, x(), icon(i % 1000)), bin(COLON, icon(i % 2), t), tp->int_t);
    expect_nodes(t, 3, 5 * LEVELS);
    t = x();
    for (int i = 0; i < LEVELS; ++i) t = mk_EXCLAIM(t);
    expect_nodes(t, 1, 3);
}

TEST_F(DeepTrees, LogicalOperatorsAndCommas) {
    for (int op : {ANDAND, OROR})
        for (bool on_left : {false, true}) {
            NODE* t = call("f", tp->int_t);
            for (int i = 0; i < LEVELS / 2; ++i) {
                NODE* test = i % 5 ? bin(LT, leaf(i), icon(i % 1000)) : call("g", tp->int_t);
                t = on_left ? bin(op, t, test) : bin(op, test, t);
            }
            expect_nodes(t, 1, 5 * LEVELS);
            t = x();
            for (int i = 0; i < LEVELS / 2; ++i)
                t = on_left ? bin(op, t, bin(EQ, leaf(i), icon(0))) : bin(op, bin(EQ, leaf(i), icon(0)), t);
            expect_nodes(t, 1, 5 * LEVELS);
        }
    for (bool on_left : {false, true}) {
        NODE* t = call("f", tp->int_t);
        for (int i = 0; i < LEVELS / 2; ++i)
            t = on_left ? bin(COMMAOP, t, call("g", tp->int_t)) : bin(COMMAOP, call("g", tp->int_t), t);
        expect_nodes(t, LEVELS, 3 * LEVELS);
        t = x();
        for (int i = 0; i < LEVELS / 4; ++i) { // effects in every operand of a sum
            NODE* term = bin(COMMAOP, call("g", tp->int_t), y());
            t = on_left ? bin(PLUS, t, term) : bin(PLUS, term, t);
        }
        expect_nodes(t, LEVELS, 3 * LEVELS);
    }
}

TEST_F(DeepTrees, CastsPointersAndIndirections) {
    NODE* t = x();
    for (int i = 0; i < LEVELS; ++i) t = un(SCONV, t, i % 2 ? tp->int_t : tp->long_t);
    expect_nodes(t, 1, 1);
    t = name(ps);
    for (int i = 0; i < LEVELS; ++i) t = bin(PLUS, t, i % 2 ? icon(1) : x(), t->type);
    expect_nodes(t, LEVELS, 2 * LEVELS + 1);
    TYPE* p = tp->mk_ptr(tp->int_t);
    t = name(ps);
    for (int i = 0; i < LEVELS / 2; ++i) t = un(PCONV, deref(bin(PLUS, t, icon(1), t->type)), p);
    expect_nodes(t, LEVELS, 3 * LEVELS);
    t = x();
    for (int i = 0; i < LEVELS; ++i) t = un(i % 2 ? UMINUS : NOTB, t);
    expect_nodes(t, 1, 3);
}

} // namespace
