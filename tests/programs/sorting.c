// Seven sorts over the same data must agree; stability and counts of comparisons are printed.
#include <zrun.h>

#define N 40

static int data[N], copy[N], temp[N];
static long compared;

static int less(int a, int b) {
    compared++;
    return a < b;
}

static void swap(int* a, int* b) {
    int t = *a;
    *a = *b;
    *b = t;
}

static void bubble(int* a, int n) {
    int changed;
    do {
        int i;
        changed = 0;
        for (i = 1; i < n; i++)
            if (less(a[i], a[i - 1])) {
                swap(a + i, a + i - 1);
                changed = 1;
            }
        n--;
    } while (changed);
}

static void insertion(int* a, int n) {
    int i, j;
    for (i = 1; i < n; i++) {
        int v = a[i];
        for (j = i; j > 0 && less(v, a[j - 1]); j--) a[j] = a[j - 1];
        a[j] = v;
    }
}

static void selection(int* a, int n) {
    int i, j;
    for (i = 0; i < n - 1; i++) {
        int m = i;
        for (j = i + 1; j < n; j++)
            if (less(a[j], a[m])) m = j;
        if (m != i) swap(&a[i], &a[m]);
    }
}

static void shell(int* a, int n) {
    int gap, i, j;
    for (gap = n / 2; gap > 0; gap /= 2)
        for (i = gap; i < n; i++)
            for (j = i - gap; j >= 0 && less(a[j + gap], a[j]); j -= gap) swap(&a[j], &a[j + gap]);
}

static void quick(int* a, int n) {
    while (n > 1) {
        int pivot = a[(n - 1) / 2], i = -1, j = n;
        for (;;) {
            do i++;
            while (less(a[i], pivot));
            do j--;
            while (less(pivot, a[j]));
            if (i >= j) break;
            swap(a + i, a + j);
        }
        if (j + 1 < n - j - 1) {
            quick(a, j + 1);
            a += j + 1;
            n -= j + 1;
        } else {
            quick(a + j + 1, n - j - 1);
            n = j + 1;
        }
    }
}

static void merge(int* a, int n) {
    int half = n >> 1, i = 0, j = half, k = 0;
    if (n < 2) return;
    merge(a, half);
    merge(a + half, n - half);
    while (i < half && j < n) temp[k++] = less(a[j], a[i]) ? a[j++] : a[i++];
    while (i < half) temp[k++] = a[i++];
    while (k--) a[k] = k < j ? temp[k] : a[k];
}

static void radix(int* a, int n) {
    int shift, i;
    for (shift = 0; shift < 16; shift += 4) {
        int count[17] = {0};
        for (i = 0; i < n; i++) count[((((unsigned)a[i] ^ 0x8000u) >> shift) & 15u) + 1]++;
        for (i = 0; i < 16; i++) count[i + 1] += count[i];
        for (i = 0; i < n; i++) temp[count[(((unsigned)a[i] ^ 0x8000u) >> shift) & 15u]++] = a[i];
        for (i = 0; i < n; i++) a[i] = temp[i];
    }
}

static long digest(const int* a) {
    unsigned long d = 1;
    int i;
    for (i = 0; i < N; i++) d = d * 33UL + (unsigned long)(long)a[i];
    return (long)(d & 0x7FFFFFFFUL);
}

int main(void) {
    static void (*const sorts[])(int*, int) = {bubble, insertion, selection, shell, quick, merge, radix};
    unsigned s;
    int i;
    for (i = 0; i < N; i++) data[i] = (int)((i * 12345L) % 20011L) - 10000;
    data[7] = 32767;
    data[8] = -32767 - 1;
    for (s = 0; s < sizeof sorts / sizeof sorts[0]; s++) {
        for (i = 0; i < N; i++) copy[i] = data[i];
        compared = 0;
        sorts[s](copy, N);
        put_i32(digest(copy));
        put_i32(compared);
        for (i = 1; i < N; i++)
            if (copy[i - 1] > copy[i]) put_str("not sorted");
    }
    put_i16(copy[0]);
    put_i16(copy[N - 1]);
    sorts[4](copy, 0);
    sorts[5](copy, 1);
    return 0;
}
