#include "OPT5/dd/inductions.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/effects.h"
#include "OPT5/dd/trip.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/loops.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>
#include <cstdint>

bool is_private_scalar(const SYMTAB* sym) {
    return sym && sym->level == 2 && sym->type->is_scalar() && only_its_name_reaches(sym);
}

namespace {

constexpr unsigned ADDRESS_BITS = 32;
constexpr double TRIP_COUNT_UNKNOWN = 12;

bool may_count(const SYMTAB* sym) {
    const TYPE* t = sym->type;
    const bool is_integer = t->is_int() && !t->is_bool() && (t->size == 16 || t->size == ADDRESS_BITS);
    return (is_integer || t->is_pointer()) && !(t->qual_kind(false) & QUAL_RESTRICT) && is_private_scalar(sym) &&
           !find_widened_symbol_entry(sym);
}

// What is added must be computed in the variable's own arithmetic: what is computed in an unsigned or in a wider type
// wraps where a signed variable does not.
bool fits_step(const TYPE* type, const NODE* added) {
    if (!added->type->is_int() || added->type->is_bool()) return false;
    if (type->is_pointer()) return added->type->size <= ADDRESS_BITS;
    if (added->op == ICON && type->is_unsigned()) return true;
    return added->type->size == type->size && added->type->is_unsigned() == type->is_unsigned();
}

bool as_step(const TYPE* type, int op, const NODE* added, INDUCTION::STEP* step) {
    constexpr int MOST_NODES = 8;
    if (!fits_step(type, added)) return false;
    const int sign = op == PLUS ? 1 : -1;
    if (added->op != ICON) {
        step->by = sign;
        step->amount = added;
        return count_nodes_in_tree(added) <= MOST_NODES;
    }
    if (!added->u.lval.fits<int32_t>()) return false;
    step->by = sign * added->u.lval.fits_in<int32_t>();
    return step->by != 0;
}

bool is_step(const NODE* t, INDUCTION::STEP* step) {
    INDUCTION_UPDATE u;
    if (!is_induction_update(t, &u) || u.is_narrowed || !may_count(u.sym)) return false;
    return as_step(u.sym->type, u.is_subtracted ? MINUS : PLUS, u.amount, step);
}

bool is_understood(const NODE* t) {
    return t->op != ASM && t->op != LOOP && t->op != INITLOOP && t->op != ENDLOOP && !tree_is_EH_SWITCH(t) &&
           !tree_is_arg_prolog(t) && !(t->op == IF && t->left->op == ENDLOOP);
}

int64_t in_type(int64_t v, TYPE* type) { return truncate_to_type(INT65(v), type).fits_in<int64_t>(); }

} // namespace

LOOP_FACTS::LOOP_FACTS(const NATURAL_LOOPS& all, NATURAL_LOOP* of) : loops(all), loop(of), estimate(TRIP_COUNT_UNKNOWN) {
    usable = loop->is_reducible;
    if (usable) collect_assignments();
    if (!usable) return;
    keep_inductions();
    if (in_order.empty()) return;
    order_steps();
    find_starts();
    find_tests();
    judge_wrapping();
    estimate_trip_count();
}

LOOP_FACTS::~LOOP_FACTS() {
    for (NODE* t : made) erase_tree(t);
}

// ---- What is assigned

void LOOP_FACTS::collect_assignments() {
    for (BBLK* bb : loop->blocks) {
        if (bb->is_in_LIR_form()) usable = false;
        int n = 0;
        for (LIST* s = bb->statements; s && usable; s = s->rest) {
            enter_statement(bb, s->first);
            place[s->first] = n++;
        }
    }
}

void LOOP_FACTS::enter_statement(BBLK* bb, NODE* t) {
    if (t->op == PPRAGMA || tree_is_ASM_comment(t)) return;
    if (!is_understood(t)) {
        usable = false;
        return;
    }
    for_each_node(t, [this](const NODE* n) {
        if (n->op == NAME) ++names[n->u.sym];
    });
    for_each_written_name(t, [this](const NODE* name, const NODE*) { ++assignments[name->u.sym]; });
    INDUCTION::STEP step{bb, t, 0, nullptr};
    if (is_step(t, &step)) {
        INDUCTION& induction = inductions[t->left->u.sym];
        induction.sym = t->left->u.sym;
        if (induction.steps.empty()) in_order.push_back(&induction);
        induction.steps.push_back(step);
    } else if (t->op == ASG && t->left->op == NAME)
        definitions[t->left->u.sym] = {bb, t};
}

// The assignments of the whole loop are known by now, so that it can be told what an amount is made of.
bool LOOP_FACTS::steps_by_invariants(const INDUCTION& i) {
    if (assignments[i.sym] != static_cast<int>(i.steps.size())) return false;
    return std::all_of(i.steps.begin(), i.steps.end(),
                       [this](const INDUCTION::STEP& s) { return !s.amount || is_invariant(s.amount); });
}

void LOOP_FACTS::keep_inductions() {
    in_order.erase(std::remove_if(in_order.begin(), in_order.end(),
                                  [this](const INDUCTION* i) { return !steps_by_invariants(*i); }),
                   in_order.end());
    std::unordered_map<const SYMTAB*, INDUCTION> kept;
    std::vector<const SYMTAB*> symbols;
    for (INDUCTION* i : in_order) {
        symbols.push_back(i->sym);
        kept[i->sym] = std::move(*i);
    }
    inductions.swap(kept);
    in_order.clear();
    for (const SYMTAB* sym : symbols) in_order.push_back(&inductions[sym]);
}

INDUCTION* LOOP_FACTS::induction(const SYMTAB* sym) {
    auto it = inductions.find(sym);
    return it == inductions.end() ? nullptr : &it->second;
}

// ---- Values within an iteration

const LOOP_FACTS::DEFINITION* LOOP_FACTS::definition(const SYMTAB* sym) const {
    auto it = definitions.find(sym);
    if (it == definitions.end() || !is_private_scalar(sym) || assignments.at(sym) != 1) return nullptr;
    return &it->second;
}

void LOOP_FACTS::look_at(const BBLK* bb, const NODE* statement) {
    looking_in = bb;
    looking_at = place.at(statement);
}

// The steps end their iteration: behind each, control passes to the header.
void LOOP_FACTS::order_steps() {
    steps_end_iterations = true;
    for (const INDUCTION* i : in_order)
        for (const INDUCTION::STEP& s : i->steps) {
            for (const EDGE* e = s.bb->successors; e; e = e->rest)
                steps_end_iterations &= e->first == loop->header || !loops.contains(loop, e->first);
            int& first = first_step.emplace(s.bb, place.at(s.statement)).first->second;
            first = std::min(first, place.at(s.statement));
        }
}

const NODE* LOOP_FACTS::value_of(const SYMTAB* sym) {
    const DEFINITION* d = is_induction(sym) ? nullptr : definition(sym);
    if (!d || !steps_end_iterations) return nullptr;
    if (auto step = first_step.find(looking_in); step != first_step.end() && step->second < looking_at) return nullptr;
    const bool comes_first =
        d->bb == looking_in ? place.at(d->statement) < looking_at : loops.dominates(d->bb, looking_in);
    return comes_first ? d->statement->right : nullptr;
}

// ---- Invariants

// Another variable than a private one: nothing in the loop may write to it.
bool LOOP_FACTS::is_unchanged(const SYMTAB* sym, const NODE* name) {
    if (auto it = unchanged.find(sym); it != unchanged.end()) return it->second;
    bool stays = --questions_left >= 0 && !sym->type->is_volatile() && !name->type->is_volatile();
    for (size_t i = 0; stays && i < loop->blocks.size(); ++i)
        stays = !bb_modifies_lvalue_in_tree(loop->blocks[i], name);
    return unchanged[sym] = stays;
}

bool LOOP_FACTS::is_invariant(const NODE* t) {
    switch (t->op) {
    case ICON: return true;
    case NAME: {
        const SYMTAB* sym = t->u.sym;
        if (!sym || !t->type->is_scalar() || lvalue_is_volatile(t)) return false;
        if (!t->type->is_pointer() && (!t->type->is_int() || t->type->size > ADDRESS_BITS)) return false;
        if (is_private_scalar(sym)) return !assignments.count(sym);
        return is_unchanged(sym, t);
    }
    case UAND: {
        const NODE* object = without_members(static_cast<const NODE*>(t->left));
        return object->op == NAME && object->u.sym && !object->u.sym->is_function();
    }
    case PLUS:
    case MINUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB:
    case SLL:
    case SRL:
        if (!t->type->is_int() && !t->type->is_pointer()) return false;
        return is_invariant(t->left) && is_invariant(t->right);
    case UMINUS:
    case NOTB:
    case SCONV:
    case PCONV:
        if (!t->left->type->is_int() && !t->left->type->is_pointer()) return false;
        return (t->type->is_int() || t->type->is_pointer()) && is_invariant(t->left);
    default: return false;
    }
}

bool LOOP_FACTS::stays_linear_when_widened(const SYMTAB* sym) const {
    auto it = inductions.find(sym);
    return it != inductions.end() && !it->second.wraps;
}

int LOOP_FACTS::mentions(const SYMTAB* sym) const {
    auto it = names.find(sym);
    return it == names.end() ? 0 : it->second;
}

bool LOOP_FACTS::is_used_after(const SYMTAB* sym) const {
    const int bit = live_index(sym);
    if (bit < 0) return true;
    for (const BBLK* bb : loop->blocks)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (!loops.contains(loop, e->first) && is_live_at_entry(e->first, bit))
                return true;
    return false;
}

// ---- Values on entry

void LOOP_FACTS::find_starts() {
    constexpr int MOST_BLOCKS = 6;
    const BBLK* bb = nullptr;
    for (const EDGE* e = loop->header->predecessors; e; e = e->rest) {
        if (loops.contains(loop, e->first)) continue;
        if (bb) return;
        bb = e->first;
    }
    std::unordered_map<const SYMTAB*, bool> seen; // an assignment behind the place looked at
    for (int n = 0; bb && n < MOST_BLOCKS; ++n) {
        std::vector<NODE*> statements;
        for (LIST* s = bb->statements; s; s = s->rest) statements.push_back(s->first);
        for (auto it = statements.rbegin(); it != statements.rend(); ++it) {
            NODE* root = *it;
            for_each_written_name(root, [&](const NODE* name, const NODE* t) {
                INDUCTION* i = induction(name->u.sym);
                if (!i || !seen.emplace(i->sym, true).second) return;
                if (t != root || t->op != ASG || t->left != name || t->right->op != ICON) return;
                if (!i->sym->type->is_int() || !t->right->u.lval.fits<int32_t>()) return;
                i->start_is_known = true;
                i->start = in_type(t->right->u.lval.fits_in<int32_t>(), i->sym->type);
                if (n == 0 && !bb->successors->rest) i->start_statement = root;
            });
        }
        bb = only_block(bb->predecessors);
    }
}

// ---- Tests

bool LOOP_FACTS::runs_once_in_each_iteration(const BBLK* bb) const {
    return loops.around(bb) == loop && loops.dominates_latches(bb, loop);
}

// An integer that is tested for truth, `counter` or `counter + constant`, against what it is compared with; null if it is none.
const NODE* LOOP_FACTS::limit_of_truth(const NODE*& t) {
    const bool is_sum = t->op == PLUS && t->right->op == ICON && t->type->is_int();
    const NODE* counter = is_sum ? static_cast<const NODE*>(t->left) : t;
    if (counter->op != NAME || !counter->type->is_int() || counter->type->size != t->type->size) return nullptr;
    TYPE* type = counter->type->stqs();
    const INT65 limit = is_sum ? truncate_to_type(-t->right->u.lval, type) : INT65(0);
    t = counter;
    return made.emplace_back(mk_ICON(limit, type));
}

void LOOP_FACTS::find_tests() {
    for (BBLK* bb : loop->blocks) {
        NODE* branch = bb->branch();
        if (!branch || branch->op != IF || !runs_once_in_each_iteration(bb)) continue;
        const NODE* compare = branch->left;
        LOOP_TEST test;
        test.bb = bb;
        test.branch = branch;
        const bool is_compare = op_is_int_compare(compare->op), is_negated = compare->op == EXCLAIM;
        const NODE *counter = is_negated || is_compare ? static_cast<const NODE*>(compare->left) : compare;
        const NODE* limit = is_compare ? static_cast<const NODE*>(compare->right) : limit_of_truth(counter);
        if (!limit) continue;
        test.stay_op = is_compare ? compare->op : is_negated ? static_cast<int>(EQ) : static_cast<int>(NEQ);
        if (counter->op != NAME || !is_induction(counter->u.sym)) {
            std::swap(counter, limit);
            test.stay_op = commute_inv[test.stay_op];
        }
        if (counter->op != NAME || !is_induction(counter->u.sym) || !is_invariant(limit)) continue;
        test.counter = induction(counter->u.sym);
        test.limit = limit;
        if (!limit->type->is_int() || !counter->type->is_int() || limit->type->size != counter->type->size ||
            test.counter->steps.size() != 1 || test.counter->steps.front().amount ||
            !runs_once_in_each_iteration(test.counter->steps.front().bb))
            continue;
        const BBLK *yes = branch->right->left->lbl->bblock, *no = branch->right->right->lbl->bblock;
        if (loops.contains(loop, yes) == loops.contains(loop, no)) continue;
        test.stays_if_true = loops.contains(loop, yes);
        if (!test.stays_if_true) test.stay_op = boolean_inv[test.stay_op];
        const bool is_signed_op = test.stay_op <= GT;
        if (test.stay_op != EQ && test.stay_op != NEQ &&
            (is_signed_op == counter->type->is_unsigned() || is_signed_op == limit->type->is_unsigned()))
            continue;
        test.step_comes_first = loops.dominates(test.counter->steps.front().bb, bb);
        exits.push_back(test);
    }
}

int64_t constant_trip_count(const LOOP_TEST& test, int64_t* last_value) {
    const INDUCTION& i = *test.counter;
    if (!i.start_is_known || test.limit->op != ICON || !test.limit->u.lval.fits<int32_t>()) return -1;
    const int64_t by = i.steps.front().by, limit = in_type(test.limit->u.lval.fits_in<int32_t>(), i.sym->type);
    const auto trips = steps_to_exit(i.start, limit, by, test.stay_op, test.step_comes_first ? 1 : 0);
    if (!trips || *trips > INT32_MAX) return -1;
    const int64_t n = static_cast<int64_t>(*trips), value = i.start + n * by;
    if (in_type(value, i.sym->type) != value) return -1;
    *last_value = value;
    return n;
}

// Whether the condition, which is consumed, holds where the loop is entered, by a test ahead of it that nothing behind it
// takes back.
bool LOOP_FACTS::is_entered_under(NODE* condition) const {
    constexpr int MOST_BLOCKS = 4;
    const READ_SET reads(condition);
    bool holds = false;
    const BBLK *to = loop->header, *bb = nullptr;
    for (const EDGE* e = to->predecessors; e; e = e->rest)
        if (!loops.contains(loop, e->first)) bb = bb ? to : e->first;
    for (int n = 0; bb && bb != loop->header && n < MOST_BLOCKS && !holds; ++n) {
        const NODE* control = bb->branch();
        if (is_test(control)) {
            const BBLK *yes = control->right->left->lbl->bblock, *no = control->right->right->lbl->bblock;
            holds = yes != no && !tree_has_side_effects(control->left) && pred_implies_pred(control->left, yes == to, condition) == 1;
        } else if (control->op != BRANCH)
            break;
        bool stays = !holds;
        for (const LIST* s = bb->statements; s && stays; s = s->rest) stays = !reads.may_be_changed_by(s->first);
        if (!stays) break;
        to = bb;
        bb = only_block(bb->predecessors);
    }
    erase_tree(condition);
    return holds;
}

bool LOOP_FACTS::is_guarded(const LOOP_TEST& test) const {
    if (!test.step_comes_first) return false;
    const INDUCTION& i = *test.counter;
    auto holds_for = [&](NODE* start) {
        return is_entered_under(simp_tree(maketree(test.stay_op, start, copy_tree(test.limit), tp->int_t), nullptr));
    };
    if (holds_for(mk_NAME(i.sym))) return true;
    return i.start_is_known && holds_for(mk_ICON(INT65(i.start), i.sym->type->stqs()));
}

// An unsigned counter does not wrap where each step follows a test that leaves room for it, or the first step follows a
// known start.
void LOOP_FACTS::judge_wrapping() {
    for (INDUCTION* i : in_order)
        i->wraps = i->sym->type->is_int() && i->sym->type->is_unsigned() && i->sym->type->size < ADDRESS_BITS &&
                   unsigned_index_wraps;
    for (const LOOP_TEST& test : exits) {
        INDUCTION& i = *test.counter;
        int64_t last;
        if (!i.wraps) continue;
        if (constant_trip_count(test, &last) >= 0) {
            i.wraps = false;
            continue;
        }
        const int64_t by = i.steps.front().by, top = (int64_t(1) << i.sym->type->size) - 1;
        if (test.step_comes_first && (!i.start_is_known || i.start + by < 0 || i.start + by > top)) continue;
        // The last value that stays, and the step from there.
        INT65 farthest;
        switch (test.stay_op) {
        case ULT: farthest = calculate_maxval_for_tree(test.limit, nullptr) - INT65(1); break;
        case ULE: farthest = calculate_maxval_for_tree(test.limit, nullptr); break;
        case UGT: farthest = calculate_minval_for_tree(test.limit, nullptr) + INT65(1); break;
        case UGE: farthest = calculate_minval_for_tree(test.limit, nullptr); break;
        default: continue;
        }
        const bool goes_up = test.stay_op == ULT || test.stay_op == ULE;
        if (goes_up == (by > 0)) i.wraps = farthest + INT65(by) < INT65(0) || farthest + INT65(by) > INT65(top);
    }
}

void LOOP_FACTS::estimate_trip_count() {
    int64_t last;
    for (const LOOP_TEST& test : exits)
        if (const int64_t n = constant_trip_count(test, &last); n >= 0)
            estimate = std::min(estimate == TRIP_COUNT_UNKNOWN ? 1000.0 : estimate, static_cast<double>(n));
}
