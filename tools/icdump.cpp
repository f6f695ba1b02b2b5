// icdump: prints an I-file as text.
#include "tools/model/ic_print.h"

#include "UTIL/big_stack.h"

#include <cerrno>

namespace {
const char help[] = "icdump [option...] FILE    prints an I-file as text\n"
                    "  --types   with the type of every operator and constant\n"
                    "  --psn     with source positions\n"
                    "  --raw     offset, kind, name and size of each record, also of files that are damaged\n"
                    "  --dot     the control flow of each function, for Graphviz\n"
                    "  --function NAME   with --dot: of this function alone\n"
                    "  --help    this text\n"
                    "Status 1 if the file is not a sound I-file.\n";

constexpr size_t printing_stack = size_t{512} << 20; // for trees of the greatest depth; touched only as needed

std::vector<uint8_t> read_bytes(FILE* stream) {
    std::vector<uint8_t> bytes;
    uint8_t piece[4096];
    while (size_t got = std::fread(piece, 1, sizeof piece, stream)) bytes.insert(bytes.end(), piece, piece + got);
    std::fclose(stream);
    return bytes;
}

// Frames only, from the first byte to the last, so that it shows as much of a damaged file as can be followed.
int print_raw(FILE* stream, const char* name) {
    const std::vector<uint8_t> bytes = read_bytes(stream);
    std::printf("%10s %4s %10s  %s\n", "offset", "kind", "size", "record");
    for (size_t at = 0; at < bytes.size();) {
        size_t start = at;
        int kind = bytes[at++];
        if (kind == IFR_END) {
            std::printf("0x%08zx %4d %10s  %s\n", start, kind, "", if_record_name(kind));
            continue;
        }
        uint64_t size = 0;
        bool more = true;
        for (int shift = 0; more && shift < 64 && at < bytes.size(); shift += 7) {
            more = bytes[at] & 0x80;
            size |= static_cast<uint64_t>(bytes[at++] & 0x7F) << shift;
        }
        std::printf("0x%08zx %4d %10llu  %s\n", start, kind, static_cast<unsigned long long>(size),
                    if_record_name(kind));
        if (more || size > bytes.size() - at) {
            std::fflush(stdout);
            std::fprintf(stderr, "icdump: %s: record at 0x%zx runs past the end of the file\n", name, start);
            return 1;
        }
        at += size;
    }
    return 0;
}

int print_parsed(FILE* stream, const char* name, bool dot, const std::string& function,
                 const IC_PRINT_OPTIONS& options) {
    try {
        IC_UNIT unit;
        bool found = true;
        unit.read(stream, ic_type_package());
        run_on_big_stack(printing_stack, [&] {
            if (dot)
                found = ic_print_dot(stdout, unit, function);
            else
                ic_print_unit(stdout, unit, options);
        });
        if (!found) std::fprintf(stderr, "icdump: %s: there is no function %s\n", name, function.c_str());
        return !found;
    } catch (const if_error& error) {
        const char* text = error.what();
        while (*text == '\n') text++;
        std::fflush(stdout);
        std::fprintf(stderr, "icdump: %s: @0x%lx: %s\n", name, error.offset(), text);
        return 1;
    }
}
} // namespace

int main(int argc, char** argv) {
    bool raw = false, dot = false;
    IC_PRINT_OPTIONS options;
    const char* name = nullptr;
    std::string function;
    for (int i = 1; i < argc; i++) {
        std::string word = argv[i];
        if (word == "--help") {
            std::fputs(help, stdout);
            return 0;
        }
        if (word == "--raw")
            raw = true;
        else if (word == "--dot")
            dot = true;
        else if (word == "--function" && i + 1 < argc)
            function = argv[++i];
        else if (word == "--types")
            options.types = true;
        else if (word == "--psn")
            options.positions = true;
        else if (word[0] == '-' || name) {
            std::fprintf(stderr, "icdump: what is %s?\n%s", argv[i], help);
            return 1;
        } else
            name = argv[i];
    }
    if (!name) {
        std::fputs(help, stderr);
        return 1;
    }
    FILE* stream = std::fopen(name, "rb");
    if (!stream) {
        std::fprintf(stderr, "icdump: %s: %s\n", name, std::strerror(errno));
        return 1;
    }
    int status = raw ? print_raw(stream, name) : print_parsed(stream, name, dot, function, options);
    if (std::fflush(stdout) != 0) status = 1;
    return status;
}
