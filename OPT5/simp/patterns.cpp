// The matcher of patterns.def: finds the rows that apply to a node and builds their right sides.

#include "OPT5/simp/patterns.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/simp/algebra.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/minmax.h"
#include "OPT5/simp/pattern_text.h"
#include "OPT5/simp/simp.h"

#include <array>

namespace rules {

uint64_t* pattern_hits = nullptr;

namespace {

// ---- Conditions of the rows
uint64_t bits(const FOUND& f, int slot) { return f.constant[slot].value & mask_of(f.type); }
int width(const FOUND& f) { return static_cast<int>(f.type->size); }
int log2_of_bits(uint64_t v) { return power_of_2(INT65(0, v)); }

bool always(FOUND&) { return true; }
bool is_signed_type(FOUND& f) { return is_signed(f.type); }
bool is_unsigned_type(FOUND& f) { return !is_signed(f.type); }
bool constant_less_one_fits(FOUND& f) { return fits_or_wraps(f.constant[FOUND::C] - INT65(1), f.type); }
bool constant_and_one_fits(FOUND& f) { return fits_or_wraps(f.constant[FOUND::C] + INT65(1), f.type); }
bool negative_fits(FOUND& f) { return fits_or_wraps(-f.constant[FOUND::C], f.type); }
bool masks_are_disjoint(FOUND& f) { return !(bits(f, FOUND::C) & bits(f, FOUND::D)); }
bool second_count_is_greater(FOUND& f) { return f.constant[FOUND::E] > f.constant[FOUND::C]; }
bool second_count_is_less(FOUND& f) { return f.constant[FOUND::E] < f.constant[FOUND::C]; }
bool factor_undoes_shift(FOUND& f) { return INT65(log2_of_bits(bits(f, FOUND::E))) == f.constant[FOUND::C]; }
bool is_truth_value(FOUND& f) { return returns_1_or_0(*f.operand[FOUND::B]); }
bool difference_is_exact(FOUND& f) {
    return is_signed(f.type) &&
           signed_result_is_exact(MINUS, *f.operand[FOUND::X], *f.operand[FOUND::Y], f.type, f.loop);
}
bool is_greatest_signed(FOUND& f) { return !is_signed(f.type) && bits(f, FOUND::C) == mask_of(f.type) >> 1; }

// c is a mask of low bits, d the highest of them: n is the number of the bits above.
bool is_field_with_sign(FOUND& f) {
    const uint64_t mask = bits(f, FOUND::C), sign = bits(f, FOUND::D);
    const int k = log2_of_bits(mask + 1);
    f.constant[FOUND::N] = INT65(width(f) - k);
    return k > 0 && k < width(f) && sign == (mask + 1) >> 1;
}
bool extends_field(FOUND& f) {
    return is_signed(f.type) && is_field_with_sign(f) && f.constant[FOUND::E] == -f.constant[FOUND::D];
}
bool extends_unsigned_field(FOUND& f) { return !is_signed(f.type) && is_field_with_sign(f); }

// A mask d that no bit of is lost when it is moved up by c, nor one of the number e.
bool lies_in_place(const FOUND& f, uint64_t room) {
    const auto c = static_cast<unsigned>(f.constant[FOUND::C].value);
    const uint64_t mask = bits(f, FOUND::D), number = bits(f, FOUND::E);
    return ((mask | number) & ~(room >> c)) == 0;
}
bool field_fits_in_place(FOUND& f) { return lies_in_place(f, mask_of(f.type)); }
bool positive_field_fits_in_place(FOUND& f) {
    return lies_in_place(f, is_signed(f.type) ? mask_of(f.type) >> 1 : mask_of(f.type));
}

bool clears_low_bits(FOUND& f) {
    const int k = log2_of_bits(-bits(f, FOUND::C) & mask_of(f.type));
    return k > 0 && k < width(f) - 1;
}

// ---- Rows
struct ROW {
    const char* text;
    bool (*condition)(FOUND& found);
    bool keeps_number;
};

constexpr ROW rows[] = {
#define PATTERN(text, condition) {text, condition, false},
#define SAME_NUMBER(text, condition) {text, condition, true},
#include "OPT5/simp/patterns.def"
#undef PATTERN
#undef SAME_NUMBER
};

std::vector<PATTERN> patterns;

// ---- Which patterns a node may match: by the kinds of the node and of its operands
constexpr int KINDS = 32, OTHER = 0;

int kind_of(int op) {
    switch (op) {
    case ICON: return 1;
    case PLUS: return 2;
    case MINUS: return 3;
    case MULT: return 4;
    case DIV: return 5;
    case MOD: return 6;
    case ANDB: return 7;
    case ORB: return 8;
    case XORB: return 9;
    case NOTB: return 10;
    case UMINUS: return 11;
    case SLL: return 12;
    case SRL: return 13;
    case SCONV: return 14;
    case QUEST: return 15;
    case ICALL: return 16;
    case EQ: return 17;
    case NEQ: return 18;
    case LE:
    case ULE: return 19;
    case LT:
    case ULT: return 20;
    case GE:
    case UGE: return 21;
    case GT:
    case UGT: return 22;
    case ABS: return 23;
    default: return OTHER;
    }
}

std::array<uint8_t, NO_OPCODES> kinds;
std::array<std::array<uint32_t, KINDS>, KINDS> may_match;            // of a node and its left operand: the right ones
std::array<std::array<std::vector<short>, KINDS>, KINDS> candidates; // of a node and its left operand

uint32_t kinds_of_term(const TERM* t) {
    if (!t) return 1u << OTHER;
    if (t->kind == TERM::OPERAND) return ~0u;
    return 1u << (t->kind == TERM::OPERATOR ? kind_of(t->op) : kind_of(ICON));
}

void enter(int pattern) {
    PATTERN& p = patterns[static_cast<std::size_t>(pattern)];
    const TERM* t = p.left;
    const uint32_t left = kinds_of_term(t->left);
    p.right_kinds = kinds_of_term(t->right);
    const auto root = static_cast<std::size_t>(kind_of(t->op));
    for (std::size_t k = 0; k < KINDS; ++k) {
        if (!(left >> k & 1)) continue;
        may_match[root][k] |= p.right_kinds;
        candidates[root][k].push_back(static_cast<short>(pattern));
    }
}

// ---- Operands on both sides
void operands_in_order(const TERM* t, std::vector<int>* out) {
    if (!t) return;
    if (t->kind == TERM::OPERAND) out->push_back(t->slot);
    for (const TERM* operand : {t->left, t->right, t->third}) operands_in_order(operand, out);
}

// Counts of the operands, and which of them must have no effects.
void count_operands(PATTERN* p) {
    std::vector<int> left, right;
    operands_in_order(p->left, &left);
    operands_in_order(p->right, &right);
    for (int slot : left) ++p->on_left[slot];
    for (int slot : right) ++p->on_right[slot];
    for (int slot = 0; slot < FOUND::OPERANDS; ++slot) {
        if (p->on_left[slot] != 1) continue; // equal values have none
        const bool stays =
            p->on_right[slot] == 1 && p->left->op != QUEST &&
            ((left.front() == slot && right.front() == slot) || (left.back() == slot && right.back() == slot));
        p->must_be_pure[slot] = !stays;
    }
}

// ---- Matching
bool is_order(int op) { return op >= LE && op <= UGT; }

class MATCHER {
public:
    MATCHER(const PATTERN& pattern, FOUND& f) : p(pattern), found(f) {}

    // `type` null: of any integer type.
    bool match(const TERM* t, NODE** link, const TYPE* type) {
        NODE* n = *link;
        switch (t->kind) {
        case TERM::OPERAND: return operand(t->slot, link, type);
        case TERM::CONSTANT: return has_type(n, type) && constant(t->slot, n);
        case TERM::NUMBER:
            return is_icon(n) && has_type(n, type) &&
                   bits_of(n) == (static_cast<uint64_t>(t->number) & mask_of(n->type));
        case TERM::TOP: return false; // of a count alone
        case TERM::HALF: return is_icon(n) && has_type(n, type) && bits_of(n) == sign_bit(n->type);
        default: return kind_of(t->op) == kinds[static_cast<std::size_t>(n->op)] && operation(t, n, type);
        }
    }

private:
    static bool has_type(const NODE* n, const TYPE* type) {
        return type ? same_integers(n->type, type) : is_integer(n->type);
    }

    bool operand(int slot, NODE** link, const TYPE* type) {
        NODE* n = *link;
        if (slot != FOUND::B && !has_type(n, type)) return false;
        if (found.operand[slot]) {
            const NODE* bound = *found.operand[slot];
            return same_value(bound, n) && same_integers(bound->type, n->type);
        }
        if (p.on_left[slot] > 1 && n->op == ICON) return false;
        found.operand[slot] = link;
        return true;
    }

    bool constant(int slot, const NODE* n) {
        if (!is_icon(n)) return false;
        if (bound_constants >> slot & 1) return found.constant[slot] == n->u.lval;
        bound_constants |= 1u << slot;
        found.constant[slot] = n->u.lval;
        return true;
    }

    bool operation(const TERM* t, NODE* n, const TYPE* type) {
        if (!has_type(n, type)) return false;
        switch (t->op) {
        case SLL:
        case SRL: return shift(t, n);
        case SCONV: return cast(t, n);
        case QUEST: return choice(t, n);
        case ICALL: return extremum(t, n);
        case NOTB:
        case ABS:
        case UMINUS: return operand_has_type(n) && match(t->left, &n->left, n->type);
        default:
            if (op_is_int_compare(t->op)) return compare(t, n);
            return operands_have_type(n) && match(t->left, &n->left, n->type) && match(t->right, &n->right, n->type);
        }
    }

    bool shift(const TERM* t, NODE* n) {
        if (!operand_has_type(n)) return false;
        if (t->right->kind == TERM::TOP && !is_icon(n->right, INT65(static_cast<long>(n->type->size) - 1)))
            return false;
        if (t->right->kind == TERM::CONSTANT && !shift_count_of(n)) return false;
        return match(t->left, &n->left, n->type) &&
               (t->right->kind == TERM::TOP || match(t->right, &n->right, nullptr));
    }

    bool cast(const TERM* t, NODE* n) {
        const TYPE* from = n->left->type;
        return is_integer(from) && from->size == n->type->size && is_signed(from) == t->flag &&
               is_signed(n->type) != t->flag && !is_bitfield_access(n->left) && match(t->left, &n->left, from);
    }

    bool choice(const TERM* t, NODE* n) {
        NODE* arms = n->right;
        return arms->op == COLON && match(t->left, &n->left, nullptr) && match(t->right, &arms->left, n->type) &&
               match(t->third, &arms->right, n->type);
    }

    bool extremum(const TERM* t, NODE* n) {
        const EXTREMUM e = extremum_of(n);
        return e.a && e.maximum == t->flag && match(t->left, &n->left->left, n->type) &&
               match(t->right, &n->left->right, n->type);
    }

    bool compare(const TERM* t, NODE* n) {
        const TYPE* type = n->left->type;
        if (!same_integers(type, n->right->type) || type->size < tp->int_t->size) return false;
        if (is_order(n->op) && (n->op >= ULE) != type->is_unsigned()) return false;
        return match(t->left, &n->left, type) && match(t->right, &n->right, type);
    }

    const PATTERN& p;
    FOUND& found;
    unsigned bound_constants = 0;
};

// ---- Building
TYPE* signed_type_for(TYPE* t) {
    return is_signed(t)                  ? t
           : t->size == tp->int_t->size  ? tp->int_t
           : t->size == tp->long_t->size ? tp->long_t
                                         : tp->llong_t;
}

class BUILDER {
public:
    BUILDER(const PATTERN& pattern, const FOUND& f) : p(pattern), found(f), uses(pattern.on_right) {}

    // In the type that the side computes in.
    NODE* build(const TERM* side) {
        TYPE* type = type_of(side);
        return build(side, type ? type : found.type);
    }

private:
    NODE* build(const TERM* t, TYPE* type) {
        switch (t->kind) {
        case TERM::OPERAND: return coerced(type, operand(t->slot), found.loop);
        case TERM::CONSTANT: return number(found.constant[t->slot], type);
        case TERM::NUMBER: return number(INT65(t->number), type);
        case TERM::TOP: return number(INT65(static_cast<long>(found.type->size) - 1), type);
        case TERM::HALF: return number(INT65(0, sign_bit(type)), type);
        default: return operation(t, type);
        }
    }

    static NODE* number(INT65 v, TYPE* type) {
        NODE* t = mk_ICON(INT65(0), type->stqs());
        set_icon(t, v);
        return t;
    }

    // The last one of its uses on this side takes the operand out of the tree.
    NODE* operand(int slot) {
        NODE** link = found.operand[slot];
        if (--uses[static_cast<std::size_t>(slot)] > 0) return copy_tree(*link);
        NODE* n = *link;
        *link = mk_ICON(INT65(0), tp->int_t);
        return n;
    }

    // The type that a term computes in; null for a number, which takes that of what stands beside it.
    TYPE* type_of(const TERM* t) const {
        if (t->kind == TERM::OPERAND) return (*found.operand[t->slot])->type->stqs();
        if (t->kind != TERM::OPERATOR) return nullptr;
        if (op_is_int_compare(t->op) || t->op == EXCLAIM) return tp->int_t;
        TYPE* type = type_of(t->op == QUEST ? t->right : t->left);
        if (!type && t->right) type = type_of(t->right);
        if (t->op == SCONV && type) return t->flag ? tp->mk_unsigned(signed_type_for(type)) : signed_type_for(type);
        return type;
    }

    NODE* operation(const TERM* t, TYPE* type) {
        switch (t->op) {
        case SLL:
        case SRL: {
            NODE* x = build(t->left, type);
            return made(t->op, x, build(t->right, tp->int_t), type, found.loop);
        }
        case SCONV: {
            TYPE *from = type_of(t->left), *to = type_of(t);
            return coerced(type, coerced(to, build(t->left, from), found.loop), found.loop);
        }
        case EXCLAIM:
            return coerced(type, simp_node(invert_boolean_tree(operand(t->left->slot)), found.loop), found.loop);
        case ICALL: {
            NODE* a = build(t->left, type);
            return extremum_call(t->flag, a, build(t->right, type), type, found.loop);
        }
        case NOTB:
        case ABS: return made(t->op, build(t->left, type), nullptr, type, found.loop);
        default: return op_is_int_compare(t->op) ? compare(t, type) : arithmetic(t, type);
        }
    }

    NODE* arithmetic(const TERM* t, TYPE* type) {
        NODE* a = build(t->left, type);
        NODE* b = t->right ? build(t->right, type) : nullptr;
        return p.keeps_number ? made(t->op, a, b, type, found.loop) : made_exact(t->op, a, b, type, found.loop);
    }

    NODE* compare(const TERM* t, TYPE* type) {
        TYPE* of = type_of(t->left);
        if (!of) of = type_of(t->right);
        NODE* a = build(t->left, of);
        NODE* b = build(t->right, of);
        const int op = is_order(t->op) && of->is_unsigned() ? t->op + (ULE - LE) : t->op;
        return coerced(type, made(op, a, b, tp->int_t, found.loop), found.loop);
    }

    const PATTERN& p;
    const FOUND& found;
    std::array<int, FOUND::OPERANDS> uses;
};

bool has_types(const PATTERN& p, const FOUND& f) {
    if (p.right->op == ICALL && p.right->kind == TERM::OPERATOR && !has_extremum(p.right->flag, f.type)) return false;
    for (int slot = 0; slot < FOUND::OPERANDS; ++slot)
        if (p.must_be_pure[slot] && !is_pure(*f.operand[slot])) return false;
    return true;
}

NODE* rewritten(const PATTERN& p, NODE* t, struct LOOP* loop) {
    FOUND found;
    found.type = op_is_int_compare(t->op) ? t->left->type->stqs() : t->type->stqs();
    found.loop = loop;
    NODE* root = t;
    if (!MATCHER(p, found).match(p.left, &root, nullptr)) return nullptr;
    if (!rows[p.row].condition(found) || !has_types(p, found) || !rewrite_is_allowed(t)) return nullptr;
    if (pattern_hits) __atomic_fetch_add(&pattern_hits[p.row], 1, __ATOMIC_RELAXED);
    TYPE* type = t->type;
    NODE* r = BUILDER(p, found).build(p.right);
    erase_tree(t);
    return coerced(type, r, loop);
}

} // namespace

void compile_patterns() {
    if (!patterns.empty()) return;
    for (int op = 0; op < NO_OPCODES; ++op) kinds[static_cast<std::size_t>(op)] = static_cast<uint8_t>(kind_of(op));
    for (std::size_t row = 0; row < std::size(rows); ++row)
        for (const TERM_PAIR& sides : orders_of_row(rows[row].text)) {
            PATTERN p;
            p.row = static_cast<int>(row);
            p.left = sides.first;
            p.right = sides.second;
            p.keeps_number = rows[row].keeps_number;
            count_operands(&p);
            patterns.push_back(p);
        }
    for (std::size_t i = 0; i < patterns.size(); ++i) enter(static_cast<int>(i));
}

NODE* by_pattern(NODE* t, struct LOOP* loop) {
    const std::size_t root = kinds[static_cast<std::size_t>(t->op)],
                      left = kinds[static_cast<std::size_t>(t->left->op)];
    const NODE* r = t->op == QUEST ? t->right->left : t->right;
    const int right = r ? kinds[static_cast<std::size_t>(r->op)] : OTHER;
    if (!(may_match[root][left] >> right & 1)) return nullptr;
    for (short i : candidates[root][left]) {
        const PATTERN& p = patterns[static_cast<std::size_t>(i)];
        if (!(p.right_kinds >> right & 1)) continue;
        if (NODE* result = rewritten(p, t, loop)) return result;
    }
    return nullptr;
}

int pattern_rows() { return static_cast<int>(std::size(rows)); }
const char* pattern_row_text(int row) { return rows[row].text; }
const std::vector<PATTERN>& all_patterns() { return patterns; }

} // namespace rules
