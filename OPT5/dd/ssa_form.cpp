// The construction of SSA form.
//
// Needs: alias marks and dominators, which it asks for; statements without assignments inside them where possible.
// Leaves: the graph. A function whose first block is a loop's head, or that has more than `MOST_SSA_VARIABLES` tracked
// variables, stays as it is.
// Sound because a value that reaches a wrapped use comes from the definition that the renaming walk has seen last on
// the path from the entry in the dominator tree, and wherever paths with different definitions meet ahead of the use
// stands a phi: phis are placed on the iterated dominance frontier of the definitions, but where the variable is dead,
// and every write that is no definition is a chi of all live variables that it may change.
//
// Sources: R. Cytron et al., "Efficiently Computing Static Single Assignment Form and the Control Dependence Graph",
// 1991; F. Chow et al., "Effective Representation of Aliases and Indirect Memory Operations in SSA Form", 1996.
#include "OPT5/alias/alias.h"
#include "OPT5/dd/ssa_build.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/frontiers.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/lowering.h"

#include <algorithm>

bool function_is_in_SSA_form = false;

const std::vector<std::unique_ptr<SSAVAR>>& ssa_variables() { return ssa_state.variables; }
std::vector<SSA_DEFINITION>& ssa_definitions() { return ssa_state.definitions; }
std::vector<SSA_ARG>& ssa_args(NODE* phi) { return *phi->rare().ssa_args; }
const std::vector<SSA_ARG>& ssa_args(const NODE* phi) { return *phi->rare().ssa_args; }

uint32_t ssa_version(const NODE* t) {
    if (op_is_SSA_definition(t->op)) return static_cast<uint32_t>(t->u.version);
    return t->reach ? ssa_version(t->reach) : 0;
}

void enter_ssa_definition(NODE* node, SSAVAR* variable, BBLK* block) {
    node->u.ssa = variable;
    node->u.version = ssa_state.definitions.size();
    ssa_state.definitions.push_back({node, block});
}

NODE* make_SSA_USE(NODE* reference, SSAVAR* variable, NODE* definition) {
    NODE* use = new_node(SSA_USE, reference->type);
    use->left = reference;
    use->ls = reference->ls;
    use->u.ssa = variable;
    use->reach = definition;
    return use;
}

NODE* make_SSA_USE_for_rdef(NODE* definition, SSAVAR* variable) {
    return make_SSA_USE(copy_tree(variable->tree), variable, definition);
}

NODE* ssa_assignment(NODE* definition) {
    if (!definition || definition->op != SSA_DEF) return nullptr;
    NODE* t = below_SSA(definition);
    return t && opcode_is_ASG(t->op) ? t : nullptr;
}

void note_changed_statement(LIST* cell) { cell->flag2 = 1; }

namespace {

// ---- Overlap

void mark_overlaps(std::vector<SSAVAR*> ring) {
    std::stable_sort(ring.begin(), ring.end(), [](const SSAVAR* a, const SSAVAR* b) { return a->start < b->start; });
    for (size_t i = 0; i < ring.size(); ++i)
        for (size_t k = i + 1; k < ring.size() && ring[k]->start < ring[i]->start + ring[i]->length; ++k) {
            ring[i]->flags |= SSAVAR_unioned;
            ring[k]->flags |= SSAVAR_unioned;
        }
}

void mark_all_overlaps() {
    for (const auto& v : ssa_state.variables) {
        SSAVAR* first = v->sym ? find_SSAVAR_ring(v->sym) : find_pointed_SSAVAR_ring(v->pointer);
        if (first != v.get() || v->ring == v.get()) continue;
        std::vector<SSAVAR*> ring;
        for_each_in_ring(first, [&ring](SSAVAR* w) {
            if (!w->has(SSAVAR_munged)) ring.push_back(w);
        });
        mark_overlaps(std::move(ring));
    }
}

// ---- Where each variable is live

struct EVENT {
    int block;
    bool is_use; // otherwise a definition
};

// A variable's definition before the one that the renaming walk has come to.
struct SAVED {
    uint32_t uid;
    NODE* before;
};

// Lists by number, which keep their room from one function to the next: most functions are small, and there are many.
template <class V>
class REUSED_LISTS {
public:
    void restart(size_t count) {
        if (lists.size() < count) lists.resize(count);
        for (size_t i = 0; i < count; ++i) lists[i].clear();
    }
    std::vector<V>& operator[](size_t i) { return lists[i]; }

private:
    std::vector<std::vector<V>> lists;
};

struct BUILD_LISTS {
    std::vector<SSA_SITE> sites;
    REUSED_LISTS<EVENT> events;           // by variable, in the order of blocks and sites
    REUSED_LISTS<int> live_in;            // by variable: blocks at whose start it is live
    REUSED_LISTS<int> definers;           // by variable: blocks with a definition or chi
    REUSED_LISTS<uint32_t> live_at_entry; // by block
    REUSED_LISTS<NODE*> phis;             // by block
    // Numbers of the predecessors, which are walked for each variable: those of block b from `first_before[b]` on.
    std::vector<int> before_blocks;
    std::vector<size_t> first_before;
    // While chis are placed: what is live, that which is memory as a list.
    std::vector<SSAVAR*> live_memory;
    std::vector<uint32_t> live;    // all that was, in the block in work
    std::vector<int32_t> place_of; // by variable: 0 dead, below 0 live, otherwise 1 + its place in `live_memory`
    // While renaming.
    std::vector<NODE*> current; // by variable
    std::vector<SAVED> saved;
    std::vector<size_t> marks; // heights of `saved` where blocks began
    std::vector<NODE*> chain;
};
BUILD_LISTS build_lists;

class BUILDER {
public:
    explicit BUILDER(SSA_BUILD& build) : build(build), variables(ssa_state.variables) {
        events.restart(variables.size());
        live_in.restart(variables.size());
        definers.restart(variables.size());
        live_at_entry.restart(build.blocks.size());
        phis.restart(build.blocks.size());
        before_blocks.clear();
        live_memory.clear();
    }
    // False, with operators that have no versions, where there are too many.
    bool run() {
        enter_uses();
        find_live_blocks();
        if (live_left > 0) place_chis();
        if (live_left > 0 && definitions_left > 0) place_phis();
        if (live_left <= 0 || definitions_left <= 0) return false;
        rename();
        return true;
    }

private:
    size_t block_count() const { return build.blocks.size(); }
    SSAVAR* var(size_t uid) const { return variables[uid].get(); }
    void enter_uses();
    void enter_use(SSA_SITE& site, int block);
    void number_predecessors();
    void find_live_blocks();
    void find_live_blocks_of(SSAVAR* v, std::vector<uint32_t>& stamp);
    void place_chis();
    void place_chis_in(size_t block, SSA_CHANGES& changes);
    void make_live(SSAVAR* v);
    void make_dead(SSAVAR* v);
    void place_phis();
    void rename();
    void rename_in(BBLK* bb);
    void rename_chain(const SSA_SITE& site, BBLK* bb);
    void fill_arguments(BBLK* bb);
    void define(NODE* t, BBLK* bb);

    SSA_BUILD& build;
    const std::vector<std::unique_ptr<SSAVAR>>& variables;
    REUSED_LISTS<EVENT>& events = build_lists.events;
    REUSED_LISTS<int>&live_in = build_lists.live_in, &definers = build_lists.definers;
    REUSED_LISTS<uint32_t>& live_at_entry = build_lists.live_at_entry;
    REUSED_LISTS<NODE*>& phis = build_lists.phis;
    int64_t definitions_left = MOST_SSA_DEFINITIONS + 4 * build.references(); // chis and phis
    int64_t live_left = 8 * MOST_SSA_DEFINITIONS + 32 * build.references(); // entries of live sets
    std::vector<int>& before_blocks = build_lists.before_blocks;
    std::vector<size_t>& first_before = build_lists.first_before;
    std::vector<SSAVAR*>& live_memory = build_lists.live_memory;
    std::vector<uint32_t>& live = build_lists.live;
    std::vector<int32_t>& place_of = build_lists.place_of;
    std::vector<NODE*>&current = build_lists.current, &chain = build_lists.chain;
    std::vector<SAVED>& saved = build_lists.saved;
    std::vector<size_t>& marks = build_lists.marks;
};

// A use also may read what overlaps the variable: an SSA_MU for each.
void BUILDER::enter_use(SSA_SITE& site, int block) {
    SSAVAR* v = ssa_variable(site.node);
    v->flags |= SSAVAR_USEd;
    events[v->uid].push_back({block, true});
    if (!v->has(SSAVAR_unioned)) return;
    for_each_in_ring(v->ring, [&](SSAVAR* w) {
        if (w == v || w->has(SSAVAR_munged) || !w->overlaps(v)) return;
        NODE* mu = new_node(SSA_MU, (*site.link)->type);
        mu->left = *site.link;
        mu->ls = site.node->ls;
        mu->u.ssa = w;
        *site.link = mu;
        events[w->uid].push_back({block, true});
    });
}

void BUILDER::enter_uses() {
    for (size_t b = 1; b < block_count(); ++b)
        for (size_t i = build.first_site[b]; i < build.first_site[b + 1]; ++i) {
            SSA_SITE& site = build.sites[i];
            if (site.kind == SSA_SITE::USE)
                enter_use(site, static_cast<int>(b));
            else if (site.kind == SSA_SITE::DEF) {
                SSAVAR* v = ssa_variable(site.node);
                v->flags |= SSAVAR_DEFd;
                events[v->uid].push_back({static_cast<int>(b), false});
                if (v->has(SSAVAR_unioned))
                    for_each_in_ring(v->ring, [&](SSAVAR* w) {
                        if (w != v && covers(v, w)) events[w->uid].push_back({static_cast<int>(b), false});
                    });
            }
        }
    for (const auto& v : variables) {
        const std::vector<EVENT>& e = events[v->uid];
        if (!e.empty() && e.front().block != e.back().block) v->flags |= SSAVAR_multi_bb;
    }
}

// Backward from the blocks that read it ahead of any definition.
void BUILDER::find_live_blocks_of(SSAVAR* v, std::vector<uint32_t>& stamp) {
    const uint32_t defined = 2 * v->uid + 1, live = defined + 1;
    std::vector<int>& found = live_in[v->uid];
    int before = 0;
    for (const EVENT& e : events[v->uid]) {
        if (e.is_use && e.block != before) {
            stamp[static_cast<size_t>(e.block)] = live;
            found.push_back(e.block);
        } else if (!e.is_use && stamp[static_cast<size_t>(e.block)] != live)
            stamp[static_cast<size_t>(e.block)] = defined;
        before = e.block;
    }
    for (size_t i = 0; i < found.size(); ++i)
        for (size_t b = static_cast<size_t>(found[i]), k = first_before[b]; k < first_before[b + 1]; ++k) {
            const int from = before_blocks[k];
            uint32_t& state = stamp[static_cast<size_t>(from)];
            if (state == defined || state == live) continue;
            state = live;
            found.push_back(from);
        }
    live_left -= static_cast<int64_t>(found.size());
    for (int b : found) live_at_entry[static_cast<size_t>(b)].push_back(v->uid);
}

void BUILDER::number_predecessors() {
    first_before.assign(block_count() + 1, 0);
    for (size_t b = 1; b < block_count(); ++b) {
        first_before[b] = before_blocks.size();
        for (const EDGE* p = build.blocks[b]->predecessors; p; p = p->rest) before_blocks.push_back(p->first->dfn);
    }
    first_before[block_count()] = before_blocks.size();
}

void BUILDER::find_live_blocks() {
    number_predecessors();
    std::vector<uint32_t> stamp(block_count(), 0);
    for (const auto& v : variables)
        if (live_left > 0 && !v->has(SSAVAR_munged)) find_live_blocks_of(v.get(), stamp);
}

// ---- Chis

void BUILDER::make_live(SSAVAR* v) {
    int32_t& place = place_of[v->uid];
    if (place != 0) return;
    if (v->is_memory()) {
        live_memory.push_back(v);
        place = static_cast<int32_t>(live_memory.size());
    } else
        place = -1;
}

void BUILDER::make_dead(SSAVAR* v) {
    int32_t& place = place_of[v->uid];
    if (place > 0) {
        SSAVAR* last = live_memory.back();
        live_memory[static_cast<size_t>(place - 1)] = last;
        place_of[last->uid] = place;
        live_memory.pop_back();
    }
    place = 0;
}

void BUILDER::place_chis_in(size_t block, SSA_CHANGES& changes) {
    live.clear();
    for (const EDGE* s = build.blocks[block]->successors; s; s = s->rest)
        for (uint32_t uid : live_at_entry[static_cast<size_t>(s->first->dfn)]) {
            if (place_of[uid] == 0) live.push_back(uid);
            make_live(var(uid));
        }
    for (size_t i = build.first_site[block + 1]; i-- > build.first_site[block];) {
        SSA_SITE& site = build.sites[i];
        if (site.kind == SSA_SITE::USE) {
            for (NODE* t = *site.link;; t = t->left) {
                SSAVAR* v = ssa_variable(t);
                if (place_of[v->uid] == 0) live.push_back(v->uid);
                make_live(v);
                if (t == site.node) break;
            }
            continue;
        }
        changes.of_site(site, live_memory, [&](SSAVAR* v) {
            if (place_of[v->uid] == 0 || v->has(SSAVAR_munged) || --definitions_left <= 0) return;
            NODE* chi = new_node(SSA_CHI, (*site.link)->type);
            chi->left = *site.link;
            chi->ls = site.node->ls;
            chi->u.ssa = v;
            *site.link = chi;
            std::vector<int>& d = definers[v->uid];
            if (d.empty() || d.back() != static_cast<int>(block)) d.push_back(static_cast<int>(block));
        });
        if (site.kind != SSA_SITE::DEF) continue;
        SSAVAR* v = ssa_variable(site.node);
        make_dead(v);
        if (v->has(SSAVAR_unioned))
            for_each_in_ring(v->ring, [&](SSAVAR* w) {
                if (covers(v, w)) make_dead(w);
            });
        std::vector<int>& d = definers[v->uid];
        if (d.empty() || d.back() != static_cast<int>(block)) d.push_back(static_cast<int>(block));
    }
    for (uint32_t uid : live) make_dead(var(uid));
}

void BUILDER::place_chis() {
    SSA_CHANGES changes(build);
    place_of.assign(variables.size(), 0);
    for (size_t b = 1; b < block_count(); ++b)
        if (build.blocks[b]) place_chis_in(b, changes);
}

// ---- Phis

void BUILDER::place_phis() {
    const FRONTIERS frontiers;
    std::vector<uint32_t> is_live(block_count(), 0), has_phi(block_count(), 0);
    std::vector<std::pair<BBLK*, NODE*>> made;
    for (const auto& v : variables) {
        if (definers[v->uid].empty() || live_in[v->uid].empty()) continue;
        const uint32_t mark = v->uid + 1;
        for (int b : live_in[v->uid]) is_live[static_cast<size_t>(b)] = mark;
        std::vector<int> waiting = definers[v->uid];
        for (size_t i = 0; i < waiting.size(); ++i)
            for (int join : frontiers.of(waiting[i])) {
                const size_t b = static_cast<size_t>(join);
                if (is_live[b] != mark || has_phi[b] == mark || --definitions_left <= 0) continue;
                has_phi[b] = mark;
                waiting.push_back(join);
                NODE* phi = new_node(SSA_PHI, v->tree->type);
                phi->u.ssa = v.get();
                ssa_state.args.push_back(std::make_unique<std::vector<SSA_ARG>>());
                phi->make_rare().ssa_args = ssa_state.args.back().get();
                phis[b].push_back(phi);
            }
    }
    for (size_t b = 1; b < block_count(); ++b)
        for (auto phi = phis[b].rbegin(); phi != phis[b].rend(); ++phi)
            insert_before(&build.blocks[b]->statements, *phi, build.blocks[b]->first_psn);
}

// ---- Renaming

void BUILDER::define(NODE* t, BBLK* bb) {
    SSAVAR* v = ssa_variable(t);
    enter_ssa_definition(t, v, bb);
    saved.push_back({v->uid, current[v->uid]});
    current[v->uid] = t;
}

// From the innermost operator out.
void BUILDER::rename_chain(const SSA_SITE& site, BBLK* bb) {
    chain.clear();
    for (NODE* t = *site.link; op_is_SSA(t->op); t = t->left) {
        chain.push_back(t);
        if (t == site.node) break;
    }
    for (size_t i = chain.size(); i-- > 0;) {
        NODE* t = chain[i];
        if (t->op != SSA_DEF) t->reach = current[ssa_variable(t)->uid];
        if (t->op == SSA_DEF || t->op == SSA_CHI) define(t, bb);
    }
}

void BUILDER::fill_arguments(BBLK* bb) {
    for (const EDGE* s = bb->successors; s; s = s->rest)
        for (NODE* phi : phis[static_cast<size_t>(s->first->dfn)])
            ssa_args(phi).push_back({bb, current[ssa_variable(phi)->uid]});
}

void BUILDER::rename_in(BBLK* bb) {
    marks.push_back(saved.size());
    const size_t b = static_cast<size_t>(bb->dfn);
    for (NODE* phi : phis[b]) define(phi, bb);
    for (size_t i = build.first_site[b]; i < build.first_site[b + 1]; ++i) rename_chain(build.sites[i], bb);
    fill_arguments(bb);
}

void BUILDER::rename() {
    current.assign(variables.size(), nullptr);
    currfuninfo->dominators->depth_first_doms([this](BBLK* bb) { rename_in(bb); },
                                              [this](BBLK*) {
                                                  for (; saved.size() > marks.back(); saved.pop_back())
                                                      current[saved.back().uid] = saved.back().before;
                                                  marks.pop_back();
                                              });
    // Of an edge from a block that control does not reach nothing is known.
    for (size_t b = 1; b < block_count(); ++b)
        for (NODE* phi : phis[b]) {
            std::vector<SSA_ARG>& args = ssa_args(phi);
            for (const EDGE* p = build.blocks[b]->predecessors;
                 p && args.size() < static_cast<size_t>(edge_length(build.blocks[b]->predecessors)); p = p->rest)
                if (std::none_of(args.begin(), args.end(), [p](const SSA_ARG& a) { return a.block == p->first; }))
                    args.push_back({p->first, nullptr});
        }
}

} // namespace

void construct_SSA_form(bool onlySSV, bool onlyIV, bool vectorsToo, bool onlyMemory) {
    OPT_ASSERT(!function_is_in_SSA_form);
    if (print_debug) {
        if (onlySSV) debug_printf("We consider only SSV candidates for SSA form.\n");
        if (onlyIV) debug_printf("We consider only IV candidates for SSA form.\n");
        if (vectorsToo) debug_printf("We also consider vectors for SSA form.\n");
    }
    if (!currfuninfo->bb_list || currfuninfo->bb_list->predecessors) return;
    if (!currfuninfo->no_calls && currfuninfo->saves_environment) return;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        promote_toplevel_COMMAOPs_in_list(bb->statements, bb->last_statement());
    need(fact::dominators | fact::alias | fact::points_to);
    SSA_BUILD build;
    build.sites.swap(build_lists.sites); // for their room
    build.sites.clear();
    build.onlySSV = onlySSV;
    build.onlyIV = onlyIV;
    build.vectorsToo = vectorsToo;
    build.onlyMemory = onlyMemory;
    ssa_state.definitions.assign(1, {});
    wrap_SSA_references(build);
    function_is_in_SSA_form = true;
    const bool fits = !ssa_state.variables.empty() && ssa_state.variables.size() <= MOST_SSA_VARIABLES;
    if (fits) mark_all_overlaps();
    const bool is_built = fits && BUILDER(build).run();
    build_lists.sites.swap(build.sites);
    if (!is_built) return deconstruct_SSA_form();
    if (print_debug >= 3) dump_SSA_function_body();
    if (pass_debug_validate && validate_SSA_form() != 0) abort_optimizer("SSA form is not valid");
}
