// Assignments inside expressions become statements of their own.
//
// The walk follows the order of evaluation, left operand first. The first side effect that stays ends the search in its
// statement.
//
// Needs: alias marks, pointees, pointer groups, where there is one. Leaves: what rests on the graph; symbols are split
// anew.
// Sound because an assignment moves in front of its statement only if nothing that stays behind and is evaluated before
// it has a side effect or reads what it writes: in `a[i] = f() + (i = 1)` both keep it. Parts that run under a
// condition are not opened, nor a statement that an exception may leave in its middle.

#include "OPT5/scalar/eda.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <vector>

namespace {

bool is_control(int op) { return op == IF || op == SWITCH || op == RETURN; }

// Whether there is anything to do below the root.
bool has_embedded(NODE* t) {
    bool found = false;
    auto visit = [&](const NODE* n) {
        if (opcode_is_ASG(n->op) || n->op == COMMAOP) found = true;
    };
    for_each_node(t->left, visit);
    for_each_node(t->right, visit);
    return found;
}

int count_names(NODE* t, const SYMTAB* sym) {
    int n = 0;
    for_each_node(t, [&](const NODE* node) { n += node->op == NAME && node->u.sym == sym; });
    return n;
}

class PROMOTER {
public:
    explicit PROMOTER(NODE* statement) : root(statement) {}

    std::vector<NODE*> before, behind;

    void run() {
        switch (root->op) {
        case IF:
        case SWITCH:
            if (root->left->op != ENDLOOP) root->left = value(root->left);
            return;
        case RETURN: root->right = value(root->right); return;
        case ANDAND:
        case OROR:
        case QUEST: root->left = value(root->left); return; // the rest runs under a condition
        default: break;
        }
        if (opcode_is_ASG(root->op)) {
            root->left = address(root->left);
            evaluated.push_back(root->left);
            root->right = value(root->right);
        } else
            operands(root);
    }

private:
    // The parts of a written lvalue that are evaluated: not its own read.
    NODE* address(NODE* lvalue) {
        if (op_is_indirection(lvalue->op))
            lvalue->left = value(lvalue->left);
        else if (lvalue->op == STDOT)
            lvalue->left = address(lvalue->left);
        return lvalue;
    }

    void operands(NODE* t) {
        t->left = value(t->left);
        if (!t->right) return;
        if (t->left) evaluated.push_back(t->left);
        t->right = value(t->right);
        if (t->left) evaluated.pop_back();
    }

    NODE* value(NODE* t) {
        if (!t) return nullptr;
        switch (t->op) {
        case ANDAND:
        case OROR:
        case QUEST:
            t->left = value(t->left);
            if (tree_has_side_effects(t->right)) blocked = true;
            return t;
        case COMMAOP: return comma(t);
        case PLUSPLUS:
        case MINMIN: return increment(t);
        case UAND:
        case ARGREF: t->left = address(t->left); return t;
        case NAME:
        case UMULT:
        case STREF:
        case STDOT:
            if (t->op != NAME) operands(t);
            if (lvalue_is_volatile(t)) blocked = true;
            return t;
        default: break;
        }
        if (opcode_is_ASG(t->op)) return assignment(t);
        if (op_is_int_compare(t->op) && t->right->op == ICON && is_increment(t->left)) return compare_of_old(t);
        operands(t);
        if (op_has_effect(t->op)) blocked = true;
        return t;
    }

    bool may_move_ahead(const NODE* t) const {
        if (blocked) return false;
        for (const NODE* p : evaluated)
            if (tree_modifies_lvalue_in_tree(t, p)) return false;
        return true;
    }

    NODE* assignment(NODE* t) {
        t->left = address(t->left);
        evaluated.push_back(t->left);
        t->right = value(t->right);
        evaluated.pop_back();
        const bool is_variable = t->left->op == NAME;
        const bool repeatable = !tree_has_side_effects(t->left) && !lvalue_is_volatile(t->left);
        if (t->op != STASG && t->op != ARASG && repeatable && (is_variable || size_speed_goal() < 4) &&
            may_move_ahead(t)) {
            NODE* copy = copy_tree(t->left);
            before.push_back(t);
            return copy;
        }
        blocked = true;
        return opASG_to_ASG(t);
    }

    NODE* comma(NODE* t) {
        if (!effect(t->left)) {
            blocked = true;
            return t;
        }
        NODE* second = t->right;
        t->left = t->right = nullptr;
        erase_node(t);
        return value(second);
    }

    // Moves what is evaluated for its effect alone ahead of the statement; false, and nothing moved, if it has to stay.
    bool effect(NODE* t) {
        switch (t->op) {
        case COMMAOP:
            // All or nothing: half of a chain would leave its order to the other half.
            if (!is_movable_effect(t->left) || !is_movable_effect(t->right)) return false;
            break;
        default:
            if (!is_movable_effect(t)) return false;
        }
        move_effect(t);
        return true;
    }

    bool is_movable_effect(const NODE* t) const {
        if (t->op == COMMAOP) return is_movable_effect(t->left) && is_movable_effect(t->right);
        return t->op != QUEST && t->op != ANDAND && t->op != OROR && may_move_ahead(t);
    }

    void move_effect(NODE* t) {
        if (t->op == COMMAOP) {
            NODE *first = t->left, *second = t->right;
            t->left = t->right = nullptr;
            erase_node(t);
            move_effect(first);
            move_effect(second);
            return;
        }
        if (NODE* rest = peel_for_effect(t)) before.push_back(rest);
    }

    NODE* increment(NODE* t) {
        NODE* x = t->left;
        if (x->op != NAME || !x->type->is_scalar() || lvalue_is_volatile(x) || t->right->op != ICON) {
            x = t->left = address(x);
            blocked = true;
            return t;
        }
        if (!is_control(root->op) && !x->u.sym->is_aliased() && x->u.sym->level == 2 &&
            count_names(root, x->u.sym) == 1) {
            behind.push_back(step(t));
            t->left = nullptr;
            erase_tree(t);
            return x;
        }
        if (!may_move_ahead(t)) {
            blocked = true;
            return t;
        }
        return x->type->is_int() && !x->type->is_ikind(TYPE::ik_bool) ? undone_step(t) : saved_value(t);
    }

    static NODE* step(const NODE* t) {
        return maketree(t->op == PLUSPLUS ? PLUSASG : MINUSASG, copy_tree(t->left), copy_tree(t->right), t->left->type,
                        t->ls);
    }

    // In arithmetic that wraps at the variable's width the old value is one step back from the new.
    NODE* undone_step(NODE* t) {
        before.push_back(step(t));
        TYPE* type = t->left->type;
        NODE* old = maketree(t->op == PLUSPLUS ? MINUS : PLUS, t->left, coerce_to_type(type, t->right), type, t->ls);
        t->left = t->right = nullptr;
        erase_node(t);
        return simp_node(old, nullptr);
    }

    static bool is_increment(const NODE* t) { return t->op == PLUSPLUS || t->op == MINMIN; }

    // x-- > c as x >= c of the new x: the step of a signed variable is exact, and so is the old value as a sum, which
    // the compare need not make then.
    NODE* compare_of_old(NODE* t) {
        operands(t);
        NODE *old = t->left, *c = t->right;
        if ((old->op != PLUS && old->op != MINUS) || old->left->op != NAME || old->right->op != ICON ||
            !is_exact_by_rule(old->op, old->type) || !equiv_mtypes(old->type, c->type) || t->op > GT)
            return t;
        const INT65 step = old->right->u.lval, moved = old->op == PLUS ? c->u.lval - step : c->u.lval + step;
        if (truncate_to_type(moved, c->type) != moved) return t;
        const bool against_zero = moved == INT65(-1) && (t->op == LE || t->op == GT);
        c->u.lval = against_zero ? INT65(0) : moved;
        if (against_zero) t->op = t->op == LE ? LT : GE;
        t->left = old->left;
        old->left = nullptr;
        erase_tree(old);
        return simp_node(t, nullptr);
    }

    NODE* saved_value(NODE* t) {
        SYMTAB* temp = sym_temp('T', -1, t->left->type, nullptr);
        before.push_back(mk_ASG(mk_NAME(temp), copy_tree(t->left)));
        before.push_back(step(t));
        erase_tree(t);
        return mk_NAME(temp);
    }

    NODE* root;
    std::vector<const NODE*> evaluated; // what stays and is evaluated before the place of the walk
    bool blocked = false;               // a side effect among it
};

bool is_left_alone(const NODE* t) {
    switch (t->op) {
    case ASM:
    case PPRAGMA:
    case BRANCH:
    case URETURN:
    case LABELDEF:
    case LOOP:
    case ASSERT:
    case NASSERT:
    case PCOMMA: return true;
    default: return tree_is_EH_SWITCH(t) || tree_is_arg_prolog(t);
    }
}

// Puts the statements around `s`, whose cell keeps its place at the end of what comes before it. The last cell.
LIST* insert_around(LIST** link, LIST* s, const PROMOTER& promoter) {
    for (NODE* t : promoter.before) link = insert_before(link, t, s->psn);
    LIST* last = s;
    for (NODE* t : promoter.behind) last = insert_behind(last, t, s->psn);
    return last;
}

} // namespace

namespace {

bool block_has_embedded(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (!is_left_alone(s->first) && has_embedded(s->first)) return true;
    return false;
}

// The statement `a, b` becomes two.
void open_comma(LIST* s) {
    NODE* comma = s->first;
    insert_behind(s, comma->right, s->psn);
    s->first = comma->left;
    erase_node(comma);
}

} // namespace

bool promote_embedded_assignments_in_bb(BBLK* bb) {
    bool changed = false;
    for (LIST** link = &bb->statements; *link;) {
        LIST* s = *link;
        // What an exception may leave in its middle stays one statement.
        const bool may_be_left = s->rest && tree_is_EH_SWITCH(s->rest->first);
        if (may_be_left || is_left_alone(s->first) || !has_embedded(s->first)) {
            link = &s->rest;
            continue;
        }
        if (s->first->op == COMMAOP) {
            open_comma(s);
            changed = true;
            continue;
        }
        PROMOTER promoter(s->first);
        promoter.run();
        LIST* last = insert_around(link, s, promoter);
        changed |= !promoter.before.empty() || !promoter.behind.empty();
        link = &last->rest;
    }
    return changed;
}

void promote_all_embedded_assignments() {
    if (!currfuninfo->bb_list) return;
    std::vector<BBLK*> blocks;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (block_has_embedded(bb)) blocks.push_back(bb);
    if (blocks.empty()) return;
    need(fact::alias);
    bool made_any = false;
    for (BBLK* bb : blocks) made_any |= promote_embedded_assignments_in_bb(bb);
    if (!made_any) return;
    sym_split(currfuninfo);
    changed(fact::graph);
}
