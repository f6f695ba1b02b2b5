// Pragmas and option sets as the I-file carries them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

// The pragma kinds that this system knows by number. The other kinds up to 128 pass through unchanged.
enum PRAGMA_KIND : uint8_t {
    PRG_DATA_ALIGN = 0,
    PRG_DATA_SECTION = 2,
    PRG_FUNC_NEVER_RETURNS = 3,
    PRG_FUNC_CANNOT_INLINE = 4,
    PRG_FUNC_NO_GLOBAL_ASG = 5,
    PRG_FUNC_NO_IND_ASG = 6,
    PRG_FUNC_IS_PURE = 7,
    PRG_FUNC_IS_SYSTEM = 8,
    PRG_FUNC_EXT_CALLED = 23,
    PRG_OPT_OVERRIDE = 36,
    PRG_UNROLL = 37,
    PRG_UNROLL_AMOUNT = 38,
    PRG_MUST_ITERATE = 39,
    PRG_PROB_ITERATE = 40,
    PRG_SRC_LOOP = 41,
    PRG_ALIAS_ADVICE = 42,
    PRG_ALIGN_ADVICE = 43,
    PRG_INLINE_ADVICE = 44,
    PRG_SRC_LANGUAGE = 49,
    PRG_FL_STATIC = 51,
    PRG_SYM_IS_REFERENCED = 52,
    PRG_FUNC_IS_NONCONFORMING = 54,
    PRG_TRIP_CNTR_MUNGED = 56,
    PRG_LOOP_FLAGS = 57,
    PRG_SYM_IS_DEAD = 59,
    PRG_NO_ALIAS = 60,
    PRG_SP_CONSTRAINT = 63,
    PRG_II_ESTIMATE = 64,
    PRG_UNIT_RESOURCES = 65,
    PRG_SP_HINDRANCES = 66,
    PRG_READ_WRITE = 67,
    PRG_NO_ALIAS_CLONE = 68,
    PRG_COMDAT_GROUP = 69,
    PRG_SWITCH_IS_FULL = 70, // 'F': no value leads to the default
    PRG_SYM_VISIBILITY = 72,
    PRG_FS_DYNAMIC_INIT = 74,
    PRG_FUNC_ESPEC = 75,
    PRG_FUNC_SYNONYM = 78,
    PRG_LOOP_NO_ALIAS = 80,
    PRG_FUNC_RET_BY_CCTOR = 81,
    PRG_WEAK = 83,
    PRG_FUNC_NUM_CALLED = 87,
    PRG_FUNC_ALWAYS_INLINE = 88,
    PRG_PARALLEL_LOOP = 112,
    PRG_MMA_LOOP = 121,
    PRG_COALESCE_LOOP = 123,
    PRG_NO_COALESCE_LOOP = 124,
    PRG_NO_NLC = 125,
    PRG_FORCEINLINE = 126,
    PRG_FORCEINLINE_RECURSIVE = 127,
    PRG_NOINLINE = 128,
    PRG_LAST = 128,
};

struct PRAGMA {
    uint8_t kind = 0;
    std::vector<std::string> args;
    PRAGMA* next = nullptr;

    // The kind's name, "unknown" for one beyond the table.
    const char* name() const { return name(kind); }
    static const char* name(unsigned kind);
};

struct OPTION_SET {
    unsigned id = 0;
    std::vector<std::string> options;
};
