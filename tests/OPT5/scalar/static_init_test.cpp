// Stores of a static initializer that become initial values, and those that must stay.

#include "../ir/function_fixture.h"

#include "OPT5/alias/alias.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/simp/simp.h"

namespace {

class StaticInit : public FunctionTest {
protected:
    static void SetUpTestSuite() {
        FunctionTest::SetUpTestSuite();
        init_simplifier();
    }
    void SetUp() override {
        init_symbols();
        begin("__sti__file");
        file_symbols_are_known = true;
    }
    void TearDown() override {
        reset_alias_info();
        for (SYMTAB* s : made) delete s;
        global_symbols = nullptr;
        file_symbols_are_known = false;
        FunctionTest::TearDown();
    }
    SYMTAB* global(const char* name, TYPE* type = tp->int_t, unsigned cqual = CQ_REFERENCED | CQ_WRITTEN,
                   int sclass = SC_STATIC) {
        SYMTAB* s = make_symbol(name, type, sclass, 0);
        s->cqual = static_cast<uint16_t>(cqual);
        s->index = static_cast<int32_t>(made.size());
        sym_def(s);
        made.push_back(s);
        return s;
    }
    static NODE* element(SYMTAB* array, long n) {
        TYPE* pointer = tp->mk_ptr(array->type->raw_elem_type());
        NODE* start = maketree(UAND, mk_NAME(array), nullptr, pointer);
        NODE* at = n ? maketree(PLUS, start, mk_ICON(INT65(n), tp->long_t), pointer) : start;
        return maketree(UMULT, at, nullptr, array->type->raw_elem_type());
    }
    void call() {
        SYMTAB* f = global("_f", function_type());
        f->sclass = SC_EXTERN;
        add(maketree(UCALL, maketree(UAND, mk_NAME(f), nullptr, tp->mk_ptr(f->type)), nullptr, tp->int_t));
    }
    void run() {
        add(maketree(URETURN, mk_NAME(currfunc), nullptr, tp->void_t));
        build();
        convert_sti_to_cinit();
    }
    static std::string items(const SYMTAB* s) {
        std::string all;
        if (!s->autoinit) return "none";
        for (const NODE* t : *s->autoinit) all += t->op == ENDINIT ? "." : tree_to_infix(t) + " ";
        return all;
    }

    std::vector<SYMTAB*> made;
};

TEST_F(StaticInit, ConstantsAheadOfEverythingElse) {
    SYMTAB *a = global("a"), *wide = global("w", tp->long_t), *v = global("v", tp->mk_array(tp->int_t, false, 4, true));
    SYMTAB *p = global("p", tp->mk_ptr(tp->int_t)), *f = global("f", tp->mk_array(tp->float_t, false, 2, true));
    a->dynamic_init = true;
    wide->autoinit = new std::vector<NODE*>{icon(0, tp->long_t), new_node(ENDINIT, tp->int_t)};
    v->autoinit = new std::vector<NODE*>{new_node(ENDINIT, tp->int_t)};
    add(mk_ASG(mk_NAME(a), icon(5)));
    add(mk_ASG(element(v, 2), icon(7)));
    add(mk_ASG(mk_NAME(p), maketree(UAND, mk_NAME(a), nullptr, p->type)));
    add(mk_ASG(mk_NAME(wide), icon(-1, tp->long_t)));
    NODE* half = new_node(FCON, tp->float_t);
    half->mk_fcon("0.5");
    add(mk_ASG(element(f, 2), half));
    add(mk_ASG(mk_NAME(wide), icon(9, tp->long_t)));
    call();
    add(mk_ASG(element(v, 1), icon(8)));
    run();
    EXPECT_EQ(items(a), "5 .");
    EXPECT_FALSE(a->dynamic_init);
    EXPECT_EQ(items(v), "0 0 7 0 .");
    EXPECT_EQ(items(p), "&a .");
    EXPECT_EQ(items(wide), "9L .");
    EXPECT_EQ(items(f), "0.0 0.5 .");
    EXPECT_EQ(f->autoinit->front()->op, FCON);
    EXPECT_EQ(statements().find("_f()"), 0u) << statements();
    EXPECT_NE(statements().find("8"), std::string::npos);
}

TEST_F(StaticInit, WhatStays) {
    SYMTAB *read = global("read"), *reached = global("reached", tp->int_t, CQ_REFERENCED | CQ_WRITTEN | CQ_ALIASED);
    SYMTAB *given = global("given"), *outside = global("outside", tp->int_t, CQ_WRITTEN, SC_EXTDEF), *x = local("x");
    SYMTAB *port = global("port", tp->mk_qual(tp->int_t, QUAL_VOLATILE)), *q = local("q", tp->mk_ptr(tp->int_t));
    SYMTAB* late = global("late");
    given->autoinit = new std::vector<NODE*>{icon(3), new_node(ENDINIT, tp->int_t)};
    add(mk_ASG(mk_NAME(x), mk_NAME(read)));
    add(mk_ASG(maketree(UMULT, mk_NAME(q), nullptr, tp->int_t), icon(2)));
    for (SYMTAB* s : {read, reached, given, outside, port}) add(mk_ASG(mk_NAME(s), icon(1)));
    add(mk_ASG(mk_NAME(late), mk_NAME(x)));
    add(mk_ASG(mk_NAME(late), icon(4)));
    run();
    for (SYMTAB* s : {read, reached, outside, port, late}) EXPECT_EQ(items(s), "none") << s->name;
    EXPECT_EQ(items(given), "3 .");
}

TEST_F(StaticInit, OnlyThatFunctionAndOnlyOnce) {
    SYMTAB *a = global("a"), *caller = global("caller", function_type());
    CALLEE edge{currfuninfo, 1, nullptr};
    make_FUNINFO(caller)->callees = &edge;
    add(mk_ASG(mk_NAME(a), icon(5)));
    run();
    make_FUNINFO(caller)->callees = nullptr;
    EXPECT_EQ(items(a), "none");
}

} // namespace
