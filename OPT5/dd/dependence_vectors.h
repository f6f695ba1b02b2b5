// Dependence vectors: in which iterations of the loops around them two references may touch the same object.
//
// A DVE says it for one loop: the set of distances, later iteration minus earlier one as the sign tells, from the
// iteration of the first reference to that of the second. Distances from -32 to 32 are exact; what lies beyond on either
// side is one mark each. A DDEP has one for each loop around both, outermost first. Plain values: they know neither trees
// nor loops, and `dependence.h` fills them. An empty set is a proof that the two never meet.
//
// Who holds a vector that an operation may prove empty gives it up to that operation (DDEP_PTR by value) and takes what
// is left, null for independent: nobody can go on with a vector that is gone.
#pragma once

#include "XINT/int65.h"

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

class NODE;
struct LOOP;

class DVE {
public:
    static constexpr int LIMIT = 32; // the farthest distance with a bit of its own

    // Masks: bit k-1 stands for distance k, or -k. The bits above 31 stand for no distance; they are set along with all
    // others where every distance of the side is meant.
    uint64_t fwd = 0, bwd = 0;
    bool overflow_high : 1, overflow_low : 1, same : 1; // distances above 32, below -32, 0

    DVE() : overflow_high(false), overflow_low(false), same(false) {}

    // Whole sides. FWD is every distance above 0, BWD every one below, SAME is 0.
    DVE& set_ALL_dirs() { return set_SAME_dir().set_FWD_dirs().set_BWD_dirs(); }
    DVE& clr_ALL_dirs() { return clr_SAME_dir().clr_FWD_dirs().clr_BWD_dirs(); }
    DVE& set_SAME_dir() { return same = true, *this; }
    DVE& clr_SAME_dir() { return same = false, *this; }
    DVE& set_FWD_dirs() { return fwd = ~uint64_t(0), overflow_high = true, *this; }
    DVE& clr_FWD_dirs() { return fwd = 0, overflow_high = false, *this; }
    DVE& set_BWD_dirs() { return bwd = ~uint64_t(0), overflow_low = true, *this; }
    DVE& clr_BWD_dirs() { return bwd = 0, overflow_low = false, *this; }
    DVE& set_SAME_FWD_dirs() { return set_SAME_dir().set_FWD_dirs(); }
    DVE& set_SAME_BWD_dirs() { return set_SAME_dir().set_BWD_dirs(); }
    DVE& clr_SAME_FWD_dirs() { return clr_SAME_dir().clr_FWD_dirs(); }
    DVE& clr_SAME_BWD_dirs() { return clr_SAME_dir().clr_BWD_dirs(); }
    DVE& clr_FWD_BWD_dirs() { return clr_FWD_dirs().clr_BWD_dirs(); }

    bool is_independent() const { return !is_dependent(); }
    bool is_dependent() const { return same || has_FWD_dirs() || has_BWD_dirs(); }

    // The set meets the side.
    bool has_SAME_dir() const { return same; }
    bool has_FWD_dirs() const { return overflow_high || exact(fwd); }
    bool has_BWD_dirs() const { return overflow_low || exact(bwd); }
    bool has_SAME_FWD_dirs() const { return same || has_FWD_dirs(); }
    bool has_SAME_BWD_dirs() const { return same || has_BWD_dirs(); }
    // It meets more than one of the three.
    bool has_compound_dirs() const { return has_FWD_dirs() + has_SAME_dir() + has_BWD_dirs() > 1; }

    // Not empty, and nothing outside the side.
    bool has_only_SAME_dir() const { return same && !has_FWD_dirs() && !has_BWD_dirs(); }
    bool has_only_FWD_dirs() const { return has_FWD_dirs() && !has_SAME_BWD_dirs(); }
    bool has_only_BWD_dirs() const { return has_BWD_dirs() && !has_SAME_FWD_dirs(); }
    bool has_only_SAME_FWD_dirs() const { return has_SAME_FWD_dirs() && !has_BWD_dirs(); }
    bool has_only_SAME_BWD_dirs() const { return has_SAME_BWD_dirs() && !has_FWD_dirs(); }

    // Every distance of the side is there.
    bool has_all_FWD_dirs() const { return overflow_high && exact(fwd) == EXACT; }
    bool has_all_BWD_dirs() const { return overflow_low && exact(bwd) == EXACT; }
    bool has_all_SAME_FWD_dirs() const { return same && has_all_FWD_dirs(); }
    bool has_all_SAME_BWD_dirs() const { return same && has_all_BWD_dirs(); }

    // Exactly the side, and said as a whole: distances that were put together one by one are a list.
    bool is_SAME_dir() const { return has_only_SAME_dir(); }
    bool is_FWD_dir() const { return whole_FWD() && !has_SAME_BWD_dirs(); }
    bool is_BWD_dir() const { return whole_BWD() && !has_SAME_FWD_dirs(); }
    bool is_SAME_FWD_dir() const { return whole_FWD() && same && !has_BWD_dirs(); }
    bool is_SAME_BWD_dir() const { return whole_BWD() && same && !has_FWD_dirs(); }
    bool is_ALL_dirs() const { return whole_FWD() && whole_BWD() && same; }
    bool whole_FWD() const { return overflow_high && fwd == ~uint64_t(0); }
    bool whole_BWD() const { return overflow_low && bwd == ~uint64_t(0); }

    // Single distances. Beyond the limits the mark of the side stands for them: it may be set, kept and asked, and
    // is cleared only where all that it may stand for is.
    DVE& set_distance(INT65 d);
    DVE& clr_distance(INT65 d);          // beyond the limits: nothing is removed
    DVE& keep_sole_distance(INT65 d);    // the others go
    DVE& keep_min_distance(INT65 d);     // those below go
    DVE& keep_max_distance(INT65 d);     // those above go
    bool has_distance(INT65 d) const;
    bool has_exact_distance() const;     // one distance, with a bit of its own
    bool is_exact_distance(INT65 d) const;
    int exact_distance() const;          // that one; it ends the run where there is none
    int threshold() const;               // the least forward distance; 33 where only the mark is set, 0 for none
    DVE& set_overflow_high() { return overflow_high = true, *this; }
    DVE& set_overflow_low() { return overflow_low = true, *this; }
    bool overflows_high() const { return overflow_high; }
    bool overflows_low() const { return overflow_low; }

    // The algebra of sets.
    DVE& operator&=(const DVE& o);
    DVE& operator|=(const DVE& o);
    friend DVE operator&(DVE a, const DVE& b) { return a &= b; }
    friend DVE operator|(DVE a, const DVE& b) { return a |= b; }
    bool operator==(const DVE& o) const;
    bool operator!=(const DVE& o) const { return !(*this == o); }
    DVE& set_inverted(); // each d becomes -d: the two references change places

private:
    static constexpr uint64_t EXACT = 0xFFFFFFFF;
    static constexpr uint64_t exact(uint64_t mask) { return mask & EXACT; }
};

// From low to high: "." none, "*" all, ">" all backward, "=" the same iteration, "<" all forward, "[1:3]" a run, "..." what
// lies beyond; parts are parted by "|", except behind a run.
std::string dve2string(const DVE& v);

class DDEP;
using DDEP_PTR = std::unique_ptr<DDEP>;

class DDEP {
public:
    DDEP_PTR next;        // of a list
    uint16_t kind = 0xFFFF; // 1: an edge that speculation removes, without elements
    int8_t feasibleLevel = 0;
    bool feasible = false;   // an order of the iterations has been imposed: `make_feasible`
    bool NotAllSame = false; // the iterations of the two are not the same at all levels
    int32_t spec = 0;        // how many levels, from the innermost one, were taken to carry it; 0: all
    std::vector<DVE> dve;    // by loop level; the first is the function's body, and SAME always

    // All directions at each of the levels, or none. `levels` -1 has no element at all.
    DDEP(int levels, bool all);
    DDEP(const DDEP& o); // without its place in a list
    DDEP& operator=(const DDEP&) = delete;

    int count() const { return static_cast<int>(dve.size()); } // levels + 1
    DVE& ddve(int level);                                      // a level that is not there ends the run
    const DVE& ddve(int level) const { return const_cast<DDEP*>(this)->ddve(level); }

    bool is_independent() const;
    bool all_are_DVE_SAME() const;
    int count_SAME_DVEs() const;
    // Whether it is certain that they meet in different iterations only, or never. With both references and a loop they
    // are asked whether they meet in one iteration of it; what is found out is kept.
    bool not_all_DVE_SAME(const NODE* v1, const NODE* v2, struct LOOP* loop);
    void set_inverted();
    // Either of the two; null and the vector itself add nothing. Another number of levels ends the run.
    void set_union(const DDEP* o);

    bool operator==(const DDEP& o) const { return dve == o.dve; }
    bool operator!=(const DDEP& o) const { return !(*this == o); }
    std::string text() const; // for people
};

// Both of the two; null where they have nothing in common. Another number of levels ends the run.
[[nodiscard]] DDEP_PTR set_intersection(DDEP_PTR v, const DDEP* o);

// What is left when the first reference is to come first: the first level at which the iterations differ runs forward.
// `level` tells how they stand in one iteration: above 0 the first may precede the second; 0: not ordered, and the same
// access if all iterations are the same; below 0 the second precedes. `same_statement`: one statement does both, in one
// go. Null where no order is left.
[[nodiscard]] DDEP_PTR make_feasible(DDEP_PTR v, int level, bool same_statement);
