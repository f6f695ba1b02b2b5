// Cooperative scheduler: tasks as functions with their own contexts, priorities, periods, and messages.
#include <zrun.h>

struct task;
typedef int (*body)(struct task*);

struct task {
    body run;
    int priority, period, due, done;
    long local;
    struct task* next;
};

static struct task* ready;
static int now, mailbox = -1, idle, dropped;
static unsigned long trace = 1;

static void insert(struct task* t) {
    struct task** at = &ready;
    while (*at && ((*at)->due < t->due || ((*at)->due == t->due && (*at)->priority >= t->priority))) at = &(*at)->next;
    t->next = *at;
    *at = t;
}

static void mark(int id) { trace = (trace << 3 | trace >> 29) ^ (unsigned long)id ^ (unsigned long)now; }

static int produce(struct task* t) {
    mark(1);
    if (mailbox >= 0) dropped++;
    mailbox = (int)(t->local++ % 7);
    return t->local < 12;
}

static int consume(struct task* t) {
    mark(2);
    if (mailbox < 0) return 1;
    t->local += mailbox * (t->done + 1);
    mailbox = -1;
    t->done++;
    return t->done < 8;
}

static int slow(struct task* t) {
    mark(3);
    t->period += 2;
    t->local += now;
    return t->period < 15;
}

static void schedule(int until) {
    while (ready && now < until) {
        struct task* t = ready;
        if (t->due > now) {
            idle += t->due - now;
            now = t->due;
        }
        ready = t->next;
        now++;
        if (t->run(t)) {
            t->due += t->period;
            insert(t);
        } else
            t->next = 0;
    }
}

int main(void) {
    static struct task tasks[3] = {
        {produce, 1, 3, 0, 0, 0L, 0}, {consume, 5, 4, 1, 0, 100L, 0}, {slow, 3, 5, 1, 0, 0L, 0}};
    struct task* t;
    int i, left = 0;
    for (i = 0; i < 3; i++) insert(&tasks[i]);
    schedule(25);
    put_i16(now);
    put_u32(trace);
    for (t = ready; t; t = t->next) {
        put_i16(t->priority);
        put_i16(t->due);
    }
    schedule(200);
    for (t = ready; t; t = t->next) left++;
    put_i16(left);
    put_i16(now);
    put_i16(idle);
    put_i16(dropped);
    put_u32(trace);
    for (i = 0; i < 3; i++) put_i32(tasks[i].local);
    return 0;
}
