// Divisions and moduli by constants become multiplications by a scaled reciprocal.
//
// For a divisor d and a scale k let m be 2^k / d rounded up to the next integer above, with the error e = m*d - 2^k >
// 0. Then for x = q*d + r, x*m / 2^k = q + (r + x*e / 2^k) / d, and its integer part is q as long as x*e < 2^k. With m
// rounded down, e = 2^k - m*d > 0, (x + 1)*m / 2^k = q + (r + 1 - (x + 1)*e / 2^k) / d has the integer part q as long
// as (x + 1)*e <= 2^k. For a negative x rounded toward minus infinity the first form gives one less than the quotient,
// which the sign of x puts right. (Granlund and Montgomery, Division by Invariant Integers using Multiplication, 1994;
// Robison, N-bit Unsigned Division via N-bit Multiply-Add, 2005; Warren, Hacker's Delight, chapter 10.)
//
// One of the two roundings always finds a factor whose products fit in twice the width of x, and one product of that
// width is what the target multiplies in one instruction. What is known of the bounds of x may allow a narrower
// product; dividends of the widest type are only multiplied where it does. Signed division by a power of two is a shift
// of a biased dividend at every width.
//
// Runs late: the passes before know more of a division than of what it becomes.
#include "OPT5/scalar/divide.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"
#include "OPT5/target/target.h"

#include <vector>

namespace {

using U128 = unsigned __int128;

constexpr unsigned WIDEST = 64;

bool rounded_up(uint64_t divisor, uint64_t limit, uint64_t product_limit, int shift, RECIPROCAL* r) {
    const U128 scale = U128(1) << shift, factor = scale / divisor + 1, error = factor * divisor - scale;
    if (U128(limit) * error >= scale || factor > product_limit / limit) return false;
    *r = {static_cast<uint64_t>(factor), shift, false};
    return true;
}

bool rounded_down(uint64_t divisor, uint64_t limit, uint64_t product_limit, int shift, RECIPROCAL* r) {
    const U128 scale = U128(1) << shift, factor = scale / divisor, error = scale - factor * divisor;
    if (factor == 0 || error == 0 || (U128(limit) + 1) * error > scale) return false;
    if ((U128(limit) + 1) * factor > product_limit) return false;
    *r = {static_cast<uint64_t>(factor), shift, true};
    return true;
}

// ---- Trees

NODE* binary(int op, NODE* a, NODE* b, TYPE* type) { return maketree(op, a, b, type, a->ls); }
NODE* shifted(NODE* x, int n, TYPE* type) { return n ? binary(SRL, x, mk_ICON(INT65(n), tp->int_t), type) : x; }

// The integer types of at least the width of `type`, from narrow to wide, of the given sign.
std::vector<TYPE*> product_types(const TYPE* type, bool is_signed) {
    std::vector<TYPE*> types;
    for (TYPE* t : is_signed ? std::vector<TYPE*>{tp->int_t, tp->long_t, tp->llong_t}
                             : std::vector<TYPE*>{tp->uint_t, tp->ulong_t, tp->ullong_t})
        if (t->size >= type->size && t->size <= WIDEST) types.push_back(t);
    return types;
}

// A dividend, a divisor of at least 2 and what is known of them.
struct DIVISION {
    const NODE* x;
    TYPE* type;
    uint64_t divisor;
    INT65 low, high; // of the dividend

    bool may_be_negative() const { return low.is_negative(); }
    uint64_t greatest_magnitude() const { return (may_be_negative() && -low > high ? -low : high).value; }
    NODE* dividend() const { return copy_tree(x); }
    // -1 for a negative dividend, else 0.
    NODE* sign_mask() const { return shifted(dividend(), static_cast<int>(type->size) - 1, type); }
};

// What rounds to the next multiple of 2^n below as the dividend does toward zero: a negative one raised by 2^n - 1.
NODE* biased_dividend(const DIVISION& d, int n) {
    NODE* x = d.dividend();
    if (!d.may_be_negative()) return x;
    if (n == 1) return binary(MINUS, x, d.sign_mask(), d.type);
    NODE* bias = binary(ANDB, d.sign_mask(), mk_ICON(INT65(d.divisor - 1), d.type), d.type);
    return binary(PLUS, x, bias, d.type);
}

// Null if no type holds the products.
NODE* quotient_by_reciprocal(const DIVISION& d) {
    const bool is_signed = d.may_be_negative();
    for (TYPE* product : product_types(d.type, is_signed)) {
        RECIPROCAL r;
        const uint64_t product_limit = int_type_max(product).value;
        if (!find_reciprocal(d.divisor, d.greatest_magnitude(), product_limit, static_cast<int>(product->size / 2),
                             !is_signed, &r))
            continue;
        NODE* x = coerce_to_type(product, d.dividend());
        NODE* value = binary(MULT, x, mk_ICON(INT65(r.factor), product), product);
        if (r.adds_factor) value = binary(PLUS, value, mk_ICON(INT65(r.factor), product), product);
        value = coerce_to_type(d.type, shifted(value, r.shift, product));
        return is_signed ? binary(MINUS, value, d.sign_mask(), d.type) : value;
    }
    return nullptr;
}

bool is_least_value(INT65 c, TYPE* type) { return type->is_signed() && c == int_type_min(type); }

// x / d.divisor, or x % d.divisor for `op` MOD; null if there is no sequence.
NODE* sequence_for_magnitude(int op, const DIVISION& d) {
    TYPE* type = d.type;
    const int n = power_of_2(INT65(d.divisor));
    NODE* multiple;
    if (n > 0) {
        if (op == DIV) return shifted(biased_dividend(d, n), n, type);
        multiple = binary(ANDB, biased_dividend(d, n), mk_ICON(-INT65(d.divisor), type), type);
    } else {
        NODE* q = quotient_by_reciprocal(d);
        if (!q || op == DIV) return q;
        multiple = binary(MULT, q, mk_ICON(INT65(d.divisor), type), type);
    }
    return binary(MINUS, d.dividend(), multiple, type);
}

// What x / c or x % c becomes, with `x` copied into it as often as it takes, or null.
NODE* sequence_for(int op, const NODE* x, INT65 c, TYPE* type, INT65 low, INT65 high) {
    if (is_least_value(c, type)) { // the type does not hold its magnitude
        NODE* q = coerce_to_type(type, maketree(EQ, copy_tree(x), mk_ICON(c, type), tp->int_t, x->ls));
        if (op == DIV) return q;
        return binary(MINUS, copy_tree(x), binary(MULT, q, mk_ICON(c, type), type), type);
    }
    // The remainder has the dividend's sign, whatever the divisor's.
    const INT65 magnitude = c.is_negative() ? -c : c;
    if (magnitude <= INT65(1)) return nullptr;
    NODE* r = sequence_for_magnitude(op, {x, type, magnitude.value, low, high});
    return r && op == DIV && c.is_negative() ? maketree(UMINUS, r, nullptr, type, x->ls) : r;
}

bool is_repeatable(const NODE* x) {
    for (; x->op == SCONV; x = x->left) {
    }
    return x->op == NAME && !lvalue_is_volatile(x);
}

// The type that a DIV or MOD of integers by a constant computes in, or null.
TYPE* type_of_division(const NODE* t) {
    if ((t->op != DIV && t->op != MOD) || t->right->op != ICON || t->right->u.lval.is_zero()) return nullptr;
    if (!t->type->is_int() || !(t->type->is_signed() || t->type->is_unsigned()) || t->type->is_bool()) return nullptr;
    const bool same = compatible_types(t->left->type, t->type, true) && compatible_types(t->right->type, t->type, true);
    return same && t->type->size >= tp->int_t->size && t->type->size <= WIDEST ? t->type->stqs() : nullptr;
}

// A modulus costs at least the division that it contains.
long cost_of_division(NODE* t) {
    const int op = t->op;
    t->op = DIV;
    const long cost = cost_for_DIV_to_MULT_expr(t);
    t->op = op;
    return cost;
}

// ---- Statements

// A division in a fact would only hide the fact.
bool is_left_alone(const NODE* t) {
    switch (t->op) {
    case ASM:
    case PPRAGMA:
    case LABELDEF:
    case ASSERT:
    case NASSERT:
    case LOOP:
    case ENDLOOP:
    case PCOMMA: return true;
    case ICALL: return is_def_assert_ICALL_tree(t);
    default: return tree_is_EH_SWITCH(t) || tree_is_arg_prolog(t);
    }
}

// x /= c where x can be evaluated twice.
NODE* spelled_out(NODE* t) {
    const bool divides = (t->op == DIVASG || t->op == MODASG) && t->right->op == ICON && t->left->type->is_int();
    return divides && !tree_has_side_effects(t->left) && !lvalue_is_volatile(t->left) ? opASG_to_ASG(t) : t;
}

bool contains_division(NODE* t) {
    bool found = false;
    for_each_node(t, [&](const NODE* n) {
        if (n->op == DIV || n->op == MOD || n->op == DIVASG || n->op == MODASG) found |= n->right->op == ICON;
    });
    return found;
}

NODE* without_divisions(NODE* t, bool* changed) {
    if (!t || is_left_alone(t)) return t;
    t = spelled_out(t);
    t->left = without_divisions(t->left, changed);
    t->right = without_divisions(t->right, changed);
    NODE* r = warp_DIV_to_MULT(t);
    *changed |= r != t;
    return r;
}

} // namespace

bool find_reciprocal(uint64_t divisor, uint64_t limit, uint64_t product_limit, int free_shift, bool may_add,
                     RECIPROCAL* result) {
    if (rounded_up(divisor, limit, product_limit, free_shift, result)) return true;
    int bits = 0;
    while (bits < 64 && product_limit >> bits) ++bits;
    for (int shift = 1; shift < bits; ++shift)
        if (rounded_up(divisor, limit, product_limit, shift, result)) return true;
    for (int shift = 1; may_add && shift < bits; ++shift)
        if (rounded_down(divisor, limit, product_limit, shift, result)) return true;
    return false;
}

NODE* warp_DIV_to_MULT(NODE* t) {
    TYPE* type = type_of_division(t);
    INT65 low, high;
    if (!type || !calculate_bounds(t->left, nullptr, &low, &high) || (low.is_zero() && high.is_zero())) return t;
    const INT65 c = t->right->u.lval;
    NODE* leaf = mk_ICON(INT65(0), type);
    NODE* trial = sequence_for(t->op, leaf, c, type, low, high);
    erase_tree(leaf);
    if (!trial) return t;
    const long cost = cost_for_DIV_to_MULT_expr(trial) + cost_for_DIV_to_MULT_expr(t->left);
    erase_tree(trial);
    if (cost >= cost_of_division(t)) return t;

    NODE* sequence;
    const bool occurs_once = t->op == DIV && (!low.is_negative() || is_least_value(c, type));
    if (occurs_once || is_repeatable(t->left))
        sequence = sequence_for(t->op, t->left, c, type, low, high);
    else {
        NODE* x = mk_NAME(sym_temp('N', -1, type, t->ls), t->ls);
        sequence = sequence_for(t->op, x, c, type, low, high);
        sequence = mk_COMMAOP(mk_ASG(x, copy_tree(t->left)), sequence);
    }
    if (print_debug) {
        debug_printf("Replacing this DIV by an ICON: %s\n", tree_to_infix(t).c_str());
        debug_printf("   with this \"magic\" sequence: %s\n", tree_to_infix(sequence).c_str());
    }
    erase_tree(t);
    return sequence;
}

void transform_DIVs_by_ICONs() {
    bool any = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) {
            bool changed = false;
            if (!contains_division(s->first)) continue;
            s->first = without_divisions(s->first, &changed);
            if (changed) s->first = simp_tree(s->first, nullptr);
            any |= changed;
        }
    if (!any) return;
    sym_split(currfuninfo);
    promote_all_embedded_assignments();
}
