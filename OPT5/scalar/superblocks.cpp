// Superblocks of the graph as it is: chains of blocks of which each but the first is entered from the one before alone.
//
// What is known of variables at the end of one block holds at the start of the next, so that constants and copies
// assigned in a chain replace later reads.
//
// Needs: alias marks. Leaves: a simplified graph with block numbers where anything was replaced.
// Sound because an assignment to a variable ends what is known of it and of its copies, and only variables take part
// that nothing but their NAME can change: after `x = y` a store through a pointer to y would make them differ.

#include "OPT5/scalar/sblk.h"
#include "OPT5/scalar/simpcfg.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"

#include <memory>
#include <unordered_map>
#include <unordered_set>

register_option pass_disable_superblock_opt("disable:superblock_opt");

namespace {

void collect_written(const NODE* t, std::unordered_set<const SYMTAB*>& written) {
    for_each_written_name(t, [&](const NODE* name, const NODE*) { written.insert(name->u.sym); });
}

class PROPAGATION {
public:
    ~PROPAGATION() {
        for (auto& [sym, value] : values) erase_tree(value);
    }

    bool block(BBLK* bb) {
        bool changed = false;
        for (LIST* s = bb->statements; s; s = s->rest) changed |= statement(s);
        return changed;
    }

private:
    bool statement(LIST* s) {
        NODE* t = s->first;
        if (t->op == PPRAGMA || t->op == ASM || t->op == BRANCH || t->op == PCOMMA || tree_is_arg_prolog(t) ||
            tree_is_EH_SWITCH(t)) {
            forget_written(t);
            return false;
        }
        // What an assignment below the root writes is neither the old nor the new value throughout the statement.
        std::unordered_set<const SYMTAB*> written;
        collect_written(t->left, written);
        collect_written(t->right, written);
        for (const SYMTAB* sym : written) forget(sym);
        bool changed = false;
        if (!values.empty()) {
            s->first = t = read(t, &changed);
            if (changed) s->first = t = simp_tree(t, nullptr);
        }
        forget_written(t);
        if (t->op == ASG && written.empty()) learn(t);
        return changed;
    }

    NODE* read(NODE* t, bool* changed) {
        if (!t) return nullptr;
        switch (t->op) {
        case NAME: return value_of(t, changed);
        case UAND:
        case ARGREF:
        case LABELREF:
        case FIELD: return t;
        case IF:
        case SWITCH: t->left = t->left->op == ENDLOOP ? t->left : read(t->left, changed); return t;
        case RETURN: t->right = read(t->right, changed); return t;
        default: break;
        }
        if (!left_names_variable(t)) t->left = read(t->left, changed);
        t->right = read(t->right, changed);
        return t;
    }

    NODE* value_of(NODE* name, bool* changed) {
        auto it = values.find(name->u.sym);
        if (it == values.end()) return name;
        NODE* value = copy_tree(it->second);
        value->ls = name->ls;
        NODE* fitted = coerce_to_type(name->type->stqs(), value);
        erase_tree(name);
        *changed = true;
        return fitted;
    }

    void learn(const NODE* asg) {
        if (!is_private_name(asg->left)) return;
        SYMTAB* sym = asg->left->u.sym;
        const NODE* value = asg->right;
        TYPE* type = sym->type->stqs();
        if (value->op == ICON && type->is_int() && value->type->is_int())
            values[sym] = mk_integer_constant(value->u.lval, type);
        else if (value->op == FCON && type->is_float() && equiv_mtypes(value->type, type))
            values[sym] = copy_tree(value);
        else if (is_private_name(value) && value->u.sym != sym && equiv_mtypes(value->u.sym->type->stqs(), type)) {
            values[sym] = copy_tree(value);
            copies[value->u.sym].push_back(sym);
        }
    }

    void forget_written(const NODE* t) {
        std::unordered_set<const SYMTAB*> written;
        collect_written(t, written);
        for (const SYMTAB* sym : written) forget(sym);
    }

    void drop(const SYMTAB* sym) {
        auto it = values.find(sym);
        if (it == values.end()) return;
        erase_tree(it->second);
        values.erase(it);
    }

    // The variable itself, and what is a copy of it.
    void forget(const SYMTAB* sym) {
        drop(sym);
        auto it = copies.find(sym);
        if (it == copies.end()) return;
        for (const SYMTAB* copy : it->second) {
            auto value = values.find(copy);
            if (value != values.end() && value->second->op == NAME && value->second->u.sym == sym) drop(copy);
        }
        copies.erase(it);
    }

    std::unordered_map<const SYMTAB*, NODE*> values; // looked up, never walked but to free
    std::unordered_map<const SYMTAB*, std::vector<const SYMTAB*>> copies;
};

BBLK* only_predecessor(const BBLK* bb) {
    const EDGE* e = bb->predecessors;
    return e && !e->rest ? e->first : nullptr;
}

// A block joins the chain of its only predecessor if that is the chain's last block. Predecessors come first in the
// order of the graph.
std::vector<std::unique_ptr<SBLK>> form_superblocks() {
    std::vector<std::unique_ptr<SBLK>> superblocks;
    SBLK::next_number = 1;
    SIDE_TABLE<SBLK*> chain_of; // null: not looked at yet
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const BBLK* before = only_predecessor(bb);
        SBLK* chain = before ? chain_of[before] : nullptr;
        if (chain && chain->tail == before) {
            chain->add_basic_block(bb);
        } else {
            superblocks.push_back(std::make_unique<SBLK>(bb));
            chain = superblocks.back().get();
        }
        chain_of[bb] = chain;
    }
    return superblocks;
}

} // namespace

void optimize_superblocks_in_cfg() {
    FUNINFO* f = currfuninfo;
    if (!f || !f->bb_list || pass_disable_superblock_opt) return;
    if (print_debug) debug_printf("\n\n\t\t\t------ ENTERING 'optimize_superblocks_in_cfg' ------\n");
    need(fact::alias_marks);
    bool changed = false;
    const auto superblocks = form_superblocks();
    for (const auto& superblock : superblocks) {
        if (print_debug && fdebug && superblock->contents.size() > 1) superblock->print(false, fdebug);
        PROPAGATION propagation;
        for (BBLK* bb : superblock->contents)
            if (!bb->is_in_LIR_form()) changed |= propagation.block(bb);
    }
    if (changed) simpcfg(false, false);
}
