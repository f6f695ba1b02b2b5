// Constant folding and truth values where random trees do not look.

#include "../ir/tree_builder.h"

#include "OPT5/simp/simp.h"

#include <cmath>
#include <cstring>

using namespace test_trees;

namespace {

class Simp : public Trees {
protected:
    void SetUp() override { fp_error = 0; }
};

NODE* double_constant(double v, TYPE* type = nullptr) {
    NODE* n = new_node(FCON, type ? type : tp->double_t);
    uint64_t bits;
    memcpy(&bits, &v, sizeof bits);
    n->u.fval = new simul_fval;
    ieee_cvt_dtos(static_cast<uint32_t>(bits >> 32), static_cast<uint32_t>(bits), n->u.fval);
    return n;
}

TEST_F(Simp, DivisionByZeroAndBadShiftsStay) {
    EXPECT_EQ(show(fold_constants(bin(DIV, icon(7), icon(0)))), "7 / 0");
    EXPECT_EQ(show(fold_constants(bin(MOD, icon(7), icon(0)))), "7 % 0");
    EXPECT_EQ(show(fold_constants(bin(SLL, icon(7), icon(-1)))), "7 << -1");
    EXPECT_EQ(show(fold_constants(bin(DIV, double_constant(1), double_constant(0)))), "1.0 / 0.0");
    EXPECT_EQ(show(fold_constants(un(SCONV, double_constant(1e10), tp->int_t))), "(int)1e+10");
}

TEST_F(Simp, FloatsFoldOnlyWhereTheTargetsResultIsCertain) {
    double tie = std::ldexp(1.0, -53), below = std::ldexp(1.0, -200);
    // 1 + 2^-53 is a tie; with 2^-200 more it is none, though a sum of 96 bits does not show it.
    double above_tie = std::nextafter(1.0, 2.0) - 1.0;
    struct {
        NODE* tree;
        double expected;
    } cases[] = {
        {bin(PLUS, double_constant(1), double_constant(tie)), 1 + tie},
        {bin(PLUS, double_constant(1), double_constant(std::nextafter(tie, 1))), 1 + std::nextafter(tie, 1)},
        {bin(PLUS, double_constant(1 + above_tie), double_constant(tie)), 1 + above_tie + tie},
        {bin(PLUS, double_constant(std::ldexp(1.0, 53)), double_constant(1 + below)),
         std::ldexp(1.0, 53) + (1 + below)},
        {bin(MULT, double_constant(0.1), double_constant(3)), 0.1 * 3},
        {bin(DIV, double_constant(1), double_constant(3)), 1.0 / 3},
        {bin(PLUS, double_constant(-0.0), double_constant(0.0)), 0.0},
        {bin(PLUS, double_constant(-0.0), double_constant(-0.0)), -0.0},
        {bin(MINUS, double_constant(0.0), double_constant(0.0)), 0.0},
        {un(SQRT, double_constant(2)), std::sqrt(2.0)},
        {un(SQR, double_constant(0.1)), 0.1 * 0.1},
        {un(RECIP, double_constant(4)), 0.25},
    };
    for (const auto& c : cases) {
        std::string text = show(c.tree);
        NODE* t = fold_constants(c.tree);
        ASSERT_EQ(t->op, FCON) << text;
        double got;
        f_ftoh(t->u.fval, &got);
        EXPECT_EQ(0, memcmp(&got, &c.expected, sizeof got)) << text << " " << got;
    }
    // The tie is broken by bits that the simulator has not got.
    NODE* hidden = bin(PLUS, double_constant(1 + above_tie), double_constant(tie + std::ldexp(1.0, -100)));
    NODE* folded = fold_constants(hidden);
    if (folded->op == FCON) {
        double got;
        f_ftoh(folded->u.fval, &got);
        EXPECT_EQ(got, 1 + above_tie + (tie + std::ldexp(1.0, -100)));
    }
    EXPECT_EQ(fold_constants(un(RECIP, double_constant(49)))->op, RECIP); // 1/(1/49) isn't 49
}

TEST_F(Simp, NaNCompares) {
    double nan = std::nan("");
    EXPECT_EQ(fold_constants(bin(FLT, double_constant(nan), double_constant(1)))->op, FLT); // invalid at run time
    EXPECT_EQ(show(fold_constants(bin(FLTN, double_constant(nan), double_constant(1)))), "1");
    EXPECT_EQ(show(fold_constants(bin(FNEQN, double_constant(nan), double_constant(nan)))), "1");
    EXPECT_EQ(show(fold_constants(bin(FUNO, double_constant(nan), double_constant(1)))), "1");
    EXPECT_EQ(show(fold_constants(bin(FORD, double_constant(nan), double_constant(1)))), "0");
    EXPECT_EQ(show(fold_constants(bin(FEQ, double_constant(0.0), double_constant(-0.0)))), "1");
}

TEST_F(Simp, AddressesCompareWithoutSign) {
    TYPE* p = tp->mk_ptr(tp->int_t);
    auto at = [p](long v) { return un(PCONV, icon(v, tp->long_t), p); };
    EXPECT_EQ(show(fold_constants(bin(ULT, at(1), at(-1)))), "1");
    EXPECT_EQ(show(fold_constants(bin(LT, at(1), at(-1)))), "1");
    EXPECT_EQ(show(fold_constants(bin(EQ, at(5), at(5)))), "1");
    EXPECT_EQ(show(fold_constants(bin(NEQ, at(0), icon(0)))), "0");
}

TEST_F(Simp, PowersWrapInTheirType) {
    auto power = [](long b, long e, TYPE* t) { return fold_constants(bin(EXPT, icon(b, t), icon(e, t), t)); };
    EXPECT_EQ(show(power(3, 5, tp->int_t)), "243");
    EXPECT_EQ(show(power(2, 16, tp->uint_t)), "0u");
    EXPECT_EQ(show(power(-1, -3, tp->int_t)), "-1");
    EXPECT_EQ(power(2, -1, tp->int_t)->op, EXPT);
    EXPECT_EQ(power(0, -1, tp->int_t)->op, EXPT);
    uint64_t wrapped = 1;
    for (int i = 0; i < 63; ++i) wrapped *= 3;
    EXPECT_EQ(power(3, 63, tp->ullong_t)->u.lval, INT65(0, wrapped));
}

TEST_F(Simp, PeelingKeepsEffectsInOrder) {
    SYMTAB *a = symbol("a", tp->int_t), *v = symbol("v", tp->mk_qual(tp->int_t, QUAL_VOLATILE)),
           *p = symbol("p", tp->mk_ptr(tp->int_t));
    auto f = [] { return call("f", tp->int_t); };
    auto set = [&] { return bin(ASG, name(a), icon(1)); };
    struct {
        NODE* tree;
        const char* left;
    } cases[] = {
        {bin(PLUS, name(a), icon(2)), "<null>"},
        {bin(PLUS, f(), bin(MULT, name(a), set())), "f(), a = 1"},
        {un(SCONV, name(v), tp->long_t), "v"},
        {bin(QUEST, f(), bin(COLON, name(a), icon(2)), tp->int_t), "f()"},
        {bin(QUEST, name(a), bin(COLON, f(), icon(2)), tp->int_t), "a ? f() : 2"},
        {bin(ANDAND, f(), name(a)), "f()"},
        {bin(ANDAND, name(a), f()), "a && f()"},
        {mk_COMMAOP(name(a), mk_COMMAOP(set(), name(a))), "a = 1"},
        {address(deref(bin(PLUS, name(p), f(), p->type))), "f()"},
        {mk_ICALL("g", bin(COMMA, name(a), f(), tp->int_t), tp->int_t), "f()"},
        {mk_ICALL("g", maketree(ARGREF, name(a), nullptr, p->type), tp->int_t), "g(&a)"},
        {deref(bin(PLUS, name(p), f(), p->type)), "f()"},
    };
    for (const auto& c : cases) EXPECT_EQ(show(peel_for_effect(c.tree)), c.left);
}

TEST_F(Simp, ConditionsLoseWhatDoesNotMatter) {
    SYMTAB *x = symbol("x", tp->int_t), *l = symbol("l", tp->long_t), *g = symbol("g", tp->int_t, 0, SC_EXTDEF);
    auto X = [&] { return name(x); };
    struct {
        NODE* tree;
        const char* text;
    } cases[] = {
        {bin(NEQ, bin(ANDB, X(), icon(4)), icon(0)), "x & 4"},
        {un(SCONV, X(), tp->long_t), "x"},
        {un(SCONV, name(l), tp->int_t), "(int)l"},
        {bin(MOD, X(), icon(8)), "x & 7"},
        {bin(ANDB, bin(SRL, X(), icon(5)), icon(1)), "x & 32"},
        {bin(SRL, X(), icon(15)), "x & -32768"},
        {address(name(g)), "1"},
        {icon(-7), "1"},
    };
    for (const auto& c : cases) EXPECT_EQ(show(simp_for_control(c.tree, nullptr)), c.text);
}

TEST_F(Simp, BitFieldsTruncateWhatTheyStore) {
    NODE* bits = member(name(symbol("s", sample_struct())), sample_member(1)); // unsigned, 3 bits
    EXPECT_EQ(truncate_RHS_for_assignment(bits, icon(13))->u.lval, INT65(5));
    EXPECT_EQ(truncate_RHS_for_assignment(name(symbol("x", tp->int_t)), icon(70000, tp->long_t))->u.lval, INT65(4464));
}

TEST_F(Simp, IllegalOpcodesEndTheRun) {
    NODE* t = icon(1);
    t->op = 28;
    EXPECT_EXIT(simp_node(t, nullptr), testing::ExitedWithCode(1), "!!! Bad opcode in simplifier \\(28\\)");
}

} // namespace
