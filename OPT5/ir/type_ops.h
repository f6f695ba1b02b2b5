// The C type rules on trees: result types, casts, and the global facts about the target's scalar types.
//
// These keep the invariant that an operator's operands have the types that the operator requires. Result types
// are in type_ops.cpp, what casts a tree must have in type_ops_casts.cpp, conversion to a type in type_ops_coerce.cpp,
// questions about types in type_ops_shape.cpp and about values in type_ops_value.cpp.
#pragma once

#include "OPT5/ir/node.h"
#include "TYPES/type.h"
#include "XINT/int65.h"

#include <vector>

extern uint32_t max_scalar_alignment; // bits
extern uint64_t max_scalar_stride, pointer_type_stride;

void init_types(); // once, after the type package and the target's sizes are known
uint64_t type_stride(const TYPE* t);
TYPE* normalized_underlying_type(TYPE* t);
// The node's type as the optimizer keeps it: normalized, an enumeration as its underlying type with the same
// qualifiers.
TYPE* normalized_value_type(TYPE* t);
TYPE* promoted_type(TYPE* t);
TYPE* combined_type_for_types(TYPE* a, TYPE* b);
TYPE* combined_type(const NODE* x, const NODE* y);
TYPE* operator_type_for_operand_types(int op, TYPE* a, TYPE* b, TYPE* c, const char* name);
TYPE* type_for_PMCONV(TYPE* t);
TYPE* get_complex_type(TYPE* part);
TYPE* next_wider_type(TYPE* t);
TYPE* wide_enough_int_type(INT65 v);
TYPE* essential_type(TYPE* t);
bool type_returns_1_or_0(TYPE* t);
bool returns_1_or_0(const NODE* tree);
bool value_fits_in_type(const NODE* tree, TYPE* t, struct LOOP* loop);
NODE* coerce_to_type(TYPE* t, NODE* tree, bool exact = false);
NODE* push_down_pointer_cast(TYPE* t, NODE* tree);
NODE* remove_pushed_down_casts(NODE* tree);
NODE* insert_mandatory_casts(NODE* tree);
NODE* fix_type_info(NODE* tree); // repairs one node in place and returns it
TYPE* merge_qualifiers_for_STDOT(TYPE* t, const NODE* stdot);
NODE* mk_member(NODE* object, fkMDATA* m); // object.m as a place; `object` is taken
// A number of one part, or a pointer; no truth value.
inline bool is_plain_number(const TYPE* t) {
    return ((t->is_int() && !t->is_bool()) || t->is_float() || t->is_pointer()) && !t->is_complex();
}
bool must_preserve_STDOT(const NODE* tree);
bool symbol_is_immutable(const SYMTAB* sym);
bool lvalue_is_immutable(const NODE* tree);
bool bits_of_var_are_immutable(TYPE* type, int64_t start, int64_t width);
bool is_type_component_of_type(TYPE* part, TYPE* whole);
// The same for an integer whose signed or unsigned form, or an enumeration of it, is a component.
bool type_or_its_twin_is_component(TYPE* part, TYPE* whole);
bool is_field_member_of_type(const fkMDATA* field, TYPE* type);
bool csu_type_has_only_simple_scalar_members(TYPE* t, int limit);
bool type_is_contained_in_type(TYPE* part, TYPE* whole);
bool types_contained_in_union(TYPE* a, TYPE* b);
bool type_may_alias_type(TYPE* a, TYPE* b);
// Whether an access of that type may be one to a part of an object of type `whole`.
bool type_may_access_part_of(TYPE* access, TYPE* whole);
bool type_may_contain_volatile(TYPE* t);
bool type_could_be_an_array(TYPE* t);
TYPE* type_of_nth_parameter(int n, const SYMTAB* sym); // null beyond the prototype
void type_cache_stats();

// Callbacks for what rooms above this one know. Each is null until the room installs it; null gives the conservative
// answer.
struct TYPE_OPS_CALLBACKS {
    TYPE* (*builtin_return_type)(const char* name) = nullptr;
    bool (*builtin_returns_1_or_0)(const char* name) = nullptr;
    NODE* (*fix_BIF_types)(NODE* call) = nullptr;
    INT65 (*find_known_zeros)(const NODE* tree, TYPE* type) = nullptr;
    bool (*calculate_bounds)(const NODE* tree, struct LOOP* loop, INT65* min, INT65* max) = nullptr;
    bool (*builtin_points_into_operand_0)(const char* name) =
        nullptr; // its value is that pointer, or a place behind it
    bool (*constant_divides_expr)(INT65 constant, const NODE* tree) = nullptr;
};
extern TYPE_OPS_CALLBACKS type_ops_callbacks;
