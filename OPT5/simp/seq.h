// Sequencing: from the raw statement trees of a function to statements without control flow at their root.
#pragma once

#include <cstdint>
#include <unordered_map>

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
// `handlers`: where clauses lead, by their id; null while they are labels of the input. At least one is known.
using EH_HANDLERS = std::unordered_map<int32_t, struct LBL*>;
NODE* make_magic_EH_SWITCH(NODE* call, NODE* fall_through, const EH_HANDLERS* handlers = nullptr);
// Whether an exception that leaves a call of the statement may come to a handler of the current function.
bool statement_may_reach_catch(const NODE* t);
// What a statement tests or returns: calls in it that may lead to a handler are made ahead, with the dispatch between.
// Null for other statements.
NODE** value_of_transfer(NODE* t);
// Records where the cases of a dispatch lead in the catch clauses of the current function.
void update_eht_labels(NODE* tree, bool negated);
