#include "OPT5/ir/remark.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"

#include <nlohmann/json.hpp>

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

// Bytes that are no text become the replacement character.
void write_remarks_as_JSON(FILE* out) {
    using nlohmann::ordered_json;
    for (const ENTRY& e : remarks) {
        const ordered_json object = {{"file", e.file},         {"line", e.line}, {"column", e.column},
                                     {"function", e.function}, {"pass", e.pass}, {"kind", name_of(e.kind)},
                                     {"text", e.text}};
        std::fprintf(out, "%s\n", object.dump(-1, ' ', false, ordered_json::error_handler_t::replace).c_str());
    }
}
