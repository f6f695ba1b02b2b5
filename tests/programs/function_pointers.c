// Functions as values: tables, functions returning functions, handlers that replace each other.
#include <zrun.h>

typedef int (*binary)(int, int);

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
    int i;
    for (i = 0; i < 4; i++) put_i16(table[i](20, 7));
    for (i = 3; i >= 0; i--) put_i16((*table[i])(i, 2));
    put_i16(apply(choose('+'), 3, 4));
    put_i16(apply(choose('-'), 3, 4));
    put_i16(apply(choose('*'), 3, 4));
    put_i16(apply(choose('/'), 3, 4));
    put_i16(choose('+') == add);
    put_i16(choose('-') == table[0]);
    for (i = 0; i < 5; i++) handler();
    put_i16(level);
    put_i16(by_current(5, 6));
    put_i16(by_current(5, 6));
    return 0;
}
