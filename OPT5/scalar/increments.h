// Moves pointer steps to the memory references beside them, where the address registers step for free.
#pragma once

// `x = *p; p += 1;` becomes `x = *p++`. Where the trees are those of the output.
void propagate_increments();

// The reverse, for passes that read the steps of pointers as statements: `x = *p++` becomes `x = *p; p += 1;`. What is
// not certain to be evaluated with its statement stays.
void spell_out_increments();
// Moves steps back to where `spell_out_increments` took them from: nothing but the steps changes.
void propagate_increments_again();
