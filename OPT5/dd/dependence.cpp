// Dependence vectors of pairs of references.
//
// Needs: the loop hierarchy, trees in normal form, alias facts. Leaves: records at the references, while it is active.
// Sound because every step only takes out what cannot be, and a step that cannot decide leaves the vector as it is. The
// alias rules are asked in the outermost loop whose iterations may differ between the two references: what they tell of
// values that are the same there holds for each pair of its iterations. What a pragma promises is the program's word.
#include "OPT5/dd/dependence.h"

#include "OPT5/alias/alias.h"
#include "OPT5/dd/reference_form.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "UTIL/abort.h"

#include <algorithm>

thread_local bool dependence_analysis_enabled = false;

// ---- Life

namespace {

template <class F>
void for_each_block_of(struct LOOP* loop, const F& visit) {
    for (struct LOOP* l : loops_outer_first(loop))
        for (BBLK* bb : l->contents)
            if (bb->loop == l) visit(bb);
}

} // namespace

void flush_DDEPNODEs_for_loop(struct LOOP* loop) {
    for_each_block_of(loop, [](BBLK* bb) {
        for (const LIST* s = bb->statements; s; s = s->rest)
            for_each_node(s->first, [](NODE* t) {
                if (!t->rare().dependence) return;
                delete t->rare().dependence;
                t->make_rare().dependence = nullptr;
            });
    });
}

void init_dependence_analysis() {
    struct LOOP* root = loop_root();
    if (!root || dependence_analysis_enabled) optassert("root && !dependence_analysis_enabled", __FILE__, __LINE__);
    dependence_analysis_enabled = true;
    need(fact::alias | fact::points_to);
    redo_dependence_analysis(root);
}

// A change in one loop may be seen by references of another: all are made anew.
void redo_dependence_analysis(struct LOOP*) {
    if (!dependence_analysis_enabled) return;
    flush_DDEPNODEs_for_loop(loop_root());
    forget_facts_for_references();
    make_references(loop_root());
}

void wrapup_dependence_analysis(bool keep) {
    if (!keep && dependence_analysis_enabled && loop_root()) flush_DDEPNODEs_for_loop(loop_root());
    forget_facts_for_references();
    dependence_analysis_enabled = false;
}

DDEPNODE* get_DDEPNODE_from_tree(const NODE* t) {
    t = without_members(t);
    if (t->op == DDNODE) t = without_members(static_cast<const NODE*>(t->left));
    return t->op == UMULT ? t->rare().dependence : nullptr;
}

struct LOOP* get_loop_from_DDEPNODE_tree(const NODE* t) {
    const DDEPNODE* d = get_DDEPNODE_from_tree(t);
    return d ? d->block->loop : nullptr;
}

// ---- One pair

namespace {

// In units behind the address of the UMULT; false where that is not known. A bit-field is written with the unit around.
bool extent_of(const NODE* t, EXTENT* extent) {
    int64_t size = static_cast<int64_t>(t->type->size), bits = 0;
    if (t->op == STDOT && t->right->mval->is_bitfld) {
        const int64_t offset = static_cast<int64_t>(t->right->mval->offset);
        if (size <= 0) return false;
        bits = offset / size * size;
        size *= (offset + static_cast<int64_t>(t->right->mval->width) + size - 1) / size - offset / size;
        t = t->left;
    }
    for (; t->op == STDOT; t = t->left) bits += static_cast<int64_t>(t->right->mval->offset);
    if (size <= 0 || t->op != UMULT) return false;
    extent->low = bits / ADDRESS_UNIT_BITS;
    extent->high = (bits + size + ADDRESS_UNIT_BITS - 1) / ADDRESS_UNIT_BITS;
    return true;
}

const REFERENCE* reference_of(const NODE* t) { return static_cast<const REFERENCE*>(get_DDEPNODE_from_tree(t)); }

struct QUESTION {
    const NODE *v1, *v2;
    struct LOOP *l1, *l2;
    bool assumeRC = false;
    bool byType = true;
    int spec = 0;
    int order = 0;
    bool early = false; // only the vector in that order is wanted
    int sameLevels = 0; // of so many levels, from the outermost one, the iterations are the same

    bool is_one_access() const { return v1 == v2; }
};

class PAIR_TEST {
public:
    explicit PAIR_TEST(const QUESTION& question) : q(question), common(innermost_common_loop(q.l1, q.l2)) {}

    DDEP_PTR run() {
        auto v = std::make_unique<DDEP>(common->level, true);
        v->spec = q.spec;
        if (!apply_promises(v.get())) return nullptr;
        for (int k = 1; k <= std::min<int>(q.sameLevels, common->level); ++k) v->ddve(k).clr_FWD_BWD_dirs();
        if (q.early) v = make_feasible(std::move(v), q.order, q.is_one_access());
        if (!v || !lvalues_may_be_aliased(q.v1, q.v2, loop_of_differences(*v), q.byType)) return nullptr;
        if (!limit_by_trips(v.get())) return nullptr;
        if (lvalue_is_volatile(q.v1) || lvalue_is_volatile(q.v2)) return v;
        const REFERENCE *a = reference_of(q.v1), *b = reference_of(q.v2);
        EXTENT x, y;
        if (!a || !b || !extent_of(q.v1, &x) || !extent_of(q.v2, &y)) return v;
        if (a->block->loop != q.l1 || b->block->loop != q.l2) return v;
        return narrow_by_addresses(std::move(v), *a, x, *b, y, common, q.assumeRC);
    }

private:
    // What pragmas of the loops around say of accesses of the program's own objects.
    bool apply_promises(DDEP* v) const {
        if (may_be_an_internal_lvalue(q.v1) || may_be_an_internal_lvalue(q.v2)) return true;
        for (struct LOOP* l = common; !l->is_root(); l = l->parent) {
            if (l->parallelLoopPragma) v->ddve(l->level).clr_FWD_BWD_dirs();
            if (l->loopNoAliasPragma && !trees_are_congruent(base(q.v1), base(q.v2), false)) return false;
        }
        return true;
    }
    static const NODE* base(const NODE* t) {
        t = without_members(t);
        return t->op == UMULT ? t->left : t;
    }
    struct LOOP* loop_of_differences(const DDEP& v) const {
        int k = 1;
        while (k < v.count() && v.dve[static_cast<size_t>(k)].has_only_SAME_dir()) ++k;
        return loop_of_level(common, std::min<int>(k, common->level));
    }
    bool limit_by_trips(DDEP* v) const {
        for (struct LOOP* l = common; !l->is_root(); l = l->parent) {
            const WIDE last = last_iteration(l);
            if (last > DVE::LIMIT) continue;
            DVE& at = v->ddve(l->level);
            at.keep_min_distance(to_int65(-last)).keep_max_distance(to_int65(last));
            if (at.is_independent()) return false;
        }
        return true;
    }

    const QUESTION q;
    struct LOOP* common;
};

int sign_of(int v) { return (v > 0) - (v < 0); }

void require_lvalue(const NODE* t) {
    if (!op_is_lvalue(t->op)) optassert("is_lvalue(tree)", __FILE__, __LINE__);
}

bool is_in_irreducible_code(const struct LOOP* l1, const struct LOOP* l2) {
    if (!l1->irreducible && !l2->irreducible) return false;
    if (l1 == loop_root() && l2 == loop_root()) return true;
    debug_printf("\n loop%d or loop%d is not currfuninfo->bb_list->loop", l1->uid, l2->uid);
    abort_optimizer();
}

} // namespace

// Of irreducible code all iterations count as one of the function's body, in which either may come first.
void compute_dependence_vectors(DDEP_PTR* fwd, DDEP_PTR* bwd, int order, const NODE* v1, struct LOOP* l1,
                                const NODE* v2, struct LOOP* l2, bool assumeRC, int spec, bool byType) {
    require_lvalue(v1);
    require_lvalue(v2);
    if (is_in_irreducible_code(l1, l2)) {
        *fwd = std::make_unique<DDEP>(0, true);
        if (bwd) *bwd = std::make_unique<DDEP>(0, true);
        return;
    }
    QUESTION q{v1, v2, l1, l2};
    q.assumeRC = assumeRC;
    q.spec = spec;
    q.byType = byType;
    q.order = sign_of(order);
    q.early = !bwd;
    if (spec > 0 && l1 == l2) q.sameLevels = l1->level - spec;
    DDEP_PTR v = PAIR_TEST(q).run();
    if (bwd) {
        bwd->reset();
        if (v) {
            *bwd = std::make_unique<DDEP>(*v);
            (*bwd)->set_inverted();
            *bwd = make_feasible(std::move(*bwd), -q.order, v1 == v2);
        }
    }
    *fwd = v ? make_feasible(std::move(v), q.order, v1 == v2) : nullptr;
}

DDEP_PTR compute_full_dependence_vector(const NODE* v1, struct LOOP* l1, const NODE* v2, struct LOOP* l2) {
    require_lvalue(v1);
    require_lvalue(v2);
    if (is_in_irreducible_code(l1, l2)) return std::make_unique<DDEP>(0, true);
    return PAIR_TEST(QUESTION{v1, v2, l1, l2}).run();
}

// ---- Of one loop

namespace {

struct LOOP* loop_of_reference(const NODE* t, struct LOOP* otherwise) {
    struct LOOP* loop = get_loop_from_DDEPNODE_tree(t);
    return loop && loop_is_subloop_of_loop(loop, otherwise, true) ? loop : otherwise;
}

} // namespace

void compute_distances_for_loop(DVE* out, const NODE* v1, const NODE* v2, struct LOOP* loop) {
    out->set_ALL_dirs();
    if (!dependence_analysis_enabled || loop->irreducible) return;
    QUESTION q{v1, v2, loop_of_reference(v1, loop), loop_of_reference(v2, loop)};
    q.sameLevels = loop->level - 1;
    const DDEP_PTR v = PAIR_TEST(q).run();
    if (v)
        *out = v->ddve(loop->level);
    else
        out->clr_ALL_dirs();
}

bool lvalues_collide_in_iteration(const NODE* v1, const NODE* v2, struct LOOP* loop) {
    if (!dependence_analysis_enabled) return lvalues_may_be_aliased(v1, v2, loop);
    DVE at;
    compute_distances_for_loop(&at, v1, v2, loop);
    return at.has_SAME_dir();
}

bool lvalues_have_non_carried_dDeps_in_loop(const NODE* v1, const NODE* v2, struct LOOP* loop) {
    if (!dependence_analysis_enabled) return lvalues_may_be_aliased(v1, v2, loop);
    DVE at;
    compute_distances_for_loop(&at, v1, v2, loop);
    return at.is_dependent();
}

bool lvalues_are_dependent(const NODE* v1, const NODE* v2, struct LOOP* l1, struct LOOP* l2) {
    if (!dependence_analysis_enabled) return lvalues_may_be_aliased(v1, v2, loop_root());
    return compute_full_dependence_vector(v1, l1, v2, l2) != nullptr;
}

// ---- For people

namespace {

struct LISTED {
    const NODE* lvalue;
    const REFERENCE* record;
    long statement; // counted through the function
};

std::vector<LISTED> list_references() {
    std::vector<LISTED> all;
    long statement = 0;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest, ++statement)
            for_each_node(s->first, [&](NODE* t) {
                const DDEPNODE* d = t->rare().dependence;
                if (d) all.push_back({d->root, static_cast<const REFERENCE*>(d), statement});
            });
    return all;
}

void report_pair(const LISTED& x, const LISTED& y, int order) {
    DDEP_PTR forward, backward;
    compute_dependence_vectors(&forward, &backward, order, x.lvalue, x.record->block->loop, y.lvalue,
                               y.record->block->loop, false, 0);
    if (!forward && !backward) return;
    debug_printf("\t\taliases (%ld) %s   lexorder: %d\n", y.statement, tree_to_infix(y.lvalue).c_str(), order);
    if (forward) debug_printf("\t\t\t\tV1->V2: %s\n", forward->text().c_str());
    if (backward) debug_printf("\t\t\t\tV2->V1: %s\n", backward->text().c_str());
}

std::string text_of(const REFERENCE& r) {
    std::string all = r.sum.is_exact ? "" : "wrapping ";
    size_t i = 0;
    for (const LINEAR_FORM::TERM& t : r.sum) {
        const TERM_FACTS& f = r.facts[i++];
        all += std::to_string(t.coefficient) + "*" + tree_to_infix(t.tree);
        if (!f.counts) all += f.fixed_in ? "@" + std::to_string(f.fixed_in->level) : "@?";
        all += " + ";
    }
    return all + std::to_string(r.sum.constant);
}

} // namespace

// Of a reference the form in which it is compared too: the value of a term behind `@` is fixed in the loop of that level.
void report_all_dependences() {
    if (!loop_root() || !dependence_analysis_enabled) return;
    const std::vector<LISTED> all = list_references();
    const BBLK* last = nullptr;
    for (size_t i = 0; i < all.size(); ++i) {
        const LISTED& x = all[i];
        if (x.record->block != last) debug_printf("  BB%d:\n", x.record->block->dfn);
        last = x.record->block;
        debug_printf("\t(%ld) %s\n", x.statement, tree_to_infix(x.lvalue).c_str());
        debug_printf("\t\tin loop%d, %s\n", x.record->block->loop->uid, text_of(*x.record).c_str());
        for (size_t j = 0; j < all.size(); ++j)
            if (j != i) report_pair(x, all[j], static_cast<int>(j) - static_cast<int>(i));
    }
}
