#include "XINT/xint.h"

#include "operands.h"

#include <gtest/gtest.h>

static void put(WIDE v, uint8_t* r) {
    for (int i = 15; i >= 0; --i, v >>= 8) r[i] = static_cast<uint8_t>(v);
}

static WIDE get(const uint8_t* a) {
    UWIDE v = 0;
    for (int i = 0; i < 16; ++i) v = v << 8 | a[i];
    return static_cast<WIDE>(v);
}

static const WIDE least = static_cast<WIDE>(UWIDE{1} << 127), greatest = ~least;

TEST(Xint, ArithmeticAgainst128Bits) {
    Random random;
    for (int i = operand_count(); i > 0; --i) {
        WIDE a = random.number(128), b = random.number(i & 1 ? 128 : 64);
        UWIDE ua = static_cast<UWIDE>(a), ub = static_cast<UWIDE>(b);
        XINT x, y, r;
        put(a, x);
        put(b, y);
        ASSERT_EQ(XI_add(x, y, r), ua + ub < ua);
        ASSERT_TRUE(get(r) == static_cast<WIDE>(ua + ub));
        XI_sub(x, y, r);
        ASSERT_TRUE(get(r) == static_cast<WIDE>(ua - ub));
        XI_neg(x, r);
        ASSERT_TRUE(get(r) == static_cast<WIDE>(-ua));
        WIDE product;
        bool lost = __builtin_mul_overflow(a, b, &product);
        ASSERT_EQ(XI_mpy(x, y, r), lost);
        ASSERT_TRUE(get(r) == (!lost ? product : (a < 0) != (b < 0) ? least : greatest));
        if (b != 0 && !(a == least && b == -1)) {
            ASSERT_EQ(XI_mod(x, y, r), 0);
            ASSERT_TRUE(get(r) == a % b);
            ASSERT_EQ(XI_div(x, y, x), 0); // onto an operand
            ASSERT_TRUE(get(x) == a / b);
            put(a, x);
        }
        XI_and(x, y, r);
        ASSERT_TRUE(get(r) == (a & b));
        XI_or(x, y, r);
        ASSERT_TRUE(get(r) == (a | b));
        XI_xor(x, y, r);
        ASSERT_TRUE(get(r) == (a ^ b));
        XI_notb(x, r);
        ASSERT_TRUE(get(r) == ~a);
        ASSERT_EQ(XI_cmp(x, y), a < b ? -1 : a > b);
        ASSERT_EQ(XI_le(x, y), a <= b);
    }
}

TEST(Xint, ShiftsAgainst128Bits) {
    Random random;
    for (int i = operand_count(); i > 0; --i) {
        WIDE a = random.number(128);
        int n = static_cast<int>(random.next() % 140);
        XINT x, r;
        put(a, x);
        XI_shr(x, n, r);
        ASSERT_TRUE(get(r) == a >> (n > 127 ? 127 : n));
        XI_shl(x, -n, r);
        ASSERT_TRUE(get(r) == a >> (n > 127 ? 127 : n));
        // Exact when shifting back gives the value again.
        WIDE left = n > 127 ? 0 : static_cast<WIDE>(static_cast<UWIDE>(a) << n);
        bool exact = a == 0 || (n <= 127 && left >> n == a);
        xi_error = 0;
        ASSERT_EQ(XI_shl(x, n, r), !exact);
        ASSERT_EQ(xi_error, !exact);
        ASSERT_TRUE(get(r) == (exact ? left : 0));
        int size = 1;
        while (size < 128 && (a >> (size - 1)) != 0 && (a >> (size - 1)) != -1) ++size;
        ASSERT_EQ(XI_size(x), size);
    }
}

TEST(Xint, Edges) {
    XINT r;
    EXPECT_EQ(XI_div(xi_ten, xi_zero, r), 1);
    EXPECT_TRUE(XI_eq(r, xi_maxint));
    EXPECT_EQ(XI_div(xi_negone, xi_zero, r), 1);
    EXPECT_TRUE(XI_eq(r, xi_minint));
    EXPECT_EQ(XI_div(xi_minint, xi_negone, r), 1);
    EXPECT_TRUE(XI_eq(r, xi_maxint));
    XI_mod(xi_minint, xi_negone, r);
    EXPECT_TRUE(XI_eq(r, xi_zero));
    EXPECT_EQ(XI_size(xi_zero), 1);
    EXPECT_EQ(XI_size(xi_negone), 1);
    EXPECT_EQ(XI_size(xi_minint), 128);
    EXPECT_TRUE(get(xi_not1f) == ~WIDE{31});
    EXPECT_TRUE(get(xi_32bitmask) == 0xFFFFFFFFu);
    EXPECT_TRUE(XI_shr(xi_negone, INT32_MIN, r) == 1);
    XI_itox(-7, r);
    EXPECT_EQ(XI_xtolli(r), -7);
    EXPECT_EQ(XI_xtou(r), 0xFFFFFFF9u);
    XI_llutox(~uint64_t{0}, r);
    EXPECT_EQ(XI_xtollu(r), ~uint64_t{0});
    EXPECT_EQ(XI_size(r), 65);
}
