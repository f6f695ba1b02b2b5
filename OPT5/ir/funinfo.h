// FUNINFO: the one record of every function ever heard of: defined, only called, named by a pragma, of the standard
// library, and one dummy for file scope. A record is never freed; the body is freed by `erase_all`.
#pragma once

#include "IFILE/if_client.h"
#include "OPT5/ir/code_records.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/list.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/serial_object.h"
#include "OPT5/ir/symtab.h"
#include "TYPES/type.h"

#include <atomic>
#include <cstdint>
#include <list>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

class BBLK;
class BITVEC;
class Dominator;
class NATURAL_LOOPS;
class FUNINFO;
class NODE;
struct PTENV;
class SNMAP;
class SPMAP;
struct LBL;
struct LIVE_SETS;

enum FUN_FLAG : uint64_t {
    FUN_calls_anonymous = 0x1,
    FUN_cannot_suppress = 0x2,
    FUN_is_unsuppressed = 0x4,
    FUN_never_returns = 0x8,
    FUN_calls_OUTSIDE = 0x10,
    FUN_cannot_inline = 0x20,
    FUN_is_suppressed = 0x40,
    FUN_no_global_asg = 0x80,
    FUN_no_global_use = 0x100,
    FUN_is_referenced = 0x200,
    FUN_calls_SYSTEM = 0x400,
    FUN_is_processed = 0x800,
    FUN_is_anonymous = 0x1000,
    FUN_is_interrupt = 0x2000,
    FUN_follows_call = 0x4000,
    FUN_value_needed = 0x8000,
    FUN_no_byref_asg = 0x10000,
    FUN_is_pure_fun = 0x20000,
    FUN_cannot_beta = 0x40000,
    FUN_no_RPT_loop = 0x80000,
    FUN_is_inlined = 0x200000,
    FUN_no_ind_asg = 0x400000,
    FUN_no_ind_use = 0x800000,
    FUN_is_cg_root = 0x1000000,
    FUN_is_called = 0x4000000,
    FUN_is_extern = 0x8000000,
    FUN_is_SYSTEM = 0x10000000,
    FUN_has_1_BB = 0x20000000,
    FUN_is_main = 0x40000000,
    FUN_is_cpp = 0x80000000,
    // As a pure one, it only computes, the same each time; but from memory also, which others may change in between.
    FUN_only_reads = 0x100000000,
    // Control comes back from each call of it, in finite time, and no event outside the program is part of it.
    FUN_surely_returns = 0x200000000,
};

struct CALLEE {
    FUNINFO* callee;
    int ncalls; // never 0
    CALLEE* next;
};

struct EHT_CATCH {
    std::string type_name;
    int64_t label = 0; // label number of the handler
    bool flag = false;
    int32_t id = 0; // from 1 in the order of the input, unique in the function; cases of a dispatch name it
};
// The in-memory exception table entry; slot 0 of a function's vector is the root.
struct EHT_ITEM {
    uint32_t id = 0;
    uint32_t kind = EHK_ROOT_NODE;
    uint32_t next_entry = 0;
    NODE* cleanup = nullptr; // owned
    std::vector<EHT_CATCH> catches;
};

struct OVERLAP; // a record of the stack-sharing tree

// A formal parameter, and what all calls together pass in it.
struct FPARM {
    enum STATE : uint8_t { NO_CALL, KNOWN, ANYTHING };
    std::string name;
    bool is_pointer;
    STATE state = NO_CALL;
    std::shared_ptr<const PTENV> summary; // of a known pointer (OPT5/alias/points_to.h)
    int kind = 0;              // 1: it has one value, `known`, and goes from the function and from all calls of it
    const NODE* known = nullptr; // in the parameter's type, without a scope; never freed

    FPARM(std::string n, bool pointer) : name(std::move(n)), is_pointer(pointer) {}
};

class FUNINFO : public serial_namespace<BBLK, FUNINFO> {
public:
    // `objects`: all blocks of the function by serial number.
    SYMTAB* symbol = nullptr; // null for a function known by name alone and for the dummy
    uint32_t uid = 0;
    std::string name; // with the language prefix
    const char* inline_obstacle = nullptr; // why FUN_cannot_inline is set
    SYMLIST* fl_statics = nullptr;
    CALLEE* callees = nullptr;
    TYPE* return_type = nullptr;
    PSN *begin_psn = nullptr, *end_args_psn = nullptr, *end_locals_psn = nullptr, *end_psn = nullptr;
    std::vector<EHT_ITEM> eht;
    uint32_t scope_blocks = 0, scope_depth = 0;
    uint32_t size = 0;     // integrable body size, 0: cannot be integrated
    CALLEE* cg_cursor = nullptr;
    const BITVEC* reach = nullptr; // borrowed
    int32_t cg_order = -1;
    uint32_t ncallers = 0;
    int8_t nargs_called = -1;
    uint32_t profile_status = 0; // 0 no profile, 1 forced during inlining, 2 profiled
    uint32_t entry_count = 0xFFFFFFFF;
    uint32_t unique_call_index = 0; // ids given to the call sites of this function so far
    BITVEC *inline_sites = nullptr, *forced_sites = nullptr, *deep_sites = nullptr;
    uint32_t sites_left = 0;
    uint32_t est_time = 0, est_bbs = 0, est_syms = 0, est_loops = 0, est_ncalls = 0, est_pressure = 0, density = 0;
    bool is_leaf_estimate = false, irreducible = false;
    bool body_returns = false; // FUN_surely_returns holds if it does for all its callees
    int bb_count = 0;
    BBLK* bb_list = nullptr;
    BBLK* exit_bb = nullptr;
    LIST* statements = nullptr; // as read, last first, until `buildcfg`
    NODE* arg_prolog = nullptr; // a copy of the argument prolog, owned
    // Symbol lists through SYMTAB::next.
    SYMTAB* new_syms = nullptr;
    SYMTAB* pending_syms = nullptr;
    SYMTAB* memory_syms = nullptr; // parameters too
    SYMTAB* scalar_syms = nullptr;
    std::vector<SYMTAB*> dropped_syms; // of class 6: on no list
    SYM_RANGE* widened = nullptr;
    SYM_RANGE* shortened = nullptr;
    LS* ls_root = nullptr;
    uint32_t ls_counter = 1;
    PTR* ptrs = nullptr; // all records, most recent first
    PTR* bottom_ptr = nullptr;
    std::map<std::pair<SYMTAB*, fkMDATA*>, PTR*> ptr_map; // looked up, never walked
    std::unique_ptr<SPMAP> spmap; // what pointer variables point into; never null
    std::unique_ptr<SNMAP> snmap; // the values in force during constant propagation; never null
    OVERLAP* overlaps = nullptr;
    SYMTAB* stack_union = nullptr; // the variable that locals of disjoint scopes lie in over each other, or null
    // The step that lays locals of disjoint scopes over each other is behind. Until then no pass moves a load of memory to
    // where its scope may have ended, for the object would share its place with one that lives there.
    bool stack_is_laid_out = false;
    uint32_t name_counter = 0;
    bool address_taken_local = false, has_bitfield_access = false, has_cqual10_name = false;
    bool no_calls = true; // no CALL or UCALL was made in this function
    bool has_nasserts = false;
    // A call of setjmp, to which control comes back from any later call: the function is worked on as at level 0.
    bool saves_environment = false;
    bool has_affine_marks = false; // statements that say which unsigned counters do not wrap, while loops are worked on
    bool has_intrinsics = false; // a built-in was read or made; never cleared
    bool has_vector_types = false, has_complex_types = false, simd_allowed = false;
    bool is_written = false;
    FACTS facts = fact::none; // those that are true now; asked and changed through OPT5/ir/facts.h
    std::unique_ptr<Dominator> dominators;
    std::unique_ptr<NATURAL_LOOPS> loops;
    std::unique_ptr<LIVE_SETS> live_sets;
    std::shared_ptr<void> points_to; // of `fact::points_to`; made and read by OPT5/alias
    // A private copy of the body for call integration, made before pass 2 and never worked on: a record of its own, which is
    // on no list. It stays when the body is erased.
    std::unique_ptr<FUNINFO> saved_cfg;
    long temp_counter = 0;
    SYMTAB* ret_by_cctor_sym = nullptr;
    SYMTAB* csu_return_sym = nullptr;
    int32_t next_symbol_index = 1;
    int32_t label_counters[2] = {0, 0}; // internal labels, counting down; chosen by `internal_label_index`
    int lva_sym_count = 0;
    void* hierarchy = nullptr;
    CODE_RECORDS code_records;
    std::vector<NODE*> givens; // facts that hold in the whole function
    std::vector<FPARM> formals; // in order, of a function all of whose calls are known; empty otherwise
    std::vector<std::string> comments;  // comment lines ahead of the function in the output
    std::vector<std::string> info_text; // buffered info text of the worker mode
    // The function's view of global symbols by their index.
    std::vector<bool> global_is_aliased;
    std::vector<uint16_t> global_bitnum;
    std::vector<int64_t> global_depnum;
    long time = 0; // clock ticks spent in steps

    explicit FUNINFO(const char* function_name);
    FUNINFO(const FUNINFO&) = delete;
    FUNINFO& operator=(const FUNINFO&) = delete;
    ~FUNINFO();

    bool has_eh() const { return eht.size() > 1; }

private:
    friend uint64_t get_flags(FUNINFO*);
    friend void set_flags(FUNINFO*, uint64_t);
    friend void clear_flags(FUNINFO*, uint64_t);
    std::atomic<uint64_t> flags{0}; // read and changed by the functions below, from several workers
};

uint64_t get_flags(FUNINFO* f);
void set_flags(FUNINFO* f, uint64_t bits);
// Its body is not copied into callers; `why` (lasting) is what the programmer is told, and the first reason stays.
void forbid_inlining(FUNINFO* f, const char* why);
void clear_flags(FUNINFO* f, uint64_t bits);
inline bool TEST_FLAG(FUNINFO* f, uint64_t bits) { return (get_flags(f) & bits) != 0; }

// What is known at file scope.
struct FILEINFO {
    std::vector<FUNINFO*> FUNLIST; // every record, in order of creation
    FUNINFO* dummy = nullptr;
    std::list<FUNINFO*> synonyms;
};
extern FILEINFO fileinfo;
extern std::mutex funinfo_lock;
extern std::list<SYMTAB*> functions; // functions in work
extern std::list<SYMTAB*> functions_queue;
extern std::list<SYMTAB*> unsuppressed_functions;
extern std::vector<FUNINFO*> unsuppressed_funinfos;
extern std::mutex unsuppression_lock;

FUNINFO* make_FUNINFO(const char* name);
FUNINFO* make_FUNINFO(SYMTAB* sym);
FUNINFO* find_FUNINFO(const char* name);
FUNINFO* find_FUNINFO(SYMTAB* sym);
FUNINFO* find_FUNINFO_for_call(const NODE* call);
bool function_is_defined(FUNINFO* f);
// By the form of the demangled name.
bool fun_is_cpp_static_initializer(const FUNINFO* f);
bool fun_is_cpp_constructor(const FUNINFO* f);
bool fun_is_cpp_destructor(const FUNINFO* f);
inline bool fun_is_cpp_op_new(const FUNINFO*) { return false; }
bool is_system_function(const char* name);
extern bool setjmp_is_named; // there is a record of that function
bool func_is_nonconforming(const SYMTAB* sym);
void add_nonconforming_function(const SYMTAB* sym);
void init_FUNINFO_flags(FUNINFO* f, int known_system);
void unsuppress_inline_function(FUNINFO* f);
void dump_FUNINFO(FUNINFO* f, int to_info); // to_info 0: the debug stream
void dump_function_header(bool to_info = false); // of the current function, to the debug stream, and the info stream on request
void erase_all();                           // drops the current function's body
bool sym_appears_in_EHT(const SYMTAB* sym); // of the current function
// Whether nothing but its NAME in the statements of the current function reads or writes the object: a parameter or an
// automatic variable that is not volatile, not aliased, and in no exception's clean-up. False while `fact::alias_marks` is not
// known.
bool only_its_name_reaches(const SYMTAB* sym);
bool is_private_name(const NODE* t); // a NAME of a scalar of that kind
