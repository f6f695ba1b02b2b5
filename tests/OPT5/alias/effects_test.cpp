// Which objects are marked as reachable, and what statements and calls do to others.

#include "alias_fixture.h"

#include "BITVEC/bitvec.h"
#include "OPT5/alias/effects.h"

namespace {

using Marks = AliasTest;
using Effects = AliasTest;

TEST_F(Marks, AddressesThatAreTaken) {
    SYMTAB *scalar = local("x"), *indexed = local("a", array(tp->int_t, 4)), *passed = local("b", array(tp->int_t, 4));
    SYMTAB *chosen = local("c", array(tp->int_t, 4)), *structure = local("s", pair()),
           *element = local("e", array(tp->int_t, 4));
    SYMTAB *member_only = local("m", pair()), *i = local("i"), *p = local("p", ptr(tp->int_t)), *cleaned = local("z");
    SYMTAB* nowhere = local("n", array(tp->int_t, 4));
    SYMTAB* f = function("_f");
    auto use = [&](NODE* t) { set(i, t); };
    set(p, address(name(scalar)));
    use(deref(sum(start_of(indexed), name(i))));
    add(call_of(f, start_of(passed)));
    NODE* arms = maketree(COLON, start_of(chosen), name(p), ptr(tp->int_t));
    use(deref(maketree(QUEST, name(i), arms, ptr(tp->int_t))));
    use(deref(maketree(PCONV, address(name(structure)), nullptr, ptr(tp->int_t))));
    add(call_of(f, address(deref(sum(start_of(element), name(i))))));
    use(member(name(member_only), 0));
    use(deref(maketree(PCONV, maketree(SCONV, start_of(nowhere), nullptr, tp->long_t), nullptr, ptr(tp->int_t))));
    currfuninfo->eht.resize(2);
    currfuninfo->eht[1].cleanup = call_of(f, address(name(cleaned)));
    analyze();
    for (SYMTAB* s : {scalar, passed, chosen, structure, element, nowhere, cleaned})
        EXPECT_TRUE(s->is_aliased()) << s->name;
    for (SYMTAB* s : {indexed, member_only, i, p}) EXPECT_FALSE(s->is_aliased()) << s->name;
}

TEST_F(Effects, OfStatements) {
    SYMTAB *x = local("x"), *y = local("y"), *i = local("i"), *a = local("a", array(tp->int_t, 4)),
           *q = parameter("q", ptr(tp->int_t));
    SYMTAB* g = global("g", tp->int_t);
    analyze();
    auto element = [&](NODE* index) { return deref(sum(start_of(a), index)); };
    struct {
        NODE *statement, *tree;
        bool expected;
    } cases[] = {
        {mk_ASG(name(x), icon(1)), sum(name(x), icon(1)), true},
        {mk_ASG(name(x), icon(1)), sum(name(y), icon(1)), false},
        {mk_ASG(name(x), icon(1)), address(name(x)), false},
        {mk_ASG(name(i), icon(1)), element(name(i)), true}, // where it lies
        {mk_ASG(name(i), icon(1)), address(element(name(i))), true},
        {mk_ASG(element(icon(1)), icon(1)), element(name(i)), true},
        {mk_ASG(element(icon(1)), icon(1)), element(icon(2)), false},
        {mk_ASG(deref(name(q)), icon(1)), name(g), true},
        {mk_ASG(deref(name(q)), icon(1)), name(x), false},
        {mk_ASG(name(y), maketree(PLUSASG, name(x), icon(1), tp->int_t)), name(x), true},
        {maketree(PLUSPLUS, name(x), icon(1), tp->int_t), name(x), true},
        {maketree(NASSERT, maketree(EQ, name(x), icon(1), tp->int_t), nullptr, tp->int_t), name(x), false},
        {mk_ASM(36, " nop"), name(g), true},
        {mk_ASM(36, " nop"), name(x), false},
        {mk_ASM(36, "; note"), name(g), false},
    };
    for (const auto& c : cases) {
        keep(c.statement);
        keep(c.tree);
        EXPECT_EQ(tree_modifies_lvalue_in_tree(c.statement, c.tree), c.expected) << text(c.statement, c.tree);
    }
    NODE *reader = keep(mk_ASG(name(y), element(icon(1)))), *one = keep(element(icon(1))),
         *two = keep(element(icon(2)));
    EXPECT_TRUE(tree_touches_lvalue(reader, one));
    EXPECT_FALSE(tree_touches_lvalue(reader, two));
    EXPECT_FALSE(tree_modifies_lvalue(reader, one));
}

TEST_F(Effects, OfCalls) {
    SYMTAB *hidden = local("h"), *shown = local("s"), *g = global("g", tp->int_t),
           *kept = global("k", tp->int_t, SC_STATIC, CQ_REFERENCED);
    SYMTAB *fixed = global("c", tp->mk_qual(tp->int_t, QUAL_CONST)), *q = parameter("q", ptr(tp->int_t));
    SYMTAB* unknown = function("_unknown");
    SYMTAB* pure = function("_pure", FUN_is_pure_fun);
    SYMTAB* no_global = function("_local", FUN_no_global_asg);
    SYMTAB* no_pointer = function("_direct", FUN_no_ind_asg | FUN_no_byref_asg);
    SYMTAB* library = function("_lib", FUN_is_SYSTEM | FUN_no_global_asg | FUN_no_global_use);
    add(call_of(unknown, address(name(shown))));
    analyze();
    struct {
        SYMTAB* callee;
        bool gives_address;
        bool hidden, shown, g, kept, through_q; // may be changed
    } cases[] = {
        {unknown, false, false, true, true, true, true},    {pure, true, false, false, false, false, false},
        {no_global, false, false, true, true, false, true}, {no_pointer, true, false, false, true, true, true},
        {library, false, false, false, false, false, true}, {library, true, false, true, false, false, true},
    };
    for (const auto& c : cases) {
        NODE* call = keep(call_of(c.callee, c.gives_address ? address(name(shown)) : nullptr));
        const std::string what = c.callee->name;
        EXPECT_EQ(call_may_modify(call, keep(name(hidden))), c.hidden) << what;
        EXPECT_EQ(call_may_modify(call, keep(name(shown))), c.shown) << what;
        EXPECT_EQ(call_may_modify(call, keep(name(g))), c.g) << what;
        EXPECT_EQ(call_may_modify(call, keep(name(kept))), c.kept) << what;
        EXPECT_EQ(call_may_modify(call, keep(deref(name(q)))), c.through_q) << what;
        EXPECT_FALSE(call_may_modify(call, keep(name(fixed)))) << what;
    }
    EXPECT_TRUE(call_may_read(keep(call_of(no_global)), keep(name(g))));
    EXPECT_FALSE(call_may_read(keep(call_of(library)), keep(name(g))));
}

TEST_F(Effects, FactsThatEnd) {
    SYMTAB *x = local("x"), *shown = local("s"), *g = global("g", tp->int_t), *q = parameter("q", ptr(tp->int_t));
    SYMTAB *r = parameter("r", ptr(tp->int_t)), *f = function("_f");
    add(call_of(f, address(name(shown))));
    analyze();
    const std::vector<const NODE*> facts = {keep(name(x)),
                                            keep(name(shown)),
                                            keep(name(g)),
                                            keep(deref(name(q))),
                                            keep(sum(deref(name(r)), name(x))),
                                            keep(maketree(NASSERT, name(x), nullptr, tp->int_t))};
    compute_alias_sets(facts);
    auto left = [&](auto kill) {
        BITVEC set(static_cast<uint32_t>(facts.size()));
        set.set_all();
        kill(&set);
        std::string bits;
        for (uint32_t i = 0; i < facts.size(); ++i) bits += set.test(i) ? '1' : '.';
        return bits;
    };
    EXPECT_EQ(left([&](BITVEC* s) { kill_aliases_of_lvalue(keep(name(x)), s); }), ".111..");
    EXPECT_EQ(left([&](BITVEC* s) { kill_aliases_of_lvalue(keep(name(g)), s); }), "11...1");
    EXPECT_EQ(left([&](BITVEC* s) { kill_aliases_of_lvalue(keep(deref(name(q))), s); }), "11...1");
    EXPECT_EQ(left([&](BITVEC* s) { kill_aliases_indirect(nullptr, nullptr, s); }), "1....1");
    EXPECT_EQ(left([&](BITVEC* s) { kill_aliases_on_call(keep(call_of(f)), s); }), "1....1");
    EXPECT_EQ(left([&](BITVEC* s) { kill_assertions(s); }), "11111.");
}

TEST_F(Effects, Alignment) {
    SYMTAB *p = local("p", ptr(tp->long_t)), *n = local("n", ptr(tp->int_t)), *i = local("i");
    SYMTAB* buffer = local("b", array(tp->int_t, 16));
    buffer->align = 64;
    analyze();
    auto at = [&](NODE* pointer) { return lvalue_alignment(keep(deref(pointer)), nullptr); };
    auto as_long = [](NODE* t) { return maketree(PCONV, t, nullptr, ptr(tp->long_t)); };
    auto unaligned = [](NODE* t) { return maketree(NONALIGN, t, nullptr, t->type); };
    EXPECT_EQ(at(name(p)), 32u);
    EXPECT_EQ(at(name(n)), 16u);
    EXPECT_EQ(at(start_of(buffer)), 64u);
    EXPECT_EQ(at(sum(start_of(buffer), icon(2))), 32u);
    EXPECT_EQ(at(sum(start_of(buffer), times(name(i), 4))), 64u);
    EXPECT_EQ(at(sum(start_of(buffer), times(name(i), 6))), 32u);
    EXPECT_EQ(at(sum(start_of(buffer), icon(1))), 16u);
    EXPECT_EQ(at(as_long(sum(start_of(buffer), icon(1)))), 32u) << "the type of the access says so";
    EXPECT_EQ(at(unaligned(as_long(sum(start_of(buffer), icon(1))))), 16u);
    EXPECT_EQ(at(unaligned(name(p))), 16u);
    EXPECT_EQ(nonaligned_pointee_alignment(keep(as_long(name(n))), nullptr), 16u);
    EXPECT_EQ(pointee_alignment(keep(as_long(name(n))), nullptr), 32u);
    SYMTAB* s = local("s", pair());
    EXPECT_EQ(lvalue_alignment(keep(member(name(s), 1)), nullptr), 32u);
}

} // namespace
