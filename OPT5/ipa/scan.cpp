// One scan of a function's body: what it calls, reads and writes, and how large it is.
//
// Needs: a definition that has been read. Leaves: the flags, callees and size of its record, and the uses of globals.
// Sound because the function starts with every guarantee ("assigns no global", ...), and the scan clears those that the
// body breaks. A call breaks what the callee does not guarantee; a callee that has not been read yet guarantees what
// the reader knows of it, and the call graph takes back what its body breaks. Whatever the scan does not know, as
// assembly text, breaks all.

#include "OPT5/ipa/progana.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstring>

PROGRAM program;

FUNLIST* mkFUNLIST(FUNINFO* f, FUNLIST* next) { return new FUNLIST{f, next}; }

PRAGMA* symbol_has_pragma(const SYMTAB* sym, int kind) { return sym ? find_pragma(sym, kind) : nullptr; }

bool symbol_is_preemptible(const SYMTAB* sym) {
    const PRAGMA* p = symbol_has_pragma(sym, PRG_SYM_VISIBILITY);
    return p && !p->args.empty() && (p->args[0] == "default" || p->args[0] == "extern");
}

namespace {

constexpr uint64_t ASSUMPTIONS =
    FUN_no_global_asg | FUN_no_global_use | FUN_no_byref_asg | FUN_is_pure_fun | FUN_no_ind_asg | FUN_no_ind_use;
static_assert(ASSUMPTIONS == 0xC30180);
constexpr uint64_t VOID_IF_REPLACED = 0x32CB0188; // of a function that another definition may take the place of
constexpr uint64_t PURE = FUN_is_pure_fun | FUN_only_reads;
constexpr uint32_t FLAG_NO_SIMD = 0x800000;       // of a built-in's descriptor

void count_in(CALLEE** list, FUNINFO* f) {
    for (CALLEE* c = *list; c; c = c->next)
        if (c->callee == f) {
            ++c->ncalls;
            return;
        }
    *list = new CALLEE{f, 1, *list};
}

class SCAN {
public:
    SCAN(FUNINFO* funinfo, bool prolog) : f(funinfo), in_prolog(prolog) {}

    void tree(NODE* t, bool value_unused) {
        if (!t) return;
        ++f->size;
        switch (t->op) {
        case NAME: name(t); return;
        case UMULT:
        case STREF: indirect_read(t); return;
        case UAND:
        case ARGREF: address(t); return;
        case CALL:
        case UCALL: call(t, value_unused); return;
        case MCALL: machine_call(t); return;
        case ICALL:
        case UICALL: intrinsic(t); return;
        case ASM:
        case UMCALL: opaque(t); return;
        case MEMCPY: memory_copy(t); return;
        case ASSERT:
            clear(PURE);
            operands(t);
            return;
        case NASSERT: assertion(t); return;
        case RETURN:
        case URETURN: tree(t->right, false); return;
        case STDOT: member(t); return;
        case SWITCH:
        case COMMA:
        case COMMAOP:
        case PCONV:
        case BRANCH:
        case OUIALIGN:
        case NONALIGN:
        case PPRAGMA:
        case IF: --f->size; break;
        case PCOMMA: {
            --f->size;
            const bool outer = in_prolog;
            in_prolog = true;
            operands(t);
            in_prolog = outer;
            return;
        }
        case PLUS:
            if (t->left->op == UAND && t->right->op == ICON) --f->size; // vanishes in addressing
            break;
        case SCONV:
            if (in_prolog && f->symbol && f->symbol->type->proto()) --f->size;
            break;
        case ACONV:
            if (t->left && compatible_types(t->type, t->left->type, false)) --f->size;
            break;
        default:
            if (writes_left_operand(t->op)) {
                assignment(t);
                return;
            }
            break;
        }
        operands(t);
    }

private:
    void operands(NODE* t) {
        tree(t->right, false);
        tree(t->left, false);
    }
    void clear(uint64_t flags) { clear_flags(f, flags); }

    void name(NODE* t) {
        SYMTAB* sym = t->u.sym;
        if (sym->is_function())
            function_name(sym);
        else
            data_name(sym);
        if (sym->cqual & (CQ_MARKS_FUNCTION | CQ_GLOBAL_REGISTER) || (sym->sclass == SC_AUTO && !sym->is_aliased()))
            --f->size;
    }

    void function_name(SYMTAB* sym) {
        FUNINFO* named = make_FUNINFO(sym);
        if (sym->cqual & CQ_INTERRUPT) {
            set_flags(named, FUN_is_interrupt);
            return;
        }
        if (TEST_FLAG(named, FUN_is_interrupt)) return;
        count_in(&program.anonymous_functions, named);
        set_flags(named, FUN_is_anonymous);
    }

    void data_name(SYMTAB* sym) {
        const bool at_file_level = sym->level == 0;
        if (at_file_level) {
            sym->cqual |= CQ_REFERENCED;
            clear(FUN_no_global_use);
            if (sym->sclass == SC_STATIC && find_pragma(sym, PRG_FL_STATIC) && !find_sym_in_symlist(sym, f->fl_statics))
                f->fl_statics = mk_symlist(sym, f->fl_statics);
        }
        if (!symbol_is_immutable(sym) && (at_file_level || sym->type->is_volatile())) clear(FUN_is_pure_fun);
        if (sym->type->is_volatile()) clear(PURE);
    }

    // What an assignment, or a machine operation through an argument, may write.
    void written(const NODE* lvalue) {
        SYMTAB* object = object_name_if_known(object_of_place(lvalue));
        if (!object) {
            clear(FUN_no_byref_asg | PURE | FUN_no_ind_asg);
            return;
        }
        if (object->level == 0) {
            object->cqual |= CQ_REFERENCED | CQ_WRITTEN;
            clear(FUN_no_global_asg | PURE);
        }
        if (object->type->is_volatile() || lvalue->type->is_volatile()) clear(PURE);
    }

    void assignment(NODE* t) {
        const bool outer = in_prolog;
        if (tree_is_arg_prolog(t)) in_prolog = true;
        tree(t->right, false);
        for_each_write_of_node(t, [this](const WRITE& w) { written(w.place); });
        NODE* target = t->left;
        if (t->op == ASG) {
            if (NODE* object = name_of_place(target))
                target = object;
            else if (op_is_indirection(target->op))
                target = target->left;
        }
        tree(target, false);
        in_prolog = outer;
    }

    void indirect_read(NODE* t) {
        if (t->type->is_volatile()) clear(PURE);
        if (SYMTAB* object = object_name_if_known(t))
            data_name(object);
        else if (!(t->left->op == NAME && t->left->u.sym->name[0] == '.'))
            clear(FUN_is_pure_fun | FUN_no_ind_use);
        if (t->op == UMULT) tree(t->right, false);
        tree(t->left, false);
    }

    void member(NODE* t) {
        if (t->left->op == UMULT) --f->size; // vanishes in addressing
        if (t->type->is_volatile()) clear(PURE);
        tree(t->left, false);
    }

    void address(NODE* t) {
        if (const NODE* object = name_of_place(t->left); object && object->u.sym->level == 0 && !object->u.sym->is_function())
            object->u.sym->cqual |= CQ_REFERENCED | CQ_ALIASED;
        tree(t->left, false);
    }

    // Nothing needs the value of a call without one, wherever it stands.
    void call(NODE* t, bool value_unused) {
        value_unused = value_unused || t->type->is_void();
        delete t->call;
        t->call = new CALL_RECORD{f, f->unique_call_index++, 0};
        FUNINFO* callee = nullptr;
        if (t->left->op == UAND && t->left->left->op == NAME && t->left->left->u.sym->is_function()) {
            callee = make_FUNINFO(t->left->left->u.sym);
            add_call_edge(f, callee, value_unused);
        } else {
            set_flags(f, FUN_calls_anonymous | FUN_calls_OUTSIDE);
            program.file_flags |= FILE_calls_outside;
            if (program.file_fun) add_call_edge(f, program.file_fun, value_unused);
            tree(t->left, false);
        }
        propagate_call_flags(f, callee);
        if (t->op == CALL) tree(t->right, false);
    }

    void machine_call(NODE* t) {
        for (int i = 0, n = arg_list_count(t->left); i < n; ++i)
            if (NODE* arg = arg_list_lookup(t->left, i); arg->op == ARGREF) written(arg->left);
        const BIF* bif = find_BIF_descriptor(t->u.name);
        if (bif && bif->has(FLAG_NO_SIMD)) f->simd_allowed = false;
        clear(PURE);
        // An argument that is a pointer leads the operation anywhere.
        note_pointer_arguments(t);
        operands(t);
    }

    void intrinsic(NODE* t) {
        note_pointer_arguments(t);
        operands(t);
    }

    void note_pointer_arguments(NODE* t) {
        for (int i = 0, n = arg_list_count(t->left); i < n; ++i)
            if (const NODE* arg = arg_list_lookup(t->left, i);
                arg->type && arg->type->is_pointer() && arg->op != ARGREF)
                clear(FUN_no_byref_asg | PURE | FUN_no_ind_asg | FUN_no_ind_use | FUN_no_global_asg |
                      FUN_no_global_use);
    }

    void opaque(NODE* t) {
        if (tree_is_ASM_comment(t)) {
            --f->size;
            return;
        }
        if (t->op == ASM && t->text) program.assembly.push_back(t->text);
        if (!f->symbol || !(f->symbol->cqual & CQ_INLINE)) {
            set_flags(f, FUN_cannot_suppress);
            forbid_inlining(f, "it holds inline assembly: declare it inline if that may be copied");
        }
        clear(ASSUMPTIONS | FUN_only_reads);
        operands(t);
    }

    void memory_copy(NODE* t) {
        add_call_edge(f, make_FUNINFO("memcpy"), true);
        clear(FUN_no_byref_asg | PURE | FUN_no_ind_asg | FUN_no_ind_use);
        // A copy to or from an object by its address is an access of that object.
        for (int i = 0; i < 2; ++i) {
            const NODE* place = place_of_pointer(arg_list_lookup(t->left, i));
            const NODE* object = place ? name_of_place(place) : nullptr;
            if (!object) continue;
            if (i == 0)
                written(object);
            else
                data_name(object->u.sym);
        }
        operands(t);
    }

    // An assertion computes nothing.
    void assertion(NODE* t) {
        const uint32_t before = f->size - 1;
        tree(t->left, true);
        f->size = before;
    }

    FUNINFO* f;
    bool in_prolog;
};

} // namespace

void scan_for_funinfo(NODE* tree, bool value_unused, FUNINFO* f, bool in_prolog) {
    SCAN(f, in_prolog).tree(tree, value_unused);
}

void scan_for_funinfo(NODE* item) {
    if (!program.file_fun) program.file_fun = make_FUNINFO("");
    scan_for_funinfo(item, false, program.file_fun, false);
}

// ---- Definitions

void preprocess_fundef(FUNINFO* f) {
    OPT_ASSERT(f->symbol != NULL);
    program.funlist = mkFUNLIST(f, program.funlist);
    if (!program.file_fun) program.file_fun = make_FUNINFO("");
    if (TEST_FLAG(f, FUN_is_main | FUN_is_interrupt | FUN_is_referenced)) {
        set_flags(f, FUN_is_cg_root);
        program.file_flags |= FILE_has_root;
    }
    if (TEST_FLAG(f, FUN_is_main)) program.file_flags |= FILE_defines_main;
    if (f->symbol->sclass == SC_EXTERN || f->symbol->sclass == SC_EXTDEF) {
        program.file_flags |= FILE_defines_external;
        set_flags(f, FUN_is_extern);
    }
    if (f->bb_count == 1) set_flags(f, FUN_has_1_BB);

    const uint64_t remembered = get_flags(f);
    set_flags(f, ASSUMPTIONS | FUN_only_reads);
    if (remembered & FUN_never_returns) clear_flags(f, PURE);
    f->size = 0;
    f->unique_call_index = 0;
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) scan_for_funinfo(s->first, true, f, false);
    for (EHT_ITEM& item : f->eht)
        if (item.kind == EHK_CLEANUP) scan_for_funinfo(item.cleanup, true, f, false);
    if (f->eht.size() > 2) {
        const uint32_t cost = static_cast<uint32_t>(2 * f->eht.size() - 2);
        f->size += tp->int_t->size == 16 ? 2 * cost : cost;
    }
    set_flags(f, remembered & (FUN_no_byref_asg | FUN_no_ind_asg));
    if (TEST_FLAG(f, FUN_no_ind_asg)) set_flags(f, FUN_no_byref_asg);
    check_fun_for_byref_asgs(f->symbol);
    if (symbol_is_preemptible(f->symbol) || symbol_has_pragma(f->symbol, PRG_WEAK)) {
        clear_flags(f, VOID_IF_REPLACED | FUN_only_reads);
        set_flags(f, FUN_calls_OUTSIDE | FUN_calls_SYSTEM);
    }
}

void check_fun_for_byref_asgs(SYMTAB* sym) {
    const TYPE* type = sym->type;
    if (!type->is_func() || !type->proto() || type->vararg()) return;
    for (const fkPARAM* p = type->params(); p; p = p->next)
        if (p->type->is_pointer()) return;
    clear_flags(make_FUNINFO(sym), FUN_no_byref_asg);
}

void add_call_edge(FUNINFO* caller, FUNINFO* callee, bool value_unused) {
    if (TEST_FLAG(callee, FUN_is_main)) program.main_runs_once = false;
    // A function may call thousands of others. What nobody calls yet is on no list, and of the file's roots, which are
    // entered one after the other, only the last may come again.
    CALLEE* last = caller->callees;
    const bool is_new =
        !TEST_FLAG(callee, FUN_is_called) || (caller == program.file_fun && !(last && last->callee == callee));
    if (is_new)
        caller->callees = new CALLEE{callee, 1, last};
    else
        count_in(&caller->callees, callee);
    set_flags(callee, FUN_is_called);
    ++callee->ncallers;
    if (!value_unused) set_flags(callee, FUN_value_needed);
    if (TEST_FLAG(caller, FUN_has_1_BB) && TEST_FLAG(callee, FUN_never_returns)) {
        set_flags(caller, FUN_never_returns);
        clear_flags(caller, PURE);
    }
}

bool propagate_call_flags(FUNINFO* caller, FUNINFO* callee) {
    if (caller == callee) return false;
    const uint64_t before = get_flags(caller), guaranteed = callee ? get_flags(callee) : 0;
    uint64_t broken = ASSUMPTIONS & ~guaranteed;
    if (broken & FUN_no_byref_asg) broken |= FUN_no_ind_asg;
    if (!(guaranteed & PURE)) broken |= FUN_only_reads;
    clear_flags(caller, broken);
    return get_flags(caller) != before;
}

void scan_for_calls_and_uses(NODE* tree) {
    for_each_node(tree, [](NODE* t) {
        if (!op_is_call(t->op)) return;
        if (SYMTAB* callee = get_callee_for_call(t)) set_flags(make_FUNINFO(callee), FUN_cannot_suppress);
    });
}
