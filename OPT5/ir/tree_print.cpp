// Trees as text: the infix form that people read, and the dump of one line a node.
//
// The infix form is C as far as C has the operator: parentheses by precedence, casts as (type), control statements with
// the labels that they branch to. What C has no operator for is written as a call in the operator's name.

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <cstdlib>
#include <cstring>

namespace {

// Spelling of a binary operator, null for the others.
const char* binary_sign(int op) {
    switch (op) {
    case PLUS: return " + ";
    case MINUS: return " - ";
    case MULT: return " * ";
    case DIV: return " / ";
    case MOD: return " % ";
    case ANDB: return " & ";
    case ORB: return " | ";
    case XORB: return " ^ ";
    case SLL: return " << ";
    case SRL: return " >> ";
    case ANDAND: return " && ";
    case OROR: return " || ";
    case EQ:
    case FEQ: return " == ";
    case NEQ:
    case FNEQN: return " != ";
    case LE:
    case ULE:
    case FLE: return " <= ";
    case LT:
    case ULT:
    case FLT: return " < ";
    case GE:
    case UGE:
    case FGE: return " >= ";
    case GT:
    case UGT:
    case FGT: return " > ";
    case QUEST: return " ? ";
    case COLON: return " : ";
    case COMMA:
    case COMMAOP:
    case PCOMMA: return ", ";
    case ASG:
    case STASG:
    case ARASG: return " = ";
    case PLUSASG: return " += ";
    case MINUSASG: return " -= ";
    case MULTASG: return " *= ";
    case DIVASG: return " /= ";
    case MODASG: return " %= ";
    case ANDBASG: return " &= ";
    case ORBASG: return " |= ";
    case XORBASG: return " ^= ";
    case SLLASG: return " <<= ";
    case SRLASG: return " >>= ";
    default: return nullptr;
    }
}

const char* unary_sign(int op) {
    switch (op) {
    case UMINUS: return "-";
    case NOTB: return "~";
    case EXCLAIM: return "!";
    case UAND:
    case ARGREF: return "&";
    case UMULT: return "*";
    default: return nullptr;
    }
}

// The compare that is false exactly where this one is true.
bool is_or_unordered(int op) { return op >= FLEN && op <= FGTN; }

bool is_cast(int op) {
    return op == SCONV || op == PCONV || op == ISP2CHAR || op == VRCONV || op == VSCONV || op == ACONV;
}

class infix_writer {
public:
    std::string out;

    void expr(const NODE* t, int outer);
    void statement(const NODE* t);

private:
    void label(const NODE* t);
    void icon(const NODE* t);
    void fcon(const NODE* t);
    void scon(const NODE* t);
    void leaf(const NODE* t);
    void binary(const NODE* t, int outer, const char* sign);
    void prefix(const NODE* t, int outer, const std::string& sign);
    void step(const NODE* t);
    void call(const NODE* t);
    void as_call(const char* name, const NODE* left, const NODE* right);
    void cases(const NODE* list);
};

void infix_writer::label(const NODE* t) {
    if (!t)
        out += "L?";
    else if (t->op == LABELREF || t->op == LABELDEF)
        out += "L" + std::to_string(t->lbl ? t->lbl->index : static_cast<long>(t->u.lval.value));
    else
        expr(t, 0);
}

void infix_writer::icon(const NODE* t) {
    INT65 v = t->u.lval;
    bool negative = v.is_negative();
    if (negative) v = -v;
    if (t->type->is_pointer()) {
        char text[24];
        snprintf(text, sizeof text, "0x%llx", static_cast<unsigned long long>(v.value));
        out += text;
        return;
    }
    if (negative) out += '-';
    out += std::to_string(v.value);
    if (t->type->is_unsigned()) out += 'u';
    if (t->type->size > 16) out += t->type->size > 32 ? "LL" : "L";
}

// The shortest decimal that reads back as the same host double.
void infix_writer::fcon(const NODE* t) {
    double v;
    f_ftoh(t->u.fval, &v);
    char text[48];
    for (int digits = 6; digits <= 17; ++digits) {
        snprintf(text, sizeof text, "%.*g", digits, v);
        if (strtod(text, nullptr) == v) break;
    }
    if (!strpbrk(text, ".en")) strcat(text, ".0");
    out += text;
}

void infix_writer::scon(const NODE* t) {
    out += '"';
    for (uint32_t i = 0, n = t->scon_length(); i < n; ++i) {
        unsigned char c = static_cast<unsigned char>(t->text[i]);
        char escaped[8];
        if (i + 1 == n && c == 0) break;
        if (c == '"' || c == '\\')
            snprintf(escaped, sizeof escaped, "\\%c", c);
        else if (c == '\n')
            strcpy(escaped, "\\n");
        else if (c < 32 || c > 126)
            snprintf(escaped, sizeof escaped, "\\%03o", c);
        else
            snprintf(escaped, sizeof escaped, "%c", c);
        out += escaped;
    }
    out += '"';
}

void infix_writer::leaf(const NODE* t) {
    switch (t->op) {
    case NAME: out += t->text ? t->text : t->u.sym && t->u.sym->name ? t->u.sym->name : "<no symbol>"; break;
    case ICON:
    case LCON: icon(t); break;
    case FCON: fcon(t); break;
    case SCON: scon(t); break;
    case LABELREF: label(t); break;
    case FIELD: out += t->mval ? t->mval->name : "<no member>"; break;
    case MIXVALUE: out += "MIX" + std::to_string(reinterpret_cast<uintptr_t>(t->u.rval)); break;
    case UICALL:
    case UMCALL: out += std::string(t->u.name) + "()"; break;
    default: out += opname(t->op);
    }
}

void infix_writer::binary(const NODE* t, int outer, const char* sign) {
    int own = precedence[t->op];
    bool right_first = own == 2 || own == 3; // assignments and conditionals group to the right
    if (own < outer) out += '(';
    expr(t->left, right_first ? own + 1 : own);
    out += sign;
    expr(t->right, right_first ? own : own + 1);
    if (own < outer) out += ')';
}

void infix_writer::prefix(const NODE* t, int outer, const std::string& sign) {
    constexpr int own = 14;
    if (own < outer) out += '(';
    std::size_t start = out.size() + sign.size();
    out += sign;
    expr(t->left, own);
    // "- -x" and "& &x" must not run together.
    if (sign.size() == 1 && out.size() > start && out[start] == sign[0]) out.insert(start, 1, ' ');
    if (own < outer) out += ')';
}

// x++ and x--; a step other than 1 is shown behind.
void infix_writer::step(const NODE* t) {
    expr(t->left, 15);
    out += t->op == PLUSPLUS ? "++" : "--";
    if (!t->right || (t->right->op == ICON && t->right->u.lval == INT65(1))) return;
    out += '{';
    expr(t->right, 0);
    out += '}';
}

void infix_writer::as_call(const char* name, const NODE* left, const NODE* right) {
    out += name;
    out += '(';
    if (left) expr(left, 0);
    if (left && right) out += ", ";
    if (right) expr(right, 0);
    out += ')';
}

void infix_writer::call(const NODE* t) {
    if (const SYMTAB* callee = get_callee_for_call(t)) {
        out += callee->name;
    } else {
        out += "(*";
        expr(t->left, 14);
        out += ')';
    }
    as_call("", t->right, nullptr);
}

void infix_writer::expr(const NODE* t, int outer) {
    if (!t) {
        out += "<null>";
        return;
    }
    int op = t->op;
    if (!t->left && !t->right) return leaf(t);
    if (const char* sign = binary_sign(op); sign && t->left && t->right) return binary(t, outer, sign);
    if (const char* sign = unary_sign(op); sign && t->left && !t->right) return prefix(t, outer, sign);
    if (is_cast(op)) return prefix(t, outer, "(" + t->type->printstr() + ")");
    if (is_or_unordered(op)) {
        out += "!(";
        expr(t->left, 11);
        out += binary_sign(boolean_inv[op]);
        expr(t->right, 11);
        out += ')';
        return;
    }
    switch (op) {
    case STDOT:
    case STREF:
        expr(t->left, 15);
        out += op == STDOT ? "." : "->";
        return expr(t->right, 15);
    case PLUSPLUS:
    case MINMIN: return step(t);
    case CALL:
    case UCALL: return call(t);
    case ICALL:
    case MCALL:
        if (const NODE* pointer = pointer_behind_builtin(t)) return expr(pointer, outer);
        return as_call(t->u.name, t->left, nullptr);
    case UMULT: return as_call("U*2", t->left, t->right);
    case STARG:
    case SSA_USE:
    case SSA_DEF:
    case SSA_MU:
    case SSA_CHI: return expr(t->left, outer);
    case CSE_DUPE:
    case CSE_ORIG: return expr(t->right, outer);
    default: return as_call(opname(op), t->left, t->right);
    }
}

void infix_writer::cases(const NODE* list) {
    if (!list) return;
    if (list->op == COMMA) {
        cases(list->left);
        cases(list->right);
        return;
    }
    if (list->op == CASE) {
        out += " case ";
        expr(list->left, 0);
        out += ": goto ";
        label(list->right);
    } else {
        out += " default: goto ";
        label(list->left);
    }
    out += ';';
}

void infix_writer::statement(const NODE* t) {
    switch (t->op) {
    case IF:
        out += "IF (";
        expr(t->left, 0);
        out += ") goto ";
        if (t->right && t->right->op == COMMA) {
            label(t->right->left);
            out += " else ";
            label(t->right->right);
        } else {
            label(t->right);
        }
        break;
    case CBRANCH:
        out += "IF (!(";
        expr(t->left, 0);
        out += ")) goto ";
        label(t->right);
        break;
    case BRANCH:
        out += "goto ";
        label(t->left);
        break;
    case LABELDEF:
        label(t);
        out += ':';
        return;
    case SWITCH:
        out += "SWITCH (";
        expr(t->left, 0);
        out += ") {";
        cases(t->right);
        out += " }";
        return;
    case RETURN:
        out += "return ";
        expr(t->right, 0);
        break;
    case URETURN: out += "return"; break;
    case ASM: out += std::string("asm(\"") + (t->text ? t->text : "") + "\")"; break;
    case PPRAGMA:
        out += std::string("#pragma ") + (t->pragma ? t->pragma->name() : "");
        if (t->pragma)
            for (const std::string& arg : t->pragma->args) out += " " + arg;
        return;
    default: expr(t, 0);
    }
    out += ';';
}

// ---- The dump
void dump_payload(FILE* out, const NODE* t) {
    switch (t->op) {
    case ICON:
    case LCON: fprintf(out, " %s", int2text(t->u.lval, nullptr, 10, 0)); break;
    case FCON: fprintf(out, " %s", t->fcon_value()); break;
    case SCON:
    case NAME:
    case LABELREF:
    case FIELD: fprintf(out, " %s", tree_to_infix(t).c_str()); break;
    case LABELDEF: fprintf(out, " L%d", t->lbl ? t->lbl->index : 0); break;
    case ICALL:
    case UICALL:
    case MCALL:
    case UMCALL: fprintf(out, " %s()", t->u.name); break;
    case ASM: fprintf(out, " \"%s\"", t->text ? t->text : ""); break;
    case PPRAGMA: fprintf(out, " %s", t->pragma ? t->pragma->name() : ""); break;
    case CALL:
        if (!t->u.lval.is_zero()) fprintf(out, " varargs=%s", int2text(t->u.lval, nullptr, 10, 0));
        break;
    }
    if (t->edge_profile() != NO_PROFILE) fprintf(out, " profile=%u", t->edge_profile());
    if (t->rare().weight >= 0.0) fprintf(out, " weight=%g", t->rare().weight);
    if (t->eh_entry()) fprintf(out, " eh=%u", t->eh_entry());
}

} // namespace

std::string tree_to_infix(const NODE* t) {
    infix_writer w;
    w.expr(t, 0);
    return w.out;
}

std::string stmt2infix(const NODE* t) {
    infix_writer w;
    w.statement(t);
    return w.out;
}

void print_tree(FILE* out, const NODE* t, int indent) {
    if (!t) {
        fputs("   >>>>>>>>>> ILLEGAL TREE: (nil) <<<<<<<<<<<<\n", out);
        return;
    }
    fprintf(out, "%*s%s", indent, "", opname(t->op));
    if (t->op == ILLOP) {
        fputs(" <<<<<<<<<<<< ILLEGAL TREE!!\n", out);
        return;
    }
    dump_payload(out, t);
    fprintf(out, " <%s>\n", t->type ? t->type->printstr().c_str() : "no type");
    if (t->left) print_tree(out, t->left, indent + 2);
    if (t->right) print_tree(out, t->right, indent + 2);
}
