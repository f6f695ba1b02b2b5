// Exception tables under call integration.
#pragma once

#include <cstdint>

struct CFG_COPY;

// The exceptions of a copied body become the current function's. An exception that left the body does what the entry of the
// call that it stands for says. `copy.eht` is used up.
void merge_exception_tables(CFG_COPY& copy, uint32_t entry_of_call);

// Every statement that may lead to a handler is followed by a dispatch, which names all handlers of the function.
void renew_dispatches();
