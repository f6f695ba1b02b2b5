// Constant tables: interpolation, bit counts, substitution boxes, calendars, Gray code, permutations, 3-d arrays.
#include <zrun.h>

static const int curve[9] = {0, 1000, 1900, 2700, 3400, 4000, 4500, 4900, 5200};
static const unsigned char nibble_bits[16] = {0, 1, 1, 2, 1, 2, 2, 3, 1, 2, 2, 3, 2, 3, 3, 4};
static const unsigned char box[16] = {0xC, 5, 6, 0xB, 9, 0, 0xA, 0xD, 3, 0xE, 0xF, 8, 4, 7, 1, 2};
static const int days[2][12] = {{31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31},
                                {31, 29, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31}};
static const int cube[2][3][4] = {{{1, 2, 3, 4}, {5, 6, 7, 8}, {9, 10, 11, 12}},
                                  {{13, 14, 15, 16}, {17, 18, 19, 20}, {21, 22, 23, 24}}};
static const int order[] = {3, 1, 4, 0, 2};
static const float scale[] = {0.5F, 0.25F, 2.0F};
static const struct {
    int key;
    const char* name;
} dictionary[] = {{10, "ten"}, {20, "twenty"}, {35, "more"}, {90, "most"}};

static int interpolate(int x) { /* 256 to the step */
    int i = x >> 8, f = x & 255;
    if (x <= 0) return curve[0];
    if (i >= 8) return curve[8];
    return curve[i] + (int)(((long)(curve[i + 1] - curve[i]) * f + 128L) >> 8);
}

static int find_inverse(int y) {
    int low = 0, high = 2048;
    while (low < high) {
        int mid = low + (high - low) / 2;
        if (interpolate(mid) < y)
            low = mid + 1;
        else
            high = mid;
    }
    return low;
}

static int ones(unsigned long v) {
    int n = 0;
    while (v) {
        n += nibble_bits[v & 15UL];
        v >>= 4;
    }
    return n;
}

static unsigned substitute(unsigned v, int rounds) {
    while (rounds--) {
        unsigned r = 0;
        int i;
        for (i = 0; i < 16; i += 4) r |= (unsigned)box[v >> i & 15u] << i;
        v = (r << 5 | r >> 11) ^ 0x1234u;
    }
    return v;
}

static int leap(int y) { return (y % 4 == 0 && y % 100 != 0) || y % 400 == 0; }

static int day_of_year(int y, int m, int d) {
    const int* table = days[leap(y)];
    int n = d, i;
    for (i = 0; i < m - 1; i++) n += table[i];
    return n;
}

static int weekday(int y, int m, int d) {
    static const int offset[] = {0, 3, 2, 5, 0, 3, 5, 1, 4, 6, 2, 4};
    if (m < 3) y--;
    return (y + y / 4 - y / 100 + y / 400 + offset[m - 1] + d) % 7;
}

static const char* look_up(int key) {
    int low = 0, high = (int)(sizeof dictionary / sizeof dictionary[0]) - 1;
    while (low <= high) {
        int mid = (low + high) / 2;
        if (dictionary[mid].key == key) return dictionary[mid].name;
        if (dictionary[mid].key < key)
            low = mid + 1;
        else
            high = mid - 1;
    }
    return "none";
}

int main(void) {
    int i, j, k, s = 0;
    unsigned g;
    for (i = -100; i < 2400; i += 333) put_i16(interpolate(i));
    for (i = 0; i < 5300; i += 1300) put_i16(find_inverse(i));
    put_i16(ones(0xF0F1UL) * 100 + ones(0xFFFFFFFFUL));
    for (i = 0; i < 3; i++) put_u32(substitute(0xBEEFu, i));
    put_i16(day_of_year(2000, 3, 1));
    put_i16(day_of_year(1900, 12, 31));
    put_i16(weekday(2024, 2, 29));
    put_i16(weekday(1999, 12, 31));
    for (i = 0; i < 2; i++)
        for (j = 0; j < 3; j++)
            for (k = 0; k < 4; k++) s += cube[i][j][k] * (i + 2 * j - k);
    put_i16(s);
    for (i = 0, s = 0; i < 5; i++) s = s * 5 % 997 + order[order[i]];
    put_i16(s);
    put_f32(scale[0] * scale[1] + scale[2]);
    for (i = 5; i < 100; i += 15) put_str(look_up(i));
    for (g = 0; g < 8; g++) put_u32(g ^ g >> 1);
    return 0;
}
