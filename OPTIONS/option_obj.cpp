// What an option_obj holds: setting, clearing, reading, export.
#include "OPTIONS/option_obj.h"

#include "OPTIONS/optgen.h"

#include <cctype>
#include <cstdlib>
#include <cstring>

namespace {
constexpr char TAG[] = "opt option debug";
} // namespace

// ---- Setting

void option_obj::setopt(int id) {
    if (!valid(id)) return;
    ++state[id];
    if (debug) std::printf("%s: Set    option id %s to state %d\n", TAG, enum_to_optiontxt(id), state[id]);
    if (!no_conflicts) do_conflicts(id);
    add_to_history(id);
}

void option_obj::setopt(int id, long value) { setarg(id, value); }
void option_obj::setopt(int id, const char* value) { setarg(id, value); }

void option_obj::setopt_internal(int id) {
    if (valid(id)) ++state[id];
}

void option_obj::do_conflicts(int id) {
    for (int other = 0; other < OPTION_COUNT; ++other) {
        if (!getopt(other)) continue;
        const std::string ours = format_of_option(id), theirs = format_of_option(other);
        switch (conflicts(id, other)) {
        case 1:
            if (debug) report(DIAG::optgen_conflict_quiet_option(__FILE__, __LINE__, ours.c_str(), theirs.c_str()));
            clearopt(other);
            break;
        case 2:
            report(DIAG::optgen_conflict_override_option(__FILE__, __LINE__, ours.c_str(), theirs.c_str()));
            clearopt(other);
            break;
        case 3:
            report(DIAG::optgen_conflict_option(__FILE__, __LINE__, ours.c_str(), theirs.c_str()));
            clearopt(other);
            std::exit(1);
        }
    }
}

void option_obj::clear_conflicting(int id) {
    for (int other = 0; other < OPTION_COUNT; ++other)
        if (conflicts(id, other) && getopt(other)) clearopt(other);
}

void option_obj::clearopt(int id) {
    if (!valid(id)) return;
    if (option_definitions[id].flags[2]) {
        if (getopt(id)) report(DIAG::optgen_clear_persistent(__FILE__, __LINE__, format_of_option(id).c_str()));
        return;
    }
    state[id] = 0;
    ++clear_count[id];
    args[id].clear();
    clear_history(id);
    if (debug) std::printf("%s: Clear  option id %s to state 0\n", TAG, enum_to_optiontxt(id));
}

// The first argument of an option sets it; later ones replace or extend without another conflict check.
void option_obj::first_argument(int id) {
    if (!args[id].empty()) return;
    ++clear_count[id];
    setopt(id);
}

void option_obj::store(int id, const argument& arg) {
    const bool is_list = parm_type[id] >= PK_STRING_LIST;
    if (!is_list) args[id].clear();
    args[id].push_back(arg);
    if (!history.empty() && history.back().id == id && history.back().text.empty())
        history.back().text = arg.word.empty() ? std::to_string(arg.number) : arg.word;
    else
        add_to_history(id, arg.word.empty() ? std::to_string(arg.number) : arg.word);
}

void option_obj::setarg(int id, long value) {
    if (!valid(id)) return;
    first_argument(id);
    switch (parm_type[id]) {
    case PK_STRING:
    case PK_STRING_LIST: store(id, {std::to_string(value), 0}); break;
    case PK_NUMBER:
    case PK_UNSIGNED:
    case PK_ENUM:
    case PK_NUMBER_LIST:
    case PK_UNSIGNED_LIST: store(id, {std::string(), value}); break;
    default: report(DIAG::optgen_unhandled_clause_in_setarg(__FILE__, __LINE__, id));
    }
}

void option_obj::setarg(int id, const char* value) {
    if (!valid(id)) return;
    first_argument(id);
    switch (parm_type[id]) {
    case PK_STRING:
    case PK_STRING_LIST: store(id, {value, 0}); break;
    default: report(DIAG::optgen_unhandled_clause_in_setarg(__FILE__, __LINE__, id));
    }
}

void option_obj::setclassmembers(class_id c) {
    for (int id = 0; id < OPTION_COUNT; ++id)
        if (isclass(id, c) && !getopt(id) && parm_type[id] == PK_NONE) setopt(id);
}

void option_obj::clearclassmembers(class_id c) {
    for (int id = 0; id < OPTION_COUNT; ++id)
        if (isclass(id, c) && getopt(id)) clearopt(id);
}

void option_obj::parsed_option(int id, int form) {
    if (valid(id)) seen_by_parse[id] = static_cast<unsigned char>(form + 1);
}

void option_obj::addfileopt(const char* tool, const char* option) {
    if (tool_cmd_map.count(tool))
        tn_fileopt_map[tool].push_back(option);
    else
        report(DIAG::optgen_missing_fileopt(__FILE__, __LINE__, tool));
}

void option_obj::add_to_history(int id, const std::string& text) { history.push_back({id, text}); }
void option_obj::clear_history(int id) {
    history.remove_if([id](const event& e) { return e.id == id; });
}

// ---- Reading

long option_obj::getnumarg(int id, unsigned index) const {
    return valid(id) && index < args[id].size() ? args[id][index].number : 0;
}

const char* option_obj::getstrarg(int id, unsigned index) const {
    return valid(id) && index < args[id].size() ? args[id][index].word.c_str() : nullptr;
}

unsigned option_obj::getargcount(int id) const { return valid(id) ? static_cast<unsigned>(args[id].size()) : 0; }

bool option_obj::isclass(int id, class_id c) { return valid(id) && (c == CLASS_ALL || (classes[id] >> c & 1) != 0); }

bool option_obj::testclass(class_id c) const {
    for (int id = 0; id < OPTION_COUNT; ++id)
        if (isclass(id, c) && getopt(id)) return true;
    return false;
}

bool option_obj::seenclass(class_id c) const {
    for (int id = 0; id < OPTION_COUNT; ++id)
        if (isclass(id, c) && seen_by_parse[id]) return true;
    return false;
}

std::vector<int> option_obj::class_list_for_option(int id) {
    std::vector<int> list;
    for (int c = CLASS_GENERAL; c < CLASS_COUNT; ++c)
        if (isclass(id, static_cast<class_id>(c))) list.push_back(c);
    return list;
}

// ---- Export

std::string option_obj::internal_option_string(int id) {
    const char* const name = valid(id) ? option_definitions[id].forms[0] : nullptr;
    return name ? name + 1 : "";
}

std::string option_obj::format_of_option(int id) const {
    if (!valid(id) || !option_definitions[id].forms[0]) return "<internal>";
    return option_definitions[id].forms[seen_by_parse[id] ? seen_by_parse[id] - 1 : 0];
}

bool option_obj::export_option(int id, unsigned index, std::string* text) const {
    if (!getopt(id) || !option_definitions[id].forms[0]) return false;
    *text = "-" + internal_option_string(id);
    if (parm_type[id] == PK_NONE) return true;
    if (index >= args[id].size()) return false;
    const argument& arg = args[id][index];
    *text += "=";
    switch (parm_type[id]) {
    case PK_STRING:
    case PK_STRING_LIST: *text += arg.word; break;
    case PK_ENUM: {
        const char* const word = enum_to_enumtxt(static_cast<int>(arg.number));
        *text += word ? word : "error";
        break;
    }
    default: *text += std::to_string(arg.number);
    }
    return true;
}

std::vector<std::pair<int, std::string>> option_obj::export_option_pairs(int type, class_id c) const {
    std::vector<std::pair<int, std::string>> pairs;
    for (int id = 0; id < OPTION_COUNT; ++id) {
        if (!isclass(id, c) || !getopt(id)) continue;
        // The first argument counts in `clear_count` as well; only what lies beyond it tells of a clearing.
        if (type == 1 && clear_count[id] <= (args[id].empty() ? 0 : 1)) continue;
        std::string text;
        for (unsigned i = 0; i == 0 || i < args[id].size(); ++i)
            if (export_option(id, i, &text)) pairs.emplace_back(id, text);
    }
    return pairs;
}

std::vector<std::string> option_obj::export_option_class(int type, class_id c) const {
    std::vector<std::string> list;
    for (auto& pair : export_option_pairs(type, c)) list.push_back(std::move(pair.second));
    return list;
}

void option_obj::post_process_option_depends() {
    if (DIAGNOSTIC::error_count_m > 0) std::exit(1);
}

const char* option_obj::rot13(const char* text) {
    static std::string buffers[5];
    static int next = 0;
    if (!text) return "";
    std::string& buffer = buffers[next];
    next = (next + 1) % 5;
    const std::size_t length = std::strlen(text);
    if (buffer.capacity() < length) buffer.reserve(length + 80);
    buffer.assign(text, length);
    for (char& c : buffer) {
        if (std::isalpha(static_cast<unsigned char>(c))) {
            const char first = std::isupper(static_cast<unsigned char>(c)) ? 'A' : 'a';
            c = static_cast<char>(first + (c - first + 13) % 26);
        } else if (c == '-' || c == '%') {
            c = c == '-' ? '%' : '-';
        }
    }
    return buffer.c_str();
}
