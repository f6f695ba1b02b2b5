// The statements of a block: every pass changes them through here.
//
// A block's list ends in its control statement, which BBLK::last_statement finds in constant time: the block remembers the
// cell. Insertions and removals in front of it leave that alone; whoever gives a block another end says so with
// `set_statements` or `end_block_with`.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/list.h"

// ---- In front of the control statement. A link is `&bb->statements` or `&cell->rest`.

// A new statement in front of the one at the link, which must be there; the link of that one.
LIST** insert_before(LIST** link, NODE* tree, PSN* psn);
// A new statement behind `cell`, which is not the control statement; the new cell.
LIST* insert_behind(LIST* cell, NODE* tree, PSN* psn);
// A new statement where the body of the block ends: ahead of the control statement and of the promises that belong to it.
void insert_at_end_of_body(BBLK* bb, NODE* tree);
LIST** end_of_body(BBLK* bb); // the link there
// Whether a pragma of the block promises something of the loop that follows in the text. The promise is of that loop, by its
// label: what stands behind one stays there, and that label stays in use. The mark of a loop's place in the source promises
// nothing.
bool ends_in_promise(const BBLK* bb);

// Takes out the statement at the link, which is not the control statement, and erases its tree if it has one; the link is
// then that of the next statement.
void drop_statement(LIST** link);
// The same of the statement behind `cell`.
void drop_statement_behind(LIST* cell);
void drop_empty_cells(LIST** list); // those whose tree went

// ---- The end of a block

// The block holds the list, which it owns from now on; what it held before is left to the caller.
void set_statements(BBLK* bb, LIST* list);
// The control statement behind `cell`, in place of all that is there; the caller has taken or erased that.
void end_block_with(BBLK* bb, LIST* cell, NODE* control);
// Erases all statements.
void erase_statements(BBLK* bb);
