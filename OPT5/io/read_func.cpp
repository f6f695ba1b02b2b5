// Functions as they are read: statements, scopes, labels, the exception table, and the clean-up at the function's end.

#include "OPT5/io/read_client.h"

#include "IFILE/ifile.h"
#include "OPT5/io/write.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/grammar.h"
#include "OPT5/ir/profile.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"
#include "UTIL/abort.h"

#include <memory>
#include <algorithm>
#include <climits>

int output_index = 0;

namespace {
// Statements without an intrinsic are simplified as they are read, while they are in the cache. The others wait for the end
// of the function, which decides what their intrinsics are.
constexpr uint16_t IS_SIMPLIFIED = 1;
} // namespace

READ_LISTENER* read_listener = nullptr;

IF_CLIENT* opt_client(READ_LISTENER& listener) {
    static OPT_CLIENT client;
    read_listener = &listener;
    return &client;
}

void refuse_input(const std::string& text) {
    const std::string where = currfunc ? std::string("function ") + currfunc->name + ": " : std::string();
    throw if_error(where + text, static_cast<long>(i_file ? i_file->if_tell() : 0));
}

void refuse_if_faulty(const std::string& fault) {
    if (!fault.empty()) refuse_input(fault);
}

// A node without a type number is of no type to the optimizer, which asks every node for one.
BASE_NODE* OPT_CLIENT::new_node(int op, TYPE* type) { return ::new_node(op, type ? type : tp->void_t); }

void OPT_CLIENT::drop_tree(BASE_NODE* tree) { erase_tree(static_cast<NODE*>(tree)); }

void OPT_CLIENT::cl_option_set(unsigned id, const std::vector<std::string>& options) {
    icode_optionlist.push_back(OPTION_SET{id, options});
}

// ---- Statements

void OPT_CLIENT::append(NODE* tree, PSN* psn) { currfuninfo->statements = mkelist(tree, currfuninfo->statements, psn); }

void OPT_CLIENT::cl_expr(BASE_NODE* base, PSN* psn) {
    if (!base) return;
    auto* tree = static_cast<NODE*>(base);
    if (lex == 0) refuse_input("a statement stands outside a function");
    refuse_if_faulty(grammar_fault_of_statement(tree));
    note_references(tree);
    // What the head of a counted loop evaluates stays as a statement ahead of the loop's label.
    if (tree->op == LOOP && tree->left && tree_has_side_effects(tree->left)) {
        NODE* start = tree->left;
        tree->left = nullptr;
        cl_expr(start, psn);
    }
    tree = expr_cleanup(tree);
    if (tree->op == LABELDEF) note_label(static_cast<uint32_t>(tree->lbl->index)); // the head of a counted loop
    LS::initialize_scopes_and_ptrs_from_tree(tree);
    const bool waits = currfuninfo->has_intrinsics || tree->op == LABELDEF;
    append(waits ? tree : simp_tree(tree, nullptr), psn);
    if (!waits) currfuninfo->statements->flag1 = IS_SIMPLIFIED;
}

// What the end of the function has to look up; noted while the tree is at hand.
void OPT_CLIENT::note_references(const NODE* tree) {
    for_each_node(const_cast<NODE*>(tree), [this](const NODE* t) {
        if (t->op == LABELREF) labels_named.push_back(t->label_id());
        if (t->eh_entry()) has_exception_entries = true;
    });
}

void OPT_CLIENT::note_label(uint32_t label) {
    if (label > INT_MAX) refuse_input("label number " + std::to_string(label) + " is out of range");
    if (!labels.insert(label).second) refuse_input("label " + std::to_string(label) + " is defined twice");
}

void OPT_CLIENT::cl_label(uint32_t label) {
    if (lex == 0) refuse_input("a label stands outside a function");
    note_label(label);
    // A branch to the label that follows at once does nothing.
    LIST*& statements = currfuninfo->statements;
    if (statements && statements->first->op == BRANCH && statements->first->left &&
        statements->first->left->op == LABELREF && statements->first->left->u.lval == INT65(label)) {
        initialize_the_profiling_state(statements->first);
        LIST* cell = statements;
        statements = cell->rest;
        erase_tree(cell->first);
        delete cell;
    }
    auto* lbl = new LBL;
    lbl->index = static_cast<int32_t>(label);
    append(mk_LABELDEF(lbl), nullptr);
}

void OPT_CLIENT::cl_inline_asm(const char* text, PSN* psn) {
    if (lex == 0) {
        read_listener->assembly(text);
        wrasmr(IFR_ASM, text, psn);
    } else
        append(mk_ASM(IFR_ASM, text), psn);
}

void OPT_CLIENT::cl_comment(const char* text) {
    if (text[0] == '*') return;
    if (lex == 0)
        wrasmr(IFR_COMMENT, text, nullptr);
    else
        append(mk_ASM(IFR_COMMENT, text), nullptr);
}

// ---- Scopes

void OPT_CLIENT::make_ptr_entries(const SYMTAB* outer) {
    for (SYMTAB* s = currfuninfo->new_syms; s && s != outer; s = s->next) find_or_make_PTR_entry(s);
}

void OPT_CLIENT::close_scope(PSN* psn) {
    make_ptr_entries(open_scopes.back().outer);
    open_scopes.pop_back();
    LS::close(psn, currfunc, 0);
}

void OPT_CLIENT::cl_begin_func(I_SYMTAB* isym, PSN* psn) {
    auto* sym = static_cast<SYMTAB*>(isym);
    if (lex != 0) refuse_input("a function begins inside another");
    if (!sym->is_function()) refuse_input(std::string("a function begins with symbol ") + sym->name + ", which is none");
    currfunc = sym;
    FUNINFO* f = currfuninfo = make_FUNINFO(sym);
    if (f->bb_list) refuse_input("the function is defined twice");
    f->symbol = sym;
    f->return_type = sym->type->getr(TYPE::tpk_func)->return_type();
    f->begin_psn = psn;
    erase_tree_list(f->statements);
    f->statements = nullptr;
    f->new_syms = f->pending_syms = f->memory_syms = f->scalar_syms = nullptr;
    f->no_calls = true;
    open_scopes.clear();
    labels.clear();
    labels_named.clear();
    has_exception_entries = false;
    next_depnum = 0;
    lex = 1;
    if (sym->cqual & CQ_INTERRUPT) set_flags(f, FUN_is_interrupt);
    LS::init(psn, sym, 0);
    LS::open(psn, sym, 0);
    open_scopes.push_back({psn, nullptr});
    if (sym->cqual & CQ_INLINE && sym->sclass == SC_STATIC && TEST_FLAG(f, FUN_cannot_suppress)) unsuppress_inline_function(f);
    dump_function_header();
    initialize_the_profiling_state(nullptr);
}

void OPT_CLIENT::cl_end_args(PSN* psn) {
    if (lex != 1) refuse_input("the end of the arguments is out of place");
    currfuninfo->end_args_psn = psn;
    output_index = 0;
    read_listener->arguments_are_complete();
    make_ptr_entries(nullptr);
    ++lex;
    open_scopes.push_back({psn, currfuninfo->new_syms});
    LS::open(psn, currfunc, 0);
}

void OPT_CLIENT::cl_end_locals(PSN* psn) {
    if (lex < 2) refuse_input("the end of the locals is out of place");
    currfuninfo->end_locals_psn = psn;
}

void OPT_CLIENT::cl_begin_block(PSN* psn) {
    if (lex < 2) refuse_input("a block begins out of place");
    ++lex;
    ++currfuninfo->scope_blocks;
    open_scopes.push_back({psn, currfuninfo->new_syms});
    LS::open(psn, currfunc, 0);
}

void OPT_CLIENT::cl_end_block(PSN* psn) {
    if (lex < 3) refuse_input("a block ends that was not begun");
    --lex;
    close_scope(psn);
}

// ---- Exception table

bool OPT_CLIENT::cl_func_eht(EHT_ENTRY* entries, uint32_t count) {
    if (lex == 0) refuse_input("an exception table stands outside a function");
    FUNINFO* f = currfuninfo;
    if (!f->eht.empty()) refuse_input("the function has two exception tables");
    f->eht.resize(size_t(count) + 1);
    int32_t clauses = 0;
    for (uint32_t i = 0; i < count; ++i) {
        const EHT_ENTRY& e = entries[i];
        if (e.id == 0 || e.id > count || f->eht[e.id].id) refuse_input("exception entry " + std::to_string(e.id) + " is out of place");
        if (e.next > count) refuse_input("exception entry " + std::to_string(e.id) + " leads to entry " + std::to_string(e.next));
        EHT_ITEM& item = f->eht[e.id];
        item.id = e.id;
        item.kind = e.kind;
        item.next_entry = e.next;
        if (e.cleanup) {
            refuse_if_faulty(grammar_fault_of_statement(static_cast<NODE*>(e.cleanup)));
            note_references(static_cast<NODE*>(e.cleanup));
            item.cleanup = expr_cleanup(static_cast<NODE*>(e.cleanup));
            LS::initialize_scopes_and_ptrs_from_tree(item.cleanup);
        }
        for (const I_CATCH_ENTRY& c : e.catches) item.catches.push_back({c.type_name, c.label, c.flag, ++clauses});
    }
    return true;
}

// ---- The end of a function

namespace {

// Locals of inner blocks join the function's own, and may be assigned where the optimizer moves their definition.
void flatten_levels(FUNINFO* f) {
    for (SYMTAB* s = f->new_syms; s; s = s->next) {
        if (s->level < 3) continue;
        s->level = 2;
        s->type = tp->remove_known_qual(s->type, QUAL_CONST);
    }
}

void count_symbol_indexes(FUNINFO* f) {
    f->next_symbol_index = 1;
    for (const SYMTAB* s = f->new_syms; s; s = s->next) f->next_symbol_index = std::max(f->next_symbol_index, s->index + 1);
    for (const SYMTAB* s : f->dropped_syms) f->next_symbol_index = std::max(f->next_symbol_index, s->index + 1);
}

template <class F> void for_each_raw_tree(FUNINFO* f, F&& visit) {
    for (LIST* s = f->statements; s; s = s->rest) visit(s->first);
    for (EHT_ITEM& item : f->eht)
        if (item.cleanup) visit(item.cleanup);
}

void restate_intrinsics(FUNINFO* f) {
    if (!f->has_cqual10_name) return;
    for_each_raw_tree(f, [](NODE* tree) {
        for_each_node(tree, [](NODE* t) {
            if (t->op != ICALL) return;
            const BIF* bif = find_BIF_descriptor(t->u.name);
            if (bif && bif->has(IS_MCALL_FOR_ONE_STAGE)) t->op = MCALL;
        });
    });
}

void simplify_raw_statements(FUNINFO* f) {
    for (LIST* s = f->statements; s; s = s->rest) {
        if (s->flag1 == IS_SIMPLIFIED) {
            s->flag1 = 0;
            continue;
        }
        if (f->has_intrinsics)
            s->first = rewrite_tree(s->first, [](NODE* t) { return op_is_intrinsic(t->op) ? fix_BIF_types(t) : t; });
        s->first = simp_tree(s->first, nullptr);
    }
}

} // namespace

// Every label that a statement or a catch clause names must be defined in the function, and every exception entry that a
// call names must stand in the table. A function without a table has no entries.
void OPT_CLIENT::check_references() {
    FUNINFO* f = currfuninfo;
    auto check_label = [this](int64_t label) {
        if (!labels.count(static_cast<uint32_t>(label))) refuse_input("label " + std::to_string(label) + " is not defined");
    };
    for (uint32_t label : labels_named) check_label(label);
    for (const EHT_ITEM& item : f->eht)
        for (const EHT_CATCH& c : item.catches) check_label(c.label);
    if (!has_exception_entries) return;
    const size_t entries = f->eht.size();
    for_each_raw_tree(f, [=](NODE* tree) {
        for_each_node(tree, [=](NODE* t) {
            if (!op_is_call(t->op)) return;
            if (entries <= 1) t->set_eh_entry(0);
            if (t->eh_entry() >= std::max<size_t>(entries, 1))
                refuse_input("a call names exception entry " + std::to_string(t->eh_entry()));
        });
    });
}

// A structure returned through a hidden pointer: the copy of that parameter never changes and is never null.
void OPT_CLIENT::add_return_pointer_assertion() {
    FUNINFO* f = currfuninfo;
    if (!f->return_type->is_void() || !find_pragma(currfunc, PRG_FUNC_RET_BY_CCTOR)) return;
    LIST* prolog = last_cell(f->statements); // the first statement of the source
    if (!prolog) return;
    NODE* copy = prolog->first;
    while (copy->op == PCOMMA || copy->op == COMMA) copy = copy->left;
    if (copy->op != ASG || copy->left->op != NAME || copy->right->op != NAME) return;
    SYMTAB *local = copy->left->u.sym, *parm = copy->right->u.sym;
    if (local->level != 2 || parm->level != 1 || parm->depnum() != 0 || std::string(local->name) != parm->name) return;
    if (!local->type->is_pointer() || !local->type->type_pointed_to()->is_csu()) return;
    local->type = tp->mk_qual(local->type, QUAL_CONST);
    parm->type = tp->mk_qual(parm->type, QUAL_CONST);
    f->ret_by_cctor_sym = local;
    NODE* test = maketree(NEQ, mk_NAME(local), coerce_to_type(local->type, mk_ICON(INT65(0), tp->long_t)), tp->int_t, copy->ls);
    NODE* fact = maketree(NASSERT, test, nullptr, tp->int_t, copy->ls);
    f->has_nasserts = true;
    LIST* cell = mkelist(fact, nullptr, prolog->psn);
    if (prolog == f->statements) {
        cell->rest = prolog;
        f->statements = cell;
        return;
    }
    LIST* second = f->statements;
    while (second->rest != prolog) second = second->rest;
    cell->rest = prolog;
    second->rest = cell;
}

void OPT_CLIENT::cl_end_func(PSN* psn) {
    if (lex != 2) refuse_input(lex > 2 ? "the function ends inside a block" : "the function ends before its locals");
    FUNINFO* f = currfuninfo;
    functions.push_back(currfunc);
    while (!open_scopes.empty()) close_scope(psn);
    LS::close(psn, currfunc, 0);
    f->end_psn = psn;
    flatten_levels(f);
    count_symbol_indexes(f);
    sym_split(f);
    check_references();
    if (setjmp_is_named)
        for_each_raw_tree(currfuninfo, [](const NODE* t) { currfuninfo->saves_environment |= calls_setjmp(t); });
    lex = 0;
    restate_intrinsics(f);
    simplify_raw_statements(f);
    add_return_pointer_assertion();
    read_listener->function_is_complete();
}
