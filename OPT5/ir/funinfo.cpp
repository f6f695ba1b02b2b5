// Function records: creation, the flags known by name, suppression, and the end of a body.

#include "OPT5/ir/funinfo.h"

#include "BITVEC/bitvec.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/live_sets.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <unordered_map>
#include <unordered_set>

FILEINFO fileinfo;
std::mutex funinfo_lock;
std::list<SYMTAB*> functions;
std::list<SYMTAB*> functions_queue;
std::list<SYMTAB*> unsuppressed_functions;
std::vector<FUNINFO*> unsuppressed_funinfos;
std::mutex unsuppression_lock;

namespace {

// All records by symbol, and by name less its prefix. Guarded by `funinfo_lock`.
std::unordered_map<std::string, FUNINFO*> funinfo_by_name;
std::unordered_set<const SYMTAB*> nonconforming_functions;

const std::unordered_map<std::string, uint64_t>& system_functions() {
    constexpr uint64_t NO_GLOBALS = FUN_no_global_asg | FUN_no_global_use, NO_IND_ASG = FUN_no_ind_asg,
                       NO_IND_USE = FUN_no_ind_use, NO_BYREF_ASG = FUN_no_byref_asg, PURE = FUN_is_pure_fun,
                       RETURNS = FUN_surely_returns;
    static const std::unordered_map<std::string, uint64_t> table = {
#define SYSTEM_FUNCTION(name, flags) {#name, flags},
#include "OPT5/ir/system_functions.def"
#undef SYSTEM_FUNCTION
    };
    return table;
}

// A function that the program defines itself does what its body says, whatever its name.
bool is_defined_here(const SYMTAB* sym) {
    return sym && sym->location && (sym->sclass == SC_EXTDEF || sym->sclass == SC_STATIC);
}

} // namespace

bool setjmp_is_named = false;

// ---- Flags

uint64_t get_flags(FUNINFO* f) { return f->flags; }
void set_flags(FUNINFO* f, uint64_t bits) { f->flags |= bits; }
void forbid_inlining(FUNINFO* f, const char* why) {
    set_flags(f, FUN_cannot_inline);
    if (!f->inline_obstacle) f->inline_obstacle = why;
}
void clear_flags(FUNINFO* f, uint64_t bits) { f->flags &= ~bits; }

bool is_system_function(const char* name) { return system_functions().count(skip_name_prefix(name)) != 0; }

bool func_is_nonconforming(const SYMTAB* sym) { return sym && nonconforming_functions.count(sym) != 0; }

void add_nonconforming_function(const SYMTAB* sym) { nonconforming_functions.insert(sym); }

void init_FUNINFO_flags(FUNINFO* f, int known_system) {
    const char* name = skip_name_prefix(f->name.c_str());
    if (!std::strcmp(name, "main")) set_flags(f, FUN_is_main);
    for (const char* root : {"_system_pre_init", "_system_post_cinit", "__mpu_init"})
        if (!std::strcmp(name, root) || f->name == root) set_flags(f, FUN_is_cg_root);
    if (cache_sys_funinfo && !func_is_nonconforming(f->symbol) && !is_defined_here(f->symbol)) {
        auto known = system_functions().find(name);
        if (known_system || known != system_functions().end()) {
            set_flags(f, FUN_is_SYSTEM);
            if (known != system_functions().end()) set_flags(f, known->second);
        }
    }
    if (TEST_FLAG(f, FUN_is_cpp) && !std::strncmp(name, "__sti__", 7)) set_flags(f, FUN_is_cg_root);
}

// ---- Records

FUNINFO::FUNINFO(const char* function_name)
    : name(function_name), spmap(std::make_unique<SPMAP>()), snmap(std::make_unique<SNMAP>()) {}
FUNINFO::~FUNINFO() = default;

namespace {

// Under `funinfo_lock`.
FUNINFO* create_funinfo(const char* name, SYMTAB* sym, int known_system) {
    static uint32_t uid_counter = 0;
    auto* f = new FUNINFO(name);
    f->symbol = sym;
    f->uid = ++uid_counter;
    constexpr int VECTORIZE_ON = 50;
    f->simd_allowed =
        pass_debug_SIMD || (file_options && file_options->getnumarg(option_obj::OO_vectorize) == VECTORIZE_ON);
    init_FUNINFO_flags(f, known_system);
    fileinfo.FUNLIST.push_back(f);
    funinfo_by_name.emplace(skip_name_prefix(name), f);
    if (!std::strcmp(skip_name_prefix(name), "setjmp")) setjmp_is_named = true;
    if (sym) sym->function_record = f;
    return f;
}

FUNINFO* lookup_by_name(const char* name) {
    auto it = funinfo_by_name.find(skip_name_prefix(name));
    return it == funinfo_by_name.end() ? nullptr : it->second;
}

} // namespace

FUNINFO* find_FUNINFO(const char* name) {
    std::lock_guard<std::mutex> guard(funinfo_lock);
    if (FUNINFO* f = lookup_by_name(name)) return f;
    return *name && is_system_function(name) ? create_funinfo(name, nullptr, 1) : nullptr;
}

FUNINFO* find_FUNINFO(SYMTAB* sym) { return sym->function_record; }

FUNINFO* make_FUNINFO(const char* name) {
    if (FUNINFO* f = find_FUNINFO(name)) return f;
    std::lock_guard<std::mutex> guard(funinfo_lock);
    FUNINFO* f = create_funinfo(name, nullptr, 0);
    if (!*name && !fileinfo.dummy) fileinfo.dummy = f;
    return f;
}

FUNINFO* make_FUNINFO(SYMTAB* sym) {
    std::lock_guard<std::mutex> guard(funinfo_lock);
    if (sym->function_record) return sym->function_record;
    FUNINFO* f = lookup_by_name(sym->name);
    if (f && !f->symbol && f != fileinfo.dummy) {
        f->symbol = sym;
        f->name = sym->name;
        // What the name alone guaranteed does not hold for a function that the program defines.
        if (is_defined_here(sym) && TEST_FLAG(f, FUN_is_SYSTEM)) {
            clear_flags(f, ~uint64_t(FUN_is_main | FUN_is_cg_root | FUN_is_cpp));
        }
        sym->function_record = f;
        return f;
    }
    return create_funinfo(sym->name, sym, 0);
}

FUNINFO* find_FUNINFO_for_call(const NODE* call) {
    SYMTAB* callee = get_callee_for_call(call);
    return callee ? find_FUNINFO(callee) : nullptr;
}

bool function_is_defined(FUNINFO* f) {
    if (!f || f == fileinfo.dummy) return false;
    if (f->symbol) return f->symbol->location && (f->symbol->sclass == SC_EXTDEF || f->symbol->sclass == SC_STATIC);
    OPT_ASSERT(TEST_FLAG(f, FUN_is_SYSTEM) || (!cache_sys_funinfo && is_system_function(f->name.c_str())));
    return false;
}

void unsuppress_inline_function(FUNINFO* f) {
    if (!f || !f->symbol || !f->symbol->location || f == currfuninfo) return;
    const uint64_t flags = get_flags(f);
    if (flags & FUN_is_processed || !(flags & FUN_is_suppressed)) return;
    if (!(flags & FUN_cannot_suppress)) {
        constexpr int PRG_KEEPS_INLINE_DEFINITION = 69;
        const SYMTAB* s = f->symbol;
        const bool visible = s->sclass == SC_EXTDEF || s->sclass == SC_EXTERN;
        if (visible && !no_outside_callers && !find_pragma(s, PRG_KEEPS_INLINE_DEFINITION)) return;
        set_flags(f, FUN_cannot_suppress);
    }
    if (write_opt_info) {
        info_printf("\nInlineable function %s() was marked for suppression,", f->name.c_str());
        info_printf("\nbut it cannot be because of a problematic use in %s().\n\n",
                    currfuninfo ? currfuninfo->name.c_str() : "");
    }
    clear_flags(f, FUN_is_suppressed);
    if (TEST_FLAG(f, FUN_is_unsuppressed)) return;
    set_flags(f, FUN_is_unsuppressed);
    std::lock_guard<std::mutex> guard(unsuppression_lock);
    unsuppressed_functions.push_back(f->symbol);
    unsuppressed_funinfos.push_back(f);
}

// ---- Dumps

namespace {

struct FLAG_NAME {
    uint64_t bit;
    const char* name;
};
#define FLAG(f)                                                                                                        \
    { f, #f }
constexpr FLAG_NAME flag_names[] = {
    FLAG(FUN_calls_anonymous), FLAG(FUN_cannot_suppress), FLAG(FUN_is_unsuppressed), FLAG(FUN_never_returns),
    FLAG(FUN_calls_OUTSIDE),   FLAG(FUN_cannot_inline),   FLAG(FUN_is_suppressed),   FLAG(FUN_no_global_asg),
    FLAG(FUN_no_global_use),   FLAG(FUN_is_referenced),   FLAG(FUN_calls_SYSTEM),    FLAG(FUN_is_processed),
    FLAG(FUN_is_anonymous),    FLAG(FUN_is_interrupt),    FLAG(FUN_follows_call),    FLAG(FUN_value_needed),
    FLAG(FUN_no_byref_asg),    FLAG(FUN_is_pure_fun),     FLAG(FUN_cannot_beta),     FLAG(FUN_no_RPT_loop),
    FLAG(FUN_is_inlined),      FLAG(FUN_no_ind_asg),      FLAG(FUN_no_ind_use),      FLAG(FUN_is_cg_root),
    FLAG(FUN_is_called),       FLAG(FUN_is_extern),       FLAG(FUN_is_SYSTEM),       FLAG(FUN_has_1_BB),
    FLAG(FUN_is_main),         FLAG(FUN_is_cpp),          FLAG(FUN_only_reads),      FLAG(FUN_surely_returns),
};
#undef FLAG

void dump_funinfo_to(FILE* out, FUNINFO* f) {
    std::fprintf(out, "\nFunction %s()\n", f->name.c_str());
    if (f->size) std::fprintf(out, "Its integrable body size is %u units\n", f->size);
    std::fprintf(out, "called from %u sites\n", f->ncallers);
    const uint64_t flags = get_flags(f);
    std::fprintf(out, "It has these properties: 0x%08lx\n", static_cast<unsigned long>(flags));
    for (const FLAG_NAME& row : flag_names)
        if (flags & row.bit) std::fprintf(out, "\t%s\n", row.name);
}

} // namespace

void dump_FUNINFO(FUNINFO* f, int to_info) {
    FILE* out = to_info ? finfo : fdebug;
    if (out && f) dump_funinfo_to(out, f);
}

void dump_function_header(bool to_info) {
    if (!currfuninfo) return;
    const PSN* psn = currfuninfo->begin_psn;
    const char* file = psn && psn->file ? psn->file : "NO_FILE";
    const long line = psn ? psn->line : 0;
    debug_printf("\n========== FUNCTION %s() [%s:%ld] ==========\n", currfuninfo->name.c_str(), file, line);
    if (to_info) info_printf("FUNCTION %s() [%s:%ld]\n", currfuninfo->name.c_str(), file, line);
}

// ---- The end of a body

namespace {

void erase_symbols(SYMTAB*& list) {
    while (list) {
        SYMTAB* next = list->next;
        delete list;
        list = next;
    }
}

void erase_ranges(SYM_RANGE*& list) {
    while (list) {
        SYM_RANGE* next = list->next;
        delete list;
        list = next;
    }
}

void erase_ptrs(FUNINFO* f) {
    while (f->ptrs) {
        PTR* next = f->ptrs->next;
        delete f->ptrs;
        f->ptrs = next;
    }
    f->bottom_ptr = nullptr;
    f->ptr_map.clear();
}

void erase_eht(FUNINFO* f) {
    for (EHT_ITEM& item : f->eht) erase_tree(item.cleanup);
    std::vector<EHT_ITEM>().swap(f->eht);
}

} // namespace

void erase_all() {
    FUNINFO* f = currfuninfo;
    if (!f) return;
    for (BBLK* bb = f->bb_list; bb;) {
        BBLK* next = bb->dflink;
        erase_bblock(bb);
        delete bb;
        bb = next;
    }
    f->bb_list = f->exit_bb = nullptr;
    f->bb_count = 0;
    std::vector<BBLK*>().swap(f->objects);
    erase_tree(f->arg_prolog);
    f->arg_prolog = nullptr;
    erase_tree_list(f->statements);
    f->statements = nullptr;
    for (NODE* fact : f->givens) erase_tree(fact);
    f->givens.clear();
    erase_eht(f);
    f->dominators.reset();
    f->loops.reset();
    f->live_sets.reset();
    f->points_to.reset();
    f->facts = fact::none;
    f->spmap->clear();
    f->snmap->clear();
    for (SYMTAB** list : {&f->new_syms, &f->pending_syms, &f->memory_syms, &f->scalar_syms}) erase_symbols(*list);
    for (SYMTAB* sym : f->dropped_syms) delete sym;
    f->dropped_syms.clear();
    f->stack_union = nullptr;
    f->code_records = {};
    f->stack_is_laid_out = false;
    erase_ranges(f->widened);
    erase_ranges(f->shortened);
    erase_symlist(f->fl_statics);
    f->fl_statics = nullptr;
    erase_ptrs(f);
    delete f->ls_root;
    f->ls_root = nullptr;
}

bool sym_appears_in_EHT(const SYMTAB* sym) {
    for (const EHT_ITEM& item : currfuninfo->eht)
        if (item.cleanup && sym_appears_in_tree(sym, item.cleanup)) return true;
    return false;
}

bool only_its_name_reaches(const SYMTAB* sym) {
    if (!is_known(fact::alias_marks)) return false;
    if (!sym->is_automatic() && !(sym->level > 0 && sym->sclass == SC_PARM)) return false;
    return !sym->is_aliased() && !sym->type->is_volatile() && !sym_appears_in_EHT(sym);
}

bool is_private_name(const NODE* t) {
    return t->op == NAME && t->u.sym && t->type->is_scalar() && !t->type->is_volatile() &&
           only_its_name_reaches(t->u.sym);
}
