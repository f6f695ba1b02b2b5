#include "OPT5/ir/dominator.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <algorithm>

namespace {

// The two-finger walk: `order[b]` falls on every step toward the root, which is its own dominator.
int intersect(int a, int b, const std::vector<int>& order, const std::vector<int>& idom) {
    while (a != b) {
        while (order[a] > order[b]) a = idom[a];
        while (order[b] > order[a]) b = idom[b];
    }
    return a;
}

// `sequence` lists the nodes in reverse postorder of the graph whose predecessors are `preds`, the root first.
void iterate(const std::vector<int>& sequence, const std::vector<std::vector<int>>& preds, std::vector<int>& idom) {
    std::vector<int> order(preds.size(), 0);
    for (size_t i = 0; i < sequence.size(); ++i) order[static_cast<size_t>(sequence[i])] = static_cast<int>(i);
    const int root = sequence.front();
    idom[root] = root;
    for (bool changed = true; changed;) {
        changed = false;
        for (size_t i = 1; i < sequence.size(); ++i) {
            const int b = sequence[i];
            int dom = Dominator::UNDEFINED;
            for (int p : preds[b])
                if (idom[p] != Dominator::UNDEFINED)
                    dom = dom == Dominator::UNDEFINED ? p : intersect(p, dom, order, idom);
            if (dom == idom[b]) continue;
            idom[b] = dom;
            changed = true;
        }
    }
}

std::vector<int> reverse_postorder(int root, const std::vector<std::vector<int>>& succs) {
    std::vector<int> out;
    std::vector<bool> seen(succs.size(), false);
    std::vector<std::pair<int, size_t>> stack{{root, 0}};
    seen[static_cast<size_t>(root)] = true;
    while (!stack.empty()) {
        auto& [b, next] = stack.back();
        const auto& list = succs[static_cast<size_t>(b)];
        if (next == list.size()) {
            out.push_back(b);
            stack.pop_back();
            continue;
        }
        const int s = list[next++];
        if (seen[static_cast<size_t>(s)]) continue;
        seen[static_cast<size_t>(s)] = true;
        stack.emplace_back(s, 0);
    }
    std::reverse(out.begin(), out.end());
    return out;
}

} // namespace

// Post-dominators start from a node of their own, numbered 0, behind every block that control leaves the function from.
// So a function with several returns has one root; a block whose chain ends there has no post-dominator.
void Dominator::builder() {
    renumber_bblocks();
    FUNINFO* f = currfuninfo;
    const size_t n = static_cast<size_t>(f->bb_count) + 1;
    saved_bb_count = f->bb_count;
    by_dfn.assign(n, nullptr);
    idom.assign(n, UNDEFINED);
    ipostdom.assign(n, UNDEFINED);
    exit_dfn = f->exit_bb ? f->exit_bb->dfn : 0;
    if (!f->bb_count) return;

    std::vector<std::vector<int>> succs(n), preds(n);
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
        const auto b = static_cast<size_t>(bb->dfn);
        by_dfn[b] = bb;
        for (const EDGE* e = bb->successors; e; e = e->rest) succs[b].push_back(e->first->dfn);
        for (const EDGE* e = bb->predecessors; e; e = e->rest) preds[b].push_back(e->first->dfn);
        if (!bb->successors) {
            succs[b].push_back(0);
            preds[0].push_back(bb->dfn);
        }
    }
    const int entry = f->bb_list->dfn;
    std::vector<int> forward = reverse_postorder(entry, succs);
    forward.erase(std::remove(forward.begin(), forward.end(), 0), forward.end());
    iterate(forward, preds, idom);
    iterate(reverse_postorder(0, preds), succs, ipostdom);
    for (int b = 1; b <= f->bb_count; ++b) {
        if (idom[b] == UNDEFINED) debug_printf("**** >>>> WARNING: BB%d doesn't have a dominator\n", b);
        if (ipostdom[b] == UNDEFINED) debug_printf("**** >>>> WARNING: BB%d doesn't have a postdominator\n", b);
    }
    generate_tree_walk();
}

void Dominator::generate_tree_walk() {
    below = post_below = INTERVALS();
    children.assign(idom.size(), {});
    post_children.assign(idom.size(), {});
    for (int b = 1; b <= saved_bb_count; ++b) {
        if (idom[b] != UNDEFINED && idom[b] != b) children[idom[b]].push_back(b);
        if (ipostdom[b] != UNDEFINED) post_children[ipostdom[b]].push_back(b);
    }
}

void Dominator::rebuild() { builder(); }

void Dominator::refresh() { need(fact::dominators); }

BBLK* Dominator::DFSblock(int dfn) {
    refresh();
    if (dfn < 1 || dfn > saved_bb_count) {
        debug_printf(" Error attempting to find BB with dfn=%d (currfuninfo->bb_count=%d)\n", dfn, currfuninfo->bb_count);
        abort_optimizer();
    }
    return by_dfn[static_cast<size_t>(dfn)];
}

BBLK* Dominator::immediate_dominator(int dfn) {
    BBLK* bb = DFSblock(dfn);
    const int dom = idom[static_cast<size_t>(dfn)];
    return dom == UNDEFINED || by_dfn[static_cast<size_t>(dom)] == bb ? nullptr : by_dfn[static_cast<size_t>(dom)];
}
BBLK* Dominator::immediate_dominator(const BBLK* bb) {
    refresh();
    return immediate_dominator(bb->dfn);
}

BBLK* Dominator::immediate_post_dominator(int dfn) {
    DFSblock(dfn);
    const int dom = ipostdom[static_cast<size_t>(dfn)];
    return dom == UNDEFINED ? nullptr : by_dfn[static_cast<size_t>(dom)];
}
BBLK* Dominator::immediate_post_dominator(const BBLK* bb) {
    refresh();
    return immediate_post_dominator(bb->dfn);
}

void Dominator::INTERVALS::number(int root, const std::vector<std::vector<int>>& tree) {
    first.assign(tree.size(), 0);
    last.assign(tree.size(), 0);
    int n = 0;
    std::vector<std::pair<int, size_t>> stack{{root, 0}};
    first[static_cast<size_t>(root)] = ++n;
    while (!stack.empty()) {
        auto& [node, next] = stack.back();
        const auto& list = tree[static_cast<size_t>(node)];
        if (next == list.size()) {
            last[static_cast<size_t>(node)] = n;
            stack.pop_back();
            continue;
        }
        const int child = list[next++];
        first[static_cast<size_t>(child)] = ++n;
        stack.emplace_back(child, 0);
    }
}

bool Dominator::INTERVALS::covers(int a, int b) const {
    const auto x = static_cast<size_t>(a), y = static_cast<size_t>(b);
    return first[x] && first[x] <= first[y] && first[y] <= last[x];
}

bool Dominator::dominates(int a, int b) {
    refresh();
    if (a < 1 || b < 1 || a > saved_bb_count || b > saved_bb_count) return false;
    if (below.first.empty()) below.number(1, children);
    return a == b || below.covers(a, b);
}
bool Dominator::dominates(const BBLK* a, const BBLK* b) {
    refresh();
    return dominates(a->dfn, b->dfn);
}

bool Dominator::post_dominates(int a, int b) {
    refresh();
    if (a < 1 || b < 1 || a > saved_bb_count || b > saved_bb_count) return false;
    if (post_below.first.empty()) post_below.number(0, post_children);
    return a == b || post_below.covers(a, b);
}
bool Dominator::post_dominates(const BBLK* a, const BBLK* b) {
    refresh();
    return post_dominates(a->dfn, b->dfn);
}

const std::vector<int>& Dominator::dominator_children(int dfn) {
    DFSblock(dfn);
    return children[static_cast<size_t>(dfn)];
}

const std::vector<int>& Dominator::post_dominator_children(int dfn) {
    refresh();
    OPT_ASSERT(dfn >= 0 && dfn <= saved_bb_count);
    return post_children[static_cast<size_t>(dfn)];
}

namespace {

using VISIT = std::function<void(BBLK*)>;

// `root` itself is visited if it names a block.
void df_traverse(int root, const std::vector<std::vector<int>>& tree, const std::vector<BBLK*>& by_dfn, const VISIT& descend,
                 const VISIT& ascend) {
    std::vector<std::pair<int, size_t>> stack{{root, 0}};
    if (by_dfn[static_cast<size_t>(root)] && descend) descend(by_dfn[static_cast<size_t>(root)]);
    while (!stack.empty()) {
        auto& [b, next] = stack.back();
        const auto& list = tree[static_cast<size_t>(b)];
        BBLK* bb = by_dfn[static_cast<size_t>(b)];
        if (next == list.size()) {
            stack.pop_back();
            if (bb && ascend) ascend(bb);
            continue;
        }
        const int child = list[next++];
        if (descend) descend(by_dfn[static_cast<size_t>(child)]);
        stack.emplace_back(child, 0);
    }
}

} // namespace

void Dominator::depth_first_doms(const VISIT& descend, const VISIT& ascend) {
    refresh();
    if (saved_bb_count) df_traverse(1, children, by_dfn, descend, ascend);
}

void Dominator::depth_first_postdoms(const VISIT& descend, const VISIT& ascend) {
    refresh();
    if (saved_bb_count) df_traverse(0, post_children, by_dfn, descend, ascend);
}

namespace {
void print_tree_array(FILE* out, const char* title, const std::vector<int>& dom) {
    std::fprintf(out, "%s:", title);
    for (size_t b = 1; b < dom.size(); ++b) std::fprintf(out, " BB%zu:%d", b, dom[b]);
    std::fputc('\n', out);
}
} // namespace

void Dominator::print_IDOM(FILE* out) {
    refresh();
    print_tree_array(out, "IDOM", idom);
}

void Dominator::print_POSTDOM(FILE* out) {
    refresh();
    print_tree_array(out, "POSTDOM", ipostdom);
}

namespace {

void find(FACTS) {
    if (!currfuninfo->dominators) currfuninfo->dominators = std::make_unique<Dominator>();
    currfuninfo->dominators->rebuild();
}

bool still_hold() {
    const Dominator known = *currfuninfo->dominators;
    currfuninfo->dominators->rebuild();
    return known.idom == currfuninfo->dominators->idom && known.ipostdom == currfuninfo->dominators->ipostdom;
}

const FACT_FINDER dominators("dominators", fact::dominators, fact::block_numbers, find, nullptr, still_hold);

} // namespace

void compute_dominators(bool with_live_variables) {
    need(fact::dominators | (with_live_variables ? fact::live_variables : fact::none));
}
