// Points-to propagation: what each pointer variable may refer to where a block begins, and each access where it stands.
//
// Forward over the blocks to the least solution that holds at every place: a block that has not been reached yet says
// nothing, and what a predecessor knows nothing of is anything. Only statements that act on pointers are walked until the
// solution stands, in order of the blocks' numbers, and only blocks whose entry has changed; then every access gets its
// binding in one walk. A function without pointers that are assigned or passed costs a look at its writes.
//
// Needs: alias marks, pointees, numbers of blocks. Leaves: all facts.
// Sound because the bindings of a variable that calls and stores may reach end at them, a variable that is not known to
// be assigned as a whole has none, and meets only grow: offsets become classes, and many targets become categories.
#include "OPT5/alias/alias.h"
#include "OPT5/alias/bindings.h"
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"

#include <algorithm>
#include <atomic>

namespace {

constexpr int POINTS_TO_IS_OFF = 7; // of `aux_cmd_flag`
constexpr size_t MOST_CELLS = 400000;  // beyond these nothing is known
constexpr int MOST_VISITS = 64;        // of one block
constexpr unsigned MOST_POINTERS = 1u << 16;

class PROPAGATION {
public:
    explicit PROPAGATION(PT_STORE& s) : store(s), transfer(s), blocks(static_cast<size_t>(currfuninfo->bb_count) + 1) {}
    void run();

private:
    struct BLOCK {
        BBLK* bb = nullptr;
        std::vector<const NODE*> acting; // on pointers
        bool is_reached = false, is_waiting = false;
        int visits = 0;
    };
    void enter(SYMTAB* ptr);
    void find_pointers();
    PT_STATE at_function_entry();
    PT_STATE joined(const BLOCK& b) const;
    bool visit(BLOCK& b);
    bool propagate();
    void bind_accesses_of(const BLOCK& b, const PT_TRANSFER::LOOK& bind);
    BLOCK& of(const BBLK* bb) { return blocks[static_cast<size_t>(bb->dfn)]; }
    const BLOCK& of(const BBLK* bb) const { return blocks[static_cast<size_t>(bb->dfn)]; }

    PT_STORE& store;
    PT_TRANSFER transfer;
    std::vector<BLOCK> blocks; // by number, from 1
    PT_STATE seeds;
};

bool is_kept_track_of(const SYMTAB* sym) {
    return sym->type->is_pointer() && !sym->type->is_volatile() && !sym->lives_in_others && !sym->hosts_others &&
           !(sym->cqual & CQ_GLOBAL_REGISTER) && !sym_appears_in_EHT(sym);
}

void PROPAGATION::enter(SYMTAB* ptr) {
    OPT_ASSERT(ptr != NULL);
    if (store.numbers.find(ptr) || !is_kept_track_of(ptr) || store.pointers.size() == MOST_POINTERS) return;
    store.numbers[ptr] = static_cast<unsigned>(store.pointers.size());
    store.pointers.push_back({ptr, only_its_name_reaches(ptr)});
}

void PROPAGATION::find_pointers() {
    for (SYMTAB* list : {currfuninfo->memory_syms, currfuninfo->scalar_syms, currfuninfo->pending_syms})
        for (SYMTAB* sym = list; sym; sym = sym->next)
            if (sym->level == 1) enter(sym);
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        BLOCK& b = of(bb);
        b.bb = bb;
        for (const LIST* l = bb->statements; l; l = l->rest) {
            bool acts = l->first->op == ASSERT || l->first->op == NASSERT;
            for_each_write(l->first, [&](const WRITE& w) {
                const NODE* name = w.place ? name_of_place(w.place) : nullptr;
                acts = acts || !name || !only_its_name_reaches(name->u.sym) || name->u.sym->type->is_pointer();
                if (name && name->u.sym->type->is_pointer()) enter(name->u.sym);
            });
            if (acts) b.acting.push_back(l->first);
        }
    }
    if (!store.pointers.empty()) store.maps.set_room(static_cast<unsigned>(store.pointers.size()));
}

// A parameter refers to nothing that is made when the function is entered.
PT_STATE PROPAGATION::at_function_entry() {
    PT_STATE s;
    for (unsigned i = 0; i < store.pointers.size(); ++i) {
        SYMTAB* sym = store.pointers[i].sym;
        if (sym->level != 1 || !sym->written_as_parameter) continue;
        PTENV e;
        const PTENV* summary = nullptr;
        if (find_PT_in_formal_parms(&summary, sym)) e = *summary;
        e.parm = sym;
        e.categories = summary ? e.categories & ~PT_AUTOL : PT_ALL & ~PT_AUTOL;
        if (!summary) e.align = std::max(16u, sym->type->type_pointed_to()->align);
        store.bind(i, store.bindings.intern(std::move(e)), s);
    }
    return s;
}

PT_STATE PROPAGATION::joined(const BLOCK& b) const {
    PT_STATE s = seeds;
    bool is_first = b.bb != currfuninfo->bb_list;
    for (const EDGE* e = b.bb->predecessors; e; e = e->rest) {
        if (!of(e->first).is_reached) continue;
        const PT_STATE& from = store.PT_OUT[e->first];
        s = is_first ? from : store.meet(s, from);
        is_first = false;
    }
    return is_first ? PT_STATE() : s;
}

// Whether what leaves the block has changed.
bool PROPAGATION::visit(BLOCK& b) {
    const PT_STATE in = joined(b);
    if (b.is_reached && store.equal(in, store.PT_IN[b.bb])) return false;
    store.PT_IN[b.bb] = in;
    PT_STATE out = in;
    for (const NODE* t : b.acting) transfer.statement(t, out);
    const bool is_new = !b.is_reached || !store.equal(out, store.PT_OUT[b.bb]);
    b.is_reached = true;
    store.PT_OUT[b.bb] = out;
    return is_new;
}

// False where it was given up.
bool PROPAGATION::propagate() {
    seeds = at_function_entry();
    of(currfuninfo->bb_list).is_waiting = true;
    int walks = 0;
    for (bool any = true; any; ++walks) {
        any = false;
        for (BLOCK& b : blocks) {
            if (!b.is_waiting) continue;
            b.is_waiting = false;
            if (++b.visits > MOST_VISITS || store.maps.cell_count() > MOST_CELLS) return false;
            if (!visit(b)) continue;
            for (const EDGE* e = b.bb->successors; e; e = e->rest) {
                of(e->first).is_waiting = true;
                any = any || e->first->dfn <= b.bb->dfn;
            }
        }
    }
    if (print_debug) debug_printf("\n\t\t%d+1 iterations needed for FW pass #%d convergence.\n", walks - 1, 1);
    return true;
}

void walk(const BBLK* bb, const PT_STORE& store, PT_TRANSFER& transfer, const PT_TRANSFER::LOOK& look) {
    PT_STATE s = store.PT_IN[bb];
    for (const LIST* l = bb->statements; l; l = l->rest) transfer.statement(l->first, s, look);
}

// The other statements leave the state as it is.
void PROPAGATION::bind_accesses_of(const BLOCK& b, const PT_TRANSFER::LOOK& bind) {
    PT_STATE s = store.PT_IN[b.bb];
    auto acting = b.acting.begin();
    for (const LIST* l = b.bb->statements; l; l = l->rest)
        if (acting != b.acting.end() && *acting == l->first)
            transfer.statement(*acting++, s, bind);
        else
            bind(l->first, s);
}

void PROPAGATION::run() {
    find_pointers();
    if (store.pointers.empty()) return;
    if (!propagate()) {
        store.PT_IN = store.PT_OUT = SIDE_TABLE<PT_STATE>();
        return;
    }
    const PT_TRANSFER::LOOK bind = [this](const NODE* t, const PT_STATE& s) { transfer.bind_accesses(t, s); };
    for (const BLOCK& b : blocks)
        if (b.is_reached) bind_accesses_of(b, bind);
}

void dump_state(const PT_STORE& store, const PT_STATE& s) {
    auto dump = [&store](unsigned i, const PTENV* e) { dump_ptr_PT_binding(store.pointers[i].sym, e); };
    store.maps.for_each(s.own, dump);
    store.maps.for_each(s.exposed, dump);
}

void dump_PT_info(const PT_STORE& store) {
    debug_printf("\n\n\t\t\tPoints-to data for %s()\n", currfunc->name);
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        debug_printf("\n  IN[%d]\n", bb->dfn);
        dump_state(store, store.PT_IN[bb]);
        debug_printf("\n  OUT[%d]\n", bb->dfn);
        dump_state(store, store.PT_OUT[bb]);
        for (const LIST* l = bb->statements; l; l = l->rest) debug_printf("%s\n", stmt2infix(l->first).c_str());
    }
}

void find_points_to(FACTS) {
    auto store = std::make_shared<PT_STORE>();
    currfuninfo->points_to = store;
    if (aux_cmd_flag[POINTS_TO_IS_OFF] || !currfuninfo->bb_list || currfuninfo->saves_environment) return;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'propagate_PT_info' -------\n");
    PROPAGATION(*store).run();
    if (print_debug >= 3) dump_PT_info(*store);
}

// What an access is said to reach is no less than what is found anew. SSA form, of which less would be found, is passed
// over.
bool bindings_still_hold() {
    std::vector<std::pair<const NODE*, PTENV>> before;
    bool is_SSA_form = false;
    for_each_tree(currfuninfo, [&](const NODE* tree) {
        for_each_subtree(tree, [&](const NODE* t) {
            is_SSA_form |= op_is_SSA(t->op);
            if (t->op != UMULT && t->op != STREF) return;
            if (const PTENV* e = PT_info_of(t)) before.emplace_back(t, *e);
        });
    });
    if (is_SSA_form) return true;
    find_points_to(fact::points_to);
    BINDINGS& bindings = PT_store()->bindings;
    return std::all_of(before.begin(), before.end(), [&bindings](std::pair<const NODE*, PTENV>& b) {
        const PTENV* old = bindings.intern(std::move(b.second));
        return bindings.meet(old, PT_info_of(b.first)) == old;
    });
}

void clear_PT_vectors() { currfuninfo->points_to.reset(); }

const FACT_FINDER finder("what pointers may refer to", fact::points_to,
                         fact::alias_marks | fact::pointees | fact::block_numbers, find_points_to, clear_PT_vectors,
                         bindings_still_hold);

} // namespace

uint32_t PT_STORE::next_run() {
    static std::atomic<uint32_t> runs{0};
    uint32_t run = ++runs;
    return run ? run : ++runs;
}

PT_STORE* PT_store() {
    return is_known(fact::points_to) ? static_cast<PT_STORE*>(currfuninfo->points_to.get()) : nullptr;
}

void find_pointer_arguments(std::vector<AARG>& arguments) {
    need(fact::points_to);
    PT_STORE& store = *PT_store();
    PT_TRANSFER transfer(store);
    const auto look = [&](const NODE* tree, const PT_STATE& s) {
        for_each_subtree(tree, [&](const NODE* t) {
            FUNINFO* callee = op_is_call(t->op) ? find_FUNINFO_for_call(t) : nullptr;
            if (!callee) return;
            const auto passed = static_cast<size_t>(arg_list_count(get_arguments_to_call(t)));
            for (size_t i = 0; i < callee->formals.size(); ++i) {
                if (!callee->formals[i].is_pointer) continue;
                const NODE* a = i < passed ? arg_list_lookup(const_cast<NODE*>(get_arguments_to_call(t)), static_cast<int>(i)) : nullptr;
                arguments.push_back(passed_value(callee, i, a, a ? transfer.evaluate(a, s) : nullptr));
            }
        });
    };
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) walk(bb, store, transfer, look);
    for (const EHT_ITEM& item : currfuninfo->eht)
        if (item.cleanup) look(item.cleanup, PT_STATE());
}

void propagate_PT_info() { need(fact::points_to); }
