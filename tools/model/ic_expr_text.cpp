// Expressions and statements in infix form.
//
// Operators that C has are written as in C, with the parentheses that C would need; the others as calls by their names.
#include "tools/model/ic_print.h"

#include <charconv>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <iterator>

using namespace if_op;

namespace {
enum : int { prec_comma = 1, prec_assign = 2, prec_quest = 3, prec_unary = 14, prec_postfix = 15, prec_leaf = 99 };

struct BINARY {
    int op;
    const char* text;
    int prec;
};
const BINARY binaries[] = {
    {PLUS, "+", 12},    {PLUSASG, "+=", 2},    {MINUS, "-", 12},     {MINUSASG, "-=", 2}, {MULT, "*", 13},
    {MULTASG, "*=", 2}, {ANDB, "&", 8},        {ANDBASG, "&=", 2},   {ORB, "|", 6},       {ORBASG, "|=", 2},
    {XORB, "^", 7},     {XORBASG, "^=", 2},    {ANDAND, "&&", 5},    {OROR, "||", 4},     {COMMA, ",", 1},
    {PCOMMA, ",", 1},   {ASG, "=", 2},         {COMMAOP, ",", 1},    {DIV, "/", 13},      {DIVASG, "/=", 2},
    {MOD, "%", 13},     {MODASG, "%=", 2},     {SLL, "<<", 11},      {SLLASG, "<<=", 2},  {SRL, ">>", 11},
    {SRLASG, ">>=", 2}, {EQ, "==", 9},         {NEQ, "!=", 9},       {LE, "<=", 10},      {LT, "<", 10},
    {GE, ">=", 10},     {GT, ">", 10},         {ULE, "<=u", 10},     {ULT, "<u", 10},     {UGE, ">=u", 10},
    {UGT, ">u", 10},    {STASG, "=struct", 2}, {ARASG, "=array", 2}, {FEQ, "==f", 9},     {FLE, "<=f", 10},
    {FLT, "<f", 10},    {FGE, ">=f", 10},      {FGT, ">f", 10},      {FNEQN, "!=f", 9},
};

const BINARY* find_binary(int op) {
    static const auto table = [] {
        std::vector<const BINARY*> rows(IF_MAX_OPCODE + 1);
        for (const BINARY& b : binaries) rows[b.op] = &b;
        return rows;
    }();
    return table[op];
}

const char* prefix_text(int op) {
    switch (op) {
    case UMINUS: return "-";
    case UMULT: return "*";
    case UAND: return "&";
    case EXCLAIM: return "!";
    case NOTB: return "~";
    }
    return nullptr;
}

class PRINTER {
public:
    explicit PRINTER(const IC_PRINT_OPTIONS& options) : options_m(options) {}
    void statement(const IC_NODE* t);
    void expr(const IC_NODE* t, int outer);
    std::string text;

private:
    void plain(const IC_NODE* t, int outer);
    void leaf(const IC_NODE* t);
    void call(const IC_NODE* t);
    void list(const IC_NODE* t);
    void switch_statement(const IC_NODE* t);
    void by_name(const IC_NODE* t);
    void string_constant(const IC_NODE* t);
    void type_of(const IC_NODE* t) { text += t->type ? t->type->printstr() : "no type"; }
    void number(uint32_t n) { text += std::to_string(n); }
    void label(const IC_NODE* t) {
        if (t && t->op == LABEL) {
            text += 'L';
            number(t->number);
        } else {
            expr(t, 0);
        }
    }
    static int precedence(const IC_NODE* t);

    const IC_PRINT_OPTIONS& options_m;
};

int PRINTER::precedence(const IC_NODE* t) {
    if (const BINARY* b = find_binary(t->op)) return b->prec;
    if (prefix_text(t->op) && !t->right) return prec_unary;
    switch (t->op) {
    case QUEST: return prec_quest;
    case SCONV:
    case PCONV: return prec_unary;
    case PLUSPLUS:
    case MINMIN:
    case STDOT:
    case STREF:
    case CALL:
    case UCALL: return prec_postfix;
    }
    return prec_leaf;
}

void PRINTER::expr(const IC_NODE* t, int outer) {
    if (!t) {
        text += "(nothing)";
        return;
    }
    bool show_type =
        options_m.types && t->op != LABEL && t->op != NAME && t->op != FIELD && t->op != COMMA && t->op != ENDINIT;
    bool parentheses = precedence(t) < outer || (show_type && precedence(t) != prec_leaf);
    if (parentheses) text += '(';
    plain(t, outer);
    if (parentheses) text += ')';
    if (show_type) {
        text += ':';
        type_of(t);
    }
}

void PRINTER::plain(const IC_NODE* t, int) {
    if (const BINARY* b = find_binary(t->op)) {
        bool right_to_left = b->prec == prec_assign;
        expr(t->left, right_to_left ? b->prec + 1 : b->prec);
        if (b->text[0] != ',') text += ' ';
        text += b->text;
        text += ' ';
        expr(t->right, right_to_left ? b->prec : b->prec + 1);
        return;
    }
    const char* prefix = prefix_text(t->op);
    if (prefix && !t->right) {
        text += prefix;
        return expr(t->left, prec_unary);
    }
    switch (t->op) {
    case QUEST: // over a COLON
        if (!t->right || t->right->op != COLON) break;
        expr(t->left, prec_quest + 1);
        text += " ? ";
        expr(t->right->left, prec_quest + 1);
        text += " : ";
        return expr(t->right->right, prec_quest);
    case PLUSPLUS: // a step other than 1 is shown behind
    case MINMIN:
        expr(t->left, prec_postfix);
        text += t->op == PLUSPLUS ? "++" : "--";
        if (!t->right || (t->right->op == ICON && t->right->value == 1)) return;
        text += '{';
        expr(t->right, 0);
        text += '}';
        return;
    case SCONV:
    case PCONV:
        text += '(';
        type_of(t);
        text += ')';
        return expr(t->left, prec_unary);
    case STDOT:
    case STREF:
        expr(t->left, prec_postfix);
        text += t->op == STDOT ? "." : "->";
        return expr(t->right, prec_postfix);
    case CALL:
    case UCALL:
    case ICALL:
    case UICALL:
    case MCALL:
    case UMCALL: return call(t);
    }
    if (if_node_info[t->op].operand_count == 0)
        leaf(t);
    else
        by_name(t);
}

void PRINTER::string_constant(const IC_NODE* t) {
    text += '"';
    for (uint32_t i = 0; i < t->number; i++) {
        unsigned char c = static_cast<unsigned char>(t->text[i]);
        if (c == '"' || c == '\\') text += '\\';
        if (c >= ' ' && c < 0x7F) {
            text += static_cast<char>(c);
        } else {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\%03o", c);
            text += escape;
        }
    }
    text += '"';
}

// The fewest decimal digits that read back as the same value, however the file spells it. Wide integers stay.
std::string float_text(const char* spelled, bool is_single) {
    if (!std::strpbrk(spelled, ".eExXpP")) return spelled;
    char* end = nullptr;
    const double value = is_single ? static_cast<double>(std::strtof(spelled, &end)) : std::strtod(spelled, &end);
    if (*end || !std::isfinite(value)) return spelled;
    char digits[40];
    const std::to_chars_result done = is_single ? std::to_chars(digits, std::end(digits), static_cast<float>(value))
                                                : std::to_chars(digits, std::end(digits), value);
    std::string text(digits, done.ptr);
    if (text.find_first_of(".e") == std::string::npos) text += ".0";
    return text;
}

void PRINTER::leaf(const IC_NODE* t) {
    switch (t->op) {
    case LABEL: return label(t);
    case NAME: text += t->sym ? t->sym->name : "(no symbol)"; return;
    case SCON: return string_constant(t);
    case ICON: text += std::to_string(t->value); return;
    case FCON:
    case LCON: text += float_text(t->text, t->type && t->type->size == 32); return;
    case FIELD:
        text += t->member->name.empty() ? "(unnamed " + std::to_string(t->member->ordinal) + ")" : t->member->name;
        return;
    case VREG: text += "vreg" + std::to_string(t->vreg_id()); return;
    default: text += if_node_info[t->op].name;
    }
}

// The elements of a left-leaning list, first to last.
void PRINTER::list(const IC_NODE* t) {
    std::vector<const IC_NODE*> elements;
    for (; t && t->op == COMMA; t = t->left) elements.push_back(t->right);
    elements.push_back(t);
    for (size_t i = elements.size(); i-- > 0;) {
        expr(elements[i], prec_comma + 1);
        if (i) text += ", ";
    }
}

void PRINTER::call(const IC_NODE* t) {
    bool by_symbol = t->op == CALL || t->op == UCALL;
    if (!by_symbol)
        text += t->text;
    else if (t->left && t->left->op == UAND && t->left->left && t->left->left->op == NAME)
        leaf(t->left->left);
    else
        expr(t->left, prec_postfix);
    text += '(';
    const IC_NODE* arguments = by_symbol ? t->right : t->left;
    if (arguments) list(arguments);
    text += ')';
    if (by_symbol && t->number2) text += "{unwind " + std::to_string(t->number2) + "}";
    if (t->op == CALL && t->number) text += "{variable " + std::to_string(t->number) + "}";
}

void PRINTER::by_name(const IC_NODE* t) {
    text += if_node_info[t->op].name;
    switch (t->op) {
    case EPVAL:
    case SKIP: text += '{' + std::to_string(t->number) + '}'; break;
    case DDNODE:
        text += '{' + std::to_string(t->number) + ", locale " + std::to_string(t->number2) + ", flags " +
                std::to_string(t->ddnode_flags()) + '}';
        break;
    }
    text += '(';
    expr(t->left, prec_comma + 1);
    if (if_node_info[t->op].operand_count == 2) {
        text += ", ";
        expr(t->right, prec_comma + 1);
    }
    text += ')';
}

void PRINTER::switch_statement(const IC_NODE* t) {
    text += "switch (";
    expr(t->left, 0);
    text += ") {";
    std::vector<const IC_NODE*> arms;
    const IC_NODE* arm = t->right;
    for (; arm && arm->op == COMMA; arm = arm->left) arms.push_back(arm->right);
    arms.push_back(arm);
    for (size_t i = arms.size(); i-- > 0;) {
        const IC_NODE* a = arms[i];
        text += ' ';
        if (a && a->op == CASE) {
            text += "case ";
            expr(a->left, 0);
            text += ": ";
            label(a->right);
        } else if (a && a->op == DEFAULT) {
            text += "default: ";
            label(a->left);
        } else {
            expr(a, 0);
        }
        text += ';';
    }
    text += " }";
}

void PRINTER::statement(const IC_NODE* t) {
    switch (t->op) {
    case RETURN: text += "return "; return expr(t->right, 0);
    case URETURN: text += "return"; return;
    case BRANCH: text += "goto "; return label(t->left);
    case CBRANCH: { // the branch is taken when the condition is false
        const bool is_negated = t->left && t->left->op == EXCLAIM;
        text += is_negated ? "if (" : "if (!(";
        expr(is_negated ? t->left->left : t->left, 0);
        text += is_negated ? ") goto " : ")) goto ";
        return label(t->right);
    }
    case SWITCH: return switch_statement(t);
    default: expr(t, 0);
    }
}
} // namespace

std::string ic_expr_text(const IC_NODE* tree, const IC_PRINT_OPTIONS& options) {
    PRINTER printer(options);
    printer.statement(tree);
    return std::move(printer.text);
}
