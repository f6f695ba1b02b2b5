// The orderly abnormal end: no partial output, the reason, the function in work, where to turn.
#include "BANNER/banner.h"
#include "OPT5/driver/driver.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <cstdlib>
#include <cstring>

namespace {

register_option pass_debug_abort("debug:abort");

struct PLACE {
    std::string function, file;
};

// Taken before the files are closed: positions live in the input's reader.
PLACE place_of_failure() {
    if (currfunc_at_abort) {
        currfunc = currfunc_at_abort;
        currfuninfo = find_FUNINFO(currfunc);
    }
    PLACE place;
    if (!currfunc) return place;
    place.function = currfunc->name ? currfunc->name : "";
    if (currfuninfo && currfuninfo->begin_psn && currfuninfo->begin_psn->file)
        place.file = currfuninfo->begin_psn->file;
    return place;
}

void end_debug_stream(const char* message) {
    if (!print_debug || !fdebug) return;
    std::fputs("\n>>>> Optimizer terminated abnormally.\n", fdebug);
    if (message) std::fprintf(fdebug, "\n>>>> %s.\n", message);
    close_debug_stream();
}

[[noreturn]] void end_abnormally(const char* message) {
    // A second failure while the run ends must not start over.
    static bool ending = false;
    if (ending) std::_Exit(1);
    ending = true;
    const bool in_function = currfunc || currfunc_at_abort;
    const PLACE place = place_of_failure();
    discard_output();
    end_debug_stream(message);
    std::fflush(stdout);
    std::fputs("\n>>>> Optimizer terminated abnormally\n", stderr);
    if (in_function) std::fprintf(stderr, ">>>>    in function %s()\n", place.function.c_str());
    if (!place.file.empty()) std::fprintf(stderr, ">>>>    in file \"%s\"\n", place.file.c_str());
    if (message) std::fprintf(stderr, "\n>>>> %s.\n", message);
    print_support_message();
    if (pass_debug_abort) std::abort();
    std::exit(1);
}

} // namespace

void install_abort_behaviour() { set_abort_hook(end_abnormally); }

void print_support_message() {
    const char* const name = tool_name();
    std::fprintf(stderr,
                 "\n>>>> The %s has a defect. Please report it to those who maintain\n"
                 "your tool chain: they may know a way around it, and a later version may have\n"
                 "it fixed.\n\n",
                 name);
    std::fputs("We need to see this ENTIRE error message and a complete, reproducible\n"
               "test case including ALL of the command-line options.\n",
               stderr);
    if (std::strstr(name, "C/C++ Parser") || std::strstr(name, "C/C++ Optimizer") || std::strstr(name, "C/C++ Codegen"))
        std::fputs("Include the .pp file created by option --preproc_with_comment\n\n", stderr);
    else if (std::strstr(name, "Linker"))
        std::fputs(
            "Include all of the object files, libraries, and linker command files\nused to link the program.\n\n",
            stderr);
    else
        std::fputs("\n", stderr);
}
