// Merging of types that were declared in separate translation units.
//
// Two declarations of one tag with the same layout are one type to the program. The newer is linked to the older by
// `equiv`; references in the output follow the link. The comparison covers everything reachable from the two types and
// links only when all of it agrees, since a structure may refer to itself through others.
#include "TYPES/type_impl.h"

#include <algorithm>
#include <cstring>

bool TYPE_MERGE_OPTS::is_redefinition_m = false;

// Types that a type is compared with, and those that are looked at to find them. A program has a handful of types of
// one name; thousands of tagless ones are not worth comparing each with each, and to leave equal types apart is always
// sound.
static const size_t max_candidates = 50, max_looked_at = 1000;

TYPE* find_type(TYPE* t) {
    while (t->equiv) t = t->equiv;
    return t;
}

static const TYPE* find_type(const TYPE* t) { return find_type(const_cast<TYPE*>(t)); }

// Temporaries of the parser that differ from unit to unit in their number.
static bool is_parser_name(const std::string& name) {
    return name.compare(TYPE_PKG::abi == 1 ? 0 : std::min<size_t>(1, name.size()), 4, "$P$T") == 0;
}

static bool member_names_equal(const std::string& a, const std::string& b) {
    return a == b || (is_parser_name(a) && is_parser_name(b));
}

namespace {

class MERGER {
public:
    void add(const TYPE* a, const TYPE* b) { pairs_m.add(find_type(a), find_type(b)); }
    bool members_equal(const fkMDATA* a, const fkMDATA* b);
    bool all_equal();
    void link_all();

private:
    bool nodes_equal(const TYPE* a, const TYPE* b);
    bool csus_equal(const TYPE* a, const TYPE* b);
    TYPE_PAIRS pairs_m;
    std::vector<TYPE_PAIRS::PAIR> equal_m; // every pair that was compared
};

} // namespace

bool MERGER::members_equal(const fkMDATA* a, const fkMDATA* b) {
    for (; a && b; a = a->next, b = b->next) {
        if (!member_names_equal(a->name, b->name) || a->offset != b->offset || a->access != b->access ||
            a->aux != b->aux || a->flag1 != b->flag1 || a->is_bitfld != b->is_bitfld || a->flag3 != b->flag3 ||
            a->flag4 != b->flag4)
            return false;
        if (a->is_bitfld && a->width != b->width) return false;
        add(a->type, b->type);
    }
    return !a && !b;
}

static bool sizes_agree(const TYPE* a, const TYPE* b) {
    if (a->size == b->size) return a->align == b->align;
    bool may_be_missing = a->kind == TYPE::tpk_enum || a->kind == TYPE::tpk_func;
    return may_be_missing && (a->size == 0 || b->size == 0);
}

bool MERGER::csus_equal(const TYPE* a, const TYPE* b) {
    // An incomplete declaration has nothing to compare; it may go only where nothing is lost.
    const TYPE *older = a->tu < b->tu || (a->tu == b->tu && a->uid < b->uid) ? a : b, *newer = older == a ? b : a;
    if (a->kind != b->kind || !compare_type_names(a, b) || a->cpp != b->cpp) return false;
    if (!newer->is_complete() && !newer->mdata() && !newer->csu_extras() && !type_is_tagless(newer)) return true;
    if (!older->is_complete()) return false;
    return a->is_complete() == b->is_complete() && sizes_agree(a, b) && a->is_lowered() == b->is_lowered() &&
           a->is_struct_vector() == b->is_struct_vector() && a->csu_word() == b->csu_word() &&
           members_equal(a->mdata(), b->mdata()) && csu_extras_alike(a->csu_extras(), b->csu_extras(), pairs_m);
}

bool MERGER::nodes_equal(const TYPE* a, const TYPE* b) {
    if (!a->uid || !b->uid || a->kind != b->kind || a->cpp != b->cpp) return false;
    if (a->get_csu()) return csus_equal(a, b);
    if (!sizes_agree(a, b)) return false;
    switch (a->kind) {
    case TYPE::tpk_int:
    case TYPE::tpk_float: return exact_types(a, b);
    case TYPE::tpk_fixed:
        if (a->binpt() != b->binpt()) return false;
        break;
    case TYPE::tpk_qual:
        if (a->own_qual_bits() != b->own_qual_bits()) return false;
        break;
    case TYPE::tpk_typedef:
        if (a->is_lowered() != b->is_lowered() || !compare_type_names(a, b)) return false;
        break;
    case TYPE::tpk_array:
        if (a->num_elem() != b->num_elem() || a->is_complete() != b->is_complete() || a->is_vector() != b->is_vector())
            return false;
        break;
    case TYPE::tpk_ptm: add(a->ptm_class(), b->ptm_class()); break;
    case TYPE::tpk_func:
        if (a->cc_kind() != b->cc_kind() || a->vararg() != b->vararg() || a->proto() != b->proto() ||
            !params_alike(a->params(), b->params(), pairs_m))
            return false;
        break;
    case TYPE::tpk_enum:
        if (!compare_type_names(a, b) || !equal_etors(a->etors(), b->etors())) return false;
        break;
    default: break;
    }
    if (a->component()) add(a->component(), b->component());
    return true;
}

bool MERGER::all_equal() {
    while (!pairs_m.empty()) {
        TYPE_PAIRS::PAIR p = pairs_m.take();
        const TYPE *a = find_type(p.first), *b = find_type(p.second);
        if (same_type(a, b) || !pairs_m.first_visit(a, b)) continue;
        equal_m.push_back({a, b});
        if (!nodes_equal(a, b)) return false;
    }
    return true;
}

// User types first, then what is built on them from the inside out, so that the bases of a type are linked before it.
void MERGER::link_all() {
    std::reverse(equal_m.begin(), equal_m.end());
    for (bool user_types : {true, false})
        for (auto& p : equal_m) {
            if ((p.first->kind >= TYPE::tpk_enum) != user_types) continue;
            TYPE *a = find_type(const_cast<TYPE*>(p.first)), *b = find_type(const_cast<TYPE*>(p.second));
            if (same_type(a, b)) continue;
            bool a_older = a->tu < b->tu || (a->tu == b->tu && a->uid < b->uid);
            (a_older ? b : a)->set_equiv(a_older ? a : b);
        }
}

bool merge_types(TYPE* a, TYPE* b) {
    if (!a || !b) return a == b;
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    if (same_type(find_type(a), find_type(b))) return true;
    MERGER merger;
    merger.add(a, b);
    if (!merger.all_equal()) return false;
    if (TYPE_MERGE_OPTS::is_redefinition_m) return true;
    merger.link_all();
    return same_type(find_type(a), find_type(b));
}

bool mdata_equal(const fkMDATA* a, const fkMDATA* b) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    MERGER merger;
    if (!merger.members_equal(a, b) || !merger.all_equal()) return false;
    if (!TYPE_MERGE_OPTS::is_redefinition_m) merger.link_all();
    return true;
}

bool TYPE::set_equiv(TYPE* other) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    TYPE* from = find_type(this);
    other = find_type(other);
    if (from == other || !from->uid || !other->uid || from->kind != other->kind) return false;
    bool other_newer = other->tu > from->tu || (other->tu == from->tu && other->uid > from->uid);
    if (other_newer || from->refd || from->writ) return false;
    TYPE* base = base_type(from);
    if (base != base_type(other)) return false;
    if (other->size == 0 && from->size != 0) {
        other->size = from->size;
        other->align = from->align;
    }
    auto list = base->based.find(from->map_name);
    std::list<TYPE*>& merged = base->based["__merged"];
    merged.splice(merged.end(), list->second, from->place_m);
    if (list->second.empty()) base->based.erase(list);
    from->map_name = "__merged";
    link_types(from, other);
    return true;
}

// A look at sizes and members alone, which tells most different types apart without a walk.
static bool may_be_equal(const TYPE* a, const TYPE* b) {
    if (a->kind != b->kind || (a->kind < TYPE::tpk_func && a->size != b->size)) return false;
    if (!a->get_csu() || !a->mdata() || !b->mdata()) return true;
    const fkMDATA *m = a->mdata(), *n = b->mdata();
    for (; m && n; m = m->next, n = n->next) {
        if (m->offset != n->offset || m->type->kind != n->type->kind) return false;
        if (m->type->kind < TYPE::tpk_func && m->type->size != n->type->size) return false;
    }
    return !m && !n;
}

bool find_equivalent_type(TYPE* t) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    if (t->equiv || t->merg || !t->uid) return t->equiv != nullptr;
    t->merg = true;
    TYPE* base = base_type(t);
    auto list = base->based.find(map_name(t));
    if (list == base->based.end()) return false;
    std::vector<TYPE*> candidates; // merging changes the list
    size_t looked_at = 0;
    for (TYPE* c : list->second) {
        if (c == t || ++looked_at > max_looked_at || candidates.size() == max_candidates)
            break; // those behind `t` are newer
        if (may_be_equal(c, t)) candidates.push_back(c);
    }
    for (TYPE* c : candidates)
        if (merge_types(t, c) && t->equiv) return true;
    return false;
}
