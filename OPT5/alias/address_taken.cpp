// Which objects something other than their own name may reach.
//
// A mark that is missing makes every later answer wrong, so whatever is not understood marks. What keeps an object
// unmarked: all its accesses are by its NAME, or, for an array, through an address from which
// `object_name_if_known` finds the array again.
#include "OPT5/alias/alias.h"

#include "OPT5/alias/effects.h"
#include "OPT5/alias/state.h"
#include "OPT5/target/bif.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symbol_maps.h"

#include <algorithm>
#include <unordered_set>
#include <vector>

bool file_symbols_are_known = false;

bool file_symbol_may_be_aliased(const SYMTAB* sym) {
    return !file_symbols_are_known || alias_vars_option || (sym->cqual & CQ_ALIASED);
}

namespace {

bool is_plain_array(const TYPE* type) { return type->is_array() && !type->is_vector(); }

// What the function in work adds to the marks of the program. Those stand in the symbols; a function names few of all,
// so that only its own marks are taken back.
std::vector<SYMTAB*> marked_globals;

void mark(SYMTAB* sym) {
    if (sym->is_function() || sym->is_aliased()) return;
    if (sym->level == 0) marked_globals.push_back(sym);
    sym->set_is_aliased(true);
}

void unmark_globals() {
    for (SYMTAB* s : marked_globals) s->set_is_aliased(false);
    marked_globals.clear();
}

// Whether an indirection is the whole object at its address: in normal form that is how memory is named.
bool is_object_itself(const NODE* t) {
    const NODE* address = t->left;
    if (t->right || address->op != UAND || address->left->op != NAME || !address->left->u.sym) return false;
    const TYPE* object = address->left->u.sym->type;
    return !is_plain_array(object) && compatible_types(object, t->type, true);
}

void mark_addressed(const NODE* t, bool is_access_address, int& writes);

// Of the multiply-accumulate hardware: the accumulators that it is handed are registers, whose address nobody has.
void mark_addressed_by_operands(const NODE* t, int& writes) {
    SYMTAB* sym = nullptr;
    if (t->op == COMMA) {
        mark_addressed_by_operands(t->left, writes);
        mark_addressed_by_operands(t->right, writes);
    } else if (!tree_is_IN_OUT_argument(t, &sym))
        mark_addressed(t, false, writes);
}

// `is_access_address`: `t` is the pointer of an access, from which the object can be told. Adds the nodes that write to
// their left operand to `writes`.
void mark_addressed(const NODE* t, bool is_access_address, int& writes) {
    while (t) {
        if (t->op == ICON) return;
        writes += writes_left_operand(t->op);
        const NODE* next = t->left;
        bool keeps = false;
        switch (t->op) {
        case NAME:
            if (t->u.sym && is_plain_array(t->type)) mark(t->u.sym);
            return;
        case ARASG: // assigns arrays as values
            for (const NODE* side : {t->left, t->right})
                if (side->op != NAME) mark_addressed(side, false, writes);
            return;
        case MCALL:
            if (is_multiply_accumulate_MCALL(t)) mark_addressed_by_operands(t->left, writes);
            else mark_addressed(next, false, writes);
            return;
        case UMULT:
            if (is_object_itself(t)) return;
            mark_addressed(t->right, false, writes);
            is_access_address = t->left->type->is_pointer();
            t = next;
            continue;
        case STREF:
            is_access_address = t->left->type->is_pointer();
            t = next;
            continue;
        case STDOT:
            next = without_members(next);
            if (next->op == NAME) return;
            break;
        case UAND:
        case ARGREF: {
            const NODE* object = without_members(static_cast<const NODE*>(t->left));
            if (object->op == NAME) {
                if (t->op == ARGREF || !is_access_address || !is_plain_array(t->left->type)) mark(object->u.sym);
                return;
            }
            // The address of what a pointer points to is that pointer.
            if (object->op == UMULT) {
                mark_addressed(object->right, false, writes);
                is_access_address &= t->op == UAND && object->left->type->is_pointer();
                t = object->left;
                continue;
            }
            if (object->op == STREF) {
                is_access_address &= t->op == UAND;
                t = object->left;
                continue;
            }
            next = object;
            break;
        }
        case PLUS:
        case MINUS:
            keeps = is_access_address && t->type->is_pointer();
            mark_addressed(t->right, keeps && t->op == PLUS && !t->left->type->is_pointer(), writes);
            break;
        case PCONV:
        case ISP2CHAR:
        case IDENTITY:
        case OUIALIGN:
        case NONALIGN: keeps = is_access_address && t->type->is_pointer(); break;
        default:
            if (t->right) mark_addressed(t->right, false, writes);
        }
        is_access_address = keeps && next && next->type->is_pointer();
        t = next;
    }
}

template <class F>
void for_each_symbol(const F& visit) {
    const FUNINFO* f = currfuninfo;
    for (SYMTAB* list : {f->new_syms, f->pending_syms, f->memory_syms, f->scalar_syms})
        for (SYMTAB* s = list; s; s = s->next) visit(s);
}

bool is_vector_or_complex(const TYPE* type) { return type->is_vector() || type->is_vpred() || type->is_complex(); }

} // namespace

bool marks_are_known() { return is_known(fact::alias_marks); }

bool may_be_reached_by_pointers(const SYMTAB* sym) {
    if (sym->is_function()) return false;
    return !marks_are_known() || sym->is_aliased() || (sym->level == 0 && file_symbol_may_be_aliased(sym));
}

namespace {

// The written part of a vector or complex variable, or null.
SYMTAB* written_in_part(const NODE* t) {
    const NODE* to = t->left;
    if (!writes_left_operand(t->op) || !to || to->op == NAME) return nullptr;
    return get_vector_or_complex_symbol(to);
}

// One walk for all: a tree is looked at while it is in the cache. `writes` may be null.
void set_marks(POINTER_WRITES* writes) {
    FUNINFO* f = currfuninfo;
    for_each_symbol([](SYMTAB* s) { s->set_is_aliased(false); });
    for (SYMTAB* s : f->dropped_syms) s->set_is_aliased(false);
    unmark_globals();
    auto look_at_write = [writes](const NODE* t) {
        if (SYMTAB* sym = written_in_part(t)) mark(sym);
        if (writes) writes->collect(t);
    };
    for_each_tree(f, [&](const NODE* tree) {
        int count = 0;
        mark_addressed(tree, false, count);
        if (count > writes_left_operand(tree->op))
            for_each_subtree(tree, look_at_write);
        else if (count)
            look_at_write(tree);
    });
}

bool groups_can_be_built() { return currfuninfo->ls_root && currfuninfo->bottom_ptr; }

void find_pointers(FACTS wanted, const POINTER_WRITES& writes) {
    if (wanted & fact::pointer_groups && groups_can_be_built()) build_groups(writes);
    if (wanted & fact::pointees) find_pointees(writes);
}

void find_marks(FACTS wanted) {
    POINTER_WRITES writes;
    set_marks(wanted == fact::alias_marks ? nullptr : &writes);
    currfuninfo->facts |= fact::alias_marks;
    find_pointers(wanted, writes); // by the marks
}

// A mark too many is no fault; one too few is. Of the globals those are looked at that the function marks: there may be many.
bool marks_still_hold() {
    std::vector<SYMTAB*> unmarked;
    for_each_symbol([&](SYMTAB* s) {
        if (!s->is_aliased()) unmarked.push_back(s);
    });
    const std::unordered_set<const SYMTAB*> before(marked_globals.begin(), marked_globals.end()); // membership only
    set_marks(nullptr);
    return std::none_of(unmarked.begin(), unmarked.end(), [](const SYMTAB* s) { return s->is_aliased(); }) &&
           std::all_of(marked_globals.begin(), marked_globals.end(), [&](const SYMTAB* s) { return before.count(s) != 0; });
}

const FACT_FINDER marks("aliased objects", fact::alias_marks, fact::none, find_marks, nullptr, marks_still_hold,
                        fact::pointees | fact::pointer_groups);
const FACT_FINDER pointers(
    "what pointers point into", fact::pointees | fact::pointer_groups, fact::alias_marks,
    [](FACTS wanted) { find_pointers(wanted, pointer_writes(currfuninfo)); }, [] { currfuninfo->spmap->clear(); },
    nullptr, fact::pointees | fact::pointer_groups);

} // namespace

bool groups_are_known() { return is_known(fact::pointer_groups) && groups_can_be_built(); }

void init_aliasing_info(bool groups) {
    changed(fact::every & ~fact::alias);
    need(groups ? fact::alias : fact::alias_marks | fact::pointees);
}

void reset_alias_info() {
    if (currfuninfo) changed(fact::every & ~fact::alias);
    compute_alias_sets({});
}

SYMTAB* get_vector_or_complex_symbol(const NODE* t) {
    SYMTAB* sym = object_name_if_known(object_of_place(t));
    return sym && is_vector_or_complex(sym->type) ? sym : nullptr;
}

void mark_aliased_vector_and_complex_symbols(bool clear_bitnum, bool aliased) {
    for_each_tree(currfuninfo, [=](const NODE* tree) {
        for_each_subtree(tree, [=](const NODE* t) {
            SYMTAB* sym = written_in_part(t);
            if (!sym) return;
            if (aliased)
                mark(sym);
            else
                sym->set_is_aliased(false);
            if (clear_bitnum) sym->set_bitnum(NOT_A_CANDIDATE);
        });
    });
}
