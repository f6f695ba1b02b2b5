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

    // A list of nodes for each node, by dfn, all in one array: most functions are small, and this is built often.
    class LISTS {
    public:
        struct RANGE {
            const int *first, *last;
            const int* begin() const { return first; }
            const int* end() const { return last; }
        };
        RANGE of(int node) const {
            const auto i = static_cast<size_t>(node);
            return {all.data() + first[i], all.data() + first[i + 1]};
        }
        // `for_each_pair` calls its argument with a node and a member of its list, in order of the members; it is run twice.
        template <class F>
        void build(size_t count, const F& for_each_pair);

    private:
        std::vector<int> first, all;
    };

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
    std::vector<int> dominator_children(int dfn);
    std::vector<int> post_dominator_children(int dfn);
    void depth_first_doms(const std::function<void(BBLK*)>& descend, const std::function<void(BBLK*)>& ascend = {});
    void depth_first_postdoms(const std::function<void(BBLK*)>& descend, const std::function<void(BBLK*)>& ascend = {});
    void print_IDOM(FILE* out);
    void print_POSTDOM(FILE* out);

private:
    // Numbers of a walk over a tree, by dfn: what is below a node lies in its interval. Empty until they are asked for.
    struct INTERVALS {
        std::vector<int> first, last;
        void number(int root, const LISTS& tree, size_t count);
        bool covers(int a, int b) const;
    };
    void builder();
    void refresh();
    void generate_tree_walk();
    std::vector<BBLK*> by_dfn;
    LISTS children, post_children;
    INTERVALS below, post_below;
    int saved_bb_count = 0;
    int exit_dfn = 0;
};

// Makes the current function's record true; with `with_live_variables` the live sets too.
void compute_dominators(bool with_live_variables);
