// Objects and values: bit-fields, structures, initial contents, conversions, floating point.
#include "exec_unit.h"

#include <cmath>

namespace {
// Fields that share units, lie across two of them and fill one; each gets every value, and its neighbours stay.
TEST_F(ExecTest, FieldsKeepTheirSignAndTheirNeighbours) {
    TYPE* t = structure("fields", 96,
                        {{"a", pkg.int_t, 0, 3},
                         {"b", pkg.uint_t, 3, 5},
                         {"c", pkg.long_t, 8, 12},
                         {"d", pkg.ulong_t, 20, 31},
                         {"e", pkg.int_t, 64, 16},
                         {"f", pkg.uint_t, 80, 1}});
    struct {
        size_t member;
        int64_t value, expected;
    } const rows[] = {
        {0, 3, 3},
        {0, 4, -4},
        {0, -1, -1},
        {0, 8, 0},
        {1, 31, 31},
        {1, 32, 0},
        {1, -1, 31},
        {2, 2047, 2047},
        {2, 2048, -2048},
        {2, -1, -1},
        {3, 0x7FFFFFFF, 0x7FFFFFFF},
        {3, -1, 0x7FFFFFFF},
        {4, 32767, 32767},
        {4, 32768, -32768},
        {5, 3, 1},
        {5, 2, 0},
    };
    begin(main_sym);
    IC_SYMBOL *s = local("s", t), *guard = local("guard", pkg.llong_t);
    body();
    std::string expected;
    for (const auto& r : rows) {
        for (size_t i = 0; i < 6; i++)
            statement(node(ASG, pkg.int_t, member(name(s), t, i), num(i % 2 ? -1 : 0, pkg.int_t)));
        statement(set(guard, num(77, pkg.llong_t)));
        IC_NODE* field = member(name(s), t, r.member);
        statement(node(ASG, field->type, field, num(r.value, pkg.llong_t)));
        put(member(name(s), t, r.member));
        expected += std::to_string(r.expected) + "\n";
        for (size_t i = 0; i < 6; i++) {
            if (i == r.member) continue;
            const int64_t full[] = {0, 31, 0, 0x7FFFFFFF, 0, 1};
            put(member(name(s), t, i));
            expected += std::to_string(full[i]) + "\n";
        }
        put(name(guard));
        expected += "77\n";
    }
    ret(0);
    end();
    expect_output(expected);
}

TEST_F(ExecTest, CompoundAssignmentOfFieldsWrapsInTheField) {
    TYPE* t = structure("fields", 32, {{"a", pkg.int_t, 0, 14}, {"b", pkg.uint_t, 14, 4}});
    begin(main_sym);
    IC_SYMBOL* s = local("s", t);
    body();
    statement(node(ASG, pkg.int_t, member(name(s), t, 0), num(-1, pkg.int_t)));
    statement(node(ASG, pkg.uint_t, member(name(s), t, 1), num(15, pkg.uint_t)));
    put(node(PLUSPLUS, pkg.uint_t, member(name(s), t, 1), num(1, pkg.uint_t)));
    put(member(name(s), t, 1));
    statement(node(PLUSASG, pkg.uint_t, member(name(s), t, 1), num(18, pkg.uint_t)));
    put(member(name(s), t, 1));
    put(member(name(s), t, 0));
    ret(0);
    end();
    expect_output("15\n0\n2\n-1\n");
}

// A structure is an argument, changed in the callee; a result; and assigned from both.
TEST_F(ExecTest, StructuresGoByValue) {
    TYPE* t = structure("pair", 64, {{"x", pkg.int_t, 0, 0}, {"y", pkg.long_t, 32, 0}});
    IC_SYMBOL* f = global("_swap", function_type({t}, t));
    file->if_write_begin_func(f, &psn);
    IC_SYMBOL* p = parameter("p", t);
    file->if_write_end_args(&psn);
    IC_SYMBOL* q = local("q", t);
    body();
    statement(node(ASG, pkg.int_t, member(name(q), t, 0), node(SCONV, pkg.int_t, member(name(p), t, 1))));
    statement(node(ASG, pkg.long_t, member(name(q), t, 1), node(SCONV, pkg.long_t, member(name(p), t, 0))));
    statement(node(ASG, pkg.int_t, member(name(p), t, 0), num(99, pkg.int_t)));
    statement(node(RETURN, t, name(f), name(q)));
    end();
    begin(main_sym);
    IC_SYMBOL *a = local("a", t), *b = local("b", t);
    body();
    statement(node(ASG, pkg.int_t, member(name(a), t, 0), num(-5, pkg.int_t)));
    statement(node(ASG, pkg.long_t, member(name(a), t, 1), num(1234, pkg.long_t)));
    statement(node(STASG, t, name(b), name(a)));
    statement(node(STASG, t, name(a), call(f, node(STARG, t, name(b)))));
    for (IC_SYMBOL* s : {a, b}) put(member(name(s), t, 0)), put(member(name(s), t, 1));
    put(member(call(f, node(STARG, t, call(f, node(STARG, t, name(a))))), t, 1));
    ret(0);
    end();
    expect_output("1234\n-5\n-5\n1234\n-5\n");
}

TEST_F(ExecTest, InitialContentsFollowTheLayout) {
    TYPE* row = structure("row", 96,
                          {{"n", pkg.int_t, 0, 0},
                           {"low", pkg.int_t, 16, 10},
                           {"high", pkg.uint_t, 26, 6},
                           {"f", pkg.float_t, 32, 0},
                           {"p", pkg.mk_ptr(pkg.int_t), 64, 0}});
    TYPE *rows = pkg.mk_array(row, false, 3, true), *chars = pkg.mk_array(pkg.schar_t, false, 5, true);
    IC_SYMBOL *g = global("_g", rows), *word = global("_word", chars), *zero = global("_zero", pkg.int_t);
    TYPE* to_row = pkg.mk_ptr(row);
    auto at = [&](int k, size_t m) {
        IC_NODE* base = node(PCONV, to_row, node(UAND, pkg.mk_ptr(rows), name(g)));
        return member(node(UMULT, row, node(PLUS, to_row, base, num(6 * k, pkg.long_t))), row, m);
    };
    begin(main_sym);
    body();
    for (int k = 0; k < 3; k++) {
        for (size_t m = 0; m < 3; m++) put(at(k, m));
        put(node(MULT, pkg.float_t, at(k, 3), real("4", pkg.float_t)));
    }
    put(node(EQ, pkg.int_t, at(2, 4), node(UAND, pkg.mk_ptr(pkg.int_t), name(zero))));
    put(node(UMULT, pkg.int_t, at(2, 4)));
    TYPE* to_char = pkg.mk_ptr(pkg.schar_t);
    for (int k : {0, 2, 3, 4})
        put(node(
            UMULT, pkg.schar_t,
            node(PLUS, to_char, node(PCONV, to_char, node(UAND, pkg.mk_ptr(chars), name(word))), num(k, pkg.long_t))));
    ret(0);
    end();
    IC_NODE* skip = node(SKIP, pkg.int_t, num(0, pkg.int_t));
    skip->number = 5;
    initialize(g, {num(1, pkg.int_t), num(-3, pkg.int_t), num(63, pkg.uint_t), real("0.25", pkg.float_t),
                   num(0, pkg.mk_ptr(pkg.int_t)), skip, num(7, pkg.int_t), num(1017, pkg.int_t), num(1, pkg.uint_t),
                   real("-2.5", pkg.float_t), node(UAND, pkg.mk_ptr(pkg.int_t), name(zero))});
    initialize(word, {text("ab\xFF", 3)});
    expect_output("1\n-3\n63\n1\n0\n0\n0\n0\n7\n-7\n1\n-10\n1\n0\n97\n255\n0\n0\n");
}

TEST_F(ExecTest, ConversionsAtEveryWidth) {
    TYPE* const types[] = {pkg.int_t, pkg.uint_t, pkg.long_t, pkg.ulong_t, pkg.llong_t};
    const int64_t values[] = {0, 32767, 32768, 65535, -1, 2147483648LL, -32769, 0x123456789ALL};
    begin(main_sym);
    IC_SYMBOL* x = local("x", pkg.llong_t);
    body();
    std::string expected;
    for (int64_t v : values) {
        statement(set(x, num(v, pkg.llong_t)));
        for (TYPE* t : types) put(node(SCONV, t, name(x)));
        for (int64_t w : {int64_t{static_cast<int16_t>(v)}, int64_t{static_cast<uint16_t>(v)},
                          int64_t{static_cast<int32_t>(v)}, int64_t{static_cast<uint32_t>(v)}, v})
            expected += std::to_string(w) + "\n";
    }
    ret(0);
    end();
    expect_output(expected);
}

TEST_F(ExecTest, ShiftsAtEveryWidth) {
    struct {
        int opcode;
        TYPE* type;
        int64_t value, count, expected;
    } const rows[] = {
        {SLL, pkg.uint_t, 1, 15, 32768},
        {SRL, pkg.uint_t, 65535, 15, 1},
        {SLL, pkg.long_t, 1, 31, -2147483648LL},
        {SRL, pkg.long_t, -2147483648LL, 31, -1},
        {SLL, pkg.ulong_t, -1, 31, 2147483648LL},
        {SRL, pkg.ulong_t, -1, 4, 0x0FFFFFFF},
        {SLL, pkg.llong_t, 1, 62, INT64_C(1) << 62},
        {SRL, pkg.llong_t, INT64_MIN, 63, -1},
        {SRL, pkg.ullong_t, -1, 60, 15},
        {SRL, pkg.llong_t, 0x7FFFFFFFFFFFLL, 40, 127},
    };
    begin(main_sym);
    IC_SYMBOL *x = local("x", pkg.llong_t), *n = local("n", pkg.int_t);
    body();
    std::string expected;
    for (const auto& r : rows) {
        statement(set(x, num(r.value, pkg.llong_t)));
        statement(set(n, num(r.count, pkg.int_t)));
        put(node(r.opcode, r.type, node(SCONV, r.type, name(x)), name(n)));
        expected += std::to_string(r.expected) + "\n";
    }
    ret(0);
    end();
    expect_output(expected);
}

// 2^24 + 1 is no single; the sum is rounded before it is used, although the next operation is wider.
TEST_F(ExecTest, SinglesRoundAfterEveryOperation) {
    TYPE* d = pkg.ldouble_t;
    ASSERT_EQ(d->size, 64u);
    IC_SYMBOL* put_f64 = library("_put_f64", {d}, pkg.void_t);
    begin(main_sym);
    IC_SYMBOL *x = local("x", pkg.float_t), *y = local("y", d);
    body();
    auto show = [&](IC_NODE* v) { statement(call(put_f64, node(SCONV, d, v))); };
    statement(set(x, real("16777216", pkg.float_t)));
    statement(set(y, real("16777216", d)));
    show(node(PLUS, pkg.float_t, name(x), real("1", pkg.float_t)));
    show(node(PLUS, d, name(y), real("1", d)));
    show(node(DIV, pkg.float_t, real("1", pkg.float_t), real("3", pkg.float_t)));
    show(node(MULT, pkg.float_t, real("1e30", pkg.float_t), real("1e30", pkg.float_t)));
    show(node(SCONV, pkg.float_t, num(16777217, pkg.long_t)));
    show(node(PLUSASG, pkg.float_t, name(x), real("3", pkg.float_t)));
    put(node(SCONV, pkg.long_t, real("-2.9", pkg.float_t)));
    ret(0);
    end();
    expect_output("16777216\n16777217\n0.3333333432674408\ninf\n16777216\n16777220\n-2\n");
}

// In the order of the codes: FEQ to FGT, the same where no order makes true as well, FORD, FUNO. Each is true for a set
// of outcomes: 1 equal, 2 less, 4 greater, 8 unordered.
TEST_F(ExecTest, FloatingComparisonsOfNumbersInfinitiesAndNoNumbers) {
    TYPE* t = pkg.float_t;
    const unsigned true_for[] = {1, 6, 3, 2, 5, 4, 9, 14, 11, 10, 13, 12, 7, 8};
    const float inf = HUGE_VALF;
    const float values[] = {1, 2, inf, NAN};
    begin(main_sym);
    IC_SYMBOL *v[] = {local("one", t), local("two", t), local("inf", t), local("nan", t)}, *big = local("big", t);
    body();
    statement(set(v[0], real("1", t)));
    statement(set(v[1], real("2", t)));
    statement(set(big, real("3e38", t)));
    statement(set(v[2], node(MULT, t, name(big), name(big))));
    statement(set(v[3], node(MINUS, t, name(v[2]), name(v[2]))));
    std::string expected;
    for (int i = 0; i < 4; i++)
        for (int j = 0; j < 4; j++) {
            const float a = values[i], b = values[j];
            const unsigned outcome = a == b ? 1 : a < b ? 2 : a > b ? 4 : 8;
            for (int k = 0; k < 14; k++) {
                put(node(FEQ + k, pkg.int_t, name(v[i]), name(v[j])));
                expected += outcome & true_for[k] ? "1\n" : "0\n";
            }
        }
    ret(0);
    end();
    expect_output(expected);
}
} // namespace
