// Promotion of memory to registers: a scalar in memory that was read or written before is taken from a temporary.
//
// Each candidate has one temporary, which mirrors the place. A load whose value is known on every path becomes a read of
// the temporary, and where it is known on some paths a load is inserted on the others (code_motion.h). Loads that a loop
// does in each iteration are made ahead of it even where it may run no iteration, if the place is of fixed address: a
// benign load. The second sweep looks at stores too (register_promotion_stores.cpp).
//
// Needs: statements without assignments inside them where possible. Leaves: nothing of what rests on the graph.
// Sound because the temporary holds what the place holds wherever it is read: it is set at each load that is kept, at each
// store, and on edges, and from there to the read no chi, no write of the pointer and no statement that an exception may
// leave in its middle lies on any path. A load is inserted only where one follows on each path before the place may
// change, and, behind a pointer, before a call that may not return: `if (p) s += *p` reads nothing ahead of the test.
#include "OPT5/dd/register_promotion.h"

#include "OPT5/dd/dd.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frequencies.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/scalar/lowering.h"

#include <algorithm>
#include <cstring>
#include <unordered_map>

PROMOTION_CANDIDATE::~PROMOTION_CANDIDATE() { erase_tree(reference); }

SYMTAB* PROMOTION_TEMPS::of(PROMOTION_CANDIDATE& c) {
    if (c.temp) return c.temp;
    const SSAVAR* v = c.variable;
    std::vector<ENTRY>& at = entries[v->base()];
    for (const ENTRY& e : at)
        if (e.is_indirect == (v->pointer != nullptr) && e.start == v->start && e.length == v->length &&
            equiv_mtypes(e.temp->type, c.reference->type))
            return c.temp = e.temp;
    c.temp = sym_temp('v', -1, c.reference->type->stqs(), nullptr);
    at.push_back({v->pointer != nullptr, v->start, v->length, c.temp});
    return c.temp;
}

namespace {

using EVENT = PROMOTION_EVENT;
using CANDIDATE = PROMOTION_CANDIDATE;

// ---- Candidates

bool is_candidate(const SSAVAR* v) {
    if (v->has(SSAVAR_munged | SSAVAR_likely_register)) return false;
    const TYPE* type = v->tree->type;
    if (!type->is_scalar() || type->is_complex() || type->is_vector() || type->is_bool()) return false;
    const SYMTAB* base = v->base();
    if (base->level == 1 || base->cqual & CQ_GLOBAL_REGISTER) return false;
    if (v->pointer) return only_its_name_reaches(base) && good_CSE_tree(v->tree, false);
    if (is_optimizer_temp(base->name, 'v', 'v')) return false;
    return name_accessed(v->tree) || good_CSE_tree(v->tree, false);
}

// Whether a place that may be a candidate is named at all: many a function works on registers alone, and needs no SSA
// form here.
bool names_memory(const NODE* statement) {
    return any_subtree(statement, [](const NODE* t) {
        if (op_is_indirection(t->op)) return true;
        if (t->op != NAME || !t->u.sym || t->u.sym->is_function() || t->u.sym->level == 1) return false;
        const SYMTAB* sym = t->u.sym;
        const bool is_register = sym->level != 0 && sym->is_automatic() && !may_be_reached_by_pointers(sym);
        return !is_register || !sym->type->is_scalar() || t->type->size != sym->size;
    });
}

bool function_names_memory() {
    need(fact::alias_marks);
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest)
            if (s->first && !tree_is_arg_prolog(s->first) && names_memory(s->first)) return true;
    return false;
}

// ---- What happens to them

class COLLECTOR {
public:
    COLLECTOR(const std::vector<std::unique_ptr<CANDIDATE>>& all, const MOTION_GRAPH& graph, bool with_assertions)
        : first_stop(graph.blocks.size(), INT32_MAX), with_assertions(with_assertions) {
        for (const auto& c : all) {
            by_uid.resize(std::max<size_t>(by_uid.size(), c->variable->uid + 1), nullptr);
            by_uid[c->variable->uid] = c.get();
            if (c->variable->pointer) behind[c->variable->pointer].push_back(c.get());
        }
        for (block = 1; block < graph.blocks.size(); ++block) collect(graph.blocks[block]);
    }
    std::vector<int> first_stop; // by block: the first statement that may not come to its end

private:
    CANDIDATE* of(const NODE* t) const {
        const uint32_t uid = ssa_variable(t)->uid;
        return uid < by_uid.size() ? by_uid[uid] : nullptr;
    }
    void collect(const BBLK* bb);
    void walk(NODE** link, bool is_conditional);
    void visit(NODE** link, bool is_conditional);
    void definition(CANDIDATE* c, NODE* assignment);
    void push(CANDIDATE* c, EVENT::KIND kind, NODE** link = nullptr, bool is_conditional = false) {
        c->events.push_back({{kind, block, order, is_conditional}, cell, link});
    }

    std::vector<CANDIDATE*> by_uid;
    std::unordered_map<const SYMTAB*, std::vector<CANDIDATE*>> behind; // looked up, never walked
    const bool with_assertions;
    size_t block = 0;
    int order = 0;
    LIST* cell = nullptr;
    bool is_left_in_middle = false;
};

void COLLECTOR::collect(const BBLK* bb) {
    order = 0;
    for (cell = bb->statements; cell; cell = cell->rest, ++order) {
        NODE* t = cell->first;
        if (!t || t->op == SSA_PHI || tree_is_arg_prolog(t)) continue;
        if ((t->op == NASSERT || t->op == ASSERT) && !with_assertions) continue;
        is_left_in_middle = cell->rest && tree_is_EH_SWITCH(cell->rest->first);
        walk(&cell->first, t->op == NASSERT || t->op == ASSERT);
        if (first_stop[block] == INT32_MAX && may_leave_in_the_middle(below_SSA(t))) first_stop[block] = order;
        if (behind.empty()) continue;
        for_each_written_name(below_SSA(t), [this](const NODE* name, const NODE*) {
            auto at = behind.find(name->u.sym);
            if (at == behind.end()) return;
            for (CANDIDATE* c : at->second) push(c, EVENT::KILL);
        });
    }
}

// In the order of evaluation.
void COLLECTOR::walk(NODE** link, bool is_conditional) {
    NODE* t = *link;
    if (!t || (!t->left && !t->right)) return;
    if (opcode_is_ASG(t->op)) {
        walk(&t->right, is_conditional);
        walk(&t->left, is_conditional);
    } else {
        walk(&t->left, is_conditional);
        switch (t->op) {
        case IF:
        case SWITCH: break; // labels
        case ANDAND:
        case OROR:
        case QUEST: walk(&t->right, true); break;
        case COMMAOP:
            if (t->right) walk(&t->right, is_conditional || may_leave_in_the_middle(t->left));
            break;
        default: walk(&t->right, is_conditional);
        }
    }
    if (op_is_SSA(t->op)) visit(link, is_conditional);
}

void COLLECTOR::visit(NODE** link, bool is_conditional) {
    NODE* t = *link;
    CANDIDATE* c = of(t);
    if (!c) return;
    if (!c->reference && (t->op == SSA_USE || ssa_assignment(t)))
        c->reference = copy_tree_removing_SSA_operators(t->op == SSA_USE ? t->left : ssa_assignment(t)->left);
    if (t->op == SSA_USE)
        push(c, EVENT::USE, link, is_conditional);
    else if (t->op == SSA_CHI)
        push(c, EVENT::KILL);
    else if (t->op == SSA_DEF)
        definition(c, ssa_assignment(t));
}

// A compound assignment reads its place last of all.
void COLLECTOR::definition(CANDIDATE* c, NODE* assignment) {
    const bool is_step = assignment && assignment->op != ASG;
    const bool is_plain = assignment && !is_left_in_middle && !(is_step && tree_has_side_effects(assignment->right));
    if (is_step) {
        OPT_ASSERT(!c->events.empty() && c->events.back().cell == cell && c->events.back().kind == EVENT::USE);
        if (is_plain)
            c->events.back().is_step = true;
        else
            c->events.pop_back(); // it stays what it is
    }
    push(c, is_plain ? EVENT::DEF : EVENT::KILL);
}

// ---- Loads

class LOAD_PROMOTER {
public:
    LOAD_PROMOTER(const MOTION_GRAPH& graph, const std::vector<int>& first_stop, PROMOTION_TEMPS& temps,
                  const FREQUENCIES& frequencies, bool benign)
        : graph(graph), first_stop(first_stop), temps(temps), frequencies(frequencies), benign(benign),
          loops(*currfuninfo->loops), is_dead_end(dead_ends(graph, loops)) {}
    void run(const std::vector<CANDIDATE*>& batch, bool is_global);
    // What the batches decided: assignments take their places.
    bool finish();

private:
    void prepare_sets();
    void fill_sets(size_t k);
    void add_benign_loads(size_t k, const std::vector<CANDIDATES>& wanted, const std::vector<CANDIDATES>& known_behind);
    const BBLK* place_ahead(const CANDIDATE& c, const EVENT& use, const NATURAL_LOOP* loop) const;
    void decide(const INSERTIONS& inserted, const std::vector<CANDIDATES>& known);
    double gain_of(size_t k, const INSERTIONS& inserted, const VALUE_LIFE& life,
                   const std::vector<CANDIDATES>& live) const;
    bool store_may_leave_loop(const CANDIDATE& c, const EVENT& def) const;
    void rewrite(CANDIDATE& c);
    void rewrite_use(CANDIDATE& c, EVENT& e);
    void rewrite_step(CANDIDATE& c, EVENT& use, EVENT& def);
    void store_behind(CANDIDATE& c, EVENT& def, NODE* value);
    void tell(const char* what, CANDIDATE& c, const EVENT& e);
    NODE* load(CANDIDATE& c) {
        return mk_ASG(mk_NAME(temps.of(c)), copy_tree(c.reference, false));
    }

    const MOTION_GRAPH& graph;
    const std::vector<int>& first_stop;
    PROMOTION_TEMPS& temps;
    const FREQUENCIES& frequencies;
    const bool benign;
    const NATURAL_LOOPS& loops;
    const std::vector<bool> is_dead_end;
    std::vector<CANDIDATE*> batch;
    std::unique_ptr<MOTION> motion;
    std::unordered_map<const LIST*, std::vector<NODE*>> ahead; // statements to come ahead of one; looked up, never walked
    std::vector<bool> has_ahead;                               // by block
    EDGE_STATEMENTS on_edges;
    bool any = false;
};

void LOAD_PROMOTER::fill_sets(size_t k) {
    CANDIDATE& c = *batch[k];
    const CANDIDATES bit = CANDIDATES(1) << k;
    for_each_block(c.events, [&](size_t b, size_t begin, size_t end) {
        motion->enter_block(bit, c.events, begin, end, c.may_trap() ? first_stop[b] : INT32_MAX);
    });
    for (size_t header : c.cut) motion->sets[header].cut |= bit;
}

// A load behind a pointer is not wanted ahead of what may not come to its end.
void LOAD_PROMOTER::prepare_sets() {
    motion = std::make_unique<MOTION>(graph);
    CANDIDATES trapping = 0;
    for (size_t k = 0; k < batch.size(); ++k)
        if (batch[k]->may_trap()) trapping |= CANDIDATES(1) << k;
    for (size_t b : graph.order) {
        motion->sets[b].passes = ~CANDIDATES(0);
        motion->sets[b].demands = first_stop[b] != INT32_MAX || is_dead_end[b] ? ~trapping : ~CANDIDATES(0);
    }
    for (size_t k = 0; k < batch.size(); ++k) fill_sets(k);
}

// Where a load ahead of the loop stands for one in each iteration; null: there is no such place, or something in the loop
// may change what it reads.
const BBLK* LOAD_PROMOTER::place_ahead(const CANDIDATE& c, const EVENT& use, const NATURAL_LOOP* loop) const {
    if (!loop->is_reducible) return nullptr;
    for (const EVENT& e : c.events) {
        const BBLK* bb = graph.blocks[e.block];
        if (e.kind == EVENT::USE || !loops.contains(loop, bb)) continue;
        if (e.kind == EVENT::KILL) return nullptr;
        const bool is_behind = e.block == use.block ? e.order >= use.order : loops.dominates(graph.blocks[use.block], bb);
        if (!is_behind) return nullptr;
    }
    const BBLK* place = nullptr;
    const bool tests_first = edge_length(loop->header->successors) > 1;
    for (const EDGE* p = loop->header->predecessors; p; p = p->rest) {
        if (loops.contains(loop, p->first)) {
            // The test will move to the end, and a copy of it ahead of the loop: then a load between is safe.
            if (tests_first && !p->first->successors->rest) return nullptr;
            continue;
        }
        if (place || p->first->successors->rest) return nullptr;
        place = p->first;
    }
    return place;
}

void LOAD_PROMOTER::add_benign_loads(size_t k, const std::vector<CANDIDATES>& wanted,
                                     const std::vector<CANDIDATES>& known_behind) {
    CANDIDATE& c = *batch[k];
    const CANDIDATES bit = CANDIDATES(1) << k;
    std::vector<size_t> places;
    for (const EVENT& e : c.events) {
        if (e.kind != EVENT::USE || e.is_conditional) continue;
        const BBLK* bb = graph.blocks[e.block];
        for (const NATURAL_LOOP* loop = loops.around(bb); loop && loops.dominates_latches(bb, loop); loop = loop->parent) {
            const BBLK* place = place_ahead(c, e, loop);
            if (!place) break;
            const size_t at = static_cast<size_t>(place->dfn), header = static_cast<size_t>(loop->header->dfn);
            const bool is_known = known_behind[at] & bit;
            if (!is_known && !(wanted[header] & bit) && !(motion->sets[header].cut & bit)) places.push_back(at);
        }
    }
    std::sort(places.begin(), places.end());
    places.erase(std::unique(places.begin(), places.end()), places.end());
    for (size_t at : places) {
        EVENT load{{EVENT::USE, at, INT32_MAX, false, true}, nullptr, nullptr};
        c.events.insert(std::upper_bound(c.events.begin(), c.events.end(), load,
                                         [](const EVENT& a, const EVENT& b) { return a.block < b.block; }),
                        load);
    }
    if (!places.empty()) fill_sets(k);
}

void LOAD_PROMOTER::run(const std::vector<CANDIDATE*>& candidates, bool is_global) {
    batch = candidates;
    prepare_sets();
    if (!is_global) return decide(motion->no_insertions(), std::vector<CANDIDATES>(graph.blocks.size(), 0));
    if (benign && !loops.inner_first().empty()) {
        const std::vector<CANDIDATES> wanted = motion->compute_ANTIN();
        const std::vector<CANDIDATES> known = motion->compute_AVOUT(motion->no_insertions()).AVOUT;
        for (size_t k = 0; k < batch.size(); ++k)
            if (!batch[k]->may_trap()) add_benign_loads(k, wanted, known);
    }
    const INSERTIONS inserted = motion->latest_insertions_off_back_edges(loops);
    decide(inserted, motion->compute_AVOUT(inserted).AVIN);
}

void LOAD_PROMOTER::decide(const INSERTIONS& inserted, const std::vector<CANDIDATES>& known) {
    VALUE_LIFE life(*motion);
    CANDIDATES changed = 0;
    for (size_t k = 0; k < batch.size(); ++k)
        if (decide_reads(batch[k]->events, CANDIDATES(1) << k, known, life)) changed |= CANDIDATES(1) << k;
    if (!changed) return;
    life.edge_sets = inserted;
    const std::vector<CANDIDATES> live = life.live_at_end(graph);
    for (size_t k = 0; k < batch.size(); ++k) {
        const CANDIDATES bit = CANDIDATES(1) << k;
        if (!(changed & bit)) continue;
        decide_saves(batch[k]->events, bit, live);
        if (gain_of(k, inserted, life, live) < 0) {
            changed &= ~bit;
            continue;
        }
        any = true;
        rewrite(*batch[k]);
    }
    for (size_t b : graph.order)
        for (size_t i = 0; i < graph.before[b].size(); ++i) {
            const CANDIDATES read = changed & inserted[b][i] & (life.reads[b] | (live[b] & ~life.sets[b]));
            if (!read) continue;
            BBLK *from = graph.blocks[graph.before[b][i]], *to = graph.blocks[b];
            for (size_t k = 0; k < batch.size(); ++k) {
                if (!(read >> k & 1)) continue;
                debug_printf("   %s SSA RP load inserted in BB%d:\t%s\n", "Global", from->dfn,
                             tree_to_infix(batch[k]->reference).c_str());
                on_edges.add(from, to, load(*batch[k]));
            }
        }
}

// ---- What it is worth

// Nothing else in the innermost loop around it may change the place: the second sweep will move the store.
bool LOAD_PROMOTER::store_may_leave_loop(const CANDIDATE& c, const EVENT& def) const {
    const NATURAL_LOOP* loop = loops.around(graph.blocks[def.block]);
    return loop && std::none_of(c.events.begin(), c.events.end(), [&](const EVENT& e) {
        return e.kind == EVENT::KILL && loops.contains(loop, graph.blocks[e.block]);
    });
}

// The read of an object by its name costs an access and nothing else; each assignment to the temporary is an operation.
double LOAD_PROMOTER::gain_of(size_t k, const INSERTIONS& inserted, const VALUE_LIFE& life,
                              const std::vector<CANDIDATES>& live) const {
    const CANDIDATE& c = *batch[k];
    if (!name_accessed(c.reference)) return 0;
    double gone = 0, assigned = 0;
    for (size_t i = 0; i < c.events.size(); ++i) {
        const EVENT& e = c.events[i];
        const double runs = frequencies.of(graph.blocks[e.block]);
        if (e.kind == EVENT::USE && e.is_deleted && e.link) gone += runs;
        if (e.kind == EVENT::DEF && e.is_saved && store_may_leave_loop(c, e)) continue;
        if (e.is_saved || (e.is_step && e.is_deleted && !c.events[i + 1].is_saved)) assigned += runs;
    }
    for (size_t b : graph.order)
        for (size_t i = 0; i < graph.before[b].size(); ++i)
            if (inserted[b][i] & (life.reads[b] | (live[b] & ~life.sets[b])) & (CANDIDATES(1) << k)) {
                const double runs = frequencies.of_edge(graph.blocks[graph.before[b][i]], graph.blocks[b]);
                gone -= runs;
                assigned += runs;
            }
    return gone - assigned;
}

// ---- What the programmer is told, of loads in loops

// Another statement of the loop that may write to the place: not one that makes it another place.
const LIST* what_may_change(const CANDIDATE& c, const EVENT& use, const MOTION_GRAPH& graph) {
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    const NATURAL_LOOP* loop = loops.around(graph.blocks[use.block]);
    for (const EVENT& e : c.events) {
        if (e.kind != EVENT::KILL || !e.cell || !loop || !loops.contains(loop, graph.blocks[e.block])) continue;
        bool is_other_place = false;
        for_each_written_name(below_SSA(e.cell->first), [&](const NODE* name, const NODE*) {
            is_other_place |= name->u.sym == c.variable->pointer;
        });
        if (is_other_place) return nullptr;
        if (e.cell->psn && e.cell != use.cell) return e.cell;
    }
    return nullptr;
}

void tell_of_loads(const CANDIDATE& c, const MOTION_GRAPH& graph) {
    for (const EVENT& e : c.events) {
        if (e.kind != EVENT::USE || !e.cell || !e.link || !currfuninfo->loops->around(graph.blocks[e.block])) continue;
        const std::string place = "'" + reference_text(c.reference) + "'";
        if (e.is_deleted && c.temp)
            remark("promote", e.cell->psn, REMARK::DONE, place + " is read from a register");
        else if (const LIST* s = e.is_saved ? nullptr : what_may_change(c, e, graph))
            remark("promote", e.cell->psn, REMARK::MISSED,
                   place + " is read from memory in each iteration, since line " + std::to_string(s->psn->line) +
                       " may write to it: copy it into a local variable ahead of the loop, or declare pointers restrict");
    }
}

// ---- The trees

void LOAD_PROMOTER::tell(const char* what, CANDIDATE& c, const EVENT& e) {
    if (!print_debug) return;
    if (std::strcmp(what, "deleted") == 0)
        debug_printf("   %s SSA RP load deleted in BB%d:\t%s\t<==  %s\n", e.is_local ? "Local" : "Global",
                     graph.blocks[e.block]->dfn, tree_to_infix(c.reference).c_str(), temps.of(c)->name);
    else
        debug_printf("   %s SSA RP load inserted in BB%d:\t%s\n", "Global", graph.blocks[e.block]->dfn,
                     tree_to_infix(c.reference).c_str());
}

void LOAD_PROMOTER::rewrite_use(CANDIDATE& c, EVENT& e) {
    if (!e.link) { // a benign load, which another one may have made needless
        if (!e.is_saved) return;
        tell("inserted", c, e);
        return insert_at_end_of_body(graph.blocks[e.block], load(c));
    }
    if (!e.is_deleted && !e.is_saved) return;
    NODE* use = *e.link;
    *e.link = coerce_to_type(use->type->stqs(), mk_NAME(temps.of(c), use->ls));
    note_changed_statement(e.cell);
    if (e.is_deleted) {
        tell("deleted", c, e);
        return erase_tree(use);
    }
    ahead[e.cell].push_back(mk_ASG(mk_NAME(temps.of(c), use->ls), use));
    has_ahead.resize(graph.blocks.size(), false);
    has_ahead[e.block] = true;
}

// The statement gives its value to the temporary, and a new one behind it stores that.
void LOAD_PROMOTER::store_behind(CANDIDATE& c, EVENT& def, NODE* assignment) {
    NODE** link = &def.cell->first;
    while (*link != assignment) link = &(*link)->left;
    NODE *place = assignment->left, *stores = def.cell->first;
    NODE* store = maketree(ASG, place, mk_NAME(temps.of(c), place->ls), assignment->type, assignment->ls);
    assignment->left = mk_NAME(temps.of(c), place->ls);
    if (link == &def.cell->first)
        stores = store;
    else
        *link = store;
    def.cell->first = assignment;
    note_changed_statement(def.cell);
    note_changed_statement(insert_behind(def.cell, stores, def.cell->psn));
}

void LOAD_PROMOTER::rewrite_step(CANDIDATE& c, EVENT& use, EVENT& def) {
    if (!use.is_deleted && !def.is_saved) return;
    if (use.is_deleted)
        tell("deleted", c, use);
    else {
        ahead[use.cell].push_back(load(c));
        has_ahead.resize(graph.blocks.size(), false);
        has_ahead[use.block] = true;
    }
    NODE* assignment = below_SSA(def.cell->first);
    assignment->left = remove_SSA_operators_in_tree(assignment->left);
    store_behind(c, def, assignment);
}

void LOAD_PROMOTER::rewrite(CANDIDATE& c) {
    for (size_t i = 0; i < c.events.size(); ++i) {
        EVENT& e = c.events[i];
        if (e.kind == EVENT::USE && e.is_step)
            rewrite_step(c, e, c.events[i + 1]), ++i;
        else if (e.kind == EVENT::USE)
            rewrite_use(c, e);
        else if (e.kind == EVENT::DEF && e.is_saved)
            store_behind(c, e, below_SSA(e.cell->first));
    }
}

bool LOAD_PROMOTER::finish() {
    for (size_t b = 1; b < has_ahead.size(); ++b) {
        if (!has_ahead[b]) continue;
        LIST** pragmas = nullptr; // those that speak of what follows
        for (LIST** link = &graph.blocks[b]->statements; *link; link = &(*link)->rest) {
            LIST* cell = *link;
            auto it = ahead.find(cell);
            if (it != ahead.end()) {
                LIST** at = pragmas ? pragmas : link;
                for (NODE* t : it->second) at = insert_before(at, t, cell->psn);
                while (*link != cell) link = &(*link)->rest;
            }
            if (cell->first->op != PPRAGMA)
                pragmas = nullptr;
            else if (!pragmas)
                pragmas = link;
        }
    }
    on_edges.insert_useful_blocks();
    return any;
}

// ---- The registers of loops

// Of the values that live through a loop the best ones keep their place; the others are not kept across its header.
void spare_registers(const std::vector<CANDIDATE*>& candidates, const MOTION_GRAPH& graph,
                     const FREQUENCIES& frequencies) {
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    struct VALUE {
        double weight;
        CANDIDATE* c;
    };
    std::unordered_map<const NATURAL_LOOP*, std::vector<VALUE>> values; // looked up, never walked
    std::unordered_map<const NATURAL_LOOP*, double> own;                // of one candidate; below 0: it may change
    std::vector<const NATURAL_LOOP*> seen;
    for (CANDIDATE* c : candidates) {
        own.clear();
        seen.clear();
        for (const EVENT& e : c->events)
            for (const NATURAL_LOOP* l = loops.around(graph.blocks[e.block]); l; l = l->parent) {
                auto [at, is_new] = own.try_emplace(l, 0);
                if (is_new) seen.push_back(l);
                if (e.kind == EVENT::KILL) at->second = -1;
                if (at->second >= 0) at->second += frequencies.of(graph.blocks[e.block]);
            }
        for (const NATURAL_LOOP* l : seen)
            if (own[l] > 0) values[l].push_back({own[l], c});
    }
    for (const auto& l : loops.inner_first()) {
        std::vector<VALUE>& all = values[l.get()];
        if (all.size() <= MOST_VALUES_IN_LOOP) continue;
        std::stable_sort(all.begin(), all.end(), [](const VALUE& a, const VALUE& b) { return a.weight > b.weight; });
        for (size_t i = MOST_VALUES_IN_LOOP; i < all.size(); ++i)
            all[i].c->cut.push_back(static_cast<size_t>(l->header->dfn));
    }
}

// ---- A sweep

bool is_worth_it(const CANDIDATE& c, const MOTION_GRAPH& graph) {
    size_t accesses = 0;
    bool is_read = false, is_in_loop = false;
    for (const EVENT& e : c.events) {
        if (e.kind == EVENT::KILL) continue;
        ++accesses;
        is_read |= e.kind == EVENT::USE;
        is_in_loop |= currfuninfo->loops->around(graph.blocks[e.block]) != nullptr;
    }
    return is_read && (accesses > 1 || is_in_loop);
}

std::vector<std::unique_ptr<CANDIDATE>> find_candidates() {
    std::vector<std::unique_ptr<CANDIDATE>> found;
    for (const auto& v : ssa_variables())
        if (is_candidate(v.get())) found.push_back(std::make_unique<CANDIDATE>(v.get()));
    return found;
}

bool promote_loads(const std::vector<std::unique_ptr<CANDIDATE>>& all, PROMOTION_TEMPS& temps, bool with_assertions) {
    need(fact::loops);
    const MOTION_GRAPH graph(false);
    const COLLECTOR collector(all, graph, with_assertions);
    const FREQUENCIES frequencies;
    std::vector<CANDIDATE*> candidates;
    if (print_debug) debug_printf("\n\nSSA RP candidate variables:\n");
    for (const auto& c : all) {
        if (!c->reference) continue;
        if (print_debug) debug_printf("\t%s\n", tree_to_infix(c->reference).c_str());
        for (const EVENT& e : c->events)
            if (e.kind != EVENT::KILL) c->weight += frequencies.of(graph.blocks[e.block]);
        if (is_worth_it(*c, graph) && rewrite_is_allowed(c->reference)) candidates.push_back(c.get());
    }
    std::stable_sort(candidates.begin(), candidates.end(),
                     [](const CANDIDATE* a, const CANDIDATE* b) { return a->weight > b->weight; });
    spare_registers(candidates, graph, frequencies);
    LOAD_PROMOTER promoter(graph, collector.first_stop, temps, frequencies, with_assertions);
    size_t blocks = 0;
    for (size_t i = 0; i < candidates.size(); i += MOST_CANDIDATES) {
        const auto end = candidates.begin() + static_cast<long>(std::min(i + MOST_CANDIDATES, candidates.size()));
        blocks += graph.blocks.size();
        promoter.run({candidates.begin() + static_cast<long>(i), end}, blocks <= MOST_BLOCKS_OF_BATCHES);
    }
    if (remarks_are_wanted)
        for (const CANDIDATE* c : candidates) tell_of_loads(*c, graph);
    return promoter.finish();
}

enum SWEEP : uint8_t { DONE, LOADS_CHANGED, STORES_CHANGED };

// Stores are looked at in the form that the loads have left alone, since they go by what is still read.
SWEEP sweep(PROMOTION_TEMPS& temps, bool with_assertions, bool is_second) {
    construct_SSA_form(false, false, false, true);
    if (!function_is_in_SSA_form) return DONE;
    SWEEP result = DONE;
    {
        const std::vector<std::unique_ptr<CANDIDATE>> candidates = find_candidates();
        if (!candidates.empty() && promote_loads(candidates, temps, with_assertions)) result = LOADS_CHANGED;
        if (!candidates.empty() && (is_second || result == DONE) && promote_stores(candidates, temps))
            result = STORES_CHANGED;
    }
    deconstruct_SSA_form();
    if (result == DONE) return DONE;
    sym_split(currfuninfo);
    changed(fact::graph | fact::alias_marks);
    return result;
}

} // namespace

bool promote_vars_to_registers(bool with_assertions) {
    if (!currfuninfo || !currfuninfo->bb_list || !currfuninfo->stack_is_laid_out) return false;
    if (currfuninfo->saves_environment || TEST_FLAG(currfuninfo, FUN_is_interrupt)) return false;
    if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'promote_SSA_vars_to_registers' ------\n");
    if (!function_names_memory()) return false;
    PROMOTION_TEMPS temps;
    const SWEEP first = sweep(temps, with_assertions, false);
    if (first == LOADS_CHANGED) sweep(temps, with_assertions, true);
    if (first != DONE) promote_all_embedded_assignments();
    return first != DONE;
}
