// The opcode table of the I-file layer.
#include "IFILE/ifile.h"

#include <cstdlib>
#include <mutex>

IF_NODE_INFO if_node_info[IF_NODE_TABLE_SIZE];

void if_enter_node(int op, const char* name, int operand_count) {
    if (op < 0 || op >= IF_NODE_TABLE_SIZE) {
        std::fputs("\nINTERNAL ERROR: Invalid opcode, aborting", stdout);
        std::fflush(stdout);
        std::exit(1);
    }
    if_node_info[op] = {op, name, operand_count};
}

void if_node_table_init() {
    static std::once_flag once;
    std::call_once(once, [] {
#define IF_NODE(op, name, count) if_enter_node(op, #name, count);
#include "IFILE/if_nodes.def"
#undef IF_NODE
    });
}

// The parser writes integer comparisons for floating operands too. Signed and unsigned forms meet in one; "not equal"
// is the form that is true for unordered operands, as C wants it.
int if_float_relop(int op) {
    switch (op) {
    case if_op::EQ: return if_op::FEQ;
    case if_op::NEQ: return if_op::FNEQN;
    case if_op::LE:
    case if_op::ULE: return if_op::FLE;
    case if_op::LT:
    case if_op::ULT: return if_op::FLT;
    case if_op::GE:
    case if_op::UGE: return if_op::FGE;
    case if_op::GT:
    case if_op::UGT: return if_op::FGT;
    }
    return op;
}
