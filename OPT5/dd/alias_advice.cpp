// Advice to the programmer: which pointers keep a loop from going faster since nothing tells them apart.
//
// Each pair of pointers that is found becomes a pragma of the loop, which is written to the output, and a block of the
// information file. The program stays as it is.
//
// Needs: the loop hierarchy, dependence analysis that is active, trees in normal form. Leaves: the same; pragmas in the
// records of loops, and the loop variable's name in the mark of its place in the source.
// Advice is given once for two variables and a loop: more pairs of references to them tell nothing new.
#include "OPT5/dd/dd.h"

#include "IFILE/pragma.h"
#include "OPT5/alias/alias.h"
#include "OPT5/dd/loop.h"
#include "OPT5/dd/ssa.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

#include <algorithm>
#include <set>
#include <unordered_map>

namespace {

constexpr int MOST_STATEMENTS = 50, MOST_BLOCKS = 6; // that a reference is held against

bool is_restricted(const SYMTAB* s) { return s->type->qual_kind(true) & QUAL_RESTRICT; }

// As the source has it.
std::string text_of(const NODE* tree) {
    NODE* t = denormalize_tree(copy_dd_tree_removing_SSA_operators(tree), false);
    const std::string text = tree_to_infix(t);
    erase_tree(t);
    return text;
}
std::string position_of(const PSN* psn) {
    return psn ? std::string(psn->file ? psn->file : "NO_FILE") + ":" + std::to_string(psn->line) : "::0";
}
std::string decl2text(const SYMTAB* s) { // with the type that the source gave it
    const std::string type = tp->mk_qual(s->orig_type ? s->orig_type : s->type, QUAL_RESTRICT)->printstr();
    return type + (type.back() == ' ' ? "" : " ") + s->name;
}

// ---- The text

void tell_statement(const char* format, const LIST* statement) {
    info_printf(format, text_of(statement->first).c_str());
    if (statement->psn) info_printf(" at line %ld", statement->psn->line);
}

void advise_loop_and_location(struct LOOP* loop, const LIST* stmt1, const LIST* stmt2) {
    if (!write_opt_info) return;
    info_printf("\nADVICE: In function %s()", currfuninfo->name.c_str());
    const char* file = stmt1->psn && stmt1->psn->file ? stmt1->psn->file : nullptr;
    if (file) info_printf(" in %s", file);
    const LOOPIV* lcv = find_LCV_for_loop(loop, IV_is_ULCV);
    if (const NODE* mark = loop->sourceLoopPragma) {
        info_printf("\n\tin the '%s' loop ", get_PPRAGMA_tree_arg(mark, 3).c_str());
        const std::string variable = get_PPRAGMA_tree_arg(mark, 1);
        if (!variable.empty()) info_printf("with loop variable '%s' ", variable.c_str());
        info_printf("at lines %s-%s", std::to_string(loop->sourceStart.line).c_str(), get_PPRAGMA_tree_arg(mark, 2).c_str());
        const std::string& own = loop->sourceStart.file;
        if (!own.empty() && (!file || own != file)) info_printf(" in %s", own.c_str());
    } else {
        const auto line = [](const LIST* s) { return static_cast<int>(s && s->psn ? s->psn->line : 0); };
        info_printf("\n\tin the loop surrounding lines %d-%d", line(stmt1), line(stmt2 ? stmt2 : stmt1));
        if (lcv) info_printf(" with loop variable '%s'", lcv->sym->name);
    }
    tell_statement("\n\tfor the statement %s", stmt1);
    if (stmt2 && stmt2 != stmt1) tell_statement("\n\tand the statement %s", stmt2);
    info_printf("\n");
}

// One side of a pair: a reference, its statement, and the variable that its address comes from.
struct AMBIGUOUS {
    const NODE* lvalue;
    const LIST* statement;
    const SYMTAB* symbol;
    bool is_plain; // the address is computed from the variable itself
};

void tell(const AMBIGUOUS& a, const AMBIGUOUS& b, struct LOOP* loop) {
    advise_loop_and_location(loop, a.statement, b.statement);
    const AMBIGUOUS *first = a.symbol ? &a : &b, *second = a.symbol && b.symbol ? &b : nullptr;
    info_printf("\n\tConsider declaring '%s'", first->symbol->name);
    info_printf(" as %s", decl2text(first->symbol).c_str());
    if (second) {
        info_printf("\n\tor declaring '%s'", second->symbol->name);
        info_printf(" as  %s", decl2text(second->symbol).c_str());
    }
    if (opt_level() <= 2) info_printf("\n\tor optimizing at level \"-o3\"");
    if (second && a.is_plain && b.is_plain) {
        info_printf("\n\tto assert that '%s'", a.symbol->name);
        info_printf(" in the address of %s", text_of(a.lvalue).c_str());
        info_printf("\n\tand            '%s'", b.symbol->name);
        info_printf(" in the address of %s", text_of(b.lvalue).c_str());
    } else {
        info_printf("\n\tto assert that lvalues %s", text_of(a.lvalue).c_str());
        info_printf("\n\tand                    %s", text_of(b.lvalue).c_str());
    }
    info_printf("\n\tdo not access the same object in memory.\n");
}

// ---- A pair

bool is_of_this_function(const AMBIGUOUS& a) {
    const LS* scope = true_scope(a.lvalue);
    if (!scope && a.symbol) scope = a.symbol->scope;
    return scope && (!scope->function || scope->function == currfuninfo);
}

// A pointer of the source that `restrict` could be written to, or null.
const SYMTAB* to_be_declared(const SYMTAB* s, const NODE* lvalue) {
    const auto qualifies = [](const SYMTAB* x) {
        return x && x->type->is_pointer() && !is_restricted(x) && !is_internal_symbol(x);
    };
    if (qualifies(s)) return s;
    const NODE* object = without_members(lvalue);
    const NODE* base = object->op == UMULT ? address_expr_base(object->left) : nullptr;
    return base && base->op == NAME && qualifies(base->u.sym) ? base->u.sym : nullptr;
}

void advise_disambiguating_pair(AMBIGUOUS a, AMBIGUOUS b, struct LOOP* loop) {
    if (!is_of_this_function(a) || !is_of_this_function(b)) return;
    a.symbol = to_be_declared(a.symbol, a.lvalue);
    b.symbol = to_be_declared(b.symbol, b.lvalue);
    if (!a.symbol && !b.symbol) return;
    const auto psn_of = [](const AMBIGUOUS& x) { return position_of(x.symbol ? x.symbol->psn : nullptr); };
    NODE* pragma = set_PPRAGMA_tree_info(nullptr, PRG_ALIAS_ADVICE,
                                         {psn_of(a), text_of(a.lvalue), position_of(a.statement->psn),
                                          b.symbol ? psn_of(b) : "", text_of(b.lvalue), position_of(b.statement->psn)});
    std::vector<NODE*>& advice = loop->aliasAdvice;
    if (std::any_of(advice.begin(), advice.end(), [&](const NODE* t) { return trees_are_congruent(t, pragma, false); }))
        erase_tree(pragma);
    else {
        if (print_debug)
            debug_printf("Adding alias advice pragma to loop #%d: %s\n", loop->uid, stmt2infix(pragma).c_str());
        advice.push_back(pragma);
    }
    if (write_opt_info) tell(a, b, loop);
}

// ---- The search

struct FOUND {
    const NODE* lvalue;
    bool is_write;
};

// The references of a statement, those that are written last.
void find_lvalues(const NODE* t, bool is_write, std::vector<FOUND>* found) {
    if (!t) return;
    if (t->op == SWITCH || t->op == IF) return find_lvalues(t->left, false, found);
    if (writes_left_operand(t->op)) {
        find_lvalues(t->right, false, found);
        return find_lvalues(t->left, true, found);
    }
    if (t->op == UMULT || t->op == STDOT) {
        const NODE* object = without_members(t);
        if (object->op == UMULT) {
            find_lvalues(object->left, false, found);
            find_lvalues(object->right, false, found);
            found->push_back({t, is_write});
        }
        return;
    }
    find_lvalues(t->left, false, found);
    find_lvalues(t->right, false, found);
}

class SEARCH {
public:
    explicit SEARCH(struct LOOP* l) : loop(l) {}

    void run() {
        for (BBLK* bb : loop->contents)
            if (bb->loop == loop) blocks.push_back(bb);
        for (size_t i = 0; i < blocks.size(); ++i)
            for (const LIST* s = blocks[i]->statements; s; s = s->rest)
                for (const FOUND& f : lvalues_of(s))
                    if (can_be_told(f.lvalue)) look_behind(f, s, i);
    }

private:
    const std::vector<FOUND>& lvalues_of(const LIST* s) {
        const auto [at, is_new] = known.try_emplace(s);
        if (is_new && s->first->op != PPRAGMA && !is_assertion(s->first)) find_lvalues(s->first, false, &at->second);
        return at->second;
    }
    static bool is_assertion(const NODE* t) { return t->op == NASSERT || t->op == ASSERT; }
    static bool can_be_told(const NODE* lvalue) {
        return !lvalue_is_immutable(lvalue) && !lvalue_is_volatile(lvalue) && without_members(lvalue)->op == UMULT;
    }
    void look_behind(const FOUND& first, const LIST* statement, size_t block) {
        int left = MOST_STATEMENTS;
        for (size_t i = block; i < blocks.size() && i <= block + MOST_BLOCKS; ++i)
            for (const LIST* s = i == block ? statement : blocks[i]->statements; s; s = s->rest) {
                if (left-- == 0) return;
                for (const FOUND& f : lvalues_of(s))
                    if (f.lvalue != first.lvalue && (f.is_write || first.is_write) && can_be_told(f.lvalue))
                        test_pair({first.lvalue, statement, nullptr, false}, {f.lvalue, s, nullptr, false});
            }
    }
    void test_pair(AMBIGUOUS a, AMBIGUOUS b) {
        const NODE *x = address_expr_base(without_members(a.lvalue)->left),
                   *y = address_expr_base(without_members(b.lvalue)->left);
        if (!x || !y || x == y || trees_are_congruent(x, y, false)) return;
        a.is_plain = x->op == NAME, b.is_plain = y->op == NAME;
        a.symbol = a.is_plain ? x->u.sym : nullptr;
        b.symbol = b.is_plain ? y->u.sym : nullptr;
        if (!to_be_declared(a.symbol, a.lvalue) && !to_be_declared(b.symbol, b.lvalue)) return;
        if (!lvalues_are_dependent(a.lvalue, b.lvalue, loop, loop)) return;
        if ((a.symbol || b.symbol) && !advised.insert(std::minmax(uid_of(a.symbol), uid_of(b.symbol))).second) return;
        advise_disambiguating_pair(a, b, loop);
    }
    static long uid_of(const SYMTAB* s) { return s ? static_cast<long>(s->uid) : -1; }

    struct LOOP* loop;
    std::vector<BBLK*> blocks;
    std::unordered_map<const LIST*, std::vector<FOUND>> known; // looked up alone
    std::set<std::pair<long, long>> advised;
};

// An internal variable says nothing to the programmer.
void name_loop_variable(struct LOOP* loop) {
    NODE* mark = loop->sourceLoopPragma;
    if (!mark || !get_PPRAGMA_tree_arg(mark, 1).empty()) return;
    const LOOPIV* lcv = find_LCV_for_loop(loop, IV_is_ULCV);
    if (lcv && !is_internal_symbol(lcv->sym)) set_PPRAGMA_tree_arg(mark, 1, lcv->sym->name);
}

} // namespace

void report_ambiguous_aliases(struct LOOP* loop) {
    if (!loop) return;
    for (struct LOOP* l : loops_inner_first(loop)) {
        name_loop_variable(l);
        if (!l->is_root()) SEARCH(l).run();
    }
}
