// Statement lists.
#pragma once

#include "UTIL/psn.h"

#include <cstddef>
#include <cstdint>

class NODE;

// One statement. A cell owns its tree; a list is owned by its block, or by FUNINFO::statements before the graph exists.
struct LIST {
    NODE* first = nullptr;
    PSN* psn = nullptr;
    uint16_t flag1 = 0;
    uint16_t flag2 = 0; // 1: changed in normal form, and to be simplified when the trees leave it
    LIST* rest = nullptr;

    static void* operator new(std::size_t size);
    static void operator delete(void* p);
};

struct LLIST {
    LIST* list;
    LLIST* next;
};

// Trees that a pass remembers; a list owns its cells only.
struct NODELIST {
    NODE* first;
    NODELIST* rest;
};
struct NODEPAIRLIST {
    NODE* a;
    NODE* b;
    NODEPAIRLIST* rest;
};
// The left operand of the first tree; null for an empty list.
NODE* nl_left_child(const NODELIST* list);
NODE* list_left_child(const LIST* list);
NODE* pair_left_child(const NODEPAIRLIST* list); // of the pair's first

LIST* mkelist(NODE* tree, LIST* rest, PSN* psn);
LIST* mklist(NODE* tree, LIST* rest, uint16_t flag1, uint16_t flag2);
LLIST* mklistlist(LIST* list, LLIST* next);
LIST* reverse_list(LIST* list);     // in place
LIST* last_cell(LIST* list);        // null for an empty list
