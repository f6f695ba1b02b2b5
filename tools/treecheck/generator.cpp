#include "tools/treecheck/generator.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/patterns.h"

#include <cmath>
#include <cstring>

namespace treecheck {

namespace {

bool same_scalars(const TYPE* a, const TYPE* b) {
    if (a->is_pointer() || b->is_pointer())
        return a->is_pointer() && b->is_pointer() &&
               equiv_mtypes(const_cast<TYPE*>(a)->type_pointed_to(), const_cast<TYPE*>(b)->type_pointed_to());
    return a->is_float() == b->is_float() && a->size == b->size && a->is_bool() == b->is_bool() &&
           a->is_unsigned() == b->is_unsigned() && a->is_wchar() == b->is_wchar();
}

bool computes(const TYPE* t) { // operators compute in this type: what is narrower is promoted
    return (t->is_int() || t->is_enum()) && !t->is_bool() && !t->is_wchar() && t->size >= tp->int_t->size &&
           promoted_type(const_cast<TYPE*>(t)) == t;
}

NODE* binary(int op, NODE* a, NODE* b, TYPE* type) { return maketree(op, a, b, type); }
NODE* unary(int op, NODE* a, TYPE* type) { return maketree(op, a, nullptr, type); }
NODE* number_of(TYPE* type, unsigned v) { return mk_ICON(INT65(v), type); }
NODE* address_of(NODE* object) {
    TYPE* t = object->type;
    return unary(UAND, object, tp->mk_ptr(t->is_array() ? t->elem_type() : t));
}

} // namespace

NODE* cast_to(TYPE* type, NODE* tree) {
    if (same_scalars(tree->type, type) && tree->op != STDOT && tree->op != STREF) return tree;
    return unary(type->is_pointer() ? PCONV : SCONV, tree, type);
}

const char* extremum_name(TYPE* type, bool maximum) {
    return type == tp->int_t      ? (maximum ? "__max" : "__min")
           : type == tp->long_t   ? (maximum ? "__lmax" : "__lmin")
           : type == tp->llong_t  ? (maximum ? "__llmax" : "__llmin")
           : type == tp->float_t  ? (maximum ? "__fmax" : "__fmin")
           : type == tp->double_t ? (maximum ? "__fmax64" : "__fmin64")
                                  : nullptr;
}

GENERATOR::GENERATOR(uint64_t seed, const GENERATOR_OPTIONS& o) : random(seed), w(world()), options(o) {
    is_loose = random.one_in(3);
    const unsigned n = 1 + random.pick(4);
    for (unsigned i = 0; i < n; ++i) {
        const bool is_float = options.floats && random.one_in(5);
        SYMTAB* s = random.of(is_float ? w.floats : w.integers);
        if (!is_float && random.one_in(3)) s = w.integers[random.pick(8)]; // the types that operators compute in
        if (options.effects && random.one_in(12)) s = random.of(w.volatiles);
        favourites.push_back(s);
    }
    for (int i = 0; i < 3; ++i) numbers.push_back(number(tp->llong_t));
}

GENERATOR::~GENERATOR() {
    for (NODE* t : seen) erase_tree(t);
}

TYPE* GENERATOR::integer_type() {
    if (random.pick(3))
        return random.of(favourites)->type->is_float() ? tp->int_t : random.of(favourites)->type->stqs();
    return random.of(w.integer_types);
}

TYPE* GENERATOR::arithmetic_type() {
    if (options.floats && random.one_in(5)) return random.pick(2) ? tp->float_t : tp->double_t;
    TYPE* t = integer_type();
    return t->is_float() ? tp->int_t : t;
}

// ---- Leaves
INT65 GENERATOR::number(TYPE* type) {
    if (type->is_bool()) return INT65(random.pick(2));
    const auto bits = static_cast<unsigned>(type->size);
    uint64_t v = random.next();
    switch (random.pick(9)) {
    case 0:
    case 1: v = random.pick(4); break;
    case 2: v = -static_cast<uint64_t>(random.pick(4)); break;
    case 3: v = uint64_t(1) << random.pick(bits); break;
    case 4: v = (uint64_t(1) << random.pick(bits)) - 1 - (random.one_in(2) ? v & 1 : 0); break;
    case 5: v = (uint64_t(1) << (bits - 1)) - random.pick(2); break;
    case 6: v = random.pick(40); break;
    case 7:
        if (!numbers.empty()) v = random.of(numbers).value + random.pick(3) - 1;
        break;
    default: v >>= random.pick(64);
    }
    return truncate_to_type(INT65(static_cast<int64_t>(v)), type);
}

NODE* GENERATOR::constant(TYPE* type) {
    if (!type->is_float()) {
        if (type->is_enum()) type = normalized_underlying_type(type); // no constant is beyond its type
        NODE* t = mk_ICON(INT65(0), type);
        t->u.lval = number(type);
        return t;
    }
    static const double some[] = {0.0, -0.0, 1.0,  -1.0,   2.0,     0.5,        3.0, 0.1,
                                  4.0, -2.0, 1e30, -1e-30, 65536.0, 16777217.0, 10.0};
    double v = some[random.pick(15)];
    if (random.one_in(4))
        v = std::ldexp(static_cast<double>(random.next() >> 11), static_cast<int>(random.pick(120)) - 110);
    if (type->size == 32) v = static_cast<float>(v);
    NODE* t = new_node(FCON, type);
    t->u.fval = new simul_fval;
    uint64_t bits;
    memcpy(&bits, &v, sizeof bits);
    ieee_cvt_dtos(static_cast<uint32_t>(bits >> 32), static_cast<uint32_t>(bits), t->u.fval);
    return t;
}

SYMTAB* GENERATOR::variable(const std::vector<SYMTAB*>& among, TYPE* type) {
    SYMTAB* found = nullptr;
    unsigned n = 0;
    for (SYMTAB* s : among)
        if (same_scalars(s->type, type) && random.one_in(++n)) found = s;
    return found;
}

NODE* GENERATOR::leaf(TYPE* type) {
    if (type->is_pointer()) return pointer(type, 0);
    if (random.one_in(3)) return constant(type);
    if (SYMTAB* s = variable(favourites, type)) return mk_NAME(s);
    if (random.one_in(8) && !type->is_float()) return cast_to(type, member(random.pick(3) != 0, 0));
    if (SYMTAB* s = random.pick(2) ? nullptr : variable(type->is_float() ? w.floats : w.integers, type))
        return mk_NAME(s);
    NODE* t = mk_NAME(random.of(favourites));
    if (t->type->is_float() && !type->is_float()) { // such a conversion is undefined for most values
        erase_tree(t);
        return constant(type);
    }
    return cast_to(type, t);
}

void GENERATOR::remember(const NODE* t) {
    if (t->left && seen.size() < 6) seen.push_back(copy_tree(t));
}

NODE* GENERATOR::recall(TYPE* type) {
    for (const NODE* t : seen)
        if (same_scalars(t->type, type) && random.pick(2)) return copy_tree(t);
    return nullptr;
}

// ---- Objects
NODE* GENERATOR::member(bool bit_field, int depth) {
    const fkMDATA* m = nullptr;
    unsigned n = 0;
    for (const fkMDATA* candidate : w.members)
        if (candidate->is_bitfld == bit_field && random.one_in(++n)) m = candidate;
    const bool through_pointer = options.pointers && random.one_in(3);
    NODE* object = mk_NAME(through_pointer ? w.record_pointer : random.pick(2) ? w.record : w.other_record);
    if (through_pointer && depth > 0 && options.effects && random.one_in(6))
        object = binary(COMMAOP, effect(tp->int_t, depth - 1), object, object->type);
    NODE* field = new_node(FIELD, m->type);
    field->mk_field(1, const_cast<fkMDATA*>(m), w.record_type);
    return maketree(through_pointer ? STREF : STDOT, object, field, m->type);
}

NODE* GENERATOR::place(TYPE* type, int depth) {
    if (SYMTAB* s = variable(favourites, type)) return mk_NAME(s);
    if (options.pointers && random.one_in(3) && (type == tp->int_t || type == tp->long_t))
        return unary(UMULT, pointer(tp->mk_ptr(type), depth - 1), type);
    if (SYMTAB* s = variable(type->is_float() ? w.floats : w.integers, type)) return mk_NAME(s);
    return mk_NAME(variable(w.integers, tp->int_t));
}

NODE* GENERATOR::any_place(int depth) {
    switch (random.pick(5)) {
    case 0: return member(random.pick(3) != 0, depth - 1);
    case 1:
        if (options.pointers) return unary(UMULT, pointer(tp->mk_ptr(tp->int_t), depth - 1), tp->int_t);
        break;
    case 2: return mk_NAME(random.of(options.floats && random.one_in(4) ? w.floats : w.integers));
    }
    return mk_NAME(random.of(favourites));
}

NODE* GENERATOR::assignment(NODE* to, int depth) {
    TYPE* type = to->type->stqs();
    if (random.pick(3)) return binary(ASG, to, operand(type, depth), type);
    const bool can_compute = !type->is_bool() && !type->is_float();
    if (can_compute && random.one_in(3))
        return binary(random.pick(2) ? PLUSPLUS : MINMIN, to, mk_ICON(INT65(1), tp->int_t), type);
    if (type->is_float()) {
        static const int ops[] = {PLUSASG, MINUSASG, MULTASG};
        return binary(ops[random.pick(3)], to, operand(type, depth), type);
    }
    static const int ops[] = {PLUSASG, MINUSASG, MULTASG, ANDBASG, ORBASG, XORBASG, DIVASG, MODASG};
    if (random.one_in(5)) // a count that most often is in range
        return binary(random.pick(2) ? SLLASG : SRLASG, to,
                      mk_ICON(INT65(random.pick(type->is_bool() ? 16 : static_cast<unsigned>(type->size))), tp->int_t),
                      type);
    TYPE* wide = combined_type_for_types(type, promoted_type(type));
    return binary(ops[random.pick(8)], to, operand(wide, depth), type);
}

NODE* GENERATOR::call(SYMTAB* function, int depth) {
    NODE* callee = address_of(mk_NAME(function));
    TYPE* type = function->type->return_type();
    if (random.pick(2)) return maketree(UCALL, callee, nullptr, type);
    NODE* args = value(arithmetic_type(), depth - 1);
    if (random.one_in(3)) args = binary(COMMA, args, value(tp->int_t, depth - 1), tp->int_t);
    return maketree(CALL, callee, args, type);
}

// Something with a side effect, as a value.
NODE* GENERATOR::effect(TYPE* type, int depth) {
    NODE* t;
    if (options.pointers && depth > 0 && random.one_in(16)) {
        TYPE* p = tp->mk_ptr(tp->int_t);
        NODE *to = pointer(p, depth - 1), *from = random.one_in(4) ? copy_tree(to) : pointer(p, depth - 1);
        NODE* args =
            binary(COMMA, binary(COMMA, to, from, tp->int_t), mk_ICON(INT65(random.pick(3)), tp->ulong_t), tp->int_t);
        return binary(COMMAOP, unary(MEMCPY, args, p), leaf(type), type);
    }
    if (random.one_in(16)) {
        NODE* copy = binary(STASG, mk_NAME(w.record), mk_NAME(w.other_record), w.record_type);
        return binary(COMMAOP, copy, leaf(type), type);
    }
    switch (random.pick(depth > 0 ? 6 : 2)) {
    case 0: t = call(w.functions[random.pick(2)], depth); break;
    case 1: t = mk_NAME(random.of(w.volatiles)); break;
    case 2:
    case 3: t = assignment(place(type, depth), depth); break;
    default: t = assignment(any_place(depth), depth);
    }
    if (t->type->is_float() && !type->is_float()) return binary(COMMAOP, t, leaf(type), type);
    return cast_to(type, t);
}

// ---- Operators
// A choice by the value of the thing chosen: the lesser, the greater, a clamp, or one that changes the thing in
// between.
NODE* GENERATOR::choice_by_value(TYPE* type, int depth) {
    NODE* x = leaf(type);
    NODE* limit = random.one_in(2) ? constant(type) : operand(type, depth);
    int op = EQ + static_cast<int>(random.pick(6));
    if (op >= LE && type->is_unsigned()) op += ULE - LE;
    if (type->is_float()) op = FEQ + static_cast<int>(random.pick(14));
    auto arm = [&] {
        NODE* t = copy_tree(random.pick(3) ? x : limit);
        if (random.one_in(4)) t = maketree(UMINUS, t, nullptr, type);
        if (random.one_in(3)) t = binary(PLUS, t, constant(type), type);
        if (options.effects && x->op == NAME && random.one_in(5))
            t = binary(COMMAOP, binary(ASG, copy_tree(x), constant(type), type), t, type);
        return t;
    };
    NODE* arms = binary(COLON, arm(), arm(), type);
    return binary(QUEST, binary(op, x, limit, tp->int_t), arms, type);
}

// The smaller or the larger by the target's instruction, or an absolute value; null where it has none for the type.
NODE* GENERATOR::extremum(TYPE* type, int depth) {
    const bool maximum = random.pick(2) != 0;
    if (type == tp->int_t && random.one_in(6)) return mk_ICALL("__abs16_sat", operand(type, depth), type);
    const char* name = extremum_name(type, maximum);
    if (!name) return nullptr;
    NODE *a = operand(type, depth), *b = random.one_in(2) ? constant(type) : operand(type, depth);
    if (random.one_in(3)) std::swap(a, b);
    return mk_ICALL(name, binary(COMMA, a, b, tp->int_t), type);
}

// ---- Values of several parts
NODE* GENERATOR::part(TYPE* type, int depth) {
    TYPE* complex = tp->mk_complex(type);
    NODE* z = random.pick(3) ? binary(COMPLEX, operand(type, depth), operand(type, depth), complex)
                             : mk_NAME(w.complexes[type == tp->double_t]);
    if (options.effects && random.one_in(8)) z = binary(COMMAOP, effect(tp->int_t, depth - 1), z, z->type);
    return unary(random.pick(2) ? REAL : IMAG, z, type);
}

NODE* GENERATOR::vector(TYPE* type, int depth) {
    TYPE* elem = type->elem_type();
    const unsigned n = type->real->num_elem();
    const unsigned kind = depth > 0 ? random.pick(8) : 7;
    if (kind == 0) return unary(VPACKM, operand(elem, depth), type);
    if (kind == 1) return binary(VPACK1P, operand(elem, depth), operand(elem, depth), type);
    if (kind == 2 && n == 2) { // lane by lane from the other element type
        TYPE* other = elem == tp->int_t ? tp->long_t : tp->int_t;
        return unary(VSCONV, vector(tp->mk_vector(other, false, 2), depth - 1), type);
    }
    if (kind == 3 && type->size == 64) { // the same words
        TYPE* other = elem == tp->int_t ? tp->mk_vector(tp->long_t, false, 2) : tp->mk_vector(tp->int_t, false, 4);
        return unary(VRCONV, vector(other, depth - 1), type);
    }
    if (kind < 7) {
        const unsigned lanes = random.one_in(4) ? 1 + random.pick(2) : n;
        NODE* list = operand(elem, depth);
        for (unsigned i = 1; i < lanes; ++i)
            list = binary(COMMA, list, random.one_in(3) ? constant(elem) : operand(elem, depth), tp->int_t);
        return unary(VPACK, list, type);
    }
    return mk_NAME(w.vectors[elem == tp->long_t ? 2 : n == 4]);
}

NODE* GENERATOR::lane(TYPE* type, int depth) {
    const unsigned n = type == tp->int_t && random.pick(2) ? 4 : 2;
    return binary(VFIELD, vector(tp->mk_vector(type, false, n), depth - 1), mk_ICON(INT65(random.pick(n)), tp->int_t),
                  type);
}

// x < c ? c : x > d ? d : x and the like, of floats.
NODE* GENERATOR::clamp(TYPE* type, int depth) {
    NODE *x = operand(type, depth), *value = x;
    for (int i = 0; i < 2; ++i) {
        static const int ops[] = {FLT, FLE, FGT, FGE};
        NODE* limit = constant(type);
        NODE* test = binary(ops[random.pick(4)], copy_tree(x), copy_tree(limit), tp->int_t);
        value = binary(QUEST, test, binary(COLON, limit, value, type), type);
    }
    return value;
}

NODE* GENERATOR::choice(TYPE* type, int depth) {
    if (random.one_in(4))
        if (NODE* t = extremum(type, depth)) return t;
    if (!type->is_pointer() && (type->is_float() || computes(type)) && random.one_in(2))
        return choice_by_value(type, depth);
    if (type->is_float() && random.one_in(3)) return clamp(type, depth);
    NODE* a = operand(type, depth);
    NODE* b = random.one_in(4) ? copy_tree(a) : operand(type, depth);
    if (computes(type) && random.one_in(4)) { // arms that share an operand
        static const int ops[] = {PLUS, MINUS, MULT, ANDB, ORB, XORB};
        const int op = ops[random.pick(6)];
        NODE* common = leaf(type);
        a = random.pick(2) ? binary(op, a, copy_tree(common), type) : binary(op, copy_tree(common), a, type);
        b = random.pick(2) ? binary(op, b, common, type) : binary(op, common, b, type);
    }
    if (random.one_in(6)) { // both arms are computed
        NODE* args = binary(COMMA, binary(COMMA, truth(depth - 1), a, tp->int_t), b, tp->int_t);
        return mk_ICALL("quest$colon", args, type);
    }
    return binary(QUEST, condition(depth - 1), binary(COLON, a, b, type), type);
}

NODE* GENERATOR::condition(int depth) {
    if (options.pointers && random.one_in(12)) return pointer(tp->mk_ptr(tp->int_t), depth);
    if (depth <= 0 || random.one_in(4)) return value(arithmetic_type(), depth);
    return truth(depth);
}

// Two pointers moved by the same offset, or whose difference is compared.
NODE* GENERATOR::meeting_pointers(int depth) {
    TYPE* p = tp->mk_ptr(tp->int_t);
    NODE *a = pointer(p, depth - 1), *b = pointer(p, depth - 1);
    const int op = random.pick(2) ? EQ : NEQ;
    if (random.one_in(3)) return binary(op, binary(MINUS, a, b, tp->long_t), number_of(tp->long_t, 0), tp->int_t);
    NODE* i = operand(random.pick(2) ? tp->int_t : tp->long_t, depth - 1);
    NODE* moved = binary(PLUS, a, copy_tree(i), p);
    return binary(op, moved, binary(PLUS, b, random.one_in(6) ? constant(tp->int_t) : copy_tree(i), p), tp->int_t);
}

// An integer as a float beside a number that lies at or between integers, or beside another one.
NODE* GENERATOR::converted_comparison(int depth) {
    TYPE *type = random.pick(2) ? tp->float_t : tp->double_t, *from = random.of(w.integer_types);
    NODE *a = cast_to(type, operand(from, depth)), *b;
    if (random.one_in(3)) {
        b = cast_to(type, operand(random.of(w.integer_types), depth));
    } else {
        b = cast_to(type, number_of(tp->long_t, 0));
        b->left->u.lval = number(random.one_in(3) ? tp->long_t : tp->int_t);
        NODE* half = binary(DIV, b, cast_to(type, number_of(tp->int_t, random.pick(2) + 1)), type);
        b = random.one_in(2) ? half : binary(MINUS, half, constant(type), type);
    }
    if (random.one_in(4)) std::swap(a, b);
    return binary(FEQ + static_cast<int>(random.pick(14)), a, b, tp->int_t);
}

// Two compares of one value, or of one pair of values, under an operator on bits.
NODE* GENERATOR::joined_comparisons(TYPE* type, int depth) {
    NODE *a = leaf(type), *b = random.one_in(2) ? nullptr : leaf(type);
    auto compare = [&] {
        int op = EQ + static_cast<int>(random.pick(6));
        if (op >= LE && type->is_unsigned()) op += ULE - LE;
        NODE *x = copy_tree(a), *y = b ? copy_tree(b) : constant(type);
        if (b && random.one_in(2)) std::swap(x, y);
        return binary(op, x, y, tp->int_t);
    };
    static const int ops[] = {ANDB, ORB, ANDAND, OROR};
    NODE* first = compare();
    NODE* t = binary(ops[random.pick(4)], first, random.one_in(6) ? truth(depth - 1) : compare(), tp->int_t);
    erase_tree(a);
    erase_tree(b);
    return t;
}

NODE* GENERATOR::comparison(int depth) {
    if (options.floats && random.one_in(12)) return converted_comparison(depth);
    if (options.pointers && random.one_in(10)) {
        TYPE* p = tp->mk_ptr(tp->int_t);
        static const int ops[] = {EQ, NEQ, ULE, ULT, UGE, UGT};
        if (random.one_in(3)) return meeting_pointers(depth);
        return binary(ops[random.pick(6)], pointer(p, depth - 1),
                      random.one_in(4) ? unary(PCONV, constant(tp->ulong_t), p) : pointer(p, depth - 1), tp->int_t);
    }
    TYPE* t = arithmetic_type();
    t = combined_type_for_types(t, t);
    NODE* a = operand(t, depth);
    NODE* b = random.one_in(2) ? constant(t) : operand(t, depth);
    if (random.one_in(8)) std::swap(a, b);
    if (t->is_float()) return binary(FEQ + static_cast<int>(random.pick(14)), a, b, tp->int_t);
    int op = EQ + static_cast<int>(random.pick(6));
    if (op >= LE && t->is_unsigned()) op += ULE - LE;
    return binary(op, a, b, tp->int_t);
}

// 0 or 1 as an `int`.
NODE* GENERATOR::truth(int depth) {
    if (depth <= 0) return comparison(0);
    switch (random.pick(6)) {
    case 0: return binary(ANDAND, condition(depth - 1), condition(depth - 1), tp->int_t);
    case 1: return binary(OROR, condition(depth - 1), condition(depth - 1), tp->int_t);
    case 2: return unary(EXCLAIM, condition(depth - 1), tp->int_t);
    case 3: {
        static TYPE* const types[] = {tp->int_t, tp->uint_t, tp->long_t, tp->ullong_t};
        if (random.pick(2)) return joined_comparisons(types[random.pick(4)], depth);
        [[fallthrough]];
    }
    default: return comparison(depth);
    }
}

NODE* GENERATOR::integer_operator(TYPE* type, int depth) {
    if (random.one_in(7)) return shape(type, depth, random.pick(static_cast<unsigned>(rules::all_patterns().size())));
    static const int ops[] = {PLUS, PLUS, MINUS, MINUS, MULT, DIV, MOD, ANDB, ANDB, ORB, XORB};
    NODE* a = operand(type, depth);
    switch (random.pick(9)) {
    case 0: return unary(random.pick(2) ? UMINUS : NOTB, a, type);
    case 1:
        if (random.one_in(3)) return binary(EXPT, a, mk_ICON(INT65(random.pick(5)), type), type);
        return unary(random.pick(3) ? ABS : SQR, a, type);
    case 2:
    case 3: {
        NODE* count = random.pick(8) ? mk_ICON(INT65(random.pick(static_cast<unsigned>(type->size))), tp->int_t)
                                     : operand(tp->int_t, depth);
        return binary(random.pick(2) ? SLL : SRL, a, count, type);
    }
    }
    NODE* b = random.one_in(3) ? constant(type) : random.one_in(8) ? copy_tree(a) : operand(type, depth);
    if (random.one_in(10)) std::swap(a, b);
    return binary(ops[random.pick(11)], a, b, type);
}

NODE* GENERATOR::integer(TYPE* type, int depth) {
    switch (random.pick(14)) {
    case 0: return choice(type, depth);
    case 1: {
        TYPE* from = random.of(w.integer_types);
        return cast_to(type, operand(from, depth));
    }
    case 2: return cast_to(type, truth(depth));
    case 3:
        if (options.effects && random.one_in(2)) return effect(type, depth);
        break;
    case 4:
        if (options.effects) return binary(COMMAOP, effect(tp->int_t, depth - 1), operand(type, depth), type);
        break;
    case 5:
        if (options.floats && random.one_in(4))
            return cast_to(type, operand(random.pick(2) ? tp->float_t : tp->double_t, depth));
        break;
    case 6:
        if (options.pointers && type == tp->long_t && random.one_in(3)) {
            TYPE* p = tp->mk_ptr(tp->int_t);
            return binary(MINUS, pointer(p, depth - 1), pointer(p, depth - 1), type);
        }
        if (options.pointers && random.one_in(6)) return unary(SCONV, pointer(tp->mk_ptr(tp->int_t), depth - 1), type);
        if (options.pointers && random.one_in(2) && (type == tp->int_t || type == tp->long_t))
            return unary(UMULT, pointer(tp->mk_ptr(type), depth - 1), type);
        break;
    case 7: return cast_to(type, member(random.pick(3) != 0, depth));
    case 8:
        if ((type == tp->int_t || type == tp->long_t) && random.one_in(3)) return lane(type, depth);
        break;
    }
    if (computes(type)) return integer_operator(type, depth);
    TYPE* wide = promoted_type(type);
    if (!computes(wide)) wide = tp->int_t;
    return cast_to(type, integer_operator(wide, depth));
}

NODE* GENERATOR::floating(TYPE* type, int depth) {
    static const int ops[] = {PLUS, MINUS, MULT, DIV};
    NODE* a = operand(type, depth);
    switch (random.pick(10)) {
    case 0: return unary(UMINUS, a, type);
    case 1: return unary(random.pick(2) ? ABS : SQR, a, type);
    case 2: erase_tree(a); return cast_to(type, operand(random.of(w.integer_types), depth));
    case 3: erase_tree(a); return cast_to(type, operand(type == tp->float_t ? tp->double_t : tp->float_t, depth));
    case 4: erase_tree(a); return choice(type, depth);
    case 6:
        if (random.pick(2)) break;
        erase_tree(a);
        return part(type, depth);
    case 5: return random.pick(3) ? unary(random.pick(2) ? SQRT : RECIP, a, type) : a;
    }
    NODE* b = random.one_in(2) ? constant(type) : random.one_in(8) ? copy_tree(a) : operand(type, depth);
    if (random.one_in(6)) std::swap(a, b);
    if (type == tp->float_t && random.one_in(6)) { // computed in the wider format
        TYPE* wide = tp->double_t;
        return cast_to(type, binary(ops[random.pick(4)], cast_to(wide, a), cast_to(wide, b), wide));
    }
    return binary(ops[random.pick(4)], a, b, type);
}

NODE* GENERATOR::pointer(TYPE* type, int depth) {
    TYPE* target = type->type_pointed_to();
    if (depth > 0) switch (random.pick(8)) {
        case 0:
        case 1: return binary(PLUS, pointer(type, depth - 1), constant(random.pick(2) ? tp->int_t : tp->long_t), type);
        case 2: {
            TYPE* index = random.pick(2) ? tp->long_t : tp->int_t;
            NODE* scaled = maketree(PMCONV, operand(index, depth),
                                    mk_ICON(INT65(static_cast<int64_t>(target->size)), index), index);
            return binary(random.pick(4) ? PLUS : MINUS, pointer(type, depth - 1), scaled, type);
        }
        case 3: return choice(type, depth);
        case 4: return cast_to(type, pointer(tp->mk_ptr(target == tp->int_t ? tp->long_t : tp->int_t), depth - 1));
        case 5: return binary(MINUS, pointer(type, depth - 1), constant(tp->int_t), type);
        }
    if (depth > 0 && random.one_in(12)) return unary(PCONV, operand(random.of(w.integer_types), depth), type);
    if (random.pick(2))
        if (SYMTAB* s = variable(w.pointers, type)) return mk_NAME(s);
    if (target == tp->int_t && random.pick(2)) return address_of(mk_NAME(w.array));
    if (SYMTAB* s = variable(w.addressed, target)) return address_of(mk_NAME(s));
    return mk_NAME(variable(w.pointers, type));
}

NODE* GENERATOR::value(TYPE* type, int depth) {
    if (depth > 0 && random.one_in(60)) return mk_ICALL("DONOTCSE", value(type, depth - 1), type);
    if (depth <= 0 || random.one_in(10)) return leaf(type);
    if (is_loose && !type->is_pointer() && random.one_in(2)) {
        NODE* t = loose(depth);
        if (t->type->is_float() && !type->is_float()) { // most values would not fit
            erase_tree(t);
            return leaf(type);
        }
        return cast_to(type, t);
    }
    if (random.one_in(6))
        if (NODE* t = recall(type)) return t;
    NODE* t = type->is_pointer() ? pointer(type, depth)
              : type->is_float() ? floating(type, depth)
                                 : integer(type, depth);
    if (random.one_in(4)) remember(t);
    return t;
}

// As C types it: each operand of its own type, the node of the type that follows.
NODE* GENERATOR::loose(int depth) {
    static const int ops[] = {PLUS, MINUS, MULT, DIV, MOD, ANDB, ORB, XORB, SLL, SRL};
    TYPE* ta = arithmetic_type();
    NODE* a = operand(ta, depth);
    if (random.one_in(5)) {
        const int op = ta->is_float() || random.pick(3) ? (random.pick(2) ? UMINUS : ABS) : NOTB;
        return unary(op, a, operator_type_for_operand_types(op, a->type, nullptr, nullptr, nullptr));
    }
    int op = ops[random.pick(10)];
    NODE* b = op == SLL || op == SRL ? mk_ICON(INT65(random.pick(16)), random.pick(2) ? tp->int_t : tp->long_t)
                                     : operand(arithmetic_type(), depth);
    if (a->type->is_float() || b->type->is_float()) {
        if (op > DIV || (op != PLUS && op != MINUS && op != MULT)) op = DIV;
    } else if (random.one_in(4)) {
        TYPE* t = combined_type_for_types(a->type, b->type);
        op = EQ + static_cast<int>(random.pick(6));
        if (op >= LE && t->is_unsigned()) op += ULE - LE;
    }
    return binary(op, a, b, operator_type_for_operand_types(op, a->type, b->type, nullptr, nullptr));
}

NODE* GENERATOR::given() {
    const bool had_effects = options.effects;
    options.effects = false;
    SYMTAB* s = favourite();
    while (s->type->is_float() || s->type->is_volatile()) s = random.of(w.integers);
    TYPE* type = promoted_type(s->type);
    NODE* x = cast_to(type, mk_NAME(s));
    if (random.one_in(4)) x = binary(PLUS, x, constant(type), type);
    NODE* fact;
    if (random.one_in(3)) {
        x = binary(MOD, x, mk_ICON(INT65(2 + random.pick(8)), type), type);
        fact = binary(EQ, x, mk_ICON(INT65(random.pick(3) ? 0 : random.pick(2)), type), tp->int_t);
    } else {
        int op = NEQ + static_cast<int>(random.pick(5));
        if (op >= LE && type->is_unsigned()) op += ULE - LE;
        fact = binary(op, x, random.one_in(6) ? value(type, 1) : constant(type), tp->int_t);
        if (random.one_in(8)) fact = unary(EXCLAIM, fact, tp->int_t);
    }
    options.effects = had_effects;
    if (!tree_has_side_effects(fact)) return fact;
    erase_tree(fact);
    return mk_ICON(INT65(1), tp->int_t);
}

NODE* GENERATOR::tree() {
    TYPE* type = options.pointers && random.one_in(16) ? tp->mk_ptr(tp->int_t) : arithmetic_type();
    const int depth = 2 + static_cast<int>(random.pick(static_cast<unsigned>(options.depth) - 1));
    NODE* t = value(type, depth);
    for (int i = 0; i < 3 && !t->left; ++i) { // a leaf is no test
        erase_tree(t);
        t = value(type, depth);
    }
    SYMTAB* x = favourite();
    if (!options.effects || !x->type->is_int() || random.pick(6)) return t;
    return binary(COMMAOP, binary(ASG, mk_NAME(x), constant(x->type), x->type), t, type);
}

} // namespace treecheck
