#include "tools/exec/trips.h"

#include "IFILE/pragma.h"
#include "tools/exec/loops.h"

#include <algorithm>
#include <cstdlib>

namespace {
constexpr uint64_t no_limit = ~uint64_t{0};

// What leaving a loop by a statement of it says of the iteration in work.
enum ROLE : uint8_t { OUTSIDE, STAYS, LEAVES_BEFORE, LEAVES_BEHIND, LEAVES_SOMEWHERE };

bool leaves(ROLE role) { return role > STAYS; }

// Marks what follows from the statements in `work` along the edges, never entering `wall`.
void spread(const std::vector<TARGETS>& edges, TARGETS work, uint32_t wall, std::vector<uint8_t>& marks) {
    while (!work.empty()) {
        const uint32_t at = work.back();
        work.pop_back();
        if (at == wall || at >= edges.size() || marks[at]) continue;
        marks[at] = 1;
        work.insert(work.end(), edges[at].begin(), edges[at].end());
    }
}

class LOOP_FINDER {
public:
    explicit LOOP_FINDER(const std::vector<STMT>& code) : code_m(code), next_m(code.size()), before_m(code.size()) {
        for (uint32_t at = 0; at < code.size(); at++) {
            next_m[at] = successors(code, at);
            for (uint32_t to : next_m[at])
                if (to < code.size()) before_m[to].push_back(at);
        }
    }
    bool find(TRIP_PROMISE& p) {
        if (p.head >= code_m.size()) return false;
        std::vector<uint8_t> beside(code_m.size());
        spread(next_m, {0}, p.head, beside);
        TARGETS sources;
        for (uint32_t from : before_m[p.head])
            if (!beside[from]) sources.push_back(from);
        if (sources.empty()) return false;
        p.roles.assign(code_m.size(), OUTSIDE);
        spread(before_m, sources, p.head, p.roles);
        p.roles[p.head] = STAYS;
        for (uint32_t at = 0; at < code_m.size(); at++)
            if (p.roles[at] && leaves_loop(p, at)) p.roles[at] = LEAVES_SOMEWHERE;
        settle_exits(p);
        return true;
    }

private:
    const std::vector<STMT>& code_m;
    std::vector<TARGETS> next_m, before_m;

    bool leaves_loop(const TRIP_PROMISE& p, uint32_t at) const {
        return std::any_of(next_m[at].begin(), next_m[at].end(),
                           [&](uint32_t to) { return to >= code_m.size() || p.roles[to] == OUTSIDE; });
    }
    bool goes_back(const TRIP_PROMISE& p, uint32_t at) const {
        return at < code_m.size() && p.roles[at] &&
               std::find(next_m[at].begin(), next_m[at].end(), p.head) != next_m[at].end();
    }
    // The test at the bottom: it branches back or out, itself or with the branch behind it.
    bool is_bottom_test(const TRIP_PROMISE& p, uint32_t at) const {
        if (!leaves(ROLE(p.roles[at])) || code_m[at].kind != S_CBRANCH) return false;
        return goes_back(p, at) || (code_m[at + 1].kind == S_BRANCH && goes_back(p, at + 1));
    }
    // The test at the top, in a loop without one at the bottom: the first branch of the loop, if it can leave.
    void settle_exits(TRIP_PROMISE& p) const {
        bool bottom = false;
        for (uint32_t at = 0; at < code_m.size(); at++) {
            if (!is_bottom_test(p, at)) continue;
            bottom = true;
            if (at != p.head && (goes_back(p, at) || p.tested_last)) p.roles[at] = LEAVES_BEHIND;
        }
        if (bottom || p.tested_last) return;
        uint32_t at = p.head;
        while (at < code_m.size() && code_m[at].kind == S_EXPR && p.roles[at]) at++;
        if (at < code_m.size() && code_m[at].kind == S_CBRANCH && leaves(ROLE(p.roles[at])) &&
            (at == p.head || p.tested_first))
            p.roles[at] = LEAVES_BEFORE;
    }
};

uint64_t number(const std::vector<std::string>& words, size_t k) {
    const long long v = k < words.size() ? std::strtoll(words[k].c_str(), nullptr, 10) : 0;
    return v > 0 ? static_cast<uint64_t>(v) : 0;
}
} // namespace

// A multiple alone leaves room for no iteration. A promise that contradicts itself is none.
bool make_promise(uint64_t min, uint64_t max, uint64_t multiple, TRIP_PROMISE& promise) {
    promise.max = max ? max : no_limit;
    promise.multiple = std::max<uint64_t>(multiple, 1);
    promise.min = min;
    return min <= promise.max && (min || promise.max != no_limit || promise.multiple > 1);
}

bool read_promise(const PRAGMA& pragma, TRIP_PROMISE& promise) {
    return make_promise(number(pragma.args, 0), number(pragma.args, 1), number(pragma.args, 2), promise);
}

void find_promised_loops(FUNCTION& f) {
    if (f.promises.empty()) return;
    LOOP_FINDER finder(f.code);
    std::vector<TRIP_PROMISE> found;
    for (TRIP_PROMISE& p : f.promises)
        if (finder.find(p)) found.push_back(std::move(p));
    f.promises = std::move(found);
}

void TRIP_WATCH::step(uint32_t from, uint32_t to, MACHINE& m) {
    for (size_t i = 0; i < backs_m.size(); i++) {
        const TRIP_PROMISE& p = f_m.promises[i];
        if (to == p.head)
            backs_m[i] = p.roles[from] ? backs_m[i] + 1 : 0;
        else if (p.roles[from] && (to >= p.roles.size() || !p.roles[to]))
            left(p, backs_m[i], from, m);
    }
}

void TRIP_WATCH::left(const TRIP_PROMISE& p, uint64_t backs, uint32_t from, MACHINE& m) const {
    const ROLE role = ROLE(p.roles[from]);
    const uint64_t least = backs + (role == LEAVES_BEHIND), most = backs + (role != LEAVES_BEFORE);
    for (uint64_t trips = least; trips <= most; trips++)
        if (trips >= p.min && trips <= p.max && trips % p.multiple == 0) return;
    std::string text = "a loop iterated " + std::to_string(most) + " times where at least " + std::to_string(p.min);
    if (p.max != no_limit) text += " and at most " + std::to_string(p.max);
    if (p.multiple > 1) text += " in multiples of " + std::to_string(p.multiple);
    m.top->at = &f_m.code[p.head];
    m.fail(EXEC_TRIPS, text + " were promised");
}
