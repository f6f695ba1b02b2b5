// An interpreter for a small stack machine: jumps, calls, memory; runs sieve, factorial, and greatest divisor.
#include <zrun.h>

enum op {
    HALT,
    PUSH,
    ADD,
    SUB,
    MUL,
    DIV,
    MOD,
    DUP,
    SWAP,
    OVER,
    DROP,
    LOAD,
    STORE,
    JUMP,
    ZERO,
    LESS,
    CALL,
    BACK,
    OUT,
    OPS
};

static long memory[64];
static unsigned long executed[OPS];

static int run(const int* code, int at, long limit) {
    long stack[16], t;
    int sp = 0, calls[12], depth = 0;
    while (limit-- > 0) {
        int op = code[at++];
        if (op < 0 || op >= OPS) return -3;
        executed[op]++;
        switch (op) {
        case HALT: return sp;
        case PUSH: stack[sp++] = code[at++]; break;
        case ADD:
            sp--;
            stack[sp - 1] += stack[sp];
            break;
        case SUB:
            sp--;
            stack[sp - 1] -= stack[sp];
            break;
        case MUL:
            sp--;
            stack[sp - 1] *= stack[sp];
            break;
        case DIV:
            if (stack[--sp] == 0) return -1;
            stack[sp - 1] /= stack[sp];
            break;
        case MOD:
            if (stack[--sp] == 0) return -1;
            stack[sp - 1] %= stack[sp];
            break;
        case DUP:
            stack[sp] = stack[sp - 1];
            sp++;
            break;
        case SWAP:
            t = stack[sp - 1];
            stack[sp - 1] = stack[sp - 2];
            stack[sp - 2] = t;
            break;
        case OVER:
            stack[sp] = stack[sp - 2];
            sp++;
            break;
        case DROP: sp--; break;
        case LOAD: stack[sp - 1] = memory[stack[sp - 1]]; break;
        case STORE:
            sp -= 2;
            memory[stack[sp + 1]] = stack[sp];
            break;
        case JUMP: at = code[at]; break;
        case ZERO: at = stack[--sp] == 0 ? code[at] : at + 1; break;
        case LESS:
            sp--;
            stack[sp - 1] = stack[sp - 1] < stack[sp];
            break;
        case CALL:
            if (depth == 12) return -2;
            calls[depth++] = at + 1;
            at = code[at];
            break;
        case BACK: at = calls[--depth]; break;
        case OUT: put_i32(stack[--sp]); break;
        }
    }
    return -4;
}

int main(void) {
    static const int factorial[] = {PUSH, 10,  CALL, 6, OUT, HALT, DUP,  ZERO, 17, DUP, PUSH,
                                    1,    SUB, CALL, 6, MUL, BACK, DROP, PUSH, 1,  BACK};
    static const int divisor[] = {PUSH, 1071, PUSH, 462, DUP, ZERO, 12, SWAP, OVER, MOD, JUMP, 4, DROP, OUT, HALT};
    static const int sieve[] = {PUSH, 2,     PUSH, 0,    STORE, PUSH, 0,    LOAD, PUSH, 60,   LESS, ZERO, 54,
                                PUSH, 0,     LOAD, LOAD, ZERO,  22,   JUMP, 43,   HALT, PUSH, 0,    LOAD, OUT,
                                PUSH, 0,     LOAD, DUP,  DUP,   PUSH, 60,   LESS, ZERO, 55,   DUP,  PUSH, 1,
                                SWAP, STORE, JUMP, 57,   PUSH,  0,    LOAD, PUSH, 1,    ADD,  PUSH, 0,    STORE,
                                JUMP, 5,     HALT, JUMP, 61,    OVER, ADD,  JUMP, 30,   DROP, DROP, JUMP, 43};
    static const int endless[] = {JUMP, 0}, zero[] = {PUSH, 5, PUSH, 0, DIV}, deep[] = {CALL, 0},
                     bad[] = {PUSH, 1, OPS, HALT};
    int i;
    put_i16(run(factorial, 0, 1000L));
    put_i16(run(divisor, 0, 40L));
    put_i16(run(sieve, 0, 10000L));
    put_i16(run(endless, 0, 1000L));
    put_i16(run(zero, 0, 1000L));
    put_i16(run(deep, 0, 1000L));
    put_i16(run(bad, 0, 1000L));
    for (i = 0; i < OPS; i++) put_u32(executed[i]);
    return 0;
}
