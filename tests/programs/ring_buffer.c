// Ring buffers with masks and with modulo, overwriting and refusing, volatile indices, and a delay line.
#include <zrun.h>

#define SIZE 8u

struct ring {
    volatile unsigned head, tail;
    int data[SIZE];
    unsigned lost;
};

static int put(struct ring* r, int v) {
    unsigned head = r->head, next = (head + 1u) & (SIZE - 1u);
    if (next == r->tail) {
        r->lost++;
        return 0;
    }
    r->data[head] = v;
    r->head = next;
    return 1;
}

static int get(struct ring* r, int* v) {
    unsigned tail = r->tail;
    if (tail == r->head) return 0;
    *v = r->data[tail];
    r->tail = (tail + 1u) % SIZE;
    return 1;
}

static unsigned used(const struct ring* r) { return (r->head - r->tail) & (SIZE - 1u); }

static int delay(int x) {
    static int line[5], *p = line;
    int y = *p;
    *p++ = x;
    if (p == line + 5) p = line;
    return y;
}

/* Free-running indices: the difference counts, whatever wraps. */
static long free_running(unsigned start, int n) {
    static int slots[4];
    unsigned w = start, r = start;
    long sum = 0;
    int i;
    for (i = 0; i < n; i++) {
        if (w - r == 4u) {
            sum = sum * 3 + slots[r++ & 3u];
            sum %= 100003L;
        }
        slots[w++ & 3u] = i;
    }
    while (r != w) sum = (sum * 3 + slots[r++ & 3u]) % 100003L;
    return sum;
}

int main(void) {
    static struct ring r;
    int i, v = 0, sum = 0;
    for (i = 0; i < 10; i++) put_i16(put(&r, i * i));
    put_i16((int)r.lost);
    put_i16((int)used(&r));
    while (get(&r, &v)) sum += v;
    put_i16(sum);
    for (i = 0; i < 50; i++) {
        put(&r, i);
        if (i % 3) put(&r, -i);
        if (get(&r, &v)) sum = sum * 2 % 1009 + v;
    }
    put_i16(sum);
    put_i16((int)r.lost);
    put_i16((int)used(&r));
    put_i16(get(&r, &v));
    put_i16(v);
    for (i = 0; i < 12; i++) sum += delay(i) * (i + 1);
    put_i16(sum);
    put_i32(free_running(0u, 20));
    put_i32(free_running(65530u, 20));
    put_i32(free_running(0u, 0));
    return 0;
}
