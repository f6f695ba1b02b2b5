// Divisions and moduli by constants become multiplications by a scaled reciprocal.
//
// One of the two roundings below always finds a factor whose products fit in twice the width of x, and one product of
// that width is what the target multiplies in one instruction. What is known of the bounds of x may allow a narrower
// product. For dividends of the widest type without such bounds the upper half of the product is put together from four
// products of halves. Signed division by a power of two is a shift of a biased dividend at every width. Runs late: the
// passes before know more of a division than of what it becomes.
//
// Needs: alias marks, where there is a division. Leaves: what rests on the graph; symbols are split anew, and there is
// no assignment inside an expression.
// Sound because, for a divisor d and a scale k, let m be 2^k / d rounded up to the next integer above, with the error e
// = m*d - 2^k > 0. Then for x = q*d + r, x*m / 2^k = q + (r + x*e / 2^k) / d, and its integer part is q as long as x*e
// < 2^k. With m rounded down, e = 2^k - m*d > 0, (x + 1)*m / 2^k = q + (r + 1 - (x + 1)*e / 2^k) / d has the integer
// part q as long as (x + 1)*e <= 2^k. A dividend beyond those limits would get another quotient, so a factor is taken
// only where the bounds of x keep to them. For a negative x rounded toward minus infinity the first form gives one less
// than the quotient, which the sign of x puts right. (Granlund and Montgomery, Division by Invariant Integers using
// Multiplication, 1994; Robison, N-bit Unsigned Division via N-bit Multiply-Add, 2005; Warren, Hacker's Delight,
// chapter 10.)
#include "OPT5/scalar/divide.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
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

bool rounded_up(uint64_t divisor, uint64_t limit, uint64_t factor_limit, int shift, RECIPROCAL* r) {
    const U128 scale = U128(1) << shift, factor = scale / divisor + 1, error = factor * divisor - scale;
    if (factor > factor_limit || U128(limit) * error >= scale) return false;
    *r = {static_cast<uint64_t>(factor), shift, false};
    return true;
}

bool rounded_down(uint64_t divisor, uint64_t limit, uint64_t factor_limit, int shift, RECIPROCAL* r) {
    const U128 scale = U128(1) << shift, factor = scale / divisor, error = scale - factor * divisor;
    if (factor == 0 || factor > factor_limit || error == 0 || (U128(limit) + 1) * error > scale) return false;
    *r = {static_cast<uint64_t>(factor), shift, true};
    return true;
}

// The product is that of all 64 bits of both; a shift takes at least its lower half.
bool find_wide_reciprocal(uint64_t divisor, uint64_t limit, bool may_add, RECIPROCAL* r) {
    for (int shift = 64; shift < 128; ++shift)
        if (rounded_up(divisor, limit, UINT64_MAX, shift, r)) return true;
    for (int shift = 64; may_add && shift < 128; ++shift)
        if (rounded_down(divisor, limit, UINT64_MAX, shift, r)) return true;
    return false;
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

// Assignments ahead of a sequence, for values that it uses twice. A trial makes no variables: a leaf stands for each.
struct SAVED_VALUES {
    bool is_trial;
    LS* scope;
    std::vector<NODE*> values; // a trial owns them
    NODE* assignments = nullptr;

    NODE* save(NODE* value) {
        TYPE* type = value->type;
        if (is_trial) {
            values.push_back(value);
            return mk_ICON(INT65(0), type);
        }
        NODE* name = mk_NAME(sym_temp('N', -1, type, scope), scope);
        NODE* asg = mk_ASG(name, value);
        assignments = assignments ? mk_COMMAOP(assignments, asg) : asg;
        return copy_tree(name);
    }
};

// A dividend, a divisor of at least 2 and what is known of them.
struct DIVISION {
    SAVED_VALUES* saved;
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

// The upper half of x * factor, or of (x + 1) * factor, as numbers without sign. With halves xh, xl, fh and fl of 32
// bits no sum below passes 64 bits, even with fl or fh added: (2^32 - 1)^2 + 2 * (2^32 - 1) is 2^64 - 1.
NODE* upper_half_of_product(const DIVISION& d, const RECIPROCAL& r) {
    TYPE* type = tp->ullong_t;
    auto constant = [type](uint64_t c) { return mk_ICON(INT65(c), type); };
    const uint64_t fh = r.factor >> 32, fl = r.factor & UINT32_MAX;
    auto low = [type](NODE* t) { return coerce_to_type(type, coerce_to_type(tp->ulong_t, t)); };
    auto high = [type](NODE* t) { return shifted(t, 32, type); };
    auto x = [&] { return coerce_to_type(type, d.dividend()); };
    auto plus = [type](NODE* a, NODE* b) { return binary(PLUS, a, b, type); };
    auto times = [&](NODE* a, uint64_t c) { return binary(MULT, a, constant(c), type); };

    NODE* lowest = times(low(x()), fl);
    if (r.adds_factor) lowest = plus(lowest, constant(fl));
    NODE* middle = d.saved->save(plus(times(high(x()), fl), high(lowest)));
    NODE* other = plus(times(low(x()), fh), low(copy_tree(middle)));
    if (r.adds_factor) other = plus(other, constant(fh));
    return plus(plus(times(high(x()), fh), high(middle)), high(other));
}

// Seen as a number without sign a negative dividend is 2^64 too large, and the upper half too large by the factor.
NODE* wide_quotient(const DIVISION& d) {
    const bool is_signed = d.may_be_negative();
    RECIPROCAL r;
    if (!find_wide_reciprocal(d.divisor, d.greatest_magnitude(), !is_signed, &r)) return nullptr;
    NODE* value = upper_half_of_product(d, r);
    if (!is_signed) return coerce_to_type(d.type, shifted(value, r.shift - 64, tp->ullong_t));
    TYPE* wide = tp->ullong_t;
    NODE* excess = binary(ANDB, coerce_to_type(wide, d.sign_mask()), mk_ICON(INT65(r.factor), wide), wide);
    value = coerce_to_type(d.type, binary(MINUS, value, excess, wide));
    return binary(MINUS, shifted(value, r.shift - 64, d.type), d.sign_mask(), d.type);
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
        if (!q && type->size == WIDEST) q = wide_quotient(d);
        if (!q || op == DIV) return q;
        multiple = binary(MULT, q, mk_ICON(INT65(d.divisor), type), type);
    }
    return binary(MINUS, d.dividend(), multiple, type);
}

// What x / c or x % c becomes, with `x` copied into it as often as it takes, or null.
NODE* sequence_for(int op, const NODE* x, INT65 c, TYPE* type, INT65 low, INT65 high, SAVED_VALUES& saved) {
    if (is_least_value(c, type)) { // the type does not hold its magnitude
        NODE* q = coerce_to_type(type, maketree(EQ, copy_tree(x), mk_ICON(c, type), tp->int_t, x->ls));
        if (op == DIV) return q;
        return binary(MINUS, copy_tree(x), binary(MULT, q, mk_ICON(c, type), type), type);
    }
    // The remainder has the dividend's sign, whatever the divisor's.
    const INT65 magnitude = c.is_negative() ? -c : c;
    if (magnitude <= INT65(1)) return nullptr;
    NODE* r = sequence_for_magnitude(op, {&saved, x, type, magnitude.value, low, high});
    return r && op == DIV && c.is_negative() ? maketree(UMINUS, r, nullptr, type, x->ls) : r;
}

bool is_repeatable(const NODE* x) {
    for (; x->op == SCONV; x = x->left) {
    }
    return name_accessed(x) && !lvalue_is_volatile(x);
}

// The type that a DIV or MOD of integers by a constant computes in, or null.
TYPE* type_of_division(const NODE* t) {
    if ((t->op != DIV && t->op != MOD) || t->right->op != ICON || t->right->u.lval.is_zero()) return nullptr;
    if (!t->type->is_int() || !(t->type->is_signed() || t->type->is_unsigned()) || t->type->is_bool()) return nullptr;
    const bool same = compatible_types(t->left->type, t->type, true) && compatible_types(t->right->type, t->type, true);
    return same && t->type->size >= tp->int_t->size && t->type->size <= WIDEST ? t->type->stqs() : nullptr;
}

// What a sequence for a dividend that costs nothing costs; -1 if there is none.
long cost_of_sequence(int op, INT65 c, TYPE* type, INT65 low, INT65 high) {
    SAVED_VALUES saved{true, nullptr, {}};
    NODE* leaf = mk_ICON(INT65(0), type);
    NODE* sequence = sequence_for(op, leaf, c, type, low, high, saved);
    long cost = sequence ? cost_for_DIV_to_MULT_expr(sequence) : -1;
    for (NODE* value : saved.values) {
        if (sequence) cost += cost_for_DIV_to_MULT_expr(value);
        erase_tree(value);
    }
    if (sequence) erase_tree(sequence);
    erase_tree(leaf);
    return cost;
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

bool bounds_of_dividend(const NODE* x, INT65* low, INT65* high) {
    if (!calculate_bounds(x, nullptr, low, high)) return false;
    INT65 least, most;
    if (!low->is_negative() || !values_of_variables || !values_of_variables->bounds_of_tree(x, &least, &most)) return true;
    if (*low < least) *low = least;
    if (most < *high) *high = most;
    return true;
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
    const uint64_t up = product_limit / limit;
    if (rounded_up(divisor, limit, up, free_shift, result)) return true;
    int bits = 0;
    while (bits < 64 && product_limit >> bits) ++bits;
    for (int shift = 1; shift < bits; ++shift)
        if (rounded_up(divisor, limit, up, shift, result)) return true;
    if (!may_add || limit == UINT64_MAX) return false;
    const uint64_t down = product_limit / (limit + 1);
    for (int shift = 1; shift < bits; ++shift)
        if (rounded_down(divisor, limit, down, shift, result)) return true;
    return false;
}

NODE* warp_DIV_to_MULT(NODE* t) {
    TYPE* type = type_of_division(t);
    INT65 low, high;
    if (!type || !bounds_of_dividend(t->left, &low, &high) || (low.is_zero() && high.is_zero())) return t;
    const INT65 c = t->right->u.lval;
    const long cost = cost_of_sequence(t->op, c, type, low, high);
    if (cost < 0 || cost + cost_for_DIV_to_MULT_expr(t->left) >= cost_of_division(t)) return t;

    SAVED_VALUES saved{false, t->ls, {}};
    const bool occurs_once = t->op == DIV && type->size < WIDEST && (!low.is_negative() || is_least_value(c, type));
    NODE* x = occurs_once || is_repeatable(t->left) ? copy_tree(t->left) : saved.save(copy_tree(t->left));
    NODE* sequence = sequence_for(t->op, x, c, type, low, high, saved);
    erase_tree(x);
    sequence = mk_COMMAOP(saved.assignments, sequence);
    if (print_debug) {
        debug_printf("Replacing this DIV by an ICON: %s\n", tree_to_infix(t).c_str());
        debug_printf("   with this \"magic\" sequence: %s\n", tree_to_infix(sequence).c_str());
    }
    erase_tree(t);
    return sequence;
}

void transform_DIVs_by_ICONs() {
    bool found = false, any = false;
    for (BBLK* bb = currfuninfo->bb_list; bb && !found; bb = bb->dflink)
        for (LIST* s = bb->statements; s && !found; s = s->rest) found = contains_division(s->first);
    if (!found) return;
    need(fact::alias_marks);
    if (value_walk.begin) value_walk.begin();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) {
            if (value_walk.at) value_walk.at(bb, s->first);
            if (!contains_division(s->first)) continue;
            bool changed = false;
            s->first = without_divisions(s->first, &changed);
            if (changed) s->first = simp_tree(s->first, nullptr);
            any |= changed;
        }
    if (value_walk.end) value_walk.end();
    if (!any) return;
    sym_split(currfuninfo);
    changed(fact::graph | fact::alias_marks);
    promote_all_embedded_assignments();
}
