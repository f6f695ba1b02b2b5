// What the tool calls itself.
#pragma once

#include <cstdio>

const char* tool_name();           // "C/C++ Optimizer"
const char* isa_and_tool_name();   // with the family's name in front
const char* tool_version();        // "1.0.0"
void print_toolversion(FILE* out); // one line: name and version
