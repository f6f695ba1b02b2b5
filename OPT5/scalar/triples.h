// Expressions by number: what passes on common subexpressions of a block and of a function share.
#pragma once

#include "BITVEC/bitvec.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/flat_map.h"
#include "OPT5/ir/list.h"
#include "OPT5/ir/node.h"
#include "OPT5/ir/trees.h"
#include "OPT5/target/bif.h"

#include <cstddef>
#include <cstdint>
#include <unordered_map>
#include <unordered_set>
#include <vector>

class BBLK;
class SYMTAB;

// ---- What makes two trees the same computation

// Types that one representation serves: all pointers, integers by width and sign, floating-point numbers by width. 0:
// no such type.
unsigned type_code(const TYPE* t);
inline bool types_are_close_enough(const TYPE* a, const TYPE* b) { return type_code(a) && type_code(a) == type_code(b); }

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

// Of a constant: its bits. Without a code where its type has none.
TREE_KEY key_of_constant(const NODE* t);
// Of an object in the type that it is read in; without a code where that is no scalar.
TREE_KEY preconflate_NAME(const NODE* t);

// A number for each key, and for what is like nothing else.
class TREE_NUMBERS {
public:
    int fresh() { return ++last; }
    int of(const TREE_KEY& key) {
        int& number = keys[key];
        return number ? number : number = fresh();
    }
    const int* find(const TREE_KEY& key) const { return keys.find(key); }
    int most() const { return last; }
    void restart() { keys.clear(); } // numbers that were given are not given again

private:
    FLAT_MAP<TREE_KEY, int, TREE_KEY_HASH> keys;
    int last = 0;
};

bool is_computing_call(const NODE* t); // of a function that only computes, be it from memory
bool op_is_computed(int op); // an operator on values whose result they decide
// What an operator costs beside its operands, a load included; casts, leaves and addresses are free.
int weight_of_operator(const NODE* t);
// All operands of the statement are evaluated ahead of its one effect, if it has one.
bool reads_come_first(const NODE* statement);

// ---- Statements whose effects stand among their reads (mixed_statements.cpp)

class MIXED_READS {
public:
    // False of a statement that takes no part. `clear` makes it one without such effects.
    bool enter(const NODE* statement);
    void clear();
    // Whether an operand acts, or an effect among the operands may change it: it stays where it is.
    bool is_out(const NODE* operand) const { return unCSEable.count(operand) != 0; }
    bool writes(const SYMTAB* variable) const { return written.count(variable) != 0; }
    // May trap, and an effect may not pass control on: it is not evaluated ahead of the statement.
    bool must_stay(const NODE* operand) const;

private:
    std::unordered_set<const NODE*> unCSEable;  // membership only
    std::unordered_set<const SYMTAB*> written;  // likewise
    bool keeps_traps = false;
};

// ---- What a tree reads, by slot

// A place is not read where it is written or its address taken, but the pointer that it lies behind is.
template <class F>
void for_each_read_of_place(NODE* place, bool is_certain, const F& read) {
    NODE* object = without_members(place);
    if (op_is_indirection(object->op)) read(object->left, is_certain);
}

// Calls `read(slot, is_certain)` for each operand whose value is read. Certain: whenever `t` is evaluated.
template <class F>
void for_each_operand_read(NODE* t, bool is_certain, const F& read) {
    if (writes_left_operand(t->op)) {
        for_each_read_of_place(t->left, is_certain, read);
        return read(t->right, is_certain);
    }
    switch (t->op) {
    case UAND:
    case ARGREF:
    case STARG:
    case STDOT: return for_each_read_of_place(t->left, is_certain, read);
    case ANDAND:
    case OROR:
    case QUEST: read(t->left, is_certain); return read(t->right, false);
    case STREF: return read(t->left, is_certain);
    case ICALL:
        if (ok_to_CSE_ICALL_opds(t)) read(t->left, is_certain);
        return;
    default: read(t->left, is_certain); read(t->right, is_certain);
    }
}

// The same for a statement that takes part in spite of effects among its reads.
template <class F>
void for_each_read_of_mixed(NODE* t, const F& read) {
    if (t->op == IF || t->op == SWITCH) return for_each_operand_read(t->left, true, read);
    if (t->op != ASG || t->right->op != CALL) return for_each_operand_read(t, true, read);
    for_each_operand_read(t->right, true, read);
    for_each_read_of_place(t->left, true, read);
}

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
    bool may_be_counter; // a counter of a loop may be made of it or of what it is part of: of an address, or a variable
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

// A place where something is written.
struct TRIPLE_WRITE {
    int block;
    int position;
    const NODE* statement;
};

// A statement that changes a triple by an amount, as `i += 1` changes a + 5 * i by 5: no change where the temporary goes
// along.
struct TRIPLE_STEP {
    int block;
    int position;
    LIST* cell;
    uint64_t amount; // modulo the width of the triple
};

// Those of one triple, in the order of blocks and statements: a part of the list of all.
struct TRIPLE_SITES {
    TRIPLE_SITE *first = nullptr, *past = nullptr;
    TRIPLE_SITE* begin() const { return first; }
    TRIPLE_SITE* end() const { return past; }
    size_t size() const { return static_cast<size_t>(past - first); }
    bool empty() const { return first == past; }
    TRIPLE_SITE& front() const { return *first; }
    TRIPLE_SITE& back() const { return past[-1]; }
    TRIPLE_SITE& operator[](size_t i) const { return first[i]; }
    // What is computed in one block only, and not again and again, is common to that block at most.
    bool is_worth_a_look() const;
};

struct TRIPLE {
    NODE* tree = nullptr; // its first occurrence, borrowed
    double cost = 0;
    bool may_trap = false; // a division, a load through a pointer, or a call
    bool reads_memory = false;
    bool is_asked_whole = false; // a call in it reads memory: the table does not tell what alters that
    std::vector<const SYMTAB*> variables; // private ones that it reads
    std::vector<const std::vector<TRIPLE_WRITE>*> writes; // of these, but for the steps
    std::vector<TRIPLE_STEP> steps;       // in the order of blocks and statements
    std::vector<size_t> lvalues;          // other ones, by their numbers in the table of aliases
    TRIPLE_SITES sites;
    std::vector<TRIPLE_RENEWAL> renewals; // in the order of blocks and statements
};

// Those that are worth a look, and what renewals refer to. Expressions and their sites are counted whether they are in or
// not.
extern std::vector<TRIPLE> unique_triples;
extern size_t unique_triple_count, triple_site_count;

// For each lvalue that triples read, which of the writes to memory may alter it: asked once, when it is wanted first.
class Triple_Alias_Table {
public:
    size_t number_of(int tree_number, const NODE* lvalue); // of the lvalue whose tree has this number; borrowed
    bool was_asked(size_t lvalue, size_t write) const { return rows[lvalue].asked.test(static_cast<uint32_t>(write)); }
    bool may_be_altered(size_t lvalue, size_t write);
    void forget_answers();
    void clear();

private:
    struct ROW {
        const NODE* lvalue;
        BITVEC asked, altered; // by the number of the write
    };
    FLAT_MAP<int, size_t> numbers; // of rows, from 1
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
