// The library: formatted output, text and memory, the end of the program; what cannot be executed.
#include "exec_unit.h"

namespace {
TEST_F(ExecTest, PrintfTakesEachArgumentInItsWidth) {
    IC_SYMBOL* print = global("_printf", function_type({pkg.mk_ptr(pkg.schar_t)}, pkg.int_t, true), 5);
    begin_main();
    statement(call(print, list({text("%d %u %ld %lld|"), num(-1, pkg.int_t), num(65535, pkg.uint_t),
                                num(-100000, pkg.long_t), num(INT64_MIN, pkg.llong_t)})));
    statement(call(print,
                   list({text("%5d|%-5d|%05d|%+d|%x|%lX|"), num(42, pkg.int_t), num(42, pkg.int_t), num(-42, pkg.int_t),
                         num(42, pkg.int_t), num(65535, pkg.uint_t), num(0xABCDEF, pkg.ulong_t)})));
    put(call(print, list({text("%s %c%% %.2f %e\n"), text("text"), num('z', pkg.int_t), real("2.125", pkg.ldouble_t),
                          real("0.5", pkg.ldouble_t)})));
    expect_output("-1 65535 -100000 -9223372036854775808|   42|42   |-0042|+42|ffff|ABCDEF|"
                  "text z% 2.12 5.000000e-01\n26\n");
}

TEST_F(ExecTest, ExitCallsWhatAtexitWasGiven) {
    TYPE* plain = function_type({}, pkg.void_t);
    IC_SYMBOL* at_exit = library("_atexit", {pkg.mk_ptr(plain)}, pkg.int_t);
    IC_SYMBOL* leave = library("_exit", {pkg.int_t}, pkg.void_t);
    IC_SYMBOL* last = global("_last", plain);
    begin(last);
    body();
    put(num(5, pkg.int_t));
    end();
    begin_main();
    statement(call(at_exit, node(UAND, pkg.mk_ptr(plain), name(last))));
    statement(call(leave, num(257, pkg.int_t)));
    put(num(6, pkg.int_t));
    ret(0);
    end();
    const EXEC_RESULT r = run();
    EXPECT_FALSE(r.failed);
    EXPECT_EQ(r.status, 1);
    EXPECT_EQ(printed, "5\n");
}

TEST_F(ExecTest, ReachedUnreachablePlaceIsReported) {
    begin_main();
    IC_NODE* mark = node(UMCALL, pkg.void_t);
    mark->text = "_never_executed";
    statement(mark);
    expect_error(EXEC_UNREACHABLE, "never executed");
}

// What hangs on state that no operand shows is refused, not guessed.
TEST_F(ExecTest, BuiltInFunctionOfHiddenStateIsRefused) {
    begin_main();
    IC_NODE* turn = node(MCALL, pkg.long_t, num(1, pkg.long_t));
    turn->text = "__sat";
    statement(turn);
    expect_error(EXEC_UNSUPPORTED, "__sat: its result hangs on the overflow counter");
}

TEST_F(ExecTest, BranchToNoLabelIsReported) {
    begin_main();
    statement(node(BRANCH, pkg.int_t, label(12)));
    end();
    const EXEC_RESULT r = run();
    EXPECT_EQ(r.status, EXEC_BAD_FILE);
    EXPECT_NE(r.error.find("nowhere"), std::string::npos) << r.error;
}

TEST_F(ExecTest, UnitWithoutMainIsReported) {
    const EXEC_RESULT r = run();
    EXPECT_EQ(r.status, EXEC_MISSING);
    EXPECT_NE(r.error.find("main"), std::string::npos) << r.error;
}

TEST_F(ExecTest, AccessesBeyondAnObjectsMemoryAreReported) {
    begin(main_sym);
    IC_SYMBOL* p = local("p", pkg.mk_ptr(pkg.llong_t));
    body();
    statement(set(p, num((1 << 16) - 2, p->type))); // the last half is outside
    statement(node(ASG, pkg.llong_t, node(UMULT, pkg.llong_t, name(p)), num(1, pkg.llong_t)));
    expect_error(EXEC_BAD_ADDRESS, "address");
}
} // namespace
