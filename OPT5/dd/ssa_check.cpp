// The verifier of SSA form, and its dump.
#include "OPT5/dd/ssa.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <unordered_map>
#include <unordered_set>

namespace {

class VERIFIER {
public:
    int findings = 0;

    void run() {
        need(fact::dominators);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) enter_definitions(bb);
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) check_block(bb);
    }

private:
    struct PLACE {
        const BBLK* block;
        size_t order; // in its block
    };
    void report(const BBLK* bb, const NODE* t, const char* what) {
        ++findings;
        std::fprintf(fdebug ? fdebug : stderr, " +++++ SSA form, %s: %s: %s\n", bb->str(), what,
                     tree_to_infix(t).c_str());
    }

    void enter_definitions(BBLK* bb) {
        size_t order = 0;
        bool is_behind_phis = false;
        for (LIST* s = bb->statements; s; s = s->rest) {
            if (!s->first) continue;
            if (s->first->op != SSA_PHI) is_behind_phis = true;
            if (s->first->op == SSA_PHI && is_behind_phis) report(bb, s->first, "a phi behind other statements");
            for_each_SSA_operator(s->first, [&](NODE* t) {
                ++order;
                if (!op_is_SSA_definition(t->op)) return;
                places[t] = {bb, order};
                const uint32_t version = ssa_version(t);
                if (version == 0 || version >= ssa_definitions().size() || ssa_definitions()[version].node != t)
                    report(bb, t, "a definition that is not entered under its version");
                else if (ssa_definitions()[version].block != bb)
                    report(bb, t, "a definition that is entered in another block");
                if (!versions.insert(version).second) report(bb, t, "two definitions of one version");
            });
        }
    }

    void check_reach(const BBLK* bb, const NODE* t, const NODE* definition, size_t order) {
        if (!definition) return;
        auto at = places.find(definition);
        if (at == places.end()) return report(bb, t, "the definition is gone");
        if (ssa_variable(definition) != ssa_variable(t)) report(bb, t, "the definition is of another variable");
        const PLACE& place = at->second;
        const bool reaches =
            place.block == bb ? place.order < order : currfuninfo->dominators->dominates(place.block, bb);
        if (!reaches) report(bb, t, "the definition does not dominate");
    }

    void check_phi(const BBLK* bb, const NODE* phi) {
        std::unordered_set<const BBLK*> seen;
        for (const SSA_ARG& a : ssa_args(phi)) {
            if (!seen.insert(a.block).second) report(bb, phi, "two arguments of one predecessor");
            if (!is_edge(a.block, bb)) report(bb, phi, "an argument of a block that is no predecessor");
            check_reach(a.block, phi, a.definition, ~size_t(0));
        }
        if (seen.size() != static_cast<size_t>(edge_length(bb->predecessors)))
            report(bb, phi, "not one argument for each predecessor");
    }

    void check_block(BBLK* bb) {
        size_t order = 0;
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_SSA_operator(s->first, [&](NODE* t) {
                ++order;
                if (t->op == SSA_PHI)
                    check_phi(bb, t);
                else if (t->op != SSA_DEF)
                    check_reach(bb, t, ssa_reach(t), order);
            });
    }

    std::unordered_map<const NODE*, PLACE> places; // looked up alone
    std::unordered_set<uint32_t> versions;
};

std::string text_of_operators(NODE* tree) {
    std::string text;
    for_each_SSA_operator(tree, [&text](NODE* t) {
        text += std::string("\t\t") + opname(t->op) + " #" + std::to_string(ssa_variable(t)->uid);
        if (t->op != SSA_DEF && t->op != SSA_PHI)
            text += " reads " + std::to_string(ssa_reach(t) ? ssa_version(ssa_reach(t)) : 0);
        if (op_is_SSA_definition(t->op)) text += " defines " + std::to_string(ssa_version(t));
        if (t->op == SSA_PHI)
            for (const SSA_ARG& a : ssa_args(t))
                text += std::string(" ") + a.block->str() + ":" +
                        std::to_string(a.definition ? ssa_version(a.definition) : 0);
        text += "\n";
    });
    return text;
}

void dump_variable(const SSAVAR* v) {
    debug_printf(v->sym ? "SSAVAR DIRECT entry #%u" : "SSAVAR INDIRECT entry #%u", v->uid);
    debug_printf(": %s [%s;%s]", tree_to_infix(v->tree).c_str(), int2text(v->start, tp->llong_t, 10, 0),
                 int2text(v->length, tp->llong_t, 10, 1));
    static const char* const names[] = {"entire_object",   "fixed_address", "DEFd",     "USEd",   "aliased", "array",
                                        "likely_register", "global",        "multi_bb", "munged", "unioned"};
    for (int i = 0; i < 11; ++i)
        if (v->has(static_cast<uint16_t>(1 << i))) debug_printf(" %s", names[i]);
    debug_printf("\n");
}

} // namespace

int validate_SSA_form() {
    if (!function_is_in_SSA_form) return 0;
    VERIFIER verifier;
    verifier.run();
    return verifier.findings;
}

void dump_SSA_function_body() {
    for (const auto& v : ssa_variables()) dump_variable(v.get());
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        debug_printf("%s:\n", bb->str());
        for (const LIST* s = bb->statements; s; s = s->rest)
            debug_printf("\t%s\n%s", stmt2infix(s->first).c_str(), text_of_operators(s->first).c_str());
    }
}

void enter_and_leave_SSA_form(bool onlySSV, bool onlyIV, bool vectorsToo) {
    std::vector<LIST*> before;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        promote_toplevel_COMMAOPs_in_list(bb->statements, bb->last_statement());
        before.push_back(copy_statements(bb->statements));
    }
    construct_SSA_form(onlySSV, onlyIV, vectorsToo);
    if (validate_SSA_form() != 0) abort_optimizer("SSA form is not valid");
    deconstruct_SSA_form();
    size_t i = 0;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink, ++i) {
        const LIST* was = before[i];
        for (const LIST* is = bb->statements; is || was; is = is->rest, was = was->rest)
            if (!is || !was || stmt2infix(is->first) != stmt2infix(was->first))
                abort_optimizer("SSA form has changed the function");
        erase_tree_list(before[i]);
    }
}
