// Globals: who uses them how, and which of them never change.
//
// Needs: the call graph. Leaves: the uses of every global in its `cqual`, and `file_symbols_are_known`; initial values
// of those that nothing writes.
// Sound because every use is entered anew from the functions that are left, from clean-up code, from initializers and
// from assembly text, and a symbol that others can name, that is volatile or that something sets ahead of `main` counts
// as used in every form. A value that the linker or a pragma may replace is not taken (`initial_value_may_be_taken`).

#include "OPT5/ipa/progana.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ipa/uses.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <algorithm>
#include <cstring>

namespace {

constexpr uint16_t ALL_USES = CQ_REFERENCED | CQ_WRITTEN | CQ_ALIASED;

bool is_only_read(const SYMTAB* s) { return (s->cqual & ALL_USES) == CQ_REFERENCED; }
bool is_data_definition(const SYMTAB* s) {
    return s->sclass == SC_EXTDEF || s->sclass == SC_STATIC || s->sclass == SC_EXTERN;
}

void use(SYMTAB* sym, uint16_t bits) {
    if (sym && sym->level == 0 && !sym->is_function()) sym->cqual |= bits;
}

// As the scan of a definition enters uses: a written object, an address, a name.
void rescan_symbol_uses(NODE* tree) {
    for_each_node(tree, [](NODE* t) {
        switch (t->op) {
        case NAME: use(t->u.sym, CQ_REFERENCED); return;
        case UMULT:
        case STREF: use(object_name_if_known(t), CQ_REFERENCED); return;
        case UAND:
        case ARGREF:
            if (const NODE* object = name_of_place(t->left))
                use(object->u.sym, t->op == UAND ? CQ_REFERENCED | CQ_ALIASED : CQ_REFERENCED);
            break;
        default: break;
        }
        for_each_write_of_node(t, [](const WRITE& w) {
            if (w.place) use(object_name_if_known(object_of_place(w.place)), CQ_REFERENCED | CQ_WRITTEN);
        });
    });
}

} // namespace

bool assembly_names(const SYMTAB* sym) {
    return std::any_of(program.assembly.begin(), program.assembly.end(),
                       [sym](const std::string& text) { return text.find(sym->name) != std::string::npos; });
}

void rescan_uses() {
    for (SYMTAB* s = global_symbols; s; s = s->next)
        if (s->retention != I_SYMTAB::RETENTION_KEEP && !s->is_function()) s->cqual &= static_cast<uint16_t>(~ALL_USES);
    for (FUNLIST* p = cg_list; p; p = p->next) {
        for (BBLK* bb = p->fun->bb_list; bb; bb = bb->dflink)
            for (LIST* stmt = bb->statements; stmt; stmt = stmt->rest) rescan_symbol_uses(stmt->first);
        for (EHT_ITEM& item : p->fun->eht)
            if (item.kind == EHK_CLEANUP) rescan_symbol_uses(item.cleanup);
    }
    for (SYMTAB* s = global_symbols; s; s = s->next) {
        if (!s->autoinit) continue;
        for (NODE* item : *s->autoinit)
            if (item->op != ENDINIT) rescan_symbol_uses(item);
        const bool one_value = s->autoinit->size() == 2 && s->type->is_scalar(); // the value and the end
        if (!s->init_value && one_value && initial_value_may_be_taken(s) && expr_is_constant(s->autoinit->front()))
            s->init_value = copy_tree(s->autoinit->front());
    }
    if (program.assembly.empty()) return;
    for (SYMTAB* s = global_symbols; s; s = s->next)
        if (!s->is_function() && assembly_names(s)) s->cqual |= ALL_USES;
}

// ---- Constants

namespace {

void forget_value(SYMTAB* s) {
    erase_tree(s->init_value);
    s->init_value = nullptr;
}

void make_constant(SYMTAB* s) {
    if (symbol_is_immutable(s)) return;
    const std::string value = tree_to_infix(s->init_value);
    debug_printf("\nMaking unmodified global variable CONST: %s = %s\n", s->name, value.c_str());
    info_printf("\nMaking unmodified global variable CONST:\n\t%s = %s\n", s->name, value.c_str());
    s->type = tp->mk_qual(s->type, QUAL_CONST);
}

void analyze_symbol(SYMTAB* s) {
    if (!s->type->is_scalar()) {
        s->cqual |= ALL_USES;
        forget_value(s);
        return;
    }
    if (s->sclass != SC_STATIC && !no_outside_writers && is_data_definition(s)) s->cqual |= ALL_USES;
    if (!is_data_definition(s)) return;
    if (s->type->is_volatile() || s->dynamic_init) s->cqual |= ALL_USES;
    if (!is_only_read(s)) return;
    if (!initial_value_may_be_taken(s)) {
        forget_value(s);
        return;
    }
    if (!s->init_value) {
        if (s->sclass == SC_STATIC || no_outside_writers) {
            s->cqual |= CQ_ALIASED;
            info_printf("\nVariable has no explicitly assigned value:\n\t%s\n", s->name);
        }
        return;
    }
    make_constant(s);
}

// An external declaration of the same object behind a definition, which is listed in its place.
bool has_declaration_twin(const SYMTAB* s) {
    if (s->sclass != SC_EXTDEF) return false;
    for (const SYMTAB* other = s->next; other; other = other->next)
        if (other->sclass == SC_EXTERN && other->name[0] && other->name[1] == s->name[1] &&
            !std::strcmp(other->name, s->name) && compatible_types(other->type, s->type, false))
            return true;
    return false;
}

template <class F>
void list_globals(const char* heading, F&& belongs) {
    info_printf("%s", heading);
    for (bool statics : {true, false})
        for (const SYMTAB* s = global_symbols; s; s = s->next) {
            if (s->is_function() || !is_data_definition(s) || (s->sclass == SC_STATIC) != statics) continue;
            if (!belongs(s) || has_declaration_twin(s)) continue;
            info_printf("\t%s\n", s->name);
        }
    info_printf("\n");
}

} // namespace

void analyze_global_symbols() {
    if (!cg_list) set_up_and_build_call_graph();
    if (!cg_list) return;
    for (SYMTAB* s = global_symbols; s; s = s->next) {
        if (s->is_function()) continue;
        analyze_symbol(s);
        if (s->cqual & (CQ_MARKS_FUNCTION | CQ_GLOBAL_REGISTER)) s->cqual &= static_cast<uint16_t>(~CQ_ALIASED);
    }
    file_symbols_are_known = true;
    if (write_opt_info < 2) return;
    list_globals("Global variable is not referenced in this file:\n",
                 [](const SYMTAB* s) { return !(s->cqual & CQ_REFERENCED); });
    list_globals("Address of global variable is never taken:\n",
                 [](const SYMTAB* s) { return (s->cqual & 0xA010) == CQ_REFERENCED; });
    list_globals("Global variable is not modified in this file:\n", is_only_read);
}

void report_constant_globals() {
    bool any = false;
    for (const SYMTAB* s = global_symbols; s; s = s->next) {
        if (!(s->cqual & CQ_REFERENCED) || s->is_function() || !is_data_definition(s)) continue;
        const bool immutable = symbol_is_immutable(s);
        if (s->sclass != SC_STATIC && !no_outside_writers && !immutable) continue;
        if (s->type->is_volatile() || !s->type->is_scalar()) continue;
        debug_printf("\tCQ_ALIASED=%d, CQ_WRITTEN=%d, sym: %s", (s->cqual & CQ_ALIASED) != 0,
                     (s->cqual & CQ_WRITTEN) != 0, s->name);
        if (immutable && s->init_value) {
            const std::string value = tree_to_infix(s->init_value);
            debug_printf(" = %s", value.c_str());
            if (!any) info_printf("Variable's value is constant in this file:\n");
            any = true;
            info_printf("    %s = %s\n", s->name, value.c_str());
        }
        debug_printf("\n");
    }
}
