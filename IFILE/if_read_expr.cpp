// Expression trees, statements and initializers.
//
// A tree is its nodes in prefix order; where it ends follows from the operand counts alone. The nodes that wait for
// operands stand on a stack of this layer's own, so the depth of a tree costs no native stack.
#include "IFILE/if_reader.h"

namespace {
constexpr char bad_record[] = "\nINTERNAL ERROR: Invalid I-code record, aborting";
}

// ---- Payloads by opcode

void I_FILE::if_read_expr_name(BASE_NODE* node) {
    int32_t symbol_level = static_cast<int32_t>(i_read_uint());
    uint64_t index = i_read_uint();
    node->mk_name(find_symbol(symbol_level, index, "NAME"));
}

void I_FILE::if_read_expr_field(BASE_NODE* node) {
    int kind = i_read_s8();
    if (kind != 1) bad_input("FIELD of kind %d, expected 1", kind);
    uint64_t member_number = i_read_uint();
    uint64_t type_number = i_read_uint();
    TYPE* csu = find_typeref(type_number);
    if (!csu || !csu->is_csu())
        bad_input("FIELD names type %llu, which is no structure", static_cast<unsigned long long>(type_number));
    fkMDATA* member = find_mdataref(type_number, member_number);
    if (!member)
        bad_input("FIELD names member %llu of type %llu, which has none of that number",
                  static_cast<unsigned long long>(member_number), static_cast<unsigned long long>(type_number));
    csu = csu->real; // what a typedef names may have been merged too
    while (csu->equiv) csu = csu->equiv;
    node->mk_field(kind, member, csu);
}

// A constant has 32 bits in the file; the type says whether the sign or zeros extend them.
void I_FILE::if_read_expr_icon(BASE_NODE* node) {
    if (node->type && node->type->is_signed())
        node->mk_icon(static_cast<int32_t>(i_read_sint()));
    else
        node->mk_icon(static_cast<uint32_t>(i_read_uint()));
}

void I_FILE::if_read_expr_scon(BASE_NODE* node) {
    uint64_t length = i_read_uint();
    if (length > rest())
        bad_input("string constant of %llu bytes in a record with %llu left", static_cast<unsigned long long>(length),
                  static_cast<unsigned long long>(rest()));
    const uint8_t* bytes = i_read_raw(length);
    node->mk_scon(reinterpret_cast<const char*>(bytes), static_cast<uint32_t>(length));
}

void I_FILE::if_read_expr_lcon(BASE_NODE* node) { node->mk_lcon(i_read_string()); }

void I_FILE::if_read_expr_fcon(BASE_NODE* node) { node->mk_fcon(i_read_string()); }

void I_FILE::if_read_expr_icall(BASE_NODE* node) { node->mk_icall(i_read_string()); }

void I_FILE::if_read_expr_label(BASE_NODE* node) {
    uint64_t label = i_read_uint();
    if (label > INT32_MAX) bad_input("reference to label %llu", static_cast<unsigned long long>(label));
    node->mk_label(static_cast<uint32_t>(label));
}

void I_FILE::if_read_expr_vreg(BASE_NODE* node) { node->mk_vreg(static_cast<int32_t>(i_read_sint())); }

void I_FILE::if_read_expr_skip(BASE_NODE* node) { node->mk_skip(static_cast<uint32_t>(i_read_uint())); }

void I_FILE::if_read_expr_switch(BASE_NODE* node) { node->mk_switch(i_read_uint32("case count")); }

void I_FILE::if_read_expr_ddnode(BASE_NODE* node) {
    uint32_t id = static_cast<uint32_t>(i_read_uint());
    uint32_t locale = static_cast<uint32_t>(i_read_uint());
    node->mk_ddnode(id, locale, i_read_u8());
}

void I_FILE::if_read_expr_call(BASE_NODE* node) {
    uint32_t num_vargs = i_read_uint32("number of variable arguments");
    uint32_t entry = i_read_uint32("exception entry");
    if (entry > max_eh_entry) max_eh_entry = entry;
    node->mk_call(num_vargs, entry);
}

void I_FILE::if_read_expr_ucall(BASE_NODE* node) {
    uint32_t entry = i_read_uint32("exception entry");
    if (entry > max_eh_entry) max_eh_entry = entry;
    node->mk_ucall(entry);
}

void I_FILE::if_read_expr_pval(BASE_NODE* node) { node->set_edge_profile_value(static_cast<uint32_t>(i_read_uint())); }

void I_FILE::read_node_payload(BASE_NODE* node) {
    switch (node->op) {
    case if_op::LABEL: return if_read_expr_label(node);
    case if_op::NAME: return if_read_expr_name(node);
    case if_op::SCON: return if_read_expr_scon(node);
    case if_op::ICON: return if_read_expr_icon(node);
    case if_op::FCON: return if_read_expr_fcon(node);
    case if_op::LCON: return if_read_expr_lcon(node);
    case if_op::FIELD: return if_read_expr_field(node);
    case if_op::SWITCH: return if_read_expr_switch(node);
    case if_op::CALL: return if_read_expr_call(node);
    case if_op::UCALL: return if_read_expr_ucall(node);
    case if_op::EPVAL: return if_read_expr_pval(node);
    case if_op::SKIP: return if_read_expr_skip(node);
    case if_op::DDNODE: return if_read_expr_ddnode(node);
    case if_op::ICALL:
    case if_op::UICALL:
    case if_op::MCALL:
    case if_op::UMCALL: return if_read_expr_icall(node);
    case if_op::VREG: return if_read_expr_vreg(node);
    }
}

// ---- Trees

// A node from the payload of its record, without operands.
BASE_NODE* I_FILE::read_node() {
    int op = i_read_u8();
    if (op > IF_MAX_OPCODE || !if_node_info[op].name) bad_input("%s", bad_record);
    BASE_NODE* node = client->new_node(op, find_typeref(i_read_uint()));
    read_node_payload(node);
    end_record();
    return node;
}

namespace {
bool is_floating(const BASE_NODE* node) { return node && node->type && node->type->is_float(); }

void finish_node(BASE_NODE* node, BASE_NODE* left, BASE_NODE* right) {
    node->set_operands(left, right);
    if (node->op >= if_op::EQ && node->op <= if_op::UGT && (is_floating(left) || is_floating(right)))
        node->op = if_float_relop(node->op);
}
} // namespace

BASE_NODE* I_FILE::if_read_expr_node(bool with_frame) {
    open_nodes.clear();
    for (;; with_frame = true) {
        if (with_frame && i_read_header() != IFR_NODE) bad_input("%s", bad_record);
        BASE_NODE* done = read_node();
        if (int operands = if_node_info[done->op].operand_count) {
            if (open_nodes.size() >= IF_MAX_TREE_DEPTH) bad_input("tree deeper than %d", IF_MAX_TREE_DEPTH);
            open_nodes.push_back({done, nullptr, operands});
            continue;
        }
        done->set_operands(nullptr, nullptr);
        for (;;) { // hand it up to the first node that still lacks an operand
            if (open_nodes.empty()) return done;
            OPEN_NODE& top = open_nodes.back();
            if (top.operands == 2 && !top.left) {
                top.left = done;
                break;
            }
            if (top.operands == 2)
                finish_node(top.node, top.left, done);
            else
                finish_node(top.node, done, nullptr);
            done = top.node;
            open_nodes.pop_back();
        }
    }
}

// ---- Statements and initializers

void I_FILE::if_read_expr_header() {
    PSN* psn = i_read_psn();
    end_record();
    need_function("expression");
    // A header may stand alone; a tree that belongs to it follows at once.
    bool has_tree = cursor != image_end && *cursor == IFR_NODE;
    client->cl_expr(has_tree ? if_read_expr_node(true) : nullptr, psn);
}

void I_FILE::if_read_init() {
    uint64_t index = i_read_uint();
    end_record();
    I_SYMTAB* sym = find_symbol(0, index, "initializer");
    if (reading_unit) {
        if (defined[index]) bad_input("second initializer of %s", sym->sym_name());
        defined[index] = true;
    }
    std::vector<BASE_NODE*> list;
    do {
        list.push_back(if_read_expr_node(true));
    } while (list.back()->op != if_op::ENDINIT);
    client->cl_symbol_init(sym, list);
}
