// The algebra of dependence vectors, their texts, and their self-check for the debug stream.
#include "OPT5/dd/dependence_vectors.h"

#include "OPT5/dd/dd.h"
#include "OPT5/dd/dependence.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <algorithm>

// ---- Single distances

namespace {

// The bits of the distances from 1 to n, n of 0 to LIMIT.
constexpr uint64_t up_to(int n) { return (uint64_t(1) << n) - 1; }
constexpr uint64_t bit_of(int distance) { return uint64_t(1) << (distance - 1); }

// What is no distance of its own becomes the one behind the limit on its side.
int clipped(INT65 d) {
    if (d > INT65(DVE::LIMIT)) return DVE::LIMIT + 1;
    if (d < INT65(-DVE::LIMIT)) return -DVE::LIMIT - 1;
    return d.fits_in<int>();
}

} // namespace

DVE& DVE::set_distance(INT65 d) {
    const int k = clipped(d);
    if (k > LIMIT)
        overflow_high = true;
    else if (k < -LIMIT)
        overflow_low = true;
    else if (k > 0)
        fwd |= bit_of(k);
    else if (k < 0)
        bwd |= bit_of(-k);
    else
        same = true;
    return *this;
}

DVE& DVE::clr_distance(INT65 d) {
    const int k = clipped(d);
    if (k == 0)
        same = false;
    else if (k > 0 && k <= LIMIT)
        fwd &= ~bit_of(k);
    else if (k < 0 && k >= -LIMIT)
        bwd &= ~bit_of(-k);
    return *this;
}

DVE& DVE::keep_sole_distance(INT65 d) { return keep_min_distance(d).keep_max_distance(d); }

// Above the limit the mark alone is kept: it may stand for distances on either side of `d`.
DVE& DVE::keep_min_distance(INT65 d) {
    const int k = clipped(d);
    if (k < -LIMIT) return *this;
    overflow_low = false;
    bwd &= k < 0 ? up_to(-k) : 0;
    if (k > 0) {
        same = false;
        fwd &= ~up_to(std::min(k - 1, LIMIT));
        if (k > LIMIT) fwd = 0;
    }
    return *this;
}

DVE& DVE::keep_max_distance(INT65 d) {
    set_inverted().keep_min_distance(-clipped(d));
    return set_inverted();
}

bool DVE::has_distance(INT65 d) const {
    const int k = clipped(d);
    if (k > LIMIT) return overflow_high;
    if (k < -LIMIT) return overflow_low;
    if (k == 0) return same;
    return k > 0 ? fwd & bit_of(k) : bwd & bit_of(-k);
}

bool DVE::has_exact_distance() const {
    const auto is_power = [](uint64_t m) { return m && !(m & (m - 1)); };
    if (overflow_high || overflow_low) return false;
    if (same) return !has_FWD_dirs() && !has_BWD_dirs();
    return exact(fwd) ? is_power(exact(fwd)) && !exact(bwd) : is_power(exact(bwd));
}

bool DVE::is_exact_distance(INT65 d) const { return has_exact_distance() && INT65(exact_distance()) == d; }

int DVE::exact_distance() const {
    OPT_ASSERT(has_exact_distance());
    if (same) return 0;
    return exact(fwd) ? __builtin_ctzll(fwd) + 1 : -(__builtin_ctzll(bwd) + 1);
}

int DVE::threshold() const {
    if (exact(fwd)) return __builtin_ctzll(fwd) + 1;
    return overflow_high ? LIMIT + 1 : 0;
}

// ---- Sets

DVE& DVE::operator&=(const DVE& o) {
    fwd &= o.fwd;
    bwd &= o.bwd;
    overflow_high &= o.overflow_high;
    overflow_low &= o.overflow_low;
    same &= o.same;
    return *this;
}

DVE& DVE::operator|=(const DVE& o) {
    fwd |= o.fwd;
    bwd |= o.bwd;
    overflow_high |= o.overflow_high;
    overflow_low |= o.overflow_low;
    same |= o.same;
    return *this;
}

bool DVE::operator==(const DVE& o) const {
    return exact(fwd) == exact(o.fwd) && exact(bwd) == exact(o.bwd) && overflow_high == o.overflow_high &&
           overflow_low == o.overflow_low && same == o.same;
}

DVE& DVE::set_inverted() {
    std::swap(fwd, bwd);
    const bool high = overflow_high;
    overflow_high = overflow_low;
    overflow_low = high;
    return *this;
}

// ---- Vectors

DDEP::DDEP(int levels, bool all) : dve(static_cast<size_t>(levels + 1)) {
    OPT_ASSERT(levels >= -1 && levels < INT16_MAX);
    if (all)
        for (DVE& e : dve) e.set_ALL_dirs();
    if (!dve.empty()) dve[0].clr_ALL_dirs().set_SAME_dir();
}

DDEP::DDEP(const DDEP& o)
    : kind(o.kind), feasibleLevel(o.feasibleLevel), feasible(o.feasible), NotAllSame(o.NotAllSame), spec(o.spec),
      dve(o.dve) {}

DVE& DDEP::ddve(int level) {
    OPT_ASSERT(level >= 0 && level < count());
    return dve[static_cast<size_t>(level)];
}

bool DDEP::is_independent() const {
    for (const DVE& e : dve)
        if (e.is_independent()) return true;
    return feasible && feasibleLevel <= 0 && all_are_DVE_SAME();
}

bool DDEP::all_are_DVE_SAME() const { return count_SAME_DVEs() == count(); }

int DDEP::count_SAME_DVEs() const {
    return static_cast<int>(std::count_if(dve.begin(), dve.end(), [](const DVE& e) { return e.is_SAME_dir(); }));
}

bool DDEP::not_all_DVE_SAME(const NODE* v1, const NODE* v2, struct LOOP* loop) {
    if (NotAllSame || (feasible && feasibleLevel <= 0)) return true;
    for (const DVE& e : dve)
        if (!e.has_SAME_dir()) return NotAllSame = true;
    if (!v1 || !v2 || !loop) return false;
    return NotAllSame = !lvalues_collide_in_iteration(v1, v2, loop);
}

void DDEP::set_inverted() {
    for (DVE& e : dve) e.set_inverted();
}

void DDEP::set_union(const DDEP* o) {
    if (!o || o == this) return;
    OPT_ASSERT(count() == o->count());
    for (size_t i = 0; i < dve.size(); ++i) dve[i] |= o->dve[i];
    NotAllSame &= o->NotAllSame;
}

DDEP_PTR set_intersection(DDEP_PTR v, const DDEP* o) {
    if (!o) return nullptr;
    OPT_ASSERT(v->count() == o->count());
    v->NotAllSame |= o->NotAllSame;
    for (size_t i = 0; i < v->dve.size(); ++i)
        if ((v->dve[i] &= o->dve[i]).is_independent()) return nullptr;
    return v;
}

// Levels lose their backward distances as long as all levels outside them are the same iteration. Those within a level
// that may differ keep all: where it does differ, anything may follow.
DDEP_PTR make_feasible(DDEP_PTR v, int level, bool same_statement) {
    v->feasible = true;
    v->feasibleLevel = static_cast<int8_t>(std::clamp<int>(level, INT8_MIN, INT8_MAX));
    if (v->count() > 0) v->dve[0].clr_FWD_BWD_dirs();
    const bool strict = level >= 0 && !same_statement;
    bool leading = true;
    for (int k = 1; k < v->count(); ++k) {
        DVE& e = v->dve[static_cast<size_t>(k)];
        if (leading) {
            e.clr_BWD_dirs();
            if (!e.is_SAME_dir()) leading = false;
            if (!strict && k == v->count() - 1) e.clr_SAME_dir();
        }
        if (e.is_independent()) return nullptr;
        if (!e.has_SAME_dir()) v->NotAllSame = true;
    }
    if (strict) return v;
    v->NotAllSame = true;
    return leading ? nullptr : std::move(v);
}

// ---- Texts

namespace {

// A list of distances; `parted` tells that the next part needs a separator.
class LISTING {
public:
    void part(const char* text) {
        if (parted) out += '|';
        out += text;
        parted = true;
    }
    void distances(const DVE& v, int first, int last) {
        for (int d = first; d <= last; ++d) {
            if (!v.has_distance(d)) continue;
            int end = d;
            while (end < last && v.has_distance(end + 1)) ++end;
            if (end - d < 2) {
                part(std::to_string(d).c_str());
                continue;
            }
            part(("[" + std::to_string(d) + ":" + std::to_string(end) + "]").c_str());
            parted = false;
            d = end;
        }
    }
    std::string out;
    bool parted = false;
};

} // namespace

std::string dve2string(const DVE& v) {
    if (v.is_independent()) return ".";
    if (v.is_ALL_dirs()) return "*";
    LISTING list;
    if (v.whole_BWD())
        list.part(">");
    else {
        if (v.overflows_low()) list.out = "...|";
        list.distances(v, -DVE::LIMIT, -1);
    }
    if (v.has_SAME_dir()) list.part("=");
    if (v.whole_FWD())
        list.part("<");
    else {
        list.distances(v, 1, DVE::LIMIT);
        if (v.overflows_high()) list.out += "|...";
    }
    return list.out;
}

std::string DDEP::text() const {
    std::string out = "{DDEP(" + std::to_string(count()) + "):";
    for (const DVE& e : dve) out += " " + dve2string(e) + " ";
    if (NotAllSame) out += ": NotAllSame";
    if (spec) out += " (spec " + std::to_string(spec) + ")";
    return out + "}";
}

// ---- Self-check

namespace {

DVE all_directions() { return DVE().set_ALL_dirs(); }

void check_single_distance(int d) {
    DVE v = all_directions().keep_sole_distance(d);
    OPT_ASSERT(v.is_dependent() && v.has_distance(d));
    OPT_ASSERT(all_directions().keep_min_distance(d).keep_max_distance(d) == v);
    const bool is_beyond = d < -DVE::LIMIT || d > DVE::LIMIT;
    OPT_ASSERT(v.has_exact_distance() != is_beyond);
    if (is_beyond) {
        OPT_ASSERT(v == (d > 0 ? DVE().set_overflow_high() : DVE().set_overflow_low()));
        return;
    }
    OPT_ASSERT(v.is_exact_distance(d) && v.exact_distance() == d);
    OPT_ASSERT(DVE(v).set_inverted().is_exact_distance(-d));
    OPT_ASSERT(DVE(v).set_inverted().set_inverted() == v);
    OPT_ASSERT(DVE().set_distance(d).clr_distance(d).is_independent());
}

} // namespace

void do_DVE_unit_testing() {
    debug_printf("DVE Unit Test #1\n");
    for (int d = -DVE::LIMIT; d <= DVE::LIMIT; ++d) check_single_distance(d);
    debug_printf("DVE Unit Test #2\n");
    for (int d : {-DVE::LIMIT - 1, DVE::LIMIT + 1}) check_single_distance(d);
    debug_printf("DVE Unit Test #3\n");
    OPT_ASSERT(DVE().set_distance(7).set_distance(3).threshold() == 3);
    OPT_ASSERT(DVE().set_overflow_high().threshold() == DVE::LIMIT + 1);
    OPT_ASSERT(DVE().threshold() == 0);
}
