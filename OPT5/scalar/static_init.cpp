// What a static initializer stores ahead of everything else it does becomes the initial value of the objects.
//
// Taken are the constants that are stored by the statements that run first, one after the other, up to the first call
// or branch. The initializer of a structure or an array gives zero to the parts that nothing was stored to.
//
// Needs: alias marks; a function whose entry has no predecessors and that the program does not call. Leaves: what rests
// on the graph.
// Sound because the function runs once, before the program proper, and the language permits a value from the start for
// what is initialized at run time. An object is left alone once a statement that stays names it, or accesses memory
// through a pointer that may reach it: in `int b = a; int a = 3` the store to a must not move ahead of the read.
#include "OPT5/alias/address_form.h"
#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lowering.h"

#include <algorithm>
#include <map>
#include <unordered_set>
#include <vector>

namespace {

constexpr std::size_t MOST_SCALARS = 64;

struct SCALAR {
    int64_t offset; // bits
    TYPE* type;
    NODE* value = nullptr;
};

// The scalars of an object in the order of its initializer; false where the order of parts is not theirs.
bool list_scalars(TYPE* type, int64_t offset, std::vector<SCALAR>* scalars) {
    if (type->is_volatile() || type->is_const() || scalars->size() > MOST_SCALARS) return false;
    TYPE* real = type->real;
    if (real->is_array() && !real->is_vector()) {
        TYPE* element = real->raw_elem_type();
        if (!real->is_complete() || real->num_elem() > MOST_SCALARS) return false;
        for (uint32_t i = 0; i < real->num_elem(); ++i)
            if (!list_scalars(element, offset + i * static_cast<int64_t>(type_stride(element)), scalars)) return false;
        return true;
    }
    if (real->is_csu()) {
        if (real->is_union() || !real->is_complete() || real->is_struct_vector()) return false;
        if (real->csu_extras() && !real->csu_extras()->base_classes.items.empty()) return false;
        for (const fkMDATA* m = real->mdata(); m; m = m->next)
            if (m->is_bitfld || !list_scalars(m->type, offset + m->offset, scalars)) return false;
        return true;
    }
    if (!real->is_int() && !real->is_enum() && !real->is_float() && !real->is_pointer()) return false;
    scalars->push_back({offset, normalized_value_type(type)->stqs()});
    return scalars->size() <= MOST_SCALARS;
}

bool is_address_of_static(const NODE* t) {
    if (t->op == PLUS && t->right->op == ICON) t = t->left;
    if (t->op == PCONV && t->left->type->is_pointer()) return is_address_of_static(t->left);
    return t->op == UAND && t->left->op == NAME && t->left->u.sym->level == 0;
}

// A fresh tree for the item, or null.
NODE* item_of(const NODE* value, TYPE* type) {
    if (value->op == ICON && (type->is_int() || type->is_enum()) && !type->is_bool())
        return mk_ICON(truncate_to_type(value->u.lval, type), type);
    if (!equiv_mtypes(value->type->stqs(), type)) return nullptr;
    return value->op == ICON || value->op == FCON || is_address_of_static(value) ? copy_tree(value) : nullptr;
}

NODE* zero_of(TYPE* type) {
    if (type->is_float()) {
        NODE* zero = new_node(FCON, type);
        zero->mk_fcon("0");
        return zero;
    }
    if (type->is_pointer()) return maketree(PCONV, mk_ICON(INT65(0), tp->long_t), nullptr, type);
    return mk_ICON(INT65(0), type);
}

bool is_zero(const NODE* item) {
    while ((item->op == PCONV || item->op == SCONV) && item->left) item = item->left;
    if (item->op == FCON) return item->u.fval && f_is_zero(item->u.fval) && item->u.fval->sign == 0;
    return item->op == ENDINIT || (item->op == ICON && item->u.lval.is_zero());
}

// Nothing but the zeros that storage starts with.
bool starts_as_zero(const SYMTAB* s) {
    if (!s->autoinit) return !s->init_value;
    return std::all_of(s->autoinit->begin(), s->autoinit->end(), is_zero);
}

class CONVERSION {
public:
    void run() {
        need(fact::alias_marks);
        for (BBLK* bb = currfuninfo->bb_list; bb && goes_on; bb = only_way(bb))
            for (LIST** link = &bb->statements; *link && goes_on;) {
                LIST* s = *link;
                if (!take(s->first)) {
                    look_at(s->first);
                    link = &s->rest;
                    continue;
                }
                drop_statement(link);
            }
        for (SYMTAB* s : order) initialize(s);
        if (!order.empty()) settle_dynamic_init();
    }

private:
    using OBJECT = std::vector<SCALAR>;

    // The block that is entered next, and from here alone.
    static BBLK* only_way(const BBLK* bb) {
        BBLK* next = only_block(bb->successors);
        return next && next != currfuninfo->exit_bb && only_block(next->predecessors) ? next : nullptr;
    }

    static bool may_be_given_a_value(const SYMTAB* s) {
        if (s->level != 0 || (s->sclass != SC_STATIC && s->sclass != SC_EXTDEF) || s->is_function()) return false;
        if (!starts_as_zero(s) || s->pragma || s->is_clustered || s->cqual & CQ_GLOBAL_REGISTER) return false;
        return s->sclass == SC_STATIC || s->dynamic_init || no_outside_writers;
    }

    OBJECT* object_of(SYMTAB* s) {
        auto at = objects.find(s->index);
        if (at != objects.end()) return at->second.empty() ? nullptr : &at->second;
        OBJECT& object = objects[s->index];
        if (!may_be_given_a_value(s) || !list_scalars(s->type, 0, &object)) object.clear();
        return object.empty() ? nullptr : &object;
    }

    // True if the statement's store is an initial value now.
    bool take(const NODE* t) {
        if (t->op != ASG || (t->left->op != NAME && t->left->op != STDOT && t->left->op != UMULT)) return false;
        if (lvalue_is_volatile(t->left)) return false;
        const ADDRESS_FORM place = address_form(t->left);
        SYMTAB* s = place.object;
        if (!s || !place.is_constant() || barred.count(s) || (reached && file_symbol_may_be_aliased(s))) return false;
        OBJECT* object = object_of(s);
        if (!object) return false;
        for (SCALAR& scalar : *object) {
            if (INT65(scalar.offset) != INT65(place.constant) ||
                INT65(static_cast<int64_t>(scalar.type->size)) != place.width)
                continue;
            NODE* item = item_of(t->right, scalar.type);
            if (!item) return false;
            if (scalar.value) erase_tree(scalar.value);
            scalar.value = item;
            if (is_taken.insert(s).second) order.push_back(s);
            return true;
        }
        return false;
    }

    // What may no longer be moved ahead of a statement that stays.
    void look_at(NODE* t) {
        for_each_node(t, [this](const NODE* n) {
            if (n->op == NAME) barred.insert(n->u.sym);
            if (op_is_indirection(n->op)) reached = true;
            if (op_is_call(n->op) || n->op == MCALL || n->op == UMCALL || n->op == ASM || n->op == MEMCPY)
                goes_on = false;
        });
    }

    // A symbol that nothing in the function names any more has its value from the start.
    void settle_dynamic_init() {
        std::unordered_set<const SYMTAB*> named;
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest)
                for_each_node(s->first, [&](const NODE* t) {
                    if (t->op == NAME) named.insert(t->u.sym);
                });
        for (SYMTAB* s : order)
            if (!named.count(s)) s->dynamic_init = false;
    }

    void initialize(SYMTAB* s) {
        if (s->autoinit)
            for (NODE* item : *s->autoinit) erase_tree(item);
        else
            s->autoinit = new std::vector<NODE*>;
        s->autoinit->clear();
        if (s->init_value) erase_tree(s->init_value);
        s->init_value = nullptr;
        for (const SCALAR& scalar : objects[s->index])
            s->autoinit->push_back(scalar.value ? scalar.value : zero_of(scalar.type));
        s->autoinit->push_back(new_node(ENDINIT, tp->int_t));
        if (print_debug) debug_printf("\n\tInitial value of '%s' instead of a store\n", s->name);
    }

    std::map<int32_t, OBJECT> objects; // by index; empty for one that can have no initializer
    std::vector<SYMTAB*> order;        // those that something was taken for
    std::unordered_set<const SYMTAB*> is_taken, barred;
    bool reached = false; // memory was accessed through a pointer
    bool goes_on = true;
};

// A function of the program, and not only the start-up code, calls it.
bool is_called_by_program(const FUNINFO* f) {
    for (const FUNINFO* caller : fileinfo.FUNLIST)
        for (const CALLEE* c = caller->symbol ? caller->callees : nullptr; c; c = c->next)
            if (c->callee == f) return true;
    return false;
}

} // namespace

void convert_sti_to_cinit() {
    const FUNINFO* f = currfuninfo;
    if (!fun_is_cpp_static_initializer(f) || !f->bb_list || f->bb_list->predecessors || is_called_by_program(f)) return;
    CONVERSION().run();
    changed(fact::graph);
}
