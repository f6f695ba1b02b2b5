// Binary heap with a comparison function: queue, heap sort, k smallest, and shortest paths over a small graph.
#include <zrun.h>

typedef int (*before)(long, long);

struct heap {
    long item[32];
    int count;
    before less;
};

static int smaller(long a, long b) { return a < b; }
static int larger(long a, long b) { return a > b; }
static int by_low_digit(long a, long b) { return a % 10 < b % 10 || (a % 10 == b % 10 && a < b); }

static void push(struct heap* h, long v) {
    int i = h->count++;
    while (i > 0) {
        int up = (i - 1) / 2;
        if (!h->less(v, h->item[up])) break;
        h->item[i] = h->item[up];
        i = up;
    }
    h->item[i] = v;
}

static long pop(struct heap* h) {
    long top = h->item[0], v = h->item[--h->count];
    int i = 0, child;
    while ((child = 2 * i + 1) < h->count) {
        if (child + 1 < h->count && h->less(h->item[child + 1], h->item[child])) child++;
        if (!h->less(h->item[child], v)) break;
        h->item[i] = h->item[child];
        i = child;
    }
    h->item[i] = v;
    return top;
}

#define NODES 7
static const int edge[NODES][NODES] = {{0, 7, 9, 0, 0, 14, 0},  {7, 0, 10, 15, 0, 0, 0}, {9, 10, 0, 11, 0, 2, 0},
                                       {0, 15, 11, 0, 6, 0, 0}, {0, 0, 0, 6, 0, 9, 0},   {14, 0, 2, 0, 9, 0, 0},
                                       {0, 0, 0, 0, 0, 0, 0}};

static void distances(int from, int* dist) {
    struct heap h;
    int i;
    h.count = 0;
    h.less = smaller;
    for (i = 0; i < NODES; i++) dist[i] = 32767;
    dist[from] = 0;
    push(&h, from);
    while (h.count) {
        long top = pop(&h);
        int node = (int)(top % 10), d = (int)(top / 10);
        if (d > dist[node]) continue;
        for (i = 0; i < NODES; i++)
            if (edge[node][i] && d + edge[node][i] < dist[i]) {
                dist[i] = d + edge[node][i];
                push(&h, dist[i] * 10L + i);
            }
    }
}

int main(void) {
    static const before orders[] = {smaller, larger, by_low_digit};
    struct heap h;
    int i, o, dist[NODES];
    for (o = 0; o < 3; o++) {
        h.count = 0;
        h.less = orders[o];
        for (i = 0; i < 25; i++) push(&h, (i * 7919L) % 1009L);
        for (i = 0; i < 4; i++) put_i32(pop(&h));
        push(&h, 500L);
        while (h.count > 1) pop(&h);
        put_i32(pop(&h));
        put_i16(h.count);
    }
    for (o = 0; o < NODES; o += 3) {
        distances(o, dist);
        for (i = 0; i < NODES; i++) put_i16(dist[i]);
    }
    return 0;
}
