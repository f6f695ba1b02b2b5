// Whether two trees compute the same value.
//
// The comparison is of form, up to the order of commutative operands and the grouping of integer sums and products.
// With `se_ok` the trees may have side effects, which must then be the same and happen in the same order; so every
// comparison that takes operands out of their order is made without. Values are compared as if both trees were
// evaluated at one and the same point of the program.

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

#include <cstring>

namespace {

constexpr int MAX_CHAIN = 12; // operands of a reassociated chain that are matched against each other

const NODE* without_wrappers(const NODE* t) {
    for (;;) switch (t->op) {
        case CSE_DUPE:
        case CSE_ORIG: t = t->right; break;
        case OUIALIGN:
        case NONALIGN:
        case IDENTITY: t = t->left; break;
        default: return t;
        }
}

bool both_or_congruent(const NODE* a, const NODE* b, bool se_ok) {
    return a && b ? trees_are_congruent(a, b, se_ok) : a == b;
}

bool operands_are_congruent(const NODE* a, const NODE* b, bool se_ok) {
    return both_or_congruent(a->left, b->left, se_ok) && both_or_congruent(a->right, b->right, se_ok);
}

bool operands_match_crosswise(const NODE* a, const NODE* b) {
    return both_or_congruent(a->left, b->right, false) && both_or_congruent(a->right, b->left, false);
}

bool same_payload(const NODE* a, const NODE* b) { return a->u.lval == b->u.lval; }
bool same_name(const char* a, const char* b) {
    return a == b || (a && b && a[0] && b[0] && a[1] == b[1] && !strcmp(a, b));
}
bool same_text(const char* a, const char* b) { return a == b || (a && b && !strcmp(a, b)); }

// ---- Names
bool names_are_parm_and_copy(const SYMTAB* a, const SYMTAB* b) {
    const SYMTAB* local = a->level == 2 ? a : b;
    const SYMTAB* parm = local == a ? b : a;
    if (local->level != 2 || parm->level != 1 || strcmp(local->name, parm->name)) return false;
    if (!symbol_is_immutable(local) || !(symbol_is_immutable(parm) || parm->type->is_scalar())) return false;
    return map_sym_to_parm(local) == parm;
}

bool NAMEs_are_congruent(const NODE* a, const NODE* b, bool se_ok) {
    if (!se_ok && (lvalue_is_volatile(a) || lvalue_is_volatile(b))) return false;
    if (a->u.sym == b->u.sym) return true;
    return a->u.sym && b->u.sym && names_are_parm_and_copy(a->u.sym, b->u.sym);
}

bool NAME_is_converted_parm(const NODE* name, const NODE* cast, bool se_ok) {
    if (name->op != NAME || (cast->op != SCONV && cast->op != PCONV && cast->op != ISP2CHAR)) return false;
    const NODE* parm = cast->left;
    if (parm->op != NAME || !name->u.sym || !parm->u.sym || name->u.sym->level != 2) return false;
    if (!se_ok && (lvalue_is_volatile(name) || lvalue_is_volatile(parm))) return false;
    return names_are_parm_and_copy(name->u.sym, parm->u.sym);
}

// ---- Chains of one associative operator on integers
bool is_integer_chain(const NODE* t) {
    switch (t->op) {
    case PLUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB: return t->type->is_int() || t->type->is_enum();
    default: return false;
    }
}

struct chain {
    const NODE* operand[MAX_CHAIN];
    int count = 0;
    int operators = 0; // counted ahead of the operands, so that a long chain is given up before its end
    bool fits = true;
};

void collect(const NODE* t, const NODE* root, chain* out) {
    t = without_wrappers(t);
    if (t->op == root->op && equiv_mtypes(t->type, root->type)) {
        out->fits &= ++out->operators < MAX_CHAIN;
        if (out->fits) collect(t->left, root, out);
        if (out->fits) collect(t->right, root, out);
    } else if (out->count < MAX_CHAIN && equiv_mtypes(t->type, root->type)) {
        out->operand[out->count++] = t;
    } else {
        out->fits = false;
    }
}

// The operands of one chain are a permutation of the other's.
bool chains_are_congruent(const NODE* a, const NODE* b) {
    chain ca, cb;
    collect(a, a, &ca);
    if (!ca.fits || ca.count < 3) return false;
    collect(b, b, &cb);
    if (!cb.fits || ca.count != cb.count) return false;
    for (int i = 0; i < ca.count; ++i) {
        int j = i;
        while (j < cb.count && !trees_are_congruent(ca.operand[i], cb.operand[j], false)) ++j;
        if (j == cb.count) return false;
        cb.operand[j] = cb.operand[i];
    }
    return true;
}

bool commutative_nodes_are_congruent(const NODE* a, const NODE* b, bool se_ok) {
    if (operands_are_congruent(a, b, se_ok)) return true;
    return is_integer_chain(a) && (operands_match_crosswise(a, b) || chains_are_congruent(a, b));
}

// ---- The other kinds of nodes
bool FIELDs_are_congruent(const NODE* a, const NODE* b) {
    return a->mval == b->mval &&
           (a->u.csu == b->u.csu || (a->u.csu && b->u.csu && compatible_types(a->u.csu, b->u.csu, true)));
}

// The address of a member: the same members of the same object, whatever the types of the nodes between.
bool UANDs_are_congruent(const NODE* a, const NODE* b, bool se_ok) {
    const NODE *x = without_wrappers(a->left), *y = without_wrappers(b->left);
    while (x->op == STDOT && y->op == STDOT && FIELDs_are_congruent(x->right, y->right)) {
        x = without_wrappers(x->left);
        y = without_wrappers(y->left);
    }
    if (x->op == NAME && y->op == NAME) return x->u.sym == y->u.sym; // taking an address reads nothing
    return trees_are_congruent(x, y, se_ok);
}

bool LABELREFs_are_congruent(const NODE* a, const NODE* b) {
    if (a->lbl == b->lbl) return a->lbl || same_payload(a, b);
    return a->lbl && b->lbl && a->lbl->bblock && a->lbl->bblock == b->lbl->bblock;
}

bool PPRAGMAs_are_congruent(const NODE* a, const NODE* b) {
    return a->pragma == b->pragma ||
           (a->pragma && b->pragma && a->pragma->kind == b->pragma->kind && a->pragma->args == b->pragma->args);
}

bool IFs_are_congruent(const NODE* a, const NODE* b, bool se_ok) {
    const NODE *to_a = a->right, *to_b = b->right;
    if (to_a->op != COMMA || to_b->op != COMMA) return operands_are_congruent(a, b, se_ok);
    bool straight =
        LABELREFs_are_congruent(to_a->left, to_b->left) && LABELREFs_are_congruent(to_a->right, to_b->right);
    if (straight && bools_are_congruent(a->left, b->left, false, se_ok)) return true;
    bool crossed = LABELREFs_are_congruent(to_a->left, to_b->right) && LABELREFs_are_congruent(to_a->right, to_b->left);
    return crossed && bools_are_congruent(a->left, b->left, true, se_ok);
}

bool same_op_is_congruent(const NODE* a, const NODE* b, bool se_ok) {
    switch (a->op) {
    case LABELREF: return LABELREFs_are_congruent(a, b);
    case LABELDEF: return LABELREFs_are_congruent(a, b);
    case NAME: return NAMEs_are_congruent(a, b, se_ok);
    case SCON: return same_payload(a, b) && !memcmp(a->text, b->text, a->scon_length());
    case ICON:
    case LCON: return same_payload(a, b);
    case FCON: return f_bit_eq(a->u.fval, b->u.fval);
    case FIELD: return FIELDs_are_congruent(a, b);
    case PLUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB: return commutative_nodes_are_congruent(a, b, se_ok);
    case UAND: return UANDs_are_congruent(a, b, se_ok);
    case UMULT:
    case STDOT:
    case STREF:
        if (!se_ok && (lvalue_is_volatile(a) || lvalue_is_volatile(b))) return false;
        return operands_are_congruent(a, b, se_ok);
    case CALL:
    case UCALL:
    case STASG:
    case STARG:
        if ((a->type->is_csu() || a->type->is_vector()) && !compatible_types(a->type, b->type, true)) return false;
        return same_payload(a, b) && a->eh_entry() == b->eh_entry() && operands_are_congruent(a, b, se_ok);
    case ICALL:
    case UICALL:
    case MCALL:
    case UMCALL: return same_name(a->u.name, b->u.name) && operands_are_congruent(a, b, se_ok);
    case DDNODE:
    case SSA_PHI: return false; // only the same node
    case SSA_USE:
    case SSA_DEF:
    case SSA_MU:
    case SSA_CHI: // of one version: the same variable and the same definition
        return a->u.ssa == b->u.ssa && a->reach == b->reach && operands_are_congruent(a, b, se_ok);
    case PPRAGMA: return PPRAGMAs_are_congruent(a, b);
    case ASM: return same_payload(a, b) && same_text(a->text, b->text);
    case IF: return IFs_are_congruent(a, b, se_ok);
    case MIXVALUE: return reinterpret_cast<uintptr_t>(a->u.rval) > 1 && a->u.rval == b->u.rval;
    default: return same_payload(a, b) && operands_are_congruent(a, b, se_ok);
    }
}

bool types_allow_congruence(const NODE* a, const NODE* b) {
    if (a->type == b->type) return true;
    if (!a->type || !b->type) return false;
    if (equiv_mtypes(a->type, b->type)) return true;
    return a->op == NAME && b->op == NAME && a->u.sym == b->u.sym && compatible_types(a->type, b->type, false);
}

} // namespace

bool trees_are_congruent(const NODE* a, const NODE* b, bool se_ok) {
    if (a == b) {
        if (a->op == MIXVALUE) return reinterpret_cast<uintptr_t>(a->u.rval) > 1;
        return se_ok || !tree_has_side_effects(a);
    }
    a = without_wrappers(a);
    b = without_wrappers(b);
    if (a == b) return trees_are_congruent(a, a, se_ok);
    if (!se_ok && (op_has_effect(a->op) || op_has_effect(b->op))) return false;
    if (!types_allow_congruence(a, b)) return false;
    if (a->op == b->op) {
        if (same_op_is_congruent(a, b, se_ok)) return true;
        return commute_inv[a->op] == a->op && !is_integer_chain(a) && operands_match_crosswise(a, b);
    }
    if (commute_inv[a->op] == b->op) return operands_match_crosswise(a, b);
    return NAME_is_converted_parm(a, b, se_ok) || NAME_is_converted_parm(b, a, se_ok);
}

// ---- Truth values
static const NODE* truth_operand(const NODE* t, bool* negated) {
    for (;;) {
        while (t->op == IDENTITY) t = t->left;
        bool is_test = (t->op == EQ || t->op == NEQ) && t->right->op == ICON && t->right->u.lval.is_zero() &&
                       !t->left->type->is_float() && !t->left->type->is_vector() && !t->left->type->is_complex();
        if (!is_test && (t->op != EXCLAIM || t->left->type->is_vector())) return t;
        if (t->op != NEQ) *negated = !*negated;
        t = t->left;
    }
}

bool bools_are_congruent(const NODE* a, const NODE* b, bool negated, bool se_ok) {
    a = truth_operand(a, &negated);
    b = truth_operand(b, &negated);
    if (!negated) return trees_are_congruent(a, b, se_ok);
    if (!tree_is_trivially_invertible(a) || !tree_is_trivially_invertible(b)) return false;
    int opposite = boolean_inv[b->op];
    if (a->op == opposite) {
        if (operands_are_congruent(a, b, se_ok)) return true;
        if (commute_inv[opposite] != opposite) return false;
    }
    return commute_inv[opposite] == a->op && operands_match_crosswise(a, b);
}

bool tree_lists_are_congruent(const LIST* a, const LIST* b) {
    for (; a && b; a = a->rest, b = b->rest)
        if (!trees_are_congruent_se_ok(a->first, b->first)) return false;
    return !a && !b;
}
