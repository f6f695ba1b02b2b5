#include "BITVEC/bitvec.h"

#include <gtest/gtest.h>

#include <random>
#include <set>
#include <sstream>

namespace {

BITVEC with(uint32_t n, std::initializer_list<uint32_t> bits) {
    BITVEC v(n);
    for (uint32_t b : bits) v.set(b);
    return v;
}

std::string text(const BITVEC& v) {
    std::ostringstream out;
    out << v;
    return out.str();
}

TEST(Bitvec, PrintsRanges) {
    EXPECT_EQ(text(with(10, {1, 2, 3, 7})), "[1-3,7]");
    EXPECT_EQ(text(with(64, {0, 31, 32, 63})), "[0,31-32,63]");
    EXPECT_EQ(text(BITVEC(0)), "[]");
    testing::internal::CaptureStdout();
    bv_print(with(10, {1, 2, 3, 7}));
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "[1-3,7]");
}

// New bits are 0 within the capacity and 1 behind a reallocation.
TEST(Bitvec, ResizeKeepsOldBitsAndSetsNewOnesByWhereTheyCome) {
    BITVEC v = with(40, {3, 39});
    bv_resize(v, 60);
    EXPECT_EQ(text(v), "[3,39]");
    bv_resize(v, 100);
    EXPECT_EQ(text(v), "[3,39,60-99]");
    bv_resize(v, 4);
    EXPECT_EQ(text(v), "[3]");
    bv_resize(v, 70);
    EXPECT_EQ(text(v), "[3]");
}

TEST(Bitvec, CopiesSegmentsAcrossWords) {
    BITVEC from(100);
    from.set_all();
    BITVEC to(64);
    bv_copy_seg(to, from, 30, 34);
    EXPECT_EQ(text(to), "[30-34]");
    bv_copy_seg(to, from, 95, 1000); // capped at the source, grows the target
    EXPECT_EQ(to.bits, 100u);
    EXPECT_EQ(text(to), "[30-34,95-99]");
    bv_copy_seg(to, BITVEC(100), 32, 32);
    EXPECT_EQ(text(to), "[30-31,33-34,95-99]");
}

TEST(Bitvec, DifferenceOfUnequalSizes) {
    BITVEC to(5);
    bv_diff(to, with(70, {1, 2, 65}), with(10, {2}));
    EXPECT_EQ(text(to), "[1,65]");
    BITVEC b = with(10, {1});
    bv_diff(b, with(10, {1, 4}), b);
    EXPECT_EQ(text(b), "[4]");
}

TEST(Bitvec, AgreesWithASetOnRandomOperations) {
    std::mt19937 rng(7);
    for (int round = 0; round < 50; ++round) {
        uint32_t n = 1 + rng() % 200;
        BITVEC a(n), b(n);
        std::set<uint32_t> sa, sb;
        for (int i = 0; i < 60; ++i) {
            uint32_t x = rng() % n, y = rng() % n;
            a.set(x), sa.insert(x);
            b.set(y), sb.insert(y);
        }
        BITVEC u = a, m = a, d = a;
        u |= b, m &= b, d -= b;
        uint32_t count = 0;
        for (uint32_t i = 0; i < n; ++i) {
            EXPECT_EQ(u.test(i), sa.count(i) || sb.count(i));
            EXPECT_EQ(m.test(i), sa.count(i) && sb.count(i));
            EXPECT_EQ(d.test(i), sa.count(i) && !sb.count(i));
            count += sa.count(i);
        }
        EXPECT_EQ(a.count(), count);
        std::set<uint32_t> walked;
        for (uint32_t i = a.next_set(0); i < n; i = a.next_set(i + 1)) walked.insert(i);
        EXPECT_EQ(walked, sa);
        EXPECT_EQ(u == a, std::includes(sa.begin(), sa.end(), sb.begin(), sb.end()));
    }
}

TEST(Bitvec, BitsBeyondTheSizeStayClear) {
    BITVEC v(33);
    v.set_all();
    EXPECT_EQ(v.count(), 33u);
    v |= with(64, {40});
    EXPECT_EQ(v.count(), 33u);
    EXPECT_FALSE(v.test(40));
}

TEST(Pbset, DefaultsAndRounding) {
    PBSET* set = make_PBSET(0, 0);
    EXPECT_EQ(set->max_element, 15u);
    EXPECT_EQ(set->dense_capacity, 16u);
    erase_PBSET(set);
    set = make_PBSET(17, 3);
    EXPECT_EQ(set->max_element, 31u);
    EXPECT_EQ(set->dense_capacity, 16u);
    erase_PBSET(set);
}

TEST(Pbset, AgreesWithASetAndClearsAtOnce) {
    std::mt19937 rng(3);
    PBSET* set = make_PBSET(10, 2);
    std::set<int> model;
    for (int i = 0; i < 20000; ++i) {
        int e = static_cast<int>(rng() % 70000) - 100;
        switch (rng() % 8) {
        case 0:
            remove_element_from_PBSET(e, set);
            model.erase(e);
            break;
        case 1:
            if (rng() % 200 == 0) {
                make_PBSET_empty(set);
                model.clear();
            }
            break;
        default:
            add_element_to_PBSET(e, set);
            if (e >= 0 && e <= 65535) model.insert(e);
        }
        ASSERT_EQ(element_is_in_PBSET(e, set), model.count(e) != 0) << e;
    }
    std::set<int> members;
    for (uint32_t i = 0; another_element_in_PBSET(i, set); ++i) members.insert(next_element_in_PBSET(i, set));
    EXPECT_EQ(members, model);
    erase_PBSET(set);
}

} // namespace
