// Which sequence of values each definition of SSA form gives.
//
// Sound because a cycle of definitions is called a sequence only where every path around it passes the phi at the
// loop's head and is understood from there back to it: what a path adds is added in the variable's own type, or in one
// that it is narrowed from, so that sums are equal modulo the width. What a chi defines is not known.
//
// Sources: M. P. Gerlek, E. Stoltz, M. Wolfe, "Beyond Induction Variables: Detecting and Classifying Sequences Using a
// Demand-Driven SSA Form", 1995; R. E. Tarjan, "Depth-First Search and Linear Graph Algorithms", 1972.
#include "OPT5/dd/ssa_data.h"

#include "OPT5/dd/loop.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"
#include "OPT5/target/bif.h"

#include <boost/graph/adjacency_list.hpp>
#include <boost/graph/strong_components.hpp>

#include <algorithm>

const char* const ivClass_names[] = {"NONE",          "LITERAL CONSTANT", "REGION CONSTANT", "AFFINE LINEAR",
                                     "PSEUDO LINEAR", "SIMPLE GEOMETRIC", "POLYNOMIAL",      "WRAPAROUND",
                                     "FLIP-FLOP",     "SHIFT RIGHT",      "MONOTONIC OTHER", "SIMPLE LIST"};

SSADATA::~SSADATA() {
    for (NODE* c : constraints) erase_tree(c);
    erase_tree(value);
    erase_tree(recurrence);
}

namespace {

std::vector<std::unique_ptr<SSADATA>> records; // by version; [0] is empty
constexpr int DEEPEST_CYCLE = 500;             // definitions on a path around a region that is looked at

struct LOOP* loop_of(const BBLK* bb) {
    return loop_root() ? bb->loop : nullptr;
}
bool is_in(const BBLK* bb, const struct LOOP* loop) {
    return !loop || (loop_of(bb) && loop_is_subloop_of_loop(loop_of(bb), loop, true));
}
bool is_sequence(const SSADATA* d) { return d->ivClass >= IVC_AFFINE_LINEAR; }
bool is_constant_in_loop(const SSADATA* d) {
    return d->ivClass == IVC_LITERAL_CONSTANT || d->ivClass == IVC_REGION_CONSTANT;
}

// The value that a definition gives its variable, where that is a tree of its own; a part of the definition.
NODE* value_of(const SSADATA* d) {
    NODE* t = ssa_assignment(d->node);
    return t && (t->op == ASG || t->op == STASG) ? t->right : nullptr;
}

template <class F>
void for_each_input(const SSADATA* d, const F& visit) {
    if (d->node->op == SSA_PHI) {
        for (const SSA_ARG& a : ssa_args(static_cast<const NODE*>(d->node))) visit(a.definition);
        return;
    }
    for_each_subtree(static_cast<const NODE*>(d->node->left), [&visit](const NODE* t) {
        if (t->op == SSA_USE) visit(ssa_reach(t));
    });
}

// Whether a tree in SSA form has the same value in all iterations of the loop.
bool is_RC(const NODE* t, const struct LOOP* loop) {
    for (; t; t = t->left) {
        if (t->op == SSA_USE) {
            const SSADATA* d = SSADATA_of(ssa_reach(t));
            return !d || !is_in(d->block, loop) || (loop_of(d->block) == loop && is_constant_in_loop(d));
        }
        if (t->op == UMULT || t->op == STREF || t->op == NAME || t->op == UAND || op_is_call(t->op) ||
            op_is_intrinsic(t->op) || op_has_effect(t->op))
            return t->op == UAND && name_of_place(t->left) != nullptr;
        if (t->right && !is_RC(t->right, loop)) return false;
    }
    return true;
}

// ---- What is known before regions are looked at

void enter_records() {
    records.resize(ssa_definitions().size());
    int64_t order = 0;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_SSA_operator(s->first, [&](NODE* t) {
                if (!op_is_SSA_definition(t->op)) return;
                auto d = std::make_unique<SSADATA>();
                d->node = t;
                d->block = bb;
                d->lexicalNumber = ++order;
                if (t->op == SSA_CHI) d->flags |= SSADATA_lattice_bot;
                if (t->op == SSA_PHI && is_a_loop_merging_phi(t)) d->flags |= SSADATA_loop_merging_phi;
                records[ssa_version(t)] = std::move(d);
            });
}

void enter_uses() {
    auto enter = [](NODE* definition, NODE* use) {
        if (SSADATA* d = SSADATA_of(definition)) d->duChain.push_back(use);
    };
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_SSA_operator(s->first, [&](NODE* t) {
                if (t->op == SSA_USE || t->op == SSA_MU) enter(ssa_reach(t), t);
                if (t->op == SSA_PHI)
                    for (const SSA_ARG& a : ssa_args(t)) enter(a.definition, t);
            });
}

// A condition that another one implies says nothing; one that implies others takes their place.
void add_constraint(SSADATA* d, NODE* condition) {
    for (NODE*& known : d->constraints) {
        if (pred_implies_pred(known, true, condition) == 1) return erase_tree(condition);
        if (pred_implies_pred(condition, true, known) == 1) {
            erase_tree(known);
            known = condition;
            return;
        }
    }
    d->constraints.push_back(condition);
}

void enter_constraints() {
    for (const auto& d : records) {
        const NODE* value = d ? value_of(d.get()) : nullptr;
        if (!value || value->op != ICALL || !is_def_assert_ICALL_tree(value)) continue;
        const NODE* fact = below_SSA(value->left);
        add_constraint(d.get(), copy_tree_removing_SSA_operators(fact->right->left));
    }
}

// ---- Sequences

// What a path from the head of a region to a definition does to the value.
struct STEP {
    enum KIND { UNKNOWN, NOTHING, ADDS, MULTIPLIES, SHIFTS, FOLLOWS, ADDS_SEQUENCE } kind = UNKNOWN;
    INT65 min, max;               // ADDS, MULTIPLIES, SHIFTS: of all paths
    const NODE* amount = nullptr; // ADDS an invariant that is no constant: the only path
    bool is_subtracted = false;
    int64_t length = 0; // definitions on the longest path

    bool is_constant() const { return !amount; }
};

class REGION {
public:
    REGION(struct LOOP* loop, const std::vector<SSADATA*>& members) : loop(loop), members(members) {
        for (SSADATA* d : members) d->flags |= SSADATA_visited;
    }
    ~REGION() {
        for (SSADATA* d : members) d->flags &= static_cast<uint8_t>(~SSADATA_visited);
    }
    void classify();

private:
    bool is_member(const SSADATA* d) const { return d && d->is_visited(); }
    STEP step_to(SSADATA* d, int depth);
    STEP find_step(SSADATA* d, int depth);
    STEP step_of_phi(SSADATA* d, int depth);
    STEP step_of_sum(const NODE* base, const NODE* amount, bool subtracts, int depth);
    STEP step_of_product(int op, const NODE* base, const NODE* factor, int depth);
    STEP step_of_value(const NODE* t, int depth);
    STEP step_of_use(const NODE* use, int depth) { return step_to(SSADATA_of(ssa_reach(use)), depth + 1); }
    static const NODE* member_use(const NODE* t);
    bool is_flip_flop() const;
    const SSADATA* copied_phi(const SSADATA* d) const;
    void set_class(SSADATA* d, uint32_t ivClass, uint8_t flags);
    void set_linear(const STEP& step);

    struct LOOP* loop;
    const std::vector<SSADATA*>& members;
    SSADATA* head = nullptr;
    std::unordered_map<const SSADATA*, STEP> steps; // of those that were asked for; looked up alone
};

// The use that a tree is, through conversions between integers that keep the lower bits.
const NODE* REGION::member_use(const NODE* t) {
    while (t->op == SCONV && t->left->type->is_int() && t->type->is_int()) t = t->left;
    return t->op == SSA_USE ? t : nullptr;
}

STEP REGION::step_to(SSADATA* d, int depth) {
    if (!is_member(d) || depth > DEEPEST_CYCLE) return {};
    if (d == head) {
        STEP nothing;
        nothing.kind = STEP::NOTHING;
        return nothing;
    }
    auto [at, is_new] = steps.try_emplace(d);
    if (!is_new) return at->second; // unknown while it is looked for: a cycle that does not pass the head
    const STEP found = find_step(d, depth);
    d->pathLength = found.length;
    return steps[d] = found;
}

STEP REGION::find_step(SSADATA* d, int depth) {
    if (d->node->op == SSA_PHI) return d->is_loop_merging_phi() ? STEP() : step_of_phi(d, depth);
    const NODE* t = ssa_assignment(d->node);
    STEP s;
    if (!t) return s;
    switch (t->op) {
    case ASG: s = step_of_value(t->right, depth); break;
    case PLUSPLUS:
    case PLUSASG: s = step_of_sum(t->left, t->right, false, depth); break;
    case MINMIN:
    case MINUSASG: s = step_of_sum(t->left, t->right, true, depth); break;
    default: s = step_of_product(op_of_opASG[t->op], t->left, t->right, depth);
    }
    ++s.length;
    return s;
}

STEP REGION::step_of_phi(SSADATA* d, int depth) {
    STEP all;
    bool is_first = true;
    for (const SSA_ARG& a : ssa_args(static_cast<const NODE*>(d->node))) {
        STEP s = step_to(SSADATA_of(a.definition), depth + 1);
        if (s.kind == STEP::UNKNOWN) return {};
        if (is_first) {
            all = s;
            is_first = false;
            continue;
        }
        auto follows = [](STEP::KIND one, STEP::KIND other) {
            return one == STEP::FOLLOWS && (other == STEP::NOTHING || other == STEP::FOLLOWS);
        };
        if (follows(s.kind, all.kind) || follows(all.kind, s.kind)) {
            all.kind = STEP::FOLLOWS;
            continue;
        }
        const bool adds = s.kind <= STEP::ADDS && all.kind <= STEP::ADDS;
        if (!adds || !s.is_constant() || !all.is_constant()) return {};
        all.kind = std::max(all.kind, s.kind);
        all.min = std::min(all.min, s.min);
        all.max = std::max(all.max, s.max);
        all.length = std::max(all.length, s.length);
    }
    ++all.length;
    return all;
}

INT65 signed_amount(const NODE* constant) { return sign_extend_by_type_size(constant->u.lval, constant->type); }

STEP REGION::step_of_sum(const NODE* base, const NODE* amount, bool subtracts, int depth) {
    const NODE* use = member_use(base);
    if (!use) return {};
    STEP s = step_of_use(use, depth);
    if ((s.kind != STEP::NOTHING && s.kind != STEP::ADDS) || !amount->type->is_int()) return {};
    if (amount->op == ICON) {
        const INT65 v = subtracts ? -signed_amount(amount) : signed_amount(amount);
        s.min += v;
        s.max += v;
    } else if (is_RC(amount, loop)) {
        if (s.kind != STEP::NOTHING) return {};
        s.amount = amount;
        s.is_subtracted = subtracts;
    } else {
        const NODE* sequence = member_use(amount);
        const SSADATA* d = sequence ? SSADATA_of(ssa_reach(sequence)) : nullptr;
        if (!d || is_member(d) || !is_sequence(d) || s.kind != STEP::NOTHING) return {};
        s.kind = STEP::ADDS_SEQUENCE;
        return s;
    }
    s.kind = STEP::ADDS;
    return s;
}

STEP REGION::step_of_product(int op, const NODE* base, const NODE* factor, int depth) {
    const NODE* use = member_use(base);
    if ((op != MULT && op != SLL && op != SRL) || !use || factor->op != ICON) return {};
    STEP s = step_of_use(use, depth);
    if (s.kind != STEP::NOTHING) return {};
    s.kind = op == SRL ? STEP::SHIFTS : STEP::MULTIPLIES;
    s.min = s.max = op == SLL ? INT65(1) << factor->u.lval : signed_amount(factor);
    return s;
}

STEP REGION::step_of_value(const NODE* t, int depth) {
    if (const NODE* use = member_use(t)) return step_of_use(use, depth);
    while (t->op == SCONV && t->left->type->is_int() && t->type->is_int()) t = t->left;
    if (is_def_assert_ICALL_tree(t)) return step_of_value(below_SSA(t->left)->left, depth);
    if (t->op == PLUS && !(member_use(t->left) && is_member(SSADATA_of(ssa_reach(member_use(t->left))))))
        return step_of_sum(t->right, t->left, false, depth);
    if (t->op == PLUS || t->op == MINUS) return step_of_sum(t->left, t->right, t->op == MINUS, depth);
    if (t->op == MULT || t->op == SLL || t->op == SRL) return step_of_product(t->op, t->left, t->right, depth);
    // A load through a pointer that is one of the region.
    if (t->op == STDOT || t->op == UMULT) {
        const NODE* place = without_members(t);
        while (place->op == UMULT && place->left->op == PCONV && !place->right) place = place->left;
        const NODE* p = place->op == UMULT || place->op == PCONV ? below_SSA(place->left) : nullptr;
        const NODE* use = place->left && place->left->op == SSA_USE ? place->left : nullptr;
        STEP s = p && use ? step_of_use(use, depth) : STEP();
        if (s.kind != STEP::NOTHING) return {};
        s.kind = STEP::FOLLOWS;
        return s;
    }
    return {};
}

// The phi at the head that a definition is a copy of, or null.
const SSADATA* REGION::copied_phi(const SSADATA* d) const {
    for (int steps_left = 16; d && steps_left > 0; --steps_left) {
        if (d->is_loop_merging_phi()) return d;
        const NODE* value = value_of(d);
        const NODE* use = value && value->op == SSA_USE ? value : nullptr;
        d = use ? SSADATA_of(ssa_reach(use)) : nullptr;
    }
    return nullptr;
}

const SSADATA* back_argument(const SSADATA* phi, const struct LOOP* loop) {
    for (const SSA_ARG& a : ssa_args(static_cast<const NODE*>(phi->node)))
        if (is_in(a.block, loop)) return SSADATA_of(a.definition);
    return nullptr;
}

NODE* entry_argument(const SSADATA* phi, const struct LOOP* loop) {
    for (const SSA_ARG& a : ssa_args(static_cast<const NODE*>(phi->node)))
        if (!is_in(a.block, loop)) return a.definition;
    return nullptr;
}

bool REGION::is_flip_flop() const {
    std::vector<const SSADATA*> phis;
    for (const SSADATA* d : members)
        if (d->is_loop_merging_phi()) phis.push_back(d);
    return phis.size() == 2 && copied_phi(back_argument(phis[0], loop)) == phis[1] &&
           copied_phi(back_argument(phis[1], loop)) == phis[0];
}

void REGION::set_class(SSADATA* d, uint32_t ivClass, uint8_t flags) {
    d->ivClass = ivClass;
    d->flags |= flags;
    d->cycleHead = head;
}

constexpr const char* TEXT_OF_CLASS[] = {"", "", "MCS: RC value found for ", "MLS: Linear sequence found for "};

void announce(const char* what, const SSADATA* d) {
    if (print_debug) debug_printf("%s%s\n", what, tree_to_infix(ssa_variable(d->node)->tree).c_str());
}

void REGION::set_linear(const STEP& s) {
    uint8_t flags = 0;
    uint32_t ivClass = IVC_AFFINE_LINEAR;
    TYPE* type = ssa_variable(head->node)->tree->type;
    if (s.is_constant()) {
        const bool rises = !s.min.is_negative(), falls = s.max <= INT65(0);
        if (s.min != s.max) ivClass = rises || falls ? IVC_PSEUDO_LINEAR : IVC_NONE;
        flags = rises ? SSADATA_monotonic_incr : falls ? SSADATA_monotonic_decr : 0;
        if (s.min > INT65(0) || s.max.is_negative()) flags |= SSADATA_strict_monotonic;
        if (s.min == s.max) head->recurrence = mk_ICON(s.min, type->is_pointer() ? tp->long_t : type->stqs());
        if (s.min.fits<int64_t>() && s.max.fits<int64_t>()) {
            head->cycleMin = s.min.fits_in<int64_t>();
            head->cycleDif = (s.max - s.min).fits<int64_t>() ? (s.max - s.min).fits_in<int64_t>() : 0;
        }
    } else {
        head->recurrence = copy_tree_removing_SSA_operators(s.amount);
        if (s.is_subtracted) head->recurrence = maketree(UMINUS, head->recurrence, nullptr, s.amount->type, nullptr);
        const int sign = sign_of_integer_expression(head->recurrence, loop, true);
        flags = sign > 0 ? SSADATA_monotonic_incr : sign < 0 ? SSADATA_monotonic_decr | SSADATA_strict_monotonic : 0;
    }
    if (ivClass == IVC_NONE) return;
    announce(TEXT_OF_CLASS[IVC_AFFINE_LINEAR], head);
    for (SSADATA* d : members) set_class(d, ivClass, flags);
}

void REGION::classify() {
    for (SSADATA* d : members)
        if (d->is_loop_merging_phi() && (!head || d->lexicalNumber < head->lexicalNumber)) head = d;
    if (print_debug) debug_printf("~~~#NON-TRIVIAL#1 SCR#%u L<%d>\n", members.front()->scrNumber, loop ? loop->uid : 0);
    STEP s;
    if (head && is_flip_flop()) {
        announce("MFFS: Flip-Flop sequence found for ", head);
        for (SSADATA* d : members) set_class(d, IVC_FLIP_FLOP, 0);
    } else if (head)
        s = step_to(const_cast<SSADATA*>(back_argument(head, loop)), 0);
    const bool adds_nothing = s.kind == STEP::ADDS && s.is_constant() && s.min.is_zero() && s.max.is_zero();
    const bool is_unsigned = head && ssa_variable(head->node)->tree->type->is_unsigned();
    if (s.kind == STEP::NOTHING || adds_nothing) {
        announce(TEXT_OF_CLASS[IVC_REGION_CONSTANT], head);
        for (SSADATA* d : members) set_class(d, IVC_REGION_CONSTANT, 0);
    } else if (s.kind == STEP::ADDS)
        set_linear(s);
    else if (s.kind == STEP::MULTIPLIES) {
        announce("MSGS: Simple geometric sequence found for ", head);
        head->recurrence = mk_ICON(s.min, ssa_variable(head->node)->tree->type->stqs());
        for (SSADATA* d : members) set_class(d, IVC_SIMPLE_GEOMETRIC, 0);
    } else if (s.kind == STEP::SHIFTS)
        for (SSADATA* d : members) set_class(d, IVC_SHIFT_RIGHT, is_unsigned ? SSADATA_monotonic_decr : 0);
    else if (s.kind == STEP::FOLLOWS)
        for (SSADATA* d : members) set_class(d, IVC_SIMPLE_LIST, 0);
    else if (s.kind == STEP::ADDS_SEQUENCE)
        for (SSADATA* d : members) set_class(d, IVC_POLYNOMIAL, 0);
    if (members.front()->ivClass == IVC_NONE) {
        if (print_debug) debug_printf("~~~#NON-TRIVIAL#z SCR#%u: NO SEQUENCE FOUND!\n", members.front()->scrNumber);
        for (SSADATA* d : members) d->flags |= SSADATA_lattice_bot;
    }
}

// ---- Definitions outside of cycles

void classify_phi(SSADATA* d, const struct LOOP* loop) {
    if (d->is_loop_merging_phi()) {
        const SSADATA* back = back_argument(d, loop);
        if (back && is_in(back->block, loop) && is_sequence(back)) d->ivClass = IVC_WRAPAROUND;
        return;
    }
    const NODE* common = nullptr;
    for (const SSA_ARG& a : ssa_args(static_cast<const NODE*>(d->node))) {
        const SSADATA* from = SSADATA_of(a.definition);
        if (!from || from->ivClass != IVC_LITERAL_CONSTANT) return;
        if (common && !trees_are_congruent(common, from->value, false)) return;
        common = from->value;
    }
    if (!common) return;
    d->ivClass = IVC_LITERAL_CONSTANT;
    d->value = copy_tree(common);
}

// A sum or a multiple of a sequence is a sequence of its class; a load of a list is none.
void classify_by_operands(NODE* value, SSADATA* d, const struct LOOP* loop) {
    const NODE* t = value;
    while (t->op == SCONV && t->left->type->is_int() && t->type->is_int() && t->type->size >= t->left->type->size)
        t = t->left;
    const NODE* use = t;
    if ((t->op == PLUS || t->op == MINUS || t->op == MULT) && t->right->op != SSA_USE && is_RC(t->right, loop))
        use = t->left;
    if (use->op != SSA_USE) return;
    const SSADATA* from = SSADATA_of(ssa_reach(use));
    if (!from || loop_of(from->block) != loop || from->ivClass == IVC_SIMPLE_LIST || !is_sequence(from)) return;
    if (t->op == MULT && from->ivClass != IVC_AFFINE_LINEAR) return;
    d->ivClass = from->ivClass;
    if (t->op != MULT)
        d->flags |= from->flags & (SSADATA_monotonic_incr | SSADATA_monotonic_decr | SSADATA_strict_monotonic);
}

void classify_alone(SSADATA* d, struct LOOP* loop) {
    d->flags |= SSADATA_trivial_cycle;
    d->cycleHead = d;
    if (d->node->op == SSA_PHI)
        classify_phi(d, loop);
    else if (NODE* value = value_of(d)) {
        if (tree_is_level_1_parameter(value)) d->flags |= SSADATA_level_1_parameter;
        if (!classify_literal_constant(value, d) && !classify_region_constant(value, d))
            classify_by_operands(value, d, loop);
    }
    if (d->ivClass == IVC_NONE) d->flags |= SSADATA_lattice_bot;
}

// ---- Regions of a loop

void classify_regions(struct LOOP* loop, const std::vector<SSADATA*>& definitions) {
    using GRAPH = boost::adjacency_list<boost::vecS, boost::vecS, boost::directedS>;
    GRAPH graph(definitions.size());
    std::vector<size_t> place(records.size(), ~size_t(0));
    for (size_t i = 0; i < definitions.size(); ++i) place[ssa_version(definitions[i]->node)] = i;
    std::vector<bool> reads_itself(definitions.size());
    for (size_t i = 0; i < definitions.size(); ++i)
        for_each_input(definitions[i], [&](const NODE* input) {
            const size_t k = input ? place[ssa_version(input)] : ~size_t(0);
            if (k == ~size_t(0)) return;
            boost::add_edge(i, k, graph);
            reads_itself[i] = reads_itself[i] || k == i;
        });
    std::vector<size_t> region(definitions.size());
    const auto index = boost::get(boost::vertex_index, graph);
    const size_t count = boost::strong_components(graph, boost::make_iterator_property_map(region.begin(), index));
    // A region's number is above those of the regions that it reads.
    std::vector<std::vector<SSADATA*>> members(count);
    for (size_t i = 0; i < definitions.size(); ++i) members[region[i]].push_back(definitions[i]);
    for (size_t r = 0; r < count; ++r) {
        for (SSADATA* d : members[r]) d->scrNumber = static_cast<uint32_t>(r + 1);
        if (members[r].size() == 1 && !reads_itself[place[ssa_version(members[r][0]->node)]])
            classify_alone(members[r][0], loop);
        else
            REGION(loop, members[r]).classify();
    }
}

void classify_all() {
    std::vector<struct LOOP*> loops;
    if (loop_root())
        loops = loops_inner_first(loop_root());
    else
        loops.push_back(nullptr);
    std::unordered_map<const struct LOOP*, std::vector<SSADATA*>> definitions;
    for (const auto& d : records)
        if (d) definitions[loop_of(d->block)].push_back(d.get());
    for (auto& [loop, list] : definitions)
        std::sort(list.begin(), list.end(),
                  [](const SSADATA* a, const SSADATA* b) { return a->lexicalNumber < b->lexicalNumber; });
    for (struct LOOP* loop : loops)
        if (definitions.count(loop)) classify_regions(loop, definitions[loop]);
}

} // namespace

bool classify_literal_constant(NODE* value, SSADATA* d) {
    const NODE* t = value;
    while (t->op == SCONV && t->left->type->is_int() && t->type->is_int()) t = t->left;
    NODE* constant = nullptr;
    if (t->op == ICON || t->op == FCON)
        constant = copy_tree(value);
    else if (value->op == SSA_USE) {
        const SSADATA* from = SSADATA_of(ssa_reach(value));
        if (from && from->ivClass == IVC_LITERAL_CONSTANT) constant = copy_tree(from->value);
    }
    if (!constant) return false;
    d->ivClass = IVC_LITERAL_CONSTANT;
    d->value = simp_tree(constant, nullptr);
    return true;
}

bool classify_region_constant(NODE* value, SSADATA* d) {
    struct LOOP* loop = loop_of(d->block);
    if (!loop || loop->is_root() || !is_RC(value, loop)) return false;
    d->ivClass = IVC_REGION_CONSTANT;
    d->value = copy_tree_removing_SSA_operators(value);
    return true;
}

SSADATA* SSADATA_of(const NODE* definition) {
    if (!definition || !op_is_SSA_definition(definition->op)) return nullptr;
    const uint32_t version = ssa_version(definition);
    return version < records.size() ? records[version].get() : nullptr;
}

bool is_a_loop_merging_phi(const NODE* phi) {
    const uint32_t version = ssa_version(phi);
    BBLK* bb = version < ssa_definitions().size() ? ssa_definitions()[version].block : nullptr;
    struct LOOP* loop = bb ? loop_of(bb) : nullptr;
    if (phi->op != SSA_PHI || !loop || loop->is_root() || loop->head != bb || ssa_args(phi).size() != 2) return false;
    return is_in(ssa_args(phi)[0].block, loop) != is_in(ssa_args(phi)[1].block, loop);
}

void begin_SSA_data_propagation() {
    insert_SSA_decoration_trees();
    construct_SSA_form(false, true, false);
    if (!function_is_in_SSA_form) return;
    enter_records();
    enter_uses();
    enter_constraints();
    if (loop_root())
        for (struct LOOP* loop : loops_outer_first(loop_root())) loop->rdefs.clear();
    classify_all();
    if (print_debug && fdebug) dump_SSADATA_information(fdebug);
}

void wrap_up_SSA_data_propagation() {
    if (loop_root())
        for (struct LOOP* loop : loops_outer_first(loop_root())) loop->rdefs.clear();
    records.clear();
    deconstruct_SSA_form();
    remove_SSA_decoration_trees();
}

void dump_SSADATA_information(FILE* out) {
    for (const auto& d : records) {
        if (!d) continue;
        const std::string name = tree_to_infix(ssa_variable(d->node)->tree);
        std::fprintf(out, "%s.%u in %s: %s\n", name.c_str(), ssa_version(d->node), d->block->str(),
                     ivClass_names[d->ivClass]);
        if (d->cycleHead)
            std::fprintf(out, "    SCR cycle head: %s\n",
                         d->cycleHead == d.get() ? "<SELF>" : std::to_string(ssa_version(d->cycleHead->node)).c_str());
        if (d->recurrence)
            std::fprintf(out, "    Recurrence:        %s := %s\n", name.c_str(), tree_to_infix(d->recurrence).c_str());
        if (d->value) std::fprintf(out, "    Closed form: %s\n", tree_to_infix(d->value).c_str());
        for (const NODE* c : d->constraints) std::fprintf(out, "    Constraints: %s\n", tree_to_infix(c).c_str());
        for (const NODE* use : d->duChain) std::fprintf(out, "    DU Chain use: %s\n", tree_to_infix(use).c_str());
    }
}

// ---- What reaches a loop's entry

void add_rdef_at_loop_entry(NODE* definition, struct LOOP* loop) {
    SSAVAR* v = ssa_variable(definition);
    const SSADATA* d = SSADATA_of(definition);
    if (!d || !v->is_a_simple_IV_candidate() || loop->rdefs.count(v->sym)) return;
    const bool is_in_subloop = loop_of(d->block) != loop && loop_is_subloop_of_loop(loop_of(d->block), loop, false);
    if (definition->op == SSA_CHI || loop->is_root() || !is_in_subloop) loop->rdefs[v->sym] = definition;
}

void add_rdefs_from_loop_preheader(struct LOOP* loop) {
    for (BBLK* bb = loop->preheader; bb; bb = bb->predecessors->first) {
        std::vector<NODE*> definitions;
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_SSA_operator(s->first, [&](NODE* t) {
                if (op_is_SSA_definition(t->op)) definitions.push_back(t);
            });
        for (size_t i = definitions.size(); i-- > 0;) add_rdef_at_loop_entry(definitions[i], loop);
        const EDGE* p = bb->predecessors;
        if (!p || p->rest || p->first->dfn >= bb->dfn || p->first->loop->level > loop->level) return;
    }
}

void add_rdefs_at_function_entry() {
    struct LOOP* root = loop_root();
    if (!root || !function_is_in_SSA_form) return;
    for (LIST* s = currfuninfo->bb_list->statements; s; s = s->rest) {
        const NODE* t = below_SSA(s->first);
        if (s->first->op == SSA_DEF && t->op == ASG && is_def_entry_ICALL_tree(t->right))
            add_rdef_at_loop_entry(s->first, root);
    }
}

NODE* find_rdef_at_loop_entry(const NODE* lvalue, const struct LOOP* loop) {
    const NODE* name = name_accessed(below_SSA(lvalue));
    if (!name || !scalar_analysis_IV_candidate(name)) return nullptr;
    auto at = loop->rdefs.find(name->u.sym);
    return at == loop->rdefs.end() ? nullptr : at->second;
}

NODE* find_SSA_sym_init(SYMTAB* sym, struct LOOP* loop) {
    const SSADATA* entry = nullptr;
    for (const LIST* cell = loop->head->statements; cell && cell->first->op == SSA_PHI; cell = cell->rest) {
        const SSADATA* phi = SSADATA_of(cell->first);
        if (phi && phi->is_loop_merging_phi() && ssa_variable(phi->node)->sym == sym)
            entry = SSADATA_of(entry_argument(phi, loop));
    }
    auto at = loop->rdefs.find(sym);
    if (!entry && at != loop->rdefs.end()) entry = SSADATA_of(at->second);
    return entry && entry->ivClass == IVC_LITERAL_CONSTANT ? copy_tree(entry->value) : nullptr;
}

NODE* find_SSA_expr_init(const NODE* expr, struct LOOP* loop) {
    NODE* result = copy_tree_removing_SSA_operators(expr);
    bool is_known = true;
    result = rewrite_tree(result, [&](NODE* t) {
        if (t->op != NAME || !t->u.sym || t->u.sym->is_function()) return t;
        NODE* value = find_SSA_sym_init(t->u.sym, loop);
        if (!value) {
            is_known = is_known && sym_is_RC_in_loop(t->u.sym, loop);
            return t;
        }
        value = coerce_to_type(t->type, value);
        erase_tree(t);
        return value;
    });
    if (is_known) return simp_tree(result, nullptr);
    erase_tree(result);
    return nullptr;
}
