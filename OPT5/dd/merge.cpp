// Induction variables of the loops, merged: as few as will do, and pointers where indexes scaled.
//
// An access whose address is an invariant plus constant multiples of inductions gets a pointer of its own, which starts
// at the address's value ahead of the loop. Addresses that differ by a constant share a pointer; the others have an
// offset from it. Where the steps would cost more than they save, the invariant part of the address alone is computed
// ahead of the loop. A pointer of an inner loop that runs a known number of times is not set anew in each iteration of the
// loop around it, but stepped from where the inner loop left it. A counter that nothing needs but its own step and the test that leaves the loop gives its test to
// a pointer.
//
// Needs: loops and live variables; no saved environment. Leaves: block numbers.
// Sound because the pointer is stepped right beside each step of an induction: it equals the address between any two
// statements of the loop, however often and under whatever condition the induction steps. An amount that changes in the
// loop, as in `i += k++`, is no induction's. What is computed ahead of the loop is arithmetic on variables and
// addresses, which cannot fail; no load moves. A test that a pointer takes over becomes one for inequality, which holds
// in arithmetic that wraps: with a step of one, or a known trip count, the pointer meets its last value exactly.
#include "OPT5/dd/merge.h"

#include "OPT5/scalar/rename.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/ir/loops.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"
#include "OPT5/target/target.h"

#include <algorithm>
#include <map>
#include <unordered_map>
#include <unordered_set>
#include <utility>

namespace {

constexpr size_t MOST_POINTERS = 6; // of a loop: the target has eight address registers
constexpr double STEP_COST = 2;     // a pointer's step becomes part of an access
constexpr double COUNTER_COST = 3;  // a counter's step
constexpr double MULTIPLY_COST = 2; // beyond its node
constexpr double WORTH_A_VARIABLE = 6; // an address that stays throughout the loop

struct USE {
    NODE** place;
    BBLK* bb;
    NODE* statement;
    LINEAR_ADDRESS address;
    double weight; // executions in an iteration
    int nodes;     // of the address
};

struct GROUP {
    std::vector<USE> uses;
    LINEAR_ADDRESS address; // the lowest of the uses
    TYPE* type = nullptr;   // the pointer's
    double step_gain = 0;   // of a pointer that steps, in an iteration
    double base_gain = 0;   // of a variable for the part that stays, in an iteration
    double entry_cost = 0;
    double step_growth = 0, base_growth = 0; // nodes of code
    bool steps = false, stays_based = false;
    SYMTAB* sym = nullptr;

    int64_t skew(const USE& use) const { return use.address.constant - address.constant; }
};

std::string text_of(int64_t v) { return std::to_string(v); }

std::unordered_set<const SYMTAB*> skewed_offset_syms; // looked up only

double cost_of_tree(const NODE* t) {
    double cost = 0;
    for_each_subtree(t, [&](const NODE* n) { cost += 1 + (n->op == MULT ? MULTIPLY_COST : 0); });
    return cost;
}

// How far the pointer of a loop has come when the loop, which has one exit, is left.
struct SWEEP {
    const NATURAL_LOOP* loop;
    int64_t distance;
};
using SWEEPS = std::unordered_map<const SYMTAB*, SWEEP>; // looked up only

// ---- The addresses of a loop

class COLLECTOR {
public:
    COLLECTOR(const NATURAL_LOOPS& all, NATURAL_LOOP* of, LOOP_FACTS& f) : loops(all), loop(of), facts(f) {}

    std::vector<GROUP> groups() {
        for (BBLK* bb : loop->blocks) {
            block = bb;
            weight = loops.dominates_latches(bb, loop) ? 1 : 0.5;
            for (const NATURAL_LOOP* l = loops.around(bb); l && l != loop; l = l->parent) weight *= 8;
            for (LIST* s = bb->statements; s; s = s->rest) {
                if (s->first->op == PPRAGMA) continue;
                statement = s->first;
                facts.look_at(bb, statement);
                visit(&s->first->left);
                visit(&s->first->right);
            }
        }
        return std::move(found);
    }

private:
    void visit(NODE** place) {
        NODE* t = *place;
        if (!t) return;
        const bool is_sum = t->type->is_pointer() && (t->op == PLUS || t->op == MINUS || t->op == PCONV);
        if (is_sum && enter(place)) return;
        visit(&t->left);
        visit(&t->right);
    }

    bool enter(NODE** place) {
        USE use{place, block, statement, {}, weight, 0};
        if (!linear_address(*place, facts, &use.address)) return false;
        const bool moves = std::any_of(use.address.begin(), use.address.end(),
                                       [&](const auto& t) { return facts.is_induction(t.tree); });
        // A pointer that steps by itself is as good as one that steps beside it.
        const bool base_moves = facts.is_induction(base_symbol(use.address));
        if (!moves && (base_moves ? use.address.is_constant() : !stays_and_costs(use))) return false;
        use.nodes = count_nodes_in_tree(*place);
        group_for(use).uses.push_back(std::move(use));
        return true;
    }

    // An address that no loop moves is computed once. One that stays in this loop alone moves in a loop around it, perhaps.
    bool stays_and_costs(const USE& use) const {
        return !loop->parent && !use.address.is_constant() && cost_of_tree(*use.place) >= WORTH_A_VARIABLE;
    }

    static const SYMTAB* base_symbol(const LINEAR_ADDRESS& a) { return a.base->op == NAME ? a.base->u.sym : nullptr; }

    GROUP& group_for(const USE& use) {
        std::vector<size_t>& alike = by_hash[use.address.hash()];
        for (size_t i : alike)
            if (found[i].uses.front().address.differs_by_constant(use.address)) return found[i];
        alike.push_back(found.size());
        return found.emplace_back();
    }

    const NATURAL_LOOPS& loops;
    NATURAL_LOOP* loop;
    LOOP_FACTS& facts;
    std::vector<GROUP> found;
    std::map<uint64_t, std::vector<size_t>> by_hash;
    BBLK* block = nullptr;
    NODE* statement = nullptr;
    double weight = 1;
};

// ---- One loop

class MERGE {
public:
    MERGE(NATURAL_LOOPS& all, NATURAL_LOOP* of, SWEEPS& s) : loops(all), loop(of), facts(all, of), sweeps(s) {}
    ~MERGE() {
        for (NODE* t : replaced) erase_tree(t);
    }
    bool unite() { return unite_equal_inductions(loops, loop, facts) || map_test_to_pointer(loops, loop, facts); }
    void run();

private:
    void split_by_offsets();
    void appraise(GROUP& g);
    void choose();
    bool counter_can_go(const LOOP_TEST& test);
    double gain_of_counter(const LOOP_TEST& test);
    const GROUP* carrier(const LOOP_TEST& test) const;
    void rewrite(GROUP& g);
    void rewrite_with_base(GROUP& g);
    void step_beside(const GROUP& g);
    void step_beside(const GROUP& g, const INDUCTION::STEP& step, int64_t by);
    const INDUCTION* only_induction(const GROUP& g);
    USE* inner_pointer(GROUP& g);
    void carry_on(GROUP& g, USE& start);
    void note_sweep(const GROUP& g);
    NODE* step_size(const INDUCTION::STEP& step, int64_t size);
    SYMTAB* make_temporary(NODE* value);
    void replace(const GROUP& g, USE& use, NODE* by, int form);
    SYMTAB* make_pointer(TYPE* type, const LINEAR_ADDRESS& from, NODE* start);
    void map_test(const LOOP_TEST& test);
    NODE* last_address(const LOOP_TEST& test, const GROUP& g);
    void remove_counter(const INDUCTION& i);
    void remove_idle_steps();
    NODE* start_tree(const GROUP& g);
    void report(const GROUP& g, int n);

    NATURAL_LOOPS& loops;
    NATURAL_LOOP* loop;
    LOOP_FACTS facts;
    SWEEPS& sweeps;
    std::vector<GROUP> groups;
    const LOOP_TEST* mapped = nullptr;
    BBLK* ahead = nullptr;
    std::map<std::pair<const NODE*, int64_t>, SYMTAB*> step_sizes; // looked up
    std::vector<NODE*> replaced; // their parts are the terms of addresses still to be made
};

// An offset that no access can hold takes a pointer of its own.
void MERGE::split_by_offsets() {
    std::vector<GROUP> parts;
    for (GROUP& g : groups) {
        std::stable_sort(g.uses.begin(), g.uses.end(),
                         [](const USE& a, const USE& b) { return a.address.constant < b.address.constant; });
        GROUP part;
        for (USE& use : g.uses) {
            const int64_t low = part.uses.empty() ? use.address.constant : part.uses.front().address.constant;
            if (!offset_is_in_range(INT65(use.address.constant - low), (*use.place)->type, 1)) {
                if (print_debug) {
                    debug_printf("\n\tSplitting SRIV %s ==> %s\n", tree_to_infix(*part.uses.front().place).c_str(),
                                 tree_to_infix(*use.place).c_str());
                    debug_printf("\t  New SRIV gets use %s\n", stmt2infix(use.statement).c_str());
                    debug_printf("\t  Old SRIV gets use %s\n", stmt2infix(part.uses.front().statement).c_str());
                }
                parts.push_back(std::move(part));
                part = GROUP();
            }
            part.uses.push_back(std::move(use));
        }
        parts.push_back(std::move(part));
    }
    groups = std::move(parts);
}

// The address without what moves; what moves alone; a constant that belongs to the part that stays.
LINEAR_ADDRESS without_inductions(LINEAR_ADDRESS a, const LOOP_FACTS& facts) {
    a.keep_if([&](const auto& t) { return !facts.is_induction(t.tree); });
    return a;
}

bool is_trivial(const LINEAR_ADDRESS& a) { return a.is_constant() && (a.constant == 0 || a.base->op == UAND); }

void MERGE::appraise(GROUP& g) {
    g.address = g.uses.front().address;
    std::map<int, int> votes; // by type number of the first that has the type
    int best = 0;
    for (size_t i = 0; i < g.uses.size(); ++i) {
        size_t k = 0;
        while (!compatible_types((*g.uses[k].place)->type, (*g.uses[i].place)->type, true)) ++k;
        if (++votes[static_cast<int>(k)] > votes[best]) best = static_cast<int>(k);
    }
    g.type = (*g.uses[static_cast<size_t>(best)].place)->type->stqs();

    double stepping = 0, moving = 0;
    const bool base_moves = g.address.base->op == NAME && facts.is_induction(g.address.base->u.sym);
    auto add_steps = [&](const SYMTAB* sym) {
        for (const INDUCTION::STEP& s : facts.induction(sym)->steps) {
            double w = loops.dominates_latches(s.bb, loop) ? 1 : 0.5;
            for (const NATURAL_LOOP* l = loops.around(s.bb); l && l != loop; l = l->parent) w *= 8;
            stepping += (s.amount ? COUNTER_COST : STEP_COST) * w;
        }
    };
    if (base_moves) add_steps(g.address.base->u.sym);
    for (const auto& t : g.address) {
        if (!facts.is_induction(t.tree)) continue;
        add_steps(t.tree->u.sym);
        moving += t.coefficient == 1 || t.coefficient == -1 ? 2 : 5 + MULTIPLY_COST;
    }
    for (const USE& use : g.uses) {
        const double cast = compatible_types((*use.place)->type, g.type, true) ? 0 : 1;
        const double cost = cost_of_tree(*use.place), skew = g.skew(use) ? 2 : 0;
        g.step_gain += use.weight * (cost - 1 - skew - cast);
        g.base_gain += use.weight * (cost - 1 - skew - cast - moving);
        g.step_growth -= use.nodes - 1 - skew - cast;
        g.base_growth -= use.nodes - 1 - skew - cast - moving;
    }
    g.step_growth += g.uses.front().nodes + 6;
    g.base_growth += g.uses.front().nodes + 2;
    g.step_gain -= stepping;
    const bool moves = base_moves || std::any_of(g.address.begin(), g.address.end(),
                                                 [&](const auto& t) { return facts.is_induction(t.tree); });
    if (!moves) g.step_gain = -1;
    if (base_moves || is_trivial(without_inductions(g.address, facts))) g.base_gain = -1;
    g.entry_cost = 2 + cost_of_tree(*g.uses.front().place);
}

// ---- The choice

bool may_grow(double nodes) { return nodes <= 0 || size_speed_goal() > 1; }

// The group whose pointer can take the test of a counter.
const GROUP* MERGE::carrier(const LOOP_TEST& test) const {
    const INDUCTION& i = *test.counter;
    int64_t last;
    const int64_t trips = constant_trip_count(test, &last), by = i.steps.front().by;
    for (const GROUP& g : groups) {
        const int64_t k = g.address.coefficient_of(i.sym);
        if (k == 0) continue;
        const bool only = std::all_of(g.address.begin(), g.address.end(), [&](const auto& t) {
            return !facts.is_induction(t.tree) || t.tree->u.sym == i.sym;
        });
        const bool base_moves = g.address.base->op == NAME && facts.is_induction(g.address.base->u.sym);
        if (!only || base_moves) continue;
        // Different counts give different addresses.
        const int64_t size = k < 0 ? -k : k;
        const bool is_short = trips >= 0 && trips < 32768 && by > -32768 && by < 32768;
        if (size == 1 || (size < 32768 && i.sym->type->size == 16) || (size == 2 && is_short)) return &g;
    }
    return nullptr;
}

// Whether nothing needs the counter but its step, this test, and addresses that get pointers.
bool MERGE::counter_can_go(const LOOP_TEST& test) {
    const SYMTAB* sym = test.counter->sym;
    int64_t last;
    const int64_t by = test.counter->steps.front().by;
    const bool is_up = test.stay_op == LT || test.stay_op == LE || test.stay_op == ULT || test.stay_op == ULE;
    const bool is_down = test.stay_op == GT || test.stay_op == GE || test.stay_op == UGT || test.stay_op == UGE;
    if (constant_trip_count(test, &last) < 0) {
        // A limit that is met exactly, or passed before the first test.
        if (test.stay_op != NEQ && !(is_up && by == 1) && !(is_down && by == -1)) return false;
        // The first step of an unsigned one may wrap.
        if (test.step_comes_first && !test.counter->start_is_known && sym->type->is_unsigned()) return false;
        // One more than the greatest value there is would be met at once.
        if ((test.stay_op == ULE || test.stay_op == UGE) && sym->type->size == 32) return false;
    }
    int understood = 2; // in its step and in the test
    if (test.counter->steps.front().statement->op == ASG) ++understood;
    for (const GROUP& g : groups) {
        if (!g.address.is_induction_by(sym)) continue;
        for (const USE& use : g.uses)
            for_each_node(*use.place, [&](const NODE* t) { understood += t->op == NAME && t->u.sym == sym; });
    }
    return facts.mentions(sym) == understood && !facts.is_used_after(sym);
}

double MERGE::gain_of_counter(const LOOP_TEST& test) {
    double gain = COUNTER_COST * facts.trip_count_estimate() - (test.limit->op == ICON ? 3 : 10);
    size_t pointers = 0;
    for (const GROUP& g : groups) {
        if (g.address.is_induction_by(test.counter->sym)) {
            ++pointers;
            if (!g.steps) gain += g.step_gain * facts.trip_count_estimate() - g.entry_cost;
        } else
            pointers += g.steps;
    }
    return pointers > MOST_POINTERS ? -1 : gain;
}

void MERGE::choose() {
    const double trips = facts.trip_count_estimate();
    std::vector<GROUP*> order;
    for (GROUP& g : groups) order.push_back(&g);
    std::stable_sort(order.begin(), order.end(),
                     [](const GROUP* a, const GROUP* b) { return a->step_gain > b->step_gain; });
    size_t pointers = 0;
    for (GROUP* g : order) {
        g->steps = g->step_gain * trips > g->entry_cost && g->step_gain >= g->base_gain && pointers < MOST_POINTERS &&
                   may_grow(g->step_growth);
        g->stays_based = !g->steps && g->base_gain * trips > g->entry_cost && may_grow(g->base_growth);
        pointers += g->steps;
    }
    for (const LOOP_TEST& test : facts.tests()) {
        if (!counter_can_go(test) || gain_of_counter(test) <= 0) continue;
        if (!carrier(test)) continue;
        for (GROUP& g : groups) g.steps |= g.address.is_induction_by(test.counter->sym);
        mapped = &test;
        return;
    }
}

// ---- Rewriting

NODE* MERGE::start_tree(const GROUP& g) {
    LINEAR_ADDRESS start = g.address;
    const INDUCTION* known = nullptr;
    for (const auto& t : start)
        if (facts.is_induction(t.tree) && facts.induction(t.tree->u.sym)->start_is_known)
            known = facts.induction(t.tree->u.sym);
    if (!known) return tree_of_address(start, g.type);
    NODE* value = mk_ICON(INT65(known->start), known->sym->type->stqs());
    NODE* tree = tree_of_address(start, g.type, known->sym, value);
    erase_tree(value);
    return tree;
}

// What the pointer points into is what its start does, anywhere in it.
SYMTAB* MERGE::make_pointer(TYPE* type, const LINEAR_ADDRESS& from, NODE* start) {
    SYMTAB* sym = make_temporary(coerce_to_type(type, start));
    const SPMAP::SPINFO target = currfuninfo->spmap->pointee_of(from.base);
    if (target.object)
        currfuninfo->spmap->set_mapping(sym, target.object, INT65(0), size_in_units(target.object), false);
    else
        currfuninfo->spmap->set_bottom(sym);
    return sym;
}

SYMTAB* MERGE::make_temporary(NODE* value) {
    TYPE* type = value->type->stqs();
    SYMTAB* sym = sym_temp('P', -1, type, nullptr);
    insert_at_end_of_body(ahead, maketree(ASG, mk_NAME(sym), value, type));
    return sym;
}

void MERGE::report(const GROUP& g, int n) {
    if (!print_debug) return;
    debug_printf("SRIV GROUP (%d):\n", n);
    for (const USE& use : g.uses) debug_printf("\t%s\n", tree_to_infix(*use.place).c_str());
    NODE* start = start_tree(g);
    debug_printf("\t\t\tinit: (BB %d) %s\n", ahead->dfn, tree_to_infix(start).c_str());
    erase_tree(start);
}

// `by` is consumed: what stands for the address of the group, to which the use has an offset. Form 0 is through the group's
// pointer, form 1 from a base that the counter moves. Form 2, through another group's pointer, has no work: uses at a
// constant distance are in one group from the start, unless the distance fits no offset.
void MERGE::replace(const GROUP& g, USE& use, NODE* by, int form) {
    NODE* old = *use.place;
    const int64_t skew = g.skew(use);
    if (skew) {
        if (print_debug)
            debug_printf("\n\t(%d) Skewing %s: high = %s, low = %s, skew = %s\n", form, tree_to_infix(old).c_str(),
                         text_of(g.uses.back().address.constant).c_str(), text_of(g.address.constant).c_str(),
                         text_of(skew).c_str());
        skewed_offset_syms.insert(g.sym);
        by = maketree(PLUS, by, mk_ICON(INT65(skew), skew <= 32767 ? tp->int_t : tp->long_t), by->type, old->ls);
    }
    *use.place = coerce_to_type(old->type, by);
    replaced.push_back(old);
}

// The step of a pointer, `size` times that of the induction: an amount is multiplied ahead of the loop.
NODE* MERGE::step_size(const INDUCTION::STEP& step, int64_t size) {
    if (!step.amount) return mk_ICON(INT65(size), size <= 32767 ? tp->int_t : tp->long_t);
    if (size == 1 && step.amount->op == NAME) return copy_tree(step.amount);
    SYMTAB*& sym = step_sizes[{step.statement, size}];
    if (!sym) {
        NODE* amount = coerce_to_type(tp->long_t, copy_tree(step.amount));
        if (size != 1) amount = made_exact(MULT, amount, mk_ICON(INT65(size), tp->long_t), tp->long_t, nullptr);
        sym = make_temporary(simp_tree(amount, nullptr));
    }
    return mk_NAME(sym);
}

void MERGE::step_beside(const GROUP& g, const INDUCTION::STEP& step, int64_t by) {
    LIST* s = step.bb->statements;
    while (s->first != step.statement) s = s->rest;
    insert_behind(s, step.statement, s->psn);
    s->first = maketree(by < 0 ? MINUSASG : PLUSASG, mk_NAME(g.sym), step_size(step, by < 0 ? -by : by), g.type,
                        step.statement->ls);
}

void MERGE::step_beside(const GROUP& g) {
    auto add = [&](const INDUCTION& i, int64_t coefficient) {
        for (const INDUCTION::STEP& step : i.steps) step_beside(g, step, coefficient * step.by);
    };
    const LINEAR_ADDRESS& a = g.address;
    if (a.base->op == NAME && facts.is_induction(a.base->u.sym)) add(*facts.induction(a.base->u.sym), 1);
    for (const auto& t : a)
        if (facts.is_induction(t.tree)) add(*facts.induction(t.tree->u.sym), t.coefficient);
}

void MERGE::rewrite(GROUP& g) {
    NODE* start = start_tree(g);
    const std::string text = print_debug ? tree_to_infix(start) : "";
    g.sym = make_pointer(g.type, g.address, start);
    if (print_debug) {
        const USE& first = g.uses.front();
        for (const INDUCTION* i : facts.all_inductions())
            if (g.address.is_induction_by(i->sym))
                debug_printf("\tConverting index to pointer: %s ==> %s ... 1st use: (BB%d) %s\n", i->sym->name,
                             g.sym->name, first.bb->dfn, stmt2infix(first.statement).c_str());
        debug_printf("\n\n\tRewriting uses of these SRIVs to use %s (==> %s):\n", g.sym->name, text.c_str());
    }
    for (USE& use : g.uses) replace(g, use, mk_NAME(g.sym), 0);
    step_beside(g);
}

bool remove_statement(BBLK* bb, const NODE* statement) {
    for (LIST** link = &bb->statements; *link; link = &(*link)->rest) {
        LIST* cell = *link;
        if (cell->first != statement) continue;
        drop_statement(link);
        return true;
    }
    return false;
}

// ---- Pointers of inner loops

// The one induction that the addresses of the group move with, if it steps once in each iteration by a constant.
const INDUCTION* MERGE::only_induction(const GROUP& g) {
    const SYMTAB* moving = nullptr;
    int count = 0;
    auto look_at = [&](const NODE* t) {
        if (t->op != NAME || !facts.is_induction(t->u.sym)) return;
        moving = t->u.sym;
        ++count;
    };
    look_at(g.address.base);
    for (const auto& t : g.address) look_at(t.tree);
    const INDUCTION* i = count == 1 ? facts.induction(moving) : nullptr;
    if (!i || i->steps.size() != 1 || i->steps.front().amount) return nullptr;
    const BBLK* bb = i->steps.front().bb;
    return loops.around(bb) == loop && loops.dominates_latches(bb, loop) ? i : nullptr;
}

// Whether `later` stands behind `first` in the block.
bool follows(const BBLK* bb, const NODE* later, const NODE* first) {
    bool is_behind = false;
    for (const LIST* s = bb->statements; s; s = s->rest) {
        if (is_behind && s->first == later) return true;
        is_behind |= s->first == first;
    }
    return false;
}

// The use that gives a pointer of an inner loop its start, once in each iteration and ahead of the group's step. The other
// uses must stand where the pointer has that value, and so must a test that it takes over.
USE* MERGE::inner_pointer(GROUP& g) {
    const INDUCTION* i = only_induction(g);
    if (!i) return nullptr;
    const BBLK* test = mapped && carrier(*mapped) == &g ? mapped->bb : nullptr;
    for (USE& use : g.uses) {
        const NODE* t = use.statement;
        if (t->op != ASG || use.place != &use.statement->right || t->left->op != NAME) continue;
        auto it = sweeps.find(t->left->u.sym);
        if (it == sweeps.end() || !compatible_types(t->left->type->stqs(), g.type, true)) continue;
        BBLK* bb = use.bb;
        if (loops.around(bb) != loop || !loops.dominates_latches(bb, loop) || !loops.dominates(bb, i->steps.front().bb))
            continue;
        if (bb->successors->rest || bb->successors->first != it->second.loop->header) continue;
        // The test sees the pointer where this loop's iteration starts, or behind the step, where the next one does.
        if (test && !mapped->step_comes_first && (test == bb || !loops.dominates(test, bb))) continue;
        if (std::all_of(g.uses.begin(), g.uses.end(), [&](const USE& other) {
                return &other == &use || (other.bb == bb && follows(bb, other.statement, use.statement));
            }))
            return &use;
    }
    return nullptr;
}

// The pointer of the inner loop gets its start ahead of this one, and steps from where the inner loop leaves it.
void MERGE::carry_on(GROUP& g, USE& start) {
    SYMTAB* pointer = start.statement->left->u.sym;
    g.address = start.address;
    g.sym = pointer;
    insert_at_end_of_body(ahead, maketree(ASG, mk_NAME(pointer), coerce_to_type(g.type, start_tree(g)), g.type));
    const INDUCTION& i = *only_induction(g);
    const INDUCTION::STEP step = i.steps.front();
    const bool is_base = g.address.base->op == NAME && g.address.base->u.sym == i.sym;
    const int64_t by = (is_base ? 1 : g.address.coefficient_of(i.sym)) * step.by - sweeps.at(pointer).distance;
    for (USE& use : g.uses)
        if (&use != &start) replace(g, use, mk_NAME(pointer), 0);
    NODE* assignment = start.statement;
    replaced.push_back(assignment->right);
    assignment->right = mk_ICON(INT65(0), tp->int_t);
    remove_statement(start.bb, assignment);
    if (by) step_beside(g, step, by);
}

// Where the loop's one exit is a test after a known number of iterations, it is known how far its pointers have come.
void MERGE::note_sweep(const GROUP& g) {
    int exits = 0;
    for (const BBLK* bb : loop->blocks)
        for (const EDGE* e = bb->successors; e; e = e->rest) exits += !loops.contains(loop, e->first);
    const INDUCTION* i = only_induction(g);
    if (exits != 1 || !i || facts.tests().size() != 1 || facts.tests().front().counter != i) return;
    int64_t last;
    if (constant_trip_count(facts.tests().front(), &last) < 0) return;
    sweeps[g.sym] = {loop, g.address.coefficient_of(i->sym) * (last - i->start)};
}

// The part that stays is computed ahead of the loop.
void MERGE::rewrite_with_base(GROUP& g) {
    const LINEAR_ADDRESS stays = without_inductions(g.address, facts);
    g.sym = make_pointer(g.type, stays, tree_of_address(stays, g.type));
    if (print_debug) debug_printf("\n\tCreating base temp %s in BB%d\n", g.sym->name, ahead->dfn);
    NODE* base = mk_NAME(g.sym);
    LINEAR_ADDRESS moves;
    moves.base = base;
    for (const auto& t : g.address)
        if (facts.is_induction(t.tree)) moves.add(t.tree, t.coefficient);
    for (USE& use : g.uses) replace(g, use, tree_of_address(moves, g.type), 1);
    erase_tree(base);
}

// ---- The test

// The address at the first test that leaves the loop.
NODE* MERGE::last_address(const LOOP_TEST& test, const GROUP& g) {
    const INDUCTION& i = *test.counter;
    TYPE* type = i.sym->type->stqs();
    const int64_t by = i.steps.front().by, k = g.address.coefficient_of(i.sym);
    int64_t last;
    if (constant_trip_count(test, &last) >= 0) {
        NODE* value = mk_ICON(INT65(last), type);
        NODE* address = tree_of_address(g.address, g.type, i.sym, value);
        erase_tree(value);
        return address;
    }
    LINEAR_ADDRESS end = g.address;
    const bool includes_limit = test.stay_op == LE || test.stay_op == GE || test.stay_op == ULE || test.stay_op == UGE;
    if (includes_limit) end.constant += k * by;
    NODE* address = tree_of_address(end, g.type, i.sym, test.limit);
    if (test.stay_op == NEQ) return address;

    // The limit may lie behind the counter from the start: then the first test leaves.
    const int64_t first = i.start + (test.step_comes_first ? by : 0);
    if (i.start_is_known) {
        const INT65 nearest =
            by > 0 ? calculate_minval_for_tree(test.limit, nullptr) : calculate_maxval_for_tree(test.limit, nullptr);
        const INT65 bound(first - (includes_limit ? by : 0));
        if (by > 0 ? bound <= nearest : nearest <= bound) return address;
    }
    if (facts.is_guarded(test)) return address;
    NODE* value = i.start_is_known ? mk_ICON(INT65(first), type) : mk_NAME(i.sym);
    if (test.step_comes_first && !i.start_is_known) value = maketree(PLUS, value, mk_ICON(INT65(by), type), type);
    NODE* runs = maketree(test.stay_op, value, copy_tree(test.limit), tp->int_t);
    NODE* at_first = mk_NAME(g.sym);
    if (test.step_comes_first) at_first = maketree(PLUS, at_first, mk_ICON(INT65(k * by), tp->long_t), g.type);
    NODE* arms = maketree(COLON, address, at_first, g.type);
    return simp_tree(maketree(QUEST, runs, arms, g.type), nullptr);
}

void MERGE::map_test(const LOOP_TEST& test) {
    const GROUP& g = *carrier(test);
    NODE* compare = test.branch->left;
    NODE* end = last_address(test, g);
    const bool is_chosen = end->op == QUEST;
    SYMTAB* limit = make_pointer(g.type, g.address, end);
    limit->is_loop_limit = is_chosen;
    const int op = test.stays_if_true ? NEQ : EQ;
    test.branch->left = maketree(op, mk_NAME(g.sym), mk_NAME(limit), tp->int_t, compare->ls);
    if (print_debug) {
        debug_printf("\tMapping test %s ", tree_to_infix(compare).c_str());
        debug_printf("into %s\n", tree_to_infix(test.branch->left).c_str());
    }
    replaced.push_back(compare);
}

// Nothing reads the counter any more in the loop or behind it.
void MERGE::remove_counter(const INDUCTION& i) {
    if (print_debug) debug_printf("\tAll uses of %s have been eliminated!\n", i.sym->name);
    remove_statement(i.steps.front().bb, i.steps.front().statement);
    if (!i.start_statement) return;
    bool is_behind = false;
    for (const LIST* s = ahead->statements; s; s = s->rest) {
        if (is_behind && sym_appears_in_tree(i.sym, s->first)) return;
        is_behind |= s->first == i.start_statement;
    }
    remove_statement(ahead, i.start_statement);
}

// A variable that pointers took the place of may be read by its own steps alone.
void MERGE::remove_idle_steps() {
    for (const INDUCTION* i : facts.all_inductions()) {
        const bool was_replaced = std::any_of(groups.begin(), groups.end(), [i](const GROUP& g) {
            return g.steps && g.address.is_induction_by(i->sym);
        });
        if (!was_replaced || (mapped && mapped->counter == i) || facts.is_used_after(i->sym)) continue;
        int reads = 0;
        auto count = [&reads, i](const NODE* t) { reads += t->op == NAME && t->u.sym == i->sym; };
        for (const BBLK* bb : loop->blocks)
            for (const LIST* s = bb->statements; s; s = s->rest) for_each_node(s->first, count);
        const int all = std::exchange(reads, 0);
        for (const INDUCTION::STEP& step : i->steps) for_each_node(step.statement, count);
        if (reads != all) continue;
        for (const INDUCTION::STEP& step : i->steps) remove_statement(step.bb, step.statement);
    }
}

void MERGE::run() {
    if (!facts.is_usable() || facts.all_inductions().empty()) return;
    groups = COLLECTOR(loops, loop, facts).groups();
    split_by_offsets();
    for (GROUP& g : groups) appraise(g);
    choose();
    const bool has_work =
        std::any_of(groups.begin(), groups.end(), [](const GROUP& g) { return g.steps || g.stays_based; });
    if (!has_work) return;
    ahead = loops.preheader(loop);
    if (!ahead) return;
    int n = 0;
    for (GROUP& g : groups) {
        report(g, n++);
        USE* start = g.steps ? inner_pointer(g) : nullptr;
        if (start)
            carry_on(g, *start);
        else if (g.steps)
            rewrite(g);
        else if (g.stays_based)
            rewrite_with_base(g);
        if (g.steps) note_sweep(g);
    }
    if (mapped) {
        map_test(*mapped);
        remove_counter(*mapped->counter);
    }
    remove_idle_steps();
}

} // namespace

// Last addresses that were chosen by whether the loop runs at all: where the values of variables tell, they are settled.
// Asked once, when all loops have been worked on.
namespace {

bool is_chosen_limit(const NODE* t) {
    return t->op == ASG && t->left->op == NAME && t->left->u.sym->is_loop_limit && t->right->op == QUEST;
}

void settle_limits() {
    auto has_limit = [](const BBLK* bb) {
        for (const LIST* s = bb->statements; s; s = s->rest)
            if (is_chosen_limit(s->first)) return true;
        return false;
    };
    std::vector<BBLK*> ahead;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (has_limit(bb)) ahead.push_back(bb);
    if (ahead.empty() || !value_walk.begin) return;
    value_walk.begin();
    for (BBLK* bb : ahead)
        for (const LIST* s = bb->statements; s; s = s->rest) {
            value_walk.at(bb, s->first);
            if (!is_chosen_limit(s->first)) continue;
            s->first->right = simp_tree(s->first->right, nullptr);
            s->first->left->u.sym->is_loop_limit = s->first->right->op == QUEST;
        }
    value_walk.end();
}

} // namespace

void init_skewed_offset_syms() { skewed_offset_syms.clear(); }
bool is_skewed_offset_sym(const SYMTAB* sym) { return skewed_offset_syms.count(sym) != 0; }

void merge_symbols() {
    if (!currfuninfo->bb_list) return;
    if (print_debug) {
        debug_printf("\n\n\t\t\t---------- ENTERING 'merge_symbols' ----------\n");
        debug_printf("Merging symbols for %s\n", currfunc->name);
    }
    init_skewed_offset_syms();
    if (currfuninfo->saves_environment) return;
    need(fact::loops | fact::live_variables);
    NATURAL_LOOPS& loops = *currfuninfo->loops;
    if (currfuninfo->lva_sym_count) eliminate_single_use_temps();
    SWEEPS sweeps;
    for (const auto& loop : loops.inner_first())
        while (loop->inside < DEEPEST) {
            MERGE merge(loops, loop.get(), sweeps);
            if (merge.unite()) continue; // what was known of the loop is stale
            merge.run();
            break;
        }
    hoist_invariants(loops);
    if (loops.has_split_edges()) renumber_bblocks();
    changed(fact::none);
    settle_limits();
}
