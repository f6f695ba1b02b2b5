// Unsigned characters and 64 bits.
// Prints: 0 -1099511627776 15 -9223372036854775808 1 3000000000 -134217729 1
#include <zrun.h>
int main(void) {
    unsigned char c = 65535;
    long long a = -1;
    unsigned long long m = 0xFFFFFFFFFFFFFFFFULL;
    c++;
    put_i16(c);
    put_i64(a << 40);
    put_i64(m >> 60);
    put_i64(-9223372036854775807LL - 1);
    put_i16(m == a);
    put_i64(3000000000LL);
    put_i64(-134217729LL);
    put_i16((long long)1 << 33 > 0);
    return 0;
}
