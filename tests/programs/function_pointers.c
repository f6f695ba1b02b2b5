// Functions as values: tables, callbacks with contexts, functions returning functions, objects with operations.
#include <zrun.h>

typedef int (*binary)(int, int);
typedef long (*fold)(long, int, void*);

static int add(int a, int b) { return a + b; }
static int subtract(int a, int b) { return a - b; }
static int multiply(int a, int b) { return a * b; }
static int maximum(int a, int b) { return a > b ? a : b; }

static const binary table[] = {add, subtract, multiply, maximum};

static binary choose(char op) {
    switch (op) {
    case '+': return add;
    case '-': return &subtract;
    case '*': return *multiply;
    }
    return 0;
}

static int apply(binary f, int a, int b) { return f ? f(a, b) : -1; }

static binary compose_choice(binary (*chooser)(char), const char* ops, int at) { return chooser(ops[at]); }

struct weights {
    int w[4];
    int used;
};

static long weighted(long so_far, int v, void* context) {
    struct weights* w = (struct weights*)context;
    return so_far + (long)v * w->w[w->used++ & 3];
}

static long polynomial(long so_far, int v, void* context) { return so_far * *(long*)context % 30011L + v; }

static long reduce(const int* a, int n, fold f, void* context) {
    long r = 0;
    int i;
    for (i = 0; i < n; i++) r = f(r, a[i], context);
    return r;
}

struct shape {
    const struct operations* ops;
    int a, b;
};

struct operations {
    long (*area)(const struct shape*);
    void (*scale)(struct shape*, int);
};

static long rectangle_area(const struct shape* s) { return (long)s->a * s->b; }
static long triangle_area(const struct shape* s) { return (long)s->a * s->b / 2; }
static void scale_both(struct shape* s, int k) {
    s->a *= k;
    s->b *= k;
}
static void scale_height(struct shape* s, int k) { s->b *= k; }

static const struct operations rectangle = {rectangle_area, scale_both}, triangle = {triangle_area, scale_height};

static int level;
static void enter(void), leave(void);
static void (*handler)(void) = enter;
static void enter(void) {
    level += 10;
    handler = leave;
}
static void leave(void) {
    level -= 3;
    handler = enter;
}

static int replaced(int a, int b) { return 1000 + a - b; }
static binary current = add;
static int by_current(int a, int b) {
    int first = current(a, b);
    current = replaced;
    return first + current(a, b);
}

int main(void) {
    static const int data[6] = {3, 1, 4, 1, 5, 9};
    struct weights w = {{1, 2, 3, 4}, 0};
    static struct shape shapes[2] = {{&rectangle, 3, 5}, {&triangle, 8, 7}};
    long base = 7;
    int i;
    for (i = 0; i < 4; i++) put_i16(table[i](20, 7));
    for (i = 3; i >= 0; i--) put_i16((*table[i])(i, 2));
    put_i16(apply(choose('+'), 3, 4));
    put_i16(apply(choose('-'), 3, 4));
    put_i16(apply(choose('*'), 3, 4));
    put_i16(apply(choose('/'), 3, 4));
    put_i16(compose_choice(choose, "*+-", 2)(9, 4));
    put_i16(choose('+') == add);
    put_i16(choose('-') == table[0]);
    put_i32(reduce(data, 6, weighted, &w));
    put_i16(w.used);
    put_i32(reduce(data, 6, polynomial, &base));
    put_i32(reduce(data, 0, polynomial, &base));
    for (i = 0; i < 2; i++) {
        put_i32(shapes[i].ops->area(&shapes[i]));
        shapes[i].ops->scale(&shapes[i], 3);
        put_i32(shapes[i].ops->area(shapes + i));
    }
    shapes[0].ops = &triangle;
    put_i32(shapes[0].ops->area(&shapes[0]));
    for (i = 0; i < 5; i++) handler();
    put_i16(level);
    put_i16(by_current(5, 6));
    put_i16(by_current(5, 6));
    return 0;
}
