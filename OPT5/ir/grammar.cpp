#include "OPT5/ir/grammar.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"

#include <cstdio>

namespace {

struct GRAMMAR_FAULT {
    std::string text;
};

[[noreturn]] void refuse(const std::string& text) { throw GRAMMAR_FAULT{text}; }

// Whether the tree stands in a block: the forms of the graph are allowed, those that only a parser writes are not.
bool in_graph = false;

enum class ROLE { statement, value, arguments, label, field, arms, cases, case_label };

const char* role_text(ROLE role) {
    switch (role) {
    case ROLE::statement: return "a statement";
    case ROLE::value: return "a value";
    case ROLE::arguments: return "an argument";
    case ROLE::label: return "a label";
    case ROLE::field: return "a member";
    case ROLE::arms: return "the arms of a condition";
    case ROLE::cases: return "a case list";
    case ROLE::case_label: return "a case constant";
    }
    return "";
}

[[noreturn]] void out_of_place(const NODE* t, ROLE role) {
    refuse(std::string(t ? opname(t->op) : "nothing") + " stands where " + role_text(role) + " must stand");
}

bool is_statement_only(int op) {
    switch (op) {
    case RETURN:
    case URETURN:
    case SWITCH:
    case BRANCH:
    case CBRANCH:
    case IF:
    case LOOP:
    case ENDLOOP: return true;
    default: return false;
    }
}

// Operators that stand in one role and nowhere else.
bool has_a_role_of_its_own(int op) {
    switch (op) {
    case LABELREF:
    case FIELD:
    case COLON:
    case CASE:
    case DEFAULT:
    case COMMA:
    case SKIP:
    case ENDINIT: return true;
    default: return false;
    }
}

void check(const NODE* t, ROLE role);

void check_arguments(const NODE* t) {
    for (; t && t->op == COMMA; t = t->left) check(t->right, ROLE::value);
    check(t, ROLE::value);
}

void check_case(const NODE* t, bool last) {
    if (t && t->op == CASE) {
        check(t->left, ROLE::case_label);
        check(t->right, ROLE::label);
    } else if (t && t->op == DEFAULT && last) {
        check(t->left, ROLE::label);
    } else
        out_of_place(t, ROLE::cases);
}

void check_cases(const NODE* t) {
    for (bool last = true;; last = false) {
        if (!t || t->op != COMMA) {
            check_case(t, last);
            return;
        }
        check_case(t->right, last);
        t = t->left;
    }
}

void check_pointer(const NODE* t, const char* what) {
    if (!t->left->type->is_pointer()) refuse(std::string(what) + " through what is no pointer");
}

void check_integer(const NODE* t, const char* what) {
    if (!t->type->is_int() && !t->type->is_enum()) refuse(std::string(what) + " of type " + t->type->printstr());
}

// Base and subscript are apart in normal form alone.
void check_subscript(const NODE* t) {
    if (!in_graph || !trees_are_normalized) refuse("an indirection with a subscript outside of the normal form");
    check(t->right, ROLE::value);
    check_integer(t->right, "a subscript");
}

// What is true or false is a scalar, or a mask of truth values.
void check_truth_value(const NODE* t) {
    if (!t->type->is_scalar() && !t->type->is_vector()) refuse("the truth of a " + t->type->printstr());
}

// The end of a counted loop is the condition of the IF that closes it.
void check_IF(const NODE* t) {
    if (!in_graph) refuse("an IF in the input");
    if (!t->left || t->left->op != ENDLOOP) {
        check(t->left, ROLE::value);
        check_truth_value(t->left);
    }
    if (!t->right || t->right->op != COMMA) out_of_place(t->right, ROLE::arms);
    check(t->right->left, ROLE::label);
    check(t->right->right, ROLE::label);
}

void check_operands(const NODE* t) {
    switch (t->op) {
    case UMULT:
        check(t->left, ROLE::value);
        check_pointer(t, "an indirection");
        if (t->right) check_subscript(t);
        return;
    case STREF:
        check(t->left, ROLE::value);
        check(t->right, ROLE::field);
        check_pointer(t, "a member is read");
        return;
    case STDOT:
        check(t->left, ROLE::value);
        check(t->right, ROLE::field);
        return;
    case QUEST:
        check(t->left, ROLE::value);
        check(t->right, ROLE::arms);
        check_truth_value(t->left);
        return;
    case ANDAND:
    case OROR:
        check(t->left, ROLE::value);
        check(t->right, ROLE::value);
        check_truth_value(t->left);
        check_truth_value(t->right);
        return;
    case EXCLAIM:
        check(t->left, ROLE::value);
        check_truth_value(t->left);
        return;
    case CALL:
        check(t->left, ROLE::value);
        check(t->right, ROLE::arguments);
        return;
    case ICALL:
    case MCALL:
    case MEMCPY:
    case VPACK:
    case VPACKM:
    case ASSERT: check(t->left, ROLE::arguments); return;
    case BRANCH: check(t->left, ROLE::label); return;
    case CBRANCH:
        check(t->left, ROLE::value);
        check(t->right, ROLE::label);
        check_truth_value(t->left);
        return;
    case IF: check_IF(t); return;
    case LOOP:
        check(t->left, ROLE::value);
        check(t->right, ROLE::label);
        return;
    case ENDLOOP:
        check(t->left, ROLE::value);
        check(t->right, ROLE::label);
        check_integer(t->left, "a loop counter");
        return;
    case PMCONV:
        check(t->left, ROLE::value);
        check(t->right, ROLE::value);
        for (const NODE* n : {t, static_cast<const NODE*>(t->left), static_cast<const NODE*>(t->right)})
            check_integer(n, "a pointer's scale");
        return;
    case SWITCH:
        check(t->left, ROLE::value);
        check(t->right, ROLE::cases);
        check_integer(t->left, "the value of a switch");
        return;
    default:
        if (t->left) check(t->left, ROLE::value);
        if (t->right) check(t->right, ROLE::value);
        return;
    }
}

// ---- Types of operands

// What an operator can compute with.
bool is_operand_type(const TYPE* t) {
    return t->is_scalar() || t->is_vector() || t->is_complex() || (t->is_csu() && t->is_struct_vector());
}

void check_type(const NODE* t, const NODE* of, bool fits) {
    if (!fits) refuse(std::string(opname(of->op)) + (t == of ? " of type " : " of what has type ") + t->type->printstr());
}

bool is_truth_type(const TYPE* t) { return t->is_int() || t->is_enum() || t->is_vector(); }

void check_comparison(const NODE* t) {
    check_type(t, t, is_truth_type(t->type));
    const bool equality = t->op == EQ || t->op == NEQ || t->op == FEQ || t->op == FNEQ || t->op == FEQN || t->op == FNEQN;
    for (const NODE* n : {t->left, t->right})
        check_type(n, t, is_operand_type(n->type) && (equality || !n->type->is_complex()));
}

// Parts of complex numbers and lanes of vectors are never dropped by an operator.
void check_arithmetic(const NODE* t, bool integers) {
    auto fits = [integers](const TYPE* type) {
        return is_operand_type(type) && !(integers && (type->is_float() || type->is_complex()));
    };
    check_type(t, t, fits(t->type));
    for (const NODE* n : {t->left, t->right}) {
        if (!n) continue;
        check_type(n, t, fits(n->type));
        if (n->type->is_complex()) check_type(t, t, t->type->is_complex());
        if (n->type->is_vector()) check_type(t, t, t->type->is_vector());
    }
}

bool is_place(const NODE* t) {
    switch (t->op) {
    case NAME:
    case STDOT:
    case STREF:
    case UMULT:
    case VFIELD:
    case REAL:
    case IMAG:
    case VREG: return true;
    case SCONV:
    case PCONV:
    case ACONV:
    case VRCONV:
    case EPVAL:
    case DDNODE: return is_place(t->left);
    case COMMAOP:
    case PCOMMA: return is_place(t->right);
    default: return in_graph && t->op > VREG; // the optimizer's own forms
    }
}

// Whether values of one type are kept as those of the other are, but for sizes.
bool same_kind(const TYPE* a, const TYPE* b) {
    auto kind = [](const TYPE* t) {
        return t->is_pointer() ? 1 : t->is_complex() ? 2 : t->is_vector() ? 3 : t->is_csu() ? 4 : t->is_array() ? 5
             : t->is_func() ? 6 : t->is_void() ? 7 : t->is_float() ? 8 : 0;
    };
    return kind(a) == kind(b);
}

void check_name(const NODE* t) {
    const TYPE* object = t->u.sym->type;
    const bool fits = same_kind(t->type, object) && (!object->is_scalar() || t->type->size == object->size);
    if (!in_graph && t->u.sym->level > 0 && t->u.sym->sclass == SC_DROPPED)
        refuse(std::string(t->u.sym->name) + " is named and has no storage");
    if (!fits) refuse(std::string(t->u.sym->name) + " named as of type " + t->type->printstr());
}

// What is assigned may be of another type than the place, but not of another kind.
void check_assignment(const NODE* t) {
    const TYPE *to = t->left->type, *from = t->right->type;
    if (!is_place(t->left)) refuse(std::string(opname(t->op)) + " to what is no place");
    if (t->op == STASG || t->op == ARASG) return;
    check_type(t, t, same_kind(t->type, to) || t->type->is_void());
    check_type(t->right, t, is_operand_type(from) == is_operand_type(to));
    check_type(t->right, t, !(from->is_pointer() && to->is_complex()));
    check_type(t->right, t, !from->is_complex() || to->is_complex() || !to->is_scalar());
}

void check_types(const NODE* t) {
    if ((t->op >= EQ && t->op <= UGT) || (t->op >= FEQ && t->op <= FUNO)) return check_comparison(t);
    switch (t->op) {
    case ANDAND:
    case OROR:
    case EXCLAIM: return check_type(t, t, is_truth_type(t->type));
    case PLUS:
    case MINUS:
    case MULT:
    case DIV:
    case UMINUS:
    case ABS:
    case SQR:
    case SQRT:
    case RECIP: return check_arithmetic(t, false);
    case MOD:
    case ANDB:
    case ORB:
    case XORB:
    case NOTB:
    case SLL:
    case SRL: return check_arithmetic(t, true);
    case COMPLEX:
        check_type(t, t, t->type->is_complex());
        for (const NODE* n : {t->left, t->right}) check_type(n, t, n->type->is_scalar() && !n->type->is_complex());
        return;
    case REAL:
    case IMAG: return check_type(t->left, t, t->left->type->is_complex() || t->left->type->is_vector());
    case SCONV: return check_type(t->left, t, is_operand_type(t->left->type));
    case STDOT:
    case STREF:
        if (t->right && t->right->mval) check_type(t, t, t->type->is_complex() == t->right->mval->type->is_complex());
        return;
    default:
        if (opcode_is_ASG(t->op)) check_assignment(t);
    }
}

void check_constant(const NODE* t) {
    const TYPE* type = t->type->is_vector() ? t->type->raw_elem_type() : t->type;
    const bool integer = type->is_int() || type->is_enum() || type->is_pointer() || type->is_fixed();
    if (t->op == FCON ? !type->is_float() : !integer)
        refuse(std::string("a constant ") + (t->op == FCON ? "FCON" : "ICON") + " of type " + t->type->printstr());
}

void check_value(const NODE* t, ROLE role) {
    if (has_a_role_of_its_own(t->op) || (role != ROLE::statement && is_statement_only(t->op))) out_of_place(t, role);
    switch (t->op) {
    case NAME:
        if (!t->u.sym) refuse("a NAME without a symbol");
        check_name(t);
        break;
    case ICON:
    case FCON: check_constant(t); break;
    case VREG: refuse("a virtual register in the input");
    default: break;
    }
    check_operands(t);
    check_types(t);
}

void check(const NODE* t, ROLE role) {
    if (!t) out_of_place(t, role);
    if (t->op == EPVAL) { // a count on whatever it holds
        check(t->left, role);
        return;
    }
    switch (role) {
    case ROLE::arguments: check_arguments(t); return;
    case ROLE::cases: check_cases(t); return;
    case ROLE::label:
        if (t->op != LABELREF) out_of_place(t, role);
        if (!t->u.lval.fits<int32_t>()) refuse("label number " + std::to_string(t->u.lval.value) + " is out of range");
        return;
    case ROLE::field:
        if (t->op != FIELD || !t->mval) out_of_place(t, role);
        return;
    case ROLE::arms:
        if (t->op != COLON) out_of_place(t, role);
        check(t->left, ROLE::value);
        check(t->right, ROLE::value);
        return;
    case ROLE::case_label:
        if (t->op != ICON) out_of_place(t, role);
        check_constant(t);
        return;
    case ROLE::statement:
    case ROLE::value: check_value(t, role); return;
    }
}

} // namespace

namespace {

std::string fault_of(const NODE* tree, ROLE role) {
    try {
        check(tree, role);
    } catch (const GRAMMAR_FAULT& fault) {
        return fault.text;
    }
    return {};
}

} // namespace

std::string grammar_fault_of_statement(const NODE* tree) {
    in_graph = false;
    return fault_of(tree, ROLE::statement);
}

std::string grammar_fault_of_initializer_item(const NODE* tree) {
    in_graph = false;
    if (tree->op == ENDINIT) return {};
    if (tree->op == SKIP) return tree->left ? fault_of(tree->left, ROLE::value) : std::string();
    return fault_of(tree, ROLE::value);
}

int validate_grammar() {
    in_graph = true;
    int errors = 0;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (bb->is_in_LIR_form()) continue;
        for (const LIST* s = bb->statements; s; s = s->rest) {
            const std::string fault = fault_of(s->first, ROLE::statement);
            if (fault.empty()) continue;
            std::fprintf(fdebug ? fdebug : stderr, " +++++ %s: %s\n", bb->str(), fault.c_str());
            ++errors;
        }
    }
    return errors;
}
