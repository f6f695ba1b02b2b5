// Built-in functions on sets: what the bounds of a call (OPT5/target/bif.h) do not tell.
#include "OPT5/vp/vp_eval.h"

#include "OPT5/ir/global.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"

#include <cstring>
#include <string>

namespace {

const NODE* argument(const NODE* call, int n) { return arg_list_lookup(call->left, n); }

bool is_arithmetic(const NODE* call, int arguments) {
    if (!has_value_range(call->type) || call->type->is_enum() || arg_list_count(call->left) != arguments) return false;
    for (int i = 0; i < arguments; ++i)
        if (!has_value_range(argument(call, i)->type)) return false;
    return true;
}

// Stops at the limits.
vpset saturated(const vpset& s, const RANGE& limits) {
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
    *out = saturated(sum, vpset_limits(type));
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
    *out = saturated(s, vpset_limits(call->type));
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

// ---- Products and fields. Operands are taken in the types of the built-in's parameters.

const TYPE* type_of_parameter(const NODE* call, int n) {
    const BIF* bif = find_BIF_descriptor(call->u.name);
    return bif && n < bif->nparams ? arg_list_lookup(bif->parameters, n)->type : nullptr;
}

bool operand(vpset* out, const NODE* call, int n, vpenv env) {
    const TYPE* type = type_of_parameter(call, n);
    if (!type || !has_value_range(type)) return false;
    *out = vpset_of_tree(argument(call, n), env);
    truncate_vpset_to_type(out, type);
    return !vpset_is_empty(*out);
}

vpenv eval_MPY_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    vpset a, b;
    if (!is_arithmetic(call, 2) || !operand(&a, call, 0, env) || !operand(&b, call, 1, env) || !vpset_product(out, a, b))
        make_vpset_empty(out);
    return env;
}

// The product of 64 bits, shifted down by a constant.
vpenv eval_MPY_32_32_64_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    vpset a, b, count, product;
    if (!is_arithmetic(call, 3) || !operand(&a, call, 0, env) || !operand(&b, call, 1, env) || !operand(&count, call, 2, env) ||
        !vpset_is_single(count) || !vpset_product(&product, a, b))
        return env;
    vpset_shifted_down(out, product, static_cast<int>(vpset_minimum(count) & 63));
    truncate_vpset_to_type(out, call->type);
    return env;
}

// The half of a long.
vpenv eval_EXT_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    vpset s;
    if (!is_arithmetic(call, 1) || !operand(&s, call, 0, env)) return env;
    const bool is_high = std::strcmp(call->u.name, "ETSI_EXTRACT_H") == 0;
    vpset_shifted_down(out, s, is_high ? 16 : 0);
    truncate_vpset_to_type(out, tp->short_t);
    return env;
}

// One bit of an int.
vpenv eval_TBIT_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    vpset s, position, down;
    if (!is_arithmetic(call, 2)) return env;
    *out = vpset(make_vpslice(0, 1, 1));
    if (!operand(&s, call, 0, env) || !operand(&position, call, 1, env) || !vpset_is_single(position)) return env;
    vpset_shifted_down(&down, s, static_cast<int>(vpset_minimum(position) & 15));
    if (vpset_delta(down) % 2 == 0) *out = vpset(single_slice(vpset_minimum(down) & 1));
    return env;
}

// __satlow16(a), and __IQsat(a, high, low), whose lower limit wins.
vpenv eval_SAT_ICALL(vpset* out, const NODE* call, struct LOOP*, vpenv env, int) {
    vpset s, high, low;
    const int arguments = arg_list_count(call->left);
    if (!is_arithmetic(call, arguments) || !operand(&s, call, 0, env)) return env;
    if (arguments == 1) {
        *out = saturated(s, vpset_limits(tp->int_t));
        return env;
    }
    if (!operand(&high, call, 1, env) || !operand(&low, call, 2, env)) return env;
    const WIDE most = std::max(std::min(vpset_maximum(s), vpset_maximum(high)), vpset_maximum(low)),
               least = std::max(std::min(vpset_minimum(s), vpset_minimum(high)), vpset_minimum(low));
    *out = vpset(make_vpslice(least, most, 1));
    return env;
}

} // namespace

VPSET_EVALUATOR vpset_evaluator_of(const NODE* call) {
    static const std::unordered_map<std::string, VPSET_EVALUATOR> evaluators = {
        {"quest$colon", eval_qc_ICALL},   {"ETSI_ABS_S", eval_ABS_ICALL}, {"ETSI_L_ABS", eval_ABS_ICALL},
        {"__abs16_sat", eval_ABS_ICALL},  {"ETSI_ADD", eval_SADD_ICALL},  {"ETSI_L_ADD", eval_SADD_ICALL},
        {"ETSI_SUB", eval_SSUB_ICALL},    {"ETSI_L_SUB", eval_SSUB_ICALL},
        {"__mpy", eval_MPY_ICALL},        {"__mpyb", eval_MPY_ICALL},
        {"__mpyu", eval_MPY_ICALL},       {"__mpyxu", eval_MPY_ICALL},
        {"__IQmpy", eval_MPY_32_32_64_ICALL}, {"__qmpy32", eval_MPY_32_32_64_ICALL},
        {"__qmpy32by16", eval_MPY_32_32_64_ICALL}, {"ETSI_EXTRACT_H", eval_EXT_ICALL},
        {"ETSI_EXTRACT_L", eval_EXT_ICALL}, {"__tbit", eval_TBIT_ICALL},
        {"__satlow16", eval_SAT_ICALL},   {"__IQsat", eval_SAT_ICALL}};
    auto it = evaluators.find(call->u.name);
    return it == evaluators.end() ? nullptr : it->second;
}
