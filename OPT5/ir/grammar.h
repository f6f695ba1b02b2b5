// The grammar of trees: every node stands where its operator may stand, under operands that it can have.
//
// The I-file's records fix how many operands a node has, not what they are. Trees that no parser writes are refused: a
// label used as a value, a case outside a switch, an indirection through what is no pointer, a sum of structures.
// Parsers leave casts out, so an operand may have another type than its operator, as long as a cast could convert it.
// The input is checked once; the optimizer's walkers then rely on the shapes, and validation between the rows of the
// pipeline holds every pass to them.
#pragma once

#include <string>

class NODE;

// What is wrong with a tree of the input, empty if nothing is.
std::string grammar_fault_of_statement(const NODE* tree);
std::string grammar_fault_of_initializer_item(const NODE* tree);

// Checks every statement of the current function's blocks and reports to the debug stream, or stderr without one; the number
// of statements that are wrong.
int validate_grammar();
