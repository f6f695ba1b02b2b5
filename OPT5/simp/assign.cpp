// Assignments.
//
// A value is stored as the place has it: casts and masks that only do the same again are removed. An assignment that
// reads its own target first becomes a compound one, but for counters of local variables, which stay sums; a compound
// one that changes nothing, or leaves a constant, becomes what it is.

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

using namespace rules;

namespace {

constexpr int MOST_TERMS = 8; // levels of a chain that are searched for the target

bool is_integral(const TYPE* t) { return t->is_int() || t->is_enum(); }
const fkMDATA* bitfield_of(const NODE* lvalue) { return is_bitfield_access(lvalue) ? lvalue->right->mval : nullptr; }

// Bits of the place, where it holds an integer that is stored as its low bits.
uint64_t stored_bits(const NODE* lhs) {
    const fkMDATA* m = bitfield_of(lhs);
    if (!m) return is_integer(lhs->type) ? mask_of(lhs->type) : ~uint64_t(0);
    if (m->type->is_bool() || m->width == 0 || m->width >= 64) return ~uint64_t(0);
    return (uint64_t(1) << m->width) - 1;
}

// ---- The value
// A constant as the place has it; of another value a cast where the types differ.
void convert_value(NODE* t, struct LOOP* loop) {
    NODE *lhs = t->left, *rhs = t->right;
    const bool differs = !compatible_types(lhs->type, rhs->type, true);
    if ((!differs && !bitfield_of(lhs)) || !is_integral(lhs->type) || !is_integral(rhs->type)) return;
    const bool keeps_low_bits = is_integer(lhs->type) && is_integer(rhs->type) && rhs->type->size >= lhs->type->size &&
                                !is_bitfield_access(rhs); // what the store does by itself
    if (is_constant(rhs, ICON))
        t->right = truncate_RHS_for_assignment(lhs, rhs);
    else if (differs && !keeps_low_bits)
        t->right = coerced(lhs->type->stqs(), rhs, loop);
}

// A cast that the store makes again.
bool cast_is_idle(const NODE* lhs, const NODE* cast) {
    const TYPE *to = lhs->type, *by = cast->type, *from = cast->left->type;
    const bool reads_bitfield =
        is_bitfield_access(cast->left) || (cast->left->op == SCONV && is_bitfield_access(cast->left->left));
    if (reads_bitfield || to->is_bool() || by->is_bool() || from->is_bool()) return false;
    if (to->is_float() && by->is_float() && from->is_float()) return by->size == to->size || from->size <= by->size;
    if (!is_integer(to) || !is_integer(by) || !is_integer(from)) return false;
    if (by->size >= to->size) return true;
    return by->size > from->size && !(is_signed(from) && !is_signed(by)); // widens in between, no more
}

void drop_idle_operators(NODE* t) {
    while (t->right->op == SCONV && cast_is_idle(t->left, t->right)) t->right = take_left(t->right);
    if (is_integer(t->right->type) && is_integral(t->left->type) && !t->left->type->is_bool())
        t->right = prop_mask_into_subtree(t->right, INT65(0, stored_bits(t->left)));
    while (t->right->op == SCONV && cast_is_idle(t->left, t->right)) t->right = take_left(t->right);
}

// a = b = 0 is b = 0, a = 0.
NODE* separate_zero(NODE* t, struct LOOP* loop) {
    NODE* inner = t->right;
    if (inner->op != ASG || !is_constant_and_zero(inner->right) || t->left->op != NAME || !t->left->type->is_scalar() ||
        !inner->type->is_scalar())
        return nullptr;
    if (t->left->type->is_float() != inner->right->type->is_float() ||
        t->left->type->is_pointer() != inner->type->is_pointer())
        return nullptr;
    t->right = coerced(t->left->type->stqs(), copy_tree(inner->right), loop);
    return mk_COMMAOP(inner, simp_node(t, loop));
}

// a = (x == 0) of truth values is x ^ 1.
void flip_truth_value(NODE* t, struct LOOP* loop) {
    NODE* test = t->right;
    if (test->op != EQ || !is_icon(test->right, INT65(0)) || test->left->type->is_pointer()) return;
    if (!returns_1_or_0(t->left) || !returns_1_or_0(test->left) || !same_integers(test->left->type, test->right->type))
        return;
    set_icon(test->right, INT65(1));
    test->op = XORB;
    test->type = test->left->type->stqs();
    t->right = simp_node(test, loop);
}

// ---- Compound forms
bool is_counter_step(const NODE* t) {
    if (t->left->op != NAME || (t->right->op != PLUS && t->right->op != MINUS)) return false;
    const NODE* step = t->right->right;
    const bool is_constant_step =
        step->op == ICON || step->op == VPACKM || (step->op == NAME && lvalue_is_immutable(step));
    const SYMTAB* s = t->left->u.sym;
    if (!is_constant_step || !s) return false;
    const bool is_local = s->sclass == SC_AUTO || (s->sclass == SC_STATIC && s->level >= 2);
    return is_local && (t->left->type->is_pointer() || is_integer(t->left->type));
}

// Rewrites a chain of sums, or of one commutative operator, so that the term that is congruent to `x` comes first, and
// the others follow it in one operand, if that is exact. False if there is no such term.
bool bubble_term(NODE* t, const NODE* x, int levels) {
    const bool is_sum = t->op == PLUS || t->op == MINUS;
    if (!levels || !operands_have_type(t)) return false;
    if (same_value(t->left, x)) return true;
    if (commute_inv[t->op] == t->op && same_value(t->right, x)) {
        std::swap(t->left, t->right);
        return true;
    }
    auto continues = [&](const NODE* n) { return is_sum ? n->op == PLUS || n->op == MINUS : n->op == t->op; };
    NODE* l = t->left;
    if (continues(l) && bubble_term(l, x, levels - 1)) { // (x op1 rest) op2 r is x op1 (rest op r)
        NODE *found = l->left, *rest = l->right, *r = t->right;
        const int op1 = l->op, op2 = t->op;
        const bool keeps = !is_sum || op1 == PLUS;
        const int of_rest = keeps ? op2 : op2 == PLUS ? MINUS : PLUS;
        if (!signed_result_is_exact(of_rest, rest, r, l->type, nullptr)) return false;
        t->op = op1;
        t->left = found;
        t->right = l;
        l->op = of_rest;
        l->left = rest;
        l->right = r;
        return true;
    }
    NODE* r = t->right;
    if (t->op != MINUS && continues(r) && bubble_term(r, x, levels - 1)) { // l op (x op2 rest)
        NODE *found = r->left, *rest = r->right;
        if (!signed_result_is_exact(r->op, l, rest, r->type, nullptr)) return false;
        r->left = l;
        r->right = rest;
        t->left = found;
        return true;
    }
    return false;
}

} // namespace

NODE* bubble_term_to_top(NODE* tree, const NODE* term) {
    if (opASG_of_op(tree->op) == ILLOP || !tree->left || !tree->right || !is_pure(tree)) return tree;
    if (commute_inv[tree->op] != tree->op && tree->op != MINUS) return tree;
    bubble_term(tree, term, MOST_TERMS);
    return tree;
}

namespace {

NODE* make_compound(NODE* t, struct LOOP* loop) {
    if (t->right->type->is_float() || !t->right->left || !t->right->right) return ASG_to_opASG(t);
    t->right = bubble_term_to_top(t->right, t->left);
    NODE* rest = t->right->right;
    if (rest && rest->left && rest->right && same_value(t->right->left, t->left))
        t->right->right = simp_node(rest, loop);
    t = ASG_to_opASG(t);
    return t->op == ASG ? t : simp_node(t, loop);
}

// ---- Assignments of assignments, and of the target itself
NODE* value_of_assignment(NODE* t) {
    NODE* value = t->right;
    erase_tree(t->left);
    erase_node(t);
    return value;
}

// a = (b = c) is b = (a = c): the variable that may live in a register is set first.
NODE* set_register_first(NODE* t) {
    NODE *a = t->left, *inner = t->right;
    if (inner->op != ASG || a->op != NAME || !a->u.sym || a->u.sym->sclass != SC_AUTO || a->u.sym->is_aliased() ||
        lvalue_is_volatile(a))
        return nullptr;
    NODE *b = inner->left, *c = inner->right;
    if (!compatible_types(a->type, b->type, true) || bitfield_of(b) || lvalue_is_volatile(b)) return nullptr;
    if (b->op == NAME && b->u.sym && b->u.sym->sclass == SC_AUTO) return nullptr;
    if (sym_appears_in_tree(a->u.sym, c) || sym_appears_in_tree(a->u.sym, b) || !is_pure(b)) return nullptr;
    t->left = b;
    inner->left = a;
    inner->type = a->type->stqs();
    t->type = b->type->stqs();
    return t;
}

NODE* assignments_of_itself(NODE* t) {
    NODE *lhs = t->left, *rhs = t->right;
    if (same_value(lhs, rhs)) return value_of_assignment(t);
    if (rhs->op == ASG && same_value(lhs, rhs->left)) return value_of_assignment(t);
    return nullptr;
}

} // namespace

NODE* simp_ASG(NODE* t, struct LOOP* loop) {
    if (tree_is_arg_prolog(t) || !t->left->type->is_scalar() || !t->right->type->is_scalar() ||
        t->left->type->is_complex())
        return t;
    convert_value(t, loop);
    drop_idle_operators(t);
    if (NODE* r = separate_zero(t, loop)) return r;
    flip_truth_value(t, loop);
    if (t->left->op == NAME && !is_counter_step(t) && t->left->type->is_scalar() &&
        equiv_mtypes(t->left->type, t->right->type)) {
        t = make_compound(t, loop);
        if (t->op != ASG) return t;
    }
    if (NODE* r = assignments_of_itself(t)) return r;
    if (NODE* r = set_register_first(t)) return r;
    return t;
}

// ---- Compound assignments

namespace {

// x op= e computes in x's own type.
bool computes_in_own_type(const NODE* t) {
    const NODE *x = t->left, *e = t->right;
    if (!is_integer(x->type) || x->type->size < tp->int_t->size || bitfield_of(x) || !is_integer(e->type)) return false;
    return op_of_opASG[t->op] == SLL || op_of_opASG[t->op] == SRL || same_integers(x->type, e->type);
}

bool leaves_target(int op, const NODE* c) {
    switch (op) {
    case PLUS:
    case MINUS:
    case ORB:
    case XORB:
    case SLL:
    case SRL: return is_icon(c, INT65(0));
    case MULT:
    case DIV: return is_icon(c, INT65(1));
    case ANDB: return is_all_ones(c);
    default: return false;
    }
}

// The constant that the assignment leaves whatever the target held.
bool leaves_constant(int op, const NODE* c, const TYPE* type, INT65* value) {
    *value = 0;
    if (op == MULT || op == ANDB) return is_icon(c, INT65(0));
    if (op == MOD) return is_icon(c, INT65(1)) || (is_signed(type) && is_icon(c, INT65(-1)));
    *value = INT65(-1);
    return op == ORB && is_all_ones(c);
}

NODE* assign(NODE* t, NODE* value, struct LOOP* loop) {
    erase_tree(t->right);
    t->right = value;
    t->op = ASG;
    return simp_node(t, loop);
}

NODE* compound_with_constant(NODE* t, struct LOOP* loop) {
    NODE *x = t->left, *c = t->right;
    const int op = op_of_opASG[t->op];
    INT65 value;
    if (leaves_target(op, c)) {
        erase_node(c);
        return take_left(t);
    }
    if (leaves_constant(op, c, x->type, &value)) return assign(t, icon_of(value, x), loop);
    if (op == MULT && is_all_ones(c) && is_pure(x))
        return assign(t, made(UMINUS, copy_tree(x), nullptr, x->type->stqs(), loop), loop);
    const int n = log2_of(c);
    if (n <= 0 || !x->type->is_unsigned()) return nullptr;
    if (op == DIV) {
        t->op = SRLASG;
        c->type = tp->int_t;
        set_icon(c, INT65(n));
        return t;
    }
    if (op != MOD) return nullptr;
    t->op = ANDBASG;
    set_icon(c, c->u.lval - INT65(1));
    return t;
}

// x -= x, x ^= x leave 0; x &= x, x |= x leave x; x += -y is x -= y.
NODE* compound_with_value(NODE* t, struct LOOP* loop) {
    NODE *x = t->left, *e = t->right;
    const int op = op_of_opASG[t->op];
    if (same_value(x, e)) {
        if (op == MINUS || op == XORB) return assign(t, icon_of(INT65(0), x), loop);
        if (op == ANDB || op == ORB) {
            erase_tree(e);
            return take_left(t);
        }
    }
    if ((op == PLUS || op == MINUS) && is_unary(e, UMINUS)) {
        t->op = op == PLUS ? MINUSASG : PLUSASG;
        t->right = take_left(e);
        return simp_node(t, loop);
    }
    return nullptr;
}

// x op= (long)y of a narrower x: the bits that are dropped again need not be computed. The wider operation is exact
// where one in x's own type may not be.
void drop_widening(NODE* t) {
    const NODE* x = t->left;
    NODE* e = t->right;
    switch (op_of_opASG[t->op]) {
    case PLUS:
    case MINUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB: break;
    default: return;
    }
    if (e->op != SCONV || !is_integer(e->type) || !is_integer(x->type) || bitfield_of(x) || is_bitfield_access(e->left))
        return;
    if (x->type->size >= tp->int_t->size && e->type->size > x->type->size && same_integers(e->left->type, x->type) &&
        signed_result_is_exact(op_of_opASG[t->op], x, e->left, x->type, nullptr))
        t->right = take_left(e);
}

} // namespace

NODE* simp_opASG(NODE* t, struct LOOP* loop) {
    if (!t->left->type->is_scalar() || !t->right->type->is_scalar() || lvalue_is_volatile(t->left)) return t;
    drop_widening(t);
    if (t->left->type->is_pointer()) {
        const int op = op_of_opASG[t->op];
        if ((op != PLUS && op != MINUS) || !is_icon(t->right, INT65(0))) return t;
        erase_node(t->right);
        return take_left(t);
    }
    if (!computes_in_own_type(t)) return t;
    if (is_icon(t->right)) {
        if (NODE* r = compound_with_constant(t, loop)) return r;
    } else if (NODE* r = compound_with_value(t, loop)) {
        return r;
    }
    return t;
}

// ---- Structures and memory

NODE* simp_STASG(NODE* t, struct LOOP*) {
    if (!t->right || tree_is_arg_prolog(t) || !same_value(t->left, t->right)) return t;
    return value_of_assignment(t);
}

// memcpy(to, from, 0) and memcpy(p, p, n) copy nothing.
NODE* simp_MEMCPY(NODE* t, struct LOOP*) {
    if (arg_list_count(t->left) != 3) return t;
    NODE *to = arg_list_lookup(t->left, 0), *from = arg_list_lookup(t->left, 1), *n = arg_list_lookup(t->left, 2);
    const bool idle = is_icon(n, INT65(0)) || (same_value(to, from) && is_pure(n));
    if (!idle || !is_pure(to) || !is_pure(from)) return t;
    TYPE* type = t->type;
    NODE* value = copy_tree(to);
    erase_tree(t);
    return type->is_pointer() ? coerce_to_type(type, value) : value;
}

// Operands before the last have their effects only, and those once.
NODE* simp_COMMAOP(NODE* t, struct LOOP*) {
    if (t->left->op == COMMAOP) {
        NODE* inner = t->left; // what is left of it was peeled before
        inner->right = peel_for_effect(inner->right);
        if (inner->right)
            inner->type = inner->right->type;
        else
            t->left = take_left(inner);
    } else {
        t->left = peel_for_effect(t->left);
        if (!t->left) return take_right(t);
    }
    t->type = t->right->type;
    return lean_left(t);
}
