// Rules of integer algebra: common bits of ranges, effects that must stay, known values.

#include "../ir/tree_builder.h"

#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/simp.h"

using namespace test_trees;

namespace {

class Algebra : public Trees {};

TEST_F(Algebra, RangesGiveTheirCommonBits) {
    for (long low = -20; low <= 20; ++low)
        for (long high = low; high <= 20; ++high) {
            const INT65 zeros = find_known_zeros_in_range(INT65(low), INT65(high)),
                        ones = find_known_ones_in_range(INT65(low), INT65(high));
            for (long v = low; v <= high; ++v) {
                EXPECT_TRUE((INT65(v) & zeros).is_zero());
                EXPECT_TRUE((~INT65(v) & ones).is_zero());
            }
        }
    EXPECT_EQ(find_known_zeros_in_range(INT65(0), INT65(7)), ~INT65(7));
    EXPECT_EQ(find_known_ones_in_range(INT65(8), INT65(11)), INT65(8));
}

// The short answer never says that a bit is unknown which the long one knows.
TEST_F(Algebra, TheLowestBitIsUnknownToTheLongAnswerToo) {
    SYMTAB* xs = symbol("x", tp->int_t);
    std::vector<NODE*> trees{icon(1), icon(-2), name(xs), un(SCONV, icon(3), tp->long_t), bin(LT, name(xs), icon(4))};
    const size_t leaves = trees.size();
    for (size_t first = 0, behind = leaves; trees.size() < 2000; first = behind, behind = trees.size())
        for (size_t i = first; i < behind; ++i) {
            for (const int op : {UMINUS, NOTB}) trees.push_back(un(op, trees[i]));
            for (TYPE* to : {tp->uchar_t, tp->long_t, tp->bool_t}) trees.push_back(un(SCONV, trees[i], to));
            for (const int op : {PLUS, MINUS, XORB, ANDB, MULT, SLL})
                for (size_t k = 0; k < leaves; ++k) trees.push_back(bin(op, trees[i], trees[k], trees[i]->type));
        }
    int unknown = 0;
    for (const NODE* t : trees) {
        if (!lowest_bit_is_unknown(t)) continue;
        ++unknown;
        const KNOWN_BITS k = known_bits(t);
        ASSERT_FALSE((k.zeros | k.ones) & 1);
    }
    EXPECT_GT(unknown, 100);
}

// ---- A known value in place of a tree

TEST_F(Algebra, KnownValuesReplaceTrees) {
    SYMTAB *xs = symbol("x", tp->int_t), *ys = symbol("y", tp->int_t), *ps = symbol("p", tp->mk_ptr(tp->int_t));
    auto x = [&] { return name(xs); };
    auto y = [&] { return name(ys); };
    NODE* target = x();
    struct ROW {
        NODE* tree;
        const char* expected;
    } rows[] = {
        {bin(PLUS, x(), y()), "y + 7"},
        {bin(MULT, bin(PLUS, x(), icon(1)), y()), "y * 8"},
        {bin(LT, x(), icon(8)), "1"},
        {bin(ASG, y(), x(), tp->int_t), "y = 7"},
        {bin(ASG, x(), bin(PLUS, x(), icon(1)), tp->int_t), "x = 8"}, // the place stays
        {address(x()), "&x"},
        {bin(PLUS, y(), icon(1)), "y + 1"},
    };
    for (ROW& row : rows) {
        const std::string before = show(row.tree);
        row.tree = simp_subst_icon(INT65(7), tp->int_t, target, row.tree);
        EXPECT_EQ(tree_to_infix(row.tree), row.expected) << before;
        erase_tree(row.tree);
    }
    erase_tree(target);

    // Effects of what is replaced stay.
    NODE* call_target = call("f", tp->int_t);
    NODE* t = simp_subst_icon(INT65(3), tp->int_t, call_target, bin(PLUS, call("f", tp->int_t), y()));
    EXPECT_EQ(count_calls_in_tree(t), 1) << show(t);
    erase_tree(t);
    erase_tree(call_target);

    // A pointer found to be a plain number: the compare is of numbers.
    NODE* pointer = name(ps);
    t = simp_subst_icon(INT65(-5), tp->long_t, pointer, bin(ULT, name(ps), un(SCONV, y(), tp->long_t), tp->int_t));
    EXPECT_TRUE(t->op == LT || t->op == GT) << show(t);
    erase_tree(t);
    erase_tree(pointer);
}

} // namespace
