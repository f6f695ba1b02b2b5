#include "HOST/file_names.h"

#include <cstdio>
#include <cstdlib>
#include <gtest/gtest.h>
#include <unistd.h>

namespace {

TEST(FileNames, ExtensionOfTheLastComponentIsReplaced) {
    const char* const cases[][2] = {
        {"a.if", "a.opt"},
        {"a", "a.opt"},
        {"dir.d/a", "dir.d/a.opt"},
        {"dir.d/a.b.if", "dir.d/a.b.opt"},
        {".hidden", ".hidden.opt"},
        {"d/.hidden", "d/.hidden.opt"},
        {"a.", "a.opt"},
    };
    for (const auto& c : cases) EXPECT_EQ(replace_extension(c[0], ".opt"), c[1]);
}

TEST(FileNames, DebugNameIsCutAheadOfItsExtension) {
    EXPECT_EQ(debug_file_name("d/x.if", nullptr), "d/x.odb");
    EXPECT_EQ(debug_file_name("d/x.if", "_main"), "d/x._main.odb");
    const std::string exact(250, 'n');
    EXPECT_EQ(debug_file_name(exact, nullptr), exact + ".odb");
    EXPECT_EQ(debug_file_name(exact + "m.if", nullptr), exact + ".odb");
    EXPECT_EQ(debug_file_name(std::string(248, 'n') + ".if", "_main"), std::string(248, 'n') + "._" + ".odb");
}

TEST(FileNames, SameFileIsSeenThroughLinks) {
    char dir[] = "/tmp/hostXXXXXX";
    ASSERT_NE(mkdtemp(dir), nullptr);
    const std::string base = dir, a = base + "/a", b = base + "/b", c = base + "/c";
    std::fclose(std::fopen(a.c_str(), "w"));
    std::fclose(std::fopen(c.c_str(), "w"));
    ASSERT_EQ(symlink(a.c_str(), b.c_str()), 0);
    EXPECT_TRUE(is_same_file(a, b));
    EXPECT_TRUE(is_same_file(a, base + "/./a"));
    EXPECT_FALSE(is_same_file(a, c));
    EXPECT_FALSE(is_same_file(a, base + "/none"));
    EXPECT_FALSE(is_same_file("/dev/null", "/dev/null")) << "a device may be read and written";
    for (const std::string& name : {a, b, c}) std::remove(name.c_str());
    rmdir(dir);
}

} // namespace
