#include "OPT5/ir/remark.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"

#include <mutex>
#include <set>
#include <tuple>

bool remarks_are_wanted = false;

namespace {

// Ordered by what it says alone: functions may be worked on in any order.
struct ENTRY {
    std::string file;
    long line, column;
    std::string function, pass;
    REMARK kind;
    std::string text;

    bool operator<(const ENTRY& o) const {
        return std::tie(file, line, column, function, pass, kind, text) <
               std::tie(o.file, o.line, o.column, o.function, o.pass, o.kind, o.text);
    }
};

std::set<ENTRY> remarks;
std::mutex remarks_lock;

const char* name_of(REMARK kind) {
    return kind == REMARK::DONE ? "done" : kind == REMARK::MISSED ? "missed" : "note";
}

// The length of the character of UTF-8 at `s`; 0 if there is none.
size_t length_of_character(const std::string& s, size_t at) {
    const auto byte = [&](size_t i) { return i < s.size() ? static_cast<unsigned char>(s[i]) : 0u; };
    const unsigned first = byte(at);
    if (first < 0x80) return 1;
    const size_t length = first >= 0xC2 && first < 0xE0 ? 2 : first >= 0xE0 && first < 0xF0 ? 3
                          : first >= 0xF0 && first < 0xF5 ? 4 : 0;
    for (size_t i = 1; i < length; ++i)
        if ((byte(at + i) & 0xC0) != 0x80) return 0;
    const unsigned second = byte(at + 1);
    const bool is_overlong = (first == 0xE0 && second < 0xA0) || (first == 0xF0 && second < 0x90);
    const bool is_beyond = (first == 0xED && second >= 0xA0) || (first == 0xF4 && second >= 0x90);
    return is_overlong || is_beyond ? 0 : length;
}

// A JSON string; bytes that are no text become the replacement character.
std::string quoted(const std::string& s) {
    std::string out = "\"";
    for (size_t i = 0; i < s.size();) {
        const size_t length = length_of_character(s, i);
        const auto c = static_cast<unsigned char>(s[i]);
        if (length == 0)
            out += "\\ufffd";
        else if (c == '"' || c == '\\')
            out += {'\\', s[i]};
        else if (c < 0x20) {
            char text[8];
            std::snprintf(text, sizeof text, "\\u%04x", static_cast<unsigned>(c));
            out += text;
        } else
            out += s.substr(i, length);
        i += length ? length : 1;
    }
    return out + '"';
}

} // namespace

void remark(const char* pass, const PSN* position, REMARK kind, const std::string& text) {
    if (!remarks_are_wanted) return;
    ENTRY e{"", 0, 0, currfuninfo ? currfuninfo->name : "", pass, kind, text};
    if (position) e.file = position->file ? position->file : "", e.line = position->line, e.column = position->column;
    const std::lock_guard<std::mutex> lock(remarks_lock);
    remarks.insert(std::move(e));
}

void write_remarks_as_text(FILE* out, bool with_notes) {
    for (const ENTRY& e : remarks) {
        if (e.kind == REMARK::NOTE && !with_notes) continue;
        std::fprintf(out, "%s:%ld: %s: [%s] %s", e.file.empty() ? "NO_FILE" : e.file.c_str(), e.line, name_of(e.kind),
                     e.pass.c_str(), e.text.c_str());
        std::fprintf(out, e.function.empty() ? "\n" : " (in %s)\n", e.function.c_str());
    }
}

void write_remarks_as_JSON(FILE* out) {
    for (const ENTRY& e : remarks)
        std::fprintf(out,
                     "{\"file\":%s,\"line\":%ld,\"column\":%ld,\"function\":%s,\"pass\":%s,\"kind\":\"%s\",\"text\":%s}\n",
                     quoted(e.file).c_str(), e.line, e.column, quoted(e.function).c_str(), quoted(e.pass).c_str(),
                     name_of(e.kind), quoted(e.text).c_str());
}
