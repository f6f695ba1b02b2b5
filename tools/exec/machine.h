// The machine that compiled trees run on: memory, frames, and the compiled form itself.
//
// A tree becomes a tree of XNODEs, each a function pointer with its operands and constants resolved: types, widths,
// addresses and member offsets are settled once, when a function is compiled. A value is an int64_t in normal form:
// sign- or zero-extended as its type says; a floating value is the bits of a double, which for a single holds only
// values that a single can have; a structure is its address.
#pragma once

#include "tools/exec/exec.h"

#include <cmath>
#include <cstdint>
#include <cstring>
#include <map>
#include <memory>
#include <string>
#include <vector>

// How a value of a type is held and computed.
enum REP : uint8_t { R_VOID, R_S16, R_U16, R_S32, R_U32, R_S64, R_U64, R_F32, R_F64, R_AGG, R_FUNC };

struct SHAPE {
    REP rep = R_VOID;
    uint8_t bits = 0; // of an integer; narrower than the representation for odd widths only
    bool is_bool = false;
    bool is_pointer = false;
    uint32_t units = 0;      // 16-bit units in memory
    uint32_t align_mask = 0; // an address of an object of this type has these bits clear

    bool is_float() const { return rep == R_F32 || rep == R_F64; }
    bool is_int() const { return rep >= R_S16 && rep <= R_U64; }
    bool is_signed() const { return rep == R_S16 || rep == R_S32 || rep == R_S64; }
    bool same_value(const SHAPE& o) const { return rep == o.rep && bits == o.bits && is_bool == o.is_bool; }
};
SHAPE shape_of(TYPE* type);
SHAPE int_shape(int bits, bool is_signed);
SHAPE float_shape(int bits);
SHAPE promoted(const SHAPE& s);
SHAPE combined(const SHAPE& a, const SHAPE& b); // the usual arithmetic conversions

struct MACHINE;
struct XNODE;
using EVAL = int64_t (*)(const XNODE*, MACHINE&);

struct XNODE {
    EVAL run = nullptr;
    const XNODE* a = nullptr;
    const XNODE* b = nullptr;
    const XNODE* c = nullptr;
    int64_t k = 0;         // constant, address, frame offset
    uint32_t m = 0, n = 0; // masks, widths, counts
    const void* extra = nullptr;
};
inline int64_t run(const XNODE* x, MACHINE& machine) { return x->run(x, machine); }

inline double as_float(int64_t v) {
    double d;
    std::memcpy(&d, &v, 8);
    return d;
}
inline int64_t from_float(double d) {
    int64_t v;
    std::memcpy(&v, &d, 8);
    return v;
}

enum STMT_KIND : uint8_t { S_EXPR, S_BRANCH, S_CBRANCH, S_SWITCH, S_RETURN, S_URETURN, S_FAIL };

struct SWITCH_TABLE {
    std::vector<std::pair<int64_t, uint32_t>> cases; // by value
    uint32_t other;                                  // target of default, or the next statement
};

struct STMT {
    STMT_KIND kind = S_EXPR;
    const XNODE* tree = nullptr;
    uint32_t target = 0; // index of a statement
    uint32_t cost = 1;   // nodes
    uint32_t line = 0;
    uint64_t count = 0; // times executed
    const SWITCH_TABLE* table = nullptr;
    const char* text = nullptr; // of S_FAIL
    int status = 0;
};

// What an exception that leaves a call finds, by exception entry.
struct HANDLING {
    uint32_t kind = 0; // EHT_ENTRY_KIND
    uint32_t next = 0;
    const XNODE* cleanup = nullptr;
    std::vector<std::pair<std::string, uint32_t>> clauses; // what is caught, and the statement that it leads to
};

struct PARAMETER {
    SHAPE shape;
    int64_t offset;
};

// How often a loop iterates, by its annotation.
struct TRIP_PROMISE {
    uint32_t head = 0; // index of a statement
    uint64_t min = 0, max = 0, multiple = 1;
    bool tested_first = false, tested_last = false; // by the keyword of the source, if it is known
    bool is_record = false;                         // of a loop record: its tail is what is counted
    std::vector<uint8_t> roles;                     // of each statement in the loop
};

// What an I-file says of a loop by records: the numbers of kind 38, and the loop that a statement is in by kind 124.
constexpr uint32_t NO_LOOP = UINT32_MAX;
struct LOOP_RECORD {
    uint32_t id, outer, min, max, multiple;
};

class DEPENDENCES;
class ACCESS_WATCH;

struct FUNCTION {
    IC_SYMBOL* sym = nullptr;
    const IC_FUNC* source = nullptr;
    std::string name;
    std::vector<STMT> code;
    std::vector<PARAMETER> params;
    SHAPE result;
    uint64_t frame = 0; // units, below the frame pointer
    size_t depth = 0;   // of its deepest tree
    uint64_t calls = 0;
    bool variadic = false;
    std::vector<TRIP_PROMISE> promises; // of a checked run
    std::vector<HANDLING> handling;     // the exception table, the root first; empty without one
    std::vector<std::pair<uint32_t, uint32_t>> handled_calls; // their statements, and their exception entries
    std::vector<LOOP_RECORD> loops;     // of one as well
    std::vector<uint32_t> loop_of;      // the id of the innermost loop around each statement, or NO_LOOP
    std::shared_ptr<DEPENDENCES> dependences; // of a checked run with numbered accesses
};

struct LIBRARY_ENTRY;

// What an address that stands for a function leads to.
struct CALLEE {
    FUNCTION* function = nullptr;           // defined in the unit
    const LIBRARY_ENTRY* library = nullptr; // or by the executor
    std::string name;
};

// One activation; the innermost is `MACHINE::top`.
struct ACTIVATION {
    FUNCTION* function;
    const STMT* at;
    ACTIVATION* up;
    uint32_t eh_entry = 0; // of the call in work
    ACCESS_WATCH* accesses = nullptr;
};

struct EXEC_ERROR {
    int status;
    std::string text;
};
struct EXEC_EXIT {
    int status;
};
// An exception of the program, thrown by `zthrow`: it is told by its number.
struct EXEC_THROW {
    int64_t value;
};

struct NODE_COUNTS {
    uint64_t by_op[164] = {};
    uint64_t loads = 0, stores = 0, calls = 0, multiplies = 0;
    uint64_t memory_loads = 0, memory_stores = 0; // those of other than scalars that a register can hold
    uint64_t branches = 0, tests = 0; // `tests` of them have a condition
    uint64_t fields = 0;              // loads and stores of bit-fields
};

constexpr uint64_t null_page = 16;              // units at address 0 that nothing lives in
constexpr uint64_t function_space = 0x70000000; // addresses of functions, beyond all memory

struct MACHINE {
    std::vector<uint16_t> memory;
    uint64_t size = 0;       // units
    bool big_endian = false; // a number's high unit comes first; fields keep their places within units
    uint64_t fp = 0, sp = 0;
    uint64_t steps = 0, step_limit = ~uint64_t{0};
    uint64_t heap_begin = 0, heap_end = 0;
    int64_t old_value = 0, right_value = 0; // operands of a compound assignment in work
    uint64_t place = 0;                     // and its address
    int64_t returned = 0;
    int64_t caught = 0; // the exception that came to a handler last
    ACTIVATION* top = nullptr;
    uintptr_t host_stack_end = 0; // no frame of the host below this
    std::vector<CALLEE> callees;  // by address - function_space
    FILE* out = stdout;
    NODE_COUNTS counts;
    uint32_t random = 1;
    std::vector<int64_t> at_exit;
    std::map<uint64_t, uint64_t> blocks, holes; // the heap's: address to size

    // Throws EXEC_ERROR with the function and line in work.
    [[noreturn]] void fail(int status, const std::string& text) const;
    [[noreturn]] void bad_address(uint64_t address, uint64_t units) const;
    [[noreturn]] void unaligned(uint64_t address) const;

    void check(uint64_t address, uint64_t units) const {
        if (address < null_page || address >= size || units > size - address) bad_address(address, units);
    }
    uint64_t get(uint64_t address, unsigned units) const { // unchecked
        if (big_endian) return get_reversed(address, units);
        uint64_t v = memory[address];
        for (unsigned i = 1; i < units; i++) v |= static_cast<uint64_t>(memory[address + i]) << 16 * i;
        return v;
    }
    void put(uint64_t address, unsigned units, uint64_t v) {
        if (big_endian) return put_reversed(address, units, v);
        for (unsigned i = 0; i < units; i++) memory[address + i] = static_cast<uint16_t>(v >> 16 * i);
    }
    uint64_t get_reversed(uint64_t address, unsigned units) const;
    void put_reversed(uint64_t address, unsigned units, uint64_t v);
    int64_t load(const SHAPE& shape, uint64_t address) const; // checked, by shape
    void store(const SHAPE& shape, uint64_t address, int64_t value);
    // Arguments in the shapes of the parameters; those beyond, in shapes of their own, are those of a variadic
    // function.
    int64_t invoke(FUNCTION& f, const int64_t* args, const SHAPE* shapes = nullptr, size_t n = 0);
    // A call through an address, with arguments of any shapes.
    int64_t call(int64_t address, const int64_t* args, const SHAPE* shapes, TYPE* const* types, size_t n,
                 const SHAPE& result);
};

int64_t wrap(int64_t v, unsigned bits, bool is_signed);
int64_t convert_value(int64_t v, const SHAPE& from, const SHAPE& to);

// ---- The library
struct LIBRARY_ARGS {
    MACHINE& m;
    const int64_t* value;
    const SHAPE* shape;
    TYPE* const* type;
    size_t n;

    int64_t i(size_t k) const { return k < n ? convert_value(value[k], shape[k], int_shape(64, true)) : 0; }
    double f(size_t k) const { return k < n ? as_float(convert_value(value[k], shape[k], float_shape(64))) : 0; }
    uint64_t p(size_t k) const { return static_cast<uint32_t>(i(k)); }
    // The object that argument k points to, by the pointer's type; `fallback` where that tells nothing.
    SHAPE pointee(size_t k, const SHAPE& fallback) const;
};
struct LIBRARY_ENTRY {
    const char* name;
    char result; // i integer, f double, v none
    int64_t (*run)(LIBRARY_ARGS&);
};
const LIBRARY_ENTRY* find_library(const std::string& name);        // functions called by name
const LIBRARY_ENTRY* find_builtin(const std::string& name);        // built-in functions of the target
const LIBRARY_ENTRY* find_basic_operator(const std::string& name); // of saturating arithmetic
const char* builtin_refusal(const std::string& name); // why one cannot be executed; null for a name that is unknown
int64_t run_library(const LIBRARY_ENTRY& entry, LIBRARY_ARGS& args, const SHAPE& result);
