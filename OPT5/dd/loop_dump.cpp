// The loop hierarchy as text, and its checks.
#include "OPT5/dd/loop.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstdio>
#include <string>

namespace {

std::string indent_of(const struct LOOP* loop) {
    return std::string(static_cast<size_t>(std::min<int>(loop->level, 20)) * 2 + 2, ' ');
}

void dump_blocks(const char* label, const std::vector<BBLK*>& blocks, const struct LOOP* loop,
                 const std::string& indent) {
    debug_printf("%s%s:", indent.c_str(), label);
    for (const BBLK* bb : blocks) debug_printf(" %d", loop && bb->loop != loop ? -bb->dfn : bb->dfn);
    debug_printf("\n");
}

void dump_tree(const char* label, const NODE* t, const std::string& indent) {
    if (t) debug_printf("%s%s: %s\n", indent.c_str(), label, tree_to_infix(t).c_str());
}

void dump_symbols(const char* label, const SYM_SET& symbols, const std::string& indent) {
    debug_printf("%s%s:", indent.c_str(), label);
    for (const SYMTAB* sym : symbols) debug_printf(" %s", sym->name);
    debug_printf("\n");
}

void dump_record(const LOOPIV& iv, const std::string& indent) {
    debug_printf("%sIV2 (x%05lx): %s", indent.c_str(), static_cast<unsigned long>(iv.flags), iv.sym->name);
    if (iv.has(IV_is_RC)) debug_printf(" (RC)");
    if (iv.has(IV_is_VLCV)) debug_printf(" (VLCV)");
    if (iv.has(IV_is_ULCV)) debug_printf(" (ULCV)");
    if (iv.has(IV_is_IV) && !iv.has(IV_affine)) debug_printf(" **NOT AFFINE**");
    if (iv.has(IV_dead_on_exit)) debug_printf(" (dead on exit)");
    for (auto [label, t] :
         {std::make_pair("init", iv.init), std::make_pair("last", iv.last), std::make_pair("incr", iv.incrtree)})
        if (t) debug_printf("  %s=%s", label, tree_to_infix(t).c_str());
    debug_printf("  [%s, %s]\n", int2text(iv.lowval, tp->llong_t, 10, 0), int2text(iv.highval, tp->ullong_t, 10, 1));
}

void dump_place(const char* label, const SOURCE_PLACE& place, const std::string& indent) {
    if (place.line)
        debug_printf("%s%s %s:%ld\n", indent.c_str(), label, place.file.c_str(), static_cast<long>(place.line));
}

void dump_loop(const struct LOOP* loop) {
    const std::string indent = indent_of(loop);
    debug_printf("\n%sLOOP #%d level %d head BB%d tail BB%d preheader BB%d flags x%x", indent.c_str() + 2, loop->uid,
                 loop->level, loop->head->dfn, loop->tail ? loop->tail->dfn : 0,
                 loop->preheader ? loop->preheader->dfn : 0, loop->flags);
    if (loop->has(LOOP_early_exit)) debug_printf("  *EARLY EXIT*");
    if (loop->has(LOOP_conservative)) debug_printf(" | LOOP IS conservatively aligned and/or aliased");
    if (loop->has(LOOP_has_trip_predicate)) debug_printf(" | LOOP HAS TRIPCOUNT PRED");
    if (loop->irreducible) debug_printf("  irreducible");
    if (!loop->is_root() && !loop->is_bottom_tested()) debug_printf("  top-tested");
    debug_printf("\n");
    dump_place("SOURCE START:", loop->sourceStart, indent);
    dump_place("SOURCE END:", loop->sourceEnd, indent);
    dump_blocks("contents", loop->contents, loop, indent);
    dump_blocks("exitBBs", loop->exits, nullptr, indent);
    dump_symbols("RC", loop->RC_syms, indent);
    dump_symbols("ALT", loop->ALT_syms, indent);
    for (const auto& iv : loop->IVs) dump_record(*iv, indent);
    for (const LOOPLV& lv : loop->LVs)
        debug_printf("%sLV %s defs=%d/%d uses=%d/%d flags x%x\n", indent.c_str(), lv.sym->name, lv.usingDefs, lv.defs,
                     lv.derefUses, lv.uses, lv.flags);
    dump_tree("trips", loop->trips, indent);
    dump_tree("max factor", loop->tripFactor, indent);
    dump_tree("maxval", loop->maxTrips, indent);
    dump_tree("minval", loop->minTrips, indent);
    dump_tree("MUST_ITERATE", loop->mustIterate, indent);
    for (const NODE* given : loop->givens) dump_tree("given", given, indent);
}

// ---- Checks

class CHECK {
public:
    int run(struct LOOP* root) {
        need(fact::loops);
        for (struct LOOP* loop : loops_outer_first(root)) {
            check_links(loop);
            check_blocks(loop);
            if (!loop->is_root()) check_shape(loop);
            check_records(loop);
        }
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) check_home(bb);
        return findings;
    }

private:
    void expect(bool holds, const struct LOOP* loop, const char* what) {
        if (holds) return;
        ++findings;
        std::fprintf(fdebug ? fdebug : stderr, "loop #%d (head BB%d): %s\n", loop->uid, loop->head->dfn, what);
    }
    void check_links(const struct LOOP* loop) {
        expect(loop->head != nullptr && loop->tail != nullptr, loop, "no head or tail");
        expect(loop->is_root() == (loop->head == currfuninfo->bb_list), loop, "only the root starts at the entry");
        expect(loop->is_root() || loop->level == loop->parent->level + 1, loop, "level");
        expect(loop->is_root() || loop->uid > loop->parent->uid, loop, "number");
    }
    void check_blocks(const struct LOOP* loop) {
        for (const BBLK* bb : loop->contents)
            expect(bb->loop == loop || (bb->loop && bb->loop->parent == loop && bb->loop->head == bb), loop,
                   "contents");
        expect(std::is_sorted(loop->contents.begin(), loop->contents.end(),
                              [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; }),
               loop, "order of contents");
        for (const BBLK* exit : loop->exits) {
            expect(!loop_is_subloop_of_loop(exit->loop, loop, true), loop, "an exit lies inside");
            for (const EDGE* e = exit->predecessors; e; e = e->rest)
                expect(loop_is_subloop_of_loop(e->first->loop, loop, true), loop, "an exit is reached from outside");
        }
    }
    void check_shape(const struct LOOP* loop) {
        const NATURAL_LOOP* natural = currfuninfo->loops->around(loop->head);
        expect(natural && natural->header == loop->head && natural->latches.size() == 1 &&
                   natural->latches.front() == loop->tail,
               loop, "no natural loop with that head and tail");
        const BBLK* pre = loop->preheader;
        expect(pre && pre->loop == loop->parent && pre->successors && !pre->successors->rest &&
                   pre->successors->first == loop->head,
               loop, "preheader");
        for (const EDGE* e = loop->head->predecessors; e; e = e->rest)
            expect(e->first == pre || e->first == loop->tail, loop, "another entry");
    }
    void check_records(const struct LOOP* loop) {
        for (const LOOPIV* iv : {loop->LCV, loop->VLCV})
            expect(!iv ||
                       std::any_of(loop->IVs.begin(), loop->IVs.end(), [iv](const auto& p) { return p.get() == iv; }),
                   loop, "a control variable without record");
        for (const auto& iv : loop->IVs) expect(iv->loop == loop && loop->record_of.count(iv->sym), loop, "record");
        for (const NODE* count : {loop->minTrips, loop->maxTrips, loop->tripFactor})
            expect(!count || count->op == ICON, loop, "a bound of the count is no constant");
    }
    void check_home(const BBLK* bb) {
        const struct LOOP* loop = bb->loop;
        if (!loop) {
            ++findings;
            std::fprintf(fdebug ? fdebug : stderr, "BB%d lies in no loop\n", bb->dfn);
            return;
        }
        const NATURAL_LOOP* natural = currfuninfo->loops->around(bb);
        if (!loop->irreducible && !(loop->is_root() && !natural))
            expect(natural && natural->header == loop->head, loop, "a block lies in another loop");
    }

    int findings = 0;
};

} // namespace

void dump_loop_hierarchy(const struct LOOP* root) {
    if (!root) return;
    debug_printf("\nLOOP HIERARCHY of %s()\n", currfunc ? currfunc->name : "");
    for (const struct LOOP* loop : loops_outer_first(const_cast<struct LOOP*>(root))) dump_loop(loop);
}

int validate_loop_hierarchy() {
    struct LOOP* root = loop_root();
    return root ? CHECK().run(root) : 0;
}
