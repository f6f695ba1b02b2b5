// Symbols: creation, classification, names, and the global view of a function.
//
// A local enters its function's `new_syms` (from the I-file) or `pending_syms` (made by a pass) and waits there until
// `sym_split` puts it on the scalar or the memory list.

#include "OPT5/ir/symtab.h"

#include "DECODE/decode.h"
#include "IFILE/ifile.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/scope.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <unordered_map>

SYMTAB* global_symbols = nullptr;
SYMTAB* errno_symbol = nullptr;

namespace {

constexpr char INTERNAL_PREFIX[] = "$O";
constexpr char EXPLODED_PARM_PREFIX[] = "$O$CSU$";

// The state that a global symbol has in the function in work, grown on demand.
template <class VEC> typename VEC::reference global_slot(VEC FUNINFO::*member, int32_t index) {
    OPT_ASSERT(currfuninfo != nullptr);
    OPT_ASSERT(index >= 0);
    VEC& v = currfuninfo->*member;
    if (static_cast<size_t>(index) >= v.size()) v.resize(static_cast<size_t>(index) + 1);
    return v[static_cast<size_t>(index)];
}

void erase_pragma_list(PRAGMA* p) {
    while (p) {
        PRAGMA* next = p->next;
        delete p;
        p = next;
    }
}

void push(SYMTAB*& list, SYMTAB* sym) {
    sym->next = list;
    list = sym;
}

} // namespace

namespace {
std::atomic<uint32_t> symbols_made{0};
}
SYMTAB::SYMTAB() : uid(++symbols_made) {}
SYMTAB::~SYMTAB() {
    std::free(name);
    erase_pragma_list(pragma);
    erase_tree(init_value);
    if (autoinit) {
        for (NODE* t : *autoinit) erase_tree(t);
        delete autoinit;
    }
}

int SYMTAB::sym_prag_num() const {
    int n = 0;
    for (const PRAGMA* p = pragma; p; p = p->next) ++n;
    return n;
}

// ---- GLOBAL_SYM

bool GLOBAL_SYM::is_aliased() const { return global_slot(&FUNINFO::global_is_aliased, index); }
int GLOBAL_SYM::bitnum() const { return global_slot(&FUNINFO::global_bitnum, index); }
int64_t GLOBAL_SYM::depnum() const { return global_slot(&FUNINFO::global_depnum, index); }
void GLOBAL_SYM::set_is_aliased(bool a) { global_slot(&FUNINFO::global_is_aliased, index) = a; }
void GLOBAL_SYM::set_bitnum(int n) { global_slot(&FUNINFO::global_bitnum, index) = static_cast<uint16_t>(n); }
void GLOBAL_SYM::inc_bitnum() { ++global_slot(&FUNINFO::global_bitnum, index); }
void GLOBAL_SYM::set_depnum(int64_t n) { global_slot(&FUNINFO::global_depnum, index) = n; }
void GLOBAL_SYM::inc_depnum() { ++global_slot(&FUNINFO::global_depnum, index); }

// ---- Entering and classifying

void init_symbols() {
    global_symbols = nullptr;
    errno_symbol = nullptr;
}

void sym_def(SYMTAB* sym) {
    if (sym->level != 0) {
        if (sym->sclass == SC_DROPPED) return;
        if (sym->sclass == SC_REGISTER || sym->sclass == SC_REGISTER2) sym->sclass = SC_AUTO;
        if (sym->level > 2) sym->level = 2;
        push(currfuninfo->new_syms, sym);
        return;
    }
    push(global_symbols, sym);
    if (o_file) o_file->if_enter_global(sym);
    if (errno_symbol || !sym->type || !sym->type->is_ikind(TYPE::ik_int)) return;
    const char* plain = skip_name_prefix(sym->name);
    if (!std::strcmp(plain, "errno") || !std::strcmp(plain, "_Errno")) errno_symbol = sym;
}

namespace {

// A list that some pass tied into a ring would hang every walk of it.
void check_for_cycle(const SYMTAB* list) {
    const SYMTAB* slow = list;
    const SYMTAB* fast = list ? list->next : nullptr;
    while (fast && fast->next) {
        OPT_ASSERT(slow != fast);
        slow = slow->next;
        fast = fast->next->next;
    }
}

void split_symbol(FUNINFO* funinfo, SYMTAB* sym) {
    switch (sym->sclass) {
    case SC_DROPPED: return;
    case SC_MEMORY:
    case SC_PARM:
    case SC_MEMORY27: push(funinfo->memory_syms, sym); return;
    case SC_REGISTER:
    case SC_REGISTER2: sym->sclass = SC_AUTO; break;
    case SC_AUTO:
    case SC_EXTDEF:
    case SC_STATIC:
    case SC_EXTERN: break;
    default: abort_optimizer();
    }
    const bool scalar = !sym->type->is_volatile() && sym->type->is_scalar();
    push(scalar ? funinfo->scalar_syms : funinfo->memory_syms, sym);
}

} // namespace

void sym_split(FUNINFO* funinfo) {
    check_for_cycle(funinfo->scalar_syms);
    for (SYMTAB** waiting : {&funinfo->new_syms, &funinfo->pending_syms}) {
        // Newest first, so that what was waiting stands in order of creation.
        SYMTAB* sym = *waiting;
        *waiting = nullptr;
        while (sym) {
            SYMTAB* next = sym->next;
            split_symbol(funinfo, sym);
            sym = next;
        }
    }
}

SYMTAB* sym_temp(char letter, long number, TYPE* type, LS* ls) {
    if (number < 0) number = currfuninfo->temp_counter++;
    TYPE* otype = type;
    if (type->is_enum()) otype = tp->int_t;
    TYPE* elem = otype;
    while (elem->is_array()) elem = elem->raw_elem_type();
    if (elem->kind == TYPE::tpk_qual) otype = otype->type_qualified();

    char name[64];
    std::snprintf(name, sizeof name, "%s$%c%ld", INTERNAL_PREFIX, letter, number);
    auto* sym = new SYMTAB;
    sym->name = safestrdup(name);
    sym->sclass = SC_AUTO;
    sym->is_temp = true;
    sym->flags = 1;
    sym->level = 2;
    sym->type = sym->orig_type = otype;
    sym->size = otype->size;
    sym->align = otype->align;
    OPT_ASSERT(otype->is_func() || sym->size == otype->size);
    sym->index = currfuninfo->next_symbol_index++;
    sym->set_is_aliased(false);
    push(currfuninfo->pending_syms, sym);
    sym->scope = ls ? ls : LS::level_2_scope();
    LS::add_symbol(sym);
    return sym;
}

SYMTAB* copy_symbol(const SYMTAB* sym, bool) {
    auto* copy = new SYMTAB;
    copy->index = sym->index;
    copy->retention = sym->retention;
    copy->name = safestrdup(sym->name);
    copy->size = sym->size;
    copy->value = sym->value;
    copy->sclass = sym->sclass;
    copy->flags = sym->flags;
    copy->cqual = sym->cqual;
    copy->type = sym->type;
    copy->orig_type = sym->orig_type;
    copy->cpp_type = sym->cpp_type;
    copy->align = sym->align;
    copy->psn = sym->psn;
    PRAGMA** tail = &copy->pragma;
    for (const PRAGMA* p = sym->pragma; p; p = p->next) {
        *tail = new PRAGMA(*p);
        (*tail)->next = nullptr;
        tail = &(*tail)->next;
    }
    copy->level = sym->level;
    copy->location = sym->location;
    copy->option_set = sym->option_set;
    copy->depnum_m = sym->depnum_m;
    copy->bitnum_m = sym->bitnum_m;
    copy->is_aliased_m = sym->is_aliased_m;
    copy->is_temp = sym->is_temp;
    copy->dynamic_init = sym->dynamic_init;
    return copy;
}

namespace {

// Definitions of file scope by name, so that a declaration finds its own in constant time. The reader asks once for each
// NAME that it reads; the index is extended by what was put on `global_symbols` since the last question.
class DEFINITION_INDEX {
public:
    SYMTAB* find(const SYMTAB* decl) {
        update();
        auto [first, last] = by_name.equal_range(decl->name);
        for (; first != last; ++first)
            if (first->second != decl && compatible_types(first->second->type, decl->type, true)) return first->second;
        return nullptr;
    }

private:
    void update() {
        if (newest == global_symbols) return;
        std::vector<SYMTAB*> fresh;
        SYMTAB* s = global_symbols;
        for (; s && s != newest; s = s->next) fresh.push_back(s);
        if (!s) by_name.clear(); // another list: start over
        for (auto it = fresh.rbegin(); it != fresh.rend(); ++it)
            if ((*it)->sclass == SC_EXTDEF && (*it)->type) by_name.emplace((*it)->name, *it);
        newest = global_symbols;
    }
    std::unordered_multimap<std::string, SYMTAB*> by_name;
    SYMTAB* newest = nullptr;
};

} // namespace

SYMTAB* get_sym_def_for_decl(SYMTAB* sym) {
    static DEFINITION_INDEX definitions;
    if (!sym || sym->level != 0 || sym->sclass != SC_EXTERN || !sym->type) return sym;
    SYMTAB* def = definitions.find(sym);
    return def ? def : sym;
}

// ---- Names

namespace {
// The second ABI says that names carry no prefix.
bool names_carry_prefix() { return TYPE_PKG::abi != 1; }
} // namespace

bool name_has_prefix(const char* name) { return names_carry_prefix() && (name[0] == '.' || name[0] == '_'); }
const char* skip_name_prefix(const char* name) { return name_has_prefix(name) ? name + 1 : name; }

bool is_internal_name(const char* name) { return name[0] == INTERNAL_PREFIX[0] && name[1] == INTERNAL_PREFIX[1]; }
bool is_internal_symbol(const SYMTAB* sym) { return is_internal_name(sym->name); }

bool is_optimizer_temp(const char* name, char c1, char c2) {
    if (!is_internal_name(name) || name[2] != '$') return false;
    if (name[3] != c1 && name[3] != c2) return false;
    const char* p = name + 4;
    return name[3] && p[std::strspn(p, "0123456789")] == '\0';
}

bool is_operator_new_symbol(const SYMTAB* sym) {
    static const std::string plain_new = "operator new";
    const std::string name = decode_name(sym->name);
    if (!sym->is_function() || name.compare(0, plain_new.size(), plain_new)) return false;
    return name.size() > plain_new.size() && (name[plain_new.size()] == ' ' || name[plain_new.size()] == '(');
}

SYMTAB* gen_operator_new_temp(TYPE* type) {
    return sym_temp('n', currfuninfo->name_counter++, tp->mk_qual(type, QUAL_RESTRICT), nullptr);
}

PRAGMA* find_pragma(const SYMTAB* sym, int kind) {
    for (PRAGMA* p = sym->pragma; p; p = p->next)
        if (p->kind == kind) return p;
    return nullptr;
}

void remove_pragma(int kind, PRAGMA** list) {
    for (; *list; list = &(*list)->next) {
        if ((*list)->kind != kind) continue;
        PRAGMA* gone = *list;
        *list = gone->next;
        delete gone;
        return;
    }
}

bool is_struct_explosion_parm_assignment(const NODE* a, const NODE* b) {
    if (!a || !b || a->op != NAME || b->op != STDOT) return false;
    if (std::strncmp(skip_name_prefix(a->u.sym->name), EXPLODED_PARM_PREFIX, sizeof EXPLODED_PARM_PREFIX - 1)) return false;
    b = without_members(b);
    return b->op == NAME && b->u.sym->level == 1;
}

TYPE* guess_cpp_type(const NODE* tree) {
    if (!tree) return nullptr;
    if (tree->op == NAME) return tree->u.sym->cpp_type;
    if (tree->op == UAND && tree->left) {
        TYPE* object = guess_cpp_type(tree->left);
        return object ? tp->mk_ptr(object) : nullptr;
    }
    if ((tree->op == STDOT || tree->op == STREF) && tree->right) return tree->right->mval->type;
    return nullptr;
}

// ---- Interning. Symbols are not interned; the table stays empty and these answer for it.

SYMTAB* intern_symbol(SYMTAB* sym, FUNINFO*) { return sym; }
SYMTAB* find_interned_symbol(SYMTAB*, FUNINFO*) { return nullptr; }
void map_over_interned_symbols(void (*)(SYMTAB*)) {}
void interned_stats() {}

// ---- Changed widths

void make_widened_symbol_entry(SYMTAB* sym, TYPE* type, INT65 max, INT65 min, INT65 known0, INT65 known1) {
    // Bits that are equal in every value of a range that does not cross zero: those above the highest differing bit.
    INT65 range0 = ~INT65(0), range1 = ~INT65(0);
    if (min.is_negative() == max.is_negative()) {
        INT65 differing = min ^ max;
        INT65 below = 0;
        while (!differing.is_zero()) {
            differing = differing >> 1;
            below = (below << 1) | INT65(1);
        }
        range0 = ~max & ~below;
        range1 = max & ~below;
    } else {
        range0 = range1 = 0;
    }
    currfuninfo->widened =
        new SYM_RANGE{currfuninfo->widened, sym, max, min, known0 & range0, known1 | range1, type, 0x10000, 0};
}

void make_shortened_symbol_entry(SYMTAB* sym, TYPE* type) {
    currfuninfo->shortened = new SYM_RANGE{currfuninfo->shortened, sym,  int_type_max(type), int_type_min(type), INT65(0),
                                           INT65(0),               type, 0x1000000,          0};
}

namespace {
SYM_RANGE* find_range(SYM_RANGE* list, const SYMTAB* sym) {
    while (list && list->sym != sym) list = list->next;
    return list;
}
} // namespace

SYM_RANGE* find_widened_symbol_entry(const SYMTAB* sym) { return find_range(currfuninfo->widened, sym); }
SYM_RANGE* find_shortened_symbol_entry(const SYMTAB* sym) { return find_range(currfuninfo->shortened, sym); }
void widen_user_variables() {} // this target's registers hold every scalar as it is
