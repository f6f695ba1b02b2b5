// The records of loops: what the hierarchy knows is kept by block, and becomes the record of a loop of the graph as it
// is written, behind the layout.
//
// Sound because a loop of the final graph takes the numbers of one of the hierarchy only if it is that loop still: all
// that leads back to its head belongs to that loop itself, all of it lies in that loop, and no other loop of the graph
// takes the same. Layout moves and copies tests, and never an iteration. A loop that is not recognized has a record
// that promises nothing.
#include "OPT5/dd/dd.h"

#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"

#include <algorithm>
#include <map>
#include <set>
#include <unordered_map>

namespace {

// ---- From the hierarchy

uint32_t saturated(const NODE* icon, uint32_t absent) {
    if (!icon || icon->op != ICON) return absent;
    const INT65 v = icon->u.lval;
    if (v.is_negative()) return 0;
    return v > INT65(int64_t(UINT32_MAX)) ? UINT32_MAX : static_cast<uint32_t>(v.value);
}

uint32_t uid_of(const struct LOOP* loop) { return static_cast<uint32_t>(loop->uid); }

CODE_LOOP record_of(const struct LOOP* loop) {
    CODE_LOOP r;
    r.id = uid_of(loop);
    r.outer = uid_of(loop->is_root() ? loop : loop->parent);
    if (loop->head) r.head = loop->head->serial;
    r.flags = static_cast<uint16_t>(loop->flags & 254);
    if (loop->is_root()) {
        r.max = 1;
        return r;
    }
    r.min = saturated(loop->minTrips, 1);
    r.max = std::max(r.min, saturated(loop->maxTrips, UINT32_MAX));
    r.factor = saturated(loop->tripFactor, 1);
    if (r.factor == 0 || r.factor == UINT32_MAX) r.factor = 1;
    if (loop->has(LOOP_early_exit)) r.min = r.factor = 1;
    r.max = std::max(r.min, r.max);
    if (const LOOPIV* counter = find_LCV_for_loop(loop, IV_is_ULCV)) {
        r.counter = counter->sym;
        r.counter_flags = static_cast<uint8_t>(counter->flags & 3);
    }
    return r;
}

// ---- Of the final graph

class SETTLER {
public:
    explicit SETTLER(CODE_RECORDS& r) : records(r), found(*currfuninfo->loops) {}

    void run() {
        if (!found.has_other_cycles()) order_loops();
        find_last_inside();
        for (const NATURAL_LOOP* loop : loops) known.push_back(known_as(loop));
        for (uint32_t k : known)
            if (k != CODE_RECORDS::NOWHERE) ++takers[k];
        drop_lost_numbers();
        write_down();
    }

private:
    // Each ahead of those in it, and loops of one loop by their heads.
    void order_loops() {
        std::map<const NATURAL_LOOP*, std::vector<const NATURAL_LOOP*>> inside; // looked up, never walked
        for (const auto& loop : found.inner_first()) inside[loop->parent].push_back(loop.get());
        for (std::vector<const NATURAL_LOOP*> waiting{nullptr}; !waiting.empty();) {
            const NATURAL_LOOP* at = waiting.back();
            waiting.pop_back();
            if (at) loops.push_back(at);
            std::vector<const NATURAL_LOOP*>& next = inside[at];
            std::sort(next.begin(), next.end(),
                      [](const NATURAL_LOOP* a, const NATURAL_LOOP* b) { return a->header->dfn > b->header->dfn; });
            waiting.insert(waiting.end(), next.begin(), next.end());
        }
    }

    // Ids of the hierarchy count its tree depth first: those in a loop follow it without a gap.
    void find_last_inside() {
        last_inside.resize(records.loops.size());
        for (size_t i = 0; i < last_inside.size(); ++i) last_inside[i] = static_cast<uint32_t>(i);
        for (size_t i = last_inside.size(); i-- > 1;) {
            uint32_t& around = last_inside[records.loops[i].outer];
            around = std::max(around, last_inside[i]);
        }
    }
    bool is_in(uint32_t loop, uint32_t outer) const { return outer <= loop && loop <= last_inside[outer]; }

    // The loop of the hierarchy that this one is, or NOWHERE.
    uint32_t known_as(const NATURAL_LOOP* loop) const {
        const uint32_t k = records.loop_at(loop->latches.front()->serial);
        if (k == CODE_RECORDS::NOWHERE || k == 0) return CODE_RECORDS::NOWHERE;
        for (const BBLK* latch : loop->latches)
            if (records.loop_at(latch->serial) != k) return CODE_RECORDS::NOWHERE;
        for (const BBLK* bb : loop->blocks) {
            const uint32_t at = records.loop_at(bb->serial);
            if (at != CODE_RECORDS::NOWHERE && !is_in(at, k)) return CODE_RECORDS::NOWHERE;
        }
        return k;
    }

    bool is_recognized(size_t i) const { return known[i] != CODE_RECORDS::NOWHERE && takers.at(known[i]) == 1; }

    // An access keeps its number if all trees that bear it stand in the loops that the analysis found around it, each
    // of which begins an iteration where it did: the distances of its vectors count those iterations.
    void drop_lost_numbers() {
        if (records.loop_of_access.size() < 2) return;
        find_nests();
        std::vector<bool> is_lost(records.loop_of_access.size());
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            const NATURAL_LOOP* around = loops.empty() ? nullptr : found.around(bb);
            const uint32_t nest = around ? nest_of.at(around) : 0;
            for (const LIST* s = bb->statements; s; s = s->rest)
                for_each_subtree(s->first, [&](const NODE* t) {
                    if (t->op == DDNODE && records.loop_of_access[t->ddnode_id()] != nest) is_lost[t->ddnode_id()] = true;
                });
        }
        if (std::find(is_lost.begin(), is_lost.end(), true) == is_lost.end()) return;
        const auto drop = [&](NODE* t) {
            if (t->op != DDNODE || !is_lost[t->ddnode_id()]) return t;
            NODE* access = t->left;
            erase_node(t);
            return access;
        };
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) s->first = rewrite_tree(s->first, drop);
    }
    // What each loop of the graph is of the hierarchy, if it and all around it are recognized; loops are ordered outer
    // ones first.
    void find_nests() {
        std::set<unsigned> standing;
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) standing.insert(bb->serial);
        for (size_t i = 0; i < loops.size(); ++i) {
            const NATURAL_LOOP* loop = loops[i];
            const uint32_t outer = loop->parent ? nest_of.at(loop->parent) : 0;
            uint32_t& nest = nest_of[loop];
            nest = CODE_RECORDS::NOWHERE;
            if (!is_recognized(i) || records.loops[known[i]].outer != outer) continue;
            const uint32_t head = records.loops[known[i]].head;
            if (loop->header->serial == head || !standing.count(head)) nest = known[i];
        }
    }

    void write_down() {
        std::unordered_map<const NATURAL_LOOP*, uint32_t> id_of;
        std::vector<CODE_LOOP> told{records.loops[0]};
        for (size_t i = 0; i < loops.size(); ++i) {
            CODE_LOOP r;
            if (is_recognized(i)) r = records.loops[known[i]];
            r.id = static_cast<uint32_t>(i) + 1;
            r.outer = loops[i]->parent ? id_of.at(loops[i]->parent) : 0;
            id_of[loops[i]] = r.id;
            told.push_back(r);
        }
        records.loop_of.assign(records.loop_of.size(), CODE_RECORDS::NOWHERE);
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            if (bb->serial >= records.loop_of.size()) records.loop_of.resize(bb->serial + 1, CODE_RECORDS::NOWHERE);
            const NATURAL_LOOP* around = loops.empty() ? nullptr : found.around(bb);
            records.loop_of[bb->serial] = around ? id_of.at(around) : 0;
        }
        records.loops = std::move(told);
    }

    CODE_RECORDS& records;
    const NATURAL_LOOPS& found;
    std::vector<uint32_t> last_inside;      // by id of the hierarchy
    std::vector<const NATURAL_LOOP*> loops; // outer ones first
    std::vector<uint32_t> known;            // by loop
    std::map<uint32_t, int> takers;
    std::unordered_map<const NATURAL_LOOP*, uint32_t> nest_of; // NOWHERE of one that is not recognized
};

} // namespace

void write_loop_icode(struct LOOP* root) {
    CODE_RECORDS& records = currfuninfo->code_records;
    records.loops.clear();
    records.loop_of.assign(currfuninfo->objects.size(), CODE_RECORDS::NOWHERE);
    for (const struct LOOP* loop : loops_outer_first(root)) {
        if (records.loops.size() <= uid_of(loop)) records.loops.resize(uid_of(loop) + 1);
        records.loops[uid_of(loop)] = record_of(loop);
    }
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (bb->loop) records.loop_of[bb->serial] = uid_of(bb->loop);
}

void settle_loop_records() {
    if (currfuninfo->code_records.loops.empty()) return;
    need(fact::loops);
    SETTLER(currfuninfo->code_records).run();
}
