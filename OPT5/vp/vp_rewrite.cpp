// What value sets settle: names of one value, tests, divisions, and facts of loops.
//
// A tree is rewritten by the environment that holds while it is evaluated. Most rules are the simplifier's own: it asks
// for bounds, and bounds take in the environment. What it cannot see, holes and steps of a set, and remainders that a
// compare can tell, is done here.
//
// Needs: alias marks; in a loop hierarchy trip counts and invariants. Leaves: blocks and edges; the hierarchy, whose
// control variables and their tests are left as it knows them.
// Sound because the environment holds wherever the tree is evaluated, and each rewrite gives the same value for every
// member of its operands' sets. A rewritten tree stands where it stood; a pass that evaluates it elsewhere uses the value
// only where it would have been used before.
#include "OPT5/vp/vp.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

#include <memory>

bool vp_changed = false;

namespace {

// A part whose operands are not values: what it says would change with them.
bool is_left_alone(const NODE* t) {
    switch (t->op) {
    case LOOP:
    case INITLOOP:
    case ENDLOOP:
    case PPRAGMA:
    case ASM:
    case NASSERT:
    case ASSERT:
    case MCALL:
    case UMCALL:
    case UICALL: return true;
    case ICALL: {
        const BIF* bif = find_BIF_descriptor(t->u.name);
        return bif && bif->has(MUST_NOT_CSE | OPDS_MUST_NOT_CSE);
    }
    default: return false;
    }
}

} // namespace

// An operator that the simplifier does more with where it knows bounds. Quotients by constants keep their shape, in
// which others are equal to them, until they are taken apart for good.
bool depends_on_bounds(int op) {
    switch (op) {
    case ABS:
    case SRL:
    case ANDB:
    case ORB:
    case XORB:
    case ICALL: return true;
    default: return op_is_int_compare(op);
    }
}

namespace {

class REWRITER {
public:
    REWRITER(vpenv in, const SYMTAB* without, struct LOOP* l, const SYM_SET& powers)
        : env(in), kept(without), loop(l), powers_of_2(powers), source(&env) {}

    // `pointerContext`: the tree is an address that is accessed, or a part of one.
    NODE* rewritten(NODE* t, bool lvalue, bool pointerContext = false) {
        if (!t || is_left_alone(t)) return t;
        const bool outer_informed = informed, outer_changed = changed;
        informed = changed = false;
        t = t->op == NAME ? name(t, lvalue, pointerContext) : node(t, lvalue, pointerContext);
        any |= changed;
        informed |= outer_informed;
        changed |= outer_changed;
        return t;
    }

    bool any = false;

private:
    NODE* name(NODE* t, bool lvalue, bool pointerContext) {
        const int number = lvalue || !t->u.sym ? -1 : vpenv_store->number_of(t->u.sym);
        const vpset* known = number < 0 ? nullptr : vpenv_store->find(env, number);
        if (!known) return t;
        informed = true;
        if (!vpset_is_single(*known) || t->u.sym == kept || t->type->size != t->u.sym->type->size ||
            is_optimizer_temp(t->u.sym->name, 'K', 'Q'))
            return t;
        // Of pointers the null pointer alone is a constant; an access through it stays what it is.
        const bool is_null = t->type->is_pointer() && known->holds(0) && !pointerContext;
        if ((!is_integer_with_range(t->type) && !is_null) || !rewrite_is_allowed(t)) return t;
        NODE* value = is_null ? coerce_to_type(t->type->stqs(), mk_ICON(INT65(0), tp->int_t))
                              : mk_ICON(to_int65(vpset_minimum(*known)), t->type->stqs());
        erase_node(t);
        changed = true;
        return value;
    }

    NODE* node(NODE* t, bool lvalue, bool pointerContext) {
        operands(t, lvalue, pointerContext || t->op == UMULT || t->op == STREF || (t->type->is_pointer() && t->op != QUEST && !writes_left_operand(t->op)));
        if (lvalue || !informed) return t;
        if (t->op == IF) t->left = decided(t->left);
        if (op_transfers_control(t->op)) return t;
        if (changed) return simp_node(t, nullptr);
        if (op_is_int_compare(t->op) || (t->op == QUEST && t->right->op == COLON)) t = decided(t);
        if (t->op == MOD && is_integer_with_range(t->type)) t = remainder(t);
        if (t->op == ICALL || t->op == QUEST) t = sum_of_alternatives(t);
        if (!depends_on_bounds(t->op)) return t;
        const int op = t->op;
        t = simp_node(t, nullptr);
        changed |= t->op != op;
        return t;
    }

    void operands(NODE* t, bool lvalue, bool pointerContext) {
        switch (t->op) {
        case QUEST:
        case ANDAND:
        case OROR: return conditional(t);
        case UAND:
        case ARGREF:
            t->left = rewritten(t->left, true);
            return;
        case STDOT:
            t->left = rewritten(t->left, lvalue);
            return;
        default:
            t->right = rewritten(t->right, false, pointerContext);
            t->left = rewritten(t->left, writes_left_operand(t->op), pointerContext);
        }
    }

    // Operands behind a condition are evaluated where it came out in one sense.
    void conditional(NODE* t) {
        t->left = rewritten(t->left, false);
        const vpenv outer = env;
        auto under = [&](NODE* arm, bool holds) {
            if (filter_vpenv(&env, t->left, holds)) arm = rewritten(arm, false);
            env = outer;
            return arm;
        };
        if (t->op != QUEST)
            t->right = under(t->right, t->op == ANDAND);
        else if (t->right->op == COLON) {
            t->right->left = under(t->right->left, true);
            t->right->right = under(t->right->right, false);
        }
    }

    // A test that always comes out the same, and a choice by one.
    NODE* decided(NODE* t) {
        NODE* test = t->op == QUEST ? t->left : t;
        if (!has_vpset(test->type)) return t;
        const vpset s = vpset_of_tree(test, env);
        if (vpset_is_empty(s) || !test->type->is_int() || (s.holds(0) && !vpset_is_single(s))) return t;
        const bool holds = !s.holds(0);
        if (test->op == ICON || !rewrite_is_allowed(t)) return t;
        NODE* constant = mk_COMMAOP(peel_for_effect(test), mk_ICON(INT65(holds ? 1 : 0), tp->int_t));
        changed = true;
        if (t == test) return constant;
        t->left = constant;
        return simp_node(t, nullptr);
    }

    // x % d, where x is not negative and d is above 0.
    NODE* remainder(NODE* t) {
        const vpset a = vpset_of_tree(t->left, env), d = vpset_of_tree(t->right, env);
        if (vpset_is_empty(a) || vpset_is_empty(d) || vpset_minimum(d) <= 0 || vpset_minimum(a) < 0) return t;
        if (vpset_maximum(a) < vpset_minimum(d) && !tree_has_side_effects(t->right)) {
            changed = true;
            NODE* x = t->left;
            TYPE* type = t->type;
            erase_tree(t->right);
            erase_node(t);
            return coerce_to_type(type->stqs(), x);
        }
        if (t->right->op != ICON && t->left->type->size == t->right->type->size &&
            ((t->right->op == NAME && powers_of_2.count(t->right->u.sym)) || positive_tree_is_power_of_2(t->right, loop))) {
            changed = true;
            t->op = ANDB;
            TYPE* type = t->right->type->stqs();
            t->right = made_exact(PLUS, t->right, mk_ICON(INT65(-1), type), type, nullptr);
            return simp_node(t, nullptr);
        }
        return vpset_is_single(d) ? stepped_remainder(t, vpset_minimum(d)) : t;
    }

    // (x + c) % d, where that is x + c or one turn less.
    NODE* stepped_remainder(NODE* t, WIDE d) {
        NODE *sum = t->left, *x = sum->left;
        if (sum->op != PLUS || sum->right->op != ICON || x->op != NAME || !is_integer_with_range(sum->type) ||
            sum->type->size != t->type->size || x->type->size != sum->type->size || power_of_2(to_int65(d)) >= 0)
            return t;
        const WIDE c = to_wide(truncate_to_type(sum->right->u.lval, sum->type->stqs()));
        const vpset xs = vpset_of_tree(x, env);
        if (c < 0 || vpset_is_empty(xs) || vpset_minimum(xs) < 0 || vpset_maximum(xs) + c >= 2 * d ||
            vpset_maximum(xs) + c > range_of_type(sum->type).max)
            return t;
        changed = true;
        TYPE* type = t->type->stqs();
        const WIDE limit = d - 1 - c; // x above it: a turn less
        if (limit < 0) { // always
            NODE* less = made_exact(PLUS, copy_tree(x), mk_ICON(to_int65(c - d), x->type->stqs()), x->type->stqs(), nullptr);
            erase_tree(t);
            return coerce_to_type(type, less);
        }
        NODE* test = maketree(is_signed(x->type) ? GT : UGT, copy_tree(x), mk_ICON(to_int65(limit), x->type->stqs()), tp->int_t);
        NODE* less = made_exact(PLUS, copy_tree(x), mk_ICON(to_int65(c - d), x->type->stqs()), x->type->stqs(), nullptr);
        NODE* choice = maketree(QUEST, simp_node(test, nullptr),
                                maketree(COLON, coerce_to_type(type, less), coerce_to_type(type, copy_tree(sum)), type), type);
        erase_tree(t);
        return simp_node(choice, nullptr);
    }
    static bool is_signed(const TYPE* t) { return wraps_signed(t); }

    // (x == k) ? a : k, where x is k or a: k + a - x.
    NODE* sum_of_alternatives(NODE* t) {
        const bool is_strict = t->op == ICALL && is_strict_ternary_ICALL(t);
        if (!is_strict && !(t->op == QUEST && t->right->op == COLON)) return t;
        NODE* test = is_strict ? arg_list_lookup(t->left, 0) : t->left;
        NODE* on_true = is_strict ? arg_list_lookup(t->left, 1) : t->right->left;
        NODE* on_false = is_strict ? arg_list_lookup(t->left, 2) : t->right->right;
        if (test->op == NEQ) std::swap(on_true, on_false);
        if ((test->op != EQ && test->op != NEQ) || test->right->op != ICON || on_true->op != ICON || on_false->op != ICON ||
            tree_has_side_effects(test) || !is_integer_with_range(test->left->type) || !is_integer_with_range(t->type) ||
            test->left->type->size != t->type->size || is_signed(test->left->type) != is_signed(t->type))
            return t;
        auto value = [](const NODE* c, const TYPE* type) {
            vpset s(single_slice(to_wide(c->u.lval)));
            truncate_vpset_to_type(&s, type);
            return vpset_minimum(s);
        };
        const TYPE* type = t->type;
        const WIDE k = value(test->right, type), a = value(on_true, type);
        const vpset xs = vpset_of_tree(test->left, env);
        if (value(on_false, type) != k || a == k || vpset_size(xs) != 2 || !xs.holds(a) || !xs.holds(k)) return t;
        const RANGE limits = range_of_type(type);
        if (k + a < limits.min || k + a > limits.max) return t;
        changed = true;
        TYPE* plain = t->type->stqs();
        NODE* x = coerce_to_type(plain, copy_tree(test->left));
        erase_tree(t);
        return made_exact(MINUS, mk_ICON(to_int65(k + a), plain), x, plain, nullptr);
    }

    vpenv env;
    const SYMTAB* const kept;
    struct LOOP* const loop;
    const SYM_SET& powers_of_2; // known in the block
    VALUES_AT source;
    bool informed = false; // something is known of a part of the tree in work
    bool changed = false;  // a part of it has changed
};

// Where a loop's control variable is tested or updated, or a promise has decided whether a loop is entered, the hierarchy
// has the statement in mind.
const SYMTAB* symbol_kept_in(const NODE* statement, const BBLK* bb) {
    if (!bb->loop || bb->loop->is_root()) return nullptr;
    INDUCTION_UPDATE update;
    return is_induction_update(statement, &update) ? update.sym : nullptr;
}
bool is_left_to_hierarchy(const NODE* statement, const BBLK* bb) {
    if (!bb->loop || (statement->op != IF && statement->op != SWITCH)) return false;
    const NODE* test = statement->left;
    if (test->op == COMMAOP && test->right->op == ICON) return true;
    if (bb->loop->is_root() || bb == bb->loop->tail) return !bb->loop->is_root();
    bool leaves = false;
    for (const EDGE* e = bb->successors; e; e = e->rest) leaves |= !loop_is_subloop_of_loop(e->first->loop, bb->loop, true);
    return bb == bb->loop->head && leaves;
}

// ---- Powers of two

// The variables that a remainder is taken by; found when they are first asked for.
class DIVISORS {
public:
    bool contain(SYMTAB* sym) {
        if (!are_known)
            for_each_tree(currfuninfo, [this](const NODE* tree) {
                for_each_subtree(tree, [this](const NODE* t) {
                    if (t->op == MOD && t->right->op == NAME) found.insert(t->right->u.sym);
                });
            });
        are_known = true;
        return found.count(sym) != 0;
    }

private:
    SYM_SET found;
    bool are_known = false;
};

bool gives_power_of_2(const NODE* t, vpenv env, struct LOOP* loop, DIVISORS& divisors) {
    if (t->op != ASG || !is_private_name(t->left) || t->right->op == ICON || !is_integer_with_range(t->left->type) ||
        !positive_tree_is_power_of_2(t->right, loop) || vpenv_store->number_of(t->left->u.sym) < 0)
        return false;
    const vpset s = vpset_of_tree(t->right, env);
    const RANGE limits = range_of_type(t->left->type);
    return !vpset_is_empty(s) && vpset_minimum(s) > 0 && vpset_maximum(s) <= limits.max &&
           divisors.contain(t->left->u.sym);
}

// Behind x = e, for who has x alone: ((x - 1) & x) == 0.
bool assert_power_of_2(LIST* s) {
    const NODE* x = s->first->left;
    TYPE* type = x->type->stqs();
    NODE* less = maketree(MINUS, copy_tree(x), mk_ICON(INT65(1), type), type);
    NODE* fact = maketree(NASSERT, maketree(EQ, maketree(ANDB, less, copy_tree(x), type), mk_ICON(INT65(0), type), tp->int_t), nullptr, tp->int_t);
    if (s->rest && s->rest->first->op == NASSERT && trees_are_congruent(s->rest->first->left, fact->left, false)) {
        erase_tree(fact);
        return false;
    }
    insert_behind(s, fact, s->psn);
    currfuninfo->has_nasserts = true;
    return true;
}

// Whether it makes assertions.
bool rewrite_block(BBLK* bb, vpenv env, DIVISORS& divisors) {
    SYM_SET powers_of_2; // by the statements so far
    bool any = false;
    for (LIST* s = bb->statements; s; s = s->rest) {
        NODE* t = s->first;
        const VP_EFFECT effect(t, bb->loop);
        const vpenv behind = effect.behind(env, false);
        if (!tree_is_arg_prolog(t) && !tree_is_EH_SWITCH(t) && !is_left_to_hierarchy(t, bb) && env != vpenv()) {
            REWRITER work(effect.during(env), symbol_kept_in(t, bb), bb->loop, powers_of_2);
            s->first = work.rewritten(t, false);
            vp_changed |= work.any;
        }
        if (!powers_of_2.empty())
            for_each_written_name(s->first, [&](const NODE* name, const NODE*) { powers_of_2.erase(name->u.sym); });
        if (gives_power_of_2(s->first, env, bb->loop, divisors)) {
            powers_of_2.insert(s->first->left->u.sym);
            any |= assert_power_of_2(s);
        }
        env = behind;
    }
    return any;
}

} // namespace

NODE* comparison(int op, SYMTAB* sym, WIDE value) {
    TYPE* type = sym->type->stqs();
    return maketree(op, mk_NAME(sym), mk_ICON(to_int65(value), type), tp->int_t);
}

std::vector<NODE*> list_VP_predicate_trees(const vpset& set, const VPSLICE* extra, SYMTAB* sym) {
    constexpr WIDE MANY = 1000, NEAR = 42;
    VPSLICE hull;
    vpset all = set;
    if (extra) vpset_union(&all, set, vpset(*extra));
    vpset_compress(&hull, all);
    if (hull.is_empty() || !is_integer_with_range(sym->type)) return {};
    if (vpslice_is_single(hull)) return {comparison(EQ, sym, hull.low)};
    const RANGE limits = range_of_type(sym->type);
    const bool is_unsigned = !wraps_signed(sym->type), has_many = vpslice_size(hull) >= MANY;
    std::vector<NODE*> trees;
    if (hull.low > limits.min && !(has_many && hull.low - limits.min <= NEAR))
        trees.push_back(comparison(is_unsigned ? UGE : GE, sym, hull.low));
    if (hull.high < limits.max && !(has_many && limits.max - hull.high <= NEAR))
        trees.push_back(comparison(is_unsigned ? ULE : LE, sym, hull.high));
    // The remainder of a negative number is negative.
    if (hull.step >= 2 && hull.step <= limits.max && (hull.low >= 0 || hull.low % hull.step == 0)) {
        TYPE* type = sym->type->stqs();
        NODE* rest = maketree(MOD, mk_NAME(sym), mk_ICON(to_int65(hull.step), type), type);
        trees.push_back(maketree(EQ, rest, mk_ICON(to_int65(hull.low % hull.step), type), tp->int_t));
    }
    return trees;
}

NODE* prop_values_in_tree(NODE* tree, vpenv env, bool lvalue, BBLK* bb) {
    const SYM_SET none;
    REWRITER work(env, symbol_kept_in(tree, bb), bb->loop, none);
    NODE* t = work.rewritten(tree, lvalue);
    vp_changed |= work.any;
    return t;
}

void do_value_propagation() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'Value Propagation' ----------\n");
    vp_changed = false;
    struct LOOP* const root = loop_root();
    construct_vpsets_for_cfg(root == nullptr);
    bool new_assertions = false;
    DIVISORS divisors;
    for (BBLK* bb = currfuninfo->bb_list; bb && vpenv_store; bb = bb->dflink) {
        const vpenv* entry = bb_vpenv(bb, false);
        if (!entry) continue;
        if (print_debug > 1) dump_vpenv(*entry, bb->str());
        if (root && bb->loop && !bb->loop->is_root() && bb->loop->head == bb) {
            if (new_assertions) find_loop_assertions_for_loop(bb->loop);
            tell_loop_of_values(bb->loop, *entry);
        }
        new_assertions |= rewrite_block(bb, *entry, divisors);
        if (values_are_asserted()) assert_bindings(bb, *entry);
    }
    deconstruct_vpsets_for_cfg();
}

// ---- For rooms below

namespace {

const BBLK* walked = nullptr;
vpenv ahead, behind;
std::unique_ptr<VALUES_AT> walk_values;

void begin_walk() {
    walked = nullptr;
    construct_vpsets_for_cfg(1, VP_QUESTION::DIVISIONS);
}
void walk_to(const BBLK* bb, const NODE* statement) {
    if (!vpenv_store) return;
    if (bb != walked) {
        const vpenv* entry = bb_vpenv(bb, false);
        behind = entry ? *entry : vpenv();
        walked = bb;
    }
    const VP_EFFECT effect(statement);
    ahead = effect.during(behind);
    behind = effect.behind(behind, false);
    if (print_debug > 1) dump_vpenv(ahead, tree_to_infix(statement).c_str());
    if (!walk_values) walk_values = std::make_unique<VALUES_AT>(&ahead);
}
void end_walk() {
    walk_values.reset();
    deconstruct_vpsets_for_cfg();
}

} // namespace

void install_value_propagation() {
    loop_work.propagate_values = do_value_propagation;
    value_walk = {begin_walk, walk_to, end_walk};
}
