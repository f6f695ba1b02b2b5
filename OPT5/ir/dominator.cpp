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

using LISTS = Dominator::LISTS;

// `sequence` lists the nodes in reverse postorder of the graph whose predecessors are `preds`, the root first.
void iterate(const std::vector<int>& sequence, const LISTS& preds, std::vector<int>& idom) {
    std::vector<int> order(idom.size(), 0);
    for (size_t i = 0; i < sequence.size(); ++i) order[static_cast<size_t>(sequence[i])] = static_cast<int>(i);
    const int root = sequence.front();
    idom[root] = root;
    for (bool changed = true; changed;) {
        changed = false;
        for (size_t i = 1; i < sequence.size(); ++i) {
            const int b = sequence[i];
            int dom = Dominator::UNDEFINED;
            for (const int p : preds.of(b))
                if (idom[p] != Dominator::UNDEFINED)
                    dom = dom == Dominator::UNDEFINED ? p : intersect(p, dom, order, idom);
            if (dom == idom[b]) continue;
            idom[b] = dom;
            changed = true;
        }
    }
}

// A walk over a graph or tree, and how far it has come in the list of each node on its path.
class PATH {
public:
    PATH(int root, const LISTS& lists) : lists(lists) {
        nodes.reserve(32); // what most functions take
        enter(root);
    }
    bool is_empty() const { return nodes.empty(); }
    int last() const { return nodes.back().node; }
    void enter(int node) {
        const LISTS::RANGE list = lists.of(node);
        nodes.push_back({node, list.begin(), list.end()});
    }
    void leave() { nodes.pop_back(); }
    const int* next() { return nodes.back().at == nodes.back().end ? nullptr : nodes.back().at++; } // null behind the last

private:
    struct PLACE {
        int node;
        const int *at, *end;
    };
    const LISTS& lists;
    std::vector<PLACE> nodes;
};

std::vector<int> reverse_postorder(int root, const LISTS& succs, size_t count) {
    std::vector<int> out;
    out.reserve(count);
    std::vector<bool> seen(count, false);
    seen[static_cast<size_t>(root)] = true;
    for (PATH path(root, succs); !path.is_empty();) {
        const int* s = path.next();
        if (!s) {
            out.push_back(path.last());
            path.leave();
        } else if (!seen[static_cast<size_t>(*s)]) {
            seen[static_cast<size_t>(*s)] = true;
            path.enter(*s);
        }
    }
    std::reverse(out.begin(), out.end());
    return out;
}

} // namespace

template <class F>
void LISTS::build(size_t count, const F& for_each_pair) {
    // Counted one place late, so that the places where the lists begin move on to where they end while they are filled.
    first.assign(count + 2, 0);
    for_each_pair([this](int node, int) { ++first[static_cast<size_t>(node) + 2]; });
    for (size_t i = 2; i < first.size(); ++i) first[i] += first[i - 1];
    all.resize(static_cast<size_t>(first.back()));
    for_each_pair([this](int node, int member) { all[static_cast<size_t>(first[static_cast<size_t>(node) + 1]++)] = member; });
}

// Post-dominators start from a node of their own, numbered 0, behind every block that control leaves the function from.
// So a function with several returns has one root; a block whose chain ends there has no post-dominator.
void Dominator::builder() {
    FUNINFO* f = currfuninfo;
    const size_t n = static_cast<size_t>(f->bb_count) + 1;
    saved_bb_count = f->bb_count;
    by_dfn.assign(n, nullptr);
    idom.assign(n, UNDEFINED);
    ipostdom.assign(n, UNDEFINED);
    exit_dfn = f->exit_bb ? f->exit_bb->dfn : 0;
    if (!f->bb_count) return;

    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) by_dfn[static_cast<size_t>(bb->dfn)] = bb;
    LISTS succs, preds;
    succs.build(n, [&](const auto& enter) {
        for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
            for (const EDGE* e = bb->successors; e; e = e->rest) enter(bb->dfn, e->first->dfn);
            if (!bb->successors) enter(bb->dfn, 0);
        }
    });
    preds.build(n, [&](const auto& enter) {
        for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
            for (const EDGE* e = bb->predecessors; e; e = e->rest) enter(bb->dfn, e->first->dfn);
            if (!bb->successors) enter(0, bb->dfn);
        }
    });
    std::vector<int> forward = reverse_postorder(f->bb_list->dfn, succs, n);
    forward.erase(std::remove(forward.begin(), forward.end(), 0), forward.end());
    iterate(forward, preds, idom);
    iterate(reverse_postorder(0, preds, n), succs, ipostdom);
    for (int b = 1; b <= f->bb_count; ++b) {
        if (idom[b] == UNDEFINED) debug_printf("**** >>>> WARNING: BB%d doesn't have a dominator\n", b);
        if (ipostdom[b] == UNDEFINED) debug_printf("**** >>>> WARNING: BB%d doesn't have a postdominator\n", b);
    }
    generate_tree_walk();
}

void Dominator::generate_tree_walk() {
    below = post_below = INTERVALS();
    children.build(idom.size(), [this](const auto& enter) {
        for (int b = 1; b <= saved_bb_count; ++b)
            if (idom[b] != UNDEFINED && idom[b] != b) enter(idom[b], b);
    });
    post_children.build(idom.size(), [this](const auto& enter) {
        for (int b = 1; b <= saved_bb_count; ++b)
            if (ipostdom[b] != UNDEFINED) enter(ipostdom[b], b);
    });
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

void Dominator::INTERVALS::number(int root, const LISTS& tree, size_t count) {
    first.assign(count, 0);
    last.assign(count, 0);
    int n = 0;
    first[static_cast<size_t>(root)] = ++n;
    for (PATH path(root, tree); !path.is_empty();) {
        if (const int* child = path.next()) {
            first[static_cast<size_t>(*child)] = ++n;
            path.enter(*child);
        } else {
            last[static_cast<size_t>(path.last())] = n;
            path.leave();
        }
    }
}

bool Dominator::INTERVALS::covers(int a, int b) const {
    const auto x = static_cast<size_t>(a), y = static_cast<size_t>(b);
    return first[x] && first[x] <= first[y] && first[y] <= last[x];
}

bool Dominator::dominates(int a, int b) {
    refresh();
    if (a < 1 || b < 1 || a > saved_bb_count || b > saved_bb_count) return false;
    if (below.first.empty()) below.number(1, children, idom.size());
    return a == b || below.covers(a, b);
}
bool Dominator::dominates(const BBLK* a, const BBLK* b) {
    refresh();
    return dominates(a->dfn, b->dfn);
}

bool Dominator::post_dominates(int a, int b) {
    refresh();
    if (a < 1 || b < 1 || a > saved_bb_count || b > saved_bb_count) return false;
    if (post_below.first.empty()) post_below.number(0, post_children, idom.size());
    return a == b || post_below.covers(a, b);
}
bool Dominator::post_dominates(const BBLK* a, const BBLK* b) {
    refresh();
    return post_dominates(a->dfn, b->dfn);
}

std::vector<int> Dominator::dominator_children(int dfn) {
    DFSblock(dfn);
    return {children.of(dfn).begin(), children.of(dfn).end()};
}

std::vector<int> Dominator::post_dominator_children(int dfn) {
    refresh();
    OPT_ASSERT(dfn >= 0 && dfn <= saved_bb_count);
    return {post_children.of(dfn).begin(), post_children.of(dfn).end()};
}

namespace {

using VISIT = std::function<void(BBLK*)>;

// `root` itself is visited if it names a block.
void df_traverse(int root, const LISTS& tree, const std::vector<BBLK*>& by_dfn, const VISIT& descend, const VISIT& ascend) {
    auto visit = [&](const VISIT& work, int node) {
        if (by_dfn[static_cast<size_t>(node)] && work) work(by_dfn[static_cast<size_t>(node)]);
    };
    visit(descend, root);
    for (PATH path(root, tree); !path.is_empty();) {
        if (const int* child = path.next()) {
            visit(descend, *child);
            path.enter(*child);
        } else {
            const int node = path.last();
            path.leave();
            visit(ascend, node);
        }
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
