// The walk over what is known to hold. Included by range.h.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/simp/symbolic.h"

constexpr int MOST_GIVENS = 64, MOST_FACT_LEVELS = 8; // looked at for one question, and in one of them

template <class VISIT>
void visit_given(const NODE* fact, bool holds, int levels, VISIT&& visit) {
    if (!fact || levels == 0) return;
    switch (fact->op) {
    case ASSERT:
    case NASSERT: return visit_given(fact->left, holds, levels - 1, visit);
    case COMMA: return visit_given(fact->left, holds, levels - 1, visit); // the condition of an ASSERT and its text
    case EXCLAIM: return visit_given(fact->left, !holds, levels - 1, visit);
    case ANDAND:
        if (!holds) break;
        visit_given(fact->left, true, levels - 1, visit);
        return visit_given(fact->right, true, levels - 1, visit);
    case OROR:
        if (holds) break;
        visit_given(fact->left, false, levels - 1, visit);
        return visit_given(fact->right, false, levels - 1, visit);
    }
    visit(fact, holds);
}

template <class VISIT>
void for_each_given(struct LOOP* loop, VISIT&& visit) {
    int left = MOST_GIVENS;
    auto visit_all = [&](const std::vector<NODE*>& facts) {
        for (const NODE* fact : facts)
            if (left-- > 0) visit_given(fact, true, MOST_FACT_LEVELS, visit);
    };
    if (loop_callbacks.givens)
        for (; loop && left > 0; loop = loop_callbacks.parent ? loop_callbacks.parent(loop) : nullptr)
            visit_all(loop_callbacks.givens(loop));
    if (currfuninfo) visit_all(currfuninfo->givens);
}
