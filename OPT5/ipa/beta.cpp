// Parameters that have one value go: the value stands at the function's entry, and calls pass it no longer.
//
// Needs: FPARM::kind and FPARM::known of all functions (ipcp.cpp), calls integrated. Leaves: the graph.
// Sound because what goes from the function goes from every call of it: both follow FPARM::kind, which is decided once for
// the file, and what a call evaluates besides the value stays ahead of it. A function or call that has lost its arguments
// already is told by their number, and stays as it is.
#include "OPT5/ipa/ipcp.h"

#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <unordered_map>

namespace {

size_t count_of_known(const FUNINFO* f) {
    return static_cast<size_t>(std::count_if(f->formals.begin(), f->formals.end(), [](const FPARM& p) { return p.kind == 1; }));
}

[[noreturn]] void fail(const char* text) {
    std::fputs(text, stderr);
    abort_optimizer(text);
}

} // namespace

void beta_parms() {
    if (opt_level() < 3) return;
    const std::vector<SYMTAB*> parameters = parameters_in_order(*currfuninfo);
    const std::vector<FPARM>& formals = currfuninfo->formals;
    const bool has_records = !TEST_FLAG(currfuninfo, FUN_cannot_beta) && formals.size() == parameters.size();
    for (size_t i = 0; i < parameters.size(); ++i) parameters[i]->arg_needed = !has_records || !formals[i].known;
}

// ---- Call sites

namespace {

NODE* joined(NODE* effects, NODE* more) { return more ? mk_COMMAOP(effects, more) : effects; }

// What is left of the arguments; effects of the others are added to `effects`.
NODE* without_known(NODE* list, const FUNINFO* callee, NODE** effects) {
    NODE* kept = nullptr;
    const int count = arg_list_count(list);
    for (int i = 0; i < count; ++i) {
        NODE* argument = arg_list_lookup(list, i);
        if (callee->formals[static_cast<size_t>(i)].kind != 1)
            kept = arg_list_append(kept, copy_tree(argument));
        else if (NODE* effect = peel_for_effect(copy_tree(argument)))
            *effects = joined(*effects, effect);
    }
    erase_tree(list);
    return kept;
}

void report_result(FUNINFO* callee, const NODE* call, const NODE* tree) {
    if (call != tree || call->type->is_void() || !write_opt_info) return;
    if (TEST_FLAG(callee, FUN_value_needed))
        info_printf("\t*** %s()'s return value discarded: %s\n", callee->name.c_str(), tree_to_infix(tree).c_str());
    else
        info_printf("\t*** %s()'s return value is not needed:\n", callee->name.c_str());
}

// The call without the arguments that its callee no longer has.
NODE* fix_call(NODE* call, const NODE* statement) {
    FUNINFO* callee = find_FUNINFO_for_call(call);
    const size_t known = callee ? count_of_known(callee) : 0;
    if (!known) return call;
    const auto count = static_cast<size_t>(arg_list_count(get_arguments_to_call(call)));
    if (count == callee->formals.size() - known) return call;
    if (count != callee->formals.size()) fail("\n!!! Opt error 1 in fix_beta_call_sites() !!!\n");
    if (call->op != CALL) fail("\n!!! Opt error 2 in fix_beta_call_sites() !!!\n");
    report_result(callee, call, statement);
    NODE* effects = nullptr;
    call->right = without_known(call->right, callee, &effects);
    if (!call->right) call->op = UCALL;
    return mk_COMMAOP(effects, call);
}

NODE* fix_beta_call_sites(NODE* tree, const NODE* statement) {
    return rewrite_tree(tree, [statement](NODE* t) { return op_is_call(t->op) ? fix_call(t, statement) : t; });
}

void fix_all_call_sites() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) {
            s->first = fix_beta_call_sites(s->first, s->first);
            if (s->first->op == COMMAOP) promote_toplevel_COMMAOPs_in_list(s, s->rest);
        }
    for (EHT_ITEM& item : currfuninfo->eht) item.cleanup = fix_beta_call_sites(item.cleanup, item.cleanup);
}

// ---- The function's own parameters

// Takes what is no longer part of a prolog out of the tree, to the head of `list`; what is left of it, or null.
NODE* fix_PCOMMA_tree(NODE* tree, std::vector<NODE*>* list) {
    if (tree->op != PCOMMA) {
        if (tree_is_arg_prolog(tree)) return tree;
        list->push_back(tree);
        return nullptr;
    }
    tree->left = fix_PCOMMA_tree(tree->left, list);
    tree->right = fix_PCOMMA_tree(tree->right, list);
    if (tree->left && tree->right) return tree;
    NODE* left = tree->left ? tree->left : tree->right;
    erase_node(tree);
    return left;
}

void fix_prolog() {
    BBLK* entry = currfuninfo->bb_list;
    LIST* first = entry->statements;
    if (!first->rest || first->first->op != PCOMMA) return;
    std::vector<NODE*> moved;
    PSN* const psn = first->psn;
    first->first = fix_PCOMMA_tree(first->first, &moved);
    LIST** link = first->first ? &first->rest : &entry->statements;
    if (!first->first) drop_statement(link);
    for (NODE* t : moved) link = insert_before(link, t, psn);
}

class SPECIALIZATION {
public:
    void run();

private:
    void announce(size_t i, const SYMTAB* parm, const FPARM& formal);
    NODE* substituted(NODE* tree);
    void remove(SYMTAB* parm);

    std::unordered_map<const SYMTAB*, const NODE*> value_of; // looked up
};

void SPECIALIZATION::announce(size_t i, const SYMTAB* parm, const FPARM& formal) {
    const std::string value = tree_to_infix(formal.known);
    if (write_opt_info) info_printf("**\tParameter deleted: %s == %s\n", parm->name, value.c_str());
    if (print_debug)
        debug_printf("\n*** Specializing %s() for parameter %ld: %s == %s\n", currfuninfo->name.c_str(), static_cast<long>(i),
                     parm->name, value.c_str());
}

NODE* SPECIALIZATION::substituted(NODE* tree) {
    bool any = false;
    tree = rewrite_tree(tree, [&](NODE* t) {
        auto at = t->op == NAME ? value_of.find(t->u.sym) : value_of.end();
        if (at == value_of.end()) return t;
        any = true;
        NODE* value = copy_tree(at->second);
        NODE* cast = maketree(t->type->is_pointer() ? PCONV : SCONV, value, nullptr, t->type, t->ls);
        erase_node(t);
        return cast;
    });
    return any ? simp_tree(tree, nullptr) : tree;
}

void SPECIALIZATION::remove(SYMTAB* parm) {
    for (SYMTAB** list : {&currfuninfo->new_syms, &currfuninfo->pending_syms, &currfuninfo->memory_syms, &currfuninfo->scalar_syms})
        if (symbol_in_list(parm, *list)) return unlink_symbol(parm, list);
    fail("\n!!! Opt error in beta_convert() !!!\n");
}

void SPECIALIZATION::run() {
    FUNINFO* f = currfuninfo;
    const std::vector<SYMTAB*> parameters = parameters_in_order(*f);
    if (!count_of_known(f) || parameters.size() != f->formals.size()) return;
    for (size_t i = 0; i < parameters.size(); ++i) {
        const FPARM& formal = f->formals[i];
        if (formal.kind != 1) continue;
        if (formal.name != parameters[i]->name) fail("\n!!! Opt error in beta_convert() !!!\n");
        value_of[parameters[i]] = formal.known;
        announce(i, parameters[i], formal);
        if (formal.known->op != ICON && formal.known->op != FCON)
            clear_flags(f, FUN_no_global_use | FUN_no_global_asg | FUN_is_pure_fun);
    }
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) s->first = substituted(s->first);
    for (EHT_ITEM& item : f->eht) item.cleanup = substituted(item.cleanup);
    fix_prolog();
    erase_tree(f->arg_prolog);
    const LIST* first = f->bb_list->statements;
    f->arg_prolog = stmt_is_arg_prolog(first) ? copy_tree(first->first) : nullptr;
    for (SYMTAB* parm : parameters)
        if (!parm->arg_needed) remove(parm);
}

} // namespace

void beta_convert() {
    if (!currfuninfo->bb_list) return;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'beta_convert' ------------\n");
    fix_all_call_sites();
    SPECIALIZATION().run();
    changed(fact::graph);
}
