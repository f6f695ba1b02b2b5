// Lexical scopes and pointer records of a function.

#include "OPT5/ir/scope.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

#include <cstring>

namespace {
LS* innermost_open = nullptr; // while a function is read
}

LS::~LS() {
    for (SYMLIST* list : {pointers, structs, arrays, scalars}) erase_symlist(list);
    for (LS* child = first_child; child;) {
        LS* next = child->next_sibling;
        delete child;
        child = next;
    }
}

LS* LS::current() { return innermost_open; }

void LS::init(PSN* psn, SYMTAB* func, uint32_t scope_kind) {
    if (func != currfunc) abort_optimizer();
    delete currfuninfo->ls_root;
    auto* root = new LS;
    root->open_psn = psn;
    root->function = currfuninfo;
    root->kind = scope_kind;
    currfuninfo->ls_root = root;
    currfuninfo->ls_counter = 1;
    innermost_open = root;

    auto* bottom = new PTR;
    bottom->root = bottom;
    bottom->scope = root;
    bottom->symbol = func;
    bottom->flags = PTR_IS_A_ROOT | PTR_IS_BOTTOM;
    currfuninfo->ptrs = bottom;
    currfuninfo->bottom_ptr = bottom;
}

void LS::open(PSN* psn, SYMTAB* func, uint32_t scope_kind) {
    if (!innermost_open || func != currfunc) abort_optimizer();
    auto* scope = new LS;
    scope->parent = innermost_open;
    scope->open_psn = psn;
    scope->function = currfuninfo;
    scope->kind = scope_kind;
    scope->depth = innermost_open->depth + 1;
    scope->id = currfuninfo->ls_counter++;
    (innermost_open->last_child ? innermost_open->last_child->next_sibling : innermost_open->first_child) = scope;
    innermost_open->last_child = scope;
    innermost_open = scope;
}

void LS::close(PSN* psn, SYMTAB* func, uint32_t scope_kind) {
    LS* scope = innermost_open;
    if (!scope || func != currfunc || scope->kind != scope_kind) abort_optimizer();
    scope->close_psn = psn;
    for (SYMLIST** list : {&scope->pointers, &scope->structs, &scope->arrays, &scope->scalars}) *list = revsymlist(*list);
    if (scope->depth == 1 && scope->first_child && !scope->first_child->close_psn) scope->first_child->close_psn = psn;
    innermost_open = scope->parent;
}

namespace {
LS* scope_at_depth(uint32_t depth) {
    LS* scope = currfuninfo ? currfuninfo->ls_root : nullptr;
    for (; scope && depth; --depth) scope = scope->first_child;
    return scope;
}
} // namespace

LS* LS::level_0_scope() { return scope_at_depth(0); }
LS* LS::level_1_scope() { return scope_at_depth(1); }
LS* LS::level_2_scope() { return scope_at_depth(2); }

void LS::enter_symbol(SYMTAB* sym) {
    if (sym->level == 0 || is_optimizer_temp(sym->name, 'h', 'i')) return;
    TYPE* type = sym->type;
    if (type->is_pointer()) {
        pointers = mk_symlist(sym, pointers);
        if (sym->is_temp && type->qual_kind(false) & QUAL_RESTRICT) sym->type = tp->remove_known_qual(type, QUAL_RESTRICT);
        return;
    }
    if (depth < 2 || is_internal_name(sym->name)) return;
    SYMLIST*& list = type->is_csu() ? structs : type->is_array() ? arrays : scalars;
    list = mk_symlist(sym, list);
}

void LS::add_symbol(SYMTAB* sym) {
    if (!sym->scope) sym->scope = innermost_open;
    if (sym->scope) sym->scope->enter_symbol(sym);
}

void LS::initialize_scopes_and_ptrs_from_tree(NODE* tree) {
    for_each_node(tree, [](NODE* t) {
        t->ls = innermost_open;
        if (t->type && t->type->is_pointer() && (t->op == NAME || t->op == STDOT)) find_or_make_PTR_entry(t);
    });
}

LS* LS::innermost_common_scope(LS* a, LS* b) {
    if (!a || !b) return nullptr;
    if (!a->parent || !b->parent || a->function != b->function) return a->function ? a->function->ls_root : nullptr;
    while (a->depth > b->depth) a = a->parent;
    while (b->depth > a->depth) b = b->parent;
    while (a != b) {
        a = a->parent;
        b = b->parent;
    }
    return a;
}

bool LS::encloses(const LS* other) const {
    while (other && other->depth > depth) other = other->parent;
    return other == this;
}

bool LS::is_strictly_contained_by(const LS* other) const { return this != other && other->encloses(this); }

bool LS::object_may_be_live_in_scope(const SYMTAB* sym, const LS* scope) {
    if (!sym->scope || !scope) return true;
    return sym->scope->encloses(scope);
}

static void set_depth(LS* scope, uint32_t depth) {
    scope->depth = depth;
    for (LS* child = scope->first_child; child; child = child->next_sibling) set_depth(child, depth + 1);
}

void LS::splice_scope(LS* tree) {
    tree->parent = this;
    (last_child ? last_child->next_sibling : first_child) = tree;
    last_child = tree;
    set_depth(tree, depth + 1);
}

void LS::offset_scope(long lines) {
    line_offset += lines;
    for (LS* child = first_child; child; child = child->next_sibling) child->offset_scope(lines);
}

void LS::validate() const {
    for (const LS* child = first_child; child; child = child->next_sibling) {
        OPT_ASSERT(child->parent == this && child->depth == depth + 1);
        child->validate();
    }
}

void LS::print(FILE* out, int indent) const {
    std::fprintf(out, "%*sSCOPE #%u depth %u", indent, "", id, depth);
    if (open_psn) std::fprintf(out, " [%s:%ld", open_psn->file ? open_psn->file : "NO_FILE", open_psn->line + line_offset);
    if (open_psn) std::fprintf(out, "-%ld]", close_psn ? close_psn->line + line_offset : 0L);
    struct {
        const char* title;
        const SYMLIST* list;
    } lists[] = {{"pointers", pointers}, {"structs", structs}, {"arrays", arrays}, {"scalars", scalars}};
    for (const auto& [title, list] : lists) {
        if (!list) continue;
        std::fprintf(out, "  %s:", title);
        for (const SYMLIST* s = list; s; s = s->next) std::fprintf(out, " %s", s->sym->name);
    }
    std::fputc('\n', out);
    for (const LS* child = first_child; child; child = child->next_sibling) child->print(out, indent + 2);
}

// ---- Pointer records

namespace {

// A level 2 local with the name of a parameter is that parameter's copy.
bool is_a_parameter(const SYMTAB* sym) { return sym->level == 1 || (sym->level == 2 && map_sym_to_parm(sym)); }

PTR* make_PTR_entry(SYMTAB* sym, fkMDATA* member) {
    auto* ptr = new PTR;
    // Until the groups are built anew nothing is known of what it is derived from.
    ptr->root = currfuninfo->bottom_ptr ? currfuninfo->bottom_ptr : ptr;
    ptr->symbol = sym;
    ptr->member = member;
    ptr->scope = sym->level == 0 ? currfuninfo->ls_root : sym->scope;
    TYPE* type = member ? member->type : sym->type;
    if (sym->level == 0) ptr->flags |= PTR_IS_FILE_LEVEL;
    if (is_a_parameter(sym)) ptr->flags |= PTR_IS_A_PARAMETER;
    if (type->qual_kind(false) & QUAL_RESTRICT) ptr->flags |= PTR_IS_RESTRICTED;
    ptr->next = currfuninfo->ptrs;
    ptr->number = ptr->next ? ptr->next->number + 1 : 0;
    currfuninfo->ptrs = ptr;
    return ptr;
}

} // namespace

PTR* find_or_make_PTR_entry(SYMTAB* sym, fkMDATA* member) {
    const TYPE* type = member ? member->type : sym->type;
    if (!type || !type->is_pointer()) return nullptr;
    PTR*& slot = currfuninfo->ptr_map[{sym, member}];
    if (!slot) slot = make_PTR_entry(sym, member);
    return slot;
}

PTR* find_or_make_PTR_entry(NODE* tree) {
    if (!tree || !tree->type || !tree->type->is_pointer()) return nullptr;
    fkMDATA* member = nullptr;
    if (tree->op == STDOT && tree->right && tree->right->op == FIELD) {
        member = tree->right->mval;
        tree = tree->left;
    }
    if (tree->op == UMULT && tree->left && tree->left->op == UAND && !tree->right) tree = tree->left->left;
    if (!tree || tree->op != NAME || !tree->u.sym) return nullptr;
    return find_or_make_PTR_entry(tree->u.sym, member);
}

void copy_PTR_entry(SYMTAB* to, SYMTAB* from) {
    const PTR* original = find_or_make_PTR_entry(from);
    PTR* copy = find_or_make_PTR_entry(to);
    if (!original || !copy) return;
    copy->scope = original->scope;
    copy->flags = original->flags & ~(PTR_IS_A_ROOT | PTR_IS_BOTTOM);
}

LS* true_scope(const NODE* tree) {
    const NODE* t = tree;
    while (t && (t->op == STDOT || t->op == SSA_USE || t->op == SSA_DEF || t->op == SSA_MU || t->op == SSA_CHI)) t = t->left;
    if (!t) return tree->ls;
    const SYMTAB* sym = object_name_if_known(t);
    if (!sym) return tree->ls;
    LS* root = currfuninfo->ls_root;
    if (sym->level == 0) return root;
    if (sym->scope) return sym->scope;
    return is_internal_symbol(sym) && root->first_child ? root->first_child : tree->ls;
}

void print_scopes() {
    if (!fdebug) return;
    if (currfuninfo->ls_root)
        currfuninfo->ls_root->print(fdebug);
    else
        debug_printf("<<NULL SCOPE>>\n");
}
