#include "tools/exec/dependences.h"

#include <algorithm>

namespace {
constexpr int kept_of_each = 5; // accesses by a number, to a unit

// Whether an element of a vector has the distance. A distance that stands beside forward directions alone is the least one.
bool has_distance(const DD_ENTRY& e, int64_t d) {
    enum { HAS_DISTANCE = 1, BACKWARD = 2, SAME = 4, FORWARD = 8, FAR = 16 };
    if (!(e.direction & (d < 0 ? BACKWARD : d > 0 ? FORWARD : SAME))) return false;
    if (std::abs(d) > 32 && !(e.direction & FAR)) return false;
    if (!(e.direction & HAS_DISTANCE)) return true;
    return d > 0 ? d >= e.distance : d == e.distance;
}

bool covers(const IC_FACTS& v, const std::vector<int64_t>& distances) {
    enum { SPECULATION = 3, NOT_ALL_SAME = 8 };
    if ((v.flags & SPECULATION) || v.elements.size() != distances.size() + 1) return false;
    const bool all_same = std::all_of(distances.begin(), distances.end(), [](int64_t d) { return d == 0; });
    if (all_same && (v.flags & NOT_ALL_SAME)) return false;
    for (size_t k = 0; k < distances.size(); k++)
        if (!has_distance(v.elements[k + 1], distances[k])) return false;
    return true;
}
} // namespace

void DEPENDENCES::find_nests(const std::vector<STMT>& code, bool innermost) {
    is_of_innermost = innermost;
    bool is_reducible;
    loops_m = natural_loops(code, &is_reducible);
    if (!is_reducible) loops_m.clear(); // there is no loop but the function
    std::vector<std::pair<size_t, uint32_t>> larger_first;
    for (uint32_t l = 0; l < loops_m.size(); l++)
        larger_first.push_back({std::count(loops_m[l].inside.begin(), loops_m[l].inside.end(), 0), l});
    std::sort(larger_first.begin(), larger_first.end());
    nests.resize(code.size());
    for (auto [size, l] : larger_first)
        for (uint32_t at = 0; at < code.size(); at++)
            if (loops_m[l].inside[at]) nests[at].push_back(l);
}

bool DEPENDENCES::has_edge(uint32_t from, uint32_t to, const std::vector<int64_t>& distances) const {
    const auto edge = edges.find(key(from, to));
    if (edge == edges.end()) return false;
    return std::any_of(edge->second.begin(), edge->second.end(), [&](uint32_t id) {
        const auto v = vectors.find(id);
        return v != vectors.end() && covers(*v->second, distances);
    });
}

void ACCESS_WATCH::step(uint32_t from, uint32_t to) {
    for (size_t l = 0; l < iteration.size(); l++) {
        const LOOP_BODY& loop = told.loops()[l];
        if (to == loop.head) iteration[l] = loop.inside[from] ? iteration[l] + 1 : 0;
    }
}

void ACCESS_WATCH::note(const ACCESS& access, uint64_t address, MACHINE& m) {
    SEEN now{&access, static_cast<uint32_t>(m.top->at - m.top->function->code.data()), 0, {}};
    for (uint32_t l : told.nest(now.statement)) now.iterations.push_back(iteration[l]);
    for (unsigned low = access.bit, end = access.bit + access.width; low < end;) {
        const unsigned unit = low / 16, high = std::min(end, (unit + 1) * 16);
        now.bits = static_cast<uint16_t>(((1u << (high - low)) - 1) << (low % 16));
        std::vector<SEEN>& list = memory[address + unit];
        bool is_overwritten = false;
        for (auto earlier = list.rbegin(); earlier != list.rend(); ++earlier) {
            const ACCESS& before = *earlier->access;
            if (!(before.writes || access.writes) || !(earlier->bits & now.bits)) continue;
            if (access.writes || !is_overwritten || before.rep == access.rep) check(*earlier, now, m);
            is_overwritten |= before.writes;
        }
        keep(list, now);
        low = high;
    }
}

void ACCESS_WATCH::keep(std::vector<SEEN>& list, const SEEN& latest) {
    int found = 0;
    auto second = list.end();
    for (auto s = list.begin(); s != list.end(); ++s)
        if (s->access->id == latest.access->id && ++found == 2) second = s;
    if (found >= kept_of_each) list.erase(second);
    list.push_back(latest);
}

void ACCESS_WATCH::check(const SEEN& first, const SEEN& second, MACHINE& m) const {
    const TARGETS &a = told.nest(first.statement), &b = told.nest(second.statement);
    std::vector<int64_t> distances;
    for (size_t k = 0; k < a.size() && k < b.size() && a[k] == b[k]; k++)
        distances.push_back(static_cast<int64_t>(second.iterations[k] - first.iterations[k]));
    if (told.tells_of_innermost_alone() && a == b && !distances.empty() &&
        std::any_of(distances.begin(), distances.end() - 1, [](int64_t d) { return d != 0; }))
        return;
    if (told.has_edge(first.access->id, second.access->id, distances)) return;
    std::string text = "access " + std::to_string(second.access->id) + " follows access " +
                       std::to_string(first.access->id) + " of line " +
                       std::to_string(m.top->function->code[first.statement].line) +
                       " without a dependence that tells so; distances:";
    for (int64_t d : distances) text += " " + std::to_string(d);
    m.fail(EXEC_CHECK, text);
}
