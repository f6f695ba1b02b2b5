// Remarks: what a pass did to a loop or a call, or why it left it, for the programmer who wrote it.
//
//     if (remarks_are_wanted) remark("inline", site.psn, REMARK::MISSED, name + " is too large: ...");
//
// They are told at the end of the run, in the order of the source and each once, however often and in whatever order the
// passes made them. A missed one says what would help.
#pragma once

#include "UTIL/psn.h"

#include <cstdint>
#include <cstdio>
#include <string>

enum class REMARK : uint8_t {
    DONE,
    MISSED, // the programmer may change it
    NOTE,   // what was found out besides
};

// Ask ahead of making a text: where nobody reads remarks they cost this test.
extern bool remarks_are_wanted;

// Of the current function, if there is one. The position may be null.
void remark(const char* pass, const PSN* position, REMARK kind, const std::string& text);

void write_remarks_as_text(FILE* out, bool with_notes);
void write_remarks_as_JSON(FILE* out); // an object a line
