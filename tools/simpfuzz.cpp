// Random trees through the simplifier: what comes out must have the value and the side effects of what went in.
//
//   simpfuzz [--count N] [--seed S] [--jobs J] [--assignments N] [--depth N] [--most N] [--thorough] [--strict]
//            [--no-floats] [--no-pointers] [--no-effects] [--show] [--hits]
//
// Tree number n of a run has the seed S + n, so that `--count 1 --seed X` shows a finding again. Each finding is cut
// down to a small tree. All checks but the first take turns unless `--thorough` is said. `--strict` also reports trees
// that a second simplification changes. `--show` prints each tree and what became of it, `--hits` how often each row of
// the patterns applied. The status is 1 if there was a finding.

#include "OPT5/simp/patterns.h"
#include "tools/treecheck/campaign.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <string>

#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace treecheck;

namespace {

[[noreturn]] void usage() {
    fprintf(stderr, "usage: simpfuzz [--count N] [--seed S] [--jobs J] [--assignments N] [--depth N] [--most N] "
                    "[--thorough] [--strict]\n"
                    "                [--no-floats] [--no-pointers] [--no-effects] [--show] [--hits]\n");
    exit(2);
}

struct WORDS {
    CAMPAIGN campaign;
    unsigned jobs = 1;
    bool hits = false;
};

WORDS arguments(int argc, char** argv) {
    WORDS w;
    CAMPAIGN& c = w.campaign;
    for (int i = 1; i < argc; ++i) {
        const std::string word = argv[i];
        auto number = [&] {
            char* end = nullptr;
            const uint64_t v = i + 1 < argc ? strtoull(argv[++i], &end, 10) : 0;
            if (!end || *end) usage();
            return v;
        };
        if (word == "--count")
            c.count = number();
        else if (word == "--seed")
            c.seed = number();
        else if (word == "--jobs")
            w.jobs = std::max(1u, static_cast<unsigned>(number()));
        else if (word == "--assignments")
            c.assignments = static_cast<int>(number());
        else if (word == "--depth")
            c.trees.depth = std::max(2, static_cast<int>(number()));
        else if (word == "--most")
            c.most_findings = static_cast<int>(number());
        else if (word == "--thorough")
            c.thorough = true;
        else if (word == "--strict")
            c.strict = true;
        else if (word == "--show")
            c.show = true;
        else if (word == "--hits")
            w.hits = true;
        else if (word == "--no-floats")
            c.trees.floats = false;
        else if (word == "--no-pointers")
            c.trees.pointers = false;
        else if (word == "--no-effects")
            c.trees.effects = false;
        else
            usage();
    }
    return w;
}

void print_finding(const FINDING& f, uint64_t seed) {
    std::string text =
        "FAIL seed " + std::to_string(seed) + " " + f.what + "\n  tree   " + f.before + "\n  result " + f.after + "\n";
    if (!f.contents.empty()) text += "  with   " + f.contents + "\n";
    fputs(text.c_str(), stdout);
    fflush(stdout);
}

// The seeds in equal parts, each in a process of its own; a part that does not end well counts as a finding.
OUTCOME run_in_parts(const CAMPAIGN& whole, unsigned jobs) {
    int channel[2];
    if (pipe(channel) != 0) return run_campaign(whole, print_finding);
    OUTCOME all;
    for (unsigned j = 0; j < jobs; ++j) {
        CAMPAIGN part = whole;
        part.seed += whole.count * j / jobs;
        part.count = whole.count * (j + 1) / jobs - whole.count * j / jobs;
        if (fork() == 0) {
            const OUTCOME o = run_campaign(part, print_finding);
            _exit(write(channel[1], &o, sizeof o) == sizeof o ? 0 : 1);
        }
    }
    close(channel[1]);
    unsigned reports = 0;
    for (OUTCOME o; read(channel[0], &o, sizeof o) == sizeof o; ++reports) {
        all.trees += o.trees;
        all.runs += o.runs;
        all.findings += o.findings;
    }
    for (unsigned j = 0; j < jobs; ++j) wait(nullptr);
    if (reports < jobs) {
        puts("FAIL a part of the run broke off");
        ++all.findings;
    }
    return all;
}

// Counters that the parts of a run share.
uint64_t* shared_counters(int n) {
    void* p = mmap(nullptr, static_cast<std::size_t>(n) * sizeof(uint64_t), PROT_READ | PROT_WRITE,
                   MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    return p == MAP_FAILED ? nullptr : static_cast<uint64_t*>(p);
}

void print_hits() {
    if (!rules::pattern_hits) return;
    for (int row = 0; row < rules::pattern_rows(); ++row)
        printf("%10llu  %s\n", static_cast<unsigned long long>(rules::pattern_hits[row]), rules::pattern_row_text(row));
}

} // namespace

int main(int argc, char** argv) {
    const WORDS w = arguments(argc, argv);
    if (w.hits) rules::pattern_hits = shared_counters(rules::pattern_rows());
    const OUTCOME o = w.jobs > 1 ? run_in_parts(w.campaign, w.jobs) : run_campaign(w.campaign, print_finding);
    print_hits();
    printf("%llu trees, %llu runs, %d findings\n", static_cast<unsigned long long>(o.trees),
           static_cast<unsigned long long>(o.runs), o.findings);
    return o.findings ? 1 : 0;
}
