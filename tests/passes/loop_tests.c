// A loop is closed by one conditional branch, and is one piece of text: its test moves to its end, or stands there a
// second time, and what it is left to stands behind it.
// RUN: --opt_level=2
#include <zrun.h>

int g[8];

// FUNCTION: nested
// HAS: /^if .* goto L4/
// HAS: /^if .* goto L3/
// HAS: L2:
// HAS: /^if .* goto L2/
// HAS: /^if .* goto L1/
// COUNT 0: /^goto/
int nested(int n) {
    int sum = 0, i, j;
    for (i = 0; i < n; i++)
        for (j = 0; j < i; j++) sum += g[j];
    return sum;
}

// A first test that is known to stay is not made.
// FUNCTION: in_turn
// COUNT 0: /^goto/
// COUNT 3: /^if .* goto/
int in_turn(int n) {
    int sum = 0;
    for (int i = 0; i < n; i++) sum += sum ^ i;
    for (int i = 0; i < 9; i++) sum += sum ^ n;
    return sum;
}

int main(void) {
    put_i16(in_turn(4) + in_turn(0));
    for (int i = 0; i < 8; i++) g[i] = i * i;
    for (int n = -1; n < 7; n += 2) put_i16(nested(n));
    return 0;
}
