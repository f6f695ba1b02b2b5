// Variable arguments of every width, passed on by va_list, counted and ended by a mark. (no crosscheck)
#include <stdarg.h>
#include <zrun.h>

static int sum(int n, ...) {
    va_list ap;
    int s = 0;
    va_start(ap, n);
    while (n-- > 0) s += va_arg(ap, int);
    va_end(ap);
    return s;
}

static long until_zero(long first, ...) {
    va_list ap;
    long s = 0, v = first;
    va_start(ap, first);
    while (v) {
        s = s * 3 + v;
        v = va_arg(ap, long);
    }
    va_end(ap);
    return s;
}

static void print_all(const char* kinds, va_list ap) {
    for (; *kinds; kinds++) switch (*kinds) {
        case 'i': put_i16(va_arg(ap, int)); break;
        case 'l': put_i32(va_arg(ap, long)); break;
        case 'u': put_u32(va_arg(ap, unsigned)); break;
        case 'q': put_i64(va_arg(ap, long long)); break;
        case 's': put_str(va_arg(ap, const char*)); break;
        case 'd': put_f64(va_arg(ap, long double)); break;
        case 'p': put_i16(*va_arg(ap, int*)); break;
        default: put_str("?");
        }
}

static void print(const char* kinds, ...) {
    va_list ap;
    va_start(ap, kinds);
    print_all(kinds, ap);
    va_end(ap);
}

static int twice(int n, ...) {
    va_list ap;
    int i, a = 0, b = 1;
    va_start(ap, n);
    for (i = 0; i < n; i++) a += va_arg(ap, int);
    va_end(ap);
    va_start(ap, n);
    for (i = 0; i < n; i++) b *= va_arg(ap, int);
    va_end(ap);
    return a * 100 + b;
}

static int extreme(int (*better)(int, int), int n, ...) {
    va_list ap;
    int best, v;
    va_start(ap, n);
    best = va_arg(ap, int);
    while (--n > 0) {
        v = va_arg(ap, int);
        if (better(v, best)) best = v;
    }
    va_end(ap);
    return best;
}

static int larger(int a, int b) { return a > b; }
static int smaller(int a, int b) { return a < b; }

static int nested(int depth, ...) {
    va_list ap;
    int v;
    va_start(ap, depth);
    v = va_arg(ap, int);
    va_end(ap);
    return depth == 0 ? v : nested(depth - 1, v + depth, 99) * 2;
}

int main(void) {
    char c = 'x';
    int local = 77;
    put_i16(sum(0));
    put_i16(sum(1, 42));
    put_i16(sum(5, 1, 2, 3, 4, 5));
    put_i16(sum(3, 1, -2, c));
    put_i16(sum(2, 10, 20, 30));
    put_i32(until_zero(1L, 2L, 100000L, 0L));
    put_i32(until_zero(0L));
    print("ilqsd", -5, 70000L, 1LL << 40, "text", 2.5L);
    print("dil?u", 0.125L, 1, -1L, 65535u);
    print("pip", &local, 3, &local);
    print("");
    put_i16(twice(4, 1, 2, 3, 4));
    put_i16(extreme(larger, 6, 3, 9, -2, 9, 8, 0));
    put_i16(extreme(smaller, 6, 3, 9, -2, 9, 8, 0));
    put_i16(extreme(smaller, 1, 5));
    put_i16(nested(4, 1));
    return 0;
}
