// Division by constants: the reciprocals for every divisor of 16 bits, and the sequences as trees at every width.

#include "../ir/function_fixture.h"

#include "OPT5/scalar/divide.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/target.h"
#include "tools/treecheck/evaluator.h"

#include <algorithm>
#include <random>

namespace {

using I128 = __int128;
using U128 = unsigned __int128;

uint64_t scaled(const RECIPROCAL& r, uint64_t x) {
    return static_cast<uint64_t>((U128(x) * r.factor + (r.adds_factor ? r.factor : 0)) >> r.shift);
}

// The scaled product only grows with x: if it is right at both ends of each run of equal quotients, it is right for all.
void expect_exact(uint64_t d, uint64_t limit, const RECIPROCAL& r) {
    for (uint64_t first = 0; first <= limit; first += d) {
        const uint64_t last = std::min(first + d - 1, limit);
        ASSERT_EQ(scaled(r, first), first / d) << first << " / " << d;
        ASSERT_EQ(scaled(r, last), first / d) << last << " / " << d;
    }
    ASSERT_LE(U128(limit) * r.factor + (r.adds_factor ? r.factor : 0), 0xFFFFFFFFu);
}

TEST(Reciprocal, IsExactForEveryDivisorAndDividendOf16Bits) {
    for (uint64_t d = 3; d <= 65535; ++d) {
        if ((d & (d - 1)) == 0) continue;
        RECIPROCAL r;
        ASSERT_TRUE(find_reciprocal(d, 65535, 0xFFFFFFFFu, 16, true, &r)) << d;
        expect_exact(d, 65535, r);
        if (d > 32767) continue;
        ASSERT_TRUE(find_reciprocal(d, 32768, 0x7FFFFFFFu, 16, false, &r)) << d;
        ASSERT_FALSE(r.adds_factor);
        expect_exact(d, 32768, r);
    }
}

TEST(Reciprocal, AnswersForTheBoundsThatAreGiven) {
    std::mt19937 rng(7);
    for (int i = 0; i < 3000; ++i) {
        const uint64_t d = 3 + rng() % 300, limit = 1 + rng() % 5000;
        RECIPROCAL r;
        if (find_reciprocal(d, limit, 0xFFFF, 8, true, &r)) expect_exact(d, limit, r);
    }
    RECIPROCAL r;
    EXPECT_TRUE(find_reciprocal(10, 255, 0xFFFF, 8, true, &r)); // 16-bit products do for a byte
    EXPECT_FALSE(find_reciprocal(10, 65535, 0xFFFF, 8, true, &r));
}

class DivisionTest : public FunctionTest {
protected:
    static void SetUpTestSuite() {
        FunctionTest::SetUpTestSuite();
        init_simplifier();
    }

    // Values where a quotient steps, at both ends of the type, and some from anywhere.
    std::vector<I128> dividends(const TYPE* type, I128 c) {
        const I128 low = type->is_unsigned() ? 0 : -(I128(1) << (type->size - 1));
        const I128 high = low + (I128(1) << type->size) - 1;
        std::vector<I128> values = {0, 1, 2, low, low + 1, high, high - 1};
        for (int i = 0; i < 20; ++i) {
            const I128 any = low + static_cast<I128>(U128(rng()) % (U128(high - low) + 1));
            for (I128 x : {any, any / c * c, any / c * c - 1, any / c * c + 1, high / c * c, high / c * c - 1})
                if (x >= low && x <= high) values.push_back(x);
        }
        return values;
    }

    // The evaluator's memory: the dividend lies ahead, the values that a sequence saves behind it.
    static constexpr uint32_t FIRST_PLACE = treecheck::FIRST_UNIT, PLACE_UNITS = 4;
    static void place_saved_values(NODE* sequence, const SYMTAB* x) {
        std::vector<SYMTAB*> saved;
        for_each_node(sequence, [&](NODE* t) {
            if (t->op != NAME || t->u.sym == x) return;
            auto at = std::find(saved.begin(), saved.end(), t->u.sym);
            if (at == saved.end()) at = saved.insert(at, t->u.sym);
            t->u.sym->scratch_word = FIRST_PLACE + PLACE_UNITS * static_cast<uint32_t>(at - saved.begin() + 1);
        });
    }
    static treecheck::BITS value(const NODE* tree, const SYMTAB* x, I128 dividend) {
        treecheck::EVALUATOR machine;
        for (unsigned n = 0; n < x->type->size / 16; ++n)
            machine.memory[x->scratch_word + n] = static_cast<uint16_t>(dividend >> 16 * n);
        const treecheck::BITS v = machine.eval(tree);
        EXPECT_FALSE(machine.undefined) << tree_to_infix(tree);
        return v;
    }

    void expect_equal(int op, TYPE* type, INT65 divisor, bool must_go) {
        SYMTAB* x = local("x", type);
        x->scratch_word = FIRST_PLACE;
        NODE* division = maketree(op, mk_NAME(x), mk_ICON(divisor, type), type);
        NODE* original = copy_tree(division);
        NODE* sequence = warp_DIV_to_MULT(division);
        if (must_go) {
            EXPECT_FALSE(tree_contains_op(sequence, DIV) || tree_contains_op(sequence, MOD)) << tree_to_infix(original);
        }
        sequence = simp_tree(sequence, nullptr);
        place_saved_values(sequence, x);
        const I128 c = static_cast<I128>(divisor.value) - (divisor.is_negative() ? I128(1) << 64 : 0);
        for (I128 is : dividends(type, c)) {
            if (is == -(I128(1) << (type->size - 1)) && c == -1) continue; // overflows
            ASSERT_EQ(value(sequence, x, is), value(original, x, is))
                << tree_to_infix(original) << " of " << static_cast<long long>(is) << " by " << tree_to_infix(sequence);
        }
        erase_tree(original);
        erase_tree(sequence);
    }

    std::mt19937_64 rng{11};
};

TEST_F(DivisionTest, SequencesHaveTheValueOfTheDivision) {
    for (TYPE* type : {tp->int_t, tp->uint_t, tp->long_t, tp->ulong_t, tp->llong_t, tp->ullong_t}) {
        std::vector<INT65> divisors = {int_type_max(type), int_type_max(type) - INT65(1), int_type_min(type)};
        for (int64_t c = 2; c < 130; ++c) divisors.push_back(INT65(c));
        for (int n = 7; n < static_cast<int>(type->size); ++n)
            for (int64_t near = -1; near <= 1; ++near) divisors.push_back((INT65(1) << INT65(n)) + INT65(near));
        for (int i = 0; i < 200; ++i) divisors.push_back(INT65(static_cast<int64_t>(rng() >> rng() % 60)));
        for (INT65 c : divisors) {
            c = truncate_to_type(c, type);
            if (c.is_zero()) continue;
            const INT65 magnitude = c.is_negative() ? -c : c;
            const bool must_go = magnitude > INT65(1);
            for (int op : {DIV, MOD}) {
                expect_equal(op, type, c, must_go);
                if (!type->is_unsigned() && c != int_type_min(type)) expect_equal(op, type, -c, must_go);
            }
        }
    }
}

TEST_F(DivisionTest, BoundsOfTheDividendAllowANarrowProduct) {
    SYMTAB* p = local("p", tp->llong_t);
    NODE* masked = maketree(ANDB, mk_NAME(p), mk_ICON(INT65(0xFFFFFF), tp->llong_t), tp->llong_t);
    NODE* t = warp_DIV_to_MULT(maketree(DIV, masked, mk_ICON(INT65(10), tp->llong_t), tp->llong_t));
    EXPECT_FALSE(tree_contains_op(t, DIV)) << tree_to_infix(t);
    erase_tree(t);
}

TEST_F(DivisionTest, ADividendWithEffectsIsEvaluatedOnce) {
    for (int op : {DIV, MOD})
        for (TYPE* type : {tp->int_t, tp->uint_t}) {
            SYMTAB* f = make_symbol("f", function_type(), SC_EXTERN, 0);
            NODE* call = maketree(UCALL, maketree(UAND, mk_NAME(f), nullptr, tp->mk_ptr(f->type)), nullptr, type);
            NODE* t = warp_DIV_to_MULT(maketree(op, call, mk_ICON(INT65(7), type), type));
            EXPECT_FALSE(tree_contains_op(t, op));
            EXPECT_EQ(count_calls_in_tree(t), 1) << tree_to_infix(t);
            EXPECT_EQ(tree_contains_op(t, ASG), op == MOD || type == tp->int_t) << tree_to_infix(t);
            erase_tree(t);
        }
}

TEST_F(DivisionTest, NothingElseIsTouched) {
    SYMTAB *x = local("x"), *y = local("y"), *d = local("d", tp->double_t);
    NODE* trees[] = {
        maketree(DIV, mk_NAME(x), mk_NAME(y), tp->int_t),
        maketree(DIV, mk_NAME(x), mk_ICON(INT65(0), tp->int_t), tp->int_t),
        maketree(MULT, mk_NAME(x), mk_ICON(INT65(7), tp->int_t), tp->int_t),
        maketree(DIV, mk_NAME(d), maketree(SCONV, mk_ICON(INT65(7), tp->int_t), nullptr, tp->double_t), tp->double_t),
    };
    for (NODE* t : trees) {
        EXPECT_EQ(warp_DIV_to_MULT(t), t);
        erase_tree(t);
    }
}

} // namespace
