// Constants and copies hold along blocks that are entered from one place, until something is assigned.
// RUN: --opt_level=1 --disable_inlining
#include <zrun.h>

int g, h;
static void use(int a, int b) { g += a * 3 + b; }

// FUNCTION: along
// HAS: /_use\(5, /
// HAS: /_use\(6, /
// COUNT 0: /_use\(x/
int along(int y) {
    int x = 5;
    use(x, y);
    if (y > 2) {
        x = x + 1;
        use(x, 1);
    }
    return x;
}

// FUNCTION: copied
// HAS: /_use\(y, 1\)/
// HAS: /_use\(x, 2\)/
int copied(int y, int n) {
    int x = y;
    use(x, 1);
    while (n-- > 0) y += n;
    use(x, 2);
    x = n;
    return x + y;
}

// FUNCTION: joined
// HAS: /_use\(x, /
int joined(int y) {
    int x = 5;
    if (y > 2) {
        g = y;
        x = 7;
    }
    use(x, y);
    return x;
}

static void change(int *p) { *p = 9; }

// FUNCTION: reached
// HAS: /_use\(x, /
int reached(int y) {
    int x = 5;
    change(&x);
    use(x, y);
    x = 4;
    change(&x);
    return x;
}

// FUNCTION: narrowed
// HAS: /_h = 1$/
int narrowed(void) {
    unsigned x;
    x = (unsigned)65537L;
    h = x;
    x = 3;
    return x + h;
}

int main(void) {
    put_i16(along(3) + along(1));
    put_i16(copied(3, 4));
    put_i16(joined(3) + joined(1));
    put_i16(reached(2));
    put_i16(narrowed());
    put_i16(g);
    return 0;
}
