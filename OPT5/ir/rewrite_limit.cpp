#include "OPT5/ir/rewrite_limit.h"

#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <cstdio>
#include <cstdlib>

namespace {

register_option pass_debug_limit("debug:limit");

long count = 0;

} // namespace

bool rewrites_are_counted = false;

void begin_counted_rewrites(bool is_last) {
    if (!pass_debug_limit) return;
    static const int told = std::atexit([] { std::fprintf(stderr, "zopt: %ld rewrites\n", count); });
    (void)told;
    rewrites_are_counted = is_last;
}

// The last one is named.
bool counted_rewrite_is_allowed(const NODE* tree) {
    if (++count == pass_debug_limit)
        std::fprintf(stderr, "zopt: rewrite %ld: %s\n", count, tree ? stmt2infix(tree).c_str() : "?");
    return count <= pass_debug_limit;
}
