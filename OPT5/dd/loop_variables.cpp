// Variables of loops beside their counts: who reads them, where they are dead, in which width they count, and the
// scalars that a loop assigns.
//
// Needs: the hierarchy with its variables; trees in normal form. Leaves: the same; where a variable is replaced by a
// narrower one its records follow, and live variables are not known any more.
// Sound because a variable is made narrower only if every value that it takes fits, the one with which the loop is left
// included: `for (k = 0; k < 32767; k += 2)` ends at 32768. Within a block a definition is forwarded as long as neither
// the variable nor what it was computed from may change.

#include "OPT5/dd/trip.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/dd.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>
#include <map>
#include <optional>

namespace {

// Of the loop and those in it.
template <class F>
void for_each_block(struct LOOP* top, F&& visit) {
    for (struct LOOP* loop : loops_outer_first(top))
        for (BBLK* bb : loop->contents)
            if (bb->loop == loop) visit(bb);
}

// A statement in normal form, simplified in the form that the simplifier knows.
NODE* simplified(NODE* t, struct LOOP* loop) {
    t = simp_tree(denormalize_tree(t, true), loop);
    return normalize_tree(t, t);
}

bool is_copy_of_counter(const SYMTAB* sym) { return is_optimizer_temp(sym->name, 'L', 'l'); }

} // namespace

// ---- The control variable

void check_if_LCV_used_in_loop(struct LOOP* loop, struct LOOP* inner) {
    LOOPIV* iv = loop->LCV;
    if (!iv) return;
    const BBLK* tested_in = loop->is_bottom_tested() ? loop->tail : loop->head;
    for_each_block(inner ? inner : loop, [&](BBLK* bb) {
        for (const LIST* s = bb->statements; s; s = s->rest) {
            INDUCTION_UPDATE update;
            const bool is_test = bb == tested_in && s->first->op == IF;
            const bool is_update = is_induction_update(s->first, &update) && update.sym == iv->sym;
            if (is_test || s->first->op == NASSERT || (is_update && !sym_appears_in_tree(iv->sym, update.amount)))
                continue;
            if (sym_appears_in_tree(iv->sym, s->first)) iv->flags |= IV_used_in_loop;
        }
    });
}

void check_if_LCV_dead_on_exit(struct LOOP* loop) {
    if (loop->LCV && is_copy_of_counter(loop->LCV->sym)) loop->LCV->flags |= IV_dead_on_exit;
}

namespace {

bool is_live_behind(const SYMTAB* sym, const struct LOOP* loop) {
    const int bit = live_index(sym);
    if (bit < 0) return true;
    return std::any_of(loop->exits.begin(), loop->exits.end(),
                       [bit](const BBLK* bb) { return !live_at_entry_is_known(bb) || is_live_at_entry(bb, bit); });
}

} // namespace

void find_IVs_dead_on_exit(struct LOOP* top) {
    need(fact::live_variables);
    for (struct LOOP* loop : loops_inner_first(top)) {
        if (loop->is_root()) continue;
        for (const auto& iv : loop->IVs)
            if (iv->has(IV_is_IV) && !iv->has(IV_is_RC | IV_is_VLCV | IV_dead_on_exit) &&
                !is_live_behind(iv->sym, loop))
                iv->flags |= IV_dead_on_exit;
    }
}

// ---- Narrower variables

namespace {

bool fits(const RANGE& r, TYPE* type) {
    return r.min >= to_wide(int_type_min(type)) && r.max <= to_wide(int_type_max(type));
}

std::optional<RANGE> range_of(const NODE* t, struct LOOP* loop) {
    RANGE r{0, 0};
    return bounds_of(t, loop, &r) ? r : std::optional<RANGE>();
}

// The values that an affine variable takes, until behind the loop.
std::optional<RANGE> course_of(const LOOPIV* iv, struct LOOP* loop) {
    if (!iv->init || !iv->incrtree || iv->incrtree->op != ICON || !loop->maxTrips || loop->maxTrips->op != ICON)
        return std::nullopt;
    auto r = range_of(iv->init, loop->parent);
    const INT65 trips = loop->maxTrips->u.lval;
    if (!r || trips > INT65(0x7fffffff)) return std::nullopt;
    // An iteration that is left before its end may have updated it.
    const WIDE updates = to_wide(trips) + (loop->is_bottom_tested() && !loop->has(LOOP_early_exit) ? 0 : 1);
    const WIDE distance = updates * to_wide(sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type));
    (distance > 0 ? r->max : r->min) += distance;
    return r;
}

class NARROWER {
public:
    NARROWER(LOOPIV* v, struct LOOP* l) : iv(v), loop(l), old(v->sym) {
        type = old->type->is_unsigned() ? tp->uint_t : tp->int_t;
    }

    bool is_possible() const {
        if ((iv->flags & 0x3400) != (IV_affine | IV_is_IV) || iv->virtualInit || !iv->last || is_copy_of_counter(old))
            return false;
        if (!old->type->is_int() || old->type->size <= tp->int_t->size || !only_its_name_reaches(old) ||
            sym_appears_in_EHT(old))
            return false;
        const auto course = course_of(iv, loop);
        if (!course || !fits(*course, type)) return false;
        auto last = range_of(iv->last, loop);
        if (last && iv == loop->LCV && first_test_holds(loop)) { // it lies behind the start
            if (iv->has(IV_increases)) last->min = std::max(last->min, course->min);
            if (iv->has(IV_decreases)) last->max = std::min(last->max, course->max);
        }
        return last && fits(*last, type) && has_only_updates();
    }

    void narrow() {
        if (print_debug) debug_printf("\nShortening this variable: %s\n", old->name);
        made = sym_temp('T', -1, type, old->scope);
        if (print_debug) debug_printf("  to its natural type: %s\n", type == tp->int_t ? "int" : "unsigned int");
        for_each_block(loop, [this](BBLK* bb) {
            for (LIST* s = bb->statements; s; s = s->rest)
                if (sym_appears_in_tree(old, s->first)) s->first = rewritten(s->first);
        });
        insert_at_end_of_body(loop->preheader, mk_ASG(mk_NAME(made), coerce_to_type(type, mk_NAME(old))));
        for (BBLK* bb : loop->exits)
            insert_before(&bb->statements, mk_ASG(mk_NAME(old), coerce_to_type(old->type->stqs(), mk_NAME(made))),
                          bb->statements->psn);
        update_records();
        forget_symbol_values();
        changed(fact::graph | fact::alias);
    }

private:
    bool has_only_updates() const {
        bool only = true;
        for_each_block(loop, [&](BBLK* bb) {
            for (const LIST* s = bb->statements; s && only; s = s->rest) {
                INDUCTION_UPDATE u;
                const bool is_update = is_induction_update(s->first, &u) && u.sym == old;
                if (is_update) {
                    only = u.amount->op == ICON && bb->loop == loop;
                    continue;
                }
                for_each_written_name(s->first,
                                      [&](const NODE* name, const NODE*) { only = only && name->u.sym != old; });
                only = only && !any_subtree(s->first, [this](const NODE* t) {
                           return t->op == UAND && t->left->op == NAME && t->left->u.sym == old;
                       });
            }
        });
        return only;
    }

    NODE* rewritten(NODE* t) {
        INDUCTION_UPDATE u;
        if (is_induction_update(t, &u) && u.sym == old) {
            const INT65 amount = sign_extend_by_type_size(u.amount->u.lval, u.amount->type);
            NODE* sum = maketree(PLUS, mk_NAME(made), mk_ICON(u.is_subtracted ? -amount : amount, type), type);
            NODE* update = mk_ASG(mk_NAME(made, t->ls), sum);
            update->ls = t->ls;
            erase_tree(t);
            return normalize_tree(update, update);
        }
        t = rewrite_tree(denormalize_tree(t, true), [this](NODE* n) { return of_narrower(n); });
        return normalize_tree(simp_tree(t, loop), nullptr);
    }

    NODE* of_narrower(NODE* n) {
        if (n->op == NAME && n->u.sym == old) {
            NODE* name = mk_NAME(made, n->ls);
            erase_tree(n);
            return coerce_to_type(old->type->stqs(), name);
        }
        return op_is_int_compare(n->op) ? compared_narrow(n) : n;
    }

    // (long)v < n as v < (int)n, where n fits.
    NODE* compared_narrow(NODE* n) {
        auto is_widened = [this](const NODE* t) {
            return t->op == SCONV && t->left->op == NAME && t->left->u.sym == made;
        };
        NODE **wide = is_widened(n->left) ? &n->left : &n->right, **other = wide == &n->left ? &n->right : &n->left;
        if (!is_widened(*wide) || (*other)->type->is_unsigned() != type->is_unsigned()) return n;
        const auto r = range_of(*other, loop);
        if (!(r && fits(*r, type)) && !is_limit(*other)) return n;
        NODE* cast = *wide;
        *wide = cast->left;
        erase_node(cast);
        *other = simp_tree(coerce_to_type(type, *other), loop);
        return n;
    }

    bool is_limit(const NODE* t) const {
        NODE* limit = denormalized_copy(iv->last);
        const bool is = iv == loop->LCV && trees_are_congruent(t, limit, false);
        erase_tree(limit);
        return is;
    }

    // The old variable stays at its first value in the loop: what names it there is about the new one.
    void update_record(NODE** t) {
        if (!*t || !sym_appears_in_tree(old, *t)) return;
        NODE* renamed = rewrite_tree(denormalize_tree(*t, false), [this](NODE* n) {
            if (n->op != NAME || n->u.sym != old) return n;
            erase_node(n);
            return coerce_to_type(old->type->stqs(), mk_NAME(made));
        });
        *t = normalize_tree(simp_tree(renamed, nullptr), nullptr);
    }

    void update_records() {
        std::replace(loop->IV_syms.begin(), loop->IV_syms.end(), old, made);
        loop->record_of.erase(old);
        loop->record_of[made] = iv;
        iv->sym = made;
        for (NODE** t : {&iv->init, &iv->last})
            *t = normalize_tree(simp_tree(coerce_to_type(type, denormalize_tree(*t, false)), loop), nullptr);
        const INT65 step = sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type);
        erase_tree(iv->incrtree);
        iv->incrtree = mk_ICON(step, tp->int_t);
        iv->lowval = std::max(iv->lowval, int_type_min(type));
        iv->highval = std::min(iv->highval, int_type_max(type));
        for (struct LOOP* l : loops_outer_first(loop)) {
            if (l->RC_syms.erase(old)) l->RC_syms.insert(made);
            if (l != loop) update_record(&l->trips);
            for (NODE*& fact : l->givens) update_record(&fact);
            for (const auto& of : l->IVs)
                if (of.get() != iv)
                    for (NODE** t : {&of->init, &of->last, &of->incrtree, &of->virtualInit}) update_record(t);
        }
        for (struct LOOP* l = loop; l; l = l->parent) l->ALT_syms.insert(made);
    }

    LOOPIV* const iv;
    struct LOOP* const loop;
    SYMTAB* const old;
    SYMTAB* made = nullptr;
    TYPE* type;
};

} // namespace

void shorten_long_IVs(struct LOOP* loop) {
    if (tp->int_t->size == tp->long_t->size || loop->is_root()) return;
    std::vector<LOOPIV*> all;
    for (const auto& iv : loop->IVs) all.push_back(iv.get());
    for (LOOPIV* iv : all) {
        NARROWER narrower(iv, loop);
        if (narrower.is_possible()) narrower.narrow();
    }
}

// Stops of the sequence that do nothing on these targets.
void lengthen_short_IVs(struct LOOP*) {}
void add_downcounters_to_loops(struct LOOP*, bool, bool) {}

// ---- Scalars that a loop assigns

namespace {

class SCALARS {
public:
    explicit SCALARS(struct LOOP* l) : loop(l) {}

    void find() {
        loop->LVs.clear();
        for (BBLK* bb : loop->contents)
            if (bb->loop == loop)
                for (const LIST* s = bb->statements; s; s = s->rest) enter(s->first, bb, false);
        for (auto& [sym, lv] : found)
            if (lv.defs || lv.usingDefs) loop->LVs.push_back(lv);
    }

private:
    static void count(uint16_t& counter) {
        counter = std::min<uint16_t>(static_cast<uint16_t>(counter + 1), MOST_LV_COUNT);
    }

    LOOPLV* record(const NODE* name, BBLK* bb) {
        SYMTAB* sym = name->u.sym;
        if (!sym || !sym->type->is_scalar() || find_LOOPIV_for_IV(sym, loop, false)) return nullptr;
        LOOPLV& lv = found[sym];
        lv.loop = loop;
        lv.sym = sym;
        if (!lv.firstBB) lv.firstBB = bb;
        lv.lastBB = bb;
        return &lv;
    }

    void enter(const NODE* t, BBLK* bb, bool dereferenced) {
        if (!t || t->op == NASSERT || t->op == PPRAGMA) return;
        if (t->op == NAME) {
            if (LOOPLV* lv = record(t, bb)) count(dereferenced ? lv->derefUses : lv->uses);
            return;
        }
        const bool writes = writes_left_operand(t->op) && t->left && t->left->op == NAME;
        if (writes) {
            if (LOOPLV* lv = record(t->left, bb)) {
                const bool reads_itself = t->op != ASG || sym_appears_in_tree(t->left->u.sym, t->right);
                count(reads_itself ? lv->usingDefs : lv->defs);
            }
        } else
            enter(t->left, bb, t->op == UMULT || dereferenced);
        enter(t->right, bb, dereferenced);
    }

    struct LOOP* const loop;
    std::map<SYMTAB*, LOOPLV, BY_UID> found;
};

void set_flags_of(LOOPLV& lv, struct LOOP* loop) {
    if (is_optimizer_temp(lv.sym->name, 'a', 'a')) {
        lv.flags = LV_dead_on_exit | LV_dead_on_entry;
        return;
    }
    const int bit = live_index(lv.sym);
    if (bit >= 0) {
        if (!is_live_behind(lv.sym, loop)) lv.flags |= LV_dead_on_exit;
        if (live_at_entry_is_known(loop->head) && !is_live_at_entry(loop->head, bit)) lv.flags |= LV_dead_on_entry;
    }
    auto* sym = lv.sym;
    auto note = [&lv, sym](struct LOOP* other) {
        if (find_LOOPLV_for_LV(sym, other)) lv.flags |= LV_defined_elsewhere | LV_used_elsewhere;
        if (other->RC_syms.count(sym)) lv.flags |= LV_used_elsewhere;
    };
    for (struct LOOP* l = loop->parent; l && !l->is_root(); l = l->parent) note(l);
    for (struct LOOP* l : loops_outer_first(loop))
        if (l != loop) note(l);
}

void find_LVs(struct LOOP* top) {
    need(fact::live_variables);
    const std::vector<struct LOOP*> loops = loops_outer_first(top);
    for (struct LOOP* loop : loops) SCALARS(loop).find();
    for (struct LOOP* loop : loops)
        if (!loop->is_root())
            for (LOOPLV& lv : loop->LVs) set_flags_of(lv, loop);
}

// ---- Forwarding within a block

constexpr int MOST_NODES = 999;

// What a definition may put in place of its variable without work.
bool is_forwarded(const NODE* t) {
    return t->op == ASG && is_private_name(t->left) && (t->right->op == ICON || is_private_name(t->right)) &&
           t->left->type->is_int() && t->right->type->is_int() && t->left->type->size == t->right->type->size &&
           t->left->type->is_unsigned() == t->right->type->is_unsigned() &&
           !sym_appears_in_tree(t->left->u.sym, t->right);
}

bool forward_in_block(BBLK* bb, struct LOOP* loop) {
    bool any = false;
    std::vector<const NODE*> definitions;
    for (LIST* s = bb->statements; s; s = s->rest) {
        NODE* t = s->first;
        if (t->op == PPRAGMA) continue;
        bool changed = false;
        for (const NODE* d : definitions) {
            if (!sym_appears_in_tree(d->left->u.sym, t) || count_nodes_in_tree(t) > MOST_NODES ||
                tree_modifies_lvalue_in_tree(t, d->left) || tree_modifies_lvalue_in_tree(t, d->right))
                continue;
            t = subst_tree_for_lvalue_in_tree(d->right, d->left, t);
            changed = true;
        }
        s->first = t = changed ? simplified(t, loop) : t;
        any |= changed;
        definitions.erase(std::remove_if(definitions.begin(), definitions.end(),
                                         [t](const NODE* d) {
                                             return tree_modifies_lvalue_in_tree(t, d->left) ||
                                                    tree_modifies_lvalue_in_tree(t, d->right);
                                         }),
                          definitions.end());
        if (is_forwarded(t)) definitions.push_back(t);
    }
    return any;
}

void make_plain(BBLK* bb) {
    for (LIST* s = bb->statements; s; s = s->rest)
        if (op_of_opASG[s->first->op] != ILLOP && is_private_name(s->first->left)) s->first = opASG_to_ASG(s->first);
}

} // namespace

void prop_scalars_in_loop(struct LOOP* top, bool recurse, bool) {
    const std::vector<struct LOOP*> loops = recurse ? loops_outer_first(top) : std::vector<struct LOOP*>{top};
    for (struct LOOP* loop : loops)
        for (BBLK* bb : loop->contents) {
            if (bb->loop != loop) continue;
            make_plain(bb);
            for (int n = 0; n < 4 && forward_in_block(bb, loop); ++n) {
            }
        }
    for (struct LOOP* loop : loops)
        for (const auto& iv : loop->IVs) iv->flags &= ~IV_order;
    forget_symbol_values();
    changed(fact::graph | fact::alias);
}

// Invariants that are constants.
void prop_IVs_and_RCs_in_loop(struct LOOP* top, bool recurse) {
    const std::vector<struct LOOP*> loops = recurse ? loops_outer_first(top) : std::vector<struct LOOP*>{top};
    for (struct LOOP* loop : loops) {
        if (loop->is_root()) continue;
        for (const auto& iv : loop->IVs) {
            if (!iv->has(IV_is_RC) || !iv->init || iv->init->op != ICON || !iv->sym->type->is_int() ||
                !only_its_name_reaches(iv->sym))
                continue;
            NODE *name = mk_NAME(iv->sym),
                 *value = mk_ICON(truncate_to_type(iv->init->u.lval, iv->sym->type), iv->sym->type->stqs());
            for_each_block(loop, [&](BBLK* bb) {
                for (LIST* s = bb->statements; s; s = s->rest)
                    if (s->first->op != PPRAGMA && sym_appears_in_tree(iv->sym, s->first))
                        s->first = simplified(subst_tree_for_lvalue_in_tree(value, name, s->first), loop);
            });
            erase_tree(name);
            erase_tree(value);
        }
    }
    forget_symbol_values();
    changed(fact::graph | fact::alias);
}

// ---- Preparation for the transformations

namespace {

// x = (int)((long)x + 1) of a variable that never wraps as x = x + 1.
void widen_update_of(LOOPIV* iv, LIST* s) {
    INDUCTION_UPDATE u;
    if (!is_induction_update(s->first, &u) || u.sym != iv->sym || !u.is_narrowed || u.amount->op != ICON ||
        !iv->sym->type->is_int())
        return;
    TYPE* type = iv->sym->type->stqs();
    const INT65 amount = sign_extend_by_type_size(u.amount->u.lval, u.amount->type),
                step = u.is_subtracted ? -amount : amount;
    if (step > int_type_max(type) || (step < int_type_min(type) && !type->is_unsigned())) return;
    NODE* update = mk_ASG(mk_NAME(iv->sym, s->first->ls), maketree(PLUS, mk_NAME(iv->sym), mk_ICON(step, type), type));
    update->ls = s->first->ls;
    erase_tree(s->first);
    s->first = normalize_tree(update, update);
}

void make_updates_plain(struct LOOP* root) {
    for (struct LOOP* loop : loops_outer_first(root))
        for (const auto& iv : loop->IVs) {
            if (!iv->has(IV_narrowed) || !iv->has(IV_affine) || !iv->has(IV_is_IV)) continue;
            for (BBLK* bb : loop->contents)
                if (bb->loop == loop)
                    for (LIST* s = bb->statements; s; s = s->rest) widen_update_of(iv.get(), s);
        }
}

} // namespace

void prep_loop_variables(bool withProp) {
    struct LOOP* root = loop_root();
    if (!root) return;
    make_updates_plain(root);
    const bool forwards = withProp && currfuninfo->simd_allowed;
    for (int n = 0; n < 2 && forwards; ++n) {
        prop_scalars_in_loop(root, true, true);
        elim_dead_assigns(true, true);
        if (n == 0) prop_IVs_and_RCs_in_loop(root, true);
    }
    find_IVs_dead_on_exit(root);
    for (struct LOOP* loop : loops_outer_first(root)) {
        check_if_LCV_used_in_loop(loop, loop);
        check_if_LCV_dead_on_exit(loop);
    }
    find_LVs(root);
}
