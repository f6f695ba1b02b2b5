// Facts of loops: conditions that hold wherever the loop runs, for the questions about values that are asked in it.
//
// They come from assertions in the head, and from assertions and tests on the straight line of blocks that leads to the
// preheader; pragmas that stand there go to the record of the loop on the same walk.
//
// Needs: invariants of the loops; of those that are induction variables, their directions. Leaves: the same; pragmas
// are taken out of the statements.
// Sound because a fact of values on entry reads invariants of the loop alone, and nothing between it and the loop may
// change what it reads. An assertion in the head counts only where no call stands ahead of it: the call may not return,
// and then the assertion says nothing of what was done before. One on a variable that only grows, as v >= 3, also holds
// in the iterations that follow. Facts die with the hierarchy, for a later pass may give a variable another meaning.

#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"
#include "OPT5/dd/reference_form.h"
#include "OPT5/dd/trip.h"

#include "IFILE/pragma.h"
#include "OPT5/alias/effects.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

#include <set>

// ---- Callbacks

namespace {

struct LOOP* parent_of(const struct LOOP* loop) {
    return loop->parent;
}
const std::vector<NODE*>& givens_of(const struct LOOP* loop) { return loop->givens; }
void add_given(struct LOOP* loop, NODE* condition) { loop->givens.push_back(condition); }
bool is_constant_in(const NODE* tree, const struct LOOP* loop) {
    return expr_is_constant(tree) || tree_is_RC_in_loop(tree, loop, false);
}

} // namespace

void install_loop_callbacks() {
    loop_callbacks.parent = parent_of;
    loop_callbacks.givens = givens_of;
    loop_callbacks.add_given = add_given;
    loop_callbacks.is_constant_in = is_constant_in;
    loop_callbacks.bounds_of_count = bounds_of_count;
}

// ---- Normal form of assertions

namespace {

bool is_icon(const NODE* t, INT65 value) { return t->op == ICON && t->u.lval == value; }

// A node whose operand `kept` takes its place.
NODE* replaced_by(NODE* t, NODE* kept) {
    for (NODE* operand : {t->left, t->right})
        if (operand && operand != kept) erase_tree(operand);
    erase_node(t);
    return kept;
}

// Gives 1 or 0, by its operator.
bool is_truth_value(const NODE* t) { return boolean_result[t->op] && !op_is_float_compare(t->op); }

// (a < b) == 0 as a >= b, and the like; null where it is nothing of that kind. (a && b) == 0 has no shorter form.
NODE* reduced_boolean(NODE* t) {
    if ((t->op != EQ && t->op != NEQ) || t->right->op != ICON || !is_truth_value(t->left)) return nullptr;
    const bool is_zero = is_icon(t->right, INT65(0));
    if (!is_zero && !is_icon(t->right, INT65(1))) return nullptr;
    const bool holds = is_zero == (t->op == NEQ);
    if (!holds && is_zero && !tree_is_trivially_invertible(t->left)) return nullptr;
    NODE* inner = replaced_by(t, t->left);
    return holds ? inner : invert_boolean_tree(inner);
}

NODE* with_constant_on_the_right(NODE* t) {
    if (!op_is_int_compare(t->op) || t->left->op != ICON || t->right->op == ICON || commute_inv[t->op] == ILLOP)
        return t;
    t->op = static_cast<decltype(t->op)>(commute_inv[t->op]);
    std::swap(t->left, t->right);
    return t;
}

// (x & (2^k - 1)) == 0 as x % 2^k == 0.
NODE* mask_as_remainder(NODE* t) {
    NODE* mask = t->op == EQ && is_icon(t->right, INT65(0)) && t->left->op == ANDB ? t->left->right : nullptr;
    if (!mask || mask->op != ICON || mask->u.lval < INT65(1)) return t;
    const INT65 modulus = mask->u.lval + INT65(1);
    if (power_of_2(modulus) < 1 || modulus > int_type_max(t->left->type->stqs())) return t;
    t->left->op = MOD;
    t->left->right = mk_ICON(modulus, t->left->type->stqs());
    erase_tree(mask);
    return t;
}

// (x >> k) < c as x < c << k, (x >> k) <= c as x < (c + 1) << k, and their opposites: a shift rounds down.
NODE* without_shift(NODE* t) {
    if (!op_is_int_compare(t->op) || t->op == EQ || t->op == NEQ || t->left->op != SRL || t->right->op != ICON)
        return t;
    NODE* shift = t->left;
    TYPE* type = shift->type->stqs();
    const bool compares_values = (t->op >= ULE) == type->is_unsigned();
    if (!compares_values || !type->is_int() || shift->left->type->size != type->size || shift->right->op != ICON ||
        shift->left->type->is_unsigned() != type->is_unsigned() || shift->right->u.lval < INT65(0) ||
        shift->right->u.lval >= INT65(static_cast<int64_t>(type->size)))
        return t;
    int op = t->op;
    INT65 c = t->right->u.lval;
    if (op == LE || op == ULE || op == GT || op == UGT) {
        c += INT65(1);
        op = op == LE ? LT : op == ULE ? ULT : op == GT ? GE : UGE;
    }
    const INT65 limit = c << shift->right->u.lval;
    if (limit < int_type_min(type) || limit > int_type_max(type)) return t;
    t->op = static_cast<decltype(t->op)>(op);
    t->left = replaced_by(shift, shift->left);
    erase_tree(t->right);
    t->right = mk_ICON(limit, type);
    return t;
}

NODE* normal_assertion(NODE* t) {
    t = denormalize_tree(t, false);
    if (t->op == OROR) {
        t->left = make_boolean(t->left, nullptr);
        t->right = make_boolean(t->right, nullptr);
        t->op = ORB;
        return t;
    }
    if (t->op == EXCLAIM) // of a truth value its opposite, of a number that it is 0
        t = is_truth_value(t->left) || !t->left->type->is_int()
                ? t
                : maketree(EQ, replaced_by(t, t->left), mk_ICON(INT65(0), t->left->type->stqs()), tp->int_t);
    t = with_constant_on_the_right(t);
    while (NODE* inner = reduced_boolean(t)) t = with_constant_on_the_right(inner);
    return without_shift(mask_as_remainder(t));
}

// (unsigned)x - 7u < 3u as x >= 7 and x <= 9: null where it is nothing of that kind. The tree is consumed then.
bool split_range(NODE* t, std::vector<NODE*>& parts) {
    if ((t->op != ULT && t->op != ULE) || t->right->op != ICON) return false;
    NODE *sum = t->left, *cast = sum;
    TYPE* type = sum->type->stqs();
    INT65 low(0);
    if ((sum->op == PLUS || sum->op == MINUS) && sum->right->op == ICON && type->is_int()) {
        const INT65 k = sign_extend_by_type_size(sum->right->u.lval, type);
        low = sum->op == PLUS ? -k : k;
        cast = sum->left;
    }
    if (cast->op != SCONV || !type->is_int() || !type->is_unsigned() || cast->type->size != type->size) return false;
    TYPE* own = cast->left->type->stqs();
    if (!own->is_int() || !own->is_signed() || own->size != type->size) return false;
    const INT65 high = low + truncate_to_type(t->right->u.lval, type) - INT65(t->op == ULT ? 1 : 0);
    if (low < int_type_min(own) || high > int_type_max(own) || high < low) return false;
    parts.push_back(maketree(GE, copy_tree(cast->left), mk_ICON(low, own), tp->int_t));
    parts.push_back(maketree(LE, copy_tree(cast->left), mk_ICON(high, own), tp->int_t));
    erase_tree(t);
    return true;
}

// The conjuncts, in order. The tree is consumed.
void split(NODE* t, std::vector<NODE*>& parts) {
    std::vector<NODE*> work{t};
    while (!work.empty()) {
        t = work.back();
        work.pop_back();
        auto joins = [](const NODE* n) {
            return n->op == ANDAND || n->op == MIX_CONJ ||
                   (n->op == ANDB && returns_1_or_0(n->left) && returns_1_or_0(n->right));
        };
        if (t->op == NEQ && is_icon(t->right, INT65(0)) && joins(t->left)) t = replaced_by(t, t->left);
        if (!joins(t)) {
            if (!split_range(t, parts)) parts.push_back(t);
            continue;
        }
        work.push_back(t->right);
        work.push_back(t->left);
        erase_node(t);
    }
}

// ---- What is known already

constexpr int MOST_COMPARED = 128;

// The constant of x % m == 0, or null.
NODE* modulus_of(const NODE* t) {
    if (t->op != EQ || !is_icon(t->right, INT65(0)) || t->left->op != MOD) return nullptr;
    NODE* m = t->left->right;
    return m->op == ICON && m->u.lval > INT65(0) ? m : nullptr;
}

bool speak_of_one_dividend(const NODE* a, const NODE* b) {
    return trees_are_congruent(a->left->left, b->left->left, false);
}

// Whether `given`, of the same loop, now says what `fact` does too.
bool merged(NODE* given, const NODE* fact) {
    NODE *m = modulus_of(given), *k = modulus_of(fact);
    if (!m || !k || !speak_of_one_dividend(given, fact)) return false;
    const INT65 lcm = long_lcm(m->u.lval, k->u.lval);
    TYPE* type = given->left->left->type->stqs();
    if (!type->is_int() || lcm < m->u.lval || lcm > int_type_max(type)) return false;
    m->u.lval = lcm;
    return true;
}

bool implies(const NODE* given, const NODE* fact) {
    const NODE *m = modulus_of(given), *k = modulus_of(fact);
    if (m && k && speak_of_one_dividend(given, fact)) return (m->u.lval % k->u.lval).is_zero();
    return trees_are_congruent(given, fact, false) || pred_implies_pred(given, true, fact) == 1;
}

bool is_known(const NODE* fact, const struct LOOP* loop) {
    int left = MOST_COMPARED;
    for (; loop; loop = loop->parent)
        for (const NODE* given : loop->givens)
            if (--left < 0 || implies(given, fact)) return left >= 0;
    return false;
}

void add_fact(NODE* fact, struct LOOP* loop) {
    fact = normal_assertion(fact);
    int left = MOST_COMPARED;
    bool drop = fact->op == ICON || is_known(fact, loop);
    for (size_t i = 0; i < loop->givens.size() && !drop && --left >= 0; ++i) drop = merged(loop->givens[i], fact);
    if (drop) {
        erase_tree(fact);
        return;
    }
    left = MOST_COMPARED;
    for (size_t i = 0; i < loop->givens.size() && --left >= 0;) // weaker ones
        if (implies(fact, loop->givens[i])) {
            erase_tree(loop->givens[i]);
            loop->givens.erase(loop->givens.begin() + static_cast<std::ptrdiff_t>(i));
        } else
            ++i;
    if (print_debug)
        debug_printf("Adding invariant assertion to loop #%d: %s\n", loop->uid, tree_to_infix(fact).c_str());
    loop->givens.push_back(fact);
}

} // namespace

void add_loop_body_assertion(NODE* tree, struct LOOP* loop) {
    if (!loop || tree_has_side_effects(tree)) {
        erase_tree(tree);
        return;
    }
    std::vector<NODE*> parts;
    split(tree, parts);
    for (NODE* part : parts) add_fact(part, loop);
}

void add_loop_entry_assertion(NODE* tree, struct LOOP* loop) {
    if (loop && !expr_is_constant(tree) && !tree_is_RC_in_loop(tree, loop, false)) loop = nullptr;
    add_loop_body_assertion(tree, loop);
}

// ---- The head

namespace {

// v >= rc of a variable that only grows, v <= rc of one that only shrinks.
bool stays_true(const NODE* t, struct LOOP* loop) {
    if (!op_is_int_compare(t->op)) return false;
    auto holds_on = [loop](int op, const NODE* v, const NODE* bound) {
        if (v->op != NAME || !tree_is_RC_in_loop(bound, loop, false)) return false;
        const LOOPIV* iv = find_LOOPIV_for_IV(v->u.sym, loop, false);
        if (!iv || !iv->has(IV_is_IV) || !iv->has(IV_affine)) return false;
        if (op == GE || op == GT || op == UGE || op == UGT) return iv->has(IV_increases) && !iv->has(IV_decreases);
        if (op == LE || op == LT || op == ULE || op == ULT) return iv->has(IV_decreases) && !iv->has(IV_increases);
        return false;
    };
    return holds_on(t->op, t->left, t->right) || holds_on(commute_inv[t->op], t->right, t->left);
}

void find_assertions_in_head(struct LOOP* loop) {
    for (const LIST* s = loop->head->statements; s && s->rest && !may_not_pass_control(s->first); s = s->rest) {
        const NODE* condition = asserted_condition(s->first);
        if (!condition) continue;
        const bool always = is_ANTIALIASED_ICALL(condition) || expr_is_constant(condition) ||
                            tree_is_RC_in_loop(condition, loop, false);
        if (!always) {
            if (!stays_true(condition, loop)) continue;
            bool is_changed = false;
            for (const LIST* p = loop->head->statements; p != s && !is_changed; p = p->rest)
                is_changed = tree_modifies_lvalue_in_tree(p->first, condition);
            if (is_changed) continue;
        }
        add_loop_body_assertion(copy_tree(condition), loop);
    }
}

// ---- The line of blocks ahead of the loop

constexpr int MOST_STATEMENTS_BACK = 500, MOST_TESTS_BACK = 50;

class LINE_AHEAD {
public:
    explicit LINE_AHEAD(struct LOOP* l) : loop(l) {}

    void walk() {
        walk_line();
        if (kept) insert_at_end_of_body(guard_block, kept);
    }

private:
    void walk_line() {
        BBLK* bb = loop->preheader;
        for (;;) {
            if (!walk_back(bb)) return;
            BBLK* before = only_block(bb->predecessors);
            if (!before || before->dfn >= bb->dfn || before->loop != loop->parent) return;
            pass_test(before, bb);
            bb = before;
        }
    }

    bool walk_back(BBLK* bb) {
        std::vector<LIST**> links;
        for (LIST** link = &bb->statements; *link && (*link)->rest; link = &(*link)->rest) links.push_back(link);
        while (!links.empty()) {
            if (--statements_left < 0) return false;
            if (is_pragma(links.back())) {
                take_run(links);
                continue;
            }
            const NODE* t = (*links.back())->first;
            links.pop_back();
            if (const NODE* condition = asserted_condition(t))
                assume(copy_tree(condition));
            else
                behind.push_back(t);
        }
        return true;
    }

    static bool is_pragma(LIST** link) { return (*link)->first->op == PPRAGMA; }
    static bool is_mark(LIST** link) { return (*link)->first->pragma->kind == PRG_SRC_LOOP; }

    // Pragmas that follow each other. The mark of the loop's place in the source stands with its pragmas: what is ahead
    // of another mark, or of the run that the mark stands in, was said of a loop that is gone.
    void take_run(std::vector<LIST**>& links) {
        size_t first = links.size(), marks = 0;
        for (; first > 0 && is_pragma(links[first - 1]); --first) marks += is_mark(links[first - 1]);
        bool passed_mark = false;
        for (; links.size() > first; links.pop_back()) {
            LIST** link = links.back();
            LIST* cell = *link;
            NODE* t = cell->first;
            if (!is_loop_pragma(t->pragma->kind)) continue;
            const bool mark = is_mark(link);
            *link = cell->rest;
            delete cell;
            if (of_others || (passed_mark && marks > 1))
                erase_tree(t);
            else
                take_pragma(t);
            passed_mark |= mark;
        }
        of_others |= marks > 0;
    }

    void take_pragma(NODE* t) {
        if (t->pragma->kind == PRG_MUST_ITERATE && get_PPRAGMA_tree_int_arg(t, 0) >= INT65(1)) fold_guard(t);
        take_loop_pragma(t, loop);
    }

    // The tree is consumed.
    void assume(NODE* condition) {
        bool holds = !tree_has_side_effects(condition);
        for (size_t i = behind.size(); i > 0 && holds; --i)
            holds = !tree_modifies_lvalue_in_tree(behind[i - 1], condition);
        if (holds && !tree_is_RC_in_loop(condition, loop, false)) condition = of_entry(condition);
        add_loop_entry_assertion(condition, holds ? loop : nullptr);
    }

    // With the values on entry of the loop's variables, which they have at the condition too.
    NODE* of_entry(NODE* condition) {
        for (const auto& iv : loop->IVs) {
            if (!iv->has(IV_is_IV) || iv->has(IV_is_VLCV) || !iv->init || !iv->init->type->is_int() ||
                !iv->sym->type->is_int() || !sym_appears_in_tree(iv->sym, condition))
                continue;
            NODE *name = mk_NAME(iv->sym),
                 *value = coerce_to_type(iv->sym->type->stqs(), denormalize_tree(copy_tree(iv->init), false));
            condition = subst_tree_for_lvalue_in_tree(value, name, condition);
            erase_tree(name);
            erase_tree(value);
        }
        return simp_for_control(condition, loop->parent);
    }

    void pass_test(BBLK* test, const BBLK* to) {
        NODE* t = test->branch();
        if (!t || t->op == BRANCH) return;
        guard = nullptr;
        if (tree_acts(t->left)) behind.push_back(t->left);
        if (t->op != IF || --tests_left < 0) return;
        const BBLK *on_true = t->right->left->lbl->bblock, *on_false = t->right->right->lbl->bblock;
        if (on_true == on_false) return;
        NODE* condition = copy_tree(t->left);
        if (on_true != to) condition = invert_boolean_tree(condition);
        if (!tree_has_side_effects(condition)) condition = simp_for_control(condition, loop->parent);
        assume(condition);
        if (to == loop->preheader) guard = t, guard_block = test, guard_chooses = on_true == to;
    }

    // The loop is entered for certain, as its source says.
    void fold_guard(const NODE* pragma) {
        const ITERATE_PROMISE p = promise_of_MUST_ITERATE(pragma);
        if (!guard || p.max < p.min || !loop->is_bottom_tested() || guard->left->op == COMMAOP ||
            guard->left->op == ICON)
            return;
        if (print_debug)
            debug_printf("\tUsing %s\n\tto fold loop guard for loop #%d:\n", stmt2infix(pragma).c_str(), loop->uid);
        keep_as_assertion(guard->left);
        guard->left = mk_COMMAOP(guard->left, mk_ICON(INT65(guard_chooses ? 1 : 0), tp->int_t));
        if (print_debug) debug_printf("\t  ==>\t%s\n", tree_to_infix(guard->left).c_str());
        guard = nullptr;
    }

    // What the guard would have shown is said ahead of it.
    void keep_as_assertion(const NODE* condition) {
        if (tree_has_side_effects(condition) || count_nodes_in_tree(condition) > MOST_NODES) return;
        NODE* fact = copy_tree(condition);
        if (!guard_chooses) fact = invert_boolean_tree(fact);
        kept = maketree(NASSERT, fact, nullptr, tp->int_t);
        currfuninfo->has_nasserts = true;
    }

    static constexpr int MOST_NODES = 32;
    struct LOOP* const loop;
    std::vector<const NODE*> behind; // statements between the place of the walk and the loop, the last first
    int statements_left = MOST_STATEMENTS_BACK, tests_left = MOST_TESTS_BACK;
    NODE* guard = nullptr; // the first IF behind the place of the walk, if one side of it is the preheader
    BBLK* guard_block = nullptr;
    NODE* kept = nullptr; // an assertion for that block
    bool guard_chooses = false;
    bool of_others = false; // the pragmas further ahead
};

} // namespace

void find_loop_assertions_for_loop(struct LOOP* loop) {
    find_assertions_in_head(loop);
    if (loop->is_root()) return;
    LINE_AHEAD(loop).walk();
    reconcile_PROB_ITERATE_pragma(loop);
}

void find_loop_assertions(struct LOOP* loop) {
    if (!loop) loop = loop_root();
    if (!loop) return;
    for (struct LOOP* l : loops_outer_first(loop)) find_loop_assertions_for_loop(l);
}

// ---- Alignment of pointers

static struct LOOP* outermost_loop_that_keeps(const SYMTAB* s, struct LOOP* loop) {
    struct LOOP* outermost = nullptr;
    for (; loop && !loop->is_root() && sym_is_RC_in_loop(s, loop); loop = loop->parent) outermost = loop;
    return outermost;
}

// `e` is what holds of the pointer where the loop begins.
static void insert_PT_alignment_assertion_in_loop(const PTENV* e, SYMTAB* s, struct LOOP* loop) {
    const unsigned align = overall_PT_align(e), plain = std::max(16u, s->type->type_pointed_to()->align);
    if (!e || align <= plain) return;
    TYPE* type = tp->long_t;
    NODE* rest = maketree(MOD, coerce_to_type(type, mk_NAME(s)), mk_ICON(INT65(align >> 4), type), type);
    NODE* fact = maketree(EQ, rest, mk_ICON(INT65(0), type), tp->int_t);
    if (print_debug) debug_printf("--> Attempting to assert %s\n", tree_to_infix(fact).c_str());
    add_loop_entry_assertion(fact, loop);
}

void assert_pointer_alignments() {
    need(fact::points_to);
    std::set<std::pair<const SYMTAB*, const struct LOOP*>> seen; // membership only
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (!bb->loop || bb->loop->is_root()) continue;
        for (const LIST* l = bb->statements; l; l = l->rest)
            for_each_subtree(l->first, [&](NODE* t) {
                if (t->op != NAME || !t->u.sym || !t->u.sym->type->is_pointer()) return;
                struct LOOP* outermost = outermost_loop_that_keeps(t->u.sym, bb->loop);
                if (!outermost || !seen.insert({t->u.sym, outermost}).second) return;
                insert_PT_alignment_assertion_in_loop(PT_info_at_start(t->u.sym, outermost->head), t->u.sym, outermost);
            });
    }
}
