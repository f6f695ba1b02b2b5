// Bit-fields and volatile objects.
// Prints: 42251 16 -3 1 1 -448576 1 -3 -2 -3 1 10 0 13107
#include <zrun.h>
struct R {
    volatile unsigned ctl;
    union {
        unsigned all;
        struct {
            unsigned en : 1, mode : 3, : 4, irq : 8;
        } bit;
    } st;
} regs;
#define R ((struct R*)&regs)
struct {
    int s : 3;
    unsigned u : 16;
    long w : 20;
    _Bool b : 1;
} f;
volatile int ticks;
static int reads(void) { return ticks++; }
int main(void) {
    R->st.bit.irq = 0x1A5;
    R->st.bit.mode = 5;
    R->st.bit.en = 1;
    put_u32(R->st.all);
    R->ctl |= 4;
    R->ctl <<= 2;
    put_i16(R->ctl);
    f.s = 5;
    put_i16(f.s);
    f.u = -1;
    put_i16(f.u > 0);
    put_i16(f.s - 4 < f.u);
    f.w = 600000;
    put_i32(f.w);
    f.b = 6;
    put_i16(f.b);
    put_i16(f.s++);
    put_i16(f.s);
    put_i16((f.s = 12) + 1);
    put_i16(-R->st.bit.mode < 0);
    reads();
    ticks;
    put_i16(reads() * 10);
    // A field narrower than int is an int, until a cast to its declared type makes it unsigned.
    put_i16((ticks - 3) / R->st.bit.mode);
    put_u32((ticks - 3) / (unsigned)R->st.bit.mode);
    return 0;
}
