// Numbers seen through their units, with the high unit first in memory.
// parse: --opt --big_endian
// no crosscheck
#include <string.h>
#include <zrun.h>

union words {
    long l;
    unsigned u[2];
    float f;
};
union quad {
    long long ll;
    long l[2];
    unsigned u[4];
    long double d;
};

static const long constants[2] = {0x11112222L, -2};
static union words global = {0x00070009L};
static long shared = 0x12345678L;
static unsigned taken[8];

static int low_half(const long* p) { return ((const int*)p)[1]; }
static int high_half(const long* p) { return *(const int*)p; }
static int narrowed(const long* p) { return (int)*p; }       // the low half, wherever it lies
static int shifted(const long* p) { return (int)(*p >> 16); } // the high half

static long made(unsigned high, unsigned low) {
    union words w;
    w.u[0] = high;
    w.u[1] = low;
    return w.l;
}

static void quads(void) {
    union quad q;
    int i;
    q.ll = 0x0001000200030004LL;
    for (i = 0; i < 4; i++) put_i16(q.u[i]);
    q.l[1] = -1;
    put_i64(q.ll);
    q.u[0] = 0x8000;
    put_i64(q.ll);
    q.d = 1.0L;
    put_u32(q.u[0]);
    put_u32(q.u[3]);
}

static void copies(void) {
    long from[3] = {1, 0x20003L, -4}, to[3];
    int i;
    memcpy(to, from, sizeof to);
    memcpy(taken, from, sizeof from);
    for (i = 0; i < 3; i++) put_i32(to[i]);
    for (i = 0; i < 6; i++) put_u32(taken[i]);
}

int main(void) {
    union words w;
    long local = 0x00010002L;
    put_i16(high_half(&local));
    put_i16(low_half(&local));
    put_i16(narrowed(&local));
    put_i16(shifted(&local));
    put_i16(global.u[0]);
    put_i16(global.u[1]);
    put_u32(((const unsigned*)constants)[0]);
    put_u32(((const unsigned*)constants)[3]);
    put_i32(made(1, 2));
    w.f = 1.0f;
    put_u32(w.u[0]);
    put_u32(w.u[1]);
    w.u[0]++;
    put_i32(w.l);
    quads();
    copies();
    return 0;
}
