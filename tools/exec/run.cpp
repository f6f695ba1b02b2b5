// The run: activations and their statements, from main to the exit status.
#include "tools/exec/compile.h"
#include "tools/exec/dependences.h"
#include "tools/exec/report.h"
#include "tools/exec/trips.h"

#include "UTIL/big_stack.h"

#include <algorithm>
#include <optional>

namespace {
constexpr size_t host_stack = size_t{2} << 30; // touched only as needed
constexpr size_t host_stack_reserve = 1 << 20;
constexpr size_t host_bytes_a_level = 512; // of a tree, at the most

uint32_t find_case(const SWITCH_TABLE& table, int64_t v) {
    auto it = std::lower_bound(table.cases.begin(), table.cases.end(), v,
                               [](const std::pair<int64_t, uint32_t>& c, int64_t x) { return c.first < x; });
    return it != table.cases.end() && it->first == v ? it->second : table.other;
}

// Of a function without promises.
struct NO_WATCH {
    explicit NO_WATCH(const FUNCTION&) {}
    void step(uint32_t, uint32_t, MACHINE&) {}
};

// Of one whose annotations are checked.
struct CHECKS {
    explicit CHECKS(const FUNCTION& f) : trips(f) {}
    void step(uint32_t from, uint32_t to, MACHINE& m) {
        trips.step(from, to, m);
        if (m.top->accesses) m.top->accesses->step(from, to);
    }
    TRIP_WATCH trips;
};

// Cleans up along the chain of the call that an exception left. The statement of its handler, or false.
bool find_handler(const FUNCTION& f, ACTIVATION& here, MACHINE& m, int64_t thrown, uint32_t* at) {
    if (f.handling.empty()) return false;
    for (uint32_t entry = here.eh_entry; entry; entry = f.handling.at(entry).next) {
        const HANDLING& h = f.handling.at(entry);
        if (h.kind == EHK_THROW_TERMINATE) m.fail(EXEC_ABORT, "an exception may not leave the call");
        if (h.cleanup) run(h.cleanup, m);
        for (const auto& [what, handler] : h.clauses)
            if (what == "..." || what == std::to_string(thrown)) {
                m.caught = thrown;
                *at = handler;
                return true;
            }
    }
    return false;
}

template <class WATCH>
void run_until_exception(FUNCTION& f, ACTIVATION& here, MACHINE& m, uint32_t at, WATCH& watch) {
    STMT* const code = f.code.data();
    const uint32_t returned = static_cast<uint32_t>(f.code.size());
    for (;;) {
        const uint32_t from = at;
        STMT& s = code[at];
        here.at = &s;
        s.count++;
        if ((m.steps += s.cost) > m.step_limit) m.fail(EXEC_STEPS, "too many steps");
        switch (s.kind) {
        case S_EXPR:
            run(s.tree, m);
            at++;
            break;
        case S_BRANCH:
            m.counts.branches++;
            at = s.target;
            break;
        case S_CBRANCH:
            m.counts.branches++;
            m.counts.tests++;
            at = run(s.tree, m) ? at + 1 : s.target;
            break;
        case S_SWITCH:
            m.counts.branches++;
            at = find_case(*s.table, run(s.tree, m));
            break;
        case S_RETURN: m.returned = run(s.tree, m); return watch.step(from, returned, m);
        case S_URETURN: return watch.step(from, returned, m);
        default: m.fail(s.status, s.text);
        }
        watch.step(from, at, m);
    }
}

template <class WATCH>
void run_statements(FUNCTION& f, ACTIVATION& here, MACHINE& m) {
    WATCH watch(f);
    const uint64_t fp = m.fp, sp = m.sp;
    for (uint32_t at = 0;;) try {
            return run_until_exception(f, here, m, at, watch);
        } catch (const EXEC_THROW& e) {
            m.top = &here;
            m.fp = fp;
            m.sp = sp;
            if (!find_handler(f, here, m, e.value, &at)) throw;
        }
}

uint64_t aligned(uint64_t at, const SHAPE& shape) { return (at + shape.align_mask) & ~uint64_t{shape.align_mask}; }

// Units behind the last named parameter that the arguments beyond take, each at its alignment.
uint64_t extra_units(const FUNCTION& f, const SHAPE* shapes, size_t n) {
    uint64_t end = f.params.empty() ? 0 : f.params.back().shape.units;
    for (size_t i = f.params.size(); i < n; i++) end = aligned(end, shapes[i]) + shapes[i].units;
    return (end + 3) & ~uint64_t{3};
}
} // namespace

// The activations are on the host's stack: they are read here, before anything unwinds.
void MACHINE::fail(int status, const std::string& text) const {
    std::string where;
    if (top) {
        where = " (in " + top->function->name;
        if (top->at && top->at->line) where += ", line " + std::to_string(top->at->line);
        where += ")";
    }
    throw EXEC_ERROR{status, text + where};
}

int64_t MACHINE::invoke(FUNCTION& f, const int64_t* args, const SHAPE* shapes, size_t n) {
    const uintptr_t here_on_host = reinterpret_cast<uintptr_t>(__builtin_frame_address(0));
    if (here_on_host < host_stack_end + f.depth * host_bytes_a_level + host_stack_reserve)
        fail(EXEC_STACK, "stack overflow");
    const uint64_t extra = f.variadic ? extra_units(f, shapes, n) : 0;
    if (sp < heap_end + f.frame + extra + 64) fail(EXEC_STACK, "stack overflow");
    const uint64_t old_fp = fp, old_sp = sp, frame = sp - extra;
    sp = frame - f.frame;
    for (size_t i = 0; i < f.params.size(); i++)
        store(f.params[i].shape, frame + static_cast<uint64_t>(f.params[i].offset), args[i]);
    if (f.variadic) {
        uint64_t at = frame + (f.params.empty() ? 0 : f.params.back().shape.units);
        for (size_t i = f.params.size(); i < n; at += shapes[i++].units)
            store(shapes[i], at = aligned(at, shapes[i]), args[i]);
    }
    fp = frame;
    f.calls++;
    ACTIVATION here{&f, nullptr, top};
    top = &here;
    returned = 0;
    std::optional<ACCESS_WATCH> accesses;
    if (f.dependences) here.accesses = &accesses.emplace(*f.dependences);
    if (f.promises.empty() && !f.dependences)
        run_statements<NO_WATCH>(f, here, *this);
    else
        run_statements<CHECKS>(f, here, *this);
    top = here.up;
    fp = old_fp;
    sp = old_sp;
    return returned;
}

int64_t MACHINE::call(int64_t address, const int64_t* args, const SHAPE* shapes, TYPE* const* types, size_t n,
                      const SHAPE& result) {
    const uint64_t at = static_cast<uint64_t>(address) - function_space;
    if (at >= callees.size()) fail(EXEC_BAD_ADDRESS, "call through an address that is no function's");
    const CALLEE& callee = callees[at];
    if (callee.library) {
        LIBRARY_ARGS values{*this, args, shapes, types, n};
        return run_library(*callee.library, values, result);
    }
    if (!callee.function) fail(EXEC_MISSING, "the function " + callee.name + " is nowhere defined");
    FUNCTION& f = *callee.function;
    std::vector<int64_t> converted(args, args + n);
    converted.resize(std::max(n, f.params.size()) + 1);
    for (size_t i = 0; i < f.params.size(); i++)
        converted[i] = i < n                            ? convert_value(args[i], shapes[i], f.params[i].shape)
                       : f.params[i].shape.rep == R_AGG ? static_cast<int64_t>(null_page)
                                                        : 0;
    return convert_value(invoke(f, converted.data(), shapes, n), f.result, result);
}

namespace {
int run_main(PROGRAM& p) {
    MACHINE& m = p.m;
    FUNCTION* main = p.find_main();
    if (!main) m.fail(EXEC_MISSING, "the function main is nowhere defined");
    int status;
    try {
        const std::vector<int64_t> none(main->params.size() + 1);
        status = static_cast<int>(m.invoke(*main, none.data()) & 255);
    } catch (const EXEC_EXIT& e) {
        status = e.status;
    } catch (const EXEC_THROW& e) {
        m.fail(EXEC_ABORT, "nothing catches the exception " + std::to_string(e.value));
    }
    while (!m.at_exit.empty()) {
        const int64_t f = m.at_exit.back();
        m.at_exit.pop_back();
        try {
            m.call(f, nullptr, nullptr, nullptr, 0, SHAPE{});
        } catch (const EXEC_EXIT& e) {
            status = e.status;
        }
    }
    return status;
}
// What the unit's option words say about names and memory.
void obey_options(const IC_UNIT& unit, PROGRAM& p) {
    for (const OPTION_SET& set : unit.option_sets)
        for (const std::string& word : set.options) {
            if (word.find("eabi") != std::string::npos) p.name_prefix = false;
            if (word == "-e" || word == "--big_endian" || word == "--endian=big") p.m.big_endian = true;
        }
}
} // namespace

EXEC_RESULT execute(const IC_UNIT& unit, const EXEC_OPTIONS& options, FILE* out, FILE* report) {
    EXEC_RESULT result;
    PROGRAM p(unit, options);
    p.m.out = out;
    if (options.max_steps) p.m.step_limit = options.max_steps;
    obey_options(unit, p);
    run_on_big_stack(host_stack, [&] {
        p.m.host_stack_end = reinterpret_cast<uintptr_t>(__builtin_frame_address(0)) - host_stack + host_stack_reserve;
        try {
            p.lay_out();
            p.initialize();
            p.compile();
            p.m.heap_begin = p.m.heap_end = (p.next + 63) & ~uint64_t{3};
            p.m.sp = p.m.size & ~uint64_t{3};
            p.m.counts = NODE_COUNTS();
            result.status = run_main(p);
        } catch (const EXEC_ERROR& e) {
            result.failed = true;
            result.status = e.status;
            result.error = e.text;
        }
    });
    std::fflush(out);
    if (options.globals && !result.failed) print_globals(p, out);
    if (options.stats) print_stats(p, report);
    if (options.profile) print_profile(p, report);
    return result;
}
