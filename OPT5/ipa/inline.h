// The inliners, which decide which call sites take the callee's body, and call integration, which does it.
#pragma once

// Made once per run, after the options are known.
void create_inliner();

// Empties the tables of call integration; once, ahead of reading.
void init_proc_integration();

void auto_inline_call_sites();
void integrate_calls_in_function();

// The list of positions whose function was integrated elsewhere, to the debug stream.
void dump_psnrefs();
