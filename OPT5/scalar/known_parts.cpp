// Parts of objects whose value a variable or a constant is known to hold: a later load takes that.
//
// `part = value` and `variable = part` make a fact; what may change the part, its address or the value ends it. A block
// with one predecessor begins with the facts that hold at that one's end.
//
// Needs: alias marks, pointees, pointer groups. Leaves: what rests on the graph.
// Sound because a load is replaced only where it is evaluated before its statement changes anything: in `a = p->x +
// f()` the call may store to `p->x`, and the load may come behind it.

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/scalar/subrange.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <vector>

namespace {

constexpr size_t MOST_KNOWN = 32; // facts at a time, which keeps long blocks linear

struct KNOWN {
    NODE* lvalue; // both are copies
    NODE* value;
};

bool is_manifest_constant(const NODE* t) { return t->op == ICON || t->op == FCON; }

bool is_whole_scalar(const NODE* lvalue) {
    if (!lvalue->type->is_scalar() || lvalue->type->is_complex()) return false;
    if (lvalue->op == UMULT) return true;
    if (lvalue->op != STDOT && lvalue->op != STREF) return false;
    return lvalue->right->op == FIELD && lvalue->right->mval && !lvalue->right->mval->is_bitfld;
}

class KNOWN_VALUES {
public:
    ~KNOWN_VALUES() { forget_all(); }

    void block(BBLK* bb) {
        const EDGE* before = bb->predecessors;
        if (!last || !before || before->rest || before->first != last) forget_all();
        for (LIST* s = bb->statements; s; s = s->rest) {
            NODE* t = s->first;
            any = false;
            if (!known.empty()) reuse(t);
            if (any) s->first = t = simp_tree(t, nullptr);
            forget_modified(t);
            learn(t);
        }
        last = bb;
    }

private:
    void reuse(NODE* t) {
        if (tree_is_arg_prolog(t) || tree_is_EH_SWITCH(t) || tree_contains_op(t, ASM)) return;
        switch (t->op) {
        case RETURN: t->right = reuse_in_value(t->right); return;
        case IF:
        case SWITCH:
            if (t->left->op != ENDLOOP) t->left = reuse_in_value(t->left);
            return;
        case CALL: reuse_in_arguments(t); return;
        default: break;
        }
        if (!(is_plain_assignment(t) || is_operator_assignment(t)) || tree_has_side_effects(t->left)) return;
        if (t->right && t->right->op == CALL)
            reuse_in_arguments(t->right);
        else
            t->right = reuse_in_value(t->right);
        if (t->op == ASG) t->right = coerce_to_type(t->left->type, t->right);
        t->left = reuse_in_place(t->left);
    }

    NODE* reuse_in_value(NODE* t) { return !t || tree_has_side_effects(t) ? t : reuse_in(t); }

    void reuse_in_arguments(NODE* call) { call->right = reuse_in_value(call->right); }

    // The place is not read, but a pointer that its address is computed from is.
    NODE* reuse_in_place(NODE* t) {
        auto* object = const_cast<NODE*>(get_first_non_stdot_node_down_the_left_side_of_tree(t));
        if (object->op == UMULT || object->op == STREF) object->left = reuse_in(object->left);
        if (object->op == UMULT) object->right = reuse_in(object->right);
        return t;
    }

    NODE* reuse_in(NODE* t) {
        if (!t) return t;
        if (is_whole_scalar(t) && !lvalue_is_volatile(t))
            for (const KNOWN& k : known)
                if (equiv_mtypes(k.lvalue->type, t->type) && trees_are_congruent(k.lvalue, t, false)) {
                    NODE* value = copy_tree(k.value);
                    erase_tree(t);
                    any = true;
                    return value;
                }
        if (t->op == UAND || t->op == ARGREF) {
            t->left = reuse_in_place(t->left);
            return t;
        }
        if (t->op == STDOT) return reuse_in_place(t);
        t->left = reuse_in(t->left);
        if (t->op != STREF) t->right = reuse_in(t->right);
        return t;
    }

    void forget_modified(const NODE* t) {
        auto gone = [&](const KNOWN& k) {
            if (!tree_modifies_lvalue_in_tree(t, k.lvalue) && !tree_modifies_lvalue_in_tree(t, k.value)) return false;
            forget(k);
            return true;
        };
        known.erase(std::remove_if(known.begin(), known.end(), gone), known.end());
    }

    void learn(const NODE* t) {
        if (t->op != ASG || tree_is_arg_prolog(t)) return;
        const NODE *part = t->left, *value = t->right;
        if (is_whole_scalar(value)) std::swap(part, value);
        if (!is_whole_scalar(part) || !(is_manifest_constant(value) || is_private_name(value))) return;
        SUBRANGE place;
        if (!equiv_mtypes(part->type, value->type) || !compute_subrange(part, &place)) return;
        // The assignment itself must not change the other side, or the address of the part.
        if (tree_modifies_lvalue_in_tree(t, t->left == part ? value : part) || address_is_changed_by(t, place)) return;
        if (known.size() == MOST_KNOWN) {
            forget(known.front());
            known.erase(known.begin());
        }
        known.push_back({copy_tree(part), copy_tree(value)});
    }

    static void forget(const KNOWN& k) {
        erase_tree(k.lvalue);
        erase_tree(k.value);
    }

    void forget_all() {
        std::for_each(known.begin(), known.end(), forget);
        known.clear();
    }

    std::vector<KNOWN> known;
    bool any = false; // replaced in the statement in work
    const BBLK* last = nullptr; // the block that `known` holds behind
};

} // namespace

void lcse_subrange_assignments() {
    if (!currfuninfo || !currfuninfo->bb_list) return;
    need(fact::alias);
    KNOWN_VALUES values;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) values.block(bb);
    changed(fact::graph);
}
