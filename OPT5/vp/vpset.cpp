// Slices and sets of them.
//
// Merging keeps a set small: slices that join without a gap become one, and while there are too many, the two whose hull
// adds the fewest members, the nearest of those. A hull holds all members of both, since its step divides both steps and the distance of the low ends.
#include "OPT5/vp/vpset.h"

#include "OPT5/ir/global.h"
#include "OPT5/ir/type_ops.h"

#include <algorithm>
#include <cstdio>

namespace {

constexpr WIDE NO_ROOM = WIDE(1) << 70; // no end of a slice is beyond

WIDE floor_mod(WIDE a, WIDE b) { return a - floor_div(a, b) * b; }

// Ends on one grid.
VPSLICE on_grid(WIDE low, WIDE high, WIDE step) {
    if (low > high) return {};
    return low == high ? single_slice(low) : VPSLICE{low, high, step};
}

bool lies_in(const VPSLICE& a, const VPSLICE& b) {
    if (a.is_empty()) return true;
    if (!b.holds(a.low) || !b.holds(a.high)) return false;
    return a.step == 0 || (b.step != 0 && a.step % b.step == 0);
}

bool grids_meet(const VPSLICE& a, const VPSLICE& b) {
    const WIDE g = gcd_of(a.step, b.step);
    return g == 0 ? a.low == b.low : (a.low - b.low) % g == 0;
}

bool overlap(const VPSLICE& a, const VPSLICE& b) { return a.low <= b.high && b.low <= a.high && grids_meet(a, b); }

VPSLICE hull_of(const VPSLICE& a, const VPSLICE& b) {
    const WIDE step = gcd_of(gcd_of(a.step, b.step), a.low - b.low);
    return on_grid(std::min(a.low, b.low), std::max(a.high, b.high), step);
}

bool is_before(const VPSLICE& a, const VPSLICE& b) {
    if (a.low != b.low) return a.low < b.low;
    return a.high != b.high ? a.high < b.high : a.step < b.step;
}

// Members of `a` congruent to those of `b`, which has twice the step, are all in `b`: the others.
bool every_other(VPSLICE* out, const VPSLICE& a, const VPSLICE& b) {
    if (a.step == 0 || b.step != 2 * a.step || (a.low - b.low) % a.step != 0) return false;
    const bool low_is_in = (a.low - b.low) % b.step == 0, high_is_in = (a.high - b.low) % b.step == 0;
    const WIDE first = low_is_in ? a.low : a.low + a.step, last = high_is_in ? a.high : a.high - a.step;
    if (first < b.low || last > b.high) return false;
    *out = on_grid(low_is_in ? a.low + a.step : a.low, high_is_in ? a.high - a.step : a.high, b.step);
    return true;
}

// Raises the low end past what `b` covers, and lowers the high end.
VPSLICE trimmed(VPSLICE a, const VPSLICE& b) {
    const bool runs = b.step != 0 && a.step % b.step == 0; // with its first member all further ones up to `b.high`
    if (b.holds(a.low)) a.low = runs && a.step ? a.low + (floor_div(b.high - a.low, a.step) + 1) * a.step : a.low + a.step;
    if (a.low <= a.high && b.holds(a.high))
        a.high = runs && a.step ? a.high - (floor_div(a.high - b.low, a.step) + 1) * a.step : a.high - a.step;
    return on_grid(a.low, a.high, a.step);
}

// The inverse of a modulo m, which have no common factor; m above 0.
WIDE inverse(WIDE a, WIDE m) {
    WIDE r0 = m, r1 = floor_mod(a, m), x0 = 0, x1 = 1;
    while (r1) {
        const WIDE q = r0 / r1;
        std::swap(r0 -= q * r1, r1);
        std::swap(x0 -= q * x1, x1);
    }
    return floor_mod(x0, m);
}

VPSLICE common(const VPSLICE& a, const VPSLICE& b) {
    if (!overlap(a, b)) return {};
    if (a.step == 0) return b.holds(a.low) ? a : VPSLICE{};
    if (b.step == 0) return a.holds(b.low) ? b : VPSLICE{};
    const WIDE g = gcd_of(a.step, b.step), m = b.step / g, low = std::max(a.low, b.low), high = std::min(a.high, b.high);
    if (a.step > NO_ROOM / m) return slice_between(low, high, a);
    // a.low + k * a.step is congruent to b.low modulo b.step.
    const WIDE k = static_cast<WIDE>(static_cast<unsigned __int128>(floor_mod((b.low - a.low) / g, m)) *
                                     static_cast<unsigned __int128>(inverse(a.step / g, m)) %
                                     static_cast<unsigned __int128>(m));
    const WIDE lcm = a.step * m, meets = a.low + k * a.step;
    return slice_between(low, high, {meets, meets + lcm, lcm});
}

std::string text_of(WIDE v) {
    if (v < 0) return "-" + text_of(-v);
    std::string digits;
    do digits.insert(digits.begin(), static_cast<char>('0' + static_cast<int>(v % 10)));
    while (v /= 10);
    return digits;
}

} // namespace

// ---- Slices

void VPSLICE_LIST::push_back(const VPSLICE& s) {
    if (s.is_empty()) return;
    if (count == MOST) merge(vpset::MOST_SLICES);
    slices[count++] = s;
}
void VPSLICE_LIST::erase(int i) {
    std::copy(slices + i + 1, slices + count, slices + i);
    --count;
}
void VPSLICE_LIST::sort() {
    if (count > 1) std::sort(slices, slices + count, is_before);
}

void VPSLICE_LIST::merge(int most) {
    for (sort(); count > 1; sort()) {
        int at = 0, with = 0;
        WIDE least = 0, shortest = 0;
        bool adds_nothing = false; // and keeps the shape: single values apart stay so
        for (int i = 0; i < count && !adds_nothing; ++i)
            for (int j = i + 1; j < count && !adds_nothing; ++j) {
                const VPSLICE both = hull_of(slices[i], slices[j]);
                const WIDE cost = vpslice_size(both) - vpslice_size(slices[i]) - vpslice_size(slices[j]),
                           length = both.high - both.low;
                adds_nothing = both == slices[i] || both == slices[j] ||
                               (slices[i].high < slices[j].low && cost <= 0 &&
                                (both.step <= std::max(slices[i].step, slices[j].step) || both.step == 1));
                if (with && !adds_nothing && (cost > least || (cost == least && length >= shortest))) continue;
                least = cost;
                shortest = length;
                at = i;
                with = j;
            }
        if (!adds_nothing && count <= most) return;
        slices[at] = hull_of(slices[at], slices[with]);
        erase(with);
    }
}

bool vpslice_is_single(const VPSLICE& s) { return s.low == s.high; }

WIDE vpslice_size(const VPSLICE& s) {
    if (s.is_empty()) return 0;
    return s.step == 0 ? 1 : (s.high - s.low) / s.step + 1;
}

void vpslice_difference(VPSLICE* out, const VPSLICE& a, const VPSLICE& b) {
    if (lies_in(a, b)) {
        *out = {};
        return;
    }
    *out = a;
    if (b.is_empty() || !overlap(a, b) || every_other(out, a, b)) return;
    *out = trimmed(a, b);
}

VPSLICE single_slice(WIDE v) { return {v, v, 0}; }

VPSLICE make_vpslice(WIDE low, WIDE high, WIDE step) {
    if (low > high) return {};
    if (low == high) return single_slice(low);
    if (step > 0 && (high - low) % step == 0) return {low, high, step};
    const VPSLICE bad{low, high, step};
    const std::string text = vpset2string(vpset(bad));
    debug_printf("+++ BAD ARGS TO make_vpslice(): %s\n\n", text.c_str());
    if (print_debug) std::fprintf(stderr, "\n\n+++ BAD ARGS TO make_vpslice(): %s\n\n", text.c_str());
    return {low, high, 1};
}

VPSLICE slice_between(WIDE low, WIDE high, const VPSLICE& grid) {
    if (grid.step == 0) return low <= grid.low && grid.low <= high ? grid : VPSLICE{};
    return on_grid(grid.low + ceil_div(low - grid.low, grid.step) * grid.step,
                   grid.low + floor_div(high - grid.low, grid.step) * grid.step, grid.step);
}

// ---- Sets

bool vpset::holds(WIDE v) const {
    return std::any_of(begin(), end(), [v](const VPSLICE& s) { return s.holds(v); });
}
bool vpset::operator==(const vpset& o) const { return std::equal(begin(), end(), o.begin(), o.end()); }

WIDE vpset_minimum(const vpset& s) { return s[0].low; }
WIDE vpset_maximum(const vpset& s) {
    WIDE m = s[0].high;
    for (const VPSLICE& slice : s) m = std::max(m, slice.high);
    return m;
}
WIDE vpset_size(const vpset& s) {
    WIDE n = 0;
    for (const VPSLICE& slice : s) n += vpslice_size(slice);
    return n;
}
WIDE vpset_delta(const vpset& s) {
    WIDE g = 0;
    for (const VPSLICE& slice : s) g = gcd_of(g, gcd_of(slice.step, slice.low - s[0].low));
    return g;
}
WIDE vpset_gcd(const vpset& s) {
    if (vpset_is_empty(s)) return 1;
    return gcd_of(vpset_delta(s), vpset_minimum(s));
}
void make_vpset_empty(vpset* s) { *s = vpset(); }
bool vpset_is_empty(const vpset& s) { return s.size() == 0; }
bool vpset_is_single(const vpset& s) { return s.size() == 1 && vpslice_is_single(s[0]); }
bool vpset_equal(const vpset& a, const vpset& b) { return a == b || (vpset_is_subset(a, b) && vpset_is_subset(b, a)); }

bool vpset_is_subset(const vpset& a, const vpset& b) {
    for (VPSLICE rest : a) {
        for (const VPSLICE& slice : b) vpslice_difference(&rest, rest, slice);
        if (!rest.is_empty()) return false;
    }
    return true;
}

std::string vpset2string(const vpset& s) {
    std::string text;
    for (const VPSLICE& slice : s)
        text += "<" + text_of(slice.low) + "," + text_of(slice.high) + "," + text_of(slice.step) + ">";
    return text;
}

vpset vpset_of(VPSLICE_LIST& list) {
    if (list.size() > 1) list.merge(vpset::MOST_SLICES);
    vpset s;
    for (int i = 0; i < list.size(); ++i) s.append(list[i]);
    return s;
}

void vpset_union(vpset* out, const vpset& a, const vpset& b) {
    if (vpset_is_subset(a, b)) {
        *out = b;
        return;
    }
    if (vpset_is_subset(b, a)) {
        *out = a;
        return;
    }
    VPSLICE_LIST list;
    for (const VPSLICE& slice : a) list.push_back(slice);
    for (VPSLICE rest : b) {
        for (const VPSLICE& slice : a) vpslice_difference(&rest, rest, slice);
        list.push_back(rest);
    }
    *out = vpset_of(list);
}

bool vpset_intersection(vpset* out, const vpset& a, const vpset& b) {
    if (vpset_is_empty(a) || vpset_is_empty(b)) {
        *out = vpset_is_empty(a) ? b : a;
        return true;
    }
    VPSLICE_LIST list;
    for (const VPSLICE& x : a)
        for (const VPSLICE& y : b) list.push_back(common(x, y));
    *out = vpset_of(list);
    return !vpset_is_empty(*out);
}

bool vpset_without(vpset* out, const vpset& a, WIDE v) {
    VPSLICE_LIST list;
    for (const VPSLICE& s : a) {
        if (!s.holds(v)) {
            list.push_back(s);
            continue;
        }
        if (s.step == 0) continue;
        list.push_back(slice_between(s.low, v - s.step, s));
        list.push_back(slice_between(v + s.step, s.high, s));
    }
    *out = vpset_of(list);
    return !vpset_is_empty(*out);
}

bool vpset_within(vpset* out, const vpset& a, WIDE low, WIDE high) {
    if (a.size() == 1 && low <= a[0].low && a[0].high <= high) { // the most frequent case
        *out = a;
        return true;
    }
    VPSLICE_LIST list;
    for (const VPSLICE& s : a) list.push_back(slice_between(std::max(low, s.low), std::min(high, s.high), s));
    *out = vpset_of(list);
    return !vpset_is_empty(*out);
}

void vpset_compress(VPSLICE* out, const vpset& s) {
    *out = {};
    for (const VPSLICE& slice : s) *out = out->is_empty() ? slice : hull_of(*out, slice);
}

// ---- Types

RANGE vpset_limits(const TYPE* type) {
    if (type->is_pointer()) return range_of_type(tp->long_t);
    if (has_value_range(type)) return range_of_type(type);
    return {range_of_type(tp->llong_t).min * 2, range_of_type(tp->ullong_t).max};
}

void make_vpset_bottom(vpset* s, const TYPE* type) {
    const RANGE limits = vpset_limits(type);
    *s = vpset(VPSLICE{limits.min, limits.max, 1});
}

bool vpset_is_bottom(const vpset& s, const TYPE* type) {
    if (!type->is_pointer() && !has_value_range(type)) return !vpset_is_empty(s);
    const RANGE limits = vpset_limits(type);
    return s.size() == 1 && s[0].step == 1 && s[0].low <= limits.min && limits.max <= s[0].high;
}

namespace {

void truncate_slice(const VPSLICE& s, const RANGE& limits, WIDE turn, VPSLICE_LIST* list) {
    if (limits.min <= s.low && s.high <= limits.max) return list->push_back(s);
    if (s.high - s.low >= turn) { // what the powers of two in the step keep apart stays apart
        WIDE grid = 1;
        while (s.step && s.step % (grid * 2) == 0 && grid * 2 < turn) grid *= 2;
        return list->push_back(slice_between(limits.min, limits.max, {s.low, s.low + grid, grid}));
    }
    const WIDE turns = floor_div(s.low - limits.min, turn) * turn;
    const VPSLICE in{s.low - turns, s.high - turns, s.step};
    list->push_back(slice_between(in.low, std::min(in.high, limits.max), in));
    if (in.high <= limits.max) return;
    const VPSLICE behind = slice_between(limits.max + 1, in.high, in);
    if (!behind.is_empty()) list->push_back({behind.low - turn, behind.high - turn, behind.step});
}

} // namespace

void truncate_vpset_to_type(vpset* s, const TYPE* type) {
    if (vpset_is_empty(*s)) return;
    if (!type->is_pointer() && !has_value_range(type)) return make_vpset_bottom(s, type);
    const RANGE limits = vpset_limits(type);
    if (limits.min <= vpset_minimum(*s) && vpset_maximum(*s) <= limits.max) return;
    if (type->is_enum()) return make_vpset_bottom(s, type);
    VPSLICE_LIST list;
    if (type->is_bool()) {
        vpset rest;
        if (s->holds(0)) list.push_back(single_slice(0));
        if (vpset_without(&rest, *s, 0)) list.push_back(single_slice(1));
    } else
        for (const VPSLICE& slice : *s) truncate_slice(slice, limits, limits.max - limits.min + 1, &list);
    *s = vpset_of(list);
}

void include_incr_in_vpset(WIDE incr, vpset* s, const TYPE* type) {
    if (incr == 0) return;
    const RANGE limits = vpset_limits(type);
    const bool wraps = !type->is_pointer() && !wraps_signed(type);
    VPSLICE_LIST list;
    for (const VPSLICE& slice : *s) {
        const WIDE step = gcd_of(slice.step, incr);
        const VPSLICE grid{slice.low, slice.low + step, step};
        list.push_back(slice_between(incr < 0 || wraps ? limits.min : slice.low, incr > 0 || wraps ? limits.max : slice.high, grid));
    }
    *s = vpset_of(list);
}

// ---- Arithmetic

namespace {

bool multiply(WIDE a, WIDE b, WIDE* out) {
    return !__builtin_mul_overflow(a, b, out) && *out < NO_ROOM && *out > -NO_ROOM;
}

bool product_of(const VPSLICE& a, const VPSLICE& b, VPSLICE* out) {
    WIDE corner[4], step[3];
    if (!multiply(a.low, b.low, &corner[0]) || !multiply(a.low, b.high, &corner[1]) ||
        !multiply(a.high, b.low, &corner[2]) || !multiply(a.high, b.high, &corner[3]) ||
        !multiply(a.step, b.low, &step[0]) || !multiply(b.step, a.low, &step[1]) || !multiply(a.step, b.step, &step[2]))
        return false;
    *out = on_grid(*std::min_element(corner, corner + 4), *std::max_element(corner, corner + 4),
                   gcd_of(gcd_of(step[0], step[1]), step[2]));
    return true;
}

VPSLICE negative_of(const VPSLICE& s) { return {-s.high, -s.low, s.step}; }

// The members on each side of zero.
template <class F>
void by_sign(const vpset& a, const F& visit) {
    for (const VPSLICE& s : a) {
        const VPSLICE below = slice_between(s.low, std::min(s.high, static_cast<WIDE>(-1)), s),
                      above = slice_between(std::max(s.low, static_cast<WIDE>(0)), s.high, s);
        if (!below.is_empty()) visit(negative_of(below), true);
        if (!above.is_empty()) visit(above, false);
    }
}

} // namespace

bool vpset_sum(vpset* out, const vpset& a, const vpset& b) {
    VPSLICE_LIST list;
    for (const VPSLICE& x : a)
        for (const VPSLICE& y : b) list.push_back(on_grid(x.low + y.low, x.high + y.high, gcd_of(x.step, y.step)));
    *out = vpset_of(list);
    return true;
}

bool vpset_negative(vpset* out, const vpset& a) {
    VPSLICE_LIST list;
    for (const VPSLICE& s : a) list.push_back(negative_of(s));
    *out = vpset_of(list);
    return true;
}

bool vpset_product(vpset* out, const vpset& a, const vpset& b) {
    VPSLICE_LIST list;
    for (const VPSLICE& x : a)
        for (const VPSLICE& y : b) {
            VPSLICE p;
            if (!product_of(x, y, &p)) return false;
            list.push_back(p);
        }
    *out = vpset_of(list);
    return true;
}

void vpset_quotient(vpset* out, const vpset& a, WIDE divisor) {
    VPSLICE_LIST list;
    by_sign(a, [&](const VPSLICE& s, bool is_negative) {
        const bool divides = s.step % divisor == 0;
        const VPSLICE q = on_grid(s.low / divisor, s.high / divisor, divides && s.step ? s.step / divisor : 1);
        list.push_back(is_negative ? negative_of(q) : q);
    });
    *out = vpset_of(list);
}

void vpset_shifted_down(vpset* out, const vpset& a, int count) {
    const WIDE by = static_cast<WIDE>(1) << count;
    VPSLICE_LIST list;
    for (const VPSLICE& s : a) {
        const bool divides = s.step % by == 0;
        list.push_back(on_grid(floor_div(s.low, by), floor_div(s.high, by), divides && s.step ? s.step / by : 1));
    }
    *out = vpset_of(list);
}

void vpset_remainder(vpset* out, const vpset& a, WIDE divisor) {
    VPSLICE_LIST list;
    by_sign(a, [&](const VPSLICE& s, bool is_negative) {
        VPSLICE r = s;
        if (s.high / divisor == s.low / divisor)
            r = on_grid(s.low % divisor, s.high % divisor, s.step);
        else {
            const WIDE g = gcd_of(s.step, divisor);
            r = on_grid(s.low % g, divisor - g + s.low % g, g);
        }
        list.push_back(is_negative ? negative_of(r) : r);
    });
    *out = vpset_of(list);
}

void vpset_absolute(vpset* out, const vpset& a) {
    VPSLICE_LIST list;
    by_sign(a, [&](const VPSLICE& s, bool) { list.push_back(s); });
    *out = vpset_of(list);
}
