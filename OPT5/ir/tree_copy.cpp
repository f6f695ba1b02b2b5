// Copying and erasing of trees and statement lists.
//
// A node owns its literal bytes, its float value, its call name, its pragma and its points-to environment; copies get
// their own, so that either tree can be erased alone.

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"

#include <cstdlib>
#include <cstring>


// ---- Copying
static void own_payload(NODE* c) {
    switch (c->op) {
    case FCON:
        c->u.fval = new simul_fval(*c->u.fval);
        c->text = nullptr;
        break;
    case SCON: {
        const char* bytes = c->text;
        c->mk_scon(bytes, c->scon_length());
        break;
    }
    case NAME:
    case ASM: c->text = safestrdup(c->text); break;
    case ICALL:
    case UICALL:
    case MCALL:
    case UMCALL: c->u.name = safestrdup(c->u.name); break;
    case PPRAGMA:
        if (!c->pragma) break;
        c->pragma = new PRAGMA(*c->pragma);
        c->pragma->next = nullptr;
        break;
    case CALL:
    case UCALL:
        if (c->call) c->call = new CALL_RECORD(*c->call);
        break;
    case LABELREF:
        if (c->lbl) ++c->lbl->refcount;
        break;
    }
}

static NODE* bare_copy(const NODE* t, bool keep_scope) {
    NODE* c = clone_node(t);
    if (!keep_scope) c->ls = nullptr;
    own_payload(c);
    return c;
}

NODE* copy_node(const NODE* t, bool keep_scope) {
    return t->op == DDNODE ? copy_dd_node(t, keep_scope) : bare_copy(t, keep_scope);
}

NODE* copy_dd_node(const NODE* t, bool keep_scope) {
    NODE* c = bare_copy(t, keep_scope);
    const RARE_FIELDS& rare = t->rare();
    if (rare.dd && (t->op == DDNODE || t->op == UMULT))
        c->make_rare().dd = new DDNODE_RECORD{nullptr, c, copy_tree(rare.dd->copy), rare.dd->id};
    return c;
}

// Left chains in a loop, right operands by recursion.
template <class COPY>
static NODE* copy_with(const NODE* t, const COPY& copy) {
    NODE* root = nullptr;
    NODE** link = &root;
    for (; t; t = t->left) {
        NODE* c = copy(t);
        *link = c;
        link = &c->left;
        c->left = nullptr;
        c->right = copy_with(t->right, copy);
    }
    return root;
}

NODE* copy_tree(const NODE* t, bool keep_scope) {
    return copy_with(t, [keep_scope](const NODE* n) { return copy_node(n, keep_scope); });
}

NODE* copy_dd_tree(const NODE* t, bool keep_scope) {
    return copy_with(t, [keep_scope](const NODE* n) { return copy_dd_node(n, keep_scope); });
}

NODE* copy_tree_0(const NODE* t, FUNINFO* funinfo) {
    return copy_with(t, [funinfo](const NODE* n) {
        NODE* c = copy_node(n, true);
        if (c->op == NAME && c->u.sym) c->u.sym = intern_symbol(c->u.sym, funinfo);
        return c;
    });
}

NODE* copy_node_if_changed(NODE* node, NODE* left, NODE* right) {
    if (node->left == left && node->right == right) return node;
    NODE* c = copy_node(node);
    c->left = left;
    c->right = right;
    return c;
}

template <class COPY>
static LIST* copy_list_with(const LIST* list, const COPY& copy) {
    LIST* out = nullptr;
    LIST** link = &out;
    for (; list; list = list->rest) {
        *link = mklist(copy(list->first), nullptr, list->flag1, list->flag2);
        (*link)->psn = list->psn;
        link = &(*link)->rest;
    }
    return out;
}

LIST* copy_statements(const LIST* list, bool keep_scope) {
    return copy_list_with(list, [keep_scope](const NODE* t) { return copy_tree(t, keep_scope); });
}
LIST* copy_shared_statements(const LIST* list) {
    return copy_list_with(list, [](NODE* t) { return t; });
}
LIST* copy_dd_statements(const LIST* list, bool keep_scope) {
    return copy_list_with(list, [keep_scope](const NODE* t) { return copy_dd_tree(t, keep_scope); });
}

// ---- Erasing
[[noreturn]] static void report_double_erase(const NODE* t) {
    const char* format = "\n\n!!! INTERNAL ERROR: node %p is erased a second time\n";
    debug_printf(format, static_cast<const void*>(t));
    fprintf(stderr, format, static_cast<const void*>(t));
    abort_optimizer();
}

static void drop_payload(NODE* t) {
    switch (t->op) {
    case FCON:
        delete t->u.fval;
        free(t->text);
        break;
    case SCON:
    case ASM:
    case NAME: free(t->text); break;
    case ICALL:
    case UICALL:
    case MCALL:
    case UMCALL: free(t->u.name); break;
    case PPRAGMA: delete t->pragma; break;
    case CALL:
    case UCALL: delete t->call; break;
    }
    const RARE_FIELDS& rare = t->rare();
    if (rare.dd && rare.dd->node == t) {
        erase_tree(rare.dd->copy);
        delete rare.dd;
    }
    delete rare.dependence;
}

void erase_node(NODE* t) {
    if (t->op == ILLOP) report_double_erase(t);
    drop_payload(t);
    const int op = t->op;
    t->op = ILLOP;
    free_node(t, op);
}

void erase_tree(NODE* t) {
    while (t) {
        if (t->op == CSE_DUPE) { // its operand is the original's
            t->left = t->right = nullptr;
            erase_node(t);
            return;
        }
        NODE* left = t->left;
        if (t->right) erase_tree(t->right);
        erase_node(t);
        t = left;
    }
}

NODE* taken_out_of_members(NODE* place) {
    while (place->op == STDOT) {
        NODE* below = place->left;
        erase_tree(place->right);
        erase_node(place);
        place = below;
    }
    return place;
}

void erase_tree_list_to_entry(LIST* list, LIST* entry) {
    while (list && list != entry) {
        LIST* rest = list->rest;
        erase_tree(list->first);
        delete list;
        list = rest;
    }
}

void erase_tree_list(LIST* list) { erase_tree_list_to_entry(list, nullptr); }

void erase_tree_list_only(LIST* list) {
    while (list) {
        LIST* rest = list->rest;
        delete list;
        list = rest;
    }
}
