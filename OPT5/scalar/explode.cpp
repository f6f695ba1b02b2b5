// A local structure whose members are all used by name becomes a set of variables, which can live in registers and are
// seen by every pass that follows values.
//
// Copies of a whole structure are taken member by member. A structure that only passes through whole stays, for one
// copy is cheaper.
//
// Needs: alias marks and pointees. Leaves: what rests on the graph; symbols are split anew.
// Sound because each mention of the structure in the function is the access of one scalar member in that member's own
// type, or one side of a statement that copies a whole structure: there is no address of it then, no call gets it, and
// no union or bit-field overlays its members. The other side of a copy must be a place that stays where it is while the
// members are copied: `s = *s.next` would move with the first of them.
#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/scalar/structure_copy.h"
#include "OPT5/simp/simp.h"

#include <unordered_map>
#include <vector>

namespace {

// More members than this are not worth a register each; a copy of more is cheaper in one piece.
constexpr std::size_t MOST_MEMBERS = 16, MOST_COPIED_MEMBERS = 4;

struct PART {
    int64_t offset; // bits from the start of the structure
    TYPE* type;
    SYMTAB* variable = nullptr;
};

bool is_plain_structure(const TYPE* type) {
    if (!type->is_csu() || type->is_union() || !type->is_complete() || type->is_struct_vector()) return false;
    const CSU_EXTRAS* extras = type->real->csu_extras();
    return !extras || extras->base_classes.items.empty();
}

// The scalars that a structure consists of, also those of structures in it; false if it holds anything else.
bool list_parts(TYPE* type, int64_t offset, std::vector<PART>* parts) {
    if (!is_plain_structure(type)) return false;
    for (const fkMDATA* m = type->real->mdata(); m; m = m->next) {
        if (m->is_bitfld || m->type->is_volatile()) return false;
        if (m->type->is_csu()) {
            if (!list_parts(m->type, offset + m->offset, parts)) return false;
        } else if (m->type->is_scalar() && !m->type->is_complex())
            parts->push_back({offset + m->offset, normalized_value_type(m->type)->stqs()});
        else
            return false;
        if (parts->size() > MOST_MEMBERS) return false;
    }
    return !parts->empty();
}

struct CANDIDATE {
    SYMTAB* sym;
    std::vector<PART> parts;
    int accesses = 0, copies = 0;
    bool is_exploded = true;

    PART* part_at(int64_t offset, TYPE* type) {
        for (PART& part : parts)
            if (part.offset == offset && part.type->size == type->size &&
                compatible_types(part.type, type->stqs(), true))
                return &part;
        return nullptr;
    }
};

class EXPLOSION {
public:
    void run() {
        list_candidates();
        if (candidates.empty()) return;
        need(fact::alias_marks | fact::pointees);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) scan_statement(s->first);
        if (!make_variables()) return;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST** link = &bb->statements; *link;) link = rewrite_statement(link);
        sym_split(currfuninfo);
        changed(fact::graph);
    }

private:
    void list_candidates() {
        for (SYMTAB* sym = currfuninfo->memory_syms; sym; sym = sym->next) {
            CANDIDATE c{sym, {}};
            if (sym->level != 2 || sym->sclass != SC_AUTO || sym->type->is_volatile() || sym_appears_in_EHT(sym) ||
                sym == currfuninfo->csu_return_sym || sym == currfuninfo->ret_by_cctor_sym ||
                !list_parts(sym->type, 0, &c.parts))
                continue;
            index_of[sym] = candidates.size();
            candidates.push_back(std::move(c));
        }
    }

    // The candidate that an access chain lies in, and the offset in it; null for another tree.
    CANDIDATE* candidate_of(const NODE* t, int64_t* offset = nullptr) {
        int64_t sum = 0;
        t = without_members(t, &sum);
        if (t->op != NAME) return nullptr;
        auto found = index_of.find(t->u.sym);
        if (found == index_of.end()) return nullptr;
        if (offset) *offset = sum;
        return &candidates[found->second];
    }

    PART* part_of(const NODE* t) {
        int64_t offset;
        CANDIDATE* c = t->op == STDOT ? candidate_of(t, &offset) : nullptr;
        return c && c->is_exploded ? c->part_at(offset, t->type) : nullptr;
    }

    // ---- Which are exploded

    void scan_statement(const NODE* t) {
        if (t->op != STASG || tree_is_arg_prolog(t) || !(candidate_of(t->left) || candidate_of(t->right))) {
            scan(t);
            return;
        }
        const bool is_copy = is_plain_structure(t->left->type) && t->left->type->real == t->right->type->real;
        if (!is_copy || !is_steady_place(t->left) || !is_steady_place(t->right)) {
            scan(t);
            return;
        }
        for (const NODE* side : {t->left, t->right})
            if (CANDIDATE* c = candidate_of(side))
                ++c->copies;
            else
                scan(side);
    }

    void scan(const NODE* t) {
        for (; t; t = t->left) {
            if (CANDIDATE* c = candidate_of(t)) {
                if (part_of(t) && !lvalue_is_volatile(t))
                    ++c->accesses;
                else
                    c->is_exploded = false;
                return;
            }
            if (t->op == UAND || t->op == ARGREF)
                if (CANDIDATE* c = candidate_of(t->left)) c->is_exploded = false;
            scan(t->right);
        }
    }

    bool make_variables() {
        bool any = false;
        for (CANDIDATE& c : candidates) {
            c.is_exploded &= c.accesses > 0 && (c.copies == 0 || c.parts.size() <= MOST_COPIED_MEMBERS);
            if (!c.is_exploded) continue;
            any = true;
            std::string names;
            for (PART& part : c.parts) {
                part.variable = sym_temp('T', -1, part.type, c.sym->scope);
                part.variable->psn = c.sym->psn;
                names += (names.empty() ? "" : ", ") + std::string(part.variable->name);
            }
            if (print_debug) debug_printf("Exploding %s\tinto %s.\n", c.sym->name, names.c_str());
        }
        return any;
    }

    // ---- The rewriting

    NODE* rewrite(NODE* t, bool* changed) {
        if (!t) return nullptr;
        if (PART* part = part_of(t)) {
            NODE* variable = mk_NAME(part->variable, t->ls);
            erase_tree(t);
            *changed = true;
            return variable;
        }
        t->left = rewrite(t->left, changed);
        t->right = rewrite(t->right, changed);
        return t;
    }

    bool is_copy_of_candidate(const NODE* t) {
        if (t->op != STASG) return false;
        const CANDIDATE *to = candidate_of(t->left), *from = candidate_of(t->right);
        return (to && to->is_exploded) || (from && from->is_exploded);
    }

    NODE* rewritten(NODE* t) {
        bool changed = false;
        t = rewrite(t, &changed);
        return changed ? simp_tree(t, nullptr) : t;
    }

    // The link behind what stands for the statement.
    LIST** rewrite_statement(LIST** link) {
        LIST* s = *link;
        if (!is_copy_of_candidate(s->first)) {
            s->first = rewritten(s->first);
            return &s->rest;
        }
        std::vector<NODE*> copies;
        copy_by_members(s->first->left, s->first->right, &copies);
        erase_tree(s->first);
        LIST* last = s;
        for (std::size_t i = 0; i < copies.size(); ++i) {
            NODE* copy = rewritten(copies[i]);
            if (i == 0)
                s->first = copy;
            else
                last = insert_behind(last, copy, s->psn);
        }
        return &last->rest;
    }

    std::vector<CANDIDATE> candidates;
    std::unordered_map<const SYMTAB*, std::size_t> index_of; // looked up, never walked
};

} // namespace

void explode_auto_struct_vars() {
    if (currfuninfo->bb_list) EXPLOSION().run();
}
