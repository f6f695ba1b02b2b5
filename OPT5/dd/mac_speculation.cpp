// Loops of one block in which the sum is used or changed elsewhere multiply for the next iteration.
//
//     do { acc += x[i] * y[i]; w[i] = acc; i++; } while (i < n);
//
// becomes, with the last iteration behind the loop, and without the first test where two iterations are certain,
//
//     t = x[i] * y[i];
//     if (i + 1 < n) do { acc += t; t = x[i + 1] * y[i + 1]; w[i] = acc; i++; } while (i + 1 < n);
//     acc += t; w[i] = acc; i++;
//
// where the two statements at the start of the loop are one call of the hardware.
//
// Needs: alias marks. Leaves: where it succeeds, what the new blocks allow.
// Sound because what stands up to the multiplication, and what stands behind it, run in turn and as often as before.
// Only the test moves, to behind the multiplication: it is known ahead, as it reads nothing but variables that stay, or
// that the rest of the iteration moves by a constant. So nothing is read for an iteration that does not come, and each
// value that the test computes it computed before. In the loop the multiplication goes back over statements that are
// independent of it, none of which may leave the loop.
#include "OPT5/dd/mac.h"

#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/accumulators.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

namespace {

// ---- Lists of statements

LIST* copy_of(const LIST* from, const LIST* end) {
    LIST* list = nullptr;
    for (LIST** link = &list; from != end; from = from->rest, link = &(*link)->rest)
        *link = mkelist(copy_tree(from->first), nullptr, from->psn);
    return list;
}

LIST** end_of(LIST** link) {
    while (*link) link = &(*link)->rest;
    return link;
}

bool commute(const NODE* a, const NODE* b) {
    auto is_sum = [](const NODE* t) { return t->op == PLUSASG || t->op == MINUSASG; };
    if (!is_sum(a) || !is_sum(b) || !trees_are_congruent(a->left, b->left, false)) return false;
    if (a->left->op != NAME || (a->left->type->is_float() && !fp_add_is_associative())) return false;
    return !sym_appears_in_tree(a->left->u.sym, a->right) && !sym_appears_in_tree(a->left->u.sym, b->right);
}

// The value of `t` where the variable has moved by `c`.
NODE* behind_step(NODE* t, const VARIABLE_STEP& step, INT65 c) {
    NODE *name = mk_NAME(step.sym), *value = value_behind_step(step, c);
    t = simp_tree(subst_tree_for_lvalue_in_tree(value, name, t), nullptr);
    erase_tree(name);
    erase_tree(value);
    return t;
}

// Exchanges two statements that follow each other, if they compute the same then. `up`: the second one is on the move.
bool exchange(LIST* first, LIST* second, bool up) {
    NODE *passed = up ? first->first : second->first, *moving = up ? second->first : first->first;
    if (trees_are_dependent(first->first, second->first, nullptr, nullptr, true) &&
        !commute(first->first, second->first)) {
        VARIABLE_STEP step;
        if (!read_variable_step(passed, &step) || moving->op != ASG || moving->left->op != NAME) return false;
        if (tree_touches_lvalue(moving->left, passed->left) || tree_modifies_lvalue(moving->right, passed->left))
            return false;
        if (!only_its_name_reaches(step.sym)) return false;
        moving->right = behind_step(moving->right, step, up ? step.c : -step.c);
    }
    std::swap(first->first, second->first);
    std::swap(first->psn, second->psn);
    return true;
}

} // namespace

LIST* move_statement_down(LIST* cell, const LIST* stop) {
    while (cell->rest != stop && exchange(cell, cell->rest, false)) cell = cell->rest;
    return cell;
}

namespace {

// The last statement of the list, upwards.
LIST* move_last_up(LIST* list, const LIST* stop) {
    std::vector<LIST*> cells;
    for (LIST* s = list; s; s = s->rest) cells.push_back(s);
    size_t at = cells.size() - 1;
    while (at > 0 && cells[at - 1] != stop && exchange(cells[at - 1], cells[at], true)) --at;
    return cells[at];
}

// ---- The loop

class SPECULATION {
public:
    SPECULATION(const MAC_LOOP& loop, SQUARES& squares) : loop(loop), squares(squares) {}
    bool succeeds();

private:
    bool may_be_cut() const;
    bool cut();
    bool make_kernel();
    bool read_step_behind(const NODE* name, VARIABLE_STEP* step, int* count) const;
    bool any_of_body_modifies(const NODE* name) const;
    NODE* test_ahead() const;
    NODE* test_of_earlier_limit(BBLK* entry) const;
    void rebuild();
    bool iterates_twice() const;
    void drop();

    MAC_LOOP loop;
    SQUARES& squares;
    LIST* prologue = nullptr; // ends in the multiplication
    LIST* rest = nullptr;     // begins with the accumulation; without the test
    LIST* kernel = nullptr;
    NODE* test = nullptr; // of the iteration whose prologue is through
};

bool SPECULATION::may_be_cut() const {
    const BBLK* bb = loop.block;
    if (loop.entries.size() != 1 || !bb->branch() || bb->branch()->op != IF || bb->branch()->left->op == ENDLOOP)
        return false;
    const BBLK* entry = loop.entries[0];
    if (entry->successors->rest && ends_in_promise(entry)) return false;
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (may_leave(s->first)) return false;
    return true;
}

// The body in two parts, the accumulation at the start of the second one.
bool SPECULATION::cut() {
    LIST* body = copy_of(loop.block->statements, loop.block->last_statement());
    for (LIST* s = body; s; s = s->rest) split_accumulations_in_stmt(s);
    squares.read_from_memory(body);
    LIST* cell = body;
    while (cell && !is_mac(cell->first)) cell = cell->rest;
    prologue = body;
    if (!cell) return false;
    split_out_multiply(cell);
    rest = std::exchange(cell->rest, nullptr);
    return true;
}

bool SPECULATION::make_kernel() {
    kernel = copy_of(rest, nullptr);
    *end_of(&kernel) = copy_of(prologue, nullptr);
    LIST* multiply = move_last_up(kernel, kernel);
    LIST* accumulate = move_statement_down(kernel, multiply);
    return accumulate->rest == multiply && conversion_to_BIF_call_succeeds(accumulate, false);
}

// False where the rest of the body does more to the variable than one step, or none.
bool SPECULATION::read_step_behind(const NODE* name, VARIABLE_STEP* step, int* count) const {
    for (const LIST* s = rest; s; s = s->rest) {
        if (!tree_modifies_lvalue(s->first, name)) continue;
        if (++*count > 1 || !read_variable_step(s->first, step) || step->sym != name->u.sym) return false;
    }
    return true;
}

bool SPECULATION::any_of_body_modifies(const NODE* name) const {
    for (const LIST* s = loop.block->statements; s; s = s->rest)
        if (tree_modifies_lvalue(s->first, name)) return true;
    return false;
}

// Null where the test reads more than variables that the rest of the body leaves alone, or makes one step of.
NODE* SPECULATION::test_ahead() const {
    const NODE* condition = loop.block->branch()->left;
    if (tree_has_side_effects(condition)) return nullptr;
    bool is_simple = true;
    std::vector<const NODE*> names;
    for_each_subtree(condition, [&](const NODE* n) {
        if (n->op == NAME) names.push_back(n);
        is_simple &= !op_is_load(n->op) && !op_is_call(n->op) && !lvalue_is_volatile(n);
    });
    if (!is_simple) return nullptr;
    NODE* ahead = copy_tree(condition);
    std::vector<const SYMTAB*> done;
    for (const NODE* name : names) {
        if (std::find(done.begin(), done.end(), name->u.sym) != done.end()) continue;
        done.push_back(name->u.sym);
        VARIABLE_STEP step;
        int count = 0;
        if (!read_step_behind(name, &step, &count)) {
            erase_tree(ahead);
            return nullptr;
        }
        if (count) ahead = behind_step(ahead, step, step.c);
    }
    return ahead;
}

// Whether each unsigned, or signed, comparison of x with a limit that leads to a next iteration holds for x + c of the
// limit where it holds for x of the limit - c.
bool moves_to_limit(const NODE* condition, bool x_is_left, bool continues, const VARIABLE_STEP& step) {
    const TYPE* type = step.sym->type;
    bool is_less = false;
    switch (condition->op) {
    case EQ:
    case NEQ: return true;
    case LT:
    case LE: is_less = true; [[fallthrough]];
    case GT:
    case GE: break;
    case ULT:
    case ULE: is_less = true; [[fallthrough]];
    case UGT:
    case UGE:
        if (!type->is_pointer() && step.c != INT65(1) && step.c != INT65(-1)) return false;
        break;
    default: return false;
    }
    const bool stays_below = (is_less == x_is_left) == continues;
    return stays_below == (INT65(0) < step.c);
}

// The test of a variable against a limit that stays, `x + c < n`, as one of x against n - c, which is found ahead of
// the loop: it is between x and n there. Null if the test is another one.
NODE* SPECULATION::test_of_earlier_limit(BBLK* entry) const {
    const NODE *control = loop.block->branch(), *condition = control->left;
    for (bool x_is_left : {true, false}) {
        const NODE *x = x_is_left ? condition->left : condition->right,
                   *limit = x_is_left ? condition->right : condition->left;
        VARIABLE_STEP step;
        int count = 0;
        if (!x || !limit || x->op != NAME || (limit->op != NAME && limit->op != ICON)) continue;
        if (!equiv_mtypes(x->type, limit->type) || !read_step_behind(x, &step, &count) || count != 1) continue;
        const bool stays = limit->op == ICON || !any_of_body_modifies(limit);
        const bool continues = control->right->left->lbl->bblock == loop.block;
        if (!stays || !moves_to_limit(condition, x_is_left, continues, step)) continue;
        TYPE* type = limit->type->stqs();
        NODE* earlier =
            maketree(MINUS, copy_tree(limit), mk_ICON(step.c, type->is_pointer() ? tp->long_t : type), type);
        earlier = simp_tree(earlier, nullptr);
        if (earlier->op != ICON) {
            SYMTAB* sym = sym_temp('T', -1, type, nullptr);
            insert_at_end_of_body(entry, mk_ASG(mk_NAME(sym), earlier));
            earlier = mk_NAME(sym);
        }
        NODE* test = copy_tree(condition);
        NODE** place = x_is_left ? &test->right : &test->left;
        erase_tree(*place);
        *place = earlier;
        return test;
    }
    return nullptr;
}

// By what is promised of the loop ahead of it.
bool SPECULATION::iterates_twice() const {
    for (const LIST* s = loop.entries[0]->statements; s; s = s->rest)
        if (s->first->op == PPRAGMA && s->first->pragma->kind == PRG_MUST_ITERATE)
            return promise_of_MUST_ITERATE(s->first).min >= INT65(2);
    return false;
}

// One iteration less, and one at least.
void take_iteration(NODE* pragma) {
    const auto less = [](INT65 n) { return n > INT65(1) ? n - INT65(1) : INT65(1); };
    if (pragma->pragma->kind == PRG_MUST_ITERATE) {
        const ITERATE_PROMISE p = promise_of_MUST_ITERATE(pragma);
        const INT65 max = p.max == no_trip_bound() ? p.max : less(p.max);
        set_PPRAGMA_tree_info(pragma, PRG_MUST_ITERATE,
                              {std::to_string(less(p.min).value), std::to_string(max.value), "1"});
    } else if (pragma->pragma->kind == PRG_PROB_ITERATE)
        for (int n : {0, 1})
            if (!get_PPRAGMA_tree_arg(pragma, n).empty())
                set_PPRAGMA_tree_int_arg(pragma, n, less(get_PPRAGMA_tree_int_arg(pragma, n)));
}

// The pragmas of the block, which promise something of the loop behind it.
LIST* take_promises(BBLK* bb) {
    LIST* taken = nullptr;
    LIST** end = &taken;
    for (LIST** link = &bb->statements; (*link)->rest;) {
        LIST* cell = *link;
        if (cell->first->op != PPRAGMA) {
            link = &cell->rest;
            continue;
        }
        *link = std::exchange(cell->rest, nullptr);
        *end = cell;
        end = &cell->rest;
    }
    return taken;
}

void insert_list(LIST** link, LIST* list) {
    if (!list) return;
    *end_of(&list) = *link;
    *link = list;
}

void SPECULATION::rebuild() {
    BBLK *bb = loop.block, *entry = loop.entries[0];
    const bool is_certain = iterates_twice();
    if (loop.exit->predecessors->rest) loop.exit = split_cfg_edge(bb, loop.exit, false);
    if (entry->successors->rest) entry = split_cfg_edge(entry, bb, false);
    LIST* promises = take_promises(entry);
    for (LIST* s = promises; s; s = s->rest) take_iteration(s->first);
    insert_list(end_of_body(entry), std::exchange(prologue, nullptr));
    NODE* again = copy_tree(bb->branch());
    std::swap(again->left, test);
    if (!is_certain) {
        LIST* control = entry->last_statement();
        erase_tree(control->first);
        control->first = copy_tree(again);
        connect(entry, loop.exit);
        entry = split_cfg_edge(entry, bb, false);
    }
    if (NODE* limited = test_of_earlier_limit(entry)) {
        erase_tree(again->left);
        again->left = limited;
    }
    insert_list(end_of_body(entry), promises);
    PSN* psn = bb->last_statement()->psn;
    erase_statements(bb);
    *end_of(&kernel) = mkelist(again, nullptr, psn);
    set_statements(bb, std::exchange(kernel, nullptr));
    insert_list(&loop.exit->statements, std::exchange(rest, nullptr));
}

void SPECULATION::drop() {
    for (LIST** list : {&prologue, &rest, &kernel}) erase_tree_list(std::exchange(*list, nullptr));
    if (test) erase_tree(test);
}

bool SPECULATION::succeeds() {
    const bool is_rebuilt =
        may_be_cut() && cut() && (test = test_ahead()) && make_kernel() && rewrite_is_allowed(loop.block->branch());
    if (is_rebuilt) rebuild();
    drop();
    return is_rebuilt;
}

} // namespace

bool speculatively_rotate_loop_for_accumulators(const MAC_LOOP& loop, SQUARES& squares) {
    if (print_debug)
        debug_printf("\n\n\t\t\t---------- ENTERING 'SPECULATIVELY_ROTATE_LOOP_FOR_ACCUMULATORS' ----------\n");
    return SPECULATION(loop, squares).succeeds();
}
