#include "OPT5/dd/inequalities.h"

#include <algorithm>
#include <numeric>

namespace {

constexpr size_t MOST_ROWS = 120;
constexpr WIDE MOST_NUMBER = WIDE(1) << 62;

bool fits(WIDE v) { return v <= MOST_NUMBER && v >= -MOST_NUMBER; }
int64_t floor_div(int64_t a, int64_t b) { return a / b - (a % b < 0 ? 1 : 0); } // b above 0

} // namespace

int INEQUALITIES::add_variable(WIDE low, WIDE high) {
    const int v = variables++;
    if (low > -NO_BOUND) add({{v, 1}}, -low);
    if (high < NO_BOUND) add({{v, -1}}, high);
    return v;
}

bool INEQUALITIES::make(const SUM& sum, WIDE constant, ROW* row) {
    std::array<WIDE, MOST_VARIABLES> by{};
    for (const TERM& t : sum) {
        if (t.variable >= MOST_VARIABLES) return false;
        by[static_cast<size_t>(t.variable)] += t.by;
    }
    if (!fits(constant) || !std::all_of(by.begin(), by.end(), fits)) return false;
    std::transform(by.begin(), by.end(), row->by.begin(), [](WIDE v) { return static_cast<int64_t>(v); });
    row->constant = static_cast<int64_t>(constant);
    return true;
}

void INEQUALITIES::add(const SUM& sum, WIDE constant) {
    ROW row;
    if (make(sum, constant, &row)) rows.push_back(row);
}
void INEQUALITIES::add_equality(const SUM& sum, WIDE constant) {
    ROW row;
    if (make(sum, constant, &row)) equalities.push_back(row);
}

// One run over a copy of the system.
class INEQUALITIES::ELIMINATION {
public:
    ELIMINATION(const INEQUALITIES& s, int t, long* w) : count(std::min(s.variables, MOST_VARIABLES)), target(t), work(w) {
        ROWS equal = s.equalities;
        rows = s.rows;
        while (!equal.empty() && is_solvable) {
            const ROW row = equal.back();
            equal.pop_back();
            solve(row, &equal);
        }
        ROWS given;
        std::swap(given, rows);
        for (const ROW& r : given) enter(r);
    }

    bool run(WIDE* low, WIDE* high) {
        while (is_solvable && !is_lost) {
            const int v = next_variable();
            if (v < 0) break;
            eliminate(v);
        }
        if (!is_solvable) return false;
        if (is_lost) return true;
        for (const ROW& r : rows) {
            const int64_t k = r.by[static_cast<size_t>(target)];
            if (k > 0) *low = std::max<WIDE>(*low, -WIDE(floor_div(r.constant, k)));
            if (k < 0) *high = std::min<WIDE>(*high, floor_div(r.constant, -k));
        }
        return *low <= *high;
    }

private:
    int64_t divisor_of(const ROW& r) const {
        int64_t g = 0;
        for (int v = 0; v < count; ++v) g = std::gcd(g, r.by[static_cast<size_t>(v)]);
        return g;
    }
    // Tightened; of those that differ in the constant alone the strongest stays.
    void enter(ROW r) {
        const int64_t g = divisor_of(r);
        if (g == 0) {
            is_solvable = is_solvable && r.constant >= 0;
            return;
        }
        for (int64_t& k : r.by) k /= g;
        r.constant = floor_div(r.constant, g);
        *work -= static_cast<long>(rows.size()) / 8 + 1;
        for (ROW& o : rows)
            if (o.by == r.by) {
                o.constant = std::min(o.constant, r.constant);
                return;
            }
        rows.push_back(r);
    }
    // a times the one plus b times the other; a and b are not negative. False: too large.
    static bool combine(const ROW& x, WIDE a, const ROW& y, WIDE b, ROW* sum) {
        for (size_t v = 0; v < MOST_VARIABLES; ++v) {
            const WIDE k = a * x.by[v] + b * y.by[v];
            if (!fits(k)) return false;
            sum->by[v] = static_cast<int64_t>(k);
        }
        const WIDE c = a * x.constant + b * y.constant;
        sum->constant = static_cast<int64_t>(c);
        return fits(c);
    }
    // One equality: a variable with the factor 1 is replaced everywhere; without, it is a pair of inequalities.
    void solve(const ROW& equality, ROWS* others) {
        const int64_t g = divisor_of(equality);
        if (g == 0 || equality.constant % g) {
            is_solvable = is_solvable && g == 0 && equality.constant == 0;
            return;
        }
        ROW e = equality, negative;
        for (int64_t& k : e.by) k /= g;
        e.constant /= g;
        combine(e, -1, e, 0, &negative);
        int v = 0;
        while (v < count && (v == target || std::abs(e.by[static_cast<size_t>(v)]) != 1)) ++v;
        if (v == count) {
            rows.push_back(e);
            rows.push_back(negative);
            return;
        }
        for (ROWS* all : {&rows, others}) replace(v, e, negative, all);
    }
    void replace(int v, const ROW& e, const ROW& negative, ROWS* all) {
        ROWS kept;
        for (const ROW& r : *all) {
            const int64_t k = r.by[static_cast<size_t>(v)];
            const ROW& opposite = (k > 0) == (e.by[static_cast<size_t>(v)] > 0) ? negative : e;
            ROW sum;
            if (k == 0)
                kept.push_back(r);
            else if (combine(r, 1, opposite, k < 0 ? -WIDE(k) : k, &sum))
                kept.push_back(sum);
        }
        all->swap(kept);
    }
    // The one that brings the fewest new inequalities; -1: the target alone is left.
    int next_variable() const {
        int best = -1;
        long least = 0;
        for (int v = 0; v < count; ++v) {
            if (v == target) continue;
            long lower = 0, upper = 0;
            for (const ROW& r : rows) {
                lower += r.by[static_cast<size_t>(v)] > 0;
                upper += r.by[static_cast<size_t>(v)] < 0;
            }
            if (lower + upper == 0) continue;
            const long more = lower * upper - lower - upper;
            if (best < 0 || more < least) best = v, least = more;
        }
        return best;
    }
    void eliminate(int v) {
        ROWS before;
        before.swap(rows);
        const auto factor = [v](const ROW& r) { return r.by[static_cast<size_t>(v)]; };
        for (const ROW& r : before)
            if (factor(r) == 0) rows.push_back(r);
        for (const ROW& l : before) {
            if (factor(l) <= 0) continue;
            for (const ROW& u : before) {
                if (factor(u) >= 0) continue;
                ROW sum;
                if (combine(l, -WIDE(factor(u)), u, factor(l), &sum)) enter(sum);
                if (!is_solvable) return;
                if (rows.size() > MOST_ROWS || *work <= 0) {
                    is_lost = true;
                    return;
                }
            }
        }
    }

    const int count, target;
    long* const work;
    ROWS rows;
    bool is_solvable = true;
    bool is_lost = false; // too large: nothing is found out
};

bool INEQUALITIES::bound(int variable, WIDE* low, WIDE* high, long* work) const {
    if (*work <= 0 || variable >= MOST_VARIABLES) return true;
    return ELIMINATION(*this, variable, work).run(low, high);
}
