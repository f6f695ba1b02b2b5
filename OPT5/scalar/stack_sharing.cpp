// Arrays and structures of disjoint lexical scopes share stack space: they become members of one union.
//
// The tree of records follows the tree of scopes: a record's variables stand side by side and ahead of what its
// children need, the children lie over each other. What the outermost block declares lives as long as the function and
// stays out.
//
// Needs: alias marks; no load or store of memory has moved (`FUNINFO::stack_is_laid_out`). Leaves: what rests on the
// graph; symbols are split anew.
// Sound because an object lives from the entry of its block to its end, however control gets in and out, so that
// objects of two blocks neither of which encloses the other never live at once. That holds of accesses only while none
// has left its scope, so a variable that is named outside of its scope all the same stays out. Behind this step the
// members are parts of one object to every pass, at offsets that overlap, and the rule on types does not part accesses
// to what the union holds (`lvalues_may_be_aliased`).
#include "OPT5/scalar/stack_sharing.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/target/target.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

struct OVERLAP {
    std::vector<SYMTAB*> vars; // null for one that was deleted
    OVERLAP* first_child = nullptr;
    OVERLAP* next_sibling = nullptr;
    OVERLAP* parent = nullptr;
    uint32_t level = 0; // depth of the scope
};

// ---- Records

namespace {

OVERLAP* current = nullptr;

OVERLAP** link_of(OVERLAP* record) {
    OVERLAP** link = record->parent ? &record->parent->first_child : &currfuninfo->overlaps;
    while (*link != record) link = &(*link)->next_sibling;
    return link;
}

void erase_records(OVERLAP* record) {
    while (record) {
        erase_records(record->first_child);
        OVERLAP* next = record->next_sibling;
        delete record;
        record = next;
    }
}

struct SLOT {
    OVERLAP* record;
    size_t index;
};
std::unordered_map<const SYMTAB*, SLOT> slots; // looked up, never walked

} // namespace

void init_stack_sharing() {
    erase_records(currfuninfo->overlaps);
    currfuninfo->overlaps = current = nullptr;
    slots.clear();
}

// The children of a record stand last first.
void begin_stack_sharing_scope(uint32_t level) {
    auto* record = new OVERLAP;
    record->level = level;
    record->parent = current;
    OVERLAP*& siblings = current ? current->first_child : currfuninfo->overlaps;
    record->next_sibling = siblings;
    siblings = current = record;
}

void end_stack_sharing_scope() {
    OVERLAP* ended = current;
    current = ended->parent;
    if (!ended->vars.empty() || ended->first_child) return;
    *link_of(ended) = ended->next_sibling;
    delete ended;
}

void add_stack_sharing_variable(SYMTAB* sym) {
    slots[sym] = {current, current->vars.size()};
    current->vars.push_back(sym);
}

void delete_stack_sharing_variable(const SYMTAB* sym) {
    auto found = slots.find(sym);
    if (found == slots.end()) return;
    found->second.record->vars[found->second.index] = nullptr;
    slots.erase(found);
}

// ---- What may share

namespace {

// Deeper scopes count as one with the scope at this depth of the tree: a path is copied for each mention of a variable.
constexpr uint32_t DEEPEST_RECORD = 12;
constexpr uint32_t OUTERMOST_BLOCK = 2;

// An object that is const or volatile keeps its storage for itself: another object in its place would change it.
bool holds_const_or_volatile(TYPE* t) {
    if (t->is_const() || t->is_volatile()) return true;
    while (t->is_array()) t = t->raw_elem_type();
    if (!t->is_csu()) return false;
    for (const fkMDATA* m = t->mdata(); m; m = m->next)
        if (holds_const_or_volatile(m->type)) return true;
    return false;
}

bool is_short_array_alone(TYPE* t) {
    const fkMDATA* only = t->mdata();
    return only && !only->next && only->type->is_array() && only->type->num_elem() < 3 &&
           only->type->raw_elem_type()->is_scalar();
}

bool is_eligible(const SYMTAB* s) {
    TYPE* type = s->type;
    if (s->level != 2 || s->sclass != SC_AUTO || s->pragma || s->size_tree || is_internal_symbol(s)) return false;
    if (s == currfuninfo->csu_return_sym || s == currfuninfo->ret_by_cctor_sym) return false;
    if (!s->scope || s->scope->function != currfuninfo || s->scope->depth <= OUTERMOST_BLOCK) return false;
    if (type->is_struct_vector() || type->is_vector() || type->size == 0) return false;
    if (holds_const_or_volatile(type) || holds_const_or_volatile(s->orig_type)) return false;
    if (!type->is_complete() || sym_appears_in_EHT(s)) return false;
    if (type->is_array()) return true;
    return type->is_csu() && !is_short_array_alone(type) &&
           (s->is_aliased() || !csu_type_has_only_simple_scalar_members(type, 4));
}

class SHARING {
public:
    void run();

private:
    struct PLACE {
        NODE* path = nullptr; // owned; a tree of STDOTs from a NAME of the union
        uint64_t offset = 0;  // bits
    };

    bool list_eligible();
    void record_scope(LS* scope);
    bool keep_what_is_named_in_scope();
    void leave_out_short_arrays();
    static void tidy(OVERLAP* record);
    static void drop_what_lies_under_nothing();

    std::string type_name(char letter, const OVERLAP* record) {
        return letter + std::to_string(record->level) + "_" + std::to_string(counter++);
    }
    TYPE* union_of(const OVERLAP* record);
    TYPE* structure_of(const OVERLAP* record);
    void find_places(const OVERLAP* record, NODE* at, uint64_t offset);

    void rewrite();
    void report();
    void list_for_interlisting();
    void remove_shared_symbols();

    std::unordered_set<const SYMTAB*> eligible;
    std::vector<SYMTAB*> shared; // in the order of the scopes
    std::unordered_map<const SYMTAB*, PLACE> places;
    SYMTAB* whole = nullptr;
    int counter = 0;
};

bool SHARING::list_eligible() {
    for (const SYMTAB* s = currfuninfo->memory_syms; s; s = s->next)
        if (is_eligible(s)) eligible.insert(s);
    return eligible.size() >= 2;
}

void SHARING::record_scope(LS* scope) {
    const bool has_record = scope->depth <= DEEPEST_RECORD;
    if (has_record) begin_stack_sharing_scope(scope->depth);
    for (const SYMLIST* list : {scope->structs, scope->arrays})
        for (; list; list = list->next)
            if (eligible.count(list->sym)) add_stack_sharing_variable(list->sym);
    for (LS* child = scope->first_child; child; child = child->next_sibling) record_scope(child);
    if (has_record) end_stack_sharing_scope();
}

// False if nothing is left, or where control may come back to a statement from anywhere.
bool SHARING::keep_what_is_named_in_scope() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) {
            if (calls_setjmp(s->first)) return false;
            const LS* at = s->first->ls;
            for_each_node(s->first, [this, at](const NODE* t) {
                if (t->op != NAME || !eligible.count(t->u.sym)) return;
                if (!at || !t->u.sym->scope->encloses(at)) eligible.erase(t->u.sym);
            });
        }
    return eligible.size() >= 2;
}

// An array of few elements that is accessed at known places may yet become a set of variables.
void SHARING::leave_out_short_arrays() {
    auto visit = [](const NODE* t) {
        if (t->op != UMULT || !pointer_is_an_adcon(t->left)) return;
        const NODE* basis = pointer_basis(t->left);
        if (!basis || basis->op != UAND || basis->left->op != NAME || !basis->left->type->is_array()) return;
        if (basis->left->type->num_elem() < 8) delete_stack_sharing_variable(basis->left->u.sym);
    };
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_node(s->first->op == SWITCH || s->first->op == IF ? s->first->left : s->first, visit);
}

// Below a record with one child nothing lies over anything: the two are laid out as one.
void SHARING::tidy(OVERLAP* record) {
    for (OVERLAP** link = &record->first_child; *link;) {
        OVERLAP* child = *link;
        tidy(child);
        auto& vars = child->vars;
        vars.erase(std::remove(vars.begin(), vars.end(), nullptr), vars.end());
        if (!vars.empty() || child->first_child) {
            link = &child->next_sibling;
            continue;
        }
        *link = child->next_sibling;
        delete child;
    }
    OVERLAP* only = record->first_child;
    if (!only || only->next_sibling) return;
    record->vars.insert(record->vars.end(), only->vars.begin(), only->vars.end());
    record->first_child = only->first_child;
    for (OVERLAP* c = record->first_child; c; c = c->next_sibling) c->parent = record;
    delete only;
}

// What the root has of its own now lies under nothing.
void SHARING::drop_what_lies_under_nothing() {
    OVERLAP* root = currfuninfo->overlaps;
    if (!root) return;
    tidy(root);
    root->vars.clear();
}

std::vector<OVERLAP*> children_in_order(const OVERLAP* record) {
    std::vector<OVERLAP*> children;
    for (OVERLAP* c = record->first_child; c; c = c->next_sibling) children.push_back(c);
    std::reverse(children.begin(), children.end());
    return children;
}

// ---- The type

uint64_t rounded_up(uint64_t n, uint32_t to) { return (n + to - 1) / to * to; }

// Members of a structure or a union, as they are found.
struct LAYOUT {
    bool is_union;
    uint64_t size = 0;
    uint32_t align = 16;
    fkMDATA *first = nullptr, **tail = &first;

    void add(const std::string& name, TYPE* type, uint32_t member_align) {
        align = std::max(align, member_align);
        const uint64_t offset = is_union ? 0 : rounded_up(size, align);
        size = std::max(size, offset + type->size);
        std::lock_guard<std::recursive_mutex> hold(mdata_lock);
        *tail = new fkMDATA(name, type, 0, static_cast<int32_t>(offset), 0, false, false, false, false);
        tail = &(*tail)->next;
    }
    TYPE* close(const std::string& name) {
        size = rounded_up(size, align);
        TYPE* t = is_union ? tp->mk_union(name, size, align, false) : tp->mk_struct(name, size, align, false);
        tp->set_mdata(t, first);
        tp->type_frozen(t);
        return t;
    }
};

TYPE* SHARING::structure_of(const OVERLAP* record) {
    LAYOUT layout{false};
    for (const SYMTAB* s : record->vars) {
        const std::string name = "l" + std::to_string(record->level) + "_" + std::to_string(counter++) + "$" + s->name;
        layout.add(name, s->type, std::max(s->align, s->type->align));
    }
    if (record->first_child) {
        TYPE* nested = union_of(record);
        std::string name = nested->name();
        name[0] = 'u';
        layout.add(name, nested, nested->align);
    }
    return layout.close(type_name('S', record));
}

TYPE* SHARING::union_of(const OVERLAP* record) {
    LAYOUT layout{true};
    for (const OVERLAP* child : children_in_order(record)) {
        TYPE* part = structure_of(child);
        std::string name = part->name();
        name[0] = 's';
        layout.add(name, part, part->align);
    }
    return layout.close(type_name('U', record));
}

uint64_t bits_needed(const OVERLAP* record) {
    uint64_t sum = 0;
    for (const SYMTAB* s : record->vars) sum += s->type->size + max_scalar_alignment;
    for (const OVERLAP* c = record->first_child; c; c = c->next_sibling) sum += bits_needed(c);
    return sum;
}

// ---- References

// `at`, of the union of `record`, is consumed.
void SHARING::find_places(const OVERLAP* record, NODE* at, uint64_t offset) {
    fkMDATA* part = at->type->real->mdata();
    for (const OVERLAP* child : children_in_order(record)) {
        NODE* structure = mk_member(copy_tree(at), part);
        part = part->next;
        fkMDATA* m = structure->type->real->mdata();
        for (SYMTAB* s : child->vars) {
            shared.push_back(s);
            places[s] = {mk_member(copy_tree(structure), m), offset + static_cast<uint64_t>(m->offset)};
            m = m->next;
        }
        if (child->first_child) find_places(child, mk_member(copy_tree(structure), m), offset + static_cast<uint64_t>(m->offset));
        erase_tree(structure);
    }
    erase_tree(at);
}

void SHARING::rewrite() {
    auto put_in_place = [this](NODE* t) {
        if (t->op != NAME) return t;
        auto found = places.find(t->u.sym);
        if (found == places.end()) return t;
        NODE* path = copy_tree(found->second.path);
        path->type = t->type;
        for_each_node(path, [t](NODE* n) { n->ls = t->ls; });
        erase_tree(t);
        return path;
    };
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest) s->first = rewrite_tree(s->first, put_in_place);
}

// ---- Reports

constexpr int BITS_PER_UNIT = 16;

void SHARING::report() {
    info_printf("\nThe following local variables in %s() will be grouped together\n"
                "to share stack space among distinct scoping blocks ...",
                currfuninfo->name.c_str());
    info_printf("\n\n    --offset--    --reference--\t\t\t --variable--\n\n");
    for (const SYMTAB* s : shared) {
        const PLACE& place = places[s];
        info_printf("%11d\t  %-30s %s  [%s:%ld]\n", static_cast<int>(place.offset / BITS_PER_UNIT),
                    tree_to_infix(place.path).c_str(), s->name, s->psn && s->psn->file ? s->psn->file : "NO_FILE",
                    s->psn ? static_cast<long>(s->psn->line) : 0L);
    }
}

void SHARING::list_for_interlisting() {
    constexpr char COMMENT = ';';
    auto add = [](const char* format, auto... arguments) {
        std::string text(static_cast<size_t>(std::snprintf(nullptr, 0, format, arguments...)), '\0');
        std::snprintf(text.data(), text.size() + 1, format, arguments...);
        currfuninfo->comments.push_back(text);
    };
    const PLACE& first = places[shared.front()];
    add("\n\n%c The following local variables in %s() will be grouped together", COMMENT, currfuninfo->name.c_str());
    add("%c to share stack space among distinct scoping blocks.  References", COMMENT);
    add("%c in the source interlisting will look like \"%s\" or \"&%s+%d\".", COMMENT,
        tree_to_infix(first.path).c_str(), whole->name, static_cast<int>(first.offset / BITS_PER_UNIT));
    add("%c\n%c    --offset--    --reference--\t\t --variable--\n%c", COMMENT, COMMENT, COMMENT);
    for (const SYMTAB* s : shared) {
        const PLACE& place = places[s];
        add("%c %9d\t  %-30s %s  [%s:%ld]", COMMENT, static_cast<int>(place.offset / BITS_PER_UNIT),
            tree_to_infix(place.path).c_str(), s->name, s->psn && s->psn->file ? s->psn->file : "NO_FILE",
            s->psn ? static_cast<long>(s->psn->line) : 0L);
    }
}

void SHARING::remove_shared_symbols() {
    for (SYMTAB** link = &currfuninfo->memory_syms; *link;) {
        SYMTAB* s = *link;
        if (!places.count(s)) {
            link = &s->next;
            continue;
        }
        *link = s->next;
        s->next = nullptr;
        currfuninfo->dropped_syms.push_back(s);
    }
    for (auto& place : places) erase_tree(place.second.path);
}

void check_root() {
    const OVERLAP* root = currfuninfo->overlaps;
    if (!root || (!root->parent && root->level == OUTERMOST_BLOCK && root->vars.empty())) return;
    optassert("currfuninfo->overlaps == NULL || ( (currfuninfo->overlaps->parent == NULL) && "
              "(currfuninfo->overlaps->level == 2) && (currfuninfo->overlaps->vars == NULL) )",
              __FILE__, __LINE__);
}

void SHARING::run() {
    constexpr uint64_t MOST_BITS = uint64_t(1) << 30; // an offset is a word
    need(fact::alias_marks);
    if (!list_eligible() || !keep_what_is_named_in_scope()) return;
    init_stack_sharing();
    record_scope(LS::level_2_scope());
    check_root();
    leave_out_short_arrays();
    drop_what_lies_under_nothing();
    const OVERLAP* root = currfuninfo->overlaps;
    if (!root || !root->first_child || bits_needed(root) > MOST_BITS) return;
    whole = sym_temp('O', 1, union_of(root), nullptr);
    sym_split(currfuninfo);
    currfuninfo->stack_union = whole;
    find_places(root, mk_NAME(whole), 0);
    rewrite();
    if (write_opt_info) report();
    if (source_interlist) list_for_interlisting();
    remove_shared_symbols();
}

} // namespace

void build_stack_sharing_type() {
    LS* outermost = LS::level_2_scope();
    const bool has_scopes = outermost && outermost->first_child && currfuninfo->bb_list;
    const bool shares = opt_level() > 0 || has_hardware_float();
    if (has_scopes && shares && !currfuninfo->stack_is_laid_out) {
        if (print_debug && fdebug) currfuninfo->ls_root->print(fdebug);
        SHARING().run();
        init_stack_sharing();
        changed(fact::graph);
    }
    currfuninfo->stack_is_laid_out = true;
}
