// Global flags, computed once from the file-level option set.
#include "DECODE/decode.h"
#include "OPT5/driver/driver.h"
#include "OPT5/ipa/inline.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "TYPES/type.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <climits>
#include <cstdlib>

namespace {

using O = option_obj;

[[noreturn]] void invalid_value(const char* format, long value) {
    std::fprintf(stderr, format, value);
    abort_optimizer();
}

bool is_level_off_or_0(const option_obj* options) {
    if (!options || !options->getopt(O::OO_opt_level)) return false;
    const long level = options->getnumarg(O::OO_opt_level);
    return level == O::OV_OPT_LEVEL_0 || level == O::OV_OPT_LEVEL_OFF;
}

void set_aux_flags(const option_obj& options) {
    if (!options.getopt(O::OO_print_debug)) return;
    for (unsigned i = 0; i < options.getargcount(O::OO_aux_cmd_flag); ++i) {
        const unsigned char digit = *options.getstrarg(O::OO_aux_cmd_flag, i);
        if (std::isdigit(digit)) aux_cmd_flag[digit - '0'] = 1;
    }
}

void set_switches(const option_obj& options, int id, const char* kind) {
    for (unsigned i = 0; i < options.getargcount(id); ++i)
        if (!process_debug_option(kind, options.getstrarg(id, i)))
            std::fprintf(stderr, "zopt: warning: --%s:%s names a switch that there is not\n", kind, options.getstrarg(id, i));
}

void set_cpu_version(const option_obj& options) {
    for (unsigned i = 0; i < options.getargcount(O::OO_silicon_version); ++i) {
        const char* const text = options.getstrarg(O::OO_silicon_version, i);
        if (!std::isdigit(static_cast<unsigned char>(*text))) continue;
        cpu_version = static_cast<int>(std::min<long>(std::strtol(text, nullptr, 10), INT_MAX));
        TYPE_PKG::cpu_version = cpu_version;
    }
}

void set_flag_of_option(const option_obj& options, int id) {
    const long value = options.getnumarg(id);
    const int number = static_cast<int>(value);
    switch (id) {
    case O::OO_abi:
        if (value == O::OV_ABI_EABI) TYPE_PKG::abi = decode_mangle_scheme = 1;
        break;
    case O::OO_aliased_variables: alias_vars_option = 1; break;
    case O::OO_aux_cmd_flag: set_aux_flags(options); break;
    case O::OO_big_endian: memory_is_big_endian = 1; break;
    case O::OO_call_assumptions: program_mode = number; break;
    case O::OO_debug: set_switches(options, id, "debug"); break;
    case O::OO_disable: set_switches(options, id, "disable"); break;
    case O::OO_enable: set_switches(options, id, "enable"); break;
    case O::OO_dump_call_graph: dump_ocg_in_GDL = 1; break;
    case O::OO_dwim_loops: dwim_loops = 1; break;
    case O::OO_endian: memory_is_big_endian = value == O::OV_ENDIAN_BIG; break;
    case O::OO_far_externs: far_externs = 1; break;
    case O::OO_fp_mode: strict_fp = value == O::OV_FP_MODE_STRICT; break;
    case O::OO_kr_compatible: kr_flag = 1; break;
    case O::OO_max_unrolled_loop_size: max_unrolled_loop_size = number; break;
    case O::OO_mem_model_data:
        if (value == O::OV_MEM_MODEL__DATA_FLAT) TYPE_PKG::flat_memory_model = 1;
        break;
    case O::OO_no_bad_aliases: dwim_aliases = dwim_loops = 1; break;
    case O::OO_nonreentrant: code_is_reentrant = 0; break;
    case O::OO_opt_level:
        if (value < O::OV_OPT_LEVEL_0 || value > O::OV_OPT_LEVEL_OFF)
            invalid_value("--opt_level given invalid value: %ld\n", value);
        break;
    case O::OO_optimizer_interlist: source_interlist = 1; break;
    case O::OO_pass_args_in_regs: pass_args_in_regs = 1; break;
    case O::OO_remove_hooks_when_inlining: remove_hooks_when_inlining = 1; break;
    case O::OO_rpt_threshold: rtc_rpt_threshold = number; break;
    case O::OO_silicon_version: set_cpu_version(options); break;
    case O::OO_single_inline: inline_single = 1; break;
    case O::OO_size_speed_goal:
        if (value < O::OV_SIZE_SPEED_GOAL_5 || value > O::OV_SIZE_SPEED_GOAL_1)
            invalid_value("--size_speed_goal given invalid value:  %ld\n", value);
        break;
    case O::OO_std_lib_func_defined: cache_sys_funinfo = 1; break;
    case O::OO_std_lib_func_not_defined: cache_sys_funinfo = 2; break;
    case O::OO_std_lib_func_redefined: cache_sys_funinfo = 0; break;
    case O::OO_unified_memory: rtc_unified_memory = true; break;
    case O::OO_unsigned_ok_for_rptb: unsigned_ok_for_RPTB = 1; break;
    case O::OO_use_const_for_alias_analysis: old_const_pointer_behavior = 1; break;
    case O::OO_volit_vars: volit_vars = 1; break;
    }
}

} // namespace

void set_global_flags(option_obj* options) {
    int previous = -1;
    for (const auto& pair : options->export_option_pairs(0, O::CLASS_OPTIMIZER)) {
        // A list option has a pair for each element and is taken as a whole.
        if (pair.first != previous) set_flag_of_option(*options, pair.first);
        previous = pair.first;
    }
    if (dwim_aliases) {
        alias_vars_option = chars_alias_other_types = caot_ref = 0;
        pointer_args_are_disjoint = 1;
    }
    if (dwim_loops) loop_increments_are_not_zero = 1;
    // Without optimization no guarantee about aliases is taken, whatever else was asked for.
    if (is_level_off_or_0(current_options())) alias_vars_option = 1;
    for (const option_obj* set : all_option_sets)
        if (is_level_off_or_0(set)) inhibit_clustering = 1;
}

void init_fileopts() {
    // By program mode: whether functions are called, and variables written, from outside this file.
    constexpr int callers[4] = {0, 1, 1, 0};
    constexpr int writers[4] = {0, 0, 1, 1};
    if (opt_level() <= 2) program_mode = 0;
    if (program_mode < 0) {
        // There is no guarantee about the rest of the program.
        no_outside_callers = no_outside_writers = 0;
    } else {
        no_outside_callers = program_mode < 4 ? callers[program_mode] : 1;
        no_outside_writers = program_mode < 4 ? writers[program_mode] : 1;
    }
    currfuninfo = make_FUNINFO("");
    create_inliner();
    inline_blocks_limit = 0;
}
