// Which variables of the current function never hold a negative value.
#pragma once

#include <unordered_map>
#include <unordered_set>
#include <vector>

class NODE;
class SYMTAB;

// Judged once, when it is made: needs the alias marks, and holds until something is assigned otherwise.
class KNOWN_SIGNS {
public:
    KNOWN_SIGNS();
    bool is_nonnegative(const NODE* tree) const;

private:
    struct DEFINITION {
        const NODE* assignment;
        SYMTAB* sym;
    };
    bool keeps_nonnegative(const NODE* assignment) const;

    std::unordered_set<const SYMTAB*> nonnegative;
};
