// The target model.

#include "OPT5/target/target.h"

#include "BITVEC/bitvec.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"

#include <cstdio>

int float_support;
bool is_fpu64;

const int32_t target_memref[EKINDS][4] = {
    {},  {},  {},  {}, {}, {}, // bool to unsigned short: accessed as int
    {1}, {1},                  // int, unsigned
    {2}, {2},                  // long, unsigned long
    {4}, {4},                  // long long, unsigned long long
    {2}, {},  {4},             // float, double (by its width one of its neighbours), long double
};

static int stack_variable_count;

// ---- Start-up
static void read_float_option() {
    constexpr int id = option_obj::OO_float_support;
    if (!file_options || !file_options->getopt(id)) return;
    switch (file_options->getnumarg(id)) {
    case option_obj::OV_FLOAT_SUPPORT_FPU64: is_fpu64 = true; [[fallthrough]];
    case option_obj::OV_FLOAT_SUPPORT_FPU32: float_support = static_cast<int>(file_options->getnumarg(id)); break;
    case option_obj::OV_FLOAT_SUPPORT_SOFTLIB: break;
    default: {
        const char* word = file_options->getstrarg(id);
        printf("\n>>>> Warning: unrecognized option:'--float_support=%s'\n\n", word ? word : "");
    }
    }
}

void init_target() {
    float_support = 0;
    is_fpu64 = false;
    if (cpu_version == -1) cpu_version = 28;
    if (cpu_version != 27 && cpu_version != 28) {
        printf("\n>>>> Warning: unrecognized option: '-v%d'\n\n", cpu_version);
        cpu_version = 28;
    }
    TYPE_PKG::cpu_version = cpu_version;
    if (cpu_version == 27) {
        rtc_RPT_ok_for_loop = false;
        return;
    }
    rtc_RPT_ok_for_loop = rtc_unified_memory && !rtc_no_rpt_ins();
    read_float_option();
}

bool target_is_this_version(const char*) { return true; }
bool target_is_superset_of_target(const char*, const char*) { return false; }
bool reserve_global_register(const char*) { return false; }

int init_reg_defs() {
    stack_variable_count = 0;
    return 0;
}

// ---- Questions about trees
bool leaf_is_immediate(const NODE* t) { return t->op == ICON; }
bool offset_is_in_range(INT65 offset, const TYPE*, int) { return !offset.is_negative() && offset <= INT65(32767); }

namespace {

enum MPY16_OPERAND { MEMORY, REGISTER, CONSTANT };
constexpr struct {
    MPY16_OPERAND left, right;
    unsigned memory_operands;
} mpy16_forms[] = {
    {MEMORY, REGISTER, 1}, // the other one goes to the multiplicand register
    {REGISTER, MEMORY, 2},
    {MEMORY, MEMORY, 3},   // which is loaded from memory as well
    {MEMORY, CONSTANT, 1},
};

constexpr long MPY16_BITS = 16;
bool fits_mpy16(const TYPE* type) { return (type->is_int() || type->is_enum()) && type->size <= MPY16_BITS; }

MPY16_OPERAND mpy16_operand(const NODE* t) {
    if (t->op == ICON) return CONSTANT;
    t = without_mpy16_cast(t);
    const bool is_access = op_is_load(t->op) || (t->op == NAME && t->u.sym && !t->u.sym->is_automatic());
    const bool is_field = (t->op == STDOT || t->op == STREF) && t->right->mval->is_bitfld;
    return is_access && !is_field && fits_mpy16(t->type) && t->type->size == MPY16_BITS ? MEMORY : REGISTER;
}

} // namespace

unsigned mpy16_memory_operands(const NODE* t) {
    if (t->op != MULT || !fits_mpy16(t->type)) return 0;
    const MPY16_OPERAND left = mpy16_operand(t->left), right = mpy16_operand(t->right);
    for (const auto& form : mpy16_forms)
        if (form.left == left && form.right == right) return form.memory_operands;
    return 0;
}

NODE* cpu_bit_test_subtree(NODE* t) {
    bool is_test = t->op == EQ || t->op == NEQ || t->op == LT || t->op == GE || t->op == GT;
    if (is_test && t->right->op == ICON && t->right->u.lval.is_zero()) t = t->left;
    if (t->op != ANDB || t->right->op != ICON || power_of_2(t->right->u.lval) < 0) return t;
    return t->type->size <= tp->int_t->size ? t->left : t;
}

long cost_for_DIV_to_MULT_expr(const NODE* t) {
    constexpr long COST_OF_DIV = 666;
    long cost = 0;
    for (; t; t = t->left) {
        cost += (t->op == DIV ? COST_OF_DIV : 1) + cost_for_DIV_to_MULT_expr(t->right);
        if (name_accessed(t)) break;
    }
    return cost;
}

// ---- Preparation of register assignment
SYMTAB* sort_stack_variables(SYMTAB* list) {
    for (SYMTAB* sym = list; sym; sym = sym->next) {
        if (sym->is_aliased() || sym->level != 2 || sym->sclass != SC_AUTO || type_may_contain_volatile(sym->type))
            continue;
        if (!sym->type->is_scalar() && !sym->type->is_csu()) continue;
        sym->sclass = SC_REGISTER2;
        sym->value = static_cast<uint32_t>(stack_variable_count++);
    }
    return list;
}

namespace {

NODE* address_of_indirection(NODE* t) {
    NODE* indirection = t->left;
    NODE* address = coerce_to_type(t->type, indirection->left);
    erase_node(indirection);
    erase_node(t);
    return address;
}

// &x.f is &x and the offsets of the members.
NODE* address_of_member(NODE* t) {
    if (t->left->op == STDOT && t->left->right->mval->is_bitfld) return t;
    int64_t bits = 0;
    NODE* base = without_members(t->left, &bits);
    const INT65 offset(bits >> 4);
    if (!offset_is_in_range(offset, t->type, 0) || (base->op != NAME && base->op != UMULT) || base->right) return t;
    t->left = taken_out_of_members(t->left);
    TYPE* type = t->type;
    t->type = tp->mk_ptr(base->type);
    NODE* address = coerce_to_type(type, base->op == UMULT ? address_of_indirection(t) : t);
    return offset.is_zero() ? address : maketree(PLUS, address, mk_ICON(offset, tp->long_t), type, address->ls);
}

// A displacement from an address that has one itself, between casts of pointers or not: their sum.
NODE* with_one_displacement(NODE* t) {
    NODE* inner = t->left;
    while (inner->op == PCONV && inner->left->type->is_pointer()) inner = inner->left;
    if (inner->op != PLUS || !inner->type->is_pointer() || inner->right->op != ICON) return t;
    const INT65 sum = inner->right->u.lval + t->right->u.lval;
    if (!offset_is_in_range(sum, t->type, 0)) return t;
    erase_tree(t->right);
    t->right = mk_ICON(sum, tp->long_t);
    NODE* base = inner->left;
    erase_tree(inner->right);
    NODE** link = &t->left;
    while (*link != inner) link = &(*link)->left;
    *link = coerce_to_type(inner->type, base);
    erase_node(inner);
    return t;
}

NODE* lower_address(NODE* t) {
    if (t->op == PLUS && t->type->is_pointer() && t->right->op == ICON) return with_one_displacement(t);
    if (t->op == STREF && t->left->type->is_pointer()) {
        t->op = STDOT;
        t->left = maketree(UMULT, t->left, nullptr, t->left->type->type_pointed_to(), t->ls);
    }
    if (t->op != UAND || !t->type->is_pointer()) return t;
    if (t->left->op == UMULT && !t->left->right) return address_of_indirection(t);
    if (t->left->op == STDOT && !must_preserve_STDOT(t->left)) return address_of_member(t);
    return t;
}

} // namespace

void lower_addresses() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* stmt = bb->statements; stmt; stmt = stmt->rest)
            stmt->first = rewrite_tree(stmt->first, lower_address);
    sym_split(currfuninfo);
}

void allocate_regs() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'allocate_regs' ----------\n");
    init_reg_defs();
    for (SYMTAB* list : {currfuninfo->new_syms, currfuninfo->scalar_syms, currfuninfo->memory_syms})
        sort_stack_variables(list); // the last holds the structures
    wrapup_allocation();
}

// ---- What a register allocator asks of the target
void find_target_conflicts(NODE*, BITVEC*, BITVEC*, long) {}
void mark_live_across_call(BITVEC*, NODE*) {}
void target_lra_uses(NODE*, BITVEC*) {}
void target_lra_defs(NODE*, BITVEC*) {}
void mark_outgoing_arg_vars(NODE*) {}
void copy_reg_preferences(SYMTAB*, unsigned long, SYMTAB*, unsigned long) {}
void wrapup_allocation() {}
bool op_affects_RPTB_regs(const NODE*) { return false; }

constexpr uint32_t REGISTER_NUMBERS = 64;

void add_reg_to_set(const SYMTAB* sym, BITVEC* set) {
    if (sym->value >= REGISTER_NUMBERS) return;
    if (sym->value >= set->bits) {
        bv_warn("Index beyond size:add");
        uint32_t old = set->bits;
        bv_resize(*set, sym->value + 1);
        for (uint32_t i = old; i < set->bits; ++i) set->clear(i);
    }
    set->set(sym->value);
}

void remove_reg_from_set(const SYMTAB* sym, BITVEC* set) {
    if (sym->value >= REGISTER_NUMBERS) return;
    if (sym->value >= set->bits) {
        bv_warn("Index beyond size:remove");
        uint32_t old = set->bits;
        bv_resize(*set, sym->value + 1);
        for (uint32_t i = old; i < set->bits; ++i) set->clear(i);
    }
    set->clear(sym->value);
}
