// A structure that a call returns goes to the local that it is passed on to, if nothing else sees either.
// RUN: --opt_level=2 --debug:skip=ssa-rp-with-benign-loads+ssa-reg-promote+ssa-reg-promote-with-simpcfg
#include <zrun.h>

struct six {
    int a, b, c, d, e, f;
};
struct six g;
struct six *seen = &g;

struct six make(int x) {
    struct six r = {x, x + 1, x * x, seen->a, g.b, 9};
    return r;
}
int sum(const struct six *p) { return p->a + p->b + p->c + p->d + p->e + p->f; }

// FUNCTION: passed
// HAS: v =struct _make(x)
// COUNT 0: t =struct
int passed(int x) {
    struct six t, v;
    t = make(x);
    v = t;
    g = v;
    return v.a + v.c + v.f;
}

// The callee can see where its result goes, or the call names it, or the temporary is named again.
// FUNCTION: kept
// HAS: t =struct _make(x)
// HAS: v =struct t
// HAS: u =struct _make(x)
// HAS: w =struct u
// HAS: s =struct _make(w.c)
// HAS: w =struct s
int kept(int x) {
    struct six t, v, u, w = {1, 2, 3, x, 5, 6}, s;
    seen = &v;
    v.a = 50;
    t = make(x);
    v = t;
    u = make(w.d);
    w = u;
    s = make(w.c);
    w = s;
    return sum(&v) + w.a + w.d + s.b;
}

int main(void) {
    put_i16(passed(3));
    put_i16(kept(4));
    put_i16(g.c);
    return 0;
}
