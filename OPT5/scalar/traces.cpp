// Traces: the order of blocks in the output follows the likeliest path.
//
// Seeds are blocks by descending frequency. A trace grows from its seed along the likeliest edge, forward and then
// backward, over blocks that no trace has yet. The traces stand in the order of their seeds, but the one that holds the
// entry comes first.
//
// Needs: block numbers, frequencies of a profile. Leaves: block numbers, which are layout positions.
// Sound because the order of blocks in the output means nothing by itself: the writer adds a jump where a block does
// not fall into its successor. Only a pragma that promises something of the loop behind it in the text would speak of
// another loop then, so the block behind one stays there.

#include "OPT5/scalar/sblk.h"
#include "OPT5/scalar/simpcfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/profile.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <memory>

register_option pass_disable_trace_straighten("disable:trace_straighten");

unsigned SBLK::next_number = 1;

SBLK::SBLK(BBLK* seed_block)
    : seed(seed_block), head(seed_block), tail(seed_block), contents{seed_block}, number(next_number++) {}

void SBLK::add_basic_block(BBLK* bb) {
    contents.push_back(bb);
    tail = bb;
}

void SBLK::add_basic_block_in_front(BBLK* bb) {
    contents.insert(contents.begin(), bb);
    head = bb;
}

namespace {

std::string number_text(char mark, double v) {
    char text[32];
    if (!(v >= 0) || !std::isfinite(v))
        std::snprintf(text, sizeof text, "%c?", mark);
    else if (v == 0)
        std::snprintf(text, sizeof text, "%c0", mark);
    else
        std::snprintf(text, sizeof text, "%c%.3g", mark, v);
    return text;
}

} // namespace

std::string freq2text(double frequency) { return number_text('#', frequency); }
std::string prob2text(double probability) { return number_text('%', probability); }

void SBLK::print(bool full, FILE* out) const {
    auto frequency = [full](const BBLK* bb) { return full ? freq2text(bb->dFreqIn) : std::string(); };
    std::fprintf(out, "SBLK #%u: is%s a proper superblock\n", number, is_proper ? "" : " NOT");
    std::fprintf(out, "\tSeed: BB%d%s, Head: BB%d%s, Tail: BB%d#%s\n\tContents:", seed->dfn, frequency(seed).c_str(),
                 head->dfn, frequency(head).c_str(), tail->dfn, frequency(tail).c_str());
    for (const BBLK* bb : contents) std::fprintf(out, " BB%d%s", bb->dfn, frequency(bb).c_str());
    std::fputc('\n', out);
}

namespace {

struct TRACES {
    std::vector<std::unique_ptr<SBLK>> list;
    SIDE_TABLE<SBLK*> around; // by block; null for none yet
};

BBLK* likeliest(EDGE* edges, bool forward) {
    const EDGE* best = nullptr;
    double most = 0;
    for (const EDGE* e = edges; e; e = e->rest) {
        // Backward the likeliest predecessor is the one that comes most often.
        const double weight = forward ? e->prob : e->prob * e->first->dFreqOut;
        if (weight > most) {
            most = weight;
            best = e;
        }
    }
    return best ? best->first : nullptr;
}

// Whether `second` may be laid out behind `first`: the block behind a promise of iterations stays behind that one.
bool may_be_neighbours(const BBLK* first, const BBLK* second) {
    if (first->dflink == second) return true;
    return !ends_in_promise(first) && !ends_in_promise(second->rdflink);
}

void grow(TRACES& traces, SBLK* trace) {
    while (BBLK* next = likeliest(trace->tail->successors, true)) {
        if (traces.around[next] || next == currfuninfo->bb_list || !may_be_neighbours(trace->tail, next)) break;
        trace->add_basic_block(next);
        traces.around[next] = trace;
    }
    while (trace->head != currfuninfo->bb_list) {
        BBLK* before = likeliest(trace->head->predecessors, false);
        if (!before || traces.around[before]) break;
        // A block whose likeliest successor is another one belongs to that one's trace.
        if (likeliest(before->successors, true) != trace->head || !may_be_neighbours(before, trace->head)) break;
        trace->add_basic_block_in_front(before);
        traces.around[before] = trace;
    }
}

TRACES form_traces() {
    std::vector<BBLK*> seeds;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) seeds.push_back(bb);
    std::stable_sort(seeds.begin(), seeds.end(), [](const BBLK* a, const BBLK* b) { return a->dFreqIn > b->dFreqIn; });
    TRACES traces;
    SBLK::next_number = 1;
    for (BBLK* seed : seeds) {
        if (traces.around[seed]) continue;
        traces.list.push_back(std::make_unique<SBLK>(seed));
        traces.around[seed] = traces.list.back().get();
        grow(traces, traces.list.back().get());
    }
    return traces;
}

void complain(const char* text) { debug_printf("%s\n", text); }

void validate_traces(const TRACES& traces) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        if (!traces.around[bb]) complain("Basic block has no trace");
    for (const auto& trace : traces.list) {
        if (trace->contents.empty() || trace->contents.front() != trace->head || trace->contents.back() != trace->tail)
            complain("Contents list is out of order");
        for (size_t i = 0; i < trace->contents.size(); ++i) {
            BBLK* bb = trace->contents[i];
            if (traces.around[bb] != trace.get()) complain("BB belongs to two traces");
            if (std::count(trace->contents.begin(), trace->contents.end(), bb) != 1)
                complain("BB is not in its trace's contents list");
            if (bb->dFreqIn > trace->seed->dFreqIn) complain("BB in trace has higher frequency than the seed");
            if (i > 0 && !edge_memberp(trace->contents[i - 1], bb->predecessors))
                complain("BB predecessor is inconsistent with trace order");
            if (i + 1 < trace->contents.size() && !edge_memberp(trace->contents[i + 1], bb->successors))
                complain("BB successor is inconsistent with trace order");
        }
    }
}

// The blocks in their new order: by traces, but a trace that ends in a promise is followed by the one that begins with
// the loop. Blocks that promises lead in a circle are left out.
std::vector<BBLK*> order_of(const TRACES& traces) {
    const BBLK* const entry = currfuninfo->bb_list;
    std::vector<BBLK*> order;
    for (const auto& trace : traces.list) {
        if (trace->head != entry && ends_in_promise(trace->head->rdflink)) continue; // comes behind that one
        for (const SBLK* t = trace.get(); t;) {
            order.insert(order.end(), t->contents.begin(), t->contents.end());
            const BBLK* tail = t->tail;
            t = tail->dflink && ends_in_promise(tail) ? traces.around[tail->dflink] : nullptr;
        }
    }
    return order;
}

void lay_out(TRACES& traces) {
    BBLK* const entry = currfuninfo->bb_list;
    auto& list = traces.list;
    const auto first = std::find_if(list.begin(), list.end(), [entry](const auto& t) { return t->head == entry; });
    if (first == list.end()) return;
    std::rotate(list.begin(), first, first + 1);
    size_t count = 0;
    for (const auto& trace : list) count += trace->contents.size();
    const std::vector<BBLK*> order = order_of(traces);
    if (order.size() != count) return;
    set_text_order(order);
}

} // namespace

void straighten_traces_in_cfg() {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list || f->profile_status == 0 || pass_disable_trace_straighten) return;
    if (print_debug) debug_printf("\n\n\t\t\t-------- ENTERING 'straighten_traces_in_cfg' -------\n");
    initialize_CFG_profiling_annotation(true, false);
    TRACES traces = form_traces();
    if (print_debug) {
        validate_traces(traces);
        debug_printf("\n\t\tSUPERBLOCK/TRACE OBJECTS\n\n");
        if (fdebug)
            for (const auto& trace : traces.list) trace->print(true, fdebug);
    }
    lay_out(traces);
    renumber_bblocks();
}

// ---- Loops

namespace {

bool has_iteration_pragma(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (s->first->op == PPRAGMA &&
            (s->first->pragma->kind == PRG_MUST_ITERATE || s->first->pragma->kind == PRG_PROB_ITERATE))
            return true;
    return false;
}

// The one block that leads into the loop of `head` and nowhere else.
BBLK* preheader_of(const BBLK* head) {
    BBLK* outside = nullptr;
    bool is_head = false;
    for (const EDGE* e = head->predecessors; e; e = e->rest) {
        if (e->first->dfn >= head->dfn)
            is_head = true;
        else if (outside)
            return nullptr;
        else
            outside = e->first;
    }
    return is_head && outside && outside->branch()->op == BRANCH ? outside : nullptr;
}

} // namespace

void add_loop_annotation_from_profile() {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list || f->profile_status != 2) return;
    initialize_CFG_profiling_annotation(true, false);
    for (BBLK* head = f->bb_list; head; head = head->dflink) {
        BBLK* before = preheader_of(head);
        if (!before || before->dFreqOut <= 0 || has_iteration_pragma(before)) continue;
        const double trips = head->dFreqIn / before->dFreqOut;
        if (!(trips >= 1 && trips < 2147483647)) continue;
        NODE* mark = new_node(PPRAGMA, tp->void_t);
        mark->pragma = new PRAGMA;
        mark->pragma->kind = PRG_PROB_ITERATE;
        const std::string n = std::to_string(static_cast<long>(trips + 0.5));
        mark->pragma->args = {n, n};
        LIST* last = before->last_statement();
        insert_stmt_before_stmt_in_bb(mark, last, before, last->psn);
    }
}
