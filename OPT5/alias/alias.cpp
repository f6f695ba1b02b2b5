// The rules on pairs of lvalues, from the cheapest to the dearest. The first that tells the two apart decides.
#include "OPT5/alias/alias.h"

#include "OPT5/alias/address_form.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/alias/state.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"

#include <cstring>


void init_dd_aliasing() { need(fact::alias); }

namespace {

// The pointer that an lvalue is accessed through, null for a NAME.
const NODE* pointer_of(const NODE* t) {
    for (t = below_transparent(t); t->op == STDOT;) t = below_transparent(t->left);
    return op_is_indirection(t->op) ? t->left : nullptr;
}

PTR* record_of(const NODE* lvalue) {
    const NODE* pointer = pointer_of(lvalue);
    const NODE* base = pointer ? address_expr_base(pointer) : nullptr;
    return base ? find_or_make_PTR_entry(const_cast<NODE*>(base)) : nullptr;
}

// The parameter that all values of a pointer come from, null for none: pointers from it never reach what was made after
// the function was entered.
const SYMTAB* parameter_behind(const NODE* lvalue) {
    if (!groups_are_known()) return nullptr;
    const PTR* p = record_of(lvalue);
    const PTR* root = p ? p->root : nullptr;
    return root && !(root->flags & PTR_IS_BOTTOM) && root->symbol->level == 1 && root->root == root ? root->symbol
                                                                                                    : nullptr;
}

bool is_string_access(const NODE* lvalue) {
    const NODE* pointer = pointer_of(lvalue);
    const NODE* base = pointer ? pointer_basis(pointer) : nullptr;
    return base && base->op == SCON;
}

// A fixed address may be the place of a global that the linker was told to put there.
bool is_placed_by_linker_alone(const SYMTAB* sym) {
    return sym->is_automatic() || (sym->sclass != SC_EXTERN && !sym->pragma);
}

// `object` is accessed by one lvalue; the other, `indirect`, has no known object.
bool is_out_of_reach(const SYMTAB* object, const NODE* indirect, const ADDRESS_FORM& form) {
    if (object->is_function()) return false;
    if (!may_be_reached_by_pointers(object)) return true;
    if (object->is_automatic() && parameter_behind(indirect)) return true;
    if (form.is_absolute()) return is_placed_by_linker_alone(object);
    return is_string_access(indirect);
}

bool are_told_apart_by_records(const NODE* a, const NODE* b) {
    const SYMTAB *p = parameter_behind(a), *q = parameter_behind(b);
    if (pointer_args_are_disjoint && p && q && p != q) return true;
    const PTR *x = record_of(a), *y = record_of(b);
    return x && y && x->flags & y->flags & PTR_IS_DISJOINTED && x->root != y->root;
}

} // namespace

// ---- restrict

namespace {

// Its block is the function's, so that there is one life of it; an inner block begins anew at each iteration of a loop.
bool lives_once(const PTR* p) { return p->scope->depth <= 2 && p->scope->function == currfuninfo; }

// The record of the `restrict` pointer that an lvalue's pointer is, or that all values of it are derived from; it keeps
// the value that it was declared with. What is derived from it may hold a value of an earlier life. Null without one.
const PTR* restricted_record(const NODE* lvalue, bool at_any_time) {
    const PTR* p = record_of(lvalue);
    if (p && !(p->flags & PTR_IS_RESTRICTED)) {
        p = p->root;
        at_any_time = true;
    }
    if (!p || !(p->flags & PTR_IS_RESTRICTED) || p->member) return nullptr;
    if (p->flags & (PTR_IS_REASSIGNED | PTR_IS_FILE_LEVEL | PTR_IS_BOTTOM)) return nullptr;
    if (!p->scope || may_be_reached_by_pointers(p->symbol)) return nullptr;
    return !at_any_time || lives_once(p) ? p : nullptr;
}

// In the scope of `p` what it points to is accessed through it and what is derived from it alone.
bool is_kept_from(const PTR* p, const NODE* through_p, const NODE* other) {
    if (!through_p->ls || !other->ls || !p->scope->encloses(through_p->ls) || !p->scope->encloses(other->ls))
        return false;
    const PTR* q = record_of(other);
    if (q) return !(q->root->flags & PTR_IS_BOTTOM) && q->root != p->root;
    // An object by its name: the pointer of a local scope may have been replaced by it in places.
    return p->root->symbol->level == 1 && !(p->root->flags & PTR_IS_BOTTOM) && address_form(other).object;
}

bool are_kept_apart(const NODE* a, const NODE* b, bool at_any_time) {
    if (a == b || !groups_are_known()) return false;
    const PTR* p = restricted_record(a, at_any_time);
    if (p && is_kept_from(p, a, b)) return true;
    p = restricted_record(b, at_any_time);
    return p && is_kept_from(p, b, a);
}

} // namespace

bool unaliased_by_scope(const NODE* a, const NODE* b) { return are_kept_apart(a, b, false); }

// ---- Pairs

bool object_symbols_may_alias(const SYMTAB* a, const SYMTAB* b) {
    if (!a || !b || a == b) return true;
    if ((a->lives_in_others && b->hosts_others) || (b->lives_in_others && a->hosts_others)) return true;
    if (a->level == 0 && b->level == 0) {
        // A declaration and its definition, and names that the linker may give another meaning.
        if (!std::strcmp(a->name, b->name)) return true;
        return a->pragma && b->pragma && (find_pragma(a, PRG_WEAK) || find_pragma(b, PRG_WEAK));
    }
    // A parameter and the variable that it is copied into may be given one place.
    const SYMTAB* parm = a->level == 1 ? a : b;
    const SYMTAB* local = parm == a ? b : a;
    return parm->level == 1 && local->level == 2 && map_sym_to_parm(local) == parm;
}

// Objects of different types that lie over each other in the variable that disjoint scopes share: what is accessed as
// one type is accessed as another before or after.
static bool may_share_stack(TYPE* a, TYPE* b) {
    const SYMTAB* shared = currfuninfo ? currfuninfo->stack_union : nullptr;
    return shared && may_be_reached_by_pointers(shared) && type_may_access_part_of(a, shared->type) &&
           type_may_access_part_of(b, shared->type);
}

// The object whose name stands in the lvalue itself, or null.
static const SYMTAB* object_named_in(const NODE* t) {
    for (;;) {
        t = below_transparent(t);
        if (t->op == STDOT && t->right && t->right->mval)
            t = t->left;
        else if (t->op == UMULT && !t->right && t->left->op == UAND && t->left->type->is_pointer())
            t = t->left->left;
        else
            return t->op == NAME ? t->u.sym : nullptr;
    }
}

COMPARED_LVALUE::COMPARED_LVALUE(const NODE* t) : lvalue(below_transparent(t)), is_place(op_is_lvalue(lvalue->op)) {
    if (!is_place) return;
    volatile_place = lvalue_is_volatile(lvalue);
    named = object_named_in(lvalue);
}

bool lvalues_may_be_aliased(const NODE* a, const NODE* b, struct LOOP* loop, bool by_type, bool* unsure) {
    return lvalues_may_be_aliased(COMPARED_LVALUE(a), COMPARED_LVALUE(b), loop, by_type, unsure);
}

bool lvalues_may_be_aliased(const COMPARED_LVALUE& of_a, const COMPARED_LVALUE& of_b, struct LOOP* loop, bool by_type,
                            bool* unsure) {
    const NODE *a = of_a.tree(), *b = of_b.tree();
    if (!of_a.is_lvalue() || !of_b.is_lvalue()) {
        if (unsure) *unsure = true;
        return true;
    }
    if (of_a.is_volatile() && of_b.is_volatile()) return true; // what their order is for may lie outside of memory
    // That only one is volatile says nothing: a plain object may be written through a pointer to volatile.
    if (a->op == NAME && b->op == NAME) return object_symbols_may_alias(a->u.sym, b->u.sym);
    if (const SYMTAB *named = of_a.object_named(), *other = of_b.object_named(); named && other && other != named)
        return object_symbols_may_alias(named, other);
    const ADDRESS_FORM &x = of_a.form(), &y = of_b.form();
    const SYMTAB *object_a = x.known_object(), *object_b = y.known_object();
    if (object_a && object_b) {
        if (object_a == object_b)
            return !accesses_are_disjoint(x, y, loop) && UMULT_PT_targets_may_overlap(a, x, b, y);
        return object_symbols_may_alias(object_a, object_b);
    }
    if (object_a && is_out_of_reach(object_a, b, y)) return false;
    if (object_b && is_out_of_reach(object_b, a, x)) return false;
    if (accesses_are_disjoint(x, y, loop)) return false;
    if (are_kept_apart(a, b, loop != nullptr) || are_told_apart_by_records(a, b)) return false;
    if (!UMULT_PT_targets_may_overlap(a, x, b, y)) return false;
    const NODE *p = pointer_of(a), *q = pointer_of(b);
    if (loop && p && q && pointers_are_antialiased(p, q, loop, loop)) return false;
    if (by_type) {
        bool exact_a, exact_b;
        TYPE *type_a = true_type(a, &exact_a), *type_b = true_type(b, &exact_b);
        if (!types_may_be_aliased(type_a, exact_a, type_b, exact_b) && !may_share_stack(type_a, type_b)) return false;
    }
    if (loop && p && q && build_the_umults_alias_free_by_predication_lists(a, b, loop)) return false;
    if (unsure) *unsure = true;
    return true;
}

// ---- Assertions of loops

namespace {

const NODE* bare_pointer(const NODE* p) {
    while (p->op == OUIALIGN || p->op == NONALIGN || p->op == IDENTITY ||
           ((p->op == PCONV || p->op == ISP2CHAR) && p->left->type->is_pointer()))
        p = p->left;
    return p;
}

int depth_of(struct LOOP* loop) {
    int depth = 0;
    for (; loop; loop = loop_callbacks.parent(loop)) ++depth;
    return depth;
}

struct LOOP* innermost_common_loop(struct LOOP* a, struct LOOP* b) {
    int da = depth_of(a), db = depth_of(b);
    for (; da > db; --da) a = loop_callbacks.parent(a);
    for (; db > da; --db) b = loop_callbacks.parent(b);
    for (; a != b; b = loop_callbacks.parent(b)) a = loop_callbacks.parent(a);
    return a;
}

} // namespace

bool pointers_are_antialiased(const NODE* p, const NODE* q, struct LOOP* loop_p, struct LOOP* loop_q) {
    if (!loop_p || !loop_q || !loop_callbacks.parent || !loop_callbacks.givens) return false;
    p = bare_pointer(p);
    q = bare_pointer(q);
    for (struct LOOP* loop = innermost_common_loop(loop_p, loop_q); loop; loop = loop_callbacks.parent(loop)) {
        for (const NODE* fact : loop_callbacks.givens(loop)) {
            if (!is_ANTIALIASED_ICALL(fact)) continue;
            const NODE *x = arg_list_lookup(fact->left, 0), *y = arg_list_lookup(fact->left, 1);
            if (!x || !y) continue;
            x = bare_pointer(x);
            y = bare_pointer(y);
            if (trees_are_congruent(x, p, false) && trees_are_congruent(y, q, false)) return true;
            if (trees_are_congruent(x, q, false) && trees_are_congruent(y, p, false)) return true;
        }
    }
    return false;
}

void add_antialiasing_loop_assertion(const NODE* p, const NODE* q, struct LOOP* loop_p, struct LOOP* loop_q) {
    if (!loop_p || !loop_q || !loop_callbacks.parent || !loop_callbacks.add_given) return;
    if (pointers_are_antialiased(p, q, loop_p, loop_q)) return;
    struct LOOP* loop = innermost_common_loop(loop_p, loop_q);
    if (!loop) return;
    loop_callbacks.add_given(loop, make_ANTIALIASED_ICALL(copy_tree(bare_pointer(p)), copy_tree(bare_pointer(q))));
}

bool build_the_umults_alias_free_by_predication_lists(const NODE* a, const NODE* b, struct LOOP* loop) {
    if (!loop_callbacks.predicate_disjointness) return false;
    const bool added = loop_callbacks.predicate_disjointness(a, b, loop);
    if (print_debug) {
        debug_printf(added ? "Adding an alias assertion that %s and" : "Failing to add alias assertion that %s and",
                     tree_to_infix(a).c_str());
        debug_printf("  %s don't share memory\n", tree_to_infix(b).c_str());
    }
    return added;
}

// ---- Shapes

bool may_be_an_internal_lvalue(const NODE* t) {
    for (t = below_transparent(t); t->op == STDOT;) t = below_transparent(t->left);
    if (const SYMTAB* sym = object_name_if_known(t))
        if (is_internal_symbol(sym)) return true;
    return get_vector_or_complex_symbol(t) != nullptr;
}

bool is_an_array_reference(const NODE* lvalue) {
    for (lvalue = below_transparent(lvalue); lvalue->op == STDOT;) lvalue = below_transparent(lvalue->left);
    if (lvalue->op != UMULT) return false;
    const SYMTAB* object = address_form(lvalue).object;
    return object && object->type->is_array();
}
