// Under `debug:PT_checks` the program itself checks what is known of its accesses: ahead of each statement an assertion
// says that the address of an access lies at one of its targets, or else in none of the objects that it cannot reach.
// A run of the executor with --check ends where one does not hold.
#include "OPT5/alias/points_to_checks.h"

#include "OPT5/alias/bindings.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

namespace {

register_option pass_debug_PT_checks("debug:PT_checks");

constexpr size_t MOST_OBJECTS = 20; // in one check
constexpr uint64_t BITS_PER_UNIT = 16;

NODE* number(int64_t v) { return mk_ICON(INT65(v), tp->ulong_t); }
NODE* truth(int op, NODE* a, NODE* b) { return maketree(op, a, b, tp->int_t); }
NODE* combined(int op, NODE* a, NODE* b) { return a ? truth(op, a, b) : b; }

// The address less that of an object, in units, as an unsigned number.
NODE* distance(const NODE* pointer, SYMTAB* base) {
    NODE* start = maketree(UAND, mk_NAME(base), nullptr, tp->mk_ptr(base->type));
    return maketree(MINUS, coerce_to_type(tp->ulong_t, copy_tree(pointer)), coerce_to_type(tp->ulong_t, start), tp->ulong_t);
}
NODE* lies_in(const NODE* pointer, SYMTAB* base) {
    return truth(ULT, distance(pointer, base), number(static_cast<int64_t>(base->size / BITS_PER_UNIT)));
}

NODE* lies_at(const NODE* pointer, const PTVAR& t) {
    if (t.stride == 0) return truth(EQ, distance(pointer, t.base), number(t.offset));
    NODE* inside = lies_in(pointer, t.base);
    if (t.stride == 1) return inside;
    NODE* rest = maketree(MOD, distance(pointer, t.base), number(t.stride), tp->ulong_t);
    return truth(ANDAND, inside, truth(EQ, rest, number(t.offset)));
}

// What pointers reach in the current function, by name.
class CHECKS {
public:
    CHECKS() {
        for (SYMTAB* list : {currfuninfo->memory_syms, currfuninfo->scalar_syms, currfuninfo->pending_syms, global_symbols})
            for (SYMTAB* s = list; s; s = s->next)
                if (s->is_aliased() && !s->is_function() && s->size && s->sclass != SC_EXTERN) objects.push_back(s);
    }
    NODE* condition(const NODE* pointer, const PTENV& e) const;

private:
    std::vector<SYMTAB*> objects;
};

NODE* CHECKS::condition(const NODE* pointer, const PTENV& e) const {
    NODE* c = nullptr;
    if (!(e.categories & ~PT_NULL)) {
        for (const PTVAR& t : e.targets) c = combined(OROR, c, lies_at(pointer, t));
        return c;
    }
    size_t count = 0;
    for (SYMTAB* object : objects) {
        if (class_category(object) & e.categories || ++count > MOST_OBJECTS) continue;
        NODE* outside = truth(EXCLAIM, lies_in(pointer, object), nullptr);
        for (const PTVAR& t : e.targets)
            if (t.base == object) outside = truth(OROR, outside, lies_at(pointer, t));
        c = combined(ANDAND, c, outside);
    }
    return c;
}

// The accesses that evaluating `t` makes in any case.
void find_accesses(const NODE* t, std::vector<const NODE*>& accesses) {
    if (!t) return;
    if (t->op == UAND || t->op == ARGREF) {
        t = without_members(static_cast<const NODE*>(t->left));
        return t->op == UMULT || t->op == STREF ? find_accesses(t->left, accesses) : void();
    }
    if ((t->op == UMULT || t->op == STREF) && PT_info_of(t)) accesses.push_back(t);
    find_accesses(t->left, accesses);
    if (t->op != ANDAND && t->op != OROR && t->op != QUEST && t->op != STREF && t->op != STDOT) find_accesses(t->right, accesses);
}

} // namespace

void insert_PT_checks() {
    if (!pass_debug_PT_checks || !PT_store()) return;
    const CHECKS checks;
    bool is_changed = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link; link = &(*link)->rest) {
            std::vector<const NODE*> accesses;
            if ((*link)->first->op != NASSERT && (*link)->first->op != ASSERT) find_accesses((*link)->first, accesses);
            for (const NODE* t : accesses) {
                if (tree_has_side_effects(t->left)) continue;
                NODE* c = checks.condition(t->left, *PT_info_of(t));
                if (!c) continue;
                link = &(*insert_before(link, maketree(NASSERT, c, nullptr, tp->int_t), (*link)->psn));
                is_changed = true;
            }
        }
    if (is_changed) changed(~fact::alias_marks); // the checks take addresses
}
