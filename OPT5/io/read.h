// Reading an I-file into the representation: the optimizer's client of the I-file layer.
//
// When `if_read_file` returns, every function has its FUNINFO, its symbols and its control-flow graph, and `functions`
// holds every defined function in file order. Input that the format allows and the optimizer cannot take (a label that
// is defined twice or not at all, scopes that do not nest) ends in `if_error`.
#pragma once

#include "IFILE/if_client.h"
#include "OPT5/ir/node.h"
#include "OPT5/ir/symtab.h"

// What is told of the input while it is read, to the passes that wait for it.
class READ_LISTENER {
public:
    virtual ~READ_LISTENER() = default;
    virtual void symbol_is_complete(SYMTAB* sym) = 0; // with its pragmas
    virtual void initializer_item(NODE* item) = 0;    // of a file-scope symbol, cleaned up
    virtual void assembly(const char* text) = 0;      // at file scope
    virtual NODE* lane_access(NODE* access) = 0;      // a VFIELD; consumes it and returns what stands for it
    virtual void arguments_are_complete() = 0;        // of the current function
    // The current function has its symbols, and its statements in FUNINFO::statements, last first.
    virtual void function_is_complete() = 0;
};

// The one object, owned by the room; `listener` is borrowed for the time of reading.
IF_CLIENT* opt_client(READ_LISTENER& listener);

extern SYMTAB* mcall_implicit_state_symbol; // the object that stands for the state that machine operations share
extern NODE* mcall_implicit_state_tree;     // reads it through a pointer; shared, copy it
extern int output_index;

bool is_implicit_state_argument(const NODE* tree); // the hidden operand of a machine operation

// The first, local clean-up of a tree just read, operands first. Consumes the tree.
NODE* expr_cleanup(NODE* tree);
// An MCALL or UMCALL just read: an unknown one becomes a call, a known one with side effects gets the hidden operand.
NODE* cleanup_intrinsic(NODE* call);
// Moves the hint of `__builtin_expect` between a condition and the labels of its branch.
void convert_CBRANCH_with_builtin_expect(NODE* cbranch);
void revert_CBRANCH_with_builtin_expect(NODE* cbranch);
