// The order of blocks ahead of the output: as few jumps as possible where the function runs most.
//
// A block that ends in a jump costs that in each execution unless its target follows. A test costs one branch if either
// of its targets follows, and otherwise a jump on the colder edge. Blocks join to chains by what following saves,
// dearest first, so that the chain of an inner loop exists before the blocks around it find their place, and ends in
// the loop's test. (K. Pettis, R. C. Hansen, "Profile Guided Code Positioning", 1990, on estimated frequencies.)
//
// Needs: block numbers and loops. Leaves: block numbers, which are layout positions.
// Sound because the order of blocks in the output means nothing by itself: the writer adds a jump where a block does
// not fall into its successor. What a pragma promises of the loop behind it in the text is the one thing that layout
// could break, so the block behind a promise stays there.

#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frequencies.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <vector>

namespace {

// A block that could follow another.
struct PAIR {
    BBLK *first, *second;
    double saves;  // branches, if it follows
    double spoils; // what another block in front of `second` would have saved at the most
    bool is_back;  // a back edge; a loop reads better in one piece
    bool negates;  // the test, as its branch is taken where the condition does not hold
    double runs;   // along the edge
};

class LAYOUT {
public:
    LAYOUT() : next(size()), previous(size()), other_end(size()) {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) other_end[number(bb)] = bb;
    }

    void run() {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            if (bb->dflink && ends_in_promise(bb)) join(bb, bb->dflink);
        for (const PAIR& pair : pairs()) join(pair.first, pair.second);
        const auto cold = cold_edges();
        link();
        renumber_bblocks();
        bool split = false;
        for (auto [bb, target] : cold) split |= jump_on_cold_edge(bb, target);
        if (split) renumber_bblocks();
    }

private:
    static size_t number(const BBLK* bb) { return static_cast<size_t>(bb->dfn); }
    static size_t size() { return static_cast<size_t>(currfuninfo->bb_count) + 1; }

    // What it costs that no successor follows.
    double cost_of_none(const BBLK* bb, const BBLK* successor) const {
        const NODE* control = bb->branch();
        if (bb->is_in_LIR_form() || !control) return 0;
        if (control->op == BRANCH) return frequencies.of_edge(bb, successor);
        if (control->op != IF) return 0;
        if (control->left->op == ENDLOOP) // the writer always ends it in a jump to the second
            return successor == control->right->right->lbl->bblock ? frequencies.of_edge(bb, successor) : 0;
        double least = frequencies.of_edge(bb, successor);
        for (const EDGE* e = bb->successors; e; e = e->rest) least = std::min(least, frequencies.of_edge(bb, e->first));
        return least;
    }

    // A compare is turned into its opposite for nothing.
    static bool negates(const BBLK* bb, const BBLK* next) {
        const NODE* control = bb->branch();
        if (!control || control->op != IF || op_is_int_compare(control->left->op)) return false;
        const NODE* follows_best = control->left->op == EXCLAIM ? control->right->right : control->right->left;
        return follows_best->lbl->bblock != next;
    }

    // What the dearest block in front of another would save, but for `from` and those that lead back.
    struct CLAIMS {
        const BBLK* from = nullptr;
        double most = 0, next = 0;
        void add(const BBLK* bb, double saves) {
            next = std::max(next, std::min(most, saves));
            if (saves > most) from = bb;
            most = std::max(most, saves);
        }
        double without(const BBLK* bb) const { return bb == from ? next : most; }
    };

    std::vector<PAIR> pairs() const {
        std::vector<CLAIMS> claims(size());
        std::vector<PAIR> all;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const EDGE* e = bb->successors; e; e = e->rest) {
                const PAIR pair{bb,
                                e->first,
                                cost_of_none(bb, e->first),
                                0,
                                frequencies.is_back_edge(bb, e->first),
                                negates(bb, e->first),
                                frequencies.of_edge(bb, e->first)};
                if (!pair.is_back) claims[number(e->first)].add(bb, pair.saves);
                all.push_back(pair);
            }
        for (PAIR& pair : all) pair.spoils = claims[number(pair.second)].without(pair.first);
        std::stable_sort(all.begin(), all.end(), [](const PAIR& a, const PAIR& b) {
            if (a.saves != b.saves) return a.saves > b.saves;
            if (a.spoils != b.spoils) return a.spoils < b.spoils;
            if (a.is_back != b.is_back) return b.is_back;
            if (a.negates != b.negates) return b.negates;
            if (a.runs != b.runs) return a.runs > b.runs;
            return (a.first->dflink == a.second) > (b.first->dflink == b.second);
        });
        return all;
    }

    // The first must be the last of its chain, the second the first of another.
    void join(BBLK* first, BBLK* second) {
        if (second == currfuninfo->bb_list || next[number(first)] || previous[number(second)]) return;
        BBLK *head = other_end[number(first)], *tail = other_end[number(second)];
        if (head == second) return;
        next[number(first)] = second;
        previous[number(second)] = first;
        other_end[number(head)] = tail;
        other_end[number(tail)] = head;
    }

    // The entry's chain comes first, the others in the order of what they are first left to from the ones before.
    void link() {
        std::vector<BBLK*> head_of(size()), order;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            if (!previous[number(bb)])
                for (BBLK* member = bb; member; member = next[number(member)]) head_of[number(member)] = bb;
        auto place = [&](const BBLK* bb) {
            BBLK*& head = head_of[number(bb)];
            if (!head) return;
            for (BBLK* member = head; member;) {
                order.push_back(member);
                head_of[number(member)] = nullptr;
                member = next[number(member)];
            }
        };
        place(currfuninfo->bb_list);
        for (size_t i = 0; i < order.size(); ++i)
            for (const EDGE* e = order[i]->successors; e; e = e->rest) place(e->first);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) place(bb);
        set_text_order(order);
    }

    // Of two targets that do not follow, the writer's conditional branch leads to the one that stands first in the
    // layout, and a jump behind it to the other. Where the other is the likelier, a block of its own behind the test
    // jumps.
    static bool jump_on_cold_edge(BBLK* bb, BBLK* cold) {
        const NODE* control = bb->branch();
        BBLK *left = control->right->left->lbl->bblock, *right = control->right->right->lbl->bblock;
        BBLK* hot = left == cold ? right : left;
        if (hot == bb->dflink || cold == bb->dflink || hot->dfn < cold->dfn || ends_in_promise(bb)) return false;
        split_cfg_edge(bb, cold, false);
        return true;
    }

    // The tests that run one of their two edges less often than the other, with that edge's target.
    std::vector<std::pair<BBLK*, BBLK*>> cold_edges() const {
        std::vector<std::pair<BBLK*, BBLK*>> found;
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            const NODE* control = bb->branch();
            if (bb->is_in_LIR_form() || !control || control->op != IF || control->left->op == ENDLOOP) continue;
            BBLK *left = control->right->left->lbl->bblock, *right = control->right->right->lbl->bblock;
            const double l = frequencies.of_edge(bb, left), r = frequencies.of_edge(bb, right);
            if (left != right && l != r) found.emplace_back(bb, l < r ? left : right);
        }
        return found;
    }

    const FREQUENCIES frequencies;
    // By number: the neighbours in the chain, and at both ends of one the other end.
    std::vector<BBLK*> next, previous, other_end;
};

} // namespace

void lay_out_blocks() {
    need(fact::loops);
    LAYOUT().run();
}
