// Which variables and trees have one value in all iterations of a loop.
//
// A variable that only its NAME reaches is changed by the statements that write the NAME and by nothing else; so a loop
// that holds no such statement keeps it. What memory holds is not asked here: a reference in normal form is invariant
// only where the object can never change.
#include "OPT5/dd/loop.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

#include <algorithm>

// ---- Records

LOOPIV* alloc_LOOPIV(SYMTAB* sym, struct LOOP* loop) {
    auto made = std::make_unique<LOOPIV>();
    made->loop = loop;
    made->sym = sym;
    const TYPE* type = sym->type;
    const bool counts = type->is_int() || type->is_enum();
    made->lowval = counts ? int_type_min(sym->type) : INT65(0);
    made->highval = counts ? int_type_max(sym->type) : int_type_max(tp->ulong_t);
    loop->record_of[sym] = made.get();
    loop->IVs.push_back(std::move(made));
    return loop->IVs.back().get();
}

void delete_LOOPIV(LOOPIV* iv) {
    struct LOOP* loop = iv->loop;
    loop->record_of.erase(iv->sym);
    if (loop->LCV == iv) loop->LCV = nullptr;
    if (loop->VLCV == iv) loop->VLCV = nullptr;
    auto& all = loop->IVs;
    // The last made is the most likely to be removed.
    auto it = std::find_if(all.rbegin(), all.rend(), [iv](const auto& p) { return p.get() == iv; });
    all.erase(std::next(it).base());
}

LOOPIV* find_LOOPIV_for_IV(const SYMTAB* sym, const struct LOOP* loop, bool outer_too) {
    for (; loop; loop = outer_too ? loop->parent : nullptr)
        if (auto it = loop->record_of.find(sym); it != loop->record_of.end() && it->second->has(IV_is_IV))
            return it->second;
    return nullptr;
}

LOOPLV* find_LOOPLV_for_LV(const SYMTAB* sym, struct LOOP* loop) {
    for (LOOPLV& lv : loop->LVs)
        if (lv.sym == sym) return &lv;
    return nullptr;
}

struct LOOP* find_loop_for_LCV(const SYMTAB* sym, struct LOOP* loop) {
    for (; loop; loop = loop->parent)
        if ((loop->LCV && loop->LCV->sym == sym) || (loop->VLCV && loop->VLCV->sym == sym)) return loop;
    return nullptr;
}

LOOPIV* find_LCV_for_loop(const struct LOOP* loop, uint64_t flags) {
    if (!loop) return nullptr;
    for (LOOPIV* iv : {loop->LCV, loop->VLCV})
        if (iv && iv->has(flags)) return iv;
    return nullptr;
}

// ---- What a loop changes

namespace {

bool is_left_alone(const SYMTAB* sym, const struct LOOP* loop) { // neither set holds it
    return sym->is_function() || sym->type->is_volatile() || (loop->has(LOOP_has_call) && sym->level == 0);
}

bool is_altered(const SYMTAB* sym, const struct LOOP* loop) {
    return loop->ALT_syms.count(const_cast<SYMTAB*>(sym)) ||
           std::find(loop->IV_syms.begin(), loop->IV_syms.end(), sym) != loop->IV_syms.end();
}

void add_RC_candidate(SYMTAB* sym, struct LOOP* loop) {
    if (!sym->is_aliased() && !is_left_alone(sym, loop) && !is_altered(sym, loop)) loop->RC_syms.insert(sym);
}

class CLASSIFIER {
public:
    explicit CLASSIFIER(struct LOOP* of) : loop(of) {}
    // `first`: the first statement of the entry block, for statements of that; null for others.
    void scan(const NODE* statement, const NODE* first) {
        const bool is_prolog = tree_is_extended_arg_prolog(statement, first);
        walk(statement, false);
        if (is_prolog) return;
        for_each_written_name(statement,
                              [this](const NODE* name, const NODE*) { make_sym_altered_in_loop(name->u.sym, loop); });
    }

private:
    // `is_address`: of a memory reference, so that an address taken here does not leave it.
    void walk(const NODE* t, bool is_address) {
        for (; t; t = t->left) {
            enter(t, is_address);
            if ((t->op == UAND || t->op == ARGREF) && name_of_place(t->left)) return;
            walk(t->right, false);
            is_address = t->op == UMULT;
        }
    }
    void enter(const NODE* t, bool is_address) {
        switch (t->op) {
        case NAME:
            if (t->u.sym) add_RC_candidate(t->u.sym, loop);
            return;
        case UAND:
        case ARGREF:
            if (const NODE* name = name_of_place(t->left); name && !is_address && !symbol_is_immutable(name->u.sym))
                make_sym_altered_in_loop(name->u.sym, loop);
            return;
        case CALL:
        case UCALL: loop->flags |= LOOP_has_call; return;
        case NASSERT:
        case ASSERT:
        case PPRAGMA: currfuninfo->has_nasserts = true; return;
        default: return;
        }
    }

    struct LOOP* loop;
};

// Behind a call only what it cannot reach is known.
template <class SET>
void keep_own_symbols(SET& set) {
    for (auto it = set.begin(); it != set.end();)
        it = (*it)->level != 0 || symbol_is_immutable(*it) ? std::next(it) : set.erase(it);
}

void clear_symbols(struct LOOP* loop) {
    loop->RC_syms.clear();
    loop->ALT_syms.clear();
    loop->IV_syms.clear();
    loop->IVs.clear();
    loop->record_of.clear();
    loop->LCV = loop->VLCV = nullptr;
    loop->LVs.clear();
    loop->test = ILLOP;
    loop->flags &= ~LOOP_has_call;
}

void take_over_symbols(struct LOOP* loop, const struct LOOP* inner) {
    loop->flags |= inner->flags & LOOP_has_call;
    for (SYMTAB* sym : inner->ALT_syms) make_sym_altered_in_loop(sym, loop);
    for (SYMTAB* sym : inner->RC_syms) add_RC_candidate(sym, loop);
}

} // namespace

void make_sym_altered_in_loop(SYMTAB* sym, struct LOOP* loop) {
    if (is_left_alone(sym, loop) || !loop->ALT_syms.insert(sym).second) return;
    loop->RC_syms.erase(sym);
    loop->IV_syms.erase(std::remove(loop->IV_syms.begin(), loop->IV_syms.end(), sym), loop->IV_syms.end());
}

void make_sym_RC_in_loop(SYMTAB* sym, struct LOOP* loop) { add_RC_candidate(sym, loop); }

// Of the whole tree below `top`. A symbol stands in the set of the outermost loop that keeps it.
void find_region_constants(struct LOOP* top) {
    const NODE* first = currfuninfo->bb_list->statements->first;
    for (struct LOOP* loop : loops_inner_first(top)) {
        clear_symbols(loop);
        if (!loop->is_root()) make_virtual_LCV(loop);
        CLASSIFIER classifier(loop);
        for (BBLK* bb : loop->contents) {
            if (bb->loop != loop)
                take_over_symbols(loop, bb->loop);
            else
                for (const LIST* s = bb->statements; s; s = s->rest)
                    classifier.scan(s->first, bb == currfuninfo->bb_list ? first : nullptr);
        }
        if (loop->has(LOOP_has_call)) {
            keep_own_symbols(loop->RC_syms);
            keep_own_symbols(loop->ALT_syms);
        }
        for_each_subloop(loop, [loop](struct LOOP* inner) {
            for (SYMTAB* sym : loop->RC_syms) inner->RC_syms.erase(sym);
        });
    }
}

// ---- Questions

bool sym_is_RC_in_loop(const SYMTAB* sym, const struct LOOP* loop) {
    if (!sym || !loop || sym->is_aliased()) return false;
    if (sym->sclass == SC_PARM) return true;
    if (symbol_is_immutable(sym) && map_sym_to_parm(sym)) return true;
    return sym->type->is_scalar() && !is_left_alone(sym, loop) && !is_altered(sym, loop);
}

bool tree_is_RC_in_loop(const NODE* t, const struct LOOP* loop, bool lcvCounts) {
    if (!t) return true;
    switch (t->op) {
    case ICON:
    case FCON:
    case LCON:
    case SCON:
    case FIELD: return true;
    case NAME:
        if (!t->u.sym || lvalue_is_volatile(t)) return false;
        if (sym_is_RC_in_loop(t->u.sym, loop)) return true;
        if (!lcvCounts || !loop) return false;
        if (loop->VLCV && loop->VLCV->sym == t->u.sym) return true;
        return loop->LCV && loop->LCV->sym == t->u.sym && !loop->LCV->has(IV_update_before_read);
    case UMULT:
    case STREF:
        return lvalue_is_immutable(t) && tree_is_RC_in_loop(t->left, loop, lcvCounts) &&
               tree_is_RC_in_loop(t->right, loop, lcvCounts);
    case UAND:
        if (name_of_place(t->left)) return true;
        return tree_is_RC_in_loop(t->left, loop, lcvCounts);
    case STDOT: return tree_is_RC_in_loop(t->left, loop, lcvCounts);
    default:
        if (op_has_effect(t->op) || op_is_call(t->op)) return false;
        return tree_is_RC_in_loop(t->left, loop, lcvCounts) && tree_is_RC_in_loop(t->right, loop, lcvCounts);
    }
}

namespace {

int joined(int a, int b) { return a == 0 || b == 0 ? 0 : a < 0 && b < 0 ? -1 : 1; }

int affine_variable(const NODE* name, const struct LOOP* loop, bool strict) {
    const LOOPIV* iv = find_LOOPIV_for_IV(name->u.sym, loop, false);
    if (!iv || !iv->has(IV_affine)) return 0;
    if (!strict) return 1;
    const bool is_known = iv->init && iv->incrtree && iv->incrtree->op == ICON && loop->trips &&
                          tree_is_RC_in_loop(iv->init, loop, false) && tree_is_RC_in_loop(loop->trips, loop, false);
    return is_known ? 1 : 0;
}

} // namespace

int expr_is_affine_in_loop(const NODE* t, const struct LOOP* loop, bool strict) {
    if (tree_is_RC_in_loop(t, loop, false)) return -1;
    switch (t->op) {
    case PLUS:
    case MINUS:
    case MULT:
        return joined(expr_is_affine_in_loop(t->left, loop, strict), expr_is_affine_in_loop(t->right, loop, strict));
    case UMINUS: return expr_is_affine_in_loop(t->left, loop, strict);
    case SCONV:
        if (!t->left->type->is_int() || t->type->size < t->left->type->size || t->type->size < tp->long_t->size)
            return 0;
        return expr_is_affine_in_loop(t->left, loop, strict);
    case NAME: return affine_variable(t, loop, strict);
    default: return 0;
    }
}
