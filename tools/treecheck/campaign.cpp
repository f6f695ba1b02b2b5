#include "tools/treecheck/campaign.h"

#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"

namespace treecheck {

namespace {

using CHECK = std::function<FINDING(const NODE*)>;

FINDING check_canonical(const NODE* tree) {
    FINDING f;
    NODE* once = simp_tree(copy_tree(tree), nullptr);
    NODE* twice = simp_tree(copy_tree(once), nullptr);
    if (!trees_are_congruent(once, twice, true)) {
        f.what = "strict: a second simplification changes the tree to " + tree_to_infix(twice);
        f.before = tree_to_infix(tree);
        f.after = tree_to_infix(once);
    }
    erase_tree(once);
    erase_tree(twice);
    return f;
}

class RUNNER {
public:
    RUNNER(const CAMPAIGN& campaign, const std::function<void(const FINDING&, uint64_t)>& to)
        : c(campaign), report(to) {}

    OUTCOME run() {
        world();
        for (uint64_t n = 0; n < c.count && o.findings < c.most_findings; ++n) {
            trees_are_normalized = (c.seed + n) % 8 == 3; // the form of loop work
            one(c.seed + n);
        }
        trees_are_normalized = 0;
        return o;
    }

private:
    void one(uint64_t seed) {
        GENERATOR make(seed, c.trees);
        NODE* raw = make.tree();
        ++o.trees;
        bool found =
            judge(raw, seed, [&](const NODE* t) { return TRIAL(t, seed, c.assignments).check(mandatory_casts); });
        NODE* tree = insert_mandatory_casts(raw);
        const TRIAL whole(tree, seed, c.assignments);
        o.runs += static_cast<uint64_t>(whole.defined_runs());
        if (c.show) show(tree, seed);
        // The operations are built on one another: one finding of a tree is enough. All but the first take turns.
        for (size_t i = 0; i < operations.size() && !found; ++i)
            if ((i == 0 || c.thorough || (seed + i) % 4 == 0) && whole.check(operations[i]))
                found = judge(tree, seed,
                              [&](const NODE* t) { return TRIAL(t, seed, c.assignments).check(operations[i]); });
        if (!found && (c.thorough || seed % 4 == 0)) found = ask(&make, tree, seed);
        if (!found && c.strict) judge(tree, seed, check_canonical);
        erase_tree(tree);
    }

    // What is known of the tree: by itself, and among givens.
    bool ask(GENERATOR* make, const NODE* tree, uint64_t seed) {
        const bool with_givens = !tree_has_side_effects(tree) && make->random.one_in(2);
        SURROUNDINGS around;
        for (unsigned n = with_givens ? make->random.pick(4) : 0; n; --n)
            around.givens.push_back(simp_tree(insert_mandatory_casts(make->given()), nullptr));
        for (unsigned n = with_givens ? 1 + make->random.pick(2) : 0; n; --n) around.varying.insert(make->favourite());
        const SURROUNDINGS* s = with_givens ? &around : nullptr;
        const int assignments = s ? 2 * c.assignments : c.assignments;
        if (judge(tree, seed, [&](const NODE* t) { return TRIAL(t, seed, assignments, s).check_facts(); })) return true;
        return s &&
               judge(tree, seed, [&](const NODE* t) { return TRIAL(t, seed, assignments, s).check(operations[0]); });
    }

    // Runs the check; a finding is reported for the smallest tree that has one of the same kind.
    bool judge(const NODE* tree, uint64_t seed, const CHECK& check) {
        const FINDING first = check(tree);
        if (!first) return false;
        const std::string kind = first.what.substr(0, first.what.find(' '));
        auto fails = [&](const NODE* t) {
            const FINDING f = check(t);
            return f && f.what.compare(0, kind.size(), kind) == 0;
        };
        NODE* small = shrink(copy_tree(tree), fails);
        report(check(small), seed);
        ++o.findings;
        erase_tree(small);
        return true;
    }

    static void show(const NODE* tree, uint64_t seed) {
        NODE* s = simp_tree(copy_tree(tree), nullptr);
        printf("%llu  %s\n    -> %s\n", static_cast<unsigned long long>(seed), tree_to_infix(tree).c_str(),
               tree_to_infix(s).c_str());
        erase_tree(s);
    }

    const CAMPAIGN& c;
    const std::function<void(const FINDING&, uint64_t)>& report;
    OUTCOME o;
};

} // namespace

OUTCOME run_campaign(const CAMPAIGN& c, const std::function<void(const FINDING&, uint64_t seed)>& report) {
    return RUNNER(c, report).run();
}

} // namespace treecheck
