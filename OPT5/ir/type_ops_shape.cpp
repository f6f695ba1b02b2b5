// Questions about the shape of types: what lies in what, what may be volatile, what may share storage.

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"

#include <algorithm>
#include <map>
#include <mutex>
#include <set>
#include <utility>

namespace {

// Answers by pair of types; looked up only, so that the order of the pairs decides nothing.
class answer_cache {
public:
    template <class F>
    bool ask(const TYPE* a, const TYPE* b, const F& compute) {
        std::pair<const TYPE*, const TYPE*> key(a, b);
        {
            std::lock_guard<std::mutex> guard(lock);
            auto found = answers.find(key);
            if (found != answers.end()) {
                ++hits;
                return found->second;
            }
        }
        bool answer = compute();
        std::lock_guard<std::mutex> guard(lock);
        answers.emplace(key, answer);
        return answer;
    }
    void print(const char* name) {
        std::lock_guard<std::mutex> guard(lock);
        debug_printf("%s: %zu entries, %ld hits\n", name, answers.size(), hits);
    }

private:
    std::mutex lock;
    std::map<std::pair<const TYPE*, const TYPE*>, bool> answers;
    long hits = 0;
};

answer_cache component_answers, twin_answers, union_answers, alias_answers;

// Visits the types that objects of `t` hold, `t` included, each once; stops where `found` says so.
template <class F>
bool visit_components(TYPE* t, std::set<const TYPE*>& seen, const F& found) {
    for (;;) {
        t = find_type(t->real);
        if (!seen.insert(t).second) return false;
        if (found(t)) return true;
        if (t->is_array())
            t = t->raw_elem_type();
        else if (t->is_complex())
            t = t->part_type();
        else
            break;
    }
    if (!t->is_csu()) return false;
    for (fkMDATA* m = t->mdata(); m; m = m->next)
        if (visit_components(m->type, seen, found)) return true;
    if (const CSU_EXTRAS* extras = t->csu_extras())
        for (const fkBCLASS& base : extras->base_classes.items)
            if (visit_components(base.type, seen, found)) return true;
    return false;
}

template <class F>
bool any_component(TYPE* t, const F& found) {
    std::set<const TYPE*> seen;
    return visit_components(t, seen, found);
}

TYPE* bare(TYPE* t) { return find_type(t->real); }

bool same_component(TYPE* part, TYPE* t) {
    return t == part || compatible_types(part, t, true) || equiv_mtypes(part, t);
}

} // namespace

bool is_type_component_of_type(TYPE* part, TYPE* whole) {
    part = bare(part);
    whole = bare(whole);
    return component_answers.ask(part, whole, [part, whole] {
        return any_component(whole, [part](TYPE* t) { return same_component(part, t); });
    });
}

bool type_or_its_twin_is_component(TYPE* part, TYPE* whole) {
    if (is_type_component_of_type(part, whole)) return true;
    part = bare(part);
    if (!part->is_int() && !part->is_enum()) return false;
    whole = bare(whole);
    return twin_answers.ask(part, whole, [part, whole] {
        TYPE* signed_form = bare(essential_type(part));
        return any_component(whole, [signed_form](TYPE* t) {
            return (t->is_int() || t->is_enum()) && same_component(signed_form, bare(essential_type(t)));
        });
    });
}

bool type_is_contained_in_type(TYPE* part, TYPE* whole) {
    return part->size <= whole->size && is_type_component_of_type(part, whole);
}

bool is_field_member_of_type(const fkMDATA* field, TYPE* type) {
    return any_component(type, [field](TYPE* t) {
        if (!t->is_csu()) return false;
        for (const fkMDATA* m = t->mdata(); m; m = m->next)
            if (m == field) return true;
        return false;
    });
}

bool csu_type_has_only_simple_scalar_members(TYPE* t, int limit) {
    if (!t->is_csu() || !t->is_complete()) return false;
    int n = 0;
    for (const fkMDATA* m = t->mdata(); m; m = m->next) {
        bool is_simple = m->type->is_scalar() && !m->type->is_complex() && !m->is_bitfld && !m->type->is_volatile();
        if (!is_simple || ++n > limit) return false;
    }
    return n > 0;
}

// Every complete union of the program that holds both.
bool types_contained_in_union(TYPE* a, TYPE* b) {
    a = bare(a);
    b = bare(b);
    return union_answers.ask(a, b, [a, b] {
        std::lock_guard<std::recursive_mutex> guard(rt_lock);
        for (const auto& named : TYPE_PKG::root_type->based)
            for (TYPE* u : named.second)
                if (u->kind == TYPE::tpk_union && is_type_component_of_type(a, u) && is_type_component_of_type(b, u))
                    return true;
        return false;
    });
}

// An object of one may be accessed as the other: through a member, as a character, or by a union.
bool type_may_alias_type(TYPE* a, TYPE* b) {
    a = bare(a);
    b = bare(b);
    if (a == b || a->is_void() || b->is_void()) return true;
    return alias_answers.ask(a, b, [a, b] {
        auto is_char = [](const TYPE* t) { return t->is_schar() || t->is_uchar(); };
        if (chars_alias_other_types && (is_char(a) || is_char(b))) return true;
        TYPE *x = essential_type(a), *y = essential_type(b);
        if (is_type_component_of_type(x, y) || is_type_component_of_type(y, x)) return true;
        auto holds_twin = [](TYPE* whole, TYPE* part) { // signed and unsigned forms access each other's objects
            return any_component(whole, [part](TYPE* t) {
                return (t->is_int() || t->is_enum()) && same_component(part, bare(essential_type(t)));
            });
        };
        return holds_twin(a, bare(y)) || holds_twin(b, bare(x)) || types_contained_in_union(a, b);
    });
}

bool type_may_access_part_of(TYPE* access, TYPE* whole) {
    access = bare(access);
    if (access->is_void() || (access->is_csu() && !access->is_complete())) return true;
    if (access->is_int() && access->size <= tp->int_t->size) return true; // a character is no wider
    return type_or_its_twin_is_component(access, whole);
}

bool type_may_contain_volatile(TYPE* t) {
    if (t->is_volatile()) return true;
    return any_component(t, [](TYPE* c) {
        if (c->is_array() && c->raw_elem_type()->is_volatile()) return true;
        if (!c->is_csu()) return false;
        if (!c->is_complete()) return true;
        for (const fkMDATA* m = c->mdata(); m; m = m->next)
            if (m->type->is_volatile()) return true;
        return false;
    });
}

bool type_could_be_an_array(TYPE* t) {
    return any_component(t,
                         [](TYPE* c) { return c->is_void() || c->is_array() || (c->is_csu() && !c->is_complete()); });
}

TYPE* type_of_nth_parameter(int n, const SYMTAB* sym) {
    if (n < 0 || !sym->type->is_func() || !sym->type->real->has_params()) return nullptr;
    const fkPARAM* p = sym->type->real->params();
    for (; p && n > 0; --n) p = p->next;
    return p && !p->type->is_void() ? p->type : nullptr;
}

void type_cache_stats() {
    if (!print_debug) return;
    component_answers.print("is_type_component_of_type");
    twin_answers.print("type_or_its_twin_is_component");
    union_answers.print("types_contained_in_union");
    alias_answers.print("type_may_alias_type");
}

// ---- Immutability
static bool const_holds_for_csu() {
    return old_const_pointer_behavior && currfuninfo && !TEST_FLAG(currfuninfo, FUN_is_cpp);
}

bool symbol_is_immutable(const SYMTAB* sym) {
    const TYPE* t = sym->type;
    if (!t || !t->is_const() || t->is_volatile() || sym->level >= 3 || sym->dynamic_init) return false;
    while (t->is_array()) t = t->raw_elem_type();
    return !t->is_csu() || const_holds_for_csu();
}

bool lvalue_is_immutable(const NODE* tree) {
    if (const SYMTAB* object = object_name_if_known(tree))
        if (symbol_is_immutable(object)) return true;
    return tree->type->is_const() && !tree->type->is_volatile() && const_holds_for_csu();
}

bool bits_of_var_are_immutable(TYPE* type, int64_t start, int64_t width) {
    if (type->is_volatile()) return false;
    bool is_const = type->is_const();
    while (type->is_array()) {
        TYPE* elem = type->raw_elem_type();
        int64_t stride = static_cast<int64_t>(type_stride(elem));
        is_const |= elem->is_const();
        type = elem;
        if (stride <= 0) break;
        if (start % stride + width > stride) { // more than one element
            start = 0;
            width = stride;
        } else {
            start %= stride;
        }
    }
    if (!type->is_csu()) return is_const && !type->is_volatile();
    if (is_const && const_holds_for_csu() && !type_may_contain_volatile(type)) return true;
    bool any = false;
    for (const fkMDATA* m = type->mdata(); m; m = m->next) {
        int64_t at = m->offset, size = m->is_bitfld ? m->width : static_cast<int64_t>(m->type->size);
        if (at + size <= start || start + width <= at) continue;
        int64_t from = std::max(start - at, int64_t(0));
        int64_t to = std::min(start + width - at, size);
        if (!bits_of_var_are_immutable(m->type, from, to - from)) return false;
        any = true;
    }
    return any;
}
