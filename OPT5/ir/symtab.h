// SYMTAB: one named object of the translation unit, and the lists that symbols live on.
//
// File-scope symbols live to the end of the run, a function's symbols as long as its body.
#pragma once

#include "IFILE/i_symtab.h"
#include "TYPES/type.h"
#include "XINT/int65.h"

#include <cstdint>
#include <string>
#include <vector>

class NODE;
class FUNINFO;
class SYMTAB;
struct LS;

enum STORAGE_CLASS : int {
    SC_AUTO = 1,
    SC_EXTDEF = 2, // external definition in this file
    SC_STATIC = 3,
    SC_REGISTER = 4,
    SC_EXTERN = 5,  // external declaration only
    SC_DROPPED = 6, // no storage of its own
    SC_MEMORY = 9,
    SC_PARM = 17,
    SC_REGISTER2 = 22,
    SC_MEMORY27 = 27, // as SC_MEMORY, and never on the scalar list
    SC_CLUSTERED = 108,
    SC_CLUSTERED_EXTDEF = 109,
};

enum CLASS_QUALIFIER : uint16_t {
    CQ_INLINE = 0x0004,
    CQ_MARKS_FUNCTION = 0x0010, // its use sets a flag of the current function
    CQ_INTERRUPT = 0x0020,
    CQ_GLOBAL_REGISTER = 0x0080,
    CQ_ALIASED = 0x2000,    // address taken
    CQ_WRITTEN = 0x4000,
    CQ_REFERENCED = 0x8000,
};

struct SYMLIST {
    SYMTAB* sym;
    SYMLIST* next;
};
struct SYMALIST {
    SYMTAB* sym;
    NODE* tree;
    SYMALIST* next;
};
struct SYMPAIRLIST {
    SYMTAB* a;
    SYMTAB* b;
    SYMPAIRLIST* next;
};

// A symbol whose width was changed, and what is known of its value.
struct SYM_RANGE {
    SYM_RANGE* next;
    SYMTAB* sym;
    INT65 max, min, known0, known1;
    TYPE* type;
    uint32_t flags1, flags2;
};

constexpr uint16_t NOT_A_CANDIDATE = 65535; // `bitnum` of a symbol that has no bit

class SYMTAB : public I_SYMTAB {
public:
    // `index` and `retention` come from I_SYMTAB.
    char* name = nullptr; // linker-level, owned
    uint32_t uid;         // in the order of making, over the whole run
    uint64_t size = 0;    // bits
    uint32_t value = 0;   // register of a class 4 or 22 symbol, otherwise as the I-file gave it
    int8_t sclass = 0;
    uint8_t flags = 0;
    uint16_t cqual = 0;
    TYPE* type = nullptr;
    TYPE* orig_type = nullptr; // as given at creation
    TYPE* cpp_type = nullptr;
    uint32_t align = 0; // bits
    LS* scope = nullptr;
    uint32_t scratch_word = 0;
    PSN* psn = nullptr;
    PRAGMA* pragma = nullptr;   // owned chain
    NODE* init_value = nullptr; // a global's single scalar initial value; owned
    std::vector<NODE*>* autoinit = nullptr; // initializer items, the last is ENDINIT; owned
    int level = 0; // 0 file scope, 1 parameter, 2 local
    uint32_t location = 0;
    uint32_t option_set = 0;
    SYMTAB* next = nullptr; // link of whichever symbol list holds it
    int64_t depnum_m = 0; // of a function's symbol: its place in the order of reading, from 0
    uint16_t bitnum_m = NOT_A_CANDIDATE; // the bit of a candidate while `fact::live_variables` is known
    bool is_aliased_m = false;
    bool is_temp = false;
    bool is_loop_limit = false; // assigned once, one of two values by a condition; with the second a loop does not run,
                                // and where the first is chosen they differ
    bool dynamic_init = false;         // initialized at run time
    bool fl_static_candidate = false;  // a function-local static that may become automatic
    bool fl_static_eligible = false;
    bool written_as_parameter = false; // entered the function as a parameter record
    bool arg_needed = true; // a parameter: calls pass it
    bool is_clustered = false;
    bool lives_in_others = false; // its storage may lie in that of a symbol with `hosts_others`
    bool hosts_others = false;
    NODE* size_tree = nullptr;
    FUNINFO* function_record = nullptr; // of a function that has one; ask `find_FUNINFO`

    SYMTAB();
    ~SYMTAB() override;

    const char* sym_name() const override { return name; }
    uint64_t sym_size() const override { return size; }
    uint32_t sym_value() const override { return value; }
    int sym_class() const override { return sclass; }
    uint16_t sym_cqual() const override { return cqual; }
    TYPE* sym_type() const override { return type; }
    TYPE* sym_cpp_type() const override { return cpp_type; }
    uint32_t sym_align() const override { return align; }
    PSN* sym_psn() const override { return psn; }
    PRAGMA* sym_pragma() const override { return pragma; }
    int sym_prag_num() const override;
    uint32_t sym_location() const override { return location; }
    uint32_t sym_option_set() const override { return option_set; }
    int sym_level() const override { return level; }
    void set_level(int l) override { level = l; }
    void set_location(uint32_t l) override { location = l; }
    bool is_aliased() const override { return is_aliased_m; }
    int bitnum() const override { return bitnum_m; }
    int64_t depnum() const override { return depnum_m; }
    void set_is_aliased(bool a) override { is_aliased_m = a; }
    void set_bitnum(int n) override { bitnum_m = static_cast<uint16_t>(n); }
    void inc_bitnum() override { ++bitnum_m; }
    void set_depnum(int64_t n) override { depnum_m = n; }
    void inc_depnum() override { ++depnum_m; }

    bool is_function() const { return type && type->is_func(); }
    bool is_global() const { return level == 0; }
    // A local that each call of its function has anew; parameters are not.
    bool is_automatic() const {
        return level >= 2 && (sclass == SC_AUTO || sclass == SC_REGISTER || sclass == SC_REGISTER2);
    }
};

// A file-scope symbol whose per-function state is kept in the current FUNINFO, so that it can be in work in two functions
// at once. Asking with no current function is an assertion failure.
class GLOBAL_SYM final : public SYMTAB {
public:
    bool is_aliased() const override;
    int bitnum() const override;
    int64_t depnum() const override;
    void set_is_aliased(bool a) override;
    void set_bitnum(int n) override;
    void inc_bitnum() override;
    void set_depnum(int64_t n) override;
    void inc_depnum() override;
};

extern SYMTAB* global_symbols; // all file-scope symbols through `next`, most recent first
extern SYMTAB* errno_symbol;   // an `int` global named "errno" or "_Errno", or null

void init_symbols();
void sym_def(SYMTAB* sym);
void sym_split(FUNINFO* funinfo);
// A temporary of the current function named "$O$<letter><number>"; a negative number takes the function's next one.
SYMTAB* sym_temp(char letter, long number, TYPE* type, LS* ls);
SYMTAB* copy_symbol(const SYMTAB* sym, bool unused = false);
SYMTAB* get_sym_def_for_decl(SYMTAB* sym);
const char* skip_name_prefix(const char* name);
bool name_has_prefix(const char* name);
bool is_internal_name(const char* name);
bool is_internal_symbol(const SYMTAB* sym);
bool is_optimizer_temp(const char* name, char c1, char c2);
bool is_operator_new_symbol(const SYMTAB* sym);
SYMTAB* gen_operator_new_temp(TYPE* type);
PRAGMA* find_pragma(const SYMTAB* sym, int kind);   // first of that kind, or null
void remove_pragma(int kind, PRAGMA** list);        // unlinks and frees the first of that kind
bool is_struct_explosion_parm_assignment(const NODE* a, const NODE* b);
TYPE* guess_cpp_type(const NODE* tree);
// Whether an object holds at the start of the run what its initializer says: not if the program computes it then, if
// another definition may take its place, or if it can change and is placed by hand, where the loader may set it up
// otherwise. Who asks must know besides that nothing has written it since.
bool initial_value_may_be_taken(const SYMTAB* sym);
// The known initial value that an lvalue or a place in a symbol has at the start of the run, as a fresh tree, or null.
NODE* lookup_autoinit(const NODE* tree);
NODE* lookup_autoinit(const SYMTAB* sym, uint64_t offset_bits, TYPE* type);
NODE* lookup_array_autoinit(const SYMTAB* sym, uint64_t i);
SYMTAB* intern_symbol(SYMTAB* sym, FUNINFO* funinfo);
SYMTAB* find_interned_symbol(SYMTAB* sym, FUNINFO* funinfo);
void map_over_interned_symbols(void (*visit)(SYMTAB*));
void interned_stats();

SYMLIST* mk_symlist(SYMTAB* sym, SYMLIST* next);
SYMALIST* mk_symalist(SYMTAB* sym, NODE* tree, SYMALIST* next);
bool symbol_in_list(const SYMTAB* sym, const SYMTAB* list); // a list through `next`
SYMLIST* find_sym_in_symlist(const SYMTAB* sym, SYMLIST* list);
SYMLIST* remove_sym_from_symlist(const SYMTAB* sym, SYMLIST* list);
SYMPAIRLIST* find_sym_in_sympairlist(const SYMTAB* sym, SYMPAIRLIST* list); // by the first of the pair
SYMLIST* revsymlist(SYMLIST* list);
SYMTAB* revsymtab(SYMTAB* list);
void unlink_symbol(SYMTAB* sym, SYMTAB** list);
SYMLIST* copy_symlist(const SYMLIST* list);
SYMALIST* copy_symalist(const SYMALIST* list);
void erase_symlist(SYMLIST* list);
void erase_symalist(SYMALIST* list); // the trees too
void erase_symplist(SYMPAIRLIST* list);

void make_widened_symbol_entry(SYMTAB* sym, TYPE* type, INT65 max, INT65 min, INT65 known0, INT65 known1);
void make_shortened_symbol_entry(SYMTAB* sym, TYPE* type);
SYM_RANGE* find_widened_symbol_entry(const SYMTAB* sym);
SYM_RANGE* find_shortened_symbol_entry(const SYMTAB* sym);
void widen_user_variables();
