// Pointers to pointers, arrays of arrays by pointers, structures in structures, offsets in both directions.
#include <zrun.h>

struct channel {
    int gain, history[4];
    struct {
        long low, high;
    } range;
};
struct unit {
    struct channel channels[3];
    struct channel* active;
    int count;
};

static int rows[3][5] = {{1, 2, 3, 4, 5}, {10, 20, 30, 40, 50}, {-1, -2, -3, -4, -5}};
static int* const lines[4] = {rows[0], rows[2], rows[1] + 1, &rows[0][4]};
static struct unit device;
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

static int feed(struct unit* u, int x) {
    struct channel* c = u->active;
    int i, y = 0;
    for (i = 3; i > 0; i--) c->history[i] = c->history[i - 1];
    c->history[0] = x;
    for (i = 0; i < 4; i++) y += c->history[i] * c->gain;
    if (y < c->range.low) c->range.low = y;
    if (y > c->range.high) c->range.high = y;
    u->active = c == &u->channels[2] ? u->channels : c + 1;
    u->count++;
    return y;
}

static struct channel* widest(struct unit* u) {
    struct channel *best = u->channels, *c;
    for (c = best + 1; c <= &u->channels[2]; c++)
        if (c->range.high - c->range.low > best->range.high - best->range.low) best = c;
    return best;
}

static int* maximum(int* a, int n) {
    int *best = a, *p;
    for (p = a; p != a + n; ++p)
        if (*p > *best) best = p;
    return best;
}

static int window(const int* middle, int radius) {
    int i, s = 0;
    for (i = -radius; i <= radius; i++) s += middle[i] * (radius + 1 - (i < 0 ? -i : i));
    return s;
}

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
    for (i = 0; i < 3; i++) {
        device.channels[i].gain = i + 1;
        device.channels[i].range.low = 30000L;
        device.channels[i].range.high = -30000L;
    }
    device.active = device.channels;
    for (i = j = 0; i < 20; i++) j = j * 3 % 1000 + feed(&device, (i * 7) % 11 - 5);
    put_i16(j);
    put_i16(device.count);
    put_i16(device.active->gain);
    put_i16(widest(&device)->gain);
    for (i = 0; i < 3; i++) {
        put_i32(device.channels[i].range.low);
        put_i32(device.channels[i].range.high);
    }
    put_i16(*maximum(rows[0], 5) * 100 + *maximum(rows[2], 5));
    *maximum(rows[1], 5) = 7;
    put_i16(*maximum(rows[1], 5));
    put_i16(window(rows[0] + 2, 2));
    put_i16(window(rows[0] + 2, 0));
    for (i = 0; i < 3; i++)
        for (j = 0; j < 2080; j += 7) wide[i][j] = i * 1000 + j;
    put_i16(far(2, 6));
    put_i16(far(1, 2072));
    return 0;
}
