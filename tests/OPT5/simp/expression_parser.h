// C expressions as trees: what a table of rewrites is written in.
//
// Variables go by name: x y z int, u v w unsigned, l m long, k n unsigned long, q r long long, t unsigned long long,
// b c bool, h float, d e double, p int*, o int*, s a structure { int a; unsigned bits : 3; long b; }, i j volatile int.
// f and g are functions that return int, F one that returns double. ABS(e), SQR(e), SQRT(e)
// and RECIP(e) are the operators of these names.
#pragma once

#include "../ir/tree_builder.h"

#include <cctype>
#include <cstdlib>
#include <map>

namespace test_trees {

class EXPRESSION_PARSER {
public:
    EXPRESSION_PARSER() {
        TYPE* volatile_int = tp->mk_qual(tp->int_t, QUAL_VOLATILE);
        declare("xyz", tp->int_t);
        declare("uvw", tp->uint_t);
        declare("lm", tp->long_t);
        declare("kn", tp->ulong_t);
        declare("qr", tp->llong_t);
        declare("t", tp->ullong_t);
        declare("bc", tp->bool_t);
        declare("h", tp->float_t);
        declare("de", tp->ldouble_t);
        declare("po", tp->mk_ptr(tp->int_t));
        declare("s", sample_struct());
        declare("ij", volatile_int);
    }

    // Null, with a message, for what is no expression.
    NODE* parse(const std::string& source) {
        text = source;
        at = 0;
        NODE* e = comma();
        skip();
        if (at == text.size()) return insert_mandatory_casts(e);
        ADD_FAILURE() << "not understood behind \"" << text.substr(0, at) << "\"";
        return nullptr;
    }

private:
    void declare(const char* names, TYPE* type) {
        for (; *names; ++names) variables[*names] = symbol(std::string(1, *names).c_str(), type);
    }
    void skip() {
        while (at < text.size() && text[at] == ' ') ++at;
    }
    bool take(const std::string& word) {
        skip();
        if (text.compare(at, word.size(), word)) return false;
        at += word.size();
        return true;
    }

    NODE* comma() {
        NODE* left = assignment();
        while (take(",")) {
            NODE* right = assignment();
            left = maketree(COMMAOP, left, right, right->type);
        }
        return left;
    }

    NODE* assignment() {
        static const std::pair<const char*, int> ops[] = {
            {"<<=", SLLASG}, {">>=", SRLASG}, {"+=", PLUSASG}, {"-=", MINUSASG}, {"*=", MULTASG},
            {"/=", DIVASG},  {"%=", MODASG},  {"&=", ANDBASG}, {"|=", ORBASG},   {"^=", XORBASG}};
        NODE* left = conditional();
        skip();
        for (auto& op : ops)
            if (take(op.first)) return maketree(op.second, left, assignment(), left->type);
        if (at < text.size() && text[at] == '=' && text.compare(at, 2, "==")) {
            ++at;
            return maketree(ASG, left, assignment(), left->type);
        }
        return left;
    }

    NODE* conditional() {
        NODE* c = binary(0);
        if (!take("?")) return c;
        NODE* a = comma();
        take(":");
        NODE* b = conditional();
        TYPE* type = a->type->is_arithmetic() ? combined_type(a, b) : a->type;
        return maketree(QUEST, c, maketree(COLON, a, b, type), type);
    }

    NODE* binary(int level) {
        struct OPERATOR {
            const char* sign;
            int op, level;
        };
        static const OPERATOR operators[] = {
            {"||", OROR, 0}, {"&&", ANDAND, 1}, {"==", EQ, 5},   {"!=", NEQ, 5}, {"<<", SLL, 7}, {">>", SRL, 7},
            {"<=", LE, 6},   {">=", GE, 6},     {"<", LT, 6},    {">", GT, 6},   {"|", ORB, 2},  {"^", XORB, 3},
            {"&", ANDB, 4},  {"+", PLUS, 8},    {"-", MINUS, 8}, {"*", MULT, 9}, {"/", DIV, 9},  {"%", MOD, 9}};
        NODE* left = unary();
        for (;;) {
            skip();
            const OPERATOR* found = nullptr;
            for (const OPERATOR& o : operators) {
                const std::string sign = o.sign;
                const char after = at + sign.size() < text.size() ? text[at + sign.size()] : ' ';
                const bool is_assignment = after == '=' && o.level != 5 && o.level != 6;
                if (!found && !text.compare(at, sign.size(), sign) && !is_assignment) found = &o;
            }
            if (!found || found->level < level) return left;
            at += std::string(found->sign).size();
            NODE* right = binary(found->level + 1);
            left = maketree(found->op, left, right,
                            operator_type_for_operand_types(found->op, left->type, right->type, nullptr, nullptr));
        }
    }

    TYPE* type_name() {
        static const std::pair<const char*, TYPE*> names[] = {{"unsigned long long)", tp->ullong_t},
                                                              {"unsigned long)", tp->ulong_t},
                                                              {"long long)", tp->llong_t},
                                                              {"long)", tp->long_t},
                                                              {"unsigned)", tp->uint_t},
                                                              {"int)", tp->int_t},
                                                              {"bool)", tp->bool_t},
                                                              {"float)", tp->float_t},
                                                              {"double)", tp->ldouble_t},
                                                              {"long*)", tp->mk_ptr(tp->long_t)},
                                                              {"int*)", tp->mk_ptr(tp->int_t)}};
        const std::size_t start = at;
        if (!take("(")) return nullptr;
        for (auto& n : names)
            if (take(n.first)) return n.second;
        at = start;
        return nullptr;
    }

    NODE* unary() {
        skip();
        if (TYPE* type = type_name()) {
            NODE* e = unary();
            return maketree(type->is_pointer() ? PCONV : SCONV, e, nullptr, type);
        }
        if (take("-")) return typed(UMINUS, unary());
        if (take("~")) return typed(NOTB, unary());
        if (take("!")) return mk_EXCLAIM(unary());
        if (take("*")) return deref(unary());
        if (text.compare(at, 2, "&&") && take("&")) return address(unary());
        return postfix(primary());
    }
    static NODE* typed(int op, NODE* e) {
        return un(op, e, operator_type_for_operand_types(op, e->type, nullptr, nullptr, nullptr));
    }

    NODE* postfix(NODE* e) {
        for (;;) {
            const bool arrow = take("->");
            if (!arrow && !(at < text.size() && text[at] == '.' && take("."))) return e;
            const int n = take("bits") ? 1 : take("a") ? 0 : (take("b"), 2);
            e = member(e, sample_member(n), arrow ? STREF : STDOT);
        }
    }

    NODE* primary() {
        skip();
        if (take("(")) {
            NODE* e = comma();
            take(")");
            return e;
        }
        static const std::pair<const char*, int> functions[] = {
            {"ABS(", ABS}, {"SQR(", SQR}, {"RECIP(", RECIP}, {"SQRT(", SQRT}};
        for (auto& f : functions)
            if (take(f.first)) {
                NODE* e = comma();
                take(")");
                return typed(f.second, e);
            }
        for (const char* f : {"f()", "g()"})
            if (take(f)) return call(std::string(1, *f).c_str(), tp->int_t);
        if (take("F()")) return call("F", tp->ldouble_t);
        if (at < text.size() && std::isdigit(static_cast<unsigned char>(text[at]))) return number();
        if (at < text.size() && variables.count(text[at])) return name(variables[text[at++]]);
        ADD_FAILURE() << "no operand behind \"" << text.substr(0, at) << "\" of \"" << text << "\"";
        ++at;
        return icon(0);
    }

    NODE* number() {
        std::size_t end = at;
        while (end < text.size() && (std::isalnum(static_cast<unsigned char>(text[end])) || text[end] == '.')) ++end;
        const std::string digits = text.substr(at, end - at);
        at = end;
        if (digits.find('.') != std::string::npos) {
            const bool is_float = digits.back() == 'f';
            return fcon((is_float ? digits.substr(0, digits.size() - 1) : digits).c_str(),
                        is_float ? tp->float_t : tp->ldouble_t);
        }
        char* suffix = nullptr;
        const unsigned long long v = strtoull(digits.c_str(), &suffix, 0);
        const std::string s = suffix;
        TYPE* type = s == "u"     ? tp->uint_t
                     : s == "L"   ? tp->long_t
                     : s == "uL"  ? tp->ulong_t
                     : s == "LL"  ? tp->llong_t
                     : s == "uLL" ? tp->ullong_t
                                  : tp->int_t;
        return mk_ICON(INT65(0, v), type);
    }

    std::map<char, SYMTAB*> variables;
    std::string text;
    std::size_t at = 0;
};

} // namespace test_trees
