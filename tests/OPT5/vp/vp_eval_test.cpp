// Sets of random trees, and what random conditions leave, against the values that an interpreter gets for every pair of
// values of two variables. VP_ROUNDS: how many trees.
#include "OPT5/vp/vp_eval.h"

#include "../ir/function_fixture.h"

#include "OPT5/ir/opcodes.h"
#include "OPT5/simp/exact.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <optional>
#include <random>

namespace {

using VALUE = std::optional<WIDE>; // none: undefined

class EVALUATED : public FunctionTest {
protected:
    int below(int n) { return std::uniform_int_distribution<int>(0, n - 1)(random); }
    static int rounds() {
        const char* text = std::getenv("VP_ROUNDS");
        return text ? std::atoi(text) : 4000;
    }

    // Few members, near 0 or an end of the type.
    vpset set_in(const TYPE* type) {
        const RANGE limits = range_of_type(type);
        VPSLICE_LIST list;
        for (int n = 1 + below(3); n > 0; --n) {
            const WIDE at = below(2) ? 0 : below(2) ? limits.min : limits.max - 40;
            const WIDE low = std::max(limits.min, at + below(40) - (at == 0 ? 20 : 0)), step = 1 + below(6);
            const WIDE high = std::min(limits.max, low + step * below(5));
            list.push_back(slice_between(low, high, {low, low + step, step}));
        }
        return vpset_of(list);
    }

    NODE* constant(TYPE* type) {
        static const int near[] = {0, 1, 2, 3, 4, 7, 8, 15, 255, -1, -2, -7};
        const WIDE v = near[below(type->is_unsigned() ? 9 : 12)];
        return mk_ICON(to_int65(v), type);
    }

    NODE* tree(TYPE* type, int depth) {
        if (depth == 0 || below(6) == 0) return below(3) ? coerced(type, mk_NAME(below(2) ? x : y)) : constant(type);
        static const int ops[] = {PLUS, MINUS, MULT, UMINUS, NOTB, ABS, ANDB, ORB, XORB, DIV, MOD, SLL, SRL, SCONV, QUEST, PLUS, MINUS};
        const int op = ops[below(17)];
        switch (op) {
        case UMINUS:
        case NOTB:
        case ABS: return maketree(op == ABS && type->is_unsigned() ? NOTB : op, tree(type, depth - 1), nullptr, type);
        case SLL:
        case SRL: return maketree(op, tree(type, depth - 1), mk_ICON(INT65(below(6)), tp->int_t), type);
        case DIV:
        case MOD: return maketree(op, tree(type, depth - 1), below(3) ? mk_ICON(INT65(1 + below(20)), type) : tree(type, depth - 1), type);
        case SCONV: {
            TYPE* const types[] = {tp->int_t, tp->uint_t, tp->long_t, tp->ulong_t};
            return coerced(type, tree(types[below(4)], depth - 1));
        }
        case QUEST: {
            NODE* arms = maketree(COLON, tree(type, depth - 1), tree(type, depth - 1), type);
            return maketree(QUEST, condition(depth - 1), arms, type);
        }
        default: return maketree(op, tree(type, depth - 1), tree(type, depth - 1), type);
        }
    }
    static NODE* coerced(TYPE* type, NODE* t) { return t->type == type ? t : maketree(SCONV, t, nullptr, type); }
    NODE* condition(int depth) {
        if (depth > 0 && below(4) == 0) return maketree(below(2) ? ANDAND : OROR, condition(depth - 1), condition(depth - 1), tp->int_t);
        if (depth > 0 && below(8) == 0) return maketree(EXCLAIM, condition(depth - 1), nullptr, tp->int_t);
        TYPE* type = below(2) ? tp->int_t : tp->uint_t;
        static const int ops[] = {EQ, NEQ, LT, LE, GT, GE};
        int op = ops[below(6)];
        if (type->is_unsigned() && op >= LE && op <= GT) op += ULE - LE;
        return maketree(op, tree(type, depth), below(2) ? constant(type) : tree(type, depth), tp->int_t);
    }

    static WIDE in_type(WIDE v, const TYPE* type) {
        const WIDE turn = WIDE(1) << type->size;
        v &= turn - 1;
        return wraps_signed(type) && v >= turn / 2 ? v - turn : v;
    }

    VALUE value(const NODE* t) const {
        if (t->op == ICON) return in_type(to_wide(t->u.lval), t->type);
        if (t->op == NAME) return t->u.sym == x ? of_x : of_y;
        if (t->op == QUEST) {
            const VALUE c = value(t->left);
            return !c ? VALUE() : value(*c ? t->right->left : t->right->right);
        }
        const VALUE a = value(t->left);
        if (!a) return a;
        if (t->op == ANDAND || t->op == OROR) return (*a != 0) != (t->op == ANDAND) ? VALUE(*a != 0) : value(t->right);
        const VALUE b = t->right ? value(t->right) : VALUE(0);
        if (!b) return b;
        const VALUE exact = result(t, *a, *b);
        if (!exact) return exact;
        const WIDE wrapped = in_type(*exact, t->type);
        return is_exact_by_rule(t->op, t->type) && wrapped != *exact ? VALUE() : wrapped;
    }
    static VALUE result(const NODE* t, WIDE a, WIDE b) {
        switch (t->op) {
        case PLUS: return a + b;
        case MINUS: return a - b;
        case MULT: return a * b;
        case UMINUS: return -a;
        case NOTB: return -1 - a;
        case ABS: return a == range_of_type(t->type).min ? VALUE() : a < 0 ? -a : a;
        case ANDB: return a & b;
        case ORB: return a | b;
        case XORB: return a ^ b;
        case SLL: return a << static_cast<int>(b);
        case SRL: return a >> static_cast<int>(b);
        case SCONV: return a;
        case EXCLAIM: return a == 0;
        case DIV:
        case MOD:
            if (b == 0 || (b == -1 && a == range_of_type(t->type).min)) return VALUE();
            return t->op == DIV ? a / b : a % b;
        case EQ: return a == b;
        case NEQ: return a != b;
        case LT:
        case ULT: return a < b;
        case LE:
        case ULE: return a <= b;
        case GT:
        case UGT: return a > b;
        default: return a >= b;
        }
    }

    template <class F>
    void for_each_pair(const vpset& xs, const vpset& ys, const F& visit) {
        for (const VPSLICE& s : xs)
            for (of_x = s.low; of_x <= s.high; of_x += s.step ? s.step : 1)
                for (const VPSLICE& r : ys)
                    for (of_y = r.low; of_y <= r.high; of_y += r.step ? r.step : 1) visit();
    }

    std::mt19937 random{5};
    SYMTAB *x = nullptr, *y = nullptr;
    WIDE of_x = 0, of_y = 0;
    long checked = 0;
};

TEST_F(EVALUATED, TreesAndConditionsLoseNoValue) {
    TYPE* const types[] = {tp->int_t, tp->uint_t, tp->long_t, tp->ulong_t};
    SYMTAB* xs[] = {local("a"), local("b"), local("c"), local("d")};
    for (int i = 0; i < 4; ++i) xs[i]->type = xs[i]->orig_type = types[i];
    for (int n = 0; n < rounds(); ++n) {
        x = xs[n & 3];
        y = xs[(n >> 2 & 3) == (n & 3) ? (n + 1) & 3 : n >> 2 & 3];
        init_vpenv_allocation({x, y}, 2);
        const vpset sx = set_in(x->type), sy = set_in(y->type);
        const vpenv env = assign_vpset_in_vpenv(y, sy, assign_vpset_in_vpenv(x, sx, vpenv()));
        NODE *t = tree(types[below(4)], 1 + below(4)), *c = condition(2);
        const vpset s = vpset_of_tree(t, env);
        vpenv where[2] = {env, env};
        const bool can_be[2] = {filter_vpenv(&where[0], c, false), filter_vpenv(&where[1], c, true)};
        auto may_be = [](vpenv e, const SYMTAB* sym, WIDE v) {
            const vpset* left = vpenv_store->find(e, vpenv_store->number_of(sym));
            return !left || left->holds(v);
        };
        const std::string text = vpset2string(sx) + " and " + vpset2string(sy) + ": ";
        for_each_pair(sx, sy, [&] {
            if (const VALUE v = value(t); v) {
                ASSERT_TRUE(s.holds(*v)) << text << tree_to_infix(t) << " = " << static_cast<long>(*v) << " is not in " << vpset2string(s);
                ++checked;
            }
            if (const VALUE v = value(c); v) {
                ASSERT_TRUE(can_be[*v != 0] && may_be(where[*v != 0], x, of_x) && may_be(where[*v != 0], y, of_y))
                    << text << tree_to_infix(c) << " loses " << static_cast<long>(of_x) << ", " << static_cast<long>(of_y);
                ++checked;
            }
        });
        if (HasFatalFailure()) return;
        erase_tree(t);
        erase_tree(c);
        erase_vpenv();
    }
    RecordProperty("checked", std::to_string(checked));
    if (std::getenv("VP_ROUNDS")) std::printf("%ld values checked\n", checked);
}

} // namespace
