// The writer's primitives, inline for the record writers of this room. Not for users of I_FILE.
#pragma once

#include "IFILE/ifile.h"

#include <cstring>

inline void I_FILE::room(size_t bytes) {
    if (buffer.size - buffer.used < bytes) buffer.grow(bytes);
}

inline void I_FILE::i_write_i8(int v) {
    room(1);
    buffer.bytes[buffer.used++] = static_cast<uint8_t>(v);
}

inline void I_FILE::i_write_bool(bool v) { i_write_i8(v); }

inline void I_FILE::i_write_uint(uint64_t v) {
    room(10);
    while (v >= 0x80) {
        buffer.bytes[buffer.used++] = static_cast<uint8_t>(v | 0x80);
        v >>= 7;
    }
    buffer.bytes[buffer.used++] = static_cast<uint8_t>(v);
}
