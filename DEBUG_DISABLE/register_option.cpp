// The table of internal switches and the reader of the lists that set them.
#include "DEBUG_DISABLE/register_option.h"

#include <cstdlib>
#include <cstring>

namespace {
// A name with its prefix must be shorter than this; the excess of a longer one names no switch.
constexpr std::size_t NAME_LIMIT = 512;
} // namespace

register_option::register_option(const char* switch_name) : name_m(switch_name) { objects()[name_m] = this; }

// Switches are constructed during static initialization, in no order that could be relied on: the table is made on first
// use, and never destroyed so that late readers find it.
std::map<std::string, register_option*>& register_option::objects() {
    static auto* const table = new std::map<std::string, register_option*>;
    return *table;
}

register_option* register_option::get_option(const std::string& name) {
    const auto found = objects().find(name);
    return found == objects().end() ? nullptr : found->second;
}

std::map<std::string, int> register_option::get_state() {
    std::map<std::string, int> state;
    for (const auto& [name, object] : objects()) state[name] = *object;
    return state;
}

void register_option::set_state(const std::map<std::string, int>& state) {
    for (const auto& [name, value] : state)
        if (register_option* object = get_option(name)) *object = value;
}

void register_option::reset_state() {
    for (const auto& entry : objects()) {
        *entry.second = 0;
        entry.second->text_m.clear();
    }
}

void register_option::dump() {}

bool process_debug_option(const char* kind, const char* list) {
    const std::string prefix = std::string(kind) + ":";
    bool all_known = true;
    for (const char* word = list; *word;) {
        const std::size_t length = std::strcspn(word, ",");
        const std::string text(word, length);
        word += length + (word[length] == ',');
        if (text.empty()) continue;
        const std::size_t equals = text.find('=');
        const std::string name = text.substr(0, equals);
        const bool fits = prefix.size() + name.size() < NAME_LIMIT;
        register_option* object = fits ? register_option::get_option(prefix + name) : nullptr;
        if (!object) {
            all_known = false;
            continue;
        }
        object->text_m = equals == std::string::npos ? "" : text.substr(equals + 1);
        *object = equals == std::string::npos ? 1 : static_cast<int>(std::strtol(object->text_m.c_str(), nullptr, 0));
    }
    return all_known;
}
