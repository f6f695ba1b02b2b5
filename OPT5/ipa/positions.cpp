#include "OPT5/ipa/positions.h"

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "UTIL/psn.h"

#include <algorithm>
#include <cstring>
#include <mutex>
#include <tuple>

register_option pass_debug_dump_psn("debug:dump_psn");

namespace {

std::mutex psnmap_lock;                           // guards both
std::unordered_map<const PSN*, SYMTAB*> psnmap;   // looked up; sorted where it is printed
std::vector<SYMTAB*> psnrefs;                     // in the order of their first integration

bool is_not_behind(const PSN* a, const PSN* b) { return std::tie(a->line, a->column) <= std::tie(b->line, b->column); }

bool are_in_one_file(const PSN* a, const PSN* b) {
    return a->file == b->file || (a->file && b->file && !std::strcmp(a->file, b->file));
}

const char* file_of(const PSN* psn) { return psn && psn->file ? psn->file : "NO_FILE"; }
long line_of(const PSN* psn) { return psn ? psn->line : 0; }

} // namespace

bool psn_is_within_psn_range(const PSN* psn, const PSN* first, const PSN* last) {
    return psn && first && last && are_in_one_file(psn, first) && is_not_behind(first, psn) && is_not_behind(psn, last);
}

void psnref_add(SYMTAB* function) {
    std::lock_guard<std::mutex> lock(psnmap_lock);
    if (std::find(psnrefs.begin(), psnrefs.end(), function) == psnrefs.end()) psnrefs.push_back(function);
}

// What came with an expansion of the body keeps its own function.
void enter_positions(const CFG_COPY& copy, SYMTAB* function) {
    std::lock_guard<std::mutex> lock(psnmap_lock);
    for (const BBLK* bb = copy.first; bb; bb = bb == copy.last ? nullptr : bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest)
            if (s->psn) psnmap.emplace(s->psn, function);
}

SYMTAB* psn_search(const PSN* psn) {
    std::lock_guard<std::mutex> lock(psnmap_lock);
    if (auto it = psnmap.find(psn); it != psnmap.end()) return it->second;
    for (SYMTAB* s : psnrefs)
        if (const FUNINFO* f = find_FUNINFO(s); f && psn_is_within_psn_range(psn, f->begin_psn, f->end_psn)) return s;
    return nullptr;
}

void dump_psnrefs() {
    if (!pass_debug_dump_psn) return;
    std::lock_guard<std::mutex> lock(psnmap_lock);
    for (SYMTAB* s : psnrefs) {
        const FUNINFO* f = find_FUNINFO(s);
        debug_printf("PSNREF %s: %s:%ld-%ld\n", s->name, file_of(f->begin_psn), line_of(f->begin_psn), line_of(f->end_psn));
    }
}

void dump_psnmap() {
    if (!pass_debug_dump_psn) return;
    std::lock_guard<std::mutex> lock(psnmap_lock);
    std::vector<std::tuple<std::string, long, long, const char*>> rows;
    for (const auto& [psn, s] : psnmap) rows.emplace_back(file_of(psn), psn->line, psn->column, s->name);
    std::sort(rows.begin(), rows.end());
    for (const auto& [file, line, column, name] : rows) debug_printf("PSN %s:%ld:%ld from %s\n", file.c_str(), line, column, name);
}
