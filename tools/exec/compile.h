// From a unit to the compiled form: places of objects, initial memory, code of functions.
#pragma once

#include "tools/exec/dependences.h"
#include "tools/exec/ops.h"

#include <deque>
#include <unordered_map>

// Where an object lives: an address, or an offset in the frame.
struct PLACE {
    BASE base = B_ABS;
    int64_t at = 0;
    uint64_t units = 0;
    bool is_register = false; // a local scalar whose address nothing takes: a compiler keeps it in a register
};

// The accesses of one node; `fields` of them to bit-fields.
struct ACCESSES {
    unsigned loads = 0, stores = 0, fields = 0, memory_loads = 0, memory_stores = 0;
};

struct LVALUE {
    BASE base = B_EXPR;
    const XNODE* address = nullptr; // of B_EXPR
    int64_t k = 0;
    int64_t low = 0, high = 0; // of B_ABS and B_FRAME: the object that k must stay in
    bool is_field = false;
    bool is_register = false;
    unsigned bit = 0, width = 0; // of a field
    SHAPE shape;                 // of what is there; of a field's declared type
};

// A call as compiled.
struct CALL_SITE {
    FUNCTION* target = nullptr;
    const LIBRARY_ENTRY* library = nullptr;
    const XNODE* callee = nullptr; // an address to be computed
    std::vector<const XNODE*> args;
    std::vector<SHAPE> shapes;
    std::vector<TYPE*> types;
    SHAPE result;
    int64_t slot = 0; // in the frame, for a structure that comes back
    uint32_t eh_entry = 0;
    std::string name;
};

// What a node adds to the statistics.
struct COUNTED {
    std::vector<uint16_t> ops;
    ACCESSES accesses;
};

struct PROGRAM {
    const IC_UNIT& unit;
    EXEC_OPTIONS options;
    MACHINE m;
    std::deque<FUNCTION> functions; // in file order
    std::deque<XNODE> nodes;
    std::deque<SWITCH_TABLE> tables;
    std::deque<std::string> texts;
    std::deque<COUNTED> counted;
    std::vector<std::shared_ptr<void>> records;
    std::unordered_map<const IC_SYMBOL*, PLACE> places;    // objects of the unit
    std::unordered_map<const IC_SYMBOL*, int64_t> entries; // functions: addresses
    uint64_t next = null_page;                             // first free unit while memory is laid out
    bool name_prefix = true;

    PROGRAM(const IC_UNIT& u, const EXEC_OPTIONS& o) : unit(u), options(o) {}
    void lay_out();    // every object and function gets its address
    void initialize(); // static initializers, after lay_out
    void compile();    // every function
    FUNCTION* find_main();
    uint64_t take(uint64_t units, uint64_t align_mask); // memory for the whole run
    uint64_t text_address(const IC_NODE* scon);
    std::string bare(const char* name) const; // the source's name

    // A record of the compiled form, which lives as long as the program.
    template <class T>
    T* make() {
        auto record = std::make_shared<T>();
        records.push_back(record);
        return record.get();
    }
    static int64_t refused(const XNODE* x, MACHINE& m);
    XNODE* node(EVAL run, const XNODE* a = nullptr, const XNODE* b = nullptr, int64_t k = 0) {
        nodes.emplace_back();
        XNODE* x = &nodes.back();
        x->run = run ? run : refused; // no form of the operation for such operands
        x->a = a;
        x->b = b;
        x->k = k;
        return x;
    }
};

inline const IC_NODE* strip_marks(const IC_NODE* n) {
    while (n && (n->op == op::EPVAL || n->op == op::DDNODE)) n = n->left;
    return n;
}

// Compiles the trees of one function, or of an initializer (without a function).
class COMPILER {
public:
    COMPILER(PROGRAM& program, FUNCTION* function) : p(program), f(function) {}
    void function();                                          // all of it
    const XNODE* value(const IC_NODE* n);                     // in the shape of the node's type
    const XNODE* value_as(const IC_NODE* n, const SHAPE& to); // converted
    const XNODE* convert(const XNODE* x, const SHAPE& from, const SHAPE& to);

private:
    PROGRAM& p;
    FUNCTION* f;
    std::unordered_map<const IC_SYMBOL*, PLACE> locals;
    std::unordered_map<uint32_t, int64_t> registers; // VREG number to its offset in the frame
    std::vector<uint16_t>* folded = nullptr;         // operators that became part of the node in work
    ACCESSES accesses;                               // of that node
    uint32_t cost = 0;
    size_t depth = 0, deepest = 0;
    std::vector<std::pair<uint32_t, const IC_NODE*>> jumps; // statement, label
    const IC_ITEM* exception_table = nullptr;
    std::unordered_map<uint32_t, uint32_t> labels;          // number to statement
    uint32_t labelled = UINT32_MAX;                         // the statement of the last label
    std::vector<TRIP_PROMISE> promised;                     // of the loop whose head comes next
    std::string keyword;                                    // and its keyword in the source
    uint32_t loop = NO_LOOP;                                // the statements that come are in
    std::unordered_map<const IC_NODE*, ACCESS> numbered;    // accesses of a function with dependences

    // compile_expr.cpp
    const XNODE* build(const IC_NODE* n);
    const XNODE* constant(int64_t v) { return p.node(constant_eval(), nullptr, nullptr, v); }
    static EVAL constant_eval();
    const XNODE* number(const IC_NODE* n, const SHAPE& s);
    const XNODE* truth(const IC_NODE* n);
    const XNODE* arithmetic(int opcode, const XNODE* a, const SHAPE& sa, const XNODE* b, const SHAPE& sb,
                            const SHAPE& result);
    const XNODE* binary(const IC_NODE* n);
    const XNODE* unary(const IC_NODE* n);
    const XNODE* comparison(const IC_NODE* n);
    const XNODE* quest(const IC_NODE* n);
    const XNODE* pointer_scale(const IC_NODE* n);
    const XNODE* unsupported(const IC_NODE* n);
    const XNODE* failing(int status, const std::string& text);
    const XNODE* assertion(const IC_NODE* n);
    const XNODE* cast(const IC_NODE* n);
    const XNODE* counting(const XNODE* x, const std::vector<uint16_t>& ops);

    // compile_lvalue.cpp
    LVALUE lvalue(const IC_NODE* n);
    LVALUE name_lvalue(const IC_NODE* n);
    LVALUE member_lvalue(const IC_NODE* n);
    LVALUE through(const XNODE* address, const SHAPE& shape);
    LVALUE part(const IC_NODE* n);
    const XNODE* address(const LVALUE& lv);
    XNODE* access(EVAL (*pick)(REP, BASE), const LVALUE& lv, const XNODE* b);
    XNODE* field_access(EVAL (*pick)(BASE), const LVALUE& lv, const XNODE* b);
    void count_load(const LVALUE& lv);
    void count_store(const LVALUE& lv);
    LVALUE plain_lvalue(const IC_NODE* n);
    LVALUE noted(const LVALUE& lv, const ACCESS& numbered);
    void settle(LVALUE& lv); // an address outside its object is checked when it is used
    const XNODE* load(const LVALUE& lv);
    const XNODE* assign(const IC_NODE* n);
    const XNODE* copy(const LVALUE& to, const XNODE* from);
    const XNODE* compound(const IC_NODE* n, int opcode, bool before);
    int64_t slot(uint64_t units);

    // compile_call.cpp
    const XNODE* call(const IC_NODE* n);
    const XNODE* intrinsic(const IC_NODE* n);
    void arguments(const IC_NODE* list, CALL_SITE& site);
    void match_parameters(CALL_SITE& site);
    const XNODE* finish(CALL_SITE& site, EVAL run);

    // compile_parts.cpp: complex numbers and vectors
    const XNODE* parts(const IC_NODE* n);
    const XNODE* lanes(const IC_NODE* n, int opcode, const XNODE* left_value = nullptr);
    const XNODE* lane_operation(int opcode, bool complex, const SHAPE& a, const SHAPE& b, const SHAPE& to);
    const XNODE* update_lanes(const IC_NODE* n, int opcode);

    // compile_stmt.cpp
    void lay_out_frame();
    void statement(const IC_NODE* n, uint32_t line);
    STMT& add(STMT_KIND kind, uint32_t line);
    void switch_table();
    void define(uint32_t label);
    void exceptions(const IC_ITEM& item);
    uint32_t target(uint32_t label);
    void promise(const PRAGMA& pragma);
    void enter_loop(uint32_t id, uint32_t line);
    void find_numbers(const IC_NODE* n);
    void resolve();
};
