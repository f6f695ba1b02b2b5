// Integers of every width.
// Prints: 0 1 0 49999 34464 100000 -3 -1 1333333333 250000000 -4375 -1 25000 1099511627776 -366503875925 1
// Prints: 10240 61072 -2 8 0 65536 -1 4e+09 -4375 -2 3 1000000000000000 1
#include <zrun.h>
unsigned ua = 50000;
int ia = -1;
long la = -70000;
unsigned long ul = 4000000000;
long long ll = 1;
unsigned long long um = 7;
int main(void) {
    put_i16(ia < ua);
    put_i16(la < ua);
    put_i16(la < ul);
    put_i32(ua + ia);
    put_u32(ua * 2);
    put_i32((long)ua * 2);
    put_i32(-7 / 2);
    put_i16(-7 % 3);
    put_u32(ul / 3);
    put_u32(ul >> 4);
    put_i32(la >> 4);
    put_i16(ia >> 1);
    put_u32(ua >> 1);
    put_i64(ll << 40);
    put_i64((ll << 40) / -3);
    put_i64(um - 8 > 0);
    put_i64((int)ul);
    put_i64((unsigned)la);
    put_i16('\xFFFE');
    put_i16(sizeof(char) + sizeof(long) + sizeof 1LL + sizeof 'a');
    put_i64(0xFFFF + 1);
    put_i64(65535 + 1);
    put_i16(1 ? -1 : 0u);
    put_f32(ul);
    put_f32((float)la / 16);
    put_i32(-2.9f);
    put_u32((unsigned)3.99);
    put_i64(1e15L);
    put_i16(!0.5f + !0);
    return 0;
}
