// Fast constant and copy propagation: no data flow, one walk to count and one to rewrite.
//
// A local with one assignment in the whole function, to a value that is the same wherever it is evaluated, is replaced
// by that value. All reads are replaced or none, so the assignment is removed with the last of them. A value that
// itself names a variable that is about to be replaced waits for the next pass.
//
// Needs: alias marks. Leaves: a simplified graph with block numbers where a branch was decided, otherwise what rests on
// the graph.
// Sound because a read ahead of the only assignment would see an undefined value. What must hold:
//   - nothing but its NAME reaches the variable, no exception's clean-up code names it, it is not volatile;
//   - the value reads no variable that changes once it was read. Of the NAMEs only those qualify that are assigned
//     once, at the function's entry. An immutable variable of an inner block does not: it has another value in each
//     iteration of a loop, which a copy of it may outlive;
//   - a string literal is one object, so that a pointer to one is moved, not copied.
#include "OPT5/scalar/fcp.h"

#include "OPT5/alias/address_form.h"
#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/symbol_table.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <unordered_set>
#include <vector>

// ---- Globals that never change

namespace {

bool is_plain_scalar(const TYPE* t) {
    return (t->is_int() || t->is_enum() || t->is_float() || t->is_pointer()) && !t->is_volatile() && !t->is_vector();
}

bool keeps_its_initial_value(const SYMTAB* sym) {
    if (!is_plain_scalar(sym->type) || (sym->sclass != SC_STATIC && sym->sclass != SC_EXTDEF)) return false;
    if (!initial_value_may_be_taken(sym)) return false;
    if (symbol_is_immutable(sym)) return true;
    constexpr unsigned USES = CQ_REFERENCED | CQ_WRITTEN | CQ_ALIASED;
    return file_symbols_are_known && (sym->cqual & USES) == CQ_REFERENCED;
}

NODE* initial_value_of_name(const NODE* name) {
    const SYMTAB* sym = name->u.sym;
    if (sym->level != 0 || name->type->is_volatile() || !keeps_its_initial_value(sym)) return nullptr;
    return sym->init_value ? copy_tree(sym->init_value) : lookup_autoinit(name);
}

// A constant place in an object whose content there is fixed: an element of a table.
NODE* initial_content(const NODE* access) {
    const SYMTAB* sym = object_name_if_known(access);
    if (!sym || sym->level != 0 || (sym->sclass != SC_STATIC && sym->sclass != SC_EXTDEF)) return nullptr;
    if (!sym->autoinit || !sym->type->is_const() || lvalue_is_volatile(access)) return nullptr;
    if (!is_plain_scalar(access->type)) return nullptr;
    const ADDRESS_FORM place = address_form(access);
    if (place.object != sym || !place.is_constant() || place.constant < 0) return nullptr;
    if (place.width != INT65(static_cast<int64_t>(access->type->size))) return nullptr; // a bit-field
    const int64_t at = place.constant, width = static_cast<int64_t>(access->type->size);
    if (at + width > static_cast<int64_t>(sym->size)) return nullptr;
    if (!symbol_is_immutable(sym) && !bits_of_var_are_immutable(sym->type, at, width)) return nullptr;
    return lookup_autoinit(sym, static_cast<uint64_t>(at), access->type);
}

NODE* initial_value(const NODE* tree) {
    const bool is_name = tree->op == NAME;
    if (is_name ? !tree->u.sym : tree->op != UMULT && tree->op != STDOT) return nullptr;
    NODE* value = is_name ? initial_value_of_name(tree) : initial_content(tree);
    if (!value) return nullptr;
    if (expr_is_propagable(value, 2)) return coerce_to_type(tree->type->stqs(), value);
    erase_tree(value);
    return nullptr;
}

void subst_globals_in_address(NODE* place, bool* changed);

NODE* subst_globals(NODE* tree, bool* changed) {
    if (!tree) return tree;
    if (NODE* value = initial_value(tree)) {
        *changed = true;
        erase_tree(tree);
        return value;
    }
    if (tree->left) {
        const bool left_is_place =
            writes_left_operand(tree->op) || tree->op == UAND || tree->op == ARGREF || tree->op == STDOT;
        if (left_is_place)
            subst_globals_in_address(tree->left, changed);
        else
            put_operand(tree->left, subst_globals(tree->left, changed));
    }
    put_operand(tree->right, subst_globals(tree->right, changed));
    return tree;
}

// Of a place only what its address is computed from is read.
void subst_globals_in_address(NODE* place, bool* changed) {
    place = object_of_place(place);
    if (place->op == NAME) return;
    place->left = subst_globals(place->left, changed);
    place->right = subst_globals(place->right, changed);
}

} // namespace

NODE* propagate_global_constants(NODE* tree) {
    bool changed = false;
    return subst_globals(tree, &changed);
}

// ---- Values

namespace {

bool is_object_address(const NODE* t) {
    if (t->op != UAND) return false;
    return without_members(static_cast<const NODE*>(t->left))->op == NAME;
}

} // namespace

bool expr_is_propagable(const NODE* t, int uses) {
    switch (t->op) {
    case ICON:
    case FCON: return true;
    case SCON: return uses <= 1;
    case UAND: return is_object_address(t);
    case PLUS: return t->right->op == ICON && is_object_address(t->left);
    case IDENTITY: return expr_is_propagable(t->left, uses);
    case SCONV: return t->left->op != NAME && expr_is_propagable(t->left, uses);
    case PCONV:
    case ISP2CHAR: // an absolute address is dearer than a register; null is not
        if (t->left->op == ICON) return t->left->u.lval.is_zero();
        return expr_is_propagable(t->left, uses);
    default: return false;
    }
}

namespace {

register_option pass_disable_fcprevsymtab("disable:fcprevsymtab");

struct COUNTS {
    int uses = 0;
    int definitions = 0;
    NODE* definition = nullptr; // the last ASG to the NAME that was counted
    bool from_prolog = false;
    bool at_entry = false; // that ASG is a statement that runs once
    bool is_pinned = false;
};

class SWEEP {
public:
    bool run(); // one pass; true if it changed a statement
    bool decided_a_branch = false;

private:
    void enter_symbols();
    void count();
    void count_tree(NODE* t);
    void judge();
    bool has_one_value(SYMTAB* sym, const COUNTS& c) const;
    bool is_lasting_name(const NODE* t) const;
    bool is_propagable(SYMTAB* sym, const COUNTS& c) const;
    void keep_parameter(SYMTAB* sym, const COUNTS& c);
    void rewrite();
    bool rewrite_statement(LIST* s);
    NODE* subst(NODE* t);
    NODE* value_for(NODE* name);

    SYMBOL_TABLE<COUNTS> counts;
    std::vector<SYMTAB*> symbols; // in the order of the lists
    bool in_entry = false;        // the block being counted is entered once
    bool in_prolog = false;
    bool tree_changed = false;
    bool changed = false;
};

// ---- Counting

void SWEEP::enter_symbols() {
    FUNINFO* f = currfuninfo;
    for (SYMTAB* s = f->scalar_syms; s; s = s->next) {
        OPT_ASSERT(s->level > 0);
        symbols.push_back(s);
    }
    for (SYMTAB* s = f->memory_syms; s; s = s->next) symbols.push_back(s);
    for (SYMTAB* s : symbols) counts[s];
    for (const EHT_ITEM& item : f->eht)
        for_each_node(item.cleanup, [this](const NODE* t) {
            if (t->op == NAME) counts[t->u.sym].is_pinned = true;
        });
    for (SYMTAB* s : symbols) // the extent of an array is read where its block is entered
        for_each_node(s->size_tree, [this](const NODE* t) {
            if (t->op == NAME) counts[t->u.sym].is_pinned = true;
        });
}

void SWEEP::count_tree(NODE* t) {
    for (; t; t = t->left) {
        if (t->op == NAME) {
            ++counts[t->u.sym].uses;
            return;
        }
        count_tree(t->right);
        bool is_definition = false;
        for_each_write_of_node(t, [&](const WRITE& w) {
            const NODE* name = w.place ? name_of_place(w.place) : nullptr;
            if (!name) return;
            is_definition = t->op == ASG && t->left == name;
            COUNTS& c = counts[name->u.sym];
            ++c.definitions;
            c.definition = is_definition ? t : nullptr;
            c.from_prolog = in_prolog;
            c.at_entry = in_entry;
        });
        if (is_definition) return; // which is no use
    }
}

void SWEEP::count() {
    const BBLK* entry = currfuninfo->bb_list;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        in_entry = bb == entry && !bb->predecessors;
        for (LIST* s = bb->statements; s; s = s->rest) {
            in_prolog = tree_is_arg_prolog(s->first);
            count_tree(s->first);
        }
    }
}

// ---- Judging

bool SWEEP::has_one_value(SYMTAB* sym, const COUNTS& c) const {
    return c.definitions == 1 && c.definition && !c.is_pinned && sym->is_automatic() && is_plain_scalar(sym->type) &&
           !sym->is_aliased() && sym != currfuninfo->ret_by_cctor_sym && sym != currfuninfo->csu_return_sym;
}

// A variable that is given its value once, before anything can copy it, and keeps it to the end of the function.
bool SWEEP::is_lasting_name(const NODE* t) const {
    if (t->op != NAME || t->type->is_volatile()) return false;
    const COUNTS* c = counts.find(t->u.sym);
    return c && has_one_value(t->u.sym, *c) && (c->from_prolog || c->at_entry);
}

bool SWEEP::is_propagable(SYMTAB* sym, const COUNTS& c) const {
    if (!has_one_value(sym, c) || c.from_prolog) return false;
    const NODE* value = c.definition->right;
    if (value->op == ASG) return false; // takes its turn once that is a statement
    if (expr_is_propagable(value, c.uses)) return true;
    // What `restrict` says holds for this variable alone.
    if (sym->type->qual_kind(false) & QUAL_RESTRICT) return false;
    while ((value->op == PCONV || value->op == ISP2CHAR) && value->left->type->is_pointer()) value = value->left;
    return is_lasting_name(value);
}

// A parameter that only the prolog sets stays what it is.
void SWEEP::keep_parameter(SYMTAB* sym, const COUNTS& c) {
    if (!c.from_prolog || !has_one_value(sym, c) || !map_sym_to_parm(sym) || symbol_is_immutable(sym)) return;
    sym->type = tp->mk_qual(sym->type, QUAL_CONST);
    if (print_debug) debug_printf("\n\tArgument variable is not re-assigned: %s\n", sym->name);
}

bool reads_name_of(const NODE* t, const std::unordered_set<const SYMTAB*>& set) {
    if (t->op == UAND) return false;
    if (t->op == NAME) return set.count(t->u.sym) != 0;
    return (t->left && reads_name_of(t->left, set)) || (t->right && reads_name_of(t->right, set));
}

void SWEEP::judge() {
    std::unordered_set<const SYMTAB*> candidates;
    for (SYMTAB* s : symbols) {
        const COUNTS& c = counts[s];
        if (print_debug && !c.definitions && !c.uses)
            debug_printf("\tNo references in the function for '%s'\n", s->name);
        else if (print_debug && !c.definitions && s->is_automatic() && !is_internal_symbol(s))
            debug_printf("\n\tVariable is used but never assigned: %s\n", s->name);
        keep_parameter(s, c);
        if (is_propagable(s, c)) candidates.insert(s);
    }
    for (SYMTAB* s : symbols) {
        if (!candidates.count(s)) continue;
        const NODE* value = counts[s].definition->right;
        if (reads_name_of(value, candidates) || !rewrite_is_allowed(counts[s].definition)) continue;
        if (s->type->is_pointer() && !currfuninfo->spmap->is_bound(s)) currfuninfo->spmap->set_pointee(s, value);
        currfuninfo->snmap->set_value(s, copy_tree(value));
        if (print_debug)
            debug_printf("\n\tGlobally constant assignment: %s = %s\n", s->name, tree_to_infix(value).c_str());
    }
}

// ---- Rewriting

NODE* SWEEP::value_for(NODE* name) {
    NODE* value = currfuninfo->snmap->value(name->u.sym);
    if (!value) return nullptr;
    value = coerce_to_type(name->type->stqs(), value);
    if (!value->ls) value->ls = name->ls;
    return value;
}

// What a pointer that became an address points to is the object itself.
NODE* access_by_name(NODE* t) {
    if (trees_are_normalized || do_dd_for_be || t->right || t->left->op != UAND) return t;
    NODE* object = t->left->left;
    const bool is_same = (object->op == NAME || object->op == STDOT) && equiv_mtypes(object->type, t->type) &&
                         object->type->is_scalar() && lvalue_is_volatile(object) == lvalue_is_volatile(t);
    if (!is_same) return t;
    erase_node(t->left);
    erase_node(t);
    return object;
}

NODE* SWEEP::subst(NODE* t) {
    if (!t) return t;
    if (t->op == NAME) {
        NODE* value = value_for(t);
        if (!value) return t;
        tree_changed = true;
        erase_tree(t);
        return value;
    }
    if (t->op == UAND && t->left->op == NAME) return t;
    if (writes_left_operand(t->op) && t->left && t->left->op == NAME) {
        t->right = subst(t->right);
        if (t->op != ASG || !currfuninfo->snmap->value(t->left->u.sym, true)) return t;
        // All reads are replaced: of the assignment its value remains.
        tree_changed = true;
        NODE* value = coerce_to_type(t->left->type->stqs(), t->right);
        erase_tree(t->left);
        erase_node(t);
        return value;
    }
    const bool was_access = t->op == UMULT && t->left && t->left->op != UAND;
    put_operand(t->left, subst(t->left));
    put_operand(t->right, subst(t->right));
    return was_access ? access_by_name(t) : t;
}

bool is_decided(const NODE* t) { return (t->op == IF || t->op == SWITCH) && t->left && t->left->op == ICON; }

// True if the statement is to go.
bool SWEEP::rewrite_statement(LIST* s) {
    if (tree_is_arg_prolog(s->first)) return false;
    tree_changed = false;
    const bool was_decided = is_decided(s->first);
    if (!currfuninfo->snmap->empty()) s->first = subst(s->first);
    if (opt_level() >= 2) s->first = subst_globals(s->first, &tree_changed);
    if (!tree_changed) return false;
    changed = true;
    if (!tree_is_ASM_comment(s->first)) s->first = peel_for_effect(simp_tree(s->first, nullptr));
    if (!s->first) return true;
    if (!was_decided && is_decided(s->first)) decided_a_branch = true;
    promote_toplevel_COMMAOPs_in_list(s, s->rest);
    return false;
}

void SWEEP::rewrite() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link;) {
            LIST* s = *link;
            if (!rewrite_statement(s)) {
                link = &s->rest;
                continue;
            }
            drop_statement(link);
        }
}

bool SWEEP::run() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'fast_CP' -----------------\n");
    FUNINFO* f = currfuninfo;
    f->snmap->clear();
    enter_symbols();
    count();
    judge();
    if (!pass_disable_fcprevsymtab) f->scalar_syms = revsymtab(f->scalar_syms);
    if (!f->snmap->empty() || opt_level() >= 2) rewrite();
    f->snmap->clear();
    return changed;
}

} // namespace

void fast_CP(int iterations, int combine) {
    if (opt_level() == 0) return;
    if (combine) combine_asgs_to_memory();
    for (int left = iterations; left > 0; --left) {
        sym_split(currfuninfo);
        need(fact::alias_marks);
        SWEEP sweep;
        if (!sweep.run()) return;
        changed(fact::graph);
        if (!sweep.decided_a_branch) continue;
        rebuildcfg();
        simpcfg(0, 0);
        if (left <= 2) return;
    }
}
