// The inliners: which call sites are worth the body of the callee.
//
// `auto_inline_call_sites` collects the sites of the file, sorts out what cannot be expanded, and lets the strategy choose.
// What it leaves is in the FUNINFOs: the sets of call sites, the saved bodies, and which definitions drop out.
#pragma once

#include "OPT5/ir/funinfo.h"

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

class BBLK;
class NODE;
class TYPE;
struct PSN;

// One call of a function that was read.
struct CALLSITE {
    FUNINFO* caller = nullptr;
    uint32_t id = 0;           // the bit in the caller's sets of call sites
    FUNINFO* callee = nullptr; // null for a call through a pointer
    const PSN* psn = nullptr;
    TYPE* type = nullptr; // of the function that is called
    int16_t loop = 0;          // height of the block's loop in the nest: 1 for an innermost loop, 0 for none
    int16_t depth = 0;         // of the block's loop, 0 for none
    int8_t nargs = 0, nconstargs = 0;
    int32_t pressure = 0;
    float fold_ratio = 1.0F;
    double temp = -1.0; // frequency of the block
    bool postdom = false;
    bool inlineable = false;
    float priority = 0;
    NODE* args = nullptr; // a copy, owned
    bool forced = false, forced_deep = false;
    bool is_accepted = false;
    const char* refusal = nullptr; // why it is no candidate; null of one

    CALLSITE() = default;
    CALLSITE(const CALLSITE&) = delete;
    CALLSITE& operator=(const CALLSITE&) = delete;
    ~CALLSITE();
    std::string description() const;
};
using SITES = std::vector<CALLSITE*>;
using SITE_PREDICATE = std::function<bool(const CALLSITE&)>; // empty: every site

int cost(const CALLSITE& site);

// ---- What the run of the inliner works on

struct INLINE_LIMITS {
    int64_t quadratic = 0; // of the sum of squared times; 0: none, as for the others
    int64_t linear = 0;
    uint32_t loops = 0, blocks = 0;
    bool any() const { return quadratic > 0 || linear > 0 || loops || blocks; }
};

// The functions of the file, their sites, and the sums of their times.
class INLINE_FILE {
public:
    explicit INLINE_FILE(std::vector<FUNINFO*> list) : functions(std::move(list)) {}
    const std::vector<FUNINFO*> functions; // in call-graph order
    std::vector<std::unique_ptr<CALLSITE>> owned;
    SITES accepted;

    SITES& sites_of(const FUNINFO* f) { return by_caller[f]; }
    void measure(); // anew, from all functions
    int64_t quadratic() const { return quadratic_m; }
    int64_t linear() const { return linear_m; }
    void set_time(FUNINFO* f, uint32_t time);
    // The engine: tries the sites in order and keeps what stays within the limits.
    void pass(const SITES& sites, const SITE_PREDICATE& predicate, const char* label, const INLINE_LIMITS& limits);

private:
    struct DELTAS {
        uint32_t time = 0, bbs = 0, syms = 0, loops = 0, ncalls = 0; // they wrap
        bool any() const { return time || bbs || syms || loops || ncalls; }
    };
    struct TRIAL;
    void apply(const CALLSITE& site, TRIAL* trial);
    void cascade(FUNINFO* into, const DELTAS& d);
    void undo(const CALLSITE& site, const TRIAL& trial);
    void add(FUNINFO* f, const DELTAS& d);
    bool is_too_big(const CALLSITE& site, const INLINE_LIMITS& limits) const;
    void accept(CALLSITE& site);

    std::unordered_map<const FUNINFO*, SITES> by_caller;  // looked up
    std::unordered_map<const FUNINFO*, SITES> into_m;     // accepted sites by callee; looked up
    int64_t quadratic_m = 0, linear_m = 0;
};

// ---- Strategies

class INLINER {
public:
    virtual ~INLINER() = default;
    virtual SITE_PREDICATE static_inlining_predicate() = 0;
    virtual void further_setup(INLINE_FILE& file, SITES& sites) = 0;
    virtual void auto_inlining_passes(INLINE_FILE& file, const SITES& sites) = 0;
    virtual void collect_pass_1_info(INLINE_FILE& file) = 0; // of the current function
    virtual bool warn_inline_recursion_limit() { return true; }
    virtual int site_benefit(const CALLSITE& site) = 0;

    int64_t static_limit = 0, auto_limit = 0; // in units of squared time
};

class OLD_INLINER : public INLINER {
public:
    SITE_PREDICATE static_inlining_predicate() override;
    void further_setup(INLINE_FILE& file, SITES& sites) override;
    void auto_inlining_passes(INLINE_FILE& file, const SITES& sites) override;
    void collect_pass_1_info(INLINE_FILE& file) override;
    int site_benefit(const CALLSITE&) override { return 1; }
};

// The strategy by size, for asked-for functions within a limit on growth.
class REVISED_OLD_INLINER : public OLD_INLINER {
public:
    SITE_PREDICATE static_inlining_predicate() override;
    void further_setup(INLINE_FILE& file, SITES& sites) override;
};

// By benefit over cost, leaves first.
class NEW_INLINER : public INLINER {
public:
    SITE_PREDICATE static_inlining_predicate() override;
    void further_setup(INLINE_FILE& file, SITES& sites) override;
    void auto_inlining_passes(INLINE_FILE& file, const SITES& sites) override;
    void collect_pass_1_info(INLINE_FILE& file) override;
    int site_benefit(const CALLSITE& site) override;

protected:
    virtual void measure(); // the current function, whose blocks get frequencies
    void set_limits(const INLINE_FILE& file);
    static void sort_by_worth(SITES& sites);
    static INLINE_LIMITS growth_limits(int64_t quadratic, int64_t linear);
    // Passes until one accepts nothing.
    static void waves(INLINE_FILE& file, const SITES& sites, const SITE_PREDICATE& predicate, const char* label,
                      const INLINE_LIMITS& limits);
    void pass_of_single_sites(INLINE_FILE& file, const SITES& sites);
};

// By frequency: counts flow through the call graph.
class NEWER_INLINER : public NEW_INLINER {
public:
    void further_setup(INLINE_FILE& file, SITES& sites) override;
    void auto_inlining_passes(INLINE_FILE& file, const SITES& sites) override;
    int site_benefit(const CALLSITE& site) override;

protected:
    void measure() override;
};

// Benefit by frequency, in the order of benefit over cost.
class INLINER_5 : public NEW_INLINER {
public:
    void further_setup(INLINE_FILE& file, SITES& sites) override;
    int site_benefit(const CALLSITE& site) override;
};

extern std::unique_ptr<INLINER> inliner;

// ---- Collecting (call_sites.cpp)

int register_pressure_for_block(const BBLK* bb); // live variables at its end; needs fact::live_variables
// The sites of the current function, with what is known of their blocks. Without `pressure_of` no pressure is measured.
void collect_call_sites(INLINE_FILE& file, int (*pressure_of)(const BBLK*) = nullptr);
void measure_sizes(); // estimates of the current function, before anything is expanded
bool arguments_fit_parameters(const NODE* call, const SYMTAB* callee);

// ---- What strategies by benefit share (new_inliner.cpp, fold_estimate.cpp)

void drop_undesirable_sites(SITES& sites);
void estimate_folding_of(const SITES& sites); // nothing where that is switched off
void estimate_folding(CALLSITE& site);        // sets `fold_ratio`
bool folding_is_estimated();
bool profiles_are_ignored();
void measure_density(bool known_only); // `known_only`: over the blocks that have a frequency

// ---- Tests (inline.cpp). The reason of the last answer is kept for the commentary.

bool is_inline_candidate(const CALLSITE& site, const char** reason);
bool is_inlineable(const CALLSITE& site, const char** reason);
bool has_inline_qualifier(const FUNINFO* f);
// Not so for one that finds its further arguments by the address of the last.
bool has_body_to_copy(FUNINFO* f);
bool inline_commentary_is_on();
// To the debug stream and, with an info file, to that.
void inline_commentary(const char* format, ...) __attribute__((format(printf, 1, 2)));
