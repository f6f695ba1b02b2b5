// What calls pass in pointer parameters, and the summaries of parameters.
//
// A summary says what a pointer refers to when the callee is entered, so that objects of the callers' frames, which have no
// name there, are autos of other activations: of the callee itself, too, where it calls itself.
#include "OPT5/alias/bindings.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <numeric>

namespace {

PTENV as_seen_by_callee(const PTENV& e) {
    PTENV seen = e;
    seen.parm = nullptr;
    seen.parm_offset = seen.parm_stride = 0;
    if (seen.categories & PT_AUTOL) seen.categories |= PT_AUTOF;
    seen.targets.clear();
    for (const PTVAR& t : e.targets) {
        if (t.base->level == 0) {
            seen.targets.push_back(t);
            continue;
        }
        const uint32_t category = class_category(t.base);
        seen.categories |= category == PT_AUTOL ? static_cast<uint32_t>(PT_AUTOF) : category | PT_STATICF;
        seen.align = std::gcd(seen.align, t.align);
    }
    seen.categories &= ~PT_AUTOL;
    settle(seen);
    return seen;
}

FPARM* find_formal(FUNINFO* f, const std::string& name) {
    auto at = std::find_if(f->formals.begin(), f->formals.end(), [&name](const FPARM& p) { return p.name == name; });
    return at == f->formals.end() ? nullptr : &*at;
}

bool is_anything(const PTENV& e) { return (e.categories | PT_AUTOL) == PT_ALL; }

bool lose(FPARM* formal) {
    formal->state = FPARM::ANYTHING;
    formal->summary.reset();
    return true;
}

} // namespace

AARG passed_value(FUNINFO* callee, size_t index, const NODE* argument, const PTENV* e) {
    AARG a{currfuninfo, callee, index, e != nullptr, {}, {}, 0, 0, {}};
    if (print_debug && argument) a.text = tree_to_infix(argument);
    if (!e) return a;
    a.value = as_seen_by_callee(*e);
    if (!e->parm) return a;
    a.parm = e->parm->name;
    a.parm_offset = e->parm_offset;
    a.parm_stride = e->parm_stride;
    return a;
}

bool meet_FPARM_with_PT_info(FPARM* formal, const AARG* a) {
    if (!formal->is_pointer || formal->state == FPARM::ANYTHING) return false;
    if (!a->is_known) return lose(formal);
    PTENV value = a->value;
    if (!a->parm.empty()) {
        const FPARM* source = find_formal(a->caller, a->parm);
        if (!source || source->state == FPARM::ANYTHING) return lose(formal);
        if (source->state == FPARM::NO_CALL) return false;
        value = shifted(*source->summary, a->parm_offset, a->parm_stride);
    }
    if (formal->summary) value = meet_bindings(*formal->summary, value);
    if (is_anything(value) || (!value.categories && value.targets.empty())) return lose(formal);
    if (formal->summary && equal_bindings(*formal->summary, value)) return false;
    formal->summary = std::make_shared<const PTENV>(std::move(value));
    formal->state = FPARM::KNOWN;
    if (print_debug)
        debug_printf(" in aarg %s\n\tto parm %s of callee %s()\n", a->text.c_str(), formal->name.c_str(), a->callee->name.c_str());
    return true;
}

bool find_PT_in_formal_parms(const PTENV** out, const SYMTAB* sym) {
    if (sym->level != 1 || opt_level() < 3) return false;
    const FPARM* formal = find_formal(currfuninfo, sym->name);
    if (!formal || formal->state != FPARM::KNOWN) return false;
    *out = formal->summary.get();
    return true;
}
