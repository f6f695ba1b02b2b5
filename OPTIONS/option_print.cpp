// Help for people, and dumps of what an object holds.
#include "OPTIONS/option_obj.h"

#include <cstring>

namespace {

constexpr int FORMS = 10;
constexpr int HELP_COLUMN = 34; // where the text behind a name begins

std::string words_of(const option_obj::option_item* item) {
    std::string words;
    for (; item && item->word; ++item) words += (words.empty() ? "" : ",") + std::string(item->word);
    return words;
}

std::string state_text(const option_obj& o, int id, int state) {
    std::string text = std::to_string(state);
    for (unsigned i = 0; i < o.getargcount(id); ++i) {
        std::string word;
        if (!o.export_option(id, i, &word)) word = std::to_string(o.getnumarg(id, i));
        text += " " + word;
    }
    return text;
}

} // namespace

std::string option_obj::get_opt_txt(int id) {
    const option_definition& d = option_definitions[id];
    if (!d.forms[0]) return {};
    std::string text = d.forms[0];
    if (d.has_arg) {
        if (text.back() != ':') text += "=";
        text += d.arg_text;
    }
    for (int form = 1; form < FORMS && d.forms[form]; ++form) text += std::string(", ") + d.forms[form];
    return text;
}

void option_obj::dump_class(class_id help_class) {
    std::printf("%s:\n", class_descriptions[help_class]);
    for (int id = 0; id < OPTION_COUNT; ++id) {
        if (!option_definitions[id].forms[0] || !isclass(id, help_class)) continue;
        const std::string form = get_opt_txt(id);
        if (form.size() > HELP_COLUMN - 3)
            std::printf("  %s\n%*s", form.c_str(), HELP_COLUMN, "");
        else
            std::printf("  %-*s ", HELP_COLUMN - 3, form.c_str());
        std::printf("%s", option_definitions[id].help[0]);
        const std::string words = words_of(option_definitions[id].items);
        if (!words.empty()) std::printf(" {%s}", words.c_str());
        std::printf("\n");
    }
    std::printf("\n");
}

void option_obj::display_option_help(int, int, int) {
    std::printf("Usage: %s [-options] filename [outfile]\n\n", executable_name);
    for (int c = CLASS_GENERAL; c < CLASS_COUNT; ++c) {
        if (c == CLASS_OPTIMIZER) continue; // its members stand under their subjects
        dump_class(static_cast<class_id>(c));
        if (c == CLASS_GENERAL) std::printf("  %-*s %s\n\n", HELP_COLUMN - 3, "--help, --usage, -?", "this text");
    }
    std::printf("Files:\n"
                "  The input is an I-file; without outfile the output has its name and the ending .opt.\n"
                "  --print_debug writes the input's name with .odb, --gen_opt_info with .nfo.\n\n"
                "Exit status:\n"
                "  0 done; 1 wrong command line, wrong input, a file that cannot be opened or written, a defect;\n"
                "  2 ended by a signal. After another status than 0 there is no output.\n\n"
                "Environment:\n"
                "  FORCED_OPT_PASSES  steps to run, as --opt_passes has them\n");
}

void option_obj::print() const {
    for (const std::string& word : export_option_list(0)) std::printf("%s\n", word.c_str());
}

void option_obj::dump(int all) const {
    for (int id = 0; id < OPTION_COUNT; ++id) {
        if (!all && !getopt(id)) continue;
        std::printf("%2d %-30s %s\n", id, enum_to_optiontxt(id), state_text(*this, id, state[id]).c_str());
    }
}

void option_obj::dump_history() const {
    for (const event& e : history)
        std::printf("%s%s%s\n", enum_to_optiontxt(e.id), e.text.empty() ? "" : "=", e.text.c_str());
}
