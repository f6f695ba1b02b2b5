// The opcode table of the I-file layer.
#include "IFILE/ifile.h"

#include <cstdlib>
#include <mutex>

IF_NODE_INFO if_node_info[201];

void if_enter_node(int op, const char* name, int operand_count) {
    if (op < 0 || op > 200) {
        std::fputs("\nINTERNAL ERROR: Invalid opcode, aborting", stdout);
        std::fflush(stdout);
        std::exit(1);
    }
    if_node_info[op] = {op, name, operand_count};
}

void if_node_table_init() {
    static std::once_flag once;
    std::call_once(once, [] {
#define IF_NODE(op, name, count) if_enter_node(op, name, count);
#include "IFILE/if_nodes.def"
#undef IF_NODE
    });
}

// The parser writes integer comparisons for floating operands too. Signed and unsigned forms meet in one; "not equal"
// is the form that is true for unordered operands, as C wants it.
int if_float_relop(int op) {
    static constexpr uint8_t float_form[10] = {143, 150, 145, 146, 147, 148, 145, 146, 147, 148};
    return op >= 80 && op <= 89 ? float_form[op - 80] : op;
}
