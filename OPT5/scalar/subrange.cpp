// Parts of objects within a block: a store that a later store covers before anything reads it goes, and a load of a
// part whose value a variable or a constant is known to hold takes that.
//
// Facts begin and end with the block. Whether an access between may meet a part is left to the alias rules.

#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <optional>
#include <vector>

namespace {

constexpr std::size_t MOST_KNOWN = 32; // facts at a time, which keeps long blocks linear

// Bits `offset` to `offset + size` of the object that `base` names or, where it is no NAME, points to.
struct SUBRANGE {
    const NODE* lvalue; // borrowed from its statement
    const NODE* base;
    int64_t size;
    int64_t offset;

    bool is_named() const { return base->op == NAME && !is_through_pointer; }
    bool is_through_pointer = false;
};

std::optional<SUBRANGE> compute_subrange(const NODE* lvalue) {
    int64_t offset = 0, size = static_cast<int64_t>(lvalue->type->size);
    const NODE* t = lvalue;
    for (; t->op == STDOT || t->op == STREF; t = t->left) {
        const fkMDATA* member = t->right->op == FIELD ? t->right->mval : nullptr;
        if (!member) return std::nullopt;
        if (t == lvalue && member->is_bitfld) size = member->width;
        offset += member->offset;
        if (t->op == STREF) return SUBRANGE{lvalue, t->left, size, offset, true};
    }
    if (t->op == UMULT) return SUBRANGE{lvalue, t->left, size, offset, true};
    if (t->op == NAME) return SUBRANGE{lvalue, t, size, offset, false};
    return std::nullopt;
}

// Whether a store to `later` leaves nothing of a store to `s`. Through pointers only in the same type: the alias rules
// do not take a read in another type for one of `later`.
bool covers(const SUBRANGE& later, const SUBRANGE& s) {
    if (s.size <= 0 || s.offset < later.offset || s.offset + s.size > later.offset + later.size) return false;
    if (later.is_named() && s.is_named()) return later.base->u.sym == s.base->u.sym;
    return later.is_through_pointer && s.is_through_pointer && equiv_mtypes(later.lvalue->type, s.lvalue->type) &&
           trees_are_congruent(later.base, s.base, false);
}

bool is_plain_assignment(const NODE* t) { return t->op == ASG || t->op == STASG; }

bool may_be_replaced(const NODE* t) {
    return is_plain_assignment(t) && !tree_is_arg_prolog(t) && !lvalue_is_volatile(t->left) &&
           !tree_has_side_effects(t->left);
}

// ---- Dead stores

class DEAD_STORES {
public:
    void run(BBLK* bb) {
        std::vector<LIST*> cells;
        for (LIST* s = bb->statements; s; s = s->rest) cells.push_back(s);
        bool completes = true, dropped = false; // nothing leaves the statement in its middle
        for (auto it = cells.rbegin(); it != cells.rend(); ++it) {
            NODE*& t = (*it)->first;
            const bool is_dispatch = tree_is_EH_SWITCH(t);
            std::optional<SUBRANGE> target;
            if (may_be_replaced(t)) target = compute_subrange(t->left);
            if (target && is_covered(*target)) {
                remove(t);
                target.reset();
                dropped |= !t;
            }
            // What the store itself takes counts as read in front of it.
            if (target && completes) {
                if (overwritten.size() == MOST_KNOWN) overwritten.erase(overwritten.begin());
                overwritten.push_back(*target);
            }
            if (t) note_accesses(t, target);
            completes = !is_dispatch;
        }
        overwritten.clear();
        if (dropped) drop_empty_cells(&bb->statements);
    }

private:
    bool is_covered(const SUBRANGE& s) const {
        return std::any_of(overwritten.begin(), overwritten.end(), [&](const SUBRANGE& o) { return covers(o, s); });
    }

    void remove(NODE*& t) {
        NODE* effect = t->right;
        const bool has_effect = tree_has_side_effects(effect);
        if (print_debug)
            debug_printf("\n(%ld) DEAD ASSIGNMENT (edsa_ASG):  %s, Effect? %d\n", ++count, stmt2infix(t).c_str(),
                         has_effect);
        t->right = nullptr;
        erase_tree(t);
        t = peel_for_effect(effect);
    }

    // What the statement may read, and places that it moves, are not known to be overwritten first any more.
    void note_accesses(const NODE* t, const std::optional<SUBRANGE>& target) {
        auto ends = [&](const SUBRANGE& s) {
            if (tree_modifies_lvalue_in_tree(t, s.base) && s.is_through_pointer) return true;
            if (!target) return tree_touches_lvalue(t, s.lvalue);
            const NODE* lhs = t->left;
            while (lhs->op == STDOT) lhs = lhs->left;
            return tree_touches_lvalue(t->right, s.lvalue) ||
                   (lhs->op != NAME && tree_touches_lvalue(lhs->left, s.lvalue));
        };
        overwritten.erase(std::remove_if(overwritten.begin(), overwritten.end(), ends), overwritten.end());
    }

    std::vector<SUBRANGE> overwritten; // later in the block, and not read up to there
    long count = 0;
};

// ---- Known values

struct KNOWN {
    NODE* lvalue; // both are copies
    NODE* value;
};

bool is_whole_scalar(const NODE* lvalue) {
    if (!lvalue->type->is_scalar() || lvalue->type->is_complex()) return false;
    if (lvalue->op == UMULT) return true;
    if (lvalue->op != STDOT && lvalue->op != STREF) return false;
    return lvalue->right->op == FIELD && lvalue->right->mval && !lvalue->right->mval->is_bitfld;
}

bool is_private_variable(const NODE* t) {
    return t->op == NAME && t->u.sym->level == 2 && !t->u.sym->is_aliased() && t->type->is_scalar() &&
           !lvalue_is_volatile(t);
}

class KNOWN_VALUES {
public:
    ~KNOWN_VALUES() { forget_all(); }

    void run(BBLK* bb) {
        for (LIST* s = bb->statements; s; s = s->rest) {
            NODE* t = s->first;
            if (!known.empty()) reuse(t);
            forget_modified(t);
            learn(t);
        }
        forget_all();
    }

private:
    // Only parts that are evaluated before the statement changes anything: both sides of an assignment, or all of it.
    void reuse(NODE*& t) {
        if (tree_contains_op(t, ASM) || tree_is_arg_prolog(t)) return;
        if (!is_plain_assignment(t)) return;
        if (tree_has_side_effects(t->left) || tree_has_side_effects(t->right)) return;
        const NODE* before = t->right;
        t->right = reuse_in(t->right);
        if (t->right != before) t->right = coerce_to_type(t->left->type, t->right);
        NODE* lhs = t->left;
        while (lhs->op == STDOT) lhs = lhs->left;
        if (lhs->op == UMULT || lhs->op == STREF) lhs->left = reuse_in(lhs->left);
    }

    NODE* reuse_in(NODE* t) {
        if (!t) return t;
        if (is_whole_scalar(t) && !lvalue_is_volatile(t))
            for (const KNOWN& k : known)
                if (equiv_mtypes(k.lvalue->type, t->type) && trees_are_congruent(k.lvalue, t, false)) {
                    NODE* value = copy_tree(k.value);
                    erase_tree(t);
                    return value;
                }
        if (t->op == UAND || t->op == ARGREF || t->op == STDOT) {
            // An object, not its value; a pointer on the way to it is a value.
            NODE* object = t->left;
            while (object->op == STDOT) object = object->left;
            if (object->op == UMULT || object->op == STREF) object->left = reuse_in(object->left);
            return t;
        }
        t->left = reuse_in(t->left);
        if (t->op != STREF) t->right = reuse_in(t->right);
        return t;
    }

    void forget_modified(const NODE* t) {
        auto gone = [&](KNOWN& k) {
            if (!tree_modifies_lvalue_in_tree(t, k.lvalue) && !tree_modifies_lvalue_in_tree(t, k.value)) return false;
            erase_tree(k.lvalue);
            erase_tree(k.value);
            return true;
        };
        known.erase(std::remove_if(known.begin(), known.end(), gone), known.end());
    }

    // `part = value` and `variable = part`, behind which both hold the same.
    void learn(const NODE* t) {
        if (t->op != ASG || tree_is_arg_prolog(t) || known.size() >= MOST_KNOWN) return;
        const NODE *part = t->left, *value = t->right;
        if (is_whole_scalar(value)) std::swap(part, value);
        if (!is_whole_scalar(part) || lvalue_is_volatile(part) || tree_has_side_effects(part)) return;
        if (value->op != ICON && value->op != FCON && !is_private_variable(value)) return;
        if (!equiv_mtypes(part->type, value->type)) return;
        if (tree_modifies_lvalue_in_tree(t, t->left == part ? value : part)) return;
        if (address_may_change(t, part)) return;
        known.push_back({copy_tree(part), copy_tree(value)});
    }

    // Whether the assignment may change the pointer that the part is reached by.
    static bool address_may_change(const NODE* t, const NODE* part) {
        while (part->op == STDOT) part = part->left;
        return part->op != NAME && tree_modifies_lvalue_in_tree(t, part->left);
    }

    void forget_all() {
        for (KNOWN& k : known) {
            erase_tree(k.lvalue);
            erase_tree(k.value);
        }
        known.clear();
    }

    std::vector<KNOWN> known;
};

} // namespace

void lcse_subrange_assignments() {
    if (!currfuninfo || !currfuninfo->bb_list) return;
    init_aliasing_info(false);
    KNOWN_VALUES values;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) values.run(bb);
    reset_alias_info();
}

void elim_dead_subrange_assigns() {
    if (!currfuninfo || !currfuninfo->bb_list) return;
    init_aliasing_info(false);
    DEAD_STORES stores;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) stores.run(bb);
    reset_alias_info();
}
