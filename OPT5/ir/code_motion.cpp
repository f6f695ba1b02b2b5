#include "OPT5/ir/code_motion.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"

#include <algorithm>

namespace {

constexpr CANDIDATES ALL = ~CANDIDATES(0);

std::vector<size_t> numbers_of(const EDGE* list) {
    std::vector<size_t> numbers;
    numbers.reserve(static_cast<size_t>(edge_length(list)));
    for (; list; list = list->rest) numbers.push_back(static_cast<size_t>(list->first->dfn));
    return numbers;
}

} // namespace

MOTION_GRAPH::MOTION_GRAPH(bool backward) : is_backward(backward) {
    need(fact::block_numbers);
    const size_t count = static_cast<size_t>(currfuninfo->bb_count) + 1;
    blocks.assign(count, nullptr);
    before.resize(count);
    after.resize(count);
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const size_t b = static_cast<size_t>(bb->dfn);
        blocks[b] = bb;
        before[b] = numbers_of(backward ? bb->successors : bb->predecessors);
        after[b] = numbers_of(backward ? bb->predecessors : bb->successors);
        order.push_back(b);
    }
    if (backward) std::reverse(order.begin(), order.end());
    is_closed.assign(count, false);
    for (size_t b : order)
        for (size_t p : before[b]) {
            BBLK *from = backward ? blocks[b] : blocks[p], *to = backward ? blocks[p] : blocks[b];
            if (!EDGE_STATEMENTS::may_insert(from, to)) is_closed[b] = true;
        }
}

MOTION_GRAPH::MOTION_GRAPH(const std::vector<std::vector<size_t>>& graph)
    : is_backward(false), is_closed(graph.size(), false), blocks(graph.size(), nullptr), before(graph.size()),
      after(graph) {
    for (size_t b = 1; b < graph.size(); ++b) {
        order.push_back(b);
        for (size_t next : graph[b]) before[next].push_back(b);
    }
}

static bool has_no_exit(const NATURAL_LOOP& loop, const NATURAL_LOOPS& loops) {
    for (const BBLK* bb : loop.blocks)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (!loops.contains(&loop, e->first)) return false;
    return true;
}

std::vector<bool> dead_ends(const MOTION_GRAPH& forward, const NATURAL_LOOPS& loops) {
    std::vector<bool> found(forward.blocks.size(), false), ends(forward.blocks.size(), false);
    std::vector<size_t> waiting;
    auto enter = [&](size_t b) {
        if (!ends[b]) waiting.push_back(b);
        ends[b] = true;
    };
    for (size_t b : forward.order)
        if (forward.after[b].empty()) enter(b);
    for (size_t i = 0; i < waiting.size(); ++i)
        for (size_t p : forward.before[waiting[i]]) enter(p);
    for (size_t b : forward.order) {
        if (ends[b]) continue;
        const NATURAL_LOOP* loop = loops.around(forward.blocks[b]);
        const bool is_header = loop && loop->header == forward.blocks[b];
        found[b] = loops.has_other_cycles() || (is_header && has_no_exit(*loop, loops));
    }
    return found;
}

MOTION::MOTION(const MOTION_GRAPH& graph) : sets(graph.blocks.size()), graph(graph) {
    for (size_t b : graph.order)
        if (graph.is_closed[b]) sets[b].closed = ALL;
}

INSERTIONS MOTION::no_insertions() const {
    INSERTIONS none(graph.blocks.size());
    for (size_t b : graph.order) none[b].assign(graph.before[b].size(), 0);
    return none;
}

std::vector<CANDIDATES> MOTION::compute_ANTIN() const {
    std::vector<CANDIDATES> at_start(graph.blocks.size(), ALL);
    for (bool changed = true; changed;) {
        changed = false;
        if (print_debug >= 2) debug_printf("\n\tNext iteration of global ANTIN/ANTOUT loop\n");
        for (auto b = graph.order.rbegin(); b != graph.order.rend(); ++b) {
            CANDIDATES at_end = graph.after[*b].empty() ? 0 : ALL;
            for (size_t next : graph.after[*b]) at_end &= at_start[next];
            const MOTION_SETS& s = sets[*b];
            const CANDIDATES now = (s.ANTLOC | (at_end & s.demands)) & ~(s.closed | s.cut);
            changed |= now != at_start[*b];
            at_start[*b] = now;
        }
    }
    return at_start;
}

MOTION::AVAILABLE MOTION::compute_AVOUT(const INSERTIONS& inserted) const {
    std::vector<CANDIDATES> at_start(graph.blocks.size(), ALL), at_end = at_start;
    for (bool changed = true; changed;) {
        changed = false;
        if (print_debug >= 2) debug_printf("\n\tNext iteration of global AVIN/AVOUT loop\n");
        for (size_t b : graph.order) {
            CANDIDATES now = graph.before[b].empty() ? 0 : ALL;
            for (size_t k = 0; k < graph.before[b].size(); ++k) now &= at_end[graph.before[b][k]] | inserted[b][k];
            at_start[b] = now & ~sets[b].cut;
            now = sets[b].AVLOC | (at_start[b] & sets[b].passes);
            changed |= now != at_end[b];
            at_end[b] = now;
        }
    }
    return {std::move(at_start), std::move(at_end)};
}

// An occurrence is wanted as early as it is anticipated, and postponed from there for as long as no path needs it.
INSERTIONS MOTION::latest_insertions() const {
    const std::vector<CANDIDATES> wanted = compute_ANTIN(), known = compute_AVOUT(no_insertions()).AVOUT;
    INSERTIONS edges = no_insertions();
    for (size_t b : graph.order)
        for (size_t k = 0; k < edges[b].size(); ++k) {
            const size_t p = graph.before[b][k];
            CANDIDATES wanted_behind = graph.after[p].empty() ? 0 : ALL;
            for (size_t next : graph.after[p]) wanted_behind &= wanted[next];
            const MOTION_SETS& s = sets[p];
            const CANDIDATES moves_on = wanted_behind & s.demands & ~(s.closed | s.cut);
            edges[b][k] = wanted[b] & ~known[p] & ~moves_on;
        }
    std::vector<CANDIDATES> postponed(graph.blocks.size(), ALL);
    auto behind = [&](size_t b, size_t k) {
        const size_t p = graph.before[b][k];
        return edges[b][k] | (postponed[p] & ~sets[p].ANTLOC);
    };
    for (bool changed = true; changed;) {
        changed = false;
        if (print_debug >= 2) debug_printf("\n\tNext iteration of global PPIN/PPOUT loop\n");
        for (size_t b : graph.order) {
            CANDIDATES now = graph.before[b].empty() ? wanted[b] : ALL;
            for (size_t k = 0; k < edges[b].size(); ++k) now &= behind(b, k);
            changed |= now != postponed[b];
            postponed[b] = now;
        }
    }
    INSERTIONS result = no_insertions();
    for (size_t b : graph.order)
        for (size_t k = 0; k < edges[b].size(); ++k) result[b][k] = behind(b, k) & ~postponed[b];
    return result;
}

INSERTIONS MOTION::latest_insertions_off_back_edges(const NATURAL_LOOPS& loops) {
    for (;;) {
        INSERTIONS edges = latest_insertions();
        bool is_done = true;
        for (size_t b : graph.order)
            for (size_t k = 0; k < edges[b].size(); ++k) {
                const BBLK *p = graph.blocks[graph.before[b][k]], *bb = graph.blocks[b];
                if (!edges[b][k] || !(graph.is_backward ? loops.dominates(p, bb) : loops.dominates(bb, p))) continue;
                sets[b].closed |= edges[b][k];
                is_done = false;
            }
        if (is_done) return edges;
    }
}

VALUE_LIFE::VALUE_LIFE(const MOTION& motion)
    : reads(motion.sets.size(), 0), sets(motion.sets.size(), 0), edge_reads(motion.no_insertions()),
      edge_sets(motion.no_insertions()) {}

std::vector<CANDIDATES> VALUE_LIFE::live_at_end(const MOTION_GRAPH& graph) const {
    std::vector<CANDIDATES> at_end(graph.blocks.size(), 0);
    for (bool changed = true; changed;) {
        changed = false;
        for (auto b = graph.order.rbegin(); b != graph.order.rend(); ++b) {
            const CANDIDATES at_start = reads[*b] | (at_end[*b] & ~sets[*b]);
            for (size_t k = 0; k < graph.before[*b].size(); ++k) {
                CANDIDATES& end = at_end[graph.before[*b][k]];
                const CANDIDATES now = end | edge_reads[*b][k] | (at_start & ~edge_sets[*b][k]);
                changed |= now != end;
                end = now;
            }
        }
    }
    return at_end;
}

// ---- Statements on edges

namespace {

LIST** start_of_body(BBLK* bb) {
    LIST** link = &bb->statements;
    while (*link && (*link)->first && (*link)->first->op == SSA_PHI) link = &(*link)->rest;
    return link;
}

} // namespace

bool EDGE_STATEMENTS::may_insert(BBLK* from, BBLK* to) {
    if (from->is_in_LIR_form() || tree_is_EH_SWITCH(from->branch())) return false;
    return only_block(from->successors) || only_block(to->predecessors) || !ends_in_promise(from);
}

void EDGE_STATEMENTS::add(BBLK* from, BBLK* to, NODE* statement) { all.push_back({from, to, statement}); }

bool EDGE_STATEMENTS::insert_useful_blocks() {
    if (all.empty()) return false;
    std::stable_sort(all.begin(), all.end(), [](const ENTRY& a, const ENTRY& b) {
        return a.from->dfn != b.from->dfn ? a.from->dfn < b.from->dfn : a.to->dfn < b.to->dfn;
    });
    bool has_split = false;
    const BBLK *from = nullptr, *to = nullptr;
    BBLK* middle = nullptr; // of the edge of the last statement
    for (const ENTRY& e : all) {
        const bool is_same_edge = e.from == from && e.to == to;
        from = e.from;
        to = e.to;
        if (!is_same_edge) middle = nullptr;
        if (!middle && only_block(e.from->successors)) {
            insert_at_end_of_body(e.from, e.statement);
        } else if (!middle && only_block(e.to->predecessors)) {
            LIST** link = start_of_body(e.to);
            insert_before(link, e.statement, (*link)->psn);
        } else {
            if (!middle) {
                middle = split_cfg_edge(e.from, e.to, false);
                if (e.from->loop && e.to->loop && loop_callbacks.edge_was_split)
                    loop_callbacks.edge_was_split(e.from, middle, e.to);
                has_split = true;
            }
            insert_at_end_of_body(middle, e.statement);
        }
    }
    if (has_split) renumber_bblocks();
    all.clear();
    return has_split;
}
