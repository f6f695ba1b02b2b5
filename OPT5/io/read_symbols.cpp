// Symbols, initializers and pragmas as they are read.

#include "OPT5/io/read_client.h"

#include "IFILE/ifile.h"
#include "OPT5/io/write.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/grammar.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/target.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"

#include <cstring>

namespace {

constexpr uint16_t CQ_FROM_INPUT = 0x19FF;
constexpr uint16_t CQ_TOP = CQ_ALIASED | CQ_WRITTEN | CQ_REFERENCED;

uint16_t file_level_cqual(uint16_t cqual, const TYPE* type) {
    const uint16_t kept = cqual & CQ_FROM_INPUT;
    if (type->is_const() || opt_level() >= 3) return kept;
    return kept | (cqual & (CQ_GLOBAL_REGISTER | CQ_MARKS_FUNCTION) ? CQ_WRITTEN | CQ_REFERENCED : CQ_TOP);
}

void note_function_symbol(SYMTAB* sym) {
    FUNINFO* f = make_FUNINFO(sym);
    f->symbol = sym;
    const bool open = sym->retention == I_SYMTAB::RETENTION_BY_USE && sym->sclass != SC_STATIC && !no_outside_callers;
    if (open) set_flags(f, FUN_is_referenced);
}

// What is kept is so for somebody outside: he may call the function, or read, write and point to the object.
void open_to_outside(SYMTAB* sym) {
    if (sym->retention != I_SYMTAB::RETENTION_KEEP) return;
    sym->cqual |= CQ_TOP;
    if (sym->is_function()) set_flags(make_FUNINFO(sym), FUN_is_referenced);
}

} // namespace

I_SYMTAB* OPT_CLIENT::cl_symbol_create(const char* name, TYPE* type, TYPE* second_type, uint64_t size, uint32_t align,
                                       uint32_t value, int sclass, uint16_t cqual, PSN* psn, uint32_t location,
                                       uint32_t option_set, I_SYMTAB::RETENTION_POLICY retention) {
    const bool file_level = lex == 0;
    if (!type) type = tp->void_t;
    if (option_set >= all_option_sets.size()) option_set = 0;
    SYMTAB* sym = file_level && max_threads > 0 ? new GLOBAL_SYM : new SYMTAB;
    sym->name = safestrdup(name);
    sym->type = normalized_value_type(type);
    sym->orig_type = type;
    sym->cpp_type = second_type;
    sym->size = size;
    sym->align = align;
    sym->value = value;
    sym->sclass = static_cast<int8_t>(sclass);
    sym->cqual = file_level ? file_level_cqual(cqual, type) : cqual & CQ_FROM_INPUT;
    sym->psn = psn;
    sym->location = location;
    sym->option_set = option_set;
    sym->retention = retention;
    sym->level = lex;
    sym->written_as_parameter = lex == 1;
    if (!file_level) {
        sym->set_depnum(next_depnum++);
        switch (sclass) {
        case SC_AUTO:
        case SC_EXTDEF:
        case SC_STATIC:
        case SC_REGISTER:
        case SC_EXTERN:
        case SC_DROPPED:
        case SC_MEMORY:
        case SC_PARM:
        case SC_REGISTER2:
        case SC_MEMORY27: break;
        default: refuse_input("local symbol " + std::string(name) + " has storage class " + std::to_string(sclass));
        }
    }
    if (sclass == SC_MEMORY27) {
        sym->sclass = SC_MEMORY;
        sym->flags = SC_MEMORY27;
        if (currfuninfo && !file_level) {
            set_flags(currfuninfo, FUN_cannot_beta | FUN_cannot_suppress);
            forbid_inlining(currfuninfo, "a local variable of it has to stay in its frame");
        }
    }
    if (sym->type->is_func()) note_function_symbol(sym);
    sym_def(sym);
    if (file_level && sym->cqual & CQ_GLOBAL_REGISTER) reserve_global_register(name);
    if (!file_level) {
        if (sym->sclass == SC_DROPPED) currfuninfo->dropped_syms.push_back(sym);
        LS::add_symbol(sym);
    }
    return sym;
}

void OPT_CLIENT::cl_symbol_def(I_SYMTAB* isym) {
    auto* sym = static_cast<SYMTAB*>(isym);
    open_to_outside(sym); // its pragmas are known now, and they may say that it is kept
    read_listener->symbol_is_complete(sym);
}

void OPT_CLIENT::cl_symbol_init(I_SYMTAB* isym, std::vector<BASE_NODE*>& list) {
    auto* sym = static_cast<SYMTAB*>(isym);
    if (sym->autoinit) refuse_input("symbol " + std::string(sym->name) + " is initialized twice");
    sym->autoinit = new std::vector<NODE*>;
    for (BASE_NODE* item : list) {
        refuse_if_faulty(grammar_fault_of_initializer_item(static_cast<NODE*>(item)));
        sym->autoinit->push_back(expr_cleanup(static_cast<NODE*>(item)));
    }
    for (NODE* item : *sym->autoinit)
        if (item->op != ENDINIT) read_listener->initializer_item(item);
    const bool fixed = !(sym->cqual & (CQ_ALIASED | CQ_WRITTEN)) && sym->type->is_scalar() && sym->autoinit->size() == 2;
    if (fixed && initial_value_may_be_taken(sym) && expr_is_constant(sym->autoinit->front())) sym->init_value = copy_tree(sym->autoinit->front());
}

void OPT_CLIENT::cl_merge_type_defs() {
    // Registered types hang in a tree below the root; a union is always a user type of the root itself.
    any_unions_in_program = false;
    for (const auto& [name, types] : TYPE_PKG::root_type->based)
        for (const TYPE* t : types)
            if (t->kind == TYPE::tpk_union) any_unions_in_program = true;
}

// ---- The state that machine operations share

SYMTAB* mcall_implicit_state_symbol = nullptr;
NODE* mcall_implicit_state_tree = nullptr;

namespace {
constexpr char IMPLICIT_STATE[] = "__MCALL_implicit_state__";
}

void OPT_CLIENT::cl_preprocess_statics() {
    SYMTAB* sym = nullptr;
    for (SYMTAB* s = global_symbols; s; s = s->next)
        if (!std::strcmp(s->name, IMPLICIT_STATE) && s->type->is_ikind(TYPE::ik_int)) sym = s;
    if (!sym) {
        sym = max_threads > 0 ? new GLOBAL_SYM : new SYMTAB;
        sym->name = safestrdup(IMPLICIT_STATE);
        sym->type = sym->orig_type = tp->int_t;
        sym->size = tp->int_t->size;
        sym->align = tp->int_t->align;
        sym->sclass = SC_EXTDEF;
        sym->retention = I_SYMTAB::RETENTION_DROP;
        SYMTAB** tail = &global_symbols;
        while (*tail) tail = &(*tail)->next;
        *tail = sym;
        o_file->if_enter_global(sym);
    }
    mcall_implicit_state_symbol = sym;
    NODE* address = maketree(UAND, mk_NAME(sym), nullptr, tp->mk_ptr(sym->type));
    mcall_implicit_state_tree = maketree(UMULT, address, nullptr, sym->type);
}

bool is_implicit_state_argument(const NODE* tree) {
    if (!tree || tree->op != ARGREF) return false;
    const NODE* object = tree->left;
    if (object && object->op == UMULT && !object->right) object = object->left;
    if (object && object->op == UAND) object = object->left;
    return object && object->op == NAME && object->u.sym == mcall_implicit_state_symbol;
}

// ---- Pragmas

namespace {

bool first_arg_is(const PRAGMA& p, const char* text) { return !p.args.empty() && p.args[0] == text; }

void apply_visibility_to_object(SYMTAB* sym, const PRAGMA& pragma) {
    if (!first_arg_is(pragma, "default") && !first_arg_is(pragma, "extern") && !first_arg_is(pragma, "protected")) return;
    sym->cqual |= CQ_TOP;
    no_outside_writers = 0;
}

void note_synonym(FUNINFO* f, const PRAGMA& pragma) {
    if (pragma.args.empty()) return;
    FUNINFO* other = make_FUNINFO(skip_name_prefix(pragma.args[0].c_str()));
    set_flags(f, FUN_cannot_beta);
    set_flags(other, FUN_cannot_beta);
    if (pragma.args.size() < 2 || pragma.args[1] != "1") return;
    set_flags(f, FUN_is_processed);
    set_flags(other, FUN_is_referenced);
    fileinfo.synonyms.push_back(f);
    if (f->symbol && f->symbol->type->is_func()) f->return_type = f->symbol->type->return_type();
}

} // namespace

void OPT_CLIENT::apply_function_pragma(SYMTAB* sym, const PRAGMA& pragma) {
    FUNINFO* f = make_FUNINFO(sym);
    if (func_is_nonconforming(sym) && pragma.kind != PRG_FUNC_CANNOT_INLINE) return;
    switch (pragma.kind) {
    case PRG_FUNC_NEVER_RETURNS: set_flags(f, FUN_never_returns); break;
    case PRG_FUNC_CANNOT_INLINE:
    case PRG_WEAK:
        set_flags(f, FUN_cannot_suppress);
        forbid_inlining(f, pragma.kind == PRG_WEAK ? "it is weak, and another definition may take its place"
                                                   : "#pragma FUNC_CANNOT_INLINE says so");
        break;
    case PRG_FUNC_NO_GLOBAL_ASG: set_flags(f, FUN_no_global_asg); break;
    case PRG_FUNC_NO_IND_ASG: set_flags(f, FUN_no_ind_asg); break;
    case PRG_FUNC_IS_PURE: set_flags(f, FUN_is_pure_fun); break;
    case PRG_FUNC_IS_SYSTEM: set_flags(f, FUN_is_SYSTEM); break;
    case PRG_SRC_LANGUAGE:
        if (!first_arg_is(pragma, "C++")) break;
        set_flags(f, FUN_is_cpp);
        init_FUNINFO_flags(f, 0);
        break;
    case PRG_FUNC_IS_NONCONFORMING:
        add_nonconforming_function(sym);
        clear_flags(f, ~uint64_t(0));
        break;
    case PRG_SYM_VISIBILITY: {
        const bool open = first_arg_is(pragma, "default") || first_arg_is(pragma, "extern");
        if (open) {
            set_flags(f, FUN_is_referenced);
            forbid_inlining(f, "it is visible outside, where another definition may take its place");
        }
        if (!open && !first_arg_is(pragma, "protected")) break;
        set_flags(f, FUN_is_cg_root | FUN_cannot_beta | FUN_is_referenced | FUN_cannot_suppress);
        no_outside_callers = 0;
        break;
    }
    case PRG_FUNC_ESPEC:
        if (pragma.args.size() < 2 || pragma.args[1] != "0") {
            set_flags(f, FUN_cannot_suppress);
            forbid_inlining(f, "it has an exception specification");
        }
        break;
    case PRG_FUNC_SYNONYM: note_synonym(f, pragma); break;
    default: break;
    }
}

void OPT_CLIENT::cl_pragma(I_SYMTAB* isym, PRAGMA* pragma) {
    if (pragma->kind == PRG_OPT_OVERRIDE) refuse_input("pragma OPT_OVERRIDE must be resolved before the optimizer runs");
    auto* sym = static_cast<SYMTAB*>(isym);
    if (!sym && lex == 0) {
        o_file->if_write_pragma(pragma);
        debug_printf("PRAGMA %s", pragma->name());
        for (const std::string& arg : pragma->args) debug_printf(" %s", arg.c_str());
        debug_printf("\n");
        delete pragma;
        return;
    }
    if (!sym) {
        NODE* statement = ::new_node(PPRAGMA, tp->void_t);
        statement->pragma = pragma;
        statement->ls = LS::current();
        append(statement, nullptr);
        return;
    }
    if (pragma->kind == PRG_FS_DYNAMIC_INIT) {
        sym->dynamic_init = true;
        delete pragma;
        return;
    }
    pragma->next = sym->pragma;
    sym->pragma = pragma;
    if (sym->is_function())
        apply_function_pragma(sym, *pragma);
    else if (pragma->kind == PRG_SYM_VISIBILITY)
        apply_visibility_to_object(sym, *pragma);
}
