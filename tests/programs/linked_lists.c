// Singly and doubly linked lists out of a pool: insertion, removal, reversal, merging sort, loops found.
#include <zrun.h>

struct node {
    int value;
    struct node *next, *prev;
};

static struct node pool[40], *spare;

static void make_pool(void) {
    int i;
    spare = 0;
    for (i = 39; i >= 0; i--) {
        pool[i].next = spare;
        spare = &pool[i];
    }
}

static struct node* make(int value, struct node* next) {
    struct node* n = spare;
    if (!n) return 0;
    spare = n->next;
    n->value = value;
    n->next = next;
    n->prev = 0;
    return n;
}

static struct node* reverse(struct node* list) {
    struct node* done = 0;
    while (list) {
        struct node* next = list->next;
        list->next = done;
        done = list;
        list = next;
    }
    return done;
}

static struct node* merge(struct node* a, struct node* b) {
    struct node head, *tail = &head;
    while (a && b) {
        struct node** least = a->value <= b->value ? &a : &b;
        tail->next = *least;
        tail = *least;
        *least = (*least)->next;
    }
    tail->next = a ? a : b;
    return head.next;
}

static struct node* sort(struct node* list) {
    struct node *slow, *fast;
    if (!list || !list->next) return list;
    slow = list;
    for (fast = list->next; fast && fast->next; fast = fast->next->next) slow = slow->next;
    fast = slow->next;
    slow->next = 0;
    return merge(sort(list), sort(fast));
}

static void remove_if(struct node** list, int divisor) {
    while (*list)
        if ((*list)->value % divisor == 0) {
            struct node* gone = *list;
            *list = gone->next;
            gone->next = spare;
            spare = gone;
        } else
            list = &(*list)->next;
}

static long digest(const struct node* list) {
    long d = 7;
    for (; list; list = list->next) d = (d * 31 + list->value) % 65521L;
    return d;
}

static int has_loop(const struct node* list) {
    const struct node *slow = list, *fast = list;
    while (fast && fast->next) {
        slow = slow->next;
        fast = fast->next->next;
        if (slow == fast) return 1;
    }
    return 0;
}

int main(void) {
    struct node *list = 0, ring = {0, &ring, &ring}, *p;
    int i, n = 0;
    make_pool();
    for (i = 0; i < 30; i++) list = make((i * 17) % 31 - 12, list);
    put_i32(digest(list));
    put_i32(digest(reverse(reverse(list))));
    list = sort(list);
    put_i32(digest(list));
    put_i16(list->value);
    remove_if(&list, 3);
    put_i32(digest(list));
    while (make(99, 0)) n++;
    put_i16(n);
    put_i16(has_loop(list));
    for (p = list; p->next; p = p->next) {
    }
    p->next = list->next;
    put_i16(has_loop(list));
    for (i = 0; i < 5; i++) {
        p = &pool[i];
        p->value = i * i;
        p->prev = ring.prev;
        p->next = &ring;
        p->prev->next = p;
        ring.prev = p;
    }
    pool[2].prev->next = pool[2].next;
    pool[2].next->prev = pool[2].prev;
    for (p = ring.prev; p != &ring; p = p->prev) put_i16(p->value);
    return 0;
}
