// Infinities, not-a-numbers, signed zeros and subnormals of both precisions, through hidden operands.
#include <zrun.h>

union bits {
    float f;
    unsigned long u;
};

static volatile float zero = 0.0F, one = 1.0F, huge = 3.0e38F, tiny = 1.2e-38F;

static unsigned long image(float f) {
    union bits b;
    b.f = f;
    return b.u;
}

static void compare(float a, float b) {
    put_i16((a < b) | (a <= b) << 1 | (a > b) << 2 | (a >= b) << 3 | (a == b) << 4 | (a != b) << 5 | !(a < b) << 6 |
            !(a >= b) << 7);
}

static const char* kind(float f) {
    if (f != f) return "nan";
    if (f - f != f - f) return f > 0.0F ? "inf" : "-inf";
    if (f == 0.0F) return image(f) >> 31 ? "-0" : "0";
    return f < 1.17549435e-38F && f > -1.17549435e-38F ? "subnormal" : "normal";
}

static float pick(float a, float b) { return a < b ? a : b; }
static float pick_not(float a, float b) { return !(a >= b) ? a : b; }

int main(void) {
    float inf = huge * 10.0F, nan = inf - inf, minus_zero = -zero, sub = tiny / 16.0F;
    const float all[6] = {0.0F, 1.0F, -1.0F, inf, -inf, nan};
    long double dsub = 2.2250738585072014e-308L;
    int i, j;
    for (i = 0; i < 6; i++)
        for (j = 0; j < 6; j++) compare(all[i], all[j]);
    put_str(kind(inf));
    put_str(kind(-inf));
    put_str(kind(nan));
    put_str(kind(minus_zero));
    put_str(kind(zero));
    put_str(kind(sub));
    put_str(kind(one));
    put_str(kind(minus_zero + zero));
    put_str(kind(minus_zero - zero));
    put_str(kind(minus_zero * one));
    put_str(kind(zero * -one));
    put_str(kind(one / minus_zero));
    put_str(kind(one / inf));
    put_str(kind(-one / inf));
    put_str(kind(inf * zero));
    put_str(kind(inf + one));
    put_str(kind(inf - one - inf));
    put_str(kind(0.0F - zero));
    put_str(kind(-(zero - zero)));
    put_f32(pick(nan, one));
    put_f32(pick(one, nan) == one);
    put_f32(pick_not(one, nan));
    put_str(kind(pick_not(nan, one)));
    put_u32(image(sub));
    put_u32(image(sub / 2.0F + sub / 2.0F));
    put_u32(image(tiny - sub));
    put_u32(image(huge + 1.0e30F));
    put_u32(image(one + 5.9604645e-8F));
    put_u32(image(one + 5.9604652e-8F));
    put_u32(image(one / 3.0F));
    put_u32(image(minus_zero));
    dsub = dsub / 4.0L;
    put_i16(dsub > 0.0L);
    put_i16(dsub * 4.0L == 2.2250738585072014e-308L);
    put_i16(dsub / 1.0e300L == 0.0L);
    put_i16(minus_zero == zero);
    put_i16(nan == nan);
    put_i16(zero ? 1 : 2);
    put_i16(minus_zero ? 1 : 2);
    put_i16(nan ? 1 : 2);
    put_i16(!nan);
    put_i16(nan && one);
    return 0;
}
