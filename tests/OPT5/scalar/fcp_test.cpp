// Constant and copy propagation on functions made by hand: what C programs do not reach.

#include "../ir/function_fixture.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/loop_callbacks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/simp/simp.h"

#include <string>

namespace {

class FcpTest : public FunctionTest {
protected:
    static void SetUpTestSuite() {
        FunctionTest::SetUpTestSuite();
        init_simplifier();
    }
    void TearDown() override {
        reset_alias_info();
        file_symbols_are_known = false;
        global_symbols = nullptr;
        FunctionTest::TearDown();
    }
    void set(SYMTAB* to, NODE* value) { add(maketree(ASG, mk_NAME(to), value, to->type)); }
    // A value that may be another one each time.
    NODE* fresh() {
        SYMTAB* f = make_symbol("_f", function_type(), SC_EXTERN, 0);
        return maketree(UCALL, maketree(UAND, mk_NAME(f), nullptr, tp->mk_ptr(f->type)), nullptr, tp->int_t);
    }
    static bool says(const std::string& part) { return statements().find(part) != std::string::npos; }
};

TEST_F(FcpTest, CleanUpCodeKeepsItsVariables) {
    SYMTAB *x = local("x"), *y = local("y"), *sum = local("s");
    set(x, icon(1));
    set(y, icon(2));
    set(sum, maketree(PLUS, mk_NAME(x), mk_NAME(y), tp->int_t));
    ret(sum);
    currfuninfo->eht.resize(2);
    currfuninfo->eht[1].cleanup = maketree(PLUS, mk_NAME(x), icon(1), tp->int_t);
    build();
    fast_CP(4, 0);
    EXPECT_TRUE(says("x = 1")) << statements();
    EXPECT_FALSE(says("y")) << statements();
    EXPECT_TRUE(valid());
}

TEST_F(FcpTest, TheExtentOfAnArrayKeepsItsVariable) {
    SYMTAB *n = local("n"), *a = local("a", tp->mk_array(tp->int_t, false, 1, true));
    a->size_tree = mk_NAME(n);
    set(n, icon(7));
    ret(n);
    build();
    fast_CP(4, 0);
    EXPECT_TRUE(says("n = 7")) << statements();
    erase_tree(a->size_tree);
    a->size_tree = nullptr;
}

TEST_F(FcpTest, AnEntryThatALoopReturnsToRunsMoreThanOnce) {
    SYMTAB *x = local("x"), *y = local("y"), *c = local("c");
    define(1);
    set(x, fresh());
    branch_if(c, 2, 3);
    define(2);
    set(y, mk_NAME(x));
    define(3);
    set(c, maketree(MINUS, mk_NAME(y), mk_NAME(x), tp->int_t));
    branch_if(c, 1, 4);
    define(4);
    ret(y);
    build();
    fast_CP(4, 0);
    EXPECT_TRUE(says("y = x")) << statements();
}

TEST_F(FcpTest, WhatRestrictSaysStaysWithItsVariable) {
    TYPE *pointer = tp->mk_ptr(tp->int_t), *sole = tp->mk_qual(pointer, QUAL_RESTRICT);
    SYMTAB *from = local("from", pointer), *own = local("own", sole), *fixed = local("fixed", sole), *x = local("x");
    SYMTAB* a = local("a", tp->mk_array(tp->int_t, false, 4, true));
    set(from, maketree(PCONV, fresh(), nullptr, pointer));
    set(own, mk_NAME(from));
    set(fixed, maketree(UAND, mk_NAME(a), nullptr, pointer));
    set(x, maketree(UMULT, mk_NAME(own), nullptr, tp->int_t));
    set(x, maketree(UMULT, mk_NAME(fixed), nullptr, tp->int_t));
    ret(x);
    build();
    fast_CP(4, 0);
    EXPECT_TRUE(says("x = *own")) << statements();
    EXPECT_FALSE(says("fixed")) << statements();
}

TEST_F(FcpTest, GlobalsThatNeverChange) {
    struct {
        const char* name;
        unsigned quals;
        int sclass;
        unsigned cqual;
        bool analyzed, replaced;
    } cases[] = {
        {"_constant", QUAL_CONST, SC_STATIC, CQ_REFERENCED | CQ_ALIASED | CQ_WRITTEN, false, true},
        {"_elsewhere", QUAL_CONST, SC_EXTERN, CQ_REFERENCED, true, false},
        {"_port", QUAL_CONST | QUAL_VOLATILE, SC_STATIC, CQ_REFERENCED, true, false},
        {"_unwritten", 0, SC_STATIC, CQ_REFERENCED, true, true},
        {"_unwritten", 0, SC_STATIC, CQ_REFERENCED, false, false},
        {"_written", 0, SC_STATIC, CQ_REFERENCED | CQ_WRITTEN, true, false},
        {"_aliased", 0, SC_STATIC, CQ_REFERENCED | CQ_ALIASED, true, false},
    };
    for (const auto& c : cases) {
        TYPE* type = c.quals ? tp->mk_qual(tp->int_t, c.quals) : tp->int_t;
        SYMTAB* g = make_symbol(c.name, type, c.sclass, 0);
        g->cqual = static_cast<uint16_t>(c.cqual);
        g->init_value = icon(42);
        file_symbols_are_known = c.analyzed;
        NODE* t = propagate_global_constants(maketree(PLUS, mk_NAME(g), icon(1), tp->int_t));
        EXPECT_EQ(t->left->op == ICON, c.replaced) << c.name << " " << c.analyzed;
        erase_tree(t);
        t = propagate_global_constants(mk_ASG(mk_NAME(g), address(g)));
        EXPECT_EQ(t->left->op, NAME) << "what is written is no value";
        EXPECT_EQ(t->right->left->op, NAME) << "nor is what has its address taken";
        erase_tree(t);
        delete g;
    }
}

// A step of a loop's counter goes where the value isn't read any more; what else is dead is left for later.
TEST_F(FcpTest, CountersLoseTheStepsThatNoOneReads) {
    SYMTAB *i = local("i"), *k = local("k"), *n = local("n");
    set(n, fresh());
    set(i, mk_NAME(n));
    set(k, mk_NAME(n));
    add(maketree(PLUSASG, mk_NAME(i), icon(1), tp->int_t));
    set(n, mk_NAME(i));
    add(maketree(PLUSASG, mk_NAME(i), icon(2), tp->int_t));
    add(maketree(PLUSASG, mk_NAME(k), icon(3), tp->int_t));
    ret(n);
    build();
    auto* loop = reinterpret_cast<struct LOOP*>(i);
    loop_callbacks.is_counter = [](const SYMTAB* sym, const struct LOOP* l) { return reinterpret_cast<const SYMTAB*>(l) == sym; };
    find_live_variables();
    elim_locally_dead_assignments_in_bb(currfuninfo->bb_list, loop);
    lva_cleanup();
    loop_callbacks = {};
    EXPECT_TRUE(says("i += 1") && says("k += 3")) << statements();
    EXPECT_FALSE(says("i += 2")) << statements();
    EXPECT_TRUE(valid());
}

} // namespace
