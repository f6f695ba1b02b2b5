// Recursive-descent calculator with precedence, right-associative power, errors with positions.
#include <zrun.h>

static const char *text, *at;
static int error_at;

static long expression(int level);

static void skip(void) {
    while (*at == ' ') at++;
}

static long fail(void) {
    if (error_at < 0) error_at = (int)(at - text);
    return 0;
}

static long number(void) {
    long v = 0;
    if (*at < '0' || *at > '9') return fail();
    while (*at >= '0' && *at <= '9') v = v * 10 + (*at++ - '0');
    return v;
}

static long primary(void) {
    long v;
    skip();
    switch (*at) {
    case '(':
        at++;
        v = expression(0);
        skip();
        if (*at != ')') return fail();
        at++;
        return v;
    case '-': at++; return -primary();
    case '~': at++; return ~primary();
    case '!': at++; return !primary();
    default: return number();
    }
}

static int level_of(char c) {
    switch (c) {
    case '|': return 1;
    case '&': return 2;
    case '<':
    case '>':
    case '=': return 3;
    case '+':
    case '-': return 4;
    case '*':
    case '/':
    case '%': return 5;
    case '^': return 6;
    }
    return 0;
}

static long power(long base, long n) {
    long r = 1;
    for (; n > 0; n >>= 1) {
        if (n & 1) r *= base;
        if (n > 1) base *= base;
    }
    return r;
}

static long apply(char op, long a, long b) {
    switch (op) {
    case '|': return a | b;
    case '&': return a & b;
    case '<': return a < b;
    case '>': return a > b;
    case '=': return a == b;
    case '+': return a + b;
    case '-': return a - b;
    case '*': return a * b;
    case '/': return b ? a / b : fail();
    case '%': return b ? a % b : fail();
    default: return power(a, b);
    }
}

static long expression(int level) {
    long left = primary();
    for (;;) {
        char op;
        int l;
        skip();
        op = *at;
        l = level_of(op);
        if (l == 0 || l <= level) return left;
        at++;
        left = apply(op, left, expression(op == '^' ? l - 1 : l));
    }
}

int main(void) {
    static const char* const inputs[] = {"1+2*3",      "(1+2)*3",   "2^3^2", "100/7%4",   "-2^2",    "~5&12|1", "1<2=1",
                                         "10 - 4 - 3", "((((7))))", "!0+!5", "65536*3+1", "8/0",     "2*(3+",   "4 4",
                                         "",           "1 + + 2",   "(1))",  "5%0+1",     "-(-(-3))"};
    unsigned i;
    for (i = 0; i < sizeof inputs / sizeof inputs[0]; i++) {
        long v;
        at = text = inputs[i];
        error_at = -1;
        v = expression(0);
        if (*at) fail();
        put_i32(v);
        if (error_at >= 0) put_i16(error_at);
    }
    return 0;
}
