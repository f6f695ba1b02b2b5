#include "OPT5/driver/pipeline.h"

#include "OPT5/dd/loop.h"
#include "OPT5/driver/driver.h"
#include "OPT5/driver/frames.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/grammar.h"
#include "OPT5/ir/rewrite_limit.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <mutex>
#include <unordered_map>
#include <vector>

namespace {

register_option pass_debug_skip("debug:skip"), pass_debug_only("debug:only"), pass_debug_list_rows("debug:list_rows"),
    pass_debug_idle_frames("debug:idle_frames"), pass_debug_rows("debug:rows");

bool current_function_has_blocks() { return currfuninfo && currfuninfo->bb_list; }

void print_current_function() {
    if (current_function_has_blocks() && fdebug) prbbinfix(fdebug);
}

void announce(const char* word, const ROW& row, const ROW_LABEL& label) {
    if (!print_debug) return;
    debug_printf("\n\n\t\t\t---------- %s %s '%s' ----------\n", word, label.text().c_str(), row.name);
    debug_flush();
}

void validate_current_function(const ROW& row, const ROW_LABEL& label, const char* place = "") {
    if (!current_function_has_blocks()) return;
    const int errors =
        validate_cfg() + validate_stmts() + validate_grammar() + validate_facts() + validate_loop_hierarchy();
    if (errors == 0) return;
    const std::string text = label.text() + place + " '" + row.name + "' left " + std::to_string(errors) + " errors";
    abort_optimizer(text.c_str());
}

bool has_work(const ROW& row) {
    if (row.kind == ROW::IDLE && !(row.frame && pass_debug_idle_frames)) return false;
    return !row.condition || row.condition();
}

// With --debug:rows=N the first N runs of rows that may be left out take place, over all functions, and no others:
// whoever looks for the one that breaks a program halves them. The last one is named, and their number; with N below 0
// none takes place.
bool is_beyond_limit(const ROW& row) {
    static long count = 0;
    if (!pass_debug_rows || row.kind != ROW::FUNCTION) return false;
    if (count == 0) std::atexit([] { std::fprintf(stderr, "zopt: %ld runs of rows\n", count); });
    begin_counted_rewrites(count + 1 == pass_debug_rows);
    if (++count == pass_debug_rows)
        std::fprintf(stderr, "zopt: run %ld: '%s' of %s\n", count, row.name, currfunc ? currfunc->name : "the program");
    return count > pass_debug_rows;
}

void do_work(const ROW& row, const ROW_LABEL& label) {
    if (!pass_debug_rows) begin_counted_rewrites(true);
    if (!has_work(row) || is_beyond_limit(row)) return;
    if (!row.frame || pass_debug_idle_frames || !row.frame->is_SSA_form) leave_kept_SSA_form();
    if (!row.frame || pass_debug_idle_frames) leave_kept_form();
    if (row.frame) {
        row.frame->begin();
        if (pass_debug_validate) validate_current_function(row, label, " at the begin of");
    }
    if (row.kind != ROW::IDLE) {
        if (row.needs) need(row.needs);
        row.action();
    }
    if (row.frame) row.frame->end();
    if (currfuninfo) changed(row.leaves); // the last step leaves no current function
}

// ---- Times

struct ROW_TIME {
    std::string name;
    long ticks = 0, runs = 0;
};
std::vector<ROW_TIME> row_times; // in the order in which the rows came first
std::unordered_map<const ROW*, std::size_t> time_of_row;
std::mutex row_times_lock;

void add_time(const ROW& row, const ROW_LABEL& label, long ticks) {
    const std::lock_guard<std::mutex> guard(row_times_lock);
    const auto [at, is_new] = time_of_row.try_emplace(&row, row_times.size());
    if (is_new) row_times.push_back({label.text() + " '" + row.name + "'"});
    row_times[at->second].ticks += ticks;
    ++row_times[at->second].runs;
}

} // namespace

void report_row_times(FILE* out) {
    std::stable_sort(row_times.begin(), row_times.end(), [](const ROW_TIME& a, const ROW_TIME& b) { return a.ticks > b.ticks; });
    std::fprintf(out, "\n");
    for (const ROW_TIME& t : row_times)
        std::fprintf(out, "%8.3f secs in %ld runs of %s\n", static_cast<double>(t.ticks) / CLOCKS_PER_SEC, t.runs, t.name.c_str());
}

void run_row(const ROW& row, const ROW_LABEL& label, bool skip) {
    if (skip || is_left_out(row)) {
        announce("SKIPPING", row, label);
        return;
    }
    announce("ENTERING", row, label);
    if (print_debug) print_current_function();
    const bool timed = print_debug || enable_time_stats;
    const clock_t start = timed ? std::clock() : 0;
    FUNINFO* const funinfo = currfuninfo;
    do_work(row, label);
    if (timed) {
        const clock_t ticks = std::clock() - start;
        if (print_debug) debug_printf("(%.1f sec for pass.)\n", static_cast<double>(ticks) / CLOCKS_PER_SEC);
        if (funinfo) funinfo->time += ticks;
        add_time(row, label, ticks);
    }
    if (print_debug) debug_printf("\n");
    announce("EXITING", row, label);
    if (print_debug) print_current_function();
    if (pass_debug_validate) validate_current_function(row, label);
}

namespace {
void run_rows(ROWS rows, const char* table) {
    for (const ROW& row : rows) run_row(row, {table}, false);
}
} // namespace

void run_rows_behind_reading() { run_rows(rows_behind_reading(), "reading:"); }
void run_rows_ahead_of_output() { run_rows(rows_ahead_of_output(), "output:"); }

// ---- Rows by name

std::string switch_name(const ROW& row) {
    std::string out;
    for (const char* p = row.name; *p; ++p) {
        if (std::isalnum(static_cast<unsigned char>(*p)))
            out += static_cast<char>(std::tolower(static_cast<unsigned char>(*p)));
        else if (!out.empty() && out.back() != '-')
            out += '-';
    }
    while (!out.empty() && out.back() == '-') out.pop_back();
    return out;
}

namespace {

std::vector<std::string> names_of(const register_option& list) {
    std::vector<std::string> names(1);
    for (const char c : list.text())
        if (c == '+')
            names.emplace_back();
        else
            names.back() += c;
    return names;
}

bool names(const register_option& list, const ROW& row) {
    const std::string name = switch_name(row);
    for (const std::string& word : names_of(list))
        if (word == name) return true;
    return false;
}

template <class F>
void for_each_row(F&& visit) {
    for (const ROW& row : rows_behind_reading()) visit("reading", row);
    for (const ROW& row : rows_of_steps()) visit("steps", row);
    for (const ROW& row : rows_ahead_of_output()) visit("output", row);
}

void check_names(const register_option& list, const char* word) {
    if (list.text().empty()) return;
    for (const std::string& name : names_of(list)) {
        const ROW* found = nullptr;
        for_each_row([&](const char*, const ROW& row) {
            if (switch_name(row) == name) found = &row;
        });
        if (!found)
            fail_run(std::string("zopt: --debug:") + word + ": no row of the pipeline is named \"" + name + "\"");
        if (found->kind == ROW::FIXED)
            fail_run(std::string("zopt: --debug:") + word + ": \"" + name + "\" runs always");
    }
}

void list_rows() {
    for_each_row([](const char* table, const ROW& row) {
        std::printf("%-8s %s%-34s %s\n", table, row.kind == ROW::FIXED ? "*" : " ", switch_name(row).c_str(), row.name);
    });
}

} // namespace

bool is_left_out(const ROW& row) {
    if (row.kind == ROW::FIXED) return false;
    if (!pass_debug_skip.text().empty() && names(pass_debug_skip, row)) return true;
    return !pass_debug_only.text().empty() && !names(pass_debug_only, row);
}

void check_row_switches() {
    if (pass_debug_list_rows) list_rows();
    check_names(pass_debug_skip, "skip");
    check_names(pass_debug_only, "only");
}

bool L1() { return opt_level() >= 1; }
bool L2() { return opt_level() >= 2; }
