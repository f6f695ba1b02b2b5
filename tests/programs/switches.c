// Switches: dense, sparse, falling through, wide ranges, long values, duff's device.
#include <zrun.h>

static int dense(int v) {
    switch (v) {
    case 0: return 10;
    case 1: return 21;
    case 2: return 32;
    case 3:
    case 4: return 43;
    case 5: v += 2; break;
    case 7: v *= 2;
    case 8: v += 1; break;
    default: v = -v;
    }
    return v;
}

static int sparse(int v) {
    switch (v) {
    case -32767 - 1: return 1;
    case -1000: return 2;
    case -1: return 3;
    case 0: return 4;
    case 77: return 5;
    case 4096: return 6;
    case 32767: return 7;
    }
    return 0;
}

static int wide(long v) {
    switch (v) {
    case 0L: return 1;
    case 65536L: return 2;
    case -65536L: return 3;
    case 2147483647L: return 4;
    case -2147483647L - 1: return 5;
    case 65537L: return 6;
    default: return v > 0 ? 7 : 8;
    }
}

static void device(int* to, const int* from, int count) {
    int n = (count + 3) / 4;
    if (count <= 0) return;
    switch (count % 4) {
    case 0: do { *to++ = *from++;
        case 3: *to++ = *from++;
        case 2: *to++ = *from++;
        case 1: *to++ = *from++;
        } while (--n > 0);
    }
}

enum color { RED, GREEN = 5, BLUE };
static const char* name(enum color c) {
    switch (c) {
    case RED: return "red";
    case GREEN: return "green";
    case BLUE: return "blue";
    }
    return "none";
}

int main(void) {
    static const int keys[] = {-32767 - 1, -32767, -1000, -1, 0, 1, 77, 78, 4096, 32766, 32767};
    static const long longs[] = {0L, 65536L, -65536L, 65537L, 2147483647L, -2147483647L - 1, 1L, -1L};
    int from[9], to[9], i, n;
    for (i = -2; i < 11; i++) put_i16(dense(i));
    for (i = 0; i < 11; i++) put_i16(sparse(keys[i]));
    for (i = 0; i < 8; i++) put_i16(wide(longs[i]));
    for (n = 0; n < 10; n += 3) {
        int sum = 0;
        for (i = 0; i < 9; i++) from[i] = i + 1, to[i] = 0;
        device(to, from, n);
        for (i = 0; i < 9; i++) sum += to[i] * (i + 1);
        put_i16(sum);
    }
    put_str(name(GREEN));
    put_str(name(BLUE));
    put_str(name((enum color)3));
    return 0;
}
