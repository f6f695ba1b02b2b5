// Addresses as sums, and what the difference of two sums says.
//
// Terms of the same value cancel. What remains is c + k1*x1 + k2*x2 + ..., with x1, x2, ... unknown integers, which
// lies in the residue class of c modulo the greatest common divisor g of the coefficients: two accesses that the whole
// class keeps apart are disjoint. That tells x.a from y.b in arrays of structures, and p[2*i] from p[2*i + 1].
//
// Sums are opened where they are exact: pointer arithmetic, and signed arithmetic, which the simplifier keeps exact.
// Unsigned ones of an address's width wrap where it does, and the classes are those of a divisor of the address space
// then. A narrower one may wrap before it becomes part of a pointer, and stays one term.

#include "OPT5/alias/address_form.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "OPT5/simp/exact.h"

namespace {

constexpr int BITS_PER_UNIT = 16, MOST_NODES = 64;
constexpr unsigned ADDRESS_WIDTH = 32; // of an address as a number, which counts units

void add_lvalue(ADDRESS_FORM& form, const NODE* t);

// Integers and pointers, in bits of the address.
class READER final : public LINEAR_READER {
public:
    explicit READER(ADDRESS_FORM* f) : LINEAR_READER(f, MOST_NODES), address(*f) {}

private:
    const NODE* without_marks(const NODE* t) const override {
        while (t->op == IDENTITY || t->op == OUIALIGN || t->op == NONALIGN || op_wraps_for_SSA(t->op))
            t = t->left;
        return t;
    }
    bool takes_constant(const NODE*) override { return true; }

    bool opens(const NODE* t, const LINEAR_STEP&) override {
        if (t->type->is_pointer()) return opens_pointer(t);
        if (t->op == SCONV) return opens_cast(t);
        if (t->op == MULT && t->right->op != ICON) return false;
        if (t->op == PLUS || t->op == MINUS || t->op == UMINUS || t->op == MULT)
            return is_exact_by_rule(t->op, t->type) || wraps(t);
        return t->op == SLL && wraps(t);
    }
    static bool opens_pointer(const NODE* t) {
        switch (t->op) {
        case PCONV:
        case ISP2CHAR: return t->left->type->is_pointer() || t->left->op == ICON;
        case PLUS: return t->left->type->is_pointer() != t->right->type->is_pointer();
        case MINUS: return t->left->type->is_pointer() && !t->right->type->is_pointer();
        default: return false;
        }
    }
    bool opens_cast(const NODE* t) {
        const TYPE *to = t->type, *from = t->left->type;
        if (!to->is_int() || !from->is_int() || from->size > to->size) return false;
        return (from->is_signed() && to->is_signed()) || (from->size == to->size && wraps(t));
    }
    // Whether the operator wraps where an address does, and counts as one that may.
    bool wraps(const NODE* t) {
        auto is_as_wide = [](const NODE* n) {
            return n->type->is_int() && !n->type->is_bool() && n->type->size == ADDRESS_WIDTH;
        };
        if (!is_as_wide(t) || !is_as_wide(t->left)) return false;
        if ((t->op == PLUS || t->op == MINUS) && !is_as_wide(t->right)) return false;
        form.is_exact = false;
        return true;
    }

    bool leaf(const NODE* t, int64_t k) override {
        if (t->op != UAND || !t->type->is_pointer() || k != BITS_PER_UNIT) return form.add(t, k);
        add_lvalue(address, t->left);
        return true;
    }

    ADDRESS_FORM& address;
};

// The tree as a term where it has more of them than fit.
void add_value(ADDRESS_FORM& form, const NODE* t) {
    const ADDRESS_FORM before = form;
    if (READER(&form).read(t, BITS_PER_UNIT)) return;
    form = before;
    form.add(t, BITS_PER_UNIT);
}

void add_lvalue(ADDRESS_FORM& form, const NODE* t) {
    for (;;) {
        t = below_transparent(t);
        if ((t->op == STDOT || t->op == STREF) && t->right && t->right->mval) {
            form.add_constant(t->right->mval->offset);
            if (t->op == STREF) return add_value(form, t->left);
            t = t->left;
        } else if (t->op == UMULT) {
            if (t->right) add_value(form, t->right); // base and subscript
            return add_value(form, t->left);
        } else if (t->op == NAME && t->u.sym && !form.object) {
            form.object = t->u.sym;
            return;
        } else {
            form.add(t, BITS_PER_UNIT); // not understood: a place of its own
            return;
        }
    }
}

INT65 access_width(const NODE* t) {
    t = below_transparent(t);
    if ((t->op == STDOT || t->op == STREF) && t->right && t->right->mval && t->right->mval->is_bitfld)
        return INT65(static_cast<int64_t>(t->right->mval->width));
    return INT65(static_cast<int64_t>(t->type->size));
}

INT65 magnitude(int64_t v) { return v < 0 ? -INT65(v) : INT65(v); }

INT65 residue(INT65 v, INT65 modulus) {
    const INT65 r = v % modulus;
    return r.is_negative() ? r + modulus : r;
}

bool may_differ_in_loop(const NODE* tree, struct LOOP* loop) {
    return loop && !(loop_callbacks.is_constant_in && loop_callbacks.is_constant_in(tree, loop));
}

// What is known of pointer variables at every place.
void find_object(ADDRESS_FORM& form) {
    if (form.object || !currfuninfo) return;
    for (const LINEAR_FORM::TERM& term : form) {
        const NODE* p = term.tree;
        if (p->op != NAME || !p->type->is_pointer() || term.coefficient != BITS_PER_UNIT) continue;
        const SPMAP& pointees = *currfuninfo->spmap;
        SYMTAB* object = pointees.object(p->u.sym);
        if (!object) continue;
        if (pointees.is_precise(p->u.sym)) {
            form.object = object;
            form.add_constant((pointees.offset(p->u.sym) * INT65(BITS_PER_UNIT)).fits_in<int64_t>());
            form.erase(&term);
        } else {
            form.points_into = object;
        }
        break;
    }
}

} // namespace

ADDRESS_FORM address_form(const NODE* lvalue) {
    ADDRESS_FORM form;
    form.width = access_width(lvalue);
    add_lvalue(form, lvalue);
    find_object(form);
    if (!form.known_object()) form.points_into = single_pointsto_target_if_known(PT_info_of(lvalue));
    return form;
}

ADDRESS_FORM pointer_form(const NODE* pointer) {
    ADDRESS_FORM form;
    add_value(form, pointer);
    find_object(form);
    return form;
}

INT65 ADDRESS_FORM::modulus() const {
    return is_exact ? INT65(0) : INT65(BITS_PER_UNIT) << INT65(static_cast<int64_t>(ADDRESS_WIDTH));
}

bool accesses_are_disjoint(const ADDRESS_FORM& a, const ADDRESS_FORM& b, struct LOOP* loop) {
    if (a.object != b.object || a.width <= INT65(0) || b.width <= INT65(0)) return false;
    // The greatest common divisor of the coefficients of what does not cancel, and of the address space where sums
    // wrap.
    INT65 g = long_gcd(a.modulus(), b.modulus());
    bool is_matched[LINEAR_FORM::MOST_TERMS] = {};
    for (const LINEAR_FORM::TERM& x : a) {
        INT65 coefficient = x.coefficient;
        for (const LINEAR_FORM::TERM& y : b) {
            bool& is_taken = is_matched[&y - b.begin()];
            if (is_taken || !trees_are_congruent(x.tree, y.tree, false)) continue;
            is_taken = true;
            if (may_differ_in_loop(x.tree, loop))
                g = long_gcd(g, magnitude(y.coefficient));
            else
                coefficient -= INT65(y.coefficient);
            break;
        }
        g = long_gcd(g, coefficient.is_negative() ? -coefficient : coefficient);
    }
    for (const LINEAR_FORM::TERM& y : b)
        if (!is_matched[&y - b.begin()]) g = long_gcd(g, magnitude(y.coefficient));
    const INT65 distance = INT65(b.constant) - INT65(a.constant); // of b behind a
    return accesses_are_apart(distance, g, a.width, b.width);
}

bool accesses_are_apart(INT65 distance, INT65 step, INT65 width_a, INT65 width_b) {
    if (step.is_zero()) return distance >= width_a || -distance >= width_b;
    const INT65 behind = residue(distance, step);
    return behind >= width_a && step - behind >= width_b;
}

const NODE* below_transparent(const NODE* t) {
    while (t->op == IDENTITY || t->op == OUIALIGN || t->op == NONALIGN || t->op == DDNODE ||
           op_wraps_for_SSA(t->op))
        t = t->left;
    return t;
}
