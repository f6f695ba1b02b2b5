// Two-dimensional convolution, separable filters, and a median, over small images with borders.
#include <zrun.h>

#define W 10
#define H 8

static unsigned image[H][W], result[H][W];
static const int sobel[3][3] = {{-1, 0, 1}, {-2, 0, 2}, {-1, 0, 1}};
static const int smooth[5] = {1, 4, 6, 4, 1};

static int at(int y, int x) {
    if (y < 0) y = 0;
    if (y >= H) y = H - 1;
    if (x < 0) x = 0;
    if (x >= W) x = W - 1;
    return (int)image[y][x];
}

static long gradient(void) {
    long total = 0;
    int y, x, dy, dx;
    for (y = 1; y < H - 1; y++)
        for (x = 1; x < W - 1; x++) {
            int gx = 0, gy = 0;
            for (dy = 0; dy < 3; dy++)
                for (dx = 0; dx < 3; dx++) {
                    gx += sobel[dy][dx] * (int)image[y + dy - 1][x + dx - 1];
                    gy += sobel[dx][dy] * (int)image[y + dy - 1][x + dx - 1];
                }
            result[y][x] = (unsigned)((gx < 0 ? -gx : gx) + (gy < 0 ? -gy : gy));
            total += result[y][x];
        }
    return total;
}

static unsigned blur(void) {
    unsigned row[W], check = 0;
    int y, x, k;
    for (y = 0; y < H; y++) {
        for (x = 0; x < W; x++) {
            int sum = 0;
            for (k = -2; k <= 2; k++) sum += smooth[k + 2] * at(y, x + k);
            row[x] = (unsigned)sum / 16u;
        }
        for (x = 0; x < W; x++) result[y][x] = row[x];
    }
    for (x = 0; x < W; x++)
        for (y = 2; y < H - 2; y++) {
            unsigned sum = 0;
            for (k = 0; k < 5; k++) sum += (unsigned)smooth[k] * result[y + k - 2][x];
            check = (check << 1 | check >> 15) ^ (sum >> 4);
        }
    return check;
}

static int median(int y, int x) {
    int v[9], n = 0, i, j;
    for (i = -1; i <= 1; i++)
        for (j = -1; j <= 1; j++) {
            int value = at(y + i, x + j), p = n++;
            while (p > 0 && v[p - 1] > value) {
                v[p] = v[p - 1];
                p--;
            }
            v[p] = value;
        }
    return v[4];
}

int main(void) {
    int y, x, sum = 0;
    for (y = 0; y < H; y++)
        for (x = 0; x < W; x++) image[y][x] = (unsigned)((x * x + 3 * y * x + 17 * y) & 255);
    put_i32(gradient());
    put_i16((int)result[3][4]);
    put_i16((int)result[6][8]);
    put_i16((int)blur());
    for (y = 0; y < H; y++) {
        for (x = 0; x < W; x++) sum += median(y, x);
        put_i16(sum);
    }
    return 0;
}
