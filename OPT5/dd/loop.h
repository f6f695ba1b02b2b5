// The loop hierarchy: the tree of natural loops of the current function, and what is known of each.
//
// It hangs off the first block: the root stands for the function's body, every other LOOP for one natural loop, which
// has one preheader, one latch and exit blocks of its own. `build_loop_hierarchy` makes it, on trees in normal form; it
// is made anew where the graph has changed, never patched, and gone before blocks are simplified.
//
//     hierarchy.cpp        the build, shape of the graph, discovery, preheaders, exits      while_tests.cpp replicated
//     tests loop_symbols.cpp     invariants, and the questions about them                         value_search.cpp
//     values on entry induction_variables.cpp   candidates, increments, the control variable loop_bounds.cpp   ranges
//     of variables trip_count.cpp, trip_bounds.cpp   affine variables, counts and what is known of them
//     loop_pragmas.cpp  promises in and out loop_assertions.cpp  facts that hold in a loop loop_variables.cpp   other
//     scalars
//
// Trees that a record holds are owned by it; trees that an operation takes are borrowed unless it says so. Every
// question answers "no", null or ILLOP where it cannot be decided.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/node.h"
#include "XINT/int65.h"

#include <cstdint>
#include <memory>
#include <set>
#include <string>
#include <unordered_map>
#include <vector>

class SYMTAB;
struct LOOP;

// By the order in which symbols were made.
struct BY_UID {
    bool operator()(const SYMTAB* a, const SYMTAB* b) const;
};
using SYM_SET = std::set<SYMTAB*, BY_UID>;

// ---- Region constants with a known value, and induction variables

enum IV_FLAG : uint64_t {
    IV_used_in_loop = 0x1, // of the control variable: read apart from its updates and the exit test
    IV_dead_on_exit = 0x2,
    IV_low_is_exact = 0x10,
    IV_high_is_exact = 0x20,
    IV_updated_in_tail = 0x40, // or in a block that runs once an iteration
    IV_updated_in_head = 0x80,
    IV_decreases = 0x100,
    IV_increases = 0x200,
    IV_affine = 0x400, // the value in iteration i is init + i * incrtree, without wrapping
    IV_is_RC = 0x800,
    IV_is_IV = 0x1000,
    IV_is_VLCV = 0x2000,
    IV_is_ULCV = 0x4000, // the control variable, and of the source
    IV_is_LCV = 0x8000,
    IV_narrowed = 0x10000, // an update converts to or from a narrower integer
    // The order in the body of updates and reads.
    IV_update_seen = 0x100000,
    IV_read_seen = 0x200000,
    IV_read_before_update = 0x400000,
    IV_update_before_read = 0x800000,
    IV_order = 0xF00000,
};
constexpr uint64_t VLCV_FLAGS = 0x703642;

struct LOOPIV {
    struct LOOP* loop = nullptr;
    SYMTAB* sym = nullptr;
    std::vector<NODE*> entryGivens; // conditions on the value on entry
    NODE* norm = nullptr;
    NODE *ssa_norm = nullptr, *ssa_init = nullptr, *ssa_incr = nullptr; // in SSA form, not built yet
    NODE* init = nullptr;                                               // on entry; null: not known
    NODE* last = nullptr;     // in the last iteration; the control variable's is the limit that it is tested against
    NODE* incrtree = nullptr; // by iteration
    NODE* virtualInit = nullptr;
    INT65 highval, lowval; // bounds of the value
    uint64_t flags = 0;

    LOOPIV() = default;
    LOOPIV(const LOOPIV&) = delete; // copies are deep: copy_LOOPIV_list
    LOOPIV& operator=(const LOOPIV&) = delete;
    ~LOOPIV();
    bool has(uint64_t bits) const { return (flags & bits) != 0; }
};

// ---- Other scalars that the loop assigns

enum LV_FLAG : uint16_t {
    LV_dead_on_exit = 0x1, // on all exits and behind the tail
    LV_dead_on_entry = 0x2,
    LV_used_elsewhere = 0x8, // in a loop around this one or in it
    LV_defined_elsewhere = 0x10,
};
constexpr uint16_t MOST_LV_COUNT = 666; // the counters stop there

struct LOOPLV {
    struct LOOP* loop = nullptr;
    SYMTAB* sym = nullptr;
    BBLK *firstBB = nullptr, *lastBB = nullptr; // of the references
    uint16_t defs = 0, usingDefs = 0, uses = 0, derefUses = 0;
    uint16_t flags = 0;
};

// ---- Loops

enum LOOP_FLAG : uint32_t {
    LOOP_unroll_requested = 0x1,
    LOOP_conservative = 0x8,
    LOOP_deprecated = 0x10,
    LOOP_favored = 0x20,
    LOOP_unaliased = 0x40,
    LOOP_aligned = 0x80,
    LOOP_early_exit = 0x100, // left other than from the tail, or from a loop in it
    LOOP_has_call = 0x400,
    LOOP_signed_bounds = 0x1000, // the control variable's type cannot wrap
    LOOP_lower_right = 0x2000,
    LOOP_lower_left = 0x4000,
    LOOP_has_trip_predicate = 0x8000,
};

// A place in the source; file and line are 0 where not known.
struct SOURCE_PLACE {
    std::string file;
    int64_t line = 0, column = 0;
};

// What a copy of a loop has in common with it as it is: no trees, no links to other loops.
struct LOOP_VALUES {
    std::vector<BBLK*> contents; // by block number; of a loop in it the head alone, whose `loop` is that loop
    std::vector<BBLK*> exits;    // blocks outside that are reached from it, and from nowhere else; by block number
    BBLK* preheader = nullptr;   // null of the root
    BBLK* head = nullptr;
    BBLK* tail = nullptr; // holds the only back edge
    SYM_SET RC_syms;      // read and not changed in the loop, of no loop around it
    SYM_SET ALT_syms;     // changed
    std::vector<SYMTAB*> IV_syms;
    std::shared_ptr<SYMTAB> virtual_symbol; // of the virtual control variable, on no list of the function
    std::vector<LOOPLV> LVs;
    SOURCE_PLACE sourceStart, sourceEnd;
    uint32_t flags = 0;
    int uid = 0; // depth first from 0, the root
    uint16_t unrollAmount = 1;
    int16_t level = 0;
    uint8_t test; // of the exit predicate `LCV test last`: control stays in the loop while it holds; ILLOP without
    bool irreducible = false; // of the root: a cycle is no natural loop, so that the tree is the root alone
    int32_t constraint_flags = 0;
    int32_t unPartitionedII = 0, partitionedII = 0, resII = 0, recII = 0, minII = 0, estII = 0;
    int32_t LUnits = 0, SUnits = 0, MUnits = 0, DUnits = 0, addUnits = 0, logicalUnits = 0;
    int32_t reg_pressure = 0, predicatePressure = 0, live2longs = 0, interruptLimit = 0;
    int32_t Xpaths = 0, Tpaths = 0, longReads = 0, longWrites = 0;

    LOOP_VALUES() : test(ILLOP) {}
};

struct LOOP : LOOP_VALUES {
    LOOP* parent = nullptr; // null of the root
    LOOP* counterpart = nullptr;
    LOOP* reflection = nullptr;
    LOOPIV* LCV = nullptr;  // of `IVs`
    LOOPIV* VLCV = nullptr; // of `IVs`: the count of iterations from 0
    std::vector<std::unique_ptr<LOOPIV>> IVs;
    std::unordered_map<const SYMTAB*, LOOPIV*> record_of; // those of `IVs`; looked up alone
    std::unordered_map<const SYMTAB*, NODE*> rdefs; // definitions that reach the entry, while data is propagated in SSA form
    NODE* trips = nullptr;                                // executions of the tail for each entry; an ICON where exact
    NODE *tripFactor = nullptr, *maxTrips = nullptr, *minTrips = nullptr; // ICONs, null before they are asked for
    // PPRAGMA trees, null without.
    NODE *mustIterate = nullptr, *probIterate = nullptr, *unrollPragma = nullptr, *unrollAmountPragma = nullptr;
    NODE *loopNoAliasPragma = nullptr, *mmaLoopPragma = nullptr, *sourceLoopPragma = nullptr;
    NODE *tripCntrMungedPragma = nullptr, *noAliasClonePragma = nullptr, *loopFlagsPragma = nullptr;
    NODE *parallelLoopPragma = nullptr, *coalesceLoopPragma = nullptr, *noCoalesceLoopPragma = nullptr;
    NODE *noNlcPragma = nullptr, *spConstraintPragma = nullptr, *iiEstimatePragma = nullptr;
    NODE *unitResourcesPragma = nullptr, *spHindrancesPragma = nullptr, *readWritePragma = nullptr;
    std::vector<NODE*> noAliasAdvice, aliasAdvice, alignAdvice, inlineAdvice;
    std::vector<NODE*> givens; // conditions that hold throughout the loop; those of FUNINFO outlive the hierarchy

    LOOP() = default;
    LOOP(const LOOP&) = delete; // copies are deep: make_LOOP
    LOOP& operator=(const LOOP&) = delete;
    ~LOOP();
    bool has(uint32_t bits) const { return (flags & bits) != 0; }
    bool is_root() const { return parent == nullptr; }
    bool is_bottom_tested() const; // the tail ends in an IF, one target of which is the head
};

template <class F>
void for_each_subloop(const struct LOOP* l, F&& visit); // those directly in it, by block number

// Whether a field that may be null is a number.
inline bool is_icon(const NODE* field) { return field && field->op == ICON; }

// ---- hierarchy.cpp

// `full`: with replication of tests and ranges by subscripts; `scalars`: with forwarding in loops; `simplify`: loops
// that can be decided fold. `requireLoops` nonzero: a function without back edges gets no hierarchy; below 0: as
// `full`.
void build_loop_hierarchy(bool full, bool scalars, bool simplify, int requireLoops);
// What the build calls of the rooms above; null until they are there.
struct LOOP_WORK {
    void (*propagate_values)() = nullptr;
};
extern LOOP_WORK loop_work;
// The tree alone, for who needs the nesting: no symbols, no pragmas taken.
void build_minimal_loop_hierarchy(bool requireLoops);
void unbuild_loop_hierarchy(); // pragmas go back to their preheaders first
void erase_loop_hierarchy();   // what the records hold is lost
void erase_loop_and_subloops(struct LOOP* loop);
struct LOOP* loop_root(); // of the current function; null without a hierarchy
// A new record, or a deep copy of `model` without its links to other loops; `uid` below 0 keeps the model's.
std::unique_ptr<struct LOOP> make_LOOP(BBLK* head, BBLK* tail, int uid, const struct LOOP* model);
void add_exit_blocks(struct LOOP* root);
void assign_loop_levels(struct LOOP* loop, int level);
void assign_loop_numbers(struct LOOP* loop, int number);
void ensure_proper_preheader_for_loop(struct LOOP* loop);
void sort_loop_contents_into_DFO(struct LOOP* loop);
void rebind_clones(struct LOOP* root);
// A loop without its partner is no clone any more: the code generator is not told that it is one.
void unmark_singleton_clones(struct LOOP* root);
void erase_loop_pragmas(struct LOOP* loop); // what the record holds
struct LOOP* innermost_common_loop(struct LOOP* a, struct LOOP* b);
bool loop_is_subloop_of_loop(const struct LOOP* inner, const struct LOOP* outer, bool or_same);
bool loop_has_subloops(const struct LOOP* loop);
bool bb_dominates_bb(BBLK* a, BBLK* b);
bool bb_post_dominates_bb(BBLK* a, BBLK* b);
// What is wrong with the tree, to the debug stream or stderr; the number of findings.
int validate_loop_hierarchy();
void dump_loop_hierarchy(const struct LOOP* loop); // to the debug stream
// Loops from the root, each ahead of those in it, and each behind those in it. Without recursion.
std::vector<struct LOOP*> loops_outer_first(struct LOOP* root);
std::vector<struct LOOP*> loops_inner_first(struct LOOP* root);

// ---- loop_symbols.cpp

void find_region_constants(struct LOOP* loop);
bool sym_is_RC_in_loop(const SYMTAB* sym, const struct LOOP* loop);
// With `lcvCounts` the loop's control variables count as invariant.
bool tree_is_RC_in_loop(const NODE* tree, const struct LOOP* loop, bool lcvCounts);
// -1 invariant, 1 of the control variable, 0 neither.
int expr_is_affine_in_loop(const NODE* tree, const struct LOOP* loop, bool strict);
void make_sym_RC_in_loop(SYMTAB* sym, struct LOOP* loop);
void make_sym_altered_in_loop(SYMTAB* sym, struct LOOP* loop);
LOOPIV* alloc_LOOPIV(SYMTAB* sym, struct LOOP* loop); // at the end of the loop's records
void delete_LOOPIV(LOOPIV* iv);
LOOPIV* find_LOOPIV_for_IV(const SYMTAB* sym, const struct LOOP* loop, bool outer_too);
LOOPLV* find_LOOPLV_for_LV(const SYMTAB* sym, struct LOOP* loop);
// The loop around, or `loop`, whose control variable it is.
struct LOOP* find_loop_for_LCV(const SYMTAB* sym, struct LOOP* loop);
LOOPIV* find_LCV_for_loop(const struct LOOP* loop, uint64_t flags); // the record with one of the flags, or null

// ---- induction_variables.cpp

// A statement that adds an amount to a variable: x = x + e, x = e + x, x = x - e, x += e, x -= e, ++, --, and the same
// under a conversion to the variable's type. This is the one place that says what an update is.
struct INDUCTION_UPDATE {
    SYMTAB* sym = nullptr;
    const NODE* amount = nullptr; // a part of the statement
    bool is_subtracted = false;
    bool is_narrowed = false;       // the sum is computed in another integer type and converted
    const TYPE* computed = nullptr; // the type that the sum is computed in
};
bool is_induction_update(const NODE* statement, INDUCTION_UPDATE* update);

// In the head of a bottom-tested loop a statement says of an unsigned counter that was proved affine that it is: a
// later build need not find the proof again. They go with the work on loops.
void insert_affine_marks(struct LOOP* root);
void drop_affine_marks();
void find_loop_IVs(struct LOOP* loop);
bool find_loop_LCV(struct LOOP* loop); // whether one was proved
NODE* find_loop_predicate(
    struct LOOP* loop); // a new tree: control stays in the loop while it holds; normalized; or null
void compute_lasttree_for_IV(LOOPIV* iv, struct LOOP* loop);
void make_virtual_LCV(struct LOOP* loop);
void erase_virtual_inits(struct LOOP* root);
NODE* eval_expr_for_iteration(const NODE* expr, struct LOOP* loop,
                              int which); // 0: the last, otherwise the first; new, or null
NODE* eval_expr_for_2nd_iteration(const NODE* expr, struct LOOP* loop);

// ---- value_search.cpp

// What the symbol holds at the end of the block, as a new tree of values that hold there too, or null. `budget`:
// statements looked at; `depth`: definitions looked through.
NODE* find_symbol_value(SYMTAB* sym, BBLK* at_end_of, struct LOOP* loop, int budget, int depth);
// What the search finds out of the function is kept from one question to the next between `keep_symbol_values(true)`
// and (false); whoever changes statements or blocks in between says so.
void keep_symbol_values(bool keep);
void forget_symbol_values();
NODE* find_expr_init(const NODE* expr, struct LOOP* loop); // a new tree, in values at the end of the loop's preheader
BBLK* find_dominator_bb(BBLK* bb);                         // the block looked at before `bb`, or null; over whole loops
BBLK* find_dominator_bb_for_sym(BBLK* bb, SYMTAB* sym, INT65* adjustment);

// ---- while_tests.cpp
bool replicate_while_tests(struct LOOP* root); // whether the graph was changed: the hierarchy is to be built again

// ---- loop_bounds.cpp
void constrain_LOOPIV_highval(LOOPIV* iv, INT65 value);
void constrain_LOOPIV_lowval(LOOPIV* iv, INT65 value);
void refine_loop_highlow(struct LOOP* loop);
void constrain_all_ranges();

// ---- trip_count.cpp, trip_bounds.cpp
void mark_affine_LCV(struct LOOP* loop);
// `init`, `last` and `trips` may be null.
void prove_IV_affine(LOOPIV* iv, const NODE* init, const NODE* last, INT65 incr, const NODE* trips, struct LOOP* loop);
NODE* loop_trip_count(struct LOOP* loop); // a new tree in normal form, or null
void calculate_trip_count(struct LOOP* loop);
void characterize_trip_count(struct LOOP* loop);
// The count of a loop whose control variable begins with what is not known: `trips` names the variable then, and is true of
// its value ahead of the loop alone. Whether it was found; for who changes the loop at once, or forgets the count again: bounds
// that were found with it are true of the loop, and stay.
bool count_from_entry(struct LOOP* loop);
void forget_count_from_entry(struct LOOP* loop);

// ---- loop_variables.cpp
void check_if_LCV_used_in_loop(struct LOOP* loop, struct LOOP* inner);
void check_if_LCV_dead_on_exit(struct LOOP* loop);
void find_IVs_dead_on_exit(struct LOOP* loop);
void shorten_long_IVs(struct LOOP* loop);
void lengthen_short_IVs(struct LOOP* loop);
void add_downcounters_to_loops(struct LOOP* loop, bool recurse, bool all);
void prep_loop_variables(bool withProp);
void prop_scalars_in_loop(struct LOOP* loop, bool recurse, bool expand);
void prop_IVs_and_RCs_in_loop(struct LOOP* loop, bool recurse);

// ---- loop_assertions.cpp
void install_loop_callbacks();                // once: what the rooms below ask of loops is answered here
void find_loop_assertions(struct LOOP* loop); // and those in it; null: from the root
void assert_pointer_alignments(); // of the pointers that loops keep, from what they may refer to
void find_loop_assertions_for_loop(struct LOOP* loop);
// Both consume the tree, which holds on entry to, or throughout, the loop; null loop: it is erased.
void add_loop_entry_assertion(NODE* tree, struct LOOP* loop);
void add_loop_body_assertion(NODE* tree, struct LOOP* loop);

// ---- loop_pragmas.cpp
// Arguments are decimal text; one that is not there, or is no number, counts as absent.
NODE* set_PPRAGMA_tree_info(NODE* tree, int number, const std::vector<std::string>& args); // null: a new one
std::string get_PPRAGMA_tree_arg(const NODE* tree, int n);                                 // empty where it has none
void set_PPRAGMA_tree_arg(NODE* tree, int n, const std::string& text);
INT65 get_PPRAGMA_tree_int_arg(const NODE* tree, int n, INT65 absent = INT65(0));
void set_PPRAGMA_tree_int_arg(NODE* tree, int n, INT65 value);
bool is_loop_pragma(int number); // one that speaks of the loop that follows
// Consumes the tree and enters it in the record. Of several pragmas the one nearest to the loop is taken first.
void take_loop_pragma(NODE* tree, struct LOOP* loop);
void reinsert_loop_pragmas(struct LOOP* loop); // of the loops in it too, into the preheaders
INT65 no_trip_bound();                         // above every trip count; what no stated maximum counts as
// The three arguments as numbers, in normal form: minimum, maximum (`no_trip_bound` without), multiple.
struct ITERATE_PROMISE {
    INT65 min, max, multiple;
};
ITERATE_PROMISE promise_of_MUST_ITERATE(const NODE* pragma);
void try_to_make_MUST_ITERATE_pragma(struct LOOP* loop);
void reconcile_MUST_ITERATE_pragma(struct LOOP* loop);
void validate_MUST_ITERATE_pragma(NODE* pragma);
void reconcile_PROB_ITERATE_pragma(struct LOOP* loop);
// Clips it to the known bounds of the trip count; one that says nothing then is erased.
void clip_PROB_ITERATE_pragma(struct LOOP* loop);
void update_pragmas_for_loop(struct LOOP* loop, int factor); // whose body was replicated
void delete_pragmas_for_loop(struct LOOP* loop);
// From the numbers of the record, unless the pragma is there.
void set_PPRAGMA_READ_WRITE(struct LOOP* loop);
void set_PPRAGMA_SP_HINDRANCES(struct LOOP* loop);
void set_PPRAGMA_UNIT_RESOURCES(struct LOOP* loop);
void set_PPRAGMA_II_ESTIMATE(struct LOOP* loop);
void set_PPRAGMA_CONSTRAINT_FLAGS(struct LOOP* loop);
void set_PPRAGMA_LOOP_FLAGS(struct LOOP* loop, unsigned flags);
void set_PPRAGMA_TRIP_CNTR_MUNGED(struct LOOP* loop);
void printIIpragmas(struct LOOP* loop); // of innermost loops, to the debug stream

// ---- Inline

template <class F>
void for_each_subloop(const struct LOOP* l, F&& visit) {
    // A visitor may insert blocks.
    const std::vector<BBLK*> contents = l->contents;
    for (BBLK* bb : contents)
        if (bb->loop != l) visit(bb->loop);
}
