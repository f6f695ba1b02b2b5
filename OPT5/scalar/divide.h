// Division by constants without a division.
#pragma once

#include <cstdint>

class NODE;

// floor(x / divisor) == floor((x * factor + (adds_factor ? factor : 0)) / 2^shift) for every x from 0 to a limit.
struct RECIPROCAL {
    uint64_t factor = 0;
    int shift = 0;
    bool adds_factor = false;
};

// Finds a reciprocal for the dividends 0 to `limit` (above 0) whose products, with the addition, stay at or below
// `product_limit`, which is 2^n - 1 for the n value bits of the type that multiplies. `divisor` is at least 2. A
// shift of `free_shift`, which takes a whole half of a product, is preferred. False if there is none.
bool find_reciprocal(uint64_t divisor, uint64_t limit, uint64_t product_limit, int free_shift, bool may_add,
                     RECIPROCAL* result);

// A DIV or MOD of integers by an ICON becomes a sequence of the same value if that costs less on the target; otherwise
// the tree comes back as it is. The sequence may begin with an assignment to a fresh temporary. Consumes the tree.
NODE* warp_DIV_to_MULT(NODE* tree);
