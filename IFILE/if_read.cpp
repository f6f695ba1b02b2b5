// Reading a unit: its sections in order, the records of its body by kind, symbols and pragmas.
#include "IFILE/if_reader.h"

#include <memory>

// ---- Sections

void I_FILE::if_read_options() {
    if (!off_options) return;
    SECTION section(*this, off_options, "option");
    while (section.next(IFR_OPTION_SET)) {
        uint32_t id = i_read_uint32("option set number");
        uint64_t count = i_read_uint();
        if (count > rest())
            bad_input("option set of %llu options in a record that is too short for them", (unsigned long long)count);
        std::vector<std::string> options;
        options.reserve(count);
        for (uint64_t i = 0; i < count; i++) options.emplace_back(i_read_string());
        end_record();
        client->cl_option_set(id, options);
    }
}

void I_FILE::if_read_file_names() {
    if (!off_files) return;
    SECTION section(*this, off_files, "file name");
    while (section.next(IFR_FILE_NAME)) {
        i_enter_file_name(i_read_string());
        end_record();
    }
}

void I_FILE::if_read_globals() {
    SECTION section(*this, off_globals, "global symbol");
    while (section.next(IFR_SYMBOL)) guard_types([this] { if_read_symbol_def(); });
}

void I_FILE::if_read_all_init() {
    if (!off_inits) return;
    SECTION section(*this, off_inits, "initializer");
    defined.assign(globals.size(), false);
    while (section.next(IFR_INIT)) guard_types([this] { if_read_init(); });
}

void I_FILE::if_read_file() {
    reading_unit = true;
    if_read_file_names();
    if_read_type_defs();
    client->cl_merge_type_defs();
    if_read_globals();
    if_read_all_init();
    client->cl_preprocess_statics();
    defined.assign(globals.size(), false);
    while (if_read_record() != IFR_END) {
    }
    reading_unit = false;
}

// ---- Records of the body

int I_FILE::if_read_record() {
    int kind = i_read_header();
    if (kind != IFR_END)
        guard_types([this, kind] { read_record(kind); });
    else if (level)
        bad_input("the body ends inside a function");
    return kind;
}

// What a back-end function holds is the code generator's, though its records may be of kinds that mean something
// elsewhere: its symbols are none of the unit's, its texts none of the file's.
namespace {
bool is_for_back_end(int kind) {
    return kind == IFR_SYMBOL || kind == IFR_PRAGMA || kind == IFR_COMMENT || kind == IFR_ASM || kind == IFR_LOOP_VAR ||
           kind == IFR_LDSPEC;
}
} // namespace

void I_FILE::read_record(int kind) {
    if (in_back_end_function && is_for_back_end(kind)) {
        cursor = limit;
        return;
    }
    switch (kind) {
    case IFR_BEGIN_FUNC: return if_read_begin_func();
    case IFR_END_FUNC: return if_read_end_func();
    case IFR_BEGIN_BLOCK: return if_read_begin_block();
    case IFR_END_BLOCK: return if_read_end_block();
    case IFR_END_ARGS: return if_read_end_args();
    case IFR_END_LOCALS: return if_read_end_locals();
    case IFR_IR: return if_read_ir();
    case IFR_SYMBOL: return if_read_symbol_def();
    case IFR_ASM: return if_read_assembly();
    case IFR_LOOP: return if_read_loop();
    case IFR_LABEL: return if_read_label();
    case IFR_MBANK: return if_read_mbank();
    case IFR_EXPR: return if_read_expr_header();
    case IFR_COMMENT: return if_read_comment();
    case IFR_DEP_EDGE: return if_read_dep_edge();
    case IFR_DEP_VECTOR: return if_read_dep_vector();
    case IFR_FUNC_INFO: return if_read_func_info();
    case IFR_EHT_HEADER: return if_read_eht();
    case IFR_PRAGMA: return if_read_pragma(nullptr);
    case IFR_NODE: return client->drop_tree(if_read_expr_node(false));
    case IFR_LDSPEC: return if_read_ldspec();
    case IFR_IR_BEGIN: return if_read_ir_begin();
    case IFR_LOOP_VAR: return if_read_inloop();
    case IFR_IR_END: return if_read_ir_end();
    case IFR_FILE_NAME: return if_read_source();
    case IFR_HEADER:
    case IFR_CATCH_LIST:
    case IFR_EHT_ENTRY:
    case IFR_INIT:
    case IFR_OPTION_SET:
    case IFR_TYPE: bad_input("record of kind %d (%s) in the body", kind, if_record_name(kind));
    }
    std::printf("\n///ERROR @0x%lx\n\n", static_cast<long>(record - image.get()));
    std::fflush(stdout);
    bad_input("record of unknown kind %d in the body", kind);
}

// ---- Symbols and pragmas

I_SYMTAB* I_FILE::if_read_sym(int* pragma_count) {
    const char* name = i_read_string();
    uint64_t size = i_read_uint();
    uint32_t value = static_cast<uint32_t>(i_read_uint());
    int sclass = i_read_s8();
    uint16_t cqual = i_read_u16();
    TYPE* type = find_typeref(i_read_uint());
    TYPE* second_type = find_typeref(i_read_uint());
    uint32_t align = read_align();
    // The format has a signed byte here, but a count below zero says nothing: its upper half counts on from 127.
    *pragma_count = i_read_u8();
    uint32_t location = static_cast<uint32_t>(i_read_uint());
    uint32_t option_set = i_read_uint32("option set number");
    PSN* psn = i_read_psn();
    unsigned retention = version >= -71 ? i_read_u8() : 0u;
    if (retention > I_SYMTAB::RETENTION_DROP) bad_input("symbol %s has the retention policy %u", name, retention);
    end_record();
    if (size == 22) size = align = 32; // a pointer of the narrow memory model
    return client->cl_symbol_create(name, type, second_type, size, align, value, sclass, cqual, psn, location,
                                    option_set, static_cast<I_SYMTAB::RETENTION_POLICY>(retention));
}

void I_FILE::if_read_symbol_def() {
    int pragma_count = 0;
    I_SYMTAB* sym = if_read_sym(&pragma_count);
    if (level == 0)
        if_enter_global(sym);
    else
        if_enter_local(sym);
    for (int i = 0; i < pragma_count; i++) {
        int kind = i_read_header();
        if (kind != IFR_PRAGMA)
            bad_input("symbol %s promises %d pragmas, record of kind %d (%s) follows", sym->sym_name(), pragma_count,
                      kind, if_record_name(kind));
        if_read_pragma(sym);
    }
    client->cl_symbol_def(sym);
}

void I_FILE::if_read_pragma(I_SYMTAB* sym) {
    auto pragma = std::make_unique<PRAGMA>();
    uint64_t kind = i_read_uint();
    if (kind > UINT8_MAX) bad_input("pragma of kind %llu", static_cast<unsigned long long>(kind));
    uint64_t count = i_read_uint();
    if (count > rest())
        bad_input("pragma of %llu arguments in a record that is too short for them",
                  static_cast<unsigned long long>(count));
    pragma->kind = static_cast<uint8_t>(kind);
    pragma->args.reserve(count);
    for (uint64_t i = 0; i < count; i++) pragma->args.emplace_back(i_read_string());
    end_record();
    if (sym && (kind == PRG_FUNC_EXT_CALLED || kind == PRG_SYM_IS_REFERENCED))
        sym->retention = I_SYMTAB::RETENTION_KEEP;
    if (sym && kind == PRG_SYM_IS_DEAD) sym->retention = I_SYMTAB::RETENTION_DROP;
    client->cl_pragma(sym, pragma.release());
}

// A symbol by its place in the file's vectors. `what` names the record that asks.
I_SYMTAB* I_FILE::find_symbol(int32_t symbol_level, uint64_t index, const char* what) const {
    if (symbol_level == -1) return nullptr;
    const std::vector<I_SYMTAB*>& table = symbol_level == 0 ? globals : locals;
    if (index >= table.size())
        bad_input("%s of level %d, index %llu of %zu", what, symbol_level, static_cast<unsigned long long>(index),
                  table.size());
    return table[index];
}

// ---- Walking functions and whole files

void I_FILE::if_read_func(int64_t offset) {
    if (offset) if_seek(offset);
    for (;;) {
        int kind = if_read_record();
        if (kind == IFR_END_FUNC) return;
        if (kind == IFR_END) bad_input("no function ends here");
    }
}

void I_FILE::if_skip_func() {
    int kind;
    do {
        kind = i_read_header();
        if (kind == IFR_END) bad_input("no function ends here");
        cursor = limit;
    } while (kind != IFR_END_FUNC);
    level = 0;
    in_back_end_function = false;
}

namespace {
// Kinds 33, 43, 60 and 62 are of other tools; they are well framed all the same.
bool is_framed_kind(int kind) {
    return std::strcmp(if_record_name(kind), "unknown") != 0 || kind == 33 || kind == 43 || kind == 60 || kind == 62;
}
} // namespace

int I_FILE::if_check_lengths() {
    struct PLACE {
        int at = 0, kind = 0, size = 0;
    } here, before;
    const uint8_t* back = cursor;
    limit = image_end;
    cursor = image.get();
    for (;;) {
        before = here;
        record = cursor;
        here = {static_cast<int>(cursor - image.get()), 0, 0};
        uint64_t size = UINT64_MAX;
        try {
            here.kind = i_read_u8();
            if (here.kind == IFR_END) break;
            size = i_read_uint();
        } catch (const if_error&) { // the frame itself is cut short: its size fits nowhere
        }
        here.size = static_cast<int>(size);
        if (size > rest() || !is_framed_kind(here.kind)) {
            std::printf(">>I-file error:@%d,id=%d,sz=%d,prev [@%d,id=%d,sz=%d]\n", here.at, here.kind, here.size,
                        before.at, before.kind, before.size);
            return 0;
        }
        cursor += size;
    }
    cursor = back;
    return 1;
}

void I_FILE::if_copy_raw(int64_t offset, int64_t size, I_FILE* to) {
    int64_t whole = image_end - image.get();
    if (offset < 0 || size < 0 || offset > whole || size > whole - offset)
        throw if_error("bytes to copy lie past the end of the file", static_cast<long>(offset));
    to->i_write_raw(image.get() + offset, static_cast<size_t>(size));
}

// Pragmas are written anew, so that a copy holds them in the form of this version; symbols are taken as they stand.
void I_FILE::if_copy_symbols(I_FILE* to) {
    const uint8_t* back = cursor;
    if_seek(off_globals);
    for (;;) {
        int kind = i_read_header();
        if (kind == IFR_END) break;
        if (kind == IFR_PRAGMA) {
            PRAGMA pragma;
            pragma.kind = static_cast<uint8_t>(i_read_uint());
            for (uint64_t count = i_read_uint(); count; count--) pragma.args.emplace_back(i_read_string());
            end_record();
            to->if_write_pragma(&pragma);
        } else {
            if_copy_raw(record - image.get(), limit - record, to);
            cursor = limit;
        }
    }
    to->i_write_eof();
    cursor = back;
}
