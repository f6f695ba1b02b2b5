// What is known of a loop, as relations of the sums that references are compared by.
//
// Needs: conditions that hold throughout a loop, in any form that assertions and tests have. Leaves: nothing changed.
// Sound because a relation is one of numbers: a comparison that reads its operands in another signedness is none, and
// so is a difference that may wrap, unless it is held against a constant. A difference of addresses may wrap too: then
// the two are half of all memory apart at least, and the relation has the difference both as it is written and so.
#include "OPT5/dd/reference_form.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

namespace {

bool is_number(const TYPE* t) { return has_value_range(t) && !t->is_bool() && !t->is_enum() && t->size <= ADDRESS_BITS; }

// The values above or below `c` that a comparison with it leaves.
std::vector<RANGE> range_by(int op, WIDE c) {
    switch (op) {
    case EQ: return {{c, c}};
    case NEQ: return {{-FAR, c - 1}, {c + 1, FAR}};
    case LT:
    case ULT: return {{-FAR, c - 1}};
    case LE:
    case ULE: return {{-FAR, c}};
    case GT:
    case UGT: return {{c + 1, FAR}};
    case GE:
    case UGE: return {{c, FAR}};
    default: return {};
    }
}

bool reads_as_its_type(int op, const TYPE* t) { return op == EQ || op == NEQ || (op >= ULE) == t->is_unsigned(); }

// x % m == r, (x & m) == r for m with ones at the low end: bits that a cast takes away do not count there.
bool modular(const NODE* left, WIDE r, RELATION* relation) {
    if (!left->right || left->right->op != ICON || !is_number(left->type)) return false;
    const WIDE c = range_of_tree(left->right, nullptr).min;
    if (left->op == MOD && c > 0)
        relation->modulus = c;
    else if (left->op == ANDB)
        relation->modulus = ~c & (c + 1);
    if (relation->modulus < 2 || relation->modulus >= WIDE(1) << (ADDRESS_BITS - 1)) return false;
    relation->residue = (r % relation->modulus + relation->modulus) % relation->modulus;
    relation->left = left->left;
    relation->right = nullptr;
    const auto keeps_low_bits = [&](const NODE* t) {
        return (t->op == SCONV || t->op == PCONV || t->op == ISP2CHAR) && !t->type->is_bool() &&
               (t->left->type->is_pointer() || is_number(t->left->type)) && (WIDE(1) << t->type->size) >= relation->modulus;
    };
    if ((relation->modulus & (relation->modulus - 1)) == 0)
        while (keeps_low_bits(relation->left)) relation->left = relation->left->left;
    return true;
}

// Inverts `r` where it is of the negated difference; false where it is of another one.
bool align(const RELATION& a, RELATION* r) {
    const auto same = [](const NODE* x, const NODE* y) { return x == y || (x && y && is_same_value(x, y)); };
    if (same(a.left, r->left) && same(a.right, r->right)) return true;
    const auto split = [](const RELATION& x, const NODE** p, const NODE** q) {
        *p = x.left, *q = x.right;
        if (x.right || x.left->op != MINUS) return x.right != nullptr;
        *p = x.left->left, *q = x.left->right;
        return true;
    };
    const NODE *p, *q, *s, *t;
    if (!split(a, &p, &q) || !split(*r, &s, &t) || !same(p, t) || !same(q, s)) return false;
    for (RANGE& range : r->ranges) range = {-range.max, -range.min};
    r->left = a.left, r->right = a.right;
    return true;
}

bool either_of(const NODE* t, RELATION* r) {
    RELATION other;
    if (!relation_of(t->left, true, r) || !relation_of(t->right, true, &other)) return false;
    if (r->modulus || other.modulus || r->ranges.size() != 1 || other.ranges.size() != 1 || !align(*r, &other))
        return false;
    r->ranges.push_back(other.ranges[0]);
    return true;
}

} // namespace

bool relation_of(const NODE* t, bool holds, RELATION* r) {
    if ((t->op == ORB || t->op == OROR) && holds && (t->op == OROR || (boolean_result[t->left->op] && boolean_result[t->right->op])))
        return either_of(t, r);
    if ((t->op == MOD || t->op == ANDB) && !holds) return modular(t, 0, r); // it is 0
    if (!op_is_int_compare(t->op)) return false;
    const int op = holds ? t->op : boolean_inv[t->op];
    const NODE *a = t->left, *b = t->right;
    const TYPE* type = a->type;
    if (!has_value_range(type) || !is_number(type) || !is_number(b->type) || type->size != b->type->size ||
        type->is_unsigned() != b->type->is_unsigned() || !reads_as_its_type(op, type))
        return false;
    const bool against_constant = b->op == ICON;
    const WIDE c = against_constant ? range_of_tree(b, nullptr).min : 0;
    if (against_constant && op == EQ && modular(a, c, r)) return true;
    r->modulus = 0;
    r->left = a;
    r->right = against_constant ? nullptr : b;
    r->ranges = range_by(op, c);
    return !r->ranges.empty();
}
