// The pre-write walk: makes a tree match what the code generator accepts.

#include "OPT5/io/write.h"

#include "IFILE/ifile.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"

#include <cstdio>
#include <cstdlib>

namespace {

[[noreturn]] void bad_opcode(int op) {
    std::fprintf(stderr, "\n\n   !!! Error in 'wrtree', opcode=%d %s !!!\n", op, opname(op));
    abort_optimizer();
}

bool fits_32_bits(const NODE* t) {
    return t->type->is_unsigned() || t->type->is_pointer() ? t->u.lval.fits<uint32_t>() : t->u.lval.fits<int32_t>();
}

NODE* prepare_LABELREF(NODE* t) {
    if (t->lbl) t->u.lval = INT65(t->lbl->index);
    if (currfuninfo->profile_status != 2 || t->edge_profile() == NO_PROFILE) return t;
    NODE* count = maketree(EPVAL, nullptr, nullptr, t->type, t->ls);
    count->set_edge_profile(t->edge_profile());
    t->set_edge_profile(NO_PROFILE);
    count->left = t;
    return count;
}

void check_arguments(const NODE* call, const SYMTAB* callee) {
    const TYPE* type = callee->type->getr(TYPE::tpk_func);
    FUNINFO* f = find_FUNINFO(const_cast<SYMTAB*>(callee));
    if (!function_is_defined(f) || type->vararg() || !type->proto()) return;
    int n_params = 0;
    for (const fkPARAM* p = type->params(); p; p = p->next) ++n_params;
    if (n_params == 1 && type->params()->type->is_void()) n_params = 0;
    const int n_args = call->op == UCALL ? 0 : arg_list_count(call->right);
    if (n_args != n_params) debug_printf("call of %s with %d arguments for %d\n", callee->name, n_args, n_params);
}

NODE* prepare_call(NODE* t) {
    SYMTAB* callee = get_callee_for_call(t);
    if (!callee || !callee->is_function()) return t;
    if (is_barrier_MCALL(skip_name_prefix(callee->name))) {
        erase_tree(t->left);
        t->left = t->right;
        t->right = nullptr;
        t->op = t->left ? MCALL : UMCALL;
        t->u.lval = INT65(0);
        t->u.name = safestrdup(skip_name_prefix(callee->name));
        return t;
    }
    FUNINFO* f = make_FUNINFO(callee);
    set_flags(f, FUN_is_called);
    unsuppress_inline_function(f);
    check_arguments(t, callee);
    return t;
}

// The writer follows operands, the reader counts them: the two operands of an assertion are put under one list.
NODE* prepare_ASSERT(NODE* t) {
    if (!t->right) return t;
    t->left = maketree(COMMA, t->left, t->right, tp->int_t, t->ls);
    t->right = nullptr;
    return t;
}

void prepare_SWITCH(NODE* t) {
    int64_t cases = 0;
    for (const NODE* list = t->right; list; list = list->op == COMMA ? list->left : nullptr)
        if ((list->op == COMMA ? list->right : list)->op == CASE) ++cases;
    t->u.lval = INT65(cases);
}

NODE* prepare_node(NODE* t) {
    switch (t->op) {
    case LABELREF: return prepare_LABELREF(t);
    case NAME:
        if (t->u.sym->level == 0) t->u.sym->cqual |= CQ_REFERENCED;
        return t;
    case ICON:
        // A pointer's constant may be held with a sign; in the file it is the pattern of its bits.
        if (t->type->is_pointer() && t->u.lval.fits<int32_t>())
            t->u.lval = INT65(static_cast<uint32_t>(t->u.lval.fits_in<int32_t>()));
        if (t->type->size > 32 && !fits_32_bits(t)) t->op = LCON;
        return t;
    case UAND:
        if (t->left->op == NAME && t->left->u.sym->is_function())
            unsuppress_inline_function(make_FUNINFO(t->left->u.sym));
        return t;
    case CALL:
    case UCALL: return prepare_call(t);
    case ASSERT: return prepare_ASSERT(t);
    case SWITCH: prepare_SWITCH(t); return t;
    case MCALL:
        if (MCALL_stands_for_ICALL(t)) t->op = ICALL;
        return t;
    case VSCONV:
        OPT_ASSERT(t->type->is_vector() && t->left->type->is_vector());
        t->op = SCONV;
        return t;
    case VRCONV: t->op = SCONV; return t;
    case ISP2CHAR: t->op = PCONV; return t;
    case IDENTITY: {
        NODE* operand = t->left;
        erase_node(t);
        return operand;
    }
    default:
        if (t->op > IF_MAX_OPCODE || !node_operator_name[t->op]) bad_opcode(t->op);
        return t;
    }
}

} // namespace

NODE* prepare_tree_for_writing(NODE* tree) {
    return rewrite_tree(tree, [](NODE* t) { return prepare_node(t); });
}

NODE* wrtree(NODE* tree) {
    tree = prepare_tree_for_writing(tree);
    o_file->if_write_expr_node(tree);
    return tree;
}
