// Built-in functions of the target at their extremes.
#include "exec_unit.h"

namespace {
enum : int { ICALL = 129 };

TEST_F(ExecTest, BuiltInFunctionsOfIntegers) {
    TYPE *i = pkg.int_t, *u = pkg.uint_t, *l = pkg.long_t, *ll = pkg.llong_t;
    struct {
        const char* name;
        TYPE *result, *operand;
        std::vector<int64_t> operands;
        int64_t expected;
    } const rows[] = {
        {"__min", i, i, {-32768, 32767}, -32768},
        {"__max", i, i, {-32768, 32767}, 32767},
        {"__lmin", l, l, {70000, -70000}, -70000},
        {"__llmax", ll, ll, {5000000000, 4999999999}, 5000000000},
        {"MAXU", u, u, {65535, 1}, 65535},
        {"LMINU", pkg.ulong_t, pkg.ulong_t, {4294967295, 1}, 1},
        {"__mpy", l, i, {-32768, -32768}, 1073741824},
        {"__mpyu", pkg.ulong_t, u, {65535, 65535}, 4294836225},
        {"__mpyxu", l, i, {-1, -1}, -65535},
        {"__abs16_sat", i, i, {-32768}, 32767},
        {"__abs16_sat", i, i, {-5}, 5},
        {"__satlow16", l, l, {-32769}, -32768},
        {"__satlow16", l, l, {40000}, 32767},
        {"__satlow16", l, l, {-7}, -7},
        {"__flip16", i, i, {1}, -32768},
        {"__flip32", l, l, {6}, 0x60000000},
        {"__flip64", ll, ll, {3}, INT64_MIN + 0x4000000000000000},
        {"__tbit", i, i, {-32768, 15}, 1},
        {"__tbit", i, i, {-32768, 14}, 0},
        {"__IQmpy", l, l, {-3 * (1 << 20), 1 << 23, 24}, -3 * (1 << 19)},
        {"__IQmpy", l, l, {2147483647, 2147483647, 32}, 1073741823},
        {"__IQsat", l, l, {900, 500, -500}, 500},
        {"__IQsat", l, l, {-900, 500, -500}, -500},
        {"__qmpy32", l, l, {-3 * (1 << 20), 1 << 23, 24}, -3 * (1 << 19)},
        {"__qmpy32", l, l, {-1, 1, 4}, -1},
        {"__qmpy32by16", l, l, {1 << 30, -32768, 31}, -16384},
        {"__qmpy32by16", l, l, {5, 65535, 0}, -5}, // the second factor is an int
        {"__rol", l, l, {-2147483647}, 3},
        {"__ror", l, l, {3}, -2147483647},
        {"__rpt_rol", l, l, {0x12345678, 8}, 0x34567812},
        {"__rpt_ror", l, l, {0x12345678, 36}, -0x7EDCBA99},
        {"__rpt_rol", l, l, {0x12345678, -3}, 0x12345678},
        {"__subcu", l, l, {0x8000, 1}, 1},
        {"__subcu", l, l, {0x4000, 1}, 0x8000},
        {"__subcu", l, l, {-1, -1}, 65535}, // 33 bits between
        {"__rpt_subcu", l, l, {50000, 7, 16}, 6 * 65536 + 7142},
        {"__rpt_subcu", l, l, {50000, 7, 0}, 50000},
        {"__rpt_norm_inc", i, l, {1, 100, 16}, 116},
        {"__rpt_norm_inc", i, l, {1, 100, 40}, 130},
        {"__rpt_norm_dec", i, l, {-65536, 100, 16}, 85},
        {"__rpt_norm_dec", i, l, {0, 100, 16}, 100},
    };
    begin_main();
    std::string expected;
    for (const auto& r : rows) {
        put(built_in(ICALL, r.result, r.name, numbers(r.operands, r.operand)));
        expected += std::to_string(r.expected) + "\n";
    }
    expect_output(expected);
}

// The operators of saturating arithmetic: `s` results and operands are 16 bits, `l` 32.
TEST_F(ExecTest, BasicOperators) {
    const int64_t top = 2147483647, bottom = -top - 1;
    struct {
        const char* name;
        std::vector<int64_t> operands;
        int64_t expected;
    } const rows[] = {
        {"ETSI_ABS_S", {-32768}, 32767},
        {"ETSI_ADD", {30000, 3000}, 32767},
        {"ETSI_SUB", {-30000, 3000}, -32768},
        {"ETSI_DIV_S", {1, 3}, 10922},
        {"ETSI_DIV_S", {7, 7}, 32767},
        {"ETSI_MULT", {-32768, -32768}, 32767},
        {"ETSI_MULT", {-1, 1}, -1},
        {"ETSI_MULT_R", {-1, 1}, 0},
        {"ETSI_NEGATE", {-32768}, 32767},
        {"ETSI_NORM_S", {0}, 0},
        {"ETSI_NORM_S", {-1}, 15},
        {"ETSI_NORM_S", {0x3FFF}, 1},
        {"ETSI_NORM_L", {-1}, 31},
        {"ETSI_NORM_L", {bottom}, 0},
        {"ETSI_ROUND", {0x7FFF8000}, 32767},
        {"ETSI_ROUND", {0x18000}, 2},
        {"ETSI_SHL", {-3, 14}, -32768},
        {"ETSI_SHL", {1, 100}, 32767},
        {"ETSI_SHL", {-3, -1}, -2},
        {"ETSI_SHR", {-3, 100}, -1},
        {"ETSI_SHR_R", {3, 1}, 2},
        {"ETSI_SHR_R", {-3, 16}, 0},
        {"ETSI_SHIFT_R", {3, -1}, 2},
        {"ETSI_EXTRACT_H", {-1}, -1},
        {"ETSI_EXTRACT_L", {0x18000}, -32768},
        {"ETSI_L_ABS", {bottom}, top},
        {"ETSI_L_ADD", {top, 1}, top},
        {"ETSI_L_SUB", {bottom, 1}, bottom},
        {"ETSI_L_DEPOSIT_H", {-1}, -65536},
        {"ETSI_L_DEPOSIT_L", {-1}, -1},
        {"ETSI_L_MULT", {-32768, -32768}, top},
        {"ETSI_L_MAC", {top, 1, 1}, top},
        {"ETSI_L_MSU", {0, -32768, -32768}, -top},
        {"ETSI_MAC_R", {0x7FFF, 1, 1}, 1},
        {"ETSI_MSU_R", {0x8000, 1, 1}, 0},
        {"ETSI_L_NEGATE", {bottom}, top},
        {"ETSI_L_SHL", {1, 31}, top},
        {"ETSI_L_SHR_R", {-1, 1}, 0},
        {"ETSI_L_SHIFT_R", {5, -1}, 3},
    };
    begin_main();
    std::string expected;
    for (const auto& r : rows) {
        put(built_in(ICALL, pkg.long_t, r.name, numbers(r.operands, pkg.long_t)));
        expected += std::to_string(r.expected) + "\n";
    }
    expect_output(expected);
}

// Remainder and quotient of 32 bits; a divisor with its top bit set needs the 33rd bit of the remainder.
TEST_F(ExecTest, LongDivisionBySteps) {
    const int64_t rows[][5] = {// dividend, divisor, steps: quotient, remainder
                               {4000000000, 7, 32, 571428571, 3},
                               {4294967295, 4294967294, 32, 1, 1},
                               {0x80000000, 1, 1, 1, 0}};
    TYPE *ul = pkg.ulong_t, *to_ul = pkg.mk_ptr(ul);
    begin(main_sym);
    IC_SYMBOL* rest = local("rest", ul);
    body();
    std::string expected;
    for (const auto& r : rows) {
        statement(set(rest, num(0, ul)));
        IC_NODE* n =
            node(MCALL, ul, list({num(r[0], ul), num(r[1], ul), node(UAND, to_ul, name(rest)), num(r[2], pkg.int_t)}));
        n->text = "__rpt_subcul";
        put(n);
        put(name(rest));
        expected += std::to_string(r[3]) + "\n" + std::to_string(r[4]) + "\n";
    }
    expect_output(expected);
}

TEST_F(ExecTest, RepeatedStoresFill) {
    TYPE* to_void = pkg.mk_ptr(pkg.void_t);
    begin(main_sym);
    IC_SYMBOL* words = local("words", pkg.long_t);
    body();
    for (int64_t n : {0, 1, 2}) {
        statement(set(words, num(0x50006, pkg.long_t)));
        IC_NODE* fill =
            node(MCALL, pkg.void_t, list({node(UAND, to_void, name(words)), num(-1, pkg.int_t), num(n, pkg.int_t)}));
        fill->text = "__rpt_mov_imm";
        statement(fill);
        put(name(words));
    }
    expect_output("327686\n393215\n-1\n");
}

TEST_F(ExecTest, BuiltInFunctionsOfSingles) {
    struct {
        const char* name;
        TYPE* result;
        const char *a, *b, *c;
        int64_t expected; // times 8
    } const rows[] = {
        {"__fmin", pkg.float_t, "-1.5", "2", nullptr, -12},
        {"__fmax", pkg.float_t, "-1.5", "2", nullptr, 16},
        {"__fsat", pkg.float_t, "9", "2.5", "-1", 20},
        {"__fsat", pkg.float_t, "-9", "2.5", "-1", -8},
        {"__fracf32", pkg.float_t, "-2.75", nullptr, nullptr, -6},
        {"__divf32", pkg.float_t, "1", "-4", nullptr, -2},
        {"__f32toi16r", pkg.int_t, "2.5", nullptr, nullptr, 16},
        {"__f32toi16r", pkg.int_t, "-1e9", nullptr, nullptr, -262144},
        {"__f32toui16r", pkg.uint_t, "-3", nullptr, nullptr, 0},
        {"__sinpuf32", pkg.float_t, "0.25", nullptr, nullptr, 8},
        {"__atan2puf32", pkg.float_t, "1", "0", nullptr, 2},
        {"__atan2puf32", pkg.float_t, "-1", "-1", nullptr, -3},
    };
    begin_main();
    std::string expected;
    for (const auto& r : rows) {
        std::vector<IC_NODE*> operands;
        for (const char* t : {r.a, r.b, r.c})
            if (t) operands.push_back(real(t, pkg.float_t));
        IC_NODE* n = built_in(ICALL, r.result, r.name, operands);
        put(node(MULT, pkg.float_t, node(SCONV, pkg.float_t, n), real("8", pkg.float_t)));
        expected += std::to_string(r.expected) + "\n";
    }
    expect_output(expected);
}

// The shift is of the product that is added; the product that is kept is not shifted.
TEST_F(ExecTest, MultiplyAccumulateShiftsByTheProductMode) {
    TYPE *l = pkg.long_t, *to_long = pkg.mk_ptr(l);
    struct {
        const char* name;
        std::vector<int64_t> factors;
        TYPE* factor;
        int64_t mode, acc, product;
    } const rows[] = {
        {"__parallel_mpy_add", {-300, 200}, pkg.int_t, -1, 1000 + 2 * -999, -60000},
        {"__parallel_mpy_add", {-300, 200}, pkg.int_t, 1, 1000 - 500, -60000},
        {"__parallel_sqr_sub", {-32768}, pkg.int_t, 0, 1000 + 999, 1073741824},
        {"__parallel_mpy_add_s32_hi", {1 << 30, 12}, l, 0, 1, 3},
        {"__parallel_mpy_sub_s32_lo", {65537, 65537}, l, 3, 1000 + 125, 131073},
        // 3 * 5 to the first, 2 * -1 to the second, each shifted; neither is a held product.
        {"__dmac", {2 * 65536 + 3, -1 * 65536 + 5}, l, 1, 1000 + 7, -999 - 1},
    };
    begin(main_sym);
    IC_SYMBOL *acc = local("acc", l), *product = local("product", l);
    body();
    std::string expected;
    for (const auto& r : rows) {
        statement(set(acc, num(1000, l)));
        statement(set(product, num(-999, l)));
        std::vector<IC_NODE*> operands;
        for (int64_t v : r.factors) operands.push_back(num(v, r.factor));
        operands.push_back(node(ARGREF, to_long, name(acc)));
        operands.push_back(node(ARGREF, to_long, name(product)));
        operands.push_back(num(r.mode, pkg.int_t));
        IC_NODE* n = built_in(MCALL, pkg.void_t, r.name, operands);
        statement(n);
        put(name(acc));
        put(name(product));
        expected += std::to_string(r.acc) + "\n" + std::to_string(r.product) + "\n";
    }
    expect_output(expected);
}

TEST_F(ExecTest, NormCountsTheShifts) {
    TYPE* to_int = pkg.mk_ptr(pkg.int_t);
    const int64_t rows[][3] = {
        {1, 30, 1 << 30}, {-1, 31, -2147483648LL}, {0x40000000, 0, 0x40000000}, {-3, 29, -3LL * (1 << 29)}, {0, 0, 0}};
    begin(main_sym);
    IC_SYMBOL* count = local("count", pkg.int_t);
    body();
    std::string expected;
    for (const auto& r : rows) {
        IC_NODE* n = node(MCALL, pkg.long_t, list({num(r[0], pkg.long_t), node(UAND, to_int, name(count))}));
        n->text = "__norm32";
        put(n);
        put(name(count));
        expected += std::to_string(r[2]) + "\n" + std::to_string(r[1]) + "\n";
    }
    expect_output(expected);
}
} // namespace
