// The rewrites that must happen, from the table beside this file: an expression and what it simplifies to, once and for
// good. A line that begins with `if` is a condition.

#include "expression_parser.h"

#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/target.h"

#include <fstream>

using namespace test_trees;

namespace {

class Rewrites : public Trees {
protected:
    static void SetUpTestSuite() {
        start();
        init_target();
        init_BIF_descriptors();
        init_simplifier();
    }
};

std::string trimmed(const std::string& s) {
    const std::size_t first = s.find_first_not_of(' '), last = s.find_last_not_of(' ');
    return first == std::string::npos ? "" : s.substr(first, last - first + 1);
}

std::string simplified_twice(NODE* t, bool is_condition, const std::string& where) {
    t = simp_tree(t, nullptr);
    if (is_condition) t = simp_for_control(t, nullptr);
    const std::string once = show(t);
    t = simp_tree(t, nullptr);
    if (is_condition) t = simp_for_control(t, nullptr);
    EXPECT_EQ(show(t), once) << where << ": changes again";
    erase_tree(t);
    return once;
}

TEST_F(Rewrites, OfTheTable) {
    std::ifstream table(std::string(REWRITES_FOLDER) + "/rewrites.txt");
    ASSERT_TRUE(table);
    EXPRESSION_PARSER parser;
    std::string line;
    int number = 0, rewrites = 0;
    while (std::getline(table, line)) {
        ++number;
        const std::size_t arrow = line.find(" -> ");
        if (line.empty() || line[0] == '#') continue;
        ASSERT_NE(arrow, std::string::npos) << "line " << number;
        std::string source = trimmed(line.substr(0, arrow));
        const std::string expected = trimmed(line.substr(arrow + 4)),
                          where = "line " + std::to_string(number) + ": " + line;
        const bool is_condition = source.compare(0, 3, "if ") == 0;
        NODE* t = parser.parse(is_condition ? source.substr(3) : source);
        if (!t) continue;
        EXPECT_EQ(simplified_twice(t, is_condition, where), expected) << where;
        ++rewrites;
    }
    EXPECT_GE(rewrites, 200);
}

} // namespace
