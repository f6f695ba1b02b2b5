// The files of a run: opened in a fixed order, so that nothing is written before everything that can be wrong with the
// command line and the input's header has been checked, and closed with a check that all was written.
#include "BANNER/banner.h"
#include "HOST/file_names.h"
#include "IFILE/ifile.h"
#include "OPT5/driver/driver.h"
#include "OPT5/io/read.h"
#include "OPT5/ipa/inline.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/remark.h"
#include "TYPES/type.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <unistd.h>

namespace {

register_option pass_debug_help("debug:help");
register_option pass_debug_remarks("debug:remarks"); // the file, JSON lines

std::string info_name, debug_name, remarks_name;
FILE* remarks_file = nullptr;
FILE* output_stream = nullptr; // until the I_FILE takes it over
std::string real_output_name;  // the file itself, should the name be a link to it

// `format` takes the reason and the name.
[[noreturn]] void cannot_open(const char* format, const std::string& name) {
    std::fprintf(stderr, format, std::strerror(errno), name.c_str());
    std::exit(1);
}

// Writing a file that another one of the run lives in would destroy both.
void refuse_same_file(const std::string& name, const std::string& other, const char* other_role) {
    if (other.empty() || (name != other && !is_same_file(name, other))) return;
    std::fprintf(stderr, "zopt: %s: would overwrite the %s file\n", name.c_str(), other_role);
    std::exit(1);
}

void open_input() {
    FILE* const stream = std::fopen(i_file_name.c_str(), "rb");
    if (!stream) cannot_open("\n>> Cannot Open Input icode File, %s : %s, Aborting\n", i_file_name);
    std::string why;
    i_file = I_FILE::if_open(stream, opt_client(pass_listener()), &why);
    if (i_file) return;
    std::fprintf(stderr, "\n>> Error when opening input icode file : %s, Aborting\n", i_file_name.c_str());
    if (!why.empty()) std::fprintf(stderr, "zopt: %s: %s\n", i_file_name.c_str(), why.c_str());
    std::exit(1);
}

void settle_debug_options() {
    if (!file_options->getopt(option_obj::OO_print_debug)) return;
    if (file_options->getnumarg(option_obj::OO_gen_opt_info) == 0)
        file_options->setopt(option_obj::OO_gen_opt_info, 1L);
    switch (file_options->getnumarg(option_obj::OO_size_speed_goal)) {
    case option_obj::OV_SIZE_SPEED_GOAL_0:
    case option_obj::OV_SIZE_SPEED_GOAL_1:
    case option_obj::OV_SIZE_SPEED_GOAL_2:
    case option_obj::OV_SIZE_SPEED_GOAL_3: std::fputs("\n\t*** Optimizing code size, not speed ***\n\n", stderr);
    }
}

void settle_output_name(int names) {
    if (names == 1) {
        o_file_name = replace_extension(i_file_name, ".opt");
    } else if (names > 2) {
        std::fputs("\n>>>> OPTIMIZER ERROR: Garbage on command line\n\n", stderr);
        std::exit(1);
    }
    refuse_same_file(o_file_name, i_file_name, "input");
}

void open_info_file() {
    const long level = file_options->getnumarg(option_obj::OO_opt_level);
    const bool high = level == option_obj::OV_OPT_LEVEL_3 || level == option_obj::OV_OPT_LEVEL_4;
    if (!high && !file_options->getopt(option_obj::OO_print_debug)) file_options->clearopt(option_obj::OO_gen_opt_info);
    write_opt_info = static_cast<int>(file_options->getnumarg(option_obj::OO_gen_opt_info));
    if (write_opt_info == 0) return;
    const char* const given = file_options->getstrarg(option_obj::OO_opt_info_filename);
    info_name = given ? given : replace_extension(i_file_name, ".nfo");
    refuse_same_file(info_name, i_file_name, "input");
    refuse_same_file(info_name, o_file_name, "output");
    if (file_options->getnumarg(option_obj::OO_print_debug) > 0)
        refuse_same_file(info_name, debug_file_name(i_file_name, nullptr), "debug");
    finfo = std::fopen(info_name.c_str(), "w");
    if (!finfo) cannot_open("\n>> Cannot Open Info File, %s : %s, Aborting\n", info_name);
    print_toolversion(finfo);
}

void open_remarks_file() {
    remarks_are_wanted = write_opt_info || pass_debug_remarks;
    remarks_name = pass_debug_remarks.text();
    if (remarks_name.empty()) return;
    remarks_are_wanted = true;
    refuse_same_file(remarks_name, i_file_name, "input");
    refuse_same_file(remarks_name, o_file_name, "output");
    refuse_same_file(remarks_name, info_name, "info");
    refuse_same_file(remarks_name, debug_name, "debug");
    remarks_file = std::fopen(remarks_name.c_str(), "w");
    if (!remarks_file) cannot_open("\n>> Cannot Open Remarks File, %s : %s, Aborting\n", remarks_name);
}

void open_output() {
    refuse_same_file(o_file_name, info_name, "info");
    refuse_same_file(o_file_name, debug_name, "debug");
    output_stream = std::fopen(o_file_name.c_str(), "wb");
    if (!output_stream) cannot_open("\n>> Cannot Open Output icode File, %s : %s, Aborting\n", o_file_name);
    real_output_name = real_file_name(o_file_name);
    // What the run prints must not stand in the I-file.
    std::fflush(stdout);
    if (is_standard_output(o_file_name)) dup2(STDERR_FILENO, STDOUT_FILENO);
    o_file = I_FILE::if_create(output_stream, tp, i_file->source_name.c_str());
    for (const OPTION_SET& set : icode_optionlist) o_file->if_enter_option_set(set);
}

void warn_of_volatile_variables() {
    constexpr char text[] = "\n>>>> Warning: All non-auto lvalues are considered VOLATILE.\n\n";
    if (!volit_vars) return;
    debug_printf("%s", text);
    std::fputs(text, stderr);
}

} // namespace

void open_files(int argc, char** argv) {
    install_common_handlers(argc > 0 ? argv[0] : nullptr, write_termination_notes);
    const int names = parse_command_line(argc, argv);
    if (names == 0) {
        std::fprintf(stderr, "Usage: %s [-options] filename\n", option_obj::executable_name);
        std::exit(1);
    }
    open_input();
    build_option_sets();
    if (file_options->getopt(option_obj::OO_dump_options)) {
        file_options->dump(0);
        std::exit(0);
    }
    reset_global_flags();
    std::memset(aux_cmd_flag, 0, sizeof aux_cmd_flag);
    set_global_flags(file_options);
    if (pass_debug_help) register_option::dump();
    tp = new TYPE_PKG();
    TYPE_PKG::init_type_pkg(tp);
    i_file->if_type_init(tp);
    settle_debug_options();
    settle_output_name(names);
    open_info_file();
    if (file_options->getnumarg(option_obj::OO_print_debug) > 0) {
        open_debug_file(1, nullptr, nullptr);
        print_debug = static_cast<int>(file_options->getnumarg(option_obj::OO_print_debug));
    }
    open_remarks_file();
    init_proc_integration();
    open_output();
    warn_of_volatile_variables();
    emit_cmd_line_text(argc, argv);
}

void open_debug_file(int fatal, const char* suffix, const char* mode) {
    if (!suffix && fdebug) return;
    const std::string name = debug_file_name(i_file_name, suffix);
    if (fdebug) debug_printf(">>>> SWITCHING LOG TO %s\n", name.c_str());
    bool overwrites = false;
    for (const std::string& other : {i_file_name, o_file_name, info_name})
        overwrites |= !other.empty() && (name == other || is_same_file(name, other));
    if (overwrites) errno = EEXIST;
    FILE* const stream = overwrites ? nullptr : std::fopen(name.c_str(), mode ? mode : "w");
    if (!stream) {
        std::fprintf(stderr, "\n>> Cannot Open Debug File, %s : %s, Aborting\n", std::strerror(errno), name.c_str());
        if (fatal) std::exit(1);
    }
    if (!suffix) debug_name = name;
    fdebug = stream ? stream : stderr;
}

void close_debug_stream() {
    if (fdebug && fdebug != stderr) std::fclose(fdebug);
    fdebug = nullptr;
}

namespace {

// The output is not whole. A link to it stays, and other names of the file find it empty; a device or a pipe is not ours.
void remove_output() {
    if (!is_regular_file(real_output_name)) return;
    if (truncate(real_output_name.c_str(), 0) == 0) std::remove(real_output_name.c_str());
}

} // namespace

void discard_output() {
    if (!o_file && !output_stream) return;
    if (o_file) I_FILE::if_close(o_file, true, true);
    if (i_file) I_FILE::if_close(i_file, true, false);
    o_file = i_file = nullptr;
    output_stream = nullptr;
    remove_output();
}

void fail_run(const std::string& text) {
    std::fflush(stdout);
    discard_output();
    std::fprintf(stderr, "%s\n", text.c_str());
    std::exit(1);
}

namespace {

// Closes a text file of the run with its last line. False if something of it could not be written.
bool finish_text_file(FILE*& file, const char* last_line) {
    FILE* const f = file;
    file = nullptr;
    if (!f || f == stderr) return true;
    std::fputs(last_line, f);
    const bool failed = std::ferror(f) != 0;
    return std::fclose(f) == 0 && !failed;
}

void write_remarks() {
    if (remarks_file) write_remarks_as_JSON(remarks_file);
    if (!finfo) return;
    info_printf("\n== REMARKS ==\n\n");
    write_remarks_as_text(finfo, write_opt_info >= 2);
}

} // namespace

void close_files() {
    // The output refers to positions and names that the input's reader owns.
    errno = 0;
    const bool output_failed = I_FILE::if_close(o_file, true, false) != 0;
    const int reason = errno;
    o_file = nullptr;
    output_stream = nullptr;
    I_FILE::if_close(i_file, true, false);
    i_file = nullptr;
    const bool debug_good = finish_text_file(fdebug, "\n== END OF DEBUG OUTPUT==\n");
    write_remarks();
    const bool info_good = finish_text_file(finfo, "\n== END OF INFO OUTPUT==\n");
    const bool remarks_good = finish_text_file(remarks_file, "");
    if (!output_failed && debug_good && info_good && remarks_good) return;
    const std::string& name = output_failed ? o_file_name : !debug_good ? debug_name : !info_good ? info_name : remarks_name;
    remove_output();
    std::fprintf(stderr, "zopt: %s: cannot write: %s\n", name.c_str(), std::strerror(reason ? reason : EIO));
    std::exit(1);
}
