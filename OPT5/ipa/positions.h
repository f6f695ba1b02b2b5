// Which function a source position comes from, once bodies have been integrated elsewhere.
#pragma once

class SYMTAB;
struct CFG_COPY;
struct PSN;

// The positions of a copied body belong to `function`.
void enter_positions(const CFG_COPY& copy, SYMTAB* function);
// The function that the position comes from: by what was entered, then by the text of the functions that were integrated.
// Null for any other position.
SYMTAB* psn_search(const PSN* psn);
void psnref_add(SYMTAB* function); // its body was integrated somewhere
// By line, then by column, both ends included; in one file.
bool psn_is_within_psn_range(const PSN* psn, const PSN* first, const PSN* last);

// To the debug stream, under debug:dump_psn.
void dump_psnrefs(); // the functions that were integrated
void dump_psnmap();  // the positions that were entered
