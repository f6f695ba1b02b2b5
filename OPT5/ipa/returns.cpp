// Which functions return for certain, whatever they are called with.
//
// Needs: a definition whose graph is built; for all of them together, the callees that the scan entered (scan.cpp).
// Leaves: FUNINFO::body_returns, and FUN_surely_returns once the whole file is known.
// Sound because control leaves a body for good only by a call, an operation of the machine, assembly or an exception, and
// stays in it only on a cycle: each of those makes the function uncertain, but for a loop that counts. A function is taken
// for certain behind all that it calls, so that one on a cycle of calls never is. What the program does with undefined
// behaviour (a signed counter that overflows, a trap) proves nothing: such a run has no "afterwards" that a rewrite could
// change. Later work on the body keeps what it does, and so the answer.

#include "OPT5/ipa/progana.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

#include <algorithm>
#include <vector>

namespace {

// ---- Loops that count
//
// A private variable has one write in the loop, which each iteration makes, and which adds a constant. A signed one, or a
// pointer, would overflow if the loop did not end. An unsigned one that steps by 1 takes all its values in turn, so that
// a test in each iteration against something invariant fails for one of them, if it does for any value.

class COUNTED_LOOP {
public:
    COUNTED_LOOP(const NATURAL_LOOP& of, const NATURAL_LOOPS& all) : loop(of), loops(all) {}

    bool ends() const {
        for (const BBLK* bb : loop.blocks)
            if (runs_once_an_iteration(bb))
                for (const LIST* s = bb->statements; s; s = s->rest)
                    if (counts_in(s->first)) return true;
        return false;
    }

private:
    bool runs_once_an_iteration(const BBLK* bb) const {
        return loops.around(bb) == &loop && loops.dominates_latches(bb, &loop);
    }

    // In what is evaluated whenever the tree is.
    bool counts_in(const NODE* t) const {
        for (; t; t = t->left) {
            INDUCTION_UPDATE update;
            if (is_induction_update(t, &update) && leads_to_end(update)) return true;
            if (t->op != ANDAND && t->op != OROR && t->op != QUEST && counts_in(t->right)) return true;
        }
        return false;
    }

    bool leads_to_end(const INDUCTION_UPDATE& update) const {
        const TYPE* type = update.sym->type;
        if (update.is_narrowed || update.amount->op != ICON) return false;
        if (!only_its_name_reaches(update.sym) || writes_of(update.sym) != 1) return false;
        const INT65 step = update.amount->u.lval;
        if (type->is_int() && type->is_unsigned()) {
            if (step != INT65(1) && step != INT65(-1)) return false;
            return std::any_of(loop.blocks.begin(), loop.blocks.end(), [&](const BBLK* bb) {
                return runs_once_an_iteration(bb) && is_left_at_some_value(bb, update.sym);
            });
        }
        // The sum of a narrow one is a sum of wider numbers, which does not overflow.
        if (step.is_zero() || (type->is_int() && type->size < tp->int_t->size)) return false;
        return std::any_of(loop.blocks.begin(), loop.blocks.end(),
                           [&](const BBLK* bb) { return is_left_by_test(bb, update.sym); });
    }

    int writes_of(const SYMTAB* sym) const {
        int n = 0;
        for (const BBLK* bb : loop.blocks)
            for (const LIST* s = bb->statements; s; s = s->rest)
                for_each_written_name(s->first, [&](const NODE* name, const NODE*) { n += name->u.sym == sym; });
        return n;
    }

    bool is_left_by_test(const BBLK* bb, const SYMTAB* sym) const {
        const NODE* branch = bb->branch();
        if (!branch || branch->op != IF || branch->left->op == ENDLOOP || !sym_appears_in_tree(sym, branch->left))
            return false;
        return !stays(branch->right->left) || !stays(branch->right->right);
    }
    bool stays(const NODE* label) const { return loops.contains(&loop, label->lbl->bblock); }

    bool is_left_at_some_value(const BBLK* bb, const SYMTAB* sym) const {
        if (!is_left_by_test(bb, sym)) return false;
        const NODE* test = bb->branch()->left;
        bool stays_if = stays(bb->branch()->right->left);
        for (; test->op == EXCLAIM; test = test->left) stays_if = !stays_if;
        if (variable_in(test) == sym) return true; // it is zero once, and not zero once
        if (!op_is_int_compare(test->op)) return false;
        const bool is_left = variable_in(test->left) == sym;
        if (!is_left && variable_in(test->right) != sym) return false;
        const NODE* limit = is_left ? test->right : test->left;
        const int op = is_left ? test->op : commute_inv[test->op];
        return is_invariant(limit) && fails_for_some_value(stays_if ? op : boolean_inv[op], limit, sym->type);
    }
    static bool fails_for_some_value(int op, const NODE* limit, TYPE* type) {
        switch (op) {
        case EQ:
        case NEQ:
        case ULT:
        case UGT: return true;
        case ULE: return limit->op == ICON && limit->u.lval < int_type_max(type);
        case UGE: return limit->op == ICON && limit->u.lval > INT65(0);
        default: return false;
        }
    }
    // As it is, or with its step.
    static const SYMTAB* variable_in(const NODE* t) {
        if (t->op == PLUSPLUS || t->op == MINMIN) t = t->left;
        return t->op == NAME ? t->u.sym : nullptr;
    }
    // Computed from variables that the loop leaves alone.
    bool is_invariant(const NODE* t) const {
        return !any_subtree(t, [this](const NODE* n) {
            if (n->op == NAME) return !only_its_name_reaches(n->u.sym) || writes_of(n->u.sym) != 0;
            return op_has_effect(n->op) || op_is_load(n->op) || op_is_intrinsic(n->op);
        });
    }

    const NATURAL_LOOP& loop;
    const NATURAL_LOOPS& loops;
};

// ---- One body

// Its callees aside, as far as the scan has entered them.
bool may_keep_control(const NODE* statement) {
    return any_subtree(statement, [](const NODE* t) {
        if (op_is_call(t->op)) return !get_callee_for_call(t);
        return node_may_stop_or_wait(t);
    });
}

bool all_cycles_end() {
    need(fact::block_numbers);
    if (!any_edge_leads_back()) return true;
    need(fact::loops | fact::alias_marks);
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    const auto& list = loops.inner_first();
    return !loops.has_other_cycles() &&
           std::all_of(list.begin(), list.end(), [&](const auto& loop) { return COUNTED_LOOP(*loop, loops).ends(); });
}

} // namespace

void see_whether_body_returns() {
    FUNINFO* f = currfuninfo;
    f->body_returns = false;
    // What stands in its place may do anything.
    if (symbol_is_preemptible(f->symbol) || symbol_has_pragma(f->symbol, PRG_WEAK)) return;
    if (f->has_eh() || TEST_FLAG(f, FUN_never_returns)) return;
    for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest)
            if (may_keep_control(s->first)) return;
    f->body_returns = all_cycles_end();
}

// ---- All of them

void close_returns(const std::vector<FUNINFO*>& functions) {
    std::vector<std::vector<FUNINFO*>> waiting(fileinfo.FUNLIST.back()->uid + 1); // by callee
    std::vector<size_t> open(waiting.size(), 0); // by caller: its callees that are not certain
    std::vector<FUNINFO*> certain;
    for (FUNINFO* f : functions) {
        if (!f->body_returns) continue;
        for (const CALLEE* c = f->callees; c; c = c->next) {
            if (!function_is_defined(c->callee) && TEST_FLAG(c->callee, FUN_surely_returns)) continue;
            waiting[c->callee->uid].push_back(f);
            ++open[f->uid];
        }
        if (open[f->uid] == 0) certain.push_back(f);
    }
    while (!certain.empty()) {
        FUNINFO* f = certain.back();
        certain.pop_back();
        set_flags(f, FUN_surely_returns);
        for (FUNINFO* caller : waiting[f->uid])
            if (--open[caller->uid] == 0) certain.push_back(caller);
    }
}
