// From the text of a row to the patterns that are matched: one for each order of its commutative operators and
// for each relation that a sign for several stands for.

#include "OPT5/simp/pattern_text.h"
#include "OPT5/simp/patterns.h"

#include "UTIL/abort.h"

#include <cctype>
#include <cstring>
#include <deque>
#include <set>
#include <string>

namespace rules {

namespace {

std::deque<TERM> terms; // kept for the run

const TERM* make(TERM t) {
    terms.push_back(t);
    return &terms.back();
}

struct SIGN {
    const char* text;
    int op, level;
};

constexpr int RELATION = 3, UNARY = 8;
constexpr SIGN signs[] = {{"==", EQ, RELATION},   {"!=", NEQ, RELATION}, {"<<", SLL, 5},      {">>", SRL, 5},
                          {"<=", LE, RELATION},   {">=", GE, RELATION},  {"<", LT, RELATION}, {">", GT, RELATION},
                          {"|", ORB, 0},          {"^", XORB, 1},        {"&", ANDB, 2},      {"+", PLUS, 6},
                          {"-", MINUS, 6},        {"*", MULT, 7},        {"/", DIV, 7},       {"%", MOD, 7},
                          {"#", ILLOP, RELATION}, {"@", ILLOP, RELATION}};

// `relation` stands for # and @.
class READER {
public:
    READER(const char* t, int r) : text(t), relation(r) {}

    const TERM* side() {
        const TERM* t = conditional();
        skip();
        if (!strncmp(text, "=>", 2)) text += 2;
        return t;
    }

private:
    void skip() {
        while (*text == ' ') ++text;
    }
    bool take(const char* word) {
        skip();
        const std::size_t n = strlen(word);
        if (strncmp(text, word, n) != 0) return false;
        text += n;
        return true;
    }
    static const TERM* node(int op, const TERM* left, const TERM* right = nullptr, bool flag = false) {
        TERM t;
        t.kind = TERM::OPERATOR;
        t.op = static_cast<short>(op);
        t.left = left;
        t.right = right;
        t.flag = flag;
        return make(t);
    }

    const TERM* conditional() {
        const TERM* c = binary(0);
        if (!take("?")) return c;
        TERM t;
        t.kind = TERM::OPERATOR;
        t.op = QUEST;
        t.left = c;
        t.right = binary(0);
        take(":");
        t.third = binary(0);
        return make(t);
    }

    const TERM* binary(int level) {
        const TERM* left = unary();
        for (;;) {
            skip();
            const SIGN* found = nullptr;
            for (const SIGN& s : signs)
                if (!found && !strncmp(text, s.text, strlen(s.text))) found = &s;
            if (!found || found->level < level || !strncmp(text, "=>", 2)) return left;
            text += strlen(found->text);
            const TERM* right = binary(found->level + 1);
            left = node(found->op == ILLOP ? relation : found->op, left, right);
        }
    }

    const TERM* unary() {
        if (take("~")) return node(NOTB, unary());
        if (take("!")) return node(EXCLAIM, unary());
        if (take("S(")) return inside(SCONV, false);
        if (take("U(")) return inside(SCONV, true);
        if (take("abs(")) return inside(ABS, false);
        if (take("min(")) return inside(ICALL, false);
        if (take("max(")) return inside(ICALL, true);
        if (take("(")) {
            const TERM* t = conditional();
            take(")");
            return t;
        }
        skip();
        if (*text == '-' && !std::isdigit(static_cast<unsigned char>(text[1]))) {
            ++text;
            return node(UMINUS, unary());
        }
        return leaf();
    }

    const TERM* inside(int op, bool flag) {
        const TERM *left = binary(0), *right = take(",") ? binary(0) : nullptr;
        take(")");
        return node(op, left, right, flag);
    }

    const TERM* leaf() {
        static const char operands[] = "xyzwb", constants[] = "cdenm";
        TERM t;
        if (take("top")) {
            t.kind = TERM::TOP;
        } else if (take("half")) {
            t.kind = TERM::HALF;
        } else if (std::isdigit(static_cast<unsigned char>(*text)) || *text == '-') {
            char* end;
            t.number = strtol(text, &end, 10);
            text = end;
        } else {
            const char letter = *text++;
            const char *o = strchr(operands, letter), *c = strchr(constants, letter);
            if (!letter || (!o && !c)) abort_optimizer();
            t.kind = o ? TERM::OPERAND : TERM::CONSTANT;
            t.slot = static_cast<uint8_t>(o ? o - operands : c - constants);
        }
        return make(t);
    }

    const char* text;
    int relation;
};

// ---- Orders
bool is_number(const TERM* t) { return t->kind != TERM::OPERAND && t->kind != TERM::OPERATOR; }

int mirror_of(const TERM* t) {
    switch (t->op) {
    case PLUS:
    case MULT:
    case ANDB:
    case ORB:
    case XORB:
    case ICALL: return t->op;
    default: return op_is_int_compare(t->op) ? int{commute_inv[t->op]} : int{ILLOP};
    }
}

std::vector<const TERM*> orders_of(const TERM* t) {
    if (t->kind != TERM::OPERATOR) return {t};
    std::vector<const TERM*> out;
    const int mirror = mirror_of(t);
    auto add = [&](int op, const TERM* l, const TERM* r, const TERM* third) {
        TERM n = *t;
        n.op = static_cast<short>(op);
        n.left = l;
        n.right = r;
        n.third = third;
        out.push_back(make(n));
    };
    for (const TERM* l : orders_of(t->left)) {
        if (!t->right) {
            add(t->op, l, nullptr, nullptr);
            continue;
        }
        for (const TERM* r : orders_of(t->right)) {
            if (!t->third) {
                if (mirror == ILLOP || !is_number(l) || is_number(r)) add(t->op, l, r, nullptr);
                if (mirror != ILLOP && !is_number(r)) add(mirror, r, l, nullptr);
                continue;
            }
            for (const TERM* third : orders_of(t->third)) add(t->op, l, r, third);
        }
    }
    return out;
}

// The same text of two orders that differ in the names of their operands only.
void write(const TERM* t, std::string* names, std::string* out) {
    if (!t) return;
    if (t->kind == TERM::OPERAND) {
        std::size_t n = names->find(static_cast<char>(t->slot));
        if (n == std::string::npos) {
            n = names->size();
            *names += static_cast<char>(t->slot);
        }
        *out += 'x';
        *out += static_cast<char>('0' + n);
        return;
    }
    *out += '(' + std::to_string(t->kind) + ',' + std::to_string(t->slot) + ',' + std::to_string(t->op) + ',' +
            std::to_string(t->number) + (t->flag ? "!" : "");
    for (const TERM* operand : {t->left, t->right, t->third}) write(operand, names, out);
    *out += ')';
}

} // namespace

std::vector<TERM_PAIR> orders_of_row(const char* text) {
    std::set<std::string> seen;
    std::vector<int> relations{ILLOP};
    if (strchr(text, '#')) relations = {EQ, NEQ};
    if (strchr(text, '@')) relations = {EQ, NEQ, LE, LT, GE, GT};
    std::vector<TERM_PAIR> out;
    for (int relation : relations) {
        READER reader(text, relation);
        const TERM *left = reader.side(), *right = reader.side();
        for (const TERM* order : orders_of(left)) {
            std::string names, written;
            write(order, &names, &written);
            if (seen.insert(written).second) out.push_back({order, right});
        }
    }
    return out;
}

} // namespace rules
