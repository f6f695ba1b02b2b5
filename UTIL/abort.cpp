#include "UTIL/abort.h"

#include <cstdio>
#include <cstdlib>

namespace {
ABORT_HOOK abort_hook = nullptr;
}

void set_abort_hook(ABORT_HOOK hook) { abort_hook = hook; }

void abort_optimizer(const char* message) {
    if (abort_hook) abort_hook(message);
    std::fputs("\n>>>> Optimizer terminated abnormally\n", stderr);
    if (message) std::fprintf(stderr, "\n>>>> %s.\n", message);
    std::exit(1);
}

void abort_optimizer() { abort_optimizer(nullptr); }

void optassert(const char* text, const char* file, int line) {
    // Kept in variables that a debugger or a core file shows.
    [[maybe_unused]] static const char* volatile failed_text = text;
    [[maybe_unused]] static const char* volatile failed_file = file;
    [[maybe_unused]] static volatile int failed_line = line;
    abort_optimizer();
}
