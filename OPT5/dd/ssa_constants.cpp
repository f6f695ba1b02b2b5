// Constants and copies are put in place of what holds them, in SSA form.
//
// `x = 3; y = x + 1;` becomes `y = 4`: blocks are taken in an order in which definitions precede their uses, so that
// one pass follows a chain of constants to its end, over phis with equal arguments too. From the second pass on a copy
// `x = a` of a register is seen through where that leaves no use of x, and a computation in a loop whose only use is
// behind the loop is done there. Behind the last pass a value of fewer numbers than its variable can hold, `x = a & 7`,
// gets a variable of its own if no other value meets it: what is known of that variable holds wherever it is read.
//
// Needs: SSA form, numbered blocks. Leaves: the form, in which the definitions remain for who removes dead ones.
// Sound because a use names the one definition whose value it reads. A constant is that value everywhere. A copy reads
// `a`, which is it only where `a` still has the version of the copy: `x = a; a = 7; y = x`. The form has phis only
// where they are read, so that the versions of the copied variables are followed anew: over the dominator tree, with a
// change at every definition and wherever definitions meet.
#include "OPT5/dd/ssa.h"

#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frontiers.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <vector>

namespace {

constexpr int MOST_NODES = 500; // of a definition
constexpr int MOST_PASSES = 3;
constexpr int MOST_BOUNDED_VALUES = 64; // of a function; who asks for the bounds of a variable looks at each

// Of a definition, by version.
struct VALUE {
    struct SOURCE {
        uint32_t variable;
        uint64_t state; // of the variable where the value is computed
    };
    NODE* tree = nullptr;          // what replaces its uses; owned
    std::vector<SOURCE> sources;   // of a copy
    const BBLK* used_in = nullptr; // the block of the last use
    uint32_t uses = 0;             // SSA_USEs that may be replaced
    uint32_t other = 0;            // phis, may-definitions, places: those stay
    bool is_copy = false;          // the value has sources, and has not been found to change
};

bool has_definition(const NODE* t) {
    return any_subtree(t, [](const NODE* n) { return op_is_SSA_definition(n->op); });
}

// A fact about the variable itself, whatever its value.
bool is_mark(const NODE* statement) {
    return statement->op == NASSERT && statement->left && statement->left->op == ICALL;
}

bool is_unsuited(const SSAVAR* v) {
    const SYMTAB* sym = v->base();
    if (!sym || v->has(SSAVAR_munged) || sym_appears_in_EHT(sym)) return true;
    return is_optimizer_temp(sym->name, 'C', 'K') || is_optimizer_temp(sym->name, 'Q', 'Q');
}

class PROPAGATION {
public:
    PROPAGATION() : values(ssa_definitions().size()) {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) by_number.push_back(bb);
        std::sort(by_number.begin(), by_number.end(), [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; });
    }
    PROPAGATION(const PROPAGATION&) = delete;
    PROPAGATION& operator=(const PROPAGATION&) = delete;
    ~PROPAGATION() {
        for (VALUE& v : values)
            if (v.tree) erase_tree(v.tree);
    }

    bool run(int number) {
        if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'do_1_CP_pass(%d)' ----------------\n", number);
        has_changed = uses_are_counted = false;
        if (number > 1) find_copies();
        for (BBLK* bb : by_number)
            for (LIST* s = bb->statements; s; s = s->rest) {
                rewrite(s, bb);
                find_constant(s->first);
            }
        for (VALUE& v : values)
            if (v.is_copy) forget(v);
        uses_are_counted &= !has_changed;
        return has_changed;
    }

    // `x = V`, where V has narrower bounds than x and reaches no phi: `y = V; x = y`, and y is read in place of x.
    bool name_bounded_values() {
        if (!uses_are_counted) count_uses();
        int left = MOST_BOUNDED_VALUES;
        for (const SYM_RANGE* r = currfuninfo->widened; r; r = r->next) --left;
        bool any = false;
        for (BBLK* bb : by_number)
            for (LIST** link = &bb->statements; *link && left > 0; link = &(*link)->rest) {
                SYMTAB* temp = bounded_value((*link)->first, bb->loop);
                if (!temp) continue;
                NODE* asg = (*link)->first->left;
                LIST** next = insert_before(link, mk_ASG(mk_NAME(temp), asg->right), (*link)->psn);
                note_changed_statement(*link);
                asg->right = mk_NAME(temp);
                value_of((*next)->first).tree = mk_NAME(temp);
                link = next;
                any = true;
                --left;
            }
        if (!any) return false;
        for (BBLK* bb : by_number)
            for (LIST* s = bb->statements; s; s = s->rest) rewrite(s, bb);
        sym_split(currfuninfo);
        return true;
    }

private:
    VALUE& value_of(const NODE* definition) { return values[ssa_version(definition)]; }

    static void forget(VALUE& v) {
        if (v.tree) erase_tree(v.tree);
        v.tree = nullptr;
        v.is_copy = false;
        v.sources.clear();
    }

    // ---- Candidates

    // The plain assignment of a definition that may be seen through.
    static const NODE* assignment_of(const NODE* def) {
        if (def->op != SSA_DEF || is_unsuited(ssa_variable(def))) return nullptr;
        const NODE* asg = def->left;
        if (asg->op != ASG || tree_is_arg_prolog(asg) || lvalue_is_volatile(ssa_variable(def)->tree)) return nullptr;
        return asg;
    }

    void find_constant(NODE* statement) {
        if (statement->op == SSA_PHI) {
            enter_constant(statement, constant_of_phi(statement));
            return;
        }
        NODE* t = statement;
        while (t->op == SSA_CHI || t->op == SSA_MU) t = t->left;
        const NODE* asg = assignment_of(t);
        if (!asg || !is_constant(asg->right)) return;
        NODE* value = truncate_RHS_for_assignment(asg->left, copy_tree(asg->right));
        if (!compatible_types(value->type, ssa_variable(t)->tree->type, true))
            value = fold_constants(coerce_to_type(ssa_variable(t)->tree->type->stqs(), value));
        enter_constant(t, value);
    }

    static bool is_constant(const NODE* t) {
        return expr_is_propagable(t, 2) && !t->type->is_volatile(); // a string is one object
    }

    NODE* constant_of_phi(const NODE* phi) {
        const NODE* value = nullptr;
        if (is_unsuited(ssa_variable(phi))) return nullptr;
        for (const SSA_ARG& arg : ssa_args(phi)) {
            const NODE* next = arg.definition ? value_of(arg.definition).tree : nullptr;
            if (!next || value_of(arg.definition).is_copy) return nullptr;
            if (value && !trees_are_congruent(value, next, false)) return nullptr;
            value = next;
        }
        return value ? copy_tree(value) : nullptr;
    }

    void enter_constant(const NODE* def, NODE* tree) {
        if (!tree) return;
        VALUE& v = value_of(def);
        const bool is_number = tree->op == ICON;
        const bool is_absolute = is_number && ssa_variable(def)->tree->type->is_pointer() &&
                                 (tree->u.lval.is_negative() || tree->u.lval > INT65(0xFFFF));
        if (is_absolute || (v.tree && !v.is_copy)) {
            erase_tree(tree);
            return;
        }
        forget(v);
        v.tree = tree;
    }

    // ---- Copies

    static bool is_followed(const NODE* use) {
        if (use->op != SSA_USE || use->left->op != NAME) return false;
        const SSAVAR* v = ssa_variable(use);
        return v->has(SSAVAR_likely_register) && !v->is_memory() && !v->has(SSAVAR_munged | SSAVAR_unioned) &&
               !lvalue_is_volatile(v->tree) && only_its_name_reaches(v->sym);
    }

    static bool is_restricted(const TYPE* t) { return t->is_pointer() && (t->qual_kind(false) & QUAL_RESTRICT); }

    // A value of constants and of variables that are followed.
    bool find_sources(const NODE* t, VALUE& v) {
        if (t->op == SSA_USE) {
            // What `restrict` says holds for that variable alone.
            if (!is_followed(t) || is_restricted(t->left->u.sym->type)) return false;
            v.sources.push_back({ssa_variable(t)->uid, 0});
            return true;
        }
        if (t->op == ICON || t->op == FCON || (t->op == UAND && expr_is_constant(t))) return true;
        const bool computes = op_is_arithmetic(t->op) || boolean_result[t->op] || t->op == SCONV || t->op == PCONV;
        return computes && find_sources(t->left, v) && (!t->right || find_sources(t->right, v));
    }

    static bool is_copied_variable(const NODE* t) {
        while (t->op == SCONV || t->op == PCONV || t->op == ISP2CHAR) t = t->left;
        return t->op == SSA_USE;
    }

    static bool is_in_inner_loop(const BBLK* bb, const BBLK* other) {
        return bb->loop && other->loop && bb->loop != other->loop &&
               loop_is_subloop_of_loop(bb->loop, other->loop, false);
    }

    bool is_copy(const SSA_DEFINITION& d) {
        const NODE* asg = assignment_of(d.node);
        if (!asg || value_of(d.node).tree || asg->left->op != NAME) return false;
        const SSAVAR* x = ssa_variable(d.node);
        VALUE& v = value_of(d.node);
        if (!x->has(SSAVAR_likely_register) || is_restricted(x->tree->type) || v.uses == 0 || v.other != 0)
            return false;
        v.sources.clear();
        if (count_nodes_in_tree(d.node) > MOST_NODES || !find_sources(asg->right, v) || v.sources.empty()) return false;
        return is_copied_variable(asg->right) || (v.uses == 1 && is_in_inner_loop(d.block, v.used_in));
    }

    void find_copies() {
        count_uses();
        std::vector<const NODE*> found;
        for (const SSA_DEFINITION& d : ssa_definitions())
            if (d.node && (value_of(d.node).is_copy = is_copy(d))) found.push_back(d.node);
        if (found.empty()) return;
        follow_versions(found);
        for (const NODE* def : found)
            if (VALUE& v = value_of(def); v.is_copy)
                v.tree = coerce_to_type(ssa_variable(def)->tree->type->stqs(), copy_tree(def->left->right));
    }

    void count_uses() {
        uses_are_counted = true;
        for (VALUE& v : values) v.uses = v.other = 0;
        for (BBLK* bb : by_number)
            for (LIST* s = bb->statements; s; s = s->rest) {
                if (s->first->op == SSA_PHI) {
                    for (const SSA_ARG& arg : ssa_args(s->first))
                        if (arg.definition) ++value_of(arg.definition).other;
                    continue;
                }
                count_uses(s->first, is_mark(s->first), bb);
            }
    }

    void count_uses(const NODE* t, bool stays, const BBLK* bb) {
        const bool is_in_mark = stays;
        for (; t; t = t->left) {
            const bool reads = t->op == SSA_USE || t->op == SSA_MU || t->op == SSA_CHI;
            if (reads && ssa_reach(t)) {
                VALUE& v = value_of(ssa_reach(t));
                ++(t->op == SSA_USE && !stays ? v.uses : v.other);
                v.used_in = bb;
            }
            count_uses(t->right, is_in_mark, bb);
            stays = is_in_mark || left_is_place(t) || (stays && is_around_use(t));
        }
    }

    // A copy is none if a variable that it reads may have another value at a use than it had there.
    void follow_versions(const std::vector<const NODE*>& copies) {
        is_source.assign(ssa_variables().size(), false);
        for (const NODE* def : copies)
            for (const VALUE::SOURCE& from : value_of(def).sources) is_source[from.variable] = true;
        find_joins();
        state.assign(ssa_variables().size(), 1);
        last_state = 1;
        currfuninfo->dominators->depth_first_doms([this](BBLK* bb) { enter(bb); }, [this](BBLK*) { leave(); });
    }

    void find_joins() {
        std::vector<std::vector<int>> defined_in(is_source.size());
        for (const SSA_DEFINITION& d : ssa_definitions())
            if (d.node && is_source[ssa_variable(d.node)->uid])
                defined_in[ssa_variable(d.node)->uid].push_back(d.block->dfn);
        joined_at.assign(by_number.size() + 1, {});
        const FRONTIERS frontiers;
        for (uint32_t uid = 0; uid < is_source.size(); ++uid) {
            std::vector<int>& in = defined_in[uid];
            if (in.empty()) continue;
            std::sort(in.begin(), in.end());
            in.erase(std::unique(in.begin(), in.end()), in.end());
            for (int dfn : frontiers.iterated(in)) joined_at[static_cast<size_t>(dfn)].push_back(uid);
        }
    }

    void enter(BBLK* bb) {
        marks.push_back(saved.size());
        for (uint32_t uid : joined_at[static_cast<size_t>(bb->dfn)]) change(uid);
        for (LIST* s = bb->statements; s; s = s->rest) {
            if (s->first->op == SSA_PHI) continue;
            for_each_SSA_operator(s->first, [this](NODE* t) {
                if (t->op == SSA_USE && ssa_reach(t)) check(value_of(ssa_reach(t)));
            });
            for_each_SSA_operator(s->first, [this](NODE* t) {
                if (!op_is_SSA_definition(t->op)) return;
                for (VALUE::SOURCE& from : value_of(t).sources) from.state = state[from.variable];
                if (is_source[ssa_variable(t)->uid]) change(ssa_variable(t)->uid);
            });
        }
    }

    void check(VALUE& copy) {
        for (const VALUE::SOURCE& from : copy.sources) copy.is_copy &= from.state == state[from.variable];
    }

    void leave() {
        while (saved.size() > marks.back()) {
            state[saved.back().first] = saved.back().second;
            saved.pop_back();
        }
        marks.pop_back();
    }

    void change(uint32_t uid) {
        saved.push_back({uid, state[uid]});
        state[uid] = ++last_state;
    }

    // The variable that is to hold the value that the statement gives to its own, with an entry of its bounds; null where
    // there is nothing to say.
    SYMTAB* bounded_value(NODE* def, struct LOOP* loop) {
        const NODE* asg = assignment_of(def);
        if (!asg || asg->left->op != NAME || tree_has_side_effects(asg->right)) return nullptr;
        const SSAVAR* x = ssa_variable(def);
        const VALUE& v = value_of(def);
        TYPE* type = x->tree->type->stqs();
        if (v.tree || v.uses == 0 || v.other != 0 || !x->has(SSAVAR_likely_register) || x->is_memory()) return nullptr;
        if (!type->is_int() || type->is_bool() || type->size > 64 || is_copied_variable(asg->right)) return nullptr;
        NODE* value = truncate_RHS_for_assignment(asg->left, copy_tree_removing_SSA_operators(asg->right));
        INT65 min, max;
        SYMTAB* temp = nullptr;
        if (compatible_types(value->type, type, true) && calculate_bounds(value, loop, &min, &max) &&
            (min > int_type_min(type) || max < int_type_max(type))) {
            temp = sym_temp('y', -1, type, asg->left->ls);
            for (struct LOOP* l = loop; l; l = l->parent) make_sym_altered_in_loop(temp, l);
            make_widened_symbol_entry(temp, type, max, min, find_known_zeros(value, type), find_known_ones(value, type));
        }
        erase_tree(value);
        return temp;
    }

    // ---- Replacement

    void rewrite(LIST* s, BBLK* bb) {
        NODE* t = s->first;
        if (t->op == SSA_PHI || is_mark(t)) return;
        changed_here = false;
        line = s->psn ? s->psn->line : 0;
        put_operand(s->first, replace(t, false));
        if (!changed_here) return;
        has_changed = true;
        note_changed_statement(s);
        simplify(s->first, bb->loop);
    }

    // Whether the left operand is a place, not a value.
    static bool left_is_place(const NODE* t) {
        if (op_is_SSA(t->op)) return false;
        return writes_left_operand(t->op) || t->op == UAND || t->op == ARGREF || t->op == STDOT;
    }

    static bool is_around_use(const NODE* t) { return t->op == SSA_MU || t->op == SSA_CHI; }

    NODE* replace(NODE* t, bool is_place) {
        if (!t || (!t->left && !t->right)) return t;
        if (t->op == SSA_USE && !is_place)
            if (NODE* value = rewrite_is_allowed(t) ? value_for(t) : nullptr) {
                if (print_debug) {
                    debug_printf("\n\t(%ld) SSA CP is replacing %s", line, tree_to_infix(t).c_str());
                    debug_printf(" with %s\n", tree_to_infix(value).c_str());
                }
                changed_here = true;
                NODE* effects = peel_for_effect(t);
                return effects ? mk_COMMAOP(effects, value) : value;
            }
        if (reads_place(t)) t = with_known_operand(t);
        put_operand(t->left, replace(t->left, left_is_place(t) || (is_place && is_around_use(t))));
        if (t->op != IF && t->op != SWITCH) put_operand(t->right, replace(t->right, false)); // labels
        // In normal form the constant terms of a pointer are in the subscript.
        if (trees_are_normalized && t->op == UMULT && (t->left->op == PLUS || t->left->op == PCONV))
            t->left = partition_pointer_under_UMULT(t->left, t);
        return t;
    }

    // A copy of the value that the use reads, in its type, or null.
    NODE* value_for(const NODE* use) {
        if (!ssa_reach(use)) return nullptr;
        const VALUE& v = value_of(ssa_reach(use));
        if (!v.tree || !use->type->is_scalar() || !ok_to_propagate_for_pointer(v.tree, use)) return nullptr;
        NODE* value = coerce_to_type(use->type->stqs(), copy_tree(v.tree));
        return v.is_copy ? value : fold_constants(value);
    }

    // An integer does not become what is pointed through.
    static bool ok_to_propagate_for_pointer(const NODE* value, const NODE* use) {
        return use->type->is_pointer() == value->type->is_pointer() || value->op == ICON;
    }

    static bool reads_place(const NODE* t) {
        return op_of_opASG[t->op] != ILLOP || t->op == PLUSPLUS || t->op == MINMIN;
    }

    // `x op= e` becomes `x = x op e` if the x that is read is known; the place stays what it is.
    NODE* with_known_operand(NODE* t) {
        NODE* use = t->left;
        while (use->op == SSA_MU) use = use->left; // of what overlaps the place
        if (use->op != SSA_USE || !ssa_reach(use) || !value_of(ssa_reach(use)).tree) return t;
        for (NODE* mu = t->left; mu != use; mu = t->left) {
            t->left = mu->left;
            erase_node(mu);
        }
        const int op = t->op;
        if (op == PLUSPLUS || op == MINMIN) t->op = op == PLUSPLUS ? PLUSASG : MINUSASG;
        t = opASG_to_ASG(t);
        if (t->op != ASG) {
            t->op = static_cast<uint8_t>(op);
            return t;
        }
        t->left = use->left;
        erase_node(use);
        changed_here = true;
        return t;
    }

    // What the next definition is known by; the rest is simplified when the form is left. Operators that define stay
    // where they are.
    static void simplify(NODE* t, struct LOOP* loop) {
        while (op_is_SSA(t->op)) t = t->left;
        if (t->op != ASG || has_definition(t->right) || tree_has_side_effects(t->right)) return;
        t->right = simp_tree(t->right, loop);
    }

    std::vector<VALUE> values;
    std::vector<BBLK*> by_number;
    // Of variables that are copied: a number for the value that each has at the place of the walk.
    std::vector<uint64_t> state;
    std::vector<bool> is_source;
    std::vector<std::vector<uint32_t>> joined_at; // by block: where definitions meet
    std::vector<std::pair<uint32_t, uint64_t>> saved;
    std::vector<size_t> marks;
    uint64_t last_state = 1;
    bool has_changed = false, changed_here = false, uses_are_counted = false;
    long line = 0;
};

void dump_widened_symbol_entries() {
    for (const SYM_RANGE* r = currfuninfo->widened; r; r = r->next) {
        debug_printf("Widened symbol entry for %s:\n", r->sym->name);
        debug_printf("    type:     %s\n", r->type->printstr().c_str());
        debug_printf("    maxValue: %s\n", int2text(r->max, nullptr, 10, 0));
        debug_printf("    minValue: %s\n", int2text(r->min, nullptr, 10, 0));
        debug_printf("    known0s:  %s\n", int2text(r->known0, nullptr, 10, 0));
        debug_printf("    known1s:  %s\n", int2text(r->known1, nullptr, 10, 0));
    }
}

} // namespace

void propagate_SSA_constants(int passes) {
    if (passes < 1 || !function_is_in_SSA_form) return;
    if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'propagate_SSA_constants' ---------\n");
    need(fact::dominators);
    PROPAGATION propagation;
    bool any = false;
    for (int i = 1; i <= std::min(passes, MOST_PASSES); ++i) {
        const bool has_changed = propagation.run(i);
        any |= has_changed;
        if (!has_changed && i > 1) break;
    }
    if (passes >= MOST_PASSES && propagation.name_bounded_values()) any = true;
    if (print_debug) dump_widened_symbol_entries();
    if (any) changed(fact::graph | fact::alias_marks);
}
