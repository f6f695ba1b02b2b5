// What --globals, --stats and --profile print.
#pragma once

#include "tools/exec/compile.h"

void print_globals(const PROGRAM& p, FILE* out);
void print_stats(const PROGRAM& p, FILE* out);
void print_profile(const PROGRAM& p, FILE* out);
