// Pairs of lvalues: each rule where it tells two apart, and its neighbour where it must not.

#include "alias_fixture.h"

#include "OPT5/ir/loop_callbacks.h"

namespace {

using Pairs = AliasTest;

TEST_F(Pairs, NamesAndMembers) {
    SYMTAB *x = local("x"), *y = local("y"), *s = local("s", pair());
    analyze();
    expect_meet(name(x), name(x));
    expect_apart(name(x), name(y));
    expect_apart(member(name(s), 0), member(name(s), 1));
    expect_meet(member(name(s), 1), member(name(s), 1));
    expect_meet(member(name(s), 0), name(s));
    expect_apart(member(name(s), 0), name(x));
    EXPECT_TRUE(object_symbols_may_alias(nullptr, x));
    x->lives_in_others = y->hosts_others = true;
    expect_meet(name(x), name(y));
}

TEST_F(Pairs, DeclarationAndDefinitionAreOneObject) {
    SYMTAB *decl = global("_g", tp->int_t, SC_EXTERN), *def = global("_g", tp->int_t, SC_EXTDEF);
    SYMTAB* other = global("_h", tp->int_t, SC_EXTERN);
    analyze();
    expect_meet(name(decl), name(def));
    expect_apart(name(other), name(def));
}

TEST_F(Pairs, ElementsOfArrays) {
    SYMTAB *a = local("a", array(tp->int_t, 10)), *b = local("b", array(tp->int_t, 10));
    SYMTAB *i = local("i"), *j = local("j"), *u = local("u", tp->uint_t);
    SYMTAB* wide = local("w", array(tp->long_t, 10));
    analyze();
    auto at = [&](SYMTAB* array, NODE* index) { return deref(sum(start_of(array), index)); };
    auto widened = [&](NODE* t) { return maketree(SCONV, t, nullptr, tp->long_t); };
    expect_apart(at(a, name(i)), at(b, name(i)));
    expect_apart(at(a, icon(3)), at(a, icon(4)));
    expect_meet(at(a, icon(3)), at(a, icon(3)));
    expect_meet(at(a, name(i)), at(a, name(j)));
    expect_meet(at(a, name(i)), name(a));
    expect_apart(at(a, name(i)), at(a, sum(name(i), icon(1))));
    expect_apart(at(a, widened(sum(name(i), icon(2)))), at(a, widened(name(i))));
    expect_apart(at(a, times(name(i), 2)), at(a, sum(times(name(j), 2), icon(1))));
    expect_meet(at(a, times(name(i), 2)), at(a, sum(times(name(j), 3), icon(1))));
    // An unsigned sum wraps before it is widened.
    auto unsigned_next = [&] { return maketree(PLUS, name(u), mk_ICON(INT65(1), tp->uint_t), tp->uint_t); };
    expect_meet(at(a, widened(unsigned_next())), at(a, widened(name(u))));
    // 32-bit accesses one unit apart overlap.
    expect_meet(at(wide, icon(2)), at(wide, icon(3)));
    expect_apart(at(wide, icon(2)), at(wide, icon(4)));
}

TEST_F(Pairs, AnObjectWithoutAnAddressIsReachedByNoPointer) {
    SYMTAB *hidden = local("h"), *shown = local("s"), *q = local("q", ptr(tp->int_t));
    SYMTAB *kept = global("k", tp->int_t, SC_STATIC, CQ_REFERENCED), *given = global("g", tp->int_t);
    add(call_of(function("_unknown"), address(name(shown))));
    set(q, maketree(UCALL, address(name(function("_maker"))), nullptr, ptr(tp->int_t)));
    analyze();
    expect_apart(name(hidden), deref(name(q)));
    expect_apart(name(kept), deref(name(q)));
    expect_meet(name(shown), deref(name(q)));
    expect_meet(name(given), deref(name(q)));
    // What the marks say is worth nothing before they are set.
    reset_alias_info();
    expect_meet(name(hidden), deref(name(q)));
    file_symbols_are_known = false;
    init_aliasing_info(true);
    expect_meet(name(kept), deref(name(q)));
}

TEST_F(Pairs, PointersWithOneObject) {
    SYMTAB *a = local("a", array(tp->int_t, 10)), *b = local("b", array(tp->int_t, 10));
    SYMTAB *p = local("p", ptr(tp->int_t)), *step = local("r", ptr(tp->int_t)), *both = local("t", ptr(tp->int_t));
    SYMTAB *derived = local("d", ptr(tp->int_t)), *taken = local("v", ptr(tp->int_t)), *i = local("i");
    set(p, sum(start_of(a), icon(2)));
    set(step, start_of(a));
    add(maketree(PLUSASG, name(step), icon(1), step->type));
    set(both, start_of(a));
    set(both, start_of(b));
    set(derived, sum(name(step), name(i)));
    set(taken, start_of(b));
    add(call_of(function("_unknown"), address(name(taken))));
    analyze();
    auto at = [&](SYMTAB* array, long n) { return deref(sum(start_of(array), icon(n))); };
    expect_meet(deref(name(p)), at(a, 2));
    expect_apart(deref(name(p)), at(a, 3));
    expect_apart(deref(name(p)), at(b, 2));
    expect_meet(deref(name(step)), at(a, 3));
    expect_apart(deref(name(step)), at(b, 3));
    expect_meet(deref(name(derived)), at(a, 7));
    expect_apart(deref(name(derived)), at(b, 7));
    expect_meet(deref(name(both)), at(a, 0));
    expect_meet(deref(name(both)), at(b, 0));
    expect_meet(deref(name(taken)), at(a, 0)); // its address was given away
    EXPECT_TRUE(currfuninfo->spmap->is_precise(p));
    EXPECT_EQ(currfuninfo->spmap->object(step), a);
    EXPECT_FALSE(currfuninfo->spmap->is_bound(both));
}

TEST_F(Pairs, ParametersDoNotPointToAutomaticObjects) {
    SYMTAB *x = local("x"), *fixed = parameter("p", ptr(tp->int_t)), *moved = parameter("q", ptr(tp->int_t));
    SYMTAB *stepped = parameter("r", ptr(tp->int_t)), *derived = local("d", ptr(tp->int_t)),
           *g = global("g", tp->int_t);
    add(call_of(function("_unknown"), address(name(x))));
    set(moved, address(name(x)));
    add(maketree(PLUSASG, name(stepped), icon(1), stepped->type));
    set(derived, sum(name(fixed), icon(3)));
    analyze();
    for (SYMTAB* p : {fixed, stepped, derived}) expect_apart(deref(name(p)), name(x));
    expect_meet(deref(name(moved)), name(x));
    expect_meet(deref(name(fixed)), name(g));
    expect_meet(deref(name(fixed)), deref(name(stepped)));
    pointer_args_are_disjoint = 1;
    expect_apart(deref(name(fixed)), deref(name(stepped)));
    expect_meet(deref(name(fixed)), deref(name(derived)));
    expect_meet(deref(name(fixed)), deref(name(moved)));
    pointer_args_are_disjoint = 0;
}

TEST_F(Pairs, OffsetsFromOnePointer) {
    SYMTAB *p = parameter("p", ptr(tp->int_t)), *q = parameter("q", ptr(tp->int_t)), *i = local("i");
    SYMTAB* pp = parameter("pp", ptr(ptr(tp->int_t)));
    analyze();
    expect_apart(deref(name(p)), deref(sum(name(p), icon(1))));
    expect_meet(deref(name(p)), deref(sum(name(q), icon(1))));
    expect_apart(deref(sum(name(p), name(i))), deref(sum(sum(name(p), name(i)), icon(1))));
    expect_meet(deref(sum(name(p), name(i))), deref(sum(name(p), icon(1))));
    expect_apart(deref(deref(name(pp))), deref(sum(deref(name(pp)), icon(2))));
    // In different iterations nothing is known of a base unless it stays.
    NODE *first = keep(deref(name(p))), *second = keep(deref(sum(name(p), icon(1))));
    auto* loop = reinterpret_cast<struct LOOP*>(&first);
    EXPECT_TRUE(lvalues_may_be_aliased(first, second, loop));
    loop_callbacks.is_constant_in = [](const NODE*, const struct LOOP*) { return true; };
    EXPECT_FALSE(lvalues_may_be_aliased(first, second, loop));
    loop_callbacks = {};
}

TEST_F(Pairs, AbsoluteAddresses) {
    SYMTAB *x = local("x", tp->long_t), *placed = global("g", tp->long_t, SC_EXTERN);
    add(call_of(function("_unknown"), address(name(x))));
    analyze();
    auto at = [](long a) { return deref(maketree(PCONV, mk_ICON(INT65(a), tp->long_t), nullptr, ptr(tp->long_t))); };
    expect_apart(at(0x7000), at(0x7004));
    expect_apart(at(0x7000), at(0x7002)); // 32 bits are two units
    expect_meet(at(0x7000), at(0x7001));
    expect_apart(at(0x7000), name(x));
    expect_meet(at(0x7000), name(placed));
}

TEST_F(Pairs, VolatileAccessesKeepTheirOrder) {
    TYPE* port = tp->mk_qual(tp->int_t, QUAL_VOLATILE);
    SYMTAB *a = global("a", port), *b = global("b", port), *plain = local("x"), *p = parameter("p", ptr(port));
    SYMTAB* reached = global("g", tp->int_t);
    add(call_of(function("_unknown"), address(name(plain))));
    analyze();
    expect_meet(name(a), name(b));
    expect_meet(name(a), deref(name(p)));
    expect_meet(deref(name(p)), name(reached)); // a plain object may be accessed as a volatile one
    expect_apart(name(a), name(plain));
}

// A pointer of a loop's body is another one in the next turn.
TEST_F(Pairs, RestrictOfAnInnerBlock) {
    TYPE* sole = tp->mk_qual(ptr(tp->int_t), QUAL_RESTRICT);
    SYMTAB *outer = parameter("o", sole), *x = parameter("x", ptr(tp->int_t)), *y = parameter("y", ptr(tp->int_t));
    LS::open(nullptr, currfunc, 0);
    SYMTAB* inner = local("p", sole);
    SYMTAB* stale = local("d", ptr(tp->int_t));
    set(inner, sum(name(x), icon(1)));
    set(stale, name(inner));
    analyze();
    NODE *p = keep(deref(name(inner))), *q = keep(deref(name(y))), *o = keep(deref(name(outer)));
    auto* loop = reinterpret_cast<struct LOOP*>(&p);
    EXPECT_FALSE(lvalues_may_be_aliased(p, q));
    EXPECT_TRUE(lvalues_may_be_aliased(p, q, loop));
    EXPECT_FALSE(lvalues_may_be_aliased(o, q, loop));
    EXPECT_TRUE(lvalues_may_be_aliased(keep(deref(name(stale))), q)) << "derived in an earlier iteration";
    LS::close(nullptr, currfunc, 0);
}

TEST_F(Pairs, Restrict) {
    TYPE* sole = tp->mk_qual(ptr(tp->int_t), QUAL_RESTRICT);
    SYMTAB *p = parameter("p", sole), *q = parameter("q", ptr(tp->int_t)), *g = global("g", tp->int_t);
    SYMTAB *from_p = local("d", ptr(tp->int_t)), *mixed = local("m", ptr(tp->int_t)),
           *loaded = local("l", ptr(tp->int_t));
    SYMTAB *moved = parameter("r", sole), *pp = parameter("pp", ptr(ptr(tp->int_t)));
    set(from_p, sum(name(p), icon(1)));
    set(mixed, name(p));
    set(mixed, name(q));
    set(loaded, deref(name(pp)));
    set(moved, name(q));
    analyze();
    auto at = [](SYMTAB* pointer) { return deref(name(pointer)); };
    expect_apart(at(p), at(q));
    expect_apart(at(p), name(g));
    expect_meet(at(p), at(from_p));
    expect_apart(at(q), at(from_p));
    expect_meet(at(q), at(mixed));
    expect_meet(at(p), at(mixed));
    expect_meet(at(p), at(loaded));
    expect_meet(at(moved), at(q)); // it does not keep the value that it came with
    NODE *outside = keep(at(p)), *other = keep(at(q));
    outside->ls = nullptr;
    EXPECT_TRUE(lvalues_may_be_aliased(outside, other)) << "its scope is not known";
}

} // namespace
