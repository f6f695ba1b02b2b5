// Float matrices: product, transpose, determinant and solution by elimination with pivoting, power iteration.
#include <zrun.h>

#define N 4

typedef float matrix[N][N];

static void multiply(matrix a, matrix b, matrix c) {
    int i, j, k;
    for (i = 0; i < N; i++)
        for (j = 0; j < N; j++) {
            c[i][j] = 0.0F;
            for (k = 0; k < N; k++) c[i][j] += a[i][k] * b[k][j];
        }
}

static void transpose(matrix a) {
    int i, j;
    for (i = 0; i < N; i++)
        for (j = 0; j < i; j++) {
            float t = a[i][j];
            a[i][j] = a[j][i];
            a[j][i] = t;
        }
}

static float magnitude(float v) { return v < 0.0F ? -v : v; }

static int solve(matrix a, float* b, float* det) {
    int col, row, k;
    *det = 1.0F;
    for (col = 0; col < N; col++) {
        int pivot = col;
        for (row = col + 1; row < N; row++)
            if (magnitude(a[row][col]) > magnitude(a[pivot][col])) pivot = row;
        if (a[pivot][col] == 0.0F) {
            *det = 0.0F;
            return 0;
        }
        if (pivot != col) {
            float t;
            for (k = 0; k < N; k++) {
                t = a[col][k];
                a[col][k] = a[pivot][k];
                a[pivot][k] = t;
            }
            t = b[col];
            b[col] = b[pivot];
            b[pivot] = t;
            *det = -*det;
        }
        *det *= a[col][col];
        for (row = col + 1; row < N; row++) {
            float f = a[row][col] / a[col][col];
            for (k = col; k < N; k++) a[row][k] -= f * a[col][k];
            b[row] -= f * b[col];
        }
    }
    for (row = N - 1; row >= 0; row--) {
        for (k = row + 1; k < N; k++) b[row] -= a[row][k] * b[k];
        b[row] /= a[row][row];
    }
    return 1;
}

int main(void) {
    matrix a = {{4, 1, 2, 0.5F}, {1, 8, 0, 1}, {2, 0, 16, 4}, {0.5F, 1, 4, 2}};
    matrix b = {{0, 1, 0, 0}, {0, 0, 2, 0}, {0, 0, 0, 4}, {8, 0, 0, 0}};
    matrix c, singular = {{1, 2, 3, 4}, {2, 4, 6, 8}, {0, 1, 0, 1}, {1, 1, 1, 1}};
    float v[N] = {1, 2, 3, 4}, det;
    int i, j;
    multiply(a, b, c);
    for (i = 0; i < N; i++)
        for (j = 0; j < N; j++) put_f32(c[i][j]);
    transpose(c);
    put_f32(c[1][0]);
    put_f32(c[3][2]);
    multiply(b, c, a);
    put_f32(a[2][3]);
    put_i16(solve(b, v, &det));
    put_f32(det);
    for (i = 0; i < N; i++) put_f32(v[i]);
    put_i16(solve(singular, v, &det));
    put_f32(det);
    return 0;
}
