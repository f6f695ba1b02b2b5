// The known alignment of an access: that of the object or of what its pointer was declared to point to, as far as the
// offsets added to it keep it. The wrappers OUIALIGN and NONALIGN take back what a pointer's type guarantees.
#include "OPT5/alias/alias.h"

#include "OPT5/alias/address_form.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"

#include <algorithm>

namespace {

constexpr unsigned UNIT = 16; // bits; what every address is aligned to

unsigned at_least_a_unit(INT65 bits) {
    constexpr unsigned LIMIT = 1u << 16;
    if (bits < INT65(UNIT)) return UNIT;
    return bits > INT65(LIMIT) ? LIMIT : bits.fits_in<unsigned>();
}

unsigned alignment_of(const TYPE* type) { return std::max(UNIT, type->align); }

unsigned type_guarantee(const NODE* pointer) {
    return pointer->type->is_pointer() ? alignment_of(pointer->type->type_pointed_to()) : UNIT;
}

bool is_marked_unaligned(const NODE* pointer) {
    while (pointer->op == PCONV || pointer->op == ISP2CHAR || pointer->op == IDENTITY) pointer = pointer->left;
    return pointer->op == OUIALIGN || pointer->op == NONALIGN;
}

// Of the place that a form stands for, down to one unit. `trusted`: pointers in it have the alignment of their types.
unsigned alignment_of_form(const ADDRESS_FORM& form, bool trusted) {
    INT65 g = long_gcd(form.modulus(), form.constant < 0 ? -INT65(form.constant) : INT65(form.constant));
    if (form.object) g = long_gcd(g, INT65(std::max(form.object->align, alignment_of(form.object->type))));
    for (const LINEAR_FORM::TERM& term : form) {
        const INT65 scale = term.coefficient < 0 ? -INT65(term.coefficient) : INT65(term.coefficient);
        const bool is_base = term.tree->type->is_pointer() && scale == INT65(UNIT);
        g = long_gcd(g, is_base && trusted ? INT65(type_guarantee(term.tree)) : scale);
    }
    return at_least_a_unit(g);
}

unsigned alignment_of_address(const NODE* pointer) {
    NODE* place = maketree(UMULT, copy_tree(pointer), nullptr, pointer->type->type_pointed_to());
    const unsigned bits = alignment_of_form(address_form(place), !is_marked_unaligned(pointer));
    erase_tree(place);
    return bits;
}

} // namespace

unsigned nonaligned_pointee_alignment(const NODE* pointer, struct LOOP*) {
    return pointer->type->is_pointer() ? alignment_of_address(pointer) : UNIT;
}

unsigned pointee_alignment(const NODE* pointer, struct LOOP* loop) {
    const unsigned known = nonaligned_pointee_alignment(pointer, loop);
    return is_marked_unaligned(pointer) ? known : std::max(known, type_guarantee(pointer));
}

unsigned lvalue_alignment(const NODE* lvalue, struct LOOP* loop) {
    const NODE* t = lvalue;
    while (t->op == IDENTITY || t->op == DDNODE || op_wraps_for_SSA(t->op)) t = t->left;
    if (t->op == UMULT && !t->right) return std::max(pointee_alignment(t->left, loop), overall_PT_align(PT_info_of(t)));
    return alignment_of_form(address_form(t), true);
}

bool is_lvalue_sufficiently_aligned(const NODE* lvalue, unsigned bits, struct LOOP* loop) {
    return lvalue_alignment(lvalue, loop) >= bits;
}
