// Scopes and control.
// Prints: 100 2 1 40 121 110 98 4 1 4 55 1 8
#include <zrun.h>
static int count(void) {
    static int n = 3;
    return n++;
}
int x = 100;
int main(void) {
    int x = 1, i, n = 0;
    {
        int x = 2;
        {
            extern int x;
            put_i16(x);
        }
        put_i16(x);
    }
    put_i16(x);
    for (int x = 5, j = 8; x < j; x++, j--) {
        int y = x * j;
        if (y == 42) continue;
        put_i16(y);
    }
    for (i = 0;; i++) {
        if (i == 3) break;
        switch (i) {
        case 0: n += 1;
        case 1: n += 10; break;
        default: n += 100;
        }
    }
    put_i16(n);
    do n--;
    while (n > 110);
    put_i16(n);
    while (1) {
        if (n-- < 100) goto out;
    }
out:
    put_i16(n);
    count();
    put_i16(count());
    switch (7L) {
    default: put_i16(1);
    }
    switch (n) {
        int dead;
    case 98: dead = 4; put_i16(dead);
    }
    i = n > 3 && (put_i16(55), 0) || n == 98;
    put_i16(i);
    n > 0 ? put_i16(8) : put_i16(9);
    return 0;
}
