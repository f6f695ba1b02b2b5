// Statement pairs that the multiply-accumulate hardware runs at once become calls of their built-in functions.
//
// Needs: alias marks. Leaves: what rests on the graph.
// Sound because a call reads its factors first, then adds the product of before to the accumulator and then stores the
// new product, in the target's arithmetic, where sums wrap: the order of the two statements. The accumulator and the
// product are registers that only their names reach, so that no factor is one of them.
#include "OPT5/dd/mac.h"

#include "OPT5/dd/dd.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/range.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"
#include "OPT5/target/accumulators.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/mac_operands.h"
#include "OPT5/target/target.h"

#include <string>
#include <utility>

namespace {

constexpr int HIGH_HALF = 32;

// A conversion from half of the bits.
bool widens(const NODE* t, uint64_t to) {
    if (t->op != SCONV) return false;
    return to == 32 ? is_an_s32_operand(t) && is_an_s16_operand(t->left)
                    : is_an_s64_operand(t) && is_an_s32_operand(t->left);
}
NODE** below_conversion(NODE** link, uint64_t to) { return widens(*link, to) ? &(*link)->left : link; }
const NODE* without_conversion(const NODE* t, uint64_t to) { return widens(t, to) ? t->left : t; }

bool is_accumulation(const NODE* t) {
    return (t->op == PLUSASG || t->op == MINUSASG) && is_a_likely_zelkova_accumulator(t->left, false);
}
bool is_constant_shift(const NODE* t, long least, long most) {
    return t->op == SRL && t->right->op == ICON && t->right->u.lval >= INT65(least) && t->right->u.lval <= INT65(most);
}

// ---- Where a multiplication stands

// What the hardware's product register holds of x * y.
enum KIND : uint8_t {
    NO_PRODUCT,
    HALVES, // of 16-bit factors, all of it
    LOW,    // of 32-bit factors
    HIGH,
    FLOATING,
};

struct PRODUCT {
    KIND kind = NO_PRODUCT;
    NODE** link = nullptr;    // holds it; a product mode may stand above
    NODE* multiply = nullptr; // the MULT itself
};

// One from memory comes first.
bool are_halves(const NODE* x, const NODE* y) {
    return is_an_s16_UMULT_operand(x) && (is_an_s16_operand(y) || is_an_s16_constant_operand(y));
}
bool are_words(const NODE* x, const NODE* y) { return is_an_s32_UMULT_operand(x) && is_an_s32_operand(y); }

bool multiplies_halves(const NODE* m) {
    if (m->op != MULT) return false;
    const NODE *a = without_conversion(m->left, 32), *b = without_conversion(m->right, 32);
    return are_halves(a, b) || are_halves(b, a);
}
bool multiplies_words(const NODE* m) {
    if (m->op != MULT) return false;
    const NODE *a = without_conversion(m->left, 64), *b = without_conversion(m->right, 64);
    return are_words(a, b) || are_words(b, a);
}

// The 32-bit value of the product of 32-bit factors that `link` holds.
PRODUCT long_product(NODE** link) {
    NODE* t = *link;
    if (print_debug) debug_printf("~~~#S64lo#1 %s\n", tree_to_infix(t).c_str());
    if (is_an_s32_operand(t) && multiplies_words(t)) return {LOW, link, t};
    if (t->op != SCONV || !is_an_s32_operand(t) || !is_an_s64_operand(t->left)) return {};
    NODE* inner = t->left;
    if (multiplies_words(inner)) return {LOW, link, inner};
    if (print_debug) debug_printf("~~~#S64hi#1 %s\n", tree_to_infix(inner).c_str());
    if (is_constant_shift(inner, HIGH_HALF, HIGH_HALF + 6) && is_an_s64_operand(inner->left) &&
        multiplies_words(inner->left))
        return {HIGH, link, inner->left};
    return {};
}

PRODUCT product_in(NODE** link) {
    NODE* t = *link;
    const bool is_double = is_an_f64_operand(t);
    if (is_double || is_an_f32_operand(t)) {
        const bool multiplies =
            t->op == MULT && equiv_mtypes(t->left->type, t->type) && equiv_mtypes(t->right->type, t->type);
        const bool has_unit = is_double ? is_fpu64 : has_hardware_float();
        return multiplies && has_unit ? PRODUCT{FLOATING, link, t} : PRODUCT{};
    }
    if (!is_an_s32_operand(t)) return {};
    // x << 3 of a value in memory is a product with 8.
    if (t->op == SLL && is_an_s32_UMULT_operand(t->left) && t->right->op == ICON && t->right->u.lval >= INT65(2) &&
        t->right->u.lval < INT65(31)) {
        t->op = MULT;
        t->right->u.lval = INT65(1) << t->right->u.lval;
        t->right->type = tp->long_t;
    }
    if (PRODUCT p = long_product(link); p.kind != NO_PRODUCT) return p;
    // The hardware's product has 32 bits: of a 16-bit one it must be known that nothing is lost.
    if (NODE** m = below_conversion(link, 32); m != link)
        return multiplies_halves(*m) && operation_is_exact(*m, nullptr) ? PRODUCT{HALVES, link, *m} : PRODUCT{};
    int shift = 0;
    const NODE* below = strip_right_shift(strip_left_shift(t, &shift), &shift);
    if (below != t && (below != t->left || !is_an_s32_operand(below))) return {};
    NODE** place = below == t ? link : &t->left;
    if (multiplies_halves(*place)) return {HALVES, place, *place};
    return below == t ? PRODUCT{} : long_product(place);
}

} // namespace

bool is_mac(const NODE* t) {
    if (!is_accumulation(t) || sym_appears_in_tree(t->left->u.sym, t->right)) return false;
    return product_in(const_cast<NODE**>(&t->right)).kind != NO_PRODUCT;
}

bool is_mac_of_halves(const NODE* statement) {
    NODE* t = copy_tree(statement); // reading a product may change how it is written
    const bool is_one = is_mac(t) && product_in(&t->right).kind == HALVES;
    erase_tree(t);
    return is_one;
}

// ---- Why not

namespace {

const NODE* multiplication_in(const NODE* t) {
    const NODE* found = nullptr;
    for_each_subtree(t, [&found](const NODE* n) {
        if (n->op == MULT && n->right->op != ICON && !found) found = n;
    });
    return found;
}

std::string why_no_accumulator(const NODE* sum) {
    if (sum->op != NAME) return "the sum is in memory, where the loop may reach it otherwise: keep it in a local variable";
    if (!is_a_likely_zelkova_register(sum->u.sym))
        return "the sum is no local variable, or its address is taken: keep it in a local one during the loop";
    if (is_a_likely_zelkova_accumulator(sum, false)) return "";
    return std::string("the sum is of type ") + sum->type->stqs()->printstr() + ": make it a long";
}

std::string why_no_product(const NODE* m) {
    if (!m) return "a constant factor has more than 16 bits, or the other one is not read from memory";
    if (m->type->is_float()) return "there is no unit for its floating-point type: see --float_support";
    const NODE *a = m->left, *b = m->right;
    while (a->op == SCONV) a = a->left;
    while (b->op == SCONV) b = b->left;
    if (!a->type->is_signed() || !b->type->is_signed()) return "a factor is unsigned: the hardware's are signed";
    if (a->op != UMULT && b->op != UMULT) return "no factor is read from memory where it is multiplied";
    if (m->type->size == 16) return "in C the product of two int has 16 bits, the hardware's has 32: write (long)x * y";
    return "the hardware multiplies two int, or two long, and shifts the product right by at most 6";
}

} // namespace

std::string why_no_mac(const NODE* statement) {
    NODE* t = copy_tree(statement);
    std::string why = why_no_accumulator(t->left);
    if (why.empty() && !is_mac(t)) {
        why = why_no_product(multiplication_in(t->right));
        if (t->op == PLUSASG && sym_appears_in_tree(t->left->u.sym, t->right))
            why = "what is added uses the sum itself";
    }
    erase_tree(t);
    return why;
}

// ---- Splitting

namespace {

bool holds_product(NODE* t) {
    if (product_in(&t).kind != NO_PRODUCT) return true;
    return (t->op == PLUS || t->op == MINUS) && (holds_product(t->left) || holds_product(t->right));
}

bool may_be_regrouped(const TYPE* t) { return t->is_int() || fp_add_is_associative(); }

} // namespace

bool split_accumulations_in_stmt(LIST* cell) {
    cell->first = normalize_zelkova_accumulation(cell->first);
    NODE* t = cell->first;
    if (!is_accumulation(t) || !may_be_regrouped(t->left->type) || sym_appears_in_tree(t->left->u.sym, t->right))
        return false;
    bool any = false;
    for (NODE* sum = t->right; sum->op == PLUS || sum->op == MINUS; sum = t->right) {
        const bool is_split = (holds_product(sum->left) || holds_product(sum->right)) &&
                              equiv_mtypes(sum->type, t->type) && equiv_mtypes(sum->left->type, t->type) &&
                              equiv_mtypes(sum->right->type, t->type) && !tree_has_side_effects(sum);
        if (!is_split) break;
        const int op = (t->op == PLUSASG) == (sum->op == PLUS) ? PLUSASG : MINUSASG;
        insert_behind(cell, maketree(op, copy_tree(t->left), sum->right, t->type, t->ls), cell->psn);
        t->right = sum->left;
        erase_node(sum);
        any = true;
    }
    return any;
}

void split_accumulations_in_bb(BBLK* bb) {
    for (LIST* s = bb->statements; s && s->rest; s = s->rest) split_accumulations_in_stmt(s);
}

// The high half is what the product register holds of a 64-bit product; the rest of the shift is its mode.
SYMTAB* split_out_multiply(LIST* cell) {
    NODE* t = cell->first;
    const PRODUCT p = product_in(&t->right);
    NODE *multiply_part = p.multiply, **place_to_insert_temp = p.link;
    OPT_ASSERT(multiply_part != NULL);
    OPT_ASSERT(*place_to_insert_temp != NULL);
    TYPE* type = t->left->type->stqs();
    SYMTAB* temp = sym_temp('T', -1, type, nullptr);
    NODE* product = *place_to_insert_temp;
    *place_to_insert_temp = mk_NAME(temp);
    if (p.kind == HIGH) {
        NODE* shift = product->left->right;
        if (const INT65 rest = shift->u.lval - INT65(HIGH_HALF); !rest.is_zero())
            *place_to_insert_temp = maketree(SRL, *place_to_insert_temp, mk_ICON(rest, tp->int_t), type);
        shift->u.lval = INT65(HIGH_HALF);
    }
    NODE* accumulation = cell->first;
    cell->first = mk_ASG(mk_NAME(temp), coerce_to_type(type, product));
    insert_behind(cell, accumulation, cell->psn);
    return temp;
}

// ---- Calls

namespace {

NODE* reference_to(const NODE* opd) {
    OPT_ASSERT(opd->op == NAME && is_a_likely_zelkova_register(opd->u.sym));
    return maketree(ARGREF, copy_tree(opd), nullptr, tp->mk_ptr(opd->type));
}

NODE* chain(std::initializer_list<NODE*> args) {
    NODE* list = nullptr;
    for (NODE* arg : args) list = list ? maketree(COMMA, list, arg, tp->int_t) : arg;
    return list;
}

NODE* take(NODE** link) {
    NODE* t = *link;
    *link = nullptr;
    return t;
}

// Takes the place of two statements, whose trees the caller no longer needs.
void set_call(LIST* cell, const std::string& name, NODE* args) {
    NODE* tree = mk_MCALL(name.c_str(), args, tp->void_t);
    OPT_ASSERT(tree != NULL && cell->rest != NULL && tree_has_side_effects(tree));
    erase_tree(cell->first);
    cell->first = tree;
    drop_statement_behind(cell);
}

struct PAIR {
    NODE* accm;    // acc op= P, or a product mode of P
    NODE* mult;    // P = x * y
    NODE* p;       // NAME P, in accm
    int shift = 0; // the product mode
    bool adds() const { return accm->op == PLUSASG; }
};

bool read_pair(LIST* cell, bool allow_s16, PAIR* pair) {
    NODE *accm = cell->first, *mult = cell->rest->first;
    if ((accm->op != PLUSASG && accm->op != MINUSASG) || mult->op != ASG) return false;
    if (!is_a_likely_zelkova_accumulator(accm->left, allow_s16) || !is_a_likely_zelkova_accumulator(mult->left, false))
        return false;
    int shift = 0;
    const NODE* p = strip_right_shift(strip_left_shift(accm->right, &shift), &shift);
    if (p->op != NAME || p->u.sym != mult->left->u.sym || p->u.sym == accm->left->u.sym) return false;
    if (!equiv_mtypes(p->type, mult->left->type) || !equiv_mtypes(accm->left->type, p->type)) return false;
    if (sym_appears_in_tree(accm->left->u.sym, mult->right) || tree_has_side_effects(mult->right)) return false;
    *pair = {accm, mult, const_cast<NODE*>(p), shift};
    return shift <= 6;
}

bool convert_product(LIST* cell, PAIR& pair) {
    const PRODUCT product = product_in(&pair.mult->right);
    const bool is_whole = product.kind != NO_PRODUCT && product.link == &pair.mult->right;
    if (!is_whole || product.kind == FLOATING || !is_an_s32_operand(pair.p)) return false;
    if (product.kind == HIGH && !is_constant_shift(pair.mult->right->left, HIGH_HALF, HIGH_HALF)) return false;
    const bool is_short = product.kind == HALVES;
    NODE* m = product.multiply;
    NODE** a = below_conversion(&m->left, is_short ? 32 : 64);
    NODE** b = below_conversion(&m->right, is_short ? 32 : 64);
    const bool is_square = is_short && trees_are_congruent(*a, *b, false) && !lvalue_is_volatile(*a);
    NODE *x = take(a), *y = take(b);
    if (!(is_short ? are_halves(x, y) : are_words(x, y))) std::swap(x, y);
    if (is_short && y->op == ICON) y->type = tp->int_t;
    NODE *acc = reference_to(pair.accm->left), *p = reference_to(pair.mult->left);
    NODE* shift = mk_ICON(pair.shift, tp->int_t);
    OPT_ASSERT(is_an_s32_RW_register_operand(acc) && is_an_s32_RW_register_operand(p));
    OPT_ASSERT(is_an_s16_PM_constant_operand(shift, false));
    std::string name = is_square ? "__parallel_sqr_" : "__parallel_mpy_";
    name += pair.adds() ? "add" : "sub";
    if (!is_short) name += product.kind == HIGH ? "_s32_hi" : "_s32_lo";
    if (is_square) erase_tree(y);
    set_call(cell, name, is_square ? chain({x, acc, p, shift}) : chain({x, y, acc, p, shift}));
    return true;
}

// Two factors from memory take both buses of a unified memory; none takes neither.
bool convert_float(LIST* cell, PAIR& pair) {
    NODE* m = pair.mult->right;
    const PRODUCT product = product_in(&pair.mult->right);
    if (product.kind != FLOATING || !pair.adds() || pair.accm->right != pair.p) return false;
    auto is_loaded = [](const NODE* t) { return is_an_f32_UMULT_operand(t) || is_an_f64_UMULT_operand(t); };
    const bool a = is_loaded(m->left), b = is_loaded(m->right);
    if (a != b || (a && !rtc_unified_memory)) return false;
    const char* name = m->type->size == 64 ? "__parallel_mpy_add_f64" : "__parallel_mpy_add_f32";
    NODE *x = take(&m->left), *y = take(&m->right);
    set_call(cell, name, chain({x, y, reference_to(pair.accm->left), reference_to(pair.mult->left)}));
    return true;
}

} // namespace

bool conversion_to_BIF_call_succeeds(LIST* cell, bool allow_s16) {
    if (!cell || !cell->rest) return false;
    if (print_debug) debug_printf("~~~#C2BIF#1 %s\n", stmt2infix(cell->first).c_str());
    if (is_mac(cell->first) && is_mac(cell->rest->first)) return conversion_to_s32xs32_DMAC_succeeds(cell);
    PAIR pair;
    if (!read_pair(cell, allow_s16, &pair)) return false;
    if (print_debug) debug_printf("~~~#C2BIF#2 %s\n", stmt2infix(pair.mult).c_str());
    return convert_product(cell, pair) || convert_float(cell, pair);
}

// ---- Both halves at once

namespace {

struct DUAL {
    NODE* mac[2];
    NODE** x[2]; // of the UMULT
    NODE** y[2];
    int shift[2] = {0, 0};
};

// acc += x * y, both of 16 bits and from memory.
bool read_dual(NODE* t, int k, DUAL* d) {
    if (t->op != PLUSASG || !is_a_likely_zelkova_accumulator(t->left, false) || !is_an_s32_operand(t->left))
        return false;
    const PRODUCT p = product_in(&t->right);
    if (p.kind != HALVES || p.multiply != *p.link || sym_appears_in_tree(t->left->u.sym, t->right)) return false;
    strip_right_shift(strip_left_shift(t->right, &d->shift[k]), &d->shift[k]);
    d->mac[k] = t;
    d->x[k] = below_conversion(&p.multiply->left, 32);
    d->y[k] = below_conversion(&p.multiply->right, 32);
    return is_an_s16_UMULT_operand(*d->x[k]) && is_an_s16_UMULT_operand(*d->y[k]);
}

bool is_same_address(const NODE* a, const NODE* b) {
    while (a->op == PCONV && a->left->type->is_pointer()) a = a->left;
    while (b->op == PCONV && b->left->type->is_pointer()) b = b->left;
    return trees_are_congruent(a, b, false);
}

// Whether `b` reads the 16-bit word behind the one that `a` reads.
bool is_next_word(const NODE* a, const NODE* b, struct LOOP* loop) {
    if (lvalue_is_volatile(a) || lvalue_is_volatile(b)) return false;
    if (!a->right && !b->right) return tree_difference_is_ivalue(b->left, a->left, INT65(1), loop);
    if (!b->right || !is_same_address(a->left, b->left)) return false;
    return a->right ? tree_difference_is_ivalue(b->right, a->right, INT65(1), loop)
                    : tree_is_ivalue(b->right, INT65(1), loop);
}

// The 32-bit word of which `t` reads the first half.
NODE* word_at(NODE* t) {
    TYPE* type = tp->mk_qual(tp->long_t, t->type->qual_kind(true));
    t->left = coerce_to_type(tp->mk_ptr(type), t->left);
    t->type = type;
    return t;
}

} // namespace

bool conversion_to_s32xs32_DMAC_succeeds(LIST* cell, struct LOOP* loop) {
    if (!cell || !cell->rest || memory_is_big_endian) return false;
    DUAL d;
    if (!read_dual(cell->first, 0, &d) || !read_dual(cell->rest->first, 1, &d)) return false;
    if (print_debug)
        debug_printf("~~~#DMAC#1 %s\n~~~#DMAC#2 %s\n", stmt2infix(d.mac[0]).c_str(), stmt2infix(d.mac[1]).c_str());
    if (d.shift[0] != d.shift[1] || d.mac[0]->left->u.sym == d.mac[1]->left->u.sym) return false;
    for (int k : {0, 1})
        if (sym_appears_in_tree(d.mac[k]->left->u.sym, d.mac[1 - k]->right) || tree_has_side_effects(d.mac[k]->right))
            return false;
    if (!is_next_word(*d.x[0], *d.x[1], loop) || !is_next_word(*d.y[0], *d.y[1], loop)) {
        std::swap(d.x[1], d.y[1]);
        if (!is_next_word(*d.x[0], *d.x[1], loop) || !is_next_word(*d.y[0], *d.y[1], loop)) return false;
    }
    if (print_debug) debug_printf("~~~#DMAC#11 %s\n", tree_to_infix(*d.x[0]).c_str());
    NODE *x = word_at(take(d.x[0])), *y = word_at(take(d.y[0]));
    NODE* args =
        chain({x, y, reference_to(d.mac[0]->left), reference_to(d.mac[1]->left), mk_ICON(d.shift[0], tp->int_t)});
    set_call(cell, "__dmac", args);
    return true;
}

// ---- Steps

bool read_variable_step(const NODE* t, VARIABLE_STEP* step) {
    if ((t->op != ASG && t->op != PLUSASG && t->op != MINUSASG) || t->left->op != NAME) return false;
    const NODE* sum = t->op == ASG ? t->right : t;
    if (t->op == ASG && sum->op != PLUS && sum->op != MINUS) return false;
    if (sum->left->op != NAME || sum->left->u.sym != t->left->u.sym || sum->right->op != ICON) return false;
    TYPE* type = t->left->type;
    const bool is_in_its_type =
        type->is_pointer() ||
        (t->op == ASG ? equiv_mtypes(sum->type, type) : compound_ASG_computes_in(type, t->op, t->left, t->right));
    if (!is_in_its_type) return false;
    const bool subtracts = sum->op == MINUS || sum->op == MINUSASG;
    step->sym = t->left->u.sym;
    step->c = subtracts ? -sum->right->u.lval : sum->right->u.lval;
    return true;
}

NODE* value_behind_step(const VARIABLE_STEP& step, INT65 c) {
    TYPE* type = step.sym->type->stqs();
    return maketree(PLUS, mk_NAME(step.sym), mk_ICON(c, type->is_pointer() ? tp->long_t : type), type);
}
