// Masks that clear no bit, since no assignment of a variable sets one there.
//
//     at = (at + 1) & 15;  ...  s += x[at & 31];       x[at]
//     flags = (flags ^ at) & 15;                       flags ^ at, if all others keep flags below 16
//
// Needs: alias marks where there is a mask. Leaves: what rests on the graph.
// Sound because a variable that only its name reaches holds what its assignments give it. A set of bits for each variable
// is found such that every assignment stays within the target's set as long as the variables that it reads are within
// theirs; the first value outside would have come of others. The sets start empty and grow with what is assigned, so that
// a mask that only variables make necessary falls; one that grows too long may have any bit.
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/simp.h"

#include <unordered_map>
#include <vector>

namespace {

constexpr int MOST_PASSES = 4; // until what still grows may have any bit

uint64_t mask_of(const TYPE* t) { return t->size >= 64 ? ~uint64_t(0) : (uint64_t(1) << t->size) - 1; }

bool is_candidate(const SYMTAB* sym) {
    return sym && sym->type->is_int() && !sym->type->is_bool() && !sym->type->is_wchar() && sym->is_automatic() &&
           only_its_name_reaches(sym);
}

// Judged once, when it is made; as long as it lives the simplifier knows of it.
class VARIABLE_BITS {
public:
    VARIABLE_BITS();
    ~VARIABLE_BITS();
    VARIABLE_BITS(const VARIABLE_BITS&) = delete;
    VARIABLE_BITS& operator=(const VARIABLE_BITS&) = delete;

private:
    struct DEFINITION {
        const SYMTAB* sym;
        const NODE* value; // null: anything
    };
    bool collect();
    const NODE* value_of(const NODE* assignment);
    bool narrow_once(bool is_last);

    std::unordered_map<const SYMTAB*, uint64_t> zeros; // looked up; the candidates, before more is known of them
    std::vector<DEFINITION> definitions;
    std::vector<NODE*> made; // values of compound assignments
};

VARIABLE_BITS::VARIABLE_BITS() {
    if (!collect()) {
        zeros.clear();
        return;
    }
    zeros_of_variables = &zeros;
    for (int pass = 0; narrow_once(pass >= MOST_PASSES); ++pass)
        if (pass == 3 * MOST_PASSES) {
            zeros.clear();
            return;
        }
}

VARIABLE_BITS::~VARIABLE_BITS() {
    zeros_of_variables = nullptr;
    for (NODE* t : made) erase_tree(t);
}

// False where what assigns is not understood.
bool VARIABLE_BITS::collect() {
    bool is_understood = true;
    for_each_tree(currfuninfo, [&](const NODE* tree) {
        is_understood &= tree->op != ASM;
        for_each_written_name(tree, [&](const NODE* name, const NODE* by) {
            const SYMTAB* sym = name->u.sym;
            if (!is_candidate(sym)) return;
            zeros[sym] = mask_of(sym->type);
            const bool is_plain = name == by->left && name->type->size == sym->type->size && !tree_is_arg_prolog(tree);
            definitions.push_back({sym, is_plain ? value_of(by) : nullptr});
        });
    });
    return is_understood && !definitions.empty();
}

const NODE* VARIABLE_BITS::value_of(const NODE* t) {
    if (t->op == ASG) return t->right;
    const int op = op_of_opASG[t->op];
    if (op == ILLOP || !compound_ASG_computes_in(t->left->type->stqs(), op, t->left, t->right)) return nullptr;
    return made.emplace_back(maketree(op, copy_tree(t->left), copy_tree(t->right), t->left->type->stqs()));
}

// Whether a set grew.
bool VARIABLE_BITS::narrow_once(bool is_last) {
    bool any = false;
    for (const DEFINITION& d : definitions) {
        uint64_t& known = zeros[d.sym];
        if (!known) continue;
        const uint64_t stays = known & (d.value ? known_zeros_as(d.value, d.sym->type) : 0);
        if (stays == known) continue;
        known = is_last ? 0 : stays;
        any = true;
    }
    return any;
}

// A mask is what bits are known by, and what knowing them removes.
bool has_mask(const NODE* t) {
    return any_subtree(t, [](const NODE* n) { return (n->op == ANDB || n->op == ANDBASG) && n->right->op == ICON; });
}

} // namespace

void drop_needless_masks() {
    std::vector<LIST*> masked;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (bb->is_in_LIR_form()) return;
        for (LIST* s = bb->statements; s; s = s->rest)
            if (has_mask(s->first)) masked.push_back(s);
    }
    if (masked.empty()) return;
    need(fact::alias_marks);
    const VARIABLE_BITS bits;
    for (LIST* s : masked) s->first = simp_tree(s->first, nullptr);
    changed(fact::graph);
}
