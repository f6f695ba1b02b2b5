// LS: a lexical scope, one node of a tree per function; PTR: what is known of a pointer object.
//
// The root is FUNINFO::ls_root, depth 0 the file, 1 the parameters, 2 and on the blocks. Scopes live with the function.
#pragma once

#include "UTIL/psn.h"

#include <cstdint>
#include <cstdio>
#include <map>
#include <utility>

class FUNINFO;
class NODE;
class SYMTAB;
struct SYMLIST;
struct fkMDATA;
struct LS;

enum PTR_FLAGS : uint8_t {
    PTR_IS_FILE_LEVEL = 0x1,
    PTR_IS_A_PARAMETER = 0x2,
    PTR_IS_REASSIGNED = 0x4,
    PTR_IS_RESTRICTED = 0x8,
    PTR_IS_DISJOINTED = 0x10,
    PTR_IS_A_ROOT = 0x20,
    PTR_IS_BOTTOM = 0x40,
};

struct PTR {
    PTR* next = nullptr;
    PTR* root = nullptr; // what this one is derived from; itself for a root
    SYMTAB* symbol = nullptr;
    fkMDATA* member = nullptr;
    LS* scope = nullptr;
    uint32_t number = 0;
    uint8_t flags = 0;
};

struct LS {
    LS* parent = nullptr;
    LS* first_child = nullptr;
    LS* last_child = nullptr;
    LS* next_sibling = nullptr;
    SYMLIST* pointers = nullptr;
    SYMLIST* structs = nullptr;
    SYMLIST* arrays = nullptr;
    SYMLIST* scalars = nullptr;
    PSN* open_psn = nullptr;
    PSN* close_psn = nullptr;
    FUNINFO* function = nullptr;
    uint32_t id = 0;
    uint32_t depth = 0;
    uint32_t kind = 0;
    uint8_t flags = 0;
    long line_offset = 0; // of a body that was integrated: its lines count from the call's

    ~LS(); // the children too

    // The scope discipline while a function is read. A violation means a corrupt input and ends the run.
    static void init(PSN* psn, SYMTAB* func, uint32_t kind);
    static void open(PSN* psn, SYMTAB* func, uint32_t kind);
    static void close(PSN* psn, SYMTAB* func, uint32_t kind);
    static LS* current(); // innermost open scope, null outside a function

    // The scope at that depth of the current function; null if it was never opened.
    static LS* level_0_scope();
    static LS* level_1_scope();
    static LS* level_2_scope();

    static void add_symbol(SYMTAB* sym); // to the symbol's scope, the current one if it has none
    void enter_symbol(SYMTAB* sym);      // to this scope
    // Gives the nodes of a tree just read their scope and makes PTR entries for its pointers.
    static void initialize_scopes_and_ptrs_from_tree(NODE* tree);
    static LS* innermost_common_scope(LS* a, LS* b);
    bool encloses(const LS* other) const; // itself included
    bool is_strictly_contained_by(const LS* other) const;
    static bool object_may_be_live_in_scope(const SYMTAB* sym, const LS* scope);
    // Joins the pointers of the current function that are derived from each other under one `root`.
    static void build_PTR_equivalence_groups();
    // Hooks a scope tree that has no parent behind the last child of this one, which owns it then.
    void splice_scope(LS* tree);
    void offset_scope(long lines); // with the scopes in it
    void validate() const;
    void print(FILE* out, int indent = 0) const;
};

// The record of a pointer expression (a NAME, UMULT(UAND(NAME)), a STDOT of such), made on first use; null for other shapes.
PTR* find_or_make_PTR_entry(NODE* tree);
PTR* find_or_make_PTR_entry(SYMTAB* sym, fkMDATA* member = nullptr);
// Gives the copy of a pointer variable what is known of the variable, but for the group, which is built anew.
void copy_PTR_entry(SYMTAB* to, SYMTAB* from);
LS* true_scope(const NODE* tree);
void print_scopes(); // of the current function, to the debug stream
