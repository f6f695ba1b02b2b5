// Which variables a run of value sets tracks: those on whose values something that is asked depends.
//
// Asked are conditions, the operators that the simplifier does more with where it knows bounds, assertions, what is assigned
// a constant, and in loops addresses. What a variable is asked for, the names in each tree that is assigned to it are asked for too. All else stays
// without a binding, as a variable that may have any value.
#include "OPT5/vp/vp.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symbol_table.h"
#include "OPT5/ir/symtab.h"

#include <algorithm>

namespace {

bool is_tracked_global(const SYMTAB* sym) {
    // In normal form its name stands under an address.
    return !trees_are_normalized && sym->level == 0 && (sym->sclass == SC_STATIC || sym->sclass == SC_EXTDEF || sym->sclass == SC_EXTERN) &&
           sym != errno_symbol && !sym->is_function() && !(sym->cqual & CQ_GLOBAL_REGISTER) && !sym->is_clustered &&
           !sym->type->is_volatile() && !volit_vars && !may_be_reached_by_pointers(sym);
}

bool may_be_tracked(const SYMTAB* sym) {
    if (!has_vpset(sym->type)) return false;
    return sym->is_automatic() ? only_its_name_reaches(sym) : is_tracked_global(sym);
}

// What narrows the sets of the names in it: of one by what is known of another.
bool is_condition(int op) { return op == IF || op == SWITCH || op == ASSERT || op == NASSERT || boolean_result[op]; }

// What is rewritten by the values of its operands, the compound assignments too.
bool is_rewritten(int op) {
    const int plain = op_of_opASG[op] == ILLOP ? op : op_of_opASG[op];
    return depends_on_bounds(plain) || plain == DIV || plain == MOD || plain == SLL;
}

class ASKED_SYMBOLS {
public:
    explicit ASKED_SYMBOLS(VP_QUESTION q) : question(q), asks_all(values_are_asserted()) {}

    void statement(const NODE* t, const struct LOOP* loop) {
        in_loop = loop && !loop->is_root();
        bool all = asks_all;
        if (question == VP_QUESTION::DIVISIONS)
            all |= any_subtree(t, [](const NODE* n) {
                return n->op == DIV || n->op == MOD || n->op == DIVASG || n->op == MODASG || n->op == QUEST;
            });
        tree(t, NOTHING, all);
    }
    void tree_of_loop(const NODE* t) {
        if (t) tree(t, NOTHING, true);
    }
    // The symbols that are asked for, in no order.
    std::vector<SYMTAB*> found() {
        std::stable_sort(parts.begin(), parts.end(), [](const PART& a, const PART& b) { return a.target < b.target; });
        for (size_t i = 0; i < asked.size(); ++i) {
            PART from{asked[i], 0};
            auto less = [](const PART& a, const PART& b) { return a.target < b.target; };
            for (auto p = std::lower_bound(parts.begin(), parts.end(), from, less); p != parts.end() && p->target == from.target; ++p)
                ask(p->source);
        }
        std::vector<SYMTAB*> symbols;
        for (int i : asked) symbols.push_back(candidates[static_cast<size_t>(i)].sym);
        return symbols;
    }

private:
    static constexpr int NOTHING = -1;
    struct CANDIDATE {
        SYMTAB* sym;
        bool is_asked;
    };
    struct PART {
        int target, source;
    };

    // `target`: the variable that the tree's value goes to. `is_asked`: each name in the tree is.
    void tree(const NODE* t, int target, bool is_asked) {
        if (t->op == NAME) return name(t, target, is_asked);
        if (is_asking(t->op)) is_asked = true;
        if (t->op == QUEST) {
            tree(t->left, target, true);
            return tree(t->right, target, is_asked);
        }
        if (!is_asked && t->left && t->left->op == NAME && writes_left_operand(t->op)) {
            const int written = t->left->u.sym ? number_of(t->left->u.sym) : NOTHING;
            if (written >= 0 && t->op == ASG && t->right->op == ICON) ask(written); // which it may always be
            if (t->right) tree(t->right, written, false);
            if (written < 0 || target < 0) return;
            parts.push_back({target, written});
            return;
        }
        if (t->left) tree(t->left, target, is_asked);
        if (t->right) tree(t->right, target, is_asked);
    }
    bool is_asking(int op) const {
        if (is_condition(op)) return true;
        switch (question) {
        case VP_QUESTION::REWRITING: return is_rewritten(op) || (in_loop && (op == UMULT || op == STREF));
        case VP_QUESTION::ARGUMENTS: return op_is_call(op);
        default: return false;
        }
    }
    void name(const NODE* t, int target, bool is_asked) {
        if (!t->u.sym || (!is_asked && target < 0)) return;
        const int number = number_of(t->u.sym);
        if (number < 0) return;
        if (is_asked)
            ask(number);
        else if (number != target)
            parts.push_back({target, number});
    }
    void ask(int number) {
        CANDIDATE& c = candidates[static_cast<size_t>(number)];
        if (c.is_asked) return;
        c.is_asked = true;
        asked.push_back(number);
    }
    int number_of(SYMTAB* sym) {
        if (const int* number = numbers.find(sym)) return *number;
        if (!may_be_tracked(sym)) return numbers[sym] = NOTHING;
        candidates.push_back({sym, false});
        return numbers[sym] = static_cast<int>(candidates.size()) - 1;
    }

    const VP_QUESTION question;
    const bool asks_all;
    bool in_loop = false;
    SYMBOL_TABLE<int> numbers;
    std::vector<CANDIDATE> candidates;
    std::vector<int> asked; // candidates
    std::vector<PART> parts;
};

} // namespace

bool find_tracked_symbols(VP_QUESTION question) {
    ASKED_SYMBOLS symbols(question);
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        for (const LIST* s = bb->statements; s; s = s->rest) symbols.statement(s->first, bb->loop);
        if (const struct LOOP* loop = bb->loop; question == VP_QUESTION::REWRITING && loop && !loop->is_root() && loop->head == bb)
            symbols.tree_of_loop(loop->trips);
    }
    std::vector<SYMTAB*> tracked = symbols.found();
    if (tracked.empty()) return false;
    const auto globals = std::partition(tracked.begin(), tracked.end(), [](const SYMTAB* sym) { return sym->is_automatic(); });
    std::sort(tracked.begin(), globals, sym_uid_less);
    std::sort(globals, tracked.end(), sym_uid_less);
    const size_t first_global = static_cast<size_t>(globals - tracked.begin());
    init_vpenv_allocation(std::move(tracked), first_global);
    return true;
}
