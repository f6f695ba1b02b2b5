// Calls: of functions of the unit, of the library, through addresses, and of built-in functions.
#include "tools/exec/compile.h"

#include <alloca.h>

namespace {
void evaluate(const CALL_SITE& site, MACHINE& m, int64_t* values) {
    for (size_t i = 0; i < site.args.size(); i++) values[i] = run(site.args[i], m);
}

int64_t call_direct(const XNODE* x, MACHINE& m) {
    const CALL_SITE& site = *static_cast<const CALL_SITE*>(x->extra);
    auto* values = static_cast<int64_t*>(alloca((site.args.size() + 1) * sizeof(int64_t)));
    evaluate(site, m, values);
    m.counts.calls++;
    m.top->eh_entry = site.eh_entry;
    return m.invoke(*site.target, values, site.shapes.data(), site.shapes.size());
}

int64_t call_library(const XNODE* x, MACHINE& m) {
    const CALL_SITE& site = *static_cast<const CALL_SITE*>(x->extra);
    auto* values = static_cast<int64_t*>(alloca((site.args.size() + 1) * sizeof(int64_t)));
    evaluate(site, m, values);
    m.counts.calls++;
    m.top->eh_entry = site.eh_entry;
    LIBRARY_ARGS args{m, values, site.shapes.data(), site.types.data(), site.args.size()};
    return run_library(*site.library, args, site.result);
}

int64_t call_address(const XNODE* x, MACHINE& m) {
    const CALL_SITE& site = *static_cast<const CALL_SITE*>(x->extra);
    auto* values = static_cast<int64_t*>(alloca((site.args.size() + 1) * sizeof(int64_t)));
    const int64_t callee = run(site.callee, m);
    evaluate(site, m, values);
    m.counts.calls++;
    m.top->eh_entry = site.eh_entry;
    return m.call(callee, values, site.shapes.data(), site.types.data(), site.args.size(), site.result);
}

// A structure that a function returns is copied out of the frame that it left.
int64_t keep_structure(const XNODE* x, MACHINE& m) {
    const uint64_t from = static_cast<uint64_t>(run(x->a, m));
    const uint64_t to = m.fp + static_cast<uint64_t>(x->k);
    m.check(from, x->n);
    if (x->n) std::memmove(&m.memory[to], &m.memory[from], size_t{x->n} * 2);
    return static_cast<int64_t>(to);
}

int64_t select_arm(const XNODE* x, MACHINE& m) {
    const int64_t p = run(x->a, m), a = run(x->b, m), b = run(x->c, m);
    return p ? a : b;
}
} // namespace

void COMPILER::arguments(const IC_NODE* list, CALL_SITE& site) {
    list = strip_marks(list);
    if (!list) return;
    if (list->op == op::COMMA) {
        arguments(list->left, site);
        arguments(list->right, site);
        return;
    }
    TYPE* type = list->op == op::STARG ? strip_marks(list->left)->type : list->type;
    site.args.push_back(value(list));
    site.shapes.push_back(shape_of(type));
    site.types.push_back(type);
}

// Each parameter of a known function gets a value of its own type.
void COMPILER::match_parameters(CALL_SITE& site) {
    const std::vector<PARAMETER>& params = site.target->params;
    for (size_t i = 0; i < params.size(); i++) {
        if (i == site.args.size())
            site.args.push_back(constant(params[i].shape.rep == R_AGG ? static_cast<int64_t>(null_page) : 0));
        else
            site.args[i] = convert(site.args[i], site.shapes[i], params[i].shape);
    }
}

const XNODE* COMPILER::finish(CALL_SITE& site, EVAL eval) {
    XNODE* x = p.node(eval);
    x->extra = &site;
    if (site.result.rep != R_AGG || site.library) return x;
    XNODE* kept = p.node(keep_structure, x, nullptr, slot(site.result.units));
    kept->n = site.result.units;
    return kept;
}

const XNODE* COMPILER::call(const IC_NODE* n) {
    if (!f) return unsupported(n); // no function runs before all are compiled
    CALL_SITE& site = *p.make<CALL_SITE>();
    site.result = shape_of(n->type);
    site.eh_entry = n->number2;
    if (site.eh_entry) f->handled_calls.emplace_back(static_cast<uint32_t>(f->code.size()) - 1, site.eh_entry);
    const IC_NODE* callee = strip_marks(n->left);
    const IC_NODE* named = callee->op == op::UAND ? strip_marks(callee->left) : callee;
    auto entry = named->op == op::NAME && named->sym ? p.entries.find(named->sym) : p.entries.end();
    if (entry == p.entries.end()) {
        site.callee = value(callee);
        if (n->op == op::CALL) arguments(n->right, site);
        return finish(site, call_address);
    }
    if (n->op == op::CALL) arguments(n->right, site);
    const CALLEE& to = p.m.callees[static_cast<size_t>(entry->second) - function_space];
    site.target = to.function;
    site.library = to.library;
    site.name = to.name;
    if (site.target) {
        match_parameters(site);
        const XNODE* x = finish(site, call_direct);
        return site.result.rep == R_VOID ? x : convert(x, site.target->result, site.result);
    }
    if (site.library) return finish(site, call_library);
    return failing(EXEC_MISSING, "the function " + site.name + " is nowhere defined");
}

const XNODE* COMPILER::intrinsic(const IC_NODE* n) {
    if (!f) return unsupported(n);
    CALL_SITE& site = *p.make<CALL_SITE>();
    site.result = shape_of(n->type);
    site.name = n->op == op::MEMCPY ? "memcpy" : n->text;
    if (n->op != op::UICALL && n->op != op::UMCALL) arguments(n->left, site);
    if (site.name == "quest$colon" && site.args.size() == 3) {
        XNODE* x = p.node(select_arm, site.args[0], convert(site.args[1], site.shapes[1], site.result));
        x->c = convert(site.args[2], site.shapes[2], site.result);
        return x;
    }
    if ((site.name == "DONOTCSE" || site.name == "def$assert" || site.name == "__builtin_expect") && !site.args.empty())
        return convert(site.args[0], site.shapes[0], site.result);
    site.library = find_builtin(site.name);
    // An intrinsic that the target does not have is a call of a function of that name.
    if (!site.library)
        for (const CALLEE& c : p.m.callees)
            if (c.function && c.name == site.name) {
                site.target = c.function;
                match_parameters(site);
                return convert(finish(site, call_direct), site.target->result, site.result);
            }
    if (!site.library) site.library = find_library(site.name);
    if (!site.library) {
        const char* why = builtin_refusal(site.name);
        return failing(EXEC_UNSUPPORTED,
                       "cannot execute the built-in function " + site.name + (why ? std::string(": ") + why : ""));
    }
    return finish(site, call_library);
}
