// Functions that nothing but calls by name enters, in bodies that are all looked at.
#pragma once

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"

// The function is the current one as long as the object lives.
class CURRENT {
public:
    explicit CURRENT(FUNINFO* f) {
        currfuninfo = f;
        currfunc = f->symbol;
    }
    ~CURRENT() {
        currfuninfo = nullptr;
        currfunc = nullptr;
    }
    CURRENT(const CURRENT&) = delete;
    CURRENT& operator=(const CURRENT&) = delete;
};

// Gives FUNINFO::formals to these functions, as far as they have parameters. Whether there is any.
bool enter_formals();
// Each caller ahead of what it calls, but for cycles: so that what is passed on is known when it is needed.
std::vector<FUNINFO*> callers_first();
