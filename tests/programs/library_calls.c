// Memory, strings, conversion, sorting and allocation by the library. (no crosscheck)
#include <stdlib.h>
#include <string.h>
#include <zrun.h>

struct item {
    int key;
    long value;
    struct item* next;
};

static int by_key(const void* a, const void* b) { return ((const struct item*)a)->key - ((const struct item*)b)->key; }

static struct item* build(int n) {
    struct item* list = 0;
    int i;
    for (i = 0; i < n; i++) {
        struct item* t = (struct item*)malloc(sizeof *t);
        t->key = i;
        t->value = (long)i * i;
        t->next = list;
        list = t;
    }
    return list;
}

static long total(const struct item* p) { return p ? p->value + total(p->next) : 0; }

static void release(struct item* p) {
    while (p) {
        struct item* next = p->next;
        free(p);
        p = next;
    }
}

int main(void) {
    char text[40], other[40];
    int numbers[10], moved[10], *grown, i;
    struct item items[5] = {{5, 50, 0}, {1, 10, 0}, {4, 40, 0}, {2, 20, 0}, {3, 30, 0}}, key = {4, 0, 0}, *found;
    strcpy(text, "first");
    strcat(text, " second");
    put_str(text);
    put_i16((int)strlen(text));
    put_i16(strcmp(text, "first") > 0);
    put_i16(strcmp("abc", "abd") < 0);
    put_i16(strncmp("abcdef", "abcxyz", 3));
    put_str(strchr(text, 's'));
    put_i16(strchr(text, '#') == 0);
    memset(other, 'z', 5);
    other[5] = 0;
    put_str(other);
    for (i = 0; i < 10; i++) numbers[i] = i * 3;
    memcpy(moved, numbers, sizeof numbers);
    put_i16(memcmp(moved, numbers, sizeof numbers));
    memmove(moved + 2, moved, 6 * sizeof moved[0]);
    for (i = 0; i < 10; i += 3) put_i16(moved[i]);
    memmove(moved, moved + 1, 5 * sizeof moved[0]);
    put_i16(moved[0] * 100 + moved[4]);
    put_i16(atoi("-123"));
    put_i16(abs(-7) + abs(7));
    put_i32(labs(-70000L));
    qsort(items, 5, sizeof items[0], by_key);
    for (i = 0; i < 5; i++) put_i32(items[i].value);
    found = (struct item*)bsearch(&key, items, 5, sizeof items[0], by_key);
    put_i16(found == items + 3);
    key.key = 9;
    put_i16(bsearch(&key, items, 5, sizeof items[0], by_key) == 0);
    found = build(10);
    put_i32(total(found));
    release(found);
    put_i32(total(build(0)));
    grown = (int*)calloc(4, sizeof(int));
    put_i16(grown[0] + grown[3]);
    grown[3] = 8;
    grown = (int*)realloc(grown, 20 * sizeof(int));
    put_i16(grown[3]);
    free(grown);
    return 0;
}
