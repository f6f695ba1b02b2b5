// The abnormal end of a run, as every library sees it.
//
// A library that finds the program's state inconsistent calls `optassert`; neither it nor `abort_optimizer` returns. What
// the end does (remove the partial output, name the function in work, print the support message) belongs to the program
// that runs, which installs it with `set_abort_hook`. Without a hook the reason goes to stderr and the process exits
// with status 1.
#pragma once

#include <exception>

using ABORT_HOOK = void (*)(const char* message); // message may be null; must not return

void set_abort_hook(ABORT_HOOK hook);

[[noreturn]] void abort_optimizer();
// `message` is borrowed and shown to the user behind ">>>>".
[[noreturn]] void abort_optimizer(const char* message);

// Ends the run through `abort_optimizer()`. The text and the place are for a debugger, they are not printed.
[[noreturn]] void optassert(const char* text, const char* file, int line);

// The program's assertion, alive in every build.
#define OPT_ASSERT(cond) ((cond) ? static_cast<void>(0) : optassert(#cond, __FILE__, __LINE__))
