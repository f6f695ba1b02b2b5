// Vectors and complex values: packs, fields and casts that undo each other.

#include "OPT5/simp/algebra.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/simp.h"

#include <vector>

using namespace rules;

namespace {

uint32_t lanes_of(const TYPE* t) { return t->real->num_elem(); }

std::vector<NODE*> operands_of(NODE* list) {
    std::vector<NODE*> out(static_cast<std::size_t>(arg_list_count(list)));
    for (std::size_t i = out.size(); i-- > 0;) {
        const bool is_chain = i > 0;
        out[i] = is_chain ? list->right : list;
        if (is_chain) list = list->left;
    }
    return out;
}

bool is_number(const NODE* t) { return t->op == ICON || t->op == FCON; }

// Fields 0, 1, ... of one vector of the pack's own type.
NODE* packed_vector(const NODE* pack, const std::vector<NODE*>& lanes) {
    const NODE* first = lanes.front();
    if (first->op != VFIELD || !compatible_types(first->left->type, pack->type, true) || !is_pure(first->left))
        return nullptr;
    for (std::size_t i = 0; i < lanes.size(); ++i) {
        const NODE* f = lanes[i];
        if (f->op != VFIELD || !is_icon(f->right, INT65(static_cast<long>(i))) || !same_value(f->left, first->left))
            return nullptr;
    }
    return first->left;
}

bool all_are_one_number(const std::vector<NODE*>& lanes) {
    if (!is_number(lanes.front())) return false;
    for (const NODE* lane : lanes)
        if (!same_value(lane, lanes.front())) return false;
    return true;
}

} // namespace

// One operand for all lanes is VPACKM, one for the first and one for the others VPACK1P; all fields of a vector in
// their order are that vector.
NODE* simp_vector_pack(NODE* t) {
    if (!t->type->is_vector() || t->type->is_predicate()) return t;
    if (t->op == VPACK1P) {
        if (!is_number(t->left) || !same_value(t->left, t->right)) return t;
        erase_node(t->right);
        return to_unary(t, VPACKM, t->left);
    }
    if (t->op != VPACK) return t;
    const std::vector<NODE*> lanes = operands_of(t->left);
    const uint32_t n = lanes_of(t->type);
    if (lanes.size() == 1 && n > 1) {
        t->op = VPACKM;
        return t;
    }
    if (lanes.size() == 2 && n > 2) {
        erase_node(t->left);
        return simp_vector_pack(to_binary(t, VPACK1P, lanes[0], lanes[1]));
    }
    if (lanes.size() != n) return t;
    NODE* whole = packed_vector(t, lanes);
    if (whole) {
        whole = copy_tree(whole);
        erase_tree(t);
        return whole;
    }
    if (!all_are_one_number(lanes) || n < 2) return t;
    NODE* lane = copy_tree(lanes.front());
    erase_tree(t->left);
    return to_unary(t, VPACKM, lane);
}

namespace {

// What a pack holds in lane i; null of what is no pack, or has effects in another lane.
const NODE* packed_lane(const NODE* v, INT65 i) {
    if (v->op == VPACKM) return v->left;
    if (!is_pure(v)) return nullptr;
    if (v->op == VPACK1P) return i.is_zero() ? v->left : v->right;
    if (v->op != VPACK) return nullptr;
    const std::vector<NODE*> lanes = operands_of(v->left);
    return lanes.size() == lanes_of(v->type) ? lanes[static_cast<std::size_t>(i.value)] : nullptr;
}

} // namespace

// A field of a pack is the operand that was packed there; of a pack under a cast, that operand under the lanes' cast.
NODE* simp_vector_VFIELD(NODE* t) {
    NODE* v = t->left;
    if (!is_icon(t->right) || !v->type->is_vector()) return t;
    const INT65 i = t->right->u.lval;
    if (i.is_negative() || i >= INT65(lanes_of(v->type))) return t;
    const bool is_cast = v->op == VSCONV && v->left->type->is_vector();
    const NODE* lane = packed_lane(is_cast ? v->left : v, i);
    if (!lane || !compatible_types((is_cast ? v->left : v)->type->elem_type(), lane->type, true)) return t;
    NODE* value = copy_tree(lane);
    if (is_cast) value = coerced(normalized_value_type(v->type->elem_type()->stqs()), value, nullptr);
    TYPE* type = t->type;
    erase_tree(t);
    return coerced(type, value, nullptr);
}

// The bits as another type of the same size.
NODE* simp_vector_VRCONV(NODE* t) {
    while (t->left->op == VRCONV && t->left->left->type->size == t->type->size) t->left = take_left(t->left);
    return exact_types(t->type, t->left->type) ? take_left(t) : t;
}

// Lane by lane; of one value for all lanes once.
NODE* simp_vector_VSCONV(NODE* t) {
    if (exact_types(t->type, t->left->type)) return take_left(t);
    NODE* pack = t->left;
    if (pack->op != VPACKM || !t->type->is_vector() || t->type->is_predicate() || pack->type->is_predicate() ||
        !compatible_types(pack->type->elem_type(), pack->left->type, true))
        return t;
    TYPE* elem = normalized_value_type(t->type->elem_type()->stqs());
    pack->left = coerced(elem, pack->left, nullptr);
    pack->type = t->type;
    return take_left(t);
}

// Of a mask, whose lanes are truth values.
NODE* simp_vector_node(NODE* t) {
    switch (t->op) {
    case VRCONV: return simp_vector_VRCONV(t);
    case VSCONV: return simp_vector_VSCONV(t);
    case ANDB:
    case ORB: return same_value(t->left, t->right) ? only_left(t) : t;
    case NOTB: return t->left->op == NOTB && exact_types(t->type, t->left->left->type) ? take_left(take_left(t)) : t;
    default: return t;
    }
}

// The parts of a value made of parts, and a value made of its own parts.
NODE* simp_complexop(NODE* t, struct LOOP*) {
    NODE* x = t->left;
    if (t->op == REAL || t->op == IMAG) {
        if (x->op != COMPLEX || !is_pure(t->op == REAL ? x->right : x->left)) return t;
        NODE* part = t->op == REAL ? x->left : x->right;
        if (!compatible_types(part->type, t->type, true)) return t;
        erase_tree(t->op == REAL ? x->right : x->left);
        erase_node(x);
        erase_node(t);
        return part;
    }
    if (t->op == COMPLEX && x->op == REAL && t->right->op == IMAG && same_value(x->left, t->right->left) &&
        exact_types(x->left->type, t->type)) {
        erase_tree(t->right);
        return take_left(take_left(t));
    }
    return t;
}
