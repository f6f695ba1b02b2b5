// Judges what the simplifier makes of a tree: the same value and the same side effects in the same order, for many
// contents of the variables.
#pragma once

#include "tools/treecheck/evaluator.h"
#include "tools/treecheck/generator.h"

#include <cstdint>
#include <functional>
#include <set>
#include <string>
#include <vector>

struct LOOP;

namespace treecheck {

// An operation under test.
struct OPERATION {
    const char* name;
    bool (*takes)(const NODE* tree); // null: any tree
    // Consumes the tree; null stands for a result without value and effects.
    NODE* (*apply)(NODE* tree, struct LOOP* loop);
    // Whether the result's value may stand for the tree's; null: the same value in the same form.
    bool (*agrees)(BITS expected, const FORM& before, BITS value, const FORM& after);
    bool value_counts; // false: only the effects do
};
extern const std::vector<OPERATION> operations;
extern const OPERATION mandatory_casts; // on trees as the generator leaves them; the others want trees with casts

struct FINDING {
    std::string what; // empty: nothing was found
    std::string before, after, contents;
    explicit operator bool() const { return !what.empty(); }
};

// Conditions that hold wherever a tree stands, and which variables change from one iteration of its loop to the next.
// Stands in for a loop of the optimizer.
class SURROUNDINGS {
public:
    SURROUNDINGS() = default;
    ~SURROUNDINGS();
    SURROUNDINGS(const SURROUNDINGS&) = delete;
    SURROUNDINGS& operator=(const SURROUNDINGS&) = delete;

    std::vector<NODE*> givens; // owned
    std::set<const SYMTAB*> varying;

    struct LOOP* loop() const;
    std::string text() const;
};

// A tree with what it does under a number of assignments of its variables.
class TRIAL {
public:
    // The tree and the surroundings are borrowed. Assignments against the givens, if there are any, do not count.
    TRIAL(const NODE* tree, uint64_t seed, int assignments, const SURROUNDINGS* around = nullptr);
    // Applies the operation to a copy of the tree and compares.
    FINDING check(const OPERATION& op) const;
    // What is known of the tree (bits, bounds, signs, factors) against its values.
    FINDING check_facts() const;
    int defined_runs() const { return static_cast<int>(runs.size()); } // in which the tree does nothing undefined

private:
    struct RUN {
        int assignment;
        BITS value;
        bool overflowed;
        std::vector<EVENT> events;
        MEMORY memory;
    };
    // What the objects hold at the start of an assignment: the first few set every variable to the same boundary, the
    // others to interesting values, often next to a constant of the tree.
    void begin(EVALUATOR* e, int assignment) const;
    bool givens_hold(EVALUATOR* e, int assignment) const;
    std::string contents(int assignment) const;

    const NODE* tree;
    uint64_t seed;
    const SURROUNDINGS* around;
    FORM form;
    std::vector<const SYMTAB*> variables; // of integer types, that the tree names
    std::vector<uint64_t> constants;      // of the tree
    std::vector<RUN> runs;                // the defined ones

    friend class FACTS;
};

// The smallest tree that cutting `tree` (consumed) gives of which `fails` holds, as it does of the tree.
NODE* shrink(NODE* tree, const std::function<bool(const NODE*)>& fails);

} // namespace treecheck
