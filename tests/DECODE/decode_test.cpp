#include "DECODE/decode.h"

#include <gtest/gtest.h>

TEST(Decode, Names) {
    struct {
        const char *in, *out;
        bool cpp;
    } const cases[] = {
        {"_Z3addii", "add(int, int)", true},
        {"_ZN4Base3getEv", "Base::get()", true},
        {"_Znwm", "operator new(unsigned long)", true},
        {"4Base", "Base", true},
        {"main", "main", false},
        {"i", "i", false}, // the code of a built-in type is also a tag of the source
        {"St", "St", false},
        {"N1aE", "N1aE", false},
        {"", "", false},
        {"99x", "99x", false},
        {"_Zzzz", "_Zzzz", true}, // mangled by its look, but not to be spelled
    };
    for (auto& c : cases) {
        EXPECT_EQ(decode_name(c.in), c.out);
        EXPECT_EQ(decode_is_cpp_name(c.in), c.cpp) << c.in;
    }
    EXPECT_EQ(decode_name(nullptr), "");
    EXPECT_FALSE(decode_is_cpp_name(nullptr));
    decode_mangle_scheme = 1;
    EXPECT_EQ(decode_name("N1a1bE"), "a::b");
    decode_mangle_scheme = 0;
}

// Each level doubles the text: spelled out it would fill the memory.
TEST(Decode, ExponentialNameStaysMangled) {
    std::string name = "_Z1fI1xE";
    for (int i = 0; i < 60; ++i) name += "St4pairIS_S" + std::to_string(i % 10) + "_E";
    EXPECT_EQ(decode_name(name.c_str()), name);
    EXPECT_EQ(decode_name(std::string(5000, '1').c_str()).size(), 5000u);
}
