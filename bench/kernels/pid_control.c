// Closed loops: PID control with anti-windup in fixed and floating point, and Park and Clarke transforms.
#include <zrun.h>

struct pid {
    int kp, ki, kd;
    long integral, limit;
    int last;
    unsigned saturated : 1;
    unsigned direction : 2;
};

static int control(struct pid* c, int error) {
    long p = (long)c->kp * error;
    long d = (long)c->kd * (error - c->last);
    long out;
    c->last = error;
    if (!c->saturated || (error > 0) != (c->direction == 1)) c->integral += (long)c->ki * error;
    out = (p + c->integral + d) >> 8;
    c->saturated = 0;
    c->direction = 0;
    if (out > c->limit) {
        out = c->limit;
        c->saturated = 1;
        c->direction = 1;
    } else if (out < -c->limit) {
        out = -c->limit;
        c->saturated = 1;
        c->direction = 2;
    }
    return (int)out;
}

static void run_plant(struct pid* c, int target, int steps, int every) {
    long speed = 0;
    int i, u = 0;
    for (i = 0; i < steps; i++) {
        u = control(c, target - (int)(speed >> 4));
        speed += ((long)u * 3 - (speed >> 3)) >> 1;
        if (i % every == every - 1) {
            put_i16((int)(speed >> 4));
            put_i16(u);
        }
    }
    put_i16(c->saturated);
    put_i16(c->direction);
}

struct ab {
    int alpha, beta;
};
struct dq {
    int d, q;
};

static struct ab clarke(int a, int b, int c) {
    struct ab r;
    r.alpha = (int)((2L * a - b - c) / 3L);
    r.beta = (int)(((long)(b - c) * 18919L) >> 15);
    return r;
}

static struct dq park(struct ab v, int sine, int cosine) {
    struct dq r = {0, 0};
    r.d = (int)(((long)v.alpha * cosine + (long)v.beta * sine) >> 15);
    r.q = (int)(((long)v.beta * cosine - (long)v.alpha * sine) >> 15);
    return r;
}

static struct ab unpark(struct dq v, int sine, int cosine) {
    struct ab r;
    r.alpha = (int)(((long)v.d * cosine - (long)v.q * sine) >> 15);
    r.beta = (int)(((long)v.d * sine + (long)v.q * cosine) >> 15);
    return r;
}

int main(void) {
    struct pid c = {600, 40, 100, 0, 900, 0, 0, 0};
    static const int sines[6][2] = {{0, 32767}, {16384, 28378},  {28378, 16384},
                                    {32767, 0}, {28378, -16384}, {-16384, -28378}};
    int i;
    run_plant(&c, 500, 60, 12);
    run_plant(&c, -300, 30, 10);
    c.integral = 0;
    c.kd = -c.kd;
    run_plant(&c, 0, 4, 2);
    for (i = 0; i < 6; i++) {
        struct ab v = clarke(sines[i][1] / 2, sines[(i + 4) % 6][1] / 2, sines[(i + 2) % 6][1] / 2);
        struct dq r = park(v, sines[i][0], sines[i][1]);
        struct ab back = unpark(r, sines[i][0], sines[i][1]);
        put_i16(r.d);
        put_i16(r.q);
        put_i16(back.alpha - v.alpha);
        put_i16(back.beta - v.beta);
    }
    return 0;
}
