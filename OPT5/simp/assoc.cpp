// Reassociation: a chain of one operator as the list of its operands.
//
// A sum becomes terms with factors, one a value, and one constant; a product its operands and one constant; chains of
// bit operators lose operands that meet themselves. A chain that nothing meets in stays as it is. The new order gives
// other numbers on the way, and what may overflow there computes unsigned.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

#include <vector>

using namespace rules;

namespace {

constexpr std::size_t MOST_OPERANDS = 32;

struct OPERAND {
    NODE* value;
    INT65 factor; // of a sum's term
};

class CHAIN {
public:
    explicit CHAIN(const NODE* root)
        : op(root->op == MINUS ? static_cast<int>(PLUS) : root->op), type(root->type->stqs()) {}

    // Copies of the operands, equal ones joined. False where the chain is too long.
    bool collect(const NODE* t, INT65 factor) {
        if (op == PLUS && is_unary(t, UMINUS)) return collect(t->left, -factor);
        const bool continues = op == PLUS ? t->op == PLUS || t->op == MINUS : t->op == op;
        if (continues && operands_have_type(t))
            return collect(t->left, factor) && collect(t->right, t->op == MINUS ? -factor : factor);
        if (is_icon(t)) {
            ++constants;
            join_constant(op == PLUS ? t->u.lval * factor : t->u.lval);
            return true;
        }
        if (op == PLUS && is_node_with_icon(t, MULT)) {
            factor = factor * t->right->u.lval;
            t = t->left;
        }
        return add(t, factor);
    }

    bool gains() const { return joined || constants > 1; }

    // Sums are built from positive terms to negative ones, the constant last. What the last operator gives is the
    // number that the chain gave, if all before it is exact.
    NODE* build(struct LOOP* loop) {
        bool begins_negated = true; // one operator more, unless it is the factor
        for (const OPERAND& o : operands) {
            if (!o.value) continue;
            operators_left += 1 + (magnitude(o) != INT65(1));
            begins_negated = begins_negated && is_negative(o);
        }
        operators_left += (constants ? 1 : 0) + (begins_negated ? 1 : 0) - 1;
        NODE* chain = nullptr;
        for (bool negative : {false, true})
            for (OPERAND& o : operands)
                if (o.value && is_negative(o) == negative) {
                    chain = append(chain, o, loop);
                    o.value = nullptr;
                }
        if (!chain) return mk_ICON(constants ? constant : neutral(), type);
        return constants ? combined(op, chain, mk_ICON(constant, type), loop) : chain;
    }

    ~CHAIN() {
        for (OPERAND& o : operands)
            if (o.value) erase_tree(o.value);
    }

private:
    INT65 signed_value(INT65 v) const { return truncate_to_type(v, tp->mk_signed(type)); }
    INT65 neutral() const { return INT65(op == MULT ? 1 : op == ANDB ? -1 : 0); }

    void join_constant(INT65 v) {
        if (constants == 1)
            constant = v;
        else
            constant = op == PLUS   ? constant + v
                       : op == MULT ? constant * v
                       : op == ANDB ? constant & v
                       : op == ORB  ? constant | v
                                    : constant ^ v;
        constant = truncated(constant);
    }

    bool add(const NODE* t, INT65 factor) {
        for (OPERAND& o : operands) {
            if (op == MULT || !o.value || !same_value(o.value, t)) continue;
            joined = true;
            o.factor = truncated(o.factor + factor);
            const bool vanishes = op == XORB || (op == PLUS && o.factor.is_zero());
            if (vanishes) {
                erase_tree(o.value);
                o.value = nullptr;
            }
            return true;
        }
        if (operands.size() == MOST_OPERANDS) return false;
        operands.push_back({copy_tree(t), truncated(factor)});
        return true;
    }

    INT65 truncated(INT65 v) {
        const INT65 r = truncate_to_type(v, type);
        is_exact = is_exact && r == v;
        return r;
    }

    bool constant_is_unit() const { return constant >= INT65(-1) && constant <= INT65(1); }
    bool is_negative(const OPERAND& o) const { return op == PLUS && signed_value(o.factor).is_negative(); }
    // Of the factor that the term is multiplied by.
    INT65 magnitude(const OPERAND& o) const {
        const INT65 factor = op == PLUS ? signed_value(o.factor) : INT65(1);
        return factor.is_negative() ? -factor : factor;
    }

    NODE* combined(int by, NODE* a, NODE* b, struct LOOP* loop) {
        --operators_left;
        const bool is_smaller =
            op == MULT && operators_left == 1 && constants && !constant_is_unit(); // than the product
        is_exact = is_exact && (operators_left == 0 || is_smaller || signed_result_is_exact(by, a, b, type, loop));
        return is_exact ? made(by, a, b, type, loop) : made_exact(by, a, b, type, loop);
    }

    NODE* append(NODE* chain, const OPERAND& o, struct LOOP* loop) {
        const bool negates = is_negative(o) && !chain;
        NODE* term = o.value;
        if (magnitude(o) != INT65(1) || negates)
            term = combined(MULT, term, mk_ICON(negates ? -magnitude(o) : magnitude(o), type), loop);
        if (!chain) return term;
        return combined(is_negative(o) ? static_cast<int>(MINUS) : op, chain, term, loop);
    }

    const int op;
    TYPE* const type;
    std::vector<OPERAND> operands;
    INT65 constant;
    int constants = 0, operators_left = 0;
    bool joined = false, is_exact = true; // nothing is lost in the constants, and the operators so far are exact
};

bool is_associative(int op) { return op == PLUS || op == MINUS || op == MULT || op == ANDB || op == ORB || op == XORB; }

} // namespace

NODE* simp_assoc(NODE* t, struct LOOP* loop) {
    if (!is_associative(t->op) || !is_integer(t->type) || !operands_have_type(t) || !is_pure(t)) return t;
    CHAIN chain(t);
    if (!chain.collect(t, INT65(1)) || !chain.gains()) return t;
    NODE* r = chain.build(loop);
    if (!r->ls) r->ls = t->ls;
    erase_tree(t);
    return r;
}
