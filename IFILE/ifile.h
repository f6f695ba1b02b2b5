// I_FILE: one I-file, read or written. An object is either a reader or a writer for its whole life.
//
// Bad input is not an internal error of the program: every reader operation that meets it throws `if_error`, whose text
// says what is wrong and whose offset says where. The caller reports it and ends with status 1.
#pragma once

#include "IFILE/if_client.h"
#include "TYPES/type.h"
#include "UTIL/psn.h"

#include <cstdint>
#include <cstdio>
#include <deque>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

enum IF_RECORD_KIND : uint8_t {
    IFR_BEGIN_FUNC = 1,
    IFR_END_FUNC = 2,
    IFR_BEGIN_BLOCK = 3,
    IFR_END_BLOCK = 4,
    IFR_END_ARGS = 5,
    IFR_END_LOCALS = 6,
    IFR_HEADER = 8,
    IFR_IR = 34,
    IFR_SYMBOL = 35,
    IFR_ASM = 36,
    IFR_LOOP = 38,
    IFR_LABEL = 42,
    IFR_MBANK = 45,
    IFR_EXPR = 46,
    IFR_COMMENT = 47,
    IFR_DEP_EDGE = 58,
    IFR_DEP_VECTOR = 59,
    IFR_CATCH_LIST = 63,
    IFR_FUNC_INFO = 64,
    IFR_EHT_ENTRY = 91,
    IFR_EHT_HEADER = 93,
    IFR_PRAGMA = 94,
    IFR_NODE = 101,
    IFR_INIT = 105,
    IFR_LDSPEC = 108,
    IFR_OPTION_SET = 111,
    IFR_TYPE = 116,
    IFR_IR_BEGIN = 123,
    IFR_LOOP_VAR = 124,
    IFR_IR_END = 125,
    IFR_FILE_NAME = 126,
    IFR_END = 255,
};
const char* if_record_name(int kind); // a label for people, "unknown" for a kind that is none

constexpr char IF_MAGIC[] = "!<icode>\n";
constexpr int IF_VERSION = -71;        // written
constexpr int IF_VERSION_OLDEST = -86; // read from here up to IF_VERSION
constexpr int IF_CPU_ID = 600;
constexpr int IF_MAX_OPCODE = 163;
// Trees nested deeper are refused: the walkers recurse, and this is what their stack is laid out for.
constexpr int IF_MAX_TREE_DEPTH = 200000;

extern int icode_cpu_id; // target code of the input, written back unchanged

class if_error : public std::runtime_error {
public:
    if_error(const std::string& text, long offset) : std::runtime_error(text), offset_m(offset) {}
    long offset() const { return offset_m; } // bytes from the first byte of the header

private:
    long offset_m;
};

// The I-file layer's own opcode table: one row for each opcode that may stand in an I-file.
struct IF_NODE_INFO {
    int op = 0;
    const char* name = nullptr; // null: no such opcode
    int operand_count = 255;
};
extern IF_NODE_INFO if_node_info[201];
void if_node_table_init(); // fills it, once per process
void if_enter_node(int op, const char* name, int operand_count);
// Opcode that a relational operator becomes where an operand is floating, or the opcode itself.
int if_float_relop(int op);

struct TYPE_INFO {
    TYPE* type = nullptr;
    uint32_t pending = 0; // list records still expected
};

class I_FILE {
public:
    std::string source_name;
    FILE* fp = nullptr;
    int64_t base = 0;
    bool is_writer = false;
    IF_CLIENT* client = nullptr;
    int version = IF_VERSION;
    int64_t off_options = 0, off_inits = 0, off_types = 0, off_files = 0, off_globals = 0;
    std::vector<OPTION_SET> option_sets; // writer
    TYPE_PKG* type_pkg = nullptr;
    std::map<int, TYPE_INFO> typeref_map; // reader
    int64_t extra_word = 0;
    int64_t level = 0; // 0 outside functions, 1 after begin function, 2 after end of arguments, plus 1 per open block
    std::vector<I_SYMTAB*> locals;
    std::vector<I_SYMTAB*> globals;

    ~I_FILE();
    I_FILE(const I_FILE&) = delete;
    I_FILE& operator=(const I_FILE&) = delete;

    // ---- Opening and closing
    // Takes over `stream` in either case. Null if the header is not acceptable; `*why`, if given, tells what was wrong.
    static I_FILE* if_open(FILE* stream, IF_CLIENT* client, std::string* why = nullptr);
    static I_FILE* if_open_basic(FILE* stream, IF_CLIENT* client, std::string* why = nullptr);
    static I_FILE* if_create(FILE* stream, TYPE_PKG* pkg, const char* source_name);
    // Writes the trailing sections unless `discard`, frees the object, closes the stream. 1 if the stream failed, else 0.
    static int if_close(I_FILE* file, bool keep_all_types, bool discard);

    // ---- Reader
    void if_type_init(TYPE_PKG* pkg); // before any type is read
    void if_read_file();
    int if_read_record(); // the record's kind
    void if_read_func(int64_t offset);
    void if_skip_func();
    int if_check_lengths(); // 1: well framed; 0 after a message on standard output
    void if_copy_raw(int64_t offset, int64_t size, I_FILE* to);
    void if_copy_symbols(I_FILE* to);
    void if_read_file_names();
    void if_read_options();
    void if_read_type_defs();
    void if_read_globals();
    void if_read_all_init();
    void if_read_symbol_def();
    BASE_NODE* if_read_expr_node(bool with_frame);
    TYPE* find_typeref(uint64_t n);
    fkMDATA* find_mdataref(uint64_t type_number, uint64_t member_number);

    // ---- Writer. Positions may be null. A stream that fails is reported by `if_close`.
    void if_enter_option_set(const OPTION_SET& set);
    void if_enter_option_set(unsigned id, unsigned count, const char* const* strings);
    void if_write_control(int kind, PSN* psn);
    void if_write_begin_func(I_SYMTAB* sym, PSN* psn);
    void if_write_end_func(PSN* psn) { if_write_control(IFR_END_FUNC, psn); }
    void if_write_begin_block(PSN* psn) { if_write_control(IFR_BEGIN_BLOCK, psn); }
    void if_write_end_block(PSN* psn) { if_write_control(IFR_END_BLOCK, psn); }
    void if_write_end_args(PSN* psn) { if_write_control(IFR_END_ARGS, psn); }
    void if_write_end_locals(PSN* psn) { if_write_control(IFR_END_LOCALS, psn); }
    void if_write_label(uint32_t label);
    void if_write_assembly(const char* text, PSN* psn);
    void if_write_comment(const char* text);
    void if_write_source(const char* name); // a kind 126 record in the body
    void if_write_func_info(uint8_t info);
    void if_write_expr(const BASE_NODE* tree, PSN* psn); // with a null tree the header alone
    void if_write_expr_node(const BASE_NODE* tree);
    void if_write_init(I_SYMTAB* sym); // opens the initializer section on first use
    void if_write_symbol(I_SYMTAB* sym); // with its pragmas
    void if_write_pragma(const PRAGMA* pragma);
    void if_write_loop(uint32_t id, uint32_t outer, uint32_t min, uint32_t max, uint32_t factor, uint16_t flags);
    void if_write_inloop(uint32_t id, I_SYMTAB* sym, uint8_t flags);
    void if_write_dep_vector(const DD_ENTRY* elements, uint32_t id, uint8_t flags, uint32_t count);
    void if_write_dep_edge(uint32_t from, uint32_t to, uint32_t vector);
    void if_write_mbank(uint32_t a, uint32_t b, uint32_t c, uint32_t d, uint32_t e);
    void if_write_ldspec_induct(uint32_t id, uint32_t word, int32_t step, TYPE* type, I_SYMTAB* sym);
    void if_write_ldspec_rand(uint32_t id, uint32_t word, uint32_t word2, TYPE* type, I_SYMTAB* sym);
    void if_write_ldspec_region(uint32_t id, uint32_t label);
    void if_write_func_eht(const EHT_ENTRY* entries, uint32_t count);
    void if_write_type(TYPE* type);
    void if_reference_type(TYPE* type); // marks it, and what it was merged into, as needed by the output; null does nothing
    void if_write_all_types(bool keep_named);

    // ---- Both
    int64_t if_tell() const;
    void if_seek(int64_t offset);
    void if_flush();
    void if_enter_global(I_SYMTAB* sym); // level 0 and the next index
    void if_enter_local(I_SYMTAB* sym);  // the current level and the next index
    uint32_t i_enter_file_name(const char* name); // the number, from 1
    uint32_t i_get_file_id(const char* name) const;
    const char* i_get_file_name(uint32_t n) const; // null for a number that is none

private:
    I_FILE() = default;
#include "IFILE/ifile_private.h"
};
