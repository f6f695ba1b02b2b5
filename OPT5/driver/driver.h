// The run of the program: start-up, the roles of the files, the orderly end and every other end.
//
// Bad input, a bad command line and files that cannot be opened or written end with a message and status 1. What the
// program finds wrong with itself ends in `abort_optimizer`, with status 1 and the support message. A fatal signal ends
// with status 2. No end but a signal leaves a partial output file.
#pragma once

#include "DEBUG_DISABLE/register_option.h"
#include "OPTIONS/option_obj.h"

#include <cstdio>
#include <functional>
#include <string>

// The whole program, on a stack of its own. Its status is the process's.
int zopt_main(int argc, char** argv);

// ---- Files (files.cpp)
void open_files(int argc, char** argv);
void close_files();
// The debug file, with the function's name as `suffix` for one function's own; `mode` null means "w". On failure a
// fatal call ends the run, another one makes stderr the debug stream.
void open_debug_file(int fatal, const char* suffix, const char* mode);
void close_debug_stream();
void discard_output();                               // closes the I-files and removes the output, if it was opened
[[noreturn]] void fail_run(const std::string& text); // `text` on stderr, no output file, status 1
const char* next_arg();                              // next word of the command line, or null

// ---- Options (command_line.cpp, flags.cpp)
int parse_command_line(int argc, char** argv); // the number of file names
void build_option_sets();
void emit_cmd_line_text(int argc, char** argv);
void set_global_flags(option_obj* options);
void init_fileopts();

// ---- Reading and writing (reading.cpp, writing.cpp)
class READ_LISTENER;
READ_LISTENER& pass_listener(); // lets the passes hear of what is read
// The last step of every function: prepares it for the code generator, writes its records and frees its body. A function
// that is suppressed leaves no records.
void output_function();

// ---- The function loop (run_loop.cpp)
void run_functions(void (*write_function)()); // `write_function`: the action of the last step
void report_times(long ticks);

// Runs `work` under the rule for failures: bad input becomes a message, every other exception an abnormal end. Returns
// what `work` does, and only then.
bool run_guarded(const std::function<bool()>& work);

// ---- Ends (abnormal_end.cpp, signals.cpp)
void install_abort_behaviour();
void install_common_handlers(const char* program, void (*callback)(int signal));
void write_termination_notes(int signal); // the callback: a last line in the debug and info files
void print_support_message();

void register_reserved_switches();
extern register_option enable_time_stats, pass_debug_split_odb;
