// Signs of variables by their definitions.
//
// Needs: alias marks. Leaves: every fact: it only looks.
// Sound because a signed variable that only its name reaches holds what its assignments give it. If each gives a value
// that is not negative as long as the variables in it are not, no variable ever is: the first negative one would have
// come of others. The sums and products of signed numbers are those of the numbers themselves (OPT5/simp/exact.h); with
// sums that wrap, `i = i + 1` would prove nothing.
#include "OPT5/scalar/known_signs.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>

namespace {

constexpr int MOST_PASSES = 8, MOST_LEVELS = 16;

bool is_signed_integer(const TYPE* t) { return t->is_int() && t->is_signed() && !t->is_bool(); }

bool may_have_sign_known(const SYMTAB* sym) {
    return sym && is_signed_integer(sym->type) && sym->is_automatic() && only_its_name_reaches(sym);
}

} // namespace

KNOWN_SIGNS::KNOWN_SIGNS() {
    std::vector<DEFINITION> definitions;
    for_each_tree(currfuninfo, [&](const NODE* tree) {
        for_each_written_name(tree, [&](const NODE* name, const NODE* by) {
            if (!may_have_sign_known(name->u.sym)) return;
            definitions.push_back({name == by->left ? by : nullptr, name->u.sym});
            nonnegative.insert(name->u.sym);
        });
    });
    bool again = true;
    for (int pass = 0; again && pass < MOST_PASSES; ++pass) {
        again = false;
        for (const DEFINITION& d : definitions)
            if (nonnegative.count(d.sym) && !(d.assignment && keeps_nonnegative(d.assignment)))
                again |= nonnegative.erase(d.sym) != 0;
    }
    if (again) nonnegative.clear(); // not all consequences are drawn
}

bool KNOWN_SIGNS::keeps_nonnegative(const NODE* t) const {
    switch (t->op) {
    case ASG:
    case PLUSPLUS:
    case PLUSASG:
    case MULTASG:
    case DIVASG:
    case ORBASG: return t->right->type->size <= t->left->type->size && is_nonnegative(t->right);
    case SRLASG:
    case MODASG:
    case ANDBASG: return true; // as the variable was
    default: return false;
    }
}

bool KNOWN_SIGNS::is_nonnegative(const NODE* tree) const {
    int levels = MOST_LEVELS;
    auto judge = [&](auto&& self, const NODE* t) -> bool {
        if (--levels < 0 || !is_signed_integer(t->type)) return false;
        auto both = [&] { return self(self, t->left) && self(self, t->right); };
        switch (t->op) {
        case NAME: return nonnegative.count(t->u.sym) != 0;
        case ICON: return !t->u.lval.is_negative();
        case PLUS:
        case MULT:
        case DIV:
        case ORB:
        case XORB:
        case COLON: return both();
        case ANDB: return self(self, t->left) || self(self, t->right);
        case MOD:
        case SRL: return self(self, t->left);
        case QUEST: return self(self, t->right);
        case SCONV:
            if (t->left->type->size <= t->type->size && is_signed_integer(t->left->type)) return self(self, t->left);
            break;
        default: break;
        }
        INT65 low, high;
        return calculate_bounds(t, nullptr, &low, &high) && !low.is_negative();
    };
    return judge(judge, tree);
}
