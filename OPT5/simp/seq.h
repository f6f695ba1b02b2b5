// Sequencing: from the raw statement trees of a function to statements without control flow at their root.
#pragma once

class NODE;
struct LIST;

// Runs once per function, after the first simplification and before `buildcfg`, on FUNINFO::statements (last first),
// which have been simplified as they stand. `prepare`, where not null, is applied to each tree first. Afterwards no
// statement is a QUEST, ANDAND, OROR, COMMAOP, CBRANCH or an increment, and every IF names both targets.
void seq_trees(NODE* (*prepare)(NODE*) = nullptr);

// Sequences one tree behind the statements of `*list` (last first), each new cell with the position `psn`. `simplified`
// says that the tree has been through the simplifier as it stands.
void sequence_tree(NODE* tree, LIST** list, struct PSN* psn, bool simplified = false);

// Sequences what comes before the value of `tree` behind the statements of `*list`; the rest of the tree.
NODE* promote_tree(NODE* tree, LIST** list, struct PSN* psn);

// Puts operators, numbers and assignments in place of calls of the standard library and of characters of literals, in a
// raw tree, before it is known which calls the function has.
void replace_library_calls(NODE** link);

// ---- Structures
NODE* apply_UAND_to_struct(NODE* tree); // the address of a structure's value; consumes the tree
// Whether a statement copies a constant object of a small structure of plain members, and its assignments one by one.
bool is_small_constant_STASG(const NODE* tree);
NODE* convert_STASG_to_asgs(NODE* tree); // a chain of COMMAOPs

// ---- Exceptions
// The statement that stands for the dispatch of an exception behind a call: a SWITCH on a magic call whose cases lead
// to the handlers. It keeps the handlers reachable while the function is optimized and is not written out.
NODE* make_magic_EH_SWITCH(NODE* call, NODE* fall_through);
// Records where the cases of a dispatch lead in the catch clauses of the current function.
void update_eht_labels(NODE* tree, bool negated);
