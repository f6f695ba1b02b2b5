#pragma once

#include "FPSIM/fpsim.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

// Operands a family of operations: ten million in the long mode.
inline int operand_count() { return getenv("ZOPT_LONG_TESTS") ? 10000000 : 1000000; }

inline uint64_t bits_of(double v) {
    uint64_t b;
    memcpy(&b, &v, 8);
    return b;
}
inline uint32_t bits_of(float v) {
    uint32_t b;
    memcpy(&b, &v, 4);
    return b;
}
inline double double_of(uint64_t b) {
    double v;
    memcpy(&v, &b, 8);
    return v;
}
inline float float_of(uint32_t b) {
    float v;
    memcpy(&v, &b, 4);
    return v;
}

inline simul_fval sim(double v) {
    simul_fval x;
    uint64_t b = bits_of(v);
    ieee_cvt_dtos(static_cast<uint32_t>(b >> 32), static_cast<uint32_t>(b), &x);
    return x;
}
inline simul_fval simf(float v) {
    simul_fval x;
    ieee_cvt_ftos(bits_of(v), &x);
    return x;
}

class Random {
public:
    uint64_t next() {
        state_m ^= state_m << 13;
        state_m ^= state_m >> 7;
        state_m ^= state_m << 17;
        return state_m * 0x2545F4914F6CDD1Du;
    }
    // Any bit pattern: half of them with an exponent near 1, some with few bits set, some specials, zeros and
    // subnormals.
    double number() {
        uint64_t b = next();
        uint64_t how = next();
        uint64_t fraction = b & ((uint64_t{1} << 52) - 1), sign = b & uint64_t{1} << 63;
        if (how & 2) fraction &= ~uint64_t{0} << (how >> 8) % 53;
        if (how & 4) fraction |= (uint64_t{1} << (how >> 16) % 53) - 1;
        fraction &= (uint64_t{1} << 52) - 1;
        uint64_t exponent = how & 1 ? 1023 - 30 + (how >> 24) % 60 : b >> 52 & 0x7FF;
        if ((how >> 40) % 64 == 0) exponent = (how >> 48) & 1 ? 0 : 0x7FF;
        if ((how >> 56) == 0) fraction = 0;
        return double_of(sign | exponent << 52 | fraction);
    }
    float single() {
        double d = number();
        uint64_t b = bits_of(d);
        uint64_t exponent = b >> 52 & 0x7FF;
        uint32_t narrow = exponent == 0x7FF                   ? 0xFF
                          : exponent > 896 && exponent < 1151 ? static_cast<uint32_t>(exponent - 896)
                                                              : exponent & 0xFF;
        return float_of(static_cast<uint32_t>(b >> 63) << 31 | narrow << 23 |
                        static_cast<uint32_t>(b >> 29 & 0x7FFFFF));
    }

private:
    uint64_t state_m = 88172645463325252u;
};
