// Runs work on a stack that is large enough for recursion over the deepest tree that the reader accepts.
#pragma once

#include <cstddef>
#include <functional>

// Calls `work` on a thread of its own with `bytes` of stack and waits for it. Pages are only used as they are touched.
// An exception of `work` is rethrown to the caller. Where the thread cannot be made, `work` runs on the caller's stack.
void run_on_big_stack(std::size_t bytes, const std::function<void()>& work);
