// Common subexpressions of a whole function: partial redundancies go.
//
// An expression that is computed where, on some path to there, it has been computed before is not computed there again:
// a temporary holds its value, and where the other paths have not computed it, they compute it at their end. What does
// not change in a loop is thereby computed ahead of it, if the loop computes it in any case.
//
// Needs: `annotate_cfg`, no loop hierarchy. Leaves: nothing where edges were split, what rests on the graph otherwise.
// A call of a function that only computes is an expression as any other; as a division, it is not made earlier than what may
// not return.
// Sound because a computation is placed only where every path from there computes the expression before its operands
// change (so that nothing is computed that was not, and nothing traps that did not; a statement that may not pass
// control on counts as a change for what may trap), and is taken away only where all paths have it in the temporary.
// Edges that exceptions take, and those out of a block that ends in their dispatch, get no computation.
//
// Every expression is looked at by itself, in the blocks that it reaches: sets of all expressions for all blocks would
// take the square of the function's size. What a block does to an expression is asked when it is reached, and the number
// of blocks that all expressions may reach is limited, so that time stays linear.
//
// Sources: E. Morel, C. Renvoise, "Global Optimization by Suppression of Partial Redundancies", 1979; D. M. Dhamdhere,
// "Practical Adaptation of the Global Optimization Algorithm of Morel and Renvoise", 1991 (insertion on edges).
#include "OPT5/scalar/gcse.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frequencies.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/gdflow.h"
#include "OPT5/scalar/subrange.h"
#include "OPT5/scalar/triples.h"

#include <algorithm>
#include <map>
#include <numeric>
#include <unordered_map>
#include <unordered_set>

namespace {

// What is known of one expression in one block.
enum FACT_BIT : uint16_t {
    ANTLOC = 1,   // computed ahead of any change
    AVLOC = 2,    // computed behind all changes
    ALTERED = 4,  // changed
    STAYS = 8,    // may trap, and control may not pass through
    PAVIN = 16,   // some path to the entry computes it
    AVIN = 32,    // all do
    PPIN = 64,    // it is in the temporary on entry
    NEEDED = 128, // the temporary's value is needed at the exit
    SEEN = 256,
    EXPOSED = 512, // as ANTLOC, whether or not control passes through
    REACHED = 1024,
};

class EXPRESSION {
public:
    // What all expressions of a function share.
    struct FUNCTION {
        std::vector<BBLK*> blocks;   // by number
        std::vector<uint16_t> facts; // by block; 0 between expressions
        std::vector<bool> is_endless; // by block: control reaches no end of the function from there
        FREQUENCIES runs;
        int64_t questions_left = 100000; // about writes to memory; beyond them every write is taken to change it
        int64_t blocks_left = 4000000;   // to be reached; beyond them expressions stay where they are
    };
    EXPRESSION(const TRIPLE& t, FUNCTION& function)
        : t(t), facts(function.facts), blocks(function.blocks), function(function) {}
    ~EXPRESSION() { forget(); }
    // Whether it pays; fills what is to be done.
    bool decide();
    // Whether all paths to what is taken away compute it, before anything is done; reports where not.
    bool is_given_where_deleted(int number);
    void dump_annotations(int number);

    struct EDGE_PLACE {
        BBLK *from, *to;
    };
    std::vector<BBLK*> insert_at_end;
    std::vector<EDGE_PLACE> insert_on_edge;
    std::vector<const TRIPLE_SITE*> replace; // the temporary has the value
    std::vector<const TRIPLE_SITE*> save;    // computed into the temporary

private:
    // The first and last change in a block, by position; 0: there is none.
    struct CHANGES {
        int first = 0, last = 0;
    };
    uint16_t& at(int block) {
        uint16_t& f = facts[static_cast<size_t>(block)];
        if (f == 0) reach(block, first_change(block));
        return f;
    }
    uint16_t& at(const BBLK* bb) { return at(bb->dfn); }
    void reach(int block, int change);
    void forget();
    int first_change(int block);
    int last_change(int block);
    bool changes_it(const TRIPLE_WRITE& w);
    BBLK* bb(int block) const { return blocks[static_cast<size_t>(block)]; }
    bool is_available_at_exit(const BBLK* b) {
        const uint16_t f = at(b);
        return (f & AVLOC) || ((f & AVIN) && !(f & ALTERED));
    }
    bool is_placed_at_exit(const BBLK* b);
    bool is_placed_through(const BBLK* b) { return (at(b) & PPIN) && !(at(b) & (ALTERED | STAYS)); }
    bool is_redundant_in(int block) {
        const uint16_t f = at(block);
        return (f & (ANTLOC | PPIN)) == (ANTLOC | PPIN) || (f & (EXPOSED | AVIN)) == (EXPOSED | AVIN);
    }
    static bool edge_takes_computation(const BBLK* from, const BBLK* to);
    static bool end_takes_computation(const BBLK* b);

    void find_local_facts();
    void compute_PAVIN();
    bool may_be_redundant();
    void compute_AVOUT();
    void compute_PPIN();
    bool may_be_placed(const BBLK* b);
    void compute_INSERT();
    void find_saves();
    bool pays() const;

    const TRIPLE& t;
    std::vector<uint16_t>& facts; // by block; 0 but for what `touched` lists
    const std::vector<BBLK*>& blocks;
    FUNCTION& function;
    bool with_memory = false; // writes to memory count
    std::vector<int> touched, region;
    std::unordered_map<int, CHANGES> changes; // of the blocks of its sites; looked up alone
};

// Those of one block. Writes are in the order of blocks and statements.
std::pair<const TRIPLE_WRITE*, const TRIPLE_WRITE*> in_block(const std::vector<TRIPLE_WRITE>& writes, int block) {
    const TRIPLE_WRITE *begin = writes.data(), *end = begin + writes.size();
    begin = std::lower_bound(begin, end, block, [](const TRIPLE_WRITE& w, int b) { return w.block < b; });
    return {begin, std::upper_bound(begin, end, block, [](int b, const TRIPLE_WRITE& w) { return b < w.block; })};
}

bool EXPRESSION::changes_it(const TRIPLE_WRITE& w) {
    return --function.questions_left < 0 || tree_modifies_lvalue_in_tree(w.statement, t.tree);
}

int EXPRESSION::first_change(int block) {
    int first = 0;
    auto enter = [&first](int position) {
        if (!first || position < first) first = position;
    };
    for (const SYMTAB* sym : t.variables) {
        const auto [begin, end] = in_block(writes_of_variable(sym), block);
        if (begin != end) enter(begin->position);
    }
    if (!with_memory) return first;
    const auto [begin, end] = in_block(writes_of_memory(), block);
    for (const TRIPLE_WRITE* w = begin; w != end && (!first || w->position < first); ++w)
        if (changes_it(*w)) enter(w->position);
    return first;
}

int EXPRESSION::last_change(int block) {
    int last = 0;
    for (const SYMTAB* sym : t.variables) {
        const auto [begin, end] = in_block(writes_of_variable(sym), block);
        if (begin != end) last = std::max(last, end[-1].position);
    }
    if (!with_memory) return last;
    const auto [begin, end] = in_block(writes_of_memory(), block);
    for (const TRIPLE_WRITE* w = end; w != begin && w[-1].position > last; --w)
        if (changes_it(w[-1])) last = w[-1].position;
    return last;
}

void EXPRESSION::reach(int block, int change) {
    --function.blocks_left;
    uint16_t f = REACHED;
    if (change) f |= ALTERED;
    if (t.may_trap) {
        const auto [begin, end] = in_block(statements_that_may_stay(), block);
        if (begin != end || function.is_endless[static_cast<size_t>(block)]) f |= STAYS;
    }
    facts[static_cast<size_t>(block)] = f;
    touched.push_back(block);
}

void EXPRESSION::forget() {
    for (int b : touched) facts[static_cast<size_t>(b)] = 0;
    touched.clear();
    region.clear();
    changes.clear();
}

void EXPRESSION::find_local_facts() {
    forget();
    for (size_t i = 0; i < t.sites.size();) {
        const int block = t.sites[i].block;
        CHANGES c;
        c.first = first_change(block);
        if (c.first) c.last = std::max(c.first, last_change(block));
        if (c.first) changes[block] = c;
        reach(block, c.first);
        int first_stay = 0;
        if (at(block) & STAYS) {
            const auto [begin, end] = in_block(statements_that_may_stay(), block);
            if (begin != end) first_stay = begin->position;
        }
        for (; i < t.sites.size() && t.sites[i].block == block; ++i) {
            const TRIPLE_SITE& site = t.sites[i];
            const bool is_ahead_of_stay = !first_stay || site.position <= first_stay;
            if (!c.first || site.position <= c.first)
                at(block) |= site.is_certain && is_ahead_of_stay ? ANTLOC | EXPOSED : EXPOSED;
            if (site.is_certain && site.position > c.last) at(block) |= AVLOC;
        }
    }
}

void EXPRESSION::compute_PAVIN() {
    std::vector<const BBLK*> waiting;
    auto enter_successors = [&](const BBLK* b) {
        for (const EDGE* s = b->successors; s; s = s->rest) {
            uint16_t& f = at(s->first->dfn);
            if (f & PAVIN) continue;
            f |= PAVIN | AVIN;
            region.push_back(s->first->dfn);
            if (!(f & ALTERED) && !(f & AVLOC)) waiting.push_back(s->first);
        }
    };
    for (const TRIPLE_SITE& site : t.sites)
        if (at(site.block) & AVLOC) enter_successors(site.bb);
    while (!waiting.empty() && function.blocks_left >= 0) {
        const BBLK* b = waiting.back();
        waiting.pop_back();
        enter_successors(b);
    }
}

void EXPRESSION::compute_AVOUT() {
    std::vector<int> waiting = region;
    while (!waiting.empty()) {
        const int b = waiting.back();
        waiting.pop_back();
        if (!(at(b) & AVIN)) continue;
        bool all = bb(b) != currfuninfo->bb_list;
        for (const EDGE* p = bb(b)->predecessors; p && all; p = p->rest) all = is_available_at_exit(p->first);
        if (all) continue;
        at(b) &= static_cast<uint16_t>(~AVIN);
        if (!(at(b) & (AVLOC | ALTERED)))
            for (const EDGE* s = bb(b)->successors; s; s = s->rest) waiting.push_back(s->first->dfn);
    }
}

bool EXPRESSION::is_placed_at_exit(const BBLK* b) {
    if (!b->successors) return false;
    for (const EDGE* s = b->successors; s; s = s->rest)
        if (!(at(s->first) & PPIN)) return false;
    return true;
}

// Not one back to the head of a loop: the loop would no longer end in its test.
bool EXPRESSION::edge_takes_computation(const BBLK* from, const BBLK* to) {
    return from->successors->rest && to->predecessors->rest && !tree_is_EH_SWITCH(from->branch()) &&
           !currfuninfo->loops->dominates(to, from);
}

// Ahead of the control statement, which must not act then.
bool EXPRESSION::end_takes_computation(const BBLK* b) {
    return !tree_is_EH_SWITCH(b->branch()) && !tree_has_side_effects(b->branch()->left);
}

bool EXPRESSION::may_be_placed(const BBLK* b) {
    const uint16_t f = at(b);
    if (b == currfuninfo->bb_list) return false;
    if (!(f & ANTLOC) && ((f & (ALTERED | STAYS)) || !is_placed_at_exit(b))) return false;
    for (const EDGE* p = b->predecessors; p; p = p->rest) {
        if (is_available_at_exit(p->first) || edge_takes_computation(p->first, b)) continue;
        if (!is_placed_at_exit(p->first) || !end_takes_computation(p->first)) return false;
    }
    return true;
}

void EXPRESSION::compute_PPIN() {
    for (int b : region)
        if ((at(b) & ANTLOC) || !(at(b) & (ALTERED | STAYS))) at(b) |= PPIN;
    std::vector<int> waiting = region;
    while (!waiting.empty()) {
        const int b = waiting.back();
        waiting.pop_back();
        if (!(at(b) & PPIN) || may_be_placed(bb(b))) continue;
        at(b) &= static_cast<uint16_t>(~PPIN);
        for (const EDGE* p = bb(b)->predecessors; p; p = p->rest) {
            waiting.push_back(p->first->dfn);
            for (const EDGE* s = p->first->successors; s; s = s->rest) waiting.push_back(s->first->dfn);
        }
        for (const EDGE* s = bb(b)->successors; s; s = s->rest) waiting.push_back(s->first->dfn);
    }
}

void EXPRESSION::compute_INSERT() {
    std::vector<int> ends;
    for (int b : region) {
        if (!(at(b) & PPIN)) continue;
        for (const EDGE* e = bb(b)->predecessors; e; e = e->rest) {
            BBLK* p = e->first;
            if (is_available_at_exit(p)) continue;
            if (!is_placed_at_exit(p) || !end_takes_computation(p))
                insert_on_edge.push_back({p, bb(b)});
            else if (!is_placed_through(p) && !(at(p) & SEEN)) {
                at(p->dfn) |= SEEN;
                insert_at_end.push_back(p);
            }
        }
    }
    std::sort(insert_at_end.begin(), insert_at_end.end(), [](const BBLK* x, const BBLK* y) { return x->dfn < y->dfn; });
    std::sort(insert_on_edge.begin(), insert_on_edge.end(), [](const EDGE_PLACE& x, const EDGE_PLACE& y) {
        return x.from->dfn != y.from->dfn ? x.from->dfn < y.from->dfn : x.to->dfn < y.to->dfn;
    });
}

// From the computations that go back to those that give the temporary its value.
void EXPRESSION::find_saves() {
    std::vector<const BBLK*> waiting;
    auto need_at_entry = [&](const BBLK* b) {
        for (const EDGE* e = b->predecessors; e; e = e->rest) {
            uint16_t& f = at(e->first->dfn);
            if ((f & NEEDED) || !(is_available_at_exit(e->first) || is_placed_through(e->first))) continue;
            f |= NEEDED;
            waiting.push_back(e->first);
        }
    };
    for (const TRIPLE_SITE& site : t.sites)
        if (is_redundant_in(site.block)) need_at_entry(site.bb);
    while (!waiting.empty()) {
        const BBLK* b = waiting.back();
        waiting.pop_back();
        if (!(at(b) & AVLOC)) need_at_entry(b);
    }
    for (size_t i = 0; i < t.sites.size();) {
        const int block = t.sites[i].block;
        const uint16_t f = at(block);
        auto c = changes.find(block);
        const int first_change = c == changes.end() || !c->second.first ? 1 << 30 : c->second.first;
        const int last_change = c == changes.end() ? 0 : c->second.last;
        const bool is_deleted = is_redundant_in(block);
        int saved_at = 0;
        for (; i < t.sites.size() && t.sites[i].block == block; ++i) {
            const TRIPLE_SITE& site = t.sites[i];
            if (is_deleted && site.position <= first_change)
                replace.push_back(&site);
            else if ((f & NEEDED) && site.position > last_change && (saved_at || site.is_certain)) {
                (saved_at ? replace : save).push_back(&site);
                saved_at = site.position;
            }
        }
    }
}

// A load counts for more than the operation that it is, a computation that may be left out for half.
bool EXPRESSION::pays() const {
    const double cost = t.cost;
    double gain = 0;
    for (const TRIPLE_SITE* site : replace) gain += (site->is_certain ? cost : cost / 2) * function.runs.of(site->bb);
    for (const TRIPLE_SITE* site : save) gain -= function.runs.of(site->bb);
    for (const BBLK* b : insert_at_end) gain -= (cost + 1) * function.runs.of(b);
    for (const EDGE_PLACE& e : insert_on_edge) gain -= (cost + 1) * function.runs.of_edge(e.from, e.to);
    if (size_speed_goal() < 2 && insert_at_end.size() + insert_on_edge.size() >= replace.size()) return false;
    return gain > 1e-6;
}

bool EXPRESSION::may_be_redundant() {
    find_local_facts();
    compute_PAVIN();
    return function.blocks_left >= 0 && std::any_of(t.sites.begin(), t.sites.end(), [this](const TRIPLE_SITE& site) {
        return (at(site.block) & (EXPOSED | PAVIN)) == (EXPOSED | PAVIN);
    });
}

bool EXPRESSION::decide() {
    if (!may_be_redundant()) return false;
    if (t.reads_memory) {
        with_memory = true;
        if (!may_be_redundant()) return false;
    }
    compute_AVOUT();
    compute_PPIN();
    compute_INSERT();
    find_saves();
    return !replace.empty() && pays();
}

// ---- Checks and dumps

bool EXPRESSION::is_given_where_deleted(int number) {
    bool is_given = true;
    int last = 0;
    for (const TRIPLE_SITE* site : replace) {
        if (site->block == last || !is_redundant_in(site->block)) continue;
        last = site->block;
        for (const EDGE* p = site->bb->predecessors; p; p = p->rest) {
            auto is_edge = [&](const EDGE_PLACE& e) { return e.from == p->first && e.to == site->bb; };
            if (is_available_at_exit(p->first) || is_placed_through(p->first)) continue;
            if (std::find(insert_at_end.begin(), insert_at_end.end(), p->first) != insert_at_end.end()) continue;
            if (std::any_of(insert_on_edge.begin(), insert_on_edge.end(), is_edge)) continue;
            debug_printf("\n\n!!! GCSE(): <%d> is DELETE-AVOUT||INSERT in BB %d %s\n", number, site->block,
                         tree_to_infix(t.tree).c_str());
            is_given = false;
        }
    }
    return is_given;
}

// By block, what holds of the expression: its number, or nothing.
void EXPRESSION::dump_annotations(int number) {
    auto line = [number](const char* format, bool holds) {
        debug_printf(format, holds ? ("{" + std::to_string(number) + "}").c_str() : "{}");
    };
    for (int b : region) {
        debug_printf("\n\nMore global dataflow data for BB->DFN %d\n", b);
        line("   ALTERED:\t%s\n", at(b) & ALTERED);
        line("   PPIN:\t%s\n", at(b) & PPIN);
        line("   PPOUT:\t%s\n", is_placed_at_exit(bb(b)));
        line("   INSERT:\t%s\n", std::find(insert_at_end.begin(), insert_at_end.end(), bb(b)) != insert_at_end.end());
        line("   DELETE:\t%s\n", is_redundant_in(b));
    }
}

// ---- Rewriting

class GLOBAL_CSE {
public:
    void run();

private:
    void find_blocks();
    void find_steps();
    void keep_what_stands(TRIPLE& t);
    bool is_worth_a_look(const TRIPLE& t) const;
    bool is_induction(const TRIPLE& t) const;
    void apply(const EXPRESSION& e, const TRIPLE& t);
    void insert_useful_blocks();
    void finish();

    EXPRESSION::FUNCTION function;
    std::unordered_set<const NODE*> gone; // nodes of trees that were taken away; membership only
    std::vector<NODE*> taken_away;        // erased at the end: they hold slots of other expressions
    STATEMENTS_AHEAD ahead;
    std::map<std::pair<int, int>, std::vector<NODE*>> on_edges; // by the numbers of the blocks
    // Outermost loops that step a variable; membership only.
    std::unordered_map<const SYMTAB*, std::unordered_set<const NATURAL_LOOP*>> stepped_in;
    int applied = 0;
};

void GLOBAL_CSE::find_blocks() {
    const size_t count = static_cast<size_t>(currfuninfo->bb_count) + 1;
    function.blocks.assign(count, nullptr);
    function.facts.assign(count, 0);
    std::vector<bool> ends(count, false);
    std::vector<BBLK*> waiting;
    for (BBLK* b = currfuninfo->bb_list; b; b = b->dflink) {
        function.blocks[static_cast<size_t>(b->dfn)] = b;
        if (b->successors) continue;
        ends[static_cast<size_t>(b->dfn)] = true;
        waiting.push_back(b);
    }
    while (!waiting.empty()) {
        const BBLK* b = waiting.back();
        waiting.pop_back();
        for (const EDGE* p = b->predecessors; p; p = p->rest) {
            if (ends[static_cast<size_t>(p->first->dfn)]) continue;
            ends[static_cast<size_t>(p->first->dfn)] = true;
            waiting.push_back(p->first);
        }
    }
    function.is_endless = std::move(ends);
    function.is_endless.flip();
}

// Sites within what another expression took away are none any more.
void GLOBAL_CSE::keep_what_stands(TRIPLE& t) {
    t.sites.erase(std::remove_if(t.sites.begin(), t.sites.end(),
                                 [this](const TRIPLE_SITE& s) { return gone.count(*s.slot) != 0; }),
                  t.sites.end());
    if (!t.sites.empty()) t.tree = *t.sites.front().slot;
}

// What is computed in one block only, and not again and again, is common to that block at most.
bool GLOBAL_CSE::is_worth_a_look(const TRIPLE& t) const {
    if (t.sites.empty()) return false;
    return t.sites.front().block != t.sites.back().block ||
           (currfuninfo->loops->around(t.sites.front().bb) || currfuninfo->loops->has_other_cycles());
}

// What a loop steps: `x op= e`, or x = ... x ...
bool is_step(const NODE* statement, const SYMTAB* x) {
    return is_operator_assignment(statement) || (statement->op == ASG && sym_appears_in_tree(x, statement->right));
}

bool is_linear(const NODE* t) {
    return !any_subtree(t, [](const NODE* n) {
        switch (n->op) {
        case NAME:
        case ICON:
        case PLUS:
        case MINUS:
        case UMINUS:
        case SCONV:
        case PCONV:
        case PMCONV:
        case UAND: return false;
        case MULT:
        case SLL: return n->right->op != ICON;
        default: return true;
        }
    });
}

const NATURAL_LOOP* outermost_loop_around(const BBLK* bb) {
    const NATURAL_LOOP* loop = currfuninfo->loops->around(bb);
    while (loop && loop->parent) loop = loop->parent;
    return loop;
}

void GLOBAL_CSE::find_steps() {
    for (const TRIPLE& t : unique_triples)
        for (const SYMTAB* x : t.variables) {
            auto [at, is_new] = stepped_in.try_emplace(x);
            if (!is_new) continue;
            for (const TRIPLE_WRITE& w : writes_of_variable(x)) {
                const NATURAL_LOOP* loop = outermost_loop_around(function.blocks[static_cast<size_t>(w.block)]);
                if (loop && is_step(w.statement, x)) at->second.insert(loop);
            }
        }
}

// A linear expression of a loop's counters is made a counter itself later on, which a temporary of its parts would
// hide.
bool GLOBAL_CSE::is_induction(const TRIPLE& t) const {
    if (!is_linear(t.tree)) return false;
    return std::any_of(t.sites.begin(), t.sites.end(), [&](const TRIPLE_SITE& site) {
        const NATURAL_LOOP* loop = outermost_loop_around(site.bb);
        return loop && std::any_of(t.variables.begin(), t.variables.end(),
                                   [&](const SYMTAB* x) { return stepped_in.at(x).count(loop) != 0; });
    });
}

void GLOBAL_CSE::apply(const EXPRESSION& e, const TRIPLE& t) {
    SYMTAB* temp = sym_temp('U', -1, t.tree->type->stqs(), t.tree->ls);
    const std::string text = print_debug ? tree_to_infix(t.tree) : std::string();
    auto name = [temp](const NODE* like) { return coerce_to_type(like->type->stqs(), mk_NAME(temp, like->ls)); };
    auto insertion = [&](const BBLK* in) {
        if (print_debug) debug_printf("\tInsertion in block %d:\t %s\n", in->dfn, text.c_str());
        return mk_ASG(mk_NAME(temp, nullptr), copy_tree(t.tree));
    };
    for (BBLK* b : e.insert_at_end) insert_at_end_of_body(b, insertion(b));
    for (const EXPRESSION::EDGE_PLACE& p : e.insert_on_edge)
        on_edges[{p.from->dfn, p.to->dfn}].push_back(insertion(p.from));
    for (const TRIPLE_SITE* s : e.save) {
        NODE* value = *s->slot;
        *s->slot = name(value);
        // What it consists of is looked at later, and stands ahead of it then.
        ahead[s->cell].push_back({-++applied, mk_ASG(mk_NAME(temp, value->ls), value)});
        if (print_debug) debug_printf("\tTemp added in block %d:\t %s\n", s->block, temp->name);
    }
    for (const TRIPLE_SITE* s : e.replace) {
        NODE* value = *s->slot;
        if (print_debug) debug_printf("\tDeletion in block %d:\t%s\t<==  %s\n", s->block, text.c_str(), temp->name);
        for_each_subtree(static_cast<const NODE*>(value), [this](const NODE* n) { gone.insert(n); });
        taken_away.push_back(value);
        *s->slot = name(value);
    }
}

// Only the edges that a computation is put on are split: a block of its own on any other would hinder what
// follows.
void GLOBAL_CSE::insert_useful_blocks() {
    for (auto& [edge, assignments] : on_edges) {
        BBLK* between = split_cfg_edge(function.blocks[static_cast<size_t>(edge.first)],
                                       function.blocks[static_cast<size_t>(edge.second)], false);
        for (NODE* t : assignments) insert_at_end_of_body(between, t);
    }
}

void GLOBAL_CSE::finish() {
    for (BBLK* b = currfuninfo->bb_list; b; b = b->dflink) insert_statements_ahead(b, ahead);
    insert_useful_blocks();
    for (NODE* t : taken_away) erase_tree(t);
    if (!on_edges.empty()) renumber_bblocks();
    if (!taken_away.empty()) sym_split(currfuninfo);
    changed(on_edges.empty() ? fact::graph : fact::none);
}

void GLOBAL_CSE::run() {
    find_blocks();
    std::vector<size_t> order(unique_triples.size());
    std::iota(order.begin(), order.end(), size_t(0));
    // A tree ahead of what it consists of.
    std::stable_sort(order.begin(), order.end(),
                     [](size_t a, size_t b) { return unique_triples[a].cost > unique_triples[b].cost; });
    for (const TRIPLE& t : unique_triples) {
        function.questions_left += 64 * static_cast<int64_t>(t.sites.size());
        function.blocks_left += 256 * static_cast<int64_t>(t.sites.size());
    }
    find_steps();
    for (size_t i : order) {
        TRIPLE& t = unique_triples[i];
        keep_what_stands(t);
        if (!is_worth_a_look(t) || is_induction(t)) continue;
        EXPRESSION e(t, function);
        if (!e.decide() || !e.is_given_where_deleted(static_cast<int>(i))) continue;
        if (print_debug >= 2) e.dump_annotations(static_cast<int>(i));
        apply(e, t);
    }
    finish();
}

} // namespace

void gcse() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'gcse' ----------\n");
    if (unique_triples.empty()) return;
    need(fact::loops);
    GLOBAL_CSE().run();
}

void restructure_loops() {}
