// The records of a function other than its symbols and trees: brackets, labels, texts, and the code generator's own.
//
// `level` follows the brackets. Records that would leave a client without a function to put them in are refused here,
// so that clients need not ask.
#include "IFILE/if_reader.h"

void I_FILE::need_function(const char* what) const {
    // A back-end function is none that a client could put anything in.
    if (level == 0 || in_back_end_function) bad_input("%s outside a function", what);
}

void I_FILE::enter_function() {
    if (level != 0) bad_input("begin function inside a function");
    level = 1;
    locals.clear();
    eht_count = max_eh_entry = 0;
    in_back_end_function = false;
}

void I_FILE::if_read_begin_func() {
    PSN* psn = i_read_psn();
    uint64_t index = i_read_uint();
    end_record();
    enter_function();
    I_SYMTAB* sym = find_symbol(0, index, "begin function");
    if (type_pkg && !(sym->sym_type() && sym->sym_type()->is_func()))
        bad_input("begin function names %s, which is no function", sym->sym_name());
    if (reading_unit) {
        if (defined.size() < globals.size()) defined.resize(globals.size());
        if (defined[index]) bad_input("function %s is defined twice", sym->sym_name());
        defined[index] = true;
    }
    client->cl_begin_func(sym, psn);
}

void I_FILE::if_read_end_args() {
    PSN* psn = i_read_psn();
    end_record();
    need_function("end of arguments");
    if (level != 1) bad_input("second end of arguments");
    level = 2;
    client->cl_end_args(psn);
}

void I_FILE::if_read_end_locals() {
    PSN* psn = i_read_psn();
    end_record();
    if (level < 2) bad_input("end of locals before end of arguments");
    client->cl_end_locals(psn);
}

void I_FILE::if_read_begin_block() {
    PSN* psn = i_read_psn();
    end_record();
    if (level < 2) bad_input("begin block before end of arguments");
    level++;
    client->cl_begin_block(psn);
}

void I_FILE::if_read_end_block() {
    PSN* psn = i_read_psn();
    end_record();
    if (level < 3) bad_input("end block without its begin block");
    level--;
    client->cl_end_block(psn);
}

void I_FILE::if_read_end_func() {
    PSN* psn = i_read_psn();
    end_record();
    if (in_back_end_function) bad_input("end function inside a back-end function");
    if (level < 2) bad_input("end function before end of arguments");
    // Without a table the entries of calls mean nothing.
    if (eht_count && max_eh_entry > eht_count)
        bad_input("a call names exception entry %u of %u", max_eh_entry, eht_count);
    client->cl_end_func(psn);
    level = 0;
}

void I_FILE::if_read_label() {
    uint64_t label = i_read_uint();
    end_record();
    need_function("label");
    if (label > INT32_MAX) bad_input("label %llu", static_cast<unsigned long long>(label));
    client->cl_label(static_cast<uint32_t>(label));
}

void I_FILE::if_read_assembly() {
    const char* text = i_read_string();
    PSN* psn = i_read_psn();
    end_record();
    client->cl_inline_asm(text, psn);
}

void I_FILE::if_read_comment() {
    const char* text = i_read_string();
    end_record();
    client->cl_comment(text);
}

void I_FILE::if_read_source() {
    const char* name = i_read_string();
    end_record();
    client->cl_source(name);
}

void I_FILE::if_read_func_info() {
    uint8_t info = i_read_u8();
    end_record();
    client->cl_func_info(info);
}

void I_FILE::if_read_ir_begin() {
    uint32_t a = static_cast<uint32_t>(i_read_uint());
    uint32_t b = static_cast<uint32_t>(i_read_uint());
    int c = i_read_s8();
    uint32_t d = static_cast<uint32_t>(i_read_uint());
    PSN* psn = i_read_psn();
    end_record();
    enter_function();
    in_back_end_function = true;
    client->cl_ir_begin_func(a, b, c, d, psn);
}

void I_FILE::if_read_ir() {
    PSN* psn = i_read_psn();
    cursor = limit; // the rest is the code generator's
    client->cl_ir_ins(psn);
}

void I_FILE::if_read_ir_end() {
    PSN* psn = i_read_psn();
    end_record();
    if (!in_back_end_function) bad_input("end back-end function outside one");
    client->cl_ir_end_func(psn);
    in_back_end_function = false;
    level = 0;
}
