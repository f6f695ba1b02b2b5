// Loops of one block that multiply and accumulate neighbouring 16-bit elements use the dual hardware, which takes a
// word of two from each operand.
//
//     for (i = 0; i < n; i++) acc += x[i] * y[i];
//
// becomes, n being even and x and y lying on 32-bit boundaries at first,
//
//     t = 0; for (i = 0; i < n; i += 2) __dmac(*(long *)&x[i], *(long *)&y[i], acc, t, 0); acc += t;
//
// Needs: normal form, the hierarchy with its counts. Leaves: where anything was converted, a graph for which the
// hierarchy is built anew; promises and counts speak of the new iterations. Sound because every second test would have
// been true, and the sum is regrouped in arithmetic that wraps. Both addresses move by a whole word an iteration, so
// that the first one decides about all. On a big-endian memory the halves are exchanged.
#include "OPT5/dd/dd.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/dd/mac.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>
#include <vector>

namespace {

constexpr unsigned WORD = 32; // bits that both halves take

// Of the block's steps one is made ahead of the accumulation or behind it.
struct STEP : VARIABLE_STEP {
    bool is_ahead = false;
};

NODE* sum_of(const STEP& step, INT65 times) { return value_behind_step(step, step.c * times); }

class DUAL_LOOP {
public:
    explicit DUAL_LOOP(struct LOOP* of) : loop(of), bb(of->head) {}
    bool convert() {
        const bool is_converted = is_suitable() && (convert_pair() || convert_doubled());
        if (remarks_are_wanted && !is_converted) tell();
        return is_converted;
    }

private:
    bool is_suitable();
    bool is_aligned_at_entry(const NODE* umult) const;
    bool all_are_aligned(const NODE* t) const;
    bool convert_pair();
    bool convert_doubled();
    const NODE* only_mac(std::vector<STEP>& steps) const;
    LIST* two_iterations(const NODE* mac, const std::vector<STEP>& steps, SYMTAB* temp) const;
    void use(LIST* list);
    void add_behind(NODE* acc, SYMTAB* temp);
    void tell();
    std::string why_not(const NODE* mac);

    struct LOOP* const loop;
    BBLK* const bb;
    BBLK* exit = nullptr;
};

bool DUAL_LOOP::is_suitable() {
    if (loop->is_root() || loop->head != loop->tail || !loop->preheader || !loop->is_bottom_tested()) return false;
    const EDGE* e = bb->successors;
    if (!e || !e->rest || e->rest->rest || bb->loop != loop || edge_length(bb->predecessors) != 2) return false;
    exit = e->first == bb ? e->rest->first : e->first;
    return !ends_in_promise(bb);
}

bool DUAL_LOOP::is_aligned_at_entry(const NODE* umult) const {
    NODE* first = find_expr_init(umult, loop);
    if (!first) return false;
    bool is_aligned = first->op == UMULT && is_lvalue_sufficiently_aligned(first, WORD, loop->parent);
    if (!is_aligned && first->op == UMULT) {
        NODE* address = coerce_to_type(tp->long_t, copy_tree(first->left));
        const bool base = (max_ICON_factor(address, loop->parent) % INT65(2)).is_zero();
        is_aligned = base && (!first->right || (max_ICON_factor(first->right, loop->parent) % INT65(2)).is_zero());
        erase_tree(address);
    }
    erase_tree(first);
    return is_aligned;
}

bool DUAL_LOOP::all_are_aligned(const NODE* t) const {
    return !any_subtree(t, [this](const NODE* n) { return n->op == UMULT && !is_aligned_at_entry(n); });
}

void DUAL_LOOP::use(LIST* list) {
    LIST* old = bb->statements;
    set_statements(bb, list);
    erase_tree_list(old);
}

// The variables that move by whole words: what is aligned at first stays so.
std::vector<const SYMTAB*> words_in(const BBLK* bb) {
    std::vector<const SYMTAB*> words, others;
    auto holds = [](const std::vector<const SYMTAB*>& list, const SYMTAB* sym) {
        return std::find(list.begin(), list.end(), sym) != list.end();
    };
    for (const LIST* s = bb->statements; s; s = s->rest) {
        STEP step;
        const bool moves = read_variable_step(s->first, &step) && (step.c % INT65(2)).is_zero();
        for_each_written_name(s->first, [&](const NODE* name, const NODE*) {
            (moves && !holds(words, name->u.sym) ? words : others).push_back(name->u.sym);
        });
    }
    words.erase(std::remove_if(words.begin(), words.end(), [&](const SYMTAB* w) { return holds(others, w); }),
                words.end());
    return words;
}

// Whether all that the statements do with the accumulator is to add what does not depend on it.
bool is_only_added_to(const LIST* statements, const SYMTAB* acc) {
    for (const LIST* s = statements; s; s = s->rest) {
        const NODE* t = s->first;
        const bool adds = (t->op == PLUSASG || t->op == MINUSASG) && t->left->op == NAME && t->left->u.sym == acc;
        if (sym_appears_in_tree(acc, adds ? t->right : t)) return false;
    }
    return true;
}

// The second accumulator begins with zero, and comes to the first one behind the loop.
void DUAL_LOOP::add_behind(NODE* acc, SYMTAB* temp) {
    insert_at_end_of_body(loop->preheader, mk_ASG(mk_NAME(temp), mk_ICON(INT65(0), temp->type)));
    if (exit->predecessors->rest) exit = split_cfg_edge(bb, exit);
    insert_before(&exit->statements, maketree(PLUSASG, acc, mk_NAME(temp), temp->type), bb->statements->psn);
}

// Two accumulations of the program itself.
bool DUAL_LOOP::convert_pair() {
    const std::vector<const SYMTAB*> words = words_in(bb);
    auto moves_otherwise = [&](const NODE* n) { // an array stays where it is, whatever is stored in it
        return n->op == NAME && !n->type->is_array() && !sym_is_RC_in_loop(n->u.sym, loop) &&
               std::find(words.begin(), words.end(), n->u.sym) == words.end();
    };
    // The second one's accesses are those behind these.
    auto is_aligned = [&](const NODE* n) {
        return is_lvalue_sufficiently_aligned(n, WORD, loop) ||
               (!any_subtree(n, moves_otherwise) && is_aligned_at_entry(n));
    };
    auto is_misaligned = [&](const NODE* n) { return n->op == UMULT && !is_aligned(n); };
    LIST* copy = copy_dd_statements(bb->statements);
    for (LIST* s = copy; s->rest; s = s->rest) split_accumulations_in_stmt(s);
    SYMTAB *sum = nullptr, *temp = nullptr; // which takes every second product of the one sum
    bool any = false;
    for (LIST* s = copy; s->rest && s->rest->rest; s = s->rest) {
        if (!is_mac(s->first) || !is_mac(s->rest->first) || any_subtree(s->first, is_misaligned)) continue;
        NODE* second = s->rest->first->left;
        SYMTAB* acc = second->u.sym;
        const bool shares = s->first->left->u.sym == acc;
        if (shares) {
            if (sum ? sum != acc : !is_only_added_to(copy, acc)) continue;
            if (!temp) temp = sym_temp('T', -1, acc->type->stqs(), nullptr);
            second->u.sym = temp;
        }
        if (conversion_to_s32xs32_DMAC_succeeds(s, loop)) {
            if (shares) sum = acc;
            any = true;
        } else if (shares)
            second->u.sym = acc;
    }
    if (!any) {
        erase_tree_list(copy);
        return false;
    }
    use(copy);
    if (sum) add_behind(mk_NAME(sum), temp);
    return true;
}

// ---- Two iterations in one

// The one accumulation, where the rest of the block is its test and steps of variables, each by one.
const NODE* DUAL_LOOP::only_mac(std::vector<STEP>& steps) const {
    const NODE* mac = nullptr;
    for (const LIST* s = bb->statements; s->rest; s = s->rest) {
        STEP step;
        if (s->first->op == NASSERT) continue; // of the steps as they were: it goes
        if (is_mac(s->first)) {
            if (mac || !s->first->left->type->is_int()) return nullptr;
            mac = s->first;
            continue;
        }
        if (!read_variable_step(s->first, &step)) return nullptr;
        for (const STEP& other : steps)
            if (other.sym == step.sym) return nullptr;
        step.is_ahead = !mac;
        steps.push_back(step);
    }
    const NODE* test = bb->branch();
    if (!mac || test->op != IF || tree_has_side_effects(test->left)) return nullptr;
    return sym_appears_in_tree(mac->left->u.sym, test->left) ? nullptr : mac;
}

// The value of `t` behind so many steps, which the program makes as well: what is signed does not overflow then, so
// that its conversion to a wider type is stepped.
NODE* behind_steps(NODE* t, const STEP& step, INT65 times) {
    if (!t) return nullptr;
    const NODE* name = t->op == SCONV ? t->left : t;
    if (name->op == NAME && name->u.sym == step.sym) {
        const bool widens = t != name && t->type->is_int() && t->type->size > name->type->size &&
                            name->type->is_int() && name->type->is_signed();
        if (widens) return maketree(PLUS, t, mk_integer_constant(step.c * times, t->type), t->type);
        if (t == name) {
            erase_tree(t);
            return sum_of(step, times);
        }
    }
    t->left = behind_steps(t->left, step, times);
    t->right = behind_steps(t->right, step, times);
    return t;
}

// The accumulation as it reads in iteration 0 or 1 before any step is made.
NODE* mac_of_iteration(const NODE* mac, int iteration, const std::vector<STEP>& steps, struct LOOP* loop) {
    NODE* t = copy_tree(mac);
    for (const STEP& step : steps) {
        const int times = iteration + step.is_ahead;
        if (times == 0) continue;
        t->right = simp_tree(behind_steps(t->right, step, INT65(times)), loop);
    }
    t->right = rewrite_tree(t->right, [](NODE* n) {
        if (n->op == UMULT) n->left = partition_pointer_under_UMULT(n->left, n);
        return n;
    });
    return t;
}

void show(const char* title, const LIST* list) {
    debug_printf("%s", title);
    for (; list; list = list->rest) debug_printf("    %s\n", stmt2infix(list->first).c_str());
}

// The call for both, and all steps behind it. Null where the accumulations are not what the hardware takes.
LIST* DUAL_LOOP::two_iterations(const NODE* mac, const std::vector<STEP>& steps, SYMTAB* temp) const {
    PSN* psn = bb->statements->psn;
    LIST* test = copy_dd_statements(bb->last_statement());
    LIST* list =
        mkelist(mac_of_iteration(mac, 0, steps, loop), mkelist(mac_of_iteration(mac, 1, steps, loop), test, psn), psn);
    if (print_debug) show("[duplicated]\n", list);
    NODE* second = list->rest->first;
    second->left = subst_sym_for_sym_in_tree(second->left->u.sym, temp, second->left);
    if (!conversion_to_s32xs32_DMAC_succeeds(list, loop)) {
        erase_tree_list(list);
        return nullptr;
    }
    LIST* at = list;
    for (const STEP& step : steps) at = insert_behind(at, mk_ASG(mk_NAME(step.sym), sum_of(step, INT65(2))), psn);
    if (print_debug) show("[delayed]\n", list);
    return list;
}

bool DUAL_LOOP::convert_doubled() {
    if (!loop->tripFactor || loop->tripFactor->op != ICON || !(loop->tripFactor->u.lval % INT65(2)).is_zero())
        return false;
    std::vector<STEP> steps;
    const NODE* mac = only_mac(steps);
    if (loop->has(LOOP_early_exit) || !mac || !all_are_aligned(mac)) return false;
    SYMTAB* temp = sym_temp('T', -1, mac->left->type->stqs(), nullptr);
    NODE* acc = copy_tree(mac->left);
    LIST* list = two_iterations(mac, steps, temp);
    if (!list) {
        erase_tree(acc);
        return false;
    }
    use(list);
    add_behind(acc, temp);
    update_pragmas_for_loop(loop, 2);
    return true;
}

// ---- What the programmer is told

std::string DUAL_LOOP::why_not(const NODE* mac) {
    if (loop_has_subloops(loop) || !is_suitable())
        return "the loop has more than one block: take if, ?: and calls out of it";
    std::vector<STEP> steps;
    if (loop->has(LOOP_early_exit) || !only_mac(steps))
        return "the loop does more than add one product and step by one element";
    if (!loop->tripFactor || loop->tripFactor->op != ICON || !(loop->tripFactor->u.lval % INT65(2)).is_zero())
        return "its number of iterations is not known to be even: a constant, or #pragma MUST_ITERATE(2, , 2)";
    const NODE* unaligned = nullptr;
    for_each_subtree(mac->right, [&](const NODE* n) {
        if (n->op == UMULT && !unaligned && !is_aligned_at_entry(n)) unaligned = n;
    });
    if (unaligned)
        return "'" + reference_text(unaligned) +
               "' is not known to begin on a 32-bit boundary: #pragma DATA_ALIGN(array, 2)";
    return "both factors must be elements of int that move up by one an iteration";
}

void DUAL_LOOP::tell() {
    if (loop->is_root()) return;
    for (const BBLK* b : loop->contents)
        for (const LIST* s = b->statements; b->loop == loop && s; s = s->rest)
            if (is_mac_of_halves(s->first))
                return remark("dual multiply-accumulate", s->psn, REMARK::MISSED,
                              "one product an iteration, not two: " + why_not(s->first));
}

} // namespace

bool special_DMAC_conversion() {
    struct LOOP* root = loop_root();
    if (!root || opt_level() < 2 || cpu_version != 28 || !rtc_unified_memory || memory_is_big_endian) return false;
    bool any = false;
    for (struct LOOP* loop : loops_inner_first(root)) any |= DUAL_LOOP(loop).convert();
    if (any) {
        sym_split(currfuninfo);
        changed(fact::none);
    }
    return any;
}
