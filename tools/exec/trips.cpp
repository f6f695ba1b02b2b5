#include "tools/exec/trips.h"

#include "IFILE/pragma.h"
#include "tools/exec/loops.h"

#include <algorithm>
#include <cstdlib>
#include <map>

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
    explicit LOOP_FINDER(const FUNCTION& f) : code_m(f.code), next_m(code_m.size()), before_m(code_m.size()) {
        const std::vector<STMT>& code = f.code;
        for (uint32_t at = 0; at < code.size(); at++) {
            next_m[at] = successors(code, at);
            for (uint32_t to : next_m[at])
                if (to < code.size()) before_m[to].push_back(at);
        }
        next_or_handlers_m = next_m;
        for (auto [at, entry] : f.handled_calls)
            for (size_t steps = 0; entry && entry < f.handling.size() && steps < f.handling.size(); steps++) {
                for (const auto& clause : f.handling[entry].clauses) next_or_handlers_m[at].push_back(clause.second);
                entry = f.handling[entry].next;
            }
    }
    bool find(TRIP_PROMISE& p) {
        if (p.head >= code_m.size()) return false;
        if (p.is_record) return find_tail(p);
        std::vector<uint8_t> beside(code_m.size());
        spread(next_or_handlers_m, {0}, p.head, beside);
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
    std::vector<TARGETS> next_or_handlers_m; // where an exception that leaves a call may lead, too

    // Of a record, whose roles tell what is in the loop: exits are told apart by the tail.
    bool find_tail(TRIP_PROMISE& p) const {
        for (uint32_t at = 0; at < code_m.size(); at++)
            if (p.roles[at] && leaves_loop(p, at)) p.roles[at] = LEAVES_SOMEWHERE;
        settle_exits_of_tail(p);
        return true;
    }

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
    // What leaves the loop from the end of its tail has executed it, what leaves from elsewhere has not.
    void settle_exits_of_tail(TRIP_PROMISE& p) const {
        std::vector<uint8_t> exits(code_m.size());
        for (uint32_t at = 0; at < code_m.size(); at++) {
            if (!leaves(ROLE(p.roles[at]))) continue;
            exits[at] = LEAVES_BEFORE;
            if (is_bottom_test(p, at)) // one block, unless there is another entry to the branch back
                exits[at] = goes_back(p, at) || before_m[at + 1].size() == 1 ? LEAVES_BEHIND : LEAVES_SOMEWHERE;
        }
        for (uint32_t at = 0; at < code_m.size(); at++)
            if (exits[at]) p.roles[at] = exits[at];
    }
};

// Which natural loop has which id, and whether the records say the same of nesting.
class RECORD_BINDER {
public:
    explicit RECORD_BINDER(FUNCTION& function) : f(function) {
        for (const LOOP_RECORD& r : f.loops) record_of[r.id] = &r;
    }
    std::string run() {
        if (!f.handling.empty()) return ""; // handlers are entered where the code has no edge
        bool is_reducible;
        const std::vector<LOOP_BODY> loops = natural_loops(f.code, &is_reducible);
        if (!is_reducible) return f.loops.size() == 1 ? "" : "loops are told of a function with cycles that are none";
        if (f.loops.size() != loops.size() + 1)
            return std::to_string(f.loops.size() - 1) + " loops are told of, and there are " + std::to_string(loops.size());
        std::map<uint32_t, const LOOP_BODY*> seen;
        for (const LOOP_BODY& loop : loops) {
            const std::string fault = bind(loop, loops);
            if (!fault.empty()) return fault;
            if (!seen.insert({f.loop_of[loop.head], &loop}).second)
                return "loop " + std::to_string(f.loop_of[loop.head]) + " is two";
        }
        return "";
    }

private:
    std::string bind(const LOOP_BODY& loop, const std::vector<LOOP_BODY>& loops) {
        const uint32_t id = f.loop_of[loop.head], outer = id_around(loop, loops);
        const std::string name = "the loop of line " + std::to_string(f.code[loop.head].line);
        const auto found = record_of.find(id);
        if (found == record_of.end() || found->second->outer == id) return name + " has no record";
        const LOOP_RECORD& r = *found->second;
        if (outer == NO_LOOP ? !is_root(r.outer) : r.outer != outer)
            return name + " is told to be in loop " + std::to_string(r.outer);
        if (r.min > r.max || !r.multiple) return name + " has a record that contradicts itself";
        TRIP_PROMISE t;
        t.is_record = true;
        t.head = loop.head;
        if (!make_promise(r.min > 1 ? r.min : 0, r.max == UINT32_MAX ? 0 : r.max, r.multiple, t)) return "";
        t.roles.assign(loop.inside.begin(), loop.inside.end());
        f.promises.push_back(std::move(t));
        return "";
    }
    uint32_t id_around(const LOOP_BODY& loop, const std::vector<LOOP_BODY>& loops) const {
        const LOOP_BODY* around = nullptr;
        for (const LOOP_BODY& other : loops)
            if (&other != &loop && other.inside[loop.head] && (!around || around->inside[other.head])) around = &other;
        return around ? f.loop_of[around->head] : NO_LOOP;
    }
    bool is_root(uint32_t id) const {
        const auto found = record_of.find(id);
        return found != record_of.end() && found->second->outer == id;
    }

    FUNCTION& f;
    std::map<uint32_t, const LOOP_RECORD*> record_of;
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

std::string bind_loop_records(FUNCTION& f) {
    if (f.loops.empty()) return "";
    f.loop_of.resize(f.code.size(), f.loop_of.empty() ? NO_LOOP : f.loop_of.back());
    return RECORD_BINDER(f).run();
}

void find_promised_loops(FUNCTION& f) {
    if (f.promises.empty()) return;
    LOOP_FINDER finder(f);
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
