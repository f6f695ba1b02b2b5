// What the programmer is told of each loop: how often it runs, and which accesses to memory keep its iterations in order.
//
// Needs: the loop hierarchy with its counts, dependence analysis that is active. Leaves: everything.
#include "OPT5/dd/dd.h"

#include "OPT5/alias/alias.h"
#include "OPT5/dd/dependence.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"

#include <algorithm>
#include <cstdlib>
#include <vector>

PSN place_of_loop(const struct LOOP* loop) {
    const SOURCE_PLACE& start = loop->sourceStart;
    PSN place{nullptr, 0, 0};
    for (const LIST* s = loop->head->statements; s && place.line == 0; s = s->rest)
        if (s->psn) place = *s->psn;
    if (start.line) place = {start.file.empty() ? place.file : start.file.c_str(), start.line, start.column};
    return place;
}

namespace {

constexpr size_t MOST_REFERENCES = 40, MOST_TOLD = 3;

// ---- How often it runs

std::string number(const NODE* icon, const char* otherwise) {
    return icon && icon->op == ICON ? std::to_string(icon->u.lval.value) : otherwise;
}

std::string count_of(const struct LOOP* loop) {
    if (loop->trips && loop->trips->op == ICON) return number(loop->trips, "") + " iterations";
    const std::string least = number(loop->minTrips, "0"), most = number(loop->maxTrips, ""),
                      factor = number(loop->tripFactor, "1");
    // A temporary says nothing to the programmer.
    const std::string trips = loop->trips ? reference_text(loop->trips) : "$";
    const bool is_shown = trips.find('$') == std::string::npos;
    std::string text = (is_shown ? trips + " iterations, " : "") + least;
    text += most.empty() ? " or more" : least == most ? "" : " to " + most;
    if (!is_shown) text += " iterations";
    return factor == "1" ? text : text + ", a multiple of " + factor;
}

const char* why_not_counted(const struct LOOP* loop) {
    if (loop->has(LOOP_early_exit)) return "it is left from elsewhere than its end, too: test one counter in one place, without break, return and goto";
    const LOOPIV* counter = loop->LCV;
    if (!counter)
        return "no variable counts its iterations: test a variable that changes by a constant, once an iteration, "
               "against a limit that the loop does not change";
    if (!counter->init || !counter->incrtree)
        return "its counter begins or steps with what is not known: write for (i = 0; i < n; i++), or use #pragma MUST_ITERATE";
    return "its counter may wrap, or pass the limit: count in int with < or >, or use #pragma MUST_ITERATE";
}

void tell_of_count(const struct LOOP* loop, const PSN& place) {
    const bool is_counted = loop->trips && !loop->has(LOOP_early_exit), is_closed = loop->is_bottom_tested();
    const char* const shape = is_closed ? "one branch closes it: " : "tested at its top: ";
    if (is_counted) return remark("loops", &place, is_closed ? REMARK::DONE : REMARK::NOTE, shape + count_of(loop));
    remark("loops", &place, REMARK::MISSED,
           shape + std::string("its number of iterations is not known ahead of it: ") + why_not_counted(loop));
}

// ---- What keeps its iterations in order

struct REFERENCE {
    const NODE* lvalue;
    const LIST* statement;
    bool is_write;
};

std::vector<REFERENCE> references_of(const struct LOOP* loop) {
    std::vector<REFERENCE> found;
    for (const BBLK* bb : loop->contents)
        for (const LIST* s = bb->statements; s; s = s->rest) {
            const NODE* t = s->first;
            if (t->op == NASSERT || t->op == ASSERT || t->op == PPRAGMA) continue;
            const NODE* target = writes_left_operand(t->op) ? without_members(t->left) : nullptr;
            for_each_subtree(t, [&](const NODE* n) {
                if (n->op == UMULT) found.push_back({n, s, n == target});
            });
        }
    return found;
}

bool have_one_base(const NODE* a, const NODE* b) {
    const NODE *x = address_expr_base(a->left), *y = address_expr_base(b->left);
    return trees_are_congruent(a->left, b->left, false) || (x && y && trees_are_congruent(x, y, false));
}

// Whether something is written that is no reference of the list and no private variable: nothing can be said of that.
bool writes_otherwise(const struct LOOP* loop) {
    const auto is_other = [](const NODE* n, const NODE* statement) {
        if (n->op == MCALL || n->op == ASM) return true;
        if (!writes_left_operand(n->op)) return false;
        const NODE* target = without_members(n->left);
        return target->op == UMULT ? n != statement : target->op != NAME || !is_private_scalar(target->u.sym);
    };
    for (const BBLK* bb : loop->contents)
        for (const LIST* s = bb->statements; s; s = s->rest)
            if (any_subtree(s->first, [&](const NODE* n) { return is_other(n, s->first); })) return true;
    return false;
}

bool is_between_iterations(const DVE& d) { return d.has_FWD_dirs() || d.has_BWD_dirs(); }

std::string place_in_text(const REFERENCE& r) {
    const std::string text = "'" + reference_text(r.lvalue) + "'";
    return r.statement->psn ? text + " of line " + std::to_string(r.statement->psn->line) : text;
}

bool is_one_place(const REFERENCE& a, const REFERENCE& b, const struct LOOP* loop) {
    const NODE *address = a.lvalue->left, *index = a.lvalue->right;
    return trees_are_congruent(a.lvalue, b.lvalue, false) && tree_is_RC_in_loop(address, loop, false) &&
           (!index || tree_is_RC_in_loop(index, loop, false));
}

void tell_of_pair(const REFERENCE& store, const REFERENCE& other, const DVE& d) {
    const int distance = d.has_exact_distance() ? std::abs(d.exact_distance()) : 0;
    const char* const help = have_one_base(store.lvalue, other.lvalue) ? ": nothing tells their subscripts apart"
                                                                       : ": if not, declare pointers restrict";
    std::string text = "iterations stay in order: " + place_in_text(store) + " and " + place_in_text(other);
    text += distance ? " are the same place in iterations " + std::to_string(distance) + " apart"
                     : std::string(" may be the same place") + help;
    remark("dependence", store.statement->psn, distance ? REMARK::NOTE : REMARK::MISSED, text);
}

void tell_of_dependences(struct LOOP* loop, const PSN& place) {
    const std::vector<REFERENCE> references = references_of(loop);
    const auto is_store = [](const REFERENCE& r) { return r.is_write; };
    if (std::none_of(references.begin(), references.end(), is_store)) return;
    if (references.size() > MOST_REFERENCES)
        return remark("dependence", &place, REMARK::NOTE,
                      std::to_string(references.size()) + " accesses to memory are too many to tell of each two");
    if (loop->has(LOOP_has_call))
        return remark("dependence", &place, REMARK::MISSED, "iterations stay in order: there is a call; see what is said of its inlining");
    size_t told = 0;
    for (size_t i = 0; i < references.size(); ++i)
        for (size_t j = i; j < references.size() && told < MOST_TOLD; ++j) {
            const REFERENCE &a = references[i], &b = references[j];
            if (!a.is_write && !b.is_write) continue;
            DVE d;
            compute_distances_for_loop(&d, a.lvalue, b.lvalue, loop);
            if (!is_between_iterations(d)) continue;
            ++told;
            if (is_one_place(a, b, loop))
                remark("dependence", a.statement->psn, REMARK::MISSED,
                       "iterations stay in order: '" + reference_text(a.lvalue) + "' is one place for all: use a local variable in the loop");
            else
                tell_of_pair(a.is_write ? a : b, a.is_write ? b : a, d);
        }
    if (!told && !writes_otherwise(loop))
        remark("dependence", &place, REMARK::DONE, "no access to memory keeps its iterations in order");
}

} // namespace

void tell_of_loops(struct LOOP* root) {
    if (!root || !remarks_are_wanted) return;
    if (root->irreducible) {
        const PSN place = place_of_loop(root);
        return remark("loops", &place, REMARK::MISSED, "no loop is known here: a goto leads into the middle of one");
    }
    for (struct LOOP* loop : loops_outer_first(root)) {
        if (loop->is_root()) continue;
        const PSN place = place_of_loop(loop);
        tell_of_count(loop, place);
        if (!loop_has_subloops(loop)) tell_of_dependences(loop, place);
    }
}
