// What is known of the current function, and whether it is true now.
//
// A pass asks for what it relies on with `need`, which finds what is not known, and says with `changed` what its work
// left true; everything else is forgotten. In between it may change statements and keep using a fact, as long as it
// knows what the change does to that fact. An edit of blocks or edges ends at once what rests on the graph.
//
// A room that can find a fact defines a FACT_FINDER beside the code that finds it.
#pragma once

#include <cstdint>

class FUNINFO;

using FACTS = uint32_t;

namespace fact {
constexpr FACTS none = 0;
constexpr FACTS block_numbers = 1 << 0;  // `dfn`, `bb_count`, numbers and references of labels
constexpr FACTS dominators = 1 << 1;     // FUNINFO::dominators
constexpr FACTS loops = 1 << 2;          // FUNINFO::loops
constexpr FACTS alias_marks = 1 << 3;    // `is_aliased` of the function's symbols and of the globals
constexpr FACTS pointees = 1 << 4;       // FUNINFO::spmap: what pointer variables point into
constexpr FACTS pointer_groups = 1 << 5; // the roots of the PTR records: which pointers come from one value, `restrict`
constexpr FACTS live_variables = 1 << 6; // `bitnum` of the candidates, FUNINFO::live_sets
constexpr FACTS points_to = 1 << 7; // bindings at accesses, and of pointers at the blocks' entries; ends with any edit of the graph
constexpr FACTS graph = block_numbers | dominators | loops; // what blocks and edges alone decide
constexpr FACTS alias = alias_marks | pointees | pointer_groups;
constexpr FACTS every = ~FACTS(0);
constexpr int count = 8;
} // namespace fact

struct FACT_FINDER {
    const char* name;
    FACTS rests_on;      // needed first; where one of these is forgotten, so is what rests on it
    FACTS found_too;     // what the same walk also finds where that is wanted
    void (*find)(FACTS); // the fact and what of `found_too` is given, for the current function
    void (*forget)();    // gives back what the fact holds in memory; may be null
    // For validation: finds it anew and compares; on return the fact is as it was or found anew. True if what was known
    // is still so. May be null.
    bool (*still_holds)();

    FACT_FINDER(const char* name, FACTS fact, FACTS rests_on, void (*find)(FACTS), void (*forget)() = nullptr,
                bool (*still_holds)() = nullptr, FACTS found_too = fact::none);
    FACT_FINDER(const FACT_FINDER&) = delete;
    FACT_FINDER& operator=(const FACT_FINDER&) = delete;
};

// All facts of `wanted` are true of the current function afterwards. A fact that no linked room finds is an assertion
// failure.
void need(FACTS wanted);
// The current function was changed; of what was known `stays` is still true. A fact ends with what it rests on.
void changed(FACTS stays);
bool is_known(FACTS facts); // all of them, of the current function
// For the edits of the graph: blocks came or went, or edges alone did. Of the facts that rest on the graph only its own
// are forgotten: an edit in the middle of a pass does not take from it what it works with.
void graph_was_changed(FUNINFO* f);
void edges_were_changed(FUNINFO* f); // blocks keep their numbers
// Finds every known fact anew and reports to the debug stream, or stderr without one, which ones were no longer true;
// their number.
int validate_facts();
