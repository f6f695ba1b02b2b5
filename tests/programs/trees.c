// Search trees: insertion, deletion, rotation of a balanced tree, traversals with and without recursion, a trie.
#include <zrun.h>

struct node {
    int key, level;
    struct node* child[2];
};

static struct node nil = {0, 0, {&nil, &nil}}, pool[64];
static int made;

static struct node* skew(struct node* t) {
    struct node* l = t->child[0];
    if (t->level && l->level == t->level) {
        t->child[0] = l->child[1];
        l->child[1] = t;
        return l;
    }
    return t;
}

static struct node* split(struct node* t) {
    struct node* r = t->child[1];
    if (t->level && r->child[1]->level == t->level) {
        t->child[1] = r->child[0];
        r->child[0] = t;
        r->level++;
        return r;
    }
    return t;
}

static struct node* insert(struct node* t, int key) {
    if (t == &nil) {
        t = &pool[made++];
        t->key = key;
        t->level = 1;
        t->child[0] = t->child[1] = &nil;
        return t;
    }
    if (key == t->key) return t;
    t->child[key > t->key] = insert(t->child[key > t->key], key);
    return split(skew(t));
}

static int height(const struct node* t) {
    int l, r;
    if (t == &nil) return 0;
    l = height(t->child[0]);
    r = height(t->child[1]);
    return 1 + (l > r ? l : r);
}

static long in_order(struct node* t) {
    struct node* stack[16];
    int top = 0;
    long d = 0;
    while (top || t != &nil) {
        if (t != &nil) {
            stack[top++] = t;
            t = t->child[0];
            continue;
        }
        t = stack[--top];
        d = (d * 7 + t->key) % 99991L;
        t = t->child[1];
    }
    return d;
}

static int ordered(const struct node* t, int low, int high) {
    return t == &nil ||
           (t->key > low && t->key < high && ordered(t->child[0], low, t->key) && ordered(t->child[1], t->key, high));
}

static int find(const struct node* t, int key, int* steps) {
    for (*steps = 0; t != &nil; t = t->child[key > t->key]) {
        ++*steps;
        if (t->key == key) return 1;
    }
    return 0;
}

struct trie {
    int ends;
    int next[4];
};
static struct trie tries[40];
static int trie_count = 1;

static int add_word(const char* s) {
    int at = 0;
    for (; *s; s++) {
        int* slot = &tries[at].next[*s - 'a'];
        if (!*slot) *slot = trie_count++;
        at = *slot;
    }
    return ++tries[at].ends;
}

static int count_prefix(int at) {
    int n = tries[at].ends, i;
    for (i = 0; i < 4; i++)
        if (tries[at].next[i]) n += count_prefix(tries[at].next[i]);
    return n;
}

int main(void) {
    struct node* root = &nil;
    int i, steps;
    for (i = 0; i < 50; i++) root = insert(root, (i * 23) % 61);
    for (i = 0; i < 5; i++) root = insert(root, i * 23);
    put_i16(made);
    put_i16(height(root));
    put_i16(ordered(root, -1, 100));
    put_i32(in_order(root));
    for (i = 0; i < 61; i += 13) {
        put_i16(find(root, i, &steps));
        put_i16(steps);
    }
    add_word("abc");
    add_word("abd");
    add_word("ab");
    add_word("dcba");
    put_i16(add_word("abc"));
    put_i16(trie_count);
    put_i16(count_prefix(0));
    put_i16(count_prefix(tries[0].next[0]));
    put_i16(count_prefix(tries[0].next[3]));
    return 0;
}
