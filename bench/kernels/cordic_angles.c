// CORDIC in 16-bit arithmetic: rotation, vectoring, and the square root by the hyperbolic mode.
#include <zrun.h>

#define STEPS 13

/* atan(2^-i), 4096 to the radian */
static const int angles[STEPS] = {3217, 1899, 1003, 509, 256, 128, 64, 32, 16, 8, 4, 2, 1};
static const int hyper[STEPS] = {0, 2250, 1046, 515, 256, 128, 64, 32, 16, 8, 4, 2, 1};

static void rotate(int angle, int* x, int* y) {
    int i, cx = 9949, cy = 0; /* 16384 over the gain */
    for (i = 0; i < STEPS; i++) {
        int nx = cx, ny = cy;
        if (angle >= 0) {
            nx -= cy >> i;
            ny += cx >> i;
            angle -= angles[i];
        } else {
            nx += cy >> i;
            ny -= cx >> i;
            angle += angles[i];
        }
        cx = nx;
        cy = ny;
    }
    *x = cx;
    *y = cy;
}

static int vector(int x, int y, int* length) {
    int angle = 0, i;
    if (x < 0) {
        x = -x;
        y = -y;
        angle = y > 0 ? -12868 : 12868;
    }
    for (i = 0; i < STEPS; i++) {
        int t = x;
        if (y > 0) {
            x += y >> i;
            y -= t >> i;
            angle += angles[i];
        } else {
            x -= y >> i;
            y += t >> i;
            angle -= angles[i];
        }
    }
    *length = (int)((long)x * 9949L >> 14);
    return angle;
}

static int root(int v) { /* of v / 4096, result by 4096 */
    int x = v + 1024, y = v - 1024, i, repeat = 4;
    for (i = 1; i < STEPS;) {
        int t = x;
        if (y < 0) {
            x += y >> i;
            y += t >> i;
        } else {
            x -= y >> i;
            y -= t >> i;
        }
        if (i == repeat)
            repeat = 3 * repeat + 1;
        else
            i++;
    }
    return (int)((long)x * 19784L >> 14);
}

int main(void) {
    int a, x, y, length;
    for (a = -6400; a <= 6400; a += 1600) {
        rotate(a, &x, &y);
        put_i16(x);
        put_i16(y);
    }
    put_i16(vector(3000, 4000, &length));
    put_i16(length);
    put_i16(vector(-4000, 3000, &length));
    put_i16(length);
    put_i16(vector(-1, -5000, &length));
    put_i16(length);
    for (a = 512; a < 8192; a += 1500) put_i16(root(a));
    for (x = a = 0; a < STEPS; a++) x += hyper[a] ^ angles[a];
    put_i16(x);
    return 0;
}
