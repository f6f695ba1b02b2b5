// Which loops are not unrolled, because the target runs them best as they are: under the repeat instruction.
#pragma once

#include "OPT5/ir/list.h"
#include "OPT5/ir/node.h"

#include <cstdint>

struct LOOP;

enum target_kop : uint8_t { ZELKOVA };

// What a loop does in an iteration, counted over its statements. Operators of SSA form are looked through.
template <target_kop>
class loop_is_OK_for_unrolling_on_target {
public:
    bool operator()(const struct LOOP* loop); // false: leave it as it is
    // The same of statements; `single`: they are one block.
    bool operator()(const LIST* statements, bool single);

    static bool ssa_stmt_is_multiply_accumulate(const NODE* stmt);
    static int count_fp_arithm(const NODE* t);
    // Operations that the repeat instruction does not do beside a multiplication; adds the calls of minimum and
    // maximum.
    static int count_significant_int_ops(const NODE* t, int& minmax);

private:
    void count(const LIST* statements);
    void count_store(const NODE* asg, int ops);
    bool is_OK(bool single) const;

    int int_macs = 0, float_macs = 0, dmacs = 0, fp_ops = 0, int_ops = 0;
    int constant_stores = 0, float_stores = 0, plain_stores = 0, copies = 0, minmax = 0;
};

extern template class loop_is_OK_for_unrolling_on_target<ZELKOVA>;
