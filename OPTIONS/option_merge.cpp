// Joining the options of several files: conflicts between them, then a policy per option.
#include "OPTIONS/optgen.h"
#include "OPTIONS/option_obj.h"

#include <cstdlib>

namespace {
std::string args_text(const option_obj& o, int id) {
    std::string all, text;
    for (unsigned i = 0; i == 0 || i < o.getargcount(id); ++i)
        if (o.export_option(id, i, &text)) all += text + "\n";
    return all;
}
std::string with_arguments(const option_obj& o, int id) {
    std::string text;
    return o.export_option(id, 0, &text) ? text : o.format_of_option(id);
}
} // namespace

void option_obj::merge_init(const option_obj& main_object, const char*) { *this = main_object; }

void option_obj::merge_options(const option_obj& other, const char* file) {
    for (int id = 0; id < OPTION_COUNT; ++id)
        if (other.getopt(id)) do_merge_conflicts(id, other, file);
    for (int id = 0; id < OPTION_COUNT; ++id) merge_one(id, other, file);
}

// What `id` of the other object does to our options.
void option_obj::do_merge_conflicts(int id, const option_obj& other, const char* file) {
    for (int ours = 0; ours < OPTION_COUNT; ++ours) {
        if (!getopt(ours)) continue;
        const std::string theirs_text = other.format_of_option(id), ours_text = format_of_option(ours);
        switch (merge_conflicts(id, ours)) {
        case 1:
            if (debug)
                report(DIAG::optgen_conflict_quiet_option(__FILE__, __LINE__, theirs_text.c_str(), ours_text.c_str()));
            clearopt(ours);
            break;
        case 2:
            report(DIAG::optgen_conflict_override_option(__FILE__, __LINE__, theirs_text.c_str(), ours_text.c_str()));
            clearopt(ours);
            break;
        case 3:
            report(
                DIAG::optgen_merge_conflict_option(__FILE__, __LINE__, theirs_text.c_str(), file, ours_text.c_str()));
            clearopt(ours);
            std::exit(1);
        }
    }
}

// The place of a value in the order of "greater": itself, or its place in the item list.
long option_obj::rank(int id, long value) {
    if (parm_type[id] != PK_ENUM) return value;
    long place = 0;
    for (const option_item* item = option_definitions[id].items; item->word; ++item, ++place)
        if (item->value == value) break;
    return place;
}

void option_obj::copy_option(int id, const option_obj& other) {
    for (unsigned i = 0; i == 0 || i < other.args[id].size(); ++i) {
        std::string word;
        if (other.export_option(id, i, &word)) process_option(word.c_str() + 1, nullptr);
    }
}

void option_obj::merge_by_order(int id, const option_obj& other, bool greater) {
    if (!other.getopt(id)) return;
    if (!getopt(id)) {
        copy_option(id, other);
        return;
    }
    if (args[id].empty() || other.args[id].empty()) return;
    const long ours = rank(id, args[id][0].number), theirs = rank(id, other.args[id][0].number);
    if (greater ? theirs > ours : theirs < ours) setarg(id, other.args[id][0].number);
}

void option_obj::merge_one(int id, const option_obj& other, const char* file) {
    switch (merge_policies[id]) {
    case merge_policy_or:
        if (other.getopt(id)) copy_option(id, other);
        break;
    case merge_policy_max: merge_by_order(id, other, true); break;
    case merge_policy_min: merge_by_order(id, other, false); break;
    case merge_policy_exact:
    case merge_policy_exact_notset:
        if (getopt(id) && !other.getopt(id))
            report(DIAG::optgen_exact_set_in_previous_files(__FILE__, __LINE__, format_of_option(id).c_str(), file));
        else if (!getopt(id) && other.getopt(id))
            report(DIAG::optgen_exact_not_set_in_previous_files(__FILE__, __LINE__, other.format_of_option(id).c_str(),
                                                                file));
        else if (merge_policies[id] == merge_policy_exact && getopt(id) && args_text(*this, id) != args_text(other, id))
            report(DIAG::optgen_exact_args_incompatible(__FILE__, __LINE__, with_arguments(other, id).c_str(), file,
                                                        with_arguments(*this, id).c_str()));
        break;
    case merge_policy_and:    // the other object's value stays out
    case merge_policy_none:   // nothing
    case merge_policy_main:   // the main object wins
    case merge_policy_custom: // an option's own rule; none has one
        break;
    }
}
