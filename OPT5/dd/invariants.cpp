// What each iteration of a loop computes of values that the loop does not change is computed ahead of it.
//
// The outermost loop that does not change them is left at once. An address of an object becomes a variable where
// something that varies is added to it; by itself, or with a constant, it is part of the access.
//
// Needs: loops and alias marks; no saved environment. Leaves: those, with new statements in preheaders.
// Sound because what moves cannot fail and has no effect: no division, no load but of a variable that nothing in the
// loop may write to. It may be computed where it was not before: a signed sum or product that need not be exact there
// is computed in the unsigned type.
#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/dd/merge.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/exact.h"

#include <algorithm>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace {

constexpr size_t MOST_VALUES = 4, MOST_POINTERS = 6, MOST_CANDIDATES = 32; // of a loop
constexpr int MOST_NODES = 32, MOST_QUESTIONS = 8;                         // the latter look at the whole loop
constexpr double ITERATIONS = 8;                                           // of a loop, as an estimate

struct CANDIDATE {
    std::vector<NODE**> uses;
    int cost = 0;
    double gain = 0;         // of the uses, in an iteration
    const PSN* psn = nullptr;
    bool is_certain = false; // it is computed whenever the loop is reached
};

bool is_free(int op) { return op == SCONV || op == PCONV || op == COMMA; }

int cost_of(const NODE* t) {
    int cost = 0;
    for_each_subtree(t, [&](const NODE* n) { cost += number_of_operands[n->op] != 0 && !is_free(n->op); });
    return cost;
}

class INVARIANTS {
public:
    INVARIANTS(NATURAL_LOOPS& all, NATURAL_LOOP* of) : loops(all), loop(of) {}

    void run() {
        if (!loop->is_reducible || !learn_what_is_written()) return;
        for (BBLK* bb : loop->blocks) {
            weight = loops.dominates_latches(bb, loop) ? 1 : 0.5;
            for (const NATURAL_LOOP* l = loops.around(bb); l && l != loop; l = l->parent) weight *= ITERATIONS;
            is_certain = bb == loop->header;
            for (LIST* s = bb->statements; s; s = s->rest) {
                psn = s->psn;
                statement(s->first);
            }
        }
        if (found.empty()) return;
        std::stable_sort(found.begin(), found.end(),
                         [](const CANDIDATE& a, const CANDIDATE& b) { return a.gain > b.gain; });
        hoist();
    }

private:
    // False for a loop that is better left alone.
    bool learn_what_is_written() {
        for (const BBLK* bb : loop->blocks) {
            if (bb->is_in_LIR_form()) return false;
            for (const LIST* s = bb->statements; s; s = s->rest) {
                if (s->first->op == ASM || tree_is_EH_SWITCH(s->first)) return false;
                for_each_written_name(s->first, [this](const NODE* name, const NODE*) { written.insert(name->u.sym); });
                for_each_node(s->first, [this](const NODE* n) {
                    if (n->op == NAME && n->u.sym && n->type->is_pointer() && n->u.sym->level > 0)
                        pointers.insert(n->u.sym);
                });
            }
        }
        return true;
    }

    // ---- What stays

    bool is_unchanged(const NODE* name) {
        const SYMTAB* sym = name->u.sym;
        if (written.count(sym)) return false;
        if (is_private_scalar(sym)) return true;
        if (auto it = unchanged.find(sym); it != unchanged.end()) return it->second;
        const bool stays = !lvalue_is_volatile(name) && questions++ < MOST_QUESTIONS &&
                           std::none_of(loop->blocks.begin(), loop->blocks.end(),
                                        [&](BBLK* bb) { return bb_modifies_lvalue_in_tree(bb, name); });
        return unchanged[sym] = stays;
    }

    bool stays(const NODE* t) {
        if (t->op == UAND) return pointer_is_an_adcon(t);
        if (!is_plain_number(t->type)) return false;
        switch (t->op) {
        case ICON:
        case FCON: return true;
        case NAME: return t->u.sym && is_unchanged(t);
        case SLL:
        case SRL: return t->right->op == ICON && stays(t->left);
        case PLUS:
        case MINUS:
        case MULT:
        case ANDB:
        case ORB:
        case XORB:
        case PMCONV: return stays(t->left) && stays(t->right);
        case UMINUS:
        case NOTB:
        case SCONV:
        case PCONV: return is_plain_number(t->left->type) && stays(t->left);
        default: return false;
        }
    }

    // ---- What is computed

    void statement(NODE* t) {
        if (t->op == PPRAGMA || t->op == ASM || tree_is_arg_prolog(t)) return;
        if (t->op == ASG && t->left->op == NAME && enter_address(&t->right)) return;
        visit(&t->left);
        if (t->op != IF && t->op != SWITCH) visit(&t->right);
    }

    void visit(NODE** place) {
        NODE* t = *place;
        if (!t || number_of_operands[t->op] == 0 || t->op == UAND || t->op == ARGREF) return;
        if (t->type->is_pointer() && pointer_is_an_adcon(t)) return;
        if (enter(place)) return;
        const bool was_certain = is_certain;
        if (t->type->is_pointer() && (t->op == PLUS || t->op == MINUS)) {
            enter_address(&t->left);
            enter_address(&t->right);
        }
        visit(&t->left);
        is_certain &= t->op != QUEST && t->op != ANDAND && t->op != OROR;
        visit(&t->right);
        is_certain = was_certain;
    }

    // The address of an object that something is added to, or that a pointer of a loop within starts from.
    bool enter_address(NODE** place) {
        while ((*place)->op == PCONV) place = &(*place)->left;
        return (*place)->op == UAND && stays(*place) && add(place);
    }

    bool enter(NODE** place) {
        NODE* t = *place;
        if (is_free(t->op) || !is_plain_number(t->type) || !stays(t)) return false;
        if (t->type->is_pointer() && t->right->op == ICON) return false;
        if (count_nodes_in_tree(t) > MOST_NODES) return false;
        return add(place);
    }

    bool add(NODE** place) {
        NODE* t = *place;
        CANDIDATE* c = nullptr;
        for (CANDIDATE& other : found)
            if (equiv_mtypes((*other.uses.front())->type, t->type) &&
                trees_are_congruent(*other.uses.front(), t, false))
                c = &other;
        if (!c) {
            if (found.size() == MOST_CANDIDATES) return false;
            c = &found.emplace_back();
            c->cost = cost_of(t);
            c->psn = psn;
        }
        c->uses.push_back(place);
        c->gain += weight * c->cost;
        c->is_certain |= is_certain;
        return true;
    }

    // ---- The move

    void hoist() {
        size_t values = 0;
        BBLK* ahead = nullptr;
        for (CANDIDATE& c : found) {
            const bool is_pointer = (*c.uses.front())->type->is_pointer();
            if (c.gain * ITERATIONS <= c.cost + 1 || values == MOST_VALUES) continue;
            if (is_pointer && pointers.size() >= MOST_POINTERS) continue;
            if (!ahead && !(ahead = loops.preheader(loop))) return;
            ++values;
            const SYMTAB* variable = hoist(c, ahead);
            if (is_pointer) pointers.insert(variable);
        }
    }

    const SYMTAB* hoist(CANDIDATE& c, BBLK* ahead) {
        NODE* value = *c.uses.front();
        TYPE* type = value->type->stqs();
        if (remarks_are_wanted && value->op != UAND)
            remark("hoist", c.psn, REMARK::DONE, "'" + reference_text(value) + "' is computed ahead of the loop");
        SYMTAB* variable = sym_temp(type->is_pointer() ? 'P' : 'N', -1, type, nullptr);
        if (type->is_pointer()) {
            SYMTAB* object = value->op == UAND ? pointee_name_if_known(value) : nullptr;
            if (object)
                currfuninfo->spmap->set_mapping(variable, object, INT65(0), size_in_units(object), false);
            else
                currfuninfo->spmap->set_bottom(variable);
        }
        for (NODE** use : c.uses) {
            NODE* old = *use;
            *use = coerce_to_type(old->type, mk_NAME(variable, old->ls));
            if (old != value) erase_tree(old);
        }
        if (!c.is_certain)
            value = rewrite_tree(value,
                                 [](NODE* t) { return is_exact_by_rule(t->op, t->type) ? kept_exact(t, nullptr) : t; });
        insert_at_end_of_body(ahead, mk_ASG(mk_NAME(variable), coerce_to_type(type, value)));
        return variable;
    }

    NATURAL_LOOPS& loops;
    NATURAL_LOOP* loop;
    std::unordered_set<const SYMTAB*> written, pointers; // looked up only
    std::unordered_map<const SYMTAB*, bool> unchanged;   // other variables that were asked about
    std::vector<CANDIDATE> found;
    int questions = 0;
    double weight = 1;
    const PSN* psn = nullptr; // of the statement that is looked at
    bool is_certain = false;
};

} // namespace

void hoist_invariants(NATURAL_LOOPS& loops) {
    const auto& all = loops.inner_first();
    for (auto loop = all.rbegin(); loop != all.rend(); ++loop)
        if ((*loop)->inside < DEEPEST) INVARIANTS(loops, loop->get()).run();
}
