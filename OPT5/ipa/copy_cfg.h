// Copies of the bodies of functions, for call integration.
#pragma once

#include "OPT5/ir/funinfo.h"

#include <unordered_map>
#include <vector>

class SYMTAB;
struct LS;

// A body that was copied into a function, and is not yet part of its graph.
struct CFG_COPY {
    BBLK* first = nullptr; // the entry; the others follow by `dflink`, `rdflink` and `uolink`
    BBLK* last = nullptr;
    std::vector<SYMTAB*> symbols; // all of the copied locals and parameters, on no list yet
    std::vector<EHT_ITEM> eht;    // the labels of its clauses are stale: the dispatches tell
    LS* ls_root = nullptr;        // owned by whoever puts it in its place
    std::unordered_map<const SYMTAB*, SYMTAB*> symbol_of; // of the original; looked up
};

// Copies blocks, edges, statements, locals and scopes of `body`, which may be a saved body, into `owner`. Every label is
// new. The copies of symbols lose `const`: what was set once for the function is set at each expansion.
CFG_COPY copy_cfg(const FUNINFO& body, FUNINFO* owner);

// The parameters of a body, in the order that arguments come in.
std::vector<SYMTAB*> parameters_in_order(const FUNINFO& body);

// Keeps a copy of the body as FUNINFO::saved_cfg, unless there is one.
void save_cfg(FUNINFO* f);
