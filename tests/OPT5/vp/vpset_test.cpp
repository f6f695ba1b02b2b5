// Sets of progressions against explicit sets: no operation loses a member, and those that are exact gain none.
#include "OPT5/vp/vpset.h"

#include "../ir/function_fixture.h"

#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/type_ops.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <random>
#include <set>

namespace {

using MEMBERS = std::set<int>;

class VPSET : public FunctionTest {
protected:
    int below(int n) { return std::uniform_int_distribution<int>(0, n - 1)(random); }

    VPSLICE slice() {
        const int low = below(200) - 100;
        if (below(3) == 0) return single_slice(low);
        const int step = 1 + below(9), count = 1 + below(12);
        return make_vpslice(low, low + step * count, step);
    }
    vpset set() {
        VPSLICE_LIST list;
        for (int n = 1 + below(5); n > 0; --n) list.push_back(slice());
        return vpset_of(list);
    }

    static MEMBERS members(const vpset& s) {
        MEMBERS all;
        for (const VPSLICE& slice : s)
            for (WIDE v = slice.low; v <= slice.high; v += slice.step ? slice.step : 1) all.insert(static_cast<int>(v));
        return all;
    }
    static void expect_sound(const vpset& s) {
        ASSERT_LE(s.size(), vpset::MOST_SLICES);
        for (int i = 0; i < s.size(); ++i) {
            ASSERT_FALSE(s[i].is_empty());
            ASSERT_EQ(s[i].step == 0, s[i].low == s[i].high);
            if (s[i].step) { ASSERT_EQ(static_cast<int>((s[i].high - s[i].low) % s[i].step), 0); }
            if (i) { ASSERT_LE(s[i - 1].low, s[i].low); }
        }
    }
    // `s` has all of `wanted`.
    static void expect_holds(const vpset& s, const MEMBERS& wanted, const std::string& what) {
        expect_sound(s);
        for (int v : wanted) ASSERT_TRUE(s.holds(v)) << v << " is lost by " << what << " = " << vpset2string(s);
    }

    std::mt19937 random{20};
    // VP_ROUNDS: as many as that.
    static int rounds() {
        const char* text = std::getenv("VP_ROUNDS");
        return text ? std::atoi(text) : 8000;
    }
};

TEST_F(VPSET, SlicesLoseNothing) {
    for (int n = 0; n < rounds(); ++n) {
        const VPSLICE a = slice(), b = slice();
        VPSLICE rest;
        vpslice_difference(&rest, a, b);
        MEMBERS wanted;
        for (int v : members(vpset(a)))
            if (!b.holds(v)) wanted.insert(v);
        const std::string what = vpset2string(vpset(a)) + " - " + vpset2string(vpset(b));
        for (int v : wanted) ASSERT_TRUE(rest.holds(v)) << v << " is lost by " << what;
        for (int v : members(vpset(rest))) ASSERT_TRUE(a.holds(v)) << v << " is gained by " << what;
        ASSERT_EQ(rest.is_empty(), wanted.empty()) << what;
    }
}

TEST_F(VPSET, UnionAndIntersection) {
    for (int n = 0; n < rounds(); ++n) {
        const vpset a = set(), b = set();
        const std::string what = vpset2string(a) + " and " + vpset2string(b);
        vpset both, common, without, within;
        vpset_union(&both, a, b);
        MEMBERS wanted = members(a), shared;
        for (int v : members(b)) {
            if (wanted.count(v)) shared.insert(v);
            wanted.insert(v);
        }
        expect_holds(both, wanted, "union of " + what);
        if (vpset_intersection(&common, a, b))
            expect_holds(common, shared, "intersection of " + what);
        else
            ASSERT_TRUE(shared.empty()) << what;
        const int v = below(200) - 100, high = v + below(60);
        MEMBERS other = members(a), inside;
        other.erase(v);
        for (int m : members(a))
            if (v <= m && m <= high) inside.insert(m);
        if (vpset_without(&without, a, v)) expect_holds(without, other, "one member less of " + what);
        else ASSERT_TRUE(other.empty()) << what;
        if (vpset_within(&within, a, v, high)) {
            expect_holds(within, inside, "a part of " + what);
            for (int m : members(within)) ASSERT_TRUE(v <= m && m <= high && a.holds(m)) << what;
        } else
            ASSERT_TRUE(inside.empty()) << what;
        const MEMBERS of_a = members(a), of_b = members(b);
        if (vpset_is_subset(a, b)) {
            for (int m : of_a) ASSERT_TRUE(of_b.count(m)) << what;
        }
        if (vpset_equal(a, b)) { ASSERT_EQ(of_a, of_b) << what; }
        const int g = static_cast<int>(vpset_gcd(a)), delta = static_cast<int>(vpset_delta(a));
        for (int m : of_a) {
            if (g) { ASSERT_EQ(m % g, 0) << what; }
            if (delta) { ASSERT_EQ((m - *of_a.begin()) % delta, 0) << what; }
        }
    }
}

TEST_F(VPSET, Arithmetic) {
    for (int n = 0; n < rounds(); ++n) {
        const vpset a = set(), b = set();
        const int d = 1 + below(20), shift = below(5);
        const std::string what = vpset2string(a) + " with " + vpset2string(b) + " or " + std::to_string(d);
        vpset sum, product, minus, quotient, down, rest, magnitude;
        vpset_sum(&sum, a, b);
        ASSERT_TRUE(vpset_product(&product, a, b));
        vpset_negative(&minus, a);
        vpset_quotient(&quotient, a, d);
        vpset_shifted_down(&down, a, shift);
        vpset_remainder(&rest, a, d);
        vpset_absolute(&magnitude, a);
        MEMBERS sums, products, minuses, quotients, downs, rests, magnitudes;
        for (int x : members(a)) {
            for (int y : members(b)) sums.insert(x + y), products.insert(x * y);
            minuses.insert(-x);
            quotients.insert(x / d);
            downs.insert(x >> shift);
            rests.insert(x % d);
            magnitudes.insert(std::abs(x));
        }
        expect_holds(sum, sums, "sum: " + what);
        expect_holds(product, products, "product: " + what);
        expect_holds(minus, minuses, "negative: " + what);
        expect_holds(quotient, quotients, "quotient: " + what);
        expect_holds(down, downs, "shift: " + what);
        expect_holds(rest, rests, "remainder: " + what);
        expect_holds(magnitude, magnitudes, "magnitude: " + what);
    }
}

TEST_F(VPSET, Types) {
    for (int n = 0; n < rounds(); ++n) {
        vpset s;
        VPSLICE_LIST list;
        for (int k = 1 + below(4); k > 0; --k) {
            const int low = below(300000) - 150000, step = 1 + below(5000), count = below(20);
            list.push_back(make_vpslice(low, low + step * count, count ? step : 0));
        }
        s = vpset_of(list);
        if (vpset_size(s) > 200) continue;
        const MEMBERS before = members(s);
        const bool is_signed = n % 2;
        TYPE* type = is_signed ? tp->int_t : tp->uint_t;
        ASSERT_EQ(type->size, 16u);
        auto as_type = [is_signed](int v) { return is_signed ? int16_t(v) : int(uint16_t(v)); };
        const std::string what = vpset2string(s);
        truncate_vpset_to_type(&s, type);
        MEMBERS wanted;
        for (int v : before) wanted.insert(as_type(v));
        expect_holds(s, wanted, "conversion of " + what);
        // Steps that a signed type has room for, and any of another.
        const int incr = below(2000) - 1000;
        vpset reached = s;
        include_incr_in_vpset(incr, &reached, type);
        for (int v : wanted)
            for (int k = 0; k < 5; ++k, v += incr) {
                if (is_signed && v != as_type(v)) break;
                if (incr && v == as_type(v)) { ASSERT_TRUE(reached.holds(v)) << what << " by " << incr; }
            }
        const RANGE limits = vpset_limits(type);
        ASSERT_TRUE(limits.min <= vpset_minimum(reached) && vpset_maximum(reached) <= limits.max);
    }
}

TEST_F(VPSET, FewSlices) {
    // Of four separated values the two nearest become one slice.
    VPSLICE_LIST list;
    for (int v : {1, 100, 104, 900}) list.push_back(single_slice(v));
    EXPECT_EQ(vpset2string(vpset_of(list)), "<1,1,0><100,104,4><900,900,0>");
    EXPECT_EQ(vpset2string(vpset(make_vpslice(5, 4, 3))), "");
    EXPECT_EQ(static_cast<int>(vpslice_size(make_vpslice(5, 17, 3))), 5);
    vpset s;
    make_vpset_bottom(&s, tp->int_t);
    EXPECT_EQ(vpset2string(s), "<-32768,32767,1>");
    EXPECT_TRUE(vpset_is_bottom(s, tp->int_t));
    EXPECT_FALSE(vpset_is_bottom(s, tp->long_t));
}

} // namespace
