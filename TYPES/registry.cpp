// The place of every type: registration under a base, sharing of equal types, life of the package.
//
// A type hangs from its base, in a list of the base's map. The lists give the deterministic tree order; looking a type
// up goes through one hash index over all bases, keyed by the type's shape, so that a base with a hundred thousand
// types on it costs no more than one with two.
#include "DECODE/decode.h"
#include "TYPES/type_impl.h"

#include <cstdarg>
#include <unordered_map>

std::recursive_mutex mk_ptr_lock;
std::recursive_mutex& rt_lock = mk_ptr_lock;
std::recursive_mutex mdata_lock;
TYPE_PKG* tp;

TYPE* TYPE_PKG::root_type;
int TYPE_PKG::tp_count;
std::atomic<bool> TYPE_PKG::seen_bitfield;
bool TYPE_PKG::seen_enum_type, TYPE_PKG::seen_small_enums;
int TYPE_PKG::flat_memory_model, TYPE_PKG::byte_mode, TYPE_PKG::large_code_model, TYPE_PKG::cpu_version, TYPE_PKG::abi,
    TYPE_PKG::wchar_t_size_in_bits;
unsigned TYPE_PKG::tot_types, TYPE_PKG::tot_structs, TYPE_PKG::tot_enums, TYPE_PKG::tot_funcs, TYPE_PKG::tot_ptrs;

// All under rt_lock.
static std::unordered_multimap<uint64_t, TYPE*> index_of_types;
static std::set<TYPE*> made_types; // every live type, for the end of the package

// ---- Names and bases

TYPE* base_type(TYPE* t) {
    switch (t->kind) {
    case TYPE::tpk_pointer:
    case TYPE::tpk_ref:
    case TYPE::tpk_qual:
    case TYPE::tpk_array:
    case TYPE::tpk_func: return find_type(t->component());
    default: return TYPE_PKG::root_type;
    }
}

static const char* kind_word(const TYPE* t) {
    switch (t->kind) {
    case TYPE::tpk_typedef: return "typedef";
    case TYPE::tpk_enum: return "enum";
    case TYPE::tpk_class:
    case TYPE::tpk_struct: return "struct";
    case TYPE::tpk_union: return "union";
    default: return nullptr;
    }
}

const std::string& map_name(TYPE* t) {
    if (t->map_name.empty()) {
        const char* word = kind_word(t);
        if (!word)
            t->map_name = "__builtin_type";
        else if (type_is_tagless(t))
            t->map_name = std::string("$$fake") + word;
        else
            t->map_name = TYPE_PKG::demangle_type_name(t->name(), nullptr);
    }
    return t->map_name;
}

std::string TYPE_PKG::demangle_type_name(const std::string& name, bool* is_cpp) {
    bool cpp = decode_is_cpp_name(name.c_str());
    if (is_cpp) *is_cpp = cpp;
    return cpp ? decode_name(name.c_str()) : name;
}

// The name of a new user type: its own, or the next running one if it has none that lasts.
std::string TYPE_PKG::tag_name(const std::string& name) {
    if (!name.empty() && name.compare(0, 6, "$$fake") != 0) return name;
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    return "$$fake" + std::to_string(fake_counter++);
}

std::vector<TYPE*> type_tree_order(TYPE* root) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    std::vector<TYPE*> order, todo{root};
    while (!todo.empty()) {
        TYPE* t = todo.back();
        todo.pop_back();
        order.push_back(t);
        for (auto names = t->based.rbegin(); names != t->based.rend(); ++names)
            todo.insert(todo.end(), names->second.rbegin(), names->second.rend());
    }
    return order;
}

// ---- Shapes

// A hash of what exact_types compares, of a node on a component whose hash is known. Members and enumerators stay out:
// they come after the first use of their type.
uint64_t TYPE::shape_hash() const {
    auto text = [](const std::string& s) { return static_cast<uint64_t>(std::hash<std::string>()(s)); };
    uint64_t h = mix_hash(kind, target_m ? target_m->shape_m : 0);
    if (kind >= tpk_enum) return mix_hash(kind, type_is_tagless(this) ? 0 : text(name_m));
    h = mix_hash(mix_hash(h, size), align);
    switch (kind) {
    case tpk_int: return mix_hash(h, ikind_m * 8u + expl_sign_m * 4u + boolean_m * 2u + ptm_m);
    case tpk_float: return mix_hash(h, fkind_m);
    case tpk_fixed: return mix_hash(h, static_cast<uint8_t>(binpt_m));
    case tpk_qual: return mix_hash(h, qual_m);
    case tpk_typedef: return mix_hash(mix_hash(h, type_is_tagless(this) ? 0 : text(name_m)), lowered_m);
    case tpk_array: return mix_hash(h, num_elem_m * uint64_t{4} + complete_m * 2u + vector_m);
    case tpk_ptm: return mix_hash(h, target2_m ? target2_m->shape_m : 0); // set after the node is made
    case tpk_func:
        h = mix_hash(h, cc_m * uint64_t{4} + vararg_m * 2u + proto_m);
        for (fkPARAM* p = params_m; p; p = p->next) h = mix_hash(mix_hash(h, p->type->shape_m), p->word * 2 + p->flag);
        return h;
    default: return h;
    }
}

void TYPE::take_component(TYPE* t) {
    target_m = t;
    if (!t) return;
    if (kind == tpk_qual || kind == tpk_typedef) {
        real = t->real;
        spine_qual_m = t->spine_qual_m | qual_m;
        deep_qual_m = t->deep_qual_m | qual_m;
    } else if (kind == tpk_array) {
        deep_qual_m = t->deep_qual_m;
    }
}

// ---- Registration

static bool is_user_type(const TYPE* t) { return t->kind >= TYPE::tpk_enum; }

// The oldest registered type of `t`'s base that equals it, C++ mark included: a type of one language is not taken for
// one of the other, since the mark is written out and decides how arrays and functions compare.
TYPE* TYPE_PKG::find_equal(const TYPE* t, uint64_t key) const {
    TYPE* found = nullptr;
    auto range = index_of_types.equal_range(key);
    for (auto it = range.first; it != range.second; ++it) {
        TYPE* other = it->second;
        if (other->pkg != t->pkg || other->cpp != t->cpp || base_type(other) != base_type(const_cast<TYPE*>(t)))
            continue;
        if (found && found->uid < other->uid) continue;
        if (exact_types(other, t)) found = other;
    }
    return found;
}

// What hangs from a linked type hangs from the one that it became.
void link_types(TYPE* from, TYPE* to) {
    for (auto& names : from->based) {
        std::list<TYPE*>& list = to->based[names.first];
        list.splice(list.end(), names.second);
    }
    from->based.clear();
    from->uid = to->uid;
    __atomic_store_n(&from->equiv, to, __ATOMIC_RELEASE);
}

TYPE* TYPE_PKG::register_type(TYPE* t, TYPE* base) {
    if (t->uid) return t;
    t->tu = current_tu;
    if (!t->frozen) return t;
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    t->shape_m = t->shape_hash();
    if (!is_user_type(t)) {
        uint64_t key = mix_hash(t->shape_m, reinterpret_cast<uintptr_t>(base));
        if (TYPE* other = find_equal(t, key)) {
            if (t->kind == TYPE::tpk_func) {
                // It was open, so that a type may have been built on it.
                link_types(t, other);
            } else {
                destroy(t);
            }
            return other;
        }
        index_of_types.emplace(key, t);
    }
    assign_uid(t);
    uint32_t ordinal = 0;
    for (fkMDATA* m = t->mdata_m; m; m = m->next) m->ordinal = ++ordinal;
    ++tot_types;
    if (t->kind >= TYPE::tpk_class) ++tot_structs;
    if (t->kind == TYPE::tpk_enum) ++tot_enums;
    if (t->kind == TYPE::tpk_func) ++tot_funcs;
    if (t->kind == TYPE::tpk_pointer) ++tot_ptrs;
    std::list<TYPE*>& list = base->based[map_name(t)];
    t->place_m = list.insert(list.end(), t);
    return t;
}

void TYPE_PKG::assign_uid(TYPE* t) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    if (!t->uid) t->uid = next_uid++;
}

void TYPE_PKG::type_frozen(TYPE*& t) {
    if (t->frozen) return;
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    t->frozen = true;
    if (t->kind == TYPE::tpk_enum) t->complete_m = true;
    t = register_type(t, base_type(t));
}

TYPE* TYPE_PKG::make(TYPE::KIND kind, TYPE* component, uint64_t size, uint32_t align, bool cpp) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    TYPE* t = new TYPE(kind);
    made_types.insert(t);
    t->take_component(component);
    t->size = size;
    t->align = align;
    t->cpp = cpp;
    t->pkg = this;
    t->shape_m = t->shape_hash();
    return t;
}

TYPE* TYPE_PKG::close(TYPE* t) {
    t->frozen = true;
    return register_type(t, base_type(t));
}

void TYPE_PKG::destroy(TYPE* t) {
    made_types.erase(t);
    delete t;
}

void TYPE_PKG::delete_type_tree(TYPE* root, int recursive, int keep_root) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    std::vector<TYPE*> order = type_tree_order(root);
    if (!recursive && order.size() > 1)
        tp_die("Nonrecusive type tree delete with nonempty based list:  TYPE_PKG::delete_type_tree");
    std::set<TYPE*> doomed(order.begin(), order.end());
    if (keep_root) {
        doomed.erase(root);
        root->based.clear();
    }
    for (auto it = index_of_types.begin(); it != index_of_types.end();)
        it = doomed.count(it->second) ? index_of_types.erase(it) : std::next(it);
    if (!keep_root && root->uid && !root->equiv && root != root_type) {
        TYPE* base = base_type(root);
        auto list = base->based.find(root->map_name);
        list->second.erase(root->place_m);
        if (list->second.empty()) base->based.erase(list);
        if (base->ptr_to == root) base->ptr_to = nullptr;
    }
    for (TYPE* t : doomed) destroy(t);
    if (doomed.count(root_type)) root_type = nullptr;
}

// ---- Life of the package

static uint64_t size_of_wchar() { return TYPE_PKG::abi == 1 ? 32 : 16; }

void TYPE_PKG::init_type_pkg(TYPE_PKG* pkg) {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    if (!root_type) {
        root_type = pkg->make(TYPE::tpk_void, nullptr, 0, 0, false);
        root_type->frozen = true;
        pkg->assign_uid(root_type);
        root_type->normalized = root_type;
    }
    if (!pkg->counted_m) ++tp_count;
    pkg->counted_m = true;
    pkg->void_t = pkg->mk_void();
    pkg->void_ptr_t = pkg->mk_ptr(pkg->void_t);
    pkg->update_basic_types();
}

void TYPE_PKG::update_basic_types() {
    wchar_t_size_in_bits = static_cast<int>(size_of_wchar());
    struct {
        TYPE* TYPE_PKG::*place;
        TYPE::IKIND kind;
        bool expl_sign;
    } const ints[] = {
        {&TYPE_PKG::bool_t, TYPE::ik_bool, false},   {&TYPE_PKG::schar_t, TYPE::ik_schar, true},
        {&TYPE_PKG::uchar_t, TYPE::ik_uchar, true},  {&TYPE_PKG::wchar_t_, TYPE::ik_wchar, false},
        {&TYPE_PKG::short_t, TYPE::ik_short, false}, {&TYPE_PKG::ushort_t, TYPE::ik_ushort, false},
        {&TYPE_PKG::int_t, TYPE::ik_int, false},     {&TYPE_PKG::uint_t, TYPE::ik_uint, false},
        {&TYPE_PKG::long_t, TYPE::ik_long, false},   {&TYPE_PKG::ulong_t, TYPE::ik_ulong, false},
        {&TYPE_PKG::llong_t, TYPE::ik_llong, false}, {&TYPE_PKG::ullong_t, TYPE::ik_ullong, false},
    };
    for (auto& i : ints) this->*i.place = mk_int(i.kind, i.expl_sign);
    float_t = mk_fltpt(TYPE::fk_float);
    double_t = mk_fltpt(TYPE::fk_double);
    ldouble_t = mk_fltpt(TYPE::fk_ldouble);
    normalize_basic_types();
}

TYPE_PKG::~TYPE_PKG() {
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    if (!counted_m || --tp_count > 0) return;
    index_of_types.clear();
    for (TYPE* t : made_types) delete t;
    made_types.clear();
    root_type = nullptr;
    if (tp == this) tp = nullptr;
}

void TYPE_PKG::print_stats(FILE* out) const {
    fprintf(out, "types: %u, structures: %u, enumerations: %u, functions: %u, pointers: %u, bytes: %llu\n", tot_types,
            tot_structs, tot_enums, tot_funcs, tot_ptrs, static_cast<unsigned long long>(tp_bytes_in_use()));
}

// ---- Errors

const char* error_code_name(TP_ERROR_CODE code) {
    switch (code) {
    case TP_NO_ERROR: return "no error";
    case TP_SIZE_NOT_SUPPORTED: return "object size not supported";
    }
    return "unknown error";
}

void TYPE_PKG::set_error(TP_ERROR_CODE code, const char* format, ...) {
    char text[512];
    va_list args;
    va_start(args, format);
    vsnprintf(text, sizeof text, format, args);
    va_end(args);
    std::lock_guard<std::recursive_mutex> hold(rt_lock);
    error_code = code;
    error_text = text;
}
