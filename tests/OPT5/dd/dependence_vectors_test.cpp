// Distances and vectors of dependences against explicit sets.
#include "OPT5/dd/dependence_vectors.h"

#include <gtest/gtest.h>

#include <random>

namespace {

// The distances from -33 to 33, whose ends stand for all that lies beyond, as bits.
using SET = unsigned __int128;
constexpr int END = DVE::LIMIT + 1;
constexpr SET bit(int d) { return SET(1) << (std::clamp(d, -END, END) + END); }
constexpr SET range(int low, int high) { return bit(low) > bit(high) ? 0 : (bit(high) << 1) - bit(low); }
constexpr SET BACK = range(-END, -1), ZERO = bit(0), FORE = range(1, END), EVERY = BACK | ZERO | FORE;

DVE dve_of(SET s) {
    DVE v;
    for (int d = -END; d <= END; ++d)
        if (s & bit(d)) v.set_distance(d < -DVE::LIMIT ? -77 : d > DVE::LIMIT ? 99 : d);
    return v;
}
bool same(const DVE& v, SET s) {
    if (v != dve_of(s)) return false;
    for (int d = -END; d <= END; ++d)
        if (v.has_distance(d) != bool(s & bit(d))) return false;
    return true;
}
SET inverted(SET s) {
    SET r = 0;
    for (int d = -END; d <= END; ++d)
        if (s & bit(d)) r |= bit(-d);
    return r;
}

void expect_answers(const DVE& v, SET s) {
    const bool f = s & FORE, z = s & ZERO, b = s & BACK;
    const bool expected[] = {s != 0, f, b, z, f || z, b || z, f + z + b > 1, z && !f && !b, f && !z && !b, b && !z && !f,
                             (f || z) && !b, (b || z) && !f, (s & FORE) == FORE, (s & BACK) == BACK, s == ZERO};
    const bool told[] = {v.is_dependent(), v.has_FWD_dirs(), v.has_BWD_dirs(), v.has_SAME_dir(), v.has_SAME_FWD_dirs(),
                         v.has_SAME_BWD_dirs(), v.has_compound_dirs(), v.has_only_SAME_dir(), v.has_only_FWD_dirs(),
                         v.has_only_BWD_dirs(), v.has_only_SAME_FWD_dirs(), v.has_only_SAME_BWD_dirs(),
                         v.has_all_FWD_dirs(), v.has_all_BWD_dirs(), v.is_SAME_dir()};
    for (size_t i = 0; i < std::size(expected); ++i) ASSERT_EQ(told[i], expected[i]) << i << " of " << dve2string(v);
    int least = 0, found = 0, only = 0;
    for (int d = END; d >= 1; --d)
        if (s & bit(d)) least = d;
    for (int d = -END; d <= END; ++d)
        if (s & bit(d)) ++found, only = d;
    ASSERT_EQ(v.threshold(), least);
    ASSERT_EQ(v.has_exact_distance(), found == 1 && std::abs(only) < END);
    ASSERT_TRUE(!v.has_exact_distance() || v.is_exact_distance(only));
}

TEST(DependenceVectors, AlgebraIsThatOfSets) {
    std::mt19937_64 random(7);
    SET s = 0;
    DVE v;
    for (int step = 0; step < 10'000'000; ++step) {
        const int d = static_cast<int>(random() % 81) - 40;
        const uint64_t bits = random();
        const SET other = ((SET(bits) << 32) ^ bits ^ (SET(random()) << 3)) & EVERY;
        switch (random() % 14) {
        case 0: v.set_distance(d), s |= bit(d); break;
        case 1: v.clr_distance(d), s &= std::abs(d) < END ? ~bit(d) : ~SET(0); break;
        case 2: v.keep_sole_distance(d), s &= bit(d); break;
        case 3: v.keep_min_distance(d), s &= range(d, END); break;
        case 4: v.keep_max_distance(d), s &= range(-END, d); break;
        case 5: v &= dve_of(other), s &= other; break;
        case 6: v |= dve_of(other), s |= other; break;
        case 7: v.set_inverted(), s = inverted(s); break;
        case 8: v.set_ALL_dirs(), s = EVERY; break;
        case 9: v.set_SAME_FWD_dirs(), s |= ZERO | FORE; break;
        case 10: v.set_SAME_BWD_dirs(), s |= ZERO | BACK; break;
        case 11: v.clr_SAME_FWD_dirs(), s &= BACK; break;
        case 12: v.clr_SAME_BWD_dirs(), s &= FORE; break;
        case 13: v.set_overflow_low(), s |= bit(-END); break;
        }
        if (step % 16 == 0) {
            ASSERT_TRUE(same(v, s)) << step << ": " << dve2string(v);
            expect_answers(v, s);
        }
    }
}

TEST(DependenceVectors, WholeSidesAreSaidAsAWhole) {
    DVE all = DVE().set_ALL_dirs();
    EXPECT_TRUE(DVE(all).keep_max_distance(40).keep_min_distance(-40).is_ALL_dirs());
    DVE list = dve_of(FORE);
    EXPECT_FALSE(list.is_FWD_dir());
    EXPECT_TRUE(list.has_all_FWD_dirs());
    const std::pair<SET, const char*> texts[] = {{0, "."}, {bit(-33), "...|"}, {bit(-33) | bit(-2) | ZERO, "...|-2|="},
        {range(-4, -1) | bit(5), "[-4:-1]5"}, {range(1, 3) | bit(5), "[1:3]5"}, {bit(1) | bit(2) | bit(9), "1|2|9"},
        {ZERO | bit(7) | bit(33), "=|7|..."}};
    for (const auto& [s, text] : texts) EXPECT_EQ(dve2string(dve_of(s)), text);
    EXPECT_EQ(dve2string(all), "*");
    EXPECT_EQ(dve2string(all.clr_SAME_dir()), ">|<");
    EXPECT_EQ(DDEP(0, true).text(), "{DDEP(1): = }");
}

// All combinations of distances, one for each level, of a vector.
std::vector<std::vector<int>> combinations(const DDEP& v) {
    std::vector<std::vector<int>> all{{}};
    for (int k = 1; k < v.count(); ++k) {
        std::vector<std::vector<int>> longer;
        for (const auto& c : all)
            for (int d = -2; d <= 2; ++d)
                if (v.ddve(k).has_distance(d)) longer.push_back(c), longer.back().push_back(d);
        all = std::move(longer);
    }
    return all;
}

TEST(DependenceVectors, FeasibleIsWhatMayComeLater) {
    std::mt19937 random(11);
    for (int turn = 0; turn < 100'000; ++turn) {
        DDEP v(static_cast<int>(random() % 4), false);
        for (int k = 1; k < v.count(); ++k) v.ddve(k) = dve_of(((random() % 31) + 1) * bit(-2));
        const int level = static_cast<int>(random() % 3) - 1;
        const bool same_statement = random() % 2;
        std::vector<std::vector<int>> later;
        for (const auto& c : combinations(v)) {
            const auto first = std::find_if(c.begin(), c.end(), [](int d) { return d != 0; });
            if (first == c.end() ? level >= 0 && !same_statement : *first > 0) later.push_back(c);
        }
        const DDEP_PTR left = make_feasible(std::make_unique<DDEP>(v), level, same_statement);
        ASSERT_EQ(left != nullptr, !later.empty()) << v.text();
        bool leading = true;
        for (int k = 1; left && k < v.count(); ++k) {
            for (const auto& c : later) ASSERT_TRUE(left->ddve(k).has_distance(c[size_t(k) - 1])) << v.text();
            ASSERT_EQ(left->ddve(k) & v.ddve(k), left->ddve(k));
            ASSERT_FALSE(leading && left->ddve(k).has_BWD_dirs());
            leading &= left->ddve(k).is_SAME_dir();
        }
    }
}

TEST(DependenceVectors, VectorsThatHoldNothingAreGone) {
    DDEP one(1, false), two(1, false);
    one.ddve(1).set_distance(1);
    two.ddve(1).set_distance(2);
    EXPECT_FALSE(set_intersection(std::make_unique<DDEP>(one), &two));
    EXPECT_FALSE(set_intersection(std::make_unique<DDEP>(one), nullptr));
    one.NotAllSame = true;
    one.set_union(&two);
    EXPECT_EQ(one.text(), "{DDEP(2): =  1|2 }");
    EXPECT_TRUE(one.not_all_DVE_SAME(nullptr, nullptr, nullptr));
    EXPECT_FALSE(make_feasible(std::make_unique<DDEP>(0, true), 0, true));
    EXPECT_TRUE(make_feasible(std::make_unique<DDEP>(0, true), 1, false));
    EXPECT_DEATH(one.ddve(2), "");
}

} // namespace
