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

// The tags of type records. An integer's is its IKIND up to 9, and 40 more than that from `long long` on.
enum IF_TYPE_TAG : uint8_t {
    IFT_LAST_SHORT_INTEGER = 9,
    IFT_FLOAT = 10,
    IFT_DOUBLE = 11,
    IFT_LDOUBLE = 12,
    IFT_FIXEDPOINT = 13,
    IFT_TYPEDEF = 14,
    IFT_ADDR = 15,
    IFT_REF = 16,
    IFT_QUAL = 17,
    IFT_ARRAY = 18,
    IFT_PTM = 19,
    IFT_FUNC = 20,
    IFT_PARAM = 21,
    IFT_ENUM = 22,
    IFT_ETOR = 23,
    IFT_CSU_SHORT = 24,
    IFT_CSU_LONG = 25,
    IFT_MDATA = 28,
    IFT_BCLASS = 29,
    IFT_ADECL = 30,
    IFT_FFRIEND = 31,
    IFT_CFRIEND = 32,
    IFT_NTYPE = 33,
    IFT_SDATA = 34,
    IFT_MFUNC = 35,
    IFT_COMPLEX = 36,
    IFT_VOID = 49,
    IFT_LLONG = 50,
    IFT_ULLONG = 51,
    IFT_LIST_HEADER = 254,
    IFT_LIST_TRAILER = 255,
};
// The lists of a type by number, and the tag of an element of each.
enum IF_TYPE_LIST : uint8_t {
    IFL_PARAMS,
    IFL_ETORS,
    IFL_BCLASSES,
    IFL_ADECLS,
    IFL_FFRIENDS,
    IFL_CFRIENDS,
    IFL_NTYPES,
    IFL_MDATA,
    IFL_SDATA,
    IFL_MFUNCS,
    IF_TYPE_LISTS
};
constexpr uint8_t if_list_tags[IF_TYPE_LISTS] = {IFT_PARAM,   IFT_ETOR,  IFT_BCLASS, IFT_ADECL, IFT_FFRIEND,
                                                 IFT_CFRIEND, IFT_NTYPE, IFT_MDATA,  IFT_SDATA, IFT_MFUNC};
constexpr uint8_t IF_LEAF_FUNCTION = 76; // the byte of IFR_FUNC_INFO: the function calls nothing

constexpr char IF_MAGIC[] = "!<icode>\n";
constexpr int IF_VERSION = -71;        // written
constexpr int IF_VERSION_OLDEST = -86; // read from here up to IF_VERSION
constexpr int IF_CPU_ID = 600;

// The opcodes of if_nodes.def by name.
namespace if_op {
enum : int {
#define IF_NODE(op, name, count) name = op,
#include "IFILE/if_nodes.def"
#undef IF_NODE
};
} // namespace if_op
constexpr int IF_MAX_OPCODE = if_op::VREG;
// Trees nested deeper are refused: the walkers recurse, and this is what their stack is laid out for.
constexpr int IF_MAX_TREE_DEPTH = 200000;
// The same for derived types, and for structures within structures.
constexpr uint32_t IF_MAX_TYPE_DEPTH = 2000;

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
constexpr int IF_NODE_TABLE_SIZE = 201; // the optimizer has opcodes beyond those of the file
extern IF_NODE_INFO if_node_info[IF_NODE_TABLE_SIZE];
void if_node_table_init(); // fills it, once per process
void if_enter_node(int op, const char* name, int operand_count);
// Opcode that a relational operator becomes where an operand is floating, or the opcode itself.
int if_float_relop(int op);

struct TYPE_INFO {
    TYPE* type = nullptr;
    uint32_t pending = 0; // list records still expected
    uint32_t depth = 0;   // how deep the type is nested; a class, struct or union counts 0
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
    std::map<uint64_t, TYPE_INFO> typeref_map; // reader: the types whose numbers are too scattered for a plain index
    int64_t extra_word = 0;
    int64_t level = 0; // 0 outside functions, 1 after begin function, 2 after end of arguments, plus 1 per open block
    std::vector<I_SYMTAB*> locals;
    std::vector<I_SYMTAB*> globals;

    ~I_FILE();
    I_FILE(const I_FILE&) = delete;
    I_FILE& operator=(const I_FILE&) = delete;

    // ---- Opening and closing
    // Takes over `stream` in either case. Null if the header is not acceptable; `*why`, if given, tells what was wrong.
    // `if_open` also reads the option sets and throws `if_error` if they are malformed.
    static I_FILE* if_open(FILE* stream, IF_CLIENT* client, std::string* why = nullptr);
    static I_FILE* if_open_basic(FILE* stream, IF_CLIENT* client, std::string* why = nullptr);
    static I_FILE* if_create(FILE* stream, TYPE_PKG* pkg, const char* source_name);
    // Writes the trailing sections unless `discard`, frees the object, closes the stream. 1 if the stream failed.
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
    void if_write_init(I_SYMTAB* sym);   // opens the initializer section on first use
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
    // Marks the type, and what it was merged into, as needed by the output. Null does nothing.
    void if_reference_type(TYPE* type);
    void if_write_all_types(bool keep_named);

    // ---- Both
    int64_t if_tell() const;
    void if_seek(int64_t offset);
    void if_flush();
    void if_enter_global(I_SYMTAB* sym);          // level 0 and the next index
    void if_enter_local(I_SYMTAB* sym);           // the current level and the next index
    uint32_t i_enter_file_name(const char* name); // the number, from 1
    uint32_t i_get_file_id(const char* name) const;
    const char* i_get_file_name(uint32_t n) const; // null for a number that is none

private:
    // The element list of a type that is being read: between its header and its trailer.
    struct OPEN_LIST {
        uint64_t number = 0; // of the owning type
        int list = -1;       // -1: none is open
        TYPE* type = nullptr;
        fkMDATA* members = nullptr;
        fkPARAM* params = nullptr;
        fkETOR* etors = nullptr;
        std::vector<uint32_t> member_numbers;
        void* tail = nullptr; // last element of the chain in work
        ~OPEN_LIST();
    };
    // The members of one struct by the numbers that the file gave them.
    struct MEMBER_TABLE {
        std::vector<uint32_t> numbers; // empty: 1, 2, 3 ... in list order
        std::vector<fkMDATA*> members; // filled on first use
        bool filled = false;
    };
    // A node whose operands are still being read.
    struct OPEN_NODE {
        BASE_NODE* node;
        BASE_NODE* left;
        int operands;
    };
    // A nested type or friend class may be named before its own record.
    struct FORWARD_REF {
        CSU_LIST<TYPE*>* elements;
        size_t item;
        uint64_t number;
        int64_t at;
    };
    struct WRITE_BUFFER {
        uint8_t* bytes = nullptr;
        size_t used = 0, size = 0;
        void grow(size_t room);
        ~WRITE_BUFFER();
    };
    class SECTION;

    I_FILE() = default;

    // ---- Reader state. The whole file is in memory; `cursor` never passes `limit`, the end of the record in work.
    std::unique_ptr<uint8_t[]> image;
    const uint8_t* image_end = nullptr;
    const uint8_t* cursor = nullptr;
    const uint8_t* limit = nullptr;
    const uint8_t* record = nullptr; // its kind byte
    const uint8_t* body = nullptr;   // first byte behind the header
    std::vector<TYPE_INFO> dense_types;
    std::vector<uint64_t> type_order;                            // numbers of named types in order of reading
    std::unordered_map<const TYPE*, MEMBER_TABLE> member_tables; // looked up only, never walked
    std::unique_ptr<OPEN_LIST> open_list;
    std::vector<FORWARD_REF> forward_refs;
    size_t waiting_types = 0; // types that still expect lists
    std::vector<OPEN_NODE> open_nodes;
    std::vector<bool> defined; // globals whose function or initializer has been read
    std::deque<PSN> psns;
    uint32_t eht_count = 0;            // entries of the function's exception table
    uint32_t max_eh_entry = 0;         // highest entry that a call of the function names
    bool in_back_end_function = false; // the code generator's records have brackets of their own
    bool reading_unit = false;

    // ---- Writer state
    WRITE_BUFFER buffer;       // bytes that are not in the stream yet
    size_t payload = 0;        // where the payload of the record in work starts in `buffer`
    int64_t buffer_offset = 0; // file offset of the buffer's first byte
    bool stream_failed = false;
    bool inits_open = false;
    uint32_t last_file_id = 0; // of the name entered last: positions come in runs of one file
    bool types_written = false;
    std::vector<const BASE_NODE*> waiting_nodes; // right subtrees of the tree in work
    std::vector<TYPE*> csu_queue;                // classes whose record is written and whose lists are not

    // ---- Both
    std::deque<std::string> file_table; // number 1 first
    std::unordered_map<std::string_view, uint32_t> file_ids;

    // ---- Primitives
    [[noreturn]] void bad_input(const char* format, ...) const __attribute__((format(printf, 2, 3)));
    [[noreturn]] void short_payload() const;
    template <class WORK>
    void guard_types(WORK work);
    uint8_t i_read_u8();
    int8_t i_read_s8();
    bool i_read_bool();
    uint16_t i_read_u16();
    int16_t i_read_s16();
    uint32_t i_read_u32();
    int32_t i_read_s32();
    uint64_t i_read_uint();
    uint64_t i_read_long_uint();
    uint32_t i_read_uint32(const char* what); // a uint that must fit 32 bits
    int64_t i_read_sint();
    const char* i_read_string(); // lives as long as the reader
    const uint8_t* i_read_raw(uint64_t size);
    PSN* i_read_psn();
    int i_read_header(); // a record's frame; its payload is next
    void end_record();   // the payload must be used up
    uint64_t rest() const { return static_cast<uint64_t>(limit - cursor); }
    bool load_image();
    bool read_file_header(std::string* why);
    bool check_sections(std::string* why) const;
    static I_FILE* open_reader(FILE* stream, IF_CLIENT* client, std::string* why);

    void room(size_t bytes);
    void begin_payload();
    void i_flush(int kind); // closes the record in work
    void drain();           // hands the buffer to the stream
    void i_write_i8(int v);
    void i_write_bool(bool v);
    void i_write_i16(int v);
    void i_write_i32(uint32_t v);
    void i_write_uint(uint64_t v);
    void i_write_sint(int64_t v);
    void i_write_string(const char* text, size_t length); // length 0: as a terminated string
    void i_write_psn(const PSN* psn);
    void i_write_typeref(TYPE* type);
    void i_write_raw(const uint8_t* bytes, size_t size);
    void i_write_eof();
    void enter_position(const PSN* psn);
    void write_file_header();
    void finish_output(bool keep_all_types);

    // ---- Records of the body
    void read_record(int kind);
    void enter_function();
    void need_function(const char* what) const;
    I_SYMTAB* find_symbol(int32_t symbol_level, uint64_t index, const char* what) const;
    I_SYMTAB* read_symbol_ref(const char* what);
    I_SYMTAB* if_read_sym(int* pragma_count);
    void if_read_pragma(I_SYMTAB* sym);
    void if_read_begin_func();
    void if_read_end_func();
    void if_read_begin_block();
    void if_read_end_block();
    void if_read_end_args();
    void if_read_end_locals();
    void if_read_label();
    void if_read_assembly();
    void if_read_comment();
    void if_read_source();
    void if_read_func_info();
    void if_read_expr_header();
    void if_read_ir_begin();
    void if_read_ir();
    void if_read_ir_end();
    void if_read_init();
    void if_read_loop();
    void if_read_inloop();
    void if_read_dep_vector();
    void if_read_dep_edge();
    void if_read_mbank();
    void if_read_ldspec();
    void if_read_eht();
    void if_read_eht_entry(EHT_ENTRY* entry, uint32_t table_size);
    void check_eht(const EHT_ENTRY* entries, uint32_t count) const;

    // ---- Nodes
    BASE_NODE* read_node();
    void read_node_payload(BASE_NODE* node);
    void if_read_expr_name(BASE_NODE* node);
    void if_read_expr_field(BASE_NODE* node);
    void if_read_expr_icon(BASE_NODE* node);
    void if_read_expr_lcon(BASE_NODE* node);
    void if_read_expr_fcon(BASE_NODE* node);
    void if_read_expr_scon(BASE_NODE* node);
    void if_read_expr_label(BASE_NODE* node);
    void if_read_expr_vreg(BASE_NODE* node);
    void if_read_expr_skip(BASE_NODE* node);
    void if_read_expr_switch(BASE_NODE* node);
    void if_read_expr_ddnode(BASE_NODE* node);
    void if_read_expr_icall(BASE_NODE* node);
    void if_read_expr_call(BASE_NODE* node);
    void if_read_expr_ucall(BASE_NODE* node);
    void if_read_expr_pval(BASE_NODE* node);
    void write_node(const BASE_NODE* node);
    void begin_ldspec(uint32_t id, int subkind);
    void end_ldspec(TYPE* type, I_SYMTAB* sym);
    void if_write_eht_hdr(uint32_t count);
    void if_write_eht_entry(const EHT_ENTRY& entry);
    void if_write_eht_catch_entry(const I_CATCH_ENTRY& clause);
    void write_name(const BASE_NODE* node);

    // ---- Types, reading
    void if_read_type();
    void read_type(uint64_t n, int tag);
    void read_element(uint64_t n, int tag);
    void if_read_void_type(uint64_t n);
    void if_read_integral_type(uint64_t n, int tag);
    void if_read_float_type(uint64_t n, int tag);
    void if_read_fixedpoint_type(uint64_t n);
    void if_read_complex_type(uint64_t n);
    void if_read_typedef(uint64_t n);
    void if_read_addr_type(uint64_t n);
    void if_read_ref_type(uint64_t n);
    void if_read_qual_type(uint64_t n);
    void if_read_array_type(uint64_t n);
    void if_read_ptm_type(uint64_t n);
    void if_read_func_type(uint64_t n);
    void if_read_enum_type(uint64_t n);
    void if_read_csu_short(uint64_t n);
    void if_read_csu_long(uint64_t n);
    void if_read_csu(uint64_t n, bool long_form);
    bool if_read_type_is_cpp(const char* name);
    void if_read_list_header(uint64_t n);
    void if_read_list_trailer(uint64_t n);
    void if_read_param_elem();
    void if_read_etor_elem();
    void if_read_mdata_elem();
    void if_read_bclass_elem();
    void if_read_adecl_elem();
    void if_read_ffriend_elem();
    void if_read_cfriend_elem();
    void if_read_ntype_elem();
    void read_forward_ref(CSU_LIST<TYPE*>& elements);
    void if_read_sdata_elem();
    void if_read_mfunc_elem();
    void tp_make_integral_type(uint64_t n, int tag, bool expl_sign, uint64_t size, uint32_t align, bool is_bool,
                               bool flag);
    void tp_make_float_type(uint64_t n, int tag, uint64_t size, uint32_t align);
    void tp_make_list(uint64_t n, int list);
    void tp_end_list(uint64_t n, int list);
    void tp_make_csu(uint64_t n, TYPE* type, uint32_t lists);
    void enter_type(uint64_t n, TYPE* type, uint32_t pending = 0);
    TYPE_INFO* find_type_info(uint64_t n);
    TYPE* read_typeref();                 // null for 0; notes the nesting
    TYPE* need_typeref(const char* what); // 0 is an error
    TYPE* typeref_or_void();
    uint64_t read_bits(uint64_t highest, const char* what);
    uint32_t read_align();
    void resolve_forward_refs();
    void check_containment();
    void merge_read_types();
    uint32_t nesting = 0; // of the types that the record in work has named

    // ---- Types, writing
    void write_type_record(TYPE* type);
    void write_waiting_lists();
    void write_all_csu_types();
    void write_type_tree();
    void begin_type(const TYPE* type, int tag);
    void write_integral_type(TYPE* type);
    void write_float_type(TYPE* type);
    void write_fixedpoint_type(TYPE* type);
    void write_typedef(TYPE* type);
    void write_addr_type(TYPE* type, int tag, TYPE* target);
    void write_qual_type(TYPE* type);
    void write_array_type(TYPE* type);
    void write_ptm_type(TYPE* type);
    void write_func_type(TYPE* type);
    void write_enum_type(TYPE* type);
    void write_complex_type(TYPE* type);
    void write_csu_type(TYPE* type);
    void write_csu_type_lists(TYPE* type);
    void write_list_frame(const TYPE* type, int tag, int list);
    void write_param(const TYPE* owner, const fkPARAM& param);
    template <class ELEMENT, class TYPE_OF, class FIELDS>
    void write_csu_list(const TYPE* type, int list, const CSU_LIST<ELEMENT>& elements, TYPE_OF type_of, FIELDS fields);
    void write_listof_etors(const TYPE* type);
    void write_listof_mdata(const TYPE* type);
};
