// What is known of a tree against the values that it has.

#include "tools/treecheck/checker.h"

#include "OPT5/ir/trees.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/symbolic.h"

namespace treecheck {

FINDING TRIAL::check_facts() const {
    FINDING finding;
    if (runs.empty() || form.is_float || form.is_pointer || !form.bits) return finding;
    const KNOWN_BITS k = known_bits(tree);
    const uint64_t mask = type_mask(tree->type).value;
    for (const RUN& r : runs) {
        const uint64_t bits = r.value & mask;
        if ((bits & k.zeros) || (~bits & k.ones)) finding.what = "known bits";
        if (!finding) continue;
        finding.what += ": value " + value_text(r.value, form);
        finding.before = tree_to_infix(tree);
        finding.contents = contents(r.assignment);
        break;
    }
    return finding;
}

} // namespace treecheck
