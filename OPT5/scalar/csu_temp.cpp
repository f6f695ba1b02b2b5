// Structure results are built where they are wanted.
//
// A call's result that is stored to a temporary, and from there to a local, is stored to the local. A function that
// returns a structure through a hidden pointer may build it in a local and copy that through the pointer on every path:
// it builds the structure where the pointer points instead.
//
// Needs: alias marks. Leaves: what rests on the graph.
// Sound because, of a call's result, nothing else names the temporary, and neither the call nor anything outside of
// this function can see the local: a callee that reads the local while it writes its result would read the new value.
// A hidden pointer points to an object of the caller that nothing else names before the function returns; the pointer
// is used for nothing but the copies, and no copy is followed by anything that could still change the local.
#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lowering.h"

#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

namespace {

class SUBSTITUTION {
public:
    explicit SUBSTITUTION(SYMTAB* pointer) : hidden(pointer) {}
    void run() {
        if (!find_copies() || !may_go() || count_uses() != copies) return;
        if (print_debug) {
            debug_printf("\nsubst_csu_returning_temp_for_local_var()\n  is substituting *%s\n", hidden->name);
            debug_printf("    for local var  %s\n\n", local->name);
        }
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST** link = &bb->statements; *link;) link = rewrite_statement(link);
        unlink_symbol(local, &currfuninfo->memory_syms);
        currfuninfo->dropped_syms.push_back(local);
    }

private:
    bool is_copy(const NODE* t) const {
        if (t->op != STASG || t->left->op != UMULT || t->left->right || t->right->op != NAME) return false;
        const NODE* pointer = t->left->left;
        return pointer->op == NAME && pointer->u.sym == hidden && (!local || t->right->u.sym == local);
    }

    // The block leaves the function; its last act must be a copy of the one local.
    bool ends_in_copy(const BBLK* bb) {
        const LIST* before = nullptr;
        for (const LIST* s = bb->statements; s && s->rest; s = s->rest) before = s;
        if (!before || !is_copy(before->first)) return false;
        local = before->first->right->u.sym;
        ++copies;
        return true;
    }

    // Backwards from the exit through blocks that do nothing.
    bool find_copies() {
        const BBLK* exit = currfuninfo->exit_bb;
        if (!exit || !exit->branch() || exit->branch()->op != URETURN) return false;
        std::vector<const BBLK*> waiting = {exit};
        std::unordered_set<const BBLK*> seen = {exit};
        while (!waiting.empty()) {
            const BBLK* bb = waiting.back();
            waiting.pop_back();
            if (bb != exit && bb->branch()->op != BRANCH) return false;
            if (bb->statements->rest) {
                if (!ends_in_copy(bb)) return false;
                continue;
            }
            if (!bb->predecessors) return false;
            for (const EDGE* e = bb->predecessors; e; e = e->rest)
                if (seen.insert(e->first).second) waiting.push_back(e->first);
        }
        return copies > 0;
    }

    bool may_go() const {
        if (local->level != 2 || local->sclass != SC_AUTO || !symbol_in_list(local, currfuninfo->memory_syms))
            return false;
        if (!hidden->type->is_pointer() || !exact_types(local->type->stqs(), hidden->type->type_pointed_to()->stqs()))
            return false;
        return !type_may_contain_volatile(local->type) && !local->pragma && !sym_appears_in_EHT(local) &&
               local->align <= local->type->align; // the caller's object has what its type asks for
    }

    int count_uses() const {
        int uses = 0;
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest) {
                if (tree_is_arg_prolog(s->first) || s->first->op == NASSERT) continue;
                if (s->first->op == RETURN || calls_setjmp(s->first)) return -1;
                for_each_node(s->first, [&](const NODE* t) { uses += t->op == NAME && t->u.sym == hidden; });
            }
        return uses;
    }

    NODE* place(const NODE* name) const {
        return maketree(UMULT, mk_NAME(hidden, name->ls), nullptr, name->type, name->ls);
    }

    NODE* substitute(NODE* t) const {
        if (t->op == UAND && t->left->op == UMULT && !t->left->right && t->left->left->op == NAME &&
            t->left->left->u.sym == hidden) {
            NODE* pointer = coerce_to_type(t->type, t->left->left);
            erase_node(t->left);
            erase_node(t);
            return pointer;
        }
        if (t->op != NAME || t->u.sym != local) return t;
        NODE* r = place(t);
        erase_tree(t);
        return r;
    }

    LIST** rewrite_statement(LIST** link) const {
        LIST* s = *link;
        if (is_copy(s->first)) {
            drop_statement(link);
            return link;
        }
        s->first = rewrite_tree(s->first, [this](NODE* t) { return substitute(t); });
        return &s->rest;
    }

    SYMTAB* hidden;
    SYMTAB* local = nullptr;
    int copies = 0;
};

// ---- In the caller

bool is_private_structure(const NODE* t) {
    return t->op == NAME && t->u.sym->is_automatic() && only_its_name_reaches(t->u.sym) &&
           !type_may_contain_volatile(t->u.sym->type);
}

// `t = f(...); v = t;`
bool passes_result_on(const LIST* s) {
    const NODE* call = s->first;
    if (call->op != STASG || call->left->op != NAME || (call->right->op != CALL && call->right->op != UCALL) ||
        !s->rest)
        return false;
    const NODE* copy = s->rest->first;
    return copy->op == STASG && copy->left->op == NAME && copy->right->op == NAME &&
           copy->right->u.sym == call->left->u.sym && copy->left->u.sym != call->left->u.sym;
}

bool may_take_result(const LIST* s) {
    const NODE *temp = s->first->left, *local = s->rest->first->left;
    return is_private_structure(temp) && is_private_structure(local) &&
           exact_types(temp->u.sym->type->stqs(), local->u.sym->type->stqs()) &&
           !sym_appears_in_tree(local->u.sym, s->first->right);
}

void hand_results_over() {
    std::vector<LIST*> calls;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            if (passes_result_on(s)) calls.push_back(s);
    if (calls.empty()) return;
    need(fact::alias_marks);
    std::unordered_map<const SYMTAB*, int> names;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest) {
            if (calls_setjmp(s->first)) return;
            for_each_node(s->first, [&](const NODE* t) { names[t->op == NAME ? t->u.sym : nullptr]++; });
        }
    constexpr int SET_AND_COPIED = 2;
    for (LIST* s : calls) {
        const SYMTAB* temp = s->first->left->u.sym;
        if (names[temp] != SET_AND_COPIED || !may_take_result(s)) continue;
        LIST* copy = s->rest;
        if (print_debug)
            debug_printf("\nsubst_csu_returning_temp_for_local_var()\n  is substituting %s\n    for temporary  %s\n\n",
                         copy->first->left->u.sym->name, temp->name);
        std::swap(s->first->left, copy->first->left);
        drop_statement_behind(s);
    }
}

} // namespace

void subst_csu_returning_temp_for_local_var() {
    FUNINFO* f = currfuninfo;
    if (f->bb_list) hand_results_over();
    SYMTAB* hidden = f->csu_return_sym ? f->csu_return_sym : f->ret_by_cctor_sym;
    if (hidden && f->bb_list) SUBSTITUTION(hidden).run();
}
