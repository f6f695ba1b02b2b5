// Pointers to pointers, arrays of arrays by pointers, offsets in both directions.
#include <zrun.h>

static int rows[3][5] = {{1, 2, 3, 4, 5}, {10, 20, 30, 40, 50}, {-1, -2, -3, -4, -5}};
static int* const lines[4] = {rows[0], rows[2], rows[1] + 1, &rows[0][4]};
static int wide[3][2080]; // a row has more bits than an int counts

static int pick(int* const* table, int i, int j) { return table[i][j]; }

static long over(int (*m)[5], int n) {
    long s = 0;
    int(*end)[5] = m + n;
    for (; m < end; m++) {
        int* p;
        for (p = *m + 4; p >= *m; p--) s = s * 2 + *p;
    }
    return s;
}

static void advance(int** p, int by) { *p += by; }

static int far(int i, int j) { return wide[i][j] + wide[i - 1][j + 1]; }

int main(void) {
    int *p = rows[1], i, j;
    for (i = 0; i < 4; i++) put_i16(pick(lines, i, i == 3 ? -2 : 1));
    put_i32(over(rows, 3));
    put_i32(over(rows + 1, 1));
    put_i32(over(rows, 0));
    advance(&p, 3);
    put_i16(*p);
    advance(&p, -2);
    put_i16(*p + p[-1] + p[2]);
    for (i = 0; i < 3; i++)
        for (j = 0; j < 2080; j += 7) wide[i][j] = i * 1000 + j;
    put_i16(far(2, 6));
    put_i16(far(1, 2072));
    return 0;
}
