// Simplifiers of calls of built-in functions: the optimizer's own marks, and the word and access functions of a target
// that has them.

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/minmax.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

#include <cstring>

using namespace rules;

namespace {

NODE* argument(const NODE* call, int n) { return arg_list_lookup(call->left, n); }
int arguments(const NODE* call) { return arg_list_count(call->left); }
bool is_call_of(const NODE* t, const char* name, int n) { return t->op == ICALL && is_ICALL_callee(t, name, n); }

// ---- Conditionals that compute both arms
bool is_movable_cast(const NODE* t) { return t->op == SCONV || (t->op == PCONV && t->left->op != ICON); }

NODE* cast_outward(NODE* call) {
    NODE *&a = call->left->left->right, *&b = call->left->right;
    if (a->op != b->op || !is_movable_cast(a) || !is_movable_cast(b) || !compatible_types(a->type, b->type, true) ||
        !compatible_types(a->left->type, b->left->type, true) || is_bitfield_access(a->left) ||
        is_bitfield_access(b->left))
        return nullptr;
    NODE* cast = a;
    a = a->left;
    b = take_left(b);
    call->type = a->type->stqs();
    cast->left = call;
    return cast;
}

// a < b ? b - a : a - b of signed numbers is |b - a|.
NODE* absolute_difference(NODE* call, struct LOOP* loop) {
    NODE *test = call->left->left->left, *a = call->left->left->right, *b = call->left->right;
    if (test->op < LE || test->op > GT || !is_node(a, MINUS) || !is_node(b, MINUS) || !is_signed(a->type) ||
        !same_integers(a->type, call->type))
        return nullptr;
    if (!same_value(a->left, b->right) || !same_value(a->right, b->left)) return nullptr;
    // The arm that the test takes must be the one that is not negative.
    const bool ascends = test->op == LE || test->op == LT;
    const NODE *less = ascends ? test->left : test->right, *greater = ascends ? test->right : test->left;
    if (!same_value(less, a->right) || !same_value(greater, a->left)) return nullptr;
    NODE* difference = copy_tree(a);
    TYPE* type = call->type;
    erase_tree(call);
    return made(ABS, difference, nullptr, type, loop);
}

// Evaluates part of itself only under a condition: what stands there may be undefined otherwise.
bool is_conditional_within(const NODE* t) {
    return tree_contains_matching_node(
        t, [](const NODE* n) { return n->op == QUEST || n->op == ANDAND || n->op == OROR; });
}

NODE* simp_strict_ternary_ICALL(NODE* t, struct LOOP* loop) {
    if (!is_strict_ternary_ICALL(t)) return t;
    if (NODE* cast = cast_outward(t)) {
        cast->left = simp_strict_ternary_ICALL(t, loop);
        return simp_node(cast, loop);
    }
    if (is_integer(t->type))
        if (NODE* r = absolute_difference(t, loop)) return r;
    if (!is_pure(t) || !t->type->is_scalar() || t->type->is_complex()) return t;
    const bool has_lazy_parts = is_conditional_within(argument(t, 1)) || is_conditional_within(argument(t, 2));
    NODE* r = simp_node(undo_strict_ternary_ICALL(t, false), loop);
    return r->op == QUEST && r->right->op == COLON && !has_lazy_parts ? make_strict_ternary_ICALL(r) : r;
}

// The arm that a known test takes. The other one was computed as well: its effects stay, the first arm's before the
// second.
NODE* eval_qc_ICALL(NODE* t) {
    if (!is_strict_ternary_ICALL(t)) return t;
    NODE *test = argument(t, 0), *a = argument(t, 1), *b = argument(t, 2);
    const bool then = is_icon(test) && !test->u.lval.is_zero();
    if (!is_icon(test) || (then && !is_pure(b) && !is_steady_leaf(a))) return t;
    NODE* effects = peel_for_effect(copy_tree(then ? b : a));
    return in_sequence(effects, replace_by(t, copy_tree(then ? a : b)));
}

// ---- Marks
NODE* simp_DONOTCSE_ICALL(NODE* t, struct LOOP*) {
    while (t->left && is_call_of(t->left, "DONOTCSE", 1)) t->left = take_left(t->left);
    return t;
}

NODE* simp_builtin_expect_ICALL(NODE* t, struct LOOP*) {
    if (arguments(t) != 2 || !is_icon(argument(t, 0)) || !is_icon(argument(t, 1))) return t;
    NODE* value = mk_ICON(argument(t, 0)->u.lval, tp->long_t);
    value->ls = t->ls;
    TYPE* type = t->type;
    erase_tree(t);
    return coerce_to_type(type, value);
}

// ---- Words of numbers
bool are_zeros(const NODE* t) {
    return arguments(t) == 2 && is_icon(argument(t, 0), INT65(0)) && is_icon(argument(t, 1), INT65(0));
}

NODE* simp_ITOD_ICALL(NODE* t, struct LOOP*) {
    if (strcmp(t->u.name, "_itod") || arguments(t) != 2) return t;
    if (are_zeros(t) && t->type->is_float()) {
        NODE* zero = new_node(FCON, t->type->stqs());
        zero->u.fval = new simul_fval(pos_zero);
        zero->ls = t->ls;
        erase_tree(t);
        return zero;
    }
    auto word = [](NODE* n) { return n->op == SCONV ? n->left : n; };
    NODE *hi = word(argument(t, 0)), *lo = word(argument(t, 1));
    if (!is_call_of(hi, "_hi", 1) || !is_call_of(lo, "_lo", 1) || !same_value(hi->left, lo->left)) return t;
    return replace_by(t, copy_tree(hi->left));
}

NODE* simp_ITOLL_ICALL(NODE* t, struct LOOP*) {
    if (strcmp(t->u.name, "_itoll") || !are_zeros(t)) return t;
    return replace_by(t, mk_ICON(INT65(0), tp->llong_t));
}

NODE* simp_HI_LO_ICALL(NODE* t, struct LOOP*) {
    const bool hi = !strcmp(t->u.name, "_hi");
    if ((!hi && strcmp(t->u.name, "_lo")) || arguments(t) != 1) return t;
    NODE* x = argument(t, 0);
    if (x->op == FCON && f_is_zero(x->u.fval) && !x->u.fval->sign) return replace_by(t, mk_ICON(INT65(0), tp->uint_t));
    if (!is_call_of(x, "_itod", 2) || !is_pure(x)) return t;
    NODE* word = coerce_to_type(tp->uint_t, copy_tree(argument(x, hi ? 0 : 1)));
    return replace_by(t, word);
}

// ---- Accesses
TYPE* true_pointer_type(TYPE* t) {
    if (!t->is_pointer()) return t;
    const unsigned dropped = QUAL_CONST | QUAL_RESTRICT;
    TYPE* pointee = t->type_pointed_to();
    return tp->mk_ptr(tp->mk_qual(pointee->stqs(), pointee->qual_kind(false) & ~dropped));
}

NODE* simp_NONALIGN_ICALL(NODE* t, struct LOOP*) {
    if (arguments(t) != 1 || !t->type->is_pointer()) return t;
    TYPE* type = true_pointer_type(t->type);
    NODE* p = coerce_to_type(type, take_left(t));
    return maketree(NONALIGN, p, nullptr, type, p->ls);
}

// What is left of an address when the addends that the alignment divides are taken off.
NODE* unaligned_rest(const NODE* p, INT65 alignment) {
    for (;;) {
        if (p->op == PCONV && p->left->type->is_pointer()) {
            p = p->left;
        } else if ((p->op == PLUS || p->op == MINUS) && p->left->type->is_pointer() &&
                   type_ops_callbacks.constant_divides_expr &&
                   type_ops_callbacks.constant_divides_expr(alignment, p->right)) {
            p = p->left;
        } else {
            return copy_tree(p);
        }
    }
}

NODE* simp_ALIGNED_ICALL(NODE* t, struct LOOP*) {
    if (arguments(t) != 1 || !t->type->is_pointer()) return t;
    TYPE* type = true_pointer_type(t->type);
    NODE* p = take_left(t);
    const INT65 alignment(static_cast<long>(type->type_pointed_to()->size_in_bytes()));
    const bool asserts = alignment >= INT65(2) && is_pure(p);
    NODE* fact = nullptr;
    if (asserts) {
        NODE* rest = coerce_to_type(tp->long_t, unaligned_rest(p, alignment));
        NODE* remainder = maketree(MOD, rest, mk_ICON(alignment, tp->long_t), tp->long_t, p->ls);
        fact = maketree(NASSERT, maketree(EQ, remainder, mk_ICON(INT65(0), tp->long_t), tp->int_t, p->ls), nullptr,
                        tp->int_t, p->ls);
        if (currfuninfo) currfuninfo->has_nasserts = true;
    }
    NODE* cast = push_down_pointer_cast(type, p);
    return fact ? mk_COMMAOP(fact, cast) : cast;
}

struct CALLBACKS {
    const char* name;
    BIF::SIMPLIFIER simplify;
    BIF::EVALUATOR evaluate;
};

const CALLBACKS callbacks[] = {
    {"quest$colon", simp_strict_ternary_ICALL, eval_qc_ICALL},
    {"DONOTCSE", simp_DONOTCSE_ICALL, nullptr},
    {"__builtin_expect", simp_builtin_expect_ICALL, nullptr},
    {"SORREL_HI", simp_HI_LO_ICALL, nullptr},
    {"SORREL_LO", simp_HI_LO_ICALL, nullptr},
    {"SORREL_ITOD", simp_ITOD_ICALL, nullptr},
    {"SORREL_ITOLL", simp_ITOLL_ICALL, nullptr},
};

constexpr const char* extrema[] = {"MIN", "LMIN", "LLMIN", "MINU", "LMINU", "LLMINU",
                                   "MAX", "LMAX", "LLMAX", "MAXU", "LMAXU", "LLMAXU"};
constexpr const char* absolutes[] = {"__abs16_sat", "ETSI_ABS_S", "ETSI_L_ABS"};
constexpr const char* accesses[] = {"MEM2", "MEM4", "MEM8", "MEMD8"};

} // namespace

void install_BIF_simplifiers() {
    if (!find_BIF_descriptor("quest$colon")) return; // a start without descriptors
    for (const CALLBACKS& c : callbacks) set_BIF_callbacks(c.name, c.simplify, c.evaluate);
    for (const char* name : extrema) set_BIF_callbacks(name, simp_minmax_ICALL, nullptr);
    for (const char* name : absolutes) set_BIF_callbacks(name, simp_absolute_ICALL, nullptr);
    for (const char* access : accesses)
        for (const char* suffix : {"", "_CONST"}) {
            set_BIF_callbacks((std::string("SORREL_") + access + suffix).c_str(), simp_NONALIGN_ICALL, nullptr);
            set_BIF_callbacks((std::string("SORREL_A") + access + suffix).c_str(), simp_ALIGNED_ICALL, nullptr);
        }
}

// The descriptor of the source's name, or of one of the optimizer's own marks.
NODE* simp_ICALL(NODE* t, struct LOOP* loop) {
    if (!t->left || !t->u.name) return t;
    const bool is_mark = is_strict_ternary_ICALL(t) || is_call_of(t, "DONOTCSE", 1);
    const BIF* bif = is_mark ? find_BIF_descriptor(t->u.name) : find_target_BIF_descriptor(t->u.name);
    if (!bif) return t;
    if (bif->evaluator) {
        NODE* value = bif->evaluator(t);
        if (value != t) return value;
    }
    return bif->simplifier ? bif->simplifier(t, loop) : t;
}
