// The local that a function's result is built in gives way to the place that the caller wants it in.

#include "../ir/function_fixture.h"

#include "OPT5/scalar/lowering.h"

namespace {

class CsuTemp : public FunctionTest {
protected:
    void SetUp() override {
        FunctionTest::SetUp();
        pointer = local("hidden", tp->mk_ptr(pair()));
        result = local("result", pair());
        other = local("other", pair());
        taken = local("taken", tp->mk_ptr(pair()));
        flag = local("flag");
        currfuninfo->csu_return_sym = pointer;
    }
    static NODE* through(SYMTAB* p) { return maketree(UMULT, mk_NAME(p), nullptr, pair()); }
    void copy(SYMTAB* from) { add(maketree(STASG, through(pointer), mk_NAME(from), pair())); }
    void set_member() {
        fkMDATA* m = pair()->mdata();
        NODE* field = new_node(FIELD, m->type);
        field->mk_field(1, m, pair());
        add(mk_ASG(maketree(STDOT, mk_NAME(result), field, m->type), mk_ICON(INT65(1), tp->int_t)));
        add(mk_ASG(mk_NAME(taken), maketree(UAND, mk_NAME(result), nullptr, tp->mk_ptr(pair()))));
    }
    // Two paths to the end, which return `a` and `b`.
    void two_paths(SYMTAB* a, SYMTAB* b) {
        set_member();
        branch_if(flag, 1, 2);
        define(1);
        copy(a);
        go(3);
        define(2);
        copy(b);
        go(3);
        define(3);
        add(maketree(URETURN, mk_NAME(currfunc), nullptr, tp->void_t));
    }
    std::string run() {
        build();
        sym_split(currfuninfo);
        subst_csu_returning_temp_for_local_var();
        return statements();
    }
    bool stays() { return symbol_in_list(result, currfuninfo->memory_syms); }

    SYMTAB *pointer, *result, *other, *taken, *flag;
};

TEST_F(CsuTemp, EveryPathCopiesIt) {
    two_paths(result, result);
    const std::string text = run();
    EXPECT_EQ(text.find("result"), std::string::npos) << text;
    EXPECT_NE(text.find("taken = hidden;"), std::string::npos) << text;
    EXPECT_EQ(text.find("*hidden = "), std::string::npos) << text;
    EXPECT_FALSE(stays());
}

TEST_F(CsuTemp, AnotherPathCopiesAnother) {
    two_paths(result, other);
    run();
    EXPECT_TRUE(stays());
}

TEST_F(CsuTemp, ThePlaceIsUsedOtherwise) {
    add(maketree(STASG, mk_NAME(other), through(pointer), pair()));
    two_paths(result, result);
    run();
    EXPECT_TRUE(stays());
}

} // namespace
