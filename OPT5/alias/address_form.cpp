// Addresses as sums, and what the difference of two sums says.
//
// Terms of the same value cancel. What remains is c + k1*x1 + k2*x2 + ..., with x1, x2, ... unknown integers, which
// lies in the residue class of c modulo the greatest common divisor g of the coefficients: two accesses that the whole
// class keeps apart are disjoint. That tells x.a from y.b in arrays of structures, and p[2*i] from p[2*i + 1].
//
// Sums are opened only where they are exact: pointer arithmetic, and signed arithmetic, whose overflow is undefined. An
// unsigned sum may wrap before it becomes part of a pointer, and stays one term.

#include "OPT5/alias/address_form.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"

#include <cstddef>

namespace {

constexpr int MAX_TERMS = 16;
constexpr int BITS_PER_UNIT = 16;

void add_term(ADDRESS_FORM& form, const NODE* tree, INT65 coefficient) {
    for (ADDRESS_TERM& term : form.terms) {
        if (!trees_are_congruent(term.tree, tree, false)) continue;
        term.coefficient += coefficient;
        return;
    }
    form.terms.push_back({tree, coefficient});
}

bool is_exact_widening(const NODE* t) {
    if (t->op != SCONV || !t->type->is_int() || !t->left->type->is_int()) return false;
    return t->left->type->is_signed() && t->type->is_signed() && t->left->type->size <= t->type->size;
}

bool is_exact_sum(const NODE* t) { return t->type->is_pointer() || (t->type->is_int() && t->type->is_signed()); }

// Adds `coefficient` times `t`, an integer.
void add_integer(ADDRESS_FORM& form, const NODE* t, INT65 coefficient) {
    for (;;) {
        while (t->op == IDENTITY || is_exact_widening(t)) t = t->left;
        if (t->op == ICON) {
            form.offset += coefficient * t->u.lval;
            return;
        }
        const bool opens = is_exact_sum(t) && !t->type->is_pointer() && form.terms.size() < MAX_TERMS;
        if (opens && (t->op == PLUS || t->op == MINUS)) {
            add_integer(form, t->right, t->op == PLUS ? coefficient : -coefficient);
            t = t->left;
        } else if (opens && t->op == MULT && t->right->op == ICON) {
            coefficient = coefficient * t->right->u.lval;
            t = t->left;
        } else if (opens && t->op == SLL && t->right->op == ICON && t->right->u.lval < INT65(32) &&
                   !t->right->u.lval.is_negative()) {
            coefficient = coefficient << t->right->u.lval;
            t = t->left;
        } else if (opens && t->op == UMINUS) {
            coefficient = -coefficient;
            t = t->left;
        } else {
            add_term(form, t, coefficient);
            return;
        }
    }
}

void add_lvalue(ADDRESS_FORM& form, const NODE* t);

void add_pointer(ADDRESS_FORM& form, const NODE* p) {
    for (;;) {
        switch (p->op) {
        case IDENTITY:
        case OUIALIGN:
        case NONALIGN: p = p->left; continue;
        case PCONV:
        case ISP2CHAR:
            if (p->left->op == ICON) {
                form.offset += p->left->u.lval * INT65(BITS_PER_UNIT);
                return;
            }
            if (!p->left->type->is_pointer()) break;
            p = p->left;
            continue;
        case ICON: form.offset += p->u.lval * INT65(BITS_PER_UNIT); return;
        case PLUS:
        case MINUS: {
            const bool swapped = p->op == PLUS && !p->left->type->is_pointer();
            const NODE *base = swapped ? p->right : p->left, *index = swapped ? p->left : p->right;
            if (!base->type->is_pointer() || index->type->is_pointer()) break;
            add_integer(form, index, INT65(p->op == PLUS ? BITS_PER_UNIT : -BITS_PER_UNIT));
            p = base;
            continue;
        }
        case UAND: add_lvalue(form, p->left); return;
        default: break;
        }
        add_term(form, p, INT65(BITS_PER_UNIT));
        return;
    }
}

const NODE* without_wrappers(const NODE* t) {
    while (t->op == IDENTITY || t->op == OUIALIGN || t->op == NONALIGN || t->op == DDNODE ||
           (t->op >= SSA_USE && t->op <= SSA_CHI))
        t = t->left;
    return t;
}

void add_lvalue(ADDRESS_FORM& form, const NODE* t) {
    for (;;) {
        t = without_wrappers(t);
        if ((t->op == STDOT || t->op == STREF) && t->right && t->right->mval) {
            form.offset += INT65(t->right->mval->offset);
            if (t->op == STREF) return add_pointer(form, t->left);
            t = t->left;
        } else if (t->op == UMULT) {
            if (t->right) add_integer(form, t->right, INT65(BITS_PER_UNIT)); // base and subscript
            return add_pointer(form, t->left);
        } else if (t->op == NAME && t->u.sym && !form.object) {
            form.object = t->u.sym;
            return;
        } else {
            add_term(form, t, INT65(BITS_PER_UNIT)); // not understood: a place of its own
            return;
        }
    }
}

INT65 access_width(const NODE* t) {
    t = without_wrappers(t);
    if ((t->op == STDOT || t->op == STREF) && t->right && t->right->mval && t->right->mval->is_bitfld)
        return INT65(static_cast<int64_t>(t->right->mval->width));
    return INT65(static_cast<int64_t>(t->type->size));
}

INT65 magnitude(INT65 v) { return v.is_negative() ? -v : v; }

INT65 residue(INT65 v, INT65 modulus) {
    const INT65 r = v % modulus;
    return r.is_negative() ? r + modulus : r;
}

bool may_differ_in_loop(const NODE* tree, struct LOOP* loop) {
    return loop && !(loop_assertion_hooks.tree_is_RC_in_loop && loop_assertion_hooks.tree_is_RC_in_loop(tree, loop));
}

} // namespace

ADDRESS_FORM address_form(const NODE* lvalue) {
    ADDRESS_FORM form;
    form.width = access_width(lvalue);
    add_lvalue(form, lvalue);
    if (form.object || !currfuninfo) return form;
    for (size_t i = 0; i < form.terms.size(); ++i) {
        const NODE* p = form.terms[i].tree;
        if (p->op != NAME || !p->type->is_pointer() || form.terms[i].coefficient != INT65(BITS_PER_UNIT)) continue;
        const SPMAP& pointees = *currfuninfo->spmap;
        SYMTAB* object = pointees.object(p->u.sym);
        if (!object) continue;
        if (pointees.is_precise(p->u.sym)) {
            form.object = object;
            form.offset += pointees.offset(p->u.sym) * INT65(BITS_PER_UNIT);
            form.terms.erase(form.terms.begin() + static_cast<std::ptrdiff_t>(i));
        } else {
            form.points_into = object;
        }
        break;
    }
    return form;
}

bool accesses_are_disjoint(const ADDRESS_FORM& a, const ADDRESS_FORM& b, struct LOOP* loop) {
    if (a.object != b.object || a.width <= INT65(0) || b.width <= INT65(0)) return false;
    INT65 g; // of the coefficients of what does not cancel
    std::vector<bool> is_matched(b.terms.size());
    for (const ADDRESS_TERM& x : a.terms) {
        INT65 coefficient = x.coefficient;
        for (size_t i = 0; i < b.terms.size(); ++i) {
            if (is_matched[i] || !trees_are_congruent(x.tree, b.terms[i].tree, false)) continue;
            is_matched[i] = true;
            if (may_differ_in_loop(x.tree, loop))
                g = long_gcd(g, magnitude(b.terms[i].coefficient));
            else
                coefficient -= b.terms[i].coefficient;
            break;
        }
        g = long_gcd(g, magnitude(coefficient));
    }
    for (size_t i = 0; i < b.terms.size(); ++i)
        if (!is_matched[i]) g = long_gcd(g, magnitude(b.terms[i].coefficient));
    const INT65 distance = b.offset - a.offset; // of b behind a
    if (g.is_zero()) return distance >= a.width || -distance >= b.width;
    const INT65 behind = residue(distance, g);
    return behind >= a.width && g - behind >= b.width;
}
