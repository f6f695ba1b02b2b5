// Cosine transform of blocks of 8 by 8, quantized and scanned in zigzag, then restored.
#include <zrun.h>

/* cos(k pi / 16), 13 bits of fraction, for k = 0 .. 8 */
static const int cosines[9] = {8192, 8035, 7568, 6811, 5793, 4551, 3135, 1598, 0};
static int block[8][8], coefficients[8][8];
static unsigned char zigzag[64];

static int cosine(int k) {
    k &= 31;
    if (k > 16) k = 32 - k;
    return k > 8 ? -cosines[16 - k] : cosines[k];
}

static void forward(const int in[8], int out[8]) {
    int u, x;
    for (u = 0; u < 8; u++) {
        long sum = 0;
        for (x = 0; x < 8; x++) sum += (long)in[x] * cosine((2 * x + 1) * u);
        if (u == 0) sum = (sum >> 8) * 181L;
        out[u] = (int)((sum + 8192L) >> 14);
    }
}

static void backward(const int in[8], int out[8]) {
    int u, x;
    for (x = 0; x < 8; x++) {
        long sum = ((long)in[0] * 181L) * 32L;
        for (u = 1; u < 8; u++) sum += (long)in[u] * cosine((2 * x + 1) * u);
        out[x] = (int)((sum + 4096L) >> 14);
    }
}

static void both_ways(void (*one)(const int*, int*), int m[8][8]) {
    int i, j, line[8], out[8];
    for (i = 0; i < 8; i++) {
        one(m[i], out);
        for (j = 0; j < 8; j++) m[i][j] = out[j];
    }
    for (j = 0; j < 8; j++) {
        for (i = 0; i < 8; i++) line[i] = m[i][j];
        one(line, out);
        for (i = 0; i < 8; i++) m[i][j] = out[i];
    }
}

static void make_zigzag(void) {
    int x = 0, y = 0, up = 1, i;
    for (i = 0; i < 64; i++) {
        zigzag[i] = (unsigned char)(y * 8 + x);
        if (up) {
            if (x == 7)
                y++, up = 0;
            else if (y == 0)
                x++, up = 0;
            else
                x++, y--;
        } else {
            if (y == 7)
                x++, up = 1;
            else if (x == 0)
                y++, up = 1;
            else
                x--, y++;
        }
    }
}

int main(void) {
    int i, j, run = 0, worst = 0;
    make_zigzag();
    for (i = 0; i < 8; i++)
        for (j = 0; j < 8; j++) coefficients[i][j] = block[i][j] = (i - 3) * 12 + (j * j - 20) * 2 + (i == j ? 30 : 0);
    both_ways(forward, coefficients);
    for (i = 0; i < 64; i++) {
        int* c = &coefficients[zigzag[i] >> 3][zigzag[i] & 7];
        int q = *c / (4 + i / 8);
        if (q == 0)
            run++;
        else {
            put_i16(run);
            put_i16(q);
            run = 0;
        }
        *c = q * (4 + i / 8);
    }
    put_i16(run);
    both_ways(backward, coefficients);
    for (i = 0; i < 8; i++)
        for (j = 0; j < 8; j++) {
            int e = coefficients[i][j] - block[i][j];
            if (e < 0) e = -e;
            if (e > worst) worst = e;
        }
    put_i16(worst);
    put_i16(coefficients[0][0]);
    put_i16(coefficients[7][7]);
    return 0;
}
