// Random pairs of accesses in a memory that is laid out for real: what is said to be apart must not overlap, whatever
// the variables hold.

#include "alias_fixture.h"

#include <random>
#include <unordered_map>

namespace {

class RandomPairs : public AliasTest {
protected:
    std::mt19937 random{20240607};
    int pick(int n) { return static_cast<int>(random() % static_cast<unsigned>(n)); }

    SYMTAB *a, *w, *s, *x, *i, *j, *u, *k, *p, *q, *r, *d, *t;
    std::unordered_map<const SYMTAB*, long> place; // of objects, in units
    std::unordered_map<const SYMTAB*, long> value; // of variables
    int unknowns = 0;

    void make_function() {
        a = local("a", array(tp->int_t, 40));
        w = local("w", array(tp->long_t, 20));
        s = local("s", array(pair(), 10));
        x = local("x", tp->long_t);
        i = local("i");
        j = local("j");
        u = local("u", tp->uint_t);
        k = local("k", tp->ulong_t);
        TYPE* pointer = ptr(tp->int_t);
        p = parameter("p", pointer);
        q = parameter("q", pointer);
        r = local("r", pointer); // &a[6]
        d = local("d", pointer); // somewhere in w
        t = local("t", pointer); // p and more
        set(r, sum(start_of(a), icon(6)));
        set(d, maketree(PCONV, sum(start_of(w), name(i)), nullptr, pointer));
        set(t, sum(name(p), icon(1)));
        set(t, sum(name(t), icon(2)));
        add(call_of(function("_unknown"), address(name(x))));
        analyze();
        long next = 1000;
        for (SYMTAB* object : {a, w, s, x}) {
            place[object] = next;
            next += static_cast<long>(object->size / 16);
        }
    }
    void give_values() {
        for (SYMTAB* v : {i, j}) value[v] = pick(13) - 4;
        value[u] = pick(4) ? pick(8) : 65535 - pick(3);
        value[k] =
            static_cast<long>(pick(2) ? uint32_t(pick(12)) : uint32_t(pick(40)) * 0xAAAAAAABu); // a third, wrapped
        value[p] = 5000 + pick(6);
        value[q] = 5000 + pick(6);
        value[r] = place[a] + 6;
        value[d] = place[w] + pick(30);
        value[t] = value[p] + (pick(2) ? 1 : 3);
    }

    NODE* index(int depth) {
        switch (depth ? pick(10) : pick(3)) {
        case 0: return icon(pick(9) - 2);
        case 1: return name(i);
        case 2: return name(j);
        case 3: return times(index(depth - 1), pick(5));
        case 4: return maketree(MINUS, index(depth - 1), index(depth - 1), tp->int_t);
        case 5: { // wraps
            NODE* wrapped = maketree(PLUS, name(u), mk_ICON(INT65(pick(4)), tp->uint_t), tp->uint_t);
            return maketree(SCONV, wrapped, nullptr, tp->long_t);
        }
        case 6: // wraps where an address does
        case 7: {
            TYPE* type = tp->ulong_t;
            NODE* product = maketree(MULT, name(k), mk_ICON(INT65(1 + pick(3)), type), type);
            return maketree(SCONV, maketree(PLUS, product, mk_ICON(INT65(pick(4)), type), type), nullptr, tp->long_t);
        }
        case 8: return maketree(SCONV, maketree(PLUS, name(i), icon(pick(3)), tp->int_t), nullptr, tp->long_t);
        default: return maketree(PLUS, index(depth - 1), index(depth - 1), tp->int_t);
        }
    }
    static NODE* as_long(NODE* t) { return t->type == tp->long_t ? t : maketree(SCONV, t, nullptr, tp->long_t); }
    // Operands of one type, as trees have them.
    NODE* uniform(NODE* t) {
        if (t->left) t->left = uniform(t->left);
        if (t->right) t->right = uniform(t->right);
        if ((t->op == PLUS || t->op == MINUS || t->op == MULT) && !t->type->is_pointer() && t->type != tp->uint_t &&
            (t->left->type == tp->long_t || t->right->type == tp->long_t)) {
            t->left = as_long(t->left);
            t->right = as_long(t->right);
            t->type = tp->long_t;
        }
        return t;
    }
    NODE* pointer(TYPE* pointee) {
        SYMTAB* const bases[] = {p, q, r, d, t};
        SYMTAB* const arrays[] = {a, w, s};
        NODE* base = pick(2) ? name(bases[pick(2) ? 0 : pick(5)]) : start_of(arrays[pick(3)]);
        NODE* sum = maketree(pick(5) ? PLUS : MINUS, base, uniform(index(2)), base->type);
        return maketree(PCONV, sum, nullptr, ptr(pointee));
    }
    NODE* access() {
        switch (pick(5)) {
        case 0: return name(x);
        case 1: return deref(pointer(tp->int_t));
        case 2: return deref(pointer(tp->long_t));
        case 3: return member(pointer(pair()), pick(2), STREF);
        default: return member(deref(pointer(pair())), pick(2));
        }
    }

    static long held(const TYPE* type, long v) {
        if (type == tp->uint_t) return v & 0xFFFF;
        return type == tp->long_t ? static_cast<int32_t>(v) : type == tp->ulong_t ? static_cast<uint32_t>(v) : v;
    }
    long eval(const NODE* n) {
        switch (n->op) {
        case ICON: return static_cast<long>(n->u.lval.fits_in<int64_t>());
        case NAME: return value.at(n->u.sym);
        case PLUS:
        case MINUS: {
            const long v = n->op == PLUS ? eval(n->left) + eval(n->right) : eval(n->left) - eval(n->right);
            return held(n->type, v);
        }
        case MULT: return held(n->type, eval(n->left) * eval(n->right));
        case SCONV:
        case PCONV: return held(n->type, eval(n->left));
        case UAND: return start(n->left);
        default: ADD_FAILURE() << opname(n->op); return 0;
        }
    }
    long start(const NODE* n) { // in units
        switch (n->op) {
        case NAME: return place.at(n->u.sym);
        case STDOT: return start(n->left) + n->right->mval->offset / 16;
        case STREF: return eval(n->left) + n->right->mval->offset / 16;
        default: return eval(n->left);
        }
    }
    // Pointers stay in the object that they were made from.
    bool stays(const NODE* n) {
        const long at = start(n), end = at + static_cast<long>(n->type->size / 16);
        const NODE* pointer = n->op == STDOT ? n->left->left : n->left;
        if (n->op == NAME) return true;
        const NODE* base = pointer_basis(pointer);
        const SYMTAB* object = base->op == UAND   ? base->left->u.sym
                               : base->u.sym == r ? a
                               : base->u.sym == d ? w
                                                  : nullptr;
        if (!object) return at > 4900 && end < 5200;
        return at >= place.at(object) && end <= place.at(object) + static_cast<long>(object->size / 16);
    }
};

TEST_F(RandomPairs, WhatIsSaidToBeApartDoesNotOverlap) {
    make_function();
    int apart = 0, overlapping = 0;
    for (int round = 0; round < 6000; ++round) {
        NODE *one = access(), *two = access();
        const bool may = lvalues_may_be_aliased(one, two, nullptr, false);
        apart += !may;
        for (int n = 0; n < 40; ++n) {
            give_values();
            if (!stays(one) || !stays(two)) continue;
            const long from = start(one), to = from + static_cast<long>(one->type->size / 16);
            const long from2 = start(two), to2 = from2 + static_cast<long>(two->type->size / 16);
            if (to <= from2 || to2 <= from) continue;
            ++overlapping;
            ASSERT_TRUE(may) << text(one, two) << " at " << from << " and " << from2;
        }
        erase_tree(one);
        erase_tree(two);
    }
    EXPECT_GT(apart, 1000);
    EXPECT_GT(overlapping, 2000);
}

} // namespace
