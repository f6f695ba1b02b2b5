// Checked allocation. On failure these print "ERROR: out of memory\n" on stderr and exit with status 1; they never
// return null for a size above 0. The result belongs to the caller and goes back with `free`.
#pragma once

#include <cstddef>

void* safemalloc(std::size_t size);
void* saferealloc(void* p, std::size_t size);
void* safecalloc(std::size_t n, std::size_t size); // zeroed; n * size is checked for overflow
char* safestrdup(const char* text);                // a copy on the heap; null gives null
