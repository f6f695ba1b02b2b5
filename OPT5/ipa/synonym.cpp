// Functions that only pass their parameters on to another function of the same type.
//
// Needs: the statements of the function as a list, the last one first. Leaves: the statements as they are, and a pragma
// that names the function called.
// Sound because the body is a call with the function's own parameters in their order and a return of its result, so
// that a caller cannot tell one from the other but by address: pragmas that say how a function is called or placed, and
// groups of the linker that differ, keep the two apart.

#include "OPT5/ipa/progana.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/bif.h"

#include <set>

namespace {

std::set<std::string> synonym_targets; // without prefix, as pragmas name them

const PRAGMA* comdat_group(const SYMTAB* sym) { return find_pragma(sym, PRG_COMDAT_GROUP); }

// Pragmas that say nothing of how the function is called or placed.
bool pragmas_allow_synonyms(const SYMTAB* sym) {
    for (const PRAGMA* p = sym->pragma; p; p = p->next) switch (p->kind) {
        case PRG_SRC_LANGUAGE:
        case PRG_COMDAT_GROUP:
        case PRG_FUNC_NUM_CALLED: break;
        default: return false;
        }
    return true;
}

bool groups_agree(const SYMTAB* a, const SYMTAB* b) {
    const PRAGMA *p = comdat_group(a), *q = comdat_group(b);
    if (!p || !q) return p == q;
    return p->args == q->args;
}

bool symbol_is_protected(const SYMTAB* sym) {
    const PRAGMA* p = symbol_has_pragma(sym, PRG_SYM_VISIBILITY);
    return p && !p->args.empty() && p->args[0] == "protected";
}

bool symbol_is_outside_accessible(const SYMTAB* sym) { return sym->sclass == SC_EXTDEF || sym->sclass == SC_EXTERN; }

// The statements stand last first.
const NODE* nth_from_end(const LIST* list, int n) {
    while (n--) list = list->rest;
    return list->first;
}

struct SHAPE {
    const NODE* call = nullptr;
    const NODE* prolog = nullptr; // null for a function without parameters
};

SHAPE shape_of(const LIST* statements) {
    SHAPE shape;
    int count = 0;
    for (const LIST* s = statements; s; s = s->rest) ++count;
    const NODE* last = count ? statements->first : nullptr;
    auto returned = [](const NODE* t, int op) {
        return t->op == RETURN && t->right && t->right->op == op ? t->right : nullptr;
    };
    switch (count) {
    case 1: shape.call = returned(last, UCALL); break;
    case 2:
        if (last->op == URETURN && nth_from_end(statements, 1)->op == UCALL)
            shape.call = nth_from_end(statements, 1);
        else if (returned(last, CALL) && tree_is_arg_prolog(nth_from_end(statements, 1))) {
            shape.call = last->right;
            shape.prolog = nth_from_end(statements, 1);
        }
        break;
    case 3:
        if (last->op != URETURN || nth_from_end(statements, 1)->op != CALL ||
            !tree_is_arg_prolog(nth_from_end(statements, 2)))
            break;
        shape.call = nth_from_end(statements, 1);
        shape.prolog = nth_from_end(statements, 2);
        break;
    default: break;
    }
    return shape;
}

const NODE* without_casts(const NODE* t) {
    while (t->op == SCONV || t->op == PCONV || t->op == ACONV) t = t->left;
    return t;
}

void collect(const NODE* t, int op, std::vector<const NODE*>& list) {
    if (t->op != op) {
        list.push_back(t);
        return;
    }
    collect(t->left, op, list);
    collect(t->right, op, list);
}

// Each argument is the local copy of the parameter at its place.
bool passes_parameters_on(const SHAPE& shape) {
    if (!shape.prolog) return shape.call->op == UCALL;
    std::vector<const NODE*> copies, arguments;
    collect(shape.prolog, PCOMMA, copies);
    collect(shape.call->right, COMMA, arguments);
    if (copies.size() != arguments.size()) return false;
    for (size_t i = 0; i < copies.size(); ++i) {
        const NODE* copy = copies[i];
        if (copy->op != ASG || copy->left->op != NAME) return false;
        const NODE* argument = without_casts(arguments[i]);
        if (argument->op != NAME || argument->u.sym != copy->left->u.sym) return false;
        // A cast that is not undone again would pass another value.
        if (!compatible_types(arguments[i]->type, argument->type, false)) return false;
    }
    return true;
}

bool may_be_synonyms(const SYMTAB* f, const SYMTAB* callee) {
    constexpr uint16_t SPECIAL = 0x1060;
    if (!callee || callee == f || !compatible_types(f->type, callee->type, false)) return false;
    if (f->type->vararg() || callee->type->vararg()) return false;
    if (is_barrier_MCALL(skip_name_prefix(callee->name)) || (f->cqual & SPECIAL) || (callee->cqual & SPECIAL))
        return false;
    if (symbol_is_protected(f) && !symbol_is_outside_accessible(callee)) return false;
    if (!pragmas_allow_synonyms(f) || !pragmas_allow_synonyms(callee) || !groups_agree(f, callee)) return false;
    FUNINFO* record = find_FUNINFO(const_cast<SYMTAB*>(callee));
    return record && record->symbol && function_is_defined(record);
}

} // namespace

bool is_synonym_function(const FUNINFO* f) { return synonym_targets.count(f->name) != 0; }

void check_for_synonym_function_in_pass_1() {
    for (const PRAGMA* p = currfunc->pragma; p; p = p->next)
        if (p->kind == PRG_FUNC_SYNONYM && !p->args.empty())
            synonym_targets.insert(skip_name_prefix(p->args[0].c_str()));
    const SHAPE shape = shape_of(currfuninfo->statements);
    if (!shape.call) return;
    SYMTAB* callee = get_callee_for_call(shape.call);
    if (!may_be_synonyms(currfunc, callee) || !passes_parameters_on(shape)) return;
    debug_printf("Making %s a function synonym of %s\n", currfunc->name, callee->name);
    info_printf("Making %s a function synonym of %s\n", currfunc->name, callee->name);
    auto* pragma = new PRAGMA;
    pragma->kind = PRG_FUNC_SYNONYM;
    pragma->args.push_back(callee->name);
    pragma->next = currfunc->pragma;
    currfunc->pragma = pragma;
    synonym_targets.insert(skip_name_prefix(callee->name));
}
