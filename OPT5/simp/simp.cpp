// The dispatch of the simplifier: from the opcode to the rules that apply to it.
//
// What is done to every node first: its type is normalized, effects of its operands are taken in front of it,
// constants are folded. Then the handler of its opcode. A tree is walked with a stack of its own, since sums,
// conditionals and comma chains of generated programs are as deep as they are long.

#include "OPT5/simp/simp.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/rule.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/walks.h"
#include "OPT5/target/bif.h"
#include "UTIL/abort.h"

#include <vector>

using namespace rules;

namespace {

// ---- Constant operands
bool has_constant_operands(const NODE* t) {
    auto is_const = [](const NODE* n) { return is_constant(n, ICON) || is_constant(n, FCON); };
    auto is_address = [](const NODE* n) { return (n->op == PCONV || n->op == ISP2CHAR) && n->left->op == ICON; };
    auto folds = [&](const NODE* n) { return is_const(n) || is_address(n); };
    return t->left && folds(t->left) && (!t->right || folds(t->right));
}

// ---- Effects of operands
// Operators whose operands are not to be evaluated before them, or not as values.
bool keeps_operands_in_place(int op) {
    switch (op) {
    case COLON:
    case ANDAND:
    case OROR:
    case RETURN:
    case SWITCH:
    case COMMA:
    case PCOMMA:
    case COMMAOP:
    case LABELREF:
    case LABELDEF:
    case CASE:
    case DEFAULT:
    case ARGREF:
    case ACONV:
    case CBRANCH:
    case IF:
    case STARG:
    case LOOP:
    case ENDLOOP:
    case INITLOOP:
    case ASSERT:
    case NASSERT:
    case DDNODE:
    case CSE_DUPE:
    case CSE_ORIG:
    case ARASG:
    case STASG: return true;
    default: return op >= MIXVALUE || !node_operator_name[op];
    }
}

bool is_constant_assignment(const NODE* t) {
    return t->op == ASG && is_constant(t->right, ICON) && t->left->type->is_scalar() && !t->left->type->is_complex() &&
           (t->left->type->is_int() || t->left->type->is_enum());
}

// Whether what `effects` does leaves the value of the operand that stands before it: a constant, an address, or a
// variable that is not the one that an assignment of constants and variables sets.
bool may_follow(const NODE* before, const NODE* effects) {
    auto may_share_register = [](const NODE* n) {
        return n->u.sym->sclass == SC_REGISTER || n->u.sym->sclass == SC_REGISTER2;
    };
    if (is_steady_leaf(before)) return true;
    if (before->op == NAME && effects->op == ASG && effects->left->op == NAME &&
        (may_share_register(before) || may_share_register(effects->left)))
        return false;
    return before->op == NAME && !lvalue_is_volatile(before) && effects->op == ASG && effects->left->op == NAME &&
           effects->left->u.sym != before->u.sym && is_pure(effects->right) && before->type->is_scalar();
}

// Effects of the value that is assigned come before a variable is set, whatever its address is.
bool left_is_plain_target(const NODE* t) { return opcode_is_ASG(t->op) && t->left->op == NAME; }

// `(a, *p) = e`: the effects are put back into the address, where their order against the value stays as it was.
void put_effects_into_address(NODE* t) {
    NODE *comma = t->left, *place = without_members(comma->right);
    if (place->op != UMULT && place->op != STREF) return;
    t->left = comma->right;
    comma->right = place->left;
    comma->type = place->left->type;
    place->left = comma;
}

// op(a, b) with effects in an operand: `a, op'`. Null where there are none, or where they must stay.
NODE* hoist_effects(NODE* t, struct LOOP* loop) {
    NODE *l = t->left, *r = t->right;
    if (!l || !t->type || !t->type->is_scalar()) return nullptr;
    const bool is_assignment = opcode_is_ASG(t->op);
    if (l->op == COMMAOP) {
        if (is_assignment && r && !is_steady_leaf(r)) {
            put_effects_into_address(t);
            return nullptr;
        }
        t->left = l->right;
        l->right = simp_node(t, loop);
        l->type = l->right->type;
        return simp_node(l, loop);
    }
    if (!is_assignment && t->op != UAND && is_constant_assignment(l)) {
        NODE* value = truncate_RHS_for_assignment(l->left, copy_tree(l->right));
        t->left = coerced(l->type->stqs(), value, loop);
        NODE* result = simp_node(t, loop);
        return simp_node(mk_COMMAOP(l, result), loop);
    }
    if (!r || r->op == FIELD) return nullptr;
    if (r->op == COMMAOP && (may_follow(l, r->left) || left_is_plain_target(t))) {
        t->right = r->right;
        r->right = simp_node(t, loop);
        r->type = r->right->type;
        return simp_node(r, loop);
    }
    if (!is_assignment && is_constant_assignment(r) && may_follow(l, r)) {
        NODE* value = truncate_RHS_for_assignment(r->left, copy_tree(r->right));
        t->right = coerced(r->type->stqs(), value, loop);
        NODE* result = simp_node(t, loop);
        return simp_node(mk_COMMAOP(r, result), loop);
    }
    return nullptr;
}

// ---- Statements
// The condition of a branch is its truth value.
NODE* simp_branch_condition(NODE* t, struct LOOP* loop) {
    if (t->left->type->is_scalar() && !t->left->type->is_complex()) t->left = simp_for_control(t->left, loop);
    return t;
}

template <class F>
void for_each_case(NODE* t, const F& visit) {
    for (NODE* list = t->right; list; list = list->op == COMMA ? list->left : nullptr) {
        NODE* item = list->op == COMMA ? list->right : list;
        if (item->op == CASE) visit(item->left);
    }
}

// SWITCH (x + c) and SWITCH ((long)x): on x, with the cases as it has them.
NODE* simp_SWITCH(NODE* t) {
    NODE* value = t->left;
    const bool adds = is_node_with_icon(value, PLUS);
    const bool widens = value->op == SCONV && is_integer(value->type) && is_integer(value->left->type) &&
                        value->left->type->size >= tp->int_t->size && value->left->type->size < value->type->size &&
                        !is_bitfield_access(value->left);
    if (!adds && !widens) return t;
    const INT65 c = adds ? value->right->u.lval : INT65(0);
    TYPE* type = value->left->type->stqs();
    bool fits = true;
    for_each_case(t, [&](const NODE* label) {
        fits = fits && is_icon(label) && same_integers(label->type, value->type) &&
               (adds || truncate_to_type(label->u.lval, type) == label->u.lval);
    });
    if (!fits) return t;
    for_each_case(t, [&](NODE* label) {
        label->type = type;
        set_icon(label, label->u.lval - c);
    });
    if (value->right) erase_node(value->right);
    t->left = take_left(value);
    return simp_SWITCH(t);
}

// A fact that is known says nothing.
NODE* simp_fact(NODE* t, struct LOOP* loop) {
    if (!t->left || !t->left->type->is_scalar() || t->left->type->is_complex() || t->left->type->is_float()) return t;
    t->left = simp_for_control(t->left, loop);
    if (t->op != NASSERT || !is_icon(t->left, INT65(1))) return t;
    erase_tree(t);
    return mk_ICON(INT65(0), tp->int_t);
}

NODE* simp_SQRT(NODE* t, struct LOOP* loop) {
    NODE* x = t->left;
    if (strict_fp || x->op != SQR || !t->type->is_float() || !compatible_types(x->left->type, t->type, true)) return t;
    t->left = take_left(x);
    t->op = ABS;
    return simp_node(t, loop);
}

[[noreturn]] void bad_opcode(const NODE* t) {
    fprintf(stderr, "\n\n   !!! Bad opcode in simplifier (%d) %s !!!\n", t->op, opname(t->op));
    abort_optimizer();
}

bool has_no_meaning(int op) {
    return op < 0 || op >= NO_OPCODES || !node_operator_name[op] || op == ILLOP || op >= DFG_DEF;
}

bool is_sum_of_floats(const NODE* t) {
    return t->type->is_float() && t->left->type->is_float() && t->right->type->is_float();
}

bool is_number_operator(int op) {
    switch (op) {
    case PLUS:
    case MINUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB:
    case SLL:
    case SRL:
    case UMINUS:
    case NOTB: return true;
    default: return false;
    }
}

NODE* dispatch(NODE* t, struct LOOP* loop) {
    if (is_number_operator(t->op)) {
        const int op = t->op;
        t = apply_to_constant_arms(t, loop);
        if (t->op != op) return t;
    }
    switch (t->op) {
    case PLUS:
    case MINUS:
        if (is_sum_of_floats(t)) return simp_float_sum(t, loop);
        return t->op == PLUS ? simp_PLUS(t, loop) : simp_MINUS(t, loop);
    case MULT: return simp_MULT(t, loop);
    case DIV: return simp_DIV(t, loop);
    case MOD: return simp_MOD(t, loop);
    case SLL:
    case SRL: return simp_shift(t, loop);
    case ANDB:
    case ORB:
    case XORB: return simp_bitop(t, loop);
    case UMINUS:
    case NOTB: return simp_unary(t, loop);
    case ABS: return simp_ABS(t, loop);
    case SQR: return simp_SQR(t, loop);
    case SQRT: return simp_SQRT(t, loop);
    case RECIP: return simp_RECIP(t, loop);
    case SCONV: return simp_SCONV(t, loop);
    case PCONV:
    case ISP2CHAR: return simp_PCONV(t, loop);
    case PMCONV:
    case PVCONV: return simp_PMCONV(t, loop);
    case ACONV: return simp_ACONV(t, loop);
    case EXCLAIM: return simp_EXCLAIM(t, loop);
    case ANDAND:
    case OROR: return simp_OROR(t, loop);
    case QUEST: return simp_QUEST(t, loop);
    case COMMAOP: return simp_COMMAOP(t, loop);
    case UMULT:
    case STREF: return simp_UMULT(t, loop);
    case STDOT: return simp_STDOT(t, loop);
    case UAND: return simp_UAND(t, loop);
    case ARGREF: return simp_ARGREF(t, loop);
    case ASG: return simp_ASG(t, loop);
    case PLUSASG:
    case MINUSASG:
    case MULTASG:
    case ANDBASG:
    case ORBASG:
    case XORBASG:
    case DIVASG:
    case MODASG:
    case SLLASG:
    case SRLASG: return simp_opASG(t, loop);
    case STASG: return simp_STASG(t, loop);
    case MEMCPY: return simp_MEMCPY(t, loop);
    case CALL:
    case UCALL: return simp_call(t, loop);
    case ICALL:
    case MCALL: return simp_ICALL(t, loop);
    case IF:
    case CBRANCH: return simp_branch_condition(t, loop);
    case SWITCH: return simp_SWITCH(t);
    case ASSERT:
    case NASSERT: return simp_fact(t, loop);
    case VPACK:
    case VPACKM:
    case VPACK1P: return simp_vector_pack(t);
    case VFIELD: return simp_vector_VFIELD(t);
    case VRCONV: return simp_vector_VRCONV(t);
    case VSCONV: return simp_vector_VSCONV(t);
    case COMPLEX:
    case REAL:
    case IMAG: return simp_complexop(t, loop);
    default: return op_is_int_compare(t->op) || op_is_float_compare(t->op) ? simp_relop(t, loop) : t;
    }
}

} // namespace

NODE* simp_node(NODE* t, struct LOOP* loop) {
    if (has_no_meaning(t->op)) bad_opcode(t);
    t->type = normalized_value_type(t->type);
    if (!keeps_operands_in_place(t->op))
        if (NODE* hoisted = hoist_effects(t, loop)) return hoisted;
    if (has_constant_operands(t)) {
        const int op = t->op;
        t = fold_constants(t);
        if (t->op != op) return t;
    }
    if (t->type->is_vector() && t->type->is_predicate()) return simp_vector_node(t);
    if (t->left && !t->left->ls) t->left->ls = t->ls;
    if (t->right && !t->right->ls) t->right->ls = t->ls;
    return dispatch(t, loop);
}

namespace {

// An assertion is not simplified by what it says itself: neither by the facts of the function nor by those of a loop.
NODE* simp_assertion(NODE* t) {
    std::vector<NODE*> givens;
    if (currfuninfo) std::swap(givens, currfuninfo->givens);
    t->left = simp_tree(t->left, nullptr);
    t->right = simp_tree(t->right, nullptr);
    t = simp_node(t, nullptr);
    if (currfuninfo) std::swap(givens, currfuninfo->givens);
    return t;
}

struct PLACE {
    NODE** link;
    bool operands_are_done;
    bool is_lvalue; // written, or its address is taken
};

bool has_lvalue(const NODE* t) { return opcode_is_ASG(t->op) || t->op == UAND || t->op == ARGREF; }

// A stack that needs no memory of its own for most trees.
class PLACES {
public:
    bool is_empty() const { return !count; }
    PLACE& top() { return at(count - 1); } // until the next push
    void push(const PLACE& place) {
        if (count >= FEW && more.size() <= count - FEW) more.emplace_back();
        at(count++) = place;
    }
    void pop() { --count; }

private:
    static constexpr size_t FEW = 16;
    PLACE& at(size_t i) { return i < FEW ? few[i] : more[i - FEW]; }

    PLACE few[FEW];
    std::vector<PLACE> more;
    size_t count = 0;
};

// The place that a conditional chooses is none of the values there.
bool is_chosen_place(const NODE* t) { return t->op == UMULT && is_strict_ternary_ICALL(t->left); }

} // namespace

NODE* simp_tree(NODE* tree, struct LOOP* loop) {
    if (!tree) return tree;
    PLACES open;
    open.push({&tree, false, false});
    while (!open.is_empty()) {
        PLACE& place = open.top();
        NODE* t = *place.link;
        if (t->op == ASSERT && t != tree) {
            *place.link = simp_assertion(t);
            open.pop();
        } else if (place.operands_are_done || (!t->left && !t->right)) {
            if (!place.is_lvalue || !is_chosen_place(t)) *place.link = simp_node(t, loop);
            open.pop();
        } else {
            if (t == tree && t->op == ASSERT) return simp_assertion(t);
            place.operands_are_done = true;
            if (t->right) open.push({&t->right, false, false});
            if (t->left) open.push({&t->left, false, has_lvalue(t)});
        }
    }
    return tree;
}

void init_simplifier() {
    compile_patterns();
    type_ops_callbacks.find_known_zeros = find_known_zeros;
    install_symbolic_callbacks();
    install_BIF_simplifiers();
}

void simp_all_trees() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'simp_all_trees' ----------\n");
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* stmt = bb->statements; stmt; stmt = stmt->rest)
            stmt->first = simp_tree(expunge_IDENTITY_ops_from_tree(stmt->first), nullptr);
}
