// What types say of two accesses.

#include "alias_fixture.h"

namespace {

using Types = AliasTest;

TYPE* const_of(TYPE* t) { return tp->mk_qual(t, QUAL_CONST); }

TYPE* make_union(const char* name, TYPE* a, TYPE* b) {
    TYPE* t = tp->mk_union(name, 32, 32, false);
    auto* m = new fkMDATA("x", a, 0, 0, 0, false, false, false, false);
    m->next = new fkMDATA("y", b, 0, 0, 0, false, false, false, false);
    tp->set_mdata(t, m);
    tp->type_frozen(t);
    return t;
}

TEST_F(Types, Table) {
    TYPE *i = tp->int_t, *l = tp->long_t, *f = tp->float_t, *c = tp->schar_t, *uc = tp->uchar_t, *s = pair();
    TYPE* holder = make_union("holder", s, tp->llong_t);
    struct {
        TYPE *a, *b;
        bool exact_a, exact_b, expected;
    } cases[] = {
        {i, i, true, true, true},
        {i, l, true, true, false},
        {i, f, false, false, false},
        {f, tp->double_t, false, false, tp->double_t->size == f->size}, // which normalized trees do not tell apart
        {i, tp->uint_t, true, true, true}, // signed and unsigned
        {i, tp->short_t, true, true, false},
        {const_of(i), i, true, true, true},
        {array(i, 4), i, true, true, true},
        {array(i, 4), array(l, 4), true, true, false},
        {c, l, false, true, true}, // a character may be a part of anything
        {uc, f, false, true, true},
        {c, l, true, true, false}, // unless it is a variable of its own
        {make_union("fields", tp->ulong_t, i), tp->ulong_t, true, false, true}, // a part, whatever its sign
        {make_union("fields", tp->ulong_t, i), l, true, false, true},
        {ptr(i), ptr(i), true, true, true},
        {ptr(i), ptr(l), true, true, false},
        {ptr(const_of(i)), ptr(i), true, true, true},
        {ptr(tp->void_t), ptr(i), true, true, true},
        {ptr(i), l, true, true, false},
        {s, i, true, false, true},
        {s, l, true, true, true},
        {s, f, true, false, false},
        {s, f, false, false, true},
        {s, holder, true, true, true}, // a part of it
        {array(s, 3), l, true, false, true},
        {ptr(s), i, true, false, false},
    };
    for (const auto& k : cases) {
        EXPECT_EQ(types_may_be_aliased(k.a, k.exact_a, k.b, k.exact_b), k.expected)
            << k.a->printstr() << " " << k.b->printstr();
        EXPECT_EQ(types_may_be_aliased(k.b, k.exact_b, k.a, k.exact_a), k.expected)
            << k.b->printstr() << " " << k.a->printstr();
    }
    chars_alias_other_types = 0;
    EXPECT_FALSE(types_may_be_aliased(c, false, l, true));
}

TEST_F(Types, MembersOfOneUnion) {
    make_union("pun", tp->float_t, ptr(tp->llong_t));
    EXPECT_FALSE(types_may_be_aliased(tp->float_t, true, ptr(tp->llong_t), true)) << "no union was read";
    any_unions_in_program = true;
    EXPECT_TRUE(types_may_be_aliased(tp->float_t, true, ptr(tp->llong_t), true));
    EXPECT_FALSE(types_may_be_aliased(tp->float_t, true, ptr(ptr(tp->llong_t)), true));
}

TEST_F(Types, AccessesThroughPointers) {
    SYMTAB *pi = parameter("pi", ptr(tp->int_t)), *pl = parameter("pl", ptr(tp->long_t)),
           *pc = parameter("pc", ptr(tp->schar_t));
    SYMTAB *ps = parameter("ps", ptr(pair())), *pv = parameter("pv", ptr(tp->void_t)),
           *pf = parameter("pf", ptr(tp->float_t));
    analyze();
    // As the reader leaves them: characters and short integers are the same to the trees.
    pc->type = ptr(tp->schar_t)->normalized_type();
    pi->type = ptr(tp->int_t)->normalized_type();
    SYMTAB* temporary = sym_temp('P', -1, pi->type, nullptr);
    auto at = [](SYMTAB* p) { return deref(name(p)); };
    auto cast = [](SYMTAB* p, TYPE* to) { return deref(maketree(PCONV, name(p), nullptr, ptr(to))); };
    expect_apart(at(pi), at(pl));
    expect_apart(at(pf), at(pl));
    expect_meet(at(pc), at(pl));
    expect_meet(at(temporary), at(pl)); // what it was made from is not known
    expect_meet(cast(pl, tp->schar_t), at(pf));
    expect_meet(cast(pl, tp->int_t), at(pf)); // might have been a character
    expect_apart(member(name(ps), 1, STREF), at(pi));
    expect_meet(member(name(ps), 0, STREF), at(pi));
    expect_apart(member(name(ps), 0, STREF), at(pf));
    expect_meet(at(ps), at(pl));
    NODE *a = keep(at(pi)), *b = keep(at(pl));
    EXPECT_TRUE(lvalues_may_be_aliased(a, b, nullptr, false)) << "without the rule on types";
    (void)pv;
}

// What lies over each other in the variable that scopes share is accessed by both types in turn.
TEST_F(Types, SharedStack) {
    SYMTAB* shared = local("shared", make_union("shared", tp->long_t, tp->float_t));
    SYMTAB *l = local("l", ptr(tp->ulong_t)), *f = local("f", ptr(tp->float_t)), *w = local("w", ptr(tp->llong_t));
    add(call_of(function("_unknown"), address(name(shared))));
    analyze();
    EXPECT_FALSE(may_meet(deref(name(l)), deref(name(f))));
    currfuninfo->stack_union = shared;
    EXPECT_TRUE(may_meet(deref(name(l)), deref(name(f))));
    EXPECT_FALSE(may_meet(deref(name(l)), deref(name(w)))); // no part of it
    shared->set_is_aliased(false);
    EXPECT_FALSE(may_meet(deref(name(l)), deref(name(f))));
    currfuninfo->stack_union = nullptr;
}

} // namespace
