// What a place in an initialized object holds at the start of the run.
//
// The initializer items stand in the layout order of the object's type, one a scalar: structure members in order, array
// elements by stride. A SKIP item stands for as many scalars as it counts, whose value the list does not give.

#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

namespace {

class INIT_WALK {
public:
    INIT_WALK(const std::vector<NODE*>& init_items, uint64_t wanted_bit, TYPE* wanted_type)
        : items(init_items), offset(wanted_bit), type(wanted_type) {}

    // A fresh tree, or null.
    NODE* run(TYPE* object) {
        visit(object, 0);
        return found;
    }

private:
    // Stops the walk once the place is reached, or cannot be.
    bool done() const { return stop; }

    void visit(TYPE* t, uint64_t at) {
        if (done()) return;
        if (t->is_union() || !t->is_complete())
            stop = true;
        else if (t->is_array())
            visit_array(t, at);
        else if (t->is_csu())
            for (const fkMDATA* m = t->mdata(); m && !done(); m = m->next)
                visit_member(m, at + static_cast<uint64_t>(m->offset));
        else
            visit_scalar(t, at);
    }

    void visit_member(const fkMDATA* m, uint64_t at) {
        if (!m->is_bitfld) {
            visit(m->type, at);
            return;
        }
        take_item();
        if (at + m->width > offset) stop = true; // the item is the value of a part of the place
    }

    void visit_array(TYPE* t, uint64_t at) {
        const uint64_t stride = type_stride(t->raw_elem_type());
        if (t->raw_elem_type()->is_int() && !skipped && next < items.size() && items[next]->op == SCON) {
            visit_string(*items[next++], t, at);
            return;
        }
        for (uint32_t i = 0; i < t->num_elem() && !done(); ++i) visit(t->raw_elem_type(), at + i * stride);
    }

    // One item for a whole array: its characters, then zeros.
    void visit_string(const NODE& string, TYPE* t, uint64_t at) {
        if (offset >= at + t->size) return;
        stop = true;
        const uint64_t stride = type_stride(t->raw_elem_type());
        if (offset < at || (offset - at) % stride || type->size != t->raw_elem_type()->size || !type->is_int()) return;
        const uint64_t i = (offset - at) / stride;
        const auto value = i < string.scon_length() ? static_cast<unsigned char>(string.scon_value()[i]) : 0;
        found = mk_ICON(INT65(static_cast<int64_t>(value)), type);
    }

    void visit_scalar(TYPE* t, uint64_t at) {
        if (at > offset) {
            stop = true;
            return;
        }
        const NODE* item = take_item();
        if (at != offset) return;
        stop = true;
        if (!item || item->op == ENDINIT) return;
        const bool pointers = type->is_pointer() && item->type->is_pointer();
        if (pointers ||
            (t->size == type->size && compatible_types(promoted_type(item->type), promoted_type(type), true)))
            found = copy_tree(item);
    }

    // The next scalar's item; null for one that a SKIP stands for.
    const NODE* take_item() {
        if (skipped > 0) {
            --skipped;
            return nullptr;
        }
        if (next >= items.size() || items[next]->op == ENDINIT) {
            stop = true;
            return nullptr;
        }
        const NODE* item = items[next++];
        if (item->op != SKIP) return item;
        skipped = static_cast<int64_t>(item->skip_count()) - 1;
        return nullptr;
    }

    const std::vector<NODE*>& items;
    const uint64_t offset;
    TYPE* const type;
    size_t next = 0;
    int64_t skipped = 0;
    bool stop = false;
    NODE* found = nullptr;
};

} // namespace

bool initial_value_may_be_taken(const SYMTAB* sym) {
    if (sym->dynamic_init || find_pragma(sym, PRG_WEAK)) return false;
    return symbol_is_immutable(sym) || !find_pragma(sym, PRG_DATA_SECTION);
}

NODE* lookup_autoinit(const SYMTAB* sym, uint64_t offset_bits, TYPE* type) {
    if (!sym || !sym->autoinit || !initial_value_may_be_taken(sym)) return nullptr;
    return INIT_WALK(*sym->autoinit, offset_bits, type).run(sym->orig_type ? sym->orig_type : sym->type);
}

NODE* lookup_autoinit(const NODE* tree) {
    int64_t offset = 0;
    TYPE* type = tree->type;
    tree = without_members(tree, &offset);
    if (tree->op == UMULT && !tree->right && tree->left->op == UAND) tree = tree->left->left;
    return tree->op == NAME ? lookup_autoinit(tree->u.sym, static_cast<uint64_t>(offset), type) : nullptr;
}

NODE* lookup_array_autoinit(const SYMTAB* sym, uint64_t i) {
    if (!sym->type->is_array() || i >= sym->type->num_elem()) return nullptr;
    TYPE* elem = sym->type->raw_elem_type();
    return lookup_autoinit(sym, i * type_stride(elem), elem);
}
