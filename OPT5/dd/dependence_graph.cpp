// Which references of a loop depend on which.
//
// Needs: the loop hierarchy, dependence analysis that is active, trees in normal form.
// Leaves: trees and loops as they are.
// Sound because each pair that may share memory and has a store is asked of the analysis, in both directions. Pairs are
// not even looked at where both are known objects and not the same: no access reaches from one object into another. The
// exceptions, objects that the linker or the frame lays over others, are taken for unknown ones here.
#include "OPT5/dd/dependence_graph.h"

#include "OPT5/alias/alias.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/dependence.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"

#include <algorithm>
#include <climits>
#include <map>
#include <string_view>
#include <unordered_set>

// ---- References of a statement

namespace {

class REFERENCE_LIST {
public:
    REFERENCE_LIST(struct LOOP* loop, std::vector<DD_CELL>& out) : loop_m(loop), list(out) {}

    void walk(NODE* t) {
        if (!t) return;
        if (t->op == SWITCH) return walk(t->left);
        if (t->op == UAND) return walk_address_of(t->left);
        if (writes_left_operand(t->op)) return walk_assignment(t);
        if (NODE* object = reference_of(t)) {
            walk_below(object);
            list.push_back({t, t, loop_m, false});
            return;
        }
        walk(t->left);
        walk(t->right);
    }

private:
    // The UMULT or volatile NAME that a reference is of; null of what is none.
    static NODE* reference_of(NODE* t) {
        NODE* object = without_members(t);
        return object->op == UMULT || (object->op == NAME && object->type->is_volatile()) ? object : nullptr;
    }
    void walk_below(NODE* object) {
        if (object->op != UMULT) return;
        walk(object->left);
        walk(object->right);
    }
    void walk_address_of(NODE* place) {
        NODE* object = without_members(place);
        object->op == UMULT ? walk_below(object) : walk(object);
    }
    // What stands over a reference that is written, as a part of a complex number does, belongs to the store.
    void walk_assignment(NODE* t) {
        walk(t->right);
        NODE* place = access_of_place(t->left);
        NODE* object = reference_of(place);
        if (!object) {
            if (place->op != NAME) walk(t->left);
            return;
        }
        walk_below(object);
        list.push_back({t, place, loop_m, true});
    }

    struct LOOP* loop_m;
    std::vector<DD_CELL>& list;
};

} // namespace

void make_dd_node_list(NODE* statement, struct LOOP* loop, std::vector<DD_CELL>& list) {
    REFERENCE_LIST(loop, list).walk(statement);
}

// ---- Which pairs are looked at

namespace {

// The object that a reference is known to lie in; null where that is not known.
const SYMTAB* declared_object(const DD_CELL& cell) {
    const NODE* t = without_members(static_cast<const NODE*>(cell.place));
    if (t->op == UMULT) {
        t = t->left;
        while (t->op == PCONV || t->op == OUIALIGN || t->op == NONALIGN) t = t->left;
        if (t->op != UAND) return nullptr;
        t = without_members(static_cast<const NODE*>(t->left));
    }
    return t->op == NAME ? t->u.sym : nullptr;
}
bool is_declared_object(const DD_CELL& cell) { return declared_object(cell) != nullptr; }

// The same, where no other object is laid over it.
const SYMTAB* known_object(const DD_CELL& cell) {
    const SYMTAB* s = declared_object(cell);
    return !s || s->lives_in_others || s->hosts_others || s->level == 1 || s->pragma ? nullptr : s;
}

bool is_string(const DD_CELL& cell) {
    const NODE* t = without_members(static_cast<const NODE*>(cell.place));
    if (t->op != UMULT) return false;
    t = t->left;
    while (t->op == PCONV || t->op == ISP2CHAR || t->op == OUIALIGN || t->op == NONALIGN) t = t->left;
    return t->op == SCON;
}

// What falls in one class may meet; class 0, what is not known, may meet everything. A declaration and its definition
// are one object with two records.
class OBJECT_CLASSES {
public:
    size_t class_of(const DD_CELL& cell) {
        const SYMTAB* s = known_object(cell);
        if (!s) return 0;
        if (s->level == 0) return by_name.insert({s->name, by_name.size() + by_symbol.size() + 1}).first->second;
        return by_symbol.insert({s, by_name.size() + by_symbol.size() + 1}).first->second;
    }
    size_t count() const { return by_name.size() + by_symbol.size() + 1; }

private:
    std::map<std::string_view, size_t> by_name;
    std::unordered_map<const SYMTAB*, size_t> by_symbol; // looked up, never walked
};

// How many pairs may be looked at, of all and for each reference: what is in no loop gains less.
constexpr uint64_t FREE_PAIRS = 200000, PAIRS_BY_REFERENCE = 64;
constexpr uint64_t FREE_PAIRS_OUTSIDE = 20000, PAIRS_BY_REFERENCE_OUTSIDE = 16;

struct REFERENCES {
    uint64_t loads = 0, stores = 0;
    void add(const DD_CELL& cell) { ++(cell.is_store ? stores : loads); }
    void add(const REFERENCES& o) { loads += o.loads, stores += o.stores; }
};
uint64_t pairs_between(const REFERENCES& a, const REFERENCES& b) {
    return a.stores * (b.loads + b.stores) + a.loads * b.stores;
}
uint64_t pairs_in(const REFERENCES& a) { return a.stores * a.loads + a.stores * (a.stores + 1) / 2; }

// The references of an outermost loop, or those that are in no loop.
struct NEST {
    std::vector<size_t> cells; // indexes
    int depth = 0;
};

// Takes nests in, the deepest first, as long as the pairs with all that are in already stay few enough: the graph of a
// function grows with its references, not with their square.
class NEST_CHOICE {
public:
    NEST_CHOICE(const std::vector<DD_CELL>& cells, const std::vector<size_t>& classes, size_t class_count)
        : cells_m(cells), classes_m(classes), taken(class_count) {}

    std::vector<bool> choose(struct LOOP* top) {
        std::vector<NEST> nests = find_nests(top);
        std::stable_sort(nests.begin(), nests.end(), [](const NEST& a, const NEST& b) { return a.depth > b.depth; });
        std::vector<bool> is_in(cells_m.size());
        for (const NEST& nest : nests)
            if (take(nest))
                for (size_t i : nest.cells) is_in[i] = true;
        return is_in;
    }

private:
    std::vector<NEST> find_nests(struct LOOP* top) const {
        std::vector<NEST> nests;
        std::unordered_map<const struct LOOP*, size_t> nest_of; // looked up, never walked
        for (size_t i = 0; i < cells_m.size(); ++i) {
            struct LOOP* outermost = cells_m[i].loop;
            while (outermost != top && outermost->parent && outermost->parent != top) outermost = outermost->parent;
            const auto [at, is_new] = nest_of.insert({outermost, nests.size()});
            if (is_new) nests.emplace_back();
            NEST& nest = nests[at->second];
            nest.cells.push_back(i);
            if (cells_m[i].loop != top) nest.depth = std::max<int>(nest.depth, cells_m[i].loop->level);
        }
        return nests;
    }
    bool take(const NEST& nest) {
        std::map<size_t, REFERENCES> own; // by class
        REFERENCES all;
        for (size_t i : nest.cells) {
            own[classes_m[i]].add(cells_m[i]);
            all.add(cells_m[i]);
        }
        REFERENCES& unknown = own[0];
        uint64_t more = pairs_in(unknown) + pairs_between(unknown, all_taken) + pairs_between(all, taken[0]);
        for (const auto& [at, mine] : own)
            if (at) more += pairs_in(mine) + pairs_between(mine, taken[at]) + pairs_between(mine, unknown);
        const uint64_t limit = nest.depth ? FREE_PAIRS + PAIRS_BY_REFERENCE * cells_m.size()
                                          : FREE_PAIRS_OUTSIDE + PAIRS_BY_REFERENCE_OUTSIDE * cells_m.size();
        if (pairs + more > limit) return false;
        pairs += more;
        for (const auto& [at, mine] : own) taken[at].add(mine);
        all_taken.add(all);
        return true;
    }

    const std::vector<DD_CELL>& cells_m;
    const std::vector<size_t>& classes_m;
    std::vector<REFERENCES> taken; // by class
    REFERENCES all_taken;
    uint64_t pairs = 0;
};

// Blocks of a loop, each behind those that precede it in an iteration; a loop in it counts as one block there, and stands as
// a whole ahead of what follows it. The text may have another order.
class ITERATION_ORDER {
public:
    std::vector<BBLK*> order;

    void add(struct LOOP* loop) {
        std::vector<BBLK*> finished; // the heads of loops stand for them
        std::unordered_set<const BBLK*> seen{loop->head}; // membership only
        std::vector<VISIT> path{visit(loop->head, loop, true)};
        while (!path.empty()) {
            VISIT& at = path.back();
            if (at.next.empty()) {
                finished.push_back(at.bb);
                path.pop_back();
                continue;
            }
            BBLK* next = at.next.back();
            at.next.pop_back();
            if (seen.insert(next).second) path.push_back(visit(next, loop, false));
        }
        for (auto bb = finished.rbegin(); bb != finished.rend(); ++bb)
            if ((*bb)->loop == loop)
                order.push_back(*bb);
            else
                add(child_around(*bb, loop));
    }

private:
    struct VISIT {
        BBLK* bb;
        std::vector<BBLK*> next;
    };
    // The loop directly in `loop` that holds the block.
    static struct LOOP* child_around(const BBLK* bb, const struct LOOP* loop) {
        struct LOOP* l = bb->loop;
        while (l->parent != loop) l = l->parent;
        return l;
    }
    VISIT visit(BBLK* bb, struct LOOP* loop, bool is_head) {
        VISIT v{bb, {}};
        struct LOOP* whole = bb->loop == loop || is_head ? nullptr : child_around(bb, loop);
        const auto add_successors = [&](const BBLK* from) {
            for (const EDGE* e = from->successors; e; e = e->rest) {
                BBLK* to = e->first;
                if (!to->loop || !loop_is_subloop_of_loop(to->loop, loop, true)) continue;
                if (whole && loop_is_subloop_of_loop(to->loop, whole, true)) continue;
                v.next.push_back(to->loop == loop ? to : child_around(to, loop)->head);
            }
        };
        if (!whole)
            add_successors(bb);
        else
            for (struct LOOP* l : loops_outer_first(whole))
                for (const BBLK* in : l->contents)
                    if (in->loop == l) add_successors(in);
        std::reverse(v.next.begin(), v.next.end());
        return v;
    }
};

std::vector<DD_CELL> references_in(struct LOOP* loop) {
    std::vector<DD_CELL> cells;
    ITERATION_ORDER blocks;
    blocks.add(loop);
    for (BBLK* bb : blocks.order)
        for (LIST* s = bb->statements; s; s = s->rest) make_dd_node_list(s->first, bb->loop, cells);
    cells.erase(std::remove_if(cells.begin(), cells.end(), is_string), cells.end());
    return cells;
}

// Of a reference and itself: the load of what loads and stores comes first.
int order_in_itself(const DD_CELL& cell) {
    const int op = cell.tree->op;
    return cell.is_store && op != ASG && op != STASG && op != ARASG ? 1 : 0;
}

// What the edge is to show beside the vector if speculation makes a difference: a vector without elements where it
// removes the edge.
DDEP_PTR speculation(const DDEP& vector, DDEP_PTR speculated) {
    if (!speculated) {
        speculated = std::make_unique<DDEP>(-1, false);
        speculated->kind = 1;
        speculated->spec = 1;
        return speculated;
    }
    const bool is_other = speculated->kind != vector.kind || speculated->NotAllSame != vector.NotAllSame ||
                          speculated->feasible != vector.feasible || *speculated != vector;
    return is_other ? std::move(speculated) : nullptr;
}

} // namespace

// ---- The graph

void DDGRAPH::clear() {
    lists.clear();
    graph.clear();
    vertex_m.clear();
    references_m.clear();
}

void DDGRAPH::build(struct LOOP* loop, bool all_vectors, int spec) {
    clear();
    all_vectors_m = all_vectors;
    spec_m = spec;
    const std::vector<DD_CELL> found = references_in(loop);
    OBJECT_CLASSES objects;
    std::vector<size_t> classes;
    for (const DD_CELL& cell : found) classes.push_back(objects.class_of(cell));
    const std::vector<bool> is_in = NEST_CHOICE(found, classes, objects.count()).choose(loop);

    std::vector<std::vector<size_t>> members(objects.count());
    for (size_t i = found.size(); i-- > 0;) { // each with those behind it
        if (!is_in[i]) continue;
        members[classes[i]].push_back(i);
    }
    std::vector<size_t> all; // in program order
    for (size_t i = 0; i < found.size(); ++i)
        if (is_in[i]) all.push_back(i), vertex_of(found[i].place, found[i].loop);

    const auto pair = [&](size_t x, size_t y) {
        const DD_CELL &a = found[x], &b = found[y];
        if (!a.is_store && !b.is_store) return;
        const int order = x == y ? order_in_itself(a) : static_cast<int>(y - x);
        relate(a, b, order);
    };
    for (size_t x : all) {
        if (classes[x] == 0) {
            for (auto y = std::lower_bound(all.begin(), all.end(), x); y != all.end(); ++y) pair(x, *y);
            continue;
        }
        // Lists are in descending order.
        for (size_t which : {classes[x], size_t(0)}) {
            const std::vector<size_t>& list = members[which];
            for (auto y = list.begin(); y != list.end() && *y >= x; ++y) pair(x, *y);
        }
    }
}

void DDGRAPH::add_dependencies(NODE* v1, struct LOOP* l1, NODE* v2, struct LOOP* l2, int order) {
    relate({v1, v1, l1, true}, {v2, v2, l2, true}, order);
}

namespace {

// Memory without a declared type takes that of what is stored last: by its type a load alone tells that it does not see
// a store. What is stored there later, or was loaded before, may have any type.
struct TYPED_APART {
    bool forward = false, backward = false; // no dependence from the first to the second, from the second to the first
};
TYPED_APART apart_by_type(const DD_CELL& a, const DD_CELL& b) {
    if (lvalues_may_be_aliased(a.place, b.place, loop_root())) return {};
    if (is_declared_object(a) || is_declared_object(b)) return {true, true};
    if (!lvalues_may_be_aliased(a.place, b.place, loop_root(), false)) return {true, true};
    return {!b.is_store, !a.is_store};
}

} // namespace

void DDGRAPH::relate(const DD_CELL& a, const DD_CELL& b, int order) {
    NODE *v1 = a.place, *v2 = b.place;
    struct LOOP *l1 = a.loop, *l2 = b.loop;
    const bool is_same = v1 == v2;
    if (is_same && l1->is_root() && !l1->irreducible) return;
    const TYPED_APART apart = apart_by_type(a, b);
    if (apart.forward && apart.backward) return;
    const auto compute = [&](int spec, DDEP_PTR* forward, DDEP_PTR* backward) {
        compute_dependence_vectors(forward, backward, order, v1, l1, v2, l2, false, spec, false);
        if (is_same) backward->reset();
    };
    DDEP_PTR forward, backward, fast_forward, fast_backward;
    compute(spec_m, &forward, &backward);
    const auto is_of_nest = [](const DDEP_PTR& v) { return v && v->count() > 2; };
    const bool speculates = all_vectors_m && spec_m == 0 && (is_of_nest(forward) || is_of_nest(backward));
    if (speculates) compute(1, &fast_forward, &fast_backward);
    for (const bool back : {false, true}) {
        DDEP_PTR& vector = back ? backward : forward;
        NODE *from = back ? v2 : v1, *to = back ? v1 : v2;
        if (!vector || (back ? apart.backward : apart.forward)) continue;
        DDEP_PTR second = speculates ? speculation(*vector, std::move(back ? fast_backward : fast_forward)) : nullptr;
        add_dep_edge(from, to, std::move(vector));
        if (second) add_dep_edge(from, to, std::move(second));
    }
}

DDGRAPH::VERTEX DDGRAPH::vertex_of(NODE* place, struct LOOP* loop) {
    NODE* object = without_members(place);
    const auto [at, is_new] = vertex_m.insert({object, 0});
    if (is_new) {
        at->second = boost::add_vertex(object, graph);
        references_m.push_back({object, loop});
    }
    return at->second;
}

std::pair<DDGRAPH::GRAPH::edge_descriptor, bool> DDGRAPH::edge_between(const NODE* from, const NODE* to) const {
    const auto f = vertex_m.find(without_members(from)), t = vertex_m.find(without_members(to));
    if (f == vertex_m.end() || t == vertex_m.end()) return {};
    return boost::edge(f->second, t->second, graph);
}

namespace {

// The n-th link of a list, or the last one, which is null.
DDEP_PTR* link_at(DDEP_PTR* list, int n) {
    while (*list && n-- > 0) list = &(*list)->next;
    return list;
}

} // namespace

DDEP* DDGRAPH::get_dep_edge(const NODE* from, const NODE* to, int n) const {
    const auto [e, exists] = edge_between(from, to);
    if (!exists) return nullptr;
    DDEP* v = lists[graph[e]].get();
    while (v && n-- > 0) v = v->next.get();
    return v;
}

void DDGRAPH::remove_dep_edge(const NODE* from, const NODE* to, int n) {
    const auto [e, exists] = edge_between(from, to);
    if (!exists) return;
    DDEP_PTR& list = lists[graph[e]];
    DDEP_PTR* link = link_at(&list, n);
    if (*link) *link = std::move((*link)->next);
    if (!list) boost::remove_edge(e, graph);
}

void DDGRAPH::add_dep_edge(NODE* from, NODE* to, DDEP_PTR vector) {
    const VERTEX f = vertex_of(from, nullptr), t = vertex_of(to, nullptr);
    const auto [e, is_new] = boost::add_edge(f, t, lists.size(), graph);
    if (is_new)
        lists.push_back(std::move(vector));
    else
        *link_at(&lists[graph[e]], INT_MAX) = std::move(vector);
}

void DDGRAPH::dump() const {
    debug_printf("Data Dependence graph:\n");
    for_each_edge([this](const NODE* from, const NODE* to, const DDEP& first) {
        debug_printf("%d:%s -> ", int(vertex_m.at(from)), tree_to_infix(from).c_str());
        debug_printf("%d:%s\t", int(vertex_m.at(to)), tree_to_infix(to).c_str());
        for (const DDEP* v = &first; v; v = v->next.get()) debug_printf("%s", v->text().c_str());
        debug_printf("\n");
    });
}
