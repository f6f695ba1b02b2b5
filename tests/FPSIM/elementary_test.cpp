#include "operands.h"

#include <cmath>
#include <gtest/gtest.h>

// The host's long double functions err by less than a unit of their last place, 2^-11 of the double's: where their
// result is not next to a midpoint of two doubles, they tell the correctly rounded double.
static bool tells(long double w, double* d) {
    *d = static_cast<double>(w);
    if (!std::isfinite(*d) || *d == 0 || fabs(*d) < 0x1p-1021) return false;
    long double rest = fabsl(w - *d), unit = ldexpl(1, ilogb(*d) - 52);
    return fabsl(rest - unit / 2) > unit / 256;
}

struct UNARY_ROW {
    const char* name;
    int (*f)(const simul_fval*, simul_fval*);
    long double (*host)(long double);
    int low, high; // exponents of the argument
    bool both;
};

TEST(FpsimElementary, CorrectlyRoundedAgainstHost) {
    static const UNARY_ROW rows[] = {
        {"exp", f_exp, expl, -40, 10, true},   {"log", f_log, logl, -1022, 1024, false},
        {"log", f_log, logl, -1, 1, false},    {"log10", f_log10, log10l, -60, 60, false},
        {"sin", f_sin, sinl, -30, 60, true},   {"cos", f_cos, cosl, -30, 60, true},
        {"tan", f_tan, tanl, -30, 60, true},   {"asin", f_asin, asinl, -30, 0, true},
        {"acos", f_acos, acosl, -30, 0, true}, {"atan", f_atan, atanl, -30, 60, true},
        {"sinh", f_sinh, sinhl, -30, 9, true}, {"cosh", f_cosh, coshl, -30, 9, true},
        {"tanh", f_tanh, tanhl, -30, 6, true},
    };
    Random random;
    for (auto& row : rows)
        for (int i = operand_count() / 100; i > 0; --i) {
            double m = 1 + ldexp(static_cast<double>(random.next() >> 12), -52);
            double x = ldexp(row.both && i & 1 ? -m : m,
                             row.low + static_cast<int>(random.next() % (row.high - row.low))),
                   want;
            if (!tells(row.host(x), &want)) continue;
            simul_fval v = sim(x), r;
            row.f(&v, &r);
            ASSERT_EQ(get_ieee_dbl_fmt(&r), bits_of(want)) << row.name << " of " << x;
        }
}

TEST(FpsimElementary, PowersAndAnglesAgainstHost) {
    Random random;
    for (int i = operand_count() / 100; i > 0; --i) {
        double x =
            ldexp(1 + ldexp(static_cast<double>(random.next() >> 12), -52), static_cast<int>(random.next() % 20) - 10);
        double y = ldexp(1 + ldexp(static_cast<double>(random.next() >> 12), -52),
                         static_cast<int>(random.next() % 14) - 8),
               want;
        if (i & 1) y = -y;
        simul_fval vx = sim(x), vy = sim(y), r;
        if (tells(powl(x, y), &want)) {
            f_pow(&vx, &vy, &r);
            ASSERT_EQ(get_ieee_dbl_fmt(&r), bits_of(want)) << x << " ^ " << y;
        }
        if (tells(atan2l(y, -x), &want)) {
            f_neg(&vx, &vx);
            f_atan2(&vy, &vx, &r);
            ASSERT_EQ(get_ieee_dbl_fmt(&r), bits_of(want)) << y << " " << -x;
        }
    }
}

// Exact results come out exact, without the last bit that stands for a remainder.
TEST(FpsimElementary, ExactValues) {
    simul_fval r;
    for (int n = 1; n < 40; ++n) {
        simul_fval base = sim(3), e = sim(n), want = one;
        for (int i = 0; i < n; ++i) f_mul(&want, &base, &want);
        f_pow(&base, &e, &r);
        EXPECT_TRUE(f_bit_eq(&r, &want)) << n;
        f_neg(&base, &base);
        want.sign = n & 1;
        f_pow(&base, &e, &r);
        EXPECT_TRUE(f_bit_eq(&r, &want)) << n;
    }
    // A tie of two doubles: (2^27 + 1)^2 has 55 bits.
    simul_fval odd = sim(0x1p27 + 1), e = sim(2);
    f_pow(&odd, &e, &r);
    EXPECT_EQ(get_ieee_dbl_fmt(&r), bits_of((0x1p27 + 1) * (0x1p27 + 1)));
    struct {
        int (*f)(const simul_fval*, simul_fval*);
        double x, want;
    } const rows[] = {
        {f_log10, 1000, 3}, {f_log10, 1e22, 22}, {f_exp, 0, 1},     {f_log, 1, 0},
        {f_cos, 0, 1},      {f_acos, 1, 0},      {f_cosh, -0.0, 1},
    };
    for (auto& row : rows) {
        simul_fval x = sim(row.x), want = sim(row.want);
        row.f(&x, &r);
        EXPECT_TRUE(f_bit_eq(&r, &want)) << row.x;
    }
}

// Next to multiples of pi/2, and far out.
TEST(FpsimElementary, HardAngles) {
    struct {
        int (*f)(const simul_fval*, simul_fval*);
        double x;
        uint64_t want;
    } const rows[] = {
        {f_sin, 0x1.6ac5b262ca1ffp+849, 0x3ff0000000000000},
        {f_cos, 0x1.6ac5b262ca1ffp+849, 0xbc214ae72e6ba22f},
        {f_sin, 1e22, 0xbfeb453ab76bf397},
        {f_sin, 0x1.921fb54442d18p+1, 0x3ca1a62633145c07},
        {f_sin, 0x1.fffffffffffffp+1023, 0x3f7452fc98b34e97},
    };
    for (auto& row : rows) {
        simul_fval x = sim(row.x), r;
        EXPECT_EQ(row.f(&x, &r), 0);
        EXPECT_EQ(get_ieee_dbl_fmt(&r), row.want) << std::hex << get_ieee_dbl_fmt(&r) << " for " << row.x;
    }
}

TEST(FpsimElementary, SpecialValues) {
    const double inf = HUGE_VAL, nan = NAN;
    struct {
        int (*f)(const simul_fval*, simul_fval*);
        double x, want;
        int error;
    } const unary[] = {
        {f_exp, -inf, 0, 0},
        {f_exp, inf, inf, 0},
        {f_exp, 1e6, inf, FPE_OVER},
        {f_exp, -1e6, 0, FPE_UNDER},
        {f_exp, 1e300, inf, FPE_OVER},
        {f_log, 0, -inf, FPE_DIVIDE},
        {f_log, -1, nan, FPE_INVALID},
        {f_log, inf, inf, 0},
        {f_sin, -0.0, -0.0, 0},
        {f_sin, inf, nan, FPE_INVALID},
        {f_tan, -0.0, -0.0, 0},
        {f_asin, 2, nan, FPE_INVALID},
        {f_asin, -1, -M_PI_2, 0},
        {f_acos, -1, M_PI, 0},
        {f_acos, 0, M_PI_2, 0},
        {f_acos, -2, nan, FPE_INVALID},
        {f_atan, -inf, -M_PI_2, 0},
        {f_sinh, -1e6, -inf, FPE_OVER},
        {f_cosh, -1e6, inf, FPE_OVER},
        {f_tanh, -1e9, -1, 0},
        {f_tanh, -0.0, -0.0, 0},
        {f_tanh, 300, 1, 0},
        {f_sin, 0x1p-1074, 0x1p-1074, 0},
        {f_exp, nan, nan, 0},
        {f_sinh, 0x1p-1022, 0x1p-1022, 0},
    };
    auto check = [](const simul_fval& r, double want) {
        return std::isnan(want) ? f_is_nan(&r) : get_ieee_dbl_fmt(&r) == bits_of(want);
    };
    for (auto& row : unary) {
        simul_fval x = sim(row.x), r;
        fp_error = 0;
        row.f(&x, &r);
        EXPECT_TRUE(check(r, row.want)) << &row - unary;
        EXPECT_EQ(fp_error, row.error) << &row - unary;
        row.f(&x, &x); // onto the operand
        EXPECT_TRUE(f_bit_eq(&x, &r));
    }
    const double values[] = {0.0, -0.0, 1, -1, 0.5, -0.5, 2, -3, 3, inf, -inf, nan, 0x1.8p60, -2.5};
    for (double x : values)
        for (double y : values) {
            simul_fval vx = sim(x), vy = sim(y), r;
            f_pow(&vx, &vy, &r);
            EXPECT_TRUE(check(r, pow(x, y))) << x << " ^ " << y;
            f_atan2(&vx, &vy, &r);
            double want = atan2(x, y), got;
            f_ftoh(&r, &got);
            EXPECT_TRUE(std::isnan(want) ? f_is_nan(&r)
                                         : fabs(got - want) <= 1e-15 && std::signbit(got) == std::signbit(want))
                << x << " " << y;
        }
}
