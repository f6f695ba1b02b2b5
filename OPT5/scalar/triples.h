// Expressions by number: what passes on common subexpressions of a block and of a function share.
#pragma once

#include "BITVEC/bitvec.h"
#include "OPT5/ir/list.h"
#include "OPT5/ir/node.h"

#include <cstddef>
#include <cstdint>
#include <unordered_map>
#include <vector>

class BBLK;
class SYMTAB;

// ---- What makes two trees the same computation

// Types that one representation serves: all pointers, integers by width and sign, floating-point numbers by width. 0:
// no such type.
unsigned type_code(const TYPE* t);

// An operator, its types, and its operands by number.
struct TREE_KEY {
    int op;
    unsigned code;    // of its type
    uint64_t payload; // a symbol, a constant, an offset, or the code of the operands' type; compared alone
    int a, b;         // the operands
    bool operator==(const TREE_KEY& o) const {
        return op == o.op && code == o.code && payload == o.payload && a == o.a && b == o.b;
    }
};
struct TREE_KEY_HASH {
    size_t operator()(const TREE_KEY& k) const;
};
inline uint64_t identity(const void* p) { return reinterpret_cast<uintptr_t>(p); }

TREE_KEY key_of_FCON(const NODE* t);  // its bits
bool is_computing_call(const NODE* t); // of a function that only computes, be it from memory
bool op_is_computed(int op); // an operator on values whose result they decide
// What an operator costs beside its operands, a load included; casts, leaves and addresses are free.
int weight_of_operator(const NODE* t);
// All operands of the statement are evaluated ahead of its one effect, if it has one.
bool reads_come_first(const NODE* statement);

// Assignments to temporaries that are to stand ahead of statements: by the statement, in ascending order.
struct KEPT {
    int order;
    NODE* assignment;
};
using STATEMENTS_AHEAD = std::unordered_map<const LIST*, std::vector<KEPT>>; // looked up, never walked
void insert_statements_ahead(BBLK* bb, STATEMENTS_AHEAD& ahead); // ahead also of the pragmas that speak of what follows

// ---- The expressions of the current function

// Where an expression is computed.
struct TRIPLE_SITE {
    int block;    // number
    int position; // of the statement in it; what a statement reads comes ahead of what it writes
    NODE** slot;
    BBLK* bb;
    LIST* cell;
    bool is_certain; // whenever the statement is evaluated
};

// An assignment `x = e` of a variable that a triple reads, behind which the triple has the value of another: of the same
// expression with e in place of x.
struct TRIPLE_RENEWAL {
    int block;
    int position;
    LIST* cell;
    BBLK* bb;
    size_t other; // number of that triple
};

struct TRIPLE {
    NODE* tree = nullptr; // its first occurrence, borrowed
    double cost = 0;
    bool may_trap = false; // a division, a load through a pointer, or a call
    bool reads_memory = false;
    bool is_asked_whole = false; // a call in it reads memory: the table does not tell what alters that
    std::vector<const SYMTAB*> variables; // private ones that it reads
    std::vector<size_t> lvalues;          // other ones, by their numbers in the table of aliases
    std::vector<TRIPLE_SITE> sites;       // in the order of blocks and statements
    std::vector<TRIPLE_RENEWAL> renewals; // likewise
};

// A place where something is written.
struct TRIPLE_WRITE {
    int block;
    int position;
    const NODE* statement;
};

extern std::vector<TRIPLE> unique_triples;

// For each lvalue that triples read, which of the writes to memory may alter it: asked once, when it is wanted first.
class Triple_Alias_Table {
public:
    size_t number_of(int triple, const NODE* lvalue); // of the lvalue whose tree has this number; borrowed
    bool was_asked(size_t lvalue, size_t write) const { return rows[lvalue].asked.test(static_cast<uint32_t>(write)); }
    bool may_be_altered(size_t lvalue, size_t write);
    void forget_answers();
    void clear();

private:
    struct ROW {
        const NODE* lvalue;
        BITVEC asked, altered; // by the number of the write
    };
    std::unordered_map<int, size_t> numbers; // looked up, never walked
    std::vector<ROW> rows;
};
extern Triple_Alias_Table triples_alias_table;
// The writes of a private variable, and those of everything else, in order.
const std::vector<TRIPLE_WRITE>& writes_of_variable(const SYMTAB* sym);
const std::vector<TRIPLE_WRITE>& writes_of_memory();
// Whether one of those of memory may change what the triple reads there.
bool write_may_alter(const TRIPLE& t, const TRIPLE_WRITE& w);
// Statements that may not pass control on: what may trap does not move ahead of them.
const std::vector<TRIPLE_WRITE>& statements_that_may_stay();
