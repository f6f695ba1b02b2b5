#include "OPT5/simp/exact.h"

#include "OPT5/simp/range.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

using namespace rules;

namespace {

constexpr int MOST_LEVELS = 64;

bool is_wrapping_operator(int op) { return op == PLUS || op == MINUS || op == MULT || op == UMINUS; }

// In the unsigned type `type`.
NODE* unsigned_tree(NODE* t, TYPE* type, int levels, struct LOOP* loop) {
    const bool opens = levels && is_wrapping_operator(t->op) && t->type->size == type->size && is_integer(t->type) &&
                       operand_has_type(t) && (!t->right || operands_have_type(t));
    if (!opens) return coerced(type, t, loop);
    t->left = unsigned_tree(t->left, type, levels - 1, loop);
    if (t->right) t->right = unsigned_tree(t->right, type, levels - 1, loop);
    t->type = type;
    return simp_node(t, loop);
}

} // namespace

bool is_exact_by_rule(int op, const TYPE* type) {
    return is_wrapping_operator(op) && is_integer(type) && is_signed(type);
}

bool signed_result_is_exact(int op, const NODE* a, const NODE* b, const TYPE* type, struct LOOP* loop) {
    return !is_exact_by_rule(op, type) || operation_is_exact(op, a, b, type, loop);
}

NODE* made_exact(int op, NODE* a, NODE* b, TYPE* type, struct LOOP* loop) {
    if (signed_result_is_exact(op, a, b, type, loop)) return made(op, a, b, type, loop);
    TYPE* wraps = tp->mk_unsigned(type->stqs());
    NODE* bits = made(op, coerced(wraps, a, loop), b ? coerced(wraps, b, loop) : nullptr, wraps, loop);
    return coerced(type->stqs(), bits, loop);
}

NODE* kept_exact(NODE* t, struct LOOP* loop) {
    if (signed_result_is_exact(t->op, t->left, t->right, t->type, loop)) return simp_node(t, loop);
    const int op = t->op;
    NODE *a = t->left, *b = t->right;
    TYPE* type = t->type;
    erase_node(t);
    return made_exact(op, a, b, type, loop);
}

NODE* as_wrapping(NODE* t, struct LOOP* loop) {
    TYPE* type = t->type->stqs();
    return coerced(type, unsigned_tree(t, tp->mk_unsigned(type), MOST_LEVELS, loop), loop);
}
