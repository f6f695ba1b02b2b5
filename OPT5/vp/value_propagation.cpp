// The fixpoint: environments at the entry and the exit of each block.
//
// Blocks are evaluated in reverse postorder, those again whose entry has changed, in at most 12 passes. An edge carries
// the exit environment of its block narrowed by the test there; an edge that no value passes carries nothing. What
// enters a block is what holds on all edges into it. A set that still grows where a back edge enters is widened, after
// the fifth member, to the end of its type in the direction it grows in; the loop's test narrows it again.
//
// Needs: block numbers, alias marks; caps need trip counts of the loop hierarchy. Leaves: everything: it only looks.
// Sound because only a state that a whole pass did not change is used: the first block's entry binds nothing, each
// entry holds at least what its edges bring, and each exit at least what the block makes of its entry. By induction
// over the steps of a run, every variable has a member of its set then, however the sets were guessed. One thing is
// not of that form: the cap of an accumulator. Where a loop has one statement that writes s, s += x, which runs at most
// T times before the loop ends, s at the head is what it was on entry plus at most T members of x's set; the same
// induction counts the updates. Without a bound T there is no cap.
#include "OPT5/vp/vp.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/side_table.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <memory>
#include <unordered_map>

namespace {

constexpr int MOST_PASSES = 12;
constexpr int FIRST_WITHOUT_NARROWING = 8, FIRST_WITHOUT_BOUNDS = 10; // so that the passes come to an end
constexpr size_t MOST_THRESHOLDS = 24; // of a loop
constexpr int MOST_RETURNS = 12;       // to a head in one pass
constexpr long BLOCKS_OF_RETURNS = 32; // gone back over in all, for each block of the function
constexpr size_t MOST_LISTED_CASES = 16;
constexpr size_t MOST_ORIGINS_BACK = 6; // assignments ahead of a test
constexpr int MOST_NODES_OF_ORIGIN = 12;

bool has_same_values(const TYPE* a, const TYPE* b) {
    return has_value_range(a) && has_value_range(b) && a->size == b->size && wraps_signed(a) == wraps_signed(b) &&
           !a->is_enum() && !b->is_enum() && a->is_bool() == b->is_bool();
}

// Quotients are left out: where their dividend is known better they lose the shape in which others are equal to them.
bool is_part_of_sum(int op) { return op == PLUS || op == MINUS || op == UMINUS || op == SCONV || op == ICON; }

// ---- Widening

VPSLICE hull_of(const vpset& s) {
    VPSLICE hull;
    vpset_compress(&hull, s);
    return hull;
}

// A value that the loop compares with, or takes remainders by: a set that grows may come to rest there.
using THRESHOLDS = std::vector<WIDE>; // ascending

// Towards the next threshold, or the end of the type, in the directions that the set has grown in since `old`.
vpset grown(const vpset& old, const vpset& all, const TYPE* type, const THRESHOLDS& thresholds) {
    const RANGE limits = vpset_limits(type);
    const VPSLICE hull = hull_of(all);
    if (hull.step == 0) return all;
    WIDE low = hull.low, high = hull.high;
    if (low < vpset_minimum(old)) {
        const auto above = std::upper_bound(thresholds.begin(), thresholds.end(), low);
        low = above == thresholds.begin() ? limits.min : std::max(limits.min, *(above - 1));
    }
    if (high > vpset_maximum(old)) {
        const auto next = std::lower_bound(thresholds.begin(), thresholds.end(), high);
        high = next == thresholds.end() ? limits.max : std::min(limits.max, *next);
    }
    // Without members in between the next end is that of the type.
    const VPSLICE s = slice_between(low, high, hull);
    return vpset(s.low < hull.low || s.high > hull.high ? s : hull);
}

void add_thresholds(const NODE* tree, THRESHOLDS* thresholds) {
    for_each_subtree(tree, [thresholds](const NODE* t) {
        if ((t->op != MOD && t->op != ANDB && !op_is_int_compare(t->op)) || t->right->op != ICON) return;
        const WIDE c = to_wide(t->right->u.lval);
        if (t->op == ANDB) return thresholds->push_back(c);
        thresholds->insert(thresholds->end(), {c - 1, c});
        thresholds->push_back(t->op == MOD ? 1 - c : c + 1);
    });
}

// What takes the place of the set that edges bring into the entry of a block, where it was `old` before.
vpset widened(const vpset& old, const vpset& now, const TYPE* type, const THRESHOLDS& thresholds, int pass) {
    if (vpset_is_subset(now, old)) return pass < FIRST_WITHOUT_NARROWING ? now : old;
    vpset all;
    if (pass >= FIRST_WITHOUT_BOUNDS) return all; // any value
    vpset_union(&all, old, now);
    if (vpset_size(old) < 3 || vpset_size(all) < 5) return all;
    return grown(old, all, type, thresholds);
}

// ---- Switches

struct CASES {
    std::unordered_map<const BBLK*, std::vector<VPSLICE>> values; // looked up alone
    std::vector<WIDE> listed;                                      // all values, if they are few
    const BBLK* otherwise = nullptr;

    CASES(const NODE* control) {
        const TYPE* type = control->left->type;
        for (const NODE* t = control->right; t; t = t->op == COMMA ? t->left : nullptr)
            take(t->op == COMMA ? t->right : t, type);
    }
    // The values of the cases that lead there.
    vpset of(const BBLK* bb) const {
        auto it = values.find(bb);
        if (it == values.end()) return {};
        VPSLICE_LIST list;
        for (const VPSLICE& s : it->second)
            if (it->second.size() <= MOST_LISTED_CASES) list.push_back(s);
        if (list.size()) return vpset_of(list);
        WIDE low = it->second[0].low, high = low;
        for (const VPSLICE& s : it->second) low = std::min(low, s.low), high = std::max(high, s.low);
        return vpset(make_vpslice(low, high, 1));
    }
    // The default edge: the selector has none of the values that lead elsewhere.
    bool without_listed(vpenv* env, const NODE* selector, const BBLK* to) const {
        if (listed.size() > MOST_LISTED_CASES || values.count(to)) return true;
        vpset left = vpset_of_tree(selector, *env);
        for (WIDE v : listed)
            if (!vpset_is_empty(left) && !vpset_without(&left, vpset(left), v)) return false;
        return filter_vpenv_by_values(env, selector, left);
    }

private:
    void take(const NODE* element, const TYPE* type) {
        if (element->op == DEFAULT) otherwise = element->left->lbl->bblock;
        if (element->op != CASE) return;
        if (element->left->op != ICON) optassert("casenode->left->op == ICON", __FILE__, __LINE__);
        vpset value(single_slice(to_wide(element->left->u.lval)));
        truncate_vpset_to_type(&value, type);
        if (!vpset_is_single(value)) return;
        values[element->right->lbl->bblock].push_back(value[0]);
        if (listed.size() <= MOST_LISTED_CASES) listed.push_back(value[0].low);
    }
};

// ---- The state

struct EDGE_STATE {
    int from = 0, to = 0;
    vpenv env;
    bool is_passed = false;
    bool closes_loop = false; // from within the natural loop that `to` heads
};

struct BLOCK_STATE {
    BBLK* bb = nullptr;
    std::vector<VP_EFFECT> effects; // those that are any, the control statement's among them
    std::vector<size_t> in, out;    // edges
    std::vector<const NODE*> origins;  // assignments x = e that the control statement tests: x is e there still
    const NODE* may_be_left = nullptr; // the statement ahead of the control statement
    const NATURAL_LOOP* headed = nullptr; // a natural loop, which
    std::vector<int> altered;             // changes these, and
    bool alters_globals = false;
    THRESHOLDS thresholds; // of the loop
    std::vector<std::pair<int, vpset>> courses; // of the induction variables of the loop whose head it is
    std::vector<size_t> capped, updated; // accumulators: of the loop whose head it is; those that it adds to
    bool closes_cycle = false;      // a back edge enters
    bool is_due = false, is_reached = false;
    int returns = 0; // to this head, in the pass
    vpenv entry, exit;
};

// A variable that one statement of a loop writes, by adding to it.
struct ACCUMULATOR {
    int number;
    const VP_EFFECT* by;
    int head;          // of the loop
    size_t entered_by; // the edge
    const NODE* amount;
    bool is_subtracted;
    WIDE most;     // updates between an entry and a later visit of the head
    vpset amounts; // of an update; empty: the statement was not reached yet
};

class VALUE_SETS {
public:
    bool find(bool with_loops); // false: no fixpoint. What is tracked has been found.
    const vpenv* of(const BBLK* bb, bool at_exit) const {
        if (number_of[bb] < 0 || !at(number_of[bb]).is_reached) return nullptr;
        return at_exit ? &at(number_of[bb]).exit : &at(number_of[bb]).entry;
    }

private:
    BLOCK_STATE& at(int number) { return blocks[static_cast<size_t>(number)]; }
    const BLOCK_STATE& at(int number) const { return blocks[static_cast<size_t>(number)]; }
    void read_graph(bool with_loops);
    static void find_origins(BLOCK_STATE* b);
    void find_altered();
    vpenv merged(const BLOCK_STATE& b) const;
    void find_accumulators();
    void add_accumulators(size_t block, const VP_EFFECT& effect);
    bool run_pass(int pass);
    void evaluate(BLOCK_STATE& b, int pass);
    bool enter(BLOCK_STATE& b, int pass);
    vpenv capped(const BLOCK_STATE& b, vpenv env) const;
    static bool filter_origins(const BLOCK_STATE& b, vpenv* env);
    void leave(BLOCK_STATE& b);
    void leave_by(size_t edge, vpenv env, bool can_be);
    void update_amounts(const BLOCK_STATE& b, const VP_EFFECT& effect, vpenv env, int pass);

    std::vector<BLOCK_STATE> blocks; // in reverse postorder
    std::vector<EDGE_STATE> edges;
    std::vector<ACCUMULATOR> accumulators;
    SIDE_TABLE<int> number_of{-1};
    std::unordered_map<const struct LOOP*, std::unordered_map<int, int>> writes; // of symbols; looked up alone
    bool is_changed = false; // an edge brings something else
    long returns_left = 0;    // blocks that may be gone back over
};

void VALUE_SETS::read_graph(bool with_loops) {
    std::vector<BBLK*> order;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) order.push_back(bb);
    std::stable_sort(order.begin(), order.end(), [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; });
    blocks.resize(order.size());
    for (size_t i = 0; i < order.size(); ++i) {
        blocks[i].bb = order[i];
        number_of[order[i]] = static_cast<int>(i);
        for (const LIST* s = order[i]->statements; s; s = s->rest) {
            if (s->rest) blocks[i].may_be_left = s->first;
            VP_EFFECT effect(s->first, with_loops ? order[i]->loop : nullptr);
            if (!effect.is_none()) blocks[i].effects.push_back(std::move(effect));
        }
        find_origins(&blocks[i]);
        if (const struct LOOP* loop = order[i]->loop; with_loops && loop && loop->head == order[i] && !loop->is_root())
            for (const auto& iv : loop->IVs)
                if (vpset course; vpenv_store->number_of(iv->sym) >= 0 && find_vpset_in_LOOPIV(&course, iv->sym, loop, true))
                    blocks[i].courses.emplace_back(vpenv_store->number_of(iv->sym), course);
    }
    for (size_t i = 0; i < order.size(); ++i)
        for (const EDGE* e = order[i]->successors; e; e = e->rest) {
            const int to = number_of[e->first];
            blocks[i].out.push_back(edges.size());
            at(to).in.push_back(edges.size());
            at(to).closes_cycle |= static_cast<size_t>(to) <= i;
            edges.push_back({static_cast<int>(i), to, {}});
        }
}

// Of the last assignments those of e to x where x is tested, and neither x nor what e reads is written in between.
void VALUE_SETS::find_origins(BLOCK_STATE* b) {
    const NODE* control = b->bb->branch();
    if (!control || (control->op != IF && control->op != SWITCH) || tree_acts(control->left)) return;
    std::vector<int> written;
    size_t looked_at = 0;
    for (size_t i = b->effects.size(); i > 0 && looked_at++ < MOST_ORIGINS_BACK; --i) {
        const VP_EFFECT& effect = b->effects[i - 1];
        if (effect.may_lose_globals()) return;
        written.insert(written.end(), effect.lost_symbols().begin(), effect.lost_symbols().end());
        const int x = effect.assigned_symbol();
        if (x < 0) continue;
        auto stays = [&written](int number) { return number >= 0 && std::find(written.begin(), written.end(), number) == written.end(); };
        const NODE* t = effect.statement();
        bool is_origin = t->op == ASG && (t->right->op == NAME || is_part_of_sum(t->right->op)) && stays(x) && sym_appears_in_tree(vpenv_store->symbol(x), control->left) &&
                         has_same_values(t->left->type, t->right->type) && count_nodes_in_tree(t->right) <= MOST_NODES_OF_ORIGIN;
        written.push_back(x);
        if (is_origin)
            for_each_subtree(static_cast<const NODE*>(t->right), [&](const NODE* n) {
                is_origin &= n->op == NAME ? stays(vpenv_store->number_of(n->u.sym)) : is_part_of_sum(n->op);
            });
        if (is_origin) b->origins.push_back(t);
    }
}

// What each natural loop changes. Its head dominates it, so that nothing else is changed where a back edge enters. An edge
// may lead back to the head from a cycle around it that has another entry, too: that is none of the loop.
void VALUE_SETS::find_altered() {
    for (const BLOCK_STATE& b : blocks) {
        const NATURAL_LOOP* innermost = currfuninfo->loops->around(b.bb);
        THRESHOLDS compared;
        if (innermost)
            for (const LIST* s = b.bb->statements; s && compared.size() < MOST_THRESHOLDS; s = s->rest)
                add_thresholds(s->first, &compared);
        for (const NATURAL_LOOP* l = innermost; l; l = l->parent) {
            BLOCK_STATE& head = at(number_of[l->header]);
            head.headed = l;
            if (head.thresholds.size() < MOST_THRESHOLDS)
                head.thresholds.insert(head.thresholds.end(), compared.begin(), compared.end());
            for (const VP_EFFECT& effect : b.effects) {
                if (effect.assigned_symbol() >= 0) head.altered.push_back(effect.assigned_symbol());
                head.altered.insert(head.altered.end(), effect.lost_symbols().begin(), effect.lost_symbols().end());
                head.alters_globals |= effect.may_lose_globals();
            }
        }
    }
    for (BLOCK_STATE& b : blocks) {
        std::sort(b.altered.begin(), b.altered.end());
        b.altered.erase(std::unique(b.altered.begin(), b.altered.end()), b.altered.end());
        std::sort(b.thresholds.begin(), b.thresholds.end());
        for (size_t e : b.in) edges[e].closes_loop = b.headed && currfuninfo->loops->contains(b.headed, at(edges[e].from).bb);
    }
}

// ---- Accumulators

void VALUE_SETS::find_accumulators() {
    for (const BLOCK_STATE& b : blocks)
        for (const VP_EFFECT& effect : b.effects)
            for (const struct LOOP* l = b.bb->loop; l && !l->is_root(); l = l->parent) {
                if (effect.assigned_symbol() >= 0) ++writes[l][effect.assigned_symbol()];
                for (int number : effect.lost_symbols()) writes[l][number] += 2; // once too often
            }
    for (size_t i = 0; i < blocks.size(); ++i)
        for (const VP_EFFECT& effect : blocks[i].effects)
            if (effect.assigned_symbol() >= 0) add_accumulators(i, effect);
    writes.clear();
}

// For each loop around the statement in which it is the only one that writes its variable.
void VALUE_SETS::add_accumulators(size_t block, const VP_EFFECT& effect) {
    constexpr WIDE MOST_UPDATES = static_cast<WIDE>(1) << 40;
    const int number = effect.assigned_symbol();
    const SYMTAB* sym = vpenv_store->symbol(number);
    INDUCTION_UPDATE update;
    if (!sym->is_automatic() || !has_value_range(sym->type) || sym->type->is_enum() || sym->type->is_bool()) return;
    WIDE inside = 1; // updates of one iteration
    for (struct LOOP* l = blocks[block].bb->loop; l && !l->is_root(); l = l->parent) {
        if (writes[l][number] != 1 || !l->maxTrips || l->maxTrips->op != ICON || !l->preheader) return;
        if (!update.sym && (!is_induction_update(effect.statement(), &update) || update.sym != sym || !update.amount ||
                            update.is_narrowed || !has_value_range(update.amount->type)))
            return;
        // A loop that is left ahead of its tail begins one more iteration than the tail ends.
        const WIDE trips = to_wide(l->maxTrips->u.lval) + (l->is_bottom_tested() ? 0 : 1);
        if (trips <= 0 || trips > MOST_UPDATES || inside > MOST_UPDATES / trips) return;
        const WIDE most = (trips - 1) * inside;
        inside *= trips;
        BLOCK_STATE& head = at(number_of[l->head]);
        const int from = number_of[l->preheader];
        for (size_t e : head.in)
            if (edges[e].from == from) {
                head.capped.push_back(accumulators.size());
                blocks[block].updated.push_back(accumulators.size());
                accumulators.push_back({number, &effect, number_of[l->head], e, update.amount, update.is_subtracted, most, {}});
            }
    }
}

void VALUE_SETS::update_amounts(const BLOCK_STATE& b, const VP_EFFECT& effect, vpenv env, int pass) {
    for (size_t i : b.updated) {
        ACCUMULATOR& a = accumulators[i];
        if (a.by != &effect) continue;
        vpset amounts = vpset_of_tree(a.amount, env);
        if (a.is_subtracted) vpset_negative(&amounts, vpset(amounts));
        if (vpset_equal(amounts, a.amounts)) continue;
        if (pass >= FIRST_WITHOUT_NARROWING) vpset_union(&amounts, vpset(amounts), a.amounts);
        a.amounts = amounts;
        at(a.head).is_due = is_changed = true;
    }
}

// What a head's variables were on entry, and no more updates than there are.
vpenv VALUE_SETS::capped(const BLOCK_STATE& b, vpenv env) const {
    for (size_t i : b.capped) {
        const ACCUMULATOR& a = accumulators[i];
        const EDGE_STATE& edge = edges[a.entered_by];
        const vpset* on_entry = edge.is_passed ? vpenv_store->find(edge.env, a.number) : nullptr;
        const vpset* now = vpenv_store->find(env, a.number);
        if (!on_entry) continue;
        const TYPE* type = vpenv_store->symbol(a.number)->type;
        const RANGE limits = vpset_limits(type);
        vpset cap = *on_entry, sum;
        if (!vpset_is_empty(a.amounts)) {
            const WIDE low = std::min(vpset_minimum(a.amounts), static_cast<WIDE>(0)) * a.most,
                       high = std::max(vpset_maximum(a.amounts), static_cast<WIDE>(0)) * a.most, step = vpset_gcd(a.amounts);
            vpset_sum(&sum, *on_entry, vpset(slice_between(low, high, {0, step, step})));
            if (limits.min > vpset_minimum(sum) || vpset_maximum(sum) > limits.max) {
                // Only numbers that the type cannot hold are left out: of one that wraps there is no cap.
                if (!wraps_signed(type) || !vpset_within(&cap, sum, limits.min, limits.max)) continue;
            } else
                cap = sum;
        }
        if (now && !vpset_intersection(&cap, *now, vpset(cap))) continue;
        env = vpenv_store->bind(env, a.number, cap);
    }
    return env;
}

// ---- Passes

// What the edges bring; the block has been reached. A loop that does not change a variable cannot make its set grow.
vpenv VALUE_SETS::merged(const BLOCK_STATE& b) const {
    std::vector<vpenv> ahead, from;
    for (size_t e : b.in)
        if (edges[e].is_passed) {
            from.push_back(edges[e].env);
            if (!edges[e].closes_loop) ahead.push_back(edges[e].env);
        }
    if (!b.headed || ahead.empty() || ahead.size() == from.size()) return vpenv_store->join(std::move(from));
    const vpenv entered = vpenv_store->join(std::move(ahead)), all = vpenv_store->join(std::move(from));
    vpenv env = all;
    vpenv_store->for_each_difference(entered, all, [&](int symbol, const vpset* set, const vpset*) {
        if (std::binary_search(b.altered.begin(), b.altered.end(), symbol)) return;
        if (b.alters_globals && !vpenv_store->symbol(symbol)->is_automatic()) return;
        env = vpenv_store->bind(env, symbol, set ? *set : vpset());
    });
    return env;
}

// Whether the block is to be evaluated: its entry is another than before.
bool VALUE_SETS::enter(BLOCK_STATE& b, int pass) {
    const bool is_first = &b == &blocks.front();
    if (!is_first && std::none_of(b.in.begin(), b.in.end(), [this](size_t e) { return edges[e].is_passed; })) return false;
    vpenv merged = is_first ? vpenv() : this->merged(b);
    if (!b.capped.empty()) merged = capped(b, merged);
    if (b.is_reached && b.closes_cycle) {
        const vpenv before = merged;
        vpenv_store->for_each_difference(b.entry, before, [&](int number, const vpset* old, const vpset* now) {
            if (!now) return;
            if (old)
                merged = vpenv_store->bind(merged, number, widened(*old, *now, vpenv_store->symbol(number)->type, b.thresholds, pass));
            else if (pass >= FIRST_WITHOUT_NARROWING)
                merged = vpenv_store->bind(merged, number, vpset());
        });
    }
    for (const auto& [number, course] : b.courses)
        if (vpset s = course; !vpenv_store->find(merged, number) || vpset_intersection(&s, *vpenv_store->find(merged, number), course))
            merged = vpenv_store->bind(merged, number, s);
    bool is_same = b.is_reached;
    if (is_same)
        vpenv_store->for_each_difference(b.entry, merged, [&](int, const vpset* x, const vpset* y) {
            is_same = is_same && x && y && vpset_equal(*x, *y);
        });
    b.is_reached = true;
    if (!is_same) b.entry = merged;
    return !is_same;
}

void VALUE_SETS::leave_by(size_t edge, vpenv env, bool can_be) {
    EDGE_STATE& e = edges[edge];
    bool is_same = e.is_passed == can_be;
    if (is_same && can_be)
        vpenv_store->for_each_difference(e.env, env, [&](int, const vpset* x, const vpset* y) {
            is_same = is_same && x && y && vpset_equal(*x, *y);
        });
    if (is_same) return;
    e.env = env;
    e.is_passed = can_be;
    at(e.to).is_due = is_changed = true;
}

// A test of x, which has been assigned e, tells of e too.
bool VALUE_SETS::filter_origins(const BLOCK_STATE& b, vpenv* env) {
    for (const NODE* t : b.origins) {
        const int x = vpenv_store->number_of(t->left->u.sym);
        const vpset *before = vpenv_store->find(b.exit, x), *now = vpenv_store->find(*env, x);
        if (now && now != before && !filter_vpenv_by_values(env, t->right, vpset(*now))) return false;
    }
    return true;
}

void VALUE_SETS::leave(BLOCK_STATE& b) {
    const NODE* control = b.bb->branch();
    const bool tests = control && control->op == IF && b.out.size() == 2;
    const bool selects = control && control->op == SWITCH && !tree_is_EH_SWITCH(control) && b.out.size() >= 2 &&
                         has_vpset(control->left->type);
    if (!tests && !selects) {
        for (size_t e : b.out) leave_by(e, b.exit, true);
        return;
    }
    if (tests) {
        const BBLK* on_true = control->right->left->lbl->bblock;
        for (size_t e : b.out) {
            vpenv env = b.exit;
            const bool can_be = filter_vpenv(&env, control->left, at(edges[e].to).bb == on_true);
            leave_by(e, env, can_be && filter_origins(b, &env));
        }
        return;
    }
    const CASES cases(control);
    for (size_t e : b.out) {
        const BBLK* to = at(edges[e].to).bb;
        vpenv env = b.exit;
        bool can_be = true;
        if (to == cases.otherwise)
            can_be = cases.without_listed(&env, control->left, to);
        else if (const vpset values = cases.of(to); !vpset_is_empty(values))
            can_be = filter_vpenv_by_values(&env, control->left, values);
        leave_by(e, env, can_be && filter_origins(b, &env));
    }
}

void VALUE_SETS::evaluate(BLOCK_STATE& b, int pass) {
    b.is_due = false;
    if (!enter(b, pass)) return;
    vpenv_store->begin_exclusive();
    vpenv env = b.entry;
    for (const VP_EFFECT& effect : b.effects) {
        if (!b.updated.empty()) update_amounts(b, effect, effect.during(env), pass);
        env = effect.behind(env, true);
    }
    // A call that throws leaves its statement before that assigns.
    if (tree_is_EH_SWITCH(b.bb->branch()))
        for (const VP_EFFECT& effect : b.effects)
            if (effect.statement() == b.may_be_left && effect.assigned_symbol() >= 0)
                env = vpenv_store->bind(env, effect.assigned_symbol(), vpset());
    b.exit = env;
    leave(b);
}

// Of nested loops the inner ones come to rest first: where a block has changed the entry of one at or ahead of it, that
// one is next, a bounded number of times.
bool VALUE_SETS::run_pass(int pass) {
    is_changed = false;
    for (BLOCK_STATE& b : blocks) b.returns = 0;
    for (size_t i = 0; i < blocks.size(); ++i) {
        if (!blocks[i].is_due) continue;
        evaluate(blocks[i], pass);
        size_t head = i + 1;
        for (size_t e : blocks[i].out) {
            const size_t to = static_cast<size_t>(edges[e].to);
            if (to <= i && at(edges[e].to).is_due) head = std::min(head, to);
        }
        if (head > i || returns_left <= 0 || ++blocks[head].returns > MOST_RETURNS) continue;
        returns_left -= static_cast<long>(i - head + 1);
        i = head - 1;
    }
    return is_changed;
}

bool VALUE_SETS::find(bool with_loops) {
    read_graph(with_loops);
    find_altered();
    if (with_loops) find_accumulators();
    blocks.front().is_due = true;
    returns_left = static_cast<long>(blocks.size()) * BLOCKS_OF_RETURNS;
    int pass = 1;
    while (run_pass(pass) && pass < MOST_PASSES) ++pass;
    if (print_debug) debug_printf("%7d iterations completed.\n", pass);
    return !is_changed;
}

std::unique_ptr<VALUE_SETS> sets;

} // namespace

void construct_vpsets_for_cfg(int noLoops, VP_QUESTION question) {
    need(fact::alias_marks);
    if (!find_tracked_symbols(question)) return;
    need(fact::block_numbers | fact::loops);
    sets = std::make_unique<VALUE_SETS>();
    if (sets->find(!noLoops)) return;
    if (print_debug) debug_printf("\t*** Failed to find VP fixpoint!\n");
    deconstruct_vpsets_for_cfg();
}

void deconstruct_vpsets_for_cfg() {
    sets.reset();
    erase_vpenv();
}

const vpenv* bb_vpenv(const BBLK* bb, bool at_exit) { return sets ? sets->of(bb, at_exit) : nullptr; }
