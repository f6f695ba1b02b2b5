// What both directions share: the tables of symbols and file names, the position in the file, and closing.
#include "IFILE/ifile.h"

#include <utility>

const char* PRAGMA::name(unsigned kind) {
    switch (kind) {
#define PRAGMA_NAME(number, text)                                                                                      \
    case number:                                                                                                       \
        return text;
#include "IFILE/pragma_names.def"
#undef PRAGMA_NAME
    }
    return "unknown";
}

I_FILE::~I_FILE() = default;

I_FILE::OPEN_LIST::~OPEN_LIST() {
    while (members) delete std::exchange(members, members->next);
    while (params) delete std::exchange(params, params->next);
    while (etors) delete std::exchange(etors, etors->next);
}

int64_t I_FILE::if_tell() const {
    return is_writer ? buffer_offset + static_cast<int64_t>(buffer.used) : cursor - image.get();
}

void I_FILE::if_seek(int64_t offset) {
    if (is_writer) {
        drain();
        if (std::fseek(fp, static_cast<long>(base + offset), SEEK_SET) != 0) stream_failed = true;
        buffer_offset = offset;
        return;
    }
    if (offset < 0 || offset > image_end - image.get())
        throw if_error("there is no such place in the file", static_cast<long>(offset));
    record = cursor = image.get() + offset;
    limit = image_end;
}

void I_FILE::if_flush() {
    if (is_writer) drain();
    if (std::fflush(fp) != 0) stream_failed = true;
}

// ---- Symbols

void I_FILE::if_enter_global(I_SYMTAB* sym) {
    sym->set_level(0);
    sym->index = static_cast<int32_t>(globals.size());
    globals.push_back(sym);
    if (is_writer) enter_position(sym->sym_psn());
}

void I_FILE::if_enter_local(I_SYMTAB* sym) {
    sym->set_level(static_cast<int>(level));
    sym->index = static_cast<int32_t>(locals.size());
    locals.push_back(sym);
}

// ---- File names

uint32_t I_FILE::i_enter_file_name(const char* name) {
    if (is_writer) {
        if (last_file_id && file_table[last_file_id - 1] == name) return last_file_id;
        if (uint32_t known = i_get_file_id(name)) return last_file_id = known;
    }
    file_table.emplace_back(name);
    uint32_t id = static_cast<uint32_t>(file_table.size());
    file_ids.emplace(file_table.back(), id); // the first of equal names keeps its number
    return last_file_id = id;
}

uint32_t I_FILE::i_get_file_id(const char* name) const {
    auto found = file_ids.find(name);
    return found == file_ids.end() ? 0 : found->second;
}

const char* I_FILE::i_get_file_name(uint32_t n) const {
    return n >= 1 && n <= file_table.size() ? file_table[n - 1].c_str() : nullptr;
}

// ---- Closing

int I_FILE::if_close(I_FILE* file, bool keep_all_types, bool discard) {
    std::unique_ptr<I_FILE> owner(file);
    if (file->is_writer) {
        if (!discard) file->finish_output(keep_all_types);
        file->drain();
        if (std::fflush(file->fp) != 0) file->stream_failed = true;
    }
    bool failed = file->stream_failed || std::ferror(file->fp);
    if (std::fclose(file->fp) != 0) failed = true;
    return failed ? 1 : 0;
}
