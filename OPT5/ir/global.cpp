#include "OPT5/ir/global.h"

#include "IFILE/pragma.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/symtab.h"
#include "UTIL/abort.h"

#include <cstdarg>
#include <cstring>

std::string i_file_name, o_file_name;
I_FILE *i_file = nullptr, *o_file = nullptr;
FILE* finfo = nullptr;
int write_opt_info = 0;
FILE* fdebug = nullptr;
int print_debug = 0;

SYMTAB* currfunc = nullptr;
FUNINFO* currfuninfo = nullptr;
SYMTAB* currfunc_at_abort = nullptr;

option_obj* cmdline_options = nullptr;
std::vector<option_obj*> all_option_sets;
option_obj* file_options = nullptr;
std::vector<OPTION_SET> icode_optionlist;

int alias_vars_option, inline_single, cache_sys_funinfo = 2, code_is_reentrant = 1, dump_ocg_in_GDL, dwim_aliases, dwim_loops,
    far_externs, kr_flag, old_const_pointer_behavior, chars_alias_other_types = 1, caot_ref = 1, pointer_args_are_disjoint,
    loop_increments_are_not_zero, max_unrolled_loop_size = 195, memory_is_big_endian, memory_model, mini_mult,
    apply_symbolic_methods, pass_args_in_regs, program_mode = -1, source_interlist, unsigned_index_wraps = 1,
    unsigned_ok_for_RPTB, volit_vars, strict_fp = 1, use_g2, inhibit_clustering, remove_hooks_when_inlining,
    default_o3_auto_inline = 20;
char aux_cmd_flag[10];
int no_outside_callers, no_outside_writers, inline_blocks_limit = 700, inline_loops_limit = 500;
int rtc_rpt_threshold;
bool rtc_unified_memory, rtc_RPT_ok_for_loop;
int cpu_version = -1;
int max_threads = 0;
bool do_int_MVP, do_IP_MVP, do_beta_MVP, trees_are_normalized, do_dd_for_be, elim_dd_dead_assignments;
bool any_unions_in_program;
int lex = 0;

register_option pass_debug_SIMD("debug:SIMD"), pass_debug_dump_serial("debug:dump_serial"),
    pass_debug_validate("debug:validate");

void reset_global_flags() {
    alias_vars_option = inline_single = dump_ocg_in_GDL = dwim_aliases = dwim_loops = far_externs = kr_flag = 0;
    cache_sys_funinfo = 2;
    code_is_reentrant = chars_alias_other_types = caot_ref = unsigned_index_wraps = strict_fp = 1;
    old_const_pointer_behavior = pointer_args_are_disjoint = loop_increments_are_not_zero = memory_is_big_endian = 0;
    memory_model = mini_mult = apply_symbolic_methods = pass_args_in_regs = source_interlist = unsigned_ok_for_RPTB = 0;
    volit_vars = use_g2 = inhibit_clustering = remove_hooks_when_inlining = 0;
    max_unrolled_loop_size = 195;
    program_mode = -1;
    rtc_rpt_threshold = 0;
    rtc_unified_memory = false;
    std::memset(aux_cmd_flag, 0, sizeof aux_cmd_flag);
}

void restore_global_flags() {
    if (print_debug)
        debug_printf("[Restoring options --> -o%d -i%d --opt_for_speed=%d]\n", opt_level(), static_cast<int>(auto_inline()), size_speed_goal());
}

void debug_printf(const char* format, ...) {
    if (!fdebug) return;
    va_list args;
    va_start(args, format);
    const int written = std::vfprintf(fdebug, format, args);
    va_end(args);
    OPT_ASSERT(written >= 0);
}

void debug_flush() {
    if (fdebug) OPT_ASSERT(std::fflush(fdebug) == 0);
}

void info_printf(const char* format, ...) {
    if (!finfo) return;
    va_list args;
    va_start(args, format);
    std::vfprintf(finfo, format, args);
    va_end(args);
}

// ---- Options of the function in work

option_obj* current_options() {
    if (!currfunc) return file_options;
    // A symbol made by the optimizer, or by a file without sets, is governed by the file's set.
    return currfunc->option_set < all_option_sets.size() && all_option_sets[currfunc->option_set]
               ? all_option_sets[currfunc->option_set]
               : file_options;
}

namespace {

// Number of option `id` in the current set, or `absent`.
long number_or(int id, long absent) {
    const option_obj* options = current_options();
    return options && options->getopt(id) ? options->getnumarg(id) : absent;
}

} // namespace

int opt_level() {
    // Behind setjmp each variable has what it had at some later call: no pass knows of that.
    if (currfuninfo && currfuninfo->saves_environment) return 0;
    switch (number_or(option_obj::OO_opt_level, -1)) {
    case 33:
    case 38: return 0;
    case 34: return 1;
    case 35: return 2;
    case 36: return 3;
    case 37: return 4;
    default: return 1;
    }
}

int size_speed_goal() {
    switch (number_or(option_obj::OO_size_speed_goal, -1)) {
    case 43: return 5;
    case 44: return 0;
    case 45: return 3;
    case 46: return 2;
    case 47: return 4;
    case 48: return 1;
    default: return 4;
    }
}

long auto_inline() {
    const option_obj* options = current_options();
    if (options && options->getopt(option_obj::OO_auto_inline)) return options->getnumarg(option_obj::OO_auto_inline);
    switch (number_or(option_obj::OO_opt_level, -1)) {
    case 36:
    case 37: return default_o3_auto_inline;
    case 35: return 20;
    default: return 0;
    }
}

bool fp_add_is_associative() { return number_or(option_obj::OO_fp_reassoc, 0) != 15; }
bool saturating_add_is_associative() { return number_or(option_obj::OO_sat_reassoc, 0) == 40; }
bool rtc_no_rpt_ins() { return current_options() && current_options()->getopt(option_obj::OO_no_rpt); }
long interrupt_threshold() { return number_or(option_obj::OO_interrupt_threshold, 0); }
bool use_llvm() { return current_options() && current_options()->getopt(option_obj::OO_use_llvm); }
