#include "DEBUG_DISABLE/register_option.h"

#include <gtest/gtest.h>

namespace {

register_option one("debug:one"), two("debug:two"), other_kind("enable:one");

struct CASE {
    const char* kind;
    const char* list;
    int one, two, other;
};

TEST(ProcessDebugOption, SetsTheSwitchesOfAList) {
    const std::string long_name(600, 'x');
    const std::string long_list = long_name + ",one=5";
    const CASE cases[] = {
        {"debug", "one", 1, 0, 0},     {"debug", "one=7,two", 7, 1, 0},       {"debug", "one=0x10,two=010", 16, 8, 0},
        {"debug", "one=-3", -3, 0, 0}, {"debug", "one=2,one=9", 9, 0, 0},     {"debug", "one=2,one", 1, 0, 0},
        {"debug", "one=", 0, 0, 0},    {"enable", "one=4,two=4", 0, 0, 4},    {"debug", "nosuch=3,,two", 0, 1, 0},
        {"debug", "", 0, 0, 0},        {"debug", long_list.c_str(), 5, 0, 0},
    };
    for (const CASE& c : cases) {
        register_option::reset_state();
        process_debug_option(c.kind, c.list);
        EXPECT_EQ(one, c.one) << c.list;
        EXPECT_EQ(two, c.two) << c.list;
        EXPECT_EQ(other_kind, c.other) << c.list;
    }
}

TEST(RegisterOption, StateIsSavedAndRestored) {
    register_option::reset_state();
    two = 12;
    const auto state = register_option::get_state();
    EXPECT_EQ(state.at("debug:two"), 12);
    register_option::reset_state();
    EXPECT_EQ(two, 0);
    register_option::set_state(state);
    EXPECT_EQ(two, 12);
    EXPECT_EQ(register_option::get_option("debug:two"), &two);
    EXPECT_EQ(register_option::get_option("debug:three"), nullptr);
}

} // namespace
