// Loops that are not unrolled: the repeat instruction runs a body of one instruction without any overhead, and a few
// more that the pipeline keeps busy by themselves gain nothing from copies.
#include "OPT5/dd/unrolling_veto.h"

#include "OPT5/dd/loop.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/target/target.h"

#include <algorithm>
#include <cstring>

namespace {

bool is_call_of(const NODE* t, int op, const char* name) { return t->op == op && !std::strcmp(t->u.name, name); }
bool is_whole_number(const TYPE* t) { return t->is_int() || t->is_enum(); }

bool is_minmax(const NODE* t) {
    static const char* const names[] = {"__min", "__lmin", "__max", "__lmax"};
    return t->op == ICALL && std::any_of(std::begin(names), std::end(names),
                                         [t](const char* name) { return !std::strcmp(t->u.name, name); });
}

const NODE* argument(const NODE* call, int index) {
    return below_SSA(static_cast<const NODE*>(arg_list_lookup(call->left, index)));
}

// The product of two fractions, of which the high word is taken.
bool is_fraction_product(const NODE* t) {
    if (!is_call_of(t, ICALL, "__IQmpy") || arg_list_count(t->left) < 3) return false;
    const NODE* digits = argument(t, 2);
    return digits->op == ICON && digits->u.lval == INT65(32) &&
           !trees_are_congruent(argument(t, 0), argument(t, 1), false);
}

} // namespace

template <target_kop K>
bool loop_is_OK_for_unrolling_on_target<K>::ssa_stmt_is_multiply_accumulate(const NODE* stmt) {
    const NODE* t = below_SSA(stmt);
    if (is_call_of(t, MCALL, "__dmac")) return true;
    const bool is_int = is_whole_number(t->type);
    if (t->op != PLUSASG && !(is_int && t->op == MINUSASG)) return false;
    const NODE* value = below_SSA(static_cast<const NODE*>(t->right));
    if (is_int && (value->op == SLL || value->op == SRL)) value = below_SSA(static_cast<const NODE*>(value->left));
    if (is_fraction_product(value)) return true;
    if (value->op != MULT) return false;
    return !value->type->is_float() || !trees_are_congruent(value->left, value->right, false);
}

template <target_kop K>
int loop_is_OK_for_unrolling_on_target<K>::count_fp_arithm(const NODE* t) {
    int n = 0;
    for_each_subtree(t, [&n](const NODE* s) {
        const bool computes = s->op == PLUS || s->op == MINUS || s->op == MULT || s->op == ICALL;
        n += (computes && s->type->is_float()) || (s->op >= FEQ && s->op <= FGTN);
    });
    return n;
}

template <target_kop K>
int loop_is_OK_for_unrolling_on_target<K>::count_significant_int_ops(const NODE* t, int& minmax) {
    if (!t || t->op == ICON || t->op == FCON || t->op == MEMCPY || t->op == ASM) return 0;
    int n = 0;
    if (t->op != IF && t->op != SWITCH) n += count_significant_int_ops(t->right, minmax); // labels
    n += count_significant_int_ops(t->left, minmax);
    switch (t->op) {
    case ANDB:
    case ANDBASG:
    case ORB:
    case ORBASG:
    case XORB:
    case XORBASG: return n + 1;
    case MULT: return n + (is_whole_number(t->type) && t->right->op != ICON);
    case ICALL:
        minmax += is_minmax(t);
        // A product of fractions takes more instructions beside others, and where the unit for them is another one.
        return n + (is_call_of(t, ICALL, "__IQmpy") && (float_support != 0 || n > 0) ? 2 : 1);
    default: return n;
    }
}

template <target_kop K>
void loop_is_OK_for_unrolling_on_target<K>::count_store(const NODE* asg, int ops) {
    const NODE *to = below_SSA(static_cast<const NODE*>(asg->left)),
               *value = below_SSA(static_cast<const NODE*>(asg->right));
    if (asg->op != ASG || (to->op != UMULT && to->op != STDOT)) return;
    if (to->type->is_float()) {
        float_stores += value->op != ICON && value->op != FCON;
        return;
    }
    if (value->op == ICON) {
        constant_stores += truncate_to_type(value->u.lval, tp->short_t) == value->u.lval;
        return;
    }
    copies += to->op == UMULT && value->op == UMULT;
    plain_stores += ops == 0;
}

template <target_kop K>
void loop_is_OK_for_unrolling_on_target<K>::count(const LIST* statements) {
    for (const LIST* s = statements; s; s = s->rest) {
        if (!s->first || s->first->op == SSA_PHI) continue;
        const NODE* t = below_SSA(static_cast<const NODE*>(s->first));
        if (is_call_of(t, MCALL, "__dmac")) {
            ++dmacs;
        } else if (ssa_stmt_is_multiply_accumulate(t)) {
            ++(t->type->is_float() ? float_macs : int_macs);
        } else {
            const int ops = count_significant_int_ops(t, minmax);
            fp_ops += count_fp_arithm(t);
            int_ops += ops;
            count_store(t, ops);
        }
    }
}

template <target_kop K>
bool loop_is_OK_for_unrolling_on_target<K>::is_OK(bool single) const {
    const bool has_float = float_support != 0;
    if (int_ops == 0 && plain_stores == 0 && int_macs == 1) return false;
    if (int_ops > 0 && int_macs > 0) return false;
    if (float_stores + fp_ops > 1 || (float_macs == 1 && fp_ops == 0)) return false;
    if (copies > 0 && int_ops + plain_stores < (has_float ? 3 : 2)) return false;
    const int w = int_ops + (int_ops >= 2 ? plain_stores : 0);
    if (w >= 3 && has_float && single) return false;
    if ((dmacs > 0 && single) || (w > 3 && !has_float)) return false;
    if (!single || rtc_no_rpt_ins()) return true;
    if (fp_ops == 0 && plain_stores == 0 && w == 1 && minmax == 1) return false;
    return !(constant_stores == 1 && fp_ops == 0 && plain_stores == 0 && w == 0);
}

template <target_kop K>
bool loop_is_OK_for_unrolling_on_target<K>::operator()(const LIST* statements, bool single) {
    *this = {};
    count(statements);
    return is_OK(single);
}

template <target_kop K>
bool loop_is_OK_for_unrolling_on_target<K>::operator()(const struct LOOP* loop) {
    *this = {};
    for (const BBLK* bb : loop->contents) count(bb->statements);
    return is_OK(loop->head == loop->tail);
}

template class loop_is_OK_for_unrolling_on_target<ZELKOVA>;
