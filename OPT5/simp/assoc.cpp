// Reassociation: a chain of one operator as the list of its operands.
//
// A sum becomes terms with factors, one a value, and one constant; a product its operands and one constant; chains of
// bit operators lose operands that meet themselves. A chain that nothing meets in stays as it is. The new order gives
// other numbers in between, and what may overflow there computes unsigned.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/linear.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

#include <vector>

using namespace rules;

namespace {

constexpr std::size_t MOST_OPERANDS = 32;

// Builds a chain from operands in a new order. The number that the last operator gives is the one that the former chain
// gave, if all before it is exact.
class BUILDER {
public:
    BUILDER(TYPE* t, int operators, bool constants_are_exact, struct LOOP* l)
        : type(t), operators_left(operators), is_exact(constants_are_exact), loop(l) {}

    NODE* combined(int op, NODE* a, NODE* b) {
        --operators_left;
        // What a constant multiplies last, which is no 0, 1 or -1, is smaller than the product.
        const bool is_smaller = op == MULT && operators_left == 1 && last_factor > INT65(1);
        is_exact = is_exact && (operators_left == 0 || is_smaller || signed_result_is_exact(op, a, b, type, loop));
        return is_exact ? made(op, a, b, type, loop) : made_exact(op, a, b, type, loop);
    }

    INT65 last_factor = 0; // its magnitude

private:
    TYPE* const type;
    int operators_left;
    bool is_exact;
    struct LOOP* const loop;
};

// ---- Sums

class SUM final : public LINEAR_READER {
public:
    explicit SUM(const NODE* root)
        : LINEAR_READER(&sum, INT_MAX), sum(static_cast<unsigned>(root->type->size)), type(root->type->stqs()) {}

    bool gains() const { return joined || constants > 1; }

    // From positive terms to negative ones, the constant last.
    NODE* build(struct LOOP* loop) const {
        bool begins_negated = !sum.is_constant(); // one operator more, unless it is the factor
        int operators = (constants ? 1 : 0) - 1;
        for (const LINEAR_FORM::TERM& t : sum) {
            operators += t.coefficient == 1 || t.coefficient == -1 ? 1 : 2;
            begins_negated = begins_negated && t.coefficient < 0;
        }
        BUILDER builder(type, operators + (begins_negated ? 1 : 0), sum.is_exact, loop);
        NODE* chain = nullptr;
        for (bool negative : {false, true})
            for (const LINEAR_FORM::TERM& t : sum) {
                if ((t.coefficient < 0) != negative) continue;
                const bool subtracts = negative && chain && fits_or_wraps(-INT65(t.coefficient), type);
                const INT65 factor = subtracts ? -INT65(t.coefficient) : INT65(t.coefficient);
                NODE* term = copy_tree(t.tree);
                if (factor != INT65(1)) term = builder.combined(MULT, term, constant(factor));
                chain = chain ? builder.combined(subtracts ? MINUS : PLUS, chain, term) : term;
            }
        if (!chain) return constant(INT65(sum.constant));
        return constants ? builder.combined(PLUS, chain, constant(INT65(sum.constant))) : chain;
    }

private:
    NODE* constant(INT65 v) const { return mk_ICON(truncate_to_type(v, type), type); }

    bool opens(const NODE* t, const LINEAR_STEP&) override {
        return t->op == UMINUS ? operand_has_type(t) : (t->op == PLUS || t->op == MINUS) && operands_have_type(t);
    }
    bool takes_constant(const NODE*) override {
        ++constants;
        return true;
    }
    bool leaf(const NODE* t, int64_t k) override {
        LINEAR_STEP product;
        if (is_node_with_icon(t, MULT) && linear_step(t, &product)) {
            k = sum.reduced(static_cast<__int128>(k) * product.by_a);
            t = product.a;
        }
        joined = joined || sum.find(t);
        return sum.add(t, k);
    }

    LINEAR_FORM sum;
    TYPE* const type;
    int constants = 0;
    bool joined = false;
};

// ---- Other chains

class CHAIN {
public:
    explicit CHAIN(const NODE* root) : op(root->op), type(root->type->stqs()), constant(neutral()) {}

    // Equal operands are joined. False where the chain is too long.
    bool collect(const NODE* t) {
        if (t->op == op && operands_have_type(t)) return collect(t->left) && collect(t->right);
        if (is_icon(t)) {
            ++constants;
            join_constant(t->u.lval);
            return true;
        }
        return add(t);
    }

    bool gains() const { return joined || constants > 1; }

    NODE* build(struct LOOP* loop) const {
        const int operators = static_cast<int>(operands.size()) + (constants ? 1 : 0) - 1;
        BUILDER builder(type, operators, is_exact, loop);
        if (constants && op == MULT) builder.last_factor = constant.is_negative() ? -constant : constant;
        NODE* chain = nullptr;
        for (const NODE* o : operands) chain = chain ? builder.combined(op, chain, copy_tree(o)) : copy_tree(o);
        if (!chain) return mk_ICON(constant, type);
        return constants ? builder.combined(op, chain, mk_ICON(constant, type)) : chain;
    }

private:
    INT65 neutral() const { return truncate_to_type(INT65(op == MULT ? 1 : op == ANDB ? -1 : 0), type); }

    void join_constant(INT65 v) {
        const INT65 r = op == MULT ? constant * v : op == ANDB ? constant & v : op == ORB ? constant | v : constant ^ v;
        constant = truncate_to_type(r, type);
        is_exact = is_exact && constant == r;
    }

    bool add(const NODE* t) {
        if (op != MULT)
            for (auto o = operands.begin(); o != operands.end(); ++o) {
                if (!same_value(*o, t)) continue;
                joined = true;
                if (op == XORB) operands.erase(o);
                return true;
            }
        if (operands.size() == MOST_OPERANDS) return false;
        operands.push_back(t);
        return true;
    }

    const int op;
    TYPE* const type;
    std::vector<const NODE*> operands;
    INT65 constant;
    int constants = 0;
    bool joined = false, is_exact = true;
};

bool is_sum(int op) { return op == PLUS || op == MINUS; }
bool is_associative(int op) { return is_sum(op) || op == MULT || op == ANDB || op == ORB || op == XORB; }

// Null where nothing meets.
NODE* rebuilt(const NODE* t, struct LOOP* loop) {
    if (is_sum(t->op)) {
        SUM sum(t);
        return sum.read(t, 1) && sum.gains() ? sum.build(loop) : nullptr;
    }
    CHAIN chain(t);
    return chain.collect(t) && chain.gains() ? chain.build(loop) : nullptr;
}

} // namespace

NODE* simp_assoc(NODE* t, struct LOOP* loop) {
    if (!is_associative(t->op) || !is_integer(t->type) || !operands_have_type(t) || !is_pure(t)) return t;
    NODE* r = rebuilt(t, loop);
    if (!r) return t;
    if (!r->ls) r->ls = t->ls;
    erase_tree(t);
    return r;
}
