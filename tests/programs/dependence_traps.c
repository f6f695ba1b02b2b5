// Loops whose iterations touch what others touch: what is told of them must hold in each run.
#include <zrun.h>

static int a[128], b[128], grid[12][12];
static short s[64];
static long sums[16];
static volatile int port, ports[8];

static void fill(void) {
    for (int i = 0; i < 128; i++) a[i] = 3 * i, b[i] = i * i % 31;
}
static long sum_of(const int* p, int n) {
    unsigned long sum = 0;
    while (n--) sum = sum * 3 + (unsigned)*p++;
    return sum;
}
// The last iteration alone meets the fixed element; so does the middle of two that cross.
static int ends(int n) {
    int sum = 0;
    for (int i = 0; i < 50; i++) a[i] = i + n, sum += a[49];
    for (int i = 0; i < 11; i++) a[i] = a[20 - i] + 1;
    for (int i = 0; i < n; i++) a[i] += a[n - 1 - i];
    for (int i = 0; i < 9; i++) b[i] = b[8 - i] + 1;
    return sum;
}
static void shifted(void) {
    for (int i = 0; i < 60; i++) a[i + 1] = a[i] + 1;
    for (int i = 0; i < 60; i++) b[i] = b[i + 1] + 1;
    for (int i = 0; i < 60; i++) a[i + 33] ^= b[i] + a[i];
    for (int i = 0; i < 20; i++) b[3 * i] = b[5 * i + 1] + 1;
    for (int i = 90; i > 3; i -= 3) a[i] = a[i - 6] + a[i + 4];
}
static void walked(int* p, int* q, int n) {
    for (; n--;) *p++ = *q++ + 1;
}
static void halves(long* l, int n) {
    unsigned short* u = (unsigned short*)l;
    for (int i = 0; i < n; i++) {
        l[i] += 1;
        ((unsigned char*)u)[2 * i + 1] = 3;
        ((unsigned char*)u)[2 * i + 2] = 4;
    }
}
static void nested(int n, int c, int m) {
    for (int i = 0; i + 1 < n; i++)
        for (int j = 0; j + 1 < n; j++) grid[i + 1][j] = grid[i][j + 1] + i;
    for (int i = 0; i < n; i++)
        for (int j = 0; j <= i; j++) grid[j][i - j] += grid[i][j] - b[i];
    for (int i = 0; i < n; i++)
        for (int j = 0; j < n; j++) sums[j] += b[i];
    int k = n;
    if (c) k = m;
    for (int i = 0; i < 40; i++) a[i + k] = a[i + n] + 1;
}
// What loads and stores meets itself in every iteration but its own; what is volatile in each.
static void repeated(int* p, int n, int c) {
    for (int i = 0; i < n; i++) *p += b[i] & 7, p[1] ^= a[i];
    for (int i = 0; i < n; i++) a[i] ^= 1, a[i + c] ^= 2;
    for (int i = 0; i < n; i++)
        for (int j = 0; j < n; j++) grid[j][c] += b[i] & 3, grid[i][j] ^= 1;
    for (int i = 0; i < n; i++) port ^= a[i], ports[i & 3] ^= port, a[i] = ports[1];
}
static void searched(void) { // tested on top, and left in the middle
    int i = 0, j = 20;
    while (i < j) {
        if (b[i] == 1000) break;
        int t = b[i];
        b[i++] = b[j];
        b[j--] = t;
    }
    b[(unsigned)a[3] % 16u] = i;
}

int main(void) {
    fill();
    put_i16(ends(40));
    shifted();
    put_i32(sum_of(a, 128));
    walked(a + 1, a, 30);
    walked(a, a + 2, 30);
    walked(b, a, 30);
    halves((long*)sums, 12);
    for (int i = 0; i < 64; i++) s[i] = (short)b[i];
    nested(12, 1, 9);
    nested(10, 0, 9);
    repeated(a + 40, 9, 3);
    searched();
    put_i16(port ^ ports[2]);
    put_i32(sum_of(a, 128));
    put_i32(sum_of(b, 128));
    put_i32(sum_of(&grid[0][0], 144));
    for (int i = 0; i < 16; i++) put_i32(sums[i]);
    put_i16(s[9]);
    return 0;
}
