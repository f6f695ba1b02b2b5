// Reads of constants at file scope are their values: scalars, elements of tables, members. What has no place known
// before the run, may be replaced by the linker, or is watched, is read.
// RUN: --opt_level=2
#include <zrun.h>

static const int limit = 12, table[4] = {3, 5, 7, 11};
const unsigned char text[] = "AZ";
static int variable = 4, changing[2] = {1, 2};
int* where = &variable;
static const int grid[2][3] = {{1, 2, 3}, {4, 5, 6}};
extern const int elsewhere;

#pragma DATA_SECTION(placed, ".other")
static int placed = 5;
#pragma DATA_SECTION(placed_constant, ".other")
static const int placed_constant = 6;
#pragma RETAIN(kept)
static int kept = 7;

// What the loader or somebody outside may have set otherwise is read.
// FUNCTION: set_elsewhere
// HAS: return _kept * 16 + _placed + 6
int set_elsewhere(void) { return placed + kept * 16 + placed_constant; }

static int setting = 30, counted = 1, exposed = 2;

// Nothing in the file writes it.
// FUNCTION: never_written
// HAS: return n + 30
int never_written(int n) { return n + setting; }

// FUNCTION: written_elsewhere
// HAS: /return .*_counted.*_exposed|return .*_exposed.*_counted/
int written_elsewhere(void) { return counted + exposed; }

// FUNCTION: elements
// HAS: return n + 18
int elements(int n) { return n + table[1] + table[2] + grid[1][2]; }

// FUNCTION: letters
// HAS: return 155
int letters(void) { return text[0] + text[1] + text[2]; }

// FUNCTION: through_pointer
// HAS: return 12
int through_pointer(void) {
    const int* p = table;
    return p[1] + p[2];
}

// FUNCTION: unknown_place
// HAS: /return .*_table/
int unknown_place(int i) { return table[i]; }

// FUNCTION: beyond
// HAS: /return .*_grid/
int beyond(int n) { return n ? 0 : *((const int*)grid + 7); }

// FUNCTION: written
// HAS: /return .*_changing.*_variable/
int written(void) { return variable + changing[1]; }

// FUNCTION: address
// HAS: /return .*&_limit/
const int* address(void) { return &limit; }

int* expose(void) { return &exposed; }
void count(void) { counted++; }

int main(void) {
    *where = 9;
    *expose() = 40;
    count();
    put_i16(set_elsewhere());
    put_i16(never_written(3));
    put_i16(written_elsewhere());
    changing[1] = 3;
    put_i16(elements(2));
    put_i16(letters());
    put_i16(through_pointer());
    put_i16(unknown_place(3));
    put_i16(beyond(1));
    put_i16(written());
    put_i16(*address());
    return 0;
}
