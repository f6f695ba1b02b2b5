// The call sites of a function: who is called, with what, and where it stands.
#include "OPT5/ipa/inliner.h"

#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <algorithm>
#include <unordered_map>

CALLSITE::~CALLSITE() { erase_tree(args); }

std::string CALLSITE::description() const {
    std::string text = "call from " + caller->name + " (" + (psn && psn->file ? psn->file : "NO_FILE") + ":" +
                       std::to_string(psn ? psn->line : 0) + ") to " + (callee ? callee->name : "(nil)");
    if (forced) text += ", forced";
    if (forced_deep) text += ", recursive";
    if (!inlineable) text += ", NOT inlineable";
    return text;
}

int cost(const CALLSITE& site) {
    if (!site.callee) return 100000;
    const SYMTAB* sym = site.callee->symbol;
    const int by_argument = sym && sym->type->is_func() && sym->type->proto() ? 2 : 3;
    const int time = static_cast<int>(static_cast<float>(site.callee->est_time) / site.fold_ratio);
    return std::max(0, time - 2 - site.nargs * by_argument);
}

// ---- Arguments against parameters

namespace {

bool is_integer_kind(const TYPE* t) { return t->is_int() || t->is_enum(); }

bool pointees_agree_in_const(TYPE* a, TYPE* b) {
    const TYPE *x = a->type_pointed_to(), *y = b->type_pointed_to();
    return !x || !y || x->is_const() == y->is_const();
}

// `parameter` is the type behind the names that the source gave it.
bool pair_fits(const NODE* argument, TYPE* parameter) {
    TYPE* type = argument->type->real;
    const bool pointers = type->is_pointer() && parameter->is_pointer();
    if (compatible_types(type, parameter, true) && (!pointers || pointees_agree_in_const(type, parameter))) return true;
    if (argument->op == ARGREF && (parameter->is_csu() || parameter->is_float()))
        return compatible_types(argument->left->type->real, parameter, true);
    if (is_integer_kind(type) && is_integer_kind(parameter)) return true;
    if (pointers) {
        const TYPE *x = type->type_pointed_to(), *y = parameter->type_pointed_to();
        return !(x && x->is_func()) && !(y && y->is_func());
    }
    return argument->op == ICON && argument->u.lval.is_zero() && parameter->is_pointer();
}

} // namespace

// Of a definition without a prototype its own parameters tell.
static std::vector<TYPE*> parameter_types(const SYMTAB* callee) {
    std::vector<TYPE*> types;
    while (TYPE* t = type_of_nth_parameter(static_cast<int>(types.size()), callee)) types.push_back(t);
    const FUNINFO* f = find_FUNINFO(const_cast<SYMTAB*>(callee));
    if (!types.empty() || !f || (callee->type->is_func() && callee->type->proto())) return types;
    for (const SYMTAB* s : parameters_in_order(f->saved_cfg ? *f->saved_cfg : *f)) types.push_back(s->type);
    return types;
}

bool arguments_fit_parameters(const NODE* call, const SYMTAB* callee) {
    NODE* arguments = call->op == CALL ? call->right : nullptr;
    const std::vector<TYPE*> parameters = parameter_types(callee);
    const auto count = static_cast<size_t>(arg_list_count(arguments));
    if (count != parameters.size()) return false;
    for (size_t n = 0; n < count; ++n)
        if (!pair_fits(arg_list_lookup(arguments, static_cast<int>(n)), parameters[n]->real)) return false;
    return true;
}

// ---- Collecting

int register_pressure_for_block(const BBLK* bb) {
    BITVEC live(static_cast<uint32_t>(currfuninfo->lva_sym_count));
    add_live_at_exit(bb, live);
    return static_cast<int>(live.count());
}

namespace {

bool is_manifest_constant(const NODE* t) { return t->op == ICON || t->op == FCON; }

class COLLECTION {
public:
    COLLECTION(INLINE_FILE& f, int (*measure)(const BBLK*)) : file(f), pressure_of(measure) { need(fact::loops | fact::dominators); }

    void run() {
        int request = 0; // in the pragmas ahead of a statement
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            block = bb;
            for (const LIST* s = bb->statements; s; s = s->rest) {
                if (s->first->op == PPRAGMA) {
                    const int kind = s->first->pragma ? s->first->pragma->kind : 0;
                    if (!request && kind >= PRG_FORCEINLINE && kind <= PRG_NOINLINE) request = kind;
                    continue;
                }
                psn = s->psn;
                // What the source has as one statement may have been taken apart, and over several blocks.
                if (request) requests[psn] = request;
                const auto found = psn ? requests.find(psn) : requests.end();
                visit(s->first, found != requests.end() ? found->second : request, false);
                request = 0;
            }
        }
    }

private:
    void visit(const NODE* t, int request, bool deep) {
        for (; t; t = t->left) {
            if (op_is_call(t->op)) deep = enter(t, request, deep);
            visit(t->right, request, deep);
        }
    }

    // Whether the call's arguments are forced, too.
    bool enter(const NODE* call, int request, bool deep) {
        file.owned.push_back(std::make_unique<CALLSITE>());
        CALLSITE& site = *file.owned.back();
        site.caller = currfuninfo;
        site.callee = find_FUNINFO_for_call(call);
        site.id = call->call ? call->call->id : currfuninfo->unique_call_index;
        site.psn = psn;
        site.type = call->left->type->is_pointer() ? call->left->type->type_pointed_to() : call->left->type;
        NODE* arguments = call->op == CALL ? call->right : nullptr;
        const int count = arg_list_count(arguments);
        site.nargs = static_cast<int8_t>(std::min(count, 127));
        for (int i = 0; i < count && site.nconstargs < 127; ++i)
            site.nconstargs = static_cast<int8_t>(site.nconstargs + is_manifest_constant(arg_list_lookup(arguments, i)));
        const SYMTAB* sym = site.callee ? site.callee->symbol : nullptr;
        site.inlineable = sym && call->call && arguments_fit_parameters(call, sym) && may_be_expanded(site, call);
        if (site.inlineable) judge_request(site, request, deep);
        place(site);
        site.args = arguments ? copy_tree(arguments) : nullptr;
        SITES& sites = file.sites_of(currfuninfo);
        sites.insert(sites.begin(), &site);
        if (!site.callee)
            inline_commentary("[new indirect call:  %s (%s)]\n", site.description().c_str(), currfuninfo->name.c_str());
        return site.forced_deep;
    }

    static bool may_be_expanded(const CALLSITE& site, const NODE* call) {
        FUNINFO *caller = site.caller, *callee = site.callee;
        if (TEST_FLAG(callee, FUN_follows_call) && caller->cg_order >= callee->cg_order) return false;
        if (TEST_FLAG(callee, FUN_is_pure_fun) && !TEST_FLAG(callee, FUN_value_needed)) return false;
        const uint32_t entry = call->eh_entry();
        return !entry || (entry < caller->eht.size() && caller->eht[entry].kind == EHK_THROW_TERMINATE);
    }

    static void judge_request(CALLSITE& site, int request, bool deep) {
        const char* reason;
        if (request == PRG_NOINLINE) {
            site.forced = site.inlineable = false;
        } else if (request || find_pragma(site.callee->symbol, PRG_FUNC_ALWAYS_INLINE)) {
            site.forced = true;
            site.forced_deep = request == PRG_FORCEINLINE_RECURSIVE || deep;
        } else if (!is_inline_candidate(site, &reason)) {
            site.inlineable = false;
        }
    }

    void place(CALLSITE& site) {
        const NATURAL_LOOP* loop = currfuninfo->loops->around(block);
        site.loop = loop ? static_cast<int16_t>(loop->inside + 1) : int16_t(0);
        for (const NATURAL_LOOP* l = loop; l; l = l->parent) ++site.depth;
        site.postdom = currfuninfo->dominators->post_dominates(block, currfuninfo->bb_list);
        site.temp = block->dFreqIn >= 0 ? block->dFreqIn : 0;
        if (pressure_of) site.pressure = pressure_of(block);
    }

    INLINE_FILE& file;
    std::unordered_map<const PSN*, int> requests; // lookup only
    int (*const pressure_of)(const BBLK*);
    const BBLK* block = nullptr;
    const PSN* psn = nullptr;
};

} // namespace

void collect_call_sites(INLINE_FILE& file, int (*pressure_of)(const BBLK*)) { COLLECTION(file, pressure_of).run(); }
