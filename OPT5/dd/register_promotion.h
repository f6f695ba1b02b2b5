// What the two halves of register promotion share: candidates, and the temporaries that hold their values.
#pragma once

#include "OPT5/ir/code_motion.h"
#include "OPT5/dd/ssa.h"
#include "OPT5/ir/list.h"

#include <memory>
#include <unordered_map>

class NATURAL_LOOPS;
struct NATURAL_LOOP;
class FREQUENCIES;

struct PROMOTION_EVENT : MOTION_EVENT {
    LIST* cell;  // the statement; null: of a new load
    NODE** link; // of a USE: holds the SSA_USE
    bool is_step = false; // the read of the compound assignment that the next event is
};

struct PROMOTION_CANDIDATE {
    explicit PROMOTION_CANDIDATE(SSAVAR* v) : variable(v) {}
    ~PROMOTION_CANDIDATE();
    PROMOTION_CANDIDATE(const PROMOTION_CANDIDATE&) = delete;
    PROMOTION_CANDIDATE& operator=(const PROMOTION_CANDIDATE&) = delete;

    SSAVAR* variable;
    SYMTAB* temp = nullptr; // once there is one
    NODE* reference = nullptr; // a copy of one without SSA operators, as the trees of the function are now; owned
    std::vector<PROMOTION_EVENT> events; // by block and place
    std::vector<size_t> cut; // headers of loops that have no register for it
    double weight = 0;       // how often it is accessed
    bool may_trap() const { return variable->pointer != nullptr; }
};

// The temporary of each place, one for all of its accesses: whenever it is read it holds what the place holds.
class PROMOTION_TEMPS {
public:
    SYMTAB* of(PROMOTION_CANDIDATE& c);

private:
    struct ENTRY {
        bool is_indirect;
        INT65 start, length;
        SYMTAB* temp;
    };
    std::unordered_map<const SYMTAB*, std::vector<ENTRY>> entries; // by object or pointer; looked up, never walked
};

constexpr size_t MOST_VALUES_IN_LOOP = 12; // that a loop has registers for
// Blocks of the graph times batches: what is beyond is promoted within blocks alone. Time stays linear.
constexpr size_t MOST_BLOCKS_OF_BATCHES = 400000;

// Stores of the candidates that another store makes needless, and those that move behind loops. Whether any changed.
bool promote_stores(const std::vector<std::unique_ptr<PROMOTION_CANDIDATE>>& candidates, PROMOTION_TEMPS& temps);
