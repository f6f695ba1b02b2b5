// The words of the command line, and the option sets that they and the I-file make together.
//
// A set is built from the I-file's strings first; then every option of the command line is applied to it and wins: what
// conflicts with it in the set is dropped without a message.
#include "BANNER/banner.h"
#include "IFILE/pragma.h"
#include "OPT5/driver/driver.h"
#include "OPT5/driver/passes.h"
#include "OPT5/io/write.h"
#include "OPT5/ir/global.h"
#include "OPTIONS/optgen.h"

#include <cstdlib>

namespace {

constexpr unsigned MAX_OPTION_SET = 0xFFFF;

int arg_count, arg_index;
char** arg_words;

[[noreturn]] void reject_option(const std::string& word, const std::string& origin) {
    const DIAG_SRCINFO_DATA where(origin.c_str(), 0, 0);
    DIAG::invalid_option message(__FILE__, __LINE__, word.c_str());
    message.set_src(origin.empty() ? nullptr : &where)->report();
    std::exit(1);
}

// Options that ask for a text and end the run are done as soon as they are read.
void serve_requests() {
    if (cmdline_options->getopt(option_obj::OO_toolversion)) {
        print_toolversion(stdout);
        std::exit(0);
    }
    if (cmdline_options->getopt(option_obj::OO_list_passes)) {
        setup_passes(false);
        list_passes(stderr);
        std::exit(0);
    }
}

void apply_icode_strings(option_obj* set, const OPTION_SET& from) {
    set->origin = i_file_name + ": option set " + std::to_string(from.id);
    for (const std::string& word : from.options)
        if (word.size() < 2 || word[0] != '-' || !set->process_option(word.c_str() + 1, nullptr))
            reject_option(word, set->origin);
}

void apply_command_line(option_obj* set) {
    set->origin.clear();
    for (const auto& [id, word] : cmdline_options->export_option_pairs(0, option_obj::CLASS_OPTIMIZER)) {
        set->clear_conflicting(id);
        if (!set->process_option(word.c_str() + 1, nullptr)) reject_option(word, "");
    }
}

option_obj* make_set() {
    auto* set = new option_obj(true);
    set->help_allowed = false;
    return set;
}

} // namespace

const char* next_arg() { return arg_index < arg_count ? arg_words[arg_index++] : nullptr; }

int parse_command_line(int argc, char** argv) {
    arg_count = argc;
    arg_words = argv;
    arg_index = 1;
    cmdline_options = new option_obj(true);
    if (argc > 0) option_obj::executable_name = argv[0];
    option_obj::next_arg = next_arg;
    int names = 0;
    while (const char* word = next_arg()) {
        if (*word == '-') {
            if (!cmdline_options->process_option(word + 1, nullptr)) reject_option(word, "");
            serve_requests();
            continue;
        }
        ++names;
        if (names == 1)
            i_file_name = word;
        else if (names == 2)
            o_file_name = word;
        else
            std::fprintf(stderr, "\n>>>> OPTIMIZER ERROR: Unexpected options: %s %s %s\n", i_file_name.c_str(),
                         o_file_name.c_str(), word);
    }
    return names;
}

void build_option_sets() {
    unsigned last = 0;
    for (const OPTION_SET& set : icode_optionlist) {
        if (set.id > MAX_OPTION_SET)
            fail_run("zopt: " + i_file_name + ": option set number " + std::to_string(set.id) + " is out of range");
        if (set.id > last) last = set.id;
    }
    for (unsigned n = 0; n <= last; ++n) all_option_sets.push_back(make_set());
    if (!cmdline_options->getopt(option_obj::OO_ignore_icode_options))
        for (const OPTION_SET& set : icode_optionlist) apply_icode_strings(all_option_sets[set.id], set);
    for (option_obj* set : all_option_sets) apply_command_line(set);
    file_options = all_option_sets[0];
}

void emit_cmd_line_text(int argc, char** argv) {
    static bool done = false;
    if (done) return;
    done = true;
    std::string text = ";\t";
    for (int i = 0; i < argc; ++i) text += (i ? " " : "") + std::string(argv[i]);
    wrasmr(47, text.c_str(), nullptr);
    const bool with_strings = !cmdline_options->getopt(option_obj::OO_ignore_icode_options);
    for (const OPTION_SET& set : icode_optionlist) {
        debug_printf("Option set %d%s:\n", static_cast<int>(set.id), set.id == 0 ? " (file-level options)" : "");
        if (!with_strings) continue;
        for (const std::string& word : set.options) debug_printf("\t%s\n", word.c_str());
    }
}
