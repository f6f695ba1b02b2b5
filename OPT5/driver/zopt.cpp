#include "OPT5/driver/driver.h"

#ifdef ZOPT_MIMALLOC
#include <mimalloc.h>
#endif

namespace {

// A step takes about what the step before it gave back. An allocator that returns such pages to the system within
// milliseconds has them cleared and mapped anew for each step.
void keep_freed_memory() {
#ifdef ZOPT_MIMALLOC
    constexpr long A_MINUTE = 60 * 1000;
#if MI_MALLOC_VERSION >= 210
    mi_option_set(mi_option_purge_delay, A_MINUTE);
#else
    mi_option_set(mi_option_decommit_delay, A_MINUTE);
#endif
#endif
}

} // namespace

int main(int argc, char** argv) {
    keep_freed_memory();
    return zopt_main(argc, argv);
}
