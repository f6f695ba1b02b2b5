// Definitions that a loop makes in each iteration and does not read are made behind it, once.
//
// Needs: a hierarchy, trees in normal form, alias marks. Leaves: the graph as it is.
// Sound because the variable, which nothing but its name reaches, is not read in the loop, the loop leaves to one block
// alone, no iteration leaves it ahead of the definition, and from there to the exit nothing changes what the definition
// reads: what it computes behind the loop is what it computed last. `x = *p; *q = i;` stays, where p and q may meet.
#include "OPT5/dd/dd.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"

#include <map>
#include <unordered_set>
#include <vector>

namespace {

constexpr size_t MOST_REFERENCES = 64; // of a variable that is looked at

struct REFERENCE {
    const struct LOOP* loop;
    bool is_definition; // by an assignment that does not read it; anything else counts as a read
};

class SINKER {
public:
    bool run(struct LOOP* root) {
        need(fact::alias_marks);
        collect();
        for (struct LOOP* loop : loops_inner_first(root))
            if (!loop->is_root() && loop->exits.size() == 1) sink_from(loop);
        return any;
    }

private:
    void collect() {
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest) collect(s->first, bb->loop);
    }
    void collect(const NODE* statement, const struct LOOP* loop) {
        SYMTAB* defined = statement->op == ASG ? assigned_variable(statement) : nullptr;
        if (defined) references[defined].push_back({loop, true});
        for_each_subtree(statement, [&](const NODE* t) {
            if (t->op == NAME && t->u.sym && !(defined && t == statement->left))
                references[t->u.sym].push_back({loop, false});
        });
    }

    void sink_from(struct LOOP* loop) {
        for (BBLK* bb : loop->contents) {
            if (bb->loop != loop) continue;
            for (LIST** link = &bb->statements; *link && *link != bb->last_statement();)
                if (may_sink(*link, bb, loop))
                    sink(link, loop);
                else
                    link = &(*link)->rest;
        }
    }

    bool may_sink(const LIST* s, BBLK* bb, struct LOOP* loop) {
        const NODE* t = s->first;
        SYMTAB* x = t->op == ASG ? assigned_variable(t) : nullptr;
        return x && x->type->is_scalar() && only_its_name_reaches(x) && is_only_reference(x, loop) &&
               !tree_has_side_effects(t->right) && every_exit_passes(bb, loop) && keeps_its_value(s, bb, loop);
    }

    bool is_only_reference(SYMTAB* x, const struct LOOP* loop) {
        const std::vector<REFERENCE>& all = references[x];
        if (all.size() > MOST_REFERENCES) return false;
        int inside = 0;
        for (const REFERENCE& r : all) {
            if (!loop_is_subloop_of_loop(r.loop, loop, true)) continue;
            if (!r.is_definition || ++inside > 1) return false;
        }
        return inside == 1;
    }

    // Blocks of the loop that are reached from `from` without passing `bb`, which ends an iteration, or the head.
    template <class F>
    bool each_block_short_of(const std::vector<BBLK*>& from, const BBLK* bb, const struct LOOP* loop, const F& visit) {
        std::unordered_set<const BBLK*> seen{bb, loop->head}; // membership only
        std::vector<BBLK*> waiting;
        auto enter = [&](BBLK* to) {
            if (to->loop && loop_is_subloop_of_loop(to->loop, loop, true) && seen.insert(to).second)
                waiting.push_back(to);
        };
        for (BBLK* to : from) enter(to);
        while (!waiting.empty()) {
            BBLK* at = waiting.back();
            waiting.pop_back();
            if (!visit(at)) return false;
            for (const EDGE* e = at->successors; e; e = e->rest) enter(e->first);
        }
        return true;
    }

    static std::vector<BBLK*> successors_of(const BBLK* bb) {
        std::vector<BBLK*> to;
        for (const EDGE* e = bb->successors; e; e = e->rest) to.push_back(e->first);
        return to;
    }

    static bool leaves(const BBLK* bb, const struct LOOP* loop) {
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (!e->first->loop || !loop_is_subloop_of_loop(e->first->loop, loop, true)) return true;
        return !bb->successors; // the function is left
    }

    bool every_exit_passes(const BBLK* bb, const struct LOOP* loop) {
        if (bb == loop->head) return true;
        if (leaves(loop->head, loop)) return false;
        return each_block_short_of(successors_of(loop->head), bb, loop,
                                   [loop](const BBLK* at) { return !leaves(at, loop); });
    }

    bool keeps_its_value(const LIST* s, const BBLK* bb, const struct LOOP* loop) {
        const NODE* value = s->first->right;
        if (expr_is_constant(value) || tree_is_RC_in_loop(value, loop, false)) return true;
        for (const LIST* later = s->rest; later; later = later->rest)
            if (tree_modifies_lvalue_in_tree(later->first, value)) return false;
        return each_block_short_of(successors_of(bb), bb, loop,
                                   [value](const BBLK* at) { return !bb_modifies_lvalue_in_tree(at, value); });
    }

    void sink(LIST** link, struct LOOP* loop) {
        LIST* s = *link;
        BBLK* exit = loop->exits.front();
        for (REFERENCE& r : references[assigned_variable(s->first)])
            if (loop_is_subloop_of_loop(r.loop, loop, true)) r.loop = exit->loop;
        for_each_subtree(static_cast<const NODE*>(s->first->right), [&](const NODE* t) {
            if (t->op == NAME && t->u.sym) references[t->u.sym].push_back({exit->loop, false});
        });
        insert_before(&exit->statements, copy_dd_tree(s->first), s->psn);
        drop_statement(link);
        any = true;
    }

    std::map<SYMTAB*, std::vector<REFERENCE>, BY_UID> references;
    bool any = false;
};

} // namespace

bool sink_unused_definitions(struct LOOP* root) { return SINKER().run(root); }
