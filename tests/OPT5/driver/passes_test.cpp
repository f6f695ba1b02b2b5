// The order of the steps, forced orders, and what the log says of them.
#include "OPT5/driver/passes.h"

#include "run.h"

#include <algorithm>
#include <gtest/gtest.h>
#include <set>
#include <sstream>

namespace {

bool contains(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

// The numbers of the steps that were entered.
std::vector<int> steps_run(const std::string& log) {
    std::vector<int> steps;
    const std::string mark = "ENTERING step ";
    for (std::size_t at = log.find(mark); at != std::string::npos; at = log.find(mark, at + 1))
        steps.push_back(std::atoi(log.c_str() + at + mark.size()));
    return steps;
}

std::vector<int> numbers(int first, int last) {
    std::vector<int> list;
    for (int i = first; i <= last; ++i) list.push_back(i);
    return list;
}

TEST(Steps, TableOrder) {
    setup_passes(false);
    ASSERT_EQ(normal_order.size(), 81u);
    for (unsigned i = 0; i < normal_order.size(); ++i) {
        EXPECT_EQ(normal_order[i]->serial, i);
        EXPECT_EQ(normal_order[i]->is_barrier(), i >= 3 && i <= 10) << i;
    }
    EXPECT_EQ(normal_order[67]->name, "Zelkova rotate loops");
    EXPECT_EQ(permuted_order, normal_order);
    WORKPLACE w;
    w.put("a.if", unit());
    for (const char* level : {"-o0", "-o4"}) {
        ASSERT_EQ(w.run({"-#1", level, "--debug:validate", "a.if", "b.if"}).status, 0);
        EXPECT_EQ(steps_run(w.get("a.odb")), numbers(0, 81)) << "every step is entered at every level";
    }
}

struct CASE {
    std::vector<std::string> words;
    std::map<std::string, std::string> environment;
    std::vector<int> steps;
    const char* report;
};

TEST(Steps, ForcedOrders) {
    const CASE cases[] = {
        {{"--opt_passes=1,0"}, {}, {1, 0, 81}, "Pass list, from command-line option, is:  1 0\n\n"},
        {{}, {{"FORCED_OPT_PASSES", "0 1"}}, {0, 1, 81}, "Pass list, from environment variable, is:  0 1\n\n"},
        {{"--opt_passes=13"}, {{"FORCED_OPT_PASSES", "1,0"}}, {13, 81}, "from command-line option, is:  13\n"},
        {{}, {{"FORCED_OPT_PASSES", ""}}, {81}, "Pass list, from environment variable, is: <empty>\n\n"},
        {{"--opt_passes=,"}, {}, {81}, "<empty>"},
        {{"--opt_passes=10,10,3,3,11,11"}, {}, {10, 10, 3, 3, 11, 11, 81}, " 10 10 3 3 11 11"},
        {{"--opt_passes=80,5,0"}, {}, {80, 5, 0, 81}, ""},
        {{"--debug:skip_pass=5", "--opt_passes=5,13"},
         {},
         {13, 81},
         "SKIPPING step 5 'do_interprocedural_propagation'"},
        {{"--debug:skip_pass=0", "--opt_passes=0"}, {}, {0, 81}, ""},
    };
    for (const CASE& c : cases) {
        WORKPLACE w;
        w.put("a.if", unit());
        std::vector<std::string> words = c.words;
        words.insert(words.end(), {"-#1", "a.if", "b.if"});
        const RESULT r = w.run(words, c.environment);
        ASSERT_EQ(r.status, 0) << r.err;
        EXPECT_EQ(steps_run(w.get("a.odb")), c.steps);
        EXPECT_TRUE(contains(w.get("a.odb"), c.report)) << c.report;
        EXPECT_TRUE(w.has("b.if"));
    }
}

TEST(Steps, BadForcedOrders) {
    WORKPLACE w;
    w.put("a.if", unit());
    for (const char* list : {"81", "-1", "0,99999999999999999999", "0,4294967296"}) {
        const RESULT r = w.run({std::string("--opt_passes=") + list, "a.if", "b.if"});
        EXPECT_EQ(r.status, 1) << list;
        EXPECT_TRUE(contains(r.err, ">>>> Optimizer terminated abnormally\n")) << r.err;
        EXPECT_TRUE(contains(r.err, "of the forced order is not in the table")) << r.err;
        EXPECT_TRUE(contains(r.err, "Include the .pp file created by option --preproc_with_comment\n\n"));
        EXPECT_FALSE(w.has("b.if"));
    }
    const RESULT r = w.run({"--opt_passes=1,two", "a.if", "b.if"});
    EXPECT_EQ(r.status, 1);
    EXPECT_TRUE(contains(r.err, "\"two\" is no number")) << r.err;
    EXPECT_FALSE(w.has("b.if"));
    for (const char* list : {"SSA_deadasg", "lcse, global", "lcse..", "no such step"}) // two of that name; a part of one
        EXPECT_EQ(w.run({std::string("--opt_passes=") + list, "a.if", "b.if"}).status, 1) << list;
}

TEST(Steps, OrdersByNameAndRange) {
    WORKPLACE w;
    w.put("a.if", unit());
    auto order_of = [&w](const char* list) {
        const RESULT r = w.run({"--print_debug=1", std::string("--opt_passes=") + list, "a.if", "b.if"});
        EXPECT_EQ(r.status, 0) << r.err;
        const std::string odb = w.get("a.odb"), mark = "Pass list, from command-line option, is: ";
        const size_t at = odb.find(mark);
        return at == std::string::npos ? "" : odb.substr(at + mark.size(), odb.find('\n', at) - at - mark.size());
    };
    EXPECT_EQ(order_of("lcse"), " 77");
    EXPECT_EQ(order_of("late fast_CP(4,1),lcp 3"), " 62 75 3");
    EXPECT_EQ(order_of("lcp..propagate increments, 4..2"), " 75 76 77 78 4 3 2");
}

TEST(Steps, RandomOrdersArePermutations) {
    WORKPLACE w;
    w.put("a.if", unit());
    for (int i = 0; i < 10; ++i) {
        const RESULT r = w.run({"-#1", "--opt_passes=random", "-o3", "a.if", "b.if"});
        ASSERT_EQ(r.status, 0) << r.err;
        const std::string log = w.get("a.odb");
        EXPECT_TRUE(contains(log, "Pass list, from command-line option, is (random):  "));
        std::vector<int> steps = steps_run(log);
        EXPECT_EQ(steps.back(), 81);
        std::sort(steps.begin(), steps.end());
        EXPECT_EQ(steps, numbers(0, 81));
    }
}

TEST(Steps, MachineDescriptionCheckWritesNothing) {
    WORKPLACE w;
    w.put("a.if", unit());
    EXPECT_EQ(w.run({"--debug:parser", "a.if", "b.if"}).status, 0);
    EXPECT_FALSE(w.has("b.if"));
}

} // namespace
