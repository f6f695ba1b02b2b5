// Basic blocks, edges and the control-flow graph of the current function.
//
// Each block ends in exactly one control statement: RETURN, URETURN, BRANCH, IF or SWITCH; only the exit block holds
// URETURN. `FUNINFO::bb_list` is the entry block. `dfn` numbers are valid after `renumber_bblocks`, from 1 to `bb_count`;
// a pass that inserts blocks calls it again before it indexes arrays by `dfn`.
#pragma once

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/list.h"
#include "OPT5/ir/node.h"
#include "OPT5/ir/serial_object.h"

#include <cstdint>
#include <cstdio>
#include <map>
#include <string>
#include <vector>

class BBLK;

struct EDGE {
    BBLK* first = nullptr; // the block at the other end
    double prob = -1.0;    // -1.0 if unknown
    EDGE* rest = nullptr;
};

class BBLK : public serial_object<BBLK, FUNINFO> {
public:
    void* fn = nullptr; // the LIR function when the block is in LIR form
    BBLK* dflink = nullptr;
    BBLK* rdflink = nullptr;
    BBLK* uolink = nullptr;
    LIST* statements = nullptr; // changed through OPT5/ir/statements.h
    EDGE* predecessors = nullptr;
    EDGE* successors = nullptr;
    LBL* label = nullptr; // chained through LBL::next, owned
    struct LOOP* loop = nullptr;
    PSN* first_psn = nullptr;
    PSN* last_psn = nullptr;
    double dFreqIn = -1.0, dFreqOut = -1.0;
    int uon = 0; // source order number from 1; -1 for a block made after `buildcfg`
    int dfn = 0;
    uint8_t depth = 0; // of loops around it, as `allocate_regs` counted them

    mutable LIST* control = nullptr; // the cell that `last_statement` found; null: to be found

    explicit BBLK(FUNINFO* owner) : serial_object(owner) {}
    FUNINFO* owner() const { return manager; }
    bool is_in_LIR_form() const { return fn != nullptr; }
    const char* str() const; // "BB<dfn>", with the serial number under debug:dump_serial; rotating static buffers
    LIST* last_statement() const; // null for an empty block; constant time but for the first call behind a new end
    NODE* branch() const;         // the tree of the last statement, or null
};

// ---- Building and numbering
void buildcfg();
void rebuildcfg();
// Visits every LABELREF of a control statement, in written order; other statements name no labels.
template <class F> void for_each_branch_target(NODE* tree, F&& visit);
void renumber_bblocks();
BBLK* mkbblock(LIST* list, BBLK* next, FUNINFO* funinfo);
BBLK* insert_new_bb(int uon, BBLK* after, LIST* list);
BBLK* insert_new_bb_with_branch(int uon, BBLK* after, BBLK* target, PSN* psn);
// All blocks of the current function, the entry first, follow each other in this order; their numbers are stale then.
void set_text_order(const std::vector<BBLK*>& order);
void delink_old_bb(BBLK* bb);
void erase_bblock(BBLK* bb); // its statements, labels and edges; the object stays

// ---- Edges
EDGE* mkedge(BBLK* bb, EDGE* rest);
EDGE* add_edge(BBLK* bb, EDGE* list, double prob = -1.0); // unless `bb` is on the list
EDGE* remove_edge(BBLK* bb, EDGE* list);
EDGE* edge_memberp(const BBLK* bb, EDGE* list);
// Whether control may pass from one to the other, told by the shorter of the two lists.
bool is_edge(const BBLK* from, const BBLK* to);
int edge_length(const EDGE* list);
bool any_edge_leads_back(); // of the current function, to a block of the same number or a lower one: any cycle has one
inline BBLK* only_block(const EDGE* list) { return list && !list->rest ? list->first : nullptr; } // null: none, or several
EDGE* rev_edge_list(EDGE* list);
EDGE* sort_edge_list(EDGE* list);
EDGE* fast_sort_edge_list(EDGE* list);
EDGE* copy_edge_list(const EDGE* list);
void erase_edge(EDGE* edge);
void erase_edge_list(EDGE* list);
void connect(BBLK* from, BBLK* to, double prob = -1.0); // both lists, unless it is there
void disconnect(BBLK* from, BBLK* to);
// The successor `from` of a block is replaced by `to`, which may be one already.
struct SUCCESSOR_CHANGE {
    BBLK *from, *to;
};
void change_successors(BBLK* bb, const std::vector<SUCCESSOR_CHANGE>& changes); // one after the other; no `from` twice
// The new block. Without `renumber` the depth-first numbers are stale: for a caller that splits many edges.
BBLK* split_cfg_edge(BBLK* a, BBLK* b, bool renumber = true);
void split_critical_edges(bool all);
bool bb_is_split_critical_edge(const BBLK* bb);
void subst_bb_for_bb_in_bb(BBLK* to, BBLK* from, BBLK* in);
void subst_bb_for_bb_in_stmts(BBLK* to, BBLK* from, LIST* list);
void remap_labelrefs(NODE* tree, LBL* from, LBL* to);
bool BB_is_in_bb_list(const BBLK* bb);
void fixup_edge_lists(BBLK* bb, NODE* tree);
EDGE* list_branch_targets(NODE* tree, EDGE* list);

// ---- Labels
extern int internal_label_index; // which counter of the current function fresh labels take
extern std::map<int32_t, LBL*> label_mapping;
LBL* find_label(int32_t index);
LBL* mklabel(int32_t index, NODE* tree, BBLK* bb); // index 0 or below: a fresh internal label
LBL* label_of_bb(BBLK* bb); // the block's first label, made if it has none

// ---- Checks and dumps
// Prints what is wrong to the debug stream, or to stderr without one; returns the number of uncorrected errors.
int validate_cfg();
int validate_stmts();
void prbblocks(BBLK* first, BBLK* last); // block structure to the debug stream
void prbbinfix(FILE* out);               // every block of the current function with its statements in infix form

// ---- Inline

template <class F> void for_each_branch_target(NODE* tree, F&& visit) {
    if (tree->op == BRANCH) {
        visit(tree->left);
        return;
    }
    if (tree->op != IF && tree->op != SWITCH && tree->op != CBRANCH) return;
    auto look_at = [&](NODE* element) {
        NODE* e = element->op == CASE ? element->right : element->op == DEFAULT ? element->left : element;
        if (e && e->op == LABELREF) visit(e);
    };
    // A case list leans left: the last element is on the right of the outermost COMMA. Most have two.
    NODE* t = tree->right;
    if (t && t->op == COMMA && t->left && t->left->op != COMMA) {
        NODE* last = t->right;
        look_at(t->left);
        look_at(last);
        return;
    }
    std::vector<NODE*> elements;
    for (; t && t->op == COMMA; t = t->left) elements.push_back(t->right);
    if (t) elements.push_back(t);
    for (auto it = elements.rbegin(); it != elements.rend(); ++it) look_at(*it);
}
