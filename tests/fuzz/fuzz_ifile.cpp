// The reader over arbitrary bytes: whatever they are, it reads a unit or throws `if_error`. What was read is written, and
// what was written must be readable, and stay the same when it is copied once more.
#include "tools/model/ic_model.h"

#include <cstdlib>
#include <sanitizer/lsan_interface.h>

namespace {
std::string written(IC_UNIT& unit, TYPE_PKG* pkg) {
    char* bytes = nullptr;
    size_t size = 0;
    if (unit.write(open_memstream(&bytes, &size), pkg, false) != 0) std::abort();
    std::string text(bytes, size);
    std::free(bytes);
    return text;
}

void read_bytes(IC_UNIT& unit, const void* bytes, size_t size, TYPE_PKG* pkg) {
    FILE* stream = size ? fmemopen(const_cast<void*>(bytes), size, "rb") : std::fopen("/dev/null", "rb");
    unit.read(stream, pkg);
}

// Types are never freed during a run, so each run starts over with a package of its own.
TYPE_PKG* new_package() {
    __lsan::ScopedDisabler types_live_for_ever;
    tp = new TYPE_PKG();
    TYPE_PKG::init_type_pkg(tp);
    return tp;
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
    __lsan::ScopedDisabler types_live_for_ever;
    TYPE_PKG* pkg = new_package();
    IC_UNIT unit;
    try {
        read_bytes(unit, bytes, size, pkg);
    } catch (const if_error&) {
        return -1;
    }
    std::string first = written(unit, pkg);
    IC_UNIT again;
    try {
        read_bytes(again, first.data(), first.size(), pkg);
    } catch (const if_error& error) {
        std::fprintf(stderr, "written, and not readable: %s @0x%lx\n", error.what(), error.offset());
        std::abort();
    }
    return 0;
}
