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

#include <numeric>
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
// as long as the sets are large, where equations over bit vectors take the product of blocks and candidates. Blocks are
// their places in the list here, so that the walk over the edges touches no block.
class LIVENESS {
public:
    explicit LIVENESS(size_t count) : count(count) {}

    void run() {
        number_blocks();
        const std::vector<MENTION> mentions = by_bit();
        ends_at.assign(blocks.size(), NOT_A_CANDIDATE);
        entered.assign(blocks.size(), NOT_A_CANDIDATE);
        live.reserve(mentions.size()); // where what is live in a block is named there, as in most
        const MENTION *m = mentions.data(), *end = m + mentions.size();
        for (size_t bit = 0; bit < count; ++bit) {
            const MENTION* first = m;
            while (m != end && m->bit == bit) ++m;
            spread(first, static_cast<size_t>(m - first));
        }
        make_lists();
    }

private:
    struct MENTION {
        uint32_t block;
        uint16_t bit;
        bool reads, assigns;
    };
    struct LIVE {
        uint32_t block;
        uint16_t bit;
    };

    void number_blocks() {
        SIDE_TABLE<uint32_t> number;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            number[bb] = static_cast<uint32_t>(blocks.size());
            blocks.push_back(bb);
        }
        for (const BBLK* bb : blocks) {
            first_before.push_back(static_cast<uint32_t>(before.size()));
            for (const EDGE* e = bb->predecessors; e; e = e->rest) before.push_back(number[e->first]);
        }
        first_before.push_back(static_cast<uint32_t>(before.size()));
    }

    std::vector<MENTION> by_bit() const {
        std::vector<MENTION> found;
        std::vector<size_t> next(count + 1, 0); // by bit: where its mentions begin, then where the next one stands
        USE_DEF_WALK walk(static_cast<uint32_t>(count));
        for (size_t b = 0; b < blocks.size(); ++b)
            walk.run(blocks[b], [&](uint32_t bit, bool reads, bool assigns) {
                found.push_back({static_cast<uint32_t>(b), static_cast<uint16_t>(bit), reads, assigns});
                ++next[bit + 1];
            });
        std::partial_sum(next.begin(), next.end(), next.begin());
        std::vector<MENTION> sorted(found.size());
        for (const MENTION& m : found) sorted[next[m.bit]++] = m;
        return sorted;
    }

    void spread(const MENTION* mentions, size_t n) {
        size_t looked_at = live.size();
        for (size_t i = 0; i < n; ++i)
            if (mentions[i].assigns) ends_at[mentions[i].block] = mentions[i].bit;
        for (size_t i = 0; i < n; ++i)
            if (mentions[i].reads) enter(mentions[i].block, mentions[i].bit);
        for (; looked_at < live.size(); ++looked_at) {
            const LIVE at = live[looked_at];
            for (uint32_t i = first_before[at.block]; i < first_before[at.block + 1]; ++i)
                if (ends_at[before[i]] != at.bit && entered[before[i]] != at.bit) enter(before[i], at.bit);
        }
    }

    void enter(uint32_t block, uint16_t bit) {
        entered[block] = bit;
        live.push_back({block, bit});
    }

    void make_lists() const {
        auto sets = std::make_unique<LIVE_SETS>();
        std::vector<uint32_t> next(blocks.size() + 1, 0); // by block: where its list begins, then where its next bit stands
        for (const LIVE& l : live) ++next[l.block + 1];
        for (size_t b = 0; b < blocks.size(); ++b) {
            sets->at_entry[blocks[b]] = {next[b], next[b + 1], true};
            next[b + 1] += next[b];
        }
        sets->lists.resize(live.size());
        for (const LIVE& l : live) sets->lists[next[l.block]++] = l.bit;
        currfuninfo->live_sets = std::move(sets);
    }

    const size_t count;
    std::vector<BBLK*> blocks; // in the order of the list
    std::vector<uint32_t> before, first_before; // the predecessors of block b: from `first_before[b]` on
    std::vector<LIVE> live; // at the entries of blocks, by ascending bits
    // By block: the last candidate that it assigns, and that is live at its entry, of those looked at so far.
    std::vector<uint16_t> ends_at, entered;
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
