// The type section: every tag and every version's form, the forward rules, numbers, and what is written in which order.
#include "world.h"

namespace {
const IC_SYMBOL* find(const IC_UNIT& unit, const std::string& name) {
    for (const IC_SYMBOL* sym : unit.globals)
        if (name == sym->name) return sym;
    return nullptr;
}

// Reads a unit in which each type of `numbers` is that of a global "_t<number>", writes it, and reads that.
struct TWICE {
    explicit TWICE(FILE_BUILDER file, std::initializer_list<uint64_t> numbers) {
        for (uint64_t n : numbers) file.globals += file.symbol("_t" + std::to_string(n), n);
        {
            WORLD first;
            first.read(file.build());
            copy = first.write();
        }
        second = std::make_unique<WORLD>(); // not before: the packages of two worlds share one tree of types
        second->read(copy);
    }
    TYPE* operator[](uint64_t n) const { return find(second->unit, "_t" + std::to_string(n))->type; }
    std::unique_ptr<WORLD> second;
    std::string copy;
};

std::string mdata(int n, int number, const char* name, int type, std::string rest) {
    return type_rec(n, 28, un(number) + str(name) + by({type}) + rest);
}

TEST(types, every_tag_survives_a_copy) {
    FILE_BUILDER file;
    file.types += type_rec(3, 0, by({0, 16, 16, 1, 1})) + type_rec(4, 1, by({1, 16, 16, 0, 0})) +
                  type_rec(5, 51, by({0, 64, 32, 0, 0})) + type_rec(6, 12, by({64, 32})) +
                  type_rec(7, 13, by({0xF1, 1, 1, 16, 16})) + type_rec(8, 36, by({64, 32, 6})) + type_rec(9, 49, "") +
                  type_rec(10, 15, by({0, 32, 32})) + type_rec(11, 16, by({1, 32, 32})) +
                  type_rec(12, 17, by({1}) + un(1 | 8 | 16 | 64) + by({16, 16})) +
                  type_rec(13, 18, by({1, 9}) + un(144) + by({16, 0, 1, 0})) +
                  type_rec(14, 18, by({1, 4, 64, 32, 0, 1, 1})) + type_rec(15, 18, by({1, 0, 0, 16, 1, 0, 0})) +
                  type_rec(16, 19, by({1, 20, 32, 32})) + type_rec(17, 14, str("name") + by({1, 16, 16, 1, 1, 0})) +
                  type_rec(18, 20, by({1, 1, 1, 3, 0})) +
                  list(18, 0, type_rec(18, 21, by({1, 0, 5}) + str("p")) + type_rec(18, 21, by({10, 0, 0}) + str(""))) +
                  type_rec(19, 2, by({1, 16, 16, 1, 1})) + type_rec(21, 4, by({0, 16, 16, 0, 1}));
    // The class that type 16 names must come before it.
    file.types = type_rec(20, 24, by({2}) + str("K") + by({0, 1, 0, 0, 0, 0, 1, 0})) + file.types;
    TWICE t(file, {3, 4, 5, 6, 7, 8, 10, 11, 12, 13, 14, 15, 16, 17, 18, 19, 20, 21});
    EXPECT_TRUE(t[3]->is_ikind(TYPE::ik_bool));
    EXPECT_TRUE(t[4]->is_schar() && t[4]->expl_sign());
    EXPECT_TRUE(t[5]->is_ikind(TYPE::ik_ullong));
    EXPECT_EQ(t[5]->size, 64u);
    EXPECT_TRUE(t[6]->is_fkind(TYPE::fk_ldouble));
    EXPECT_EQ(t[7]->binpt(), -15);
    EXPECT_TRUE(t[8]->is_complex() && t[8]->part_type() == t[6]);
    EXPECT_TRUE(t[10]->type_pointed_to()->is_void());
    EXPECT_TRUE(t[11]->is_ref());
    EXPECT_EQ(t[12]->own_qual_bits(), 65u); // near and far are dropped
    EXPECT_TRUE(t[13]->is_array() && !t[13]->is_vector() && t[13]->num_elem() == 9 && t[13]->size == 144);
    EXPECT_TRUE(t[14]->is_vector() && t[14]->num_elem() == 4);
    EXPECT_FALSE(t[15]->is_complete());
    EXPECT_TRUE(t[15]->cpp);
    EXPECT_EQ(t[16]->ptm_class(), t[20]);
    EXPECT_EQ(t[17]->name(), "name");
    EXPECT_TRUE(t[17]->cpp && t[17]->is_lowered());
    EXPECT_TRUE(t[18]->vararg() && t[18]->proto() && t[18]->cc_kind() == 3);
    const fkPARAM* p = t[18]->params();
    EXPECT_TRUE(p && p->name == "p" && p->word == 5 && p->next && p->next->type == t[10] && !p->next->next);
    EXPECT_TRUE(t[19]->boolean_flag() && !t[19]->ptm_int_flag());
    EXPECT_TRUE(t[21]->ptm_int_flag() && !t[21]->boolean_flag());
    EXPECT_TRUE(t[20]->is_class() && !t[20]->is_complete() && t[20]->is_lowered() && t[20]->cpp);
}

TEST(types, enumerators_have_the_sign_of_their_type) {
    FILE_BUILDER file;
    file.types += type_rec(3, 9, by({0, 32, 32, 0, 0})) + type_rec(4, 50, by({0, 64, 32, 0, 0})) +
                  type_rec(5, 22, str("E") + by({16, 16, 1, 1, 0})) +
                  list(5, 1, type_rec(5, 23, str("a") + by({0x7F, 0})) + type_rec(5, 23, str("b") + by({0xC0, 0, 0}))) +
                  type_rec(6, 22, str("U") + by({32, 32, 3, 0, 0})) +
                  list(6, 1, type_rec(6, 23, str("c") + un(UINT32_MAX) + by({0}))) +
                  type_rec(7, 22, str("W") + by({64, 32, 4, 0, 0})) +
                  list(7, 1, type_rec(7, 23, str("d") + by({0x80, 0x80, 0x80, 0x80, 0x80, 0x70, 0}))) +
                  type_rec(8, 22, str("N") + by({0, 0, 1, 0, 0})) + list(8, 1, "");
    TWICE t(file, {5, 6, 7, 8});
    EXPECT_TRUE(t[5]->cpp);
    EXPECT_EQ(t[5]->etors()->value, -1);
    EXPECT_EQ(t[5]->etors()->next->value, 64);
    EXPECT_EQ(t[6]->etors()->value, int64_t{UINT32_MAX});
    EXPECT_EQ(t[7]->etors()->value, -(int64_t{1} << 39));
    EXPECT_EQ(t[8]->etors(), nullptr);
}

TEST(types, a_class_with_every_list) {
    FILE_BUILDER file;
    std::string owner =
        type_rec(3, 25, by({2}) + str("C") + by({1, 0, 64, 32}) + un(77) + by({1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 1, 0}));
    std::string base = type_rec(4, 24, by({0}) + str("B") + by({1, 0, 0, 16, 0, 0, 0, 0}));
    file.types += owner + base + list(3, 2, type_rec(3, 29, by({4, 0x7F, 2, 1}))) +
                  list(3, 3, type_rec(3, 30, by({9, 1}))) + list(3, 4, type_rec(3, 31, str("fr") + by({2}))) +
                  list(3, 5, type_rec(3, 32, by({4}))) +
                  list(3, 6, type_rec(3, 33, by({5}))) + // named ahead of its record
                  list(3, 7, mdata(3, 1, "m", 1, by({3, 0x20, 0xA5, 7, 1, 1, 0, 0}))) +
                  list(3, 8, type_rec(3, 34, str("sd") + by({1, 2}))) +
                  list(3, 9, type_rec(3, 35, str("mf") + by({2, 1, 0x7E, 1, 0, 1, 0}))) +
                  list(3, 0, type_rec(3, 21, by({1, 0, 6}) + str("tp"))) +
                  type_rec(5, 14, str("nested") + by({1, 16, 16, 1, 0, 0}));
    TWICE t(file, {3});
    EXPECT_TRUE(t[3]->is_class() && t[3]->is_struct_vector() && t[3]->cpp);
    EXPECT_EQ(t[3]->csu_word(), 77u);
    const CSU_EXTRAS* x = t[3]->csu_extras();
    ASSERT_NE(x, nullptr);
    const fkBCLASS& b = x->base_classes.items.at(0);
    EXPECT_TRUE(b.type->name() == "B" && b.offset == -1 && b.access == 2 && b.is_virtual);
    EXPECT_EQ(x->access_decls.items.at(0).access, 1);
    EXPECT_EQ(x->access_decls.items.at(0).word, 0u); // written 0
    EXPECT_EQ(x->friend_functions.items.at(0).name, "fr");
    EXPECT_EQ(x->friend_classes.items.at(0), b.type);
    EXPECT_EQ(x->nested_types.items.at(0)->name(), "nested");
    EXPECT_TRUE(x->static_data.items.at(0).name == "sd" && x->static_data.items[0].access == 2);
    const fkMFUNC& f = x->member_functions.items.at(0);
    EXPECT_TRUE(f.name == "mf" && f.type->is_func() && f.access == 1 && f.word == -2);
    EXPECT_TRUE(f.flags[0] && !f.flags[1] && f.flags[2] && !f.flags[3]);
    EXPECT_TRUE(x->parameters.items.at(0).name == "tp" && x->parameters.items[0].word == 6);
    const fkMDATA* m = t[3]->mdata();
    EXPECT_TRUE(m && m->access == 3 && m->offset == 32 && m->aux == 0xA5 && m->width == 7);
    EXPECT_TRUE(m->is_bitfld && m->flag3 && m->flag4 == false);
    EXPECT_TRUE(TYPE_PKG::seen_bitfield);
}

// What each version's records hold beside the newest form's.
TEST(types, forms_by_version) {
    for (int version = -86; version <= -71; version++) {
        FILE_BUILDER file(version);
        std::string cpp = version >= -81 ? by({1}) : "", sv = version >= -84 ? by({1}) : "";
        std::string vector = version >= -76 ? by({1}) : "", dropped = version == -75 || version == -74 ? by({1}) : "";
        std::string aux = version >= -74 ? by({9}) : "";
        std::string field = version == -86 ? by({1, 5, 1}) : by({5, 1, 1, 1});
        file.types += type_rec(3, 18, by({1, 4, 64, 16, 0, 1}) + vector + dropped) +
                      type_rec(4, 24, by({0}) + str("S") + by({1, 0, 32, 16, 1}) + sv + cpp + no_psn) +
                      list(4, 7, type_rec(4, 28, by({1}) + str("m") + by({1, 2, 16}) + aux + field + no_psn)) +
                      type_rec(5, 22, str("E") + by({16, 16, 1}) + cpp + no_psn) + list(5, 1, "");
        for (int n : {3, 4, 5}) file.globals += file.symbol("_t" + std::to_string(n), n, 0, version == -71 ? 1 : 0);
        WORLD world;
        ASSERT_EQ(world.read_error(file.build()), "") << version;
        auto type = [&](const char* name) { return find(world.unit, name)->type; };
        EXPECT_EQ(type("_t3")->is_vector(), version >= -76) << version;
        EXPECT_EQ(type("_t4")->is_struct_vector(), version >= -84) << version;
        EXPECT_EQ(type("_t4")->cpp, version >= -81) << version;
        EXPECT_EQ(type("_t5")->cpp, version >= -81) << version;
        const fkMDATA* m = type("_t4")->mdata();
        EXPECT_EQ(m->aux, version >= -74 ? 9 : 0) << version;
        EXPECT_TRUE(m->is_bitfld && m->width == 5 && m->flag3 && m->offset == 16 && m->access == 2) << version;
        EXPECT_EQ(m->flag4, version >= -85) << version;
        EXPECT_EQ(find(world.unit, "_t4")->retention, version == -71 ? 1 : 0);
        EXPECT_EQ(world.unit.file()->extra_word, version >= -83 ? 7 : 0);
        EXPECT_EQ(world.write().substr(12, 2), little(-71, 2));
    }
}

TEST(types, a_qualified_narrow_pointer_is_widened) {
    WORLD world;
    FILE_BUILDER file;
    file.types +=
        type_rec(3, 15, by({1, 22, 22})) + type_rec(4, 17, by({3, 1, 22, 22})) + type_rec(5, 17, by({1, 1, 22, 22}));
    file.globals += file.symbol("_t4", 4) + file.symbol("_t5", 5);
    world.read(file.build());
    EXPECT_EQ(find(world.unit, "_t4")->type->size, 32u);
    EXPECT_EQ(find(world.unit, "_t4")->type->align, 32u);
    EXPECT_EQ(find(world.unit, "_t5")->type->size, 22u);
}

// Any 64-bit number may name a type, and costs no more memory for being large.
TEST(types, scattered_numbers) {
    WORLD world;
    FILE_BUILDER file;
    uint64_t huge = UINT64_MAX;
    file.types += type_rec(huge, 15, by({1, 32, 32})) + type_rec(1500, 15, un(huge) + by({32, 32}));
    file.globals += file.symbol("_p", huge) + file.symbol("_q", 1500);
    world.read(file.build());
    EXPECT_EQ(find(world.unit, "_q")->type->type_pointed_to(), find(world.unit, "_p")->type);
}

// Members are found by the numbers that the file gave them, whatever they are.
TEST(types, members_by_number) {
    for (auto numbers : {std::pair{1, 2}, std::pair{0, 1}, std::pair{9, 4}}) {
        WORLD world;
        FILE_BUILDER file;
        std::string rest = by({0, 0, 0, 0, 0, 0, 0, 0});
        file.types += type_rec(3, 24, by({0}) + str("S") + by({1, 0, 32, 16, 1, 0, 0, 0})) +
                      list(3, 7, mdata(3, numbers.first, "a", 1, rest) + mdata(3, numbers.second, "b", 1, rest)) +
                      type_rec(4, 14, str("T") + by({3, 32, 16, 0, 0, 0}));
        for (int type : {3, 4}) file.statements += FILE_BUILDER::expr(node(26, 1, by({1, numbers.second, type})));
        world.read(file.build());
        for (int i : {3, 4}) {
            EXPECT_EQ(world.unit.items[i].tree->member->name, "b");
            EXPECT_EQ(world.unit.items[i].tree->field_csu()->name(), "S");
        }
        I_FILE* reader = const_cast<I_FILE*>(world.unit.file());
        EXPECT_EQ(reader->find_mdataref(3, numbers.second + 100), nullptr);
        EXPECT_EQ(reader->find_mdataref(1, 1), nullptr);
        EXPECT_EQ(reader->find_typeref(0), nullptr);
        EXPECT_THROW(reader->find_typeref(99), if_error);
    }
}

// Two declarations of one structure are one type from then on, whichever of them a record names.
TEST(types, equal_declarations_are_merged) {
    WORLD world;
    FILE_BUILDER file;
    std::string rest = by({0, 0, 0, 0, 0, 0, 0, 0});
    for (int n : {3, 4}) file.types += type_rec(n, 24, by({0}) + str("S") + by({1, 0, 32, 16, 1, 0, 0, 0}));
    file.types += list(3, 7, mdata(3, 1, "a", 1, rest) + mdata(3, 2, "b", 1, rest)) +
                  list(4, 7, mdata(4, 7, "a", 1, rest) + mdata(4, 8, "b", 1, rest)) +
                  type_rec(5, 14, str("T") + by({4, 32, 16, 0, 0, 0}));
    file.globals += file.symbol("_t3", 3) + file.symbol("_t4", 4);
    for (auto [type, number] : {std::pair{3, 2}, std::pair{4, 8}, std::pair{5, 8}})
        file.statements += FILE_BUILDER::expr(node(26, 1, by({1, number, type})));
    world.read(file.build());
    EXPECT_EQ(find(world.unit, "_t3")->type, find(world.unit, "_t4")->type);
    const IC_NODE* first = world.unit.items[3].tree;
    EXPECT_EQ(first->member->name, "b");
    for (int i : {4, 5}) {
        EXPECT_EQ(world.unit.items[i].tree->member, first->member);
        EXPECT_EQ(world.unit.items[i].tree->field_csu(), first->field_csu());
    }
}

TEST(types, reserved_tags_say_nothing) {
    WORLD world;
    FILE_BUILDER file;
    for (int tag : {26, 27, 37, 48}) file.types += type_rec(9, tag, "some bytes");
    EXPECT_EQ(world.read_error(file.build()), "");
}

// Only what the output names is written; with `keep_all_types` what has a name is as well.
TEST(types, unused_types_are_left_out) {
    FILE_BUILDER file;
    std::string rest = by({0, 0, 0, 0, 0, 0, 0, 0});
    file.types += type_rec(3, 24, by({0}) + str("used") + by({1, 0, 32, 16, 1, 0, 0, 0})) +
                  type_rec(4, 24, by({0}) + str("unused") + by({1, 0, 32, 16, 0, 0, 0, 0})) +
                  type_rec(5, 24, by({0}) + str("reached") + by({1, 0, 32, 16, 0, 0, 0, 0})) +
                  type_rec(6, 15, by({5, 32, 32})) + list(3, 7, mdata(3, 1, "m", 6, rest));
    file.globals += file.symbol("_s", 3);
    for (bool keep : {false, true}) {
        WORLD world;
        world.read(file.build());
        char* bytes = nullptr;
        size_t size = 0;
        world.unit.write(open_memstream(&bytes, &size), &world.pkg, keep);
        std::string copy(bytes, size);
        std::free(bytes);
        EXPECT_NE(copy.find("used"), std::string::npos);
        EXPECT_NE(copy.find("reached"), std::string::npos);
        EXPECT_EQ(copy.find("unused") != std::string::npos, keep);
        EXPECT_EQ(world.write(), world.write()); // marks do not outlive an output
    }
}
} // namespace
