// Rules of the simplifier that are not expressions of C: effects, built-in functions, vectors and complex values,
// memory, structures, and the operations that other passes call.

#include "../ir/tree_builder.h"

#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/target.h"

using namespace test_trees;

namespace {

class Families : public Trees {
protected:
    static void SetUpTestSuite() {
        start();
        init_target();
        init_BIF_descriptors();
        instantiate_generic_BIF("_itod", find_BIF_descriptor("SORREL_ITOD"));
        instantiate_generic_BIF("_itoll", find_BIF_descriptor("SORREL_ITOLL"));
        instantiate_generic_BIF("_hi", find_BIF_descriptor("SORREL_HI"));
        instantiate_generic_BIF("_lo", find_BIF_descriptor("SORREL_LO"));
        instantiate_generic_BIF("_amem4", find_BIF_descriptor("SORREL_AMEM4"));
        instantiate_generic_BIF("_mem4", find_BIF_descriptor("SORREL_MEM4"));
        instantiate_generic_BIF("__builtin_expect_", find_BIF_descriptor("__builtin_expect"));
        init_simplifier();
    }

    SYMTAB *xs = symbol("x", tp->int_t), *ys = symbol("y", tp->int_t), *zs = symbol("z", tp->int_t),
           *us = symbol("u", tp->uint_t), *ls = symbol("l", tp->long_t), *ds = symbol("d", tp->double_t),
           *ps = symbol("p", tp->mk_ptr(tp->int_t));
    NODE* x() { return name(xs); }
    NODE* y() { return name(ys); }
    NODE* u() { return name(us); }
    static NODE* args(NODE* a, NODE* b) { return maketree(COMMA, a, b, tp->int_t); }
    static NODE* f() { return call("f", tp->int_t); }

    struct ROW {
        NODE* tree;
        const char* expected;
    };
    static NODE* simplified(NODE* t) { return simp_tree(t, nullptr); }
    template <std::size_t N, class OPERATION = NODE* (*)(NODE*)>
    static void check(const ROW (&rows)[N], OPERATION operation = simplified) {
        for (const ROW& row : rows) {
            const std::string before = show(row.tree);
            NODE* t = operation(row.tree);
            EXPECT_EQ(show(t), row.expected) << before;
            erase_tree(t);
        }
    }
};

TEST_F(Families, BuiltInFunctions) {
    auto ternary = [](NODE* c, NODE* a, NODE* b) {
        return make_strict_ternary_ICALL(bin(QUEST, c, bin(COLON, a, b, a->type), a->type));
    };
    auto less = [&](NODE* a, NODE* b) { return bin(LT, a, b, tp->int_t); };
    auto unary_call = [](const char* f, NODE* a, TYPE* type) { return mk_ICALL(f, a, type); };
    auto itod = [&] { return mk_ICALL("_itod", args(u(), un(SCONV, x(), tp->uint_t)), tp->double_t); };
    auto word = [&](const char* f) { return un(SCONV, unary_call(f, name(ds), tp->uint_t), tp->uint_t); };
    const ROW rows[] = {
        {ternary(less(x(), y()), bin(MINUS, y(), x()), bin(MINUS, x(), y())), "ABS(y - x)"},
        {ternary(less(x(), y()), bin(MINUS, x(), y()), bin(MINUS, y(), x())), "quest$colon(x < y, x - y, y - x)"},
        {ternary(less(x(), y()), un(SCONV, x(), tp->long_t), un(SCONV, y(), tp->long_t)), "(long)__min(y, x)"},
        {ternary(icon(1), x(), y()), "x"},
        {ternary(less(x(), y()), x(), x()), "x"},
        {unary_call("DONOTCSE", unary_call("DONOTCSE", x(), tp->int_t), tp->int_t), "DONOTCSE(x)"},
        {mk_ICALL("__builtin_expect_", args(icon(3, tp->long_t), icon(1, tp->long_t)), tp->long_t), "3L"},
        {mk_ICALL("__builtin_expect_", args(name(ls), icon(1, tp->long_t)), tp->long_t), "__builtin_expect_(l, 1L)"},
        {mk_ICALL("_itod", args(icon(0, tp->uint_t), icon(0, tp->uint_t)), tp->double_t), "0.0"},
        {mk_ICALL("_itoll", args(icon(0, tp->uint_t), icon(0, tp->uint_t)), tp->llong_t), "0LL"},
        {mk_ICALL("_itod", args(word("_hi"), word("_lo")), tp->double_t), "d"},
        {mk_ICALL("_itod", args(word("_lo"), word("_hi")), tp->double_t), "_itod(_lo(d), _hi(d))"},
        {unary_call("_hi", itod(), tp->uint_t), "u"},
        {unary_call("_lo", itod(), tp->uint_t), "(unsigned int)x"},
        {unary_call("_hi", mk_ICALL("_itod", args(u(), un(SCONV, f(), tp->uint_t)), tp->double_t), tp->uint_t),
         "_hi(_itod(u, (unsigned int)f()))"},
        {unary_call("_hi", fcon("0.0"), tp->uint_t), "0u"},
        {unary_call("_mem4", name(ps), tp->mk_ptr(tp->uint_t)), "NONALIGN((unsigned int *)p)"},
    };
    check(rows);
    NODE* t = simp_tree(unary_call("_amem4", name(ps), tp->mk_ptr(tp->ulong_t)), nullptr);
    EXPECT_EQ(show(t), "NASSERT((long)p % 2L == 0L), (unsigned long *)p");
    erase_tree(t);
}

TEST_F(Families, VectorsAndComplexValues) {
    TYPE *pair = tp->mk_vector(tp->int_t, false, 2), *quad = tp->mk_vector(tp->int_t, false, 4),
         *longs = tp->mk_vector(tp->long_t, false, 2);
    SYMTAB* vs = symbol("v", pair);
    auto lane = [&](int i) { return maketree(VFIELD, name(vs), icon(i), tp->int_t); };
    auto pack = [&](NODE* list) { return maketree(VPACK, list, nullptr, pair); };
    EXPECT_EQ(show(invert_boolean_tree(name(vs))), "v == VPACKM(0)");
    TYPE* complex = tp->mk_complex(tp->float_t);
    SYMTAB *hs = symbol("h", tp->float_t), *gs = symbol("g", tp->float_t), *cs = symbol("c", complex);
    auto make = [&] { return maketree(COMPLEX, name(hs), name(gs), complex); };
    const ROW rows[] = {
        {pack(args(lane(0), lane(1))), "v"},
        {pack(args(lane(1), lane(0))), "VPACK(VFIELD(v, 1), VFIELD(v, 0))"},
        {pack(args(icon(3), icon(3))), "VPACKM(3)"},
        {pack(args(icon(3), icon(4))), "VPACK(3, 4)"},
        {pack(x()), "VPACKM(x)"},
        {maketree(VFIELD, pack(args(x(), y())), icon(1), tp->int_t), "y"},
        {maketree(VFIELD, pack(args(f(), y())), icon(1), tp->int_t), "VFIELD(VPACK(f(), y), 1)"},
        {maketree(VFIELD, maketree(VPACKM, x(), nullptr, pair), icon(1), tp->int_t), "x"},
        {maketree(VPACK, args(x(), y()), nullptr, quad), "VPACK1P(x, y)"},
        {maketree(VFIELD, maketree(VPACK, args(x(), y()), nullptr, quad), icon(3), tp->int_t), "y"},
        {maketree(VFIELD, maketree(VPACK1P, x(), y(), quad), icon(0), tp->int_t), "x"},
        {maketree(VPACK1P, icon(3), icon(3), quad), "VPACKM(3)"},
        {maketree(VFIELD, maketree(VSCONV, pack(args(x(), y())), nullptr, longs), icon(1), tp->long_t), "(long)y"},
        {maketree(VSCONV, maketree(VPACKM, x(), nullptr, pair), nullptr, longs), "VPACKM((long)x)"},
        {maketree(REAL, make(), nullptr, tp->float_t), "h"},
        {maketree(IMAG, make(), nullptr, tp->float_t), "g"},
        {maketree(COMPLEX, maketree(REAL, name(cs), nullptr, tp->float_t),
                  maketree(IMAG, name(cs), nullptr, tp->float_t), complex),
         "c"},
    };
    check(rows);
}

TEST_F(Families, AssignmentsThatWriteMembersAndMemory) {
    SYMTAB* ss = symbol("s", sample_struct());
    auto bits = [&] { return member(name(ss), sample_member(1)); };
    auto memcpy_of = [&](NODE* to, NODE* from, long n) {
        return maketree(MEMCPY, args(args(to, from), icon(n)), nullptr, to->type);
    };
    SYMTAB *flag = symbol("b", tp->bool_t), *global = symbol("g", tp->int_t, 0, SC_EXTDEF);
    auto set = [](NODE* a, NODE* b) { return bin(ASG, a, b, a->type); };
    const ROW rows[] = {
        {set(bits(), icon(13, tp->uint_t)), "s.bits = 5u"},
        {set(bits(), bin(ANDB, u(), icon(15, tp->uint_t))), "s.bits = u"},
        {set(bits(), bin(ANDB, u(), icon(3, tp->uint_t))), "s.bits = u & 3u"},
        {set(name(flag), un(SCONV, x(), tp->bool_t)), "b = (bool)x"}, // a truth value, not the low bits
        {set(name(global), set(x(), y())), "g = x = y"},
        {set(x(), set(name(global), y())), "g = x = y"},
        {set(x(), set(x(), y())), "x = y"},
        {set(x(), bin(PLUS, bin(PLUS, y(), x()), u(), tp->int_t)), "x = y + x + u"}, // of two types
        {set(x(), bin(PLUS, bin(MINUS, y(), name(zs)), x())), "x += y - z"},
        {set(x(), bin(MINUS, bin(MINUS, x(), y()), name(zs))), "x = x - y - z"},
        {set(x(), bin(MINUS, y(), x())), "x = y - x"},
        {set(x(), bin(ORB, bin(ORB, y(), x()), name(zs))), "x |= y | z"},
        {set(x(), bin(PLUS, y(), icon(1))), "x = y + 1"},
        {set(x(), bin(PLUS, x(), icon(1))), "x = x + 1"}, // a counter
        {set(name(global), bin(PLUS, name(global), icon(1))), "g += 1"},
        {memcpy_of(name(ps), name(ps), 8), "p"},
        {bin(STASG, name(ss), name(ss), sample_struct()), "s"},
    };
    check(rows);
}

TEST_F(Families, SwitchesAreOnTheirVariable) {
    auto on = [&](NODE* value, long a, long b) {
        auto entry = [&](long v, int label) {
            return maketree(CASE, icon(v, value->type), mk_LABELREF(label), tp->int_t);
        };
        NODE* dflt = maketree(DEFAULT, mk_LABELREF(3), nullptr, tp->int_t);
        return maketree(SWITCH, value, args(args(entry(a, 1), entry(b, 2)), dflt), tp->int_t);
    };
    NODE* switches[] = {on(bin(PLUS, x(), icon(5)), 4, -32768), on(un(SCONV, x(), tp->long_t), 4, 9),
                        on(un(SCONV, x(), tp->long_t), 4, 70000)};
    const char* expected[] = {"SWITCH (x) { case -1: goto L1; case 32763: goto L2; default: goto L3; }",
                              "SWITCH (x) { case 4: goto L1; case 9: goto L2; default: goto L3; }",
                              "SWITCH ((long)x) { case 4L: goto L1; case 70000L: goto L2; default: goto L3; }"};
    for (int i = 0; i < 3; ++i) {
        NODE* t = simp_tree(switches[i], nullptr);
        EXPECT_EQ(stmt2infix(t), expected[i]);
        erase_tree(t);
    }
}

// Without strict floating point a division is by the reciprocal; powers of one base are joined.
TEST_F(Families, RelaxedFloatingPointAndPowers) {
    SYMTAB *n = symbol("n", tp->int_t), *base = symbol("e", tp->double_t);
    auto power = [&](NODE* b, NODE* e) { return maketree(EXPT, b, e, b->type); };
    auto d = [&] { return name(ds); };
    auto small = [&](long mask) { return bin(ANDB, name(n), icon(mask)); };
    const ROW strict[] = {{bin(DIV, d(), fcon("3.0")), "d / 3.0"},
                          {bin(MULT, power(d(), icon(3)), d()), "EXPT(d, 3) * d"},
                          {bin(MULT, power(x(), icon(3)), power(x(), small(7))), "EXPT(x, (n & 7) + 3)"},
                          {bin(MULT, power(x(), icon(3)), x()), "EXPT(x, 4)"},
                          {bin(MULT, power(x(), name(n)), x()), "EXPT(x, n) * x"}, // n may be negative
                          {bin(MULT, d(), power(name(base), icon(2))), "EXPT(e, 2) * d"}};
    const ROW relaxed[] = {{bin(DIV, d(), fcon("3.0")), "d * 0.3333333333333333"},
                           {bin(DIV, d(), fcon("0.0")), "d / 0.0"},
                           {bin(MULT, power(d(), icon(3)), d()), "EXPT(d, 4)"}};
    const auto former = strict_fp;
    strict_fp = 1;
    check(strict);
    strict_fp = 0;
    check(relaxed);
    strict_fp = former;
}

TEST_F(Families, TermsAreBroughtToTheTop) {
    NODE* target = x();
    auto bits = [](NODE* a) { return bin(ANDB, a, icon(7)); };
    const ROW rows[] = {
        {bin(PLUS, y(), x()), "x + y"},
        {bin(PLUS, bin(PLUS, bits(y()), x()), bits(name(zs))), "x + ((y & 7) + (z & 7))"},
        {bin(MINUS, bin(MINUS, x(), bits(y())), bits(name(zs))), "x - ((y & 7) + (z & 7))"},
        {bin(PLUS, bin(MINUS, x(), y()), name(zs)), "x - y + z"}, // y - z may overflow
        {bin(PLUS, bits(y()), bin(MINUS, x(), bits(name(zs)))), "x + ((y & 7) - (z & 7))"},
        {bin(MULT, bits(y()), bin(MULT, bits(name(zs)), x())), "x * ((y & 7) * (z & 7))"},
        {bin(MINUS, y(), x()), "y - x"},
        {bin(PLUS, f(), x()), "f() + x"},
    };
    check(rows, [&](NODE* t) { return bubble_term_to_top(t, target); });
    erase_tree(target);
}

TEST_F(Families, ChainsAreReassociated) {
    auto sum = [](NODE* a, NODE* b) { return bin(PLUS, a, b); };
    const ROW rows[] = {
        {sum(sum(sum(x(), y()), icon(3)), sum(x(), icon(4))), "(int)((unsigned int)x * 2u + (unsigned int)y + 7u)"},
        {bin(MINUS, sum(sum(x(), y()), name(zs)), x()), "y + z"},
        {bin(XORB, bin(XORB, bin(XORB, x(), y()), name(zs)), y()), "x ^ z"},
        {bin(ANDB, bin(ANDB, x(), y()), x()), "x & y"},
        {bin(MULT, bin(MULT, x(), icon(3)), bin(MULT, y(), icon(5))), "x * y * 15"},
        {sum(sum(x(), y()), name(zs)), "x + y + z"},
        {sum(sum(f(), icon(1)), icon(2)), "f() + 1 + 2"},
    };
    check(rows, [&](NODE* t) { return simp_assoc(t, nullptr); });
}

TEST_F(Families, AddressesAndCopiesOfStructures) {
    SYMTAB *ss = symbol("s", sample_struct()), *sp = symbol("q", tp->mk_ptr(sample_struct()));
    const ROW rows[] = {
        {name(ss), "&s"},
        {deref(name(sp)), "q"},
        {bin(COMMAOP, f(), name(ss), sample_struct()), "f(), &s"},
        {bin(QUEST, x(), bin(COLON, name(ss), deref(name(sp)), sample_struct()), sample_struct()), "x ? &s : q"},
    };
    check(rows, [&](NODE* t) { return apply_UAND_to_struct(t); });

    TYPE* two = tp->mk_struct("two", 32, 16, false);
    fkMDATA* a = new fkMDATA("a", tp->int_t, 0, 0, 0, false, false, false, false);
    a->next = new fkMDATA("b", tp->int_t, 0, 16, 0, false, false, false, false);
    tp->set_mdata(two, a);
    tp->type_frozen(two);
    SYMTAB *to = symbol("t", two), *from = symbol("k", tp->mk_qual(two, QUAL_CONST), 0, SC_STATIC),
           *other = symbol("o", two);
    NODE* copy = bin(STASG, name(to), name(from), two);
    ASSERT_TRUE(is_small_constant_STASG(copy));
    copy = convert_STASG_to_asgs(copy);
    EXPECT_EQ(show(copy), "t.a = k.a, t.b = k.b");
    erase_tree(copy);
    copy = bin(STASG, name(to), name(other), two);
    EXPECT_FALSE(is_small_constant_STASG(copy));
    erase_tree(copy);
}

} // namespace
