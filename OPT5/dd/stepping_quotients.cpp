// Quotients and remainders of a counter by what the loop leaves alone are counted themselves:
//
//     for (i = 0; i < n; i++) if (i % every == 0) f();       r = 0; ... i += 1; r += 1; r = r == every ? 0 : r;
//     for (k = p; k < n; k += step) s += x[k / step];        q = p / step; ... k += step; q += 1;
//
// Needs: the hierarchy with its variables. Leaves: the hierarchy; symbols are added.
// Sound because the step of the temporary stands right behind the counter's one step, so that at any other statement it
// is what the division gives. A counter from 0 by 1 that does not wrap is never negative: its remainder is that by the
// divisor's magnitude, and 0 where it begins, where nothing is divided. A quotient is divided for ahead of the loop: there the
// divisor is positive. It goes up by 1 with each step of a counter that begins with no negative number, and is signed, so
// that it does not wrap. What divides by 0 has no meaning, and may have any value.
#include "OPT5/dd/dd.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/symbolic.h"

#include <vector>

namespace {

class STEPPING_QUOTIENTS {
public:
    explicit STEPPING_QUOTIENTS(struct LOOP* of) : loop(of) {}

    bool run() {
        for (BBLK* bb : loop->contents)
            if (bb->loop == loop && bb_dominates_bb(bb, loop->tail))
                for (LIST* s = bb->statements; s; s = s->rest) find_in(&s->first);
        for (const COUNTED& c : counted) count(c);
        return !counted.empty();
    }

private:
    // Divisions of one variable by one other.
    struct COUNTED {
        int op;
        SYMTAB *counter, *divisor;
        LIST* step;                // the statement that steps the variable
        std::vector<NODE**> places;
    };

    // In what is evaluated in each iteration: the others may cost less than the steps.
    void find_in(NODE** slot) {
        for (; *slot; slot = &(*slot)->left) {
            enter(slot);
            if ((*slot)->op != ANDAND && (*slot)->op != OROR && (*slot)->op != QUEST) find_in(&(*slot)->right);
        }
    }

    void enter(NODE** slot) {
        const NODE* t = *slot;
        if ((t->op != DIV && t->op != MOD) || !t->type->is_int() || t->left->op != NAME || t->right->op != NAME) return;
        for (COUNTED& c : counted)
            if (c.op == t->op && c.counter == t->left->u.sym && c.divisor == t->right->u.sym) return c.places.push_back(slot);
        SYMTAB *x = t->left->u.sym, *divisor = t->right->u.sym;
        if (!is_private_scalar(x) || !is_private_scalar(divisor) || !sym_is_RC_in_loop(divisor, loop)) return;
        if (x->type->stqs() != t->type->stqs() || divisor->type->stqs() != t->type->stqs()) return;
        LIST* step = step_of(x);
        INDUCTION_UPDATE update;
        if (!step || !is_induction_update(step->first, &update) || update.is_narrowed || update.is_subtracted) return;
        const bool is_counted = t->op == MOD ? counts_from_0(update) : goes_up_by(update, t);
        if (is_counted && rewrite_is_allowed(t)) counted.push_back({t->op, x, divisor, step, {slot}});
    }

    static bool is_number(const NODE* t, int value) { return t && t->op == ICON && t->u.lval == INT65(value); }
    bool counts_from_0(const INDUCTION_UPDATE& update) const {
        const LOOPIV* iv = find_LOOPIV_for_IV(update.sym, loop, false);
        return iv && is_number(iv->init, 0) && is_number(update.amount, 1) &&
               (update.sym->type->is_signed() || iv->has(IV_affine));
    }
    bool goes_up_by(const INDUCTION_UPDATE& update, const NODE* quotient) const {
        const NODE* divisor = quotient->right;
        return update.amount->op == NAME && update.amount->u.sym == divisor->u.sym && divisor->type->is_signed() &&
               tree_is_positive(divisor, loop) && begins_non_negative(quotient->left);
    }
    bool begins_non_negative(const NODE* counter) const {
        NODE* start = find_expr_init(counter, loop);
        const LOOPIV* outer = start && start->op == NAME ? find_LOOPIV_for_IV(start->u.sym, loop->parent, true) : nullptr;
        const bool is_one = start && (tree_is_non_negative(start, loop) || (outer && !outer->lowval.is_negative()));
        erase_tree(start);
        return is_one;
    }

    // The one statement of the loop that writes the variable; null where there are others.
    LIST* step_of(const SYMTAB* x) const {
        LIST* step = nullptr;
        int writes = 0;
        for (const BBLK* bb : loop->contents) {
            if (bb->loop != loop && !sym_is_RC_in_loop(x, bb->loop)) return nullptr;
            for (LIST* s = bb->statements; s && bb->loop == loop; s = s->rest)
                for_each_written_name(s->first, [&](const NODE* name, const NODE* by) {
                    if (name->u.sym != x) return;
                    ++writes;
                    step = by == s->first ? s : nullptr;
                });
        }
        return writes == 1 ? step : nullptr;
    }

    // ---- Counting. A remainder is below the divisor's magnitude, which may have no room in its own type.

    void count(const COUNTED& c) {
        TYPE *type = c.counter->type->stqs(), *wide = tp->mk_unsigned(type);
        SYMTAB* value = sym_temp(c.op == MOD ? 'r' : 'q', -1, c.op == MOD ? wide : type, nullptr);
        for (struct LOOP* l = loop; l; l = l->parent) make_sym_altered_in_loop(value, l);
        auto name = [value] { return mk_NAME(value); };
        NODE* next = maketree(PLUSASG, name(), mk_ICON(INT65(1), value->type), value->type);
        if (c.op == DIV) {
            put_ahead(value, maketree(DIV, mk_NAME(c.counter), mk_NAME(c.divisor), type));
            insert_behind(c.step, next, c.step->psn);
        } else {
            SYMTAB* limit = magnitude(c.divisor, wide);
            put_ahead(value, mk_ICON(INT65(0), wide));
            NODE* is_at_limit = maketree(EQ, name(), mk_NAME(limit), tp->int_t);
            NODE* arms = maketree(COLON, mk_ICON(INT65(0), wide), name(), wide);
            insert_behind(c.step, mk_ASG(name(), maketree(QUEST, is_at_limit, arms, wide)), c.step->psn);
            insert_behind(c.step, next, c.step->psn);
        }
        for (NODE** place : c.places) {
            erase_tree(*place);
            *place = coerce_to_type(type, name());
        }
    }

    SYMTAB* magnitude(SYMTAB* divisor, TYPE* wide) {
        if (divisor->type->is_unsigned()) return divisor;
        auto as_unsigned = [=] { return coerce_to_type(wide, mk_NAME(divisor)); };
        NODE *value = as_unsigned(), *number = mk_NAME(divisor);
        if (tree_is_non_negative(number, loop)) {
            erase_tree(number);
        } else {
            NODE* is_negative = maketree(LT, number, mk_ICON(INT65(0), divisor->type->stqs()), tp->int_t);
            NODE* negated = maketree(UMINUS, as_unsigned(), nullptr, wide);
            value = maketree(QUEST, is_negative, maketree(COLON, negated, value, wide), wide);
        }
        SYMTAB* limit = sym_temp('r', -1, wide, nullptr);
        put_ahead(limit, value);
        make_sym_RC_in_loop(limit, loop);
        for (struct LOOP* l = loop->parent; l; l = l->parent) make_sym_altered_in_loop(limit, l);
        return limit;
    }

    void put_ahead(SYMTAB* sym, NODE* value) { insert_at_end_of_body(loop->preheader, mk_ASG(mk_NAME(sym), value)); }

    struct LOOP* loop;
    std::vector<COUNTED> counted;
};

} // namespace

void count_quotients(struct LOOP* root) {
    bool any = false;
    need(fact::alias_marks);
    for (struct LOOP* loop : loops_inner_first(root))
        if (!loop->is_root() && loop->preheader) any |= STEPPING_QUOTIENTS(loop).run();
    if (!any) return;
    sym_split(currfuninfo);
    changed(fact::graph);
}
