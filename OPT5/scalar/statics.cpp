// Function-local statics that every activation writes before it reads them become automatic variables.
//
// Needs: the statements of the function in blocks. Leaves: what rests on the graph; symbols are split anew.
// Sound because such a static carries nothing from one call to the next, so that a variable of the frame does the same:
// unless something else can see it, or the function is entered again while it is in use. A call may do that, so what
// was written before a call counts as not written behind it. The analysis runs forward over the blocks with the set of
// candidates that are written on every path; a read of one that is not in the set makes it stay.
#include "OPT5/scalar/eda.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dataflow.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lowering.h"

#include <cstring>
#include <unordered_map>
#include <vector>

namespace {

template <class F>
void for_each_statement(const F& visit) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) visit(s->first);
}

bool is_candidate(const SYMTAB* sym) {
    constexpr unsigned BARRING = QUAL_VOLATILE | QUAL_RESTRICT | QUAL_CONST;
    return sym->sclass == SC_STATIC && sym->level == 0 && sym->retention != I_SYMTAB::RETENTION_KEEP &&
           sym->type->is_scalar() && !sym->type->is_complex() && !(sym->type->qual_kind(true) & BARRING) &&
           !sym->dynamic_init && !(sym->cqual & CQ_GLOBAL_REGISTER) && !sym_appears_in_EHT(sym);
}

class STATICS {
public:
    void run() {
        for (SYMLIST* l = currfuninfo->fl_statics; l; l = l->next) {
            SYMTAB* sym = l->sym;
            sym->fl_static_eligible = false;
            sym->fl_static_candidate = is_candidate(sym);
            if (!sym->fl_static_candidate) continue;
            bit_of[sym] = static_cast<uint32_t>(candidates.size());
            candidates.push_back(sym);
        }
        if (candidates.empty()) return;
        drop_what_initializers_name();
        for_each_statement([this](const NODE* t) { drop_what_is_not_plain(t); });
        find_unwritten_reads();
        for (SYMTAB* sym : candidates) {
            sym->fl_static_eligible = sym->fl_static_candidate;
            if (print_debug && sym->fl_static_eligible)
                debug_printf("\t%s:%s (eligible for promotion to 'auto')\n", currfuninfo->name.c_str(), sym->name);
        }
    }

private:
    int bit(const NODE* t) const {
        if (t->op != NAME) return -1;
        const auto found = bit_of.find(t->u.sym);
        return found == bit_of.end() ? -1 : static_cast<int>(found->second);
    }
    void drop(int candidate) {
        if (candidate >= 0) candidates[static_cast<size_t>(candidate)]->fl_static_candidate = false;
    }
    void drop_all_names(NODE* t) {
        for_each_node(t, [this](const NODE* n) { drop(bit(n)); });
    }

    // ---- What something else can see

    void drop_what_initializers_name() {
        for (const SYMTAB* sym = global_symbols; sym; sym = sym->next) {
            drop_all_names(sym->init_value);
            if (sym->autoinit)
                for (NODE* item : *sym->autoinit) drop_all_names(item);
        }
    }

    // Everything but the read or the assignment of the whole variable.
    void drop_what_is_not_plain(const NODE* t) {
        for (; t; t = t->left) {
            if (t->op == UAND || t->op == ARGREF) drop(bit(t->left));
            for_each_write_of_node(t, [this, t](const WRITE& w) {
                const NODE* name = w.place ? name_of_place(w.place) : nullptr;
                if (name && name != t->left) drop(bit(name));
            });
            if (t->op == ASM && t->text) drop_what_text_names(t->text);
            drop_what_is_not_plain(t->right);
        }
    }
    void drop_what_text_names(const char* text) {
        for (size_t i = 0; i < candidates.size(); ++i)
            if (std::strstr(text, candidates[i]->name)) drop(static_cast<int>(i));
    }

    // ---- The analysis. `written` holds what is written on every path to the point.

    // Reads outside of the arguments of the statement's only call may come behind the call.
    void check_reads(const NODE* t, const BITVEC& written, bool may_follow_call) {
        for (; t; t = t->left) {
            if (const int i = bit(t); i >= 0 && (may_follow_call || !written.test(static_cast<uint32_t>(i)))) drop(i);
            if (op_is_call(t->op)) {
                check_reads(t->left, written, false);
                check_reads(t->right, written, false);
                return;
            }
            check_reads(t->right, written, may_follow_call);
        }
    }

    void statement(const NODE* t, BITVEC& written, bool check) {
        const int calls = count_calls_in_tree(t);
        const int target = t->op == ASG ? bit(t->left) : -1;
        if (check) {
            const NODE* read = target >= 0 ? t->right : t;
            if (calls <= 1)
                check_reads(read, written, calls == 1);
            else
                drop_all_names(const_cast<NODE*>(read));
        }
        if (calls) written.clear_all();
        if (target >= 0) written.set(static_cast<uint32_t>(target));
    }

    void find_unwritten_reads() {
        const DATAFLOW written(FLOW::FORWARD, MEET::INTERSECTION, BITVEC(static_cast<uint32_t>(candidates.size())),
                               [this](const BBLK* bb, BITVEC& set) {
                                   for (const LIST* s = bb->statements; s; s = s->rest) statement(s->first, set, false);
                               });
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            BITVEC set = written.at_entry(bb);
            for (const LIST* s = bb->statements; s; s = s->rest) statement(s->first, set, true);
        }
    }

    std::vector<SYMTAB*> candidates;
    std::unordered_map<const SYMTAB*, uint32_t> bit_of; // looked up, never walked
};

bool is_entered_once_at_a_time() {
    if (TEST_FLAG(currfuninfo, FUN_is_interrupt | FUN_is_cpp) || currfuninfo->has_eh()) return false;
    bool saves = false;
    for_each_statement([&](const NODE* t) { saves |= calls_setjmp(t); });
    return !saves;
}

SYMTAB* automatic_copy(const SYMTAB* sym, FUNINFO* f) {
    SYMTAB* copy = copy_symbol(sym);
    copy->sclass = SC_AUTO;
    copy->level = 2;
    copy->location = 0;
    copy->index = f->next_symbol_index++;
    copy->cqual &= static_cast<uint16_t>(~(CQ_ALIASED | CQ_WRITTEN | CQ_REFERENCED));
    remove_pragma(PRG_FL_STATIC, &copy->pragma);
    copy->set_is_aliased(false);
    copy->next = f->pending_syms;
    f->pending_syms = copy;
    copy->scope = LS::level_2_scope();
    LS::add_symbol(copy);
    return copy;
}

} // namespace

void identify_fl_statics_safe_for_auto() {
    if (opt_level() < 1 || !currfuninfo->bb_list || !currfuninfo->fl_statics || !is_entered_once_at_a_time()) return;
    STATICS().run();
}

void convert_safe_fl_statics_to_auto(FUNINFO* f) {
    std::vector<SYMTAB*> eligible;
    for (SYMLIST* l = f->fl_statics; l; l = l->next)
        if (l->sym->fl_static_eligible) eligible.push_back(l->sym);
    if (eligible.empty() || !f->bb_list) return;
    if (print_debug) debug_printf("    Changing these function-local static variables to 'auto':\n");
    for (SYMTAB* sym : eligible) {
        if (print_debug) debug_printf("\t%s:%s\n", f->name.c_str(), sym->name);
        if (write_opt_info) info_printf("Changing this function-local static variable to 'auto': %s\n", sym->name);
        SYMTAB* copy = automatic_copy(sym, f);
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) s->first = subst_sym_for_sym_in_tree(sym, copy, s->first);
        sym->fl_static_eligible = false;
        f->fl_statics = remove_sym_from_symlist(sym, f->fl_statics);
    }
    sym_split(f);
}
