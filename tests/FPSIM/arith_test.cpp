// Against the host's IEEE arithmetic: what reaches the target's formats must be the correctly rounded result, bit for
// bit.
#include "operands.h"

#include <cmath>
#include <gtest/gtest.h>

#include "TYPES/type.h"
#include "XINT/xint.h"

static ::testing::AssertionResult same(const simul_fval& x, double host) {
    uint64_t got = get_ieee_dbl_fmt(&x), want = bits_of(host);
    if (std::isnan(host) ? f_is_nan(&x) : got == want) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << std::hex << got << ", host " << want;
}

static ::testing::AssertionResult same(const simul_fval& x, float host) {
    uint32_t got = get_ieee_flt_fmt(&x), want = bits_of(host);
    if (std::isnan(host) ? f_is_nan(&x) : got == want) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << std::hex << got << ", host " << want;
}

static bool well_formed(const simul_fval& x) {
    if (x.exp == 32767) return true;
    if (x.exp == -32767) return x.mant[0] == 0;
    return x.mant[0] != 0 && x.exp % 16 == 0 && x.exp > -32767 && x.exp < 32767;
}

TEST(Fpsim, DoublesAgainstHost) {
    Random random;
    for (int i = operand_count(); i > 0; --i) {
        double a = random.number(), b = random.number();
        simul_fval x = sim(a), y = sim(b), r;
        ASSERT_TRUE(same(x, a));
        f_add(&x, &y, &r);
        ASSERT_TRUE(well_formed(r) && same(r, a + b)) << a << " + " << b;
        f_sub(&x, &y, &r);
        ASSERT_TRUE(well_formed(r) && same(r, a - b)) << a << " - " << b;
        f_mul(&x, &y, &r);
        ASSERT_TRUE(well_formed(r) && same(r, a * b)) << a << " * " << b;
        f_div(&x, &y, &r);
        ASSERT_TRUE(well_formed(r) && same(r, a / b)) << a << " / " << b;
        if (a >= 0) {
            f_sqrt(&x, &r);
            ASSERT_TRUE(well_formed(r) && same(r, sqrt(a))) << a;
        }
        fp_error = 0;
        bool ordered = !std::isnan(a) && !std::isnan(b);
        ASSERT_TRUE(f_lt(&x, &y) == (a < b) && f_le(&x, &y) == (a <= b) && f_gt(&x, &y) == (a > b));
        ASSERT_TRUE(f_ge(&x, &y) == (a >= b) && f_eq(&x, &y) == (a == b) && f_ne(&x, &y) == (a != b));
        ASSERT_EQ(fp_error, ordered ? 0 : int(FPE_INVALID));
    }
}

TEST(Fpsim, SinglesAgainstHost) {
    Random random;
    for (int i = operand_count(); i > 0; --i) {
        float a = random.single(), b = random.single();
        simul_fval x = simf(a), y = simf(b), r;
        ASSERT_TRUE(same(x, a));
        f_add(&x, &y, &r);
        ASSERT_TRUE(same(r, a + b)) << a << " + " << b;
        f_mul(&x, &y, &r);
        ASSERT_TRUE(same(r, a * b)) << a << " * " << b;
        f_div(&x, &y, &r);
        ASSERT_TRUE(same(r, a / b)) << a << " / " << b;
        if (a >= 0) {
            f_sqrt(&x, &r);
            ASSERT_TRUE(same(r, sqrtf(a))) << a;
        }
    }
}

// Exact results a hair beside the midpoint of two doubles, the hair below the digits that the simulator holds: rounding
// them to nearest twice gives the midpoint, and then the wrong double every other time.
TEST(Fpsim, MidpointsAreNotMadeByRoundingTwice) {
    Random random;
    const uint64_t mask = (uint64_t{1} << 53) - 1, half = uint64_t{1} << 52;
    int products = 0;
    for (int i = operand_count() / 5; i > 0; --i) {
        // a * b has the low bits 2^52 + 1 or 2^52 - 1: a is that times the inverse of b modulo 2^53.
        uint64_t b = (random.next() & mask) | half | 1, inverse = b;
        for (int k = 0; k < 5; ++k) inverse *= 2 - b * inverse;
        uint64_t a = inverse * (half + (i & 1 ? 1 : -1)) & mask;
        int scale = static_cast<int>(random.next() % 64);
        simul_fval x, y, r;
        if (a & half) {
            ++products;
            double da = ldexp(static_cast<double>(a), -scale), db = static_cast<double>(b);
            x = sim(da);
            y = sim(db);
            f_mul(&x, &y, &r);
            ASSERT_TRUE(same(r, da * db)) << da << " * " << db;
        }
        double large = ldexp(static_cast<double>(b), -scale);
        double small = ldexp(i & 1 ? 1 + 0x1p-52 : 1 - 0x1p-53, -scale - (i & 2 ? 1 : 2));
        x = sim(large);
        y = sim(small);
        f_add(&x, &y, &r);
        ASSERT_TRUE(same(r, large + small)) << large << " + " << small;
        f_sub(&x, &y, &r);
        ASSERT_TRUE(same(r, large - small)) << large << " - " << small;
    }
    EXPECT_GT(products, 1000);
}

TEST(Fpsim, ConversionsAgainstHost) {
    Random random;
    for (int i = operand_count(); i > 0; --i) {
        double a = random.number();
        simul_fval x = sim(a), r, whole;
        ASSERT_TRUE(same(x, static_cast<float>(a))) << a;
        f_trunc(&x, &r);
        ASSERT_TRUE(same(r, trunc(a))) << a;
        f_round(&x, &r);
        ASSERT_TRUE(same(r, round(a))) << a;
        f_floor(&x, &r);
        ASSERT_TRUE(same(r, floor(a))) << a;
        f_ceil(&x, &r);
        ASSERT_TRUE(same(r, ceil(a))) << a;
        double host_whole, host_fraction = modf(a, &host_whole);
        f_modf(&x, &whole, &r);
        ASSERT_TRUE(same(whole, host_whole) && same(r, host_fraction)) << a;
        double back;
        f_ftoh(&x, &back);
        ASSERT_TRUE(std::isnan(a) ? std::isnan(back) : bits_of(back) == bits_of(a));
        long l = -1;
        unsigned long u;
        bool fits = a >= -0x1p63 && a < 0x1p63;
        ASSERT_EQ(f_ftoi(&x, &l), fits ? 0 : -1) << a;
        ASSERT_EQ(l, fits ? static_cast<long>(a) : 0);
        if (a >= 0 && a < 0x1p64) {
            ASSERT_EQ(f_ftou(&x, &u), 0);
            ASSERT_EQ(u, static_cast<unsigned long>(a));
        }
        long v = static_cast<long>(random.next() >> random.next() % 64);
        if (i & 1) v = -v;
        f_itof(v, &r);
        ASSERT_TRUE(same(r, static_cast<double>(v)) && same(r, static_cast<float>(v))) << v;
        f_utof(static_cast<unsigned long>(v), &r);
        ASSERT_TRUE(same(r, static_cast<double>(static_cast<unsigned long>(v))));
        if (std::isfinite(a)) {
            int n = static_cast<int>(random.next() % 300) - 150, e, host_e;
            f_ldexp(&x, n, &r);
            ASSERT_TRUE(same(r, ldexp(a, n)));
            f_frexp(&x, &e, &r);
            ASSERT_TRUE(same(r, frexp(a, &host_e)) && e == host_e);
            if (a != 0) {
                ASSERT_EQ(f_findexp(&x), ilogb(a));
            }
        }
    }
}

TEST(Fpsim, RemainderAgainstHost) {
    Random random;
    for (int i = operand_count() / 4; i > 0; --i) {
        double a = random.number(), b = random.number();
        simul_fval x = sim(a), y = sim(b), r;
        f_fmod(&x, &y, &r);
        ASSERT_TRUE(same(r, fmod(a, b))) << a << " % " << b;
    }
}

// The digits hold more than twice what is cut off here: 128-bit integers whose low bits decide the rounding.
TEST(Fpsim, XintsBothWays) {
    Random random;
    for (int i = operand_count(); i > 0; --i) {
        __int128 v = static_cast<__int128>(static_cast<unsigned __int128>(random.next()) << 64 | random.next()) >>
                     random.next() % 128;
        XINT bytes, back;
        for (int k = 15; k >= 0; --k) bytes[k] = static_cast<uint8_t>(v >> (8 * (15 - k)));
        simul_fval x;
        f_xtof(bytes, &x);
        ASSERT_TRUE(same(x, static_cast<double>(v)) && same(x, static_cast<float>(v)));
        if (XI_size(bytes) <= 82) {
            f_ftox(&x, back);
            ASSERT_TRUE(XI_eq(bytes, back));
        }
    }
    simul_fval x;
    XINT back;
    f_xtof(xi_minint, &x);
    f_ftox(&x, back);
    EXPECT_TRUE(XI_eq(back, xi_minint));
    f_neg(&x, &x);
    f_ftox(&x, back);
    EXPECT_TRUE(XI_eq(back, xi_maxint));
}

TEST(Fpsim, Specials) {
    simul_fval r;
    struct {
        int (*op)(const simul_fval*, const simul_fval*, simul_fval*);
        const simul_fval *a, *b, *result;
        int error;
    } const rows[] = {
        {f_add, &pos_zero, &neg_zero, &pos_zero, 0},
        {f_add, &neg_zero, &neg_zero, &neg_zero, 0},
        {f_sub, &one, &one, &pos_zero, 0},
        {f_add, &pos_infin, &neg_infin, &a_nan, FPE_INVALID},
        {f_add, &pos_infin, &pos_infin, &pos_infin, 0},
        {f_mul, &pos_zero, &neg_infin, &a_nan, FPE_INVALID},
        {f_mul, &neg_one, &pos_zero, &neg_zero, 0},
        {f_div, &pos_zero, &pos_zero, &a_nan, FPE_INVALID},
        {f_div, &neg_infin, &pos_infin, &a_nan, FPE_INVALID},
        {f_div, &neg_one, &pos_zero, &neg_infin, FPE_DIVIDE},
        {f_div, &one, &neg_infin, &neg_zero, 0},
        {f_mul, &pos_huge, &pos_huge, &pos_infin, FPE_OVER},
        {f_mul, &a_nan, &one, &a_nan, 0},
        {f_fmod, &one, &pos_zero, &a_nan, FPE_INVALID},
    };
    for (auto& row : rows) {
        fp_error = 0;
        int code = row.op(row.a, row.b, &r);
        EXPECT_TRUE(f_bit_eq(&r, row.result)) << &row - rows;
        EXPECT_EQ(fp_error, row.error) << &row - rows;
        EXPECT_EQ(code, row.error ? -1 : 0);
    }
    fp_error = 0;
    simul_fval tiny;
    f_div(&one, &pos_huge, &tiny);
    EXPECT_EQ(f_mul(&tiny, &tiny, &r), -1);
    EXPECT_EQ(fp_error, FPE_UNDER);
    fp_error = 0;
    EXPECT_EQ(f_eq(&a_nan, &a_nan), 0);
    EXPECT_EQ(fp_error, FPE_INVALID);
    EXPECT_TRUE(f_bit_eq(&a_nan, &a_nan));
    EXPECT_FALSE(f_bit_eq(&pos_zero, &neg_zero));
    fp_error = 0;
    EXPECT_EQ(f_sqrt(&neg_one, &r), -1);
    EXPECT_TRUE(f_bit_eq(&r, &pos_zero));
    EXPECT_EQ(f_max(&a_nan, &one, 1), &one);
    EXPECT_EQ(f_max(&a_nan, &one, 0), &a_nan);
    EXPECT_EQ(f_min(&one, &neg_two, 0), &neg_two);
}

TEST(Fpsim, Representation) {
    simul_fval third;
    f_itof(3, &third);
    f_div(&one, &third, &third);
    for (uint16_t digit : third.mant) EXPECT_EQ(digit, 0x5555);
    EXPECT_EQ(third.exp, 0);
    simul_fval x = one;
    f_left_justify(&x);
    EXPECT_EQ(x.mant[0], 0x8000);
    EXPECT_EQ(x.exp, 1);
    f_align_radix_pt(&x);
    EXPECT_TRUE(f_bit_eq(&x, &one));
    x.exp = 32767 + 5;
    EXPECT_EQ(f_align_radix_pt(&x), -1);
    EXPECT_TRUE(f_bit_eq(&x, &pos_infin));
    // The seventh word rounds, through all digits.
    precise_sim_fval precise = {{0xFFFF, 0xFFFF, 0xFFFF, 0xFFFF, 0xFFFF, 0xFFFF, 0x8000}, 0, 16, 0};
    EXPECT_EQ(f_rnd_prectbl(&precise, &x, 1), 0);
    EXPECT_EQ(x.mant[0], 1);
    EXPECT_EQ(x.exp, 32);
    simul_fval corrupt = {{0, 0, 0, 0, 0, 1}, 16, 0};
    EXPECT_EXIT(f_left_justify(&corrupt), testing::ExitedWithCode(1), "Illegal float representation!");
}
