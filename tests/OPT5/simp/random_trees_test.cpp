// Random trees and exhaustive small ones through the simplifier: values and side effects stay.

#include "tools/treecheck/campaign.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/patterns.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

#include <gtest/gtest.h>

using namespace treecheck;

namespace {

OUTCOME run(const CAMPAIGN& c) {
    return run_campaign(c, [](const FINDING& f, uint64_t seed) {
        ADD_FAILURE() << "seed " << seed << " " << f.what << "\n  tree   " << f.before << "\n  result " << f.after
                      << "\n  with   " << f.contents;
    });
}

TEST(RandomTrees, KeepValuesAndEffects) {
    CAMPAIGN c;
    c.seed = 1000000;
    c.count = 85000;
    c.assignments = 10;
    EXPECT_GT(run(c).runs, c.count * 8) << "most trees do something defined";
}

TEST(RandomTrees, DeepOnesKeepValuesAndEffects) {
    CAMPAIGN c;
    c.seed = 2000000;
    c.count = 15000;
    c.assignments = 10;
    c.trees.depth = 7;
    run(c);
}

// ---- Every operator on every pair of boundary values

std::vector<INT65> boundaries(TYPE* t) {
    if (t->is_bool()) return {0, 1};
    const INT65 min = int_type_min(t), max = int_type_max(t);
    std::vector<INT65> out;
    for (INT65 v : {INT65(0), INT65(1), INT65(2), INT65(-1), min, max, max - INT65(1), (max >> INT65(1)) + INT65(1)})
        out.push_back(truncate_to_type(v, t));
    return out;
}

NODE* constant(INT65 v, TYPE* t) {
    NODE* n = mk_ICON(INT65(0), t);
    n->u.lval = v;
    return n;
}

void expect_kept(NODE* t) {
    for (const OPERATION& op : operations) {
        const FINDING f = TRIAL(t, 1, 8).check(op);
        EXPECT_FALSE(f) << f.what << "\n  tree   " << f.before << "\n  result " << f.after << "\n  with   "
                        << f.contents;
    }
    erase_tree(t);
}

// Both operands constant; one a variable that holds the boundary values; and each under a cast to every type.
TEST(RandomTrees, OperatorsOnBoundaries) {
    const WORLD& w = world();
    const int ops[] = {PLUS, MINUS, MULT, DIV, MOD, ANDB, ORB, XORB, SLL, SRL, EQ, NEQ, LE, LT, GE, GT};
    for (SYMTAB* x : w.integers) {
        TYPE* type = x->type;
        if (promoted_type(type) != type) continue;
        for (int op : ops)
            for (INT65 a : boundaries(type)) {
                const bool is_shift = op == SLL || op == SRL, compares = op_is_int_compare(op);
                const int own = op >= LE && compares && type->is_unsigned() ? op + (ULE - LE) : op;
                TYPE* result = compares ? tp->int_t : type;
                auto right = [&](INT65 b) {
                    return is_shift ? constant(INT65(b.value & (type->size - 1)), tp->int_t) : constant(b, type);
                };
                for (INT65 b : boundaries(type)) expect_kept(maketree(own, constant(a, type), right(b), result));
                expect_kept(maketree(own, mk_NAME(x), right(a), result));
                if (!is_shift) expect_kept(maketree(own, constant(a, type), mk_NAME(x), result));
            }
    }
}

// (x op1 c1) op2 c2, and with c2 on the left.
TEST(RandomTrees, PairsOfOperatorsWithBoundaries) {
    const int ops[] = {PLUS, MINUS, MULT, DIV, MOD, ANDB, ORB, XORB, SLL, SRL, EQ, LT, GE};
    auto is_shift = [](int op) { return op == SLL || op == SRL; };
    auto simplifies = [](NODE* t) {
        const FINDING f = TRIAL(t, 1, 8).check(operations[0]);
        EXPECT_FALSE(f) << f.what << "\n  tree   " << f.before << "\n  result " << f.after << "\n  with   "
                        << f.contents;
        erase_tree(t);
    };
    for (SYMTAB* x : world().integers) {
        TYPE* type = x->type;
        if (promoted_type(type) != type) continue;
        auto right = [&](int op, INT65 c) {
            return is_shift(op) ? constant(INT65(c.value & (type->size - 1)), tp->int_t) : constant(c, type);
        };
        for (int op1 : ops)
            for (int op2 : ops)
                for (INT65 c1 : boundaries(type))
                    for (INT65 c2 : boundaries(type)) {
                        if (op_is_int_compare(op1)) continue;
                        const bool compares = op_is_int_compare(op2);
                        const int own = op2 >= LE && compares && type->is_unsigned() ? op2 + (ULE - LE) : op2;
                        TYPE* result = compares ? tp->int_t : type;
                        auto inner = [&] { return maketree(op1, mk_NAME(x), right(op1, c1), type); };
                        simplifies(maketree(own, inner(), right(op2, c2), result));
                        if (!is_shift(op2)) simplifies(maketree(own, constant(c2, type), inner(), result));
                    }
    }
}

TEST(RandomTrees, CastsOfBoundaries) {
    const WORLD& w = world();
    for (SYMTAB* x : w.integers)
        for (TYPE* middle : w.integer_types)
            for (TYPE* to : w.integer_types) {
                for (INT65 v : boundaries(x->type))
                    expect_kept(maketree(SCONV, maketree(SCONV, constant(v, x->type), nullptr, middle), nullptr, to));
                expect_kept(maketree(SCONV, maketree(SCONV, mk_NAME(x), nullptr, middle), nullptr, to));
            }
}

// A conditional that computes both arms chooses a place as well as a value.
TEST(RandomTrees, ChosenPlacesStayPlaces) {
    const WORLD& w = world();
    TYPE* pointer = tp->mk_ptr(tp->int_t);
    auto place = [&] {
        auto address = [&](SYMTAB* s) { return maketree(UAND, mk_NAME(s), nullptr, pointer); };
        NODE* arms = maketree(COLON, address(w.addressed[0]), address(w.addressed[0]), pointer);
        NODE* test = maketree(NEQ, mk_NAME(w.integers[0]), constant(3, tp->int_t), tp->int_t);
        return maketree(UMULT, make_strict_ternary_ICALL(maketree(QUEST, test, arms, pointer)), nullptr, tp->int_t);
    };
    expect_kept(maketree(ASG, place(), constant(5, tp->int_t), tp->int_t));
    expect_kept(maketree(PLUSASG, place(), constant(5, tp->int_t), tp->int_t));
    expect_kept(maketree(UAND, place(), nullptr, pointer));
    expect_kept(place());
}

// ---- Rows of patterns
bool has_operands(const rules::TERM* t) {
    if (!t || t->kind != rules::TERM::OPERATOR) return t && t->kind == rules::TERM::OPERAND;
    return has_operands(t->left) || has_operands(t->right) || has_operands(t->third);
}

// What the executor's count of operations makes of a side; what constants compute is one.
int cost(const rules::TERM* t) {
    if (!t || t->kind != rules::TERM::OPERATOR || !has_operands(t)) return 0;
    const int own = t->op == DIV || t->op == MOD ? 16 : t->op == SCONV ? 0 : 1;
    return own + cost(t->left) + cost(t->right) + cost(t->third);
}

// Each row applies to trees made from its own left side, keeps their values, and costs no more than they do.
TEST(RandomTrees, RowsOfPatternsApplyAndKeepValues) {
    world();
    std::vector<uint64_t> hits(static_cast<std::size_t>(rules::pattern_rows()));
    rules::pattern_hits = hits.data();
    const std::vector<rules::PATTERN>& all = rules::all_patterns();
    TYPE* const types[] = {tp->int_t, tp->uint_t, tp->long_t, tp->ullong_t};
    for (std::size_t i = 0; i < all.size(); ++i) {
        EXPECT_LE(cost(all[i].right), cost(all[i].left)) << rules::pattern_row_text(all[i].row);
        GENERATOR_OPTIONS plain;
        plain.effects = false;
        const uint64_t& hit = hits[static_cast<std::size_t>(all[i].row)];
        const uint64_t before = hit;
        for (uint64_t seed = 0; hit == before && seed < 4000; ++seed) {
            GENERATOR make(seed, plain);
            expect_kept(insert_mandatory_casts(make.shape(types[seed % 4], 0, i)));
        }
    }
    for (std::size_t row = 0; row < hits.size(); ++row)
        EXPECT_GT(hits[row], 0u) << rules::pattern_row_text(static_cast<int>(row));
    rules::pattern_hits = nullptr;
}

// What only one arm of an inner conditional may compute is not computed for both.
TEST(RandomTrees, GuardedDivisionsStayGuarded) {
    const WORLD& w = world();
    auto x = [&] { return mk_NAME(w.integers[0]); };
    auto arms = [](NODE* a, NODE* b) { return maketree(COLON, a, b, tp->int_t); };
    auto guarded = [&] {
        return maketree(QUEST, x(), arms(maketree(DIV, constant(100, tp->int_t), x(), tp->int_t), x()), tp->int_t);
    };
    NODE* test = maketree(NEQ, mk_NAME(w.integers[1]), constant(3, tp->int_t), tp->int_t);
    expect_kept(make_strict_ternary_ICALL(maketree(QUEST, test, arms(guarded(), guarded()), tp->int_t)));
}

// The checker itself: what is wrong is seen.
TEST(RandomTrees, FaultsAreFound) {
    const WORLD& w = world();
    NODE* sum =
        maketree(PLUS, mk_NAME(w.integers[0]),
                 maketree(UCALL, maketree(UAND, mk_NAME(w.functions[0]), nullptr, tp->mk_ptr(w.functions[0]->type)),
                          nullptr, tp->int_t),
                 tp->int_t);
    const OPERATION faults[] = {
        {"value", nullptr,
         [](NODE* t, struct LOOP*) { return maketree(PLUS, t, mk_ICON(INT65(1), tp->int_t), tp->int_t); }, nullptr,
         true},
        {"type", nullptr, [](NODE* t, struct LOOP*) { return maketree(SCONV, t, nullptr, tp->uint_t); }, nullptr, true},
        {"effect lost", nullptr,
         [](NODE* t, struct LOOP*) {
             erase_tree(t);
             return mk_ICON(INT65(0), tp->int_t);
         },
         nullptr, false},
        {"effect twice", nullptr, [](NODE* t, struct LOOP*) { return mk_COMMAOP(copy_tree(t), t); }, nullptr, false},
        {"a store", nullptr,
         [](NODE* t, struct LOOP*) {
             return mk_COMMAOP(mk_ASG(mk_NAME(world().integers[2]), mk_ICON(INT65(77), tp->uint_t)), t);
         },
         nullptr, true},
        {"undefined", nullptr,
         [](NODE* t, struct LOOP*) { return maketree(DIV, t, mk_ICON(INT65(0), tp->int_t), tp->int_t); }, nullptr,
         true},
    };
    const TRIAL whole(sum, 5, 12);
    for (const OPERATION& op : faults) EXPECT_TRUE(whole.check(op)) << op.name;
    EXPECT_FALSE(whole.check({"same", nullptr, [](NODE* t, struct LOOP*) { return t; }, nullptr, true}));
    erase_tree(sum);
}

TEST(RandomTrees, FindingsAreCutDown) {
    GENERATOR make(77, {});
    NODE* big = make.value(tp->int_t, 6);
    big = maketree(PLUS, maketree(MULT, big, mk_NAME(world().integers[0]), tp->int_t), make.value(tp->int_t, 5),
                   tp->int_t);
    NODE* small = shrink(big, [](const NODE* t) { return tree_contains_op(t, MULT); });
    EXPECT_EQ(count_nodes_in_tree(small), 3) << tree_to_infix(small);
    erase_tree(small);
}

} // namespace
