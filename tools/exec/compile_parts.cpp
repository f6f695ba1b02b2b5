// Vectors and complex numbers as they are put together: the value is a place in the frame.
#include "tools/exec/compile.h"

namespace {
struct PACK {
    std::vector<const XNODE*> lanes; // values; a short list repeats its last
    SHAPE lane;
    uint32_t count;
    int64_t slot;
};
int64_t pack(const XNODE* x, MACHINE& m) {
    const PACK& k = *static_cast<const PACK*>(x->extra);
    const uint64_t to = m.fp + static_cast<uint64_t>(k.slot);
    std::vector<int64_t> values;
    for (const XNODE* lane : k.lanes) values.push_back(run(lane, m));
    for (uint32_t i = 0; i < k.count; i++)
        m.store(k.lane, to + uint64_t{i} * k.lane.units, values[std::min<size_t>(i, values.size() - 1)]);
    return static_cast<int64_t>(to);
}
} // namespace

const XNODE* COMPILER::parts(const IC_NODE* n) {
    TYPE* t = n->type->real;
    const bool complex = n->op == op::COMPLEX && t->is_complex();
    const bool vector = (n->op == op::VPACK || n->op == op::VPACKM) && t->is_vector();
    if ((!complex && !vector) || !f) return unsupported(n);
    PACK* k = p.make<PACK>();
    k->lane = shape_of(complex ? t->part_type() : t->raw_elem_type());
    k->count = complex ? 2 : t->num_elem();
    std::vector<const IC_NODE*> lanes;
    auto collect = [&](auto&& self, const IC_NODE* list) -> void {
        list = strip_marks(list);
        if (list->op == op::COMMA) {
            self(self, list->left);
            self(self, list->right);
        } else
            lanes.push_back(list);
    };
    collect(collect, n->left);
    if (complex) collect(collect, n->right);
    if (lanes.size() != 1 && lanes.size() != k->count) return unsupported(n);
    for (const IC_NODE* lane : lanes) k->lanes.push_back(value_as(lane, k->lane));
    k->slot = slot(uint64_t{k->count} * k->lane.units);
    XNODE* x = p.node(pack);
    x->extra = k;
    return x;
}
