// The executor on small units made by hand: arithmetic at the widths' extremes, control, errors.
#include "exec_unit.h"

#include <cmath>

namespace {
TEST_F(ExecTest, IntegersWrapAtTheirWidth) {
    TYPE *i = pkg.int_t, *u = pkg.uint_t, *l = pkg.long_t, *ul = pkg.ulong_t, *ll = pkg.llong_t;
    struct {
        int opcode;
        TYPE* type;
        int64_t a, b, expected;
    } const rows[] = {
        {PLUS, i, 32767, 1, -32768},
        {PLUS, u, 65535, 1, 0},
        {PLUS, l, 2147483647, 1, -2147483648LL},
        {MINUS, u, 0, 1, 65535},
        {MULT, i, 256, 256, 0},
        {MULT, l, 65536, 65535, -65536},
        {MULT, ll, 65536, 65536, 4294967296LL},
        {DIV, i, -7, 2, -3},
        {MOD, i, -7, 2, -1},
        {DIV, i, -32768, -1, -32768},
        {DIV, u, 65535, 2, 32767},
        {MOD, ul, -1, 10, 5},
        {SLL, i, 1, 15, -32768},
        {SLL, i, 1, 16, 0},
        {SRL, i, -32768, 15, -1},
        {SRL, i, -4, 40, -1},
        {SRL, u, 32768, 15, 1},
        {SRL, ul, -1, 31, 1},
    };
    begin(main_sym);
    IC_SYMBOL* x = local("x", ll);
    body();
    std::string expected;
    for (const auto& r : rows) {
        // The operand comes from a variable, so that nothing is computed before the run.
        statement(node(ASG, ll, name(x), num(r.a, ll)));
        IC_NODE* right = num(r.b, r.opcode == SLL || r.opcode == SRL ? i : r.type);
        put(node(r.opcode, r.type, node(SCONV, r.type, name(x)), right));
        expected += std::to_string(r.expected) + "\n";
    }
    ret(300);
    end();
    EXPECT_EQ(run().status, 300 & 255);
    EXPECT_EQ(printed, expected);
}

TEST_F(ExecTest, CountedLoopRunsOnceMoreThanItsCounter) {
    begin(main_sym);
    IC_SYMBOL *n = local("n", pkg.uint_t), *sum = local("sum", pkg.int_t);
    body();
    statement(node(ASG, pkg.uint_t, name(n), num(4, pkg.uint_t)));
    statement(node(ASG, pkg.int_t, name(sum), num(0, pkg.int_t)));
    file->if_write_label(1);
    statement(node(PLUSPLUS, pkg.int_t, name(sum), num(1, pkg.int_t)));
    statement(node(ENDLOOP, pkg.uint_t, name(n), label(1)));
    put(name(sum));
    ret(0);
    end();
    EXPECT_EQ(run().status, 0);
    EXPECT_EQ(printed, "5\n");
}

TEST_F(ExecTest, UnalignedObjectIsReported) {
    begin(main_sym);
    IC_SYMBOL* p = local("p", pkg.mk_ptr(pkg.long_t));
    body();
    statement(node(ASG, p->type, name(p), num(4097, p->type)));
    statement(node(UMULT, pkg.long_t, name(p)));
    expect_error(EXEC_UNALIGNED, "unaligned");
}

TEST_F(ExecTest, MissingFunctionIsReported) {
    IC_SYMBOL* f = global("_nowhere", function_type({}, pkg.int_t), 5);
    begin_main();
    statement(call(f, nullptr));
    expect_error(EXEC_MISSING, "nowhere");
}

TEST_F(ExecTest, RecursionWithoutEndIsAStackOverflow) {
    begin(main_sym);
    local("x", pkg.llong_t);
    body();
    statement(call(main_sym, nullptr));
    expect_error(EXEC_STACK, "stack overflow");
}

TEST_F(ExecTest, FalseAssertionIsReportedOnRequest) {
    begin_main();
    statement(node(NASSERT, pkg.int_t, num(0, pkg.int_t)));
    ret(0);
    expect_error(EXEC_CHECK, "asserted", checked());
}

// Files that no parser writes: an operation on types that it has no form for, an operand of no type.
TEST_F(ExecTest, WhatHasNoFormIsRefused) {
    begin_main();
    statement(node(ENDLOOP, pkg.int_t, name(main_sym), label(1)));
    file->if_write_label(1);
    expect_error(EXEC_UNSUPPORTED, "operands of such types");
}

TEST_F(ExecTest, WhatHasNoTypeIsRefused) {
    TYPE* pair = structure("pair", 32, {{"a", pkg.int_t, 0, 0}});
    IC_SYMBOL* s = global("_s", pair);
    begin_main();
    IC_NODE* const untyped = name(s);
    untyped->type = nullptr;
    statement(node(EQ, pkg.int_t, untyped, name(s)));
    expect_error(EXEC_UNSUPPORTED, "cannot execute EQ");
}

// In the order of the codes: FEQ to FGT, the same where no order makes true as well, FORD, FUNO. Each is true for a set
// of outcomes: 1 equal, 2 less, 4 greater, 8 unordered.
TEST_F(ExecTest, FloatingComparisonsOfNumbersInfinitiesAndNoNumbers) {
    TYPE* t = pkg.float_t;
    const unsigned true_for[] = {1, 6, 3, 2, 5, 4, 9, 14, 11, 10, 13, 12, 7, 8};
    const float inf = HUGE_VALF;
    const float values[] = {1, 2, inf, NAN};
    begin(main_sym);
    IC_SYMBOL *v[] = {local("one", t), local("two", t), local("inf", t), local("nan", t)}, *big = local("big", t);
    body();
    statement(set(v[0], real("1", t)));
    statement(set(v[1], real("2", t)));
    statement(set(big, real("3e38", t)));
    statement(set(v[2], node(MULT, t, name(big), name(big))));
    statement(set(v[3], node(MINUS, t, name(v[2]), name(v[2]))));
    std::string expected;
    for (int i = 0; i < 4; i++)
        for (int j = 0; j < 4; j++) {
            const float a = values[i], b = values[j];
            const unsigned outcome = a == b ? 1 : a < b ? 2 : a > b ? 4 : 8;
            for (int k = 0; k < 14; k++) {
                put(node(FEQ + k, pkg.int_t, name(v[i]), name(v[j])));
                expected += outcome & true_for[k] ? "1\n" : "0\n";
            }
        }
    expect_output(expected);
}
} // namespace
