// Superblocks and traces: blocks that run one behind the other.
#pragma once

#include <cstdio>
#include <string>
#include <vector>

class BBLK;

// Owns nothing. A proper superblock is entered at its head alone.
class SBLK {
public:
    explicit SBLK(BBLK* seed_block);

    BBLK *seed, *head, *tail;
    std::vector<BBLK*> contents;
    bool is_proper = true;
    unsigned number; // from 1 in order of creation within a function's pass

    void add_basic_block(BBLK* bb); // behind the tail
    void add_basic_block_in_front(BBLK* bb);
    void print(bool full, FILE* out) const; // `full`: the frequencies too

    static unsigned next_number;
};

// "a1.25" style texts of a frequency or a probability, led by `mark`: three digits, "0" for none, "?" for an invalid
// value.
std::string freq2text(double frequency);
std::string prob2text(double probability);
