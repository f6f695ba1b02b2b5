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

// A pack of every lane. One operand for all is VPACKM; all fields of a vector in their order are that vector.
NODE* simp_vector_pack(NODE* t) {
    if (t->op != VPACK || !t->type->is_vector() || t->type->is_predicate()) return t;
    const std::vector<NODE*> lanes = operands_of(t->left);
    const uint32_t n = lanes_of(t->type);
    if (lanes.size() == 1 && n > 1) {
        t->op = VPACKM;
        return t;
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

// A field of a pack is the operand that was packed there.
NODE* simp_vector_VFIELD(NODE* t) {
    NODE* v = t->left;
    if (!is_icon(t->right) || t->right->u.lval.is_negative()) return t;
    if (v->op == VPACKM) {
        if (!compatible_types(v->left->type, t->type, true)) return t;
        erase_tree(t->right);
        return take_left(take_left(t));
    }
    if (v->op != VPACK || !is_pure(v)) return t;
    const std::vector<NODE*> lanes = operands_of(v->left);
    const INT65 i = t->right->u.lval;
    if (lanes.size() != lanes_of(v->type) || i >= INT65(static_cast<long>(lanes.size()))) return t;
    const NODE* lane = lanes[static_cast<std::size_t>(i.value)];
    if (!compatible_types(lane->type, t->type, true)) return t;
    return replace_by(t, copy_tree(lane));
}

// The bits as another type of the same size.
NODE* simp_vector_VRCONV(NODE* t) {
    while (t->left->op == VRCONV && t->left->left->type->size == t->type->size) t->left = take_left(t->left);
    return exact_types(t->type, t->left->type) ? take_left(t) : t;
}

NODE* simp_vector_VSCONV(NODE* t) { return exact_types(t->type, t->left->type) ? take_left(t) : t; }

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
