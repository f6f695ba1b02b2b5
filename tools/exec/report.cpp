// Reports after a run.
#include "tools/exec/report.h"
#include "tools/exec/loops.h"

#include <algorithm>

namespace {
unsigned long long ull(uint64_t v) { return v; }

// What a machine has to do: operators, without the conversions that move no data and the glue of lists. Divisions and
// calls weigh what they cost beside a sum; a bit-field is shifted and masked beside its load or store.
uint64_t operations(const NODE_COUNTS& c) {
    uint64_t sum = c.tests + 2 * c.fields;
    for (int i = 0; i < 164; i++) {
        switch (i) {
        case op::SCONV:
        case op::PCONV:
        case op::COMMA:
        case op::PCOMMA: break;
        case op::DIV:
        case op::DIVASG:
        case op::MOD:
        case op::MODASG: sum += 16 * c.by_op[i]; break;
        default:
            if (if_node_info[i].operand_count) sum += c.by_op[i];
        }
    }
    return sum + 7 * (c.by_op[op::CALL] + c.by_op[op::UCALL]); // an intrinsic is one operator
}
} // namespace

// One line an object: a digest of its contents and its name, by name. Pointers have none: addresses differ between
// layouts that are equally right.
void print_globals(const PROGRAM& p, FILE* out) {
    std::map<std::string, uint64_t> lines;
    for (const IC_SYMBOL* s : p.unit.globals) {
        auto it = p.places.find(s);
        const SHAPE shape = shape_of(s->type);
        if (it == p.places.end() || shape.is_pointer || std::strncmp(s->name, "$str", 4) == 0) continue;
        uint64_t digest = 1469598103934665603u;
        for (uint64_t i = 0; i < shape.units; i++)
            digest = (digest ^ p.m.memory[static_cast<uint64_t>(it->second.at) + i]) * 1099511628211u;
        lines[s->name] = digest;
    }
    for (const auto& [name, digest] : lines) std::fprintf(out, "%016llx %s\n", ull(digest), name.c_str());
}

// Innermost loops: those whose one test closes them, how many of these close with one branch, and the others. A number
// before each name, as operators have it.
static void print_loops(const PROGRAM& p, FILE* out) {
    uint64_t plain = 0, closed = 0, iterations = 0, closed_iterations = 0, branches = 0;
    uint64_t tested = 0, tested_iterations = 0, tested_branches = 0;
    for (const FUNCTION& f : p.functions)
        for (const LOOP_COUNTS& loop : count_innermost_loops(f.code)) {
            const bool own = loop.has_own_tests(), one = !own && loop.tests + loop.jumps == 1;
            (own ? tested : plain)++;
            (own ? tested_iterations : iterations) += loop.iterations;
            (own ? tested_branches : branches) += loop.branches;
            closed += one;
            closed_iterations += one ? loop.iterations : 0;
        }
    std::fprintf(out,
                 "loops %llu loops_closed %llu iterations %llu iterations_closed %llu loop_branches %llu "
                 "tested_loops %llu tested_iterations %llu tested_branches %llu\n",
                 ull(plain), ull(closed), ull(iterations), ull(closed_iterations), ull(branches), ull(tested),
                 ull(tested_iterations), ull(tested_branches));
}

void print_stats(const PROGRAM& p, FILE* out) {
    const NODE_COUNTS& c = p.m.counts;
    uint64_t nodes = 0;
    for (uint64_t n : c.by_op) nodes += n;
    uint64_t statements = 0;
    for (const FUNCTION& f : p.functions)
        for (const STMT& s : f.code) statements += s.count;
    const uint64_t multiplies = c.by_op[op::MULT] + c.by_op[op::MULTASG] + c.by_op[op::SQR] + c.multiplies;
    std::fprintf(out,
                 "nodes %llu loads %llu stores %llu calls %llu branches %llu multiplies %llu statements %llu "
                 "operations %llu memory_loads %llu memory_stores %llu\n",
                 ull(nodes), ull(c.loads), ull(c.stores), ull(c.calls), ull(c.branches), ull(multiplies),
                 ull(statements), ull(operations(c)), ull(c.memory_loads), ull(c.memory_stores));
    print_loops(p, out);
    for (int i = 0; i < 164; i++)
        if (c.by_op[i]) std::fprintf(out, "%12llu %s\n", ull(c.by_op[i]), if_node_info[i].name);
}

void print_profile(const PROGRAM& p, FILE* out) {
    for (const FUNCTION& f : p.functions) {
        uint64_t nodes = 0;
        std::map<uint32_t, uint64_t> lines;
        for (const STMT& s : f.code) {
            nodes += s.count * s.cost;
            if (s.count) lines[s.line] += s.count;
        }
        if (!f.calls) continue;
        std::fprintf(out, "%s: %llu calls, %llu nodes\n", f.name.c_str(), ull(f.calls), ull(nodes));
        for (auto [line, count] : lines) std::fprintf(out, "%8u %12llu\n", line, ull(count));
        for (const LOOP_COUNTS& loop : count_innermost_loops(f.code))
            std::fprintf(out, "%8u loop: %llu iterations, %llu branches; %d tests and %d jumps\n", loop.line,
                         ull(loop.iterations), ull(loop.branches), loop.tests, loop.jumps);
    }
}
