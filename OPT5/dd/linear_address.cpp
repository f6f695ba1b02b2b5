#include "OPT5/dd/linear_address.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"

namespace {

constexpr int MOST_NODES = 48, MOST_TERMS = 6;
constexpr unsigned ADDRESS_BITS = 32;

bool is_plain_integer(const TYPE* t) { return t->is_int() && !t->is_bool() && t->size <= ADDRESS_BITS; }
bool same_integers(const TYPE* a, const TYPE* b) {
    return is_plain_integer(a) && is_plain_integer(b) && a->size == b->size && a->is_unsigned() == b->is_unsigned();
}

class READER final : public LINEAR_READER {
public:
    READER(LINEAR_LEAVES& l, LINEAR_ADDRESS* a) : LINEAR_READER(a, MOST_NODES), leaves(l), address(*a) {}

private:
    bool takes_constant(const NODE* icon) override { return is_plain_integer(icon->type); }

    bool opens(const NODE* t, const LINEAR_STEP& step) override {
        if (t->type->is_pointer()) return opens_pointer(t, step);
        if (!is_plain_integer(t->type) || t->op == NOTB || t->op == SLL || t->op == PCONV || t->op == ISP2CHAR)
            return false;
        if (t->op == SCONV) return opens_cast(t);
        // The result is the sum of the operands' values: it does not wrap, or wraps where an address does.
        if (t->type->size != ADDRESS_BITS && t->type->is_unsigned()) return false;
        if (t->op == PMCONV) return t->left->type->size == t->type->size && value_of(t->right) % 16 == 0;
        if (t->op == MULT && t->right->op != ICON) return false;
        return same_integers(t->left->type, t->type) && (!t->right || same_integers(t->right->type, t->type));
    }
    static bool opens_pointer(const NODE* t, const LINEAR_STEP& step) {
        if (t->op == PCONV) return t->left->type->is_pointer();
        if (t->op == MINUS) return step.a->type->is_pointer() && !step.b->type->is_pointer();
        return t->op == PLUS && step.a->type->is_pointer() != step.b->type->is_pointer();
    }
    // Whether the operand's value is that of the cast, or differs by what an address does not see.
    static bool opens_cast(const NODE* cast) {
        const TYPE *from = cast->left->type, *to = cast->type;
        if (!is_plain_integer(from) || from->size > to->size) return false;
        if (from->size == to->size) return to->size == ADDRESS_BITS || from->is_unsigned() == to->is_unsigned();
        return to->size == ADDRESS_BITS; // a narrower result may be extended once more, by another sign
    }
    static int64_t value_of(const NODE* icon) { return icon->u.lval.fits_in<int64_t>(); }

    bool leaf(const NODE* t, int64_t k) override {
        if (nodes_left < 0) return false;
        const bool moves = leaves.is_induction(t);
        if (t->type->is_pointer()) {
            if (address.base || k != 1 || (!moves && !leaves.is_invariant(t))) return false;
            address.base = t;
            return true;
        }
        if (!is_plain_integer(t->type)) return false;
        if (const NODE* value = t->op == NAME && !in_value ? leaves.value_of(t->u.sym) : nullptr)
            if (same_integers(value->type, t->type)) return of_value(value, k);
        if (moves && t->type->size < ADDRESS_BITS && !leaves.stays_linear_when_widened(t->u.sym)) return false;
        if (!moves && !leaves.is_invariant(t)) return false;
        return address.add(t, k) && address.term_count() <= MOST_TERMS;
    }

    // Its variables may have changed since it was computed: only what `leaf` takes without asking for values counts.
    bool of_value(const NODE* value, int64_t k) {
        in_value = true;
        const bool is_linear = read(value, k);
        in_value = false;
        return is_linear;
    }

    LINEAR_LEAVES& leaves;
    LINEAR_ADDRESS& address;
    bool in_value = false;
};

} // namespace

bool LINEAR_LEAVES::is_induction(const NODE* term) const { return term->op == NAME && is_induction(term->u.sym); }

LINEAR_ADDRESS::LINEAR_ADDRESS() : LINEAR_FORM(ADDRESS_BITS) {}

bool LINEAR_ADDRESS::is_induction_by(const SYMTAB* sym) const { return coefficient_of(sym) != 0; }

int64_t LINEAR_ADDRESS::coefficient_of(const SYMTAB* sym) const {
    if (base->op == NAME && base->u.sym == sym) return 1;
    for (const TERM& t : *this)
        if (t.tree->op == NAME && t.tree->u.sym == sym) return t.coefficient;
    return 0;
}

bool LINEAR_ADDRESS::differs_by_constant(const LINEAR_ADDRESS& other) const {
    return trees_are_congruent(base, other.base, false) && has_same_terms(other);
}

uint64_t LINEAR_ADDRESS::hash() const {
    auto of_name = [](const NODE* name) { return 0x9e3779b97f4a7c15u * static_cast<uint64_t>(name->u.sym->index + 1); };
    const NODE* object = base->op == UAND ? without_members(static_cast<const NODE*>(base->left)) : base;
    uint64_t h = object->op == NAME ? of_name(object) : 7;
    for (const TERM& t : *this)
        h += (t.tree->op == NAME ? of_name(t.tree) : 11) * static_cast<uint64_t>(2 * t.coefficient + 1);
    return h;
}

bool linear_address(const NODE* pointer, LINEAR_LEAVES& leaves, LINEAR_ADDRESS* address) {
    *address = LINEAR_ADDRESS();
    return READER(leaves, address).read(pointer, 1) && address->base;
}

NODE* tree_of_address(const LINEAR_ADDRESS& address, TYPE* type, const SYMTAB* sym, const NODE* value) {
    auto tree_of = [&](const NODE* leaf) {
        const bool is_given = value && leaf->op == NAME && leaf->u.sym == sym;
        return is_given ? coerce_to_type(leaf->type->stqs(), copy_tree(value)) : copy_tree(leaf);
    };
    NODE* tree = tree_of(address.base);
    TYPE* own = tree->type->stqs();
    for (const LINEAR_FORM::TERM& t : address) {
        NODE* term = tree_of(t.tree);
        int64_t k = t.coefficient;
        const int op = k < 0 ? MINUS : PLUS;
        k = k < 0 ? -k : k;
        if (k != 1)
            term =
                made_exact(MULT, coerce_to_type(tp->long_t, term), mk_ICON(INT65(k), tp->long_t), tp->long_t, nullptr);
        tree = maketree(op, tree, term, own);
    }
    if (address.constant) tree = maketree(PLUS, tree, mk_ICON(INT65(address.constant), tp->long_t), own);
    return simp_tree(coerce_to_type(type, tree), nullptr);
}
