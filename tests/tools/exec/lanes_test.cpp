// Vectors and complex numbers as whole values.
#include "exec_unit.h"

namespace {
enum : int { REAL = 141, IMAG = 142, COMPLEX = 140, VPACK = 134, VPACKM = 135, VFIELD = 138, NEQ = 81 };

class LanesTest : public ExecTest {
protected:
    IC_NODE* pair(TYPE* type, const char* re, const char* im) {
        TYPE* part = type->part_type();
        return node(COMPLEX, type, real(re, part), real(im, part));
    }
    IC_NODE* part(int opcode, IC_NODE* z) { return node(opcode, z->type->part_type(), z); }
    // In eighths.
    void put_real(IC_NODE* v) { put(node(MULT, v->type, v, real("8", v->type))); }
    IC_NODE* lane(IC_SYMBOL* v, int64_t i) {
        return node(VFIELD, v->type->raw_elem_type(), name(v), num(i, pkg.int_t));
    }
};

TEST_F(LanesTest, ComplexArithmetic) {
    TYPE* t = pkg.mk_complex(pkg.float_t);
    struct {
        int opcode;
        int64_t re, im; // of (1.5 + 2i) op (-1 + 1i), in eighths
    } const rows[] = {{PLUS, 4, 24}, {MINUS, 20, 8}, {MULT, -28, -4}, {DIV, 2, -14}};
    begin(main_sym);
    IC_SYMBOL *a = local("a", t), *b = local("b", t), *c = local("c", t);
    body();
    statement(set(a, pair(t, "1.5", "2")));
    statement(set(b, pair(t, "-1", "1")));
    std::string expected;
    for (const auto& r : rows) {
        statement(set(c, node(r.opcode, t, name(a), name(b))));
        put_real(part(REAL, name(c)));
        put_real(part(IMAG, name(c)));
        expected += std::to_string(r.re) + "\n" + std::to_string(r.im) + "\n";
    }
    // A real operand has no imaginary part; the other operand's sign of zero does not matter here.
    statement(set(c, node(PLUS, t, node(UMINUS, t, name(a)), real("1", pkg.float_t))));
    put_real(part(REAL, name(c)));
    put_real(part(IMAG, name(c)));
    expected += "-4\n-16\n";
    put(node(EQ, pkg.int_t, name(a), name(a)));
    put(node(EQ, pkg.int_t, name(a), pair(t, "1.5", "-2")));
    put(node(NEQ, pkg.int_t, name(a), pair(t, "1", "2")));
    expected += "1\n0\n1\n";
    expect_output(expected);
}

TEST_F(LanesTest, VectorArithmeticWrapsByLane) {
    TYPE *t = pkg.mk_vector(pkg.int_t, false, 4), *wide = pkg.mk_vector(pkg.long_t, false, 4);
    struct {
        int opcode;
        int64_t expected[4]; // of {32767, -2, 300, 7} op {2, 3, 300, 3}
    } const rows[] = {{PLUS, {-32767, 1, 600, 10}},
                      {MINUS, {32765, -5, 0, 4}},
                      {MULT, {-2, -6, 24464, 21}},
                      {DIV, {16383, 0, 1, 2}},
                      {MOD, {1, -2, 0, 1}}};
    begin(main_sym);
    IC_SYMBOL *a = local("a", t), *b = local("b", t), *c = local("c", t), *w = local("w", wide);
    body();
    auto pack = [&](std::vector<int64_t> v) {
        std::vector<IC_NODE*> lanes;
        for (int64_t x : v) lanes.push_back(num(x, pkg.int_t));
        return node(VPACK, t, list(lanes));
    };
    statement(set(a, pack({32767, -2, 300, 7})));
    statement(set(b, pack({2, 3, 300, 3})));
    std::string expected;
    auto put_lanes = [&](IC_SYMBOL* v, const std::vector<int64_t>& want) {
        for (int64_t i = 0; i < 4; i++) {
            put(lane(v, i));
            expected += std::to_string(want[static_cast<size_t>(i)]) + "\n";
        }
    };
    for (const auto& r : rows) {
        statement(set(c, node(r.opcode, t, name(a), name(b))));
        put_lanes(c, {std::begin(r.expected), std::end(r.expected)});
    }
    statement(set(c, node(NOTB, t, name(a))));
    put_lanes(c, {-32768, 1, -301, -8});
    statement(set(c, node(SLL, t, name(a), num(1, pkg.int_t)))); // the count is in every lane
    put_lanes(c, {-2, -4, 600, 14});
    statement(set(w, node(SCONV, wide, node(VPACKM, t, num(-9, pkg.int_t)))));
    put_lanes(w, {-9, -9, -9, -9});
    statement(set(a, node(PLUS, t, name(a), name(a))));
    put_lanes(a, {-2, -4, 600, 14});
    // The right operand changes what the left one is afterwards, not what is updated.
    statement(node(PLUSASG, t, name(a), node(PLUSASG, t, name(b), name(a))));
    put_lanes(a, {-2, -5, 1500, 31});
    put_lanes(b, {0, -1, 900, 17});
    expect_output(expected);
}
} // namespace
