// Calls of the standard library whose outcome is an operator, a number or a few assignments, and characters of
// literals. Of a function that the unit itself defines nothing is taken for known.

#include "OPT5/ir/funinfo.h"
#include "OPT5/simp/rule.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <cstring>

using namespace rules;

namespace {

constexpr uint64_t UNIT = 16;     // bits
constexpr int64_t MOST_PARTS = 2; // assignments in place of a call

// ---- Literals
struct TEXT {
    const NODE* literal = nullptr; // null for another address
    int64_t offset = 0;
};

// What an address of characters points into.
TEXT text_at(const NODE* p) {
    auto points_to_units = [](const NODE* n) {
        return n->type->is_pointer() && n->type->type_pointed_to()->size == UNIT;
    };
    if (!points_to_units(p)) return {};
    while ((p->op == PCONV || p->op == ISP2CHAR || p->op == ACONV) && points_to_units(p->left)) p = p->left;
    if (p->op == SCON) return {p, 0};
    if (p->op != PLUS || p->left->op != SCON || !is_icon(p->right)) return {};
    const INT65 offset = p->right->u.lval;
    if (offset.is_negative() || offset >= INT65(static_cast<int64_t>(p->left->scon_length()))) return {};
    return {p->left, static_cast<int64_t>(offset.value)};
}

unsigned character(const NODE* literal, int64_t at) { return static_cast<unsigned char>(literal->scon_value()[at]); }

// The length of the text up to its zero; -1 where it has none.
int64_t length_of(TEXT t) {
    const auto end = static_cast<int64_t>(t.literal->scon_length());
    for (int64_t i = t.offset; i < end; ++i)
        if (!character(t.literal, i)) return i - t.offset;
    return -1;
}

// "text"[c] as an operand that is a value, not a place.
void replace_character(NODE** link) {
    NODE* load = *link;
    if (!load || load->op != UMULT || load->right || !is_integer(load->type) || load->type->size != UNIT ||
        load->type->is_volatile())
        return;
    const TEXT text = text_at(load->left);
    if (!text.literal) return;
    NODE* c = mk_ICON(INT65(0), load->type->stqs());
    c->ls = load->ls;
    set_icon(c, INT65(character(text.literal, text.offset)));
    erase_tree(load);
    *link = c;
}

void replace_characters(NODE* t) {
    switch (t->op) {
    case SCONV:
    case SWITCH:
    case IF:
    case CBRANCH: replace_character(&t->left); return;
    case RETURN:
    case ASG: replace_character(&t->right); return;
    case PLUS:
    case MINUS:
    case MULT:
    case DIV:
    case MOD:
    case ANDB:
    case ORB:
    case XORB: break;
    default:
        if (!op_is_int_compare(t->op)) return;
    }
    replace_character(&t->left);
    replace_character(&t->right);
}

// ---- Objects that are filled and copied part by part: a variable of an integer type, or an array of such
struct PARTS {
    const NODE* name = nullptr; // null for what is no such object
    TYPE* part = nullptr;
    uint64_t units = 0; // of the object
};

PARTS parts_at(const NODE* p) {
    while ((p->op == PCONV || p->op == ISP2CHAR || p->op == ACONV) && p->left->type->is_pointer()) p = p->left;
    if (p->op != UAND || p->left->op != NAME || !p->left->u.sym || lvalue_is_volatile(p->left)) return {};
    TYPE* type = p->left->u.sym->type;
    TYPE* part = type->is_array() && !type->is_vector() ? type->elem_type() : type;
    if (!is_integer(part) || part->is_volatile() || part->size % UNIT != 0) return {};
    return {p->left, part->stqs(), type->size / UNIT};
}

NODE* part_of(const PARTS& o, int64_t i) {
    if (!o.name->u.sym->type->is_array()) return copy_tree(o.name);
    NODE* address = maketree(UAND, copy_tree(o.name), nullptr, tp->mk_ptr(o.part), o.name->ls);
    const int64_t offset = i * static_cast<int64_t>(o.part->size / UNIT);
    if (offset) address = maketree(PLUS, address, mk_ICON(INT65(offset), tp->int_t), address->type, o.name->ls);
    return maketree(UMULT, address, nullptr, o.part, o.name->ls);
}

// How many parts `units` are; 0 where they are none, too many, or more than the object has.
int64_t parts_in(const PARTS& o, const NODE* units) {
    if (!o.name || !is_icon(units) || units->u.lval.is_negative() || units->u.lval > INT65(o.units)) return 0;
    const uint64_t n = units->u.lval.value, each = o.part->size / UNIT;
    return n % each == 0 && n / each <= MOST_PARTS ? static_cast<int64_t>(n / each) : 0;
}

// The assignments, and the address that the call gives.
template <class F>
NODE* in_parts(NODE* call, NODE* to, const PARTS& o, int64_t count, const F& value) {
    NODE* all = nullptr;
    for (int64_t i = 0; i < count; ++i) all = mk_COMMAOP(all, mk_ASG(part_of(o, i), value(i)));
    all = mk_COMMAOP(all, coerce_to_type(call->type, copy_tree(to)));
    erase_tree(call);
    return all;
}

NODE* fill(NODE* call, NODE* to, const NODE* with, const NODE* units) {
    const PARTS o = parts_at(to);
    const int64_t count = parts_in(o, units);
    if (!count || !is_icon(with) || (o.part->size != UNIT && !with->u.lval.is_zero()) ||
        o.name->u.sym->type->is_const())
        return nullptr;
    const INT65 v = truncate_to_type(with->u.lval, o.part);
    return in_parts(call, to, o, count, [&](int64_t) { return mk_ICON(v, o.part); });
}

NODE* copy(NODE* call, NODE* to, const NODE* from, const NODE* units) {
    const PARTS o = parts_at(to), source = parts_at(from);
    const int64_t count = parts_in(o, units);
    if (!count || !source.name || !same_integers(o.part, source.part) || parts_in(source, units) != count ||
        o.name->u.sym == source.name->u.sym || o.name->u.sym->type->is_const())
        return nullptr;
    return in_parts(call, to, o, count, [&](int64_t i) { return part_of(source, i); });
}

// ---- Calls
const char* library_function(const NODE* call) {
    FUNINFO* f = find_FUNINFO_for_call(call);
    if (!f || !TEST_FLAG(f, FUN_is_SYSTEM)) return "";
    const char* name = f->name.c_str();
    return *name == '_' ? name + 1 : name;
}

NODE* absolute(NODE* call, TYPE* type) {
    NODE* x = call->right;
    if (!same_integers(x->type, type) || !same_integers(call->type, type)) return nullptr;
    erase_tree(call->left);
    return to_unary(call, ABS, x);
}

NODE* length(NODE* call) {
    const TEXT text = text_at(call->right);
    const int64_t n = text.literal ? length_of(text) : -1;
    TYPE* type = normalized_value_type(call->type);
    if (n < 0 || !is_integer(type)) return nullptr;
    NODE* c = mk_ICON(INT65(n), type->stqs());
    c->ls = call->ls;
    erase_tree(call);
    return c;
}

NODE* known_call(NODE* t) {
    const int n = arg_list_count(t->right);
    if (n != 1 && n != 3) return nullptr;
    const std::string name = library_function(t);
    if (n == 1) {
        if (name == "abs") return absolute(t, tp->int_t);
        if (name == "labs") return absolute(t, tp->long_t);
        if (name == "llabs") return absolute(t, tp->llong_t);
        return name == "strlen" ? length(t) : nullptr;
    }
    NODE *a = arg_list_lookup(t->right, 0), *b = arg_list_lookup(t->right, 1), *c = arg_list_lookup(t->right, 2);
    if (name == "memset") return fill(t, a, b, c);
    return name == "memcpy" || name == "memmove" ? copy(t, a, b, c) : nullptr;
}

} // namespace

void replace_library_calls(NODE** link) {
    for (; *link; link = &(*link)->left) {
        NODE* known = (*link)->op == CALL ? known_call(*link) : nullptr;
        if (known) *link = known;
        replace_characters(*link);
        if ((*link)->right) replace_library_calls(&(*link)->right);
    }
}
