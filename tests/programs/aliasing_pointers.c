// Stores through pointers that may or may not meet what is loaded around them.
#include <zrun.h>

static int global = 5, other = 7, array[8];
static int* where = &global;
struct pair {
    int a, b;
};
static struct pair pairs[3] = {{1, 2}, {3, 4}, {5, 6}};
static long words[4];

static int load_store_load(int* p, int* q) {
    int first = *p;
    *q = first + 1;
    return first * 10 + *p;
}

static int kept_global(int* p) {
    int sum = global;
    *p = 100;
    sum += global;
    other = 1;
    sum += global;
    return sum;
}

static int through_where(int v) {
    global = v;
    *where += 1;
    return global;
}

static void copy_overlapping(int* to, const int* from, int n) {
    while (n-- > 0) *to++ = *from++;
}

static int members(struct pair* p, struct pair* q) {
    p->a = 1;
    q->b = 2;
    q->a = 3;
    return p->a * 10 + p->b;
}

static long loop_bound(long* n, long* out, int count) {
    int i;
    for (i = 0; i < *n && i < count; i++) out[i] = i + 2;
    return *n;
}

static int address_taken(void) {
    int x = 1, y = 2, *p = &x, **pp = &p;
    *p = 10;
    **pp += 1;
    *pp = &y;
    *p = 20;
    return x * 100 + y;
}

static void swap_in_place(int* a, int* b) {
    *a ^= *b;
    *b ^= *a;
    *a ^= *b;
}

static int sum_and_clear(int* restrict a, const int* restrict b, int n) {
    int s = 0, i;
    for (i = 0; i < n; i++) {
        a[i] = 0;
        s += b[i];
    }
    return s;
}

static int invariant(int* a, int* factor, int n) {
    int i, s = 0;
    for (i = 0; i < n; i++) {
        a[i] = *factor * i;
        s += a[i];
    }
    return s;
}

int main(void) {
    int x = 3, y = 4, i;
    put_i16(load_store_load(&x, &y));
    put_i16(load_store_load(&x, &x));
    put_i16(load_store_load(array, array + 1));
    put_i16(kept_global(&other));
    put_i16(kept_global(&global));
    put_i16(through_where(41));
    where = &other;
    put_i16(through_where(41));
    put_i16(other);
    for (i = 0; i < 8; i++) array[i] = i + 1;
    copy_overlapping(array + 2, array, 5);
    for (i = 0; i < 8; i++) put_i16(array[i]);
    copy_overlapping(array, array + 3, 5);
    put_i16(array[0] * 10 + array[4]);
    put_i16(members(&pairs[0], &pairs[1]));
    put_i16(members(&pairs[2], &pairs[2]));
    words[0] = words[1] = 4;
    put_i32(loop_bound(&words[3], words, 4));
    words[1] = 4;
    put_i32(loop_bound(&words[1], words, 4));
    put_i32(words[2]);
    put_i16(address_taken());
    swap_in_place(&x, &y);
    put_i16(x * 10 + y);
    swap_in_place(&x, &x);
    put_i16(x);
    put_i16(sum_and_clear(array, array + 4, 4));
    for (i = 0; i < 8; i++) array[i] = 2;
    put_i16(invariant(array, &array[1], 5));
    put_i16(invariant(array, &y, 5));
    return 0;
}
