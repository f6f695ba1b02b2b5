// Copies and constants in place of the variables and places that hold them.
//
// Two lists of assignments are asked for each read. The local one holds what the statements of a chain of blocks have
// assigned (local_asgs.cpp), and, in the late mode, what every path to the chain has assigned and not changed since. The
// global one holds assignments of constants and copies to variables that have no other assignment in the function.
//
// Needs: alias marks, pointees, pointer groups; dominators where there are global assignments. Leaves: a simplified graph
// with block numbers where anything was replaced. The assignments stay, for who removes dead ones.
// Sound, for the local list, because at each block that control may enter from elsewhere than the block just walked it is
// emptied but for what holds at the end of every block ahead of it. For the global one, because the only assignment of x dominates the read, and the only assignment of y in `x = y`
// dominates that: were y assigned again between the two, the same path from there on would come to the read without `x =
// y`. Only variables take part that nothing but their NAME reaches, and that live in one call alone.
#include "OPT5/scalar/lcp.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/dataflow.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/side_table.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/scalar/local_asgs.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/simp.h"

#include <optional>
#include <unordered_map>
#include <vector>

namespace {

constexpr int MOST_ROUNDS = 3;

// ---- Globally constant assignments

// An assignment is globally constant where its variable has no other one and what it assigns does not change.
class GLOBAL_ASGS {
public:
    GLOBAL_ASGS() {
        count();
        judge();
    }
    ~GLOBAL_ASGS() {
        for (auto& [sym, value] : values) erase_tree(value);
    }
    bool empty() const { return values.empty(); }
    // Replaces what the statement reads. True if anything; the cell is left empty where nothing of it remains.
    bool statement(LIST* s, const BBLK* bb, int position);

private:
    // Of a variable: the number of its assignments, and the last that was counted.
    struct DEFINITION {
        int count = 0;
        const NODE* asg = nullptr; // the statement that is nothing else, or null
        const BBLK* bb = nullptr;
        int position = 0; // of the statement in its block
    };
    void count();
    void judge();
    bool comes_ahead(const DEFINITION& d, const BBLK* bb, int position) const {
        return d.bb == bb ? d.position < position : currfuninfo->dominators->dominates(d.bb, bb);
    }
    NODE* value_to_keep(const DEFINITION& d) const;
    NODE* read(NODE* t);
    NODE* lookup_global_ASG(NODE* name);

    std::unordered_map<const SYMTAB*, DEFINITION> definitions; // looked up, never walked
    std::unordered_map<const SYMTAB*, NODE*> values;           // looked up, never walked but to free
    std::vector<const SYMTAB*> candidates;                     // in the order of the statements
    const BBLK* block = nullptr;                               // of the statement in work
    int at = 0;
    bool any = false;
};

void GLOBAL_ASGS::count() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        int position = 0;
        for (LIST* s = bb->statements; s; s = s->rest) {
            const NODE* t = s->first;
            ++position;
            for_each_written_name(t, [&](const NODE* name, const NODE* by) {
                DEFINITION& d = definitions[name->u.sym];
                const bool is_whole = t->op == ASG && by == t && t->left == name;
                // An assignment that may be left out counts as several.
                d.count += is_whole || tree_is_arg_prolog(t) ? 1 : 2;
                d.asg = is_whole && !tree_is_arg_prolog(t) ? t : nullptr;
                d.bb = bb;
                d.position = position;
                if (d.asg) candidates.push_back(name->u.sym);
            });
        }
    }
}

NODE* GLOBAL_ASGS::value_to_keep(const DEFINITION& d) const {
    const NODE *target = d.asg->left, *value = d.asg->right;
    TYPE* type = target->u.sym->type->stqs();
    if (value->op == ICON && type->is_int() && value->type->is_int()) return mk_integer_constant(value->u.lval, type);
    if (value->op == FCON && type->is_float() && equiv_mtypes(value->type, type)) return copy_tree(value);
    if (!is_private_name(value) || !equiv_mtypes(value->u.sym->type->stqs(), type)) return nullptr;
    if (!ok_to_propagate_for_pointer(value, target)) return nullptr;
    auto source = definitions.find(value->u.sym);
    if (source == definitions.end() || source->second.count != 1) return nullptr;
    return comes_ahead(source->second, d.bb, d.position) ? copy_tree(value) : nullptr;
}

void GLOBAL_ASGS::judge() {
    for (const SYMTAB* sym : candidates) {
        const DEFINITION& d = definitions[sym];
        if (d.count != 1 || !d.asg || !is_private_name(d.asg->left)) continue;
        need(fact::dominators);
        NODE* value = value_to_keep(d);
        if (!value) continue;
        if (print_debug && values.empty()) debug_printf("\n\t============== Globally constant assignments:\n");
        if (print_debug) debug_printf("%s\n", stmt2infix(d.asg).c_str());
        values[sym] = value;
    }
    if (print_debug && !values.empty()) debug_printf("\n\t============================================\n");
}

NODE* GLOBAL_ASGS::lookup_global_ASG(NODE* name) {
    const NODE* value = nullptr;
    for (const SYMTAB* sym = name->u.sym;;) { // a copy of a copy
        auto known = values.find(sym);
        if (known == values.end() || !comes_ahead(definitions.at(sym), block, at)) break;
        value = known->second;
        if (value->op != NAME) break;
        sym = value->u.sym;
    }
    if (!value || !rewrite_is_allowed(name)) return name;
    report_replacement("\n\t============== (%ld) 'lookup_global_ASG' is replacing this:\n",
                       "\n\t============== with the following substitute:\n",
                       "\n\t=============================================\n", name, value);
    any = true;
    return value_in_place_of(name, value);
}

NODE* GLOBAL_ASGS::read(NODE* t) {
    if (!t) return nullptr;
    switch (t->op) {
    case NAME: return lookup_global_ASG(t);
    case UAND:
    case ARGREF:
    case LABELREF:
    case FIELD: return t;
    default: break;
    }
    if (!left_names_variable(t)) t->left = read(t->left);
    t->right = read(t->right);
    return t;
}

bool GLOBAL_ASGS::statement(LIST* s, const BBLK* bb, int position) {
    NODE* t = s->first;
    if (t->op == PPRAGMA || t->op == ASM || t->op == BRANCH || t->op == PCOMMA || tree_is_arg_prolog(t) ||
        tree_is_EH_SWITCH(t) || (t->op == IF && t->left->op == ENDLOOP))
        return false;
    block = bb;
    at = position;
    any = false;
    if (t->op == IF || t->op == SWITCH)
        t->left = read(t->left);
    else
        s->first = t = read(t);
    if (any) s->first = peel_for_effect(simp_tree(t, nullptr));
    return any;
}

// ---- Assignments that hold on every path

// Copies and constants: `x = y` holds behind it until one of the two is written. A statement that may be left in its middle
// may have written or not: it makes nothing hold, and ends what it may write.
class AVAILABLE_ASGS {
public:
    static constexpr size_t MOST = 256; // those that follow are not looked at

    AVAILABLE_ASGS() {
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest)
                if (is_copy(s->first) && !number_of(s->first) && asgs.size() < MOST) enter(s->first);
        if (asgs.empty()) return;
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) summarize(bb);
        flow.emplace(FLOW::FORWARD, MEET::INTERSECTION, none(), [this](const BBLK* bb, BITVEC& set) {
            set -= ended[bb];
            set |= made[bb];
        });
    }
    AVAILABLE_ASGS(const AVAILABLE_ASGS&) = delete;
    AVAILABLE_ASGS& operator=(const AVAILABLE_ASGS&) = delete;
    ~AVAILABLE_ASGS() {
        for (NODE* asg : asgs) erase_tree(asg);
    }
    void assume_at_entry(const BBLK* bb, LOCAL_ASGS& known) const {
        if (!flow) return;
        const BITVEC& set = flow->at_entry(bb);
        for (uint32_t i = set.next_set(0); i < set.bits; i = set.next_set(i + 1)) known.assume(asgs[i]);
    }

private:
    BITVEC none() const { return BITVEC(static_cast<uint32_t>(asgs.size())); }

    static bool is_copy(const NODE* t) {
        if (t->op != ASG || tree_is_arg_prolog(t) || !is_private_name(t->left)) return false;
        return t->right->op == ICON || (is_private_name(t->right) && t->right->u.sym != t->left->u.sym);
    }
    // Of an assignment that says the same, from wherever.
    std::optional<uint32_t> number_of(const NODE* t) const {
        const auto found = of_variable.find(t->left->u.sym);
        if (found != of_variable.end())
            for (uint32_t i : found->second)
                if (asgs[i]->left->u.sym == t->left->u.sym && trees_are_congruent(asgs[i]->right, t->right, false)) return i;
        return {};
    }
    void enter(const NODE* t) {
        const auto number = static_cast<uint32_t>(asgs.size());
        of_variable[t->left->u.sym].push_back(number);
        if (t->right->op == NAME) of_variable[t->right->u.sym].push_back(number);
        asgs.push_back(copy_tree(t)); // the walk changes statements
    }
    void summarize(const BBLK* bb) {
        BITVEC &in = made[bb] = none(), &out = ended[bb] = none();
        for (const LIST* s = bb->statements; s; s = s->rest) {
            for_each_written_name(s->first, [&](const NODE* name, const NODE*) {
                const auto found = of_variable.find(name->u.sym);
                if (found == of_variable.end()) return;
                for (uint32_t i : found->second) in.clear(i), out.set(i);
            });
            if (!is_copy(s->first)) continue;
            if (const auto number = number_of(s->first)) in.set(*number);
        }
    }

    std::vector<NODE*> asgs;
    std::unordered_map<const SYMTAB*, std::vector<uint32_t>> of_variable; // looked up alone
    SIDE_TABLE<BITVEC> made, ended;
    std::optional<DATAFLOW> flow;
};

// ---- The walk

bool walk_global_asgs() {
    GLOBAL_ASGS known;
    bool any = false;
    for (BBLK* bb = currfuninfo->bb_list; bb && !known.empty(); bb = bb->dflink) {
        if (bb->is_in_LIR_form()) continue;
        int position = 0;
        for (LIST* s = bb->statements; s; s = s->rest) any |= known.statement(s, bb, ++position);
        if (any) drop_empty_cells(&bb->statements);
    }
    return any;
}

bool walk_local_asgs(unsigned kinds, const AVAILABLE_ASGS* available = nullptr) {
    LOCAL_ASGS known(kinds);
    const BBLK* last = nullptr; // the block just walked
    bool any = false;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        const EDGE* before = bb->predecessors;
        if (!last || !before || before->rest || before->first != last) {
            known.restart();
            if (available) available->assume_at_entry(bb, known);
        }
        last = bb->is_in_LIR_form() ? nullptr : bb;
        if (!last) continue;
        walk_block(known, bb, &any);
    }
    return any;
}

} // namespace

void copyprop(int mode) {
    if (opt_level() == 0 || !currfuninfo || !currfuninfo->bb_list) return;
    sym_split(currfuninfo);
    for (int left = MOST_ROUNDS; left > 0; --left) {
        if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'copyprop' -----------------\n");
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest)
                if (s->first->op == COMMAOP) promote_toplevel_COMMAOPs_in_list(s, s->rest);
        need(fact::alias);
        bool any = mode != 0 && walk_global_asgs();
        std::optional<AVAILABLE_ASGS> available;
        if (mode == 1) available.emplace();
        any |= walk_local_asgs(ASGS_TO_NAMES | ASGS_TO_PARTS | (mode == 2 ? +ASGS_KEEP_TESTS : 0u), available ? &*available : nullptr);
        if (!any) return;
        changed(fact::graph);
        simpcfg(0, 0);
    }
}

void lcse_subrange_assignments() {
    if (!currfuninfo || !currfuninfo->bb_list) return;
    need(fact::alias);
    if (walk_local_asgs(ASGS_TO_PARTS)) changed(fact::graph);
}
