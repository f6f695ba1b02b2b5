// A run of random trees through every check.
#pragma once

#include "tools/treecheck/checker.h"

#include <cstdint>
#include <functional>

namespace treecheck {

struct CAMPAIGN {
    uint64_t seed = 1, count = 100000;
    int assignments = 10;
    int most_findings = 10; // the run ends after so many
    bool thorough = false;  // every check on every tree; otherwise all but the first take turns
    bool strict = false;    // also reports trees that a second simplification changes
    bool show = false;
    GENERATOR_OPTIONS trees;
};

struct OUTCOME {
    uint64_t trees = 0, runs = 0; // runs: defined evaluations of trees
    int findings = 0;
};

// `report` gets each finding, of a tree that was cut down, and the seed of the tree that it came from.
OUTCOME run_campaign(const CAMPAIGN& c, const std::function<void(const FINDING&, uint64_t seed)>& report);

} // namespace treecheck
