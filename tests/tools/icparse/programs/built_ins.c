// Built-ins.
// Prints: -12 9 32767
#include <intrinsics.h>
#include <zrun.h>
int main(void) {
    put_i32(__mpy(-3, 4));
    put_i16(__max(3, 9));
    put_i16(__abs16_sat(-32767 - 1));
    return 0;
}
