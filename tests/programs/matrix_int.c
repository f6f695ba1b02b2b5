// Integer matrices of 16 and 32 bits by rows, by pointers to rows, in one dimension, and in blocks.
#include <zrun.h>

#define M 6
#define N 5
#define K 7

static int a[M][K], b[K][N];
static long c[M][N], d[M][N];
static int flat[M * K];

static void product(void) {
    int i, j, k;
    for (i = 0; i < M; i++)
        for (j = 0; j < N; j++) {
            long sum = 0;
            for (k = 0; k < K; k++) sum += (long)a[i][k] * b[k][j];
            c[i][j] = sum;
        }
}

static void product_rows(int (*x)[K], int (*y)[N], long (*z)[N], int rows) {
    while (rows-- > 0) {
        int k, j;
        for (j = 0; j < N; j++) (*z)[j] = 0;
        for (k = 0; k < K; k++)
            for (j = 0; j < N; j++) (*z)[j] += (long)(*x)[k] * y[k][j];
        x++;
        z++;
    }
}

static void product_blocks(int size) {
    int ib, jb, i, j, k;
    for (i = 0; i < M; i++)
        for (j = 0; j < N; j++) d[i][j] = 0;
    for (ib = 0; ib < M; ib += size)
        for (jb = 0; jb < N; jb += size)
            for (k = 0; k < K; k++)
                for (i = ib; i < ib + size && i < M; i++)
                    for (j = jb; j < jb + size && j < N; j++) d[i][j] += (long)a[i][k] * b[k][j];
}

static int equal(void) {
    const long *p = &c[0][0], *q = &d[0][0];
    int n = M * N;
    while (n-- > 0)
        if (*p++ != *q++) return 0;
    return 1;
}

static void transpose_flat(int* m, int rows, int columns) { /* in place, by cycles */
    int start, size = rows * columns;
    for (start = 1; start < size - 1; start++) {
        int at = start, count = 0, kept;
        do {
            at = at % rows * columns + at / rows;
            count++;
        } while (at > start);
        if (at < start || count == 1) continue;
        kept = m[start];
        at = start;
        do {
            int from = at % rows * columns + at / rows, t = from == start ? kept : m[from];
            m[at] = t;
            at = from;
        } while (at != start);
    }
}

static long diagonal(int offset) {
    long s = 0;
    int i;
    for (i = 0; i < M; i++)
        if (i + offset >= 0 && i + offset < N) s += c[i][i + offset];
    return s;
}

static int saddle(int* row, int* column) {
    int i, j, k;
    for (i = 0; i < M; i++)
        for (j = 0; j < K; j++) {
            for (k = 0; k < K; k++)
                if (a[i][k] < a[i][j]) goto next;
            for (k = 0; k < M; k++)
                if (a[k][j] > a[i][j]) goto next;
            *row = i;
            *column = j;
            return 1;
        next:;
        }
    return 0;
}

int main(void) {
    int i, j, row = -1, column = -1;
    for (i = 0; i < M; i++)
        for (j = 0; j < K; j++) flat[i * K + j] = a[i][j] = (i * 31 + j * 17) % 23 * 40 - 400;
    for (i = 0; i < K; i++)
        for (j = 0; j < N; j++) b[i][j] = i == j ? 1000 : i - j;
    product();
    for (i = 0; i < M; i++) put_i32(c[i][i % N]);
    product_rows(a, b, d, M);
    put_i16(equal());
    for (i = 1; i < 5; i++) {
        product_blocks(i);
        put_i16(equal());
    }
    product_rows(a, b, d, 0);
    for (i = -3; i < 4; i++) put_i32(diagonal(i));
    transpose_flat(flat, M, K);
    for (i = 0, row = 0; i < M; i++)
        for (j = 0; j < K; j++) row += flat[j * M + i] != a[i][j];
    put_i16(row);
    put_i16(saddle(&row, &column));
    for (j = 0; j < K; j++) a[2][j] = 900 + (j - 3) * (j - 3);
    put_i16(saddle(&row, &column));
    put_i16(row * 10 + column);
    return 0;
}
