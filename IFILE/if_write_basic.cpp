// The writer's buffer, primitives and record frame, and what frames a file: its header and trailing sections.
//
// A record's payload is built at the end of the buffer behind two bytes that wait for the kind and the size; `i_flush`
// fills them in. Sizes of 128 and more need room for further bytes, so the payload moves up.
#include "IFILE/if_writer.h"

#include "UTIL/abort.h"

#include <cstdlib>

namespace {
constexpr size_t buffer_step = 32768;

[[noreturn]] void die(const char* text) {
    std::fputs(text, stdout);
    std::fflush(stdout);
    abort_optimizer();
}
} // namespace

// ---- The buffer

void I_FILE::WRITE_BUFFER::grow(size_t room) {
    size_t wanted = (std::max(used + room, size + size / 2) + buffer_step - 1) / buffer_step * buffer_step;
    void* larger = wanted <= UINT32_MAX ? std::realloc(bytes, wanted) : nullptr;
    if (!larger) die(">> ICODE Buffer size exceeded and realloc failed");
    bytes = static_cast<uint8_t*>(larger);
    size = wanted;
}

I_FILE::WRITE_BUFFER::~WRITE_BUFFER() { std::free(bytes); }

void I_FILE::drain() {
    if (buffer.used && std::fwrite(buffer.bytes, 1, buffer.used, fp) != buffer.used) stream_failed = true;
    buffer_offset += static_cast<int64_t>(buffer.used);
    buffer.used = 0;
}

// ---- The frame

void I_FILE::begin_payload() {
    if (buffer.used >= buffer_step) drain();
    room(2);
    buffer.used += 2;
    payload = buffer.used;
}

void I_FILE::i_flush(int kind) {
    size_t size = buffer.used - payload;
    uint8_t digits[10];
    int count = 0;
    for (size_t left = size; count == 0 || left; left >>= 7) digits[count++] = (left & 0x7F) | (left >> 7 ? 0x80 : 0);
    if (count > 1) {
        room(count - 1);
        std::memmove(buffer.bytes + payload + count - 1, buffer.bytes + payload, size);
        buffer.used += count - 1;
    }
    buffer.bytes[payload - 2] = static_cast<uint8_t>(kind);
    std::memcpy(buffer.bytes + payload - 1, digits, count);
}

void I_FILE::i_write_eof() { i_write_i8(IFR_END); }

// ---- Primitives

void I_FILE::i_write_i16(int v) {
    if (v < INT16_MIN || v > UINT16_MAX) die(">> Value exceeds size of short");
    i_write_i8(v);
    i_write_i8(v >> 8);
}

void I_FILE::i_write_i32(uint32_t v) {
    for (int shift = 0; shift < 32; shift += 8) i_write_i8(static_cast<int>(v >> shift));
}

void I_FILE::i_write_sint(int64_t v) {
    room(10);
    for (;;) {
        uint8_t group = v & 0x7F;
        v >>= 7; // arithmetic
        bool last = (v == 0 && !(group & 0x40)) || (v == -1 && (group & 0x40));
        buffer.bytes[buffer.used++] = last ? group : group | 0x80;
        if (last) return;
    }
}

void I_FILE::i_write_string(const char* text, size_t length) {
    if (length == 0) length = std::strlen(text) + 1;
    i_write_raw(reinterpret_cast<const uint8_t*>(text), length);
}

void I_FILE::i_write_raw(const uint8_t* bytes, size_t size) {
    if (size == 0) return;
    room(size);
    std::memcpy(buffer.bytes + buffer.used, bytes, size);
    buffer.used += size;
}

namespace {
const char* file_of(const PSN* psn) { return psn->file ? psn->file : "NO_FILE"; }
} // namespace

void I_FILE::enter_position(const PSN* psn) {
    if (psn) i_enter_file_name(file_of(psn));
}

void I_FILE::i_write_psn(const PSN* psn) {
    if (!psn) return i_write_uint(0);
    i_write_uint(i_enter_file_name(file_of(psn)));
    i_write_uint(static_cast<uint64_t>(psn->line));
    i_write_uint(static_cast<uint64_t>(psn->column));
}

// A type that was merged into another is never written; a reference to it names the survivor.
void I_FILE::i_write_typeref(TYPE* type) {
    if (!type) return i_write_uint(0);
    while (type->equiv) type = type->equiv;
    OPT_ASSERT(type->uid != 0);
    type->refd = true;
    i_write_uint(type->uid);
}

// ---- Header and sections

void I_FILE::write_file_header() {
    begin_payload();
    i_write_string(IF_MAGIC, 0);
    i_write_i16(version);
    i_write_i16(icode_cpu_id);
    for (int64_t offset : {off_options, off_inits, off_types, off_files, off_globals}) {
        if (offset > UINT32_MAX) stream_failed = true; // the format ends at 4 GiB
        i_write_i32(static_cast<uint32_t>(offset));
    }
    i_write_string(source_name.c_str(), 0);
    i_write_i32(static_cast<uint32_t>(extra_word));
    i_flush(IFR_HEADER);
}

I_FILE* I_FILE::if_create(FILE* stream, TYPE_PKG* pkg, const char* source_name) {
    if_node_table_init();
    I_FILE* file = new I_FILE;
    file->fp = stream;
    file->is_writer = true;
    file->type_pkg = pkg;
    file->source_name = source_name ? source_name : "";
    file->write_file_header();
    return file;
}

void I_FILE::if_enter_option_set(const OPTION_SET& set) { option_sets.push_back(set); }

void I_FILE::if_enter_option_set(unsigned id, unsigned count, const char* const* strings) {
    option_sets.push_back({id, std::vector<std::string>(strings, strings + count)});
}

void I_FILE::finish_output(bool keep_all_types) {
    i_write_eof(); // of the initializers or, without any, of the body
    if (!option_sets.empty()) {
        off_options = if_tell();
        for (const OPTION_SET& set : option_sets) {
            begin_payload();
            i_write_uint(set.id);
            i_write_uint(set.options.size());
            for (const std::string& option : set.options) i_write_string(option.c_str(), 0);
            i_flush(IFR_OPTION_SET);
        }
        i_write_eof();
    }
    if (type_pkg) if_write_all_types(keep_all_types);
    // The names must be complete before their section is written.
    for (I_SYMTAB* sym : globals) enter_position(sym->sym_psn());
    if (!file_table.empty()) {
        off_files = if_tell();
        for (const std::string& name : file_table) {
            begin_payload();
            i_write_string(name.c_str(), 0);
            i_flush(IFR_FILE_NAME);
        }
        i_write_eof();
    }
    off_globals = if_tell();
    for (I_SYMTAB* sym : globals) if_write_symbol(sym);
    i_write_eof();
    int64_t end = if_tell();
    if_seek(0);
    write_file_header();
    if_seek(end);
}
