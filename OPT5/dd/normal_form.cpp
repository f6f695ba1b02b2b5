// The normal form of memory references, and back.
//
// In normal form an indirection is UMULT(base, subscript): the base is a pointer without integer terms, the subscript,
// absent for 0, the sum of the terms. A variable that memory holds is UMULT(UAND(NAME)), so that all references have
// one shape; a variable of its function that nothing else reaches stays a NAME.
//
// Needs: the marks of aliased objects.
// Leaves: the same values, the same accesses, each as volatile and as aligned as it was. What a reference may meet is
// asked in this form as in the other.
// Sound because a subscript is computed where it is exact: all partial sums are differences of pointers into one object
// in a program without errors, so that they fit in the width of a pointer; in a narrower or an unsigned type only what
// the simplifier proves not to wrap is summed up. `u + 65535u` as subscript of an object is one term: widened term by
// term it would be another place. A term with effects stays where it is, so that effects keep their order.
#include "OPT5/dd/dd.h"

#include "OPT5/alias/alias.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/range.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

namespace {

// ---- Terms of an address

bool is_integral(const TYPE* t) { return t->is_int() || t->is_enum(); }

NODE* left_alone(NODE* t) { // the node is removed, its left operand stays
    NODE* left = t->left;
    erase_node(t);
    return left;
}

bool is_exact(int op, const NODE* a, const NODE* b, const TYPE* type) {
    return is_exact_by_rule(op, type) ? signed_result_is_exact(op, a, b, type, nullptr)
                                      : operation_is_exact(op, a, b, type, nullptr);
}

// The type that counts addresses.
TYPE* address_type() { return tp->long_t; }
bool is_as_wide_as_addresses(const TYPE* t) { return t->size >= address_type()->size; }

bool keeps_values(const TYPE* from, const TYPE* to) {
    if (is_as_wide_as_addresses(to)) return true; // its bits are those of the address
    return from->size < to->size ? from->is_unsigned() || !to->is_unsigned() : from->is_unsigned() == to->is_unsigned();
}

// The type that `a op b` of two terms is computed in, so that it is what the address is moved by.
TYPE* type_of_sum(int op, const NODE* a, const NODE* b) {
    TYPE* type = combined_type(a, b)->stqs();
    if (is_as_wide_as_addresses(type)) return type;
    const bool keeps = keeps_values(a->type, type) && keeps_values(b->type, type);
    return keeps && is_exact(op, a, b, type) ? type : address_type();
}

NODE* sum_of_terms(NODE* sum, int op, NODE* term) {
    TYPE* type = type_of_sum(op, sum, term);
    LS* ls = term->ls;
    return simp_node(maketree(op, coerce_to_type(type, sum), coerce_to_type(type, term), type, ls), nullptr);
}

NODE* negated(NODE* term) {
    TYPE* type = promoted_type(term->type)->stqs();
    if (!is_as_wide_as_addresses(type) && !(keeps_values(term->type, type) && is_exact(UMINUS, term, nullptr, type)))
        type = address_type();
    LS* ls = term->ls;
    return simp_node(maketree(UMINUS, coerce_to_type(type, term), nullptr, type, ls), nullptr);
}

void add_term(NODE* umult, int op, NODE* term) {
    if (umult->right)
        umult->right = sum_of_terms(umult->right, op, term);
    else
        umult->right = op == PLUS ? term : negated(term);
}

// ---- Widening

bool is_pushable(const NODE* t, const TYPE* to) {
    if (t->op != PLUS && t->op != MINUS && t->op != UMINUS) return false;
    if (!is_integral(t->left->type) || (t->right && !is_integral(t->right->type))) return false;
    if (!t->type->is_int() || t->type->is_bool() || t->type->size < tp->int_t->size) return false;
    for (const NODE* n : {static_cast<const NODE*>(t->left), static_cast<const NODE*>(t->right)})
        if (n && !(n->type->size <= t->type->size && keeps_values(n->type, t->type))) return false;
    // A negative number does not become one of an unsigned type, unless that wraps where addresses do.
    if (is_exact_by_rule(t->op, t->type)) return !to->is_unsigned() || to->size == address_type()->size;
    return operation_is_exact(t, nullptr);
}

NODE* widened(TYPE* type, NODE* t) {
    if (!t || !is_integral(type) || !is_integral(t->type))
        optassert("tree != NULL && TYPE_IS_INT(nType) && TYPE_IS_INT(tree->type)", __FILE__, __LINE__);
    if (t->op == SCONV && is_integral(t->left->type) && t->left->type->size <= t->type->size &&
        keeps_values(t->left->type, t->type) && !t->type->is_bool())
        return widened(type, left_alone(t));
    if (!is_pushable(t, type)) return coerce_to_type(type, t);
    t->left = widened(type, t->left);
    if (t->right) t->right = widened(type, t->right);
    t->type = type;
    return simp_node(t, nullptr);
}

// A term whose widening stands over the sum has it in the operands of the sum.
NODE* term_of(NODE* t) {
    if (t->op != SCONV || !t->type->is_int() || t->type->is_bool() || !t->left->type->is_int()) return t;
    const NODE* sum = t->left;
    const bool is_step = !t->type->is_unsigned() && sum->op == PLUS && sum->right->op == ICON;
    if (sum->type->size < tp->int_t->size || sum->type->size >= t->type->size || is_step || !is_pushable(sum, t->type))
        return t;
    TYPE* type = t->type->stqs();
    return widened(type, left_alone(t));
}

// ---- Base and subscript

bool is_wrapper(const NODE* p) {
    return (p->op == PCONV || p->op == OUIALIGN || p->op == NONALIGN || p->op == ISP2CHAR) &&
           p->left->type->is_pointer();
}

// A pointer minus a pointer is no sum of integers; what has effects stays in its place among them.
bool may_move(const NODE* term) {
    if (!is_integral(term->type) || tree_has_side_effects(term)) return false;
    for (const NODE* t = term; t; t = t->left) {
        if (t->op == MINUS && t->right->type->is_pointer()) return false;
        if (t->op != PLUS && t->op != MINUS && t->op != SCONV && t->op != UMINUS) break;
        if (t->right && !may_move(t->right)) return false;
    }
    return true;
}

NODE* without_terms(NODE* p, NODE* umult) {
    if (!p->type->is_pointer()) return p;
    TYPE* type = p->type;
    if (p->op == PCONV && p->left->type->is_pointer() && p->left->type->size == type->size) {
        p->left = without_terms(p->left, umult);
        return type->type_pointed_to()->is_array() ? p : coerce_to_type(type, left_alone(p));
    }
    if ((p->op != PLUS && p->op != MINUS) || !p->right) return p;
    NODE*& base = p->left->type->is_pointer() ? p->left : p->right;
    NODE*& term = &base == &p->left ? p->right : p->left;
    if (!base->type->is_pointer() || term->type->is_pointer() || (p->op == MINUS && &base == &p->right)) return p;
    base = without_terms(base, umult);
    if (!may_move(term)) return p;
    add_term(umult, p->op, term_of(term));
    NODE* rest = base;
    erase_node(p);
    return coerce_to_type(type, rest);
}

} // namespace

NODE* partition_pointer_under_UMULT(NODE* p, NODE* umult) {
    if (!is_wrapper(p)) return without_terms(p, umult);
    p->left = partition_pointer_under_UMULT(p->left, umult);
    if (!p->left) optassert("ptr->left != NULL", __FILE__, __LINE__);
    return p;
}

// ---- Into normal form

namespace {

bool is_aggregate(const TYPE* t) { return t->is_array() || t->is_csu(); }

// A variable that has a register rather than a place in memory.
bool is_likely_in_register(const SYMTAB* sym) {
    return (sym->sclass == SC_REGISTER || sym->sclass == SC_REGISTER2 || sym->sclass == SC_PARM) &&
           !sym->is_aliased() && !sym->type->is_volatile();
}

bool stays_a_name(const NODE* t) {
    const SYMTAB* sym = t->u.sym;
    const bool is_volatile = sym->type->is_volatile() || t->type->is_volatile();
    const bool is_counter = is_optimizer_temp(sym->name, 'i', 'h');
    if (is_counter && !sym->is_aliased() && sym->sclass == SC_AUTO) return true;
    if (sym->sclass != SC_AUTO && is_likely_in_register(sym) && sym->type->is_scalar()) return true;
    return !do_dd_for_be && !sym->is_aliased() && sym->level != 0 && !is_aggregate(sym->type) && !is_volatile;
}

// The qualifiers of the symbol; an access that is volatile by itself stays so.
TYPE* type_by_symbol(TYPE* type, const SYMTAB* sym) {
    const unsigned own = type->qual_kind(false);
    const unsigned bits = sym->type->qual_kind(false) | (own & QUAL_VOLATILE);
    return bits == own ? type : tp->mk_qual(type->stqs(), bits);
}

NODE* normalize_NAME(NODE* t, bool in_prolog) {
    SYMTAB* sym = t->u.sym;
    if (!sym || sym->is_function() || (sym->type->is_vector() && !sym->is_aliased())) return t;
    t->type = type_by_symbol(t->type, sym);
    if (in_prolog || stays_a_name(t)) return t;
    TYPE* type = t->type;
    LS* ls = t->ls;
    t->type = type_by_symbol(sym->type, sym);
    if (type->is_volatile() && !t->type->is_volatile()) t->type = tp->mk_qual(t->type, QUAL_VOLATILE);
    NODE* address = maketree(UAND, t, nullptr, tp->mk_ptr(t->type), ls);
    if (!compatible_types(type, t->type, true)) address = maketree(PCONV, address, nullptr, tp->mk_ptr(type), ls);
    return maketree(UMULT, address, nullptr, type, ls);
}

// The object that an indirection of its address is, as the tree that accesses it.
bool is_object_itself(const NODE* t, const NODE* address) {
    if (address->op != UAND || address->left->op != NAME) return false;
    const NODE* name = address->left;
    const SYMTAB* sym = name->u.sym;
    if (!sym || sym->is_function() || sym->type->size != t->type->size) return false;
    return compatible_types(name->type, t->type, true) && compatible_types(sym->type, t->type, true) &&
           (!t->type->is_volatile() || lvalue_is_volatile(name));
}

// `in_prolog`: a part of the argument prolog, which names parameters as they come.
NODE* normalize(NODE* t, bool in_prolog);

void normalize_operands(NODE* t, bool in_prolog) {
    if (t->right) t->right = normalize(t->right, in_prolog);
    if (t->left) t->left = normalize(t->left, in_prolog);
}

NODE* normalize_UMULT(NODE* t, bool in_prolog) {
    if (!t->left->type->is_pointer()) {
        normalize_operands(t, in_prolog);
        return t;
    }
    if (!t->right && is_object_itself(t, t->left) && !t->left->left->u.sym->type->is_array()) {
        NODE* name = left_alone(left_alone(t));
        return normalize_NAME(name, in_prolog);
    }
    t->left = partition_pointer_under_UMULT(t->left, t);
    if (!t->left) optassert("tree->left != NULL", __FILE__, __LINE__);
    t->right = simp_ss_tree(t->right, nullptr);
    if (t->right && t->right->op == ICON && t->right->u.lval.is_zero()) {
        erase_tree(t->right);
        t->right = nullptr;
    }
    normalize_operands(t, in_prolog);
    return t;
}

NODE* normalize(NODE* t, bool in_prolog) {
    switch (t->op) {
    case NAME: return normalize_NAME(t, in_prolog);
    case UMULT: return normalize_UMULT(t, in_prolog);
    case UAND:
        if (without_members(static_cast<const NODE*>(t->left))->op == NAME) return t;
        break;
    case URETURN:
    case BRANCH:
    case PPRAGMA:
    case ASM: return t;
    case RETURN:
        if (t->right) t->right = normalize(t->right, in_prolog);
        return t;
    case SWITCH: t->left = normalize(t->left, in_prolog); return t;
    case STDOT:
        t->left = normalize(t->left, in_prolog);
        t->type = merge_qualifiers_for_STDOT(t->type, t);
        return t;
    default: break;
    }
    normalize_operands(t, in_prolog);
    return t;
}

} // namespace

NODE* normalize_tree(NODE* t, NODE* statement) { return normalize(t, tree_is_arg_prolog(statement)); }

// ---- Back

namespace {

// A pointer to the accessed type, qualified as `base` and what it points to are.
TYPE* type_of_address(const NODE* t, const NODE* base) {
    if (!base->type->is_pointer()) return tp->mk_ptr(t->type);
    const unsigned kept = base->type->type_pointed_to()->qual_kind(false) & ~unsigned(QUAL_PACKED);
    TYPE* target = kept & ~t->type->qual_kind(false) ? tp->mk_qual(t->type, kept) : t->type;
    if (compatible_types(base->type->type_pointed_to(), target, true)) return base->type->stqs();
    return tp->mk_ptr(target);
}

bool is_scaled(const NODE* t) {
    return (t->op == MULT || t->op == PMCONV || t->op == SLL) && t->right && t->right->op == ICON;
}

// Rows and columns are added one by one, as they came: an address of a row serves all its columns.
NODE* moved(NODE* base, int op, NODE* term, TYPE* type, LS* ls) {
    const bool is_sum = op == PLUS && (term->op == PLUS || term->op == MINUS) && is_as_wide_as_addresses(term->type);
    if (!is_sum || !(is_scaled(term->left) || is_scaled(term->right))) return maketree(op, base, term, type, ls);
    base = moved(base, PLUS, term->left, type, ls);
    NODE* last = term->right;
    const int last_op = term->op;
    erase_node(term);
    return maketree(last_op, base, last, type, ls);
}

void join_subscript(NODE* t) {
    NODE** base = &t->left;
    while ((*base)->op == OUIALIGN || (*base)->op == NONALIGN) base = &(*base)->left;
    NODE* subscript = t->right;
    t->right = nullptr;
    LS* ls = t->left->ls;
    TYPE* type = type_of_address(t, *base);
    *base = moved(*base, PLUS, subscript, type, ls);
    for (NODE* mark = t->left; mark != *base; mark = mark->left) mark->type = type;
}

NODE* with_dependence(NODE* t, bool keep_ddnodes) {
    if (!t->rare().dd) return t;
    DDNODE_RECORD* record = t->rare().dd;
    t->make_rare().dd = nullptr;
    if (!keep_ddnodes) return t;
    NODE* mark = maketree(DDNODE, t, nullptr, t->type, t->ls);
    mark->make_rare().dd = record;
    record->node = mark;
    return mark;
}

// The pointer under a mark of its alignment points to what the access says, which the mark alone qualifies.
void settle_alignment_mark(NODE* t) {
    if (t->left->op != OUIALIGN && t->left->op != NONALIGN) return;
    NODE*& pointer = t->left->left;
    if (!pointer->type->is_pointer()) return;
    bool exact;
    TYPE* type = true_type(pointer, &exact);
    if (!type || !type->is_pointer()) return;
    const unsigned bits = type->qual_kind(false);
    if (bits & (QUAL_CONST | QUAL_RESTRICT))
        type = tp->mk_qual(type->stqs(), bits & ~unsigned(QUAL_CONST | QUAL_RESTRICT));
    pointer = coerce_to_type(type, pointer);
}

NODE* denormalize(NODE* t, bool keep_ddnodes);

thread_local bool made_an_address = false; // which is to be simplified

NODE* denormalize_UMULT(NODE* t, bool keep_ddnodes) {
    t->left = denormalize(t->left, keep_ddnodes);
    if (t->right) {
        t->right = denormalize(t->right, keep_ddnodes);
        join_subscript(t);
        made_an_address = true;
    } else if (t->left->op == UAND || t->left->op == PCONV) {
        if (!t->rare().dd && is_object_itself(t, t->left)) return left_alone(left_alone(t));
        made_an_address = true;
    }
    settle_alignment_mark(t);
    return with_dependence(t, keep_ddnodes);
}

// The mark of a reference stands above the members that are taken of it.
NODE* denormalize_STDOT(NODE* t, bool keep_ddnodes) {
    t->left = denormalize(t->left, keep_ddnodes);
    if (t->left->op != DDNODE) return t;
    NODE* mark = t->left;
    TYPE* old = t->type;
    t->left = mark->left;
    mark->left = t;
    t->type = mark->type = old->normalized_type();
    return compatible_types(old, mark->type, true) ? mark : coerce_to_type(old, mark);
}

NODE* denormalize(NODE* t, bool keep_ddnodes) {
    switch (t->op) {
    case UMULT: return denormalize_UMULT(t, keep_ddnodes);
    case STDOT: return denormalize_STDOT(t, keep_ddnodes);
    case SWITCH: t->left = denormalize(t->left, keep_ddnodes); return t;
    default: break;
    }
    if (t->right) t->right = denormalize(t->right, keep_ddnodes);
    if (t->left) t->left = denormalize(t->left, keep_ddnodes);
    return t;
}

template <class F>
void rewrite_statements(const F& rewrite) {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) put_operand(s->first, rewrite(s->first));
}

} // namespace

NODE* denormalize_tree(NODE* t, bool keep_ddnodes) { return denormalize(t, keep_ddnodes); }

void normalize_all_trees() {
    need(fact::alias_marks);
    rewrite_statements([](NODE* t) { return normalize(t, tree_is_arg_prolog(t)); });
    trees_are_normalized = true;
}

void denormalize_unchanged_trees() {
    trees_are_normalized = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) {
            made_an_address = false;
            s->first = denormalize(s->first, false);
            if (made_an_address || s->flag2) s->first = simp_tree(s->first, nullptr);
            s->flag2 = 0;
        }
}

void denormalize_all_trees(bool keep_ddnodes, bool simplify) {
    trees_are_normalized = false;
    rewrite_statements([=](NODE* t) {
        t = denormalize(t, keep_ddnodes);
        return simplify ? simp_tree(t, nullptr) : t;
    });
}

NODE* strip_ddep_info_from_tree(NODE* tree) {
    return rewrite_tree(tree, [](NODE* t) {
        if (t->op == UMULT && t->rare().dd) t->make_rare().dd = nullptr;
        return t->op == DDNODE ? left_alone(t) : t;
    });
}

// ---- Copies of qualified parameters

namespace {

// The copy of a parameter into a volatile scalar: it is made in a variable of its own, which bears the parameter's name as
// the scalar does, and from there to the scalar.
bool split_copy(NODE* copy, LIST* prolog) {
    if (copy->op != ASG || copy->left->op != NAME || !copy->left->type->is_scalar() || !copy->left->type->is_volatile())
        return false;
    NODE* scalar = copy->left;
    SYMTAB* plain = copy_symbol(scalar->u.sym);
    plain->type = plain->orig_type = plain->type->stqs();
    plain->index = currfuninfo->next_symbol_index++;
    plain->sclass = SC_AUTO;
    plain->scope = scalar->u.sym->scope;
    plain->set_is_aliased(false);
    plain->next = currfuninfo->pending_syms;
    currfuninfo->pending_syms = plain;
    LS::add_symbol(plain);
    copy->left = mk_NAME(plain, scalar->ls);
    copy->type = copy->left->type;
    insert_behind(prolog, mk_ASG(scalar, mk_NAME(plain, scalar->ls)), prolog->psn);
    return true;
}

} // namespace

void split_qualified_parameter_copies() {
    const BBLK* first = currfuninfo->bb_list;
    LIST* prolog = first ? first->statements : nullptr;
    if (!stmt_is_arg_prolog(prolog)) return;
    NODE* list = prolog->first;
    bool any = false;
    for (; list->op == PCOMMA || list->op == COMMA; list = list->left) any |= split_copy(list->right, prolog);
    any |= split_copy(list, prolog);
    if (!any) return;
    erase_tree(currfuninfo->arg_prolog);
    currfuninfo->arg_prolog = copy_tree(prolog->first);
    changed(fact::every & ~(fact::alias | fact::live_variables));
}
