// The target model and the built-in functions.

#include "../ir/tree_builder.h"

#include "BITVEC/bitvec.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/target.h"

using namespace test_trees;

namespace {

class Target : public Trees {
protected:
    void SetUp() override { start_as(28, 10); }
    void TearDown() override { start_as(28, 10); }

    static void start_as(int version, int unit) {
        cpu_version = version;
        init_target();
        float_support = unit;
        is_fpu64 = unit == 11;
        init_BIF_descriptors();
    }
    static NODE* args(std::initializer_list<NODE*> list) {
        NODE* out = nullptr;
        for (NODE* a : list) out = arg_list_append(out, a);
        return out;
    }
};

TEST_F(Target, SiliconVersions) {
    rtc_unified_memory = true;
    cpu_version = -1;
    init_target();
    EXPECT_EQ(cpu_version, 28);
    EXPECT_TRUE(rtc_RPT_ok_for_loop);
    cpu_version = 27;
    init_target();
    EXPECT_EQ(TYPE_PKG::cpu_version, 27);
    EXPECT_FALSE(rtc_RPT_ok_for_loop);
    cpu_version = 29;
    testing::internal::CaptureStdout();
    init_target();
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "\n>>>> Warning: unrecognized option: '-v29'\n\n");
    EXPECT_EQ(cpu_version, 28);
    rtc_unified_memory = false;
}

TEST_F(Target, QuestionsAboutTrees) {
    EXPECT_TRUE(offset_is_in_range(INT65(32767), tp->int_t, 1));
    EXPECT_FALSE(offset_is_in_range(INT65(32768), tp->int_t, 1));
    EXPECT_FALSE(offset_is_in_range(INT65(-1), tp->int_t, 1));
    NODE* x = name(symbol("x", tp->int_t));
    NODE* wide = name(symbol("l", tp->long_t));
    EXPECT_EQ(show(cpu_bit_test_subtree(bin(NEQ, bin(ANDB, copy_tree(x), icon(8)), icon(0)))), "x");
    EXPECT_EQ(show(cpu_bit_test_subtree(bin(EQ, bin(ANDB, wide, icon(8, tp->long_t)), icon(0)))), "l & 8L");
    EXPECT_EQ(show(cpu_bit_test_subtree(bin(LE, copy_tree(x), icon(0)))), "x <= 0");
    EXPECT_EQ(cost_for_DIV_to_MULT_expr(bin(DIV, bin(PLUS, copy_tree(x), icon(1)), icon(3))), 670);
}

// Addresses of members become sums, and what stands in memory all the same stays.
TEST_F(Target, AddressesAreLoweredAheadOfRegisterAssignment) {
    SYMTAB *s = symbol("s", sample_struct()), *q = symbol("q", tp->mk_ptr(sample_struct())),
           *p = symbol("p", tp->mk_ptr(tp->int_t));
    TYPE* to_long = tp->mk_ptr(tp->long_t);
    struct {
        NODE* tree;
        const char* text;
    } cases[] = {
        {address(deref(name(p))), "p"},
        {address(member(name(s), sample_member(2))), "(long *)&s + 2L"},
        {address(member(name(s), sample_member(0))), "(int *)&s"},
        {address(member(name(q), sample_member(2), STREF)), "(long *)q + 2L"},
        {member(name(q), sample_member(1), STREF), "(*q).bits"},
        {un(PCONV, address(deref(name(p))), to_long), "(long *)p"},
    };
    BBLK* bb = new BBLK(currfuninfo);
    LIST* list = nullptr;
    for (const auto& c : cases) list = mkelist(c.tree, list, nullptr);
    bb->statements = list = reverse_list(list);
    currfuninfo->bb_list = bb;
    lower_addresses();
    allocate_regs();
    currfuninfo->bb_list = nullptr;
    for (const auto& c : cases) {
        EXPECT_EQ(show(list->first), c.text);
        list = list->rest;
    }
}

TEST_F(Target, RegisterSets) {
    BITVEC set(4);
    SYMTAB* r = symbol("r", tp->int_t);
    r->value = 9;
    add_reg_to_set(r, &set);
    EXPECT_EQ(set.count(), 1u);
    EXPECT_TRUE(set.test(9));
    remove_reg_from_set(r, &set);
    EXPECT_TRUE(set.empty());
    r->value = 64;
    add_reg_to_set(r, &set);
    EXPECT_TRUE(set.empty());
}

TEST_F(Target, ArgumentsTakeTheirParametersTypes) {
    SYMTAB *i = symbol("i", tp->int_t), *l = symbol("l", tp->long_t), *u = symbol("u", tp->uint_t);
    struct {
        NODE* call;
        const char* text;
    } cases[] = {
        {mk_ICALL("__mpy", args({name(l), name(i)}), tp->long_t), "__mpy((int)l, i)"},
        {mk_ICALL("__mpy", args({name(i), name(i)}), tp->int_t), "(int)__mpy(i, i)"},
        {mk_ICALL("__mpy", args({name(l)}), tp->long_t), "__mpy(l)"}, // another count
        {mk_ICALL("__unheard_of", args({name(u)}), tp->int_t), "__unheard_of(u)"},
        {mk_ICALL("DONOTCSE", args({name(u)}), tp->uint_t), "DONOTCSE(u)"},
        {mk_MCALL("__rpt_rol", args({name(i), name(l)}), tp->long_t), "__rpt_rol(i, l)"}, // an MCALL stays
        {mk_ICALL("quest$colon", args({name(i), name(l), name(u)}), tp->long_t), "quest$colon(i, l, u)"},
    };
    for (const auto& c : cases) {
        NODE* t = insert_mandatory_casts(c.call);
        EXPECT_EQ(show(t), c.text);
        EXPECT_EQ(show(insert_mandatory_casts(t)), c.text) << "twice";
    }
}

TEST_F(Target, BoundsOfCalls) {
    auto bounds = [](NODE* call) {
        return std::make_pair(calculate_minval_for_BIF_call(call, nullptr),
                              calculate_maxval_for_BIF_call(call, nullptr));
    };
    using P = std::pair<INT65, INT65>;
    NODE* x = name(symbol("x", tp->int_t));
    EXPECT_EQ(bounds(mk_MCALL("__norm32", args({icon(1, tp->long_t), copy_tree(x)}), tp->long_t)), P(0, 31));
    EXPECT_EQ(bounds(mk_MCALL("__norm64", args({icon(1, tp->llong_t), copy_tree(x)}), tp->llong_t)), P(0, 63));
    EXPECT_EQ(bounds(mk_ICALL("__abs16_sat", args({copy_tree(x)}), tp->int_t)), P(0, 32767));
    EXPECT_EQ(bounds(mk_ICALL("__min", args({copy_tree(x), icon(9)}), tp->int_t)), P(-32768, 9));
    EXPECT_EQ(bounds(mk_ICALL("__max", args({icon(3), icon(9)}), tp->int_t)), P(9, 9));
    EXPECT_EQ(bounds(mk_ICALL("__unheard_of", args({icon(3)}), tp->uint_t)), P(0, 65535));
}

TEST_F(Target, WhatCommonSubexpressionsMayTake) {
    NODE* tbit = mk_ICALL("__tbit", args({icon(1), icon(2)}), tp->int_t);
    EXPECT_FALSE(ok_to_CSE_ICALL(tbit));
    EXPECT_FALSE(ok_to_CSE_ICALL_opds(tbit));
    NODE* rol = mk_ICALL("__rol", icon(1), tp->long_t);
    EXPECT_TRUE(ok_to_CSE_ICALL(rol));
    EXPECT_TRUE(ok_to_CSE_ICALL_opds(rol));
    EXPECT_FALSE(ok_to_CSE_ICALL(mk_ICALL("DONOTCSE", icon(1), tp->int_t)));
    EXPECT_FALSE(ok_to_CSE_ICALL(mk_ICALL("__x", nullptr, tp->int_t)));
    EXPECT_TRUE(ok_to_CSE_ICALL_opds(mk_ICALL("__x", nullptr, tp->int_t)));
    EXPECT_EQ(find_unCSEable_opds(rol), 255u);
    EXPECT_TRUE(is_barrier_MCALL("__add"));
    EXPECT_TRUE(is_barrier_MCALL("_disable_interrupts"));
    EXPECT_FALSE(is_barrier_MCALL("__dmac"));
    EXPECT_FALSE(is_barrier_MCALL("strlen"));
}

TEST_F(Target, AssociativePairs) {
    BIF* other = instantiate_associative_BIF("__mpy_a", find_BIF_descriptor("__mpy"));
    EXPECT_TRUE(other->has(IS_SELF_ASSOCIATIVE));
    EXPECT_TRUE(other->has(TOWERS_LIKE_PLUS));
    EXPECT_EQ(find_BIF_descriptor("__mpy")->associative_partner, other);
    EXPECT_EXIT(instantiate_associative_BIF("__mpy_b", other), testing::ExitedWithCode(1), "");
}

TEST_F(Target, StrictTernaries) {
    NODE* t = bin(QUEST, name(symbol("c", tp->int_t)), bin(COLON, icon(1), icon(2)), tp->int_t);
    t = make_strict_ternary_ICALL(t);
    EXPECT_TRUE(is_strict_ternary_ICALL(t));
    EXPECT_EQ(show(t), "quest$colon(c, 1, 2)");
    EXPECT_EQ(show(undo_strict_ternary_ICALL(t, false)), "c ? 1 : 2");
}

TEST_F(Target, InOutArguments) {
    SYMTAB *x = symbol("x", tp->long_t), *found = nullptr;
    NODE* direct = maketree(ARGREF, name(x), nullptr, tp->mk_ptr(tp->long_t));
    NODE* through = maketree(ARGREF, deref(address(name(x))), nullptr, tp->mk_ptr(tp->long_t));
    for (NODE* t : {direct, through}) {
        found = nullptr;
        EXPECT_TRUE(tree_is_IN_OUT_argument(t, &found));
        EXPECT_EQ(found, x);
    }
    EXPECT_FALSE(tree_is_IN_OUT_argument(name(x), &found));
}

TEST_F(Target, MisuseOfDescriptorsIsInternal) {
    auto dies = testing::ExitedWithCode(1);
    EXPECT_EXIT(make_BIF_descriptor(ICALL, "__rol", 1, tp->long_t), dies,
                "INTERNAL ERROR in make_BIF_descriptor\\(\\) for \"__rol\"");
    EXPECT_EXIT(make_BIF_descriptor(PLUS, "__new", 1, tp->long_t), dies, "make_BIF_descriptor");
    EXPECT_EXIT(instantiate_generic_BIF("__x", find_BIF_descriptor("__rol")), dies,
                "INTERNAL ERROR in instantiate_generic_BIF");
    EXPECT_EXIT(get_BIF_parameter('z', find_BIF_descriptor("__rol")), dies, "");
    BIF* bif = make_BIF_descriptor(ICALL, "__new", 2, tp->long_t);
    EXPECT_EXIT(def_BIF_parameter(bif, 1, tp->int_t, 'b'), dies, "INTERNAL ERROR in def_BIF_parameter");
    add_BIF_semantics(bif, icon(1), true);
    EXPECT_TRUE(bif->has(MUST_EXPAND));
    EXPECT_EXIT(add_BIF_semantics(bif, icon(1), false), dies, "INTERNAL ERROR in add_BIF_semantics");
}

} // namespace
