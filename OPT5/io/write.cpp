// The output step of a function and the end of the unit.

#include "OPT5/io/write.h"

#include "IFILE/ifile.h"
#include "OPT5/io/read.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/target/target.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstdlib>
#include <unordered_set>

std::vector<REGISTER_ASSIGNMENT> register_assignments;

// ---- Small records

void wrasmr(int kind, const char* text, PSN* psn) {
    if (kind == IFR_COMMENT)
        o_file->if_write_comment(text);
    else
        o_file->if_write_assembly(text, psn);
    debug_printf("%s\t%s\n", kind == IFR_COMMENT ? ";" : "ASM", text);
}

namespace {

const char* control_tag(int kind) {
    switch (kind) {
    case IFR_BEGIN_FUNC: return "I_BF";
    case IFR_END_ARGS: return "I_EA";
    case IFR_END_LOCALS: return "I_EL";
    default: return "I_EF";
    }
}

} // namespace

void wrstcr(int kind, PSN* psn) {
    debug_printf("%s\t%d\t%ld\t\t\t;%s\n", control_tag(kind), kind, psn ? psn->line : 0L, currfunc->name);
    if (kind == IFR_BEGIN_FUNC)
        o_file->if_write_begin_func(currfunc, psn);
    else
        o_file->if_write_control(kind, psn);
}

void wrsfid(const char* name) { o_file->if_write_source(name); }

// ---- Symbols

void revert_symbol_type(SYMTAB* sym) {
    TYPE* o = sym->orig_type;
    if (!o || !sym->type) return;
    const bool same = compatible_types(sym->type, o->normalized_type(), true) ||
                      (o->is_enum() && compatible_types(sym->type, normalized_underlying_type(o), true));
    if (same) {
        const unsigned now = sym->type->qual_kind(false);
        TYPE* type = o;
        if (now != o->qual_kind(false)) type = now ? tp->mk_qual(o->stqs(), now) : o->stqs();
        sym->type = type;
    }
    o_file->if_reference_type(sym->type);
    o_file->if_reference_type(sym->type->stqs());
    o_file->if_reference_type(sym->type->stds());
}

namespace {

void write_symbol(SYMTAB* s) {
    const bool keeps_value = s->sclass == SC_REGISTER || s->sclass == SC_REGISTER2 || s->sclass == SC_MEMORY;
    if (!keeps_value) s->value = 0;
    TYPE* const working_type = s->type;
    const int8_t sclass = s->sclass;
    if (s->sclass == SC_MEMORY && s->flags == SC_MEMORY27) s->sclass = SC_MEMORY27;
    revert_symbol_type(s);
    o_file->if_enter_local(s);
    o_file->if_write_symbol(s);
    s->type = working_type;
    s->sclass = sclass;
}

void write_parameters(FUNINFO* f) {
    std::vector<SYMTAB*> parms;
    for (SYMTAB* s = f->memory_syms; s; s = s->next)
        if (s->level == 1 && s->written_as_parameter) parms.push_back(s);
    // Parameters of a class that the register lists hold are parameters all the same.
    for (SYMTAB* list : {f->scalar_syms, f->new_syms, f->pending_syms})
        for (SYMTAB* s = list; s; s = s->next)
            if (s->level == 1 && s->written_as_parameter) parms.push_back(s);
    std::stable_sort(parms.begin(), parms.end(),
                     [](const SYMTAB* a, const SYMTAB* b) { return a->depnum() < b->depnum(); });
    for (SYMTAB* s : parms) write_symbol(s);
}

void write_locals(FUNINFO* f) {
    for (SYMTAB* list : {f->scalar_syms, f->new_syms, f->pending_syms, f->memory_syms})
        for (SYMTAB* s = list; s; s = s->next) {
            if (s->level == 1 && s->written_as_parameter) continue;
            OPT_ASSERT(s->level == 2);
            write_symbol(s);
        }
}

// From here on a symbol has a number only if it was written.
void forget_indexes(FUNINFO* f) {
    for (SYMTAB* list : {f->scalar_syms, f->new_syms, f->pending_syms, f->memory_syms})
        for (SYMTAB* s = list; s; s = s->next) s->index = -1;
    for (SYMTAB* s : f->dropped_syms) s->index = -1;
}

template <class F>
void for_each_tree(FUNINFO* f, F&& visit) {
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) visit(s->first);
}

} // namespace

// ---- The function

namespace {
bool calls_are_written = false; // by the function that is written
}

void write_func_header() {
    for (const std::string& comment : currfuninfo->comments) wrasmr(IFR_COMMENT, comment.c_str(), nullptr);
    currfuninfo->comments.clear();
    wrstcr(IFR_BEGIN_FUNC, currfuninfo->begin_psn);
}

namespace {

void write_register_assignments() {
    if (register_assignments.empty()) return;
    std::reverse(register_assignments.begin(), register_assignments.end());
    wrasmr(IFR_COMMENT, "*", nullptr);
    for (const REGISTER_ASSIGNMENT& a : register_assignments) wrasmr(IFR_COMMENT, a.comment.c_str(), nullptr);
    wrasmr(IFR_COMMENT, "*", nullptr);
    register_assignments.clear();
}

void write_exception_table(FUNINFO* f) {
    if (f->eht.size() <= 1) return;
    std::vector<EHT_ENTRY> table;
    for (size_t i = 1; i < f->eht.size(); ++i) {
        EHT_ITEM& item = f->eht[i];
        if (item.cleanup) item.cleanup = prepare_tree_for_writing(insert_mandatory_casts(item.cleanup));
        EHT_ENTRY e;
        e.id = item.id;
        e.kind = item.kind;
        e.next = item.next_entry;
        e.count = item.kind == EHK_CATCH ? static_cast<uint32_t>(item.catches.size()) : 0;
        e.cleanup = item.cleanup;
        for (const EHT_CATCH& c : item.catches)
            e.catches.push_back({c.type_name, static_cast<uint32_t>(std::abs(c.label)), c.flag});
        debug_printf("EHT %u kind %u next %u\n", e.id, e.kind, e.next);
        table.push_back(std::move(e));
    }
    o_file->if_write_func_eht(table.data(), static_cast<uint32_t>(table.size()));
}

} // namespace

void finalize_ldspec_advice() {
    for (const ldspec_tuple& t : currfuninfo->code_records.ldspec_advice) {
        if (t.sym == mcall_implicit_state_symbol) continue;
        OPT_ASSERT(t.kind == 0 || t.kind == 1);
        if (t.kind == 0)
            o_file->if_write_ldspec_induct(t.id, t.word, t.step, t.type, t.sym);
        else
            o_file->if_write_ldspec_rand(t.id, t.word, static_cast<uint32_t>(t.step), t.type, t.sym);
    }
    currfuninfo->code_records.ldspec_advice.clear();
}

void write_func_body() {
    FUNINFO* f = currfuninfo;
    forget_indexes(f);
    write_parameters(f);
    wrstcr(IFR_END_ARGS, f->end_args_psn);
    write_locals(f);
    wrstcr(IFR_END_LOCALS, f->end_locals_psn);
    if (!calls_are_written) {
        o_file->if_write_func_info(IF_LEAF_FUNCTION);
        debug_printf("%s is a leaf function\n", f->name.c_str());
    }
    write_register_assignments();
    finalize_ldspec_advice();
    wrbblocks();
    write_exception_table(f);
    wrstcr(IFR_END_FUNC, f->end_psn);
    f->is_written = true;
    set_flags(f, FUN_is_processed);
    if (fdebug) o_file->if_flush();
    if (const PRAGMA* synonym = find_pragma(currfunc, PRG_FUNC_SYNONYM); synonym && !synonym->args.empty())
        unsuppress_inline_function(make_FUNINFO(skip_name_prefix(synonym->args[0].c_str())));
}

namespace {

// The object that an address is taken of, or null.
SYMTAB* addressed_object(const NODE* t) {
    const NODE* object = t->op == UAND || t->op == ARGREF ? name_of_place(static_cast<const NODE*>(t->left)) : nullptr;
    return object ? object->u.sym : nullptr;
}

// One walk over what will be written: which locals it names, which have their address taken, and whether it calls.
std::unordered_set<const SYMTAB*> survey(FUNINFO* f) {
    for (SYMTAB* list : {f->scalar_syms, f->memory_syms, f->new_syms, f->pending_syms})
        for (SYMTAB* s = list; s; s = s->next)
            if (s->level == 2) s->set_is_aliased(false);
    calls_are_written = false;
    std::unordered_set<const SYMTAB*> named; // membership only
    auto visit = [&](NODE* t) {
        if (t->op == NAME && t->u.sym->level == 2)
            named.insert(t->u.sym);
        else if (op_is_call(t->op))
            calls_are_written = true;
        else if (SYMTAB* object = addressed_object(t); object && object->level == 2)
            object->set_is_aliased(true);
    };
    for_each_tree(f, [&](NODE* tree) { for_each_node(tree, visit); });
    for (EHT_ITEM& item : f->eht) for_each_node(item.cleanup, visit);
    return named;
}

} // namespace

void drop_unused_locals() {
    FUNINFO* f = currfuninfo;
    const std::unordered_set<const SYMTAB*> named = survey(f);
    for (SYMTAB** list : {&f->scalar_syms, &f->memory_syms, &f->new_syms, &f->pending_syms})
        for (SYMTAB** link = list; *link;) {
            SYMTAB* s = *link;
            if (s->level != 2 || named.count(s)) {
                link = &s->next;
                continue;
            }
            *link = s->next;
            s->next = nullptr;
            f->dropped_syms.push_back(s);
        }
}

namespace {

// The operand that stood for the state of the machine while the function was optimized.
NODE* strip_implicit_state(NODE* t) {
    if (t->op != MCALL || !t->left) return t;
    if (is_implicit_state_argument(t->left)) {
        erase_tree(t->left);
        t->left = nullptr;
        t->op = UMCALL;
    } else if (t->left->op == COMMA && is_implicit_state_argument(t->left->right)) {
        NODE* list = t->left;
        t->left = list->left;
        erase_tree(list->right);
        erase_node(list);
    }
    return t;
}

} // namespace

void strip_implicit_states() {
    FUNINFO* f = currfuninfo;
    if (!f->has_intrinsics) return;
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) s->first = rewrite_tree(s->first, strip_implicit_state);
    for (EHT_ITEM& item : f->eht) item.cleanup = rewrite_tree(item.cleanup, strip_implicit_state);
}

namespace {

void write_code_records(const CODE_RECORDS& records) {
    for (const CODE_LOOP& l : records.loops) o_file->if_write_loop(l.id, l.outer, l.min, l.max, l.factor, l.flags);
    uint32_t id = 0;
    for (const CODE_VECTOR& v : records.vectors)
        o_file->if_write_dep_vector(v.elements.data(), id++, v.flags, static_cast<uint32_t>(v.elements.size()));
    for (const CODE_EDGE& e : records.edges) o_file->if_write_dep_edge(e.from, e.to, e.vector);
}

} // namespace

void write_function() {
    write_func_header();
    write_code_records(currfuninfo->code_records);
    write_func_body();
}

// ---- The end of the unit

namespace {

void mark_names_of_initializers() {
    for (SYMTAB* s = global_symbols; s; s = s->next) {
        if (!s->autoinit) continue;
        for (NODE* item : *s->autoinit)
            for_each_node(item, [](NODE* t) {
                if (t->op != NAME || !t->u.sym) return;
                t->u.sym->cqual |= CQ_REFERENCED;
                if (t->u.sym->is_function()) set_flags(make_FUNINFO(t->u.sym), FUN_is_referenced);
            });
    }
}

// Whether the definition may be dropped when nothing in the output needs it.
void settle_retention(SYMTAB* s) {
    const bool is_function = s->is_function();
    const bool candidate =
        is_function ? no_outside_callers || s->sclass == SC_STATIC : no_outside_writers && s->sclass == SC_STATIC;
    if (s->retention == I_SYMTAB::RETENTION_KEEP) return;
    if (s->retention == I_SYMTAB::RETENTION_BY_USE && !candidate) return;
    if (is_function) {
        FUNINFO* f = make_FUNINFO(s);
        constexpr uint64_t needed =
            FUN_is_referenced | FUN_is_processed | FUN_is_anonymous | FUN_is_interrupt | FUN_is_main;
        if (function_is_defined(f) && !TEST_FLAG(f, needed)) s->retention = I_SYMTAB::RETENTION_DROP;
    } else if (!(s->cqual & CQ_REFERENCED)) {
        s->retention = I_SYMTAB::RETENTION_DROP;
    }
}

void settle_global(SYMTAB* s) {
    if (s->is_clustered) s->sclass = s->sclass == SC_EXTDEF ? SC_CLUSTERED_EXTDEF : SC_CLUSTERED;
    revert_symbol_type(s);
    if (s->dynamic_init) {
        auto* pragma = new PRAGMA;
        pragma->kind = PRG_FS_DYNAMIC_INIT;
        pragma->next = s->pragma;
        s->pragma = pragma;
    }
    if (s->sclass == SC_EXTDEF || s->sclass == SC_STATIC) settle_retention(s);
    // A definition that was not written is a definition no more.
    if (s->location && s->is_function() && !make_FUNINFO(s)->is_written) s->location = 0;
}

} // namespace

void write_end_of_unit() {
    mark_names_of_initializers();
    for (SYMTAB* s = global_symbols; s; s = s->next) settle_global(s);
    for (SYMTAB* s = global_symbols; s; s = s->next) {
        if (!s->autoinit) {
            if (!s->is_function()) s->location = 0;
            continue;
        }
        o_file->if_write_init(s);
        for (NODE*& item : *s->autoinit) item = wrtree(insert_mandatory_casts(item));
    }
}
