// Exception tables under call integration.
//
// The table of the body is put behind that of the function, entry by entry. Entry 0 of a call, and entry 1 of a table that
// has it pass exceptions on, stand for what leaves the function: in the copy that is what the entry of the call says that
// is expanded. Chains that end in the body go on there.
//
// A dispatch behind a call leads to all handlers of its function, so each is made anew when everything is expanded.
//
// Needs: a dispatch behind every statement that may lead to a handler, on both sides. Leaves: the same; the graph is new.
// Sound because clauses are told by ids that are unique in the function, in each copy of a body again.
#include "OPT5/ipa/exceptions.h"

#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <algorithm>

namespace {

bool passes_on(const EHT_ITEM& item) {
    const bool does_nothing = item.kind == EHK_ROOT_NODE || item.kind == EHK_CLEANUP_END || item.kind == EHK_CATCH_END;
    return does_nothing && item.next_entry == EHT_ROOT_ID;
}

int32_t highest_clause(const std::vector<EHT_ITEM>& table) {
    int32_t id = 0;
    for (const EHT_ITEM& item : table)
        for (const EHT_CATCH& clause : item.catches) id = std::max(id, clause.id);
    return id;
}

template <class F> void for_each_case(NODE* dispatch, const F& visit) {
    for_each_subtree(dispatch->right, [&visit](NODE* t) {
        if (t->op == CASE) visit(t);
    });
}

} // namespace

void merge_exception_tables(CFG_COPY& copy, uint32_t entry_of_call) {
    std::vector<EHT_ITEM>& table = currfuninfo->eht;
    const bool has_table = copy.eht.size() > 1;
    if (!has_table && !entry_of_call) return;
    if (has_table) // entries 0 and 1 keep their meaning
        while (table.size() < 2) {
            table.emplace_back();
            table.back().id = static_cast<uint32_t>(table.size() - 1);
        }
    const auto first = static_cast<uint32_t>(table.size());
    const bool first_passes_on = has_table && passes_on(copy.eht[1]);
    const int32_t clauses = highest_clause(table);
    auto renumber = [&](NODE* t) {
        if (op_is_call(t->op)) {
            const uint32_t entry = t->eh_entry();
            t->set_eh_entry(entry == 0 || (entry == 1 && first_passes_on) ? entry_of_call : entry + first);
        }
    };
    for (BBLK* bb = copy.first; bb; bb = bb == copy.last ? nullptr : bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            if (tree_is_EH_SWITCH(s->first))
                for_each_case(s->first, [clauses](NODE* c) { c->left->u.lval = c->left->u.lval + INT65(clauses); });
            else
                for_each_subtree(s->first, renumber);
    if (!has_table) return;
    for (EHT_ITEM& item : copy.eht) {
        for_each_subtree(item.cleanup, renumber);
        for (EHT_CATCH& clause : item.catches) clause.id += clauses;
        item.id = static_cast<uint32_t>(table.size());
        item.next_entry = item.next_entry == EHT_ROOT_ID ? entry_of_call : item.next_entry + first;
        table.push_back(std::move(item));
    }
    copy.eht.clear();
}

namespace {

// The dispatches become branches to where control is without an exception.
EH_HANDLERS take_dispatches_out() {
    EH_HANDLERS handlers;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        NODE* tree = bb->branch();
        if (!tree_is_EH_SWITCH(tree)) continue;
        OPT_ASSERT(tree->right->op == COMMA && tree->right->right->op == DEFAULT);
        for_each_case(tree, [&handlers](const NODE* c) { handlers.emplace(c->left->u.lval.fits_in<int32_t>(), c->right->lbl); });
        BBLK* next = tree->right->right->left->lbl->bblock;
        while (bb->successors) disconnect(bb, bb->successors->first);
        erase_tree(tree);
        bb->last_statement()->first = mk_BRANCH(next);
        connect(bb, next);
    }
    return handlers;
}

// The calls of a control statement stand in a statement of their own.
LIST* hold_value(BBLK* bb, LIST* control) {
    NODE** value = value_of_transfer(control->first);
    OPT_ASSERT(value != nullptr);
    SYMTAB* held = sym_temp('R', -1, (*value)->type->stqs(), control->first->ls);
    LIST** link = &bb->statements;
    while (*link != control) link = &(*link)->rest;
    insert_before(link, mk_ASG(mk_NAME(held, control->first->ls), *value), control->psn);
    *value = mk_NAME(held, control->first->ls);
    return *link;
}

void dispatch_behind(BBLK* bb, LIST* s, const EH_HANDLERS& handlers) {
    BBLK* next = split_block(bb, s, false);
    NODE** control = &bb->last_statement()->first;
    erase_tree(*control);
    *control = make_magic_EH_SWITCH(s->first, mk_LABELREF_to_bb(next), &handlers);
    for_each_case(*control, [bb](const NODE* c) { connect(bb, c->right->lbl->bblock); });
}

} // namespace

void renew_dispatches() {
    if (!currfuninfo->has_eh()) return;
    const EH_HANDLERS handlers = take_dispatches_out();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) {
            if (!statement_may_reach_catch(s->first)) continue;
            dispatch_behind(bb, s->rest ? s : hold_value(bb, s), handlers);
            break;
        }
}
