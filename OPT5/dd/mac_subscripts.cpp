// The multiplier computes one product an iteration: a subscript like `i * stride` takes it from the sum's. Where that
// is all that stands between a loop and the hardware, the subscript steps instead: k = i * stride; ... i++, k +=
// stride.
//
// Needs: alias marks. Leaves: the graph. Sound because the value has the product's bits at every point of the loop: it
// steps right behind its variable, in unsigned arithmetic, which wraps.
#include "OPT5/dd/mac.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"

// The one statement of the loop that changes the variable; null if there is none, or more than a step.
LIST* SUBSCRIPTS::only_change_of(const SYMTAB* sym, bool* any) const {
    LIST* found = nullptr;
    NODE* name = mk_NAME(const_cast<SYMTAB*>(sym));
    *any = false;
    for (LIST* s = loop.block->statements; s; s = s->rest) {
        if (!tree_modifies_lvalue(s->first, name)) continue;
        VARIABLE_STEP step;
        const bool is_first_step = !*any && read_variable_step(s->first, &step) && step.sym == sym;
        found = is_first_step ? s : nullptr;
        *any = true;
    }
    erase_tree(name);
    return found;
}

bool SUBSCRIPTS::read(const NODE* t, PRODUCT* product) const {
    if (t->op != MULT || !t->type->is_int() || !is_private_name(t->left) || !is_private_name(t->right)) return false;
    if (t->left->u.sym == t->right->u.sym) return false;
    SYMTAB *a = t->left->u.sym, *b = t->right->u.sym;
    bool a_moves, b_moves;
    const LIST *a_step = only_change_of(a, &a_moves), *b_step = only_change_of(b, &b_moves);
    if (a_moves && b_moves) return false;
    if ((a_moves && !a_step) || (b_moves && !b_step)) return false;
    *product = {b_moves ? b : a, b_moves ? a : b, nullptr, t->type};
    return true;
}

void SUBSCRIPTS::put_ahead(NODE* asg) {
    for (BBLK* entry : loop.entries) {
        NODE* t = entry == loop.entries.back() ? asg : copy_tree(asg);
        ahead.push_back(t);
        insert_at_end_of_body(entry, t);
    }
}

// Sets the value ahead of the loop, and steps it there.
void SUBSCRIPTS::begin(PRODUCT& p) {
    TYPE* type = tp->mk_unsigned(p.type->stqs());
    auto operand = [type](SYMTAB* sym) { return coerce_to_type(type, mk_NAME(sym)); };
    p.value = sym_temp('T', -1, type, nullptr);
    put_ahead(mk_ASG(mk_NAME(p.value), maketree(MULT, operand(p.steps), operand(p.stays), type)));
    bool moves;
    LIST* cell = only_change_of(p.steps, &moves);
    if (!moves) return;
    VARIABLE_STEP step;
    read_variable_step(cell->first, &step);
    NODE* by = operand(p.stays);
    const bool goes_down = step.c < INT65(0);
    const INT65 size = goes_down ? -step.c : step.c;
    if (size != INT65(1)) {
        SYMTAB* amount = sym_temp('T', -1, type, nullptr);
        put_ahead(mk_ASG(mk_NAME(amount), maketree(MULT, by, mk_integer_constant(size, type), type)));
        by = mk_NAME(amount);
    }
    NODE* next = maketree(goes_down ? MINUS : PLUS, mk_NAME(p.value), by, type);
    insert_behind(cell, mk_ASG(mk_NAME(p.value), next), cell->psn);
}

void SUBSCRIPTS::step(int count) {
    std::vector<std::pair<NODE**, PRODUCT>> found; // by what holds it
    auto look = [&](auto& self, NODE** link, bool in_address) -> void {
        NODE* t = *link;
        if (!t) return;
        PRODUCT p;
        if (in_address && read(t, &p)) return found.emplace_back(link, p), void();
        in_address |= op_is_indirection(t->op);
        self(self, &t->left, in_address);
        self(self, &t->right, in_address);
    };
    for (LIST* s = loop.block->statements; s->rest; s = s->rest) look(look, &s->first, false);
    if (static_cast<int>(found.size()) != count) return;
    for (auto& [link, p] : found) {
        PRODUCT* known = nullptr;
        for (PRODUCT& other : products)
            if (other.steps == p.steps && other.stays == p.stays && equiv_mtypes(other.type, p.type)) known = &other;
        if (!known) {
            products.push_back(p);
            known = &products.back();
            begin(*known);
        }
        erase_tree(*link);
        *link = coerce_to_type(p.type, mk_NAME(known->value));
    }
}

void SUBSCRIPTS::drop() {
    for (BBLK* entry : loop.entries) drop_statements(entry, ahead);
    ahead.clear();
}
