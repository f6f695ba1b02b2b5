// Renaming: what is kept in a variable at unrelated times gets a variable for each.
//
// A web is a set of assignments and reads that only makes sense together: two assignments are in one web if a read may
// see the value of either. Webs are found as in the static single assignment form: where paths with different values of
// a live variable meet, the values there become one web; the dominators' frontiers are these places. The web that the
// function's entry gives a value keeps the symbol, so that a parameter stays what it is.
//
// Needs: dominators and live variables; an entry without predecessors, and no saved environment. Leaves: what rests on
// the graph.
// Sound because a read is renamed with all assignments that it may see. A variable takes part if only its NAME reaches
// it. Only an assignment that is a statement starts a new value; one under a condition, one in front of an exception's
// dispatch, a step or a part of the variable belongs to the web of the value before it, since that value may still be
// seen behind it.
#include "OPT5/scalar/rename.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/simp/seq.h"
#include "UTIL/safemem.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <vector>

SYMTAB* clone_symbol(SYMTAB* sym, int n) {
    FUNINFO* f = currfuninfo;
    SYMTAB* copy = copy_symbol(sym);
    copy->index = f->next_symbol_index++;
    copy->scope = sym->scope;
    copy->next = f->new_syms;
    f->new_syms = copy;
    if (source_interlist && print_debug >= 2) {
        char name[96];
        if (is_internal_name(sym->name))
            std::snprintf(name, sizeof name, "%.*s$%03d", 32, sym->name, n);
        else
            std::snprintf(name, sizeof name, "%s$N%03d$%.*s", "$O", n, 30, sym->name);
        std::free(copy->name);
        copy->name = safestrdup(name);
    }
    copy_PTR_entry(copy, sym);
    if (sym->type->is_pointer() && f->spmap->is_bound(sym)) f->spmap->copy_mapping(copy, sym);
    return copy;
}

namespace {

using VALUE = int;
constexpr VALUE NONE = -1;

class RENAMER {
public:
    // Whether a variable was split.
    bool run() {
        choose();
        if (variables.empty() || !find_frontiers()) return false;
        place_joins();
        currfuninfo->dominators->depth_first_doms([this](BBLK* bb) { enter(bb); }, [this](BBLK* bb) { leave(bb); });
        return rebind();
    }

private:
    struct VARIABLE {
        SYMTAB* sym;
        std::vector<BBLK*> assigned_in;
        std::vector<VALUE> current; // the innermost last
        VALUE at_entry = NONE;
    };
    struct JOIN {
        int variable;
        VALUE value;
    };

    // ---- Variables with two values or more

    void choose() {
        std::vector<int> count(static_cast<size_t>(currfuninfo->lva_sym_count), 0);
        std::vector<std::pair<SYMTAB*, BBLK*>> assignments;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest) {
                count_parameters(s->first, count);
                if (starts_value(s) && is_separable(s->first->left->u.sym)) {
                    assignments.emplace_back(s->first->left->u.sym, bb);
                    ++count[slot(s->first->left->u.sym)];
                }
            }
        by_bit.assign(count.size(), NONE);
        for (const auto& [sym, bb] : assignments) {
            if (count[slot(sym)] < 2) continue;
            int& v = by_bit[slot(sym)];
            if (v == NONE) {
                v = static_cast<int>(variables.size());
                variables.push_back({sym, {}, {}, NONE});
            }
            auto& blocks = variables[static_cast<size_t>(v)].assigned_in;
            if (blocks.empty() || blocks.back() != bb) blocks.push_back(bb);
        }
    }

    // The entry gives them a value as well.
    static void count_parameters(const NODE* t, std::vector<int>& count) {
        for (; t->op == PCOMMA; t = t->left) count_parameters(t->right, count);
        if (t->op == ASG && t->left->op == NAME && live_index(t->left->u.sym) >= 0 && tree_is_arg_prolog(t))
            ++count[slot(t->left->u.sym)];
    }

    static size_t slot(const SYMTAB* sym) { return static_cast<size_t>(live_index(sym)); }

    static bool starts_value(const LIST* s) {
        const NODE* t = s->first;
        return t->op == ASG && t->left->op == NAME && live_index(t->left->u.sym) >= 0 && !tree_is_arg_prolog(t) &&
               !(s->rest && tree_is_EH_SWITCH(s->rest->first));
    }

    static bool is_separable(const SYMTAB* sym) {
        const FUNINFO* f = currfuninfo;
        if (sym->level != 2 || sym == f->csu_return_sym || sym == f->ret_by_cctor_sym) return false;
        if ((sym->type->qual_kind(false) & QUAL_RESTRICT) || sym->size_tree) return false;
        if (find_widened_symbol_entry(sym) || find_shortened_symbol_entry(sym)) return false;
        return std::none_of(f->givens.begin(), f->givens.end(),
                            [sym](const NODE* fact) { return sym_appears_in_tree(sym, fact); });
    }

    VARIABLE* variable_of(const SYMTAB* sym) {
        const int bit = live_index(sym);
        const int v = bit < 0 ? NONE : by_bit[static_cast<size_t>(bit)];
        return v == NONE ? nullptr : &variables[static_cast<size_t>(v)];
    }

    // ---- Where values meet

    bool find_frontiers() {
        const std::vector<int>& idom = currfuninfo->dominators->idom;
        frontier.resize(idom.size());
        joins.resize(idom.size());
        size_t left = 64 * idom.size(); // of a graph that is deep beyond reason nothing is renamed
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            if (!bb->predecessors || !bb->predecessors->rest) continue;
            for (const EDGE* e = bb->predecessors; e; e = e->rest)
                for (int b = e->first->dfn; b != idom[index(bb)]; b = idom[static_cast<size_t>(b)]) {
                    if (b == Dominator::UNDEFINED) break;
                    auto& f = frontier[static_cast<size_t>(b)];
                    if (!f.empty() && f.back() == bb) break; // and so has all above
                    if (left-- == 0) return false;
                    f.push_back(bb);
                    if (b == idom[static_cast<size_t>(b)]) break; // the entry
                }
        }
        return true;
    }

    static size_t index(const BBLK* bb) { return static_cast<size_t>(bb->dfn); }

    void place_joins() {
        std::vector<int> placed(frontier.size(), NONE);
        for (size_t v = 0; v < variables.size(); ++v) {
            const int bit = live_index(variables[v].sym);
            std::vector<BBLK*> work = variables[v].assigned_in;
            while (!work.empty()) {
                const BBLK* from = work.back();
                work.pop_back();
                for (BBLK* bb : frontier[index(from)]) {
                    if (placed[index(bb)] == static_cast<int>(v) || !is_live_at_entry(bb, bit)) continue;
                    placed[index(bb)] = static_cast<int>(v);
                    joins[index(bb)].push_back({static_cast<int>(v), new_value()});
                    work.push_back(bb);
                }
            }
        }
    }

    // ---- Values and webs

    VALUE new_value() {
        web.push_back(static_cast<VALUE>(web.size()));
        return web.back();
    }

    VALUE web_of(VALUE v) {
        while (web[static_cast<size_t>(v)] != v) {
            VALUE& up = web[static_cast<size_t>(v)];
            up = web[static_cast<size_t>(up)];
            v = up;
        }
        return v;
    }

    void unite(VALUE a, VALUE b) { web[static_cast<size_t>(web_of(a))] = web_of(b); }

    VALUE current(VARIABLE& v) {
        if (!v.current.empty()) return v.current.back();
        if (v.at_entry == NONE) v.at_entry = new_value();
        return v.at_entry;
    }

    void push(VARIABLE& v, VALUE value) {
        v.current.push_back(value);
        changed.push_back(&v);
    }

    void mention(NODE* t) {
        if (t->op != NAME) return;
        if (VARIABLE* v = variable_of(t->u.sym)) mentions.push_back({t, current(*v)});
    }

    // A block changes what is current; the blocks that it dominates see that, and then it is taken back.
    void enter(BBLK* bb) {
        marks.push_back(changed.size());
        for (const JOIN& j : joins[index(bb)]) push(variables[static_cast<size_t>(j.variable)], j.value);
        for (LIST* s = bb->statements; s; s = s->rest) {
            NODE* t = s->first;
            VARIABLE* v = starts_value(s) ? variable_of(t->left->u.sym) : nullptr;
            for_each_node(v ? t->right : t, [this](NODE* n) { mention(n); });
            if (!v) continue;
            push(*v, new_value());
            mention(t->left);
        }
        for (const EDGE* e = bb->successors; e; e = e->rest)
            for (const JOIN& j : joins[index(e->first)])
                unite(j.value, current(variables[static_cast<size_t>(j.variable)]));
    }

    void leave(BBLK*) {
        for (; changed.size() > marks.back(); changed.pop_back()) changed.back()->current.pop_back();
        marks.pop_back();
    }

    // ---- Names

    bool rebind() {
        bool any = false;
        std::vector<SYMTAB*> symbol(web.size(), nullptr);
        for (VARIABLE& v : variables)
            if (v.at_entry != NONE) symbol[static_cast<size_t>(web_of(v.at_entry))] = v.sym;
        std::vector<int> clones(variables.size(), 0);
        for (const VARIABLE& v : variables) clones[static_cast<size_t>(&v - variables.data())] = v.at_entry != NONE;
        for (const auto& [name, value] : mentions) {
            SYMTAB*& sym = symbol[static_cast<size_t>(web_of(value))];
            const auto v = static_cast<size_t>(by_bit[slot(name->u.sym)]);
            if (sym) continue;
            any |= clones[v] > 0;
            sym = clones[v]++ == 0 ? variables[v].sym : clone_symbol(variables[v].sym, clones[v] - 1);
        }
        for (const auto& [name, value] : mentions) name->u.sym = symbol[static_cast<size_t>(web_of(value))];
        return any;
    }

    struct MENTION {
        NODE* name;
        VALUE value;
    };
    std::vector<int> by_bit; // the variable with a bit, or NONE
    std::vector<VARIABLE> variables;
    std::vector<std::vector<BBLK*>> frontier; // by block
    std::vector<std::vector<JOIN>> joins;     // by block
    std::vector<VALUE> web;                   // a value of the same web, itself for its leader
    std::vector<MENTION> mentions;
    std::vector<VARIABLE*> changed;
    std::vector<size_t> marks;
};

} // namespace

void rename_symbols() {
    if (!currfuninfo->bb_list || currfuninfo->bb_list->predecessors || currfuninfo->saves_environment) return;
    need(fact::dominators | fact::live_variables);
    if (currfuninfo->lva_sym_count && RENAMER().run()) ::changed(fact::graph | fact::alias_marks);
}
