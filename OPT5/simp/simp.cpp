// The dispatch of the simplifier: from the opcode to the rules that apply to it.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/simp.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/type_ops.h"
#include "UTIL/abort.h"

#include <utility>

namespace {

bool has_constant_operands(const NODE* t) {
    auto is_const = [](const NODE* n) { return is_constant(n, ICON) || is_constant(n, FCON); };
    auto is_address = [](const NODE* n) { return (n->op == PCONV || n->op == ISP2CHAR) && n->left->op == ICON; };
    auto folds = [&](const NODE* n) { return is_const(n) || is_address(n); };
    return t->left && folds(t->left) && (!t->right || folds(t->right));
}

// The condition of a branch is its truth value.
NODE* simp_branch_condition(NODE* t, struct LOOP* loop) {
    if (t->left->type->is_scalar() && !t->left->type->is_complex()) t->left = simp_for_control(t->left, loop);
    return t;
}

NODE* simp_EXCLAIM(NODE* t) {
    if (!t->left->type->is_scalar() || t->left->type->is_complex()) return t;
    NODE* operand = t->left;
    erase_node(t);
    return invert_boolean_tree(operand);
}

// A cast to the type that the value has. A bit-field keeps its cast.
NODE* simp_SCONV(NODE* t) {
    if (t->left->op == STDOT || t->left->op == STREF) return t;
    if (!compatible_types(t->type, t->left->type, true)) return simp_cast_of_cast(t);
    NODE* operand = t->left;
    erase_node(t);
    return operand;
}

NODE* simp_QUEST(NODE* t, struct LOOP* loop) {
    if (t->left->op != ICON || t->right->op != COLON) return simp_arms(t, loop);
    NODE* colon = t->right;
    bool is_true = !t->left->u.lval.is_zero();
    NODE *kept = is_true ? colon->left : colon->right, *dropped = is_true ? colon->right : colon->left;
    TYPE* type = t->type;
    erase_tree(dropped);
    erase_node(colon);
    erase_tree(t->left);
    erase_node(t);
    return type->is_scalar() ? coerce_to_type(type, kept) : kept;
}

// The constant decides, or leaves it to the right operand.
NODE* simp_logical(NODE* t, struct LOOP* loop) {
    if (t->left->op != ICON) return t;
    bool left = !t->left->u.lval.is_zero(), decides = left == (t->op == OROR);
    NODE* right = t->right;
    LS* ls = t->ls;
    erase_tree(t->left);
    erase_node(t);
    if (!decides) return make_boolean(right, loop);
    erase_tree(right);
    NODE* truth = mk_ICON(INT65(left ? 1 : 0), tp->int_t);
    truth->ls = ls;
    return truth;
}

[[noreturn]] void bad_opcode(const NODE* t) {
    fprintf(stderr, "\n\n   !!! Bad opcode in simplifier (%d) %s !!!\n", t->op, opname(t->op));
    abort_optimizer();
}

} // namespace

NODE* simp_node(NODE* t, struct LOOP* loop) {
    if (t->op < 0 || t->op >= NO_OPCODES || !node_operator_name[t->op] || t->op == ILLOP) bad_opcode(t);
    t->type = normalized_value_type(t->type);
    if (t->op != UMULT) t->scratch = nullptr;
    if (has_constant_operands(t)) {
        int op = t->op;
        t = fold_constants(t);
        if (t->op != op) return t;
    }
    switch (t->op) {
    case IF:
    case CBRANCH: return simp_branch_condition(t, loop);
    case EXCLAIM: return simp_EXCLAIM(t);
    case QUEST: return simp_QUEST(t, loop);
    case ANDAND:
    case OROR: return simp_logical(t, loop);
    case SCONV: return simp_SCONV(t);
    case PLUS: return simp_PLUS(t);
    case MINUS: return simp_MINUS(t);
    case MULT: return simp_MULT(t);
    case DIV: return simp_DIV(t);
    case MOD: return simp_MOD(t);
    case SLL:
    case SRL: return simp_shift(t);
    case ANDB:
    case ORB:
    case XORB: return simp_bitop(t);
    case UMINUS:
    case NOTB: return simp_unary(t);
    default: return op_is_int_compare(t->op) ? simp_relop(t) : t;
    }
}

namespace {

// An assertion is not simplified by what it says itself.
NODE* simp_assertion(NODE* t, struct LOOP* loop) {
    std::vector<NODE*> givens;
    if (currfuninfo) std::swap(givens, currfuninfo->givens);
    t->left = simp_tree(t->left, loop);
    t->right = simp_tree(t->right, loop);
    t = simp_node(t, loop);
    if (currfuninfo) std::swap(givens, currfuninfo->givens);
    return t;
}

} // namespace

NODE* simp_tree(NODE* t, struct LOOP* loop) {
    if (!t) return t;
    if (t->op == ASSERT) return simp_assertion(t, loop);
    if (t->left) t->left = simp_tree(t->left, loop);
    if (t->right) t->right = simp_tree(t->right, loop);
    return simp_node(t, loop);
}

void init_simplifier() { type_ops_seams.find_known_zeros = find_known_zeros; }

void simp_all_trees() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'simp_all_trees' ----------\n");
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* stmt = bb->statements; stmt; stmt = stmt->rest)
            stmt->first = simp_tree(expunge_IDENTITY_ops_from_tree(stmt->first), nullptr);
}
