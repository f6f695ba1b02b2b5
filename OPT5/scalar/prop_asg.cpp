// What the assignment of registers asks of the data flow before it begins: tests that hold the assignment in front of
// them, and the number of loops around each block.
//
// Needs: live variables; loops, where an edge leads backward. Leaves: what rests on the graph.
// Sound because the assignment moves into the one read of the variable that its block's test evaluates first, over
// nothing that names the variable. A variable that is not a candidate might be reached by what else the test reads.

#include "OPT5/scalar/eda.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/target/target.h"

namespace {

// The one read of a condition that compares a variable with a constant, or is the variable itself.
NODE** tested_variable(NODE** condition) {
    NODE* t = *condition;
    if (t->op == NAME) return condition;
    const bool compares = op_is_int_compare(t->op) || op_is_float_compare(t->op);
    const bool with_constant = compares && (t->right->op == ICON || t->right->op == FCON);
    return with_constant && t->left->op == NAME ? &t->left : nullptr;
}

} // namespace

void prop_asg_into_if(BBLK* bb) {
    for (LIST** link = &bb->statements; *link && (*link)->rest; link = &(*link)->rest) {
        LIST *s = *link, *test = s->rest;
        if (test->rest) continue;
        NODE* asg = s->first;
        if (test->first->op != IF || (asg->op != ASG && op_of_opASG[asg->op] == ILLOP) || asg->left->op != NAME) return;
        if (live_index(asg->left->u.sym) < 0 || lvalue_is_volatile(asg->left) || tree_is_arg_prolog(asg)) return;
        NODE** read = tested_variable(&test->first->left);
        if (!read || (*read)->u.sym != asg->left->u.sym) return;
        erase_tree(*read);
        *read = asg;
        s->first = nullptr;
        drop_statement(link);
        return;
    }
}

namespace {

void count_loops_around_blocks() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) bb->depth = 0;
    if (!any_edge_leads_back()) return;
    need(fact::loops);
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const NATURAL_LOOP* loop = loops.around(bb); loop && bb->depth < UINT8_MAX; loop = loop->parent)
            ++bb->depth;
}

} // namespace

void propagate_assignments_into_tests() {
    if (!currfuninfo->bb_list) return;
    count_loops_around_blocks();
    BBLK* const entry = currfuninfo->bb_list;
    for (BBLK* bb = entry->rdflink; bb; bb = bb == entry ? nullptr : bb->rdflink) prop_asg_into_if(bb);
    changed(fact::graph | fact::alias_marks | fact::live_variables); // what a block reads and writes is as it was
}
