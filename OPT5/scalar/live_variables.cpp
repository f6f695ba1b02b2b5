// Live variables of a function.
//
// A candidate is a local scalar that is read and written by its NAME alone: its address is not taken, it is not
// volatile, and no exception entry names it. The sets are the least solution of
//   live_out(b) = union of live_in(s) over the successors s,   live_in(b) = use(b) | (live_out(b) - def(b)).
//
// Needs: alias marks. Leaves: every fact; symbols are split anew, and a statement that is a COMMAOP becomes two.
// Sound because what is not a candidate counts as live everywhere: a variable that a pointer reaches could be read by
// any load or call, and no set shows that.

#include "OPT5/scalar/live_walk.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dataflow.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <vector>

int live_index(const SYMTAB* sym) {
    if (!sym || sym->level == 0) return -1;
    const int n = sym->bitnum();
    return n < currfuninfo->lva_sym_count ? n : -1;
}

namespace {

void number_candidates() {
    FUNINFO* f = currfuninfo;
    int count = 0;
    for (SYMTAB* list : {f->scalar_syms, f->memory_syms})
        for (SYMTAB* sym = list; sym; sym = sym->next) {
            if (sym->level == 0) continue;
            if (count == NOT_A_CANDIDATE || !sym->type->is_scalar() || !only_its_name_reaches(sym)) {
                sym->set_bitnum(NOT_A_CANDIDATE);
                continue;
            }
            if (print_debug) debug_printf("\tLVA candidate %2d is variable '%s'\n", count, sym->name);
            sym->set_bitnum(count++);
        }
    f->lva_sym_count = count;
}

// A COMMAOP at the top of a statement is a sequence of statements.
void split_statements() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link;) {
            LIST* s = *link;
            if (s->first->op != COMMAOP) {
                link = &s->rest;
                continue;
            }
            NODE* comma = s->first;
            NODE *first = peel_for_effect(comma->left), *second = peel_for_effect(comma->right);
            comma->left = comma->right = nullptr;
            erase_node(comma);
            if (first && second) insert_behind(s, second, s->psn);
            s->first = first ? first : second;
            if (!s->first) drop_statement(link);
        }
}

class USE_DEF_WALK final : public BACKWARD_WALK {
public:
    USE_DEF_WALK(BITVEC* use_set, BITVEC* def_set) : use(use_set), def(def_set) {}

private:
    void read(int bit) override { use->set(static_cast<uint32_t>(bit)); }
    bool write(int bit, bool kills) override {
        if (kills) {
            use->clear(static_cast<uint32_t>(bit));
            def->set(static_cast<uint32_t>(bit));
        }
        return true;
    }
    BITVEC *use, *def;
};

struct USE_DEF {
    BITVEC use, def;
};

void solve(uint32_t bits) {
    SIDE_TABLE<USE_DEF> sets({BITVEC(bits), BITVEC(bits)});
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) USE_DEF_WALK(&sets[bb].use, &sets[bb].def).block(bb);
    const DATAFLOW live(FLOW::BACKWARD, MEET::UNION, BITVEC(bits), [&](const BBLK* bb, BITVEC& set) {
        set -= sets[bb].def;
        set |= sets[bb].use;
    });
    currfuninfo->live_sets = std::make_unique<LIVE_SETS>();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        currfuninfo->live_sets->of[bb] = {live.at_entry(bb), live.at_exit(bb)};
}

} // namespace

void find_live_variables() {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list) return;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'find_live_variables' --------\n");
    sym_split(f);
    split_statements();
    need(fact::alias_marks);
    number_candidates();
    if (f->lva_sym_count == 0) return;
    solve(static_cast<uint32_t>(f->lva_sym_count));
}

void lva_cleanup() {
    currfuninfo->live_sets.reset();
    currfuninfo->lva_sym_count = 0;
}

namespace {
const FACT_FINDER live_variables("live variables", fact::live_variables, fact::alias_marks,
                                 [](FACTS) { find_live_variables(); }, lva_cleanup);
} // namespace
