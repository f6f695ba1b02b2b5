// Opening a reader: the image of the file, the header, and the primitives that are not worth inlining.
#include "IFILE/if_reader.h"

#include <cstdarg>
#include <sys/stat.h>

int icode_cpu_id = IF_CPU_ID;

const char* if_record_name(int kind) {
    switch (kind) {
    case IFR_BEGIN_FUNC: return "begin function";
    case IFR_END_FUNC: return "end function";
    case IFR_BEGIN_BLOCK: return "begin block";
    case IFR_END_BLOCK: return "end block";
    case IFR_END_ARGS: return "end of arguments";
    case IFR_END_LOCALS: return "end of locals";
    case IFR_HEADER: return "header";
    case IFR_IR: return "back-end instruction";
    case IFR_SYMBOL: return "symbol";
    case IFR_ASM: return "inline assembly";
    case IFR_LOOP: return "loop definition";
    case IFR_LABEL: return "label";
    case IFR_MBANK: return "memory bank hint";
    case IFR_EXPR: return "expression header";
    case IFR_COMMENT: return "comment";
    case IFR_DEP_EDGE: return "dependence edge";
    case IFR_DEP_VECTOR: return "dependence vector";
    case IFR_CATCH_LIST: return "catch list";
    case IFR_FUNC_INFO: return "function info";
    case IFR_EHT_ENTRY: return "exception table entry";
    case IFR_EHT_HEADER: return "exception table header";
    case IFR_PRAGMA: return "pragma";
    case IFR_NODE: return "expression node";
    case IFR_INIT: return "initializer";
    case IFR_LDSPEC: return "load speculation";
    case IFR_OPTION_SET: return "option set";
    case IFR_TYPE: return "type";
    case IFR_IR_BEGIN: return "begin back-end function";
    case IFR_LOOP_VAR: return "loop variable";
    case IFR_IR_END: return "end back-end function";
    case IFR_FILE_NAME: return "source file name";
    case IFR_END: return "end marker";
    }
    return "unknown";
}

// ---- Errors

namespace {
std::string format_text(const char* format, va_list args) {
    char text[512];
    std::vsnprintf(text, sizeof text, format, args);
    return text;
}
} // namespace

void I_FILE::bad_input(const char* format, ...) const {
    va_list args;
    va_start(args, format);
    std::string text = format_text(format, args);
    va_end(args);
    throw if_error(text, record - image.get());
}

void I_FILE::short_payload() const {
    if (record == cursor) bad_input("file ends where a record must follow");
    if (limit == image_end && cursor - record <= 11) bad_input("file ends inside a record");
    bad_input("record of kind %d (%s) ends inside its payload", *record, if_record_name(*record));
}

// ---- Primitives

uint64_t I_FILE::i_read_long_uint() {
    uint64_t value = 0;
    for (int shift = 0; shift < 70; shift += 7) {
        uint8_t byte = i_read_u8();
        value |= static_cast<uint64_t>(byte & 0x7F) << shift;
        if (!(byte & 0x80)) return value;
    }
    bad_input("base-128 number of more than ten bytes");
}

// The sign is the last group's bit 6, however many bytes there are: callers that keep the low 32 bits see no
// difference.
int64_t I_FILE::i_read_sint() {
    uint64_t value = 0;
    for (int shift = 0; shift < 70;) {
        uint8_t byte = i_read_u8();
        value |= static_cast<uint64_t>(byte & 0x7F) << shift;
        shift += 7;
        if (byte & 0x80) continue;
        if ((byte & 0x40) && shift < 64) value |= ~uint64_t{0} << shift;
        return static_cast<int64_t>(value);
    }
    bad_input("base-128 number of more than ten bytes");
}

uint32_t I_FILE::i_read_uint32(const char* what) {
    uint64_t value = i_read_uint();
    if (value > UINT32_MAX) bad_input("%s %llu does not fit 32 bits", what, static_cast<unsigned long long>(value));
    return static_cast<uint32_t>(value);
}

uint16_t I_FILE::i_read_u16() {
    const uint8_t* b = i_read_raw(2);
    return static_cast<uint16_t>(b[0] | b[1] << 8);
}

int16_t I_FILE::i_read_s16() { return static_cast<int16_t>(i_read_u16()); }

uint32_t I_FILE::i_read_u32() {
    const uint8_t* b = i_read_raw(4);
    return b[0] | b[1] << 8 | b[2] << 16 | static_cast<uint32_t>(b[3]) << 24;
}

int32_t I_FILE::i_read_s32() { return static_cast<int32_t>(i_read_u32()); }

const char* I_FILE::i_read_string() {
    const void* end = std::memchr(cursor, 0, rest());
    if (!end) bad_input("record of kind %d (%s): string without an end", *record, if_record_name(*record));
    const char* text = reinterpret_cast<const char*>(cursor);
    cursor = static_cast<const uint8_t*>(end) + 1;
    return text;
}

PSN* I_FILE::i_read_psn() {
    uint64_t file = i_read_uint();
    if (!file) return nullptr;
    long line = static_cast<long>(i_read_uint());
    long column = static_cast<long>(i_read_uint());
    psns.push_back({file <= UINT32_MAX ? i_get_file_name(static_cast<uint32_t>(file)) : nullptr, line, column});
    return &psns.back();
}

// ---- Opening

bool I_FILE::load_image() {
    struct stat info;
    size_t size = 1 << 16;
    if (fstat(fileno(fp), &info) == 0 && S_ISREG(info.st_mode) && info.st_size > base)
        size = static_cast<size_t>(info.st_size - base) + 1; // one more, to see the end at the first try
    size_t used = 0;
    image.reset(new uint8_t[size]);
    while (size_t got = std::fread(image.get() + used, 1, size - used, fp)) {
        used += got;
        if (used < size) continue;
        std::unique_ptr<uint8_t[]> larger(new uint8_t[size * 2]);
        std::memcpy(larger.get(), image.get(), used);
        image = std::move(larger);
        size *= 2;
    }
    record = cursor = image.get();
    limit = image_end = image.get() + used;
    return !std::ferror(fp);
}

namespace {
__attribute__((format(printf, 2, 3))) bool refuse(std::string* why, const char* format, ...) {
    va_list args;
    va_start(args, format);
    if (why) *why = format_text(format, args);
    va_end(args);
    return false;
}
} // namespace

// False with the reason in `*why`. A header that ends too early is reported by the primitives.
bool I_FILE::read_file_header(std::string* why) {
    if (cursor == image_end) return refuse(why, "file is empty");
    if (*cursor != IFR_HEADER) return refuse(why, "first record is of kind %d, not a header", *cursor);
    i_read_header();
    if (std::strcmp(i_read_string(), IF_MAGIC) != 0) return refuse(why, "bad magic");
    version = i_read_s16();
    int cpu = i_read_s16();
    if (version < IF_VERSION_OLDEST || version > IF_VERSION)
        return refuse(why, "version %d is not supported (%d to %d are)", version, IF_VERSION_OLDEST, IF_VERSION);
    if (cpu != IF_CPU_ID) return refuse(why, "cpu id %d, expected %d", cpu, IF_CPU_ID);
    for (int64_t* offset : {&off_options, &off_inits, &off_types, &off_files, &off_globals}) *offset = i_read_u32();
    source_name = i_read_string();
    if (version >= -83) extra_word = i_read_s32();
    end_record();
    body = cursor;
    if (!check_sections(why)) return false;
    icode_cpu_id = cpu;
    if (client && !client->cl_magic(version, cpu)) return refuse(why, "the header is refused");
    return true;
}

bool I_FILE::check_sections(std::string* why) const {
    const std::pair<int64_t, const char*> sections[] = {{off_options, "option"},
                                                        {off_inits, "initializer"},
                                                        {off_types, "type"},
                                                        {off_files, "file name"},
                                                        {off_globals, "global symbol"}};
    for (auto [offset, name] : sections) {
        if (offset && offset < body - image.get())
            return refuse(why, "the %s section's offset 0x%lx lies inside the header", name, static_cast<long>(offset));
        if (offset >= image_end - image.get())
            return refuse(why, "the %s section's offset 0x%lx lies past the end of the file", name,
                          static_cast<long>(offset));
    }
    return off_globals != 0 || refuse(why, "there is no global symbol section");
}

I_FILE* I_FILE::open_reader(FILE* stream, IF_CLIENT* client, std::string* why) {
    std::unique_ptr<I_FILE> file(new I_FILE);
    file->fp = stream;
    file->client = client;
    long at = std::ftell(stream);
    file->base = at < 0 ? 0 : at;
    bool good = false;
    try {
        if (!file->load_image()) {
            if (why) *why = "the file cannot be read";
        } else {
            good = file->read_file_header(why);
        }
    } catch (const if_error& error) {
        if (why) *why = error.what();
    }
    if (good) return file.release();
    std::fclose(stream);
    return nullptr;
}

I_FILE* I_FILE::if_open_basic(FILE* stream, IF_CLIENT* client, std::string* why) {
    return open_reader(stream, client, why);
}

I_FILE* I_FILE::if_open(FILE* stream, IF_CLIENT* client, std::string* why) {
    I_FILE* file = open_reader(stream, client, why);
    if (!file) return nullptr;
    if_node_table_init();
    client->cl_source(file->source_name.c_str());
    try {
        file->if_read_options();
    } catch (...) {
        if_close(file, false, true);
        throw;
    }
    return file;
}

void I_FILE::if_type_init(TYPE_PKG* pkg) { type_pkg = pkg; }
