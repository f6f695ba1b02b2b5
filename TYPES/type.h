// The type package: every type of the translation units as a graph of shared, immutable TYPE objects.
//
// Sizes, alignments and member offsets are in bits; a "byte" of `size_in_bytes` is the target's 16-bit unit. A type is
// built by a maker of TYPE_PKG, which registers it, so that two structurally equal types of one base are one object and
// types are compared by pointer where that is enough. TYPE objects are never freed during a run. A type is immutable
// once registered, but for the caches `normalized` and `ptr_to`, the output marks and the equivalence link.
#pragma once

#include "UTIL/psn.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <list>
#include <map>
#include <mutex>
#include <stdexcept>
#include <string>
#include <vector>

class TYPE;
class TYPE_PKG;

// Guards `ptr_to` and `normalized`, and with them the creation of derived types.
extern std::recursive_mutex mk_ptr_lock;
// Guards `register_type` and the based-type maps. Deriving a type registers it, and a walk of the maps may ask for a
// normalized type: the two nest both ways, so they are one mutex.
extern std::recursive_mutex& rt_lock;
// Guards the creation of members.
extern std::recursive_mutex mdata_lock;

// An internal error of the type package, or a type graph of the input that cannot be. `what()` is
// "TP>> internal error: " and the text; `text()` is the text alone.
class tp_failure : public std::runtime_error {
public:
    explicit tp_failure(const std::string& text);
    const std::string& text() const { return text_m; }

private:
    std::string text_m;
};

// Ends the work of the type package by throwing `tp_failure`.
[[noreturn]] void tp_die(const char* text);

// Zeroed memory of the type package, counted for `print_stats`. Dies with "Out of memory: tp_alloc()".
void* tp_alloc(std::size_t size);
void tp_free(void* p, std::size_t size);

// Gives the records of the package their memory from `tp_alloc`.
#define TP_ALLOCATED                                                                                                   \
    static void* operator new(std::size_t size) { return tp_alloc(size); }                                             \
    static void operator delete(void* p, std::size_t size) { tp_free(p, size); }

enum QUAL_BITS : unsigned {
    QUAL_CONST = 1,
    QUAL_VOLATILE = 2,
    QUAL_PACKED = 4,
    QUAL_NEAR = 8,
    QUAL_FAR = 16,
    QUAL_IOPORT = 32,
    QUAL_RESTRICT = 64,
    QUAL_ONCHIP = 128,
};

// One data member of a class, struct or union. Owned by its type.
struct fkMDATA {
    TP_ALLOCATED
    uint32_t ordinal = 0; // from 1, in list order, set by `register_type`
    TYPE* type = nullptr;
    std::string name;
    uint32_t access = 0;
    int32_t offset = 0; // bits from the start of the structure
    uint8_t aux = 0;    // the I-file's aux byte, passed through
    uint32_t width = 0; // bits of a bit-field
    bool flag1 = false;
    bool is_bitfld = false;
    bool flag3 = false;
    bool flag4 = false;
    PSN* psn = nullptr;
    fkMDATA* next = nullptr;

    fkMDATA(const std::string& name, TYPE* type, uint32_t access, int32_t offset, uint32_t width, bool flag1,
            bool is_bitfld, bool flag3, bool flag4);
};

struct fkPARAM {
    TP_ALLOCATED
    TYPE* type = nullptr;
    bool flag = false; // the I-file's flag and word, passed through
    uint64_t word = 0;
    std::string name;
    fkPARAM* next = nullptr;
};

struct fkETOR {
    TP_ALLOCATED
    int64_t value = 0; // as the underlying type's sign dictates
    std::string name;
    PSN* psn = nullptr;
    fkETOR* next = nullptr;
};

// What a C++ class holds beside its data members. The optimizer passes these through unchanged.
struct fkBCLASS {
    TYPE* type;
    int64_t offset;
    uint8_t access;
    bool is_virtual;
};
struct fkADECL {
    uint64_t word;
    uint8_t access;
};
struct fkFFRIEND {
    std::string name;
    TYPE* type;
};
struct fkSDATA {
    std::string name;
    TYPE* type;
    uint8_t access;
};
struct fkMFUNC {
    std::string name;
    TYPE* type;
    uint8_t access;
    int64_t word;
    bool flags[4];
};
// A list that is absent differs from one that is there and empty: the I-file frames only the latter.
template <class T>
struct CSU_LIST {
    bool present = false;
    std::vector<T> items;
};
struct CSU_EXTRAS {
    CSU_LIST<fkBCLASS> base_classes;
    CSU_LIST<fkADECL> access_decls;
    CSU_LIST<fkFFRIEND> friend_functions;
    CSU_LIST<TYPE*> friend_classes;
    CSU_LIST<TYPE*> nested_types;
    CSU_LIST<fkSDATA> static_data;
    CSU_LIST<fkMFUNC> member_functions;
    CSU_LIST<fkPARAM> parameters;
};

class TYPE {
public:
    TP_ALLOCATED
    enum KIND {
        tpk_void,
        tpk_int,
        tpk_float,
        tpk_fixed,
        tpk_complex,
        tpk_pointer,
        tpk_ref,
        tpk_qual,
        tpk_typedef,
        tpk_array,
        tpk_ptm,
        tpk_func,
        tpk_enum,
        tpk_class,
        tpk_struct,
        tpk_union,
    };
    enum IKIND {
        ik_bool,
        ik_schar,
        ik_uchar,
        ik_wchar,
        ik_short,
        ik_ushort,
        ik_int,
        ik_uint,
        ik_long,
        ik_ulong,
        ik_llong,
        ik_ullong,
    };
    enum FKIND { fk_float, fk_double, fk_ldouble };
    using CC_KIND = uint32_t;
    using BASED_TYPE_CONTAINER = std::map<std::string, std::list<TYPE*>>;

    uint32_t uid = 0; // nonzero once registered
    KIND kind;
    uint64_t size = 0;  // bits
    uint32_t align = 0; // bits
    TYPE_PKG* pkg = nullptr;
    bool frozen = false;
    bool merg = false;
    TYPE* real = nullptr; // this type with typedefs and qualifiers stripped
    PSN* psn = nullptr;
    TYPE* normalized = nullptr; // cache; read it through `normalized_type()`
    TYPE* ptr_to = nullptr;     // cache of `mk_ptr(this)`
    bool writ = false;
    bool refd = false;
    uint32_t tu = 0;
    TYPE* equiv = nullptr; // the type that this one was merged into; follow it with `find_type`
    bool cpp = false;
    std::string map_name;
    BASED_TYPE_CONTAINER based; // the types that are built on this one

    // ---- Classification. Every `is_*` looks at the real type.
    bool is_void() const { return real->kind == tpk_void; }
    bool is_int() const { return real->kind == tpk_int; }
    bool is_float() const { return real->kind == tpk_float; }
    bool is_fixed() const { return real->kind == tpk_fixed; }
    bool is_complex() const { return real->kind == tpk_complex; }
    bool is_pointer() const { return real->kind == tpk_pointer; }
    bool is_ref() const { return real->kind == tpk_ref; }
    bool is_array() const { return real->kind == tpk_array; } // vectors too
    bool is_vector() const { return real->kind == tpk_array && real->vector_m; }
    bool is_ptm() const { return real->kind == tpk_ptm; }
    bool is_func() const { return real->kind == tpk_func; }
    bool is_enum() const { return real->kind == tpk_enum; }
    bool is_class() const { return real->kind == tpk_class; }
    bool is_struct() const { return real->kind == tpk_struct; }
    bool is_union() const { return real->kind == tpk_union; }
    bool is_csu() const { return real->kind >= tpk_class; }
    bool is_udt() const { return real->kind >= tpk_enum; }
    bool is_arithmetic() const;
    bool is_scalar() const {
        const KIND k = real->kind;
        return (k >= tpk_int && k <= tpk_ref) || k == tpk_ptm || k == tpk_enum;
    }
    // An integer of kinds `signed char` and the like, or an enumeration by its underlying type. `bool` and `wchar_t`
    // are neither signed nor unsigned.
    bool is_signed() const {
        return has_integer_kind(1u << ik_schar | 1u << ik_short | 1u << ik_int | 1u << ik_long | 1u << ik_llong);
    }
    bool is_unsigned() const {
        return has_integer_kind(1u << ik_uchar | 1u << ik_ushort | 1u << ik_uint | 1u << ik_ulong | 1u << ik_ullong);
    }
    bool is_bool() const { return real->kind == tpk_int && (real->ikind_m == ik_bool || real->boolean_m); } // or marked so
    bool is_plain_char() const; // `char` written without `signed` or `unsigned`
    bool is_ikind(IKIND k) const { return real->kind == tpk_int && real->ikind_m == k; }
    bool is_fkind(FKIND k) const { return real->kind == tpk_float && real->fkind_m == k; }
    bool is_schar() const { return is_ikind(ik_schar); }
    bool is_uchar() const { return is_ikind(ik_uchar); }
    bool is_wchar() const { return is_ikind(ik_wchar); }
    // A complex type by its part.
    bool is_complex_of(IKIND k) const { return is_complex() && real->target_m->is_ikind(k); }
    bool is_complex_of(FKIND k) const { return is_complex() && real->target_m->is_fkind(k); }
    bool is_cchar() const { return is_complex_of(ik_schar); }
    bool is_cuchar() const { return is_complex_of(ik_uchar); }
    bool is_cshort() const { return is_complex_of(ik_short); }
    bool is_cushort() const { return is_complex_of(ik_ushort); }
    bool is_cint() const { return is_complex_of(ik_int); }
    bool is_cuint() const { return is_complex_of(ik_uint); }
    bool is_clong() const { return is_complex_of(ik_long); }
    bool is_culong() const { return is_complex_of(ik_ulong); }
    bool is_cllong() const { return is_complex_of(ik_llong); }
    bool is_cullong() const { return is_complex_of(ik_ullong); }
    bool is_cfloat() const { return is_complex_of(fk_float); }
    bool is_cdouble() const { return is_complex_of(fk_double); }
    bool is_cldouble() const { return is_complex_of(fk_ldouble); }
    bool is_complete() const;
    bool is_lowered() const; // of a typedef, class, struct or union, seen through qualifiers
    bool is_struct_vector() const { return is_csu() && real->is_struct_vector_m; }
    bool is_bool_vector() const;
    bool is_vpred() const;
    bool is_predicate() const { return is_bool_vector() || is_vpred(); }
    bool has_flex_array_member() const;
    int rank() const; // of an integer or an enumeration; another kind dies

    // ---- Parts. Those of a wrong kind die with "Bad kind:  TYPE::<name>()".
    IKIND ikind() const;
    FKIND fkind() const;
    bool expl_sign() const;
    bool boolean_flag() const { return kind == tpk_int && boolean_m; }
    bool ptm_int_flag() const { return kind == tpk_int && ptm_m; }
    TYPE* type_pointed_to() const; // pointer or pointer to member
    TYPE* type_refd() const;
    TYPE* type_qualified() const; // of a qualifier node itself; any other type gives itself
    TYPE* type_named() const;     // of a typedef node itself
    TYPE* part_type() const;
    TYPE* underlying_type() const; // of an enumeration or a fixed-point type
    TYPE* ptm_class() const;
    TYPE* return_type() const;
    TYPE* raw_elem_type() const; // the array's element without the array's own qualifiers
    TYPE* elem_type() const;     // element with the qualifiers of this type added
    uint32_t num_elem() const;
    signed char binpt() const;
    fkPARAM* params() const;
    bool has_params() const { return real->params_set_m; }
    CC_KIND cc_kind() const;
    bool vararg() const;
    bool proto() const;
    fkETOR* etors() const;
    fkMDATA* mdata() const; // first data member, null if there is none
    bool has_mdata_list() const { return real->mdata_set_m; }
    uint32_t csu_word() const;                                // the class record's integer field
    CSU_EXTRAS* csu_extras() const { return real->extras_m; } // null without
    unsigned own_qual_bits() const { return kind == tpk_qual ? qual_m : 0; }
    // The one type that this node is built on (pointee, referent, qualified, named, element, part, underlying or return
    // type), whatever the kind; null where there is none.
    TYPE* component() const { return target_m; }

    // Qualifier bits of the outer spine of qualifier and typedef nodes; with `through_arrays` those of array elements
    // too. A type is volatile for every pass when `qual_kind(true) & QUAL_VOLATILE`.
    unsigned qual_kind(bool through_arrays) const { return through_arrays ? deep_qual_m : spine_qual_m; }
    bool is_volatile() const { return qual_kind(true) & QUAL_VOLATILE; }
    bool is_const() const { return qual_kind(true) & QUAL_CONST; }

    TYPE* stqs() const;              // strips qualifier nodes at the outside
    TYPE* stds() const;              // strips typedef nodes at the outside, down to the first node that is none
    TYPE* getr(KIND k) const;        // the real type, which must be of kind `k`
    TYPE* getd(KIND k) const;        // typedefs stripped only
    TYPE* get_csu() const;           // this type if it is a class, struct or union node, else null
    TYPE* getr_csu() const;          // the real class, struct or union; dies if there is none
    const std::string& name() const; // of a named type; empty for the others

    uint64_t size_in_bytes() const { return size >> 4; } // 16-bit units
    uint32_t align_in_bytes() const { return align >> 4; }

    // The package's canonical form, computed once. Takes `mk_ptr_lock`.
    TYPE* normalized_type();
    TYPE* normalized_type_uncached();

    // Kind number for tables: an integer's IKIND, 12 plus the FKIND of a float, fixed numbers 15 to 26 for the rest.
    int ekind() const;

    // Links this type to `other`, which it equals across translation units. Refuses (returns false) where that is not
    // sound.
    bool set_equiv(TYPE* other);

    void print(FILE* out) const;
    void println(FILE* out) const;
    std::string printstr() const; // C-like text, qualifiers in front
    void dump(FILE* out) const;   // one line with all fields

    static void mark_named_types(TYPE* root, bool keep_named);
    static void mark_refed_types(TYPE* root);
    void mark_refed_recur();

private:
    friend class TYPE_PKG;
    explicit TYPE(KIND k) : kind(k), real(this) {}
    void take_component(TYPE* t); // sets `target_m` and what follows from it: `real` and the qualifier bits
    uint64_t shape_hash() const;
    // The integer type that carries the sign and rank of an integer or enumeration, null for other types.
    const TYPE* integer() const {
        const TYPE* t = real;
        while (t->kind == tpk_enum) t = t->target_m->real;
        return t->kind == tpk_int ? t : nullptr;
    }
    bool has_integer_kind(unsigned kinds) const { // one of these, a bit each
        const TYPE* t = integer();
        return t && (kinds >> t->ikind_m & 1);
    }
    ~TYPE();

    IKIND ikind_m = ik_int;
    FKIND fkind_m = fk_float;
    bool expl_sign_m = false;
    bool boolean_m = false;
    bool ptm_m = false;
    signed char binpt_m = 0;
    TYPE* target_m = nullptr;  // pointee, referent, qualified, named, element, part, underlying or return type
    TYPE* target2_m = nullptr; // class of a pointer to member
    unsigned qual_m = 0;
    uint32_t num_elem_m = 0;
    bool complete_m = false;
    bool vector_m = false;
    bool lowered_m = false;
    bool is_struct_vector_m = false;
    bool vararg_m = false;
    bool proto_m = false;
    CC_KIND cc_m = 0;
    std::string name_m;
    fkPARAM* params_m = nullptr;
    bool params_set_m = false;
    fkETOR* etors_m = nullptr;
    bool etors_set_m = false;
    fkMDATA* mdata_m = nullptr;
    bool mdata_set_m = false;
    uint32_t csu_word_m = 0;
    bool old_format_m = false; // read from a file of a version older than -80
    CSU_EXTRAS* extras_m = nullptr;
    // Qualifier bits of `qual_kind`, known from the component when the node is made: a chain may be long.
    unsigned spine_qual_m = 0, deep_qual_m = 0;
    // Equal for types that are exact_types, so far as both were closed when they were first used; only looks types up.
    uint64_t shape_m = 0;
    std::list<TYPE*>::iterator place_m; // where `base_type(this)->based` holds this type, once registered
};

enum TP_ERROR_CODE { TP_NO_ERROR, TP_SIZE_NOT_SUPPORTED };
const char* error_code_name(TP_ERROR_CODE code);

class TYPE_PKG {
public:
    TYPE *bool_t, *schar_t, *uchar_t, *wchar_t_, *short_t, *ushort_t, *int_t, *uint_t, *long_t, *ulong_t, *llong_t,
        *ullong_t, *float_t, *double_t, *ldouble_t, *void_t, *void_ptr_t;
    uint32_t current_tu = 0;
    uint32_t next_uid = 1;

    static TYPE* root_type;
    static int tp_count;
    static std::atomic<bool> seen_bitfield;
    static bool seen_enum_type, seen_small_enums;
    static int flat_memory_model, byte_mode, large_code_model, cpu_version, abi, wchar_t_size_in_bits;
    static unsigned tot_types, tot_structs, tot_enums, tot_funcs, tot_ptrs;

    TYPE_PKG() = default;
    ~TYPE_PKG(); // the last package that goes frees all types
    TYPE_PKG(const TYPE_PKG&) = delete;
    TYPE_PKG& operator=(const TYPE_PKG&) = delete;

    // Builds the root, `void_t`, `void_ptr_t` and the basic types. `abi` and `byte_mode` must be set before.
    static void init_type_pkg(TYPE_PKG* pkg);
    void normalize_basic_types();
    void update_basic_types();

    // ---- Makers. Each returns a registered type, an existing equal one if there is one. Sizes and alignments in bits.
    TYPE* mk_void();
    TYPE* mk_int(TYPE::IKIND k, bool expl_sign);
    TYPE* mk_int(TYPE::IKIND k, bool expl_sign, uint64_t size, uint32_t align, bool boolean, bool ptm);
    TYPE* mk_fltpt(TYPE::FKIND k);
    TYPE* mk_fltpt(TYPE::FKIND k, uint64_t size, uint32_t align);
    TYPE* mk_fxtpt(TYPE* underlying, int binpt);
    TYPE* mk_fxtpt(TYPE* underlying, int binpt, uint64_t size, uint32_t align);
    TYPE* mk_complex(TYPE* part);
    TYPE* mk_complex(TYPE* part, uint64_t size, uint32_t align);
    TYPE* mk_ptr(TYPE* t); // cached in `t->ptr_to`
    TYPE* mk_ptr(TYPE* t, uint64_t size, uint32_t align);
    TYPE* mk_ref(TYPE* t);
    TYPE* mk_ref(TYPE* t, uint64_t size, uint32_t align);
    TYPE* mk_ptm(TYPE* pointee, TYPE* cls, uint64_t size, uint32_t align);
    TYPE* mk_qual(TYPE* t, unsigned bits); // `t` itself if it has all the bits
    TYPE* mk_qual(TYPE* t, unsigned bits, uint64_t size, uint32_t align);
    TYPE* mk_array(TYPE* elem, bool cpp); // incomplete
    TYPE* mk_array(TYPE* elem, bool cpp, uint32_t n, bool complete);
    TYPE* mk_array(TYPE* elem, bool cpp, uint32_t n, uint32_t align, bool complete);
    TYPE* mk_array(TYPE* elem, bool cpp, uint32_t n, uint64_t size, uint32_t align, bool complete);
    TYPE* mk_vector(TYPE* elem, bool cpp, uint32_t n);
    TYPE* mk_vector(TYPE* elem, bool cpp, uint32_t n, uint64_t size, uint32_t align);
    TYPE* mk_boolean_int(TYPE* t);
    TYPE* mk_ptm_int(TYPE* t);
    TYPE* mk_signed(TYPE* t);
    TYPE* mk_unsigned(TYPE* t);
    TYPE* mk_bool_vector(uint32_t lanes);
    TYPE* mk_vpred();
    TYPE* mk_struct_vector(TYPE* elem, uint32_t n); // n members "__x0", "__x1" and so on
    TYPE* mk_typedef(const std::string& name, bool cpp, TYPE* named, uint64_t size, uint32_t align, bool lowered,
                     PSN* psn = nullptr);

    // The following are built in two steps: made open, given their lists with the setters below, then closed with
    // `type_frozen`. An empty name or one that starts "$$fake" makes a tagless type.
    TYPE* mk_func(TYPE* ret, bool cpp, bool vararg, bool proto, TYPE::CC_KIND cc, uint64_t size, uint32_t align);
    TYPE* mk_enum(const std::string& name, TYPE* underlying, uint64_t size, uint32_t align, bool cpp,
                  PSN* psn = nullptr);
    TYPE* mk_csu(TYPE::KIND kind, const std::string& name, bool complete, bool lowered, uint64_t size, uint32_t align,
                 bool cpp, bool is_struct_vector = false, uint32_t word = 0, PSN* psn = nullptr);
    TYPE* mk_class(const std::string& name, uint64_t size, uint32_t align, bool cpp);
    TYPE* mk_struct(const std::string& name, uint64_t size, uint32_t align, bool cpp);
    TYPE* mk_union(const std::string& name, uint64_t size, uint32_t align, bool cpp);
    // Ownership of the chain passes to the type. Die with "Modifying frozen type:  TYPE::check_nfrozen" on a frozen
    // one.
    void set_params(TYPE* t, fkPARAM* list);
    void set_etors(TYPE* t, fkETOR* list);
    void set_mdata(TYPE* t, fkMDATA* list);
    CSU_EXTRAS* make_csu_extras(TYPE* t); // the record of `t`, made on first use
    // Marks a built class, enum, function or array as final and registers it; `t` becomes an existing equal type if
    // any.
    void type_frozen(TYPE*& t);

    TYPE* replace_array_elem(TYPE* array, TYPE* elem);
    TYPE* remove_known_qual(TYPE* t, unsigned bits); // without these bits at the outside and in array elements
    void delete_type_tree(TYPE* root, int recursive, int keep_root);
    void assign_uid(TYPE* t);
    // Gives `t` its place at `base`: returns an equal type known there (`t` is then gone, or linked to it if it was
    // open before and may be in use), else `t` itself with its `uid`. A type that is open or has its `uid` comes back
    // as it is.
    TYPE* register_type(TYPE* t, TYPE* base);

    void set_error(TP_ERROR_CODE code, const char* format, ...);
    TP_ERROR_CODE error_code = TP_NO_ERROR;
    std::string error_text;
    void print_stats(FILE* out) const;

    // The type name in the source's spelling; `*is_cpp`, which may be null, tells whether it was a C++ name.
    static std::string demangle_type_name(const std::string& name, bool* is_cpp);

private:
    friend class TYPE;
    unsigned fake_counter = 0;
    bool counted_m = false; // in `tp_count`
    TYPE* vpred_m = nullptr;

    TYPE* make(TYPE::KIND kind, TYPE* component, uint64_t size, uint32_t align, bool cpp);
    TYPE* close(TYPE* t); // freezes and registers a node that is complete as made
    std::string tag_name(const std::string& name);
    void destroy(TYPE* t);
    TYPE* find_equal(const TYPE* t, uint64_t key) const;
    TYPE* rebuild_on(TYPE* shape, TYPE* component); // a type like `shape` on another component
    TYPE* int_of_sign(TYPE* t, bool is_signed, const char* who);
    TYPE* flagged_int(TYPE* t, bool boolean, bool ptm, const char* who);
};

// Switches of `merge_types`.
struct TYPE_MERGE_OPTS {
    // Only asks whether one type may stand as a redefinition of the other: nothing is linked, nothing is filled in.
    static bool is_redefinition_m;
};

// The package of this run; null until the driver makes it.
extern TYPE_PKG* tp;

TYPE* base_type(TYPE* t); // the type that `t` is registered under
// Key of `t` in its base's map: the source's spelling of the name of a named type, "$$fake" and the kind for a tagless
// one,
// "__builtin_type" for the others.
const std::string& map_name(TYPE* t);
// All types that hang from `root`, itself first, in tree order: a type, then what is built on it, by map name, then by
// age.
std::vector<TYPE*> type_tree_order(TYPE* root);
bool type_is_tagless(const TYPE* t);
bool exact_types(const TYPE* a, const TYPE* b);
bool compatible_types(const TYPE* a, const TYPE* b, bool strict);
// Compatible for machine purposes: equal normalized forms without qualifiers at the outside.
bool equiv_mtypes(TYPE* a, TYPE* b);
bool merge_types(TYPE* a, TYPE* b);
TYPE* find_type(TYPE* t); // the end of the `equiv` chain
bool find_equivalent_type(TYPE* t);
bool is_same_sign(const TYPE* a, const TYPE* b);
bool equal_params(const fkPARAM* a, const fkPARAM* b);
bool equal_etors(const fkETOR* a, const fkETOR* b);
bool mdata_equal(const fkMDATA* a, const fkMDATA* b);  // as members of merged types; merges the members' types
bool compare_type_names(const TYPE* a, const TYPE* b); // equal tags, or both tagless
TYPE* c_integral_promotions(TYPE* t);
TYPE* c_usual_arith_conv(TYPE* a, TYPE* b);
// Whether a scalar container of `container_bits` that starts on a container boundary from bit `start` may hold a field
// of `width` bits at bit `offset`. `*out` receives the container's bit offset.
bool get_container_offset_for_field(int start, int container_bits, int offset, int width, int* out);
bool is_legal_container_for_field(int start, int container_bits, int offset, int width);
// Marks the parameter types of a function type for output.
void mark_func_args(TYPE* func);
// Appends one letter code a parameter to `name`: how the instances of an overloaded built-in are told apart.
std::string mangle_overloaded_builtin_function_argtypes(const std::string& name, const std::vector<TYPE*>& args);
