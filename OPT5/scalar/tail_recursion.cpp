// A call that a function makes of itself as its last act becomes new values for its parameters and a jump to the start.
//
// A call is the last act too where it is an arm of the conditional value that is returned, and, of a function that
// returns truth values alone, where the rest of `a && b` or `a || b` is the call: such a return is taken apart first.
//
// Needs: alias marks and pointees, where there is such a call. Leaves: nothing where it found one.
// Sound because the frame of the caller is no longer in use while the callee runs: no address of anything in it may be
// known to anyone, as in `return f(&x)`, and nothing may depend on which frame it is: no handler, no saved environment,
// no part of the argument list beyond the named parameters. `restrict` speaks of one activation; a pointer that bears
// it keeps its value.
#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <cstring>
#include <vector>

namespace {

constexpr int ASM_COMMENT = 47;

struct PARAMETER {
    SYMTAB* parm;
    SYMTAB* local; // what the prolog copies it into; null for one that isn't used
};

struct NEW_VALUE {
    SYMTAB* local;
    NODE* value; // owned
};

template <class F>
void for_each_local(const F& visit) {
    const FUNINFO* f = currfuninfo;
    for (SYMTAB* list : {f->new_syms, f->pending_syms, f->memory_syms, f->scalar_syms})
        for (SYMTAB* s = list; s; s = s->next) visit(s);
}

std::vector<PARAMETER> parameters() {
    std::vector<PARAMETER> list;
    for_each_local([&](SYMTAB* s) {
        if (s->level == 1 && s->written_as_parameter) list.push_back({s, map_parm_to_sym(s)});
    });
    std::sort(list.begin(), list.end(), [](const PARAMETER& a, const PARAMETER& b) {
        return a.parm->depnum() < b.parm->depnum();
    });
    return list;
}

bool may_be_assigned(const PARAMETER& p) {
    if (!p.parm->type->is_scalar() || p.parm->type->is_volatile()) return false;
    return !p.local || (p.local->type->is_scalar() && !p.local->type->is_volatile() && !p.local->type->is_const());
}

bool reads_parameter_record(const NODE* t) {
    return tree_contains_matching_node(t, [](const NODE* n) { return n->op == NAME && n->u.sym->level == 1; });
}

bool calls_itself(const NODE* t) { return op_is_call(t->op) && get_callee_for_call(t) == currfunc; }

// Whether a value is 0 or 1, if what the current function returns is.
bool is_truth_value(const NODE* t) {
    switch (t->op) {
    case ICON: return t->u.lval.is_zero() || t->u.lval == INT65(1);
    case ANDAND:
    case OROR:
    case EXCLAIM: return true;
    case QUEST: return is_truth_value(t->right->left) && is_truth_value(t->right->right);
    default: return op_is_int_compare(t->op) || op_is_float_compare(t->op) || calls_itself(t);
    }
}

class TAIL_RECURSION {
public:
    void run() {
        FUNINFO* f = currfuninfo;
        if (opt_level() < 2 || !f->bb_list || f->has_eh() || !find_calls() || !frame_is_private()) return;
        for (BBLK* bb : conditional) take_apart(bb);
        bool changed = !conditional.empty();
        for (BBLK* bb : calls) changed |= convert(bb);
        if (!changed) return;
        sym_split(f);
        rebuildcfg();
        ::changed(fact::none);
    }

private:
    static bool leads_only_to_exit(const BBLK* bb) {
        const BBLK* to = only_block(bb->successors);
        for (int steps = 0; to && to != currfuninfo->exit_bb; ++steps) {
            const LIST* only = to->statements;
            if (steps == 8 || !only || only->rest || only->first->op != BRANCH) return false;
            to = to->successors ? to->successors->first : nullptr;
        }
        return to != nullptr;
    }

    // The cell of the block's tail call, or null.
    static LIST* tail_call(const BBLK* bb) {
        LIST* last = bb->last_statement();
        if (!last) return nullptr;
        if (last->first->op == RETURN) return last->first->right && calls_itself(last->first->right) ? last : nullptr;
        if (last->first->op != BRANCH || !leads_only_to_exit(bb)) return nullptr;
        LIST* before = bb->statements;
        if (before == last) return nullptr;
        while (before->rest != last) before = before->rest;
        return calls_itself(before->first) ? before : nullptr;
    }

    static NODE* returned_value(const BBLK* bb) {
        NODE* t = bb->branch();
        return t && t->op == RETURN ? t->right : nullptr;
    }

    bool find_calls() {
        returns_truth = currfunc->type->getr(TYPE::tpk_func)->return_type()->is_int();
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            if (const NODE* value = returned_value(bb)) returns_truth &= is_truth_value(value);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            const NODE* value = returned_value(bb);
            if (tail_call(bb))
                calls.push_back(bb);
            else if (value && ends_in_call(value))
                conditional.push_back(bb);
        }
        return !calls.empty() || !conditional.empty();
    }

    // ---- Conditional values

    // A test of a truth value against zero is the value.
    NODE* as_truth_value(NODE* t) const {
        const bool is_test = t->op == NEQ && t->right->op == ICON && t->right->u.lval.is_zero();
        if (is_test && calls_itself(t->left)) {
            NODE* call = t->left;
            erase_tree(t->right);
            erase_node(t);
            return call;
        }
        return is_truth_value(t) ? t : make_boolean(t, nullptr);
    }

    bool ends_in_call(const NODE* t) const {
        if (calls_itself(t)) return true;
        if (t->op == QUEST) return ends_in_call(t->right->left) || ends_in_call(t->right->right);
        if (!returns_truth) return false;
        const bool is_test = t->op == NEQ && t->right->op == ICON && t->right->u.lval.is_zero();
        return is_test ? calls_itself(t->left) : (t->op == ANDAND || t->op == OROR) && ends_in_call(t->right);
    }

    // A return of `c ? a : b`, `c && a` or `c || b` becomes a test of c and two returns; a call stands bare.
    void take_apart(BBLK* bb) {
        LIST* cell = bb->last_statement();
        NODE *ret = cell->first, *value = ret->right, *condition = value->left, *yes = value->right, *no = nullptr;
        TYPE* type = value->type;
        switch (value->op) {
        case QUEST:
            yes = value->right->left;
            no = value->right->right;
            erase_node(value->right);
            break;
        case ANDAND:
            yes = as_truth_value(yes);
            no = mk_ICON(INT65(0), type);
            break;
        case OROR:
            no = as_truth_value(yes);
            yes = mk_ICON(INT65(1), type);
            break;
        default:
            ret->right = as_truth_value(value);
            if (tail_call(bb)) calls.push_back(bb);
            return;
        }
        erase_node(value);
        ret->right = nullptr;
        BBLK *const on_no = block_of_return(bb, ret, no), *const on_yes = block_of_return(bb, ret, yes);
        while (bb->successors) disconnect(bb, bb->successors->first);
        cell->first = mk_IF(condition, mk_LABELREF_to_bb(on_yes), mk_LABELREF_to_bb(on_no), ret->ls);
        erase_tree(ret);
        for (BBLK* arm : {on_yes, on_no}) connect(bb, arm);
        for (BBLK* arm : {on_yes, on_no})
            if (tail_call(arm))
                calls.push_back(arm);
            else if (ends_in_call(returned_value(arm)))
                take_apart(arm);
    }

    static BBLK* block_of_return(BBLK* bb, const NODE* ret, NODE* value) {
        NODE* t = copy_tree(ret);
        t->right = value;
        BBLK* arm = insert_new_bb(-1, bb, mkelist(t, nullptr, bb->last_statement()->psn));
        for (EDGE* e = bb->successors; e; e = e->rest) connect(arm, e->first);
        return arm;
    }

    // ---- The frame

    bool frame_is_private() {
        const TYPE* type = currfunc->type->getr(TYPE::tpk_func);
        if (type->vararg() || type->return_type()->is_csu() || currfuninfo->csu_return_sym) return false;
        parms = parameters();
        if (!std::all_of(parms.begin(), parms.end(), may_be_assigned)) return false;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest) {
                if (bb == currfuninfo->bb_list && s == bb->statements && tree_is_arg_prolog(s->first)) continue;
                if (reads_parameter_record(s->first) || calls_setjmp(s->first)) return false;
            }
        need(fact::alias_marks | fact::pointees);
        bool is_private = true;
        for_each_local([&](const SYMTAB* s) { is_private &= !s->is_aliased(); });
        return is_private;
    }

    // The block behind the prolog, made when it is first asked for.
    BBLK* start() {
        if (start_bb) return start_bb;
        BBLK* entry = currfuninfo->bb_list;
        LIST* first = entry->statements;
        if (tree_is_arg_prolog(first->first)) return start_bb = split_block(entry, first, false);
        // Without parameters the start is all of the block; the empty statement that it is split behind is removed again.
        insert_before(&entry->statements, nullptr, first->psn);
        start_bb = split_block(entry, entry->statements, false);
        drop_statement(&entry->statements);
        return start_bb;
    }

    bool arguments_fit(const NODE* call) const {
        NODE* args = call->op == CALL ? call->right : nullptr;
        if (arg_list_count(args) != static_cast<int>(parms.size()) || !call->u.lval.is_zero()) return false;
        for (size_t i = 0; i < parms.size(); ++i) {
            const NODE* arg = arg_list_lookup(args, static_cast<int>(i));
            if (arg->op == STARG || arg->op == ARGREF || !arg->type->is_scalar() || arg->type->is_complex())
                return false;
            const SYMTAB* local = parms[i].local;
            const bool keeps_value = arg->op == NAME && arg->u.sym == local;
            if (local && (local->type->qual_kind(false) & QUAL_RESTRICT) && !keeps_value) return false;
        }
        return true;
    }

    // The value that the prolog would store.
    static NODE* as_passed(const PARAMETER& p, NODE* arg) {
        arg = coerce_to_type(p.parm->type->stqs(), arg);
        return p.local ? coerce_to_type(p.local->type->stqs(), arg) : arg;
    }

    bool convert(BBLK* bb) {
        LIST* cell = tail_call(bb);
        NODE* call = cell->first->op == RETURN ? cell->first->right : cell->first;
        if (!arguments_fit(call)) return false;
        BBLK* const to = start(); // may split the block of the call: if that is the entry
        if (bb == currfuninfo->bb_list) bb = to;
        report(cell);

        std::vector<NEW_VALUE> values;
        bool has_effects = false;
        for (size_t i = 0; i < parms.size(); ++i) {
            const NODE* arg = arg_list_lookup(call->right, static_cast<int>(i));
            values.push_back({parms[i].local, simp_tree(as_passed(parms[i], copy_tree(arg)), nullptr)});
            has_effects |= tree_has_side_effects(values.back().value);
        }
        LIST *first = nullptr, **end = &first;
        auto add = [&](NODE* t) { *end = mkelist(t, nullptr, cell->psn), end = &(*end)->rest; };
        if (source_interlist) add(mk_ASM(ASM_COMMENT, source_text(cell).c_str()));
        if (has_effects) evaluate_in_order(values, add);
        assign_together(values, add);
        add(mk_ASM(ASM_COMMENT, "***\t; tail recursive call occurs here"));
        add(mk_BRANCH(to));
        replace_tail(bb, cell, first);
        while (bb->successors) disconnect(bb, bb->successors->first);
        connect(bb, to);
        return true;
    }

    static std::string source_text(const LIST* cell) {
        return ";" + stmt2infix(cell->first) + (cell->first->op == RETURN ? "" : "  return;");
    }

    static void report(const LIST* cell) {
        if (!print_debug) return;
        debug_printf("\n  ===> Tail recursive self-call removed at line %ld: %s\n\n", cell->psn ? cell->psn->line : 0L,
                     stmt2infix(cell->first).c_str());
    }

    static void replace_tail(BBLK* bb, LIST* cell, LIST* tail) {
        LIST** link = &bb->statements;
        while (*link != cell) link = &(*link)->rest;
        erase_tree_list(cell);
        *link = tail;
        set_statements(bb, bb->statements);
    }

    // A value is computed into a temporary; of one that no parameter takes only the effects stay.
    template <class F>
    static void evaluate_in_order(std::vector<NEW_VALUE>& values, const F& add) {
        for (NEW_VALUE& v : values) {
            if (!v.local) {
                if (NODE* effect = peel_for_effect(v.value)) add(effect);
                v.value = nullptr;
                continue;
            }
            if (v.value->op == ICON) continue;
            SYMTAB* temp = sym_temp('T', -1, v.local->type->stqs(), nullptr);
            add(mk_ASG(mk_NAME(temp), v.value));
            v.value = mk_NAME(temp);
        }
    }

    // All parameters take their values at once: one is assigned when no value that is still to come reads it.
    template <class F>
    static void assign_together(std::vector<NEW_VALUE> values, const F& add) {
        auto is_done = [](const NEW_VALUE& v) {
            const bool done = !v.local || (v.value->op == NAME && v.value->u.sym == v.local);
            if (done && v.value) erase_tree(v.value);
            return done;
        };
        values.erase(std::remove_if(values.begin(), values.end(), is_done), values.end());
        while (!values.empty()) {
            auto is_free = [&](const NEW_VALUE& v) {
                return std::none_of(values.begin(), values.end(), [&](const NEW_VALUE& other) {
                    return other.local != v.local && sym_appears_in_tree(v.local, other.value);
                });
            };
            auto next = std::find_if(values.begin(), values.end(), is_free);
            if (next == values.end()) { // they read each other in a ring
                next = values.begin();
                SYMTAB* saved = sym_temp('T', -1, next->local->type->stqs(), nullptr);
                add(mk_ASG(mk_NAME(saved), mk_NAME(next->local)));
                for (NEW_VALUE& other : values)
                    if (other.local != next->local)
                        other.value = subst_sym_for_sym_in_tree(next->local, saved, other.value);
            }
            add(mk_ASG(mk_NAME(next->local), next->value));
            values.erase(next);
        }
    }

    std::vector<PARAMETER> parms;
    std::vector<BBLK*> calls;
    std::vector<BBLK*> conditional; // return what is a call of the function itself on some path
    bool returns_truth = false;
    BBLK* start_bb = nullptr;
};

} // namespace

void remove_tail_recursion() { TAIL_RECURSION().run(); }
