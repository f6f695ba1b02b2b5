#include "OPT5/ir/statements.h"

#include "OPT5/ir/trees.h"

LIST** insert_before(LIST** link, NODE* tree, PSN* psn) {
    *link = mkelist(tree, *link, psn);
    return &(*link)->rest;
}

LIST* insert_behind(LIST* cell, NODE* tree, PSN* psn) { return cell->rest = mkelist(tree, cell->rest, psn); }

LIST** end_of_body(BBLK* bb) {
    LIST** end = &bb->statements;
    for (LIST** link = &bb->statements; *link && (*link)->rest; link = &(*link)->rest)
        if ((*link)->first->op != PPRAGMA) end = &(*link)->rest;
    return end;
}

void insert_at_end_of_body(BBLK* bb, NODE* tree) {
    LIST** link = end_of_body(bb);
    insert_before(link, tree, (*link)->psn);
}

bool ends_in_promise(const BBLK* bb) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (s->first->op == PPRAGMA && s->first->pragma->kind != PRG_SRC_LOOP) return true;
    return false;
}

void drop_statement(LIST** link) {
    LIST* cell = *link;
    *link = cell->rest;
    erase_tree(cell->first);
    delete cell;
}

void drop_statement_behind(LIST* cell) { drop_statement(&cell->rest); }

void drop_empty_cells(LIST** list) {
    while (*list) {
        if ((*list)->first)
            list = &(*list)->rest;
        else
            drop_statement(list);
    }
}

void set_statements(BBLK* bb, LIST* list) {
    bb->statements = list;
    bb->control = nullptr;
}

void end_block_with(BBLK* bb, LIST* cell, NODE* control) {
    cell->rest = mkelist(control, nullptr, cell->psn);
    bb->control = cell->rest;
}

void erase_statements(BBLK* bb) {
    erase_tree_list(bb->statements);
    set_statements(bb, nullptr);
}
