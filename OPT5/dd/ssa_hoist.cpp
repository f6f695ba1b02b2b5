// What every iteration of a loop computes of values that the loop does not change is computed ahead of it, in SSA form.
//
// An expression whose uses have their definitions outside of a loop is a region constant there. Equal ones that leave
// the same loop are one RCX, which is weighed by where its instances stand, and by how many blocks the temporary lives
// through; the best are taken first. Loads are among them: `hoist_invariants`, which comes later, moves sums and
// products of variables, and has a bound on their number in a loop.
//
// Needs: SSA form, a hierarchy, alias marks, dominators. Leaves: those, with new statements in preheaders.
// Sound because the definitions of the uses dominate the loop's head and nothing in the loop defines their variables:
// memory that is read there has a may-definition wherever it may change. A load through a pointer, DIV and MOD move
// only where each execution of the loop evaluates the expression in its first iteration, ahead of any call that may not
// return and of any loop within, which may not end: `for (...) if (d) s += n / d` stays. What is not certain to be
// evaluated may be computed though nobody asked: its signed operations wrap.
#include "OPT5/dd/ssa.h"
#include "OPT5/dd/dd.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/simp/exact.h"

#include <algorithm>
#include <memory>
#include <unordered_map>
#include <vector>

namespace {

constexpr int LEAST_GOAL = 4;              // of `size_speed_goal`
constexpr int MOST_NODES = 64;             // of an expression
constexpr int MOST_COST = 999;             // blocks that all temporaries live through
constexpr int MOST_TEMPORARIES = 6;        // of a loop
constexpr size_t MOST_BLOCKS_AHEAD = 64;   // between the head of a loop and what it evaluates for certain
constexpr int SMALL_LOOP = 9;              // blocks
constexpr int64_t MOST_STATEMENTS = 20000; // that are asked whether they change a load

// A region constant expression.
struct RCX {
    struct INSTANCE {
        NODE** place;
        const LIST* cell;
        BBLK* block;
    };
    std::vector<INSTANCE> instances;
    struct LOOP* loop = nullptr;        // the outermost one that it leaves
    struct LOOP* common_loop = nullptr; // the innermost one that all instances are in
    bool is_certain = false;            // evaluated whenever `loop` is entered
    int benefit = 0, cost = 1;
    unsigned order = 0;

    const NODE* tree() const { return *instances.front().place; }
    int priority() const { return 10 * benefit / cost; }
    void dump() const;
};

void RCX::dump() const {
    debug_printf("\nRegion Constant eXpression (RCX) instances for %s\n", tree_to_infix(tree()).c_str());
    debug_printf("\tInsertion point: BB%d\n", loop->preheader->dfn);
    debug_printf("\tInsertion loop:  L<%d>\n", loop->parent->uid);
    debug_printf("\tCommon loop Lu:  L<%d>\n", common_loop->uid);
    debug_printf("\tQueue priority:  %d\n", priority());
    debug_printf("\tQueue benefit:   %d\n", benefit);
    debug_printf("\tInsertion cost:  %d\n", cost);
    int number = 0;
    for (const INSTANCE& i : instances)
        debug_printf("%4d: BB<%d> in %s\n", ++number, i.block->dfn, stmt2infix(i.cell->first).c_str());
}

// The RCX of the highest priority first.
class RCXQ {
public:
    void push(RCX* rcx) {
        heap.push_back(rcx);
        std::push_heap(heap.begin(), heap.end(), is_behind);
    }
    RCX* pop() {
        if (heap.empty()) return nullptr;
        std::pop_heap(heap.begin(), heap.end(), is_behind);
        RCX* first = heap.back();
        heap.pop_back();
        return first;
    }
    void dump() const {
        if (heap.empty()) return debug_printf("\nThe RCX priority queue is empty.\n\n");
        debug_printf("\nThe RCX priority queue has %d entries:\n", static_cast<int>(heap.size()));
        for (const RCX* rcx : heap) rcx->dump();
    }

private:
    static bool is_behind(const RCX* a, const RCX* b) {
        return a->priority() != b->priority() ? a->priority() < b->priority() : a->order > b->order;
    }
    std::vector<RCX*> heap;
};

bool computes(int op) {
    return op_is_arithmetic(op) || boolean_result[op] || op == SCONV || op == PCONV || op == DIV || op == MOD;
}

// ---- Invariance

class INVARIANCE {
public:
    // In the loop and those within.
    bool holds(const NODE* t, struct LOOP* loop) {
        switch (t->op) {
        case ICON:
        case FCON: return true;
        case UAND: return expr_is_constant(t);
        case NAME: return is_private_name(t) && sym_is_RC_in_loop(t->u.sym, loop);
        case SSA_USE:
        case SSA_MU: return is_defined_outside(ssa_reach(t), loop) && operands_hold(t->left, loop);
        case UMULT:
        case STREF:
        case STDOT: return operands_hold(t, loop) && is_kept(t, loop);
        default:
            if (!computes(t->op) || !is_plain_number(t->type)) return false;
            return holds(t->left, loop) && (!t->right || holds(t->right, loop));
        }
    }

private:
    static bool is_defined_outside(const NODE* definition, const struct LOOP* loop) {
        if (!definition) return true;
        const BBLK* bb = ssa_definitions()[ssa_version(definition)].block;
        return !bb->loop || !loop_is_subloop_of_loop(bb->loop, loop, true);
    }

    // What the address of a reference is computed from.
    bool operands_hold(const NODE* t, struct LOOP* loop) {
        t = without_members(t);
        if (t->op == NAME) return true;
        if (op_is_indirection(t->op))
            return holds(t->left, loop) && (!t->right || t->right->op == FIELD || holds(t->right, loop));
        return op_is_SSA(t->op) && holds(t, loop);
    }

    // A load that is not tracked.
    bool is_kept(const NODE* t, struct LOOP* loop) {
        if (lvalue_is_volatile(t)) return false;
        const READ_SET reads(t);
        if (!reads.is_complete()) return false;
        return is_kept(reads, loop);
    }

    bool is_kept(const READ_SET& reads, struct LOOP* loop) {
        for (BBLK* bb : loop->contents) {
            if (bb->loop != loop) {
                if (!is_kept(reads, bb->loop)) return false;
                continue;
            }
            for (const NODE* t : writers_in(bb))
                if (--statements_left < 0 || reads.may_be_changed_by(t)) return false;
        }
        return true;
    }

    // The statements of the block that write to anything but variables of their own: what is not tracked is no such
    // variable, or a part of one.
    const std::vector<const NODE*>& writers_in(const BBLK* bb) {
        WRITERS& in = writers[bb];
        if (in.is_known) return in.statements;
        in.is_known = true;
        for (const LIST* s = bb->statements; s; s = s->rest) {
            bool writes = false;
            for_each_write(s->first,
                           [&writes](const WRITE& w) { writes |= !w.place || !is_private_name(below_SSA(w.place)); });
            if (writes && s->first->op != SSA_PHI) in.statements.push_back(s->first);
        }
        return in.statements;
    }

    struct WRITERS {
        std::vector<const NODE*> statements;
        bool is_known = false;
    };
    SIDE_TABLE<WRITERS> writers;
    int64_t statements_left = MOST_STATEMENTS;
};

// ---- Certainty

// Which blocks every execution of their innermost loop gets to in its first iteration, ahead of anything that may not
// return.
class CERTAINTY {
public:
    bool holds_at_start(BBLK* bb) {
        signed char& known = certain[bb];
        if (known == 0) known = is_certain(bb) ? 1 : -1;
        return known > 0;
    }
    bool is_quiet(const BBLK* bb) {
        signed char& known = quiet[bb];
        if (known == 0) {
            known = 1;
            for (const LIST* s = bb->statements; s && known > 0; s = s->rest)
                if (may_leave_in_the_middle(s->first)) known = -1;
        }
        return known > 0;
    }

private:
    // Of what leads from the head to the block, all paths do.
    bool is_certain(BBLK* at) {
        const struct LOOP* loop = at->loop;
        if (at == loop->head) return true;
        ++now;
        std::vector<BBLK*> ahead{at};
        stamp[at] = now;
        for (size_t i = 0; i < ahead.size(); ++i) {
            if (ahead.size() > MOST_BLOCKS_AHEAD) return false;
            if (ahead[i] == loop->head) continue;
            for (const EDGE* e = ahead[i]->predecessors; e; e = e->rest) {
                if (e->first->loop != loop || !is_quiet(e->first)) return false;
                if (stamp[e->first] == now) continue;
                stamp[e->first] = now;
                ahead.push_back(e->first);
            }
        }
        for (size_t i = 1; i < ahead.size(); ++i)
            for (const EDGE* e = ahead[i]->successors; e; e = e->rest)
                if (e->first == loop->head || stamp[e->first] != now) return false;
        return true;
    }

    SIDE_TABLE<signed char> certain, quiet; // 0: not asked yet
    SIDE_TABLE<unsigned> stamp;
    unsigned now = 0;
};

class HOISTING {
public:
    void run() {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            if (!bb->loop || bb->loop->is_root()) continue;
            is_certain_here = certainty.holds_at_start(bb);
            for (LIST* s = bb->statements; s; s = s->rest) {
                is_certain_here = is_certain_here && !may_leave_in_the_middle(s->first);
                statement(s, bb);
            }
        }
        RCXQ queue;
        for (const auto& rcx : all)
            if (weigh(*rcx)) queue.push(rcx.get());
        if (print_debug) queue.dump();
        int cost = 0;
        for (RCX* rcx = queue.pop(); rcx; rcx = queue.pop()) {
            if (++hoisted_from[rcx->common_loop] > MOST_TEMPORARIES) continue;
            if ((cost += rcx->cost) > MOST_COST) break;
            if (rewrite_is_allowed(rcx->tree())) hoist(*rcx);
        }
        if (cost == 0) return;
        sym_split(currfuninfo);
        changed(fact::graph | fact::alias_marks);
    }

private:
    // ---- Collection

    void statement(LIST* s, BBLK* bb) {
        const NODE* t = below_SSA(s->first);
        if (t->op == SSA_PHI || t->op == NASSERT || t->op == ASSERT || t->op == PPRAGMA || t->op == ASM ||
            tree_is_EH_SWITCH(t))
            return;
        here = {nullptr, s, bb};
        is_conditional = false;
        for (NODE** place = &s->first; *place;) {
            if (op_is_SSA((*place)->op)) {
                place = &(*place)->left;
                continue;
            }
            const bool is_test = (*place)->op == IF || (*place)->op == SWITCH;
            operands(*place, is_test);
            return;
        }
    }

    void operands(NODE* t, bool is_test) {
        if (t->op == UAND || t->op == ARGREF) return;
        if (is_test) { // the result of a comparison is not worth a variable
            if (boolean_result[t->left->op] && !op_is_SSA(t->left->op))
                operands(t->left, false);
            else
                visit(&t->left);
            return;
        }
        if (t->left)
            op_is_SSA(t->op) || writes_left_operand(t->op) || op_is_load(t->op) ? place(&t->left, t) : visit(&t->left);
        const bool was_conditional = is_conditional;
        is_conditional |= t->op == QUEST || t->op == ANDAND || t->op == OROR;
        if (t->right && t->right->op != FIELD) visit(&t->right);
        is_conditional = was_conditional;
    }

    // What is written, or the reference that an operator stands for; a load's pointer is a value.
    void place(NODE** link, const NODE* holder) {
        if (holder->op == UMULT || holder->op == STREF || holder->op == SSA_CHI) return visit(link);
        if ((*link)->left) operands(*link, false);
    }

    void visit(NODE** link) {
        NODE* t = *link;
        if (!t->left || t->op == UAND || t->op == ARGREF) return;
        if (is_candidate(t) && enter(link)) return;
        operands(t, false);
    }

    static bool is_candidate(const NODE* t) {
        if (!is_small(t)) return false;
        const NODE* access = below_SSA(t);
        if (access->op == NAME || op_is_SSA_definition(t->op) || is_access_by_name(access) || !is_plain_number(t->type)) return false;
        // An address that is kept in a variable would let the object be reached by pointers.
        if (!good_CSE_tree(access, false) || (t->type->is_pointer() && tree_contains_op(t, UAND))) return false;
        if (!op_is_load(access->op) && !computes(access->op)) return false;
        return !is_of_variables(t);
    }

    static bool is_small(const NODE* t) {
        int nodes_left = MOST_NODES;
        return !any_subtree(t, [&nodes_left](const NODE*) { return --nodes_left < 0; });
    }

    // `hoist_invariants` moves it, once the inductions that it may be a part of are found.
    static bool is_of_variables(const NODE* t) {
        return !any_subtree(t, [](const NODE* n) {
            return op_is_load(n->op) || (n->op == NAME && !is_private_name(n)) ||
                   ((n->op == DIV || n->op == MOD) && n->right->op != ICON) || boolean_result[n->op];
        });
    }

    // The outermost loop that keeps it, from the innermost one on: where each iteration gets to it.
    bool enter(NODE** link) {
        const NODE* t = *link;
        struct LOOP* loop = here.block->loop;
        if (!invariance.holds(t, loop)) return false;
        const bool traps = may_trap(t);
        bool is_certain = !is_conditional && is_certain_here;
        if (traps && !is_certain) return false;
        BBLK* at = here.block;
        if (is_conditional || !bb_dominates_bb(at, loop->tail) || !loop->preheader) return false;
        for (;;) {
            struct LOOP* around = loop->parent;
            at = loop->preheader;
            if (around->is_root() || !around->preheader || !bb_dominates_bb(at, around->tail)) break;
            const bool stays_certain = is_certain && certainty.is_quiet(at) && certainty.holds_at_start(at);
            if ((traps && !stays_certain) || !invariance.holds(t, around)) break;
            is_certain = stays_certain;
            loop = around;
        }
        RCX& rcx = rcx_for(t, loop);
        rcx.is_certain |= is_certain;
        here.place = link;
        rcx.instances.push_back(here);
        return true;
    }

    static size_t hash_of(const NODE* t) {
        size_t hash = 0;
        for_each_subtree(t, [&hash](const NODE* n) {
            const size_t own = n->op == NAME ? n->u.sym->uid : n->op == ICON ? static_cast<size_t>(n->u.lval.value) : 0;
            hash += (static_cast<size_t>(n->op) + 1) * 0x9E3779B1u + own * 0x85EBCA6Bu; // operands may be exchanged
        });
        return hash;
    }

    RCX& rcx_for(const NODE* t, struct LOOP* loop) {
        std::vector<RCX*>& candidates = by_hash[hash_of(t)];
        for (RCX* rcx : candidates)
            if (rcx->loop == loop && equiv_mtypes(rcx->tree()->type, t->type) &&
                trees_are_congruent(rcx->tree(), t, false))
                return *rcx;
        all.push_back(std::make_unique<RCX>());
        RCX& rcx = *all.back();
        rcx.loop = loop;
        rcx.order = static_cast<unsigned>(all.size());
        candidates.push_back(&rcx);
        return rcx;
    }

    // ---- Weight

    bool weigh(RCX& rcx) {
        int small = 0, inner = 0, other = 0, last = 0;
        rcx.common_loop = rcx.instances.front().block->loop;
        for (const RCX::INSTANCE& i : rcx.instances) {
            struct LOOP* loop = i.block->loop;
            const bool is_innermost = !loop_has_subloops(loop);
            inner += is_innermost;
            small += is_innermost && loop->tail->dfn - loop->head->dfn + 1 < SMALL_LOOP;
            other += !is_innermost;
            last = std::max(last, loop == rcx.loop ? i.block->dfn : loop->tail->dfn);
            rcx.common_loop = innermost_common_loop(rcx.common_loop, loop);
        }
        if (inner) rcx.benefit = 120 * small + 60 * inner + 30 * other + count_nodes_in_tree(rcx.tree(), true, false);
        rcx.cost = std::max(1, last + 1 - rcx.loop->preheader->dfn);
        return rcx.priority() > 0;
    }

    // ---- The move

    static void tell(const RCX& rcx) {
        remark("hoist", rcx.instances.front().cell->psn, REMARK::DONE,
               "'" + reference_text(rcx.tree()) + "' is computed ahead of the loop");
    }

    void hoist(RCX& rcx) {
        if (remarks_are_wanted) tell(rcx);
        NODE* value = copy_tree(rcx.tree());
        TYPE* type = value->type->stqs();
        SYMTAB* temp = sym_temp('H', -1, type, nullptr);
        if (type->is_pointer()) {
            NODE* pointer = copy_tree_removing_SSA_operators(value);
            currfuninfo->spmap->set_pointee(temp, pointer);
            erase_tree(pointer);
        }
        for (const RCX::INSTANCE& i : rcx.instances) {
            NODE* old = *i.place;
            *i.place = coerce_to_type(old->type, mk_NAME(temp, old->ls));
            erase_tree(old);
        }
        if (!rcx.is_certain)
            value = rewrite_tree(value,
                                 [](NODE* t) { return is_exact_by_rule(t->op, t->type) ? kept_exact(t, nullptr) : t; });
        insert_at_end_of_body(rcx.loop->preheader, mk_ASG(mk_NAME(temp), coerce_to_type(type, value)));
        make_sym_RC_in_loop(temp, rcx.loop);
        for (struct LOOP* l = rcx.loop->parent; l; l = l->parent) make_sym_altered_in_loop(temp, l);
    }

    INVARIANCE invariance;
    CERTAINTY certainty;
    std::vector<std::unique_ptr<RCX>> all;
    std::unordered_map<size_t, std::vector<RCX*>> by_hash;    // looked up alone
    std::unordered_map<const struct LOOP*, int> hoisted_from; // by the common loop; looked up alone
    RCX::INSTANCE here = {};
    bool is_conditional = false, is_certain_here = false;
};

} // namespace

void hoist_SSA_region_constants() {
    if (!function_is_in_SSA_form || !loop_root() || size_speed_goal() < LEAST_GOAL) return;
    if (!currfuninfo->stack_is_laid_out) return;
    if (print_debug) debug_printf("\n\n\t\t\t------- ENTERING 'hoist_SSA_region_constants' ------\n");
    HOISTING().run();
}
