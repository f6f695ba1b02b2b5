// Which memory references may meet.
#pragma once

// What is known of the current function's references is dropped.
void reset_alias_info();

void init_dd_aliasing();
void clean_up_alias_analysis_bitvecs_etc();

// Points-to sets of the current function's pointers.
void propagate_PT_info();
