// Conversions between integers of all widths and floats, at values where truncation and rounding show.
#include <zrun.h>

static const float floats[] = {0.0F,        0.5F,          -0.5F,          0.99999994F,   1.5F,       -1.5F,
                               255.75F,     32767.0F,      -32768.0F,      32766.9F,      8388607.5F, 16777216.0F,
                               16777218.0F, 2147483520.0F, -2147483648.0F, 4294967040.0F, 1.0e18F};

static void from_float(float f) {
    if (f > -32769.0F && f < 32768.0F) put_i16((int)f);
    if (f > -1.0F && f < 65536.0F) put_u32((unsigned)f);
    if (f >= -2147483648.0F && f < 2147483648.0F) put_i32((long)f);
    if (f > -1.0F && f < 4294967296.0F) put_u32((unsigned long)f);
    put_i64((long long)f);
    put_f64((long double)f);
}

static void from_long(long v) {
    put_f32((float)v);
    put_f64((long double)v);
    put_f32((float)(unsigned long)v);
    put_f32((float)(int)(v & 0x7FFFL));
    put_f32((float)(unsigned)v);
}

static void from_wide(long long v) {
    put_f32((float)v);
    put_f64((long double)v);
    put_f64((long double)(unsigned long long)v);
    put_i32((long)(float)(v % 1000000LL));
}

static long mixed(int i, unsigned u, long l, float f) {
    long r = 0;
    r += (long)(i + f);
    r += (long)(u * f);
    r = r * 2 + (i < u);
    r = r * 2 + (i < l);
    r = r * 2 + ((unsigned long)l < u);
    r = r * 2 + (f == i);
    r = r * 2 + (f != 0);
    r = r * 2 + !f;
    return r;
}

int main(void) {
    static const long longs[] = {0L,        1L,         -1L,       16777215L,   16777217L,
                                 16777219L, -16777217L, 33554434L, 2147483647L, -2147483647L - 1};
    static const long long wides[] = {
        0LL, 9007199254740993LL, -9007199254740993LL, 9223372036854775807LL, 36028797018963969LL, -1LL};
    unsigned i;
    float f = 3.75F;
    int k = 10;
    for (i = 0; i < sizeof floats / sizeof floats[0]; i++) from_float(floats[i]);
    for (i = 0; i < sizeof longs / sizeof longs[0]; i++) from_long(longs[i]);
    for (i = 0; i < sizeof wides / sizeof wides[0]; i++) from_wide(wides[i]);
    put_i32(mixed(-1, 1u, 65536L, 2.5F));
    put_i32(mixed(7, 65535u, -1L, 7.0F));
    put_i32(mixed(0, 0u, 0L, 0.0F));
    k += f;
    put_i16(k);
    k *= 1.5F;
    put_i16(k);
    k -= 0.5F;
    put_i16(k);
    f += k;
    f /= 4;
    put_f32(f);
    f = 1 / 2 + 1 / 2.0F;
    put_f32(f);
    put_f32((float)0.1L);
    put_f64((long double)0.1F);
    put_f32((float)1.00000005960464477539L);
    put_f32((float)1.000000178813934L);
    return 0;
}
