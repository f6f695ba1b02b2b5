// Promises of trip counts and facts of loops in their normal forms, on records made by hand.
#include "../ir/function_fixture.h"
#include "../simp/expression_parser.h"

#include "IFILE/pragma.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/ir/statements.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

namespace {

using namespace test_trees;
using WORDS = std::vector<std::string>;

const std::string NO_BOUND = "18446744073709551615";

class Promises : public Trees {
protected:
    void SetUp() override {
        static const bool once = (init_BIF_descriptors(), init_simplifier(), install_loop_callbacks(), true);
        (void)once;
        loop.parent = &root;
        loop.test = ILLOP;
    }
    NODE* pragma(int kind, const WORDS& args) { return set_PPRAGMA_tree_info(nullptr, kind, args); }
    static WORDS args_of(const NODE* t) { return t->pragma->args; }
    WORDS facts_after(const WORDS& asserted) {
        for (const std::string& text : asserted) add_loop_body_assertion(parser.parse(text), &loop);
        WORDS facts;
        for (NODE* t : loop.givens) {
            facts.push_back(tree_to_infix(t));
            erase_tree(t);
        }
        loop.givens.clear();
        return facts;
    }
    void set_counts(INT65 min, INT65 max, INT65 factor) {
        for (auto [field, v] :
             {std::make_pair(&loop.minTrips, min), {&loop.maxTrips, max}, {&loop.tripFactor, factor}}) {
            erase_tree(*field);
            *field = mk_ICON(v, tp->ullong_t);
        }
    }

    struct LOOP root, loop;
    EXPRESSION_PARSER parser;
};

TEST_F(Promises, MustIterateHasANormalForm) {
    const struct {
        WORDS stated, normal;
    } rows[] = {
        {{}, {"0", NO_BOUND, "1"}},
        {{"", "", ""}, {"0", NO_BOUND, "1"}},
        {{"0", "0", "0"}, {"0", NO_BOUND, "1"}},
        {{"-3", "-1", "-2"}, {"0", NO_BOUND, "1"}},
        {{"10", "20", "4"}, {"12", "20", "4"}},
        {{"5", "17", "4"}, {"8", "16", "4"}},
        {{"8", "8", "8"}, {"8", "8", "8"}},
        {{"0", "101", "2"}, {"0", "100", "2"}},
        {{"1", "", "4"}, {"4", NO_BOUND, "4"}},
        {{"5", "7", "4"}, {"5", "7", "1"}},
        {{"9", "3", "2"}, {"0", "0", "1"}},
        {{"3", "99999999999999999999", ""}, {"3", NO_BOUND, "1"}},
    };
    for (const auto& row : rows) {
        NODE* t = pragma(PRG_MUST_ITERATE, row.stated);
        validate_MUST_ITERATE_pragma(t);
        EXPECT_EQ(args_of(t), row.normal);
        erase_tree(t);
    }
}

TEST_F(Promises, FurtherPragmasOfAKind) {
    const struct {
        int kind;
        WORDS near, far, both;
    } rows[] = {
        {PRG_MUST_ITERATE, {"2", "100", "4"}, {"10", "50", "6"}, {"12", "48", "12"}},
        {PRG_PROB_ITERATE, {"2", "100"}, {"10", "50"}, {"10", "50"}},
        {PRG_UNROLL, {"2"}, {"4"}, {"4"}},
        {PRG_UNROLL_AMOUNT, {"2"}, {"4"}, {"2"}},
        {PRG_SRC_LOOP, {"a.c:5", "i", "9", "for"}, {"3", "", "4", "do"}, {"a.c:5", "i", "9", "for"}},
    };
    NODE* LOOP::*fields[] = {&LOOP::mustIterate, &LOOP::probIterate, &LOOP::unrollPragma, &LOOP::unrollAmountPragma,
                             &LOOP::sourceLoopPragma};
    size_t n = 0;
    for (const auto& row : rows) {
        take_loop_pragma(pragma(row.kind, row.near), &loop);
        take_loop_pragma(pragma(row.kind, row.far), &loop);
        EXPECT_EQ(args_of(loop.*fields[n++]), row.both);
    }
    EXPECT_EQ(loop.sourceStart.file, "a.c");
    EXPECT_EQ(loop.sourceEnd.line, 9);
    EXPECT_EQ(loop.unrollAmount, 2);
}

TEST_F(Promises, OfACopiedBody) {
    take_loop_pragma(pragma(PRG_MUST_ITERATE, {"10", "20", "4"}), &loop);
    loop.mustIterate->pragma->args = {"10", "20", "4"};
    update_pragmas_for_loop(&loop, 3);
    EXPECT_EQ(args_of(loop.mustIterate), (WORDS{"3", "6", "1"}));
    EXPECT_EQ(args_of(loop.unrollAmountPragma), WORDS{"3"});
}

TEST_F(Promises, AreMadeOfWhatIsProved) {
    set_counts(INT65(4), INT65(100), INT65(4));
    loop.flags = LOOP_early_exit;
    try_to_make_MUST_ITERATE_pragma(&loop);
    EXPECT_EQ(args_of(loop.mustIterate), (WORDS{"", "100", ""}));
    // The promise counts what happens; the formula counts on behind the exit.
    loop.mustIterate->pragma->args = {"4", "50", "4"};
    loop.trips = parser.parse("l");
    loop.RC_syms.insert(loop.trips->u.sym);
    reconcile_MUST_ITERATE_pragma(&loop);
    EXPECT_EQ(args_of(loop.mustIterate), (WORDS{"4", "48", "4"}));
    EXPECT_TRUE(loop.givens.empty());
}

TEST_F(Promises, AreAssertedOfTheCount) {
    const struct {
        WORDS stated, facts;
    } rows[] = {
        {{"1", "16777216", "1"}, {}},
        {{"2", "16777215", "1"}, {"l >= 2L", "l <= 16777215L"}},
        {{"4", "", "4"}, {"l % 4L == 0L", "l >= 4L"}},
    };
    loop.trips = parser.parse("l");
    loop.RC_syms.insert(loop.trips->u.sym);
    for (const auto& row : rows) {
        set_counts(INT65(0), no_trip_bound(), INT65(1));
        erase_tree(loop.mustIterate);
        loop.mustIterate = pragma(PRG_MUST_ITERATE, row.stated);
        reconcile_MUST_ITERATE_pragma(&loop);
        EXPECT_EQ(facts_after({}), row.facts) << row.stated[1];
    }
}

TEST_F(Promises, FactsHaveANormalForm) {
    const struct {
        WORDS asserted, facts;
    } rows[] = {
        {{"x > 3 && y < 5"}, {"x > 3", "y < 5"}},
        {{"(x > 3 && y < 5 && z) != 0"}, {"x > 3", "y < 5", "z"}},
        {{"5 < x"}, {"x > 5"}},
        {{"(x & 7) == 0"}, {"x % 8 == 0"}},
        {{"(x & 6) == 0"}, {"(x & 6) == 0"}},
        {{"!(x % 4)"}, {"x % 4 == 0"}},
        {{"(x < y) == 0"}, {"x >= y"}},
        {{"(x < y) != 1"}, {"x >= y"}},
        {{"(x >> 2) >= 3"}, {"x >= 12"}},
        {{"(x >> 2) > 3"}, {"x >= 16"}},
        {{"(x >> 2) <= 3"}, {"x < 16"}},
        {{"(x >> 2) == 3"}, {"x >> 2 == 3"}},
        {{"(x >> 4) < 3000"}, {"x >> 4 < 3000"}}, // does not fit
        {{"(unsigned)x - 7u < 3u"}, {"x >= 7", "x <= 9"}},
        {{"x % 4 == 0", "x % 6 == 0"}, {"x % 12 == 0"}},
        {{"x % 12 == 0", "(x & 3) == 0"}, {"x % 12 == 0"}},
        {{"x > 5", "x > 3"}, {"x > 5"}},
        {{"x > 3", "x > 5"}, {"x > 5"}},
        {{"f() > 3"}, {}},
        {{"1"}, {}},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(facts_after(row.asserted), row.facts) << row.asserted[0];
    }
}

// ---- Into the text and back

class LoopPragmas : public FunctionTest {
protected:
    void SetUp() override {
        FunctionTest::SetUp();
        static const bool once = (init_BIF_descriptors(), init_simplifier(), true);
        (void)once;
        SYMTAB* c = local("c");
        assign(c, 1);
        define(1);
        assign(c, 2);
        branch_if(c, 1, 2);
        define(2);
        ret(c);
        build();
    }
    // The kinds ahead of the loop, in order, each with its first argument; flags are the hierarchy's own.
    static std::vector<std::pair<int, std::string>> pragmas() {
        std::vector<std::pair<int, std::string>> found;
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest)
                if (s->first->op == PPRAGMA && s->first->pragma->kind != PRG_LOOP_FLAGS)
                    found.emplace_back(s->first->pragma->kind, get_PPRAGMA_tree_arg(s->first, 0));
        return found;
    }
    static void put(int kind, const WORDS& args) { // the last ahead of the loop
        LIST** link = &currfuninfo->bb_list->statements;
        while ((*link)->rest) link = &(*link)->rest;
        insert_before(link, set_PPRAGMA_tree_info(nullptr, kind, args), nullptr);
    }
};

TEST_F(LoopPragmas, ComeOutOnceInTheirOrder) {
    const int order[] = {125, 124, 123, 112, 66,  67, 65, 64, 63, 56, 68, 41,
                         38,  37,  39,  40,  121, 80, 60, 60, 42, 43, 44};
    std::vector<std::pair<int, std::string>> want;
    for (int kind : order) want.emplace_back(kind, std::to_string(1000 + want.size()));
    want[11].second = "7"; // a line
    want[14].second = "3";
    for (size_t i = want.size(); i > 0; --i)
        if (want[i - 1].first != 60) put(want[i - 1].first, {want[i - 1].second});
    for (const auto& [kind, arg] : want)
        if (kind == 60) put(kind, {arg});
    for (int n = 0; n < 2; ++n) {
        build_loop_hierarchy(false, false, false, 1);
        ASSERT_NE(loop_root(), nullptr);
        EXPECT_TRUE(pragmas().empty());
        unbuild_loop_hierarchy();
        EXPECT_EQ(pragmas(), want);
    }
}

TEST_F(LoopPragmas, OfALoopThatIsGone) {
    put(PRG_SRC_LOOP, {"1", "", "1", "for"});
    put(PRG_MUST_ITERATE, {"7", "7", "1"});
    put(PRG_SRC_LOOP, {"2", "", "2", "for"});
    put(PRG_MUST_ITERATE, {"3", "9", "3"});
    build_loop_hierarchy(false, false, false, 1);
    struct LOOP* loop = nullptr;
    for_each_subloop(loop_root(), [&loop](struct LOOP* l) { loop = l; });
    ASSERT_NE(loop, nullptr);
    EXPECT_EQ(loop->mustIterate->pragma->args, (WORDS{"3", "9", "3"}));
    EXPECT_EQ(loop->sourceStart.line, 2);
    delete_pragmas_for_loop(loop);
    EXPECT_EQ(loop->mustIterate, nullptr);
    EXPECT_EQ(loop->sourceLoopPragma, nullptr);
    EXPECT_TRUE(pragmas().empty());
}

TEST_F(LoopPragmas, LoopsAreMoreThanAHalfWordCounts) {
    build_loop_hierarchy(false, false, false, 1);
    assign_loop_numbers(loop_root(), 65535);
    for_each_subloop(loop_root(), [](struct LOOP* l) { EXPECT_EQ(l->uid, 65536); });
    unbuild_loop_hierarchy();
}

} // namespace
