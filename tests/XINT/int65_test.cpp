#include "XINT/int65.h"

#include "TYPES/type.h"
#include "operands.h"

#include <gtest/gtest.h>

static INT65 make(WIDE v) { return INT65(static_cast<int32_t>(v >> 64), static_cast<uint64_t>(v)); }
static WIDE value(INT65 v) { return static_cast<WIDE>(static_cast<UWIDE>(static_cast<WIDE>(v.sign)) << 64 | v.value); }
static WIDE wrap96(WIDE v) { return static_cast<WIDE>(static_cast<UWIDE>(v) << 32) >> 32; }
static bool in_range(WIDE v) { return v >> 64 == 0 || v >> 64 == -1; }

class Int65 : public testing::Test {
protected:
    Int65() {
        TYPE_PKG::abi = 1;
        TYPE_PKG::init_type_pkg(&pkg);
        tp = &pkg;
    }
    TYPE_PKG pkg;
    Random random;
};

TEST_F(Int65, ArithmeticAgainst128Bits) {
    for (int i = operand_count(); i > 0; --i) {
        WIDE a = random.number(64), b = random.number(64);
        INT65 x = make(a), y = make(b);
        ASSERT_EQ(value(x), a);
        ASSERT_TRUE(value(x + y) == a + b);
        ASSERT_TRUE(value(x - y) == a - b);
        ASSERT_TRUE(value(-x) == -a);
        ASSERT_TRUE(value(x * y) == wrap96(static_cast<WIDE>(static_cast<UWIDE>(a) * static_cast<UWIDE>(b))));
        if (b != 0) {
            ASSERT_TRUE(value(x / y) == a / b);
            ASSERT_TRUE(value(x % y) == a % b);
        }
        ASSERT_TRUE(value(x & y) == (a & b) && value(x | y) == (a | b) && value(x ^ y) == (a ^ b) && value(~x) == ~a);
        ASSERT_TRUE((x < y) == (a < b) && (x == y) == (a == b) && (x >= y) == (a >= b));
    }
}

TEST_F(Int65, ShiftsAgainst128Bits) {
    for (int i = operand_count(); i > 0; --i) {
        WIDE a = random.number(64);
        int n = static_cast<int>(random.next() % 160);
        WIDE left = n > 64 ? 0 : wrap96(static_cast<WIDE>(static_cast<UWIDE>(a) << n));
        WIDE right = a >> (n > 127 ? 127 : n);
        ASSERT_TRUE(value(make(a) << INT65(n)) == left) << n;
        ASSERT_TRUE(value(make(a) >> INT65(n)) == right) << n;
        ASSERT_TRUE(value(make(a) >> INT65(-n)) == left);
        ASSERT_TRUE(value(make(a) << INT65(-n)) == right);
    }
    EXPECT_EQ(INT65(1) << INT65(64), INT65(1, 0));
    EXPECT_EQ(INT65(-1) >> INT65(uint64_t{1} << 63), INT65(-1));
    EXPECT_EQ(INT65(-1) << INT65(uint64_t{1} << 63), INT65(0));
}

TEST_F(Int65, CheckedArithmetic) {
    for (int i = operand_count(); i > 0; --i) {
        WIDE a = random.number(64), b = random.number(64), product;
        int overflow = 0;
        INT65 sum = long_add(make(a), make(b), &overflow);
        ASSERT_EQ(overflow, !in_range(a + b));
        if (!overflow) {
            ASSERT_TRUE(value(sum) == a + b);
        }
        overflow = 0;
        bool lost = __builtin_mul_overflow(a, b, &product);
        INT65 prod = long_multiply(make(a), make(b), &overflow);
        ASSERT_EQ(overflow, lost || !in_range(product));
        if (!overflow) {
            ASSERT_TRUE(value(prod) == product);
        }
    }
    int overflow = 1;
    long_add(1, 1, &overflow);
    EXPECT_EQ(overflow, 1); // never cleared
}

TEST_F(Int65, TypesAgainst128Bits) {
    struct {
        TYPE* t;
        int bits;
        bool is_signed;
    } const rows[] = {
        {pkg.schar_t, 16, true},    {pkg.uchar_t, 16, false}, {pkg.int_t, 16, true},   {pkg.uint_t, 16, false},
        {pkg.long_t, 32, true},     {pkg.ulong_t, 32, false}, {pkg.llong_t, 64, true}, {pkg.ullong_t, 64, false},
        {pkg.void_ptr_t, 32, true}, {pkg.bool_t, 16, false},
    };
    auto limits = [](auto& r, WIDE& lo, WIDE& hi) {
        lo = r.is_signed ? -(WIDE{1} << (r.bits - 1)) : 0;
        hi = (WIDE{1} << (r.is_signed ? r.bits - 1 : r.bits)) - 1;
    };
    for (auto& r : rows) {
        WIDE lo, hi;
        limits(r, lo, hi);
        EXPECT_TRUE(value(int_type_min(r.t)) == lo && value(int_type_max(r.t)) == hi) << r.t->printstr();
    }
    for (int i = operand_count(); i > 0; --i) {
        auto& r = rows[random.next() % 10];
        WIDE a = random.number(64), b = random.number(64), lo, hi;
        limits(r, lo, hi);
        WIDE wrapped = a & ((WIDE{1} << r.bits) - 1);
        if (wrapped > hi) wrapped -= WIDE{1} << r.bits;
        ASSERT_TRUE(value(truncate_to_type(make(a), r.t)) == wrapped) << r.t->printstr();
        auto holds = [&](WIDE v) { return lo <= v && v <= hi; };
        ASSERT_EQ(sum_may_overflow(make(a), make(b), r.t), !(holds(a) && holds(b) && holds(a + b)));
        WIDE product;
        bool fits = holds(a) && holds(b) && !__builtin_mul_overflow(a, b, &product) && holds(product);
        ASSERT_EQ(prod_may_overflow(make(a), make(b), r.t), !fits);
    }
}

TEST_F(Int65, Truncation) {
    INT65 all_ones(0, ~uint64_t{0});
    EXPECT_NE(all_ones, INT65(-1));
    EXPECT_EQ(truncate_to_type(-1, pkg.ullong_t), all_ones);
    EXPECT_EQ(truncate_to_type(all_ones, pkg.llong_t), INT65(-1));
    TYPE* v = pkg.mk_vector(pkg.long_t, false, 4);
    EXPECT_EQ(truncate_to_type(INT65(0, 0xFFFFFFFF), v), INT65(-1));
    EXPECT_EQ(sign_extend_by_type(0xFFFF, pkg.uint_t), INT65(-1));
    EXPECT_EQ(sign_extend_by_type(0xFFFF, pkg.ushort_t), INT65(0xFFFF));
    EXPECT_EQ(sign_extend_by_type_size(0xFFFF, pkg.ushort_t), INT65(-1));
    EXPECT_EQ(sign_extend_by_type(INT65(0, 0xFFFFFFFF), pkg.void_ptr_t), INT65(-1));
    TYPE* e = pkg.mk_enum("E", pkg.int_t, 16, 16, false);
    pkg.type_frozen(e);
    EXPECT_EQ(truncate_to_type(0xFFFF, e), INT65(0xFFFF));
    EXPECT_EQ(truncate_to_type(INT65(-1), e), INT65(-1));
    EXPECT_TRUE(sum_may_overflow(0x7FFF, 1, e));
}

TEST_F(Int65, DefaultTypes) {
    struct {
        INT65 v;
        int flag;
        TYPE* t;
    } const rows[] = {
        {0x7FFF, 0, pkg.int_t},
        {0x8000, 0, pkg.long_t},
        {0x8000, 1, pkg.uint_t},
        {-0x8000, 0, pkg.int_t},
        {-0x8001, 1, pkg.long_t},
        {INT65(0, 0x80000000), 1, pkg.ulong_t},
        {INT65(0, 0x80000000), 0, pkg.llong_t},
        {INT65(0, ~uint64_t{0}), 0, pkg.ullong_t},
    };
    for (auto& r : rows) EXPECT_EQ(default_ICON_type(r.v, r.flag), r.t) << r.t->printstr();
}

TEST_F(Int65, NumberTheory) {
    EXPECT_EQ(power_of_2(0), -1);
    EXPECT_EQ(power_of_2(1), 0);
    EXPECT_EQ(power_of_2(-4), -1);
    EXPECT_EQ(power_of_2(INT65(0, uint64_t{1} << 63)), 63);
    EXPECT_EQ(extract_power_of_2_factor(INT65(-1, 0)), 64);
    EXPECT_EQ(ulong_expt(3, 40), INT65(0, 12157665459056928801u));
    for (int i = operand_count() / 10; i > 0; --i) {
        WIDE a = random.number(63), b = random.number(63);
        INT65 x, y, g = extended_gcd(make(a), make(b), &x, &y);
        ASSERT_EQ(g, long_gcd(make(a), make(b)));
        ASSERT_TRUE(a * value(x) + b * value(y) == value(g));
        if (a != 0 || b != 0) {
            ASSERT_TRUE(!g.is_zero() && a % value(g) == 0 && b % value(g) == 0);
        }
        if (a > INT32_MIN && a < INT32_MAX && b > INT32_MIN && b < INT32_MAX && a != 0 && b != 0) {
            WIDE m = value(long_lcm(make(a), make(b)));
            ASSERT_TRUE(m > 0 && m % a == 0 && m % b == 0 && m * value(g) == (a * b < 0 ? -a * b : a * b));
        }
        WIDE v = random.number(64);
        if (v < 0) v = -v - 1;
        WIDE s = value(long_sqrt(make(v)));
        ASSERT_TRUE(s * s <= v && (s + 1) * (s + 1) > v);
    }
}

TEST_F(Int65, Text) {
    struct {
        INT65 v;
        const TYPE* t;
        int radix;
        const char* text;
    } const rows[] = {
        {-5, nullptr, 0, "-5"},
        {-5, pkg.long_t, 16, "0xfffffffbL"},
        {7, pkg.uint_t, 0, "7u"},
        {0x8000, pkg.uint_t, 0, "0x8000u"},
        {0x1000000, pkg.ulong_t, 0, "0x1000000uL"},
        {0xFFFFFF, pkg.ulong_t, 0, "16777215uL"},
        {INT65(-1, uint64_t{1} << 63), pkg.llong_t, 0, "-9223372036854775808LL"},
        {INT65(-1, 0), pkg.llong_t, 10, "-18446744073709551616LL"},
        {-1, pkg.ullong_t, 8, "1777777777777777777777uLL"},
        {16, pkg.float_t, 0, "0x10"},
    };
    int slot = 0;
    for (auto& r : rows) EXPECT_STREQ(int2text(r.v, r.t, r.radix, slot++), r.text);
}
