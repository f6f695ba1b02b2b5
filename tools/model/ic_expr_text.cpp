// Expressions and statements in infix form.
//
// Operators that C has are written as in C, with the parentheses that C would need; the others as calls by their names.
#include "tools/model/ic_print.h"

namespace {
enum : int { prec_comma = 1, prec_assign = 2, prec_quest = 3, prec_unary = 14, prec_postfix = 15, prec_leaf = 99 };

struct BINARY {
    int op;
    const char* text;
    int prec;
};
const BINARY binaries[] = {
    {6, "+", 12},       {7, "+=", 2},       {8, "-", 12},    {9, "-=", 2},     {11, "*", 13},   {12, "*=", 2},
    {14, "&", 8},       {15, "&=", 2},      {17, "|", 6},    {18, "|=", 2},    {19, "^", 7},    {20, "^=", 2},
    {23, "&&", 5},      {24, "||", 4},      {56, ",", 1},    {57, ",", 1},     {58, "=", 2},    {59, ",", 1},
    {60, "/", 13},      {61, "/=", 2},      {62, "%", 13},   {63, "%=", 2},    {64, "<<", 11},  {65, "<<=", 2},
    {66, ">>", 11},     {67, ">>=", 2},     {80, "==", 9},   {81, "!=", 9},    {82, "<=", 10},  {83, "<", 10},
    {84, ">=", 10},     {85, ">", 10},      {86, "<=u", 10}, {87, "<u", 10},   {88, ">=u", 10}, {89, ">u", 10},
    {98, "=struct", 2}, {103, "=array", 2}, {143, "==f", 9}, {145, "<=f", 10}, {146, "<f", 10}, {147, ">=f", 10},
    {148, ">f", 10},    {150, "!=f", 9},
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
    case 10: return "-";
    case 13: return "*";
    case 16: return "&";
    case 76: return "!";
    case 77: return "~";
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
        if (t && t->op == 1) {
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
    case 21: return prec_quest;
    case 104:
    case 105: return prec_unary;
    case 68:
    case 69:
    case 70:
    case 72: return prec_postfix;
    }
    return prec_leaf;
}

void PRINTER::expr(const IC_NODE* t, int outer) {
    if (!t) {
        text += "(nothing)";
        return;
    }
    bool show_type = options_m.types && t->op != 1 && t->op != 2 && t->op != 26 && t->op != 56 && t->op != 112;
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
    case 21: // QUEST over COLON
        if (!t->right || t->right->op != 22) break;
        expr(t->left, prec_quest + 1);
        text += " ? ";
        expr(t->right->left, prec_quest + 1);
        text += " : ";
        return expr(t->right->right, prec_quest);
    case 104:
    case 105:
        text += '(';
        type_of(t);
        text += ')';
        return expr(t->left, prec_unary);
    case 68:
    case 69:
        expr(t->left, prec_postfix);
        text += t->op == 68 ? "." : "->";
        return expr(t->right, prec_postfix);
    case 70:
    case 72:
    case 129:
    case 130:
    case 132:
    case 133: return call(t);
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

void PRINTER::leaf(const IC_NODE* t) {
    switch (t->op) {
    case 1: return label(t);
    case 2: text += t->sym ? t->sym->name : "(no symbol)"; return;
    case 3: return string_constant(t);
    case 4: text += std::to_string(t->value); return;
    case 5:
    case 25: text += t->text; return;
    case 26:
        text += t->member->name.empty() ? "(unnamed " + std::to_string(t->member->ordinal) + ")" : t->member->name;
        return;
    case 163: text += "vreg" + std::to_string(t->vreg_id()); return;
    default: text += if_node_info[t->op].name;
    }
}

// The elements of a left-leaning list, first to last.
void PRINTER::list(const IC_NODE* t) {
    std::vector<const IC_NODE*> elements;
    for (; t && t->op == 56; t = t->left) elements.push_back(t->right);
    elements.push_back(t);
    for (size_t i = elements.size(); i-- > 0;) {
        expr(elements[i], prec_comma + 1);
        if (i) text += ", ";
    }
}

void PRINTER::call(const IC_NODE* t) {
    bool by_symbol = t->op == 70 || t->op == 72;
    if (!by_symbol)
        text += t->text;
    else if (t->left && t->left->op == 16 && t->left->left && t->left->left->op == 2)
        leaf(t->left->left);
    else
        expr(t->left, prec_postfix);
    text += '(';
    const IC_NODE* arguments = by_symbol ? t->right : t->left;
    if (arguments) list(arguments);
    text += ')';
    if (by_symbol && t->number2) text += "{unwind " + std::to_string(t->number2) + "}";
    if (t->op == 70 && t->number) text += "{variable " + std::to_string(t->number) + "}";
}

void PRINTER::by_name(const IC_NODE* t) {
    text += if_node_info[t->op].name;
    switch (t->op) {
    case 110:
    case 115: text += '{' + std::to_string(t->number) + '}'; break;
    case 119:
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
    for (; arm && arm->op == 56; arm = arm->left) arms.push_back(arm->right);
    arms.push_back(arm);
    for (size_t i = arms.size(); i-- > 0;) {
        const IC_NODE* a = arms[i];
        text += ' ';
        if (a && a->op == 47) {
            text += "case ";
            expr(a->left, 0);
            text += ": ";
            label(a->right);
        } else if (a && a->op == 46) {
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
    case 36: text += "return "; return expr(t->right, 0);
    case 118: text += "return"; return;
    case 114: text += "goto "; return label(t->left);
    case 109: // the branch is taken when the condition is false
        text += "if (!(";
        expr(t->left, 0);
        text += ")) goto ";
        return label(t->right);
    case 40: return switch_statement(t);
    default: expr(t, 0);
    }
}
} // namespace

std::string ic_expr_text(const IC_NODE* tree, const IC_PRINT_OPTIONS& options) {
    PRINTER printer(options);
    printer.statement(tree);
    return std::move(printer.text);
}
