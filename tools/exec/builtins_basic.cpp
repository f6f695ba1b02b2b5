// The basic operators of saturating arithmetic on `short` (S16) and `long` (S32), as the ETSI and ITU speech coders
// define them. Products are fractions: twice the integer product. A shift by a negative count is one in the other
// direction.
#include "tools/exec/machine.h"

#include <algorithm>
#include <unordered_map>

namespace {
using A = LIBRARY_ARGS;

int64_t sat16(int64_t v) { return std::clamp<int64_t>(v, INT16_MIN, INT16_MAX); }
int64_t sat32(int64_t v) { return std::clamp<int64_t>(v, INT32_MIN, INT32_MAX); }
int64_t s16(A& a, size_t k) { return wrap(a.i(k), 16, true); }
int64_t s32(A& a, size_t k) { return wrap(a.i(k), 32, true); }
int64_t rounded(int64_t v) { return sat32(v + 0x8000) >> 16; }
int64_t product(A& a, size_t x, size_t y) { return sat32(s16(a, x) * s16(a, y) * 2); }

// To the left, saturating at `bits`.
int64_t shifted(int64_t v, int64_t left, int bits) {
    if (left <= 0) return v >> std::min<int64_t>(-left, bits - 1);
    const int64_t limit = (int64_t{1} << (bits - 1)) - 1;
    for (; left > 0 && v != 0; left--) {
        v *= 2;
        if (v > limit) return limit;
        if (v < -limit - 1) return -limit - 1;
    }
    return v;
}
// To the right, a half rounded up; a count beyond the width leaves nothing.
int64_t shifted_rounded(int64_t v, int64_t right, int bits) {
    if (right > bits - 1) return 0;
    const int64_t r = shifted(v, -right, bits);
    return right > 0 ? r + (v >> (right - 1) & 1) : r;
}
int64_t norm(int64_t v, int bits) {
    if (v == 0) return 0;
    int64_t n = 0;
    for (uint64_t u = static_cast<uint64_t>(v < 0 ? ~v : v); n < bits - 1 && !(u >> (bits - 2 - n)); n++) {
    }
    return n;
}
int64_t quotient(A& a) {
    const int64_t x = s16(a, 0), y = s16(a, 1);
    if (x < 0 || y <= 0 || x > y) a.m.fail(EXEC_DIVISION, "ETSI_DIV_S takes 0 <= a <= b, b > 0");
    return x == y ? INT16_MAX : (x << 15) / y;
}

#define ROW(NAME, EXPR)                                                                                                \
    {                                                                                                                  \
        "ETSI_" NAME, 'i', [](A& a) -> int64_t { return EXPR; }                                                        \
    }
const LIBRARY_ENTRY entries[] = {
    ROW("ABS_S", sat16(std::abs(s16(a, 0)))),
    ROW("ADD", sat16(s16(a, 0) + s16(a, 1))),
    ROW("DIV_S", quotient(a)),
    ROW("EXTRACT_H", s32(a, 0) >> 16),
    ROW("EXTRACT_L", wrap(a.i(0), 16, true)),
    ROW("MAC_R", rounded(sat32(s32(a, 0) + product(a, 1, 2)))),
    ROW("MSU_R", rounded(sat32(s32(a, 0) - product(a, 1, 2)))),
    ROW("MULT", sat16(s16(a, 0) * s16(a, 1) >> 15)),
    ROW("MULT_R", sat16((s16(a, 0) * s16(a, 1) + 0x4000) >> 15)),
    ROW("NEGATE", sat16(-s16(a, 0))),
    ROW("NORM_S", norm(s16(a, 0), 16)),
    ROW("NORM_L", norm(s32(a, 0), 32)),
    ROW("ROUND", rounded(s32(a, 0))),
    ROW("SHIFT_R", shifted_rounded(s16(a, 0), -s16(a, 1), 16)),
    ROW("SHL", shifted(s16(a, 0), s16(a, 1), 16)),
    ROW("SHR", shifted(s16(a, 0), -s16(a, 1), 16)),
    ROW("SHR_R", shifted_rounded(s16(a, 0), s16(a, 1), 16)),
    ROW("SUB", sat16(s16(a, 0) - s16(a, 1))),
    ROW("L_ABS", sat32(std::abs(s32(a, 0)))),
    ROW("L_ADD", sat32(s32(a, 0) + s32(a, 1))),
    ROW("L_DEPOSIT_H", s16(a, 0) * 65536),
    ROW("L_DEPOSIT_L", s16(a, 0)),
    ROW("L_MAC", sat32(s32(a, 0) + product(a, 1, 2))),
    ROW("L_MSU", sat32(s32(a, 0) - product(a, 1, 2))),
    ROW("L_MULT", product(a, 0, 1)),
    ROW("L_NEGATE", sat32(-s32(a, 0))),
    ROW("L_SHIFT_R", shifted_rounded(s32(a, 0), -s16(a, 1), 32)),
    ROW("L_SHL", shifted(s32(a, 0), s16(a, 1), 32)),
    ROW("L_SHR", shifted(s32(a, 0), -s16(a, 1), 32)),
    ROW("L_SHR_R", shifted_rounded(s32(a, 0), s16(a, 1), 32)),
    ROW("L_SUB", sat32(s32(a, 0) - s32(a, 1))),
};
#undef ROW
} // namespace

const LIBRARY_ENTRY* find_basic_operator(const std::string& name) {
    static const auto table = [] {
        std::unordered_map<std::string, const LIBRARY_ENTRY*> t;
        for (const LIBRARY_ENTRY& e : entries) t.emplace(e.name, &e);
        return t;
    }();
    auto it = table.find(name);
    return it == table.end() ? nullptr : it->second;
}
