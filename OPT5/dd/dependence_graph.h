// The dependences of all memory references of a loop, as a graph: a vertex is a reference, an edge leads from the one
// that comes first in time to the one that follows, and bears the vectors of the two. Loads alone need no order.
//
// Two references without an edge between them never touch the same object, in no iterations. References that the graph
// does not have as vertices are not spoken of: a function in which too many pairs may meet has those of its deepest nests
// alone.
#pragma once

#include "OPT5/dd/dependence_vectors.h"

#include <boost/graph/adjacency_list.hpp>

#include <unordered_map>
#include <vector>

class NODE;
class SYMTAB;
struct LOOP;

// A memory reference where it is evaluated.
struct DD_CELL {
    NODE* tree = nullptr;  // of a store the assignment, of a load the reference
    NODE* place = nullptr; // the reference: UMULT, the outermost STDOT over one, a volatile NAME
    struct LOOP* loop = nullptr; // innermost
    bool is_store = false;       // also of what loads and stores
};

// Those of one statement, in the order of evaluation: operands first, the place that an assignment writes last. Places
// whose address alone is taken are no references.
void make_dd_node_list(NODE* statement, struct LOOP* loop, std::vector<DD_CELL>& list);

class DDGRAPH {
public:
    struct REFERENCE {
        NODE* object;      // below members
        struct LOOP* loop; // innermost; null of what `add_dep_edge` brought
    };

    // Analysis is active, trees are in normal form. `all_vectors`: an edge has a second vector, of a speculation, where that
    // differs. `spec` (0 or 1): as `compute_dependence_vectors` takes it.
    void build(struct LOOP* loop, bool all_vectors, int spec);
    void clear();

    // Of `v1` in `l1` and `v2` in `l2`, `v1` first where `order` is above 0.
    void add_dependencies(NODE* v1, struct LOOP* l1, NODE* v2, struct LOOP* l2, int order);
    DDEP* get_dep_edge(const NODE* from, const NODE* to, int n) const; // the n-th vector, from 0; null without
    void remove_dep_edge(const NODE* from, const NODE* to, int n);     // the last one: the edge too
    void add_dep_edge(NODE* from, NODE* to, DDEP_PTR vector);          // behind those that are there
    void dump() const;                                                 // to the debug stream

    // All references, and all edges with the list of their vectors, each in the order in which they were added.
    const std::vector<REFERENCE>& references() const { return references_m; }
    template <class F>
    void for_each_edge(const F& visit) const { // (from, to, const DDEP& first)
        const auto [begin, end] = boost::edges(graph);
        for (auto e = begin; e != end; ++e)
            visit(graph[boost::source(*e, graph)], graph[boost::target(*e, graph)], *lists[graph[*e]]);
    }

private:
    // An edge has the index of its list of vectors.
    using GRAPH = boost::adjacency_list<boost::setS, boost::vecS, boost::bidirectionalS, NODE*, size_t>;
    using VERTEX = GRAPH::vertex_descriptor;

    void relate(const DD_CELL& a, const DD_CELL& b, int order);
    VERTEX vertex_of(NODE* place, struct LOOP* loop);
    // The edge, if there is one.
    std::pair<GRAPH::edge_descriptor, bool> edge_between(const NODE* from, const NODE* to) const;


    GRAPH graph;
    std::vector<DDEP_PTR> lists; // null of an edge that was removed
    std::unordered_map<const NODE*, VERTEX> vertex_m; // by reference below members; looked up, never walked
    std::vector<REFERENCE> references_m;
    bool all_vectors_m = false;
    int spec_m = 0;
};
