// The operators of SSA form on the references of a function, and what each write may change.
//
// Sound because a wrapped reference is evaluated where its operator is taken to be: an assignment is a definition only
// as a whole statement, so that everything else in the statement is evaluated ahead of it; where a call or another
// write stands within a statement, a reference to memory is wrapped only among the operands of the only one. `g + f()`
// leaves g bare. An object that is written within an expression, or whose accesses do not all show which bits they are
// of, is given up unless it is memory: of memory every write that is no definition is asked for what it may change.
#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/dd/ssa_build.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/walks.h"

#include <algorithm>
#include <unordered_set>

namespace {


// Other than as the root of a statement.
bool writes_within(const NODE* t) {
    if (!op_has_effect(t->op) || op_transfers_control(t->op) || is_magic_EH_MCALL(t)) return false;
    return writes_left_operand(t->op) || may_write_indirectly(t);
}

class WRAPPER {
public:
    explicit WRAPPER(SSA_BUILD& build) : build(build) {}

    void statement(LIST* cell) {
        NODE* t = cell->first;
        is_root_written = opcode_is_ASG(t->op);
        root = t;
        writes = NOT_COUNTED;
        is_operand_of_only_write = false;
        if (is_root_written)
            assignment(&cell->first);
        else
            value(&cell->first);
    }
    void refuse(const SYMTAB* sym) { refused.insert(sym); }
    void give_up_refused();

private:
    void value(NODE** link);
    void access(NODE** link);
    void operands_of_place(NODE** link);
    void operands_of_write(NODE* t);
    void assignment(NODE** link);
    void write_within(NODE** link);
    void note_untracked(const NODE* lvalue);
    bool is_left_bare(const NODE* lvalue) {
        const bool is_bare = build.onlyMemory && is_register_reference(lvalue, build);
        build.left_bare += is_bare;
        return is_bare;
    }
    void site(SSA_SITE::KIND kind, NODE** link, NODE* node) { build.sites.push_back({kind, link, node}); }

    static constexpr int NOT_COUNTED = -1;
    int count_writes() {
        if (writes != NOT_COUNTED) return writes;
        writes = 0;
        for_each_subtree(root, [this](const NODE* n) { writes += writes_within(n) && !(is_root_written && n == root); });
        return writes;
    }

    SSA_BUILD& build;
    std::unordered_set<const SYMTAB*> refused; // membership only
    const NODE* root = nullptr;                // of the statement, while its writes are not counted
    int writes = 0;                            // of the statement, its root assignment aside; NOT_COUNTED
    bool is_root_written = false, is_operand_of_only_write = false;
};

// Which bits are accessed is not seen, or may not be tracked.
void WRAPPER::note_untracked(const NODE* lvalue) {
    const NODE* name = name_of_place(lvalue);
    const SYMTAB* sym = name ? name->u.sym : object_name_if_known(lvalue);
    if (sym && !sym->is_function() && !is_SSA_memory(sym, build)) refuse(sym);
}

void WRAPPER::operands_of_place(NODE** link) {
    for (;;) {
        NODE* t = *link;
        switch (t->op) {
        case NAME: return;
        case UMULT:
            if (t->right) value(&t->right);
            return value(&t->left);
        case STREF: return value(&t->left);
        case QUEST: return value(link);
        default:
            if (op_has_effect(t->op) || !place_below(t)) return value(link);
            link = place_below(t) == t->right ? &t->right : &t->left;
        }
    }
}

void WRAPPER::access(NODE** link) {
    NODE* t = *link;
    if (is_left_bare(t)) return;
    SSAVAR* v = SSAVAR_for_reference(t, build);
    NODE** base = link_without_members(link);
    if (op_is_lvalue((*base)->op))
        operands_of_place(base);
    else
        value(base); // a member of a value
    if (!v) return op_is_lvalue((*base)->op) ? note_untracked(t) : void();
    if (v->is_memory() && !is_operand_of_only_write && count_writes() > 0) return;
    *link = make_SSA_USE(t, v, nullptr);
    site(SSA_SITE::USE, link, *link);
}

void WRAPPER::operands_of_write(NODE* t) {
    const bool before = is_operand_of_only_write;
    is_operand_of_only_write = count_writes() == 1;
    if (t->right) value(&t->right);
    if (t->left) value(&t->left);
    is_operand_of_only_write = before;
}

void WRAPPER::write_within(NODE** link) {
    NODE* t = *link;
    if (writes_left_operand(t->op) && t->left) {
        if (t->right) value(&t->right);
        operands_of_place(&t->left);
        effects::visit_places(t, t->left, [this](const WRITE& w) {
            if (const NODE* name = name_of_place(w.place)) refuse(name->u.sym);
            note_untracked(w.place);
        });
    } else
        operands_of_write(t);
    site(SSA_SITE::WRITE, link, t);
}

void WRAPPER::value(NODE** link) {
    for (; *link;) {
        NODE* t = *link;
        if (op_is_lvalue(t->op)) return access(link);
        if (t->op == ARGREF) note_untracked(t->left); // the callee writes it
        if (t->op == UAND || t->op == ARGREF) return operands_of_place(&t->left);
        if (t->op == PPRAGMA || t->op == LABELREF) return;
        if (writes_within(t)) return write_within(link);
        if (t->op != IF && t->op != SWITCH && t->right) value(&t->right);
        link = &t->left;
    }
}

void WRAPPER::assignment(NODE** link) {
    NODE* t = *link;
    const bool reads = t->op != ASG && t->op != STASG && t->op != ARASG;
    if (t->right) value(&t->right);
    if (is_left_bare(t->left)) {
        if (t->left->type->is_pointer()) site(SSA_SITE::WRITE, link, t); // what is behind it is another place then
        return;
    }
    SSAVAR* v = op_is_lvalue(t->left->op) ? SSAVAR_for_reference(t->left, build) : nullptr;
    operands_of_place(&t->left);
    if (!v) {
        effects::visit_places(t, t->left, [this](const WRITE& w) { note_untracked(w.place); });
        return site(SSA_SITE::WRITE, link, t);
    }
    // `x op= e` evaluates e, whatever it writes, and reads x then.
    if (reads) {
        t->left = make_SSA_USE(t->left, v, nullptr);
        site(SSA_SITE::USE, &t->left, t->left);
    }
    NODE* definition = new_node(SSA_DEF, t->type);
    definition->left = t;
    definition->ls = t->ls;
    definition->u.ssa = v;
    *link = definition;
    site(SSA_SITE::DEF, link, definition);
}

void WRAPPER::give_up_refused() {
    if (refused.empty()) return;
    for (const auto& v : ssa_state.variables)
        if (refused.count(v->base())) v->flags |= SSAVAR_munged;
    size_t kept = 0;
    for (size_t i = 0, first = 0; i <= build.sites.size(); ++i) {
        for (; first < build.first_site.size() && build.first_site[first] == i; ++first) build.first_site[first] = kept;
        if (i == build.sites.size()) break;
        SSA_SITE s = build.sites[i];
        if (s.kind != SSA_SITE::WRITE && ssa_variable(s.node)->has(SSAVAR_munged)) {
            NODE* below = s.node->left;
            *s.link = below;
            erase_node(s.node);
            if (s.kind == SSA_SITE::USE) continue;
            s = {SSA_SITE::WRITE, s.link, below};
        }
        build.sites[kept++] = s;
    }
    build.sites.resize(kept);
}

} // namespace

namespace {

bool has_local_structures() {
    for (const SYMTAB* list : {currfuninfo->new_syms, currfuninfo->pending_syms, currfuninfo->memory_syms})
        for (const SYMTAB* s = list; s; s = s->next)
            if (s->type->is_csu()) return true;
    return false;
}

void find_indexed_objects(SSA_BUILD& build) {
    if (!has_local_structures()) return;
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (const LIST* s = bb->statements; s; s = s->rest)
            for_each_subtree(static_cast<const NODE*>(s->first), [&build](const NODE* t) {
                SSA_PLACE place;
                if (t->op != UMULT || t->left->op == NAME || find_SSA_place(t, &place)) return;
                const SYMTAB* sym = object_name_if_known(t);
                if (sym && sym->is_automatic() && sym->type->is_csu()) build.indexed.insert(sym);
            });
}

} // namespace

void wrap_SSA_references(SSA_BUILD& build) {
    find_indexed_objects(build);
    WRAPPER wrapper(build);
    for (const EHT_ITEM& item : currfuninfo->eht)
        for_each_subtree(static_cast<const NODE*>(item.cleanup), [&wrapper](const NODE* t) {
            if (t->op == NAME && t->u.sym) wrapper.refuse(t->u.sym);
        });
    build.blocks.assign(static_cast<size_t>(currfuninfo->bb_count) + 1, nullptr);
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) build.blocks[static_cast<size_t>(bb->dfn)] = bb;
    build.first_site.assign(build.blocks.size() + 1, 0);
    for (size_t i = 1; i < build.blocks.size(); ++i) {
        BBLK* bb = build.blocks[i];
        build.first_site[i] = build.sites.size();
        if (!bb) continue;
        for (LIST* s = bb->statements; s; s = s->rest) {
            // What the parameters' variables hold behind the prolog counts as their value on entry.
            if (!s->first || (bb == currfuninfo->bb_list && s == bb->statements && tree_is_arg_prolog(s->first)))
                continue;
            wrapper.statement(s);
        }
    }
    build.first_site[build.blocks.size()] = build.sites.size();
    wrapper.give_up_refused();
}

// ---- Changes

SSA_CHANGES::SSA_CHANGES(const SSA_BUILD& form)
    : build(form), stamp(ssa_state.variables.size(), 0),
      // Beyond that every answer is "may": time stays linear.
      questions_left(100000 + 64 * form.references()) {}

void SSA_CHANGES::add(SSAVAR* v) {
    if (stamp[v->uid] == now) return;
    stamp[v->uid] = now;
    found.push_back(v);
    if (v->sym) add_what_is_behind(v->sym);
}

// Another pointer points elsewhere.
void SSA_CHANGES::add_what_is_behind(const SYMTAB* pointer) {
    if (pointer->type->is_pointer()) for_each_in_ring(find_pointed_SSAVAR_ring(pointer), [this](SSAVAR* v) { add(v); });
}

void SSA_CHANGES::add_what_overlaps(SSAVAR* written) {
    if (!written->has(SSAVAR_unioned)) return;
    for_each_in_ring(written->ring, [this, written](SSAVAR* v) {
        if (v != written && v->overlaps(written)) add(v);
    });
}

bool SSA_CHANGES::may_meet(const NODE* write, const NODE* place, const SSAVAR* written, const SSAVAR* v) {
    if (written) {
        if (written->sym == v->sym && written->pointer == v->pointer) return written->overlaps(v);
        if (written->sym && v->sym) return object_symbols_may_alias(written->sym, v->sym);
        if (!place) place = written->tree;
    }
    if (--questions_left < 0) return true;
    if (place) return lvalues_may_be_aliased(access_of_place(place), v->tree);
    if (op_is_call(write->op) || op_is_intrinsic(write->op) || write->op == MEMCPY)
        return call_may_modify(write, v->tree);
    return tree_modifies_lvalue(write, v->tree);
}

void SSA_CHANGES::add_aliases(const NODE* write, const NODE* place, const SSAVAR* written,
                              const std::vector<SSAVAR*>& live_memory) {
    for (SSAVAR* v : live_memory)
        if (v != written && stamp[v->uid] != now && may_meet(write, place, written, v)) add(v);
}

void SSA_CHANGES::find(const SSA_SITE& site, const std::vector<SSAVAR*>& live_memory) {
    ++now;
    if (site.kind == SSA_SITE::DEF) {
        SSAVAR* v = ssa_variable(site.node);
        stamp[v->uid] = now;
        add_what_overlaps(v);
        if (v->sym) add_what_is_behind(v->sym);
        const NODE* assignment = ssa_assignment(site.node);
        if (v->is_memory()) add_aliases(site.node, assignment ? below_SSA(assignment->left) : nullptr, v, live_memory);
        return;
    }
    for_each_write_of_node(site.node, [&](const WRITE& w) {
        const NODE* place = w.by->op == MEMCPY ? nullptr : w.place;
        const NODE* name = place ? name_of_place(place) : nullptr;
        const SYMTAB* sym = name ? name->u.sym : place ? object_name_if_known(place) : nullptr;
        if (sym) {
            for_each_in_ring(find_SSAVAR_ring(sym), [&](SSAVAR* v) {
                if (!v->has(SSAVAR_munged) && (!v->is_memory() || may_meet(w.by, place, nullptr, v))) add(v);
            });
            add_what_is_behind(sym);
            if (!is_SSA_memory(sym, build)) return;
        }
        add_aliases(w.by, place, nullptr, live_memory);
    });
}
