// Placement of accesses on random graphs: what is counted on random paths must agree with what the equations say.
#include "OPT5/ir/code_motion.h"

#include <gtest/gtest.h>

#include <random>
#include <string>

namespace {

constexpr size_t BLOCKS = 9, ENTRY = 1, EXIT = BLOCKS;

struct PROGRAM {
    std::vector<std::vector<size_t>> after{BLOCKS + 1};
    std::vector<std::vector<std::string>> acts{BLOCKS + 1, std::vector<std::string>(MOST_CANDIDATES)}; // l, s and k
};

PROGRAM random_program(std::mt19937& random) {
    PROGRAM p;
    for (size_t b = 1; b < EXIT; ++b) {
        p.after[b].push_back(b + 1);
        const size_t other = 2 + random() % (BLOCKS - 1);
        if (random() % 3 && other != b + 1) p.after[b].push_back(other);
    }
    for (size_t b = 1; b <= BLOCKS; ++b)
        for (std::string& acts : p.acts[b])
            for (size_t n = random() % 7 > 3 ? 1 + random() % 2 : 0; n; --n) acts += "lllsk"[random() % 5];
    return p;
}

void fill(MOTION_SETS& s, const std::vector<std::string>& acts, uint32_t closed) {
    s.passes = s.demands = ~CANDIDATES(0);
    s.closed = closed;
    for (size_t k = 0; k < acts.size(); ++k)
        for (char act : acts[k]) {
            const CANDIDATES bit = CANDIDATES(1) << k;
            if (act == 'l' && s.demands & bit) s.ANTLOC |= bit;
            if (act != 'l') s.demands &= ~bit, s.passes &= ~bit;
            if (act == 'k')
                s.AVLOC &= ~bit;
            else
                s.AVLOC |= bit;
        }
}

// The loads of one candidate on a path to the exit, with what was inserted and what went, and without.
struct COUNTS {
    int before = 0, after = 0;
};

class PATH {
public:
    PATH(const PROGRAM& p, const MOTION_GRAPH& g, const INSERTIONS& inserted, const std::vector<CANDIDATES>& known)
        : p(p), g(g), inserted(inserted), known(known) {}

    // False if it did not come to the exit.
    bool walk(size_t k, std::mt19937& random) {
        counts = {};
        bool is_known = false;
        size_t b = ENTRY;
        for (int steps = 0; steps < 60; ++steps) {
            is_known = walk_block(b, k, is_known);
            if (b == EXIT) return true;
            const size_t next = p.after[b][random() % p.after[b].size()];
            for (size_t i = 0; i < g.before[next].size(); ++i)
                if (g.before[next][i] == b && inserted[next][i] >> k & 1) {
                    ++counts.after;
                    is_known = true;
                }
            b = next;
        }
        return false;
    }
    COUNTS counts;

private:
    bool walk_block(size_t b, size_t k, bool is_known) {
        bool is_said_known = known[b] >> k & 1;
        for (char act : p.acts[b][k]) {
            EXPECT_TRUE(is_known || !is_said_known) << "a value that is not there on some path";
            if (act == 'l') {
                ++counts.before;
                counts.after += !is_said_known;
            }
            is_known = is_said_known = act != 'k';
        }
        return is_known;
    }

    const PROGRAM& p;
    const MOTION_GRAPH& g;
    const INSERTIONS& inserted;
    const std::vector<CANDIDATES>& known;
};

TEST(CodeMotion, NoPathGetsMoreLoads) {
    std::mt19937 random(1);
    long before = 0, after = 0;
    for (int i = 0; i < 60; ++i) {
        const PROGRAM p = random_program(random);
        const MOTION_GRAPH graph(p.after);
        MOTION motion(graph);
        for (size_t b = 1; b <= BLOCKS; ++b) fill(motion.sets[b], p.acts[b], random() % 4 ? 0 : random());
        const INSERTIONS inserted = motion.latest_insertions();
        const std::vector<CANDIDATES> known = motion.compute_AVOUT(inserted).AVIN;
        for (size_t b : graph.order)
            for (CANDIDATES on_edge : inserted[b]) EXPECT_EQ(on_edge & motion.sets[b].closed, 0u);
        PATH path(p, graph, inserted, known);
        for (size_t k = 0; k < MOST_CANDIDATES; ++k)
            for (int n = 0; n < 8; ++n) {
                if (!path.walk(k, random)) continue;
                EXPECT_LE(path.counts.after, path.counts.before);
                before += path.counts.before;
                after += path.counts.after;
            }
    }
    EXPECT_LT(after * 4, before * 3);
}

// A loop that loads in each iteration, and one that loads behind a test.
TEST(CodeMotion, LoadsMoveAheadOfLoops) {
    const MOTION_GRAPH graph({{}, {2}, {3}, {2, 4}, {}});
    MOTION motion(graph);
    for (size_t b : graph.order) motion.sets[b].passes = motion.sets[b].demands = 1;
    motion.sets[3].ANTLOC = motion.sets[3].AVLOC = 1;
    const INSERTIONS inserted = motion.latest_insertions();
    EXPECT_EQ(inserted[2][0], 1u);
    EXPECT_EQ(motion.compute_AVOUT(inserted).AVIN[3], 1u);
}

} // namespace
