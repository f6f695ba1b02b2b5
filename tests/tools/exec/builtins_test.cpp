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
    };
    begin(main_sym);
    body();
    std::string expected;
    for (const auto& r : rows) {
        std::vector<IC_NODE*> operands;
        for (int64_t v : r.operands) operands.push_back(num(v, r.operand));
        IC_NODE* n = node(ICALL, r.result, list(operands));
        n->text = r.name;
        put(n);
        expected += std::to_string(r.expected) + "\n";
    }
    ret(0);
    end();
    expect_output(expected);
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
    };
    begin(main_sym);
    body();
    std::string expected;
    for (const auto& r : rows) {
        std::vector<IC_NODE*> operands;
        for (const char* t : {r.a, r.b, r.c})
            if (t) operands.push_back(real(t, pkg.float_t));
        IC_NODE* n = node(ICALL, r.result, list(operands));
        n->text = r.name;
        put(node(MULT, pkg.float_t, node(SCONV, pkg.float_t, n), real("8", pkg.float_t)));
        expected += std::to_string(r.expected) + "\n";
    }
    ret(0);
    end();
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
        IC_NODE* n = node(MCALL, pkg.void_t, list(operands));
        n->text = r.name;
        statement(n);
        put(name(acc));
        put(name(product));
        expected += std::to_string(r.acc) + "\n" + std::to_string(r.product) + "\n";
    }
    ret(0);
    end();
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
    ret(0);
    end();
    expect_output(expected);
}
} // namespace
