#include "OPT5/scalar/linear_address.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"

#include <algorithm>

bool LINEAR_ADDRESS::is_induction_by(const SYMTAB* sym) const { return coefficient_of(sym) != 0; }

int64_t LINEAR_ADDRESS::coefficient_of(const SYMTAB* sym) const {
    if (base->op == NAME && base->u.sym == sym) return 1;
    for (const TERM& t : terms)
        if (t.leaf->op == NAME && t.leaf->u.sym == sym) return t.coefficient;
    return 0;
}

bool LINEAR_ADDRESS::differs_by_constant(const LINEAR_ADDRESS& other) const {
    if (terms.size() != other.terms.size() || !trees_are_congruent(base, other.base, false)) return false;
    return std::all_of(terms.begin(), terms.end(), [&](const TERM& t) {
        return std::any_of(other.terms.begin(), other.terms.end(), [&](const TERM& o) {
            return o.coefficient == t.coefficient && trees_are_congruent(o.leaf, t.leaf, false);
        });
    });
}

uint64_t LINEAR_ADDRESS::hash() const {
    auto of_name = [](const NODE* name) { return 0x9e3779b97f4a7c15u * static_cast<uint64_t>(name->u.sym->index + 1); };
    const NODE* object = base;
    while (object->op == UAND || object->op == STDOT) object = object->left;
    uint64_t h = object->op == NAME ? of_name(object) : 7;
    for (const TERM& t : terms)
        h += (t.leaf->op == NAME ? of_name(t.leaf) : 11) * static_cast<uint64_t>(2 * t.coefficient + 1);
    return h;
}

namespace {

constexpr int MOST_NODES = 48;
constexpr size_t MOST_TERMS = 6;
constexpr unsigned ADDRESS_BITS = 32;

int64_t wrapped(uint64_t v) { return static_cast<int32_t>(static_cast<uint32_t>(v)); }
int64_t product(int64_t a, int64_t b) { return wrapped(static_cast<uint64_t>(a) * static_cast<uint64_t>(b)); }
int64_t sum(int64_t a, int64_t b) { return wrapped(static_cast<uint64_t>(a) + static_cast<uint64_t>(b)); }

bool is_plain_integer(const TYPE* t) { return t->is_int() && !t->is_bool() && t->size <= ADDRESS_BITS; }

class SPLITTER {
public:
    SPLITTER(LINEAR_LEAVES& l, LINEAR_ADDRESS* a) : leaves(l), address(*a) {}

    bool pointer(const NODE* t) {
        if (--nodes_left < 0) return false;
        switch (t->op) {
        case PCONV:
            if (!t->left->type->is_pointer()) break;
            return pointer(t->left);
        case PLUS:
            if (!t->left->type->is_pointer()) return pointer(t->right) && integer(t->left, 1);
            return !t->right->type->is_pointer() && pointer(t->left) && integer(t->right, 1);
        case MINUS:
            if (!t->left->type->is_pointer() || t->right->type->is_pointer()) return false;
            return pointer(t->left) && integer(t->right, -1);
        case NAME:
            if (leaves.is_induction(t->u.sym)) {
                address.base = t;
                return true;
            }
            break;
        default: break;
        }
        if (!leaves.is_invariant(t)) return false;
        address.base = t;
        return true;
    }

private:
    // The operator's result is the sum of its operands' values: it does not wrap, or wraps where an address does.
    static bool is_exact(const NODE* t) {
        auto has_type = [t](const NODE* operand) {
            return !operand || (is_plain_integer(operand->type) && operand->type->size == t->type->size &&
                                operand->type->is_unsigned() == t->type->is_unsigned());
        };
        if (!is_plain_integer(t->type) || !has_type(t->left) || !has_type(t->right)) return false;
        return t->type->size == ADDRESS_BITS || !t->type->is_unsigned();
    }

    bool integer(const NODE* t, int64_t k) {
        if (--nodes_left < 0 || !is_plain_integer(t->type)) return false;
        switch (t->op) {
        case ICON: address.offset = sum(address.offset, product(k, t->u.lval.fits_in<int64_t>())); return true;
        case NAME:
            if (const NODE* value = in_value ? nullptr : leaves.value_of(t->u.sym))
                if (is_plain_integer(value->type) && value->type->size == t->type->size &&
                    value->type->is_unsigned() == t->type->is_unsigned())
                    return of_value(value, k);
            break;
        case PLUS:
            if (is_exact(t)) return integer(t->left, k) && integer(t->right, k);
            break;
        case MINUS:
            if (is_exact(t)) return integer(t->left, k) && integer(t->right, -k);
            break;
        case UMINUS:
            if (is_exact(t)) return integer(t->left, -k);
            break;
        case MULT:
            if (is_exact(t) && t->right->op == ICON) return integer(t->left, product(k, value_of(t->right)));
            break;
        case PMCONV: // scales by a size in bits
            if (t->right->op == ICON && value_of(t->right) % 16 == 0 && t->type->size == t->left->type->size &&
                (t->type->size == ADDRESS_BITS || !t->type->is_unsigned()))
                return integer(t->left, product(k, value_of(t->right) / 16));
            break;
        case SCONV:
            if (is_plain_integer(t->left->type) && t->left->type->size <= t->type->size && widens(t))
                return integer(t->left, k);
            break;
        default: break;
        }
        return leaf(t, k);
    }

    // What variables held where it was computed is not known here, but of inductions.
    bool of_value(const NODE* value, int64_t k) {
        in_value = true;
        const bool is_linear = integer(value, k);
        in_value = false;
        return is_linear;
    }

    static int64_t value_of(const NODE* icon) { return icon->u.lval.fits_in<int64_t>(); }

    // Whether the operand's value is that of the cast, or differs by what an address does not see.
    static bool widens(const NODE* cast) {
        const TYPE *from = cast->left->type, *to = cast->type;
        if (from->size == to->size) return to->size == ADDRESS_BITS || from->is_unsigned() == to->is_unsigned();
        return to->size == ADDRESS_BITS; // by its own sign; a narrower result could still be read the other way
    }

    bool leaf(const NODE* t, int64_t k) {
        const bool moves = t->op == NAME && leaves.is_induction(t->u.sym);
        if (moves && t->type->size < ADDRESS_BITS && !leaves.stays_linear_when_widened(t->u.sym)) return false;
        if (!moves && !leaves.is_invariant(t)) return false;
        for (auto it = address.terms.begin(); it != address.terms.end(); ++it) {
            if (!trees_are_congruent(it->leaf, t, false)) continue;
            it->coefficient = sum(it->coefficient, k);
            if (it->coefficient == 0) address.terms.erase(it);
            return true;
        }
        if (k == 0) return true;
        if (address.terms.size() == MOST_TERMS) return false;
        address.terms.push_back({t, k, moves});
        return true;
    }

    LINEAR_LEAVES& leaves;
    LINEAR_ADDRESS& address;
    int nodes_left = MOST_NODES;
    bool in_value = false;
};

} // namespace

bool linear_address(const NODE* pointer, LINEAR_LEAVES& leaves, LINEAR_ADDRESS* address) {
    *address = LINEAR_ADDRESS();
    return SPLITTER(leaves, address).pointer(pointer);
}

NODE* tree_of_address(const LINEAR_ADDRESS& address, TYPE* type, const SYMTAB* sym, const NODE* value) {
    auto tree_of = [&](const NODE* leaf) {
        const bool is_given = value && leaf->op == NAME && leaf->u.sym == sym;
        return is_given ? coerce_to_type(leaf->type->stqs(), copy_tree(value)) : copy_tree(leaf);
    };
    NODE* tree = tree_of(address.base);
    TYPE* own = tree->type->stqs();
    for (const LINEAR_ADDRESS::TERM& t : address.terms) {
        NODE* term = tree_of(t.leaf);
        int64_t k = t.coefficient;
        const int op = k < 0 ? MINUS : PLUS;
        k = k < 0 ? -k : k;
        if (k != 1)
            term = made_exact(MULT, coerce_to_type(tp->long_t, term), mk_ICON(INT65(k), tp->long_t), tp->long_t, nullptr);
        tree = maketree(op, tree, term, own);
    }
    if (address.offset) tree = maketree(PLUS, tree, mk_ICON(INT65(address.offset), tp->long_t), own);
    return simp_tree(coerce_to_type(type, tree), nullptr);
}
