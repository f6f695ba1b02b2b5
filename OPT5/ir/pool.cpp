#include "OPT5/ir/pool.h"

#if defined(__linux__)
#include <sys/mman.h>
#endif

void* take_huge_block() {
    void* block = ::operator new(HUGE_BLOCK, std::align_val_t(HUGE_BLOCK));
#if defined(__linux__)
    madvise(block, HUGE_BLOCK, MADV_HUGEPAGE); // advice: without huge pages the block is as good as any
#endif
    return block;
}
