// The inliners, which decide which call sites take the callee's body, and call integration, which does it.
#pragma once

// Made once per run, after the options are known.
void create_inliner();

// Empties the tables of call integration; once, ahead of reading.
void init_proc_integration();

void auto_inline_call_sites();
// Expands what `auto_inline_call_sites` chose in the current function; a call of a saved body that is not expanded brings
// the definition back.
void integrate_calls_in_function();
// Whether expansion through expansion stops at a depth.
bool inline_recursion_is_limited();
