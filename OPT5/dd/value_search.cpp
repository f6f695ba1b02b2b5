// What a variable holds at the end of a block.
//
// Only variables count that nothing but their NAMEs reaches. The definition that reaches a block is found up the
// dominator tree: the last write of a block above, unless on the path up stands a block where values of several writes
// meet (an iterated dominance frontier). Behind a loop with a known count the variable has its value from ahead of it
// and so many steps.
//
// Sound because two places with one reaching definition see one value: between them the variable is not written, on any
// path. A value is handed on as a tree of constants and of variables whose reaching definition is the same where the
// tree was computed and where it is asked for.
#include "OPT5/dd/loop.h"

#include "OPT5/alias/effects.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frontiers.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <memory>
#include <unordered_map>

namespace {

bool may_be_searched(const SYMTAB* sym) {
    return sym && sym->level != 0 && !sym->is_aliased() && !sym->type->is_volatile() && sym->type->is_scalar();
}

struct DEFINITION {
    BBLK* bb;
    int place; // of the statement in the block
    const NODE* statement;
    bool is_assertion; // that the variable has a value; it writes nothing
};

struct SYMBOL_DEFINITIONS {
    std::vector<DEFINITION> all; // by block number and place
    std::vector<int> meets;      // blocks where several of them meet, ascending
    std::vector<bool> is_marked; // by block number: one of them stands there, or several meet
    bool meets_are_known = false;
    bool is_empty(const BBLK* bb) const { // of a block that was there when they were marked
        const size_t b = static_cast<size_t>(bb->dfn);
        return b < is_marked.size() && !is_marked[b];
    }
};

// Where control is: ahead of a statement of a block, or at its end.
struct POINT {
    BBLK* bb;
    int place;
};
constexpr int AT_END = INT32_MAX;

struct REACHING {
    enum KIND { NONE, DEFINED, MEET, ENTRY } kind = NONE;
    const DEFINITION* definition = nullptr;
    BBLK* meet = nullptr;
    bool operator==(const REACHING& o) const {
        return kind != NONE && kind == o.kind && definition == o.definition && meet == o.meet;
    }
};

class DEFINITIONS {
public:
    DEFINITIONS() {
        need(fact::dominators);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            int place = 0;
            for (const LIST* s = bb->statements; s; s = s->rest, ++place) enter(bb, place, s->first);
        }
    }
    // `with_assertions` false: of writes alone.
    REACHING reaching(const SYMTAB* sym, POINT at, int& budget, bool with_assertions);

private:
    void enter(BBLK* bb, int place, const NODE* t) {
        for_each_written_name(t, [&](const NODE* name, const NODE*) {
            if (!may_be_searched(name->u.sym)) return;
            auto& all = of[name->u.sym].all;
            if (all.empty() || all.back().statement != t) all.push_back({bb, place, t, false});
        });
        if ((t->op == ASSERT || t->op == NASSERT) && t->left && t->left->op == EQ && t->left->left->op == NAME &&
            t->left->right->op == ICON && may_be_searched(t->left->left->u.sym))
            of[t->left->left->u.sym].all.push_back({bb, place, t, true});
    }
    const std::vector<int>& meets(SYMBOL_DEFINITIONS& d) {
        if (!d.meets_are_known) {
            if (!frontiers) frontiers = std::make_unique<FRONTIERS>();
            std::vector<int> in;
            for (const DEFINITION& x : d.all)
                if (!x.is_assertion && (in.empty() || in.back() != x.bb->dfn)) in.push_back(x.bb->dfn);
            d.meets = frontiers->iterated(in);
            d.is_marked.assign(static_cast<size_t>(currfuninfo->bb_count) + 1, false);
            for (const DEFINITION& x : d.all) d.is_marked[static_cast<size_t>(x.bb->dfn)] = true;
            for (int b : d.meets) d.is_marked[static_cast<size_t>(b)] = true;
            d.meets_are_known = true;
        }
        return d.meets;
    }

    std::unordered_map<const SYMTAB*, SYMBOL_DEFINITIONS> of; // looked up alone
    std::unique_ptr<FRONTIERS> frontiers;
};

REACHING DEFINITIONS::reaching(const SYMTAB* sym, POINT at, int& budget, bool with_assertions) {
    REACHING r;
    auto found = of.find(sym);
    if (found == of.end()) {
        r.kind = REACHING::ENTRY;
        return r;
    }
    SYMBOL_DEFINITIONS& d = found->second;
    const std::vector<int>& meet_blocks = meets(d);
    BBLK* bb = at.bb;
    for (int place = at.place; --budget > 0; place = AT_END) {
        if (!d.is_empty(bb)) {
            auto it = std::lower_bound(
                d.all.begin(), d.all.end(), std::make_pair(bb->dfn, place),
                [](const DEFINITION& a, const std::pair<int, int>& b) { return std::make_pair(a.bb->dfn, a.place) < b; });
            while (it != d.all.begin() && std::prev(it)->bb == bb && std::prev(it)->is_assertion && !with_assertions) --it;
            if (it != d.all.begin() && std::prev(it)->bb == bb) {
                r.kind = REACHING::DEFINED;
                r.definition = &*std::prev(it);
                return r;
            }
            if (std::binary_search(meet_blocks.begin(), meet_blocks.end(), bb->dfn)) {
                r.kind = REACHING::MEET;
                r.meet = bb;
                return r;
            }
        }
        BBLK* above = currfuninfo->dominators->immediate_dominator(bb->dfn);
        if (!above || above == bb) {
            r.kind = REACHING::ENTRY;
            return r;
        }
        bb = above;
    }
    return r;
}

std::unique_ptr<DEFINITIONS> known; // of the current function
bool is_kept = false;               // from one question to the next

class SEARCH {
public:
    SEARCH(BBLK* at_end_of, int blocks) : asked{at_end_of, AT_END}, budget(blocks) {
        if (!known) known = std::make_unique<DEFINITIONS>();
    }
    ~SEARCH() {
        if (!is_kept) known.reset();
    }
    SEARCH(const SEARCH&) = delete;
    SEARCH& operator=(const SEARCH&) = delete;
    NODE* value(SYMTAB* sym, POINT at, int depth);

private:
    NODE* assigned(SYMTAB* sym, const DEFINITION& d, int depth);
    NODE* behind_loop(SYMTAB* sym, struct LOOP* loop, int depth);
    NODE* resolved(NODE* copy, POINT at, int depth);
    bool is_unchanged(SYMTAB* sym, POINT since) {
        return known->reaching(sym, since, budget, false) == known->reaching(sym, asked, budget, false);
    }
    // The outermost loop around `bb` that control has left where the value is asked for.
    struct LOOP* left_loop(const BBLK* bb) const {
        struct LOOP* found = nullptr;
        for (struct LOOP* l = bb->loop; l && !loop_is_subloop_of_loop(asked.bb->loop, l, true); l = l->parent)
            found = l;
        return found;
    }

    POINT asked;
    int budget;
    static constexpr int MOST_NODES = 64;
};

NODE* SEARCH::value(SYMTAB* sym, POINT at, int depth) {
    if (depth <= 0 || budget < 2 || !may_be_searched(sym) || (sym->type->qual_kind(false) & QUAL_RESTRICT))
        return nullptr;
    const REACHING r = known->reaching(sym, at, budget, true);
    switch (r.kind) {
    case REACHING::DEFINED:
        if (r.definition->is_assertion) return copy_tree(r.definition->statement->left->right);
        if (struct LOOP* loop = left_loop(r.definition->bb)) return behind_loop(sym, loop, depth);
        return assigned(sym, *r.definition, depth);
    case REACHING::MEET:
        if (struct LOOP* loop = left_loop(r.meet); loop && loop->head == r.meet) return behind_loop(sym, loop, depth);
        return nullptr;
    default: return nullptr;
    }
}

NODE* SEARCH::assigned(SYMTAB* sym, const DEFINITION& d, int depth) {
    const NODE* t = d.statement;
    if (!t->left || t->left->op != NAME || t->left->u.sym != sym) return nullptr;
    NODE* right = nullptr;
    if (t->op == ASG)
        right = copy_tree(t->right);
    else if (t->op == PLUSASG || t->op == MINUSASG || t->op == PLUSPLUS || t->op == MINMIN) {
        NODE* plain = opASG_to_ASG(copy_tree(t));
        if (plain->op == ASG) {
            right = plain->right;
            plain->right = nullptr;
        }
        erase_tree(plain);
    }
    if (!right) return nullptr;
    right = resolved(right, {d.bb, d.place}, depth - 1);
    return right ? simp_tree(coerce_to_type(sym->type->stqs(), right), nullptr) : nullptr;
}

// A loop that ends by its test alone, behind a known number of steps: those of its tail.
NODE* SEARCH::behind_loop(SYMTAB* sym, struct LOOP* loop, int depth) {
    const LOOPIV* iv = find_LOOPIV_for_IV(sym, loop, false);
    const EDGE* last = loop->exits.size() == 1 ? loop->exits.front()->predecessors : nullptr;
    const bool ends_by_test =
        last && !last->rest && last->first == (loop->is_bottom_tested() ? loop->tail : loop->head);
    if (!iv || !ends_by_test || !loop->trips || loop->trips->op != ICON || !iv->incrtree || iv->incrtree->op != ICON)
        return nullptr;
    if (!loop->is_bottom_tested() && iv->has(IV_updated_in_head)) return nullptr; // which is executed once more
    if (!iv->has(IV_affine)) return nullptr;
    NODE* start = value(sym, {loop->preheader, AT_END}, depth - 1);
    if (!start) return nullptr;
    const INT65 steps = loop->trips->u.lval * iv->incrtree->u.lval;
    TYPE* type = sym->type->stqs();
    if (type->is_pointer()) return simp_node(maketree(PLUS, start, mk_ICON(steps, tp->long_t), type), nullptr);
    return made_exact(PLUS, coerce_to_type(type, start), mk_ICON(steps, type), type, nullptr);
}

// The tree, which is consumed, in values that stand where the search began; null where it has none.
NODE* SEARCH::resolved(NODE* copy, POINT at, int depth) {
    bool is_known = count_nodes_in_tree(copy) <= MOST_NODES && !tree_has_side_effects(copy) &&
                    !any_subtree(copy, [](const NODE* n) {
                        return op_is_load(n->op) || op_is_call(n->op);
                    });
    if (is_known && copy->op == UAND) return copy;
    NODE* t = !is_known ? copy : rewrite_tree(copy, [&](NODE* n) {
        if (n->op != NAME || !is_known) return n;
        if (n->u.sym && symbol_is_immutable(n->u.sym) && may_be_searched(n->u.sym)) return n;
        if (!may_be_searched(n->u.sym)) {
            is_known = !n->type->is_scalar() && n->u.sym; // an array's or function's address
            return n;
        }
        NODE* v = value(n->u.sym, at, depth);
        const bool may_stay = (!v || !expr_is_constant(v)) && is_unchanged(n->u.sym, at);
        if (may_stay) {
            if (v) erase_tree(v);
            return n;
        }
        if (!v) {
            is_known = false;
            return n;
        }
        TYPE* type = n->type->stqs();
        erase_tree(n);
        return coerce_to_type(type, v);
    });
    if (is_known && count_nodes_in_tree(t) <= MOST_NODES) return t;
    erase_tree(t);
    return nullptr;
}

NODE* asserted_value(const SYMTAB* sym, const struct LOOP* loop) {
    for (; loop; loop = loop->parent)
        if (sym_is_RC_in_loop(sym, loop))
            for (const NODE* fact : loop->givens)
                if (fact->op == EQ && fact->left->op == NAME && fact->left->u.sym == sym && fact->right->op == ICON)
                    return coerce_to_type(sym->type->stqs(), copy_tree(fact->right));
    return nullptr;
}

} // namespace

NODE* find_symbol_value(SYMTAB* sym, BBLK* at_end_of, struct LOOP* loop, int budget, int depth) {
    if (NODE* v = asserted_value(sym, loop)) return v;
    if (!may_be_searched(sym) || (sym->type->qual_kind(false) & QUAL_RESTRICT)) return nullptr;
    NODE* v = SEARCH(at_end_of, budget).value(sym, {at_end_of, AT_END}, depth);
    if (v || !sym->type->is_pointer()) return v;
    // Asked in the middle of a pass: what the search for bindings rests on is not found anew here.
    if (!is_known(fact::block_numbers | fact::alias_marks | fact::pointees)) return nullptr;
    need(fact::points_to);
    return find_var_init_in_PT_info(sym, at_end_of);
}

void keep_symbol_values(bool keep) {
    is_kept = keep;
    known.reset();
}
void forget_symbol_values() { known.reset(); }

NODE* find_expr_init(const NODE* expr, struct LOOP* loop) {
    constexpr int BUDGET = 500, DEPTH = 10;
    if (!loop->preheader) return nullptr;
    NODE* t = rewrite_tree(copy_tree(expr), [loop](NODE* n) {
        if (n->op != NAME || !may_be_searched(n->u.sym)) return n;
        NODE* v = find_symbol_value(n->u.sym, loop->preheader, loop, BUDGET, DEPTH);
        if (!v) return n;
        TYPE* type = n->type->stqs();
        erase_tree(n);
        return coerce_to_type(type, v);
    });
    return simp_tree(t, loop);
}

BBLK* find_dominator_bb(BBLK* bb) {
    need(fact::dominators);
    BBLK* above = currfuninfo->dominators->immediate_dominator(bb);
    return above && above->dfn < bb->dfn ? above : nullptr;
}

BBLK* find_dominator_bb_for_sym(BBLK* bb, SYMTAB* sym, INT65* adjustment) {
    BBLK* above = find_dominator_bb(bb);
    if (!above || loop_is_subloop_of_loop(bb->loop, above->loop, true)) return above;
    struct LOOP* left = above->loop;
    while (left->parent && !loop_is_subloop_of_loop(bb->loop, left->parent, true)) left = left->parent;
    if (sym_is_RC_in_loop(sym, left)) return left->preheader;
    const LOOPIV* iv = find_LOOPIV_for_IV(sym, left, false);
    if (iv && left->trips && left->trips->op == ICON && !left->has(LOOP_early_exit) && left->is_bottom_tested() &&
        iv->incrtree && iv->incrtree->op == ICON) {
        *adjustment = *adjustment + left->trips->u.lval * iv->incrtree->u.lval;
        return left->preheader;
    }
    return symbol_is_immutable(sym) ? currfuninfo->bb_list : nullptr;
}
