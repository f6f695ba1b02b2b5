// Places and addresses: indirections, members, addresses of both.
//
// An indirection of an address is the object, unless the object's type says otherwise or an access that is volatile
// would be lost. While trees are normalized, indirections keep their addresses.

#include "OPT5/ir/global.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

using namespace rules;

namespace {

bool same_place_type(TYPE* a, TYPE* b) { return compatible_types(a, b, true); }

// Whether `object` may stand for an indirection of its address.
bool object_may_stand(const NODE* indirection, NODE* object) {
    if (is_bitfield_access(object)) return false;
    TYPE* own = object->op == NAME && object->u.sym && !object->type->is_vector() ? object->u.sym->type : object->type;
    if (!same_place_type(own, indirection->type) || !same_place_type(object->type, indirection->type)) return false;
    return !indirection->type->is_volatile() || lvalue_is_volatile(object);
}

NODE* object_of_address(NODE* t, struct LOOP*) {
    NODE* address = t->left;
    if (trees_are_normalized || t->right || (address->op != UAND && address->op != ARGREF) ||
        !object_may_stand(t, address->left))
        return nullptr;
    return take_left(take_left(t));
}

// The cast of a pointer to an array that only says that its first element is meant.
NODE* element_of_array(NODE* t, struct LOOP* loop) {
    NODE* cast = t->left;
    if (cast->op != PCONV || !cast->left->type->is_pointer()) return nullptr;
    TYPE* pointee = cast->left->type->type_pointed_to();
    if (!pointee->is_array() || pointee->is_vector() || !same_place_type(pointee->elem_type(), t->type)) return nullptr;
    if (pointee->is_volatile() && !t->type->is_volatile()) return nullptr;
    t->left = take_left(cast);
    return simp_node(t, loop);
}

// *(c ? &a : &b) of a conditional that computes both arms loads both.
NODE* load_both_arms(NODE* t, struct LOOP* loop) {
    NODE* call = t->left;
    if (trees_are_normalized || t->right || !is_strict_ternary_ICALL(call) || !t->type->is_scalar()) return nullptr;
    NODE*& otherwise = call->left->right;
    NODE*& then = call->left->left->right;
    auto fits = [&](const NODE* arm) {
        return arm->op == UAND && arm->left->op == NAME && object_may_stand(t, arm->left) &&
               !lvalue_is_volatile(arm->left);
    };
    if (!fits(then) || !fits(otherwise)) return nullptr;
    then = take_left(then);
    otherwise = take_left(otherwise);
    call->type = t->type->stqs();
    erase_node(t);
    return simp_node(call, loop);
}

// What a string literal holds does not change.
void mark_literal_const(NODE* t) {
    const NODE* p = t->left;
    if (p->op == PLUS && p->left->op == SCON) p = p->left;
    if (p->op == SCON && !t->type->is_const() && t->type->is_scalar())
        t->type = tp->mk_qual(t->type, t->type->qual_kind(false) | QUAL_CONST);
}

const RULE indirection_rules[] = {object_of_address, element_of_array, load_both_arms};

} // namespace

NODE* simp_ss_tree(NODE* t, struct LOOP* loop) {
    if (!t) return t;
    return is_integer(t->type) ? simp_assoc(t, loop) : t;
}

NODE* simp_UMULT(NODE* t, struct LOOP* loop) {
    if (t->op == STREF) return simp_STREF(t, loop);
    if (t->right) t->right = simp_ss_tree(t->right, loop);
    if (!trees_are_normalized) mark_literal_const(t);
    return first_that_applies(indirection_rules, t, loop);
}

// (&x)->f is x.f.
NODE* simp_STREF(NODE* t, struct LOOP*) {
    NODE* address = t->left;
    if (trees_are_normalized || address->op != UAND || !address->type->is_pointer()) return t;
    NODE* object = address->left;
    if (!object->type->is_csu() || !same_place_type(address->type->type_pointed_to(), object->type)) return t;
    if (address->type->type_pointed_to()->is_volatile() && !lvalue_is_volatile(object)) return t;
    t->left = take_left(address);
    t->op = STDOT;
    return t;
}

NODE* simp_STDOT(NODE* t, struct LOOP*) { return t; }

// &*p is p.
NODE* simp_UAND(NODE* t, struct LOOP*) {
    NODE* object = t->left;
    if (trees_are_normalized || object->op != UMULT || object->right || !object->left->type->is_pointer() ||
        !t->type->is_pointer())
        return t;
    TYPE* type = t->type;
    NODE* p = take_left(take_left(t));
    return coerce_to_type(type, p);
}

// The place of an output argument stays a place.
NODE* simp_ARGREF(NODE* t, struct LOOP*) { return t; }

// The conversion of an argument to the type that it has.
NODE* simp_ACONV(NODE* t, struct LOOP*) {
    if (!t->type->is_scalar() || is_bitfield_access(t->left) || !exact_types(t->type, t->left->type)) return t;
    return take_left(t);
}

// Scaling by a size in bits, in address units: by one unit it is none.
NODE* simp_PMCONV(NODE* t, struct LOOP* loop) {
    constexpr long ADDRESS_UNIT = 16;
    if (!t->right || !is_icon(t->right) || !is_integer(t->type) || !operand_has_type(t)) return t;
    const INT65 bits = t->right->u.lval;
    if (bits < INT65(ADDRESS_UNIT) || !(bits % INT65(ADDRESS_UNIT)).is_zero()) return t;
    const INT65 scale = bits / INT65(ADDRESS_UNIT);
    if (scale == INT65(1)) return only_left(t);
    if (!is_icon(t->left)) return t;
    NODE* c = icon_of(scale, t->left);
    NODE* r = made(t->op == PMCONV ? MULT : DIV, t->left, c, t->type->stqs(), loop);
    erase_node(t->right);
    erase_node(t);
    return r;
}

namespace {

// A pointer to a function stands for the function, through an indirection of it and casts that keep its type.
void plain_callee(NODE* t) {
    for (;;) {
        NODE* callee = t->left;
        const bool is_cast = callee->op == PCONV && callee->left->type->is_pointer() && callee->left->op == UAND &&
                             compatible_types(callee->type, callee->left->type, false);
        const bool is_indirection = callee->op == UAND && callee->left->op == UMULT && !callee->left->right &&
                                    callee->left->left->type->is_pointer() &&
                                    compatible_types(callee->type, callee->left->left->type, true);
        if (!is_cast && !is_indirection) return;
        t->left = take_left(callee);
        if (is_indirection) t->left = take_left(t->left);
    }
}

} // namespace

NODE* simp_call(NODE* t, struct LOOP*) {
    plain_callee(t);
    return t;
}
