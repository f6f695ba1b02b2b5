#include "UTIL/safemem.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {
[[noreturn]] void out_of_memory() {
    std::fputs("ERROR: out of memory\n", stderr);
    std::exit(1);
}
} // namespace

void* safemalloc(std::size_t size) {
    void* p = std::malloc(size ? size : 1);
    if (!p) out_of_memory();
    return p;
}

void* saferealloc(void* old, std::size_t size) {
    void* p = std::realloc(old, size ? size : 1);
    if (!p) out_of_memory();
    return p;
}

void* safecalloc(std::size_t n, std::size_t size) {
    void* p = std::calloc(n ? n : 1, size ? size : 1);
    if (!p) out_of_memory();
    return p;
}

char* safestrdup(const char* text) {
    if (!text) return nullptr;
    const std::size_t n = std::strlen(text) + 1;
    return static_cast<char*>(std::memcpy(safemalloc(n), text, n));
}
