// The pipeline: everything that happens to a function between reading and writing, as rows of three tables.
//
//     behind reading     reading.cpp    a function's statements have been read: to its graph, and what pass 1 needs
//     the steps          steps.cpp      0 to 80, the numbered table
//     ahead of output    writing.cpp    what the last step, "output function", does before it writes
//
// Nothing else runs a pass. A row says what the pass needs and what it leaves true (OPT5/ir/facts.h); whatever it does
// not name is forgotten behind it. A pass that has work in few functions asks for facts by itself, behind its first look.
#pragma once

#include "OPT5/ir/facts.h"

#include <cstdio>
#include <string>

// What stands around the work of a row: its first half before, its second half behind.
struct FRAME {
    void (*begin)();
    void (*end)();
    bool is_SSA_form = false; // which stays for the next such row
};

struct ROW {
    enum KIND : uint8_t {
        FUNCTION,
        BARRIER, // once for the whole program, with no current function
        FIXED,   // of a function; the program is not one without it, so no switch takes it out
        // Of a function; its action changes nothing: what it calls is not built yet, or has no work on this target. The row is
        // entered and dumped, its frame and its action are left out; under `debug:idle_frames` its action alone.
        IDLE,
    };
    KIND kind;
    const char* name;
    const FRAME* frame;  // null: none
    bool (*condition)(); // null: always
    void (*action)();
    FACTS needs;  // true when the work begins
    FACTS leaves; // still true behind it
};

// How the dump and messages name a row: "step 12", or by its table alone. The text is made where it is printed.
struct ROW_LABEL {
    const char* word;
    int number = -1; // below 0: none
    std::string text() const { return number < 0 ? word : std::string(word) + " " + std::to_string(number); }
};

// Runs a row of a function or a barrier: left out by switch, under its condition, in its frame, between its facts. The
// function is dumped before and behind to the debug stream, and validated behind under `debug:validate`.
void run_row(const ROW& row, const ROW_LABEL& label, bool skip);

// Under `enable:time_stats`, behind the run: the time of each row, with that of its frame, over all functions.
void report_row_times(FILE* out);

// The two tables beside the steps, for the current function.
void run_rows_behind_reading();
void run_rows_ahead_of_output();

// The name of a row as the switches write it: small letters and digits, everything else a single "-".
std::string switch_name(const ROW& row);
// Whether `debug:skip=NAME` or `debug:only=NAME` takes the row out; names are joined by "+".
bool is_left_out(const ROW& row);
// Ends the run with a message if one of the two switches names no row, or a row that cannot be taken out. Under
// `debug:list_rows` prints the rows of the three tables first: table, switch name ("*": runs always), name.
void check_row_switches();

// ---- The tables
struct ROWS {
    const ROW* first;
    int count;
    template <int N>
    ROWS(const ROW (&rows)[N]) : first(rows), count(N) {}
    const ROW* begin() const { return first; }
    const ROW* end() const { return first + count; }
};
ROWS rows_behind_reading();
ROWS rows_of_steps();
ROWS rows_ahead_of_output();

// ---- Conditions of rows
constexpr bool (*always)() = nullptr;
bool L1(); // the level of the current function is at least 1
bool L2();
