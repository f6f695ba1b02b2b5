// Objects of static duration: locals that keep their value, initial values of every kind, addresses as constants.
#include <zrun.h>

static int zeroed[5];
static int partly[6] = {1, 2, 3};
static const char* names[] = {"zero", "one", "two"};
static int* inside = &partly[2];
static struct {
    int a;
    long b;
    float c;
    const char* d;
} record = {-1, 100000L, 0.5F, "record"};
static int matrix[2][3] = {{1}, {4, 5}};
static long big = 0x7FFFFFFFL;
static unsigned long ubig = 0xFFFFFFFFUL;
static long long huge = -1234567890123LL;
int exported = 9;
extern int later;

static int counter(int step) {
    static int n = 100;
    n += step;
    return n;
}

static int once(void) {
    static int done;
    if (done) return 0;
    done = 1;
    return 1;
}

static unsigned next_random(void) {
    static unsigned long seed = 1;
    seed = seed * 1103515245UL + 12345UL;
    return (unsigned)(seed >> 16) & 0x7FFFu;
}

static long memo(int n) {
    static long known[30];
    if (n < 2) return n;
    if (!known[n]) known[n] = memo(n - 1) + memo(n - 2);
    return known[n];
}

static int average(int x) {
    static int history[4], at, sum;
    sum += x - history[at];
    history[at] = x;
    at = (at + 1) & 3;
    return sum >> 2;
}

static int* slot(int i) {
    static int slots[3] = {7, 8, 9};
    return &slots[i];
}

static int same_name(int which) {
    if (which) {
        static int v = 1;
        return v *= 2;
    } else {
        static int v = 1000;
        return v -= 1;
    }
}

static int recursive(int n) {
    static int depth, deepest;
    if (++depth > deepest) deepest = depth;
    if (n > 0) recursive(n - 1);
    if (n > 2) recursive(n - 3);
    depth--;
    return deepest * 10 + depth;
}

int later = 31;

int main(void) {
    int i, s = 0;
    for (i = 0; i < 5; i++) s += zeroed[i]++;
    for (i = 0; i < 6; i++) s = s * 2 + partly[i];
    put_i16(s);
    put_str(names[1]);
    put_i16(names[2][1]);
    put_i16(*inside + inside[-1] + inside[1]);
    put_i16(record.a);
    put_i32(record.b);
    put_f32(record.c);
    put_str(record.d + 2);
    put_i16(matrix[0][0] + matrix[0][2] + matrix[1][1] * 10 + matrix[1][2]);
    put_i32(big);
    put_u32(ubig);
    put_i64(huge);
    put_i16(exported + later);
    for (i = 0; i < 3; i++) put_i16(counter(i));
    put_i16(once() * 10 + once());
    for (i = 0; i < 4; i++) put_u32(next_random());
    put_i32(memo(29));
    for (i = 0; i < 7; i++) put_i16(average(i * i));
    *slot(1) += 5;
    put_i16(*slot(0) * 100 + *slot(1));
    put_i16((int)(slot(2) - slot(0)));
    for (i = 0; i < 4; i++) put_i16(same_name(i & 1));
    put_i16(recursive(5));
    put_i16(recursive(2));
    later = exported++;
    put_i16(exported * 10 + later);
    return 0;
}
