// How far loops are unrolled.

#include "../ir/tree_builder.h"

#include "OPT5/target/accumulators.h"
#include "OPT5/target/target.h"

#include <map>
#include <vector>

using namespace test_trees;

namespace {

class Unrolling : public Trees {
protected:
    void SetUp() override {
        start();
        if (!file_options) file_options = new option_obj;
        set_goal(47);
        rtc_RPT_ok_for_loop = false;
    }
    void TearDown() override {
        set_goal(47);
        rtc_RPT_ok_for_loop = false;
    }
    // Goals 0 to 5 by the option's numbers.
    static void set_goal(int number) { file_options->setopt(option_obj::OO_size_speed_goal, number); }
    static constexpr int GOAL_3 = 45, GOAL_5 = 43;

    static NODE* i() { return variable("i", tp->int_t); }
    static NODE* x() { return variable("x", tp->int_t); }
    static NODE* l() { return variable("l", tp->long_t); }
    static NODE* p() { return variable("p", tp->mk_ptr(tp->int_t)); }
    static NODE* q() { return variable("q", tp->mk_ptr(tp->int_t)); }
    static NODE* variable(const char* n, TYPE* type) { return name(symbol_of(n, type)); }
    static SYMTAB* symbol_of(const std::string& n, TYPE* type) {
        static std::map<std::string, SYMTAB*> all;
        SYMTAB*& s = all[n];
        if (!s) s = symbol(n.c_str(), type);
        return s;
    }
    static NODE* asg(NODE* to, NODE* v) { return bin(ASG, to, v, to->type); }

    // Of a body of these statements and a branch; they are erased.
    static long factor(std::vector<NODE*> body, long count) {
        body.push_back(maketree(BRANCH, mk_LABELREF(1), nullptr, tp->int_t));
        LIST* list = nullptr;
        for (auto t = body.rbegin(); t != body.rend(); ++t) list = mkelist(*t, list, nullptr);
        const INT65 f = loop_unrolling_factor(list, INT65(count));
        erase_tree_list(list);
        return f.fits_in<int64_t>();
    }
    static std::vector<NODE*> cheap() { return {asg(x(), icon(7))}; } // of cost 3 and 3 nodes
};

TEST_F(Unrolling, CheapBodies) {
    const long rows[][2] = {{0, 1},  {1, 1},  {2, 2},  {3, 3},  {4, 4},  {6, 6},  {7, 1},  {8, 1},  {10, 2},
                            {12, 2}, {15, 3}, {18, 3}, {13, 1}, {25, 3}, {28, 2}, {23, 2}, {29, 2}, {21, 3}};
    for (auto [count, wanted] : rows) EXPECT_EQ(factor(cheap(), count), wanted) << count;
    set_goal(GOAL_3);
    EXPECT_EQ(factor(cheap(), 3), 3);
    EXPECT_EQ(factor(cheap(), 6), 1);
}

// 5 is cheap, 6 is not; what the walk does not know is dear.
TEST_F(Unrolling, CostsOfStatements) {
    auto costs_at_most_5 = [](NODE* t) { return factor({t}, 10) == 2; };
    auto costs_at_most_2 = [](NODE* t) { return factor({t, asg(x(), icon(1))}, 10) == 2; };
    EXPECT_TRUE(costs_at_most_2(asg(p(), bin(PLUS, p(), icon(1), p()->type)))); // a step costs 1
    EXPECT_FALSE(costs_at_most_2(asg(x(), icon(7))));
    EXPECT_TRUE(costs_at_most_5(asg(x(), i())));
    EXPECT_TRUE(costs_at_most_5(asg(x(), deref(p()))));
    EXPECT_TRUE(costs_at_most_5(asg(x(), deref(bin(PLUSPLUS, p(), icon(1), p()->type)))));
    EXPECT_TRUE(costs_at_most_5(asg(x(), bin(PLUS, i(), x()))));
    EXPECT_TRUE(costs_at_most_5(asg(deref(p()), bin(PLUS, deref(p()), icon(3)))));
    EXPECT_TRUE(costs_at_most_5(bin(PLUSASG, x(), i(), tp->int_t)));
    EXPECT_TRUE(costs_at_most_5(mk_ASM(47, "a note")));
    EXPECT_FALSE(costs_at_most_5(asg(x(), bin(PLUS, i(), icon(1)))));
    EXPECT_FALSE(costs_at_most_5(asg(x(), bin(XORB, x(), icon(1)))));
    EXPECT_FALSE(costs_at_most_5(asg(l(), icon(1, tp->long_t))));
    EXPECT_FALSE(costs_at_most_5(asg(name(symbol("g", tp->int_t, 0, SC_EXTDEF)), icon(1))));
    EXPECT_FALSE(costs_at_most_5(asg(name(symbol("v", tp->mk_qual(tp->int_t, QUAL_VOLATILE))), icon(1))));
}

TEST_F(Unrolling, BodiesForTheRepeatInstruction) {
    rtc_RPT_ok_for_loop = true;
    auto body = [](int nodes) { // a sum of that many nodes, of a cost that is not known
        NODE* sum = l();
        for (int n = 3; n < nodes; n += 2) sum = bin(XORB, sum, l());
        return std::vector<NODE*>{asg(l(), sum)};
    };
    EXPECT_EQ(factor(body(17), 32), 4);
    EXPECT_EQ(factor(body(63), 32), 2);
    EXPECT_EQ(factor(body(65), 32), 1);
    EXPECT_EQ(factor(body(17), 7), 7);  // no divisor up to a half, and few rounds
    EXPECT_EQ(factor(body(17), 11), 1); // none, downward
    EXPECT_EQ(factor(body(31), 35), 5);
    EXPECT_EQ(factor(body(17), 1999966), 2); // twice a large prime
    EXPECT_EQ(factor({}, 32), 1);
    set_goal(GOAL_5);
    EXPECT_EQ(factor(body(17), 11), 11);
}

TEST_F(Unrolling, LoopsThatStayAsTheyAre) {
    auto product = [] { return un(SCONV, bin(MULT, deref(p()), i()), tp->long_t); }; // for the accumulator l
    auto sum = [&] { return bin(PLUS, l(), product(), tp->long_t); };
    auto call_of = [](int op, const char* f) {
        return maketree(COMMAOP, op == ICALL ? mk_ICALL(f, i(), tp->int_t) : mk_MCALL(f, i(), tp->int_t), icon(0),
                        tp->int_t);
    };
    for (bool repeats : {false, true}) {
        rtc_RPT_ok_for_loop = repeats;
        EXPECT_EQ(factor({bin(PLUSASG, l(), product(), tp->long_t)}, 2), 1);
        EXPECT_EQ(factor({asg(l(), sum())}, 2), 1);
        EXPECT_EQ(factor({asg(deref(p()), deref(q()))}, 2), 1);
        EXPECT_EQ(factor({call_of(MCALL, "__dmac")}, 16), 1);
        EXPECT_EQ(factor({call_of(ICALL, "__IQmpy")}, 16), 1);
    }
    EXPECT_GT(factor({call_of(ICALL, "__dmac")}, 16), 1);                          // not of this kind
    EXPECT_EQ(factor({bin(PLUSASG, x(), bin(MULT, x(), i()), tp->int_t)}, 16), 8); // no accumulator
    EXPECT_EQ(factor({bin(PLUSASG, x(), i(), tp->int_t)}, 3), 3);
    EXPECT_EQ(factor({asg(x(), bin(DIV, x(), i()))}, 3), 1);
    EXPECT_EQ(factor({asg(x(), bin(DIV, x(), icon(0)))}, 3), 1);
    EXPECT_EQ(factor({asg(x(), bin(DIV, x(), icon(3)))}, 3), 3);
}

TEST_F(Unrolling, ProductsForTheAccumulator) {
    auto longs = [] { return deref(variable("lp", tp->mk_ptr(tp->long_t))); };
    auto quad = [](NODE* t) { return un(SCONV, t, tp->llong_t); };
    auto wide = [](NODE* t) { return un(SCONV, t, tp->long_t); };
    auto halves = [&] { return bin(MULT, wide(deref(p())), wide(i()), tp->long_t); };
    auto product = [&] { return bin(MULT, quad(longs()), quad(l()), tp->llong_t); };
    auto right = [](NODE* t, int n) { return bin(SRL, t, icon(n), t->type); };
    const struct {
        NODE* tree;
        bool plain, stripped; // without and with a product mode
    } rows[] = {
        {halves(), true, true},
        {right(halves(), 2), false, true},
        {right(halves(), 7), false, false},
        {bin(SLL, halves(), icon(1), tp->long_t), false, true},
        {bin(MULT, wide(x()), wide(i()), tp->long_t), false, false}, // nothing from memory
        {wide(bin(MULT, deref(p()), i(), tp->int_t)), true, true},
        {product(), true, true},
        {right(product(), 34), true, true}, // the high half, with or without a mode
        {right(product(), 39), true, true},
        {wide(product()), true, true},
        {bin(PLUS, l(), l(), tp->long_t), false, false},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(is_a_likely_mpy_for_zelkova_mac(row.tree, false), row.plain) << tree_to_infix(row.tree);
        EXPECT_EQ(is_a_likely_mpy_for_zelkova_mac(row.tree, true), row.stripped) << tree_to_infix(row.tree);
    }
    auto normal = [](NODE* t) {
        t = normalize_zelkova_accumulation(t);
        const std::string text = show(t);
        erase_tree(t);
        return text;
    };
    EXPECT_EQ(normal(asg(l(), bin(PLUS, halves(), l(), tp->long_t))), "l += (long)*p * (long)i");
    EXPECT_EQ(normal(asg(l(), bin(MINUS, l(), halves(), tp->long_t))), "l -= (long)*p * (long)i");
    EXPECT_EQ(normal(asg(l(), bin(MINUS, halves(), l(), tp->long_t))), "l = (long)*p * (long)i - l");
    EXPECT_EQ(normal(asg(x(), bin(PLUS, x(), i()))), "x = x + i");
    NODE* uses_itself = bin(PLUSASG, l(), bin(PLUS, halves(), l(), tp->long_t), tp->long_t);
    EXPECT_FALSE(has_a_likely_serial_zelkova_mac(uses_itself));
}

} // namespace
