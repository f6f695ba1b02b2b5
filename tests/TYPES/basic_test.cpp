#include "fixture.h"


TEST_F(Types, NormalFormOfBasicTypes) {
    EXPECT_EQ(pkg.schar_t->normalized_type(), pkg.int_t);
    EXPECT_EQ(pkg.uchar_t->normalized_type(), pkg.uint_t);
    EXPECT_EQ(pkg.ushort_t->normalized_type(), pkg.uint_t);
    EXPECT_EQ(pkg.mk_int(TYPE::ik_schar, false)->normalized_type(), pkg.int_t);
    EXPECT_EQ(pkg.mk_int(TYPE::ik_int, true)->normalized_type(), pkg.int_t);
    for (TYPE* t :
         {pkg.bool_t, pkg.wchar_t_, pkg.int_t, pkg.long_t, pkg.llong_t, pkg.ullong_t, pkg.float_t, pkg.double_t})
        EXPECT_EQ(t->normalized_type(), t);
    EXPECT_EQ(pkg.ldouble_t->normalized_type(), pkg.double_t);
    // An integer of a layout that the package doesn't know may not change its size.
    TYPE* odd = pkg.mk_int(TYPE::ik_int, false, 24, 8, false, false);
    EXPECT_EQ(odd->normalized_type(), odd);
}

TEST_F(Types, Qualifiers) {
    TYPE* c = pkg.mk_qual(pkg.long_t, QUAL_CONST);
    EXPECT_EQ(pkg.mk_qual(c, 0), c);
    EXPECT_EQ(pkg.mk_qual(c, QUAL_CONST), c);
    TYPE* cv = pkg.mk_qual(c, QUAL_VOLATILE);
    EXPECT_EQ(cv->own_qual_bits(), unsigned(QUAL_CONST | QUAL_VOLATILE));
    EXPECT_EQ(cv->type_qualified(), pkg.long_t);
    EXPECT_EQ(pkg.mk_qual(pkg.long_t, QUAL_CONST | QUAL_VOLATILE), cv);
    EXPECT_EQ(pkg.mk_qual(pkg.long_t, QUAL_PACKED)->align, 16u);
    EXPECT_EQ(pkg.remove_known_qual(cv, QUAL_CONST), pkg.mk_qual(pkg.long_t, QUAL_VOLATILE));

    // Through a typedef of a qualified type.
    TYPE* td = pkg.mk_typedef("CL", false, c, 32, 32, false);
    EXPECT_EQ(td->qual_kind(false), unsigned(QUAL_CONST));
    EXPECT_EQ(pkg.mk_qual(td, QUAL_CONST), td);
    EXPECT_EQ(pkg.remove_known_qual(td, QUAL_CONST), pkg.long_t);
    EXPECT_EQ(td->stqs(), td);
    EXPECT_EQ(td->stds(), c);
    EXPECT_EQ(td->real, pkg.long_t);
}

TEST_F(Types, QualifiersOfArrays) {
    TYPE* inside = pkg.mk_array(pkg.mk_qual(pkg.int_t, QUAL_VOLATILE), false, 3, true);
    EXPECT_EQ(inside->qual_kind(false), 0u);
    EXPECT_EQ(inside->qual_kind(true), unsigned(QUAL_VOLATILE));
    EXPECT_TRUE(inside->is_volatile());
    EXPECT_EQ(pkg.remove_known_qual(inside, QUAL_VOLATILE), pkg.mk_array(pkg.int_t, false, 3, true));
    TYPE* outside = pkg.mk_qual(pkg.mk_array(pkg.int_t, false, 3, true), QUAL_VOLATILE);
    EXPECT_EQ(outside->elem_type(), pkg.mk_qual(pkg.int_t, QUAL_VOLATILE));
    EXPECT_EQ(outside->raw_elem_type(), pkg.int_t);
    // A pointer to volatile isn't volatile.
    EXPECT_FALSE(pkg.mk_ptr(pkg.mk_qual(pkg.int_t, QUAL_VOLATILE))->is_volatile());
}

TEST_F(Types, ArraysAndVectors) {
    TYPE* a = pkg.mk_array(pkg.llong_t, false, 5, true);
    EXPECT_EQ(a->size, 320u);
    EXPECT_EQ(a->align, 32u);
    EXPECT_EQ(pkg.mk_array(pkg.mk_int(TYPE::ik_int, false, 24, 8, false, false), false, 2, true)->size, 64u);
    EXPECT_EQ(pkg.mk_array(structure("S3", nullptr, 48), false, 2, true)->size, 96u);
    EXPECT_FALSE(pkg.mk_array(pkg.int_t, false)->is_complete());
    TYPE* v = pkg.mk_vector(pkg.float_t, false, 4);
    EXPECT_EQ(v->size, 128u);
    EXPECT_TRUE(v->is_vector());
    EXPECT_NE(v, pkg.mk_array(pkg.float_t, false, 4, true));
    EXPECT_TRUE(pkg.mk_bool_vector(8)->is_predicate());
    EXPECT_TRUE(pkg.mk_vpred()->is_predicate());
    EXPECT_EQ(pkg.mk_vpred(), pkg.mk_vpred());
    EXPECT_DIES(pkg.mk_vector(pkg.int_t, false, 1), "Illegal vector length 1");
    EXPECT_DIES(pkg.mk_vector(a, false, 2), "Bad type:  TYPE_PKG::mk_vector()");

    TYPE* sv = pkg.mk_struct_vector(pkg.float_t, 4);
    EXPECT_TRUE(sv->is_struct_vector());
    EXPECT_EQ(sv->name(), "float4_t");
    EXPECT_EQ(sv->mdata()->next->name, "__x1");
    EXPECT_EQ(sv->mdata()->next->offset, 32);

    // Sizes beyond 64 bits don't wrap.
    TYPE* huge = pkg.mk_array(pkg.mk_array(pkg.llong_t, false, UINT32_MAX, true), false, UINT32_MAX, true);
    EXPECT_EQ(huge->size, ~uint64_t{15});
    EXPECT_STREQ(error_code_name(pkg.error_code), "object size not supported");
}

TEST_F(Types, UsualConversions) {
    struct {
        TYPE *a, *b, *result;
    } const rows[] = {
        {pkg.schar_t, pkg.short_t, pkg.int_t},
        {pkg.uchar_t, pkg.int_t, pkg.uint_t},
        {pkg.uint_t, pkg.long_t, pkg.long_t},
        {pkg.ulong_t, pkg.long_t, pkg.ulong_t},
        {pkg.llong_t, pkg.ulong_t, pkg.llong_t},
        {pkg.int_t, pkg.float_t, pkg.float_t},
        {pkg.ldouble_t, pkg.float_t, pkg.ldouble_t},
        {pkg.mk_complex(pkg.float_t), pkg.double_t, pkg.mk_complex(pkg.double_t)},
    };
    for (auto& r : rows) {
        EXPECT_EQ(c_usual_arith_conv(r.a, r.b), r.result) << r.a->printstr() << " " << r.b->printstr();
        EXPECT_EQ(c_usual_arith_conv(r.b, r.a), r.result);
    }
    EXPECT_DIES(c_usual_arith_conv(pkg.int_t, pkg.void_ptr_t), "Bad type:  c_usual_arith_conv()");
}

TEST_F(Types, FlexibleArrayMembers) {
    TYPE* open_array = pkg.mk_array(pkg.int_t, false);
    TYPE* flex = structure("F", member("n", pkg.int_t, 0, member("a", open_array, 16)), 16);
    EXPECT_TRUE(flex->has_flex_array_member());
    EXPECT_TRUE(structure("G", member("x", pkg.long_t, 0, member("f", flex, 32)))->has_flex_array_member());
    EXPECT_FALSE(structure("H", member("a", open_array, 0, member("n", pkg.int_t, 0)))->has_flex_array_member());
}

TEST_F(Types, BitFieldContainers) {
    struct {
        int start, bits, offset, width, out;
    } const rows[] = {
        {0, 16, 3, 5, 0},    {0, 16, 12, 5, -1}, {0, 32, 12, 5, 0},   {0, 16, 16, 16, 16}, {16, 32, 40, 8, 16},
        {16, 32, 44, 8, -1}, {0, 16, 0, 17, -1}, {32, 16, 16, 4, -1}, {0, 0, 0, 1, -1},
    };
    for (auto& r : rows) {
        int out = -1;
        EXPECT_EQ(get_container_offset_for_field(r.start, r.bits, r.offset, r.width, &out), r.out >= 0);
        EXPECT_EQ(out, r.out);
    }
}

TEST_F(Types, Text) {
    TYPE* f = function(pkg.int_t, param(pkg.long_t, param(pkg.void_ptr_t)));
    struct {
        TYPE* t;
        const char* text;
    } const rows[] = {
        {pkg.mk_int(TYPE::ik_schar, false), "char"},
        {pkg.mk_qual(pkg.int_t, QUAL_VOLATILE | QUAL_CONST | QUAL_ONCHIP), "const volatile onchip int"},
        {pkg.mk_ptr(pkg.mk_qual(pkg.uint_t, QUAL_CONST)), "const unsigned int *"},
        {pkg.mk_array(pkg.mk_ptr(pkg.int_t), false, 3, true), "int *[3]"},
        {pkg.mk_ptr(pkg.mk_array(pkg.int_t, false, 3, true)), "int (*)[3]"},
        {pkg.mk_ptr(f), "int (*)(long, void *)"},
        {pkg.mk_array(pkg.mk_array(pkg.int_t, false, 3, true), false), "int[][3]"},
    };
    for (auto& r : rows) EXPECT_EQ(r.t->printstr(), r.text);
    EXPECT_EQ(
        mangle_overloaded_builtin_function_argtypes("f", {pkg.mk_ptr(pkg.int_t), pkg.mk_vector(pkg.float_t, false, 4)}),
        "fPiDv4_f");
}
