// What evaluating a tree does to memory, and which facts about memory it ends.
#include "OPT5/alias/effects.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/address_form.h"
#include "OPT5/alias/alias.h"
#include "OPT5/alias/state.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"

#include <algorithm>
#include <cstring>

namespace {

// A pointer handed out may be used for any address in the object that it points into, and, where that is not known, in
// any object that pointers reach.
bool pointer_may_reach(const NODE* pointer, const NODE* lvalue) {
    if (!pointer->type->is_pointer() && pointer->op != ARGREF && pointer->op != UAND) return false;
    const SYMTAB* object = lvalue ? address_form(lvalue).known_object() : nullptr;
    if (!object) return true;
    const NODE* basis = pointer_basis(pointer);
    const NODE* place = pointer->op == ARGREF ? pointer->left : basis && basis->op == UAND ? basis->left : nullptr;
    if (place)
        if (const SYMTAB* target = object_name_if_known(place)) return object_symbols_may_alias(object, target);
    return may_be_reached_by_pointers(object);
}

bool any_argument_reaches(const NODE* call, const NODE* lvalue, SYMTAB* callee, bool skip_unassigned) {
    const NODE* list = get_arguments_to_call(call);
    const int count = arg_list_count(list);
    for (int i = 0; i < count; ++i) {
        const NODE* arg = arg_list_lookup(const_cast<NODE*>(list), i);
        if (skip_unassigned && byref_arg_is_not_assigned_thru(i, callee)) continue;
        if (pointer_may_reach(arg, lvalue)) return true;
    }
    return false;
}

struct CALL_BITS {
    uint64_t no_global, no_indirect;
};
constexpr CALL_BITS WRITES = {FUN_no_global_asg, FUN_no_ind_asg};
constexpr CALL_BITS READS = {FUN_no_global_use, FUN_no_ind_use};

bool keeps_pointers(const FUNINFO* f) { return !std::strcmp(skip_name_prefix(f->name.c_str()), "strtok"); }

bool callee_may_access(const NODE* call, const NODE* lvalue, const CALL_BITS& bits, bool writes) {
    FUNINFO* f = find_FUNINFO_for_call(call);
    const uint64_t flags = f ? get_flags(f) : 0;
    if (flags & FUN_is_pure_fun) return false;
    const SYMTAB* object = lvalue ? address_form(lvalue).known_object() : nullptr;
    if (!object) return (flags & bits.no_global) == 0 || (flags & bits.no_indirect) == 0;
    if (writes && symbol_is_immutable(object)) return false;
    const bool is_reached = may_be_reached_by_pointers(object);
    if (object->level > 0 && !is_reached) return false;
    if (object->level == 0 && !(flags & bits.no_global)) return true;
    if (!is_reached || flags & bits.no_indirect) return false;
    // The library keeps no pointers into objects of the program from one call to the next.
    if (flags & FUN_is_SYSTEM && flags & bits.no_global && !keeps_pointers(f))
        return any_argument_reaches(call, lvalue, f->symbol, writes) && (!writes || call_assigns_thru_byref_args(call));
    return true;
}

// A machine operation may do anything but touch a variable that has no address and is not handed to it.
bool machine_call_may_access(const NODE* call, const NODE* lvalue) {
    const SYMTAB* object = lvalue ? address_form(lvalue).known_object() : nullptr;
    if (!object || object->level == 0 || may_be_reached_by_pointers(object)) return true;
    return any_argument_reaches(call, lvalue, nullptr, false);
}

bool copy_may_access(const NODE* copy, const NODE* lvalue, bool writes) {
    const NODE* place = arg_list_lookup(copy->left, writes ? 0 : 1);
    return !place || pointer_may_reach(place, lvalue);
}

bool call_may_access(const NODE* call, const NODE* lvalue, const CALL_BITS& bits, bool writes) {
    switch (call->op) {
    case CALL:
    case UCALL: return callee_may_access(call, lvalue, bits, writes);
    case ICALL: return !writes && any_argument_reaches(call, lvalue, nullptr, false);
    case UICALL: return false; // a value of its operands
    case MEMCPY: return copy_may_access(call, lvalue, writes);
    case MCALL:
        // What it writes are its ARGREFs, which the tree shows.
        if (is_multiply_accumulate_MCALL(call)) return lvalue && any_argument_reaches(call, lvalue, nullptr, false);
        return machine_call_may_access(call, lvalue);
    default: return machine_call_may_access(call, lvalue);
    }
}

bool asm_may_access(const NODE* t, const NODE* lvalue) {
    if (tree_is_ASM_comment(t)) return false;
    const SYMTAB* object = lvalue ? address_form(lvalue).known_object() : nullptr;
    return !object || object->level == 0 || may_be_reached_by_pointers(object);
}

// Operators that the table calls unknown and that change nothing.
bool is_inert(int op) {
    switch (op) {
    case NOP:
    case PCOMMA:
    case COMMAOP:
    case DDNODE:
    case NASSERT:
    case ASSERT:
    case VREG:
    case PPRAGMA:
    case BGNBLOCK:
    case ENDBLOCK: return true;
    default: return false;
    }
}

bool is_operation_on_memory(int op) { return op_is_call(op) || op_is_intrinsic(op) || op == MEMCPY; }

bool place_may_meet(const NODE* place, const COMPARED_LVALUE& lvalue) {
    bool meets = false;
    effects::visit_places(nullptr, place, [&](const WRITE& w) {
        meets = meets || lvalues_may_be_aliased(COMPARED_LVALUE(access_of_place(w.place)), lvalue);
    });
    return meets;
}

// One node of a tree, its operands aside.
bool node_may_modify(const NODE* t, const COMPARED_LVALUE& lvalue) {
    if (writes_left_operand(t->op)) return !t->left || place_may_meet(t->left, lvalue);
    if (is_operation_on_memory(t->op)) return call_may_modify(t, lvalue.tree());
    if (t->op == ASM) return asm_may_access(t, lvalue.tree());
    // A volatile access is an event, that keeps its order to other events.
    if (op_is_lvalue(t->op)) return lvalue.is_volatile() && lvalue_is_volatile(t);
    return op_has_effect(t->op) && !op_transfers_control(t->op) && !is_inert(t->op);
}

// The outermost lvalues that `t` reads and those that their addresses are computed from.
template <class P>
bool any_lvalue_read(const NODE* t, const P& predicate) {
    for (; t; t = t->left) {
        if (t->op == UAND || t->op == ARGREF) { // the address alone
            const NODE* object = without_members(static_cast<const NODE*>(t->left));
            if (object->op == NAME) return t->op == ARGREF && predicate(object);
            if (op_is_indirection(object->op)) {
                if (object->op == UMULT && any_lvalue_read(object->right, predicate)) return true;
                t = object;
                continue;
            }
        }
        if (op_is_lvalue(t->op) && predicate(t)) return true;
        t = without_members(t); // one access with its parts
        if (t->op == NAME) return false;
        if (any_lvalue_read(t->right, predicate)) return true;
    }
    return false;
}

} // namespace

// ---- Calls

bool call_may_modify(const NODE* call, const NODE* lvalue) { return call_may_access(call, lvalue, WRITES, true); }
bool call_may_read(const NODE* call, const NODE* lvalue) { return call_may_access(call, lvalue, READS, false); }

bool call_assigns_thru_byref_args(const NODE* call) {
    if (call->op == MEMCPY || call->op == MCALL) return true;
    if (call->op == ICALL) return false;
    FUNINFO* f = find_FUNINFO_for_call(call);
    return !f || !TEST_FLAG(f, FUN_no_byref_asg);
}

bool byref_arg_is_not_assigned_thru(int index, SYMTAB* callee) {
    FUNINFO* f = callee ? find_FUNINFO(callee) : nullptr;
    if (!f) return false;
    if (TEST_FLAG(f, FUN_no_byref_asg)) return true;
    // `const` can be cast away, except by the library.
    if (!TEST_FLAG(f, FUN_is_SYSTEM)) return false;
    const TYPE* type = type_of_nth_parameter(index, callee);
    return type && type->is_pointer() && type->type_pointed_to()->is_const();
}

// ---- Trees

bool may_write_indirectly(const NODE* t) {
    if (is_operation_on_memory(t->op)) return call_may_modify(t, nullptr);
    if (t->op == ASM) return !tree_is_ASM_comment(t);
    return op_has_effect(t->op) && !op_transfers_control(t->op) && !writes_left_operand(t->op) && !is_inert(t->op);
}

const NODE* place_of_pointer(const NODE* pointer) {
    const NODE* basis = pointer ? pointer_basis(pointer) : nullptr;
    return basis && basis->op == UAND ? basis->left : nullptr;
}

SYMTAB* assigned_variable(const NODE* t) {
    return opcode_is_ASG(t->op) && t->left->op == NAME ? t->left->u.sym : nullptr;
}

bool tree_acts(const NODE* tree) {
    return any_subtree(tree, [](const NODE* t) { return op_has_effect(t->op); });
}

bool tree_changes_nothing(const NODE* tree) {
    if (!tree_has_side_effects(tree)) return true;
    return !any_subtree(tree, [](const NODE* t) {
        if (op_is_lvalue(t->op)) return lvalue_is_volatile(t);
        return op_has_effect(t->op) && !(op_is_call(t->op) && !call_may_modify(t, nullptr));
    });
}

std::vector<const NODE*> lvalues_read_in(const NODE* tree) {
    std::vector<const NODE*> lvalues;
    any_lvalue_read(tree, [&lvalues](const NODE* t) {
        lvalues.push_back(t);
        return false;
    });
    return lvalues;
}

const void* computing_callee(const NODE* call, bool* reads_memory) {
    *reads_memory = false;
    if (!call->type->is_scalar()) return nullptr;
    if (call->op == ICALL) {
        const bool is_pure = ok_to_CSE_ICALL(call) && !any_argument_reaches(call, nullptr, nullptr, false);
        return is_pure ? find_BIF_descriptor(call->u.name) : nullptr;
    }
    if (call->op != CALL) return nullptr;
    FUNINFO* f = find_FUNINFO_for_call(call);
    if (!f || !TEST_FLAG(f, FUN_is_pure_fun | FUN_only_reads) || TEST_FLAG(f, FUN_never_returns)) return nullptr;
    *reads_memory = !TEST_FLAG(f, FUN_is_pure_fun);
    return get_callee_for_call(call);
}

const void* pure_callee(const NODE* call) {
    bool reads_memory = false;
    const void* callee = computing_callee(call, &reads_memory);
    return reads_memory ? nullptr : callee;
}

// ---- Control

bool call_surely_returns(const NODE* call) {
    FUNINFO* f = find_FUNINFO_for_call(call);
    return f && TEST_FLAG(f, FUN_surely_returns) && !TEST_FLAG(f, FUN_never_returns);
}

bool call_only_computes(const NODE* call) {
    if (!op_is_call(call->op) || !call_surely_returns(call)) return false;
    return TEST_FLAG(find_FUNINFO_for_call(call), FUN_is_pure_fun | FUN_only_reads);
}

static bool node_may_not_pass_control(const NODE* t) {
    if (op_is_call(t->op)) return !call_surely_returns(t);
    return t->op == UMCALL || t->op == ASM || (t->op == MCALL && !is_multiply_accumulate_MCALL(t));
}

bool node_may_stop_or_wait(const NODE* t) {
    if (op_is_lvalue(t->op)) return lvalue_is_volatile(t);
    return !op_is_call(t->op) && node_may_not_pass_control(t);
}

bool may_not_pass_control(const NODE* tree) { return any_subtree(tree, node_may_not_pass_control); }

bool may_leave_in_the_middle(const NODE* tree) {
    return any_subtree(tree, [](const NODE* t) { return node_may_not_pass_control(t) || node_may_stop_or_wait(t); });
}

bool may_trap(const NODE* tree) {
    return any_subtree(tree, [](const NODE* t) {
        const int op = opcode_is_ASG(t->op) ? op_of_opASG[t->op] : t->op;
        if (op == DIV || op == MOD)
            return t->right->op != ICON || t->right->u.lval.is_zero() || t->right->u.lval == INT65(-1);
        return op_is_call(op) || op_is_intrinsic(op) || (op_is_indirection(op) && !is_access_by_name(t));
    });
}

// ---- Modifications

static bool tree_may_modify(const NODE* a, const COMPARED_LVALUE& lvalue) {
    return any_subtree(a, [&](const NODE* t) { return node_may_modify(t, lvalue); });
}

bool tree_modifies_lvalue(const NODE* a, const NODE* lvalue) { return tree_may_modify(a, COMPARED_LVALUE(lvalue)); }

bool tree_touches_lvalue(const NODE* a, const NODE* lvalue) {
    const COMPARED_LVALUE place(lvalue);
    if (tree_may_modify(a, place)) return true;
    if (any_lvalue_read(a, [&](const NODE* t) { return lvalues_may_be_aliased(COMPARED_LVALUE(t), place); })) return true;
    return any_subtree(a,
                       [lvalue](const NODE* t) { return is_operation_on_memory(t->op) && call_may_read(t, lvalue); });
}

// What a call reads is not in the tree: whether `a` may change it.
static bool may_change_what_call_reads(const NODE* a, const NODE* call) {
    bool reads_memory = false;
    if (!computing_callee(call, &reads_memory)) return tree_has_side_effects(a);
    bool changes = false;
    if (reads_memory)
        for_each_write(a, [&](const WRITE& w) {
            changes = changes || !w.place || call_may_read(call, access_of_place(w.place));
        });
    return changes;
}

static bool may_change_what_calls_read(const NODE* a, const NODE* t) {
    return any_subtree(t, [a](const NODE* call) {
        if (call->op == ICALL) return any_argument_reaches(call, nullptr, nullptr, false) && tree_has_side_effects(a);
        if (!op_is_call(call->op) && call->op != MCALL && call->op != UMCALL && call->op != MEMCPY) return false;
        FUNINFO* f = find_FUNINFO_for_call(call);
        return !(f && TEST_FLAG(f, FUN_is_pure_fun)) && may_change_what_call_reads(a, call);
    });
}

bool tree_modifies_lvalue_in_tree(const NODE* a, const NODE* t) {
    if (tree_contains_op(t, ASM)) return true;
    if (any_lvalue_read(t, [a](const NODE* lvalue) { return tree_modifies_lvalue(a, lvalue); })) return true;
    return may_change_what_calls_read(a, t);
}

bool bb_modifies_lvalue_in_tree(const BBLK* bb, const NODE* t) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (tree_modifies_lvalue_in_tree(s->first, t)) return true;
    return false;
}

// ---- Accesses, listed

// Whether it may modify or read any lvalue, by more than being a part of an access.
static bool acts_on_memory(const NODE* t) {
    if (writes_left_operand(t->op) || is_operation_on_memory(t->op) || t->op == ASM || t->op == ARGREF) return true;
    if (op_is_lvalue(t->op)) return lvalue_is_volatile(t);
    return op_has_effect(t->op) && !op_transfers_control(t->op) && !is_inert(t->op);
}

size_t ACCESS_LISTS::add(const NODE* tree) {
    RANGE r{tree, acts.size(), 0, places.size(), 0, 0};
    for_each_subtree(tree, [this](const NODE* t) {
        if (!acts_on_memory(t)) return;
        for_each_write_of_node(t, [this](const WRITE& w) {
            if (w.place) places.emplace_back(access_of_place(w.place));
        });
        acts.push_back({t, places.size()});
    });
    r.acts_end = acts.size();
    r.reads = places.size();
    any_lvalue_read(tree, [this](const NODE* t) {
        places.emplace_back(t);
        return false;
    });
    r.reads_end = places.size();
    trees.push_back(r);
    return trees.size() - 1;
}

// What the node writes, whatever the types, and what else it does.
bool ACCESS_LISTS::act_may_touch(const ACT& act, size_t from, const COMPARED_LVALUE& lvalue) const {
    const NODE* t = act.node;
    const bool writes_left = writes_left_operand(t->op) && t->left;
    if (!writes_left && node_may_modify(t, lvalue)) return true;
    if (is_operation_on_memory(t->op) && call_may_read(t, lvalue.tree())) return true;
    for (size_t i = from; i < act.places_end; ++i)
        if (lvalues_may_be_aliased(places[i], lvalue, nullptr, false)) return true;
    return false;
}

bool ACCESS_LISTS::act_may_modify(const ACT& act, size_t from, const COMPARED_LVALUE& lvalue) const {
    if (!writes_left_operand(act.node->op) || !act.node->left) return node_may_modify(act.node, lvalue);
    for (size_t i = from; i < act.places_end; ++i)
        if (lvalues_may_be_aliased(places[i], lvalue)) return true;
    return false;
}

bool ACCESS_LISTS::touches(size_t number, const COMPARED_LVALUE& lvalue) const {
    const RANGE& r = trees[number];
    for (size_t i = r.acts, place = r.places; i < r.acts_end; place = acts[i++].places_end)
        if (act_may_touch(acts[i], place, lvalue)) return true;
    for (size_t i = r.reads; i < r.reads_end; ++i)
        if (lvalues_may_be_aliased(places[i], lvalue)) return true;
    const NODE* t = lvalue.tree();
    if (name_accessed(t)) return false; // of a fixed address
    if (r.acts != r.acts_end && any_lvalue_read(t, [&](const NODE* part) {
            if (part == t) return false;
            const COMPARED_LVALUE of_part(part);
            for (size_t i = r.acts, place = r.places; i < r.acts_end; place = acts[i++].places_end)
                if (act_may_modify(acts[i], place, of_part)) return true;
            return false;
        }))
        return true;
    return tree_contains_op(t, ASM) || may_change_what_calls_read(r.tree, t);
}

// ---- What a tree reads

// Whether or not the marks are known: this is asked between the passes that set them.
static bool is_exposed(const SYMTAB* sym) {
    return sym->level == 0 || sym->is_aliased() || currfuninfo->address_taken_local;
}

READ_SET::READ_SET(const NODE* tree) {
    for_each_subtree(tree, [this](const NODE* t) {
        switch (t->op) {
        case NAME:
            if (!t->u.sym || t->u.sym->is_function()) break;
            symbols.push_back(t->u.sym);
            exposed |= is_exposed(t->u.sym);
            break;
        case UMULT:
        case STREF: indirect = true; break;
        case ASM:
        case UAND: complete = false; break;
        default: complete &= !is_operation_on_memory(t->op); break;
        }
    });
}

const SYMTAB* READ_SET::only_variable() const {
    if (indirect || symbols.empty()) return nullptr;
    const SYMTAB* first = symbols.front();
    return std::all_of(symbols.begin(), symbols.end(), [first](const SYMTAB* s) { return s == first; }) ? first
                                                                                                        : nullptr;
}

bool READ_SET::may_be_changed(const WRITE& w) const {
    if (!w.place) return w.by->op == ASM || indirect || exposed;
    const NODE* name = name_of_place(w.place);
    if (!name) return indirect || exposed;
    if (std::find(symbols.begin(), symbols.end(), name->u.sym) != symbols.end()) return true;
    return indirect && is_exposed(name->u.sym);
}

bool READ_SET::may_be_changed_by(const NODE* tree) const {
    bool changes = false;
    for_each_write(tree, [this, &changes](const WRITE& w) { changes = changes || may_be_changed(w); });
    return changes;
}

// ---- Sets

namespace {

std::vector<const NODE*> numbered;

template <class P>
void kill_where(BITVEC* set, const P& predicate) {
    for (uint32_t i = set->next_set(0); i < set->bits; i = set->next_set(i + 1))
        if (i >= numbered.size() || predicate(numbered[i])) set->clear(i);
}

} // namespace

void compute_alias_sets(const std::vector<const NODE*>& lvalues) { numbered = lvalues; }
void clean_up_alias_analysis_bitvecs_etc() { std::vector<const NODE*>().swap(numbered); }

void kill_aliases_of_lvalue(const NODE* lvalue, BITVEC* set) {
    kill_where(set, [lvalue](const NODE* fact) {
        return any_lvalue_read(fact, [lvalue](const NODE* t) { return lvalues_may_be_aliased(lvalue, t); });
    });
}

void kill_aliases_indirect(const LS* scope, const NODE* tree, BITVEC* set, unsigned) {
    if (tree) return kill_aliases_of_lvalue(tree, set);
    kill_where(set, [scope](const NODE* fact) {
        return any_lvalue_read(fact, [scope](const NODE* t) {
            const SYMTAB* object = address_form(t).known_object();
            if (!object) return true;
            return may_be_reached_by_pointers(object) && LS::object_may_be_live_in_scope(object, scope);
        });
    });
}

void kill_aliases_on_call(const NODE* call, BITVEC* set) {
    kill_where(set, [call](const NODE* fact) {
        return any_lvalue_read(fact, [call](const NODE* t) { return call_may_modify(call, t); });
    });
}

void kill_assertions(BITVEC* set) {
    kill_where(set, [](const NODE* fact) {
        return fact->op == ASSERT || fact->op == NASSERT || is_def_assert_ICALL_tree(fact) ||
               is_ANTIALIASED_ICALL(fact);
    });
}
