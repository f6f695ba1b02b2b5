// Multiply-accumulate statements, in the forms that the hardware takes. What it takes is in target/accumulators.h.
//
//     acc += P; P = x * y;      __parallel_mpy_add(x, y, acc, P, shift): adds the product of before while it multiplies
//     a0 += x[0] * y[0]; a1 += x[1] * y[1];                  __dmac(x, y, a0, a1, shift): both halves of 32-bit words
//
// Statements are cells of a block's list and change in place.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/list.h"

#include <string>
#include <unordered_map>
#include <vector>

// acc += a*b - c*d + e becomes acc += a*b, acc -= c*d, acc += e: one statement behind the other. Whether it was split.
// Sums of floating-point numbers are split where the program allows them to be regrouped.
bool split_accumulations_in_stmt(LIST* cell);
void split_accumulations_in_bb(BBLK* bb); // all but the control statement

// The statement at `cell`, an accumulation of something already multiplied, and the multiplication behind it become one
// call in its place. With `allow_s16` the accumulator may have 16 bits.
bool conversion_to_BIF_call_succeeds(LIST* cell, bool allow_s16);
// Two accumulations of products of neighbouring 16-bit elements, read as 32-bit words, which the caller knows to be
// aligned. `loop`: around them, null if it is not known.
bool conversion_to_s32xs32_DMAC_succeeds(LIST* cell, struct LOOP* loop = nullptr);

// acc op= R, where R holds a multiplication (see `is_mac`): `t = x * y; acc op= R'` with a new t, in two cells from `cell` on.
// Its temporary.
SYMTAB* split_out_multiply(LIST* cell);

// An accumulation whose right side holds a multiplication for the hardware, and not the accumulator.
bool is_mac(const NODE* statement);
bool is_mac_of_halves(const NODE* statement); // of 16-bit factors, into an integer
// Why the sum `statement`, into its left side, of something with a multiplication is not such a one; empty if it is.
std::string why_no_mac(const NODE* statement);

// ---- Loops

// x = x + c of a variable.
struct VARIABLE_STEP {
    SYMTAB* sym = nullptr;
    INT65 c = 0;
};
bool read_variable_step(const NODE* statement, VARIABLE_STEP* step);
NODE* value_behind_step(const VARIABLE_STEP& step, INT65 c); // x + c

// A block that is its own successor, and has one other.
struct MAC_LOOP {
    BBLK* block = nullptr;
    BBLK* exit = nullptr;
    std::vector<BBLK*> entries; // predecessors outside the loop
};
// The multiplications of the block, as the multiplier counts them.
int multiplications_in(const BBLK* bb);
// Loops that accumulate one product an iteration, and choose values by branches, choose them without. Whether the graph
// changed, which is to be simplified then.
bool straighten_loops_of_accumulators();
// Whether evaluating the tree may leave the function, or is an act that keeps its place.
bool may_leave(const NODE* t);
void drop_statements(BBLK* bb, const std::vector<const NODE*>& trees); // those of the list

// A sum in memory that nothing else in the loop reaches: a variable has it there, for as long as that is no variable.
class SUM_IN_MEMORY {
public:
    explicit SUM_IN_MEMORY(MAC_LOOP& loop) : loop(loop) {}
    bool keep_in_variable(); // the one that multiplies; the loop's neighbours may be new then
    void drop();             // what was put around the loop

private:
    bool is_alone(const LIST* cell) const;

    MAC_LOOP& loop;
    std::vector<const NODE*> around;
};

// Takes the statement past those behind it, as far as that changes nothing, but not past `stop`; where it is then.
LIST* move_statement_down(LIST* cell, const LIST* stop);

// `s = *x; acc += s * s;`, as a load that is needed twice was kept, becomes `acc += *x * *x;`: the hardware squares what it
// loads. For one run over a function.
class SQUARES {
public:
    void read_from_memory(LIST* statements);

private:
    bool is_read_here_alone(const SYMTAB* sym);
    bool read_from_memory(LIST* load, LIST* sum);

    std::unordered_map<const SYMTAB*, int> mentions; // looked up alone; found when it is first asked for
};

// Products in the addresses of a block that is a loop, of one variable that steps and one that stays, or of two that stay:
// the multiplier is free of them where they step by themselves.
class SUBSCRIPTS {
public:
    explicit SUBSCRIPTS(const MAC_LOOP& loop) : loop(loop) {}
    void step(int count); // that many, or none
    void drop();          // what was put ahead of the loop

private:
    struct PRODUCT {
        SYMTAB *steps, *stays, *value;
        TYPE* type;
    };
    bool read(const NODE* t, PRODUCT* product) const;
    LIST* only_change_of(const SYMTAB* sym, bool* any) const;
    void put_ahead(NODE* asg);
    void begin(PRODUCT& product);

    const MAC_LOOP& loop;
    std::vector<PRODUCT> products;
    std::vector<const NODE*> ahead;
};

// Multiplies for the next iteration where that leads to a call; whether it did. Blocks are new then, and not numbered.
bool speculatively_rotate_loop_for_accumulators(const MAC_LOOP& loop, SQUARES& squares);
