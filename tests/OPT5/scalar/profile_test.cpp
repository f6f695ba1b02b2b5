// Counts of a profile become frequencies, and the layout follows them.

#include "../ir/function_fixture.h"

#include "OPT5/ir/profile.h"
#include "OPT5/scalar/sblk.h"
#include "OPT5/scalar/simpcfg.h"

namespace {

class ProfileTest : public FunctionTest {
protected:
    void branch_counted(SYMTAB* cond, int if_true, unsigned n, int if_false, unsigned m) {
        NODE *a = ref(if_true), *b = ref(if_false);
        a->set_edge_profile(n);
        b->set_edge_profile(m);
        add(mk_IF(mk_NAME(cond), a, b));
    }
    // if (x) x = 1 (10 times) else x = 2 (90 times); a loop of 10 iterations an entry behind it.
    void diamond_and_loop() {
        x = local("x");
        branch_counted(x, 1, 10, 2, 90);
        define(1);
        assign(x, 1);
        go(3);
        define(2);
        assign(x, 2);
        define(3);
        assign(x, 3);
        define(4);
        assign(x, 4);
        branch_counted(x, 4, 900, 5, 100);
        define(5);
        ret(x);
        currfuninfo->profile_status = 2;
        currfuninfo->entry_count = 100;
        build();
    }
    static std::vector<BBLK*> layout() {
        std::vector<BBLK*> order;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) order.push_back(bb);
        return order;
    }
    SYMTAB* x = nullptr;
};

TEST_F(ProfileTest, CountsGiveFrequenciesAndProbabilities) {
    diamond_and_loop();
    initialize_CFG_profiling_annotation(false, false);
    EXPECT_NEAR(block_of(1)->dFreqIn, 10, 0.01);
    EXPECT_NEAR(block_of(2)->dFreqIn, 90, 0.01);
    EXPECT_NEAR(block_of(3)->dFreqIn, 100, 0.01);
    EXPECT_NEAR(block_of(4)->dFreqIn, 1000, 40) << "the loop converges from below";
    EXPECT_NEAR(edge_memberp(block_of(4), block_of(4)->successors)->prob, 0.9, 1e-9);
    EXPECT_NEAR(edge_memberp(block_of(4), block_of(4)->predecessors)->prob, 0.9, 1e-9);
    rebuildcfg();
    EXPECT_NEAR(edge_memberp(block_of(4), block_of(4)->predecessors)->prob, 0.9, 1e-9) << "the edge is still there";
}

TEST_F(ProfileTest, TheLikelyPathIsLaidOutStraight) {
    diamond_and_loop();
    straighten_traces_in_cfg();
    const std::vector<BBLK*> order = layout();
    EXPECT_EQ(order.front(), currfuninfo->bb_list);
    EXPECT_EQ(currfuninfo->bb_list->dflink, block_of(2));
    EXPECT_EQ(block_of(2)->dflink, block_of(3));
    EXPECT_EQ(order.back(), block_of(1)) << "the unlikely path stands aside";
    EXPECT_TRUE(valid());
}

TEST_F(ProfileTest, WhatIsSaidOfALoopStaysInFrontOfIt) {
    x = local("x");
    assign(x, 1);
    define(1);
    branch_counted(x, 1, 900, 2, 100);
    define(2);
    assign(x, 2);
    define(3);
    branch_counted(x, 3, 9900, 4, 100); // the more frequent loop, which is laid out first
    define(4);
    ret(x);
    currfuninfo->profile_status = 2;
    currfuninfo->entry_count = 100;
    build();
    add_loop_annotation_from_profile();
    straighten_traces_in_cfg();
    EXPECT_EQ(currfuninfo->bb_list->dflink, block_of(1)) << "10 iterations";
    EXPECT_EQ(block_of(2)->dflink, block_of(3)) << "100 iterations";
    EXPECT_TRUE(valid());
}

TEST_F(ProfileTest, ALoopIsToldItsTripCount) {
    diamond_and_loop();
    add_loop_annotation_from_profile();
    const NODE* mark = nullptr;
    for (const LIST* s = block_of(3)->statements; s; s = s->rest)
        if (s->first->op == PPRAGMA) mark = s->first;
    ASSERT_NE(mark, nullptr);
    EXPECT_EQ(mark->pragma->kind, 40);
    EXPECT_EQ(mark->pragma->args.front(), "10");
}

TEST_F(ProfileTest, Texts) {
    EXPECT_EQ(freq2text(0), "#0");
    EXPECT_EQ(freq2text(1234.5), "#1.23e+03");
    EXPECT_EQ(prob2text(0.25), "%0.25");
    EXPECT_EQ(prob2text(-1), "%?");
}

} // namespace
