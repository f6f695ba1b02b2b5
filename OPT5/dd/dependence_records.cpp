// The records of dependences: the references of the graph get numbers, and its edges become pairs of numbers with a
// vector.
//
// Needs: the graph of the whole function, on the trees that are written.
// Leaves: each reference of the graph with a number, which its DDNODE bears from then on.
// Sound because what follows may drop accesses, but not invent any: an access without a number is one of which nothing
// is known. A number that stands where the loops around are not those of its vectors would lie; `settle_loop_records`
// takes it away.
#include "OPT5/dd/dd.h"

#include "BITVEC/bitvec.h"
#include "OPT5/dd/dependence_graph.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/walks.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <map>

namespace {

constexpr int MOST_ELEMENTS = 255;

DD_ENTRY entry_of(const DVE& v) {
    enum { HAS_DISTANCE = 1, BACKWARD = 2, SAME = 4, FORWARD = 8, OVERFLOW_BIT = 16 };
    int8_t distance = 0;
    uint8_t direction = 0;
    if (v.has_exact_distance() || v.has_only_FWD_dirs()) {
        direction |= HAS_DISTANCE;
        distance = static_cast<int8_t>(v.has_exact_distance() ? v.exact_distance() : v.threshold());
    }
    if (v.has_BWD_dirs()) direction |= BACKWARD;
    if (v.has_SAME_dir()) direction |= SAME;
    if (v.has_FWD_dirs()) direction |= FORWARD;
    if (v.overflows_high() || v.overflows_low()) direction |= OVERFLOW_BIT;
    return {direction, distance};
}

uint8_t flags_of(const DDEP& v) {
    if (use_g2) return 0;
    OPT_ASSERT(v.spec >= 0 && v.spec < 4);
    return static_cast<uint8_t>(v.spec | (v.count() == 0 ? 4 : 0) | (v.NotAllSame ? 8 : 0));
}

// The distinct vectors of a function, numbered as they come.
class VECTORS {
public:
    explicit VECTORS(std::vector<CODE_VECTOR>& records) : out(records) {}

    uint32_t number_of(const DDEP& v) {
        const auto [at, is_new] = number.insert({key_of(v), static_cast<uint32_t>(out.size())});
        if (is_new) write(v);
        return at->second;
    }

private:
    using KEY = std::vector<uint64_t>;
    static KEY key_of(const DDEP& v) {
        KEY key{static_cast<uint64_t>(v.spec), v.NotAllSame};
        for (const DVE& e : v.dve) {
            key.push_back(e.fwd << 32 | (e.bwd & UINT32_MAX));
            key.push_back(e.overflow_high | e.overflow_low << 1 | e.same << 2);
        }
        return key;
    }
    void write(const DDEP& v) {
        if (v.count() > MOST_ELEMENTS) {
            std::fprintf(stderr, "\n\n   !!! DDVECT too big:  %d elements !!!\n", v.count());
            abort_optimizer();
        }
        CODE_VECTOR r;
        r.flags = flags_of(v);
        for (const DVE& e : v.dve) r.elements.push_back(entry_of(e));
        out.push_back(std::move(r));
    }

    std::vector<CODE_VECTOR>& out;
    std::map<KEY, uint32_t> number;
};

} // namespace

void write_dd_edges(const DDGRAPH& graph) {
    CODE_RECORDS& records = currfuninfo->code_records;
    records.vectors.clear();
    records.edges.clear();
    records.loop_of_access.assign(1, CODE_RECORDS::NOWHERE); // numbers begin with 1
    for (const auto& [t, loop] : graph.references()) {
        if (t->op != UMULT) continue; // a variable by name has no place for a number
        const auto id = static_cast<uint32_t>(records.loop_of_access.size());
        records.loop_of_access.push_back(static_cast<uint32_t>(loop->uid));
        t->make_rare().dd = new DDNODE_RECORD{nullptr, t, nullptr, id};
    }
    VECTORS vectors(records.vectors);
    graph.for_each_edge([&](const NODE* from, const NODE* to, const DDEP& first) {
        if (!from->ddnode_id() || !to->ddnode_id()) return;
        for (const DDEP* v = &first; v; v = v->next.get())
            records.edges.push_back({from->ddnode_id(), to->ddnode_id(), vectors.number_of(*v)});
    });
    const auto accesses = static_cast<long>(records.loop_of_access.size()) - 1;
    const auto dependences = static_cast<long>(records.edges.size());
    const char* const told = "\nThere are %ld memory accesses with %ld dependences.\n\n";
    debug_printf(told, accesses, dependences);
    if (write_opt_info) info_printf(told, accesses, dependences);
}

namespace {

// The numbers of the accesses that still stand. A branch names labels alone on its right.
BITVEC standing_accesses(const std::vector<CODE_EDGE>& edges) {
    uint32_t largest = 0;
    for (const CODE_EDGE& e : edges) largest = std::max({largest, e.from, e.to});
    BITVEC standing(largest + 1);
    for_each_tree(currfuninfo, [&](const NODE* tree) {
        for_each_subtree(tree, [&](const NODE* t) {
            if (t->op != DDNODE) return;
            if (!t->rare().dd) optassert("tree->dval != NULL", __FILE__, __LINE__);
            if (t->ddnode_id() <= largest) standing.set(t->ddnode_id());
        });
    });
    return standing;
}

} // namespace

void finalize_dd_edges() {
    std::vector<CODE_EDGE>& edges = currfuninfo->code_records.edges;
    if (edges.empty()) return;
    const BITVEC standing = standing_accesses(edges);
    std::vector<CODE_EDGE> kept;
    for (const CODE_EDGE& e : edges) {
        if (standing.test(e.from) && standing.test(e.to)) {
            kept.push_back(e);
            continue;
        }
        debug_printf("\n\tDDEDGE from %u->%u omitted\n", e.from, e.to);
        for (uint32_t id : {e.from, e.to})
            if (!standing.test(id)) debug_printf("\t\tbecause DDNODE #%u is no longer present\n", id);
    }
    edges = std::move(kept);
}
