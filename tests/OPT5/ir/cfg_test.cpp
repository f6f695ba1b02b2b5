#include "function_fixture.h"

namespace {

class CfgTest : public FunctionTest {};

TEST_F(CfgTest, ALoopAtTheStartLeavesTheEntryWithoutPredecessors) {
    SYMTAB* x = local("x");
    define(1);
    assign(x, 1);
    branch_if(x, 1, 2);
    define(2);
    ret(x);
    build();
    EXPECT_EQ(currfuninfo->bb_list->predecessors, nullptr);
    EXPECT_TRUE(has_edge(block_of(1), block_of(1)));
    EXPECT_EQ(currfuninfo->exit_bb, nullptr) << "no path falls off the end";
    EXPECT_TRUE(valid());
}

TEST_F(CfgTest, ASwitchWithoutDefaultFallsThroughExplicitly) {
    SYMTAB* x = local("x");
    NODE* cases = maketree(COMMA, maketree(CASE, mk_ICON(INT65(1), tp->int_t), ref(1), tp->int_t),
                           maketree(CASE, mk_ICON(INT65(2), tp->int_t), ref(2), tp->int_t), tp->int_t);
    add(maketree(SWITCH, mk_NAME(x), cases, tp->int_t));
    assign(x, 9);
    define(1);
    assign(x, 1);
    define(2);
    ret(x);
    build();
    const NODE* sw = currfuninfo->bb_list->branch();
    ASSERT_EQ(sw->op, SWITCH);
    ASSERT_EQ(sw->right->right->op, DEFAULT);
    const BBLK* dflt = sw->right->right->left->lbl->bblock;
    EXPECT_EQ(dflt->statements->first->op, ASG);
    EXPECT_TRUE(has_edge(currfuninfo->bb_list, block_of(1)) && has_edge(currfuninfo->bb_list, block_of(2)));
    EXPECT_TRUE(valid());
}

TEST_F(CfgTest, SplittingEveryCriticalEdgeLeavesNone) {
    SYMTAB* x = local("x");
    define(1);
    branch_if(x, 2, 3);
    define(2);
    branch_if(x, 1, 3);
    define(3);
    branch_if(x, 1, 4);
    define(4);
    ret(x);
    build();
    split_critical_edges(true);
    EXPECT_TRUE(valid());
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (edge_length(bb->successors) < 2) continue;
        for (const EDGE* e = bb->successors; e; e = e->rest) EXPECT_EQ(edge_length(e->first->predecessors), 1) << bb->str();
    }
}

TEST_F(CfgTest, ForwardEdgesMayStayCritical) {
    SYMTAB* x = local("x");
    branch_if(x, 1, 2);
    define(1);
    branch_if(x, 2, 3);
    define(2);
    assign(x, 1);
    define(3);
    ret(x);
    build();
    const int before = currfuninfo->bb_count;
    split_critical_edges(false);
    EXPECT_EQ(currfuninfo->bb_count, before);
    BBLK* middle = split_cfg_edge(block_of(1), block_of(2));
    EXPECT_TRUE(bb_is_split_critical_edge(middle));
    EXPECT_FALSE(has_edge(block_of(1), block_of(2)));
    EXPECT_TRUE(valid());
}

TEST_F(CfgTest, ValidationFindsAndMendsMissingEdges) {
    SYMTAB* x = local("x");
    branch_if(x, 1, 2);
    define(1);
    assign(x, 1);
    define(2);
    ret(x);
    build();
    BBLK* entry = currfuninfo->bb_list;
    disconnect(entry, block_of(2));
    EXPECT_EQ(validate_cfg(), 0) << "mended";
    EXPECT_TRUE(has_edge(entry, block_of(2)));
    block_of(2)->predecessors = remove_edge(entry, block_of(2)->predecessors);
    EXPECT_EQ(validate_cfg(), 0) << "mended";
    EXPECT_TRUE(has_edge(entry, block_of(2)));
    // An edge that no branch backs is not for the checker to remove.
    connect(block_of(1), block_of(1));
    EXPECT_GT(validate_cfg(), 0);
    // A block that does not end in a control statement.
    disconnect(block_of(1), block_of(1));
    LIST* last = block_of(1)->last_statement();
    last->first->op = NOP;
    EXPECT_GT(validate_cfg(), 0);
    last->first->op = BRANCH;
    EXPECT_TRUE(valid());
}

// ---- Dominators

class DominatorTest : public FunctionTest {
protected:
    // 1 -> 2,3; 2 -> 4; 3 -> 4; 4 -> 1,5; 5 returns
    void diamond_in_a_loop() {
        SYMTAB* x = local("x");
        define(1);
        branch_if(x, 2, 3);
        define(2);
        assign(x, 2);
        go(4);
        define(3);
        assign(x, 3);
        define(4);
        branch_if(x, 1, 5);
        define(5);
        ret(x);
        build();
        compute_dominators(false);
    }
    Dominator& d() { return *currfuninfo->dominators; }
};

TEST_F(DominatorTest, DiamondInALoop) {
    diamond_in_a_loop();
    BBLK *b1 = block_of(1), *b2 = block_of(2), *b4 = block_of(4), *b5 = block_of(5);
    EXPECT_EQ(d().immediate_dominator(b2), b1);
    EXPECT_EQ(d().immediate_dominator(b4), b1);
    EXPECT_EQ(d().immediate_dominator(b5), b4);
    EXPECT_EQ(d().immediate_dominator(currfuninfo->bb_list), nullptr);
    EXPECT_TRUE(d().dominates(b1, b5));
    EXPECT_TRUE(d().dominates(b2, b2));
    EXPECT_FALSE(d().dominates(b2, b4));
    EXPECT_FALSE(d().dominates(0, b4->dfn));
    EXPECT_EQ(d().immediate_post_dominator(b2), b4);
    EXPECT_EQ(d().immediate_post_dominator(b1), b4);
    EXPECT_TRUE(d().post_dominates(b5, b1));
    EXPECT_EQ(d().immediate_post_dominator(b5), nullptr);
}

TEST_F(DominatorTest, AnEditMakesTheNextQueryRebuild) {
    diamond_in_a_loop();
    BBLK* middle = split_cfg_edge(block_of(1), block_of(2));
    EXPECT_EQ(d().immediate_dominator(block_of(2)), middle);
    EXPECT_EQ(d().immediate_dominator(middle), block_of(1));
    std::vector<int> seen;
    d().depth_first_doms([&](BBLK* bb) { seen.push_back(bb->dfn); });
    EXPECT_EQ(seen.size(), static_cast<size_t>(currfuninfo->bb_count));
    EXPECT_EQ(seen.front(), 1);
}

} // namespace
