// Memory and failure of the type package.
#include "TYPES/type_impl.h"

#include <cstdlib>

static std::atomic<uint64_t> bytes_in_use{0};

tp_failure::tp_failure(const std::string& text) : std::runtime_error("TP>> internal error: " + text), text_m(text) {}

void tp_die(const char* text) { throw tp_failure(text); }

void* tp_alloc(std::size_t size) {
    void* p = calloc(1, size ? size : 1);
    if (!p) tp_die("Out of memory: tp_alloc()");
    bytes_in_use += size;
    return p;
}

void tp_free(void* p, std::size_t size) {
    if (!p) return;
    bytes_in_use -= size;
    free(p);
}

uint64_t tp_bytes_in_use() { return bytes_in_use; }
