// Writing the records of the body, the initializers, and symbols.
#include "IFILE/if_writer.h"

#include "UTIL/abort.h"

// ---- Brackets and small records

void I_FILE::if_write_control(int kind, PSN* psn) {
    begin_payload();
    i_write_psn(psn);
    i_flush(kind);
    switch (kind) {
    case IFR_BEGIN_FUNC:
    case IFR_END_ARGS: level = kind == IFR_BEGIN_FUNC ? 1 : 2; break;
    case IFR_BEGIN_BLOCK: level++; break;
    case IFR_END_BLOCK: level--; break;
    case IFR_END_FUNC: level = 0; break;
    }
}

void I_FILE::if_write_begin_func(I_SYMTAB* sym, PSN* psn) {
    sym->set_location(static_cast<uint32_t>(if_tell()));
    begin_payload();
    i_write_psn(psn);
    i_write_uint(static_cast<uint32_t>(sym->index));
    i_flush(IFR_BEGIN_FUNC);
    level = 1;
    locals.clear();
}

void I_FILE::if_write_label(uint32_t label) {
    begin_payload();
    i_write_uint(label);
    i_flush(IFR_LABEL);
}

void I_FILE::if_write_assembly(const char* text, PSN* psn) {
    begin_payload();
    i_write_string(text, 0);
    i_write_psn(psn);
    i_flush(IFR_ASM);
}

void I_FILE::if_write_comment(const char* text) {
    begin_payload();
    i_write_string(text, 0);
    i_flush(IFR_COMMENT);
}

void I_FILE::if_write_source(const char* name) {
    begin_payload();
    i_write_string(name, 0);
    i_flush(IFR_FILE_NAME);
}

void I_FILE::if_write_func_info(uint8_t info) {
    begin_payload();
    i_write_i8(info);
    i_flush(IFR_FUNC_INFO);
}

// ---- Trees

void I_FILE::write_name(const BASE_NODE* node) {
    I_SYMTAB* sym = node->name_symbol();
    if (!sym) { // level -1 stands for no symbol
        i_write_uint(UINT32_MAX);
        i_write_uint(0);
        return;
    }
    if (sym->index < 0) {
        std::printf(">> Symbol %s is not in the symbol table\n", sym->sym_name());
        std::fflush(stdout);
        abort_optimizer();
    }
    i_write_uint(static_cast<uint32_t>(sym->sym_level()));
    i_write_uint(static_cast<uint32_t>(sym->index));
}

namespace {
// A reader finds the end of a tree by the operand counts: a node of another shape would garble all that follows.
bool has_file_form(const BASE_NODE* node) {
    if (node->op < 0 || node->op > IF_MAX_OPCODE || !if_node_info[node->op].name) return false;
    int count = if_node_info[node->op].operand_count;
    return (node->left_operand() != nullptr) == (count >= 1) && (node->right_operand() != nullptr) == (count == 2);
}
} // namespace

void I_FILE::write_node(const BASE_NODE* node) {
    OPT_ASSERT(has_file_form(node));
    begin_payload();
    i_write_i8(node->op);
    i_write_typeref(node->type);
    switch (node->op) {
    case if_op::LABEL: i_write_uint(node->label_id()); break;
    case if_op::NAME: write_name(node); break;
    case if_op::SCON:
        i_write_uint(node->scon_length());
        i_write_raw(reinterpret_cast<const uint8_t*>(node->scon_value()), node->scon_length());
        break;
    case if_op::ICON:
        if (node->type && node->type->is_signed())
            i_write_sint(node->icon_svalue());
        else
            i_write_uint(node->icon_uvalue());
        break;
    case if_op::FCON: i_write_string(node->fcon_value(), 0); break;
    case if_op::LCON: i_write_string(node->lcon_value(), 0); break;
    case if_op::FIELD:
        i_write_i8(node->field_kind());
        i_write_uint(node->field_mval()->ordinal);
        i_write_typeref(node->field_csu());
        break;
    case if_op::SWITCH: i_write_uint(node->case_count()); break;
    case if_op::CALL:
        i_write_uint(node->call_num_vargs());
        i_write_uint(node->eh_entry_id());
        break;
    case if_op::UCALL: i_write_uint(node->eh_entry_id()); break;
    case if_op::EPVAL: i_write_uint(node->get_edge_profile_value()); break;
    case if_op::SKIP: i_write_uint(node->skip_count()); break;
    case if_op::DDNODE:
        i_write_uint(node->ddnode_id());
        i_write_uint(node->ddnode_locale());
        i_write_i8(node->ddnode_flags());
        break;
    case if_op::ICALL:
    case if_op::UICALL:
    case if_op::MCALL:
    case if_op::UMCALL: i_write_string(node->icall_name(), 0); break;
    case if_op::VREG: i_write_sint(node->vreg_id()); break;
    }
    i_flush(IFR_NODE);
}

// Prefix order by an explicit stack of the right subtrees that wait.
void I_FILE::if_write_expr_node(const BASE_NODE* tree) {
    std::vector<const BASE_NODE*>& waiting = waiting_nodes;
    size_t bottom = waiting.size();
    for (const BASE_NODE* node = tree;;) {
        while (node) {
            write_node(node);
            if (const BASE_NODE* right = node->right_operand()) waiting.push_back(right);
            node = node->left_operand();
        }
        if (waiting.size() == bottom) return;
        node = waiting.back();
        waiting.pop_back();
    }
}

void I_FILE::if_write_expr(const BASE_NODE* tree, PSN* psn) {
    begin_payload();
    i_write_psn(psn);
    i_flush(IFR_EXPR);
    if (tree) if_write_expr_node(tree);
}

void I_FILE::if_write_init(I_SYMTAB* sym) {
    if (!inits_open) {
        i_write_eof(); // of the body
        inits_open = true;
        off_inits = if_tell();
    }
    sym->set_location(static_cast<uint32_t>(if_tell()));
    begin_payload();
    i_write_uint(static_cast<uint32_t>(sym->index));
    i_flush(IFR_INIT);
}

// ---- Symbols and pragmas

void I_FILE::if_write_symbol(I_SYMTAB* sym) {
    int pragmas = 0;
    for (const PRAGMA* p = sym->sym_pragma(); p; p = p->next) pragmas++;
    OPT_ASSERT(pragmas <= UINT8_MAX);
    begin_payload();
    i_write_string(sym->sym_name(), 0);
    i_write_uint(sym->sym_size());
    i_write_uint(sym->sym_value());
    i_write_i8(sym->sym_class());
    i_write_i16(sym->sym_cqual());
    i_write_typeref(sym->sym_type());
    i_write_typeref(sym->sym_cpp_type());
    i_write_uint(sym->sym_align());
    i_write_i8(pragmas); // what follows, whatever `sym_prag_num` counts
    i_write_uint(sym->sym_location());
    i_write_uint(sym->sym_option_set());
    i_write_psn(sym->sym_psn());
    i_write_i8(sym->retention);
    i_flush(IFR_SYMBOL);
    for (const PRAGMA* p = sym->sym_pragma(); p; p = p->next) if_write_pragma(p);
}

void I_FILE::if_write_pragma(const PRAGMA* pragma) {
    begin_payload();
    i_write_uint(pragma->kind);
    i_write_uint(pragma->args.size());
    for (const std::string& arg : pragma->args) i_write_string(arg.c_str(), 0);
    i_flush(IFR_PRAGMA);
}
