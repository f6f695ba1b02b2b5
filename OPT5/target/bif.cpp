// The descriptors of built-in functions: made from bif.def, kept by name.

#include "OPT5/target/bif.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/target/target.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"

#include <cctype>
#include <cstdarg>
#include <cstring>
#include <map>
#include <memory>
#include <vector>

BIF_CALLBACKS bif_callbacks;

namespace {

std::map<std::string, std::unique_ptr<BIF>, std::less<>> descriptors;

[[noreturn]] void internal_error(const char* text) {
    fputs(text, stderr);
    abort_optimizer();
}

// ---- Parameter symbols, shared by all entries that agree in letter and type
struct POOLED {
    char letter;
    TYPE* type;
    SYMTAB* sym;
};
std::vector<POOLED> parameter_pool;

TYPE* pool_type(TYPE* t) {
    if (t->is_enum()) return normalized_underlying_type(t);
    return t->is_array() ? t->stqs() : t;
}

SYMTAB* pooled_parameter(char letter, TYPE* type) {
    TYPE* key = pool_type(type);
    for (const POOLED& p : parameter_pool)
        if (p.letter == letter && compatible_types(p.type, key, true)) return p.sym;
    SYMTAB* sym = new SYMTAB;
    const char name[2] = {letter, 0};
    sym->name = safestrdup(name);
    sym->sclass = SC_AUTO;
    sym->level = 2;
    sym->type = sym->orig_type = key;
    sym->size = key->size;
    sym->align = key->align;
    parameter_pool.push_back({letter, key, sym});
    return sym;
}

// ---- Types as bif.def writes them
class type_reader {
public:
    explicit type_reader(const char* text) : p(text) {}

    bool at_end() {
        skip();
        return !*p;
    }
    bool comma() {
        skip();
        if (*p != ',') return false;
        ++p;
        return true;
    }
    TYPE* type() {
        bool is_far = word("far");
        TYPE* t = base();
        if (is_far) t = tp->mk_qual(t, QUAL_FAR);
        for (skip(); *p == '*'; skip()) {
            ++p;
            t = tp->mk_ptr(t);
        }
        return t;
    }
    char letter() {
        skip();
        return *p++;
    }

private:
    const char* p;

    void skip() {
        while (*p == ' ') ++p;
    }
    bool word(const char* w) {
        skip();
        std::size_t n = strlen(w);
        if (strncmp(p, w, n) || isalnum(static_cast<unsigned char>(p[n]))) return false;
        p += n;
        return true;
    }
    TYPE* base() {
        if (word("unsigned")) {
            if (word("short")) return tp->ushort_t;
            if (!word("long")) return tp->uint_t;
            return word("long") ? tp->ullong_t : tp->ulong_t;
        }
        if (word("long")) return word("long") ? tp->llong_t : word("double") ? tp->ldouble_t : tp->long_t;
        if (word("int")) return tp->int_t;
        if (word("short")) return tp->short_t;
        if (word("schar")) return tp->schar_t;
        if (word("float")) return tp->float_t;
        if (word("double")) return tp->double_t;
        if (word("void")) return tp->void_t;
        if (word("F32")) return TYPE_PKG::abi == 1 ? tp->float_t : tp->double_t;
        if (word("UADDRESS")) return tp->int_t->size == 32 ? tp->uint_t : tp->ulong_t;
        internal_error("\n\n!!! INTERNAL ERROR in init_BIF_descriptors()\n");
    }
};

// ---- The table
enum WHEN { GENERIC, TARGET, FLOAT };
constexpr uint32_t MINMAX = IS_SELF_ASSOCIATIVE | TOWERS_LIKE_PLUS | OPDS_0_1_COMMUTE;
constexpr uint32_t MULTIPLY_ACCUMULATE = LIKES_UMULT_OPDS | IS_MULTIPLY_ACCUMULATE;
constexpr uint32_t BOUNDED_BY_WIDTH = MINVAL_IS_KNOWN | MAXVAL_IS_KNOWN; // 0 to the first operand's width less 1

struct ROW {
    WHEN when;
    int opcode;
    const char *name, *ret, *parameters;
    uint32_t flags;
};
constexpr ROW rows[] = {
#define BIF_ROW(when, kind, name, ret, parameters, flags) {when, kind, name, ret, parameters, flags},
#include "OPT5/target/bif.def"
#undef BIF_ROW
};

int count_parameters(const char* text) {
    if (!*text) return 0;
    int n = 1;
    for (; *text; ++text) n += *text == ',';
    return n;
}

void make_row(const ROW& row) {
    type_reader ret(row.ret), list(row.parameters);
    BIF* bif = make_BIF_descriptor(row.opcode, row.name, count_parameters(row.parameters), ret.type());
    bif->flags = row.flags | (row.when == GENERIC ? IS_GENERIC : 0u);
    for (int i = 0; i < bif->nparams; ++i) {
        if (i && !list.comma()) internal_error("\n\n!!! INTERNAL ERROR in init_BIF_descriptors()\n");
        TYPE* type = list.type();
        def_BIF_parameter(bif, i, type, list.letter());
    }
    if (!list.at_end()) internal_error("\n\n!!! INTERNAL ERROR in init_BIF_descriptors()\n");
    if ((row.flags & BOUNDED_BY_WIDTH) == BOUNDED_BY_WIDTH)
        bif->maxval = INT65(arg_list_lookup(bif->parameters, 0)->type->size) - INT65(1);
}

void make_rows(WHEN when) {
    for (const ROW& row : rows)
        if (row.when == when) make_row(row);
}

void normalize_types(BIF* bif) {
    bif->return_type = normalized_value_type(bif->return_type);
    for_each_node(bif->parameters, [](NODE* t) {
        if (t->op == NAME) t->type = normalized_value_type(t->type);
    });
}

void instantiate(const char* name, const char* generic) { instantiate_generic_BIF(name, find_BIF_descriptor(generic)); }

TYPE* builtin_return_type(const char* name) {
    const BIF* bif = find_target_BIF_descriptor(name);
    return bif && !bif->return_type->is_void() ? bif->return_type : nullptr;
}

bool builtin_returns_1_or_0(const char* name) {
    const BIF* bif = find_BIF_descriptor(name);
    return bif && bif->has(RETURNS_1_OR_0);
}

bool builtin_points_into_operand_0(const char* name) {
    const BIF* bif = find_BIF_descriptor(name);
    return bif && bif->has(POINTS_INTO_OPERAND_0);
}

} // namespace

// ---- Making
BIF* make_BIF_descriptor(int opcode, const char* name, int nparams, TYPE* ret) {
    bool valid = op_is_intrinsic(opcode) && name && *name && nparams >= 0 && nparams < 256 && ret;
    if (!valid || descriptors.count(name)) {
        fprintf(stderr, "\n\n!!! INTERNAL ERROR in make_BIF_descriptor() for \"%s\"\n", name ? name : "");
        abort_optimizer();
    }
    auto bif = std::make_unique<BIF>();
    bif->opcode = static_cast<uint8_t>(opcode);
    bif->nparams = static_cast<uint8_t>(nparams);
    bif->return_type = ret;
    bif->name = name;
    if (opcode == ICALL) bif->funinfo_flags = FUN_is_pure_fun;
    BIF* made = bif.get();
    descriptors.emplace(name, std::move(bif));
    return made;
}

BIF* make_simple_BIF(int opcode, const char* name, int nparams, TYPE* ret, ...) {
    BIF* bif = make_BIF_descriptor(opcode, name, nparams, ret);
    va_list types;
    va_start(types, ret);
    for (int i = 0; i < nparams; ++i) def_BIF_parameter(bif, i, va_arg(types, TYPE*), static_cast<char>('a' + i));
    va_end(types);
    return bif;
}

void def_BIF_parameter(BIF* bif, int index, TYPE* type, char letter) {
    if (!bif || !type || index >= bif->nparams || index != arg_list_count(bif->parameters))
        internal_error("\n\n!!! INTERNAL ERROR in def_BIF_parameter()\n");
    NODE* name = new_node(NAME, type);
    name->u.sym = pooled_parameter(letter, type);
    bif->parameters = arg_list_append(bif->parameters, name);
}

NODE* get_BIF_parameter(char letter, BIF* bif) {
    for (int i = 0; i < bif->nparams; ++i) {
        NODE* p = arg_list_lookup(bif->parameters, i);
        if (p && p->u.sym->name[0] == letter) return p;
    }
    internal_error("\n\n!!! INTERNAL ERROR in get_BIF_parameter()\n");
}

void add_BIF_semantics(BIF* bif, NODE* tree, bool must_expand) {
    if (!bif || !tree || bif->semantics) internal_error("\n\n!!! INTERNAL ERROR in add_BIF_semantics()\n");
    bif->semantics = tree;
    if (must_expand) bif->flags |= MUST_EXPAND;
}

static BIF* copy_of(const char* name, const BIF* from) {
    BIF* bif = make_BIF_descriptor(from->opcode, name, from->nparams, from->return_type);
    bif->parameters = copy_tree(from->parameters);
    bif->semantics = copy_tree(from->semantics);
    bif->minval = from->minval;
    bif->maxval = from->maxval;
    bif->funinfo_flags = from->funinfo_flags;
    bif->simplifier = from->simplifier;
    bif->evaluator = from->evaluator;
    bif->flags = from->flags & ~static_cast<uint32_t>(IS_GENERIC);
    return bif;
}

BIF* instantiate_generic_BIF(const char* name, BIF* generic) {
    if (!generic || !generic->has(IS_GENERIC)) internal_error("\n\n!!! INTERNAL ERROR in instantiate_generic_BIF()\n");
    BIF* bif = copy_of(name, generic);
    bif->partner = generic;
    generic->partner = bif;
    return bif;
}

BIF* instantiate_associative_BIF(const char* name, BIF* bif) {
    if (!bif || bif->has(IS_GENERIC) || bif->associative_partner)
        internal_error("\n\n!!! INTERNAL ERROR in instantiate_associative_BIF()\n");
    BIF* other = copy_of(name, bif);
    other->flags |= IS_SELF_ASSOCIATIVE;
    if (other->nparams == 2 && other->has(OPDS_0_1_COMMUTE)) other->flags |= TOWERS_LIKE_PLUS;
    other->associative_partner = bif;
    bif->associative_partner = other;
    return other;
}

void set_BIF_callbacks(const char* name, BIF::SIMPLIFIER simplifier, BIF::EVALUATOR evaluator) {
    BIF* bif = find_BIF_descriptor(name);
    if (!bif) internal_error("\n\n!!! INTERNAL ERROR in set_BIF_callbacks()\n");
    for (auto& entry : descriptors) {
        BIF* b = entry.second.get();
        if (b != bif && !(bif->has(IS_GENERIC) && b->partner == bif)) continue;
        b->simplifier = simplifier;
        b->evaluator = evaluator;
    }
}

// ---- Finding
BIF* find_BIF_descriptor(const char* name) {
    auto found = descriptors.find(std::string_view(name));
    if (found != descriptors.end()) return found->second.get();
    if (print_debug >= 2) debug_printf("Cannot find BIF descriptor for %s()\n", name);
    return nullptr;
}

BIF* find_target_BIF_descriptor(const char* name) {
    BIF* bif = find_BIF_descriptor(name);
    return bif && bif->has(IS_GENERIC) ? bif->partner : bif;
}

// ---- The dump
static void dump_descriptor(const BIF& bif) {
    std::string text;
    for (int i = 0; i < bif.nparams; ++i) {
        const NODE* p = arg_list_lookup(bif.parameters, i);
        text += (i ? ", " : "") + p->type->printstr() + " " + p->u.sym->name;
    }
    debug_printf("%s %s %s(%s) flags=0x%06x\n", opname(bif.opcode), bif.return_type->printstr().c_str(),
                 bif.name.c_str(), text.c_str(), bif.flags);
    if (bif.partner)
        debug_printf("%s %s()\n", bif.has(IS_GENERIC) ? "\t== generic for local" : "\t== local for generic",
                     bif.partner->name.c_str());
    if (bif.associative_partner)
        debug_printf("\t%sassociative version of %s()\n", bif.has(IS_SELF_ASSOCIATIVE) ? "" : "non-",
                     bif.associative_partner->name.c_str());
    if (bif.semantics) debug_printf("\tIt is equivalent to %s\n", tree_to_infix(bif.semantics).c_str());
}

void dump_BIF_descriptors(bool generics, bool non_generics) {
    if (print_debug < 2) return;
    for (const auto& entry : descriptors)
        if (entry.second->has(IS_GENERIC) ? generics : non_generics) dump_descriptor(*entry.second);
    debug_printf("\tTotal size: %zd nodes\n", static_cast<ssize_t>(descriptors.size()));
}

// ---- Start-up
void init_BIFs_for_target() {
    if (cpu_version == 28) {
        instantiate("__min", "MIN");
        instantiate("__lmin", "LMIN");
        instantiate("__llmin", "LLMIN");
        instantiate("__max", "MAX");
        instantiate("__lmax", "LMAX");
        instantiate("__llmax", "LLMAX");
        if (float_support) {
            instantiate("__fmin", "FMIN");
            instantiate("__fmax", "FMAX");
        }
        if (is_fpu64) {
            instantiate("__fmin64", "DMIN");
            instantiate("__fmax64", "DMAX");
        }
    }
    instantiate("_disable_interrupts", "DISABLE_INTERRUPTS");
    instantiate("__disable_interrupts", "DISABLE_INTERRUPTS");
    instantiate("_enable_interrupts", "ENABLE_INTERRUPTS");
    instantiate("__enable_interrupts", "ENABLE_INTERRUPTS");
    instantiate("_restore_interrupts", "RESTORE_INTERRUPTS");
    instantiate("__restore_interrupts", "RESTORE_INTERRUPTS");
    make_rows(TARGET);
    if (float_support) make_rows(FLOAT);
}

void init_BIF_descriptors() {
    for (auto& entry : descriptors) {
        erase_tree(entry.second->parameters);
        erase_tree(entry.second->semantics);
    }
    descriptors.clear();
    make_rows(GENERIC);
    init_BIFs_for_target();
    for (auto& entry : descriptors)
        if (!entry.second->has(IS_GENERIC)) normalize_types(entry.second.get());
    type_ops_callbacks.builtin_return_type = builtin_return_type;
    type_ops_callbacks.builtin_returns_1_or_0 = builtin_returns_1_or_0;
    type_ops_callbacks.builtin_points_into_operand_0 = builtin_points_into_operand_0;
    type_ops_callbacks.fix_BIF_types = fix_BIF_types;
    dump_BIF_descriptors(true, false);
    dump_BIF_descriptors(false, true);
}
