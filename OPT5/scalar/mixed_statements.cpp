// Statements whose effects stand among their reads, as `x = f(a * b) + a * b`: which operands common subexpressions may
// take.
//
// Sound because an operand that no effect among the operands may change has one value wherever it comes in the order of
// evaluation: the one that it has ahead of the statement. An assignment or a call that is the whole statement comes last
// and counts for none of them.
#include "OPT5/alias/effects.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/triples.h"

#include <algorithm>

namespace {

constexpr int MOST_NODES = 256; // each read is asked about each effect

// Assignments and calls are the effects; of other operators it is not known here what becomes of their operands.
bool effects_are_known(const NODE* statement) {
    return !any_subtree(statement, [statement](const NODE* t) {
        if (t->op == CSE_ORIG || t->op == CSE_DUPE || t->op == ASM) return true;
        if (t == statement || !op_has_effect(t->op)) return false;
        return !writes_left_operand(t->op) && t->op != CALL && t->op != UCALL && t->op != ICALL && t->op != COMMAOP;
    });
}

bool takes_part(const NODE* t) {
    const bool is_test = t->op == IF || t->op == SWITCH, assigns = writes_left_operand(t->op) && t->right;
    if (!is_test && !assigns && t->op != RETURN && t->op != CALL) return false;
    if ((is_test && t->left->op == ENDLOOP) || tree_is_arg_prolog(t)) return false;
    return count_nodes_in_tree(t) <= MOST_NODES && effects_are_known(t);
}

// What the statement evaluates ahead of its own effect, if that is the last one.
std::vector<const NODE*> operands_with_effects(const NODE* t) {
    const bool is_call = (t->op == ASG || t->op == STASG) && t->right->op == CALL; // made last
    std::vector<const NODE*> operands{t->left};
    if (is_call) operands.push_back(t->right->left);
    operands.push_back(is_call ? t->right->right : t->right);
    operands.erase(std::remove_if(operands.begin(), operands.end(),
                                  [](const NODE* n) { return !n || !tree_has_side_effects(n); }),
                   operands.end());
    return operands;
}

// Enters each operand below and with `t` that acts or that one of the effects may change. True of `t` itself.
bool mark_unCSEable_opds(const NODE* t, const std::vector<const NODE*>& effects, std::unordered_set<const NODE*>* marked) {
    if (!t) return false;
    const NODE *left = t->left, *right = t->right;
    if (t->op == UAND || t->op == ARGREF || t->op == STARG || t->op == STDOT) { // the object is not read as a whole
        left = without_members(left);
        if (op_is_indirection(left->op)) left = left->left;
        if (left->op == NAME) left = nullptr;
        right = nullptr;
    }
    bool is_out = mark_unCSEable_opds(left, effects, marked);
    is_out |= mark_unCSEable_opds(right, effects, marked);
    is_out = is_out || !tree_changes_nothing(t) || std::any_of(effects.begin(), effects.end(), [t](const NODE* effect) {
        if (op_is_call(t->op)) return tree_modifies_lvalue_in_tree(effect, t);
        return (op_is_load(t->op) || (t->op == NAME && t->u.sym && !t->u.sym->is_function())) &&
               tree_modifies_lvalue(effect, t);
    });
    if (is_out) marked->insert(t);
    return is_out;
}

} // namespace

bool MIXED_READS::enter(const NODE* statement) {
    clear();
    if (!takes_part(statement)) return false;
    const std::vector<const NODE*> effects = operands_with_effects(statement);
    for (const NODE* e : effects)
        for_each_written_name(e, [this](const NODE* name, const NODE*) { written.insert(name->u.sym); });
    mark_unCSEable_opds(statement->left, effects, &unCSEable);
    mark_unCSEable_opds(statement->right, effects, &unCSEable);
    keeps_traps = std::any_of(effects.begin(), effects.end(), may_leave_in_the_middle);
    return true;
}

bool MIXED_READS::must_stay(const NODE* operand) const { return keeps_traps && may_trap(operand); }

void MIXED_READS::clear() {
    unCSEable.clear();
    written.clear();
    keeps_traps = false;
}
