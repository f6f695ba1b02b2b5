// The state of a run that every pass reads: files, the function in work, flags, and the options of the current function.
#pragma once

#include "DEBUG_DISABLE/register_option.h"
#include "OPTIONS/option_obj.h"

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

class FUNINFO;
class I_FILE;
class SYMTAB;
struct OPTION_SET;

// ---- Files
extern std::string i_file_name, o_file_name;
extern I_FILE *i_file, *o_file;
extern FILE* finfo;        // optimizer info file, null without
extern int write_opt_info; // level asked for; 0: no file
extern FILE* fdebug;       // debug file, null without
extern int print_debug;    // debug level; 0: no output

// Formatted output to the debug stream; a failed write is an assertion failure. Does nothing when there is no stream.
void debug_printf(const char* format, ...) __attribute__((format(printf, 1, 2)));
void debug_flush();
void info_printf(const char* format, ...) __attribute__((format(printf, 1, 2))); // to `finfo`, if open

// ---- The function in work; both null between functions and during barriers
extern SYMTAB* currfunc;
extern FUNINFO* currfuninfo;
extern SYMTAB* currfunc_at_abort;

// ---- Options
extern option_obj* cmdline_options;
extern std::vector<option_obj*> all_option_sets; // by option-set number
extern option_obj* file_options;                 // element 0
extern std::vector<OPTION_SET> icode_optionlist; // as read from the input

// Answers for the current function, or for the file when there is none.
int opt_level();       // 0 to 4
int size_speed_goal(); // from 0, size is everything, to 5, speed is
long auto_inline();
bool fp_add_is_associative();
bool saturating_add_is_associative();
bool rtc_no_rpt_ins();
long interrupt_threshold();
bool use_llvm();
inline int arm_neon() { return 0; }
option_obj* current_options();

// ---- Flags, set once from the file-level set
extern int alias_vars_option, inline_single, cache_sys_funinfo, code_is_reentrant, dump_ocg_in_GDL, dwim_aliases, dwim_loops,
    far_externs, kr_flag, old_const_pointer_behavior, chars_alias_other_types, caot_ref, pointer_args_are_disjoint,
    loop_increments_are_not_zero, max_unrolled_loop_size, memory_is_big_endian, memory_model, mini_mult,
    apply_symbolic_methods, pass_args_in_regs, program_mode, source_interlist, unsigned_index_wraps, unsigned_ok_for_RPTB,
    volit_vars, strict_fp, use_g2, inhibit_clustering, remove_hooks_when_inlining, default_o3_auto_inline;
extern char aux_cmd_flag[10];
extern int no_outside_callers, no_outside_writers, inline_blocks_limit, inline_loops_limit;
extern int rtc_rpt_threshold;
extern bool rtc_unified_memory, rtc_RPT_ok_for_loop;
extern int cpu_version; // silicon version, -1 until known
extern int max_threads; // 0: serial
extern bool do_int_MVP, do_IP_MVP, do_beta_MVP, trees_are_normalized, do_dd_for_be, elim_dd_dead_assignments;
extern bool any_unions_in_program;
extern int lex; // scope depth while reading

void reset_global_flags(); // the defaults
// Called where the work on a function ends. The options of a function are not copied into flags, so it reports only.
void restore_global_flags();

// ---- Switches that more than one room reads
extern register_option pass_debug_SIMD, pass_debug_dump_serial, pass_debug_validate;
