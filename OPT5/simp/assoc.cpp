// Reassociation: a chain of one operator as the list of its operands.
//
// A sum becomes terms with factors, one a value, and one constant; a product its operands and one constant; chains of
// bit operators lose operands that meet themselves. A chain that nothing meets in stays as it is.

#include "OPT5/simp/algebra.h"
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

    // Sums are built from positive terms to negative ones, the constant last.
    NODE* build(struct LOOP* loop) {
        NODE* chain = nullptr;
        for (bool negative : {false, true})
            for (OPERAND& o : operands)
                if (o.value && (op == PLUS && signed_value(o.factor).is_negative()) == negative) {
                    chain = append(chain, o, negative, loop);
                    o.value = nullptr;
                }
        if (!chain) return mk_ICON(constants ? constant : neutral(), type);
        return constants ? made(op, chain, mk_ICON(constant, type), type, loop) : chain;
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
        constant = truncate_to_type(constant, type);
    }

    bool add(const NODE* t, INT65 factor) {
        for (OPERAND& o : operands) {
            if (op == MULT || !o.value || !same_value(o.value, t)) continue;
            joined = true;
            o.factor = truncate_to_type(o.factor + factor, type);
            const bool vanishes = op == XORB || (op == PLUS && o.factor.is_zero());
            if (vanishes) {
                erase_tree(o.value);
                o.value = nullptr;
            }
            return true;
        }
        if (operands.size() == MOST_OPERANDS) return false;
        operands.push_back({copy_tree(t), truncate_to_type(factor, type)});
        return true;
    }

    NODE* append(NODE* chain, const OPERAND& o, bool negative, struct LOOP* loop) const {
        INT65 factor = op == PLUS ? signed_value(o.factor) : INT65(1);
        if (negative && chain) factor = -factor;
        NODE* term = factor == INT65(1) ? o.value : made(MULT, o.value, mk_ICON(factor, type), type, loop);
        return chain ? made(negative ? static_cast<int>(MINUS) : op, chain, term, type, loop) : term;
    }

    const int op;
    TYPE* const type;
    std::vector<OPERAND> operands;
    INT65 constant;
    int constants = 0;
    bool joined = false;
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
