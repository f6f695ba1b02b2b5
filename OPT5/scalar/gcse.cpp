// Common subexpressions of a whole function: partial redundancies go.
//
// An expression that is computed where, on some path to there, it has been computed before is not computed there again:
// a temporary holds its value, and where the other paths have not computed it, they compute it at their end. What does
// not change in a loop is thereby computed ahead of it, if the loop computes it in any case.
//
// Needs: `annotate_cfg`, no loop hierarchy. Leaves: nothing where edges were split, what rests on the graph otherwise.
// A call of a function that only computes is an expression as any other; as a division, it is not made earlier than what may
// not return.
// Sound because a computation is placed only where every path from there computes the expression before its operands
// change (so that nothing is computed that was not, and nothing traps that did not; a statement that may not pass
// control on counts as a change for what may trap), and is taken away only where all paths have it in the temporary.
// A sum of multiples of variables does not count as changed by a statement that steps one of them by a constant: the
// temporary goes along there, in arithmetic that wraps, wherever it is read behind. So a + 5 * i is computed ahead of a loop
// over i. Not what addresses are made of: they become pointers later on.
// Of a statement with effects among its reads those operands take part that none of the effects may change.
// Edges that exceptions take, and those out of a block that ends in their dispatch, get no computation.
//
// What a block does to an expression is asked when some path brings the expression there, and the number of blocks that
// all expressions may reach is limited, so that time stays linear: sets of all expressions for all blocks would take the
// square of the function's size. Those for which that leaves something to gain are placed, many at a time, by the
// equations that register promotion uses for its loads (code_motion.h); elsewhere they count as changed.
//
// Sources: E. Morel, C. Renvoise, "Global Optimization by Suppression of Partial Redundancies", 1979; D. M. Dhamdhere,
// "Practical Adaptation of the Global Optimization Algorithm of Morel and Renvoise", 1991 (insertion on edges);
// R. Kennedy et al., "Strength Reduction via SSAPRE", 1998 (steps).
#include "OPT5/scalar/gcse.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/code_motion.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frequencies.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/gdflow.h"
#include "OPT5/scalar/subrange.h"
#include "OPT5/scalar/triples.h"
#include "OPT5/simp/exact.h"

#include <algorithm>
#include <deque>
#include <memory>
#include <numeric>
#include <unordered_map>
#include <unordered_set>

namespace {

// What is known of one expression in one block.
enum FACT_BIT : uint8_t {
    AVLOC = 1,   // computed behind all changes
    ALTERED = 2, // changed
    STAYS = 4,   // may trap, and control may not pass through
    PAVIN = 8,   // some path to the entry computes it
    REACHED = 16,
};

struct EVENT : MOTION_EVENT {
    const TRIPLE_SITE* site;               // null where the expression changes
    const TRIPLE_RENEWAL* renewal = nullptr; // of a DEF
    const TRIPLE_STEP* step = nullptr;       // of a STEP
};

// What all expressions of a function share.
struct FUNCTION {
    FUNCTION();

    const MOTION_GRAPH graph;
    const std::vector<bool> is_dead_end; // by block
    std::vector<uint8_t> facts; // by block; 0 between expressions
    FREQUENCIES runs;
    int64_t questions_left = 100000; // about writes to memory; beyond them every write is taken to change it
    int64_t blocks_left = 4000000;   // to be reached; beyond them expressions stay where they are
    std::unordered_set<const NODE*> gone; // nodes of trees that were taken away; membership only

    bool stands(const TRIPLE_SITE& s) const { return gone.count(*s.slot) == 0; }
    // The first change of the expression in a block ahead of the position, or the last; 0: there is none.
    int first_change(const TRIPLE& t, int block, bool with_memory);
    int last_change(const TRIPLE& t, int block, bool with_memory, int before = INT32_MAX);
    // By the statements of the block from the one position to ahead of the other.
    bool tree_is_unaltered(const TRIPLE& t, int block, int from, int before) {
        return last_change(t, block, t.reads_memory, before) < from;
    }

private:
    bool changes_it(const TRIPLE_WRITE& w, const TRIPLE& t);
    std::pair<const TRIPLE_WRITE*, const TRIPLE_WRITE*> memory_writes_in(int block) const {
        const auto b = static_cast<size_t>(block);
        return {writes_of_memory().data() + memory_writes[b], writes_of_memory().data() + memory_writes[b + 1]};
    }
    std::vector<size_t> memory_writes; // the first of each block
};

class EXPRESSION {
public:
    EXPRESSION(TRIPLE& t, int number, FUNCTION& function) : t(t), number(number), function(function) {}
    // Whether some path to where it is computed has computed it before. What it does in blocks is known then.
    bool may_be_redundant();
    void enter(MOTION& motion, CANDIDATES bit) const;

    TRIPLE& t;
    const int number;
    std::vector<EVENT> events; // by block and place

private:
    // The first and last change in a block, by position; 0: there is none.
    struct CHANGES {
        int first = 0, last = 0;
    };
    struct BLOCK {
        int block;
        uint8_t facts;
    };
    uint8_t& at(int block) {
        uint8_t& f = function.facts[static_cast<size_t>(block)];
        if (f == 0) reach(block, function.first_change(t, block, with_memory));
        return f;
    }
    void reach(int block, int change);
    void find_local_facts();
    void enter_block(int block, size_t begin, size_t end, const TRIPLE_RENEWAL* renewal);
    void enter_sites(size_t begin, size_t end, CHANGES c);
    void enter_steps(int block, size_t first_event, CHANGES c);
    bool renews(const TRIPLE_RENEWAL& r) const;
    bool compute_PAVIN();
    bool is_partially_available();

    FUNCTION& function;
    bool with_memory = false; // writes to memory count
    std::vector<int> touched;
    std::vector<BLOCK> region; // what some path brings it to
};

// The first one of a block or behind it. Writes are in the order of blocks and statements.
const TRIPLE_WRITE* first_in_block(const std::vector<TRIPLE_WRITE>& writes, int block) {
    return std::lower_bound(writes.data(), writes.data() + writes.size(), block,
                            [](const TRIPLE_WRITE& w, int b) { return w.block < b; });
}
std::pair<const TRIPLE_WRITE*, const TRIPLE_WRITE*> in_block(const std::vector<TRIPLE_WRITE>& writes, int block) {
    return {first_in_block(writes, block), first_in_block(writes, block + 1)};
}

FUNCTION::FUNCTION()
    : graph(false), is_dead_end(dead_ends(graph, *currfuninfo->loops)), facts(graph.blocks.size(), 0) {
    size_t w = 0;
    const std::vector<TRIPLE_WRITE>& writes = writes_of_memory();
    for (size_t b = 0; b <= graph.blocks.size(); ++b) {
        while (w < writes.size() && static_cast<size_t>(writes[w].block) < b) ++w;
        memory_writes.push_back(w);
    }
}

bool FUNCTION::changes_it(const TRIPLE_WRITE& w, const TRIPLE& t) {
    const auto write = static_cast<size_t>(&w - writes_of_memory().data());
    for (size_t lvalue : t.lvalues)
        if (!triples_alias_table.was_asked(lvalue, write)) --questions_left;
    if (t.is_asked_whole) --questions_left;
    return questions_left < 0 || write_may_alter(t, w);
}

int FUNCTION::first_change(const TRIPLE& t, int block, bool with_memory) {
    int first = 0;
    auto enter = [&first](int position) {
        if (!first || position < first) first = position;
    };
    for (const std::vector<TRIPLE_WRITE>* writes : t.writes) {
        const TRIPLE_WRITE* w = first_in_block(*writes, block);
        if (w != writes->data() + writes->size() && w->block == block) enter(w->position);
    }
    if (!with_memory) return first;
    const auto [begin, end] = memory_writes_in(block);
    for (const TRIPLE_WRITE* w = begin; w != end && (!first || w->position < first); ++w)
        if (changes_it(*w, t)) enter(w->position);
    return first;
}

int FUNCTION::last_change(const TRIPLE& t, int block, bool with_memory, int before) {
    int last = 0;
    for (const std::vector<TRIPLE_WRITE>* writes : t.writes) {
        const auto [begin, end] = in_block(*writes, block);
        for (const TRIPLE_WRITE* w = end; w != begin && w[-1].position > last; --w)
            if (w[-1].position < before) last = w[-1].position;
    }
    if (!with_memory) return last;
    const auto [begin, end] = memory_writes_in(block);
    for (const TRIPLE_WRITE* w = end; w != begin && w[-1].position > last; --w)
        if (w[-1].position < before && changes_it(w[-1], t)) last = w[-1].position;
    return last;
}

void EXPRESSION::reach(int block, int change) {
    --function.blocks_left;
    uint8_t f = REACHED;
    if (change) f |= ALTERED;
    if (t.may_trap) {
        const auto [begin, end] = in_block(statements_that_may_stay(), block);
        if (begin != end || function.is_dead_end[static_cast<size_t>(block)]) f |= STAYS;
    }
    function.facts[static_cast<size_t>(block)] = f;
    touched.push_back(block);
}

// What is computed between two changes matters to its block alone.
void EXPRESSION::enter_sites(size_t begin, size_t end, CHANGES c) {
    for (size_t i = begin; i < end; ++i) {
        const TRIPLE_SITE& s = t.sites[i];
        if (c.first && s.position > c.first && s.position <= c.last) continue;
        events.push_back({{MOTION_EVENT::USE, static_cast<size_t>(s.block), s.position, !s.is_certain}, &s});
        if (s.is_certain && s.position > c.last) at(s.block) |= AVLOC;
    }
}

void EXPRESSION::enter_block(int block, size_t begin, size_t end, const TRIPLE_RENEWAL* renewal) {
    CHANGES c;
    c.first = function.first_change(t, block, with_memory);
    if (c.first) c.last = std::max(c.first, function.last_change(t, block, with_memory));
    reach(block, c.first);
    size_t ahead = begin;
    const size_t first_event = events.size();
    while (ahead < end && (!c.first || t.sites[ahead].position <= c.first)) ++ahead;
    enter_sites(begin, ahead, c);
    if (!c.first) return enter_steps(block, first_event, c);
    const auto b = static_cast<size_t>(block);
    const bool is_renewed = renewal && renewal->position == c.last && renews(*renewal);
    if (c.first != c.last) events.push_back({{MOTION_EVENT::KILL, b, c.first}, nullptr});
    events.push_back({{is_renewed ? MOTION_EVENT::DEF : MOTION_EVENT::KILL, b, c.last}, nullptr, renewal});
    if (is_renewed) at(block) |= AVLOC;
    enter_sites(ahead, end, c);
    enter_steps(block, first_event, c);
}

// In a statement that steps, what it reads comes first.
void EXPRESSION::enter_steps(int block, size_t first_event, CHANGES c) {
    const auto begin = std::lower_bound(t.steps.begin(), t.steps.end(), block,
                                        [](const TRIPLE_STEP& s, int b) { return s.block < b; });
    for (auto s = begin; s != t.steps.end() && s->block == block; ++s) {
        if (c.first && s->position > c.first && s->position < c.last) continue;
        const EVENT step{{MOTION_EVENT::STEP, static_cast<size_t>(block), s->position}, nullptr, nullptr, &*s};
        events.insert(std::upper_bound(events.begin() + static_cast<ptrdiff_t>(first_event), events.end(), step,
                                       [](const EVENT& a, const EVENT& b) { return a.order < b.order; }),
                      step);
    }
}

void EXPRESSION::find_local_facts() {
    events.clear();
    size_t site = 0, renewal = 0, step = 0;
    while (site < t.sites.size() || renewal < t.renewals.size() || step < t.steps.size()) {
        const int of_site = site < t.sites.size() ? t.sites[site].block : INT32_MAX;
        const int of_renewal = renewal < t.renewals.size() ? t.renewals[renewal].block : INT32_MAX;
        const int of_step = step < t.steps.size() ? t.steps[step].block : INT32_MAX;
        const int block = std::min({of_site, of_renewal, of_step});
        while (step < t.steps.size() && t.steps[step].block == block) ++step;
        size_t end = site;
        while (end < t.sites.size() && t.sites[end].block == block) ++end;
        for (; renewal < t.renewals.size() && t.renewals[renewal].block == block; ++renewal) {}
        enter_block(block, site, end, block == of_renewal ? &t.renewals[renewal - 1] : nullptr);
        site = end;
    }
}

// The other expression is computed ahead of the assignment in the chain of blocks that each lead to one that is entered from
// nowhere else, and nothing changes it in between.
bool EXPRESSION::renews(const TRIPLE_RENEWAL& r) const {
    constexpr int MOST_BLOCKS = 4;
    const TRIPLE& other = unique_triples[r.other];
    if (!other.steps.empty()) return false;
    const BBLK* bb = r.bb;
    int before = r.position;
    for (int n = 0; n < MOST_BLOCKS; ++n, before = INT32_MAX) {
        const TRIPLE_SITE* last = nullptr;
        for (const TRIPLE_SITE& s : other.sites)
            if (s.block == bb->dfn && s.position <= before && s.is_certain && function.stands(s)) last = &s;
        if (!function.tree_is_unaltered(other, bb->dfn, last ? last->position : 1, before)) return false;
        if (last) return true;
        if (!bb->predecessors || bb->predecessors->rest) return false;
        bb = bb->predecessors->first;
        if (tree_is_EH_SWITCH(bb->branch())) return false; // a statement ahead of it may have been left in its middle
    }
    return false;
}

// Whether it comes to where it is computed ahead of any change.
bool EXPRESSION::compute_PAVIN() {
    if (print_debug >= 2) debug_printf("\n\tNext iteration of global PAVIN/PAVOUT loop\n");
    std::vector<const BBLK*> waiting;
    region.clear();
    auto enter_successors = [&](const BBLK* b) {
        for (const EDGE* s = b->successors; s; s = s->rest) {
            uint8_t& f = at(s->first->dfn);
            if (f & PAVIN) continue;
            f |= PAVIN;
            region.push_back({s->first->dfn, f});
            if (!(f & ALTERED) && !(f & AVLOC)) waiting.push_back(s->first);
        }
    };
    for (const TRIPLE_SITE& site : t.sites)
        if (at(site.block) & AVLOC) enter_successors(site.bb);
    for (const TRIPLE_RENEWAL& r : t.renewals)
        if (at(r.block) & AVLOC) enter_successors(r.bb);
    while (!waiting.empty() && function.blocks_left >= 0) {
        const BBLK* b = waiting.back();
        waiting.pop_back();
        enter_successors(b);
    }
    size_t last = 0; // block
    return function.blocks_left >= 0 && std::any_of(events.begin(), events.end(), [&](const EVENT& e) {
        if (e.kind == MOTION_EVENT::STEP) return false;
        const bool is_first = e.block != last;
        last = e.block;
        return is_first && e.site && (at(static_cast<int>(e.block)) & PAVIN);
    });
}

bool EXPRESSION::is_partially_available() {
    find_local_facts();
    const bool is_available = compute_PAVIN();
    for (int b : touched) function.facts[static_cast<size_t>(b)] = 0;
    touched.clear();
    return is_available;
}

bool EXPRESSION::may_be_redundant() {
    if (!is_partially_available()) return false;
    if (!t.reads_memory) return true;
    with_memory = true;
    return is_partially_available();
}

void EXPRESSION::enter(MOTION& motion, CANDIDATES bit) const {
    for (const BLOCK& b : region) {
        MOTION_SETS& s = motion.sets[static_cast<size_t>(b.block)];
        if (!(b.facts & ALTERED)) s.passes |= bit;
        if (!(b.facts & (ALTERED | STAYS))) s.demands |= bit;
    }
    for_each_block(events, [&](size_t b, size_t begin, size_t end) {
        int first_stay = INT32_MAX;
        if (t.may_trap) {
            const auto [stays, stays_end] = in_block(statements_that_may_stay(), static_cast<int>(b));
            if (stays != stays_end) first_stay = stays->position;
        }
        motion.enter_block(bit, events, begin, end, first_stay);
    });
}

// ---- Placing

// Expressions that are placed together.
class BATCH {
public:
    BATCH(const FUNCTION& function, std::vector<std::unique_ptr<EXPRESSION>>& expressions);
    // Whether the temporary of an expression pays; what is to be done is marked at its events then.
    bool decide(size_t k);
    // The blocks of edges on which it is computed.
    struct EDGE_PLACE {
        BBLK *from, *to;
    };
    const std::vector<EDGE_PLACE>& insertions() const { return inserted_on; }

private:
    void compute_PPIN();
    void find_insertions(CANDIDATES bit);
    bool is_given(size_t k) const;
    bool is_given_where_deleted(size_t k) const;
    bool pays(const EXPRESSION& e) const;
    void dump_annotations(size_t k) const;
    CANDIDATES needed_at_entry(size_t b) const { return life.reads[b] | (live[b] & ~life.sets[b]); }

    const FUNCTION& function;
    const MOTION_GRAPH& graph;
    std::vector<std::unique_ptr<EXPRESSION>>& expressions;
    MOTION motion;
    VALUE_LIFE life;
    INSERTIONS inserted;
    std::vector<CANDIDATES> AVIN, AVOUT, live; // the last: needed at exit
    CANDIDATES redundant = 0;
    std::vector<EDGE_PLACE> inserted_on;
};

BATCH::BATCH(const FUNCTION& function, std::vector<std::unique_ptr<EXPRESSION>>& expressions)
    : function(function), graph(function.graph), expressions(expressions), motion(graph), life(motion) {
    for (size_t k = 0; k < expressions.size(); ++k) expressions[k]->enter(motion, CANDIDATES(1) << k);
    compute_PPIN();
}

void BATCH::compute_PPIN() {
    inserted = motion.latest_insertions_off_back_edges(*currfuninfo->loops);
    MOTION::AVAILABLE known = motion.compute_AVOUT(inserted);
    AVIN = std::move(known.AVIN);
    AVOUT = std::move(known.AVOUT);
    for (size_t k = 0; k < expressions.size(); ++k)
        if (decide_reads(expressions[k]->events, CANDIDATES(1) << k, AVIN, life)) redundant |= CANDIDATES(1) << k;
    life.edge_sets = inserted;
    live = life.live_at_end(graph);
    for (size_t k = 0; k < expressions.size(); ++k) decide_saves(expressions[k]->events, CANDIDATES(1) << k, live);
}

void BATCH::find_insertions(CANDIDATES bit) {
    inserted_on.clear();
    for (size_t b : graph.order) {
        if (!(needed_at_entry(b) & bit)) continue;
        for (size_t i = 0; i < inserted[b].size(); ++i)
            if (inserted[b][i] & bit) inserted_on.push_back({graph.blocks[graph.before[b][i]], graph.blocks[b]});
    }
}

// A load counts for more than the operation that it is, a computation that may be left out for half.
bool BATCH::pays(const EXPRESSION& e) const {
    const double cost = e.t.cost;
    double gain = 0;
    size_t deleted = 0;
    size_t steps = 0;
    for (const EVENT& at : e.events) {
        if (at.kind == MOTION_EVENT::KILL) continue;
        steps += at.kind == MOTION_EVENT::STEP && at.is_saved;
        const double runs = function.runs.of(graph.blocks[at.block]);
        deleted += at.is_deleted;
        if (at.is_deleted)
            gain += (at.is_conditional ? cost / 2 : cost) * runs;
        else if (at.is_saved)
            gain -= runs;
    }
    for (const EDGE_PLACE& place : inserted_on) gain -= (cost + 1) * function.runs.of_edge(place.from, place.to);
    if (size_speed_goal() < 2 && inserted_on.size() + steps >= deleted) return false;
    return gain > 1e-6;
}

bool BATCH::decide(size_t k) {
    if (!(redundant >> k & 1)) return false;
    find_insertions(CANDIDATES(1) << k);
    if (!pays(*expressions[k]) || !is_given(k) || !is_given_where_deleted(k)) return false;
    if (print_debug >= 2) dump_annotations(k);
    return true;
}

// ---- Checks and dumps

// The temporary is set on each path to where it is read: nothing waits for it at the entry of the function.
bool BATCH::is_given(size_t k) const {
    const EXPRESSION& e = *expressions[k];
    const size_t entry = graph.order.front();
    if (!(needed_at_entry(entry) >> k & 1)) return true;
    debug_printf("\n\n!!! GCSE(): <%d> is not AVOUT||INSERT in BB %d %s\n", e.number, graph.blocks[entry]->dfn,
                 tree_to_infix(e.t.tree).c_str());
    return false;
}

bool BATCH::is_given_where_deleted(size_t k) const {
    const EXPRESSION& e = *expressions[k];
    bool is_given = true;
    for (const EVENT& at : e.events) {
        if (!at.is_deleted || at.is_local) continue;
        for (size_t i = 0; i < graph.before[at.block].size(); ++i) {
            if ((AVOUT[graph.before[at.block][i]] | inserted[at.block][i]) >> k & 1) continue;
            debug_printf("\n\n!!! GCSE(): <%d> is DELETE-AVOUT||INSERT in BB %d %s\n", e.number, at.site->block,
                         tree_to_infix(e.t.tree).c_str());
            is_given = false;
        }
    }
    return is_given;
}

// By block, what holds of the expression: its number, or nothing.
void BATCH::dump_annotations(size_t k) const {
    const std::string number = "{" + std::to_string(expressions[k]->number) + "}";
    auto line = [&](const char* format, CANDIDATES set) {
        debug_printf(format, set >> k & 1 ? number.c_str() : "{}"); // NOLINT: the formats below
    };
    for (size_t b : graph.order) {
        const MOTION_SETS& s = motion.sets[b];
        CANDIDATES inserted_behind = 0;
        for (size_t next : graph.after[b])
            for (size_t i = 0; i < inserted[next].size(); ++i)
                if (graph.before[next][i] == b) inserted_behind |= inserted[next][i];
        const CANDIDATES all = s.ANTLOC | s.AVLOC | s.passes | AVIN[b] | live[b] | inserted_behind;
        if (!(all >> k & 1)) continue;
        debug_printf("\n\nMore global dataflow data for BB->DFN %d\n", graph.blocks[b]->dfn);
        line("   ALTERED:\t%s\n", ~s.passes);
        line("   PPIN:\t%s\n", AVIN[b] & needed_at_entry(b));
        line("   PPOUT:\t%s\n", live[b]);
        line("   INSERT:\t%s\n", inserted_behind);
        line("   DELETE:\t%s\n", AVIN[b] & s.ANTLOC);
    }
}

// ---- Rewriting

class GLOBAL_CSE {
public:
    void run();

private:
    void find_steps();
    void order_triples();
    std::vector<std::unique_ptr<EXPRESSION>> next_batch();
    void place(std::vector<std::unique_ptr<EXPRESSION>>& expressions);
    void keep_what_stands(TRIPLE& t);
    bool must_wait(const EXPRESSION& e, const std::unordered_set<const NODE*>& held_back) const;
    bool is_induction(const TRIPLE& t) const;
    static void add_step(const TRIPLE_STEP& step, SYMTAB* temp);
    void apply(const EXPRESSION& e, const std::vector<BATCH::EDGE_PLACE>& insertions);
    void finish();

    FUNCTION function;
    std::deque<size_t> waiting;           // the triples still to be looked at, a tree ahead of what it consists of
    std::vector<NODE*> taken_away;        // erased at the end: they hold slots of other expressions
    STATEMENTS_AHEAD ahead;
    EDGE_STATEMENTS on_edges;
    // Outermost loops that step a variable; membership only.
    std::unordered_map<const SYMTAB*, std::unordered_set<const NATURAL_LOOP*>> stepped_in;
    int applied = 0;
};

// Sites within what another expression took away are none any more.
void GLOBAL_CSE::keep_what_stands(TRIPLE& t) {
    t.sites.past = std::remove_if(t.sites.begin(), t.sites.end(),
                                  [this](const TRIPLE_SITE& s) { return !function.stands(s); });
    if (!t.sites.empty()) t.tree = *t.sites.front().slot;
}

// What a loop steps: `x op= e`, or x = ... x ...
bool is_step(const NODE* statement, const SYMTAB* x) {
    return is_operator_assignment(statement) || (statement->op == ASG && sym_appears_in_tree(x, statement->right));
}

bool is_linear(const NODE* t) {
    return !any_subtree(t, [](const NODE* n) {
        switch (n->op) {
        case NAME:
        case ICON:
        case PLUS:
        case MINUS:
        case UMINUS:
        case SCONV:
        case PCONV:
        case PMCONV:
        case UAND: return false;
        case MULT:
        case SLL: return n->right->op != ICON;
        default: return true;
        }
    });
}

const NATURAL_LOOP* outermost_loop_around(const BBLK* bb) {
    const NATURAL_LOOP* loop = currfuninfo->loops->around(bb);
    while (loop && loop->parent) loop = loop->parent;
    return loop;
}

void GLOBAL_CSE::find_steps() {
    for (const TRIPLE& t : unique_triples)
        for (const SYMTAB* x : t.variables) {
            auto [at, is_new] = stepped_in.try_emplace(x);
            if (!is_new) continue;
            for (const TRIPLE_WRITE& w : writes_of_variable(x)) {
                const NATURAL_LOOP* loop = outermost_loop_around(function.graph.blocks[static_cast<size_t>(w.block)]);
                if (loop && is_step(w.statement, x)) at->second.insert(loop);
            }
        }
}

// A linear expression of a loop's counters is made a counter itself later on, which a temporary of its parts would
// hide.
bool GLOBAL_CSE::is_induction(const TRIPLE& t) const {
    if (!t.steps.empty() || !is_linear(t.tree)) return false;
    return std::any_of(t.sites.begin(), t.sites.end(), [&](const TRIPLE_SITE& site) {
        const NATURAL_LOOP* loop = outermost_loop_around(site.bb);
        return loop && std::any_of(t.variables.begin(), t.variables.end(),
                                   [&](const SYMTAB* x) { return stepped_in.at(x).count(loop) != 0; });
    });
}

// The temporary goes along with the variable.
void GLOBAL_CSE::add_step(const TRIPLE_STEP& step, SYMTAB* temp) {
    TYPE* type = temp->type;
    const INT65 by = truncate_to_type(INT65(0, step.amount), type), back = truncate_to_type(INT65(0, -step.amount), type);
    const int op = back < by ? MINUSASG : PLUSASG;
    NODE* t = maketree(op, mk_NAME(temp), mk_ICON(std::min(by, back), type), type, nullptr);
    if (print_debug) debug_printf("\tSR increment added in block %d:\t %s\n", step.block, stmt2infix(t).c_str());
    insert_behind(step.cell, t, step.cell->psn);
}

void GLOBAL_CSE::apply(const EXPRESSION& e, const std::vector<BATCH::EDGE_PLACE>& insertions) {
    const TRIPLE& t = e.t;
    const char letter = op_is_call(t.tree->op) ? 'K' : 'U'; // what a call gave, or else
    const bool steps = std::any_of(e.events.begin(), e.events.end(), [](const EVENT& at) {
        return at.kind == MOTION_EVENT::STEP && at.is_saved;
    });
    // What goes along with a variable may leave the type where the expression is not computed: it wraps.
    TYPE* type = steps ? tp->mk_unsigned(t.tree->type->stqs()) : t.tree->type->stqs();
    SYMTAB* temp = sym_temp(letter, -1, type, t.tree->ls);
    // So may the expression itself where it stands ahead of a step.
    auto copy = [&t, steps] { return steps ? as_wrapping(copy_tree(t.tree), nullptr) : copy_tree(t.tree); };
    auto set = [temp, type](NODE* value, auto* where) {
        return mk_ASG(mk_NAME(temp, where), coerce_to_type(type, value));
    };
    const std::string text = print_debug ? tree_to_infix(t.tree) : std::string();
    auto name = [temp](const NODE* like) { return coerce_to_type(like->type->stqs(), mk_NAME(temp, like->ls)); };
    for (const BATCH::EDGE_PLACE& p : insertions) {
        if (print_debug) debug_printf("\tInsertion in block %d:\t %s\n", p.from->dfn, text.c_str());
        on_edges.add(p.from, p.to, set(copy(), t.tree->ls));
    }
    for (const EVENT& at : e.events) {
        if (at.kind == MOTION_EVENT::KILL || !(at.is_deleted || at.is_saved)) continue;
        if (at.step) {
            add_step(*at.step, temp);
            continue;
        }
        if (at.renewal) { // it becomes a copy of what the other expression gave, once values are numbered
            LIST* cell = at.renewal->cell;
            insert_behind(cell, set(copy(), t.tree->ls), cell->psn);
            if (print_debug) debug_printf("\tTemp added in block %d:\t %s\n", at.renewal->block, temp->name);
            continue;
        }
        const TRIPLE_SITE& s = *at.site;
        NODE* value = *s.slot;
        *s.slot = name(value);
        if (at.is_deleted) {
            if (print_debug) debug_printf("\tDeletion in block %d:\t%s\t<==  %s\n", s.block, text.c_str(), temp->name);
            for_each_subtree(static_cast<const NODE*>(value), [this](const NODE* n) { function.gone.insert(n); });
            taken_away.push_back(value);
            continue;
        }
        // What it consists of is looked at later, and stands ahead of it then.
        ahead[s.cell].push_back({-++applied, set(value, value->ls)});
        if (print_debug) debug_printf("\tTemp added in block %d:\t %s\n", s.block, temp->name);
    }
}

void GLOBAL_CSE::finish() {
    for (BBLK* b = currfuninfo->bb_list; b; b = b->dflink) insert_statements_ahead(b, ahead);
    const bool has_split = on_edges.insert_useful_blocks();
    for (NODE* t : taken_away) erase_tree(t);
    if (!taken_away.empty()) sym_split(currfuninfo);
    const bool any = applied || has_split || !taken_away.empty();
    // A temporary may hold the address of an object that was only accessed.
    if (any) changed(has_split ? fact::none : fact::graph);
}

void GLOBAL_CSE::order_triples() {
    std::vector<size_t> order(unique_triples.size());
    std::iota(order.begin(), order.end(), size_t(0));
    std::stable_sort(order.begin(), order.end(),
                     [](size_t a, size_t b) { return unique_triples[a].cost > unique_triples[b].cost; });
    waiting.assign(order.begin(), order.end());
    function.questions_left += 64 * static_cast<int64_t>(triple_site_count);
    function.blocks_left += 256 * static_cast<int64_t>(triple_site_count);
}

std::vector<std::unique_ptr<EXPRESSION>> GLOBAL_CSE::next_batch() {
    std::vector<std::unique_ptr<EXPRESSION>> batch;
    for (; !waiting.empty() && batch.size() < MOST_CANDIDATES; waiting.pop_front()) {
        TRIPLE& t = unique_triples[waiting.front()];
        keep_what_stands(t);
        if (!t.sites.is_worth_a_look() || is_induction(t)) continue;
        auto e = std::make_unique<EXPRESSION>(t, static_cast<int>(waiting.front()), function);
        if (e->may_be_redundant()) batch.push_back(std::move(e));
    }
    return batch;
}

// What was decided rests on sites that are none any more, or a tree that it is part of has to wait.
bool GLOBAL_CSE::must_wait(const EXPRESSION& e, const std::unordered_set<const NODE*>& held_back) const {
    return std::any_of(e.t.sites.begin(), e.t.sites.end(), [&](const TRIPLE_SITE& s) {
        return !function.stands(s) || held_back.count(*s.slot) != 0;
    });
}

void GLOBAL_CSE::place(std::vector<std::unique_ptr<EXPRESSION>>& expressions) {
    BATCH batch(function, expressions);
    function.blocks_left -= static_cast<int64_t>(function.graph.blocks.size());
    std::unordered_set<const NODE*> held_back; // membership only
    std::vector<size_t> again;
    for (size_t k = 0; k < expressions.size(); ++k) {
        const EXPRESSION& e = *expressions[k];
        if (must_wait(e, held_back)) {
            again.push_back(static_cast<size_t>(e.number));
            for (const TRIPLE_SITE& s : e.t.sites)
                for_each_subtree(static_cast<const NODE*>(*s.slot), [&](const NODE* n) { held_back.insert(n); });
        } else if (batch.decide(k) && rewrite_is_allowed(*e.t.sites.front().slot)) {
            apply(e, batch.insertions());
        }
    }
    waiting.insert(waiting.begin(), again.begin(), again.end());
}

void GLOBAL_CSE::run() {
    order_triples();
    find_steps();
    for (auto batch = next_batch(); !batch.empty(); batch = next_batch()) place(batch);
    finish();
}

} // namespace

void gcse() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'gcse' ----------\n");
    if (unique_triples.empty()) return;
    need(fact::loops);
    GLOBAL_CSE().run();
}
