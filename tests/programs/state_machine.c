// Protocol receiver as a switch-driven automaton with byte stuffing, time-outs and a checksum; and as a table.
#include <zrun.h>

enum state { IDLE, LENGTH, BODY, ESCAPED, CHECK, STATES };
enum { START = 0x7E, STOP = 0x7F, ESCAPE = 0x7D };

struct receiver {
    enum state state;
    int wanted, count, sum, silence;
    int body[8];
};

static int good, bad, timeouts;

static void fail(struct receiver* r) {
    bad++;
    r->state = IDLE;
}

static void receive(struct receiver* r, int byte) {
    r->silence = 0;
    switch (r->state) {
    case IDLE:
        if (byte != START) break;
        r->state = LENGTH;
        r->sum = r->count = 0;
        break;
    case LENGTH:
        if (byte < 1 || byte > 8) {
            fail(r);
            break;
        }
        r->wanted = byte;
        r->state = BODY;
        break;
    case BODY:
        if (byte == ESCAPE) {
            r->state = ESCAPED;
            break;
        }
        if (byte == START) {
            fail(r);
            r->state = LENGTH;
            r->sum = r->count = 0;
            break;
        }
        goto store;
    case ESCAPED:
        byte ^= 0x20;
    store:
        r->body[r->count++] = byte;
        r->sum += byte;
        r->state = r->count == r->wanted ? CHECK : BODY;
        break;
    case CHECK:
        if ((r->sum & 0xFF) == byte) {
            good++;
            r->state = IDLE;
        } else
            fail(r);
        break;
    default: fail(r);
    }
}

static void tick(struct receiver* r) {
    if (r->state != IDLE && ++r->silence > 2) {
        timeouts++;
        r->state = IDLE;
    }
}

/* A sign, digits, a point, digits: -1 stops; 0 start, 1 sign, 2 whole, 3 point, 4 part. */
static const signed char transitions[5][4] = {
    {1, 2, 3, -1}, {-1, 2, 3, -1}, {-1, 2, 3, -1}, {-1, 4, -1, -1}, {-1, 4, -1, -1}};

static int is_number(const char* s) {
    int state = 0;
    for (; *s; s++) {
        int kind = *s == '-' || *s == '+' ? 0 : *s >= '0' && *s <= '9' ? 1 : *s == '.' ? 2 : 3;
        state = transitions[state][kind];
        if (state < 0) return 0;
    }
    return state == 2 || state == 4;
}

int main(void) {
    static const int line[] = {1,     START, 2,     10, 20, 30, START, 3, ESCAPE, 0x5E, 5,   6,  (0x7E + 11) & 255,
                               START, 9,     START, 4,  1,  2,  START, 1, 7,      8,    -1,  -1, START,
                               2,     -1,    -1,    -1, -1, 5,  START, 1, 0,      0,    STOP};
    static const char* const texts[] = {"12", "-3.5", ".", "+.5", "1.", "", "7x", "--1", "1.2.3", "007"};
    struct receiver r = {IDLE, 0, 0, 0, 0, {0}};
    unsigned i;
    for (i = 0; i < sizeof line / sizeof line[0]; i++)
        if (line[i] < 0)
            tick(&r);
        else
            receive(&r, line[i]);
    put_i16(good);
    put_i16(bad);
    put_i16(timeouts);
    put_i16(r.state);
    put_i16(r.body[0]);
    r.state = STATES;
    receive(&r, 0);
    put_i16(bad);
    for (i = 0; i < 10; i++) put_i16(is_number(texts[i]));
    return 0;
}
