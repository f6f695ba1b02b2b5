// Immediate dominators and post-dominators of the current function, computed on demand.
//
// Source: K. D. Cooper, T. J. Harvey, K. Kennedy, "A Simple, Fast Dominance Algorithm", 2001. Every query
// needs `fact::dominators`, so that a graph edit before it costs a rebuild.
#pragma once

#include <cstdio>
#include <functional>
#include <vector>

class BBLK;

class Dominator {
public:
    static constexpr int UNDEFINED = -556;

    std::vector<int> idom, ipostdom; // by dfn

    void rebuild();
    BBLK* immediate_dominator(int dfn); // null for the entry
    BBLK* immediate_dominator(const BBLK* bb);
    BBLK* immediate_post_dominator(int dfn);
    BBLK* immediate_post_dominator(const BBLK* bb);
    bool dominates(int a, int b); // a dfn below 1 answers false
    bool dominates(const BBLK* a, const BBLK* b);
    bool post_dominates(int a, int b);
    bool post_dominates(const BBLK* a, const BBLK* b);
    BBLK* DFSblock(int dfn); // an index out of range ends the run
    const std::vector<int>& dominator_children(int dfn);
    const std::vector<int>& post_dominator_children(int dfn);
    void depth_first_doms(const std::function<void(BBLK*)>& descend, const std::function<void(BBLK*)>& ascend = {});
    void depth_first_postdoms(const std::function<void(BBLK*)>& descend, const std::function<void(BBLK*)>& ascend = {});
    void print_IDOM(FILE* out);
    void print_POSTDOM(FILE* out);

private:
    // Numbers of a walk over a tree, by dfn: what is below a node lies in its interval. Empty until they are asked for.
    struct INTERVALS {
        std::vector<int> first, last;
        void number(int root, const std::vector<std::vector<int>>& tree);
        bool covers(int a, int b) const;
    };
    void builder();
    void refresh();
    void generate_tree_walk();
    std::vector<BBLK*> by_dfn;
    std::vector<std::vector<int>> children, post_children;
    INTERVALS below, post_below;
    int saved_bb_count = 0;
    int exit_dfn = 0;
};

// Makes the current function's record true; with `with_live_variables` the live sets too.
void compute_dominators(bool with_live_variables);
