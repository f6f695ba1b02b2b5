// Open hashing with tombstones and growth, chained hashing of strings, counting words.
#include <zrun.h>

#define EMPTY (-32767 - 1)
#define GONE (-32767)

static int keys[64], values[64];
static int capacity = 8, used, live, probes;

static unsigned mix(int k) {
    unsigned h = (unsigned)k * 40503u;
    return h ^ h >> 7;
}

static int slot_of(int key, int insert) {
    unsigned i = mix(key) & (unsigned)(capacity - 1), step = 1;
    int free_slot = -1;
    for (;;) {
        probes++;
        if (keys[i] == key) return (int)i;
        if (keys[i] == EMPTY) return insert ? (free_slot >= 0 ? free_slot : (int)i) : -1;
        if (keys[i] == GONE && free_slot < 0) free_slot = (int)i;
        i = (i + step++) & (unsigned)(capacity - 1);
    }
}

static void clear(int n) {
    int i;
    capacity = n;
    used = live = 0;
    for (i = 0; i < n; i++) keys[i] = EMPTY;
}

static void put(int key, int value);

static void grow(void) {
    int old_keys[64], old_values[64], n = capacity, i;
    for (i = 0; i < n; i++) {
        old_keys[i] = keys[i];
        old_values[i] = values[i];
    }
    clear(n * 2);
    for (i = 0; i < n; i++)
        if (old_keys[i] > GONE) put(old_keys[i], old_values[i]);
}

static void put(int key, int value) {
    int s;
    if (4 * (used + 1) > 3 * capacity && capacity < 64) grow();
    s = slot_of(key, 1);
    if (keys[s] != key) {
        if (keys[s] == EMPTY) used++;
        live++;
        keys[s] = key;
    }
    values[s] = value;
}

static int drop(int key) {
    int s = slot_of(key, 0);
    if (s < 0) return 0;
    keys[s] = GONE;
    live--;
    return 1;
}

struct word {
    const char* start;
    int length, count;
    struct word* next;
};
static struct word words[16], *chains[5];
static int word_count;

static void count_word(const char* s, int n) {
    unsigned h = 5381;
    struct word* w;
    int i;
    for (i = 0; i < n; i++) h = h * 33u + (unsigned)s[i];
    for (w = chains[h % 5u]; w; w = w->next) {
        for (i = 0; i < n && w->length == n && w->start[i] == s[i]; i++) {
        }
        if (i == n && w->length == n) {
            w->count++;
            return;
        }
    }
    w = &words[word_count++];
    w->start = s;
    w->length = n;
    w->count = 1;
    w->next = chains[h % 5u];
    chains[h % 5u] = w;
}

int main(void) {
    const char *p = "the cat and the dog and the end of the cat", *q;
    int i, sum = 0;
    clear(8);
    for (i = -20; i < 20; i++) put(i * 37, i);
    put_i16(live);
    put_i16(capacity);
    for (i = -20; i < 20; i += 3) sum += drop(i * 37);
    put_i16(sum);
    put_i16(drop(1));
    put(111, 5);
    put(37, 1000);
    for (sum = 0, i = -20; i < 20; i++) {
        int s = slot_of(i * 37, 0);
        if (s >= 0) sum += values[s];
    }
    put_i16(sum);
    put_i16(live);
    put_i16(probes);
    while (*p) {
        for (q = p; *q && *q != ' '; q++) {
        }
        count_word(p, (int)(q - p));
        p = *q ? q + 1 : q;
    }
    for (i = 0; i < word_count; i++) put_i16(words[i].count * 100 + words[i].length);
    return 0;
}
