// Built-in functions on sets: what the bounds of a call (OPT5/target/bif.h) do not tell.
#include "OPT5/vp/vp_eval.h"

#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"

#include <string>

namespace {

const NODE* argument(const NODE* call, int n) { return arg_list_lookup(call->left, n); }

bool is_arithmetic(const NODE* call, int arguments) {
    if (!has_value_range(call->type) || call->type->is_enum() || arg_list_count(call->left) != arguments) return false;
    for (int i = 0; i < arguments; ++i)
        if (!has_value_range(argument(call, i)->type)) return false;
    return true;
}

// Stops at the bounds of the type.
vpset saturated(const vpset& s, const TYPE* type) {
    const RANGE limits = vpset_limits(type);
    vpset inside;
    if (!vpset_within(&inside, s, limits.min, limits.max)) make_vpset_empty(&inside);
    VPSLICE_LIST list;
    for (const VPSLICE& slice : inside) list.push_back(slice);
    if (vpset_minimum(s) < limits.min) list.push_back(single_slice(limits.min));
    if (vpset_maximum(s) > limits.max) list.push_back(single_slice(limits.max));
    return vpset_of(list);
}

// The sum of `a` and `sign` times `b`, which stops at the bounds of the type.
void vpslice_saddssub(vpset* out, const vpset& a, const vpset& b, int sign, const TYPE* type) {
    vpset sum, other = b;
    if (sign < 0) vpset_negative(&other, b);
    vpset_sum(&sum, a, other);
    *out = saturated(sum, type);
}

// Both arms are computed; each is used where the condition chooses it.
vpenv eval_qc_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    for (bool holds : {true, false}) {
        vpenv chosen = env;
        const NODE* arm = argument(call, holds ? 1 : 2);
        if (!has_vpset(arm->type) || arm->type->is_pointer() != call->type->is_pointer()) {
            make_vpset_empty(out);
            return env;
        }
        if (!filter_vpenv(&chosen, argument(call, 0), holds)) continue;
        vpset s = vpset_of_tree(arm, chosen), before = *out;
        truncate_vpset_to_type(&s, call->type);
        if (vpset_is_empty(before))
            *out = s;
        else
            vpset_union(out, before, s);
    }
    return env;
}

vpenv eval_ABS_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    if (!is_arithmetic(call, 1)) return env;
    vpset s;
    vpset_absolute(&s, vpset_of_tree(argument(call, 0), env));
    *out = saturated(s, call->type);
    return env;
}

vpenv eval_sum(vpset* out, const NODE* call, vpenv env, int sign) {
    if (is_arithmetic(call, 2))
        vpslice_saddssub(out, vpset_of_tree(argument(call, 0), env), vpset_of_tree(argument(call, 1), env), sign,
                         call->type);
    return env;
}
vpenv eval_SADD_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    return eval_sum(out, call, env, 1);
}
vpenv eval_SSUB_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    return eval_sum(out, call, env, -1);
}

} // namespace

VPSET_EVALUATOR vpset_evaluator_of(const NODE* call) {
    static const std::unordered_map<std::string, VPSET_EVALUATOR> evaluators = {
        {"quest$colon", eval_qc_ICALL},   {"ETSI_ABS_S", eval_ABS_ICALL}, {"ETSI_L_ABS", eval_ABS_ICALL},
        {"__abs16_sat", eval_ABS_ICALL},  {"ETSI_ADD", eval_SADD_ICALL},  {"ETSI_L_ADD", eval_SADD_ICALL},
        {"ETSI_SUB", eval_SSUB_ICALL},    {"ETSI_L_SUB", eval_SSUB_ICALL}};
    auto it = evaluators.find(call->u.name);
    return it == evaluators.end() ? nullptr : it->second;
}
