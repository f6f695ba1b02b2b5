// Opening: which headers are accepted, and what is said of the others.
#include "world.h"

namespace {
std::string why_refused(const std::string& bytes) {
    WORLD world;
    return world.read_error(bytes);
}

TEST(open, refused_headers) {
    FILE_BUILDER magic, cpu, longer;
    magic.magic = "!<ocode>\n";
    cpu.cpu = 601;
    longer.tail = "x";
    std::string good = FILE_BUILDER().build();
    auto with_offset = [&good](int field, uint32_t offset) {
        std::string text = good;
        text.replace(2 + 10 + 4 + 4 * field, 4, little(offset, 4));
        return text;
    };
    const std::pair<std::string, std::string> cases[] = {
        {"", "file is empty"},
        {"int main(void) { return 0; }", "first record is of kind 105, not a header"},
        {magic.build(), "bad magic"},
        {cpu.build(), "cpu id 601, expected 600"},
        {FILE_BUILDER(-70).build(), "version -70 is not supported (-86 to -71 are)"},
        {FILE_BUILDER(-87).build(), "version -87 is not supported (-86 to -71 are)"},
        {longer.build(), "record of kind 8 (header): its payload ends 1 bytes before its frame"},
        {good.substr(0, 1), "file ends inside a record"},
        {good.substr(0, 20), "record of kind 8 (header) runs past the end of the file"},
        {with_offset(0, 1000000), "the option section's offset 0xf4240 lies past the end of the file"},
        {with_offset(1, 3), "the initializer section's offset 0x3 lies inside the header"},
        {with_offset(2, 0xFFFFFFFF), "the type section's offset 0xffffffff lies past the end of the file"},
        {with_offset(3, 4), "the file name section's offset 0x4 lies inside the header"},
        {with_offset(4, 0), "there is no global symbol section"},
        {good.substr(0, 2) + good.substr(2, 10) + little(-71, 2),
         "record of kind 8 (header) runs past the end of the file"},
        {by({8, 5}) + "!<ico", "record of kind 8 (header): string without an end"},
    };
    for (const auto& [bytes, text] : cases) EXPECT_EQ(why_refused(bytes), text);
}

// A file may be cut anywhere: the reader says so, and does not crash.
TEST(open, every_cut_is_reported) {
    FILE_BUILDER file;
    file.options = rec(IFR_OPTION_SET, un(1) + un(1) + str("x"));
    file.files = rec(IFR_FILE_NAME, str("a.c"));
    file.inits = rec(IFR_INIT, un(1)) + node(4, 1, by({5})) + node(112, 0);
    file.statements = FILE_BUILDER::expr(node(36, 1) + node(2, 2, by({0, 0})) + node(4, 1, by({1})));
    std::string whole = file.build();
    EXPECT_EQ(why_refused(whole), "");
    for (size_t size = 0; size < whole.size(); size++) EXPECT_NE(why_refused(whole.substr(0, size)), "") << size;
}

} // namespace
