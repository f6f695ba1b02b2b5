// The build of the loop hierarchy: shape, loops, symbols, variables, counts, and once more where a test was replicated.
//
// Needs: trees in normal form, alias marks. Leaves: a hierarchy, or none where the function can have none; block
// numbers.
// Sound because the tree is made anew from the graph after every change of it, and what earlier passes promised of a
// loop is taken into its record and put back in front of it.
#include "OPT5/alias/alias.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/dd/loop_shape.h"
#include "OPT5/dd/ssa_data.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <climits>
#include <cstdio>

bool BY_UID::operator()(const SYMTAB* a, const SYMTAB* b) const { return a->uid < b->uid; }

// ---- Records

LOOPIV::~LOOPIV() {
    for (NODE* t : {norm, ssa_norm, ssa_init, ssa_incr, init, last, incrtree, virtualInit})
        if (t) erase_tree(t);
    for (NODE* t : entryGivens) erase_tree(t);
}

LOOP::~LOOP() {
    erase_loop_pragmas(this);
    for (NODE* t : {trips, tripFactor, maxTrips, minTrips})
        if (t) erase_tree(t);
    for (NODE* t : givens) erase_tree(t);
}

namespace {

NODE* copied(const NODE* t) { return t ? copy_dd_tree(t) : nullptr; }
std::vector<NODE*> copied(const std::vector<NODE*>& trees) {
    std::vector<NODE*> copies;
    for (const NODE* t : trees) copies.push_back(copied(t));
    return copies;
}

std::unique_ptr<LOOPIV> copy_of(const LOOPIV& iv, struct LOOP* loop) {
    auto copy = std::make_unique<LOOPIV>();
    copy->loop = loop;
    copy->sym = iv.sym;
    copy->entryGivens = copied(iv.entryGivens);
    copy->norm = copied(iv.norm);
    copy->ssa_norm = copied(iv.ssa_norm);
    copy->ssa_init = copied(iv.ssa_init);
    copy->ssa_incr = copied(iv.ssa_incr);
    copy->init = copied(iv.init);
    copy->last = copied(iv.last);
    copy->incrtree = copied(iv.incrtree);
    copy->virtualInit = copied(iv.virtualInit);
    copy->highval = iv.highval;
    copy->lowval = iv.lowval;
    copy->flags = iv.flags;
    return copy;
}

// The copies are those of the loop `to`, whose control variables are among them.
void copy_LOOPIV_list(const struct LOOP& from, struct LOOP& to) {
    for (const auto& iv : from.IVs) {
        to.IVs.push_back(copy_of(*iv, &to));
        LOOPIV* copy = to.IVs.back().get();
        to.record_of[copy->sym] = copy;
        if (iv.get() == from.LCV) to.LCV = copy;
        if (iv.get() == from.VLCV) to.VLCV = copy;
    }
}

// The pragma fields that hold one tree.
constexpr NODE* LOOP::*PRAGMA_FIELDS[] = {
    &LOOP::mustIterate,          &LOOP::probIterate,        &LOOP::unrollPragma,       &LOOP::unrollAmountPragma,
    &LOOP::loopNoAliasPragma,    &LOOP::mmaLoopPragma,      &LOOP::sourceLoopPragma,   &LOOP::tripCntrMungedPragma,
    &LOOP::noAliasClonePragma,   &LOOP::loopFlagsPragma,    &LOOP::parallelLoopPragma, &LOOP::coalesceLoopPragma,
    &LOOP::noCoalesceLoopPragma, &LOOP::noNlcPragma,        &LOOP::spConstraintPragma, &LOOP::iiEstimatePragma,
    &LOOP::unitResourcesPragma,  &LOOP::spHindrancesPragma, &LOOP::readWritePragma,
};
constexpr std::vector<NODE*> LOOP::*PRAGMA_LISTS[] = {&LOOP::noAliasAdvice, &LOOP::aliasAdvice, &LOOP::alignAdvice,
                                                      &LOOP::inlineAdvice};
constexpr NODE* LOOP::*COUNT_FIELDS[] = {&LOOP::trips, &LOOP::tripFactor, &LOOP::maxTrips, &LOOP::minTrips};

void copy_facts(const struct LOOP& from, struct LOOP& to) {
    static_cast<LOOP_VALUES&>(to) = from;
    for (LOOPLV& lv : to.LVs) lv.loop = &to;
    copy_LOOPIV_list(from, to);
    for (auto field : COUNT_FIELDS) to.*field = copied(from.*field);
    for (auto field : PRAGMA_FIELDS) to.*field = copied(from.*field);
    for (auto list : PRAGMA_LISTS) to.*list = copied(from.*list);
    to.givens = copied(from.givens);
}

} // namespace

std::unique_ptr<struct LOOP> make_LOOP(BBLK* head, BBLK* tail, int uid, const struct LOOP* model) {
    auto loop = std::make_unique<struct LOOP>();
    if (model) copy_facts(*model, *loop);
    if (head) loop->head = head;
    if (tail) loop->tail = tail;
    if (uid >= 0) loop->uid = uid;
    return loop;
}

void erase_loop_pragmas(struct LOOP* loop) {
    for (auto field : PRAGMA_FIELDS) {
        if (loop->*field) erase_tree(loop->*field);
        loop->*field = nullptr;
    }
    for (auto list : PRAGMA_LISTS) {
        for (NODE* t : loop->*list) erase_tree(t);
        (loop->*list).clear();
    }
}

bool LOOP::is_bottom_tested() const {
    const NODE* branch = tail ? tail->branch() : nullptr;
    return branch && branch->op == IF && !is_root();
}

// ---- The tree

std::vector<struct LOOP*> loops_outer_first(struct LOOP* root) {
    std::vector<struct LOOP*> loops;
    loops.reserve(8); // most functions have fewer
    if (root) loops.push_back(root);
    for (size_t i = 0; i < loops.size(); ++i) {
        const struct LOOP* loop = loops[i];
        for (const BBLK* bb : loop->contents)
            if (bb->loop != loop) loops.push_back(bb->loop);
    }
    return loops;
}

std::vector<struct LOOP*> loops_inner_first(struct LOOP* root) {
    std::vector<struct LOOP*> loops = loops_outer_first(root);
    std::reverse(loops.begin(), loops.end());
    return loops;
}

void assign_loop_levels(struct LOOP* root, int level) {
    for (struct LOOP* loop : loops_outer_first(root)) {
        const int own = loop == root ? level : loop->parent->level + 1;
        if (own > INT16_MAX) {
            std::fprintf(stderr, "Too many nested loops:  %d\n", own);
            abort_optimizer();
        }
        loop->level = static_cast<int16_t>(own);
    }
}

// Depth first: each loop ahead of those in it, and these in the order of `contents`.
void assign_loop_numbers(struct LOOP* root, int number) {
    std::vector<struct LOOP*> waiting{root};
    while (!waiting.empty()) {
        struct LOOP* loop = waiting.back();
        waiting.pop_back();
        loop->uid = number++;
        const size_t first = waiting.size();
        for_each_subloop(loop, [&](struct LOOP* inner) { waiting.push_back(inner); });
        std::reverse(waiting.begin() + static_cast<std::ptrdiff_t>(first), waiting.end());
    }
}

void sort_loop_contents_into_DFO(struct LOOP* loop) {
    auto by_number = [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; };
    std::sort(loop->contents.begin(), loop->contents.end(), by_number);
    std::sort(loop->exits.begin(), loop->exits.end(), by_number);
}

struct LOOP* loop_root() {
    return currfuninfo && currfuninfo->bb_list ? currfuninfo->bb_list->loop : nullptr;
}

struct LOOP* innermost_common_loop(struct LOOP* a, struct LOOP* b) {
    while (a && b && a != b) {
        if (a->level >= b->level)
            a = a->parent;
        else
            b = b->parent;
    }
    return a && b ? a : nullptr;
}

bool loop_is_subloop_of_loop(const struct LOOP* inner, const struct LOOP* outer, bool or_same) {
    if (inner == outer) return or_same;
    while (inner && inner->level > outer->level) inner = inner->parent;
    return inner == outer;
}

bool loop_has_subloops(const struct LOOP* loop) {
    return std::any_of(loop->contents.begin(), loop->contents.end(),
                       [loop](const BBLK* bb) { return bb->loop != loop; });
}

bool bb_dominates_bb(BBLK* a, BBLK* b) {
    need(fact::dominators);
    return currfuninfo->dominators->dominates(a, b);
}
bool bb_post_dominates_bb(BBLK* a, BBLK* b) {
    need(fact::dominators);
    return currfuninfo->dominators->post_dominates(a, b);
}

// ---- Life

namespace {

HIERARCHY* hierarchy_of(FUNINFO* f) { return static_cast<HIERARCHY*>(f->hierarchy); }

void hold(std::unique_ptr<HIERARCHY> made) {
    OPT_ASSERT(!currfuninfo->hierarchy);
    currfuninfo->hierarchy = made.release();
}

bool is_back_edge(const BBLK* from, const BBLK* to) {
    return to->loop && to->loop->head == to && to->loop->tail == from && !to->loop->is_root();
}
void edge_was_split(BBLK* from, BBLK* middle, BBLK* to) {
    struct LOOP* loop = innermost_common_loop(from->loop, to->loop);
    middle->loop = loop;
    loop->contents.push_back(middle);
    if (to == loop->head && from == loop->tail) loop->tail = middle;
    for (struct LOOP* l = to->loop; l && l != loop; l = l->parent)
        if (l->head == to && l->preheader == from) l->preheader = middle;
}

void install_callbacks() {
    install_loop_callbacks();
    loop_callbacks.is_back_edge = is_back_edge;
    loop_callbacks.edge_was_split = edge_was_split;
}

} // namespace

void erase_loop_hierarchy() {
    if (!currfuninfo) return;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) bb->loop = nullptr;
    delete hierarchy_of(currfuninfo);
    currfuninfo->hierarchy = nullptr;
}

void unbuild_loop_hierarchy() {
    if (struct LOOP* root = loop_root()) reinsert_loop_pragmas(root);
    erase_loop_hierarchy();
}

// For a part of the tree whose blocks are gone.
void erase_loop_and_subloops(struct LOOP* loop) {
    auto& all = hierarchy_of(currfuninfo)->loops;
    for (const struct LOOP* gone : loops_inner_first(loop))
        all.erase(std::find_if(all.begin(), all.end(), [gone](const auto& l) { return l.get() == gone; }));
}

// ---- The build

namespace {

// Passes that fold loops, and move loads out of them, come here: they are not built yet.
void coalesce_compound_IF_statements() {}
void simplify_dd_loops(struct LOOP*, bool, bool) {}
bool gcm_scalar_memrefs(struct LOOP*) { return false; }
void maybe_clear_restrict_in_inner_loops() {}

bool find_tree(bool require_loops) {
    if (!shape_loops(require_loops)) return false;
    hold(discover_loops());
    need(fact::dominators);
    return true;
}

void find_symbols_and_variables(struct LOOP* root) {
    currfuninfo->has_nasserts = false;
    if (aux_cmd_flag[3] && !do_dd_for_be) return find_SSA_loop_vars_and_assertions();
    find_region_constants(root);
    find_loop_assertions(nullptr);
    find_loop_IVs(root);
    find_loop_assertions(nullptr);
}

} // namespace

void build_loop_hierarchy(bool full, bool scalars, bool simplify, int requireLoops) {
    install_callbacks();
    unbuild_loop_hierarchy();
    if (!find_tree(requireLoops < 0 ? full : requireLoops != 0)) return;
    for (;;) {
        find_symbols_and_variables(loop_root());
        if (scalars) prep_loop_variables(full);
        if (full && replicate_while_tests(loop_root())) {
            unbuild_loop_hierarchy();
            if (!find_tree(true)) return;
            continue;
        }
        if (!(full || scalars) || !gcm_scalar_memrefs(loop_root())) break;
    }
    if (full) constrain_all_ranges();
    coalesce_compound_IF_statements();
    if (simplify) simplify_dd_loops(loop_root(), true, true);
    if (full) {
        if (loop_work.propagate_values) loop_work.propagate_values();
        find_loop_assertions(nullptr);
        if (opt_level() >= 3) assert_pointer_alignments();
    }
    maybe_clear_restrict_in_inner_loops();
    if (full && unsigned_index_wraps) insert_affine_marks(loop_root());
    rebind_clones(loop_root());
    if (print_debug) dump_loop_hierarchy(loop_root());
}

LOOP_WORK loop_work;

void build_minimal_loop_hierarchy(bool requireLoops) {
    install_callbacks();
    unbuild_loop_hierarchy();
    find_tree(requireLoops);
}

// ---- Clones

namespace {

bool lies_within(const SOURCE_PLACE& place, const struct LOOP* loop) {
    return place.line && loop->sourceStart.line && place.file == loop->sourceStart.file &&
           place.line >= loop->sourceStart.line && place.line <= loop->sourceEnd.line;
}

struct LOOP* find_clone(struct LOOP* of, uint32_t flag) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        struct LOOP* other = bb->loop;
        if (other == of || other->head != bb || !other->has(flag)) continue;
        if (lies_within(other->sourceStart, of) && lies_within(other->sourceEnd, of)) return other;
        if (of->sourceLoopPragma && other->sourceLoopPragma &&
            trees_are_congruent(of->sourceLoopPragma, other->sourceLoopPragma, false))
            return other;
    }
    return nullptr;
}

void rebind_counterpart(struct LOOP* loop, uint32_t own, uint32_t others) {
    if (!loop->has(own)) return;
    loop->counterpart = find_clone(loop, others);
    if (!loop->counterpart) loop->flags &= ~own;
}

void rebind_reflection(struct LOOP* loop) {
    struct LOOP* other = nullptr;
    if (loop->has(LOOP_unaliased | LOOP_aligned | LOOP_has_trip_predicate))
        other = find_clone(loop, LOOP_conservative);
    else if (loop->has(LOOP_conservative)) {
        for (uint32_t flag : {LOOP_unaliased, LOOP_has_trip_predicate, LOOP_aligned})
            if (!other) other = find_clone(loop, flag);
        if (!other) loop->flags &= ~LOOP_conservative;
    }
    if (!other) return;
    loop->reflection = other;
    other->reflection = loop;
}

} // namespace

void rebind_clones(struct LOOP* root) {
    constexpr uint32_t ANY =
        LOOP_favored | LOOP_deprecated | LOOP_unaliased | LOOP_aligned | LOOP_has_trip_predicate | LOOP_conservative;
    for (struct LOOP* loop : loops_outer_first(root)) {
        if (!loop->has(ANY)) continue;
        rebind_counterpart(loop, LOOP_favored, LOOP_deprecated);
        rebind_counterpart(loop, LOOP_deprecated, LOOP_favored);
        rebind_reflection(loop);
    }
}

void unmark_singleton_clones(struct LOOP* root) {
    for (struct LOOP* loop : loops_outer_first(root)) {
        if (!loop->counterpart) loop->flags &= ~uint32_t(LOOP_favored | LOOP_deprecated);
        if (!loop->reflection)
            loop->flags &= ~uint32_t(LOOP_unaliased | LOOP_aligned | LOOP_conservative | LOOP_has_trip_predicate);
    }
}
