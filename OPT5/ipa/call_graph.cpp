// The call graph of the file: its roots, its order, and which functions may call themselves.
//
// Needs: every definition scanned (scan.cpp). Leaves: `cg_list`, and flags of functions that hold for all that they may
// call.
// Sound because the record of the file stands for the outside world: it calls the roots, and what calls outside, or
// through a pointer, may come back through it. A guarantee of a function ("assigns no global", ...) is kept only if
// everything keeps it that the function may call, to the end of every chain: one callee that is not known breaks them
// all.

#include "OPT5/ipa/progana.h"

#include "BITVEC/bitvec.h"
#include "OPT5/ipa/uses.h"
#include "OPT5/ipa/view.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <boost/graph/adjacency_list.hpp>
#include <boost/graph/strong_components.hpp>

#include <algorithm>
#include <cstring>
#include <vector>

FUNLIST* cg_list = nullptr;

namespace {

std::vector<FUNINFO*> defined_functions() {
    std::vector<FUNINFO*> list;
    for (FUNLIST* p = program.funlist; p; p = p->next) list.push_back(p->fun);
    return list;
}

void sort_by_name() {
    std::vector<FUNINFO*> list = defined_functions();
    std::stable_sort(list.begin(), list.end(), [](const FUNINFO* a, const FUNINFO* b) {
        return std::strcmp(a->name.c_str(), b->name.c_str()) < 0;
    });
    FUNLIST* p = program.funlist;
    for (FUNINFO* f : list) {
        p->fun = f;
        p = p->next;
    }
}

// A guarantee holds if it holds for everything that is called, to the end of every chain.
void close_guarantees(const std::vector<FUNINFO*>& list) {
    for (bool changed = true; changed;) {
        changed = false;
        for (FUNINFO* f : list)
            for (CALLEE* c = f->callees; c; c = c->next)
                if (function_is_defined(c->callee)) changed |= propagate_call_flags(f, c->callee);
    }
}

// A function that its symbol makes a synonym is the other one to the linker, which so stands behind every call of it,
// whatever its own body calls. One without a body may be called from anywhere.
void add_synonym_edges() {
    for (SYMTAB* s = global_symbols; s; s = s->next) {
        if (!s->is_function()) continue;
        FUNINFO* f = make_FUNINFO(s);
        for (const PRAGMA* p = s->pragma; p; p = p->next) {
            if (p->kind != PRG_FUNC_SYNONYM || p->args.empty()) continue;
            FUNINFO* target = make_FUNINFO(skip_name_prefix(p->args[0].c_str()));
            if (!target->symbol || !function_is_defined(target)) continue;
            if (function_is_defined(f))
                add_call_edge(f, target, false);
            else
                set_flags(target, FUN_is_cg_root);
        }
    }
}

// A call through a pointer may reach every function whose address is known.
void add_anonymous_edges(const std::vector<FUNINFO*>& list) {
    for (FUNINFO* f : list) {
        if (!TEST_FLAG(f, FUN_calls_anonymous)) continue;
        for (CALLEE* c = program.anonymous_functions; c; c = c->next) {
            if (function_is_defined(c->callee))
                add_call_edge(f, c->callee, false);
            else
                program.file_flags |= FILE_calls_outside;
        }
    }
}

void classify_callees(FUNINFO* f) {
    for (CALLEE* c = f->callees; c; c = c->next) {
        FUNINFO* callee = c->callee;
        if (callee == program.file_fun) continue;
        if (!function_is_defined(callee)) {
            if (TEST_FLAG(callee, FUN_is_SYSTEM))
                set_flags(f, FUN_calls_SYSTEM);
            else {
                set_flags(f, FUN_calls_OUTSIDE);
                program.file_flags |= FILE_calls_outside;
            }
            set_flags(callee, FUN_cannot_beta);
            callee->nargs_called = -1;
        }
        if (TEST_FLAG(f, FUN_has_1_BB) && !TEST_FLAG(f, FUN_calls_anonymous) && TEST_FLAG(callee, FUN_never_returns)) {
            set_flags(f, FUN_never_returns);
            clear_flags(f, FUN_is_pure_fun | FUN_only_reads);
        }
    }
}

void check_program_mode() {
    const bool has_root = program.file_flags & FILE_has_root;
    bool revert =
        program_mode < 0 && (!(program.file_flags & FILE_defines_main) || (program.file_flags & FILE_calls_outside));
    if ((program_mode == 1 || program_mode == 2) && !has_root) {
        std::fprintf(finfo ? finfo : stderr, "\"%s\": Warning - Reverting to -op0: file has no entry functions!\n",
                     i_file_name.c_str());
        revert = true;
    }
    if (!revert) return;
    debug_printf("\n>>>> WARNING: Reverting to -op0!\n\n");
    program.main_runs_once = false;
    no_outside_writers = no_outside_callers = 0;
}

void settle_root(FUNINFO* f) {
    if (assembly_names(f->symbol)) set_flags(f, FUN_is_cg_root | FUN_cannot_suppress);
    if (!no_outside_callers && TEST_FLAG(f, FUN_is_extern | FUN_is_anonymous)) set_flags(f, FUN_is_cg_root);
    const bool returns_void = f->symbol->type->return_type()->is_void();
    const bool is_special = fun_is_cpp_constructor(f) || fun_is_cpp_destructor(f);
    if ((!returns_void && TEST_FLAG(f, FUN_is_cg_root | FUN_is_anonymous)) || is_special)
        set_flags(f, FUN_value_needed);
    if (!(f->symbol->cqual & CQ_INLINE))
        if (TEST_FLAG(f, FUN_is_main | FUN_is_interrupt) || (returns_void && TEST_FLAG(f, FUN_value_needed))) {
            set_flags(f, FUN_cannot_suppress);
            forbid_inlining(f, "it is main, an interrupt function, or has no value where one is used");
        }
    if (TEST_FLAG(f, FUN_is_cg_root)) add_call_edge(program.file_fun, f, false);
    if (TEST_FLAG(f, FUN_is_anonymous)) add_call_edge(program.file_fun, f, false);
    if (TEST_FLAG(f, FUN_is_cg_root | FUN_is_anonymous)) {
        f->nargs_called = -1;
        set_flags(f, FUN_cannot_beta);
    }
    if (print_debug) dump_FUNINFO(f, 0);
}

// What is not defined here leaves the graph.
void keep_defined_callees(FUNINFO* f) {
    CALLEE** link = &f->callees;
    while (CALLEE* c = *link) {
        if (c->callee == program.file_fun || function_is_defined(c->callee)) {
            link = &c->next;
            continue;
        }
        *link = c->next;
        CALLEE** list = TEST_FLAG(c->callee, FUN_is_SYSTEM) ? &program.system_callees : &program.outside_callees;
        CALLEE* known = *list;
        while (known && known->callee != c->callee) known = known->next;
        if (known) {
            known->ncalls += c->ncalls;
            delete c;
        } else {
            c->next = *list;
            *list = c;
        }
    }
}

// Reverse postorder from the outside world, so that a caller precedes its callee but on the back edges of cycles.
void number_functions(const std::vector<FUNINFO*>& list) {
    for (FUNINFO* f : list) f->cg_order = -1;
    FUNINFO* file = program.file_fun;
    if (!file->callees) return;
    constexpr int32_t ENTERED = -2;
    std::vector<FUNINFO*> stack{file};
    file->cg_order = ENTERED;
    file->cg_cursor = file->callees;
    FUNLIST* finished = nullptr;
    while (!stack.empty()) {
        FUNINFO* f = stack.back();
        if (CALLEE* c = f->cg_cursor) {
            f->cg_cursor = c->next;
            FUNINFO* callee = c->callee;
            if (callee->cg_order != -1 || callee == file) continue;
            callee->cg_order = ENTERED;
            callee->cg_cursor = callee->callees;
            stack.push_back(callee);
            continue;
        }
        stack.pop_back();
        finished = mkFUNLIST(f, finished);
    }
    int32_t n = 0;
    for (FUNLIST* p = finished; p; p = p->next) p->fun->cg_order = n++;
    program.cg_count = n;
    cg_list = finished;
}

void report_uncalled(const std::vector<FUNINFO*>& list) {
    if (!write_opt_info) return;
    for (FUNINFO* f : list)
        if (f->cg_order < 0 && !TEST_FLAG(f, FUN_is_anonymous | FUN_is_suppressed)) {
            info_printf("\n>>>> WARNING - Function %s()", f->name.c_str());
            info_printf(" is not called and will not be compiled\n");
        }
}

} // namespace

void set_up_and_build_call_graph() {
    if (!program.funlist) return;
    sort_by_name();
    const std::vector<FUNINFO*> list = defined_functions();
    add_synonym_edges();
    close_guarantees(list);
    close_returns(list);
    add_anonymous_edges(list);
    for (FUNINFO* f : list) classify_callees(f);
    check_program_mode();
    program.main_runs_once &= no_outside_callers != 0;
    for (FUNINFO* f : list) settle_root(f);
    for (FUNINFO* f : list) keep_defined_callees(f);
    number_functions(list);
    rescan_uses();
    report_uncalled(list);
}

// ---- Recursion

namespace {

using GRAPH = boost::adjacency_list<boost::vecS, boost::vecS, boost::directedS>;

void add_edges(FUNINFO* f, GRAPH& graph) {
    const auto from = static_cast<size_t>(f->cg_order);
    auto edge_to = [&](const FUNINFO* to) {
        if (to->cg_order >= 0) boost::add_edge(from, static_cast<size_t>(to->cg_order), graph);
    };
    for (CALLEE* c = f->callees; c; c = c->next) {
        const bool first_run = f == program.file_fun && TEST_FLAG(c->callee, FUN_is_main);
        if (first_run && program.main_runs_once && no_outside_callers) continue;
        edge_to(c->callee);
    }
    if (TEST_FLAG(f, FUN_calls_OUTSIDE)) edge_to(program.file_fun);
    if (!no_outside_callers && TEST_FLAG(f, FUN_calls_SYSTEM))
        for (CALLEE* c = program.anonymous_functions; c; c = c->next)
            if (function_is_defined(c->callee)) edge_to(c->callee);
}

std::unique_ptr<GRAPH> calls; // who may call whom, by the numbers of the functions
std::vector<std::unique_ptr<BITVEC>> reach_sets; // of the functions that were asked about; all of them take n^2 bits

void build_graph(const std::vector<FUNINFO*>& order) {
    calls = std::make_unique<GRAPH>(order.size());
    for (FUNINFO* f : order) {
        f->reach = nullptr;
        add_edges(f, *calls);
    }
    reach_sets.clear();
}

const BITVEC& reach_of(FUNINFO* f) {
    if (f->reach) return *f->reach;
    reach_sets.push_back(std::make_unique<BITVEC>(static_cast<uint32_t>(boost::num_vertices(*calls))));
    BITVEC& set = *reach_sets.back();
    std::vector<size_t> work{static_cast<size_t>(f->cg_order)};
    while (!work.empty()) {
        const size_t from = work.back();
        work.pop_back();
        for (auto [e, end] = boost::out_edges(from, *calls); e != end; ++e) {
            const size_t to = boost::target(*e, *calls);
            if (set.test(static_cast<uint32_t>(to))) continue;
            set.set(static_cast<uint32_t>(to));
            work.push_back(to);
        }
    }
    f->reach = &set;
    return set;
}

// The functions that may be entered while they run: those of a strong component with an edge inside.
std::vector<bool> on_cycles() {
    const size_t n = boost::num_vertices(*calls);
    std::vector<size_t> component(n);
    std::vector<bool> has_cycle(boost::strong_components(*calls, component.data())), result(n);
    for (size_t v = 0; v < n; ++v)
        for (auto [e, end] = boost::out_edges(v, *calls); e != end; ++e)
            if (component[boost::target(*e, *calls)] == component[v]) has_cycle[component[v]] = true;
    for (size_t v = 0; v < n; ++v) result[v] = has_cycle[component[v]];
    return result;
}

} // namespace

void detect_recursion() {
    if (!cg_list) set_up_and_build_call_graph();
    if (!cg_list) return;
    std::vector<FUNINFO*> order;
    for (FUNLIST* p = cg_list; p; p = p->next) order.push_back(p->fun);
    build_graph(order);
    if (!write_opt_info) return;
    const std::vector<bool> recursive = on_cycles();
    bool any = false;
    for (const FUNINFO* f : order) {
        if (f == program.file_fun || !recursive[static_cast<size_t>(f->cg_order)]) continue;
        if (!any) info_printf("\nThese functions may be recursive:\n");
        any = true;
        info_printf("\t%s()\n", f->name.c_str());
    }
}

bool call_may_be_recursive(const NODE* call) {
    constexpr uint16_t REENTRANT = 0x800;
    if (program.main_runs_once && currfuninfo && TEST_FLAG(currfuninfo, FUN_is_main)) return false;
    if (!code_is_reentrant && currfunc && !(currfunc->cqual & REENTRANT)) return false;
    if (!op_is_call(call->op)) return false;
    FUNINFO* callee = find_FUNINFO_for_call(call);
    if (!callee || !function_is_defined(callee)) callee = program.file_fun;
    const size_t known = calls ? boost::num_vertices(*calls) : 0;
    auto is_known = [known](const FUNINFO* f) { return f && f->cg_order >= 0 && static_cast<size_t>(f->cg_order) < known; };
    if (!is_known(callee) || !is_known(currfuninfo)) return true;
    return reach_of(callee).test(static_cast<uint32_t>(currfuninfo->cg_order));
}

// ---- Reports

namespace {

void list_functions(const CALLEE* list, void (*print)(const char*, ...)) {
    for (const CALLEE* c = list; c; c = c->next) print("\t%s()\n", c->callee->name.c_str());
}

void report_undefined_callees() {
    if (program.system_callees || program.outside_callees) {
        info_printf("\nThese external functions are called but not defined here:\n");
        list_functions(program.system_callees, info_printf);
        list_functions(program.outside_callees, info_printf);
    }
    if (program.system_callees) {
        debug_printf("\nThese SYSTEM functions are called but not defined:\n");
        list_functions(program.system_callees, debug_printf);
    }
    if (program.outside_callees) {
        debug_printf("\nThese OUTSIDE functions are called but not defined:\n");
        list_functions(program.outside_callees, debug_printf);
    }
}

} // namespace

void dump_call_graph_debug() {
    if (!cg_list) set_up_and_build_call_graph();
    if (!cg_list) return;
    report_undefined_callees();
    if (dump_ocg_in_GDL) view_call_graph();
    if (print_debug)
        for (FUNLIST* p = cg_list; p; p = p->next) debug_printf("%3d: %s\n", p->fun->cg_order, p->fun->name.c_str());
    report_constant_globals();
}
