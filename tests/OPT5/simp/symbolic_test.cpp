// Questions about values: the answers that must be found. That no answer is wrong is the random trees' business.

#include "../ir/tree_builder.h"

#include "OPT5/simp/simp.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/symbolic.h"

#include <map>

using namespace test_trees;

namespace {

// Stands in for a loop of the optimizer.
struct ROUND {
    std::vector<NODE*> givens;
    ROUND* around = nullptr;
    const SYMTAB* varying = nullptr;
};
const ROUND* behind(const struct LOOP* loop) { return reinterpret_cast<const ROUND*>(loop); }
struct LOOP* as_loop(ROUND* r) {
    return reinterpret_cast<struct LOOP*>(r);
}

class Symbolic : public Trees {
protected:
    static void SetUpTestSuite() {
        start();
        rules::compile_patterns();
    }
    void SetUp() override {
        loop_callbacks.givens = [](const struct LOOP* l) -> const std::vector<NODE*>& { return behind(l)->givens; };
        loop_callbacks.parent = [](const struct LOOP* l) { return as_loop(behind(l)->around); };
        loop_callbacks.is_constant_in = [](const NODE* t, const struct LOOP* l) {
            return !sym_appears_in_tree(behind(l)->varying, t);
        };
    }
    void TearDown() override {
        loop_callbacks = {};
        for (NODE* t : made) erase_tree(t);
        for (NODE* t : currfuninfo->givens) erase_tree(t);
        currfuninfo->givens.clear();
    }

    NODE* kept(NODE* t) {
        made.push_back(t);
        return t;
    }
    static NODE* variable(const char* n, TYPE* type) {
        static std::map<std::pair<std::string, TYPE*>, SYMTAB*> all;
        SYMTAB*& s = all[{n, type}];
        if (!s) s = symbol(n, type);
        return name(s);
    }
    static NODE* x() { return variable("x", tp->int_t); }
    static NODE* y() { return variable("y", tp->int_t); }
    static NODE* n() { return variable("n", tp->int_t); }
    static NODE* u() { return variable("u", tp->uint_t); }
    static NODE* l() { return variable("l", tp->long_t); }
    static NODE* b() { return variable("b", tp->bool_t); }
    static NODE* f() { return call("f", tp->int_t); }
    static NODE* c(long v) { return icon(v); }
    static NODE* uc(long v) { return icon(v, tp->uint_t); }
    static NODE* low(NODE* t, long mask) { return bin(ANDB, t, icon(mask, t->type), t->type); } // t & mask
    static NODE* choose(NODE* cond, NODE* a, NODE* otherwise) {
        return maketree(QUEST, cond, maketree(COLON, a, otherwise, a->type), a->type);
    }
    static NODE* lt(NODE* a, NODE* other) { return bin(LT, a, other, tp->int_t); }
    static NODE* times(NODE* a, long k) { return bin(MULT, a, icon(k, a->type), a->type); }
    static NODE* plus(NODE* a, long k) { return bin(PLUS, a, icon(k, a->type), a->type); }
    static NODE* field(int m) { return member(variable("s", sample_struct()), sample_member(m)); }

    std::vector<NODE*> made;
};

struct INTERVAL {
    NODE* tree;
    long min, max;
};

void expect_bounds(const std::vector<INTERVAL>& rows, struct LOOP* loop) {
    for (const INTERVAL& row : rows) {
        EXPECT_EQ(calculate_minval_for_tree(row.tree, loop), INT65(row.min)) << show(row.tree);
        EXPECT_EQ(calculate_maxval_for_tree(row.tree, loop), INT65(row.max)) << show(row.tree);
        erase_tree(row.tree);
    }
}

TEST_F(Symbolic, BoundsOfOperators) {
    constexpr long MIN = -32768, MAX = 32767;
    expect_bounds(
        {
            {c(5), 5, 5},
            {x(), MIN, MAX},
            {u(), 0, 65535},
            {b(), 0, 1},
            {f(), MIN, MAX},
            {plus(x(), 1), MIN, MAX}, // may wrap
            {plus(low(x(), 7), 1), 1, 8},
            {bin(MINUS, low(x(), 7), low(y(), 3)), -3, 7},
            {un(UMINUS, low(x(), 7)), -7, 0},
            {un(NOTB, low(x(), 7)), -8, -1},
            {un(ABS, bin(MINUS, low(x(), 7), c(3))), 0, 4},
            {times(low(x(), 7), -3), -21, 0},
            {bin(MULT, low(x(), 7), low(y(), 3)), 0, 21},
            {bin(MULT, bin(MINUS, low(x(), 7), c(3)), bin(MINUS, low(x(), 7), c(3))), 0, 16}, // a square
            {bin(MULT, low(x(), 255), low(y(), 255)), MIN, MAX},                              // 65025 wraps
            {bin(MULT, x(), x()), MIN, MAX},
            {low(x(), 12), 0, 12},
            {bin(ANDB, u(), low(u(), 12)), 0, 12},
            {bin(ORB, low(x(), 12), c(1)), 1, 13},
            {bin(XORB, low(x(), 7), low(y(), 7)), 0, 7},
            {bin(DIV, low(x(), 255), c(16)), 0, 15},
            {bin(DIV, x(), c(-2)), -16383, 16384},
            {bin(DIV, c(100), y()), -100, 100}, // by zero is no value
            {bin(MOD, x(), c(10)), -9, 9},
            {bin(MOD, low(x(), 255), c(10)), 0, 9},
            {bin(MOD, low(x(), 7), c(10)), 0, 7},
            {bin(MOD, u(), uc(10)), 0, 9},
            {bin(SLL, low(x(), 3), c(4)), 0, 48},
            {bin(SRL, u(), c(12)), 0, 15},
            {bin(SRL, x(), c(12)), -8, 7},
            {bin(SRL, low(x(), 64), low(y(), 1)), 0, 64},
            {lt(x(), y()), 0, 1},
            {bin(ANDAND, x(), y(), tp->int_t), 0, 1},
            {choose(x(), c(3), c(9)), 3, 9},
            {bin(ASG, x(), low(y(), 7), tp->int_t), 0, 7},
            {bin(COMMAOP, f(), c(5), tp->int_t), 5, 5},
            {un(SCONV, low(x(), 7), tp->long_t), 0, 7},
            {un(SCONV, u(), tp->long_t), 0, 65535},
            {un(SCONV, plus(low(x(), 7), -3), tp->uint_t), 0, 65535},
            {un(SCONV, low(l(), 7), tp->int_t), 0, 7},
            {un(SCONV, l(), tp->int_t), MIN, MAX},
            {field(1), 0, 7},                          // unsigned : 3
            {plus(plus(low(u(), 7), 1), 65535), 0, 7}, // a wrap that all values make
            {plus(low(u(), 7), 65533), 0, 65535},      // one that some make
        },
        nullptr);
}

// The condition of a conditional holds in its arms.
TEST_F(Symbolic, BoundsInArms) {
    NODE* clamp = choose(lt(x(), c(0)), c(0), choose(bin(GT, x(), c(10), tp->int_t), c(10), x()));
    expect_bounds({{choose(lt(x(), c(0)), c(0), x()), 0, 32767},
                   {clamp, 0, 10},
                   {choose(lt(x(), low(y(), 15)), low(y(), 15), x()), 0, 32767},
                   {choose(lt(low(y(), 15), x()), low(y(), 15), x()), -32768, 15}, // the lesser
                   {choose(un(EXCLAIM, x(), tp->int_t), x(), c(7)), 0, 7},
                   // What the condition changes is not what it compared.
                   {choose(lt(x(), bin(ASG, x(), c(5), tp->int_t)), x(), c(0)), -32768, 32767}},
                  nullptr);
}

// ---- Facts

TEST_F(Symbolic, BoundsFromGivens) {
    ROUND outer, inner;
    inner.around = &outer;
    outer.givens = {kept(bin(GE, n(), c(0), tp->int_t)), kept(bin(LE, n(), c(100), tp->int_t))};
    inner.givens = {kept(bin(GE, x(), c(0), tp->int_t)),
                    kept(lt(x(), n())),
                    kept(lt(c(3), y())),
                    kept(bin(EQ, plus(y(), 2), c(9), tp->int_t)),
                    kept(bin(NEQ, u(), uc(0), tp->int_t)),
                    kept(lt(un(SCONV, variable("h", tp->int_t), tp->long_t), icon(20, tp->long_t)))};
    expect_bounds({{x(), 0, 99},
                   {plus(times(x(), 4), 3), 3, 399},
                   {n(), 1, 100}, // above x
                   {y(), 4, 32767},
                   {plus(y(), 2), 9, 9},
                   {u(), 1, 65535},
                   {variable("h", tp->int_t), -32768, 19}},
                  as_loop(&inner));
    expect_bounds({{x(), -32768, 32767}, {n(), 0, 100}}, as_loop(&outer));
    // Without a loop those of the function.
    expect_bounds({{n(), -32768, 32767}}, nullptr);
    currfuninfo->givens = {
        maketree(NASSERT, bin(ANDAND, lt(n(), c(50)), lt(c(0), n()), tp->int_t), nullptr, tp->int_t)};
    expect_bounds({{n(), 1, 49}}, nullptr);
    expect_bounds({{n(), 1, 49}}, as_loop(&outer));
    // Contradictions leave what was known.
    outer.givens.push_back(kept(lt(n(), c(-5))));
    expect_bounds({{low(n(), 7), 0, 7}}, as_loop(&outer));
    EXPECT_LE(calculate_minval_for_tree(kept(n()), as_loop(&outer)),
              calculate_maxval_for_tree(kept(n()), as_loop(&outer)));
}

// ---- Predicates

TEST_F(Symbolic, Predicates) {
    using ASK = bool (*)(const NODE*, struct LOOP*);
    struct ROW {
        ASK ask;
        NODE* tree;
        bool answer;
    };
    const ROW rows[] = {
        {tree_is_non_negative, u(), true},
        {tree_is_non_negative, x(), false},
        {tree_is_non_negative, bin(MULT, x(), x()), false},
        {tree_is_non_negative, bin(MULT, bin(DIV, x(), c(200)), bin(DIV, x(), c(200))), true},
        {tree_is_non_negative, bin(DIV, low(x(), 7), low(y(), 7)), true},
        {tree_is_non_negative, bin(MULT, un(UMINUS, low(x(), 7)), un(UMINUS, low(y(), 7))), true},
        {tree_is_non_negative, fcon("1.0"), false},
        {tree_is_non_negative, un(SCONV, l(), tp->int_t), false},
        {tree_is_negative, un(UMINUS, plus(low(x(), 7), 1)), true},
        {tree_is_negative, bin(ORB, x(), c(-8)), true},
        {tree_is_negative, bin(MULT, plus(low(x(), 7), 1), plus(low(y(), 7), -8)), true},
        {tree_is_negative, u(), false},
        {tree_is_positive, plus(low(x(), 7), 1), true},
        {tree_is_positive, bin(ORB, u(), uc(1)), true},
        {tree_is_positive, low(x(), 7), false},
        {tree_is_zero, bin(MINUS, x(), x()), true},
        {tree_is_zero, bin(MINUS, plus(x(), 3), plus(x(), 3)), true},
        {tree_is_zero, bin(MULT, low(x(), 0), y()), true},
        {tree_is_zero, bin(ANDB, bin(SLL, x(), c(3)), c(7)), true},
        {tree_is_zero, bin(MINUS, f(), f()), false},
        {tree_is_non_zero, bin(ORB, x(), c(4)), true},
        {tree_is_non_zero, bin(MULT, plus(low(x(), 7), 1), plus(low(y(), 7), -8)), true},
        {tree_is_non_zero, bin(MINUS, plus(x(), 1), x()), true},
        {tree_is_non_zero, bin(XORB, bin(ORB, x(), c(1)), times(y(), 2)), true},
        {tree_is_non_zero, un(UMINUS, bin(ORB, x(), c(4))), true},
        {tree_is_non_zero, un(SCONV, bin(ORB, x(), c(4)), tp->bool_t), true},
        {tree_is_non_zero, un(SCONV, bin(ORB, l(), icon(65536, tp->long_t)), tp->int_t), false},
        {tree_is_non_zero, times(bin(ORB, x(), c(4)), 16384), false}, // wraps to zero
        {positive_tree_is_power_of_2, c(8), true},
        {positive_tree_is_power_of_2, c(12), false},
        {positive_tree_is_power_of_2, bin(SLL, c(1), x()), true},
        {positive_tree_is_power_of_2, bin(MULT, bin(SLL, c(1), x()), c(4)), true},
        {positive_tree_is_power_of_2, bin(MULT, x(), c(4)), false},
        {positive_tree_is_power_of_2, bin(ANDB, x(), un(UMINUS, x())), true},
        {positive_tree_is_power_of_2, un(SCONV, bin(SLL, c(1), x()), tp->ulong_t), false}, // 0xffff8000
        {expr_product_may_overflow, bin(MULT, low(x(), 127), low(y(), 127)), false},
        {expr_product_may_overflow, bin(MULT, low(x(), 255), low(y(), 255)), true},
        {expr_product_may_overflow, bin(MULT, x(), c(0)), false},
        {expr_product_may_overflow, bin(MULT, x(), c(-1)), true},
        {expr_product_may_overflow, bin(MULT, plus(low(x(), 7), -3), c(-1)), false},
        {expr_product_may_overflow, bin(PLUS, c(1), c(1)), true},
        {integer_DIV_is_exact, bin(DIV, times(x(), 8), c(4)), true},
        {integer_DIV_is_exact, bin(DIV, times(x(), 12), c(3)), false}, // x * 12 may wrap
        {integer_DIV_is_exact, bin(DIV, times(low(x(), 15), 12), c(-3)), true},
        {integer_DIV_is_exact, bin(DIV, c(8), c(0)), false},
    };
    for (const ROW& row : rows) {
        EXPECT_EQ(row.ask(row.tree, nullptr), row.answer) << "row " << &row - rows << ": " << show(row.tree);
        erase_tree(row.tree);
    }
    NODE* one_to_eight = kept(plus(low(x(), 7), 1));
    EXPECT_EQ(sign_of_integer_expression(one_to_eight, nullptr, false), 1);
    EXPECT_EQ(sign_of_integer_expression(kept(low(x(), 7)), nullptr, false), 0);
    EXPECT_EQ(sign_of_integer_expression(kept(low(x(), 7)), nullptr, true), 1);
    EXPECT_EQ(sign_of_integer_expression(kept(un(UMINUS, plus(low(x(), 7), 1))), nullptr, true), -1);
    EXPECT_TRUE(tree_is_not_ivalue(one_to_eight, INT65(9), nullptr));
    EXPECT_TRUE(tree_is_not_ivalue(kept(bin(ORB, x(), c(4))), INT65(3), nullptr));
    EXPECT_FALSE(tree_is_not_ivalue(one_to_eight, INT65(8), nullptr));
    EXPECT_TRUE(tree_is_ivalue(kept(bin(MINUS, plus(x(), 5), x())), INT65(5), nullptr));
    EXPECT_FALSE(tree_is_ivalue(kept(x()), INT65(5), nullptr));

    ROUND round;
    round.givens = {kept(bin(EQ, bin(ANDB, plus(n(), -1), n()), c(0), tp->int_t))};
    EXPECT_TRUE(positive_tree_is_power_of_2(kept(times(n(), 2)), as_loop(&round)));
}

TEST_F(Symbolic, PairsOfTrees) {
    struct ROW {
        NODE *a, *b;
        long difference; // NONE: not known
        bool differ;
    };
    constexpr long NONE = 99999;
    SYMTAB* object = symbol("o", tp->int_t);
    auto p = [&] { return address(name(object)); };
    const ROW rows[] = {
        {x(), x(), 0, false},
        {x(), y(), NONE, false},
        {plus(x(), 3), plus(x(), 1), 2, true},
        {plus(x(), 3), bin(MINUS, x(), c(1)), 4, true},
        {bin(PLUS, x(), y()), bin(PLUS, y(), x()), 0, false},
        {times(plus(x(), 2), 3), plus(times(x(), 3), 6), 0, false},
        {bin(SLL, x(), c(1)), bin(PLUS, x(), x()), 0, false},
        {un(NOTB, x()), un(UMINUS, x()), -1, true},
        {times(x(), 2), plus(times(y(), 2), 1), NONE, true},
        {times(x(), 6), plus(times(y(), 3), 1), NONE, false}, // either may wrap
        {times(low(x(), 7), 6), plus(times(low(y(), 7), 3), 100), NONE, true},
        {low(x(), 7), plus(low(y(), 7), 8), NONE, true},
        {un(SCONV, plus(low(x(), 7), 1), tp->long_t), un(SCONV, low(x(), 7), tp->long_t), 1, true},
        {un(SCONV, plus(x(), 1), tp->long_t), un(SCONV, x(), tp->long_t), NONE, false}, // x + 1 may wrap
        {f(), f(), NONE, false},
        {bin(PLUS, p(), c(4), p()->type), bin(PLUS, p(), c(1), p()->type), 3, true},
    };
    for (const ROW& row : rows) {
        SCOPED_TRACE(show(row.a) + " and " + show(row.b));
        for (long d : {-1L, 0L, 1L, 2L, 3L, 4L})
            EXPECT_EQ(tree_difference_is_ivalue(row.a, row.b, INT65(d), nullptr), d == row.difference) << d;
        EXPECT_EQ(tree_values_are_not_equal(row.a, row.b, nullptr), row.differ);
        erase_tree(row.a);
        erase_tree(row.b);
    }
    EXPECT_TRUE(expr_cannot_divide_expr(kept(c(4)), kept(plus(times(x(), 2), 1)), nullptr));
    EXPECT_TRUE(expr_cannot_divide_expr(kept(plus(low(x(), 7), 20)), kept(plus(low(y(), 7), 1)), nullptr));
    EXPECT_FALSE(expr_cannot_divide_expr(kept(c(2)), kept(times(x(), 4)), nullptr));
    EXPECT_FALSE(expr_cannot_divide_expr(kept(c(4)), kept(low(x(), 1)), nullptr)); // every number divides zero
}

// ---- Factors

TEST_F(Symbolic, Factors) {
    struct ROW {
        NODE* tree;
        long factor, if_exact; // the second where signed arithmetic is taken not to overflow
    };
    const ROW rows[] = {
        {x(), 1, 1},
        {c(12), 12, 12},
        {c(-12), 12, 12},
        {plus(times(x(), 4), 8), 4, 4},
        {plus(times(x(), 3), 5), 1, 1},
        {times(x(), 12), 4, 12},
        {times(u(), 12), 4, 4},
        {times(low(x(), 15), 12), 12, 12},
        {bin(SLL, x(), c(3)), 8, 8},
        {low(x(), -8), 8, 8},
        {low(times(low(x(), 15), 12), -4), 12, 12},
        {bin(MINUS, times(x(), 6), times(x(), 2)), 4, 4}, // joined terms
        {plus(times(low(x(), 7), 6), 9), 3, 3},
        {bin(ORB, times(x(), 4), c(2)), 2, 2},
        {bin(XORB, times(x(), 8), c(4)), 4, 4},
        {choose(x(), c(8), c(12)), 4, 4},
        {bin(DIV, times(x(), 8), c(4)), 2, 2},
        {bin(SRL, times(x(), 8), c(2)), 2, 2},
        {bin(MOD, times(x(), 8), c(12)), 4, 4},
        {un(UMINUS, times(low(x(), 7), 6)), 6, 6},
        {un(SCONV, times(x(), 4), tp->long_t), 4, 4},
        {un(SCONV, times(l(), 12), tp->int_t), 4, 4},
        {un(SCONV, times(low(x(), 7), 6), tp->long_t), 6, 6},
        {un(SCONV, times(x(), 4), tp->bool_t), 1, 1},
        {bin(MINUS, x(), x()), 32768, 32768}, // zero
        {fcon("4.0"), 1, 1},
        {un(PCONV, times(x(), 12), tp->mk_ptr(tp->int_t)), 4, 4},
        {un(PCONV, un(PCONV, c(24), tp->mk_ptr(tp->long_t)), tp->mk_ptr(tp->int_t)), 24, 24},
        {un(VPACKM, times(x(), 4), tp->mk_vector(tp->int_t, false, 2)), 4, 4},
        {variable("p", tp->mk_ptr(tp->int_t)), 1, 1},
    };
    for (const ROW& row : rows) {
        EXPECT_EQ(max_ICON_factor(row.tree, nullptr), INT65(row.factor)) << show(row.tree);
        EXPECT_EQ(max_ICON_factor(row.tree, nullptr, true), INT65(row.if_exact)) << show(row.tree);
        erase_tree(row.tree);
    }
    ROUND round;
    round.varying = variable("x", tp->int_t)->u.sym;
    round.givens = {kept(bin(EQ, bin(MOD, n(), c(6)), c(0), tp->int_t)), kept(bin(EQ, low(n(), 3), c(0), tp->int_t)),
                    kept(bin(EQ, bin(MOD, y(), c(8)), c(3), tp->int_t)), kept(bin(LE, x(), c(100), tp->int_t)),
                    kept(bin(GE, x(), c(0), tp->int_t))};
    struct LOOP* loop = as_loop(&round);
    EXPECT_EQ(max_asserted_ICON_factor(kept(n()), loop), INT65(12));
    EXPECT_EQ(max_ICON_factor(kept(n()), loop), INT65(12));
    EXPECT_EQ(max_ICON_factor(kept(plus(times(n(), 2), 8)), loop), INT65(8));
    EXPECT_EQ(max_asserted_ICON_factor(kept(x()), loop), INT65(1));
    EXPECT_TRUE(constant_divides_expr(INT65(-4), tp->long_t, kept(n()), loop));
    EXPECT_FALSE(constant_divides_expr(INT65(5), tp->int_t, kept(n()), loop));
    EXPECT_TRUE(constant_divides_expr(INT65(3), tp->long_t, kept(n()), loop));
    EXPECT_FALSE(constant_divides_expr(INT65(3), tp->uint_t, kept(n()), loop)); // n may be negative
    EXPECT_TRUE(constant_divides_expr(INT65(7), tp->int_t, kept(c(0)), nullptr));

    EXPECT_EQ(max_ICON_delta(kept(plus(times(x(), 4), 3)), nullptr), INT65(4));
    EXPECT_EQ(max_ICON_delta(kept(plus(bin(PLUS, times(x(), 6), n()), 3)), loop), INT65(2)); // n may be anything
    EXPECT_EQ(max_ICON_delta(kept(plus(times(x(), 6), 3)), loop), INT65(6));                 // x from 0 to 100

    EXPECT_EQ(expr_modulo_constant(kept(plus(times(x(), 4), 3)), tp->int_t, INT65(4), nullptr), INT65(3));
    EXPECT_EQ(expr_modulo_constant(kept(plus(times(x(), 4), -1)), tp->int_t, INT65(4), nullptr), INT65(3));
    EXPECT_EQ(expr_modulo_constant(kept(plus(times(x(), 6), 1)), tp->int_t, INT65(3), nullptr), INT65(-1));
    EXPECT_EQ(expr_modulo_constant(kept(plus(times(x(), 6), 1)), tp->int_t, INT65(3), loop), INT65(1));
    EXPECT_EQ(expr_modulo_constant(kept(y()), tp->int_t, INT65(4), loop), INT65(3));
    EXPECT_EQ(expr_modulo_constant(kept(c(-1)), tp->uint_t, INT65(10), nullptr), INT65(5));
}

TEST_F(Symbolic, Coefficients) {
    struct ROW {
        NODE* tree;
        long coef, divisor;
        const char* quotient;
    };
    ROW rows[] = {
        {bin(PLUS, times(x(), 6), times(y(), 9)), 3, 3, "x * 2 + y * 3"},
        {plus(times(x(), 4), 8), 4, 4, "x + 2"},
        {plus(times(x(), 4), 8), 4, -2, "-4 - x * 2"},
        {bin(MINUS, bin(SLL, x(), c(3)), c(12)), 4, 4, "(int)((unsigned int)x * 2u - 3u)"},
        {times(bin(PLUS, times(x(), 2), times(y(), 4)), 3), 6, 6, "y * 2 + x"},
        {un(UMINUS, times(x(), 6)), 6, 2, "-(x * 3)"},
        {un(SCONV, times(l(), 4), tp->int_t), 4, 4, "(int)l"},
        {un(SCONV, times(x(), 4), tp->long_t), 1, 1, "(long)(x * 4)"},
        {bin(PLUS, times(x(), 4), y()), 1, 1, "x * 4 + y"},
        {c(0), 0, 5, "0"},
    };
    for (ROW& row : rows) {
        const std::string before = show(row.tree);
        EXPECT_EQ(max_ICON_coef(row.tree), INT65(row.coef)) << before;
        row.tree = div_ICON_coef(row.tree, INT65(row.divisor));
        EXPECT_EQ(show(row.tree), row.quotient) << before;
        erase_tree(row.tree);
    }
}

// ---- Partial evaluation

TEST_F(Symbolic, PartialEvaluation) {
    ROUND round;
    round.varying = variable("x", tp->int_t)->u.sym;
    round.givens = {kept(bin(GE, x(), c(0), tp->int_t)), kept(lt(x(), c(10))), kept(bin(GE, n(), c(0), tp->int_t)),
                    kept(bin(LE, n(), c(1000), tp->int_t))};
    struct LOOP* loop = as_loop(&round);
    struct ROW {
        NODE* tree;
        const char *most, *least; // null: no bound better than the type's
    };
    const ROW rows[] = {
        {x(), "9", "0"},
        {n(), "n", "n"},
        {bin(PLUS, n(), times(x(), 2)), "n + 18", "n"},
        {bin(MINUS, n(), times(x(), 2)), "n", "n + -18"},
        {times(plus(x(), 1), -3), "-3", "-30"},
        {un(SCONV, plus(x(), 1), tp->long_t), "10L", "1L"},
        {bin(MULT, x(), x()), "81", "0"},
        {bin(PLUS, y(), x()), nullptr, nullptr}, // may wrap
        {bin(SRL, bin(PLUS, n(), x()), c(1)), "n + 9 >> 1", "n >> 1"},
        {fcon("1.5"), "1.5", "1.5"},
    };
    for (const ROW& row : rows) {
        NODE* most = partially_eval_for_maximum(row.tree, loop, true);
        NODE* least = partially_eval_for_minimum(row.tree, loop, true);
        const std::string text = show(row.tree);
        EXPECT_EQ(most ? show(most) : "none", row.most ? row.most : "none") << text;
        EXPECT_EQ(least ? show(least) : "none", row.least ? row.least : "none") << text;
        for (NODE* t : {most, least, row.tree})
            if (t) erase_tree(t);
    }
    EXPECT_EQ(show(kept(partially_eval_for_maximum(kept(bin(PLUS, y(), x())), loop, false))), "32767");
    EXPECT_EQ(show(kept(partially_eval_for_maximum(kept(plus(x(), 1)), nullptr, true))), "x + 1");
}

TEST_F(Symbolic, TreesInARange) {
    struct ROW {
        NODE* tree;
        long low, high, step;
        const char* result;
    };
    ROW rows[] = {
        {bin(MINUS, x(), c(3)), 5, 5, 1, "5"},
        {bin(MINUS, x(), c(3)), 5, 9, 10, "5"},
        {bin(MINUS, x(), c(3)), 5, 9, 4, "x + -3"},
        {bin(PLUS, f(), c(0)), 5, 5, 1, "f(), 5"},
        {choose(y(), c(4), c(9)), 0, 5, 1, "4"},
        {choose(y(), x(), c(-1)), 0, 32767, 1, "x"},
        {choose(y(), x(), c(3)), 0, 32766, 2, "x"},
        {plus(choose(y(), x(), c(-8)), 3), 0, 100, 1, "x + 3"},
        {un(SCONV, choose(y(), x(), c(-8)), tp->long_t), 0, 100000, 1, "(long)x"},
        {choose(y(), x(), c(3)), 0, 32767, 1, "y ? x : 3"},
    };
    for (ROW& row : rows) {
        const std::string before = show(row.tree);
        row.tree = simp_tree_in_range(row.tree, INT65(row.low), INT65(row.high), INT65(row.step));
        EXPECT_EQ(show(row.tree), row.result) << before;
        erase_tree(row.tree);
    }
}

} // namespace
