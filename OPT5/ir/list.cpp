// Statement cells.

#include "OPT5/ir/list.h"

#include "OPT5/ir/node.h"
#include "OPT5/ir/pool.h"

void* LIST::operator new(std::size_t) { return record_pool<sizeof(LIST)>::take(); }
void LIST::operator delete(void* p) { record_pool<sizeof(LIST)>::give(p); }

LIST* mkelist(NODE* tree, LIST* rest, PSN* psn) {
    LIST* cell = new LIST;
    cell->first = tree;
    cell->rest = rest;
    cell->psn = psn;
    return cell;
}

LIST* mklist(NODE* tree, LIST* rest, uint16_t flag1, uint16_t flag2) {
    LIST* cell = mkelist(tree, rest, nullptr);
    cell->flag1 = flag1;
    cell->flag2 = flag2;
    return cell;
}

LLIST* mklistlist(LIST* list, LLIST* next) { return new LLIST{list, next}; }

LIST* reverse_list(LIST* list) {
    LIST* out = nullptr;
    while (list) {
        LIST* rest = list->rest;
        list->rest = out;
        out = list;
        list = rest;
    }
    return out;
}

LIST* last_cell(LIST* list) {
    if (list)
        while (list->rest) list = list->rest;
    return list;
}

NODE* nl_left_child(const NODELIST* list) { return list ? list->first->left : nullptr; }
NODE* list_left_child(const LIST* list) { return list ? list->first->left : nullptr; }
NODE* pair_left_child(const NODEPAIRLIST* list) { return list ? list->a->left : nullptr; }
