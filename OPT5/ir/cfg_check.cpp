// Consistency of the control-flow graph and of statements, run between steps when asked for.

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "UTIL/abort.h"

#include <cstdarg>
#include <unordered_set>

namespace {

class CFG_CHECKER {
public:
    int run() {
        f = currfuninfo;
        if (!f->bb_list) {
            error(" +++++ currfuninfo->bb_list == NULL\n");
            return finish();
        }
        if (f->bb_list->predecessors) error(" +++++ Entry block %s has predecessors\n", f->bb_list->str());
        check_links();
        check_reachability();
        // What follows from the branches is mended first; what then has no branch behind it is an error.
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) check_branch(bb);
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) check_successors(bb);
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) check_predecessors(bb);
        return finish();
    }

private:
    void report(const char* format, va_list args) { std::vfprintf(fdebug ? fdebug : stderr, format, args); }
    void error(const char* format, ...) __attribute__((format(printf, 2, 3))) {
        va_list args;
        va_start(args, format);
        report(format, args);
        va_end(args);
        ++uncorrected;
    }
    void fixed(const char* format, ...) __attribute__((format(printf, 2, 3))) {
        va_list args;
        va_start(args, format);
        report(format, args);
        va_end(args);
        ++corrected;
    }
    int finish() {
        if (corrected || uncorrected)
            std::fprintf(fdebug ? fdebug : stderr, " ===== Corrected errors: %d, Uncorrected errors: %d\n\n", corrected, uncorrected);
        return uncorrected;
    }

    void check_links() {
        const BBLK* previous = nullptr;
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
            if (!listed.insert(bb).second) {
                error(" +++++ %s has improper <dflink>\n", bb->str());
                bb->dflink = nullptr;
                break;
            }
            if (bb->owner() != f)
                error(" +++++ %s has improper <owner>, found %s (0x%p) expected %s (0x%p)\n", bb->str(),
                      bb->owner()->name.c_str(), static_cast<void*>(bb->owner()), f->name.c_str(), static_cast<void*>(f));
            if (previous && bb->rdflink != previous) error(" +++++ %s has improper <rdflink>\n", bb->str());
            previous = bb;
        }
        if (f->bb_list->rdflink != previous) error(" +++++ %s has improper <rdflink>\n", f->bb_list->str());
    }

    void check_reachability() {
        std::unordered_set<const BBLK*> seen{f->bb_list};
        std::vector<const BBLK*> work{f->bb_list};
        while (!work.empty()) {
            const BBLK* bb = work.back();
            work.pop_back();
            for (const EDGE* e = bb->successors; e; e = e->rest)
                if (seen.insert(e->first).second) work.push_back(e->first);
        }
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
            if (!seen.count(bb)) fixed(" ----- %s cannot be reached from the entry block\n", bb->str());
    }

    void check_successors(BBLK* bb) {
        for (const EDGE* e = bb->successors; e; e = e->rest) {
            if (!listed.count(e->first)) {
                error(" +++++ %s has bogus successor: %s\n", bb->str(), e->first->str());
            } else if (!edge_memberp(bb, e->first->predecessors)) {
                fixed(" ----- %s succeeds %s but %s doesn't precede %s\n", e->first->str(), bb->str(), bb->str(),
                      e->first->str());
                e->first->predecessors = add_edge(bb, e->first->predecessors, e->prob);
            }
        }
    }

    void check_predecessors(const BBLK* bb) {
        for (const EDGE* e = bb->predecessors; e; e = e->rest)
            if (!listed.count(e->first) || !edge_memberp(bb, e->first->successors))
                error(" +++++ %s precedes %s but %s doesn't succeed %s\n", e->first->str(), bb->str(), bb->str(),
                      e->first->str());
    }

    void check_branch(BBLK* bb) {
        if (bb->is_in_LIR_form()) return;
        if (!bb->statements) {
            error(" +++++ %s has no statement list\n", bb->str());
            return;
        }
        if (bb->control && bb->last_statement() != last_cell(bb->statements)) {
            error(" +++++ %s remembers a control statement that is not its last\n", bb->str());
            bb->control = nullptr;
        }
        NODE* branch = bb->branch();
        switch (branch->op) {
        case RETURN:
        case URETURN:
        case BRANCH:
        case CBRANCH:
        case IF:
        case SWITCH: break;
        default: error(" +++++ %s has no ending branch\n", bb->str()); return;
        }
        EDGE* targets = list_branch_targets(branch, nullptr);
        for (const EDGE* e = targets; e; e = e->rest) {
            if (edge_memberp(e->first, bb->successors)) continue;
            fixed(" ----- %s's successors must include %s\n", bb->str(), e->first->str());
            connect(bb, e->first);
        }
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (!edge_memberp(e->first, targets)) error(" +++++ %s has bogus successor: %s\n", bb->str(), e->first->str());
        erase_edge_list(targets);
    }

    FUNINFO* f = nullptr;
    std::unordered_set<const BBLK*> listed;
    int corrected = 0, uncorrected = 0;
};

// One tree: every node alive, typed where a value stands, seen once.
class STMT_CHECKER {
public:
    int errors = 0;

    void check(NODE* t, const BBLK* bb) {
        for_each_node(t, [&](NODE* n) {
            if (!nodes.insert(n).second) complain(bb, n, "is shared");
            if (n->op < 0 || n->op >= NO_OPCODES || n->op == ILLOP || !node_operator_name[n->op]) {
                complain(bb, n, "has an illegal opcode");
                return;
            }
            if (number_of_operands[n->op] == 2 && !n->left && n->op != RETURN) complain(bb, n, "lacks its left operand");
            if (n->op == NAME && !n->u.sym) complain(bb, n, "names no symbol");
            if (n->op == LABELREF && !(n->lbl && n->lbl->bblock)) complain(bb, n, "names no block");
        });
    }

    void check_middle(const LIST* s, const BBLK* bb) {
        if (s->rest && op_transfers_control(s->first->op)) complain(bb, s->first, "transfers control inside its block");
    }

private:
    void complain(const BBLK* bb, const NODE* n, const char* what) {
        std::fprintf(fdebug ? fdebug : stderr, " +++++ %s: %s node %s\n", bb->str(), opname(n->op), what);
        ++errors;
    }
    std::unordered_set<const NODE*> nodes;
};

} // namespace

int validate_cfg() { return CFG_CHECKER().run(); }

int validate_stmts() {
    STMT_CHECKER checker;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        if (bb->is_in_LIR_form()) continue;
        for (const LIST* s = bb->statements; s; s = s->rest) {
            checker.check(s->first, bb);
            checker.check_middle(s, bb);
        }
    }
    return checker.errors;
}
