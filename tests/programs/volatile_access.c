// Every access of a volatile object happens, once, in order; plain ones around it may move.
#include <zrun.h>

static volatile int port, status = 3;
static volatile long counter;
static struct {
    volatile unsigned flag : 1, mode : 3;
    volatile int data[2];
    int plain;
} device;

static int wait(int limit) {
    int spins = 0;
    while (status && spins < limit) {
        status = status - 1;
        spins++;
    }
    return spins;
}

static void pulse(void) {
    port = 0;
    port = 1;
    port = 0;
}

static int read_twice(void) {
    int a = port, b = port;
    return a - b;
}

static int dead_read(void) {
    port;
    (void)status;
    return 1;
}

static long count_up(int n) {
    int i;
    for (i = 0; i < n; i++) counter++;
    return counter;
}

static int through_pointer(volatile int* p, int n) {
    int sum = 0;
    do {
        *p = *p + n;
        sum += *p;
    } while (--n > 0);
    return sum;
}

static void configure(int mode) {
    device.flag = 0;
    device.mode = (unsigned)mode & 7u;
    device.data[0] = mode;
    device.data[1] = device.data[0] + device.data[0];
    device.plain = device.data[1];
    device.flag = 1;
}

static int local_volatile(int n) {
    volatile int i, twice = 0;
    for (i = 0; i < n; ++i) twice += 2;
    return twice + i;
}

static int conditional(volatile int* p, int use) {
    int v = use ? *p : -1;
    return use && *p == v;
}

int main(void) {
    const volatile int constant = 12;
    volatile int x = 6;
    put_i16(wait(10));
    put_i16(wait(10));
    status = 20;
    put_i16(wait(5));
    put_i16(status);
    pulse();
    put_i16(read_twice());
    put_i16(dead_read());
    put_i32(count_up(10));
    put_i32(count_up(0));
    put_i16(through_pointer(&port, 4));
    put_i16(port);
    configure(5);
    put_i16(device.mode);
    put_i16(device.plain);
    configure(9);
    put_i16(device.mode + 10 * device.flag);
    put_i16(local_volatile(7));
    put_i16(conditional(&port, 0));
    put_i16(conditional(&port, 1));
    put_i16(constant * x);
    x = x;
    x += x;
    x++;
    put_i16(x);
    x = 2;
    put_i16(x * x);
    put_i16(x == x);
    put_i16(x - x);
    put_i16(x & 0);
    return 0;
}
