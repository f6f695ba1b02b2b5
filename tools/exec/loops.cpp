#include "tools/exec/loops.h"

#include <algorithm>

TARGETS successors(const std::vector<STMT>& code, uint32_t at) {
    const STMT& s = code[at];
    switch (s.kind) {
    case S_EXPR: return {at + 1};
    case S_BRANCH: return {s.target};
    case S_CBRANCH: return {at + 1, s.target};
    case S_SWITCH: {
        TARGETS targets{s.table->other};
        for (const auto& c : s.table->cases) targets.push_back(c.second);
        return targets;
    }
    default: return {};
    }
}

namespace {

// Statements in reverse postorder, and who dominates whom, by iteration to the fixed point.
class FLOW {
public:
    explicit FLOW(const std::vector<STMT>& code) : next(code.size()), before(code.size()), order_of(code.size(), none) {
        for (uint32_t at = 0; at < code.size(); at++)
            for (uint32_t to : successors(code, at))
                if (to < code.size()) {
                    next[at].push_back(to);
                    before[to].push_back(at);
                }
        if (!code.empty()) number_statements();
        find_dominators();
    }
    bool is_reached(uint32_t at) const { return order_of[at] != none; }
    bool dominates(uint32_t a, uint32_t b) const {
        uint32_t at = order_of[b];
        while (at > order_of[a]) at = dominator[at];
        return at == order_of[a];
    }
    // Whether each edge that leads back in reverse postorder leads to what dominates its source.
    bool is_reducible() const {
        for (uint32_t from : order)
            for (uint32_t to : next[from])
                if (order_of[to] <= order_of[from] && !dominates(to, from)) return false;
        return true;
    }
    std::vector<TARGETS> next, before;

private:
    static constexpr uint32_t none = UINT32_MAX;

    void number_statements() {
        std::vector<std::pair<uint32_t, size_t>> path{{0, 0}};
        std::vector<uint8_t> seen(next.size());
        seen[0] = 1;
        while (!path.empty()) {
            auto& [at, edge] = path.back();
            if (edge == next[at].size()) {
                order.push_back(at);
                path.pop_back();
                continue;
            }
            const uint32_t to = next[at][edge++];
            if (!seen[to]) path.push_back({to, 0});
            seen[to] = 1;
        }
        std::reverse(order.begin(), order.end());
        for (uint32_t i = 0; i < order.size(); i++) order_of[order[i]] = i;
    }
    void find_dominators() {
        dominator.assign(order.size(), none);
        if (!order.empty()) dominator[0] = 0;
        for (bool changed = true; changed;) {
            changed = false;
            for (uint32_t i = 1; i < order.size(); i++) {
                uint32_t common = none;
                for (uint32_t from : before[order[i]])
                    if (is_reached(from) && dominator[order_of[from]] != none)
                        common = common == none ? order_of[from] : meet(common, order_of[from]);
                changed |= dominator[i] != common;
                dominator[i] = common;
            }
        }
    }
    uint32_t meet(uint32_t a, uint32_t b) const {
        while (a != b) (a > b ? a : b) = dominator[std::max(a, b)];
        return a;
    }

    TARGETS order;                   // statements
    std::vector<uint32_t> order_of;  // by statement
    std::vector<uint32_t> dominator; // by place in `order`
};

std::vector<LOOP_BODY> loops_of(const FLOW& flow) {
    std::vector<LOOP_BODY> loops;
    for (uint32_t head = 0; head < flow.before.size(); head++) {
        LOOP_BODY loop{head, {}, {}};
        for (uint32_t from : flow.before[head])
            if (flow.is_reached(from) && flow.dominates(head, from)) loop.latches.push_back(from);
        if (loop.latches.empty()) continue;
        loop.inside.assign(flow.before.size(), 0);
        loop.inside[head] = 1;
        for (TARGETS work = loop.latches; !work.empty();) {
            const uint32_t at = work.back();
            work.pop_back();
            if (loop.inside[at] || !flow.is_reached(at)) continue;
            loop.inside[at] = 1;
            work.insert(work.end(), flow.before[at].begin(), flow.before[at].end());
        }
        loops.push_back(std::move(loop));
    }
    return loops;
}

LOOP_COUNTS counts_of(const std::vector<STMT>& code, const LOOP_BODY& loop) {
    LOOP_COUNTS counts;
    counts.line = code[loop.head].line;
    for (uint32_t latch : loop.latches) counts.iterations += code[latch].count;
    for (uint32_t at = 0; at < code.size(); at++) {
        const STMT_KIND kind = code[at].kind;
        if (!loop.inside[at] || (kind != S_BRANCH && kind != S_CBRANCH && kind != S_SWITCH)) continue;
        (kind == S_BRANCH ? counts.jumps : counts.tests)++;
        counts.branches += code[at].count;
    }
    return counts;
}

} // namespace

std::vector<LOOP_BODY> natural_loops(const std::vector<STMT>& code, bool* is_reducible) {
    const FLOW flow(code);
    *is_reducible = flow.is_reducible();
    return loops_of(flow);
}

std::vector<LOOP_COUNTS> count_innermost_loops(const std::vector<STMT>& code) {
    const std::vector<LOOP_BODY> loops = loops_of(FLOW(code));
    std::vector<LOOP_COUNTS> counts;
    for (const LOOP_BODY& loop : loops) {
        const bool has_inner = std::any_of(loops.begin(), loops.end(), [&](const LOOP_BODY& other) {
            return &other != &loop && loop.inside[other.head];
        });
        if (!has_inner) counts.push_back(counts_of(code, loop));
    }
    return counts;
}
