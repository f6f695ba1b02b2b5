// Variable arguments of every width, passed on by va_list. (no crosscheck)
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

int main(void) {
    char c = 'x';
    int local = 77;
    put_i16(sum(0));
    put_i16(sum(1, 42));
    put_i16(sum(5, 1, 2, 3, 4, 5));
    put_i16(sum(3, 1, -2, c));
    put_i16(sum(2, 10, 20, 30));
    print("ilqsd", -5, 70000L, 1LL << 40, "text", 2.5L);
    print("dil?u", 0.125L, 1, -1L, 65535u);
    print("pip", &local, 3, &local);
    print("");
    return 0;
}
