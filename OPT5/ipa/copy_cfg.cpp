// Copies of bodies: blocks with new labels, statements, symbols without `const`, and scopes.
#include "OPT5/ipa/copy_cfg.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "UTIL/abort.h"

#include <algorithm>

namespace {

// The function is the current one as long as the object lives.
class CURRENT_FUNINFO {
public:
    explicit CURRENT_FUNINFO(FUNINFO* f) : before(currfuninfo) { currfuninfo = f; }
    ~CURRENT_FUNINFO() { currfuninfo = before; }
    CURRENT_FUNINFO(const CURRENT_FUNINFO&) = delete;
    CURRENT_FUNINFO& operator=(const CURRENT_FUNINFO&) = delete;

private:
    FUNINFO* before;
};

// What a variable holds that is set anew at each expansion is not constant in the function.
TYPE* without_const(TYPE* type) {
    type = tp->remove_known_qual(type, QUAL_CONST);
    if (!type->is_pointer()) return type;
    TYPE* pointee = type->type_pointed_to();
    if (!pointee || !pointee->is_const()) return type;
    TYPE* pointer = tp->mk_ptr(tp->remove_known_qual(pointee, QUAL_CONST));
    const unsigned quals = type->qual_kind(false);
    return quals ? tp->mk_qual(pointer, quals) : pointer;
}

class COPIER {
public:
    COPIER(const FUNINFO& from, FUNINFO* to) : body(from), owner(to) {}

    CFG_COPY run() {
        CURRENT_FUNINFO current(owner);
        if (body.ls_root) copy.ls_root = copy_scope_tree(body.ls_root, nullptr);
        for (const SYMTAB* list : {body.new_syms, body.pending_syms, body.memory_syms, body.scalar_syms})
            for (const SYMTAB* s = list; s; s = s->next) copy_local(s);
        for (const auto& [from, to] : scope_of) copy_scope_symbols(from, to);
        copy_blocks();
        for (const BBLK* bb = body.bb_list; bb; bb = bb->dflink) copy_contents(bb, block_of.at(bb));
        copy_exception_table();
        return std::move(copy);
    }

private:
    LS* copy_scope_tree(const LS* from, LS* parent) {
        auto* to = new LS;
        to->parent = parent;
        to->open_psn = from->open_psn;
        to->close_psn = from->close_psn;
        to->function = owner;
        to->id = owner->ls_counter++;
        to->depth = from->depth;
        to->kind = from->kind;
        to->flags = from->flags;
        to->line_offset = from->line_offset;
        scope_of[from] = to;
        for (const LS* child = from->first_child; child; child = child->next_sibling) {
            LS* c = copy_scope_tree(child, to);
            (to->last_child ? to->last_child->next_sibling : to->first_child) = c;
            to->last_child = c;
        }
        return to;
    }

    SYMLIST* copied(const SYMLIST* list) {
        SYMLIST* result = nullptr;
        for (; list; list = list->next) {
            auto it = copy.symbol_of.find(list->sym);
            if (it != copy.symbol_of.end()) result = mk_symlist(it->second, result);
        }
        return revsymlist(result);
    }

    void copy_scope_symbols(const LS* from, LS* to) {
        to->pointers = copied(from->pointers);
        to->structs = copied(from->structs);
        to->arrays = copied(from->arrays);
        to->scalars = copied(from->scalars);
    }

    void copy_local(const SYMTAB* from) {
        SYMTAB* to = copy_symbol(from);
        to->index = owner->next_symbol_index++;
        to->type = without_const(from->type);
        if (from->orig_type) to->orig_type = without_const(from->orig_type);
        to->written_as_parameter = from->written_as_parameter;
        to->bitnum_m = 0;
        to->scope = scope(from->scope);
        if (from->autoinit) {
            to->autoinit = new std::vector<NODE*>;
            for (const NODE* item : *from->autoinit) to->autoinit->push_back(copy_tree(item));
        }
        copy.symbols.push_back(to);
        copy.symbol_of[from] = to;
    }

    LS* scope(const LS* from) const {
        auto it = scope_of.find(from);
        return it == scope_of.end() ? nullptr : it->second;
    }

    void copy_blocks() {
        for (const BBLK* bb = body.bb_list; bb; bb = bb->dflink) {
            auto* to = new BBLK(owner);
            to->uon = -1;
            to->first_psn = bb->first_psn;
            to->last_psn = bb->last_psn;
            to->dFreqIn = bb->dFreqIn;
            to->dFreqOut = bb->dFreqOut;
            label_of_bb(to);
            for (const LBL* lbl = bb->label; lbl; lbl = lbl->next) label_of[lbl] = to->label;
            to->rdflink = copy.last;
            if (copy.last)
                copy.last->dflink = copy.last->uolink = to;
            else
                copy.first = to;
            copy.last = to;
            block_of[bb] = to;
        }
    }

    void copy_contents(const BBLK* from, BBLK* to) {
        LIST* statements = copy_statements(from->statements);
        for (LIST* s = statements; s; s = s->rest) for_each_subtree(s->first, [this](NODE* t) { remap(t); });
        set_statements(to, statements);
        for (const EDGE* e = from->successors; e; e = e->rest) connect(to, block_of.at(e->first), e->prob);
    }

    void copy_exception_table() {
        copy.eht = body.eht;
        for (EHT_ITEM& item : copy.eht) {
            if (!item.cleanup) continue;
            item.cleanup = copy_tree(item.cleanup);
            for_each_subtree(item.cleanup, [this](NODE* t) { remap(t); });
        }
    }

    void remap(NODE* t) {
        t->ls = scope(t->ls);
        if (t->op == NAME && t->u.sym) {
            auto it = copy.symbol_of.find(t->u.sym);
            if (it == copy.symbol_of.end()) return;
            t->u.sym = it->second;
            if (t->type->is_const()) t->type = tp->remove_known_qual(t->type, QUAL_CONST);
        } else if (t->op == LABELREF && t->lbl) {
            --t->lbl->refcount;
            t->lbl = label_of.at(t->lbl);
            ++t->lbl->refcount;
            t->u.lval = INT65(t->lbl->index);
        }
    }

    const FUNINFO& body;
    FUNINFO* owner;
    CFG_COPY copy;
    std::unordered_map<const LS*, LS*> scope_of;         // looked up; walked where the order decides nothing
    std::unordered_map<const BBLK*, BBLK*> block_of;     // looked up
    std::unordered_map<const LBL*, LBL*> label_of;       // looked up
};

} // namespace

CFG_COPY copy_cfg(const FUNINFO& body, FUNINFO* owner) { return COPIER(body, owner).run(); }

std::vector<SYMTAB*> parameters_in_order(const FUNINFO& body) {
    std::vector<SYMTAB*> parameters;
    for (SYMTAB* list : {body.new_syms, body.pending_syms, body.memory_syms, body.scalar_syms})
        for (SYMTAB* s = list; s; s = s->next)
            if (s->level == 1 && s->written_as_parameter) parameters.push_back(s);
    std::sort(parameters.begin(), parameters.end(), [](const SYMTAB* a, const SYMTAB* b) { return a->depnum_m < b->depnum_m; });
    return parameters;
}

void save_cfg(FUNINFO* f) {
    if (f->saved_cfg) return;
    f->saved_cfg = std::make_unique<FUNINFO>(f->name.c_str());
    FUNINFO* saved = f->saved_cfg.get();
    saved->symbol = f->symbol;
    CFG_COPY copy = copy_cfg(*f, saved);
    saved->eht = std::move(copy.eht);
    saved->bb_list = copy.first;
    saved->ls_root = copy.ls_root;
    saved->has_bitfield_access = f->has_bitfield_access;
    saved->address_taken_local = f->address_taken_local;
    saved->has_cqual10_name = f->has_cqual10_name;
    saved->has_nasserts = f->has_nasserts;
    saved->has_intrinsics = f->has_intrinsics;
    saved->has_vector_types = f->has_vector_types;
    saved->has_complex_types = f->has_complex_types;
    for (auto s = copy.symbols.rbegin(); s != copy.symbols.rend(); ++s) {
        (*s)->next = saved->memory_syms;
        saved->memory_syms = *s;
    }
}
