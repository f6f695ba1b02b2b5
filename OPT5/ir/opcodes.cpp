// The opcode tables: filled from opcodes.def, then held against the I-file layer's own table, since the two number the
// same format and a silent difference would write wrong files.

#include "OPT5/ir/opcodes.h"

#include "IFILE/ifile.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <cstdio>
#include <cstring>

const char* node_operator_name[NO_OPCODES];
uint8_t number_of_operands[NO_OPCODES];
uint8_t precedence[NO_OPCODES];
uint8_t side_effects[NO_OPCODES];
bool op_OK_for_SP[NO_OPCODES];
uint8_t commute_inv[NO_OPCODES];
bool boolean_result[NO_OPCODES];
uint8_t boolean_inv[NO_OPCODES];
uint8_t op_of_opASG[NO_OPCODES];
uint8_t op_traits[NO_OPCODES];
int float_micro_ops_to_op[16];

namespace {

constexpr uint8_t ANY_COUNT = 255;

struct ROW {
    int op;
    const char* name;
    uint8_t operands, precedence, side_effect;
    bool sp_ok;
    int mirror, negation, base;
};

constexpr ROW rows[] = {
#define OPCODE(code, name, operands, precedence, side_effect, sp, mirror, negation, base)                              \
    {code, #name, operands, precedence, side_effect, sp, mirror, negation, base},
#include "OPT5/ir/opcodes.def"
#undef OPCODE
};

uint8_t traits_of(int op) {
    const bool assigns =
        op == ASG || op == STASG || op == ARASG || op == PLUSPLUS || op == MINMIN || op_of_opASG[op] != ILLOP;
    const bool writes_left = (side_effects[op] == 1 && !op_is_SSA(op)) || op == ARASG || op == LOOP || op == INITLOOP ||
                             op == ENDLOOP;
    const bool acts = side_effects[op] != 0 || op == ARGREF || op_is_call(op) || op_is_intrinsic(op);
    return static_cast<uint8_t>((assigns ? OP_ASSIGNS : 0) | (writes_left ? OP_WRITES_LEFT : 0) | (acts ? OP_ACTS : 0));
}

void fill_tables() {
    for (int op = 0; op < NO_OPCODES; ++op) {
        node_operator_name[op] = nullptr;
        number_of_operands[op] = ANY_COUNT;
        precedence[op] = side_effects[op] = 0;
        op_OK_for_SP[op] = boolean_result[op] = false;
        commute_inv[op] = boolean_inv[op] = op_of_opASG[op] = ILLOP;
    }
    for (const ROW& r : rows) {
        node_operator_name[r.op] = r.op == LABELREF ? "LABEL" : r.name;
        number_of_operands[r.op] = r.operands;
        precedence[r.op] = r.precedence;
        side_effects[r.op] = r.side_effect;
        op_OK_for_SP[r.op] = r.sp_ok;
        commute_inv[r.op] = static_cast<uint8_t>(r.mirror);
        boolean_result[r.op] = r.negation != NOT_BOOLEAN;
        boolean_inv[r.op] = static_cast<uint8_t>(boolean_result[r.op] ? r.negation : ILLOP);
        op_of_opASG[r.op] = static_cast<uint8_t>(r.base);
    }
    for (int op = 0; op < NO_OPCODES; ++op) op_traits[op] = traits_of(op);
    float_micro_ops_to_op[0] = FLOAT_ALWAYS_FALSE;
    float_micro_ops_to_op[15] = FLOAT_ALWAYS_TRUE;
    for (int op = FEQ; op <= FUNO; ++op) float_micro_ops_to_op[float_op_to_micro_ops[op - FEQ]] = op;
}

bool same_text(const char* a, const char* b) { return a && b && !strcmp(a, b); }

// Three rows by heart: an I-file table that is empty or shifted shows here, whatever the loop below compares.
bool anchors_match() {
    auto is = [](int op, const char* name, int operands) {
        const IF_NODE_INFO& info = if_node_info[op];
        return info.op == op && info.operand_count == operands && same_text(info.name, name);
    };
    return is(NAME, "NAME", 0) && is(UMINUS, "UMINUS", 1) && is(CALL, "CALL", 2);
}

bool rows_match() {
    bool ok = true;
    for (int op = 0; op <= IF_MAX_OPCODE; ++op) {
        const char* name = node_operator_name[op];
        if (!name) continue;
        const IF_NODE_INFO& info = if_node_info[op];
        if (info.op == op && info.operand_count == number_of_operands[op] && same_text(info.name, name)) continue;
        ok = false;
        if (!print_debug) continue;
        debug_printf("OP#%d: %d || %d || (%d != %d) <<%s>> <<%s>>\n", op, op, info.op, number_of_operands[op],
                     info.operand_count, name, info.name ? info.name : "");
        if (!info.name) debug_printf("\tNo match for %s\n", name);
    }
    return ok;
}

void check_micro_ops() {
    for (int op = FEQ; op <= FUNO; ++op) {
        if (float_micro_ops_to_op[float_op_to_micro_ops[op - FEQ]] == op) continue;
        const char* format = "float_micro_ops_to_op is not the reverse of float_op_to_micro_ops at %s\n";
        debug_printf(format, opname(op));
        fprintf(stderr, format, opname(op));
        abort_optimizer();
    }
}

} // namespace

void init_opcode_tables() {
    if_node_table_init();
    fill_tables();
    if (print_debug) debug_printf(" *** VALIDATING OPCODE TABLES\n");
    if (!anchors_match() || !rows_match()) {
        fputs("INTERNAL ERROR: if_node_info[] mismatch\n", stderr);
        abort_optimizer();
    }
    check_micro_ops();
    if (print_debug) debug_printf(" *** OPCODE TABLES ARE OK\n\n");
}

const char* opname(int op) {
    if (op >= 0 && op < NO_OPCODES && node_operator_name[op]) return node_operator_name[op];
    thread_local char text[24];
    snprintf(text, sizeof text, "OP#%d", op);
    return text;
}

int opASG_of_op(int op) {
    switch (op) {
    case PLUS: return PLUSASG;
    case MINUS: return MINUSASG;
    case MULT: return MULTASG;
    case ANDB: return ANDBASG;
    case ORB: return ORBASG;
    case XORB: return XORBASG;
    case DIV: return DIVASG;
    case MOD: return MODASG;
    case SLL: return SLLASG;
    case SRL: return SRLASG;
    default: return ILLOP;
    }
}
