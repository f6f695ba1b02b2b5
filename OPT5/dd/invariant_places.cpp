// A place that a loop writes and whose address stays in it is reached by a pointer of its own, made ahead of the loop:
// such places live in registers where promotion finds that they may.
//
//     for (k...) c[i][j] += a[i][k] * b[k][j];          p = &c[i][j]; for (k...) *p += a[i][k] * b[k][j];
//
// Needs: a loop hierarchy, trees in normal form, alias marks. Leaves: the graph.
// Sound because the address is computed, not used, ahead of the loop, nothing in the loop changes what it is computed from,
// and it is arithmetic that cannot fail: `if (d) c[i / d] += ...` stays, since no iteration may divide. Only where no other access of the loop may meet the place: elsewhere it stays in memory, and what is known
// of its subscripts serves other steps better.
#include "OPT5/dd/dd.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

#include <vector>

namespace {

constexpr size_t MOST_REFERENCES = 64; // of a loop that is looked at

struct PLACE {
    NODE* access; // its first
    std::vector<NODE*> later;
    int writes = 0;
};

bool has_own_address(const NODE* umult) {
    const NODE* base = umult->left;
    return !umult->right && (base->op == NAME || base->op == UAND);
}

class NAMING {
public:
    explicit NAMING(struct LOOP* l) : loop(l) {}

    bool run() {
        if (!loop->preheader || !collect()) return false;
        bool any = false;
        for (PLACE& place : places) {
            if (!is_candidate(place)) continue;
            name(place);
            any = true;
        }
        return any;
    }

private:
    bool collect() {
        for (BBLK* bb : loop->contents)
            for (LIST* s = bb->statements; s; s = s->rest)
                if (!collect_statement(s->first) || count > MOST_REFERENCES) return false;
        return true;
    }

    // False where more may happen than the accesses that the trees show.
    bool collect_statement(NODE* t) {
        if (t->op == PPRAGMA) return true;
        if (t->op == ASM) return false;
        const NODE* target = writes_left_operand(t->op) ? without_members(t->left) : nullptr;
        bool is_plain = true;
        for_each_subtree(t, [&](NODE* n) {
            is_plain &= !op_is_call(n->op) && n->op != STREF && (n == t || !writes_left_operand(n->op));
            if (n->op == UMULT) enter(n, n == target);
        });
        return is_plain && (!target || target->op == NAME || target->op == UMULT);
    }

    void enter(NODE* access, bool is_write) {
        ++count;
        for (PLACE& place : places)
            if (trees_are_congruent(place.access, access, false) && equiv_mtypes(place.access->type, access->type)) {
                place.later.push_back(access);
                place.writes += is_write;
                return;
            }
        places.push_back({access, {}, is_write});
    }

    bool may_be_made_ahead(const NODE* t) const {
        return !tree_has_side_effects(t) && !may_trap(t) && tree_is_RC_in_loop(t, loop, false);
    }

    bool is_candidate(const PLACE& place) const {
        const NODE* t = place.access;
        if (!place.writes || has_own_address(t) || !t->type->is_scalar() || lvalue_is_volatile(t)) return false;
        if (!may_be_made_ahead(t->left) || (t->right && !may_be_made_ahead(t->right))) return false;
        for (const PLACE& other : places)
            if (&other != &place && lvalues_may_be_aliased(t, other.access, loop)) return false;
        return rewrite_is_allowed(t);
    }

    void name(const PLACE& place) {
        NODE* access = denormalize_tree(copy_dd_tree(place.access), false);
        TYPE* type = tp->mk_ptr(access->type);
        NODE* address = coerce_to_type(type, access->left);
        erase_node(access);
        SYMTAB* pointer = sym_temp('H', -1, type, nullptr);
        currfuninfo->spmap->set_pointee(pointer, address);
        NODE* asg = mk_ASG(mk_NAME(pointer), address);
        insert_at_end_of_body(loop->preheader, normalize_tree(asg, asg));
        make_sym_RC_in_loop(pointer, loop);
        for (struct LOOP* l = loop->parent; l; l = l->parent) make_sym_altered_in_loop(pointer, l);
        point(place.access, pointer);
        for (NODE* later : place.later) point(later, pointer);
    }

    static void point(NODE* access, SYMTAB* pointer) {
        erase_tree(access->left);
        erase_tree(access->right);
        access->left = mk_NAME(pointer);
        access->right = nullptr;
    }

    struct LOOP* loop;
    std::vector<PLACE> places;
    size_t count = 0;
};

} // namespace

void name_invariant_places(struct LOOP* root) {
    bool any = false;
    need(fact::alias_marks);
    for (struct LOOP* loop : loops_outer_first(root))
        if (!loop->is_root() && !loop_has_subloops(loop)) any |= NAMING(loop).run();
    if (any) sym_split(currfuninfo);
    if (any) changed(fact::graph);
}
