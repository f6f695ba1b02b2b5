// Values of several parts: vectors and complex numbers, and copies of memory.
#include "tools/treecheck/evaluator.h"

#include "OPT5/ir/trees.h"

namespace treecheck {

namespace {

FORM form_of_lanes(TYPE* type) { return form_of(type->is_complex() ? type->part_type() : type->elem_type()); }
std::size_t lane_count(const TYPE* type) { return type->is_complex() ? 2 : type->real->num_elem(); }

BITS low_bits(BITS v, const FORM& f) {
    FORM bits = f;
    bits.is_signed = bits.is_float = false;
    if (f.is_float && f.bits == 32) return ~BITS(0); // unused: no vector of them is taken as another
    return bits.bits >= 64 ? v : v & ((BITS(1) << bits.bits) - 1);
}

} // namespace

std::vector<BITS> EVALUATOR::lanes(const NODE* t) {
    TYPE* type = t->type;
    const std::size_t n = lane_count(type);
    const FORM form = form_of_lanes(type);
    std::vector<BITS> out;
    auto operand = [&](const NODE* x) { out.push_back(convert(eval(x), form_of(x->type), form)); };
    auto list = [&](auto&& self, const NODE* x) -> void {
        if (x->op != COMMA) return operand(x);
        self(self, x->left);
        self(self, x->right);
    };
    switch (t->op) {
    case COMMAOP: eval(t->left); return lanes(t->right);
    case VPACK1P:
    case COMPLEX:
        operand(t->left);
        operand(t->right);
        break;
    case VPACK:
    case VPACKM: list(list, t->left); break;
    case VSCONV:
        out = lanes(t->left);
        for (BITS& v : out) v = convert(v, form_of_lanes(t->left->type), form);
        break;
    case VRCONV: { // the same words
        const FORM from = form_of_lanes(t->left->type);
        std::vector<uint16_t> words;
        for (BITS v : lanes(t->left))
            for (int i = 0; i < from.bits; i += 16) words.push_back(static_cast<uint16_t>(low_bits(v, from) >> i));
        for (std::size_t at = 0; at < words.size();) {
            BITS v = 0;
            for (int i = 0; i < form.bits && at < words.size(); i += 16) v |= BITS(words[at++]) << i;
            out.push_back(convert(v, FORM{false, false, false, false, 64}, form));
        }
        break;
    }
    case NAME: {
        PLACE p = place(t);
        p.form = form;
        for (std::size_t i = 0; i < n; ++i, p.unit += static_cast<uint32_t>(form.bits) / 16) out.push_back(read(p));
        break;
    }
    default: fail();
    }
    if (out.empty()) out.push_back(0);
    while (out.size() < n) out.push_back(out.back()); // a short list repeats its last
    return out;
}

// To, from, number of units; the value is where it was copied to.
BITS EVALUATOR::copy_memory(const NODE* t) {
    const NODE *outer = t->left, *inner = outer->left;
    const auto to = static_cast<uint32_t>(eval(inner->left)), from = static_cast<uint32_t>(eval(inner->right));
    const BITS n = eval(outer->right);
    if (undefined || n == 0) return to;
    if (n >= MEMORY_UNITS || to >= MEMORY_UNITS || from >= MEMORY_UNITS) return fail();
    const auto units = static_cast<uint32_t>(n);
    const bool overlaps = to < from + units && from < to + units && to != from;
    if (overlaps || !w.pointer_may_reach(to, units) || !w.pointer_may_reach(from, units)) return fail();
    for (uint32_t i = 0; i < units; ++i) memory[to + i] = memory[from + i];
    return to;
}

} // namespace treecheck
