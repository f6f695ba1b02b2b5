// What the constant arguments of a call site leave of the callee's body: a copy is folded and counted.
#include "OPT5/ipa/inliner.h"

#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/remark.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/simp/simp.h"

namespace {

// Another function is the current one as long as the object lives, and nothing is reported of it.
class SCRATCH {
public:
    explicit SCRATCH(const FUNINFO* callee) : f(callee->name.c_str()) {
        f.symbol = callee->symbol;
        f.return_type = callee->return_type;
        currfuninfo = &f;
        currfunc = f.symbol;
        print_debug = write_opt_info = 0;
        remarks_are_wanted = false;
    }
    ~SCRATCH() {
        erase_all();
        currfuninfo = function;
        currfunc = symbol;
        print_debug = debug;
        write_opt_info = info;
        remarks_are_wanted = remarks;
    }
    SCRATCH(const SCRATCH&) = delete;
    SCRATCH& operator=(const SCRATCH&) = delete;

    FUNINFO f;

private:
    FUNINFO* const function = currfuninfo;
    SYMTAB* const symbol = currfunc;
    const int debug = print_debug, info = write_opt_info;
    const bool remarks = remarks_are_wanted;
};

int count_nodes() {
    int n = 0;
    for_each_tree(currfuninfo, [&n](const NODE* t) { n += count_nodes_in_tree(t); });
    return n;
}

// What means the same in another function.
bool is_known_anywhere(const NODE* t) {
    return !any_subtree(t, [](const NODE* n) { return (n->op == NAME && n->u.sym->level != 0) || op_has_effect(n->op) || op_is_call(n->op); });
}

// Puts the arguments in place of the parameters that the prolog copies.
void bind(NODE* t, NODE* arguments) {
    if (t->op == PCOMMA || t->op == COMMA || t->op == COMMAOP) {
        bind(t->left, arguments);
        bind(t->right, arguments);
        return;
    }
    NODE** slot = &t->right;
    while (*slot && ((*slot)->op == SCONV || (*slot)->op == PCONV)) slot = &(*slot)->left;
    if (!*slot || (*slot)->op != NAME) return;
    const SYMTAB* parameter = (*slot)->u.sym;
    if (parameter->level != 1 || parameter->depnum_m < 0) return;
    const NODE* argument = arg_list_lookup(arguments, static_cast<int>(parameter->depnum_m));
    if (!argument || !argument->type->is_scalar() || argument->op == ARGREF || !is_known_anywhere(argument)) return;
    erase_tree(*slot);
    *slot = coerce_to_type(parameter->type->stqs(), copy_tree(argument));
}

void give(FUNINFO* to, CFG_COPY copy) {
    to->eht = std::move(copy.eht);
    to->bb_list = copy.first;
    to->ls_root = copy.ls_root;
    for (auto s = copy.symbols.rbegin(); s != copy.symbols.rend(); ++s) {
        (*s)->next = to->pending_syms;
        to->pending_syms = *s;
    }
}

} // namespace

void estimate_folding(CALLSITE& site) {
    FUNINFO* callee = site.callee;
    if (!callee->symbol || !site.args || !type_of_nth_parameter(0, callee->symbol) || !callee->bb_list ||
        !tree_is_arg_prolog(callee->bb_list->statements->first))
        return;
    long before, after;
    {
        sym_split(callee);
        SCRATCH scratch(callee);
        give(&scratch.f, copy_cfg(*callee, &scratch.f));
        rebuildcfg();
        changed(fact::none);
        sym_split(&scratch.f);
        before = count_nodes();
        bind(scratch.f.bb_list->statements->first, site.args);
        fast_CP(4, 1);
        after = count_nodes();
    }
    if (after > 0) site.fold_ratio = static_cast<float>(before) / static_cast<float>(after);
    inline_commentary("[constant folding in %s:  before %ld, after %ld, ratio %.2f]\n", callee->name.c_str(), before, after,
                      static_cast<double>(site.fold_ratio));
}
