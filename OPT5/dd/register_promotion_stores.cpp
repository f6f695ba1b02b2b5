// Stores to memory that register promotion takes out or moves: the mirror image of its loads.
//
// A store is removed that another store overwrites on every path, with nothing between that may read the place or make the
// difference seen. A store in a loop that runs ahead of each exit is made behind the loop once, on the edges out of it: in
// the loop its value lives in the temporary of the place.
//
// Needs: SSA form, as the loads left it. Leaves: nothing of what rests on the graph.
// Sound because what is inserted lies behind a store on every path, with nothing between that touches the place, so that
// nothing is stored where nothing was, and a store is removed only where another follows on every path. A call that may not
// return, assembly and a volatile access end such a path, and so do a statement that an exception may leave and a return; a
// block from which control does not come to the end of the function keeps its stores. Constant objects are not written at
// all.
#include "OPT5/dd/register_promotion.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frequencies.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <iterator>
#include <numeric>
#include <unordered_map>

namespace {

using CANDIDATE = PROMOTION_CANDIDATE;

constexpr int64_t MOST_QUESTIONS = 50000; // about statements, and 8 for each of them; later candidates are left alone
constexpr double LEAST_GAIN = 1.5; // stores that go for each that is inserted

// A store of a candidate, or a statement (none) that another store must not pass.
struct POINT {
    size_t block;
    LIST* cell; // null: a barrier
    bool is_deleted = false, is_saved = false;
};

struct STORED {
    CANDIDATE* c;
    std::vector<POINT> points; // by block and place
    double weight = 0;
};

constexpr size_t NOT_LISTED = SIZE_MAX;

// What a statement does that many candidates ask about.
struct SUMMARY {
    LIST* cell;
    const NODE* tree; // without the operators of SSA form over it
    size_t block;
    NODE* assignment = nullptr;        // of a definition, no compound one: the root
    const SSAVAR* stored = nullptr;    // which this is of
    bool is_barrier = false;           // for all
    bool is_indirect = false;          // accesses something through a pointer, or may
    bool is_memory = false;            // names what pointers may reach
    size_t number = NOT_LISTED;        // among the lists of accesses: of the tree, and
    size_t right_number = NOT_LISTED;  // of the value that it assigns
};

class STORE_PROMOTER {
public:
    explicit STORE_PROMOTER(PROMOTION_TEMPS& temps)
        : temps(temps), backward(true), forward(false), loops(*currfuninfo->loops) {}
    bool run(const std::vector<std::unique_ptr<CANDIDATE>>& candidates);

private:
    void summarize();
    SUMMARY summary_of(LIST* cell, size_t block);
    void find_stored(const std::vector<std::unique_ptr<CANDIDATE>>& candidates);
    bool touches(const NODE* tree, size_t& number, const COMPARED_LVALUE& place);
    void find_points(STORED& s);
    std::vector<size_t> statements_around(const SSAVAR* v) const;
    void spare_registers();
    void promote(std::vector<STORED*> stored);
    void fill_sets(MOTION& motion) const;
    void drop_poor_insertions(const MOTION& motion, INSERTIONS& inserted) const;
    void decide(const MOTION& motion, const INSERTIONS& inserted);
    void mark_deleted(size_t k, const std::vector<CANDIDATES>& overwritten);
    VALUE_LIFE life_of(const MOTION& motion, const INSERTIONS& inserted) const;
    void rewrite(STORED& s, CANDIDATES bit, const std::vector<CANDIDATES>& live);
    void rewrite_store(STORED& s, POINT& p);

    PROMOTION_TEMPS& temps;
    const MOTION_GRAPH backward, forward;
    const NATURAL_LOOPS& loops;
    const FREQUENCIES frequencies;
    std::vector<SUMMARY> statements;
    ACCESS_LISTS accesses; // of statements that were asked about, while they are as they were
    std::vector<size_t> indirect; // those that may touch what they do not name
    std::vector<size_t> memory;   // those that may touch what pointers reach
    std::unordered_map<const SYMTAB*, std::vector<size_t>> naming; // statements by symbol; looked up, never walked
    std::vector<STORED> all;
    std::vector<STORED*> batch;
    std::vector<bool> is_dead_end; // by block
    std::vector<BBLK*> has_empty_cells;
    EDGE_STATEMENTS on_edges;
    int64_t questions_left = 0;
    bool any = false;
};

SUMMARY STORE_PROMOTER::summary_of(LIST* cell, size_t block) {
    const NODE* t = below_SSA(static_cast<const NODE*>(cell->first));
    SUMMARY s{cell, t, block};
    s.is_barrier = t->op == RETURN || t->op == URETURN || may_leave_in_the_middle(t) ||
                   (cell->rest && tree_is_EH_SWITCH(cell->rest->first)) || tree_is_EH_SWITCH(t) || t->op == MEMCPY;
    for (NODE* n = cell->first; n && op_is_SSA(n->op) && n->op != SSA_USE; n = n->left)
        if (n->op == SSA_DEF && !s.is_barrier && below_SSA(n)->op == ASG) {
            s.assignment = ssa_assignment(n);
            s.stored = ssa_variable(n);
        }
    for_each_subtree(t, [&](const NODE* n) {
        if (n->op == NAME && n->u.sym) {
            std::vector<size_t>& in = naming[n->u.sym];
            if (in.empty() || in.back() != statements.size()) in.push_back(statements.size());
            s.is_memory |= !n->u.sym->is_function() && !only_its_name_reaches(n->u.sym);
        }
        s.is_indirect |= op_is_indirection(n->op) || op_is_call(n->op) || op_is_intrinsic(n->op);
    });
    return s;
}

void STORE_PROMOTER::summarize() {
    for (size_t b = 1; b < forward.blocks.size(); ++b)
        for (LIST* s = forward.blocks[b]->statements; s; s = s->rest)
            if (s->first && s->first->op != SSA_PHI && s->first->op != PPRAGMA) statements.push_back(summary_of(s, b));
    questions_left = MOST_QUESTIONS + 8 * static_cast<int64_t>(statements.size());
    for (size_t i = 0; i < statements.size(); ++i)
        if (statements[i].is_barrier || statements[i].is_indirect) indirect.push_back(i);
    for (size_t i = 0; i < statements.size(); ++i)
        if (statements[i].is_barrier || statements[i].is_indirect || statements[i].is_memory) memory.push_back(i);
}

bool may_be_stored_to(const CANDIDATE& c) {
    return !lvalue_is_immutable(c.reference) && !(c.variable->sym && symbol_is_immutable(c.variable->sym));
}

void STORE_PROMOTER::find_stored(const std::vector<std::unique_ptr<CANDIDATE>>& candidates) {
    std::unordered_map<const SSAVAR*, size_t> place; // looked up alone
    for (const auto& c : candidates) {
        if (!c->reference || !may_be_stored_to(*c)) continue;
        place[c->variable] = all.size();
        all.push_back({c.get(), {}});
    }
    std::vector<int> stores(all.size(), 0);
    for (const SUMMARY& s : statements) {
        auto at = s.stored ? place.find(s.stored) : place.end();
        if (at == place.end()) continue;
        const BBLK* bb = forward.blocks[s.block];
        stores[at->second] += loops.around(bb) ? 2 : 1;
        all[at->second].weight += frequencies.of(bb);
    }
    size_t kept = 0;
    for (size_t i = 0; i < all.size(); ++i)
        if (stores[i] > 1) {
            if (kept != i) all[kept] = std::move(all[i]);
            ++kept;
        }
    all.resize(kept, {nullptr, {}});
    std::stable_sort(all.begin(), all.end(), [](const STORED& a, const STORED& b) { return a.weight > b.weight; });
}

// The place itself, or the pointer to it. Memory without a declared type takes that of the last store: two stores stay in
// their order whatever their types.
bool STORE_PROMOTER::touches(const NODE* tree, size_t& number, const COMPARED_LVALUE& place) {
    if (number == NOT_LISTED) number = accesses.add(tree);
    return accesses.touches(number, place);
}

// The statements that may touch the place or the pointer to it, in order: those that name it, and those that may reach
// what they do not name.
std::vector<size_t> STORE_PROMOTER::statements_around(const SSAVAR* v) const {
    const std::vector<size_t>& others = v->pointer ? memory : indirect;
    auto at = naming.find(v->base());
    if (at == naming.end()) return others;
    std::vector<size_t> found;
    std::set_union(at->second.begin(), at->second.end(), others.begin(), others.end(), std::back_inserter(found));
    return found;
}

void STORE_PROMOTER::find_points(STORED& s) {
    const COMPARED_LVALUE place(s.c->variable->tree);
    for (size_t i : statements_around(s.c->variable)) {
        SUMMARY& at = statements[i];
        const bool stores = at.stored == s.c->variable;
        if (!stores && !at.is_barrier) --questions_left;
        if (stores ? touches(at.assignment->right, at.right_number, place) : at.is_barrier || touches(at.tree, at.number, place))
            s.points.push_back({at.block, nullptr});
        if (stores) s.points.push_back({at.block, at.cell});
    }
}

void STORE_PROMOTER::spare_registers() {
    std::unordered_map<const NATURAL_LOOP*, size_t> values; // looked up, never walked
    size_t kept = 0;
    for (size_t i = 0; i < all.size(); ++i) {
        std::vector<const NATURAL_LOOP*> in;
        for (const POINT& p : all[i].points)
            if (p.cell)
                for (const NATURAL_LOOP* l = loops.around(forward.blocks[p.block]); l; l = l->parent)
                    if (std::find(in.begin(), in.end(), l) == in.end()) in.push_back(l);
        if (std::any_of(in.begin(), in.end(), [&](const NATURAL_LOOP* l) { return values[l] >= MOST_VALUES_IN_LOOP; }))
            continue;
        for (const NATURAL_LOOP* l : in) ++values[l];
        if (kept != i) all[kept] = std::move(all[i]);
        ++kept;
    }
    all.resize(kept, {nullptr, {}});
}

void STORE_PROMOTER::fill_sets(MOTION& motion) const {
    for (size_t b : backward.order) {
        const CANDIDATES through = is_dead_end[b] ? 0 : ~CANDIDATES(0);
        motion.sets[b].passes = motion.sets[b].demands = through;
    }
    for (size_t k = 0; k < batch.size(); ++k)
        for_each_block(batch[k]->points, [&](size_t b, size_t begin, size_t end) {
            const CANDIDATES bit = CANDIDATES(1) << k;
            MOTION_SETS& s = motion.sets[b];
            if (is_dead_end[b]) return;
            if (batch[k]->points[end - 1].cell) s.ANTLOC |= bit;
            if (batch[k]->points[begin].cell) s.AVLOC |= bit;
            for (size_t i = begin; i < end; ++i)
                if (!batch[k]->points[i].cell) {
                    s.passes &= ~bit;
                    s.demands &= ~bit;
                }
        });
}

// Code on edges is worth it where it stands for stores of a loop.
void STORE_PROMOTER::drop_poor_insertions(const MOTION& motion, INSERTIONS& inserted) const {
    const std::vector<CANDIDATES> overwritten = motion.compute_AVOUT(inserted).AVIN;
    for (size_t k = 0; k < batch.size(); ++k) {
        const CANDIDATES bit = CANDIDATES(1) << k;
        double gone = 0, made = 0;
        for (size_t b : backward.order)
            for (size_t i = 0; i < inserted[b].size(); ++i)
                if (inserted[b][i] & bit)
                    made += frequencies.of_edge(backward.blocks[b], backward.blocks[backward.before[b][i]]);
        if (made == 0) continue;
        for_each_block(batch[k]->points, [&](size_t b, size_t, size_t end) {
            if (batch[k]->points[end - 1].cell && overwritten[b] & bit) gone += frequencies.of(backward.blocks[b]);
        });
        if (gone >= LEAST_GAIN * made) continue;
        for (size_t b : backward.order)
            for (CANDIDATES& i : inserted[b]) i &= ~bit;
    }
}

void STORE_PROMOTER::mark_deleted(size_t k, const std::vector<CANDIDATES>& overwritten) {
    STORED& s = *batch[k];
    for_each_block(s.points, [&](size_t b, size_t begin, size_t end) {
        bool is_overwritten = overwritten[b] >> k & 1;
        for (size_t i = end; i-- > begin;) {
            POINT& p = s.points[i];
            p.is_deleted = p.cell && is_overwritten && !is_dead_end[b];
            is_overwritten = p.cell != nullptr;
        }
    });
}

// What is stored on an edge is read there.
VALUE_LIFE STORE_PROMOTER::life_of(const MOTION& motion, const INSERTIONS& inserted) const {
    VALUE_LIFE life(motion);
    life.edge_reads = life.edge_sets = INSERTIONS(forward.blocks.size());
    for (size_t b : forward.order) {
        life.edge_reads[b].assign(forward.before[b].size(), 0);
        for (size_t k = 0; k < forward.before[b].size(); ++k) {
            const size_t p = forward.before[b][k];
            for (size_t i = 0; i < backward.before[p].size(); ++i)
                if (backward.before[p][i] == b) life.edge_reads[b][k] |= inserted[p][i];
        }
        life.edge_sets[b] = std::vector<CANDIDATES>(forward.before[b].size(), 0);
    }
    for (size_t k = 0; k < batch.size(); ++k)
        for (const POINT& p : batch[k]->points) life.sets[p.block] |= CANDIDATES(1) << k;
    return life;
}

void STORE_PROMOTER::decide(const MOTION& motion, const INSERTIONS& inserted) {
    const std::vector<CANDIDATES> overwritten = motion.compute_AVOUT(inserted).AVIN;
    const VALUE_LIFE life = life_of(motion, inserted);
    const std::vector<CANDIDATES> live = life.live_at_end(forward);
    for (size_t k = 0; k < batch.size(); ++k) {
        mark_deleted(k, overwritten);
        rewrite(*batch[k], CANDIDATES(1) << k, live);
    }
    for (size_t b : forward.order)
        for (size_t i = 0; i < forward.before[b].size(); ++i)
            for (size_t k = 0; k < batch.size(); ++k) {
                if (!(life.edge_reads[b][i] >> k & 1)) continue;
                CANDIDATE& c = *batch[k]->c;
                on_edges.add(forward.blocks[forward.before[b][i]], forward.blocks[b],
                             mk_ASG(copy_tree(c.reference, false), mk_NAME(temps.of(c))));
                any = true;
            }
}

void STORE_PROMOTER::rewrite_store(STORED& s, POINT& p) {
    NODE* t = below_SSA(p.cell->first);
    if (p.is_deleted) {
        any = true;
        if (print_debug)
            debug_printf("   Global SSA RP store deleted in BB%d:\t%s\n", forward.blocks[p.block]->dfn,
                         stmt2infix(t).c_str());
    }
    const SYMTAB* temp = p.is_saved ? temps.of(*s.c) : nullptr;
    const NODE* value = below_SSA(static_cast<const NODE*>(t->right));
    const bool is_mirrored = temp && value->op == NAME && value->u.sym == temp;
    if (!p.is_deleted && (!p.is_saved || is_mirrored)) return;
    NODE* place = t->left;
    if (p.is_deleted && (!p.is_saved || is_mirrored)) {
        NODE* rest = peel_for_effect(remove_SSA_operators_in_tree(t->right));
        t->right = nullptr;
        erase_tree(p.cell->first);
        p.cell->first = rest;
        if (!rest) has_empty_cells.push_back(forward.blocks[p.block]);
        return;
    }
    NODE** link = &p.cell->first;
    while (*link != t) link = &(*link)->left;
    t->left = mk_NAME(temps.of(*s.c), place->ls);
    note_changed_statement(p.cell);
    if (p.is_deleted) {
        NODE* operators = link == &p.cell->first ? nullptr : p.cell->first;
        *link = nullptr;
        erase_tree(operators);
        p.cell->first = t;
        return erase_tree(place);
    }
    NODE* store = maketree(ASG, place, mk_NAME(temps.of(*s.c), place->ls), t->type, t->ls);
    NODE* stores = store;
    if (link != &p.cell->first) {
        *link = store;
        stores = p.cell->first;
    }
    p.cell->first = t;
    note_changed_statement(insert_behind(p.cell, stores, p.cell->psn));
}

void STORE_PROMOTER::rewrite(STORED& s, CANDIDATES bit, const std::vector<CANDIDATES>& live) {
    for_each_block(s.points, [&](size_t b, size_t begin, size_t end) {
        bool is_live = live[b] & bit;
        for (size_t i = end; i-- > begin;) {
            POINT& p = s.points[i];
            p.is_saved = p.cell && is_live;
            is_live = false;
        }
    });
    for (POINT& p : s.points)
        if (p.cell) rewrite_store(s, p);
}

void STORE_PROMOTER::promote(std::vector<STORED*> stored) {
    batch = std::move(stored);
    MOTION motion(backward);
    fill_sets(motion);
    INSERTIONS inserted = motion.latest_insertions_off_back_edges(loops);
    drop_poor_insertions(motion, inserted);
    decide(motion, inserted);
    for (BBLK* bb : has_empty_cells) drop_empty_cells(&bb->statements);
    has_empty_cells.clear();
}

bool is_stored_to(const CANDIDATE& c) {
    return c.reference && may_be_stored_to(c) && std::any_of(c.events.begin(), c.events.end(), [](const PROMOTION_EVENT& e) {
               return e.kind == PROMOTION_EVENT::DEF;
           });
}

bool STORE_PROMOTER::run(const std::vector<std::unique_ptr<CANDIDATE>>& candidates) {
    summarize();
    find_stored(candidates);
    if (all.empty()) return false;
    is_dead_end = dead_ends(forward, loops);
    size_t known = 0;
    for (; known < all.size() && questions_left > 0; ++known) find_points(all[known]);
    all.resize(known, {nullptr, {}});
    spare_registers();
    size_t blocks = 0;
    for (size_t i = 0; i < all.size(); i += MOST_CANDIDATES) {
        blocks += forward.blocks.size();
        if (blocks > MOST_BLOCKS_OF_BATCHES) break;
        std::vector<STORED*> some;
        for (size_t k = i; k < std::min(i + MOST_CANDIDATES, all.size()); ++k) some.push_back(&all[k]);
        promote(std::move(some));
    }
    on_edges.insert_useful_blocks();
    return any;
}

} // namespace

bool promote_stores(const std::vector<std::unique_ptr<CANDIDATE>>& candidates, PROMOTION_TEMPS& temps) {
    if (std::none_of(candidates.begin(), candidates.end(), [](const auto& c) { return is_stored_to(*c); })) return false;
    need(fact::loops | fact::alias);
    return STORE_PROMOTER(temps).run(candidates);
}
