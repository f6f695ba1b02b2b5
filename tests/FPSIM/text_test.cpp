#include "operands.h"

#include <cmath>
#include <gtest/gtest.h>
#include <sstream>
#include <string>

static ::testing::AssertionResult reads_alike(const char* text) {
    simul_fval x;
    f_atof(text, &x);
    double d = strtod(text, nullptr);
    float f = strtof(text, nullptr);
    if (get_ieee_dbl_fmt(&x) == bits_of(d) && get_ieee_flt_fmt(&x) == bits_of(f)) return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << text;
}

TEST(FpsimText, ReadingAgainstHost) {
    Random random;
    char text[1200];
    for (int i = operand_count() / 2; i > 0; --i) {
        // Random digits, and the decimal text of a double, short, exact enough, or too long.
        snprintf(text, sizeof text, "%s%lu.%lue%d", i & 1 ? "-" : "", random.next() >> random.next() % 64,
                 random.next() >> random.next() % 64, static_cast<int>(random.next() % 700) - 350);
        ASSERT_TRUE(reads_alike(text));
        double d = random.number();
        if (!std::isfinite(d)) continue;
        snprintf(text, sizeof text, "%.*e", static_cast<int>(random.next() % 25), d);
        ASSERT_TRUE(reads_alike(text));
    }
}

// The midpoint between two doubles, exactly, and with one digit more or less far behind.
TEST(FpsimText, ReadingOfMidpoints) {
    Random random;
    char text[1200];
    for (int i = operand_count() / 200; i > 0; --i) {
        double d = fabs(random.number());
        if (!std::isfinite(d) || d > 1e300) continue;
        simul_fval low = sim(d), high = sim(nextafter(d, HUGE_VAL)), middle;
        f_add(&low, &high, &middle);
        f_ldexp(&middle, -1, &middle);
        f_ftoa(text, "%.800e", &middle);
        ASSERT_TRUE(reads_alike(text));
        std::string above = text, below = text;
        size_t e = above.find('e');
        above.insert(e, "00000000001");
        ASSERT_TRUE(reads_alike(above.c_str()));
        size_t last = below.find_last_not_of('0', e - 1);
        if (isdigit(below[last])) --below[last];
        ASSERT_TRUE(reads_alike(below.c_str()));
    }
}

TEST(FpsimText, Literals) {
    std::istringstream words("0.1 1e-45 1e400 1e-400 1e600 1e-600 -0.0 0 .5 5. 4.9406564584124654e-324 2.4703282292062327e-324 "
                             "2.4703282292062328e-324 1.7976931348623157e308 1.7976931348623159e308 0x1.8p3 0x.1p-1070 "
                             "0x1.00000000000008p0 0x1.000000000000080000000000000000000001p0 "
                             "0x123456789abcdef0123456789abcdef0123456789p-10 1e5 9007199254740993 infinity -inf "
                             "0e99999999999999999999 1e-99999999999999999999 "
                             "1.00000017881393421514957253748434595763683319091796875001 1.00000017881393432617187499");
    for (std::string text; words >> text;) EXPECT_TRUE(reads_alike(text.c_str()));
    std::string long_text = "0." + std::string(600, '0') + "1" + std::string(900, '9') + "e620";
    EXPECT_TRUE(reads_alike(long_text.c_str()));
    std::string many = "1" + std::string(2000, '0') + "e-2000";
    EXPECT_TRUE(reads_alike(many.c_str()));
    simul_fval x;
    EXPECT_EQ(f_atof("1e400", &x), 0);
    EXPECT_FALSE(f_is_inf(&x)); // only the target's format has no room for it
    EXPECT_EQ(f_atof("nan", &x), 0);
    EXPECT_TRUE(f_is_nan(&x));
}

TEST(FpsimText, PrintingAgainstHost) {
    Random random;
    static const char* const formats[] = {"%.*e",     "%.*f",    "%.*g",  "%+.*e",  "%#.*e",
                                          "%-30.*g|", "%030.*e", "% .*f", "%30.*f", "%.*G"};
    char want[1600], got[1600];
    for (int i = operand_count() / 5; i > 0; --i) {
        double d = random.number();
        if (std::isnan(d)) continue;
        if (i & 1)
            d = ldexp(static_cast<double>(random.next() >> 44), -static_cast<int>(random.next() % 30)); // many ties
        if (!std::isfinite(d)) continue;
        int precision = static_cast<int>(random.next() % 22);
        const char* f = formats[random.next() % 10];
        simul_fval x = sim(d);
        snprintf(want, sizeof want, f, precision, d);
        std::string mine = f;
        mine.replace(mine.find('*'), 1, std::to_string(precision));
        f_ftoa(got, mine.c_str(), &x);
        ASSERT_STREQ(got, want) << mine;
    }
}

// The "%a" text without a precision is the value itself.
TEST(FpsimText, HexTextIsExact) {
    Random random;
    char text[100], want[100];
    for (int i = operand_count() / 5; i > 0; --i) {
        double d = random.number();
        if (std::isnan(d)) continue;
        simul_fval x = sim(d), y = sim(random.number()), back;
        if (i & 1) f_mul(&x, &y, &x);
        if (f_is_nan(&x)) continue;
        f_ftoa(text, "%a", &x);
        f_atof(text, &back);
        ASSERT_TRUE(f_bit_eq(&x, &back)) << text;
        if (!(i & 1) && (d == 0 || std::isnormal(d))) {
            snprintf(want, sizeof want, "%a", d);
            ASSERT_STREQ(text, want);
        }
    }
}

TEST(FpsimText, CanonicalLiterals) {
    struct {
        const char* in;
        int flag;
        const char* out;
    } const rows[] = {
        {"1", 0, "1.0"},         {"+001.500", 0, "+1.5"},   {"1.5", 1, "+1.5"},
        {"-0.00", 0, "-0.0"},    {"", 0, "+0.0"},           {"x", 0, "+0.0"},
        {".", 0, "+0.0"},        {"12345.6", 0, "12345.6"}, {"123456", 0, "1.23456e5"},
        {"100000", 0, "1.0e5"},  {"0.00123", 0, "0.00123"}, {"0.000123", 0, "1.23e-4"},
        {"10000", 0, "10000.0"}, {"1e-3", 0, "0.001"},      {"0x1p3", 0, "0x1p3"},
        {"12e1f", 0, "120.0"},   {"-inf", 0, "-inf"},
    };
    for (auto& r : rows) {
        char* text = normalize_fcon(r.in, r.flag);
        EXPECT_STREQ(text, r.out);
        simul_fval a, b;
        f_atof(r.in, &a);
        f_atof(text, &b);
        EXPECT_TRUE(f_bit_eq(&a, &b)) << r.in;
        free(text);
    }
}

TEST(FpsimText, DigitStrings) {
    int point, sign;
    simul_fval x = sim(-1234.5);
    EXPECT_STREQ(f_ecvt(&x, 6, &point, &sign), "123450");
    EXPECT_EQ(point, 4);
    EXPECT_EQ(sign, 1);
    EXPECT_STREQ(f_fcvt(&x, 2, &point, &sign), "123450");
    x = sim(9.996);
    EXPECT_STREQ(f_fcvt(&x, 2, &point, &sign), "1000");
    EXPECT_EQ(point, 2);
    x = sim(1.5);
    EXPECT_STREQ(f_acvt(&x, -1, &point, &sign), "18");
    char text[70];
    EXPECT_STREQ(f_utoa(255, text, 16), "ff");
    EXPECT_EQ(f_f2ascii(text, 8, 2, 'f', &x), 8);
    EXPECT_STREQ(text, "    1.50");
}
