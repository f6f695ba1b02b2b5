// Lists of symbols: those linked through the symbol itself, and those with cells of their own.

#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"

SYMLIST* mk_symlist(SYMTAB* sym, SYMLIST* next) { return new SYMLIST{sym, next}; }
SYMALIST* mk_symalist(SYMTAB* sym, NODE* tree, SYMALIST* next) { return new SYMALIST{sym, tree, next}; }

bool symbol_in_list(const SYMTAB* sym, const SYMTAB* list) {
    for (; list; list = list->next)
        if (list == sym) return true;
    return false;
}

SYMLIST* find_sym_in_symlist(const SYMTAB* sym, SYMLIST* list) {
    while (list && list->sym != sym) list = list->next;
    return list;
}

SYMLIST* remove_sym_from_symlist(const SYMTAB* sym, SYMLIST* list) {
    for (SYMLIST** link = &list; *link; link = &(*link)->next) {
        if ((*link)->sym != sym) continue;
        SYMLIST* gone = *link;
        *link = gone->next;
        delete gone;
        break;
    }
    return list;
}

SYMPAIRLIST* find_sym_in_sympairlist(const SYMTAB* sym, SYMPAIRLIST* list) {
    while (list && list->a != sym) list = list->next;
    return list;
}

SYMLIST* revsymlist(SYMLIST* list) {
    SYMLIST* out = nullptr;
    while (list) {
        SYMLIST* next = list->next;
        list->next = out;
        out = list;
        list = next;
    }
    return out;
}

SYMTAB* revsymtab(SYMTAB* list) {
    SYMTAB* out = nullptr;
    while (list) {
        SYMTAB* next = list->next;
        list->next = out;
        out = list;
        list = next;
    }
    return out;
}

void unlink_symbol(SYMTAB* sym, SYMTAB** list) {
    for (; *list; list = &(*list)->next)
        if (*list == sym) {
            *list = sym->next;
            sym->next = nullptr;
            return;
        }
}

SYMLIST* copy_symlist(const SYMLIST* list) {
    SYMLIST* out = nullptr;
    SYMLIST** tail = &out;
    for (; list; list = list->next) {
        *tail = mk_symlist(list->sym, nullptr);
        tail = &(*tail)->next;
    }
    return out;
}

SYMALIST* copy_symalist(const SYMALIST* list) {
    SYMALIST* out = nullptr;
    SYMALIST** tail = &out;
    for (; list; list = list->next) {
        *tail = mk_symalist(list->sym, copy_tree(list->tree), nullptr);
        tail = &(*tail)->next;
    }
    return out;
}

void erase_symlist(SYMLIST* list) {
    while (list) {
        SYMLIST* next = list->next;
        delete list;
        list = next;
    }
}

void erase_symalist(SYMALIST* list) {
    while (list) {
        SYMALIST* next = list->next;
        erase_tree(list->tree);
        delete list;
        list = next;
    }
}

void erase_symplist(SYMPAIRLIST* list) {
    while (list) {
        SYMPAIRLIST* next = list->next;
        delete list;
        list = next;
    }
}
