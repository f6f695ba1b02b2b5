#pragma once

#include <cstdint>
#include <cstdlib>

using WIDE = __int128;
using UWIDE = unsigned __int128;

// Operands a family of operations: ten million in the long mode.
inline int operand_count() { return getenv("ZOPT_LONG_TESTS") ? 10000000 : 1000000; }

class Random {
public:
    uint64_t next() {
        state_m ^= state_m << 13;
        state_m ^= state_m >> 7;
        state_m ^= state_m << 17;
        return state_m * 0x2545F4914F6CDD1Du;
    }
    // A number of any magnitude up to `bits` bits and either sign, near a power of two every other time.
    WIDE number(int bits) {
        int n = static_cast<int>(next() % (bits + 1));
        UWIDE v = static_cast<UWIDE>(next()) << 64 | next();
        if (next() & 1)
            v = n ? (UWIDE{1} << (n - 1)) + (next() % 5) - 2 : next() % 3;
        else
            v = n ? v >> (128 - n) : 0;
        UWIDE cap = bits >= 128 ? ~UWIDE{0} : (UWIDE{1} << bits) - 1;
        v &= cap;
        return static_cast<WIDE>(next() & 1 ? v : -v);
    }

private:
    uint64_t state_m = 88172645463325252u;
};
