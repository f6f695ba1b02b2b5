// Checksums bit by bit, by tables of 16 and 256, reflected and not, of 8, 16 and 32 bits.
#include <zrun.h>

static const unsigned message[] = {0x31, 0x32, 0x33, 0x34, 0x35, 0x36, 0x37, 0x38, 0x39};
#define LENGTH (int)(sizeof message / sizeof message[0])

static unsigned crc16_bits(const unsigned* p, int n, unsigned poly, unsigned start) {
    unsigned crc = start;
    while (n-- > 0) {
        int bit;
        crc ^= *p++ << 8;
        for (bit = 8; bit; bit--) crc = crc & 0x8000u ? crc << 1 ^ poly : crc << 1;
    }
    return crc;
}

static unsigned crc16_reflected(const unsigned* p, int n) {
    unsigned crc = 0xFFFFu;
    int i, bit;
    for (i = 0; i < n; i++) {
        crc ^= p[i] & 0xFFu;
        for (bit = 0; bit < 8; ++bit) {
            unsigned low = crc & 1u;
            crc >>= 1;
            if (low) crc ^= 0xA001u;
        }
    }
    return crc;
}

static unsigned long table[256];

static void make_table(void) {
    unsigned long i;
    for (i = 0; i < 256UL; i++) {
        unsigned long c = i;
        int k;
        for (k = 0; k < 8; k++) c = c & 1UL ? 0xEDB88320UL ^ c >> 1 : c >> 1;
        table[i] = c;
    }
}

static unsigned long crc32(const unsigned* p, int n) {
    unsigned long c = 0xFFFFFFFFUL;
    while (n--) c = table[(c ^ *p++) & 0xFFUL] ^ c >> 8;
    return c ^ 0xFFFFFFFFUL;
}

static unsigned long crc32_nibbles(const unsigned* p, int n) {
    unsigned long c = ~0UL;
    int i;
    for (i = 0; i < n; i++) {
        c ^= p[i];
        c = table[(c & 15UL) << 4] ^ c >> 4;
        c = table[(c & 15UL) << 4] ^ c >> 4;
    }
    return ~c;
}

static unsigned crc8(const unsigned* p, int n) {
    unsigned crc = 0;
    int i, k;
    for (i = 0; i < n; i++) {
        crc ^= p[i];
        for (k = 0; k < 8; k++) {
            crc <<= 1;
            if (crc & 0x100u) crc ^= 0x107u;
        }
    }
    return crc;
}

static unsigned long adler(const unsigned* p, int n) {
    unsigned long a = 1, b = 0;
    int i;
    for (i = 0; i < n; i++) {
        a = (a + p[i]) % 65521UL;
        b = (b + a) % 65521UL;
    }
    return b << 16 | a;
}

int main(void) {
    make_table();
    put_u32(crc16_bits(message, LENGTH, 0x1021u, 0xFFFFu));
    put_u32(crc16_bits(message, LENGTH, 0x1021u, 0u));
    put_u32(crc16_bits(message, LENGTH, 0x8005u, 0u));
    put_u32(crc16_bits(message, 0, 0x8005u, 0x1234u));
    put_u32(crc16_reflected(message, LENGTH));
    put_u32(crc32(message, LENGTH));
    put_u32(crc32_nibbles(message, LENGTH));
    put_u32(crc32(message, 0));
    put_u32(crc8(message, LENGTH));
    put_u32(adler(message, LENGTH));
    put_u32(table[255] ^ table[128]);
    return 0;
}
