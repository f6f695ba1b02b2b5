// Switches whose control value is known to lie in a small range.
//
// Bounds, a common factor and bits that are always zero tell which values can occur. A case of another value is
// removed; where all values that can occur have a case, the default is never taken and the code generator need not test
// the bounds.
//
// Needs: alias marks and pointees, where there is a switch; no loop hierarchy. Leaves: a graph with block numbers.
// Sound because the bounds come from the tree itself and from those assertions of the block that hold where the switch
// is evaluated: one on a variable that is assigned behind it says nothing there.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstring>
#include <map>

namespace {

constexpr int64_t MAX_RANGE = 500;

struct CASE_ELEMENT {
    INT65 value; // as the control's type holds it
    NODE* tree;
};

// Restores the function's facts on leaving.
class BLOCK_GIVENS {
public:
    explicit BLOCK_GIVENS(const BBLK* bb) : kept(currfuninfo->givens.size()) {
        std::vector<NODE*>& givens = currfuninfo->givens;
        for (const LIST* s = bb->statements; s->rest; s = s->rest) {
            const NODE* t = s->first;
            if (t->op == ASSERT || t->op == NASSERT) {
                givens.push_back(const_cast<NODE*>(t));
                continue;
            }
            // A fact on what is changed behind it holds no longer.
            givens.erase(std::remove_if(givens.begin() + static_cast<long>(kept), givens.end(),
                                        [t](const NODE* fact) { return tree_modifies_lvalue_in_tree(t, fact->left); }),
                         givens.end());
        }
    }
    ~BLOCK_GIVENS() { currfuninfo->givens.resize(kept); }

private:
    size_t kept;
};

const char* infix(const NODE* t) {
    static std::string text;
    text = tree_to_infix(t);
    return text.c_str();
}

std::string decimal(INT65 v) { return std::to_string(v.fits_in<int64_t>()); }

class SWITCH_CASES {
public:
    SWITCH_CASES(BBLK* block, LIST* control_cell) : bb(block), cell(control_cell), sw(control_cell->first) {}

    bool run() {
        BLOCK_GIVENS givens(bb);
        const TYPE* type = sw->left->type;
        if (!type->is_int() || type->size > 64 || (type->size == 64 && type->is_unsigned())) return false;
        report_place();
        take_apart();
        bool changed = simplify_control();
        read_range();
        if (range < 1 || range >= MAX_RANGE) {
            if (print_debug) debug_printf("--> Range is <= 0 or >= 500\n");
            if (changed) rebuild_list();
            return changed;
        }
        report_state();
        changed |= drop_impossible_cases();
        changed |= settle_default();
        if (changed) rebuild_list();
        return changed;
    }

private:
    void report_place() const {
        if (!print_debug) return;
        const PSN* p = cell->psn;
        debug_printf("\nConsidering: %s\n", infix(sw->left));
        if (p)
            debug_printf("    in <%s> at line %lu, column %lu\n", p->file ? p->file : "NO_FILE",
                         static_cast<unsigned long>(p->line), static_cast<unsigned long>(p->column));
        else
            debug_printf("    in <%s> at line %s, column %s\n", "NO_FILE", "-?-", "-?-");
    }

    // The list leans left; it is kept in written order.
    void take_apart() {
        for (NODE* t = sw->right; t; t = t->op == COMMA ? t->left : nullptr) {
            NODE* element = t->op == COMMA ? t->right : t;
            if (t->op == COMMA) commas.push_back(t);
            if (element->op == DEFAULT)
                dflt = element;
            else
                cases.push_back({truncate_to_type(element->left->u.lval, sw->left->type), element});
        }
        std::reverse(cases.begin(), cases.end());
    }

    // ---- The control

    // A constant that is added is taken from the cases instead, which is exact in arithmetic that wraps; a factor is
    // divided out where no multiple leaves the type.
    bool simplify_control() {
        bool changed = drop_offset();
        changed |= divide_out();
        if (changed && print_debug) debug_printf("--> Simplified to switch(%s)...\n", infix(sw->left));
        return changed;
    }

    bool drop_offset() {
        NODE* t = sw->left;
        if ((t->op != PLUS && t->op != MINUS) || t->right->op != ICON || t->left->op == ICON) return false;
        if (!equiv_mtypes(t->left->type, t->type)) return false;
        const INT65 added = t->op == PLUS ? t->right->u.lval : -t->right->u.lval;
        for (CASE_ELEMENT& c : cases) c.value = truncate_to_type(c.value - added, t->type);
        sw->left = t->left;
        erase_tree(t->right);
        erase_node(t);
        return true;
    }

    bool divide_out() {
        NODE* t = sw->left;
        if (t->op != MULT || t->right->op != ICON || !equiv_mtypes(t->left->type, t->type)) return false;
        const INT65 f = t->right->u.lval;
        if (f < INT65(2)) return false;
        const INT65 low = calculate_minval_for_tree(t->left, nullptr),
                    high = calculate_maxval_for_tree(t->left, nullptr);
        if (low < int_type_min(t->type) / f || high > int_type_max(t->type) / f) return false;
        cases.erase(std::remove_if(cases.begin(), cases.end(),
                                   [f](const CASE_ELEMENT& c) {
                                       if ((c.value % f).is_zero()) return false;
                                       erase_tree(c.tree);
                                       return true;
                                   }),
                    cases.end());
        for (CASE_ELEMENT& c : cases) c.value = c.value / f;
        sw->left = t->left;
        erase_tree(t->right);
        erase_node(t);
        return true;
    }

    // ---- The values that can occur

    void read_range() {
        const NODE* t = sw->left;
        min = calculate_minval_for_tree(t, nullptr);
        max = calculate_maxval_for_tree(t, nullptr);
        possible_bits = ~known_bits(t).zeros;
        const NODE* varying = t;
        if (t->op == PLUS && t->right->op == ICON) varying = t->left;
        factor = max_ICON_factor(varying, nullptr);
        if (factor > INT65(MAX_RANGE)) factor = INT65(1); // no value but zero, or too coarse to matter
        offset = varying == t ? INT65(0) : modulo(t->right->u.lval);
        const INT65 span = max - min;
        range = span < INT65(MAX_RANGE) * factor ? (span / factor).fits_in<int64_t>() : MAX_RANGE;
    }

    INT65 modulo(INT65 v) const {
        const INT65 rest = v % factor;
        return rest < INT65(0) ? rest + factor : rest;
    }

    bool has_impossible_bits(INT65 v) const {
        const unsigned width = static_cast<unsigned>(sw->left->type->size);
        const uint64_t in_type = width >= 64 ? ~uint64_t(0) : (uint64_t(1) << width) - 1;
        return (v.value & ~possible_bits & in_type) != 0;
    }

    bool can_occur(INT65 v) const { return v >= min && v <= max && !has_impossible_bits(v) && modulo(v) == offset; }

    void report_state() const {
        if (!print_debug) return;
        debug_printf("~~~#OSiBB#1 Total CASEs=%d, explicit CASEs=%d, %s\n", static_cast<int>(range + 1),
                     static_cast<int>(cases.size()), dflt ? "DEFAULT" : "no DEFAULT");
        debug_printf("~~~#OSiBB#2 minval: %s\n", decimal(min).c_str());
        debug_printf("~~~#OSiBB#2 maxval: %s\n", decimal(max).c_str());
        debug_printf("~~~#OSiBB#2 factor: %s\n", decimal(factor).c_str());
        debug_printf("~~~#OSiBB#2 offset: %s\n", decimal(offset).c_str());
        debug_printf("~~~#OSiBB#2 mask:   %s\n", std::to_string(static_cast<int64_t>(possible_bits)).c_str());
    }

    // ---- Cases

    bool drop_impossible_cases() {
        bool changed = false;
        cases.erase(std::remove_if(cases.begin(), cases.end(),
                                   [&](const CASE_ELEMENT& c) {
                                       if (can_occur(c.value)) return false;
                                       report_impossible(c.value);
                                       erase_tree(c.tree);
                                       changed = true;
                                       return true;
                                   }),
                    cases.end());
        return changed;
    }

    void report_impossible(INT65 v) const {
        const std::string text = decimal(v);
        if (print_debug)
            debug_printf("--> CASE %s of this SWITCH cannot occur. \t(%d|%d|%d|%d)\n", text.c_str(), v<min, v> max,
                         has_impossible_bits(v), modulo(v) != offset);
        if (!write_opt_info) return;
        info_printf("\nCase %s of this statement cannot be reached:  switch ( %s ) ...\n", text.c_str(),
                    infix(sw->left));
        if (const PSN* p = cell->psn)
            info_printf("    in file <%s> at line %lu, column %lu\n", p->file ? p->file : "NO_FILE",
                        static_cast<unsigned long>(p->line), static_cast<unsigned long>(p->column));
    }

    // With a case for every value that can occur the default is never taken. Missing ones are written out where they
    // are the lesser part, so that a table without a test of its bounds serves.
    bool settle_default() {
        if (!dflt || default_is_unreachable()) return false;
        std::vector<INT65> values;
        for (INT65 v = first_value(); v <= max; v = v + factor)
            if (can_occur(v)) values.push_back(v);
        std::map<int64_t, bool> explicit_values;
        for (const CASE_ELEMENT& c : cases) explicit_values[c.value.fits_in<int64_t>()] = true;
        const size_t missing = values.size() - explicit_values.size();
        if (missing > explicit_values.size()) return false;
        if (missing) {
            if (print_debug) debug_printf("--> Fully populating this SWITCH with %zu cases.\n", values.size());
            for (INT65 v : values)
                if (!explicit_values.count(v.fits_in<int64_t>())) add_case(v);
        }
        add_unreachable_default();
        return true;
    }

    INT65 first_value() const {
        INT65 v = min;
        while (modulo(v) != offset) v = v + INT65(1);
        return v;
    }

    void add_case(INT65 v) {
        NODE* element = maketree(CASE, mk_ICON(v, sw->left->type), copy_tree(dflt->left), tp->int_t, sw->ls);
        if (print_debug) debug_printf("\tAdding %s\n", infix(element->left));
        cases.push_back({v, element});
    }

    bool default_is_unreachable() const {
        const LIST* first = dflt->left->lbl->bblock->statements;
        return first && first->first->op == UMCALL && !std::strcmp(first->first->u.name, "_never_executed");
    }

    void add_unreachable_default() {
        if (print_debug) debug_printf("--> Adding a new DEFAULT basic block.\n");
        FUNINFO* f = currfuninfo;
        NODE* last = f->exit_bb ? mk_BRANCH(f->exit_bb)
                                : maketree(URETURN, mk_NAME(currfunc), nullptr, tp->void_t, LS::level_2_scope());
        LIST* list = mkelist(last, nullptr, cell->psn);
        list = mkelist(mk_ASM(47, "***\t; this point in the function is never reached"), list, cell->psn);
        list = mkelist(mk_MCALL("_never_executed", nullptr, tp->void_t), list, cell->psn);
        BBLK* never = insert_new_bb(-1, f->bb_list->rdflink, list);
        if (f->exit_bb)
            connect(never, f->exit_bb);
        else
            f->exit_bb = never;
        dflt->left->lbl = label_of_bb(never);
        dflt->left->u.lval = INT65(dflt->left->lbl->index);
        auto* mark = new_node(PPRAGMA, tp->void_t);
        mark->pragma = new PRAGMA;
        mark->pragma->kind = PRG_SWITCH_IS_FULL;
        insert_stmt_before_stmt_in_bb(mark, cell, bb, cell->psn);
    }

    // ---- Back

    void rebuild_list() {
        NODE* list = nullptr;
        auto append = [&](NODE* element) { list = list ? maketree(COMMA, list, element, tp->int_t, sw->ls) : element; };
        for (NODE* comma : commas) erase_node(comma);
        commas.clear();
        for (CASE_ELEMENT& c : cases) {
            c.tree->left->type = sw->left->type;
            c.tree->left->u.lval = c.value;
            append(c.tree);
        }
        if (dflt) append(dflt);
        sw->right = list;
        sw->u.lval = INT65(static_cast<int64_t>(cases.size()));
        resync_edges(bb);
    }

    BBLK* bb;
    LIST* cell;
    NODE* sw;
    NODE* dflt = nullptr;
    std::vector<CASE_ELEMENT> cases;
    std::vector<NODE*> commas; // of the list as it was; elements of it may be gone
    INT65 min, max, factor, offset;
    uint64_t possible_bits = ~uint64_t(0);
    int64_t range = 0;
};

} // namespace

void optimize_SWITCH_cases() {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list) return;
    if (f->bb_list->loop) abort_optimizer();
    if (print_debug) debug_printf("\n\n\t\t\t------ ENTERING 'optimize_SWITCH_cases' ----\n");
    std::vector<BBLK*> switches;
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
        const NODE* control = bb->branch();
        const bool forks = bb->successors && bb->successors->rest;
        if (control && control->op == SWITCH && forks && !tree_is_EH_SWITCH(control) && !bb->is_in_LIR_form())
            switches.push_back(bb);
    }
    if (switches.empty()) return;
    need(fact::alias_marks | fact::pointees);
    bool changed = false;
    for (BBLK* bb : switches) changed |= SWITCH_CASES(bb, bb->last_statement()).run();
    if (changed) rebuildcfg();
}
