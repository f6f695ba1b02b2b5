// The reader over arbitrary bytes: whatever they are, it reads a unit or throws `if_error`. What was read is written,
// and what was written must be readable.
#include "tools/model/ic_print.h"

#include <cstdlib>

namespace {
// A unit with a type package of its own, which takes all types along when it goes.
struct WORLD {
    TYPE_PKG pkg;
    IC_UNIT unit;

    WORLD() {
        tp = &pkg;
        TYPE_PKG::init_type_pkg(&pkg);
    }
    void read(const void* bytes, size_t size) {
        unit.read(size ? fmemopen(const_cast<void*>(bytes), size, "rb") : std::fopen("/dev/null", "rb"), &pkg);
    }
    std::string write() {
        char* bytes = nullptr;
        size_t size = 0;
        if (unit.write(open_memstream(&bytes, &size), &pkg, false) != 0) std::abort();
        std::string text(bytes, size);
        std::free(bytes);
        return text;
    }
};
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
    std::string copy;
    try {
        WORLD world;
        world.read(bytes, size);
        copy = world.write();
        FILE* nowhere = std::fopen("/dev/null", "w");
        ic_print_unit(nowhere, world.unit, {true, true});
        ic_print_dot(nowhere, world.unit);
        std::fclose(nowhere);
    } catch (const if_error&) {
        return 0;
    }
    try {
        WORLD world;
        world.read(copy.data(), copy.size());
        world.write();
    } catch (const if_error& error) {
        std::fprintf(stderr, "written, and not readable: %s @0x%lx\n", error.what(), error.offset());
        std::abort();
    }
    return 0;
}
