// The first clean-up of a tree just read.
//
// The parser's trees name declarations, count loops down and scale pointers with forms of their own. Afterwards a NAME
// refers to the definition, node types are the optimizer's (normalized, enumerations as their integers), loops are
// labels and conditional branches, and pointer scaling is plain multiplication.

#include "OPT5/io/read.h"

#include "OPT5/io/read_client.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/target/bif.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"

#include <cstring>
#include <unordered_map>

namespace {

constexpr int ADDRESS_UNIT = 16;

void note_address_taken(const NODE* address) {
    const NODE* object = name_of_place(static_cast<const NODE*>(address->left));
    if (!object || !currfuninfo) return;
    switch (object->u.sym->sclass) {
    case SC_AUTO:
    case SC_REGISTER:
    case SC_MEMORY:
    case SC_PARM:
    case SC_REGISTER2: currfuninfo->address_taken_local = true; break;
    default: break;
    }
}

// An argument passed by reference or as a structure has its operand's type, unless that would lose a qualifier.
void retype_arguments(NODE* call) {
    for (NODE* list = call->right; list; list = list->op == COMMA ? list->left : nullptr) {
        NODE* arg = list->op == COMMA ? list->right : list;
        if (!arg || (arg->op != ARGREF && arg->op != STARG) || !arg->left) continue;
        TYPE* type = arg->left->type;
        if (compatible_types(arg->type, type, true) && !(arg->type->qual_kind(false) & ~type->qual_kind(false)))
            arg->type = type;
    }
}

NODE* cleanup_LOOP(NODE* t) {
    NODE* label = t->right;
    auto* lbl = new LBL;
    lbl->index = static_cast<int32_t>(label->label_id());
    NODE* def = mk_LABELDEF(lbl);
    erase_tree(t);
    return def;
}

// Counts down and branches back while the counter, before the step, was not 0.
NODE* cleanup_ENDLOOP(NODE* t) {
    NODE* counter = t->left;
    TYPE* type = counter->type;
    NODE* step = maketree(MINUSASG, counter, mk_ICON(INT65(1), type), type, t->ls);
    t->left = maketree(EQ, step, mk_ICON(INT65(-1), type), tp->int_t, t->ls);
    t->op = CBRANCH;
    return t;
}

// Scaling by a size in bits becomes scaling by address units.
NODE* cleanup_PMCONV(NODE* t) {
    if (t->left->type->size != t->type->size) t->left = coerce_to_type(t->type, t->left);
    t->op = MULT;
    if (t->right->op == ICON) {
        NODE* scale = mk_ICON(t->right->u.lval / INT65(ADDRESS_UNIT), t->type);
        erase_tree(t->right);
        t->right = scale;
    } else {
        TYPE* type = t->right->type;
        t->right = coerce_to_type(t->type, maketree(DIV, t->right, mk_ICON(INT65(ADDRESS_UNIT), type), type, t->ls));
    }
    return t;
}

NODE* cleanup_NASSERT(NODE* t) {
    if (t->left && tree_has_side_effects(t->left)) {
        erase_tree(t);
        return mk_ICON(INT65(0), tp->int_t);
    }
    if (currfuninfo) currfuninfo->has_nasserts = true;
    return t;
}

// The two operands of an assertion are its own; the writer puts them back under one list.
NODE* cleanup_ASSERT(NODE* t) {
    NODE* list = t->left;
    if (!list || list->op != COMMA) return t;
    t->left = list->left;
    t->right = list->right;
    erase_node(list);
    return t;
}

// The parts of a complex value held as a vector are its lanes 0 and 1.
NODE* part_to_VFIELD(NODE* t) {
    t->right = mk_ICON(INT65(t->op == REAL ? 0 : 1), tp->int_t);
    t->op = VFIELD;
    return t;
}

NODE* cleanup_node(NODE* t) {
    if (t->type->kind != TYPE::tpk_void) t->type = normalized_value_type(t->type);
    switch (t->op) {
    case NAME: t->u.sym = get_sym_def_for_decl(t->u.sym); return t;
    case UAND: note_address_taken(t); return t;
    case CALL: retype_arguments(t); return t;
    case LOOP: return cleanup_LOOP(t);
    case ENDLOOP: return cleanup_ENDLOOP(t);
    case SCONV:
        if (t->type->is_vector()) {
            OPT_ASSERT(t->left->type->is_vector());
            t->op = VSCONV;
        }
        return t;
    case PMCONV: return cleanup_PMCONV(t);
    case CBRANCH: convert_CBRANCH_with_builtin_expect(t); return t;
    case DDNODE: { // what an earlier run learned of the access is dropped with its records
        NODE* access = t->left;
        erase_node(t);
        return access;
    }
    case EPVAL: {
        NODE* child = t->left;
        if (child->op == LABELREF) child->set_edge_profile_value(t->get_edge_profile_value());
        erase_node(t);
        return child;
    }
    case NASSERT: return cleanup_NASSERT(t);
    case ASSERT: return cleanup_ASSERT(t);
    case MCALL:
    case UMCALL: return cleanup_intrinsic(t);
    case REAL:
    case IMAG: return t->left->type->is_vector() ? read_listener->lane_access(part_to_VFIELD(t)) : t;
    case VFIELD: return read_listener->lane_access(t);
    default: return t;
    }
}

} // namespace

NODE* expr_cleanup(NODE* tree) {
    return rewrite_tree(tree, [](NODE* t) { return cleanup_node(t); });
}

// ---- Branch hints

namespace {

constexpr char BUILTIN_EXPECT[] = "__builtin_expect";

bool is_expect_call(const NODE* t) {
    return t->op == ICALL && !std::strcmp(t->u.name, BUILTIN_EXPECT) && arg_list_count(t->left) == 2 &&
           t->left->right->op == ICON;
}

} // namespace

// `CBRANCH(expect(c, k), L)`, or with the call compared against 0: the condition becomes `c`, and L, where a false
// condition goes, is likely when k is 0 and unlikely otherwise.
void convert_CBRANCH_with_builtin_expect(NODE* cbranch) {
    NODE* target = cbranch->right;
    NODE** place = &cbranch->left;
    NODE* test = *place;
    if (test && test->op == NEQ && test->right->op == ICON && test->right->u.lval.is_zero()) place = &test->left;
    while (*place && (*place)->op == SCONV && (*place)->type->is_int() &&
           (*place)->type->size >= (*place)->left->type->size)
        place = &(*place)->left;
    NODE* call = *place;
    if (!call || !is_expect_call(call) || !target || target->op != LABELREF) return;
    target->make_rare().branch_hint = call->left->right->u.lval.is_zero() ? 1 : -1;
    NODE* args = call->left;
    // The hint is taken off only where the condition's truth does not depend on the call's own type.
    NODE* value = args->left;
    if (value->type->is_int() && value->type->size <= call->type->size) {
        erase_tree(args->right);
        erase_node(args);
        call->left = nullptr;
        *place = coerce_to_type(call->type, value);
        erase_node(call);
    } else {
        target->make_rare().branch_hint = 0;
    }
}

void revert_CBRANCH_with_builtin_expect(NODE* cbranch) {
    NODE* target = cbranch->right;
    if (target->rare().branch_hint == 0) return;
    const int expected = target->rare().branch_hint > 0 ? 0 : 1;
    target->make_rare().branch_hint = 0;
    NODE* truth = cbranch->left;
    if (!returns_1_or_0(truth)) {
        if (!truth->type->is_int()) return;
        truth = maketree(NEQ, truth, mk_ICON(INT65(0), truth->type), tp->int_t, truth->ls);
    }
    NODE* args =
        maketree(COMMA, coerce_to_type(tp->long_t, truth), mk_ICON(INT65(expected), tp->long_t), tp->long_t, truth->ls);
    NODE* call = mk_ICALL(BUILTIN_EXPECT, args, tp->long_t);
    cbranch->left = maketree(NEQ, call, mk_ICON(INT65(0), tp->long_t), tp->int_t, truth->ls);
}

// ---- Machine operations

namespace {

// Functions made for intrinsics that nothing declares, by the intrinsic's name.
std::unordered_map<std::string, SYMTAB*> converted_intrinsics;

SYMTAB* find_function_named(const char* name) {
    for (SYMTAB* s = global_symbols; s; s = s->next)
        if (s->is_function() && !std::strcmp(skip_name_prefix(s->name), name)) return s;
    return nullptr;
}

TYPE* function_type_of_call(const NODE* call) {
    fkPARAM* params = nullptr;
    for (const NODE* list = call->left; list; list = list->op == COMMA ? list->left : nullptr) {
        auto* parm = new fkPARAM;
        parm->type = (list->op == COMMA ? list->right : list)->type;
        parm->next = params;
        params = parm;
    }
    TYPE* type = tp->mk_func(call->type, false, false, true, 0, 0, 0);
    tp->set_params(type, params);
    tp->type_frozen(type);
    return type;
}

SYMTAB* make_intrinsic_function(const char* name, const NODE* call) {
    const std::string linker_name = (TYPE_PKG::abi == 1 ? "" : "_") + std::string(name);
    auto* sym = new SYMTAB;
    sym->name = safestrdup(linker_name.c_str());
    sym->type = sym->orig_type = function_type_of_call(call);
    sym->sclass = SC_EXTERN;
    sym->cqual = 0xE001;
    sym->size = 32;
    sym->align = 32;
    make_FUNINFO(sym);
    sym_def(sym);
    return sym;
}

NODE* intrinsic_to_call(NODE* t) {
    SYMTAB*& sym = converted_intrinsics[t->u.name];
    if (!sym) sym = find_function_named(t->u.name);
    if (!sym) sym = make_intrinsic_function(t->u.name, t);
    NODE* callee = maketree(UAND, mk_NAME(sym), nullptr, tp->mk_ptr(sym->type), t->ls);
    NODE* call = maketree(t->left ? CALL : UCALL, callee, t->left, t->type, t->ls);
    if (currfuninfo) currfuninfo->no_calls = false;
    t->left = nullptr;
    erase_node(t);
    return call;
}

NODE* make_implicit_state_argument() {
    NODE* state = copy_tree(mcall_implicit_state_tree);
    return maketree(ARGREF, state, nullptr, tp->mk_ptr(state->type));
}

} // namespace

NODE* cleanup_intrinsic(NODE* t) {
    const BIF* bif = find_BIF_descriptor(t->u.name);
    if (!std::strcmp(t->u.name, "_never_executed") || is_magic_EH_MCALL(t)) return t;
    if (!bif || bif->has(IS_GENERIC)) return intrinsic_to_call(t);
    const bool pure = bif->opcode == ICALL || bif->opcode == UICALL;
    if (pure || tree_contains_op(t, ARGREF)) return t;
    NODE* state = make_implicit_state_argument();
    if (t->op == UMCALL) {
        t->op = MCALL;
        t->left = state;
    } else {
        t->left = maketree(COMMA, t->left, state, state->type, t->ls);
    }
    return t;
}
