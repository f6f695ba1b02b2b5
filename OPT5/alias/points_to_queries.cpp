// What is asked of bindings.
#include "OPT5/alias/address_form.h"
#include "OPT5/alias/alias.h"
#include "OPT5/alias/bindings.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <algorithm>
#include <numeric>

namespace {

constexpr int BITS_PER_UNIT = 16;

// The UMULT or STREF that an lvalue is through, or null; `*bits` grows by where the lvalue lies behind its address.
const NODE* access_behind(const NODE* t, int64_t* bits) {
    for (;; t = t->left) {
        if (t->op == UMULT) return t;
        if (t->op == STREF || t->op == STDOT) {
            if (!t->right || !t->right->mval) return nullptr;
            *bits += static_cast<int64_t>(t->right->mval->offset);
            if (t->op == STREF) return t;
        } else if (t->op != IDENTITY && t->op != OUIALIGN && t->op != NONALIGN && t->op != DDNODE && !op_wraps_for_SSA(t->op))
            return nullptr;
    }
}

} // namespace

// ---- At accesses

const PTENV* PT_info_of(const NODE* lvalue) {
    int64_t bits = 0;
    const NODE* t = access_behind(lvalue, &bits);
    if (!t || !t->rare().ptenv) return nullptr;
    const PT_STORE* store = PT_store();
    return store && store->run == t->rare().ptenv_run ? t->rare().ptenv : nullptr;
}

namespace {
void set_PT_info(NODE* access, const PTENV* e) {
    if (!e && !access->rare().ptenv) return;
    RARE_FIELDS& rare = access->make_rare();
    rare.ptenv = e;
    rare.ptenv_run = e ? PT_store()->run : 0;
}
} // namespace

void carry_PT_info(NODE* copy, const NODE* original) {
    int64_t bits = 0;
    const NODE* access = access_behind(copy, &bits);
    if (access) set_PT_info(const_cast<NODE*>(access), PT_info_of(original));
}

void share_PT_info(const std::vector<NODE*>& accesses) {
    PT_STORE* store = PT_store();
    if (!store || accesses.size() < 2) return;
    const PTENV* all = PT_info_of(accesses.front());
    for (const NODE* t : accesses) all = store->bindings.meet(all, PT_info_of(t));
    for (NODE* t : accesses) set_PT_info(t, all);
}

// ---- Questions

unsigned overall_PT_align(const PTENV* e) {
    if (!e) return BITS_PER_UNIT;
    unsigned align = e->align;
    for (const PTVAR& t : e->targets) align = std::gcd(align, t.align);
    return align ? align : BITS_PER_UNIT;
}

SYMTAB* single_pointsto_target_if_known(const PTENV* e) {
    return e && !e->parm && !e->categories && e->targets.size() == 1 ? e->targets.front().base : nullptr;
}

NODE* find_var_init_in_PT_info(SYMTAB* pointer, const BBLK* bb) {
    const PT_STORE* store = PT_store();
    if (!store || !pointer->type->is_pointer()) return nullptr;
    const PTENV* e = store->binding(pointer, store->PT_OUT[bb]);
    const SYMTAB* base = single_pointsto_target_if_known(e);
    if (!base || base->level != 0 || e->targets.front().stride) return nullptr;
    TYPE* type = tp->mk_ptr(base->type);
    NODE* address = maketree(UAND, mk_NAME(e->targets.front().base), nullptr, type);
    const int64_t offset = e->targets.front().offset;
    return coerce_to_type(pointer->type->stqs(), offset ? maketree(PLUS, address, mk_ICON(INT65(offset), type), type) : address);
}

const PTENV* PT_info_at_start(const SYMTAB* pointer, const BBLK* bb) {
    const PT_STORE* store = PT_store();
    return store ? store->binding(pointer, store->PT_IN[bb]) : nullptr;
}

// ---- Pairs

namespace {

// The addresses of one access: a binding, from which it lies `bits` further on.
struct PLACES {
    PTENV of_object; // what `e` points to where it is the object's own address
    const PTENV* e = nullptr;
    INT65 bits, width;

    PLACES(const NODE* t, const ADDRESS_FORM& form) : width(form.width) {
        int64_t behind = 0;
        access_behind(t, &behind);
        e = PT_info_of(t);
        bits = INT65(behind);
        if (form.object) set_object(form);
    }
    PLACES(const PLACES&) = delete;

private:
    void set_object(const ADDRESS_FORM& form) {
        INT65 step = form.modulus();
        for (const LINEAR_FORM::TERM& term : form)
            step = long_gcd(step, term.coefficient < 0 ? -INT65(term.coefficient) : INT65(term.coefficient));
        const INT65 unit(BITS_PER_UNIT);
        if (!step.fits<int64_t>() || !(step % unit).is_zero()) {
            step = unit;
            width = INT65(0);
        }
        bits = INT65(form.constant);
        of_object.targets.push_back(make_target(form.object, 0, (step / unit).fits_in<int64_t>()));
        e = &of_object;
    }
};

bool classes_may_meet(const PLACES& x, int64_t offset_x, int64_t stride_x, const PLACES& y, int64_t offset_y,
                      int64_t stride_y) {
    if (x.width <= INT65(0) || y.width <= INT65(0)) return true;
    const INT65 unit(BITS_PER_UNIT);
    const INT65 distance = INT65(offset_y) * unit + y.bits - (INT65(offset_x) * unit + x.bits);
    return !accesses_are_apart(distance, long_gcd(INT65(stride_x), INT65(stride_y)) * unit, x.width, y.width);
}

bool covers_a_target(const PTENV& e, const PTENV& other) {
    return std::any_of(other.targets.begin(), other.targets.end(),
                       [&e](const PTVAR& t) { return is_covered(t, e.categories & ~PT_NULL); });
}

} // namespace

bool UMULT_PT_targets_may_overlap(const NODE* a, const ADDRESS_FORM& form_a, const NODE* b, const ADDRESS_FORM& form_b) {
    if (!PT_store()) return true;
    const PLACES x(a, form_a), y(b, form_b);
    if (!x.e || !y.e) return true;
    if (x.e->parm && y.e->parm) {
        if (x.e->parm != y.e->parm && pointer_args_are_disjoint) return false;
        // Both are the parameter's one value on entry, and more.
        if (x.e->parm == y.e->parm && !classes_may_meet(x, x.e->parm_offset, x.e->parm_stride, y, y.e->parm_offset, y.e->parm_stride))
            return false;
    }
    if (x.e->categories & y.e->categories & ~PT_NULL) return true;
    if (covers_a_target(*x.e, *y.e) || covers_a_target(*y.e, *x.e)) return true;
    for (const PTVAR& s : x.e->targets)
        for (const PTVAR& t : y.e->targets) {
            if (s.base != t.base ? object_symbols_may_alias(s.base, t.base)
                                 : classes_may_meet(x, s.offset, s.stride, y, t.offset, t.stride))
                return true;
        }
    return false;
}

// ---- Dumps

void dump_ptr_PT_binding(const SYMTAB* pointer, const PTENV* e) {
    if (!e) {
        debug_printf("\t<NO POINTS-TO BINDINGS>\n");
        return;
    }
    debug_printf("    %s\n", pointer ? pointer->name : "(nil)");
    if (e->parm)
        debug_printf("\t\tPARAMETER VALUE: (1,%d) %s  offset=%s, stride=%s\n", e->parm->level, e->parm->name,
                     std::to_string(e->parm_offset).c_str(), std::to_string(e->parm_stride).c_str());
    static const char* const names[][2] = {{"+NULL", "-null"},     {"+ADCON", "-adcon"},     {"+SCON", "-scon"},
                                           {"+HEAP", "-heap"},     {"+AUTOF", "-autoF"},     {"+AUTOL", "-autoL"},
                                           {"+STATICF", "-staticF"}, {"+STATICL", "-staticL"}, {"+STATICG", "-staticG"},
                                           {"+EXTERN", "-extern"}};
    debug_printf("\t\tCATEGORIES: ");
    if (e->categories == PT_ALL)
        debug_printf("*ALL*");
    else
        for (size_t i = 0; i < std::size(names); ++i) debug_printf("%s", names[i][e->categories >> i & 1 ? 0 : 1]);
    debug_printf("\n");
    const unsigned plain = pointer ? std::max<unsigned>(BITS_PER_UNIT, pointer->type->type_pointed_to()->align) : BITS_PER_UNIT;
    if (e->align > plain) debug_printf("\t\tALIGNMENT:  %s (bits)\n", std::to_string(e->align).c_str());
    for (const PTVAR& t : e->targets)
        debug_printf("\t\tVARIABLE:   Offset=%s (bytes), stride=%s (bytes), align=%s (bits), base: %s\n",
                     std::to_string(t.offset).c_str(), std::to_string(t.stride).c_str(), std::to_string(t.align).c_str(),
                     t.base->name);
}
