// How far a counted loop of one block is unrolled: small ones wholly, others as far as pays.
//
// Where the repeat instruction runs such loops, a body is unrolled to about as many nodes as keep it busy; a body that
// the multiply-accumulate hardware runs under that instruction by itself is left alone. Without it, the bookkeeping of
// a few cheap statements is what unrolling saves.

#include "OPT5/target/target.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/trees.h"
#include "OPT5/target/accumulators.h"
#include "OPT5/target/bif.h"

#include <algorithm>
#include <cstring>


namespace {

constexpr long NO_COST = 12345;      // of what the walk does not know: ends it
constexpr long CHEAP = 5;            // statements up to this cost are worth unrolling for size as well
constexpr int64_t WANTED_NODES = 64; // of an unrolled body
constexpr int64_t MOST_COPIES = 128; // a large prime of the count is no reason for as many copies

// Calls that run best under the repeat instruction.
bool is_call_to_repeat(const NODE* t) {
    static const char* const names[] = {
        "__parallel_mpy_add_f32",    "__dmac",
        "__parallel_mpy_add",        "__parallel_mpy_sub",
        "__parallel_sqr_add",        "__parallel_sqr_sub",
        "__parallel_mpy_add_s32_lo", "__parallel_mpy_sub_s32_lo",
        "__parallel_mpy_add_s32_hi", "__parallel_mpy_sub_s32_hi",
    };
    if (t->op == ICALL) return !strcmp(t->u.name, "__IQmpy");
    return t->op == MCALL &&
           std::any_of(std::begin(names), std::end(names), [t](const char* name) { return !strcmp(t->u.name, name); });
}

// A division by a constant does later on, and those may all be unrolled.
bool becomes_other_operators(const NODE* division) {
    return division->type->is_int() && division->right->op == ICON && !division->right->u.lval.is_zero();
}

// Whether each operator of a statement may stand in an unrolled loop.
bool node_is_OK_for_unrolling(const NODE* t) {
    if (t->type->is_float() && !has_hardware_float()) return false;
    switch (t->op) {
    case FCON: return true;
    case MEMCPY:
    case CALL:
    case UCALL: return false;
    case DIV:
    case MOD: return becomes_other_operators(t);
    case ASM: return tree_is_ASM_comment(t);
    case ASG:
        if (t->type->is_vector() && t->left->op != NAME) return false;
        break;
    }
    return op_OK_for_SP[t->op];
}

} // namespace

bool tree_is_OK_for_unrolling(const NODE* stmt) {
    return !tree_contains_matching_node(stmt, [](const NODE* t) { return !node_is_OK_for_unrolling(t); });
}

namespace {

bool leave_to_repeat(const NODE* t) {
    if (has_a_likely_serial_zelkova_mac(t) || tree_contains_matching_node(t, is_call_to_repeat)) return true;
    if (t->op == ASG && t->left->op == UMULT && t->right->op == UMULT) return true;
    return !tree_is_OK_for_unrolling(t);
}

// ---- The cost of a statement

bool is_plain_variable(const NODE* t) {
    if (t->op != NAME || !t->u.sym) return false;
    const SYMTAB* s = t->u.sym;
    const TYPE* type = s->type;
    if (s->sclass != SC_AUTO || s->is_aliased() || lvalue_is_volatile(t)) return false;
    return type->is_pointer() || ((type->is_int() || type->is_enum()) && type->size <= 16);
}

bool is_positive_constant(const NODE* t) { return t->op == ICON && INT65(0) < t->u.lval; }

bool is_plain_address(const NODE* t) {
    if (t->op == PLUSPLUS) return is_plain_variable(t->left) && is_positive_constant(t->right);
    return is_plain_variable(t);
}

bool costs_one(const NODE* t);

long cost_of_sum_into(const NODE* place, const NODE* sum) {
    const NODE *same = sum->left, *other = sum->right;
    if (!trees_are_congruent(place, same, false)) std::swap(same, other);
    if (!trees_are_congruent(place, same, false)) return NO_COST;
    if (place->op == NAME && place->type->is_pointer() && is_plain_variable(place) && is_positive_constant(other))
        return 1;
    return costs_one(other) ? 3 : NO_COST;
}

// What the tree adds, or NO_COST. An address is no value of 16 bits, but a register's.
long cost_of(const NODE* t) {
    if (!t) return 0;
    const bool is_word = t->type->is_scalar() && (t->type->size <= 16 || t->type->is_pointer());
    if (!is_word) return NO_COST;
    switch (t->op) {
    case NAME: return is_plain_variable(t) ? 1 : NO_COST;
    case ICON: return 1;
    case UMULT: return is_plain_address(t->left) ? 1 : NO_COST;
    case PLUSASG:
    case MINUSASG: return costs_one(t->left) && costs_one(t->right) ? 3 : NO_COST;
    case ASG: {
        const bool is_place = t->left->op == NAME || t->left->op == UMULT;
        if (t->right->op == PLUS && is_place) {
            const long cost = cost_of_sum_into(t->left, t->right);
            if (cost != NO_COST) return cost;
        }
        return costs_one(t->left) && costs_one(t->right) ? 3 : NO_COST;
    }
    default: return NO_COST;
    }
}

bool costs_one(const NODE* t) { return cost_of(t) == 1; }

// The sum over the statements; NO_COST if one is not known; -1 for a loop that stays as it is.
long cost_of_body(const LIST* statements) {
    long cost = 0;
    for (; statements && statements->rest; statements = statements->rest) {
        NODE* t = normalize_zelkova_accumulation(copy_tree(statements->first));
        const bool stays = leave_to_repeat(t);
        const long own = stays || tree_is_ASM_comment(t) ? 0 : cost_of(t);
        cost = own == NO_COST ? NO_COST : cost + own;
        if (print_debug && !stays)
            debug_printf("\tCumulative loop_unrolling_factor() cost=%d for %s\n", static_cast<int>(cost),
                         stmt2infix(t).c_str());
        erase_tree(t);
        if (stays || (cost > CHEAP && size_speed_goal() < 4)) return -1;
        if (cost == NO_COST) break;
    }
    return cost;
}

// ---- Factors

int64_t factor_without_repeat(int64_t n) {
    if (n <= 6) return n;
    if (n % 3 == 0 && n > 14) return 3;
    if (n % 2 == 0 && n > 9) return 2;
    if (n % 3 == 1 && n > 23) return 3;
    if (n % 2 == 1 && n > 21) return 2;
    return 1;
}

int64_t factor_for_nodes(int64_t nodes, int64_t n) {
    const int64_t start = (nodes + WANTED_NODES - 1) / nodes, cap = size_speed_goal() >= 5 ? 16 : 8;
    for (int64_t d = start; d <= std::min(n / 2, MOST_COPIES); ++d)
        if (n % d == 0) return d;
    if (n <= cap) return n;
    int64_t d = n < 2 * cap ? n / 2 : cap;
    while (n % d != 0) --d;
    return d;
}

} // namespace

INT65 loop_unrolling_factor(const LIST* statements, INT65 count) {
    if (count < INT65(2) || !count.fits<int64_t>()) return 1;
    const int64_t n = count.fits_in<int64_t>();
    const long cost = cost_of_body(statements);
    if (cost < 0) return 1;
    if (cost <= CHEAP && n <= 3) return n;
    if (size_speed_goal() < 4) return 1;
    if (!rtc_RPT_ok_for_loop) return cost > CHEAP ? 1 : factor_without_repeat(n);
    int64_t nodes = 0;
    for (; statements && statements->rest; statements = statements->rest)
        nodes += count_nodes_in_tree(statements->first);
    return nodes == 0 || nodes > WANTED_NODES ? 1 : factor_for_nodes(nodes, n);
}
