#include "fixture.h"

#include <thread>

TEST_F(Types, EqualTypesAreOne) {
    TYPE* s = structure("S", nullptr);
    EXPECT_EQ(pkg.mk_ptr(s), pkg.mk_ptr(s, 32, 32));
    EXPECT_NE(pkg.mk_ptr(s), pkg.mk_ptr(s, 16, 16));
    EXPECT_EQ(pkg.mk_array(s, false, 3, true), pkg.mk_array(s, false, 3, true));
    EXPECT_NE(pkg.mk_array(s, false, 3, true), pkg.mk_array(s, true, 3, true));
    EXPECT_EQ(function(s, param(pkg.int_t)), function(s, param(pkg.int_t)));
    EXPECT_NE(function(s, param(pkg.int_t)), function(s, param(pkg.uint_t)));
    EXPECT_NE(function(s, param(pkg.int_t)), function(s, nullptr));
    EXPECT_EQ(pkg.mk_typedef("T", false, s, 32, 32, false), pkg.mk_typedef("T", false, s, 32, 32, false));
    EXPECT_NE(pkg.mk_typedef("T", false, s, 32, 32, false), pkg.mk_typedef("U", false, s, 32, 32, false));
    EXPECT_NE(pkg.short_t, pkg.int_t); // one size, two types
    EXPECT_FALSE(exact_types(pkg.short_t, pkg.int_t));
    EXPECT_NE(structure("S", nullptr), s); // a user type is never replaced unasked
}

// A function type that is dropped when it is closed may have types on it already: they must stay in the tree.
TEST_F(Types, DroppedFunctionKeepsItsDependents) {
    TYPE* first = function(pkg.int_t, param(pkg.long_t));
    TYPE* open = pkg.mk_func(pkg.int_t, false, false, true, 0, 0, 0);
    TYPE* p = pkg.mk_ptr(open, 16, 16);
    TYPE* closed = open;
    pkg.set_params(closed, param(pkg.long_t));
    pkg.type_frozen(closed);
    EXPECT_EQ(closed, first);
    EXPECT_EQ(find_type(open), first);
    EXPECT_TRUE(exact_types(open, first));
    std::vector<TYPE*> order = type_tree_order(TYPE_PKG::root_type);
    EXPECT_EQ(std::count(order.begin(), order.end(), p), 1);
    EXPECT_EQ(std::count(order.begin(), order.end(), first), 1);
}

TEST_F(Types, Compatibility) {
    TYPE* s = structure("S", member("a", pkg.long_t, 0));
    TYPE* other = structure("S", member("b", pkg.float_t, 0));
    TYPE* wide = structure("S", nullptr, 64);
    TYPE* cls = pkg.mk_class("S", 32, 32, false);
    pkg.type_frozen(cls);
    TYPE* uni = pkg.mk_union("S", 32, 32, false);
    pkg.type_frozen(uni);
    TYPE* declared = pkg.mk_csu(TYPE::tpk_struct, "S", false, false, 0, 0, false);
    pkg.type_frozen(declared);
    TYPE* open = pkg.mk_struct("S", 32, 32, false);
    TYPE* cs = pkg.mk_qual(s, QUAL_CONST);
    struct {
        TYPE *a, *b;
        bool strict, compatible;
    } const rows[] = {
        {s, other, false, true},
        {s, wide, false, false},
        {s, cls, false, true},
        {s, uni, false, false},
        {s, declared, false, true},
        {s, open, false, false},
        {s, cs, false, false},
        {s, cs, true, true},
        {pkg.mk_ptr(s), pkg.mk_ptr(cs), true, true},
        {pkg.mk_ptr(s), pkg.mk_ptr(cs), false, false},
        {pkg.schar_t, pkg.mk_int(TYPE::ik_schar, false), false, false},
        {pkg.int_t, pkg.mk_int(TYPE::ik_int, true), false, true},
        {pkg.int_t, pkg.short_t, true, false},
        {pkg.mk_array(pkg.int_t, false), pkg.mk_array(pkg.int_t, false, 3, true), false, true},
        {pkg.mk_array(pkg.int_t, false, 2, true), pkg.mk_array(pkg.int_t, false, 3, true), false, false},
        {pkg.mk_array(pkg.int_t, false, 2, true), pkg.mk_vector(pkg.int_t, false, 2), false, false},
        {function(pkg.int_t, param(s)), function(pkg.int_t, nullptr), false, true},
        {function(pkg.int_t, param(s), true), function(pkg.int_t, nullptr), false, false},
        {pkg.long_t, pkg.mk_qual(pkg.long_t, QUAL_PACKED), true, false},
    };
    for (auto& r : rows) {
        EXPECT_EQ(compatible_types(r.a, r.b, r.strict), r.compatible) << r.a->printstr() << " " << r.b->printstr();
        EXPECT_EQ(compatible_types(r.b, r.a, r.strict), r.compatible);
    }
}

TEST_F(Types, MergeOfSelfReferringStructures) {
    TYPE* a = self_referring("L");
    pkg.current_tu = 1;
    TYPE* b = self_referring("L");
    TYPE* pb = pkg.mk_ptr(b);
    EXPECT_NE(a, b);
    EXPECT_TRUE(exact_types(a, b));
    EXPECT_TRUE(find_equivalent_type(b));
    EXPECT_EQ(find_type(b), a);
    EXPECT_EQ(b->uid, a->uid);
    EXPECT_EQ(find_type(pb), pkg.mk_ptr(a)); // what hung from b hangs from a, and merges
    EXPECT_FALSE(find_equivalent_type(a));
    EXPECT_EQ(b->normalized_type(), a);
    EXPECT_EQ(pb->normalized_type(), pkg.mk_ptr(a));
    std::vector<TYPE*> order = type_tree_order(TYPE_PKG::root_type);
    for (TYPE* t : {a, b, pkg.mk_ptr(a), pb}) EXPECT_EQ(std::count(order.begin(), order.end(), t), 1);
}

TEST_F(Types, MergeRefusals) {
    TYPE* a = structure("S", member("a", pkg.long_t, 0));
    TYPE* tagless = structure("", member("a", pkg.long_t, 0));
    pkg.current_tu = 1;
    TYPE* other_member = structure("S", member("b", pkg.long_t, 0));
    TYPE* other_type = structure("S", member("a", pkg.ulong_t, 0));
    TYPE* other_offset = structure("S", member("a", pkg.long_t, 16));
    TYPE* other_size = structure("S", member("a", pkg.long_t, 0), 64);
    for (TYPE* t : {other_member, other_type, other_offset, other_size, tagless}) EXPECT_FALSE(merge_types(t, a));
    TYPE* written = structure("S", member("a", pkg.long_t, 0));
    written->refd = true;
    EXPECT_FALSE(merge_types(written, a));
    TYPE* same = structure("S", member("a", pkg.long_t, 0));
    EXPECT_FALSE(a->set_equiv(same)); // newer
    TYPE_MERGE_OPTS::is_redefinition_m = true;
    EXPECT_TRUE(merge_types(a, same));
    EXPECT_EQ(same->equiv, nullptr);
    TYPE_MERGE_OPTS::is_redefinition_m = false;
    EXPECT_TRUE(merge_types(a, same));
    EXPECT_EQ(same->equiv, a);
    EXPECT_TRUE(type_is_tagless(tagless));
    EXPECT_EQ(map_name(tagless), "$$fakestruct");
    EXPECT_TRUE(find_equivalent_type(structure("", member("a", pkg.long_t, 0)))); // member by member
    EXPECT_FALSE(find_equivalent_type(structure("", member("x", pkg.long_t, 0))));
}

TEST_F(Types, MergeOfDeclarationAndDefinition) {
    TYPE* def = structure("S", member("a", pkg.long_t, 0));
    TYPE* early = pkg.mk_csu(TYPE::tpk_struct, "T", false, false, 0, 0, false);
    pkg.type_frozen(early);
    pkg.current_tu = 1;
    TYPE* decl = pkg.mk_csu(TYPE::tpk_struct, "S", false, false, 0, 0, false);
    pkg.type_frozen(decl);
    EXPECT_TRUE(find_equivalent_type(decl));
    EXPECT_EQ(find_type(decl), def);
    // The definition is newer here: it would be lost.
    EXPECT_FALSE(find_equivalent_type(structure("T", member("a", pkg.long_t, 0))));
}

TEST_F(Types, DeleteTree) {
    TYPE* s = structure("S", nullptr);
    pkg.mk_ptr(s, 16, 16);
    EXPECT_DIES(pkg.delete_type_tree(s, 0, 0),
                "Nonrecusive type tree delete with nonempty based list:  TYPE_PKG::delete_type_tree");
    size_t before = type_tree_order(TYPE_PKG::root_type).size();
    pkg.delete_type_tree(s, 1, 0);
    EXPECT_EQ(type_tree_order(TYPE_PKG::root_type).size(), before - 2);
}

// Passes make types on every worker: all must get the same ones.
TEST_F(Types, MakersFromManyThreads) {
    std::vector<TYPE*> made[4];
    auto work = [this](std::vector<TYPE*>* out) {
        for (uint32_t i = 2; i < 300; ++i) {
            TYPE* v = pkg.mk_vector(pkg.short_t, false, i);
            TYPE* p = pkg.mk_ptr(pkg.mk_qual(v, QUAL_CONST));
            out->insert(out->end(),
                        {v, p, p->normalized_type(), function(p, param(v)), pkg.mk_unsigned(v), pkg.mk_vpred()});
        }
    };
    std::vector<std::thread> workers;
    for (auto& out : made) workers.emplace_back(work, &out);
    for (auto& w : workers) w.join();
    for (auto& out : made) EXPECT_EQ(out, made[0]);
}

// ---- Input of any size

// Two equal chains on two equal structures: compared node by node they agree to the bottom.
TEST_F(Types, LongChains) {
    TYPE* ends[2] = {self_referring("L"), self_referring("L")};
    auto grow = [&](TYPE* t, bool with_typedefs) {
        for (int i = 0; i < 200000; ++i) {
            if (i % 3 == 0) t = pkg.mk_ptr(t);
            if (i % 3 == 1) t = pkg.mk_qual(t, QUAL_VOLATILE);
            if (i % 3 == 2) t = pkg.mk_array(t, false, 1, true);
            if (with_typedefs) t = pkg.mk_typedef("T", false, t, t->size, t->align, false);
        }
        return t;
    };
    TYPE* named = grow(pkg.int_t, true);
    EXPECT_EQ(named->normalized_type()->size, 32u);
    EXPECT_EQ(named->normalized_type()->normalized_type(), named->normalized_type());
    for (TYPE*& t : ends) t = grow(t, false);
    EXPECT_NE(ends[0], ends[1]);
    EXPECT_TRUE(exact_types(ends[0], ends[1]));
    EXPECT_TRUE(compatible_types(ends[0], ends[1], true));
    EXPECT_TRUE(ends[0]->is_volatile());
    EXPECT_EQ(ends[0]->normalized_type()->size, 32u);
    EXPECT_GT(ends[0]->printstr().size(), 3u);
    pkg.remove_known_qual(ends[0], QUAL_VOLATILE);
    ends[0]->mark_refed_recur();
    EXPECT_TRUE(find_type(pkg.int_t)->refd);
    EXPECT_TRUE(merge_types(ends[1], ends[0]) || ends[1]->equiv == nullptr);
    std::string mangled = mangle_overloaded_builtin_function_argtypes("f", {ends[0]});
    EXPECT_GT(mangled.size(), 50000u);
}

TEST_F(Types, NestedParameterListsShareWork) {
    TYPE* f[2] = {pkg.int_t, pkg.uint_t};
    TYPE* s[2] = {self_referring("L"), self_referring("L")};
    for (int k = 0; k < 2; ++k) {
        f[k] = s[k];
        for (int i = 0; i < 60; ++i) f[k] = pkg.mk_ptr(function(pkg.void_t, param(f[k], param(f[k]))));
    }
    EXPECT_TRUE(exact_types(f[0], f[1])); // 2^60 paths, 60 pairs
    EXPECT_LT(f[0]->printstr().size(), 10000u);
}

TEST_F(Types, ManyTypesOfOneBaseAndName) {
    std::vector<TYPE*> arrays, functions;
    for (uint32_t i = 0; i < 100000; ++i) {
        arrays.push_back(pkg.mk_array(pkg.int_t, false, i, true));
        functions.push_back(function(pkg.int_t, param(arrays.back())));
        structure("", member("a", arrays.back(), 0));
        pkg.mk_typedef("T" + std::to_string(i), false, pkg.int_t, 16, 16, false);
    }
    EXPECT_EQ(pkg.mk_array(pkg.int_t, false, 77777, true), arrays[77777]);
    EXPECT_EQ(function(pkg.int_t, param(arrays[4])), functions[4]);
    std::vector<TYPE*> order = type_tree_order(TYPE_PKG::root_type);
    for (TYPE* t : order) find_equivalent_type(t);
    EXPECT_EQ(type_tree_order(TYPE_PKG::root_type).size(), order.size());
}
