// Induction variables of the hierarchy's loops, their increments, and the variable that controls a loop.
//
// A variable counts here if every assignment of it in the loop adds an invariant to it, in the loop's head or tail,
// which each iteration executes once. The search asks the region constants as they stood before: whatever the loop
// assigns is still in the set of altered symbols.
#include "OPT5/dd/dd.h"
#include "OPT5/dd/loop.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"
#include "OPT5/target/bif.h"
#include "UTIL/safemem.h"

#include <algorithm>
#include <string>
#include <unordered_map>

// ---- Updates

namespace {

bool counts(const TYPE* type) { return (type->is_int() && !type->is_bool()) || type->is_pointer(); }

const NODE* without_widening(const NODE* t) {
    while (t->op == SCONV && t->left->type->is_int() && t->type->is_int() && t->type->size >= t->left->type->size)
        t = t->left;
    return t;
}

bool is_variable(const NODE* t, const SYMTAB* sym) { return t->op == NAME && t->u.sym == sym; }

// Whether a sum of that type is the variable's own arithmetic.
bool is_own_type(const TYPE* computed, const TYPE* type) {
    if (type->is_pointer()) return computed->is_pointer();
    return computed->is_int() && computed->size == type->size && computed->is_unsigned() == type->is_unsigned();
}

bool is_compound_update(const NODE* t, INDUCTION_UPDATE* u) {
    TYPE* type = u->sym->type;
    u->amount = t->right;
    u->is_subtracted = t->op == MINUSASG || t->op == MINMIN;
    if (type->is_pointer()) {
        u->computed = type;
        return true;
    }
    u->computed =
        t->op == PLUSPLUS || t->op == MINMIN || t->right->op == ICON ? type : combined_type(t->left, t->right);
    u->is_narrowed = !is_own_type(u->computed, type);
    return true;
}

bool is_assigned_sum(const NODE* t, INDUCTION_UPDATE* u) {
    const NODE* sum = t->right;
    if (sum->op == SCONV && sum->left && sum->left->type->is_int() && sum->type->is_int()) {
        sum = sum->left;
        u->is_narrowed = true;
    }
    if (sum->op != PLUS && sum->op != MINUS) return false;
    u->computed = sum->type;
    u->is_narrowed |= !is_own_type(sum->type, u->sym->type);
    const NODE* left = u->is_narrowed ? without_widening(sum->left) : sum->left;
    const NODE* right = u->is_narrowed ? without_widening(sum->right) : sum->right;
    if (is_variable(left, u->sym)) {
        u->amount = sum->right;
        u->is_subtracted = sum->op == MINUS;
        return true;
    }
    u->amount = sum->left;
    return sum->op == PLUS && is_variable(right, u->sym);
}

} // namespace

bool is_induction_update(const NODE* t, INDUCTION_UPDATE* u) {
    if (!t->left || !t->right || t->left->op != NAME || !t->left->u.sym) return false;
    *u = INDUCTION_UPDATE();
    u->sym = t->left->u.sym;
    if (!counts(u->sym->type) || !counts(t->left->type)) return false;
    bool is_update = false;
    switch (t->op) {
    case PLUSPLUS:
    case MINMIN:
    case PLUSASG:
    case MINUSASG: is_update = is_compound_update(t, u); break;
    case ASG: is_update = is_assigned_sum(t, u); break;
    }
    return is_update && u->amount->type->is_int() && !u->amount->type->is_bool() &&
           !sym_appears_in_tree(u->sym, u->amount);
}

// ---- Candidates

namespace {

bool reads_memory(const NODE* t) {
    return any_subtree(t, [](const NODE* n) { return op_is_indirection(n->op); });
}

bool may_be_IV(const INDUCTION_UPDATE& u, const struct LOOP* loop) {
    const SYMTAB* sym = u.sym;
    return !sym->is_aliased() && !sym->type->is_volatile() && !symbol_is_immutable(sym) &&
           !(loop->has(LOOP_has_call) && sym->level == 0) && !reads_memory(u.amount) &&
           tree_is_RC_in_loop(u.amount, loop, false);
}

// Whether exactly one of the block's two arms is executed in each iteration, and neither the arms nor the tail touch
// the symbol: control leads from the block to the tail past at most one block.
bool passes_diamond_test(const BBLK* bb, const struct LOOP* loop, const NODE* lvalue) {
    const BBLK* tail = loop->tail;
    if (edge_length(bb->successors) != 2 || edge_length(tail->predecessors) != 2) return false;
    for (const EDGE* e = bb->successors; e; e = e->rest) {
        const BBLK* arm = e->first;
        if (arm == tail) continue;
        if (edge_length(arm->predecessors) != 1 || edge_length(arm->successors) != 1 || arm->successors->first != tail)
            return false;
        if (sym_appears_in_bb(lvalue->u.sym, arm)) return false;
    }
    return bb->successors->first != bb->successors->rest->first && !bb_modifies_lvalue_in_tree(tail, lvalue);
}

bool is_update_block(const BBLK* bb, const struct LOOP* loop, const INDUCTION_UPDATE& u, const NODE* statement) {
    if (bb == loop->head || bb == loop->tail) return true;
    return do_dd_for_be && u.sym->type->is_pointer() && statement->op != ASG &&
           passes_diamond_test(bb, loop, statement->left);
}

// The signed number that a constant update adds.
INT65 constant_amount(const INDUCTION_UPDATE& u) {
    INT65 v = u.amount->u.lval;
    if (!u.sym->type->is_pointer() && u.sym->type->is_unsigned()) v = sign_extend_by_type_size(v, u.sym->type);
    return u.is_subtracted ? -v : v;
}

// Both where it is not known.
uint64_t direction_of(const INDUCTION_UPDATE& u, struct LOOP* loop) {
    const int sign = u.amount->op != ICON               ? (tree_is_positive(u.amount, loop)   ? (u.is_subtracted ? -1 : 1)
                                                           : tree_is_negative(u.amount, loop) ? (u.is_subtracted ? 1 : -1)
                                                                                              : 0)
                     : constant_amount(u).sign < 0      ? -1
                     : constant_amount(u) == INT65(0) ? 0
                                                        : 1;
    return sign > 0 ? IV_increases : sign < 0 ? IV_decreases : (IV_increases | IV_decreases);
}

class CANDIDATES {
public:
    explicit CANDIDATES(struct LOOP* of) : loop(of) {}
    void find() {
        SYM_SET altered;
        for_each_subloop(
            loop, [&altered](struct LOOP* inner) { altered.insert(inner->ALT_syms.begin(), inner->ALT_syms.end()); });
        const NODE* first = currfuninfo->bb_list->statements->first;
        for (BBLK* bb : loop->contents)
            if (bb->loop == loop)
                for (const LIST* s = bb->statements; s; s = s->rest)
                    scan(bb, s->first, bb == currfuninfo->bb_list ? first : nullptr, altered);
        std::vector<SYMTAB*> ivs;
        for (SYMTAB* sym : in_order)
            if (!altered.count(sym)) ivs.push_back(sym);
        // What had been altered stays so: its address may leave the loop.
        for (SYMTAB* sym : ivs) loop->ALT_syms.erase(sym);
        loop->IV_syms.insert(loop->IV_syms.end(), ivs.begin(), ivs.end());
    }

private:
    void scan(const BBLK* bb, const NODE* t, const NODE* first, SYM_SET& altered) {
        INDUCTION_UPDATE u;
        const bool is_update = !loop->is_root() && is_induction_update(t, &u) && may_be_IV(u, loop) &&
                               !is_optimizer_temp(u.sym->name, 'h', 'i') && is_update_block(bb, loop, u, t);
        if (is_update) {
            const uint64_t direction = direction_of(u, loop);
            const auto [found, is_first] = directions.emplace(u.sym, direction);
            if (is_first) in_order.push_back(u.sym);
            // One that goes back and forth leaves its bounds between the updates, or wraps there.
            if (!is_first && (found->second | direction) == (IV_increases | IV_decreases)) altered.insert(u.sym);
        }
        const bool is_prolog = tree_is_extended_arg_prolog(t, first);
        for_each_written_name(t, [&](const NODE* name, const NODE* by) {
            if (!(is_update && by == t) && !is_prolog) altered.insert(name->u.sym);
        });
    }

    struct LOOP* loop;
    std::unordered_map<const SYMTAB*, uint64_t> directions; // looked up alone
    std::vector<SYMTAB*> in_order;
};

// ---- Increments

class INCREMENT {
public:
    INCREMENT(LOOPIV* of, struct LOOP* in) : iv(of), loop(in) {}
    void accumulate() {
        add_updates_of(loop->head, IV_updated_in_head);
        if (loop->tail != loop->head)
            add_updates_of(loop->tail, IV_updated_in_tail);
        else
            iv->flags |= IV_updated_in_tail;
        if (do_dd_for_be && iv->sym->type->is_pointer())
            for (BBLK* bb : loop->contents)
                if (bb->loop == loop && bb != loop->head && bb != loop->tail) add_updates_of(bb, IV_updated_in_tail);
        if (!iv->incrtree) iv->incrtree = mk_ICON(constant, type_of_constant());
        if (iv->has(IV_increases) && iv->has(IV_decreases)) iv->flags &= ~(IV_increases | IV_decreases);
    }

private:
    TYPE* type_of_constant() const {
        const TYPE* t = iv->sym->type;
        if (t->is_pointer()) return tp->long_t;
        return t->is_unsigned() ? signed_twin(t) : iv->sym->type->stqs();
    }
    static TYPE* signed_twin(const TYPE* t) {
        for (TYPE* s : {tp->int_t, tp->long_t, tp->llong_t})
            if (s->size == t->size) return s;
        return tp->llong_t;
    }
    void add_updates_of(BBLK* bb, uint64_t where) {
        for (const LIST* s = bb->statements; s; s = s->rest) {
            INDUCTION_UPDATE u;
            if (!is_induction_update(s->first, &u) || u.sym != iv->sym) continue;
            iv->flags |= where;
            if (u.is_narrowed) iv->flags = (iv->flags | IV_narrowed) & ~uint64_t(IV_affine);
            iv->flags |= direction_of(u, loop);
            add(u);
        }
    }
    void add(const INDUCTION_UPDATE& u) {
        if (u.amount->op == ICON && !iv->incrtree) {
            constant = constant + constant_amount(u);
            return;
        }
        TYPE* type = iv->sym->type->is_pointer() ? tp->long_t : iv->sym->type->stqs();
        if (!iv->incrtree) {
            if (constant == INT65(0) && !u.is_subtracted) {
                iv->incrtree = coerce_to_type(type, copy_tree(u.amount));
                return;
            }
            iv->incrtree = mk_ICON(constant, type);
        }
        iv->incrtree = made_exact(u.is_subtracted ? MINUS : PLUS, iv->incrtree,
                                  coerce_to_type(type, copy_tree(u.amount)), type, loop);
    }

    LOOPIV* iv;
    struct LOOP* loop;
    INT65 constant{0};
};

constexpr int SEARCH_BUDGET = 100000, SEARCH_DEPTH = 10;

NODE* value_on_entry(SYMTAB* sym, struct LOOP* loop, size_t symbols) {
    if (!loop->preheader) return nullptr;
    NODE* value =
        find_symbol_value(sym, loop->preheader, loop, SEARCH_BUDGET / static_cast<int>(symbols), SEARCH_DEPTH);
    if (value && sym_appears_in_tree(sym, value)) {
        erase_tree(value);
        value = nullptr;
    }
    return value;
}

void make_RC_records(struct LOOP* loop) {
    for (SYMTAB* sym : loop->RC_syms) {
        if (!sym->type->is_scalar()) continue;
        NODE* value = value_on_entry(sym, loop, loop->RC_syms.size());
        if (!value) continue;
        LOOPIV* record = alloc_LOOPIV(sym, loop);
        record->flags = IV_is_RC;
        record->init = value;
    }
}

bool drops_conversion(const LOOPIV* iv) {
    const NODE* t = iv->init;
    return t && is_optimizer_temp(iv->sym->name, 'L', 'l') && t->op == SCONV && t->left->type->is_int() &&
           t->left->type->is_unsigned() && t->left->type->size >= t->type->size;
}

bool is_affine_mark(const NODE* t, const SYMTAB* sym) {
    return t->op == NASSERT && t->left && is_AFFINE_IV_sym_ICALL(t->left, sym);
}
bool is_marked_affine(const SYMTAB* sym, const struct LOOP* loop) {
    for (const LIST* s = loop->head->statements; currfuninfo->has_affine_marks && s; s = s->rest)
        if (is_affine_mark(s->first, sym)) return true;
    return false;
}

// False where the record had to go.
bool make_IV_record(SYMTAB* sym, struct LOOP* loop, size_t symbols) {
    LOOPIV* iv = alloc_LOOPIV(sym, loop);
    const bool is_sure = !unsigned_index_wraps || sym->type->is_pointer() || sym->type->is_signed() ||
                         is_marked_affine(sym, loop);
    iv->flags = IV_is_IV | (is_sure ? uint64_t(IV_affine) : 0);
    INCREMENT(iv, loop).accumulate();
    iv->init = value_on_entry(sym, loop, symbols);
    if (drops_conversion(iv)) {
        NODE* inner = iv->init->left;
        erase_node(iv->init);
        iv->init = inner;
    }
    const bool is_understood = (!iv->init || counts(iv->init->type)) && iv->incrtree->type->is_int();
    if (!is_understood) delete_LOOPIV(iv);
    return is_understood;
}

// Where one is not understood, the rest is not looked at: they count as altered.
bool make_IV_records(struct LOOP* loop) {
    const std::vector<SYMTAB*> symbols = loop->IV_syms;
    for (size_t i = 0; i < symbols.size(); ++i) {
        if (is_optimizer_temp(symbols[i]->name, 'h', 'i') || make_IV_record(symbols[i], loop, symbols.size())) continue;
        for (size_t rest = i; rest < symbols.size(); ++rest)
            if (!is_optimizer_temp(symbols[rest]->name, 'h', 'i')) make_sym_altered_in_loop(symbols[rest], loop);
        return false;
    }
    return true;
}

// ---- The order of updates and reads in the body

class USE_ORDER {
public:
    explicit USE_ORDER(struct LOOP* of) : loop(of) {}
    void find() {
        bool any = false;
        for (const auto& iv : loop->IVs) {
            iv->flags &= ~uint64_t(IV_order);
            any |= iv->has(IV_is_IV) && iv.get() != loop->VLCV;
        }
        if (!any) return;
        for (struct LOOP* l : loops_outer_first(loop))
            for (BBLK* bb : l->contents)
                if (bb->loop == l) blocks.push_back(bb);
        std::sort(blocks.begin(), blocks.end(), [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; });
        for (const BBLK* bb : blocks)
            for (const LIST* s = bb->statements; s; s = s->rest) scan(s->first, !s->rest && bb == loop->tail);
    }

private:
    LOOPIV* record(const NODE* name) {
        LOOPIV* iv = find_LOOPIV_for_IV(name->u.sym, loop, false);
        return iv == loop->VLCV ? nullptr : iv;
    }
    void scan(const NODE* t, bool is_exit_test) {
        if (t->op == NASSERT || t->op == ASSERT) return;
        INDUCTION_UPDATE u;
        if (is_induction_update(t, &u))
            if (LOOPIV* iv = record(t->left)) {
                enter_read(iv, true);
                iv->flags |= IV_update_seen | (iv->has(IV_read_seen) ? uint64_t(IV_read_before_update) : 0);
                return;
            }
        const NODE* tested = is_exit_test && t->op == IF ? variable_of_test(t->left) : nullptr;
        for_each_subtree(t, [&](const NODE* n) {
            if (n->op == NAME)
                if (LOOPIV* iv = record(n)) enter_read(iv, n == tested);
        });
    }
    static const NODE* variable_of_test(const NODE* condition) {
        if (!op_is_int_compare(condition->op)) return condition->op == NAME ? condition : nullptr;
        const NODE* t = condition->left;
        while (t->op == SCONV && t->left->type->is_int() && t->left->type->is_unsigned() &&
               t->type->size == t->left->type->size)
            t = t->left;
        return t->op == NAME ? t : nullptr;
    }
    void enter_read(LOOPIV* iv, bool is_own) {
        if (!is_own) iv->flags |= IV_read_seen | (iv->has(IV_update_seen) ? uint64_t(IV_update_before_read) : 0);
    }

    struct LOOP* loop;
    std::vector<BBLK*> blocks;
};

} // namespace

// ---- The control variable

namespace {

// The condition of the loop's exit test as a new tree that is true where control stays, or null.
NODE* staying_condition(const BBLK* bb, const struct LOOP* loop) {
    const NODE* branch = bb->branch();
    if (!branch || branch->op != IF || branch->left->op == ENDLOOP || tree_has_side_effects(branch->left))
        return nullptr;
    const BBLK *yes = branch->right->left->lbl->bblock, *no = branch->right->right->lbl->bblock;
    auto stays = [loop](const BBLK* b) { return loop_is_subloop_of_loop(b->loop, loop, true); };
    if (stays(yes) == stays(no)) return nullptr;
    bool holds = stays(yes);
    const NODE* condition = branch->left;
    for (; condition->op == EXCLAIM; condition = condition->left) holds = !holds;
    NODE* t = nullptr;
    if (op_is_int_compare(condition->op))
        t = copy_tree(condition);
    else if (condition->op == NAME && counts(condition->type)) {
        t = new_node(NEQ, tp->int_t);
        t->left = copy_tree(condition);
        t->right = coerce_to_type(condition->type,
                                  mk_ICON(INT65(0), condition->type->is_pointer() ? tp->long_t : condition->type));
    } else
        return nullptr;
    if (!holds) {
        OPT_ASSERT(boolean_inv[t->op] != ILLOP);
        t->op = static_cast<uint8_t>(boolean_inv[t->op]);
    }
    return t;
}

// Bottom-tested loops by their tail; a loop that is left from its head alone by that.
NODE* exit_condition(const struct LOOP* loop) {
    if (loop->is_bottom_tested()) return staying_condition(loop->tail, loop);
    if (loop->exits.size() != 1) return nullptr;
    const EDGE* from = loop->exits.front()->predecessors;
    return from && !from->rest && from->first == loop->head ? staying_condition(loop->head, loop) : nullptr;
}

// The variable of a side of the test: behind conversions that keep every value of it.
const NODE* tested_variable(const NODE* t) {
    while (t->op == SCONV && t->left->type->is_int() && t->type->is_int() && !t->left->type->is_bool() &&
           t->type->size == t->left->type->size && t->type->is_unsigned() == t->left->type->is_unsigned())
        t = t->left;
    return t->op == NAME ? t : nullptr;
}

LOOPIV* record_of_variable(const NODE* t, const struct LOOP* loop) {
    const NODE* name = tested_variable(t);
    LOOPIV* iv = name ? find_LOOPIV_for_IV(name->u.sym, loop, false) : nullptr;
    return iv && iv != loop->VLCV && iv->incrtree ? iv : nullptr;
}

bool fits_operator(int op, const TYPE* type) {
    if (op == EQ || op == NEQ) return true;
    const bool is_unsigned_op = op >= ULE;
    return type->is_pointer() ? is_unsigned_op : is_unsigned_op == type->is_unsigned();
}

} // namespace

NODE* find_loop_predicate(struct LOOP* loop) {
    if (loop->is_root()) return nullptr;
    NODE* t = exit_condition(loop);
    if (!t) return nullptr;
    if (!record_of_variable(t->left, loop) && commute_inv[t->op] != ILLOP) {
        std::swap(t->left, t->right);
        t->op = static_cast<uint8_t>(commute_inv[t->op]);
    }
    return t;
}

// `LCV test last` is asked behind the updates of the iteration where the loop is bottom-tested, and ahead of them where
// it is top-tested.
bool find_loop_LCV(struct LOOP* loop) {
    loop->LCV = nullptr;
    loop->test = ILLOP;
    NODE* predicate = find_loop_predicate(loop);
    if (!predicate) return false;
    LOOPIV* iv = record_of_variable(predicate->left, loop);
    const bool is_usable = iv && tree_is_RC_in_loop(predicate->right, loop, false) && counts(predicate->right->type) &&
                           fits_operator(predicate->op, predicate->left->type) &&
                           (loop->is_bottom_tested() || !iv->has(IV_updated_in_head));
    if (is_usable) {
        loop->LCV = iv;
        loop->test = static_cast<uint8_t>(predicate->op);
        if (iv->last) erase_tree(iv->last);
        iv->last = predicate->right;
        predicate->right = nullptr;
        iv->flags |= IV_is_LCV | (is_internal_name(iv->sym->name) ? 0 : uint64_t(IV_is_ULCV));
    }
    erase_tree(predicate);
    return is_usable;
}

// ---- Derived values

namespace {

TYPE* arithmetic_type(const LOOPIV* iv) { return iv->sym->type->is_pointer() ? tp->long_t : iv->sym->type->stqs(); }

// `start` plus a multiple of the step, in the variable's type; both trees are consumed.
NODE* stepped(const LOOPIV* iv, NODE* start, NODE* times, struct LOOP* loop) {
    TYPE* type = arithmetic_type(iv);
    NODE* distance =
        made_exact(MULT, coerce_to_type(type, times), coerce_to_type(type, copy_tree(iv->incrtree)), type, loop);
    if (iv->sym->type->is_pointer()) return simp_node(maketree(PLUS, start, distance, start->type), loop);
    return made_exact(PLUS, coerce_to_type(type, start), distance, type, loop);
}

NODE* less_one(const NODE* trips, struct LOOP* loop) {
    if (trips->op == DIV && trips->type->is_int()) { // (a - b) / b: the sum ahead of the division is no larger
        NODE* t = copy_tree(trips);
        t->left = made_exact(MINUS, t->left, copy_tree(t->right), t->type, loop);
        return simp_node(t, loop);
    }
    return made_exact(MINUS, copy_tree(trips), mk_ICON(INT65(1), trips->type), trips->type, loop);
}

} // namespace

void compute_lasttree_for_IV(LOOPIV* iv, struct LOOP* loop) {
    if (!loop->trips || !iv->incrtree || !iv->init || iv->last || !iv->has(IV_affine) ||
        !iv->has(IV_increases | IV_decreases))
        return;
    if (loop->trips->type->size > arithmetic_type(iv)->size && loop->trips->op != ICON) return;
    iv->last = stepped(iv, copy_tree(iv->init), less_one(loop->trips, loop), loop);
    if (!iv->sym->type->is_int() || !iv->sym->type->is_signed() || !loop->trips) return;
    // In the last iteration there has been a first one.
    if (iv->has(IV_increases) && iv->init->op == ICON)
        iv->last = simp_tree_in_range(iv->last, iv->init->u.lval, int_type_max(iv->sym->type), INT65(1));
    else if (iv->has(IV_decreases) && iv->init->op == ICON)
        iv->last = simp_tree_in_range(iv->last, int_type_min(iv->sym->type), iv->init->u.lval, INT65(1));
}

namespace {

// What the loop's variables are in an iteration, in place of their names; null where one has no value there.
template <class VALUE>
NODE* evaluated(const NODE* expr, struct LOOP* loop, const VALUE& value_of) {
    bool is_known = !tree_has_side_effects(expr) && !reads_memory(expr);
    NODE* t = rewrite_tree(copy_tree(expr), [&](NODE* n) {
        if (n->op != NAME || !is_known || sym_is_RC_in_loop(n->u.sym, loop)) return n;
        const LOOPIV* iv = find_LOOPIV_for_IV(n->u.sym, loop, false);
        NODE* value = iv ? value_of(iv) : nullptr;
        if (!value) {
            is_known = false;
            return n;
        }
        TYPE* type = n->type;
        erase_tree(n);
        return coerce_to_type(type->stqs(), value);
    });
    if (is_known) return simp_tree(t, loop);
    erase_tree(t);
    return nullptr;
}

} // namespace

NODE* eval_expr_for_iteration(const NODE* expr, struct LOOP* loop, int which) {
    return evaluated(expr, loop, [which, loop](const LOOPIV* iv) -> NODE* {
        if (iv == loop->LCV && which == 0) return nullptr; // `last` is its limit
        const NODE* value = which ? iv->init : iv->last;
        return value ? copy_tree(value) : nullptr;
    });
}

NODE* eval_expr_for_2nd_iteration(const NODE* expr, struct LOOP* loop) {
    return evaluated(expr, loop, [loop](const LOOPIV* iv) -> NODE* {
        return iv->init && iv->incrtree ? stepped(iv, copy_tree(iv->init), mk_ICON(INT65(1), arithmetic_type(iv)), loop)
                                        : nullptr;
    });
}

// ---- Marks of affine counters

void insert_affine_marks(struct LOOP* root) {
    for (struct LOOP* loop : loops_outer_first(root)) {
        if (!loop->is_bottom_tested()) continue;
        for (const auto& iv : loop->IVs) {
            const TYPE* type = iv->sym->type;
            if (iv.get() == loop->VLCV || !iv->has(IV_is_IV) || !iv->has(IV_affine) || !type->is_int() ||
                !type->is_unsigned() || is_marked_affine(iv->sym, loop))
                continue;
            NODE* mark = maketree(NASSERT, make_AFFINE_IV_sym_ICALL(iv->sym), nullptr, tp->void_t);
            insert_before(&loop->head->statements, mark, loop->head->statements->psn);
            currfuninfo->has_affine_marks = true;
        }
    }
}

void drop_affine_marks() {
    if (!currfuninfo->has_affine_marks) return;
    currfuninfo->has_affine_marks = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link && (*link)->rest;) {
            const NODE* t = (*link)->first;
            const bool is_mark = t->op == NASSERT && t->left->op == ICALL && t->left->left && t->left->left->op == NAME &&
                                 is_affine_mark(t, t->left->left->u.sym);
            if (is_mark)
                drop_statement(link);
            else
                link = &(*link)->rest;
        }
}

// ---- The virtual control variable

void make_virtual_LCV(struct LOOP* loop) {
    if (!loop->virtual_symbol) {
        auto sym = std::make_shared<SYMTAB>();
        sym->name = safestrdup(("$O$h" + std::to_string(loop->uid)).c_str());
        sym->sclass = SC_AUTO;
        sym->is_temp = true;
        sym->flags = 1;
        sym->level = 2;
        sym->type = sym->orig_type = tp->long_t;
        sym->size = tp->long_t->size;
        sym->align = tp->long_t->align;
        loop->virtual_symbol = std::move(sym);
    }
    SYMTAB* sym = loop->virtual_symbol.get();
    LOOPIV* iv = alloc_LOOPIV(sym, loop);
    std::rotate(loop->IVs.begin(), loop->IVs.end() - 1, loop->IVs.end());
    iv->lowval = INT65(0);
    iv->highval = type_mask(tp->long_t);
    iv->init = mk_ICON(INT65(0), tp->long_t);
    iv->incrtree = mk_ICON(INT65(1), tp->long_t);
    iv->flags = VLCV_FLAGS;
    loop->VLCV = iv;
    loop->flags |= LOOP_signed_bounds;
    loop->IV_syms.push_back(sym);
}

void erase_virtual_inits(struct LOOP* root) {
    for (struct LOOP* loop : loops_outer_first(root))
        for (const auto& iv : loop->IVs)
            if (iv->virtualInit) {
                erase_tree(iv->virtualInit);
                iv->virtualInit = nullptr;
            }
}

// ---- The search

namespace {

void keep_virtual_record_alone(struct LOOP* loop) {
    loop->LCV = nullptr;
    std::vector<LOOPIV*> gone;
    for (const auto& iv : loop->IVs)
        if (iv.get() != loop->VLCV) gone.push_back(iv.get());
    for (LOOPIV* iv : gone) delete_LOOPIV(iv);
}

void find_IVs_of(struct LOOP* loop) {
    keep_virtual_record_alone(loop);
    CANDIDATES(loop).find();
    make_RC_records(loop);
    if (make_IV_records(loop) && !loop->is_root()) USE_ORDER(loop).find();
    if (loop->is_root()) return;
    find_loop_LCV(loop);
    if (!loop->VLCV) make_virtual_LCV(loop);
    if (loop->LCV) mark_affine_LCV(loop);
    calculate_trip_count(loop);
    refine_loop_highlow(loop);
    if (loop->trips)
        for (const auto& iv : loop->IVs) compute_lasttree_for_IV(iv.get(), loop);
    if (!do_dd_for_be) {
        shorten_long_IVs(loop);
        lengthen_short_IVs(loop);
    }
    if (loop->trips)
        for (const auto& iv : loop->IVs)
            if (iv->has(IV_is_IV) && !iv->has(IV_affine) && iv->incrtree && iv->incrtree->op == ICON)
                prove_IV_affine(iv.get(), iv->init, iv->last, iv->incrtree->u.lval, loop->trips, loop);
}

} // namespace

// Of the whole tree below `top`, outer loops first: what is known of a loop serves those in it and behind it.
void find_loop_IVs(struct LOOP* top) {
    keep_symbol_values(true);
    for (struct LOOP* loop : loops_outer_first(top)) find_IVs_of(loop);
    keep_symbol_values(false);
}
