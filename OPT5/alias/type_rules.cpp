// What the types of two lvalues say: an object is accessed as its own type, as a part or a whole of it, or as a
// character.
//
// Only declared types may decide. The normalized form of `char`, `short` and `int` is one and the same here, so that
// the type of a node, or of a temporary made from one, does not tell what the program wrote: where nothing declared is
// found, a 16-bit integer counts as a character. A cast to a character pointer is told from others by its opcode.
#include "OPT5/alias/alias.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

namespace {

TYPE* without_arrays(TYPE* t) {
    t = find_type(t->real);
    while (t->is_array() && !t->is_vector()) t = find_type(t->raw_elem_type()->real);
    return t;
}

bool is_character(const TYPE* t) { return t->is_schar() || t->is_uchar(); }

bool is_narrow_integer(const TYPE* t) { return t->is_int() && t->size <= tp->int_t->size; }

// What is compared once characters are dealt with. Floating types of one size, and an enumeration and its integer, have
// one normalized form: one lvalue may tell the declared type of an object, and the other only that form.
TYPE* compared_form(TYPE* t) {
    constexpr unsigned DROPPED = QUAL_CONST | QUAL_VOLATILE | QUAL_ONCHIP;
    constexpr unsigned DROPPED_IN_OLD_C = QUAL_VOLATILE | QUAL_ONCHIP;
    const bool old_c = old_const_pointer_behavior && currfuninfo && !TEST_FLAG(currfuninfo, FUN_is_cpp);
    t = essential_type(tp->remove_known_qual(t, old_c ? DROPPED_IN_OLD_C : DROPPED));
    return t->is_float() || t->is_enum() ? normalized_value_type(t) : t;
}

bool holds(TYPE* whole, TYPE* part) {
    return whole->is_csu() && (!whole->is_complete() || type_or_its_twin_is_component(part, whole));
}

} // namespace

bool types_may_be_aliased(TYPE* t1, bool exact1, TYPE* t2, bool exact2) {
    TYPE *a = without_arrays(t1), *b = without_arrays(t2);
    if (compatible_types(a, b, true)) return true;
    // Members of one union are accessed through each other's types.
    if (any_unions_in_program && types_contained_in_union(a, b)) return true;
    if (chars_alias_other_types && ((is_character(a) && !exact1) || (is_character(b) && !exact2))) return true;
    while ((a->is_pointer() && b->is_pointer()) || (a->is_array() && b->is_array())) {
        a = a->is_pointer() ? find_type(a->type_pointed_to()->real) : without_arrays(a);
        b = b->is_pointer() ? find_type(b->type_pointed_to()->real) : without_arrays(b);
    }
    if (a->is_func() && b->is_func()) return true; // with and without parameters
    a = compared_form(a);
    b = compared_form(b);
    if (a->is_void() || b->is_void()) return true;
    // A structure that is accessed as declared shares memory with its parts, and with what it is a part of.
    if (a->is_csu() && exact1 && !holds(a, b) && !holds(b, a)) return false;
    if (b->is_csu() && exact2 && !holds(b, a) && !holds(a, b)) return false;
    return compatible_types(a, b, true) || a->is_csu() || b->is_csu();
}

namespace {

// The type that a pointer was declared to point to, or null where the tree does not tell.
TYPE* declared_pointee(const NODE* p) {
    for (;;) switch (p->op) {
        case ISP2CHAR: return tp->schar_t;
        case IDENTITY:
        case OUIALIGN:
        case NONALIGN: p = p->left; break;
        case PLUS:
        case MINUS:
            p = p->op == PLUS && !p->left->type->is_pointer() ? p->right : p->left;
            if (!p->type->is_pointer()) return nullptr;
            break;
        case NAME: {
            const SYMTAB* sym = p->u.sym;
            // Temporaries of an earlier run have the type of their first access for a declared one.
            if (!sym || sym->is_temp || is_internal_symbol(sym)) return nullptr;
            if (!sym->orig_type || !sym->orig_type->is_pointer()) return nullptr;
            return sym->orig_type->type_pointed_to();
        }
        case STDOT:
        case STREF: {
            const fkMDATA* m = p->right ? p->right->mval : nullptr;
            return m && m->type->is_pointer() ? m->type->type_pointed_to() : nullptr;
        }
        default: return nullptr;
        }
}

TYPE* type_of_indirection(const NODE* t) {
    TYPE* declared = t->right ? nullptr : declared_pointee(t->left);
    // A cast in between may stand for another access than the variable below it was declared for.
    if (declared && (is_character(declared->real) || equiv_mtypes(declared, t->type))) return declared;
    return is_narrow_integer(t->type) ? tp->schar_t : t->type;
}

} // namespace

TYPE* true_type(const NODE* t, bool* exact) {
    for (;;) switch (t->op) {
        case SSA_USE:
        case SSA_DEF:
        case SSA_MU:
        case SSA_CHI:
        case DDNODE:
        case IDENTITY:
        case OUIALIGN:
        case NONALIGN: t = t->left; break;
        case NAME: *exact = true; return t->u.sym && t->u.sym->orig_type ? t->u.sym->orig_type : t->type;
        case STDOT:
        case STREF: *exact = true; return t->right && t->right->mval ? t->right->mval->type : t->type;
        case UMULT: *exact = false; return type_of_indirection(t);
        default: *exact = false; return is_narrow_integer(t->type) ? tp->schar_t : t->type;
        }
}
