// The control-flow simplifier on graphs made by hand, and what one condition says of another.

#include "../ir/function_fixture.h"

#include "OPT5/scalar/implied_tests.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"

namespace {

class SimpcfgTest : public FunctionTest {
protected:
    static void SetUpTestSuite() {
        FunctionTest::SetUpTestSuite();
        init_simplifier();
    }
    static int blocks() {
        int n = 0;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) ++n;
        return n;
    }
    NODE* constant_case(long value, int to) {
        return maketree(CASE, mk_ICON(INT65(value), tp->int_t), ref(to), tp->int_t);
    }
};

TEST_F(SimpcfgTest, ALoopThatDoesNothingStays) {
    SYMTAB* x = local("x");
    branch_if(x, 1, 2);
    define(1);
    go(1);
    define(2);
    define(3);
    go(4);
    define(4);
    go(3); // two blocks that jump to each other
    build();
    simpcfg(false, false);
    EXPECT_TRUE(has_edge(block_of(1), block_of(1)));
    EXPECT_TRUE(valid());
}

// Where a case ends up is a case itself, which gives way in its turn.
TEST_F(SimpcfgTest, CasesAlongAChainOfJumpsAllReachItsEnd) {
    SYMTAB *x = local("x"), *y = local("y");
    constexpr int N = 100;
    NODE* cases = nullptr;
    for (int n = 1; n <= N; ++n)
        cases = cases ? maketree(COMMA, cases, constant_case(n, n), tp->int_t) : constant_case(n, n);
    add(maketree(SWITCH, mk_NAME(x), cases, tp->int_t));
    ret(y);
    for (int n = 1; n <= N; ++n) {
        define(n);
        go(n + 1);
    }
    define(N + 1);
    ret(x);
    build();
    simpcfg(false, false);
    EXPECT_EQ(blocks(), 3);
    const BBLK* end = block_of(N + 1);
    EXPECT_EQ(edge_length(end->predecessors), 1);
    for_each_branch_target(currfuninfo->bb_list->branch(), [end, n = 0](const NODE* ref) mutable {
        if (++n <= N) {
            EXPECT_EQ(ref->lbl->bblock, end) << "case " << n;
        }
    });
    EXPECT_TRUE(valid());
}

// A reference for every pair of compares with constants: the values around both constants and the limits decide.
TEST_F(SimpcfgTest, ImplicationOfComparesAgreesWithTheValues) {
    const long constants[] = {-32768, -1, 0, 1, 3, 4, 32766, 32767};
    const int ops[] = {EQ, NEQ, LT, LE, GT, GE};
    auto holds = [](int op, long x, long c) {
        switch (op) {
        case EQ: return x == c;
        case NEQ: return x != c;
        case LT: return x < c;
        case LE: return x <= c;
        case GT: return x > c;
        default: return x >= c;
        }
    };
    SYMTAB* x = local("x");
    int decided = 0;
    for (int p_op : ops)
        for (long c : constants)
            for (int q_op : ops)
                for (long d : constants)
                    for (bool sense : {false, true}) {
                        NODE* p = maketree(p_op, mk_NAME(x), mk_ICON(INT65(c), tp->int_t), tp->int_t);
                        NODE* q = maketree(q_op, mk_NAME(x), mk_ICON(INT65(d), tp->int_t), tp->int_t);
                        bool can_hold = false, can_fail = false;
                        for (long base : {c, d, -32768L, 32767L, 0L})
                            for (long v = base - 2; v <= base + 2; ++v) {
                                if (v < -32768 || v > 32767 || holds(p_op, v, c) != sense) continue;
                                (holds(q_op, v, d) ? can_hold : can_fail) = true;
                            }
                        const int known = pred_implies_pred(p, sense, q);
                        const bool right = known == 1 ? !can_fail : known == 0 ? !can_hold : can_hold && can_fail;
                        EXPECT_TRUE(right) << stmt2infix(p) << " " << sense << ": " << stmt2infix(q) << " " << known;
                        decided += known >= 0;
                        erase_tree(p);
                        erase_tree(q);
                    }
    EXPECT_GT(decided, 1000);
}

TEST_F(SimpcfgTest, ImplicationThroughConnectives) {
    SYMTAB *x = local("x"), *y = local("y");
    SYMTAB* f = local("f", tp->float_t);
    auto is = [&](int op, SYMTAB* s, long c) {
        return maketree(op, mk_NAME(s), mk_ICON(INT65(c), tp->int_t), tp->int_t);
    };
    auto both = [&](int op, NODE* a, NODE* b) { return maketree(op, a, b, tp->int_t); };
    auto real = [&](int op) {
        NODE* c = new_node(FCON, tp->float_t);
        c->mk_fcon("3.0");
        return maketree(op, mk_NAME(f), c, tp->int_t);
    };
    struct ROW {
        NODE* p;
        bool sense;
        NODE* q;
        int expected;
    } const rows[] = {
        {both(ANDAND, is(GT, x, 3), is(EQ, y, 1)), true, is(NEQ, x, 0), 1},
        {both(ANDAND, is(GT, x, 3), is(EQ, y, 1)), false, is(GT, x, 3), -1},
        {both(OROR, is(GT, x, 3), is(EQ, y, 1)), false, is(LE, x, 3), 1},
        {both(OROR, is(GT, x, 3), is(EQ, y, 1)), true, is(GT, x, 3), -1},
        {is(GT, x, 3), true, both(OROR, is(EQ, y, 1), is(GT, x, 0)), 1},
        {is(GT, x, 3), true, both(ANDAND, is(EQ, y, 1), is(LT, x, 0)), 0},
        {is(GT, x, 3), true, both(ANDAND, is(EQ, y, 1), is(GT, x, 0)), -1},
        {maketree(EXCLAIM, is(GT, x, 3), nullptr, tp->int_t), true, is(LE, x, 3), 1},
        {mk_NAME(x), true, is(EQ, x, 0), 0},
        {mk_NAME(x), false, is(GE, x, 0), 1},
        {is(GT, x, 3), true, is(GT, y, 3), -1},
        // A NaN fails both a compare and its mirror image, but not its exact opposite.
        {real(FLT), false, real(FGE), -1},
        {real(FLT), true, real(FLT), 1},
        {real(FLT), false, real(FGEN), 1},
    };
    for (const ROW& row : rows) {
        EXPECT_EQ(pred_implies_pred(row.p, row.sense, row.q), row.expected)
            << stmt2infix(row.p) << (row.sense ? " holds: " : " fails: ") << stmt2infix(row.q);
        erase_tree(row.p);
        erase_tree(row.q);
    }
}

} // namespace
