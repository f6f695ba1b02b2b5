// Passes that rewrite forms of the source into plainer ones, and back ahead of the output.
//
//     tail_recursion.cpp  bitfields.cpp  explode.cpp  divide.cpp  static_init.cpp  stack_sharing.cpp  csu_temp.cpp
//     unsimplify.cpp      each what its name says; clusters and instrumentation, in lowering.cpp, are not built yet
#pragma once

class NODE;

// Calls that the current function makes of itself as its last act become jumps to its start. Behind `buildcfg`.
void remove_tail_recursion();

// Bit-field accesses become operations on their containers.
void expand_bitfields();

// A local structure becomes a set of variables.
void explode_auto_struct_vars();

// Divisions by constants become multiplications where the target gains.
void transform_DIVs_by_ICONs();

// Masks that clear no bit of what variables hold go.
void drop_needless_masks();

// Assignments of a static-initializer function become initial values.
void convert_sti_to_cinit();

// Lays the locals of disjoint scopes out in one aggregate.
void build_stack_sharing_type();

// The temporary that takes a structure result is replaced by the variable that it is copied to.
void subst_csu_returning_temp_for_local_var();

// Simplifier forms that the code generator does not want are undone.
void unsimplify();

// References to clustered symbols; clustering is no part of this family.
void expand_cluster_refs();
void collect_clustered_symbols();

// The program is being built for instrumentation; no option of this family asks for it.
extern int GO_FOR_INSTRUMENTATION;
// Registers the exit routine of the instrumentation in `main`.
void add_instrumentation_exit_routine_to_atexit();
