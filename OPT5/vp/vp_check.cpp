// What is known of values, as assertions that the executor checks: under --debug:vp_asserts of every variable at the entry of
// every block, and of the parameters of functions, none of which is deleted then.
#include "OPT5/vp/vp.h"

#include "DEBUG_DISABLE/register_option.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

namespace {

register_option pass_debug_vp_asserts("debug:vp_asserts");

// One of the slices holds the symbol's value.
NODE* membership(const vpset& set, SYMTAB* sym) {
    NODE* any = nullptr;
    const bool wraps = !wraps_signed(sym->type);
    for (const VPSLICE& s : set) {
        NODE* in = comparison(wraps ? UGE : GE, sym, s.low);
        in = maketree(ANDAND, in, comparison(wraps ? ULE : LE, sym, s.high), tp->int_t);
        if (s.step > 1 && s.step < static_cast<WIDE>(1) << (sym->type->size - 1)) {
            TYPE* type = tp->mk_unsigned(sym->type->stqs());
            NODE* distance = maketree(MINUS, coerce_to_type(type, mk_NAME(sym)), mk_ICON(to_int65(s.low), type), type);
            NODE* rest = maketree(MOD, distance, mk_ICON(to_int65(s.step), type), type);
            in = maketree(ANDAND, in, maketree(EQ, rest, mk_ICON(INT65(0), type), tp->int_t), tp->int_t);
        }
        any = any ? maketree(OROR, any, in, tp->int_t) : in;
    }
    return any;
}

} // namespace

bool values_are_asserted() { return static_cast<bool>(pass_debug_vp_asserts); }

void assert_bindings(BBLK* bb, vpenv env) {
    vpenv_store->for_each_binding(env, [&](int number, const vpset& set) {
        SYMTAB* sym = vpenv_store->symbol(number);
        if (!is_integer_with_range(sym->type)) return;
        insert_before(&bb->statements, maketree(NASSERT, membership(set, sym), nullptr, tp->int_t), nullptr);
        currfuninfo->has_nasserts = true;
    });
}

void assert_values_on_entry(FUNINFO* f, SYMTAB* sym, const vpset& set, const NODE* value) {
    LIST* prolog = f->bb_list->statements;
    NODE* fact = nullptr;
    if (value && !value->type->is_float() && sym->type->is_scalar() && !sym->type->is_float())
        fact = maketree(EQ, mk_NAME(sym), coerce_to_type(sym->type->stqs(), copy_tree(value)), tp->int_t);
    else if (!value && !vpset_is_empty(set) && is_integer_with_range(sym->type))
        fact = membership(set, sym);
    if (!fact) return;
    insert_behind(prolog, maketree(NASSERT, fact, nullptr, tp->int_t), prolog->psn);
    f->has_nasserts = true;
}
