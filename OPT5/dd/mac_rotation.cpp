// Loops of one block add the product of the iteration before while they multiply, as one instruction does.
//
//     do acc += x * y; while (...);          t = 0; do { acc += t; t = x * y; } while (...); acc += t;
//
// and the pair in the loop becomes one call, for the repeat instruction to run.
//
// Needs: alias marks. Leaves: the graph, but for exits of loops that it splits.
// Sound because the accumulator gets the same products in the same order, one iteration late: the zero at first changes
// nothing (for floating-point sums it is -0.0), and the last one is added behind the loop. Nothing else in the block
// reads the accumulator, and what else adds to it commutes in arithmetic that wraps. Memory is read where it was.
#include "OPT5/dd/mac.h"

#include "OPT5/dd/dd.h"

#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/accumulators.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

namespace {

register_option pass_disable_simple_rotation("disable:simple_rotation");

constexpr int LEAST_GOAL_TO_SPECULATE = 3; // of `size_speed_goal`: the rest of the body is copied

bool find_rotation(BBLK* bb, MAC_LOOP* r) {
    const EDGE* e = bb->successors;
    if (!e || !e->rest || e->rest->rest || ends_in_promise(bb)) return false;
    if (e->first != bb && e->rest->first != bb) return false;
    r->block = bb;
    r->exit = e->first == bb ? e->rest->first : e->first;
    for (const EDGE* p = bb->predecessors; p; p = p->rest)
        if (p->first != bb) r->entries.push_back(p->first);
    return !r->entries.empty();
}

// ---- How much the block multiplies

// The size of an element scales a subscript by a shift, or by steps of a pointer in the end: no multiplication.
bool is_scaled_subscript(const NODE* t) {
    return t->op == MULT && t->right->op == ICON && power_of_2(t->right->u.lval) >= 0;
}

int count_multiplies(const NODE* t, bool in_address) {
    int count = 0;
    for (; t; t = t->left) {
        count += t->op == MULT && !(in_address && is_scaled_subscript(t));
        in_address |= op_is_indirection(t->op);
        count += count_multiplies(t->right, in_address);
    }
    return count;
}

bool doubles(const NODE* t) {
    return any_subtree(
        t, [](const NODE* n) { return n->op == MULT && n->right->op == ICON && n->right->u.lval == INT65(2); });
}

bool is_sum_into_target(const NODE* t) {
    if (t->op == PLUSASG || t->op == MINUSASG) return true;
    return t->op == ASG && (t->right->op == PLUS || t->right->op == MINUS) &&
           (trees_are_congruent(t->left, t->right->left, false) ||
            trees_are_congruent(t->left, t->right->right, false));
}

} // namespace

int multiplications_in(const BBLK* bb) {
    int total = 0;
    for (const LIST* s = bb->statements; s; s = s->rest) {
        const int count = count_multiplies(s->first, false);
        total += count == 2 && is_sum_into_target(s->first) && doubles(s->first->right) ? 1 : count;
    }
    return total;
}

namespace {

// The multiplier is one: a block with more to multiply is no rotation's.
bool multiplies_once(const BBLK* bb) { return multiplications_in(bb) == 1; }

// ---- One accumulation

// Whether what else the block does with the accumulator commutes with adding to it.
bool may_be_late(const BBLK* bb, const LIST* cell) {
    const NODE* acc = cell->first->left;
    for (const LIST* s = bb->statements; s; s = s->rest) {
        if (s == cell || !sym_appears_in_tree(acc->u.sym, s->first)) continue;
        const NODE* t = s->first;
        const bool accumulates = (t->op == PLUSASG || t->op == MINUSASG) && trees_are_congruent(t->left, acc, false) &&
                                 !sym_appears_in_tree(acc->u.sym, t->right);
        if (!accumulates || (acc->type->is_float() && !fp_add_is_associative())) return false;
    }
    return true;
}

// ---- What the programmer is told

constexpr char PASS[] = "multiply-accumulate";

bool is_in_cycle(BBLK* bb) {
    std::vector<const BBLK*> waiting{bb}, seen;
    while (!waiting.empty()) {
        const BBLK* at = waiting.back();
        waiting.pop_back();
        for (const EDGE* e = at->successors; e; e = e->rest) {
            if (e->first == bb) return true;
            if (std::find(seen.begin(), seen.end(), e->first) != seen.end()) continue;
            seen.push_back(e->first);
            waiting.push_back(e->first);
        }
    }
    return false;
}

std::string why_not_rotated(BBLK* bb, const LIST* cell, int products) {
    std::string why = why_no_mac(cell->first);
    if (!why.empty()) return why;
    if (MAC_LOOP r; !find_rotation(bb, &r)) return "the loop has more than one block: take if and calls out of it";
    if (!multiplies_once(bb))
        return "there are " + std::to_string(products) +
               " multiplications an iteration and one multiplier: make a loop of each sum";
    if (!may_be_late(bb, cell)) return "the loop uses the sum elsewhere, and its test or its stores may depend on that";
    return "the hardware has no instruction for this product";
}

bool multiplies_loaded(const NODE* t) {
    const auto is_loaded = [](const NODE* n) { return n->op == UMULT; };
    return any_subtree(t, [&](const NODE* n) {
        return n->op == MULT && n->right->op != ICON &&
               (any_subtree(n->left, is_loaded) || any_subtree(n->right, is_loaded));
    });
}

// Not of what addresses are computed by.
bool has_product(const NODE* t) {
    for (; t && t->op != UMULT && t->op != STREF; t = t->left)
        if (t->op == MULT || has_product(t->right)) return true;
    return false;
}

void tell_of_block(BBLK* bb) {
    int products = 0;
    const LIST* first = nullptr;
    bool is_told = false;
    for (const LIST* s = bb->statements; s; s = s->rest) {
        const int count = count_multiplies(s->first, false);
        products += count;
        if (!first && multiplies_loaded(s->first)) first = s;
        if (s->first->op != MCALL) continue;
        const std::string name = s->first->u.name;
        if (name.compare(0, 11, "__parallel_") != 0 && name != "__dmac") continue;
        remark(PASS, s->psn, REMARK::DONE, "one instruction adds and multiplies: " + name);
        is_told = true;
    }
    for (const LIST* s = bb->statements; s; s = s->rest) {
        if (!is_sum_into_target(s->first) || !has_product(s->first->right)) continue;
        remark(PASS, s->psn, REMARK::MISSED, "adds apart from multiplying: " + why_not_rotated(bb, s, products));
        is_told = true;
    }
    if (!is_told && first)
        remark(PASS, first->psn, REMARK::NOTE,
               std::to_string(products) + " multiplications an iteration, none of them added to a sum");
}

// ---- The rotation

// What added to, or taken from, any number leaves it as it is.
NODE* neutral(const NODE* accumulation) {
    TYPE* type = accumulation->left->type->stqs();
    NODE* zero = fold_constants(coerce_to_type(type, mk_ICON(INT65(0), tp->int_t)));
    const bool is_negative = type->is_float() && accumulation->op == PLUSASG;
    return is_negative ? fold_constants(maketree(UMINUS, zero, nullptr, type)) : zero;
}

class ROTATOR {
public:
    void run();

private:
    void rotate(BBLK* bb);
    bool simply(MAC_LOOP& r);
    bool simply(MAC_LOOP& r, LIST* cell);

    SQUARES squares;
    bool has_new_temps = false, has_new_blocks = false, has_peeled = false;
};

// The statement becomes `acc op= t` and `t = product`, or the call of both.
bool ROTATOR::simply(MAC_LOOP& r, LIST* cell) {
    LIST* pair = mkelist(copy_tree(cell->first), nullptr, cell->psn);
    SYMTAB* temp = split_out_multiply(pair);
    std::swap(pair->first, pair->rest->first);
    NODE* late = copy_tree(pair->first);
    NODE* zero = mk_ASG(mk_NAME(temp), neutral(late));
    const bool is_call = conversion_to_BIF_call_succeeds(pair, false);
    // Where no instruction does both, an addition beside the multiplication is a gain for the floating-point unit
    // alone.
    if (!is_call && !late->left->type->is_float()) {
        erase_tree_list(pair);
        erase_tree(late);
        erase_tree(zero);
        return false;
    }
    erase_tree(cell->first);
    cell->first = std::exchange(pair->first, nullptr);
    if (pair->rest) insert_behind(cell, std::exchange(pair->rest->first, nullptr), cell->psn);
    erase_tree_list(pair);
    for (BBLK* entry : r.entries) insert_at_end_of_body(entry, copy_tree(zero));
    erase_tree(zero);
    if (r.exit->predecessors->rest) {
        r.exit = split_cfg_edge(r.block, r.exit, false);
        has_new_blocks = true;
    }
    insert_before(&r.exit->statements, late, cell->psn);
    return true;
}

bool ROTATOR::simply(MAC_LOOP& r) {
    bool any = false;
    split_accumulations_in_bb(r.block);
    squares.read_from_memory(r.block->statements);
    for (LIST* s = r.block->statements; s->rest; s = s->rest)
        if (is_mac(s->first) && may_be_late(r.block, s) && rewrite_is_allowed(s->first)) any |= simply(r, s);
    return any;
}

// A block that is not rotated stays as it was.
void ROTATOR::rotate(BBLK* bb) {
    MAC_LOOP r;
    if (!find_rotation(bb, &r) || !multiplications_in(bb)) return;
    LIST* before = copy_dd_statements(bb->statements);
    SUM_IN_MEMORY sum(r);
    SUBSCRIPTS subscripts(r);
    has_new_blocks |= sum.keep_in_variable();
    if (!multiplies_once(bb)) subscripts.step(multiplications_in(bb) - 1);
    bool is_rotated = false, is_peeled = false;
    if (multiplies_once(bb)) {
        is_rotated = !pass_disable_simple_rotation && simply(r);
        if (!is_rotated && size_speed_goal() >= LEAST_GOAL_TO_SPECULATE)
            is_rotated = is_peeled = speculatively_rotate_loop_for_accumulators(r, squares);
    }
    if (is_rotated) {
        has_new_temps = true;
        has_new_blocks |= is_peeled;
        has_peeled |= is_peeled;
        return erase_tree_list(before);
    }
    sum.drop();
    subscripts.drop();
    std::swap(last_cell(before)->first->right, bb->branch()->right); // the labels, of edges that may have been split
    erase_statements(bb);
    set_statements(bb, before);
}

void ROTATOR::run() {
    if (straighten_loops_of_accumulators()) {
        changed(fact::none);
        simpcfg(false, false);
        need(fact::alias_marks);
    }
    std::vector<BBLK*> blocks;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) blocks.push_back(bb);
    for (BBLK* bb : blocks) rotate(bb);
    if (remarks_are_wanted) {
        need(fact::loops);
        const NATURAL_LOOPS& loops = *currfuninfo->loops;
        for (BBLK* bb : blocks)
            if (loops.around(bb) || (loops.has_other_cycles() && is_in_cycle(bb))) tell_of_block(bb);
    }
    if (has_new_temps) sym_split(currfuninfo);
    changed(has_new_blocks ? fact::none : fact::graph);
    // Behind the last iteration nobody may want its steps.
    if (!has_peeled) return;
    need(fact::live_variables);
    elim_dead_assigns(0, 0);
    changed(fact::graph);
}

} // namespace

void rotate_loops_for_accumulators() {
    if (opt_level() < 2 || currfuninfo->bb_count < 2) return;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'ROTATE_LOOPS_FOR_ACCUMULATORS' ----------\n");
    ROTATOR().run();
}
