// Stores of a destructor to the object that dies.
//
// Needs: alias marks and pointees. Leaves: what rests on the graph.
// Sound because nobody may look at the object when its destructor is done, so a store to a member only serves
// statements of the destructor itself and what they call. It is removed if none of those that can follow it may touch
// the member; a destructor of a base that is called behind it is one that may.

#include "OPT5/scalar/eda.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/simp/simp.h"

#include <cstring>
#include <vector>

namespace {

constexpr int MAX_STORES = 64; // looked at in one function: each looks at all that follows it

bool has_this() {
    for (const SYMTAB* s = currfuninfo->memory_syms; s; s = s->next)
        if (s->level == 1 && !std::strcmp(s->name, "this")) return true;
    return false;
}

// The member of *this that a statement stores to, or null.
const NODE* stored_member(const NODE* t) {
    if (t->op != ASG || tree_is_arg_prolog(t) || t->left->op != STDOT) return nullptr;
    const NODE* lvalue = t->left;
    if (!lvalue->type->is_scalar() || lvalue_is_volatile(lvalue)) return nullptr;
    const NODE* object = without_members(lvalue);
    if (object->op != UMULT || object->left->op != NAME || std::strcmp(object->left->u.sym->name, "this"))
        return nullptr;
    return lvalue;
}

bool touched_behind(const LIST* s, const NODE* lvalue) {
    for (; s; s = s->rest)
        if (tree_touches_lvalue(s->first, lvalue)) return true;
    return false;
}

bool touched_in_any_successor(BBLK* bb, const NODE* lvalue) {
    BLOCK_SET seen;
    std::vector<BBLK*> work;
    auto add_successors = [&](const BBLK* from) {
        for (const EDGE* e = from->successors; e; e = e->rest)
            if (seen.add(e->first)) work.push_back(e->first);
    };
    bool touched = false;
    for (add_successors(bb); !touched && !work.empty();) {
        BBLK* next = work.back();
        work.pop_back();
        touched = touched_behind(next->statements, lvalue);
        add_successors(next);
    }
    return touched;
}

} // namespace

void remove_unneeded_stores_from_destructor() {
    FUNINFO* f = currfuninfo;
    if (!fun_is_cpp_destructor(f) || !has_this()) return;
    if (print_debug)
        debug_printf("\n\n\t\t\t---------- ENTERING 'remove_unneeded_stores_from_destructor' ----------\n");
    need(fact::alias_marks | fact::pointees);
    int left = MAX_STORES;
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link;) {
            LIST* s = *link;
            const NODE* lvalue = stored_member(s->first);
            if (!lvalue || left-- <= 0 || touched_behind(s->rest, lvalue) || touched_in_any_successor(bb, lvalue)) {
                link = &s->rest;
                continue;
            }
            if (print_debug) debug_printf("\n\tRemoving '%s'\n", stmt2infix(s->first).c_str());
            NODE* asg = s->first;
            s->first = peel_for_effect(asg->right);
            asg->right = nullptr;
            erase_tree(asg);
            if (s->first) {
                link = &s->rest;
                continue;
            }
            drop_statement(link);
        }
}
