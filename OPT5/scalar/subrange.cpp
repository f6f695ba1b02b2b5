// Stores that nothing reads: of a part that a later store covers first, and into objects of the frame that are not read
// any more.
//
// Within a block a walk from the last statement to the first keeps the stores that wait for an earlier one to the same
// address; a bounded number of them keeps long blocks linear. Structures and arrays of the frame that only their own
// name can reach have a life like that of a variable, which spans blocks: a backward analysis with a bit for each. A
// store to any part of one that is dead behind it is removed.
//
// Needs: alias marks, pointees, pointer groups. Leaves: what rests on the graph.
// Sound because nothing in between may read what the second store writes. What an access may meet is left to the alias
// rules, and since they judge by types too, the first store must be one that a read of the second's type could not
// miss: of `*f = 1.0; x = *f; *i = 2` at one address the read of a float is not held against the store of an integer,
// and the first store must stay.

#include "OPT5/scalar/subrange.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dataflow.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <memory>
#include <unordered_map>
#include <vector>

// ---- Places

namespace {

constexpr int MOST_NODES = 48; // of an lvalue that facts are kept on

bool have_same_base(const ADDRESS_FORM& a, const ADDRESS_FORM& b) {
    return a.object == b.object && a.has_same_terms(b);
}

} // namespace

const NODE* get_first_non_stdot_node_down_the_left_side_of_tree(const NODE* t) {
    return t ? without_members(t) : nullptr;
}

bool is_plain_assignment(const NODE* t) { return t->op == ASG || t->op == STASG || t->op == ARASG; }

bool is_operator_assignment(const NODE* t) {
    return t->op == PLUSPLUS || t->op == MINMIN || op_of_opASG[t->op] != ILLOP;
}

bool compute_subrange(const NODE* lvalue, SUBRANGE* s) {
    const NODE* object = get_first_non_stdot_node_down_the_left_side_of_tree(lvalue);
    if (object->op != NAME && object->op != UMULT && object->op != STREF) return false;
    if (tree_has_side_effects(lvalue)) return false; // a volatile access is one
    if (count_nodes_in_tree(lvalue) > MOST_NODES) return false;
    *s = {lvalue, address_form(lvalue)};
    return s->place.width > INT65(0);
}

bool covers(const SUBRANGE& later, const SUBRANGE& s) {
    const ADDRESS_FORM &l = later.place, &e = s.place;
    const INT65 from(e.constant), first(l.constant);
    if (from < first || from + e.width > first + l.width || !have_same_base(l, e)) return false;
    if (l.object && l.is_constant()) return true;
    TYPE *whole = later.lvalue->type, *part = s.lvalue->type;
    return equiv_mtypes(whole, part) || (whole->is_csu() && is_type_component_of_type(part, whole));
}

bool address_is_changed_by(const NODE* t, const SUBRANGE& s) {
    return std::any_of(s.place.begin(), s.place.end(),
                       [t](const LINEAR_FORM::TERM& x) { return tree_modifies_lvalue_in_tree(t, x.tree); });
}

namespace {

// ---- The lives of objects

// The NAME of the object that an lvalue is part of, where the tree shows it.
const NODE* object_of(const NODE* t) {
    bool is_pointer = false; // `t` is an address, not a place
    for (;;) switch (t->op) {
        case NAME: return is_pointer ? nullptr : t;
        case STDOT:
        case UAND:
            if (is_pointer != (t->op == UAND)) return nullptr;
            is_pointer = false;
            t = t->left;
            break;
        case STREF:
        case UMULT:
            if (is_pointer) return nullptr;
            is_pointer = true;
            t = t->left;
            break;
        case PCONV:
        case ISP2CHAR:
        case OUIALIGN:
        case NONALIGN:
        case IDENTITY: t = t->left; break;
        case PLUS:
        case MINUS: t = t->left->type->is_pointer() ? t->left : t->right; break;
        default: return nullptr;
        }
}

// `completes`: nothing leaves the statement in its middle, as an exception may in front of its dispatch.
template <class F>
void for_each_statement_backward(BBLK* bb, const F& visit) {
    std::vector<LIST*> cells;
    for (LIST* s = bb->statements; s; s = s->rest) cells.push_back(s);
    bool completes = true;
    for (auto it = cells.rbegin(); it != cells.rend(); ++it) {
        const bool is_dispatch = tree_is_EH_SWITCH((*it)->first);
        visit((*it)->first, completes);
        completes = !is_dispatch;
    }
}

class OBJECT_LIVES {
public:
    OBJECT_LIVES() {
        const FUNINFO* f = currfuninfo;
        for (SYMTAB* list : {f->new_syms, f->pending_syms, f->memory_syms, f->scalar_syms})
            for (SYMTAB* sym = list; sym; sym = sym->next)
                if (is_candidate(sym)) bit_of.emplace(sym, static_cast<uint32_t>(bit_of.size()));
        if (!bit_of.empty()) find_lives();
    }

    bool empty() const { return bit_of.empty(); }

    // What is live behind the block.
    BITVEC at_exit(const BBLK* bb) const { return empty() ? BITVEC(0) : lives->at_exit(bb); }

    bool is_dead_target(const NODE* lvalue, const BITVEC& live) const {
        const int bit = bit_of_target(lvalue);
        return bit >= 0 && !live.test(static_cast<uint32_t>(bit)) && !tree_has_side_effects(lvalue);
    }

    // From behind a statement to in front of it.
    void pass(NODE* t, BITVEC& live, bool completes) const {
        const NODE* target = nullptr;
        if (is_plain_assignment(t) && bit_of_target(t->left) >= 0) {
            target = object_of(t->left);
            if (target == t->left && completes) live.clear(bit_of.at(target->u.sym));
        }
        for_each_node(t, [&](const NODE* n) {
            if (n->op != NAME || n == target) return;
            if (auto it = bit_of.find(n->u.sym); it != bit_of.end()) live.set(it->second);
        });
    }

private:
    static bool is_candidate(const SYMTAB* sym) {
        const FUNINFO* f = currfuninfo;
        if (!sym->type->is_csu() && !sym->type->is_array()) return false;
        if (sym->lives_in_others || sym->hosts_others || sym == f->csu_return_sym || sym == f->ret_by_cctor_sym)
            return false;
        return sym->is_automatic() && only_its_name_reaches(sym);
    }

    int bit_of_target(const NODE* lvalue) const {
        const NODE* object = object_of(lvalue);
        auto it = object ? bit_of.find(object->u.sym) : bit_of.end();
        return it != bit_of.end() ? static_cast<int>(it->second) : -1;
    }

    // In front of a block lives what it reads, and of what lives behind it that which would also reach its start. The two
    // are found once for each block, from nothing and from everything.
    void find_lives() {
        const auto bits = static_cast<uint32_t>(bit_of.size());
        SIDE_TABLE<BITVEC> read{BITVEC(bits)}, passed{BITVEC(bits)};
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            passed[bb].set_all();
            for_each_statement_backward(bb, [&](NODE*& t, bool completes) {
                pass(t, read[bb], completes);
                pass(t, passed[bb], completes);
            });
        }
        lives = std::make_unique<DATAFLOW>(FLOW::BACKWARD, MEET::UNION, BITVEC(bits), [&](const BBLK* bb, BITVEC& live) {
            live &= passed[bb];
            live |= read[bb];
        });
    }

    std::unordered_map<const SYMTAB*, uint32_t> bit_of; // looked up, never walked
    std::unique_ptr<DATAFLOW> lives;
};

// ---- Dead stores

class DEAD_STORES {
public:
    void run(BBLK* bb) {
        live = objects.at_exit(bb);
        bool dropped = false;
        for_each_statement_backward(bb, [&](NODE*& t, bool completes) {
            statement(t, completes);
            dropped |= !t;
        });
        overwritten.clear();
        if (dropped) drop_empty_cells(&bb->statements);
    }
    bool removed_any() const { return removed != 0; }

private:
    static constexpr size_t MOST_COVERS = 32;

    void statement(NODE*& t, bool completes) {
        const bool assigns = is_plain_assignment(t) || is_operator_assignment(t);
        SUBRANGE target;
        const bool is_known = assigns && !tree_is_arg_prolog(t) && compute_subrange(t->left, &target);
        const bool is_dead = assigns && (objects.is_dead_target(t->left, live) || (is_known && is_covered(target)));
        const bool is_cover = !is_dead && is_known && completes && is_plain_assignment(t);
        if (is_dead) remove(t);
        if (!t) return;
        if (!objects.empty()) objects.pass(t, live, completes);
        if (is_cover) {
            if (overwritten.size() == MOST_COVERS) overwritten.erase(overwritten.begin());
            overwritten.push_back(target);
        }
        // What the store itself takes counts as read in front of it.
        kill_aliased_subranges(t, is_cover);
    }

    bool is_covered(const SUBRANGE& s) const {
        return std::any_of(overwritten.begin(), overwritten.end(), [&s](const SUBRANGE& o) { return covers(o, s); });
    }

    // The effects of what would have been stored stay.
    void remove(NODE*& t) {
        ++removed;
        const bool has_effect = t->right && tree_has_side_effects(t->right);
        if (print_debug)
            debug_printf(is_plain_assignment(t) ? "\n(%ld) DEAD ASSIGNMENT (edsa_ASG):  %s, Effect? %d\n"
                                                : "\n(%ld) DEAD ASSIGNMENT (edsa_opASG) : %s, Effect? %d\n",
                         removed, stmt2infix(t).c_str(), has_effect);
        NODE* effect = t->right;
        t->right = nullptr;
        erase_tree(t);
        t = effect ? peel_for_effect(effect) : nullptr;
    }

    // What the statement may read, and places that it moves, are not known to be overwritten first any more. The place
    // that a plain assignment writes is no read.
    void kill_aliased_subranges(const NODE* t, bool is_plain_store) {
        const NODE* place = is_plain_store ? get_first_non_stdot_node_down_the_left_side_of_tree(t->left) : nullptr;
        auto ends = [&](const SUBRANGE& s) {
            if (address_is_changed_by(t, s)) return true;
            if (!place) return tree_touches_lvalue(t, s.lvalue);
            if (tree_touches_lvalue(t->right, s.lvalue)) return true;
            if (place->op == NAME) return false;
            return tree_touches_lvalue(place->left, s.lvalue) ||
                   (place->op == UMULT && place->right && tree_touches_lvalue(place->right, s.lvalue));
        };
        overwritten.erase(std::remove_if(overwritten.begin(), overwritten.end(), ends), overwritten.end());
    }

    const OBJECT_LIVES objects;
    BITVEC live;
    std::vector<SUBRANGE> overwritten; // later in the block, and not read up to there
    long removed = 0;
};

} // namespace

void elim_dead_subrange_assigns() {
    if (!currfuninfo || !currfuninfo->bb_list) return;
    need(fact::alias);
    DEAD_STORES stores;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) stores.run(bb);
    if (stores.removed_any()) changed(fact::graph);
}
