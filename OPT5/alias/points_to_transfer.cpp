// What a statement does to the bindings of pointers.
//
// Sound because a binding changes only where the value is known that the root of a statement assigns last. What an
// operator inside of it may write has no binding for the whole statement, as nothing says whether it runs before the
// accesses beside it, or at all.
#include "OPT5/alias/address_form.h"
#include "OPT5/alias/alias.h"
#include "OPT5/alias/bindings.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <cstring>
#include <numeric>

namespace {

constexpr int BITS_PER_UNIT = 16;

// Of a function that no definition of the program takes the place of.
bool returns_fresh_memory(const NODE* call) {
    if (call->op != CALL) return false;
    FUNINFO* f = find_FUNINFO_for_call(call);
    if (!f || !TEST_FLAG(f, FUN_is_SYSTEM) || function_is_defined(f)) return false;
    const char* name = skip_name_prefix(f->name.c_str());
    return !std::strcmp(name, "malloc") || !std::strcmp(name, "calloc");
}

bool is_marked_unaligned(const NODE* pointer) {
    return any_subtree(pointer, [](const NODE* t) { return t->op == OUIALIGN || t->op == NONALIGN; });
}

// What is added to the base of a sum, in units: a constant, and multiples of a stride.
struct DISTANCE {
    int64_t constant = 0, stride = 0;
    bool is_known = true;
};

DISTANCE distance_from(const ADDRESS_FORM& form, const LINEAR_FORM::TERM* base) {
    DISTANCE d;
    INT65 stride = form.modulus();
    for (const LINEAR_FORM::TERM& term : form)
        if (&term != base) {
            if (term.tree->type->is_pointer()) d.is_known = false;
            stride = long_gcd(stride, term.coefficient < 0 ? -INT65(term.coefficient) : INT65(term.coefficient));
        }
    if (form.constant % BITS_PER_UNIT || !stride.fits<int64_t>() || stride.fits_in<int64_t>() % BITS_PER_UNIT) {
        d.is_known = false;
        return d;
    }
    d.constant = form.constant / BITS_PER_UNIT;
    d.stride = stride.fits_in<int64_t>() / BITS_PER_UNIT;
    return d;
}

PTENV of_category(uint32_t category) {
    PTENV e;
    e.categories = category;
    e.align = BITS_PER_UNIT;
    return e;
}

PTENV of_object(SYMTAB* object, int64_t offset, int64_t stride) {
    PTENV e;
    e.targets.push_back(make_target(object, offset, stride));
    return e;
}

} // namespace

unsigned simple_pointer(const PT_STORE& store, const NODE* t) {
    const NODE* name = name_accessed(below_SSA(t));
    return name && name->u.sym && compatible_types(name->u.sym->type, t->type, true) ? store.number_of(name->u.sym)
                                                                                    : PT_STORE::NONE;
}

// ---- Values

const PTENV* PT_TRANSFER::of_base(const NODE* base, const PT_STATE& s) {
    const unsigned i = simple_pointer(store, base);
    if (i != PT_STORE::NONE) return store.binding(store.pointers[i].sym, s);
    switch (base->op) {
    case SCON: return store.bindings.intern(of_category(PT_SCON));
    case CALL: return returns_fresh_memory(base) ? store.bindings.intern(of_category(PT_HEAP | PT_NULL)) : nullptr;
    case QUEST:
        if (!base->right || !base->right->left || !base->right->right) return nullptr;
        return store.bindings.meet(evaluate(base->right->left, s), evaluate(base->right->right, s));
    default: return nullptr;
    }
}

const PTENV* PT_TRANSFER::evaluate(const NODE* t, const PT_STATE& s) {
    for (t = below_SSA(t); t->op == ASG || t->op == COMMAOP;) t = below_SSA(t->right);
    if (!t->type->is_pointer()) return nullptr;
    const ADDRESS_FORM form = pointer_form(t);
    const LINEAR_FORM::TERM* base = nullptr;
    if (!form.object)
        for (const LINEAR_FORM::TERM& term : form)
            if (!base && term.tree->type->is_pointer() && term.coefficient == BITS_PER_UNIT) base = &term;
    const DISTANCE d = distance_from(form, base);
    if (!d.is_known) return nullptr;
    PTENV e;
    if (form.object) {
        if (form.object->is_function()) return nullptr;
        e = of_object(form.object, d.constant, d.stride);
    } else if (form.is_constant()) {
        e = of_category(form.constant ? PT_ADCON | PT_EXTERN : PT_NULL);
    } else if (base) {
        const PTENV* of_it = of_base(base->tree, s);
        if (!of_it && !form.points_into) return nullptr;
        e = of_it ? shifted(*of_it, d.constant, d.stride) : of_object(form.points_into, 0, 1);
    } else
        return nullptr;
    if (e.align && is_marked_unaligned(t)) e.align = BITS_PER_UNIT;
    return store.bindings.intern(std::move(e));
}

// ---- Accesses

void PT_TRANSFER::bind_accesses(const NODE* tree, const PT_STATE& s) {
    for_each_subtree(tree, [&](const NODE* t) {
        if ((t->op != UMULT && t->op != STREF) || (t->op == UMULT && t->right) || !t->left->type->is_pointer()) return;
        const NODE* basis = pointer_basis(t->left);
        if (!basis || basis->op == UAND) return; // that of an object by its address is its form
        const PTENV* e = evaluate(t->left, s);
        if (!e) return;
        RARE_FIELDS& rare = const_cast<NODE*>(t)->make_rare();
        rare.ptenv = e;
        rare.ptenv_run = store.run;
    });
}

// ---- Writes

namespace {

// Above this number all exposed pointers are dropped, so that time stays linear.
constexpr size_t MOST_ASKED = 32;

bool may_reach(const WRITE& w, const NODE* pointer) {
    if (w.place) return lvalues_may_be_aliased(access_of_place(w.place), pointer);
    return (w.by->op != CALL && w.by->op != UCALL) || call_may_modify(w.by, pointer);
}

} // namespace

void PT_TRANSFER::drop_exposed(const WRITE& w, PT_STATE& s) {
    std::vector<unsigned> asked;
    store.maps.for_each(s.exposed, [&asked](unsigned i, const PTENV*) { asked.push_back(i); });
    if (asked.size() > MOST_ASKED) {
        s.exposed = nullptr;
        return;
    }
    for (const unsigned i : asked) {
        NODE* pointer = mk_NAME(store.pointers[i].sym);
        if (may_reach(w, pointer)) store.bind(i, nullptr, s);
        erase_tree(pointer);
    }
}

void PT_TRANSFER::drop_written(const WRITE& w, PT_STATE& s) {
    const NODE* name = w.place ? name_of_place(w.place) : nullptr;
    const unsigned i = name ? store.number_of(name->u.sym) : PT_STORE::NONE;
    if (i != PT_STORE::NONE) store.bind(i, nullptr, s);
    if (s.exposed && (!name || !only_its_name_reaches(name->u.sym))) drop_exposed(w, s);
}

// The value that the root of a statement gives a pointer.
const PTENV* PT_TRANSFER::assigned_value(const NODE* t, unsigned pointer, const PT_STATE& s) {
    if (t->op == ASG) {
        // An exception may leave the variable as it was.
        if (currfuninfo->has_eh() && any_subtree(t->right, [](const NODE* n) { return op_is_call(n->op); })) return nullptr;
        return evaluate(t->right, s);
    }
    if ((t->op != PLUSASG && t->op != MINUSASG && t->op != PLUSPLUS && t->op != MINMIN) || !t->right) return nullptr;
    const PTENV* before = store.binding(store.pointers[pointer].sym, s);
    if (!before || t->right->type->is_pointer()) return nullptr;
    const DISTANCE d = distance_from(pointer_form(t->right), nullptr);
    if (!d.is_known) return nullptr;
    return store.bindings.intern(shifted(*before, t->op == MINUSASG || t->op == MINMIN ? -d.constant : d.constant, d.stride));
}

void PT_TRANSFER::apply_root(const NODE* t, PT_STATE& s) {
    const unsigned i = writes_left_operand(t->op) && t->left ? simple_pointer(store, t->left) : PT_STORE::NONE;
    const PTENV* value = i != PT_STORE::NONE ? assigned_value(t, i, s) : nullptr;
    for_each_write_of_node(t, [this, &s](const WRITE& w) { drop_written(w, s); });
    if (i != PT_STORE::NONE) store.bind(i, value, s);
}

// ---- Conditions

// `pointer op other` holds.
void PT_TRANSFER::refine_pointer(int op, const NODE* pointer, const NODE* other, PT_STATE& s) {
    const unsigned i = simple_pointer(store, pointer);
    if (i == PT_STORE::NONE) return;
    const PTENV* mine = store.binding(store.pointers[i].sym, s);
    const PTENV* its = evaluate(other, s);
    if (!its) return;
    if (op == NEQ) {
        if (!mine || its->categories != PT_NULL || !its->targets.empty()) return;
        PTENV e = *mine;
        e.categories &= ~PT_NULL;
        store.bind(i, store.bindings.intern(std::move(e)), s);
        return;
    }
    if (!mine) return;
    const PTENV* both = store.bindings.intern(intersection(*mine, *its));
    if (both) store.bind(i, both, s); // otherwise the place is never reached
}

void PT_TRANSFER::refine(const NODE* c, PT_STATE& s) {
    if (!c) return;
    if (c->op == ANDAND || (c->op == ANDB && returns_1_or_0(c->left) && returns_1_or_0(c->right))) {
        refine(c->left, s);
        refine(c->right, s);
        return;
    }
    const bool is_order = c->op == ULE || c->op == ULT || c->op == UGE || c->op == UGT;
    if ((c->op != EQ && c->op != NEQ && !is_order) || !c->left->type->is_pointer() || !c->right->type->is_pointer()) return;
    refine_pointer(c->op, c->left, c->right, s);
    refine_pointer(c->op, c->right, c->left, s);
}

void PT_TRANSFER::statement(const NODE* t, PT_STATE& s, const LOOK& look) {
    t = below_SSA(t);
    if (t->op == COMMAOP || t->op == PCOMMA) { // one behind the other
        statement(t->left, s, look);
        if (t->right) statement(t->right, s, look);
        return;
    }
    for_each_write(t, [&](const WRITE& w) {
        if (w.by != t) drop_written(w, s);
    });
    if (look) look(t, s);
    if (t->op == ASSERT || t->op == NASSERT)
        refine(t->left, s);
    else
        apply_root(t, s);
}
