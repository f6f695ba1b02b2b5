// Fatal signals: a word to the user and to the files that are open, then the end at once.
#include "OPT5/driver/driver.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"

#include <csignal>
#include <cstdlib>

namespace {

const char* program_name = nullptr;
void (*callback)(int) = nullptr;

struct SIGNAL_ROW {
    int number;
    const char* name;
    const char* text; // null: no fault of the program, or not handled
};
constexpr SIGNAL_ROW signal_rows[] = {
    {1, "SIGHUP", nullptr},
    {2, "SIGINT", nullptr},
    {4, "SIGILL", "executed an illegal instruction"},
    {5, "SIGTRAP", "received a TRAP signal"},
    {6, "SIGABRT", "had an internal inconsistency and aborted"},
    {7, "SIGBUS", "experienced a bus alignment fault"},
    {8, "SIGFPE", "received a floating point exception"},
    {10, "SIGUSR1", nullptr},
    {11, "SIGSEGV", "experienced a segmentation fault"},
    {12, "SIGUSR2", nullptr},
    {15, "SIGTERM", nullptr},
    {23, "SIGURG", nullptr},
    {24, "SIGXCPU", "exceeded the CPU time limit"},
    {25, "SIGXFSZ", "exceeded the file size limit"},
    {31, "SIGSYS", "experienced a bad system call"},
};
constexpr int handled[] = {4, 6, 8, 11, 15, 2, 1, 5, 7, 31, 24, 25};

const SIGNAL_ROW* find_row(int number) {
    for (const SIGNAL_ROW& row : signal_rows)
        if (row.number == number) return &row;
    return nullptr;
}

void handle_signal(int number) {
    const char* const tool = program_name ? program_name : "unknown";
    if (number == SIGHUP || number == SIGINT) {
        std::fprintf(stderr, "[%s forced exit]\n", tool);
        std::_Exit(2);
    }
    if (number == SIGTERM) {
        std::fprintf(stderr, "[%s received a terminate signal]\n", tool);
        std::_Exit(2);
    }
    const SIGNAL_ROW* const row = find_row(number);
    const char* const text = row && row->text ? row->text : "experienced a fatal internal fault";
    const char* const function = currfunc && currfunc->name ? currfunc->name : "<unknown>";
    const PSN* const psn = currfuninfo ? currfuninfo->begin_psn : nullptr;
    const char* const file = psn && psn->file ? psn->file : "<unknown>";
    char place[2048];
    std::snprintf(place, sizeof place, "while processing function %s file %s", function, file);
    std::fprintf(stderr, "\nINTERNAL ERROR: %s %s\n", tool, text);
    std::fprintf(stderr, "                  %s\n\n", place);
    std::fflush(stderr);
    print_support_message();
    std::fflush(stderr);
    if (callback) callback(number);
    std::_Exit(2);
}

} // namespace

void install_common_handlers(const char* program, void (*on_fault)(int)) {
    program_name = program;
    callback = on_fault;
    for (int number : handled) {
        struct sigaction action {};
        action.sa_handler = handle_signal;
        // The fault may be the stack's own; a second fault in the handler ends the process.
        action.sa_flags = SA_ONSTACK | SA_RESETHAND;
        sigaction(number, &action, nullptr);
    }
}

void write_termination_notes(int number) {
    const SIGNAL_ROW* const row = find_row(number);
    for (FILE** file : {&fdebug, &finfo}) {
        if (!*file) continue;
        std::fprintf(*file, "\n>>>> Optimizer terminated by signal: %s.\n", row ? row->name : "<unknown>");
        std::fclose(*file);
        *file = nullptr;
    }
}
