// What is known of a loop that may be unrolled, and what a factor would make of it.
//
// Costs are of trees: time is what an iteration executes, in operators by their weight, a block that does not run in
// each iteration for half; space is operators. A trial computes the costs of the unrolled body, it does not build it.
#pragma once

#include "OPT5/cd/unroll_build.h"
#include "XINT/int65.h"

#include <cstdint>
#include <cstdio>
#include <string>

struct LOOP_UNROLLING_INFO {
    struct LOOP* loop = nullptr;
    int32_t loopNestingLevel = 0;
    INT65 maximumTripCount, minimumTripCount;
    INT65 f, x; // the count is f * N + x; f is 0 where it is x
    uint64_t originalTimeCost = 0, originalSpaceCost = 0;
    uint64_t predicatedSpaceCost = 0; // of arms of QUEST
    uint32_t numberOfIFs = 0, numberOfSSVs = 0;
    uint32_t iCachePercentage = 0;
    uint32_t firstTerminationTest = 0;  // the first copy that keeps the loop's test
    uint32_t terminationTestFactor = 1; // it stays every so many copies
    uint64_t unrolledTimeCost = 0, unrolledSpaceCost = 0;
    uint64_t peeledIterationTimeCost = 0, peeledIterationSpaceCost = 0;
    uint32_t peeledIterationCount = 0;
    uint32_t unrolledFactor = 1;
    uint32_t userRequestedUF = 0; // 0 for none
    bool unrolledCompletely = false;

    explicit LOOP_UNROLLING_INFO(struct LOOP* of) : loop(of) {}

    void characterize_loop_before_unrolling(); // the count
    void characterize_body(const UNROLLED_BODY& body);
    void characterize_loop_test_intervals();
    void improve_f_and_x_given_uf();
    bool peel_excess_loop_iterationsp() const;
    bool loop_test_is_needed_for_unrolled_iteration(int copy) const;
    void characterize_unrolled_loop(int uf, int requested, bool peeled);
    // Sets the factor, 1 for none; `completely` lets none but the complete one be built. Whether iterations are peeled.
    bool select_unrolling_factor(bool completely);
    bool unrolling_completely_wins() const;
    // Every copy but the last is without the loop's test: the only bodies that are built.
    bool has_one_test() const;
    REST rest() const;

    void print(const char* title, FILE* out) const;

private:
    bool count_is_exact() const;
    bool is_multiple_of(uint32_t uf) const;
    int most_copies_beside_rest() const;

    uint64_t testTimeCost = 0, testSpaceCost = 0;
    uint64_t stepTimeCost = 0, stepSpaceCost = 0; // of what copies leave out
    int64_t entryTimeCost = 2;                    // of pointers and a limit, ahead of a loop
    int64_t placesTimeCost = 0;                   // of an iteration more, in the loop's place
    bool peeled = false;
};

// No calls, no early end, a preheader; each statement may be in an unrolled loop, and the target has nothing better.
// `requested`: the target is not asked. Where the answer is no, `*why`, if it is not null, says what is in the way.
bool loop_is_OK_for_unrolling(struct LOOP* loop, bool requested, std::string* why);
