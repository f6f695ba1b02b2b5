// Escape counts over a small plane, in 32-bit fixed point and in floats, and an automaton on a torus.
#include <zrun.h>

#define GRID 12

static int fixed_escape(long cr, long ci, int limit) { /* 12 bits of fraction */
    long zr = 0, zi = 0;
    int n = 0;
    while (n < limit) {
        long r2 = zr * zr >> 12, i2 = zi * zi >> 12;
        if (r2 + i2 > 4L * 4096L) break;
        zi = (zr * zi >> 11) + ci;
        zr = r2 - i2 + cr;
        n++;
    }
    return n;
}

static int float_escape(float cr, float ci, int limit) {
    float zr = 0.0F, zi = 0.0F;
    int n;
    for (n = 0; n < limit && zr * zr + zi * zi <= 4.0F; n++) {
        float t = zr * zr - zi * zi + cr;
        zi = 2.0F * zr * zi + ci;
        zr = t;
    }
    return n;
}

static unsigned world[GRID];

static int neighbours(int y, int x) {
    int dy, dx, n = 0;
    for (dy = -1; dy <= 1; dy++)
        for (dx = -1; dx <= 1; dx++) {
            if (dy == 0 && dx == 0) continue;
            n += (int)(world[(y + dy + GRID) % GRID] >> ((x + dx + GRID) % GRID) & 1u);
        }
    return n;
}

static int generation(void) {
    unsigned next[GRID];
    int y, x, alive = 0;
    for (y = 0; y < GRID; y++) {
        next[y] = 0;
        for (x = 0; x < GRID; x++) {
            int n = neighbours(y, x);
            if (n == 3 || (n == 2 && (world[y] >> x & 1u))) {
                next[y] |= 1u << x;
                alive++;
            }
        }
    }
    for (y = 0; y < GRID; y++) world[y] = next[y];
    return alive;
}

static unsigned rule(unsigned cells, unsigned number) {
    unsigned next = 0;
    int i;
    for (i = 0; i < 16; i++) {
        unsigned l = cells >> ((i + 1) & 15) & 1u, m = cells >> i & 1u, r = cells >> ((i + 15) & 15) & 1u;
        next |= (number >> (l << 2 | m << 1 | r) & 1u) << i;
    }
    return next;
}

int main(void) {
    int y, x, inside = 0, differ = 0;
    long total = 0;
    unsigned cells = 0x0100u;
    for (y = -8; y <= 8; y += 2)
        for (x = -16; x <= 4; x += 2) {
            int n = fixed_escape(x * 512L, y * 512L, 40);
            total += n;
            inside += n == 40;
            differ += n != float_escape((float)x / 8.0F, (float)y / 8.0F, 40);
        }
    put_i32(total);
    put_i16(inside);
    put_i16(differ < 5);
    put_i16(float_escape(-0.75F, 0.1F, 60));
    put_i16(fixed_escape(-3072L, 410L, 60));
    world[1] = 4u;
    world[2] = 8u;
    world[3] = 14u;
    world[8] = 0x1C0u;
    for (x = 0; x < 24; x++) y = generation();
    put_i16(y);
    for (y = 0; y < GRID; y++)
        if (world[y]) put_u32(world[y]);
    for (x = 0; x < 10; x++) {
        cells = rule(cells, 90u + (unsigned)(x & 1) * 20u);
        put_u32(cells);
    }
    return 0;
}
