// The grammar of trees: every node stands where its operator may stand, under operands that it can have.
//
// The I-file's records fix how many operands a node has, not what they are. What is refused is what no parser writes and
// what the optimizer could only misread: a label used as a value, a case outside a switch, an indirection through what is
// no pointer, a sum of structures. Operands may have other types than their operator, since parsers leave casts out; but
// what no cast could make of them is refused. Behind the check of the input the walkers of the optimizer rely on the shapes, and validation between the
// rows of the pipeline holds every pass to them.
#pragma once

#include <string>

class NODE;

// What is wrong with a tree of the input, empty if nothing is.
std::string grammar_fault_of_statement(const NODE* tree);
std::string grammar_fault_of_initializer_item(const NODE* tree);

// Checks every statement of the current function's blocks and reports to the debug stream, or stderr without one; the number
// of statements that are wrong.
int validate_grammar();
