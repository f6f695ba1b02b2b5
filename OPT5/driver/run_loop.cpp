// The function loop: every function has its own list of the steps that remain for it; all lists advance to the next
// barrier, the barrier runs once, and so on until the lists are empty.
//
// Between two barriers functions do not depend on each other. Invariant at a barrier: every list that is not empty has
// that barrier in front. A function that left work as suppressed keeps its list, and takes it up where it stopped when
// it is unsuppressed.
#include "BANNER/banner.h"
#include "DECODE/decode.h"
#include "OPT5/driver/driver.h"
#include "OPT5/driver/frames.h"
#include "OPT5/driver/passes.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/md/matcher.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <ctime>
#include <deque>
#include <future>
#include <list>
#include <map>
#include <mutex>
#include <string>

register_option pass_debug_split_odb("debug:split_odb");

namespace {

using PASS_LIST = std::deque<pass*>;

std::map<SYMTAB*, PASS_LIST> steps_table; // looked up, never walked: its order is that of pointers
std::mutex queue_lock;                    // guards functions_queue
pass* output_step = nullptr;

bool at_barrier_or_end(const PASS_LIST& passes) { return passes.empty() || passes.front()->is_barrier(); }

// ---- One function

// The debug stream of one function, for the time of its steps.
class FUNCTION_LOG {
public:
    explicit FUNCTION_LOG(const SYMTAB* sym, const char* mode = "a")
        : active(pass_debug_split_odb && fdebug), unit(fdebug) {
        if (active) open_debug_file(0, sym->name, mode);
    }
    ~FUNCTION_LOG() {
        if (!active) return;
        if (fdebug != unit) close_debug_stream();
        fdebug = unit;
    }
    FUNCTION_LOG(const FUNCTION_LOG&) = delete;
    FUNCTION_LOG& operator=(const FUNCTION_LOG&) = delete;

private:
    const bool active;
    FILE* const unit;
};

void announce_function() {
    const std::string line(80, '=');
    if (write_opt_info) info_printf("%s\n", line.c_str());
    dump_function_header(true);
    if (write_opt_info) info_printf("%s\n", line.c_str());
    dump_FUNINFO(currfuninfo, 0);
    if (print_debug && TEST_FLAG(currfuninfo, FUN_is_unsuppressed) && opt_level() >= 3)
        debug_printf("\n!!! %s() (%s) must be unsuppressed !!!\n\n", decode_name(currfunc->name).c_str(),
                     currfunc->name);
}

void run_until_barrier(SYMTAB* sym, PASS_LIST& passes) {
    if (at_barrier_or_end(passes)) return;
    currfuninfo = make_FUNINFO(sym);
    currfunc = sym;
    changed(fact::none); // what is known of globals was found for another function
    const FUNCTION_LOG log(sym);
    if (currfunc != currfuninfo->symbol) currfunc = get_sym_def_for_decl(currfuninfo->symbol);
    OPT_ASSERT(currfunc == currfuninfo->symbol);
    announce_function();
    while (!at_barrier_or_end(passes)) {
        passes.front()->run();
        passes.pop_front();
    }
    if (currfuninfo) leave_kept_form();
    OPT_ASSERT(passes.empty() || passes.front()->is_barrier());
}

// ---- Workers

// Runs a function with an info file of its own and keeps its text in the function's record.
void run_with_buffered_info(SYMTAB* sym) {
    FILE* const unit_info = finfo;
    FILE* const own = std::tmpfile();
    finfo = own;
    run_until_barrier(sym, steps_table[sym]);
    const long size = own ? std::ftell(own) : 0;
    if (size > 0) {
        std::string text(size, '\0');
        std::rewind(own);
        text.resize(std::fread(text.data(), 1, text.size(), own));
        make_FUNINFO(sym)->info_text.push_back(text);
    }
    if (own) std::fclose(own);
    finfo = unit_info;
}

void worker() {
    std::unique_lock<std::mutex> lock(queue_lock);
    while (!functions_queue.empty()) {
        SYMTAB* const sym = functions_queue.front();
        functions_queue.pop_front();
        lock.unlock();
        try {
            run_with_buffered_info(sym);
        } catch (...) {
            currfunc_at_abort = sym;
            throw;
        }
        lock.lock();
    }
}

// An exception in one function stops the queue: no other one starts, and those in work come to their barrier.
void run_workers() {
    const std::size_t n = std::min<std::size_t>(functions.size(), max_threads);
    functions_queue = functions;
    std::vector<std::future<void>> tasks;
    for (std::size_t i = 0; i < n; ++i) tasks.push_back(std::async(std::launch::async, worker));
    for (auto& task : tasks) {
        try {
            task.get();
        } catch (...) {
            {
                std::lock_guard<std::mutex> lock(queue_lock);
                functions_queue.clear();
            }
            throw;
        }
    }
}

// ---- From barrier to barrier

bool is_written(SYMTAB* f) { return TEST_FLAG(make_FUNINFO(f), FUN_is_processed); }

bool work_remains() {
    return std::any_of(functions.begin(), functions.end(), [](SYMTAB* f) { return !steps_table[f].empty(); });
}

void advance_to_barrier() {
    if (max_threads == 0 || functions.size() < 2) {
        for (SYMTAB* f : functions) run_until_barrier(f, steps_table[f]);
    } else if (std::any_of(functions.begin(), functions.end(),
                           [](SYMTAB* f) { return !at_barrier_or_end(steps_table[f]); })) {
        run_workers();
    }
    for (SYMTAB* f : unsuppressed_functions) {
        PASS_LIST& passes = steps_table[f];
        const bool is_behind_its_end = passes.empty() && max_threads == 0; // it came there suppressed, or came back before
        if (is_behind_its_end && !is_written(f)) passes.push_back(output_step);
        run_until_barrier(f, passes);
    }
    functions.splice(functions.end(), unsuppressed_functions);
    currfunc = nullptr;
    currfuninfo = nullptr;
}

void run_barrier() {
    pass* barrier_pass = nullptr;
    for (SYMTAB* f : functions) {
        PASS_LIST& passes = steps_table[f];
        if (passes.empty()) continue;
        OPT_ASSERT(passes.front()->is_barrier());
        if (!barrier_pass) barrier_pass = passes.front();
        OPT_ASSERT(barrier_pass == passes.front());
        passes.pop_front();
    }
    if (barrier_pass) barrier_pass->run();
    OPT_ASSERT(unsuppressed_functions.empty());
}

void prepare_lists(void (*write_function)()) {
    output_step = new pass(ROW{ROW::FIXED, "output function", nullptr, nullptr, write_function, fact::none, fact::none});
    steps_table.clear();
    for (SYMTAB* sym : functions) {
        steps_table[sym].assign(permuted_order.begin(), permuted_order.end());
        OPT_ASSERT(steps_table[sym].size() == permuted_order.size());
        // With workers, writing waits for the end of the loop: so the order of the output is that of the list.
        if (max_threads == 0) steps_table[sym].push_back(output_step);
        if (print_debug) const FUNCTION_LOG empty_log(sym, "w");
    }
    matcher_init();
}

void write_buffered_functions() {
    for (SYMTAB* f : functions) {
        FUNINFO* const funinfo = make_FUNINFO(f);
        for (const std::string& text : funinfo->info_text) info_printf("%s", text.c_str());
        funinfo->info_text.clear();
        PASS_LIST output{output_step};
        run_until_barrier(f, output);
    }
}

// Functions that were needed after all when the last barrier was past: what remains for them, without barriers.
void finish_late_functions() {
    for (SYMTAB* f : unsuppressed_functions) {
        PASS_LIST& passes = steps_table[f];
        const bool will_be = std::find(passes.begin(), passes.end(), output_step) != passes.end();
        if (!will_be && !is_written(f)) passes.push_back(output_step);
        passes.erase(std::remove_if(passes.begin(), passes.end(), [](const pass* p) { return p->is_barrier(); }),
                     passes.end());
        run_until_barrier(f, passes);
    }
    unsuppressed_functions.clear();
}

} // namespace

void run_functions(void (*write_function)()) {
    prepare_lists(write_function);
    while (work_remains()) {
        advance_to_barrier();
        run_barrier();
    }
    if (max_threads != 0) write_buffered_functions();
    finish_late_functions();
    currfunc = nullptr;
    currfuninfo = nullptr;
}

void report_times(long ticks) {
    FILE* const out = print_debug && fdebug ? fdebug : stderr;
    const auto seconds = [](long t) { return static_cast<double>(t) / CLOCKS_PER_SEC; };
    std::fprintf(out, "\nTime for whole compilation unit:  %.2f secs\n", seconds(ticks));
    std::vector<const FUNINFO*> timed;
    long sum = 0;
    for (const FUNINFO* f : fileinfo.FUNLIST) {
        if (f->time <= 0) continue;
        timed.push_back(f);
        sum += f->time;
    }
    if (ticks > sum) std::fprintf(out, "Non-function time:  %.2f secs\n", seconds(ticks - sum));
    std::fprintf(out, "\n");
    std::stable_sort(timed.begin(), timed.end(), [](const FUNINFO* a, const FUNINFO* b) { return a->time > b->time; });
    for (const FUNINFO* f : timed) std::fprintf(out, "%s:  %.2f secs\n", f->name.c_str(), seconds(f->time));
    report_row_times(out);
}
