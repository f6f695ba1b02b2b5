// Loops that the repeat instruction runs best are not unrolled.
#include "OPT5/dd/unrolling_veto.h"

#include "../ir/tree_builder.h"

#include "OPT5/target/target.h"

#include <map>
#include <string>
#include <vector>

using namespace test_trees;

namespace {

class UnrollingVeto : public Trees {
protected:
    void SetUp() override {
        start();
        float_support = 0;
    }
    void TearDown() override { float_support = 0; }

    static NODE* variable(const std::string& n, TYPE* type) {
        static std::map<std::string, SYMTAB*> all;
        SYMTAB*& s = all[n];
        if (!s) s = symbol(n.c_str(), type);
        return name(s);
    }
    static NODE* i() { return variable("i", tp->int_t); }
    static NODE* acc() { return variable("acc", tp->long_t); }
    static NODE* f() { return variable("f", tp->float_t); }
    static NODE* at(const char* p, TYPE* type) { return un(UMULT, variable(p, tp->mk_ptr(type)), type); }
    static NODE* p() { return at("p", tp->int_t); }
    static NODE* q() { return at("q", tp->int_t); }
    static NODE* fp() { return at("fp", tp->float_t); }
    static NODE* fq() { return at("fq", tp->float_t); }
    static NODE* asg(NODE* to, NODE* v) { return bin(ASG, to, v, to->type); }
    static NODE* call(const char* n, NODE* a, NODE* b) { return mk_ICALL(n, bin(COMMA, a, b, tp->int_t), tp->int_t); }
    static NODE* mac(int op = PLUSASG) {
        return bin(op, acc(), bin(MULT, at("lp", tp->long_t), at("lq", tp->long_t), tp->long_t), tp->long_t);
    }
    static NODE* mask(NODE* v) { return bin(ANDB, v, i(), tp->int_t); }

    static bool is_OK(const std::vector<NODE*>& body, bool single = true) {
        LIST* list = nullptr;
        for (auto t = body.rbegin(); t != body.rend(); ++t) list = mkelist(*t, list, nullptr);
        const bool ok = loop_is_OK_for_unrolling_on_target<ZELKOVA>()(list, single);
        erase_tree_list(list);
        return ok;
    }
};

TEST_F(UnrollingVeto, MultiplyAccumulates) {
    EXPECT_FALSE(is_OK({mac()}));
    EXPECT_FALSE(is_OK({mac(MINUSASG)}, false));
    EXPECT_FALSE(is_OK({mac(), asg(i(), mask(i()))}));
    EXPECT_TRUE(is_OK({mac(), mac()}));
    EXPECT_TRUE(is_OK({mac(), asg(p(), i())}));
    EXPECT_FALSE(is_OK({mk_MCALL("__dmac", acc(), tp->void_t)}));
    EXPECT_TRUE(is_OK({mk_MCALL("__dmac", acc(), tp->void_t)}, false));
    // A floating-point square is no multiply-accumulate, and one operation; two are too many.
    EXPECT_FALSE(is_OK({bin(PLUSASG, f(), bin(MULT, fp(), fq(), tp->float_t), tp->float_t)}));
    EXPECT_TRUE(is_OK({bin(PLUSASG, f(), bin(MULT, fp(), fp(), tp->float_t), tp->float_t)}));
    EXPECT_FALSE(is_OK({asg(fp(), bin(PLUS, fq(), f(), tp->float_t))}));
    EXPECT_TRUE(is_OK({asg(f(), bin(PLUS, fq(), f(), tp->float_t))}));
}

TEST_F(UnrollingVeto, StoresAndBits) {
    EXPECT_FALSE(is_OK({asg(p(), icon(0))})); // what the repeat instruction fills
    EXPECT_TRUE(is_OK({asg(p(), icon(0))}, false));
    EXPECT_TRUE(is_OK({asg(p(), icon(0)), asg(q(), icon(1))}));
    EXPECT_FALSE(is_OK({asg(p(), q())}));
    EXPECT_TRUE(is_OK({asg(p(), q()), asg(p(), i())}));
    float_support = 10;
    EXPECT_FALSE(is_OK({asg(p(), q()), asg(p(), i())}));
    EXPECT_FALSE(is_OK({asg(i(), mask(mask(mask(i()))))}));
    EXPECT_TRUE(is_OK({asg(i(), mask(mask(mask(i()))))}, false));
    float_support = 0;
    EXPECT_TRUE(is_OK({asg(i(), mask(mask(mask(i()))))}));
    EXPECT_FALSE(is_OK({asg(i(), mask(mask(mask(mask(i())))))}, false));
    EXPECT_FALSE(is_OK({asg(i(), call("__max", i(), p()))}));
    EXPECT_TRUE(is_OK({asg(i(), call("__sat", i(), p()))}));
}

} // namespace
