// Subscripts as canonical trees, and what keeps its value in a nest of loops.
//
// Needs: the loop hierarchy. Leaves: nothing changed.
// Sound because a canonical tree has the value of the subscript modulo its width: sums are taken apart only where they
// wrap no earlier, and put together in the unsigned type, which wraps there.
#include "OPT5/dd/dependence.h"

#include "OPT5/dd/loop.h"
#include "OPT5/dd/ssa.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/linear_value.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <vector>

namespace {

TYPE* unsigned_twin(const TYPE* t) {
    for (TYPE* u : {tp->uint_t, tp->ulong_t, tp->ullong_t})
        if (u->size == t->size) return u;
    return nullptr;
}

// The deepest loop around `loop`, or itself, one of whose induction variables stands in the tree; 0 for none.
int depth_of_inductions(const NODE* tree, struct LOOP* loop) {
    int depth = 0;
    for_each_subtree(tree, [&](const NODE* t) {
        if (t->op != NAME) return;
        if (const LOOPIV* iv = find_LOOPIV_for_IV(t->u.sym, loop, true)) depth = std::max<int>(depth, iv->loop->level);
    });
    return depth;
}

// Terms with induction variables first, those of outer loops ahead of those of inner ones.
NODE* tree_of(const LINEAR_FORM& sum, TYPE* type, struct LOOP* loop) {
    std::vector<std::pair<int, const LINEAR_FORM::TERM*>> order;
    for (const LINEAR_FORM::TERM& t : sum) {
        const int depth = depth_of_inductions(t.tree, loop);
        order.push_back({depth ? depth : INT_MAX, &t});
    }
    std::stable_sort(order.begin(), order.end(), [](const auto& a, const auto& b) { return a.first < b.first; });
    auto number = [type](int64_t v) { return mk_ICON(truncate_to_type(INT65(v), type), type); };
    NODE* tree = nullptr;
    for (const auto& [depth, t] : order) {
        NODE* term = coerce_to_type(type, copy_tree(t->tree));
        if (t->coefficient != 1) term = maketree(MULT, term, number(t->coefficient), type);
        tree = tree ? maketree(PLUS, tree, term, type) : term;
    }
    if (!sum.constant) return tree;
    return tree ? maketree(PLUS, tree, number(sum.constant), type) : number(sum.constant);
}

NODE* canonical(const NODE* ss1, const NODE* ss2, struct LOOP* loop, bool simplify) {
    if (!ss1 && !ss2) return nullptr;
    NODE* a = ss1 ? copy_dd_tree_removing_SSA_operators(ss1) : mk_ICON(INT65(0), ss2->type);
    NODE* b = ss2 ? copy_dd_tree_removing_SSA_operators(ss2) : nullptr;
    TYPE* own = a->type->stqs();
    TYPE* type = unsigned_twin(own);
    LINEAR_VALUE value(a, loop);
    if (b) value.subtract(b);
    NODE* tree;
    if (type && value.is_known()) {
        tree = tree_of(value.sum(), type, loop);
        if (tree) tree = coerce_to_type(own, tree);
        erase_tree(a);
        erase_tree(b);
    } else {
        TYPE* wide = b ? combined_type(a, b)->stqs() : own;
        if (TYPE* wrapping = unsigned_twin(wide)) wide = wrapping;
        tree = b ? maketree(MINUS, coerce_to_type(wide, a), coerce_to_type(wide, b), wide) : a;
    }
    return tree && simplify ? simp_tree(tree, loop) : tree;
}

} // namespace

NODE* canonicalize_ss_delta(const NODE* ss1, const NODE* ss2, struct LOOP* loop, bool simplify) {
    return canonical(ss1, ss2, loop, simplify);
}

NODE* canonicalize_symbolic_ss(const NODE* ss, struct LOOP* loop, bool simplify) {
    return canonical(ss, nullptr, loop, simplify);
}

// The iterations may differ at every level from the outermost one on that is not exactly the same iteration.
bool tree_is_RC_in_loop_nest(const NODE* tree, struct LOOP* loop, const DDEP* vector) {
    if (!loop) return expr_is_constant(tree) || (loop_root() && tree_is_RC_in_loop(tree, loop_root(), false));
    if (vector && !loop->is_root()) {
        int level = 1;
        while (level < loop->level && level < vector->count() && vector->ddve(level).has_only_SAME_dir()) ++level;
        while (loop->level > level) loop = loop->parent;
    }
    return tree_is_RC_in_loop(tree, loop, false);
}

bool tree_is_RC_in_common_loop(const NODE* tree, struct LOOP* l1, struct LOOP* l2) {
    return tree_is_RC_in_loop(tree, innermost_common_loop(l1, l2), false);
}
