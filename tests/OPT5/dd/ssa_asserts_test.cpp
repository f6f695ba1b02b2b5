// Assertions on copies, which no C program of the tests can state.
#include "../ir/function_fixture.h"

#include "OPT5/dd/ssa.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

namespace {

class AssertionsOnCopies : public FunctionTest {
protected:
    AssertionsOnCopies() {
        static const bool once = (init_BIF_descriptors(), init_simplifier(), true);
        (void)once;
    }
    void assert_positive(SYMTAB* sym) {
        add(maketree(NASSERT, maketree(GT, mk_NAME(sym), icon(0), tp->int_t), nullptr, tp->int_t));
        currfuninfo->has_nasserts = true;
    }
};

// n = 7; x = n; [n = 9;] NASSERT(x > 0); [NASSERT(n > 0);] return x, with n `const` or not.
TEST_F(AssertionsOnCopies, HoldOfWhatWasCopiedIfThatNeverChanges) {
    const struct {
        bool is_const, changes, is_known;
        int about_n; // assertions behind the pass
    } rows[] = {{true, false, false, 1}, {false, false, false, 0}, {true, true, false, 0}, {true, false, true, 1}};
    for (const auto& row : rows) {
        SYMTAB *n = local("n", row.is_const ? tp->mk_qual(tp->int_t, QUAL_CONST) : tp->int_t), *x = local("x");
        assign(n, 7);
        add(mk_ASG(mk_NAME(x), mk_NAME(n)));
        if (row.changes) assign(n, 9);
        assert_positive(x);
        if (row.is_known) assert_positive(n);
        ret(x);
        buildcfg();
        construct_SSA_form(false, false, false);
        ASSERT_TRUE(function_is_in_SSA_form);
        clone_SSA_NASSERTs();
        EXPECT_EQ(validate_SSA_form(), 0);
        deconstruct_SSA_form();
        int about_n = 0;
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest)
                about_n += s->first->op == NASSERT && sym_appears_in_tree(n, s->first);
        EXPECT_EQ(about_n, row.about_n) << statements();
        TearDown();
        SetUp();
    }
}

} // namespace
