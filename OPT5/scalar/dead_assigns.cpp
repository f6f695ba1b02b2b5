// Dead assignments: stores to a local that no path reads before the next store to it. So are calls of functions that
// compute and return for certain where no one takes what they give.
//
// One walk over each block against the order of evaluation, with the set of variables that are live at the point.
// Variables that only die because an assignment was removed are found by the next call.
//
// A counter that nothing but its own steps reads would keep itself alive around its loop. So would any ring of
// variables that only feed each other: they are found without regard to flow, and their reads don't count.
//
// Needs: live variables. Leaves: a simplified graph with block numbers; the sets of live variables are forgotten.
// Sound because the effects of a removed value stay. The sets of the other blocks are not recomputed and can only be
// too large: then less is removed. A variable that is not a candidate is live everywhere.

#include "OPT5/scalar/eda.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/delay.h"
#include "OPT5/scalar/live_walk.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/target.h"

#include <vector>

namespace {

// `y = x` where x is a candidate that is dead behind it.
struct COPY {
    LIST* cell = nullptr;
    int from = -1; // the bits of x and y, -1 for a y that is no candidate
    int to = -1;
};

bool is_combinable(const LIST* first, const LIST* second) {
    const NODE *a = first->first, *b = second->first;
    if (a->op != ASG || b->op != ASG || a->left->op != NAME || b->right->op != NAME ||
        a->left->u.sym != b->right->u.sym)
        return false;
    if (tree_is_arg_prolog(a) || tree_is_arg_prolog(b) || lvalue_is_volatile(a->left)) return false;
    if (sym_appears_in_tree(a->left->u.sym, b->left)) return false;
    // The store still comes last: the address of `b`'s place is then evaluated ahead of the value, which must not show.
    return b->left->op == NAME || (!tree_has_side_effects(a->right) && !tree_has_side_effects(b->left));
}

// ---- Swaps

bool is_float_copy(const NODE* t) {
    if (t->op != ASG || t->left->op != NAME || t->right->op != NAME) return false;
    for (const NODE* side : {t->left, t->right})
        if (!side->type->is_float() || side->type->size != 32 || lvalue_is_volatile(side)) return false;
    return !tree_is_arg_prolog(t);
}

// `t = a; a = b; b = t;` from this cell on. Cells of statements that went are empty.
bool starts_swap(const LIST* s) {
    if (!s->rest || !s->rest->rest || !s->rest->rest->rest) return false;
    const NODE *save = s->first, *first = s->rest->first, *second = s->rest->rest->first;
    if (!first || !second) return false;
    if (!is_float_copy(save) || !is_float_copy(first) || !is_float_copy(second)) return false;
    const SYMTAB *t = save->left->u.sym, *a = save->right->u.sym, *b = first->right->u.sym;
    return first->left->u.sym == a && second->left->u.sym == b && second->right->u.sym == t && t != a && t != b &&
           a != b;
}

NODE* make_swap(const NODE* a, const NODE* b) {
    auto reference = [](const NODE* name) {
        return maketree(ARGREF, copy_tree(name), nullptr, tp->mk_ptr(name->type));
    };
    return mk_MCALL("__swapf", maketree(COMMA, reference(a), reference(b), tp->int_t), tp->void_t);
}

bool target_swaps_floats() { return has_hardware_float() && cpu_version == 28 && find_BIF_descriptor("__swapf"); }

// ---- Variables whose values reach nothing

class FAINT_VARIABLES {
public:
    BITVEC find() {
        needed = BITVEC(static_cast<uint32_t>(currfuninfo->lva_sym_count));
        feeds.resize(needed.bits);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) statement(s->first);
        while (!work.empty()) {
            const uint32_t bit = work.back();
            work.pop_back();
            for (uint32_t source : feeds[bit]) need(source);
        }
        BITVEC faint(needed.bits);
        faint.set_all();
        faint -= needed;
        return faint;
    }

private:
    // What an assignment without other effects reads is needed if its target is, all else at once.
    void statement(NODE* t) {
        const int target = live_index(assigned_variable(t));
        const bool is_pure = target >= 0 && !tree_has_side_effects(t->right) && !tree_is_arg_prolog(t);
        for_each_node(is_pure ? t->right : t, [&](const NODE* n) {
            const int bit = n->op == NAME ? live_index(n->u.sym) : -1;
            if (bit < 0) return;
            if (is_pure)
                feeds[static_cast<size_t>(target)].push_back(static_cast<uint32_t>(bit));
            else
                need(static_cast<uint32_t>(bit));
        });
    }

    void need(uint32_t bit) {
        if (needed.test(bit)) return;
        needed.set(bit);
        work.push_back(bit);
    }

    BITVEC needed;
    std::vector<std::vector<uint32_t>> feeds; // by the variable assigned to: what its values are made of
    std::vector<uint32_t> work;
};

class ELIMINATION final : public BACKWARD_WALK {
public:
    int count = 0;

    ELIMINATION() : live(static_cast<uint32_t>(currfuninfo->lva_sym_count)), faint(FAINT_VARIABLES().find()) {}

    void run(BBLK* bb) {
        start_from_successors(bb);
        std::vector<LIST*> cells;
        for (LIST* s = bb->statements; s; s = s->rest) cells.push_back(s);
        COPY copy, copy_behind; // of the next statement and of the one behind it
        bool kills = true, dropped = false;
        for (auto it = cells.rbegin(); it != cells.rend(); ++it) {
            LIST* s = *it;
            if (copy.cell && kills && s->rest == copy.cell && combine_assignments(s)) {
                if (copy.to >= 0) live.set(static_cast<uint32_t>(copy.to));
                live.clear(static_cast<uint32_t>(copy.from));
                ++count;
            }
            if (swaps && copy_behind.cell && starts_swap(s) && s->rest->rest == copy_behind.cell) {
                replace_by_swap(s, copy_behind.from);
                copy = copy_behind = COPY();
                ++count;
                continue;
            }
            copy_behind = copy;
            copy = copy_at(s);
            const bool is_dispatch = tree_is_EH_SWITCH(s->first);
            statement(s->first, kills);
            kills = !is_dispatch;
            if (s->first) continue;
            dropped = true;
            copy.cell = nullptr;
        }
        if (dropped) drop_empty_cells(&bb->statements);
    }

private:
    void start_from_successors(const BBLK* bb) {
        live.clear_all();
        add_live_at_exit(bb, live);
        live -= faint;
    }

    // The variables are read and written by the call; the one that held the value is not live in front of it.
    void replace_by_swap(LIST* s, int saved) {
        const LIST* first = s->rest;
        for (const NODE* name : {s->first->right, first->first->right})
            if (int bit = live_index(name->u.sym); bit >= 0) live.set(static_cast<uint32_t>(bit));
        live.clear(static_cast<uint32_t>(saved));
        NODE* swap = make_swap(s->first->right, first->first->right);
        drop_statement_behind(s);
        drop_statement_behind(s);
        erase_tree(s->first);
        s->first = swap;
    }

    COPY copy_at(LIST* s) {
        COPY copy;
        const NODE* t = s->first;
        if (t->op != ASG || t->right->op != NAME) return copy;
        const int from = live_index(t->right->u.sym);
        if (from < 0 || live.test(static_cast<uint32_t>(from))) return copy;
        copy.to = t->left->op == NAME ? live_index(t->left->u.sym) : -1;
        if (copy.to >= 0 && !live.test(static_cast<uint32_t>(copy.to))) return copy; // will be removed
        copy.cell = s;
        copy.from = from;
        return copy;
    }

    void read(int bit) override {
        if (!faint.test(static_cast<uint32_t>(bit))) live.set(static_cast<uint32_t>(bit));
    }
    bool write(int bit, bool kills) override {
        if (!live.test(static_cast<uint32_t>(bit)) && rewrite_is_allowed(nullptr)) return false;
        if (kills) live.clear(static_cast<uint32_t>(bit));
        return true;
    }
    bool call(const NODE* t) override { return !call_only_computes(t) || !rewrite_is_allowed(t); }
    void removed() override { ++count; }

    BITVEC live;
    const BITVEC faint; // never live
    const bool swaps = target_swaps_floats();
};

// A block that lost all but its jump lets the graph be smaller.
bool some_block_only_jumps() {
    for (BBLK* bb = currfuninfo->bb_list->dflink; bb; bb = bb->dflink)
        if (bb->statements && !bb->statements->rest && bb->statements->first->op == BRANCH) return true;
    return false;
}

// A candidate that no tree names any more is no variable of the function any more.
void drop_unreferenced_candidates() {
    FUNINFO* f = currfuninfo;
    BITVEC named(static_cast<uint32_t>(f->lva_sym_count));
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_node(s->first, [&](const NODE* t) {
                if (t->op != NAME) return;
                if (int bit = live_index(t->u.sym); bit >= 0) named.set(static_cast<uint32_t>(bit));
            });
    for (SYMTAB** list : {&f->scalar_syms, &f->memory_syms})
        for (SYMTAB** link = list; *link;) {
            SYMTAB* s = *link;
            const int bit = s->level == 2 ? live_index(s) : -1;
            if (bit < 0 || named.test(static_cast<uint32_t>(bit))) {
                link = &s->next;
                continue;
            }
            *link = s->next;
            s->next = nullptr;
            f->dropped_syms.push_back(s);
        }
}

} // namespace

bool combine_assignments(LIST* cell) {
    LIST* next = cell->rest;
    if (!next || !next->rest || !is_combinable(cell, next)) return false;
    NODE *first = cell->first, *second = next->first;
    NODE* value = coerce_to_type(first->left->type, first->right, true);
    first->right = nullptr;
    erase_tree(first);
    erase_tree(second->right);
    second->right = coerce_to_type(second->left->type, value);
    cell->first = simp_tree(second, nullptr);
    next->first = nullptr;
    drop_statement_behind(cell);
    return true;
}

int elim_dead_assigns(bool keep_embedded, bool early) {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list) return 0;
    sym_split(f);
    if (TEST_FLAG(f, FUN_is_cpp)) remove_unneeded_stores_from_destructor();
    need(fact::live_variables);
    if (f->lva_sym_count == 0) return 0;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'elim_dead_assigns' ----------\n");
    ELIMINATION elimination;
    BBLK* const entry = f->bb_list;
    for (BBLK* bb = entry->rdflink; bb; bb = bb == entry ? nullptr : bb->rdflink) elimination.run(bb);
    if (elimination.count) drop_unreferenced_candidates();
    bool graph_changed = false;
    if (opt_level() > 0 && !keep_embedded) {
        promote_all_embedded_assignments();
        graph_changed = delay_assignments();
        if (graph_changed) promote_all_embedded_assignments();
    }
    changed(elimination.count ? fact::none : fact::alias_marks);
    if (!early && !f->bb_list->loop && (graph_changed || (elimination.count && some_block_only_jumps()))) simpcfg(false, false);
    return elimination.count;
}

// ---- Counters

namespace {

class COUNTER_STEPS final : public BACKWARD_WALK {
public:
    COUNTER_STEPS(BBLK* bb, const struct LOOP* loop)
        : live(static_cast<uint32_t>(currfuninfo->lva_sym_count)), is_counter(live.bits) {
        add_live_at_exit(bb, live);
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_node(s->first, [&](const NODE* t) {
                const int bit = t->op == NAME ? live_index(t->u.sym) : -1;
                if (bit >= 0 && loop_callbacks.is_counter(t->u.sym, loop)) is_counter.set(static_cast<uint32_t>(bit));
            });
    }

private:
    void read(int bit) override { live.set(static_cast<uint32_t>(bit)); }
    bool write(int bit, bool kills) override {
        const bool is_live = live.test(static_cast<uint32_t>(bit));
        if (kills) live.clear(static_cast<uint32_t>(bit));
        return is_live || !is_counter.test(static_cast<uint32_t>(bit));
    }

    BITVEC live;
    BITVEC is_counter;
};

} // namespace

void elim_locally_dead_assignments_in_bb(BBLK* bb, struct LOOP* loop) {
    if (!loop || !loop_callbacks.is_counter || !live_at_entry_is_known(bb)) return;
    COUNTER_STEPS(bb, loop).block(bb);
    drop_empty_cells(&bb->statements);
}

namespace {

const NODE* constant_mask(const NODE* t) { return t->op == ANDBASG && t->right->op == ICON ? t->right : nullptr; }

bool clears_bits_of_the_same(const NODE* a, const NODE* b) {
    if (!constant_mask(a) || !constant_mask(b) || !equiv_mtypes(a->right->type, b->right->type)) return false;
    if (a->left->type->is_volatile() || tree_has_side_effects(a->left) || tree_has_side_effects(b->left)) return false;
    return trees_are_congruent(a->left, b->left, false);
}

} // namespace

void fold_ANDBASGs() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s && s->rest;) {
            LIST* next = s->rest;
            if (!clears_bits_of_the_same(s->first, next->first)) {
                s = next;
                continue;
            }
            NODE* mask = s->first->right;
            mask->u.lval = truncate_to_type(mask->u.lval & next->first->right->u.lval, mask->type);
            drop_statement_behind(s);
        }
}
