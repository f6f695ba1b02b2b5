// Names of variables: separate live ranges get symbols of their own (rename.cpp), and what is set once and read once is
// computed where it is read (single_use.cpp).
#pragma once

class SYMTAB;

void rename_symbols();

// A new local with the type and scope of `sym`, whose name is told apart by `n`. What is known of a pointer is copied.
SYMTAB* clone_symbol(SYMTAB* sym, int n);

// Computes the value of a variable that is set once and read once where it is read. The bits of the candidates stand.
void eliminate_single_use_temps();
