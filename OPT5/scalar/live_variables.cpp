// Live variables of a function.
//
// A candidate is a local scalar that is read and written by its NAME alone: its address is not taken, it is not
// volatile, and no exception entry names it. The sets are the least solution of
//   live_out(b) = union of live_in(s) over the successors s,   live_in(b) = use(b) | (live_out(b) - def(b)),
// of which live_in is kept.
//
// Needs: alias marks. Leaves: every fact; symbols are split anew, and a statement that is a COMMAOP becomes two.
// Sound because what is not a candidate counts as live everywhere: a variable that a pointer reaches could be read by
// any load or call, and no set shows that.

#include "OPT5/scalar/live_walk.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
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

// What a block reads of what it was entered with, and what it assigns whatever happens.
class USE_DEF_WALK final : public BACKWARD_WALK {
public:
    explicit USE_DEF_WALK(uint32_t bits) : use(bits), def(bits) {}

    // Calls `visit(bit, reads, assigns)` for every candidate that the block reads or assigns.
    template <class F>
    void run(BBLK* bb, const F& visit) {
        block(bb);
        for (uint32_t bit : touched) {
            visit(bit, use.test(bit), def.test(bit));
            use.clear(bit);
            def.clear(bit);
        }
        touched.clear();
    }

private:
    void touch(uint32_t bit) {
        if (!use.test(bit) && !def.test(bit)) touched.push_back(bit);
    }
    void read(int bit) override {
        touch(static_cast<uint32_t>(bit));
        use.set(static_cast<uint32_t>(bit));
    }
    bool write(int bit, bool kills) override {
        if (kills) {
            touch(static_cast<uint32_t>(bit));
            use.clear(static_cast<uint32_t>(bit));
            def.set(static_cast<uint32_t>(bit));
        }
        return true;
    }

    BITVEC use, def;
    std::vector<uint32_t> touched;
};

// One candidate after the other: from the blocks that read it back over the edges, up to those that assign it. That takes
// as long as the sets are large, where equations over bit vectors take the product of blocks and candidates.
class LIVENESS {
public:
    explicit LIVENESS(size_t count) : read_in(count), assigned_in(count) {}

    void run() {
        FUNINFO* f = currfuninfo;
        USE_DEF_WALK walk(static_cast<uint32_t>(read_in.size()));
        f->live_sets = std::make_unique<LIVE_SETS>();
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
            f->live_sets->at_entry[bb].is_known = true;
            walk.run(bb, [&](uint32_t bit, bool reads, bool assigns) {
                if (reads) read_in[bit].push_back(bb);
                if (assigns) assigned_in[bit].push_back(bb);
            });
        }
        for (size_t bit = 0; bit < read_in.size(); ++bit) spread(static_cast<uint16_t>(bit));
    }

private:
    void spread(uint16_t bit) {
        for (const BBLK* bb : assigned_in[bit]) ends_at[bb] = bit;
        std::vector<const BBLK*>& waiting = read_in[bit];
        for (const BBLK* bb : waiting) enter(bb, bit);
        while (!waiting.empty()) {
            const BBLK* bb = waiting.back();
            waiting.pop_back();
            for (const EDGE* e = bb->predecessors; e; e = e->rest)
                if (ends_at[e->first] != bit && entered[e->first] != bit) {
                    enter(e->first, bit);
                    waiting.push_back(e->first);
                }
        }
    }

    void enter(const BBLK* bb, uint16_t bit) {
        entered[bb] = bit;
        currfuninfo->live_sets->at_entry[bb].live.push_back(bit);
    }

    std::vector<std::vector<const BBLK*>> read_in, assigned_in; // by bit
    // By block: the last candidate that it assigns, and that is live at its entry, of those looked at so far.
    SIDE_TABLE<uint16_t> ends_at{NOT_A_CANDIDATE}, entered{NOT_A_CANDIDATE};
};

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
    LIVENESS(static_cast<size_t>(f->lva_sym_count)).run();
}

void lva_cleanup() {
    currfuninfo->live_sets.reset();
    currfuninfo->lva_sym_count = 0;
}

namespace {
const FACT_FINDER live_variables("live variables", fact::live_variables, fact::alias_marks,
                                 [](FACTS) { find_live_variables(); }, lva_cleanup);
} // namespace
