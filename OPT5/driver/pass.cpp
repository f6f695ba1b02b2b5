// Running one step, and choosing the order of all.
#include "OPT5/driver/passes.h"

#include "OPT5/driver/driver.h"
#include "OPT5/driver/frames.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <cctype>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <ctime>

pass_manager global_pass_manager;
std::vector<pass*> normal_order, permuted_order;

namespace {
register_option pass_debug_skip_pass("debug:skip_pass"), pass_debug_list_passes("debug:list_passes");
} // namespace

void pass::run() {
    const bool skip = pass_debug_skip_pass > 0 && static_cast<unsigned>(pass_debug_skip_pass) == serial;
    // A row without a frame changes blocks as it likes; an order of steps may have it between those that share a
    // hierarchy.
    if (currfuninfo && row.kind == ROW::FUNCTION && !row.frame) drop_hierarchy();
    run_row(row, {"step", static_cast<int>(serial)}, skip);
}

// ---- Orders

void list_passes(FILE* out) {
    for (const pass* step : normal_order)
        std::fprintf(out, "%2d:  %s\n", static_cast<int>(step->serial), step->name.c_str());
}

namespace {

std::vector<int> random_order(int n) {
    std::vector<int> v(n, 0);
    std::srand(static_cast<unsigned>(std::time(nullptr) + std::clock()));
    constexpr double per_draw = 4.656612873077393e-10; // of a draw from [0, 2^31): a fraction of 1
    for (int i = 0; i + 1 < n; ++i) {
        const int j = static_cast<int>(per_draw * std::rand() * (i + 2));
        v[i + 1] = v[j];
        v[j] = i + 1;
    }
    return v;
}

[[noreturn]] void bad_order(const std::string& what) { fail_run("zopt: the forced order of steps: " + what); }

// The steps of a list: numbers and names of the table, "first..last" for all from one to the other.
class ORDER_READER {
public:
    explicit ORDER_READER(const char* text) : p(text) {}

    std::vector<int> read() {
        std::vector<int> order;
        while (skip_separators()) {
            const int first = step();
            int last = first;
            if (!std::strncmp(p, "..", 2)) {
                p += 2;
                last = step();
            }
            for (int i = first; i != last; i += first < last ? 1 : -1) order.push_back(i);
            order.push_back(last);
        }
        return order;
    }

private:
    bool skip_separators() {
        while (*p == ',' || std::isspace(static_cast<unsigned char>(*p))) ++p;
        return *p != 0;
    }

    int step() {
        char* end = nullptr;
        errno = 0;
        const long index = std::strtol(p, &end, 10);
        if (end == p) return named_step();
        if (errno != 0 || index < 0 || index >= static_cast<long>(normal_order.size())) {
            const std::string message = "step " + std::string(p, end - p) + " of the forced order is not in the table";
            abort_optimizer(message.c_str());
        }
        p = end;
        return static_cast<int>(index);
    }

    // Names have spaces and commas in them: the longest one that the text begins with is meant.
    int named_step() {
        std::vector<int> found;
        size_t length = 0;
        for (const pass* step : normal_order) {
            const size_t own = step->name.size();
            const bool fits = own >= length && !std::strncmp(p, step->name.c_str(), own) && ends_word(p + own);
            if (!fits) continue;
            if (own > length) found.clear();
            length = own;
            found.push_back(static_cast<int>(step->serial));
        }
        if (found.empty()) bad_order("\"" + std::string(p) + "\" is no number, and no name of --list_passes");
        if (found.size() > 1) {
            std::string numbers;
            for (int i : found) numbers += (numbers.empty() ? "" : ", ") + std::to_string(i);
            bad_order("\"" + std::string(p, length) + "\" is the name of more than one step: " + numbers);
        }
        p += length;
        return found.front();
    }

    static bool ends_word(const char* t) {
        return !*t || *t == ',' || std::isspace(static_cast<unsigned char>(*t)) || !std::strncmp(t, "..", 2);
    }

    const char* p;
};

// What asks for an order, and in which words the report names it; null without.
const char* forced_order(const char** source) {
    *source = "command-line option";
    if (file_options && file_options->getopt(option_obj::OO_opt_passes))
        return file_options->getstrarg(option_obj::OO_opt_passes);
    *source = "environment variable";
    return std::getenv("FORCED_OPT_PASSES");
}

void choose_order() {
    const char* source;
    const char* const text = forced_order(&source);
    if (!text) {
        if (print_debug) debug_printf("Pass list is normal order.\n");
        permuted_order = normal_order;
        return;
    }
    const int n = static_cast<int>(normal_order.size());
    const bool is_random = std::string(text) == "random";
    const std::vector<int> order = is_random ? random_order(n) : ORDER_READER(text).read();
    for (int index : order) permuted_order.push_back(normal_order[index]);
    if (!print_debug) return;
    debug_printf("Pass list, from %s, is%s: ", source, is_random ? " (random)" : "");
    for (int index : order) debug_printf(" %d", index);
    debug_printf("%s\n\n", order.empty() ? "<empty>" : "");
}

} // namespace

void setup_passes(bool use_forced) {
    global_pass_manager.clear();
    normal_order.clear();
    permuted_order.clear();
    add_normal_order_passes(normal_order);
    if (use_forced) {
        check_row_switches();
        choose_order();
    } else
        permuted_order = normal_order;
    if (pass_debug_list_passes && fdebug) list_passes(fdebug);
}
