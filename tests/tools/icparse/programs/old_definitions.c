// Old definitions.
// Prints: 6
#include <zrun.h>
int old(a, f, c)
int a;
float f;
char c;
{ return a + (int)f + c; }
int main(void) {
    put_i16(old(1, 2.5f, 3));
    return 0;
}
