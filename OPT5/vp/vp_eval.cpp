// Evaluation of trees on sets, and what a condition that came out in one sense tells of the variables in it.
//
// Sound because each operator gives a superset of what the target computes from members of its operands' sets. A signed
// sum, difference, product or negation is the number itself (OPT5/simp/exact.h), so that what lies beyond the type is
// left out; all else wraps. Of a variable that the tree itself writes nothing is taken: its environment has no
// binding of it then (VP_EFFECT::during). A walk looks at a bounded number of nodes; what it does not see has any value.
#include "OPT5/vp/vp_eval.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/target/bif.h"

namespace {

constexpr int MOST_NODES = 256, MOST_LEVELS = 48;

// An operator whose operands are of its type: sums, products and the like.
bool operands_have_its_type(const NODE* t) {
    auto fits = [t](const NODE* n) {
        return !n || (has_value_range(n->type) && n->type->size == t->type->size && !n->type->is_enum() &&
                      wraps_signed(n->type) == wraps_signed(t->type) && n->type->is_bool() == t->type->is_bool());
    };
    return has_value_range(t->type) && !t->type->is_bool() && !t->type->is_enum() && fits(t->left) && fits(t->right);
}

// A compare of the values that its operands have.
bool compares_values(const NODE* t) {
    if (!op_is_int_compare(t->op)) return false;
    const TYPE *a = t->left->type, *b = t->right->type;
    if (a->is_pointer() || b->is_pointer()) return a->is_pointer() && b->is_pointer() && (t->op == EQ || t->op == NEQ);
    if (!has_value_range(a) || !has_value_range(b) || a->is_enum() || b->is_enum() || a->size != b->size ||
        wraps_signed(a) != wraps_signed(b))
        return false;
    return t->op == EQ || t->op == NEQ || (t->op >= ULE) == !wraps_signed(a);
}

bool is_tracked_as(const NODE* name, int number) {
    const TYPE* type = vpenv_store->symbol(number)->type;
    return name->type->size == type->size && name->type->is_pointer() == type->is_pointer() &&
           name->type->is_bool() == type->is_bool() && name->type->is_enum() == type->is_enum() &&
           (type->is_pointer() || type->is_enum() || wraps_signed(name->type) == wraps_signed(type));
}

int number_of_name(const NODE* t) {
    if (t->op != NAME || !t->u.sym) return -1;
    const int number = vpenv_store->number_of(t->u.sym);
    return number >= 0 && is_tracked_as(t, number) ? number : -1;
}

constexpr WIDE power(int n) { return static_cast<WIDE>(1) << n; }

class EVALUATION {
public:
    explicit EVALUATION(vpenv in) : env(in), source(&env) {}

    vpset of(const NODE* t) {
        t = without_wrappers(t);
        if (!has_vpset(t->type)) return {};
        if (--nodes_left < 0 || levels >= MOST_LEVELS) return bottom(t->type);
        if (t->op == ICON) return of_constant(t);
        if (t->op == NAME)
            if (const int number = number_of_name(t); number >= 0)
                if (const vpset* known = vpenv_store->find(env, number)) return *known;
        ++levels;
        vpset s = evaluated(t);
        --levels;
        if (vpset_is_empty(s)) return bottom(t->type);
        truncate_vpset_to_type(&s, t->type);
        return s;
    }

    // False: the condition cannot come out so in this environment.
    bool filter(const NODE* t, bool holds) {
        if (--nodes_left < 0 || tree_acts(t)) return true;
        t = without_wrappers(t);
        switch (t->op) {
        case EXCLAIM: return filter(t->left, !holds);
        case ANDAND:
        case OROR:
            if (holds == (t->op == ANDAND)) return filter(t->left, holds) && filter(t->right, holds);
            return filter_either(t, holds);
        default: break;
        }
        if (compares_values(t)) return filter_compare(t, holds);
        if (!has_vpset(t->type)) return true;
        vpset truth = of(t), left;
        if (holds ? !vpset_without(&left, truth, 0) : !vpset_within(&left, truth, 0, 0)) return false;
        return narrow(t, left);
    }

    // The tree has one of the values.
    bool narrow(const NODE* t, const vpset& values) {
        t = without_wrappers(t);
        if (--nodes_left < 0 || vpset_is_empty(values) || vpset_is_bottom(values, t->type)) return true;
        if (const int number = number_of_name(t); number >= 0) return narrow_name(number, values);
        switch (t->op) {
        case SCONV: return narrow_converted(t, values);
        case PLUS:
        case MINUS:
        case UMINUS: return narrow_sum(t, values);
        case MULT:
        case DIV:
        case SRL: return narrow_scaled(t, values);
        case MOD:
        case ANDB: return narrow_remainder(t, values);
        default: return true;
        }
    }

    const vpenv& environment() const { return env; }

private:
    static vpset bottom(const TYPE* type) {
        vpset s;
        make_vpset_bottom(&s, type);
        return s;
    }
    static vpset truth_values() { return vpset(VPSLICE{0, 1, 1}); }

    // Of a load and of a variable without a binding the type alone speaks then.
    static bool nothing_is_asserted() { return currfuninfo && currfuninfo->givens.empty(); }

    vpset plain_range(const NODE* t) const {
        if (t->op == UMULT && nothing_is_asserted()) return bottom(t->type);
        INT65 min, max;
        if (!calculate_bounds(t, nullptr, &min, &max)) return bottom(t->type);
        return vpset(make_vpslice(to_wide(min), to_wide(max), 1));
    }

    // An exact result as the operator's type holds it.
    static vpset result(const NODE* t, const vpset& exact) {
        vpset s;
        if (!is_exact_by_rule(t->op, t->type)) {
            s = exact;
            truncate_vpset_to_type(&s, t->type);
        } else if (const RANGE limits = vpset_limits(t->type); !vpset_within(&s, exact, limits.min, limits.max))
            return bottom(t->type);
        return s;
    }

    vpset evaluated(const NODE* t) {
        if (boolean_result[t->op]) return of_condition(t);
        switch (t->op) {
        case NAME: {
            vpset passed;
            const bool is_passed = t->u.sym && t->type->stqs() == t->u.sym->type->stqs() && find_vpset_in_formal_parms(&passed, t->u.sym);
            if (is_passed) return passed;
            return nothing_is_asserted() && number_of_name(t) >= 0 ? bottom(t->type) : plain_range(t);
        }
        case COMMAOP: return as_type(of(t->right), t->right, t->type);
        case ASG: return t->left->op == NAME ? as_type(of(t->right), t->right, t->type) : plain_range(t);
        case QUEST: return of_choice(t->left, t->right, t->type);
        case SCONV: return has_value_range(t->type) ? as_type(of(t->left), t->left, t->type) : bottom(t->type);
        case PCONV:
        case ACONV: return of_pointer_conversion(t);
        case ICALL: return of_builtin(t);
        case PLUS:
        case MINUS:
        case UMINUS:
        case MULT:
        case DIV:
        case MOD:
        case SLL:
        case SRL:
        case ANDB:
        case ORB:
        case XORB:
        case NOTB:
        case ABS: return operands_have_its_type_or_shifts(t) ? of_operator(t) : plain_range(t);
        default: return plain_range(t);
        }
    }

    static bool operands_have_its_type_or_shifts(const NODE* t) {
        if (t->op != SLL && t->op != SRL) return operands_have_its_type(t);
        return has_value_range(t->type) && has_value_range(t->left->type) && has_value_range(t->right->type) &&
               !t->type->is_bool() && !t->type->is_enum() && t->left->type->size == t->type->size &&
               !t->left->type->is_enum() && wraps_signed(t->left->type) == wraps_signed(t->type);
    }

    static vpset of_constant(const NODE* t) {
        vpset s(single_slice(to_wide(t->u.lval)));
        truncate_vpset_to_type(&s, t->type);
        return s;
    }

    // A value of `from` where one of `type` is wanted.
    static vpset as_type(vpset s, const NODE* from, const TYPE* type) {
        if (!has_value_range(from->type) && !(from->type->is_pointer() && type->is_pointer())) return bottom(type);
        truncate_vpset_to_type(&s, type);
        return s;
    }

    vpset of_pointer_conversion(const NODE* t) {
        if (!t->type->is_pointer()) return plain_range(t);
        const vpset s = of(t->left);
        if (t->left->type->is_pointer() && t->left->type->size == t->type->size) return s;
        return vpset_is_single(s) && s.holds(0) ? s : bottom(t->type); // the null pointer
    }

    vpset of_choice(const NODE* condition, const NODE* arms, const TYPE* type) {
        if (!arms || arms->op != COLON) return bottom(type);
        vpset all;
        for (bool holds : {true, false}) {
            const NODE* arm = holds ? arms->left : arms->right;
            const vpenv outer = env;
            if (filter(condition, holds)) {
                const vpset s = as_type(of(arm), arm, type);
                if (vpset_is_empty(all))
                    all = s;
                else
                    vpset_union(&all, vpset(all), s);
            }
            env = outer;
        }
        return all;
    }

    vpset of_builtin(const NODE* t) {
        if (is_def_assert_ICALL_tree(t)) {
            const NODE* value = arg_list_lookup(t->left, 0);
            return as_type(of(value), value, t->type);
        }
        vpset s;
        if (VPSET_EVALUATOR evaluate = vpset_evaluator_of(t)) evaluate(&s, t, nullptr, env, 0);
        return vpset_is_empty(s) ? plain_range(t) : s;
    }

    vpset of_operator(const NODE* t) {
        const vpset a = of(t->left), b = t->right ? of(t->right) : vpset();
        vpset s, minus;
        switch (t->op) {
        case PLUS: return vpset_sum(&s, a, b) ? result(t, s) : bottom(t->type);
        case MINUS: return vpset_negative(&minus, b) && vpset_sum(&s, a, minus) ? result(t, s) : bottom(t->type);
        case UMINUS: return vpset_negative(&s, a) ? result(t, s) : bottom(t->type);
        case MULT: return vpset_product(&s, a, b) ? result(t, s) : bottom(t->type);
        case NOTB: {
            vpset_negative(&minus, a);
            vpset_sum(&s, minus, vpset(single_slice(-1)));
            return s;
        }
        case ABS: vpset_absolute(&s, a); return s;
        default: return by_constant(t, a, b);
        }
    }

    // Quotients, remainders and shifts by a constant, and operators on bits.
    vpset by_constant(const NODE* t, const vpset& a, const vpset& b) {
        vpset s;
        const bool is_constant = vpset_is_single(b);
        const WIDE c = is_constant ? vpset_minimum(b) : 0;
        const bool is_shift_count = is_constant && c >= 0 && c < static_cast<WIDE>(t->type->size);
        switch (t->op) {
        case DIV:
            if (c <= 0) break;
            vpset_quotient(&s, a, c);
            return s;
        case MOD:
            if (c <= 0) break;
            vpset_remainder(&s, a, c);
            return s;
        case SLL:
            if (!is_shift_count || !vpset_product(&s, a, vpset(single_slice(power(static_cast<int>(c)))))) break;
            return s;
        case SRL:
            if (!is_shift_count) break;
            vpset_shifted_down(&s, a, static_cast<int>(c));
            return s;
        case ANDB:
        case ORB:
        case XORB: return on_bits(t, a, b);
        }
        return plain_range(t);
    }

    vpset on_bits(const NODE* t, const vpset& a, const vpset& b) {
        auto is_listed = [](const vpset& s) { return vpset_size(s) == s.size(); };
        if (is_listed(a) && is_listed(b)) {
            VPSLICE_LIST list;
            for (const VPSLICE& x : a)
                for (const VPSLICE& y : b)
                    list.push_back(single_slice(t->op == ANDB  ? x.low & y.low
                                                : t->op == ORB ? x.low | y.low
                                                               : x.low ^ y.low));
            return vpset_of(list);
        }
        vpset s = plain_range(t);
        if (t->op != ANDB || !vpset_is_single(b) || vpset_minimum(b) == 0) return s;
        // What the members have in common modulo a power of two, the mask's ones at the low end leave.
        WIDE modulus = 1;
        while ((vpset_minimum(b) & modulus) && vpset_delta(a) % (modulus * 2) == 0 && modulus < power(62)) modulus *= 2;
        if (modulus > 1) {
            const WIDE rest = vpset_minimum(a) & (modulus - 1);
            vpset congruent;
            if (vpset_intersection(&congruent, s, vpset(slice_between(vpset_minimum(s), vpset_maximum(s), {rest, rest + modulus, modulus}))))
                return congruent;
        }
        WIDE step = 1; // a multiple of the mask's lowest bit
        while ((vpset_minimum(b) & step) == 0) step *= 2;
        vpset multiples;
        return step > 1 && vpset_intersection(&multiples, s, vpset(slice_between(vpset_minimum(s), vpset_maximum(s), {0, step, step})))
                   ? multiples
                   : s;
    }

    // ---- Conditions

    vpset of_condition(const NODE* t) {
        if (t->op == EXCLAIM) {
            const vpset s = of(t->left);
            if (vpset_is_empty(s)) return truth_values();
            if (!s.holds(0)) return vpset(single_slice(0));
            return vpset_is_single(s) ? vpset(single_slice(1)) : truth_values();
        }
        if (!compares_values(t)) return truth_values();
        const vpset a = of(t->left), b = of(t->right);
        const int outcome = outcome_of(t->op, a, b);
        return outcome < 0 ? truth_values() : vpset(single_slice(outcome));
    }

    // 1 always holds, 0 never does, -1 neither.
    static int outcome_of(int op, const vpset& a, const vpset& b) {
        switch (op) {
        case EQ:
        case NEQ: {
            vpset both;
            if (!vpset_intersection(&both, a, b)) return op == NEQ;
            if (vpset_is_single(a) && vpset_is_single(b)) return op == EQ;
            return -1;
        }
        case GT:
        case UGT: return outcome_of(LT, b, a);
        case GE:
        case UGE: return outcome_of(LE, b, a);
        case LT:
        case ULT:
            if (vpset_maximum(a) < vpset_minimum(b)) return 1;
            return vpset_minimum(a) >= vpset_maximum(b) ? 0 : -1;
        default:
            if (vpset_maximum(a) <= vpset_minimum(b)) return 1;
            return vpset_minimum(a) > vpset_maximum(b) ? 0 : -1;
        }
    }

    bool filter_either(const NODE* t, bool holds) {
        const vpenv before = env;
        std::vector<vpenv> ends;
        if (filter(t->left, holds)) ends.push_back(env);
        env = before;
        if (filter(t->left, !holds) && filter(t->right, holds)) ends.push_back(env);
        if (ends.empty()) return false;
        env = vpenv_store->join(ends);
        return true;
    }

    bool filter_compare(const NODE* t, bool holds) {
        const int op = holds ? t->op : boolean_inv[t->op];
        const vpset a = of(t->left), b = of(t->right);
        vpset x, y;
        return keep(&x, op, a, b) && keep(&y, commute_inv[op], b, a) && narrow(t->left, x) && narrow(t->right, y);
    }

    // The members v of `a` for which v op w may hold for a w of `b`.
    static bool keep(vpset* out, int op, const vpset& a, const vpset& b) {
        const WIDE low = vpset_minimum(a), high = vpset_maximum(a);
        switch (op) {
        case EQ: return vpset_intersection(out, a, b);
        case NEQ:
            *out = a;
            return !vpset_is_single(b) || vpset_without(out, a, vpset_minimum(b));
        case LT:
        case ULT: return vpset_within(out, a, low, vpset_maximum(b) - 1);
        case LE:
        case ULE: return vpset_within(out, a, low, vpset_maximum(b));
        case GT:
        case UGT: return vpset_within(out, a, vpset_minimum(b) + 1, high);
        default: return vpset_within(out, a, vpset_minimum(b), high);
        }
    }

    bool narrow_name(int number, const vpset& values) {
        const vpset* known = vpenv_store->find(env, number);
        vpset s = values;
        if (known && !vpset_intersection(&s, *known, values)) return false;
        env = vpenv_store->bind(env, number, s);
        return true;
    }

    bool narrow_converted(const NODE* t, const vpset& values) {
        const TYPE *from = t->left->type, *to = t->type;
        if (!has_value_range(from) || !has_value_range(to) || from->is_bool() || to->is_bool() || from->is_enum() ||
            to->is_enum())
            return true;
        vpset s = values;
        if (from->size == to->size)
            truncate_vpset_to_type(&s, from); // one to one
        else {
            const vpset operand = of(t->left);
            const RANGE limits = range_of_type(to);
            if (vpset_minimum(operand) < limits.min || vpset_maximum(operand) > limits.max) return true;
            if (!vpset_intersection(&s, operand, values)) return false;
        }
        return narrow(t->left, s);
    }

    // x + c, x - c, c - x, -x.
    bool narrow_sum(const NODE* t, const vpset& values) {
        if (!operands_have_its_type(t)) return true;
        auto inverted = [&](const NODE* x, const vpset& exact) {
            vpset s = exact;
            if (is_exact_by_rule(t->op, t->type)) {
                const RANGE limits = range_of_type(x->type);
                if (!vpset_within(&s, exact, limits.min, limits.max)) return false;
            } else
                truncate_vpset_to_type(&s, x->type);
            return narrow(x, s);
        };
        vpset minus, s;
        if (t->op == UMINUS) {
            vpset_negative(&s, values);
            return inverted(t->left, s);
        }
        const vpset a = of(t->left), b = of(t->right);
        if (vpset_is_single(b)) {
            const WIDE c = t->op == PLUS ? -vpset_minimum(b) : vpset_minimum(b);
            vpset_sum(&s, values, vpset(single_slice(c)));
            return inverted(t->left, s);
        }
        if (!vpset_is_single(a)) return true;
        if (t->op == PLUS)
            vpset_sum(&s, values, vpset(single_slice(-vpset_minimum(a))));
        else {
            vpset_negative(&minus, values);
            vpset_sum(&s, minus, a);
        }
        return inverted(t->right, s);
    }

    // x * c, x / c, x >> c by the bounds alone.
    bool narrow_scaled(const NODE* t, const vpset& values) {
        if (!operands_have_its_type_or_shifts(t) || (t->op == MULT && !is_exact_by_rule(MULT, t->type))) return true;
        const vpset b = of(t->right);
        if (!vpset_is_single(b) || vpset_minimum(b) <= 0) return true;
        WIDE c = vpset_minimum(b);
        if (t->op == SRL) {
            if (c >= static_cast<WIDE>(t->type->size)) return true;
            c = power(static_cast<int>(c));
        }
        const WIDE low = vpset_minimum(values), high = vpset_maximum(values);
        vpset s = of(t->left), kept;
        WIDE least, most;
        if (t->op == MULT) {
            least = low >= 0 ? (low + c - 1) / c : -(-low / c);
            most = high >= 0 ? high / c : -((-high + c - 1) / c);
        } else if (t->op == DIV) {
            least = low > 0 ? low * c : low * c - (c - 1);
            most = high >= 0 ? high * c + (c - 1) : high * c;
        } else {
            least = low * c;
            most = high * c + (c - 1);
        }
        return vpset_within(&kept, s, least, most) && narrow(t->left, kept);
    }

    // x % m == k, x & (2^n - 1) == k.
    bool narrow_remainder(const NODE* t, const vpset& values) {
        if (!operands_have_its_type(t) || !vpset_is_single(values)) return true;
        const vpset b = of(t->right);
        if (!vpset_is_single(b)) return true;
        WIDE m = vpset_minimum(b);
        const WIDE k = vpset_minimum(values);
        if (t->op == ANDB) m += 1;
        if (m <= 1 || (t->op == ANDB && (m & (m - 1)))) return true;
        const vpset x = of(t->left);
        const WIDE low = t->op == MOD && k > 0 ? std::max(vpset_minimum(x), k) : vpset_minimum(x),
                   high = t->op == MOD && k < 0 ? std::min(vpset_maximum(x), k) : vpset_maximum(x);
        vpset s;
        const VPSLICE congruent = slice_between(low, high, {k, k + m, m});
        return !congruent.is_empty() && vpset_intersection(&s, x, vpset(congruent)) && narrow(t->left, s);
    }

    vpenv env;
    VALUES_AT source;
    int nodes_left = MOST_NODES, levels = 0;
};

} // namespace

bool has_vpset(const TYPE* type) { return type->is_pointer() || has_value_range(type); }

bool VALUES_AT::bounds_of_variable(const SYMTAB* sym, INT65* min, INT65* max) const {
    const int number = vpenv_store->number_of(sym);
    const vpset* known = number < 0 ? nullptr : vpenv_store->find(*env, number);
    if (!known) return false;
    *min = to_int65(vpset_minimum(*known));
    *max = to_int65(vpset_maximum(*known));
    return true;
}

bool VALUES_AT::bounds_of_tree(const NODE* tree, INT65* min, INT65* max) const {
    const vpset s = has_value_range(tree->type) ? vpset_of_tree(tree, *env) : vpset();
    if (vpset_is_empty(s)) return false;
    *min = to_int65(vpset_minimum(s));
    *max = to_int65(vpset_maximum(s));
    return true;
}

vpset vpset_of_tree(const NODE* tree, vpenv env) { return EVALUATION(env).of(tree); }

vpenv eval_expr_in_vpenv(vpset* out, const NODE* tree, struct LOOP* loop, vpenv env, int assign) {
    if (!tree) {
        make_vpset_empty(out);
        return env;
    }
    if (!assign) {
        *out = vpset_of_tree(tree, env);
        return env;
    }
    const VP_EFFECT effect(tree, loop);
    *out = vpset_of_tree(tree, effect.during(env));
    return effect.behind(env, false);
}

bool filter_vpenv(vpenv* env, const NODE* condition, bool holds) {
    EVALUATION e(*env);
    const bool can_be = e.filter(condition, holds);
    *env = e.environment();
    return can_be;
}

bool filter_vpenv_by_values(vpenv* env, const NODE* selector, const vpset& values) {
    if (tree_acts(selector)) return true;
    EVALUATION e(*env);
    const vpset known = e.of(selector);
    vpset s;
    if (vpset_is_empty(known)) return true;
    if (!vpset_intersection(&s, known, values) || !e.narrow(selector, s)) return false;
    *env = e.environment();
    return true;
}

// ---- Statements

namespace {

// What the root of a statement assigns: the variable as a whole, by an operator whose value is known.
bool assigns_known_value(const NODE* t) {
    if (t->op == ASG) return true;
    if (t->op != PLUSPLUS && t->op != MINMIN && (op_of_opASG[t->op] == ILLOP || !t->right)) return false;
    return has_value_range(t->left->type) && has_value_range(t->right->type);
}

} // namespace

VP_EFFECT::VP_EFFECT(const NODE* statement, const struct LOOP* loop) : tree(statement) {
    if (tree->op == NASSERT || tree->op == ASSERT) {
        asserted = tree->left;
        if (asserted && asserted->op == COMMA) asserted = asserted->left;
        if (!asserted || tree_acts(asserted)) asserted = nullptr;
    }
    for_each_write(tree, [this](const WRITE& w) {
        if (!w.place) {
            loses_globals = true;
            return;
        }
        const NODE* name = name_of_place(w.place);
        if (!name) loses_globals = true; // an address may be one that a global was put at by hand
        const int number = name && name->u.sym ? vpenv_store->number_of(name->u.sym) : -1;
        if (number < 0) return;
        if (w.by == tree && tree->left == name && is_tracked_as(name, number) && assigns_known_value(tree))
            target = number;
        else
            lost.push_back(number);
    });
    if (target >= 0)
        for (int number : lost)
            if (number == target) { // in which order is not asked
                target = -1;
                break;
            }
    if (vpset s; target >= 0 && loop && find_vpset_in_LOOPIV(&s, vpenv_store->symbol(target), loop, false))
        course = std::make_unique<vpset>(s);
}

vpenv VP_EFFECT::during(vpenv env) const {
    for (int number : lost) env = vpenv_store->bind(env, number, vpset());
    return loses_globals ? vpenv_store->without_globals(env) : env;
}

// The value that the target gets, in the environment ahead of it.
vpset VP_EFFECT::value(vpenv env) const {
    const NODE *x = tree->left, *e = tree->right;
    if (tree->op == ASG) {
        vpset s = vpset_of_tree(e, env);
        if (!has_value_range(e->type) && !(e->type->is_pointer() && x->type->is_pointer())) return {};
        truncate_vpset_to_type(&s, x->type);
        return s;
    }
    const bool steps = tree->op == PLUSPLUS || tree->op == MINMIN;
    int op = op_of_opASG[tree->op];
    if (steps) op = tree->op == PLUSPLUS ? PLUS : MINUS;
    // x op e computes in the type of x.
    if (!steps && !compound_ASG_computes_in(x->type->stqs(), op, x, e)) return {};
    NODE* conversion = nullptr;
    NODE* right = const_cast<NODE*>(e);
    if (op != SLL && op != SRL && (e->type->size != x->type->size || wraps_signed(e->type) != wraps_signed(x->type)))
        right = conversion = maketree(SCONV, right, nullptr, x->type->stqs());
    NODE* operation = maketree(op, const_cast<NODE*>(x), right, x->type->stqs());
    const vpset s = vpset_of_tree(operation, env);
    erase_node(operation);
    if (conversion) erase_node(conversion);
    return s;
}

// An argument prolog gives each local the value of its parameter.
vpenv VP_EFFECT::with_parameters(vpenv env) const {
    for_each_subtree(tree, [&env](const NODE* t) {
        if (t->op != ASG || !tree_is_arg_prolog(t) || number_of_name(t->left) < 0) return;
        env = vpenv_store->bind(env, number_of_name(t->left), VP_EFFECT(t).value(env));
    });
    return env;
}

vpenv VP_EFFECT::behind(vpenv env, bool exclusive) const {
    env = during(env);
    if (asserted) {
        vpenv narrowed = env;
        if (filter_vpenv(&narrowed, asserted, true)) env = narrowed;
    }
    if (tree->op == PCOMMA) return with_parameters(env);
    if (target < 0) return env;
    vpset s = value(env);
    if (vpset inside; course && vpset_intersection(&inside, s, *course)) s = inside;
    return exclusive ? vpenv_store->bind_exclusively(env, target, s) : vpenv_store->bind(env, target, s);
}
