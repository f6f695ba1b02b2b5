// The encodings of numbers, positions and frames, seen in the bytes of written records.
#include "world.h"

#include <unistd.h>

namespace {
// The bytes that `work` adds behind the header.
template <class WORK>
std::string written(WORLD& world, WORK work) {
    char* bytes = nullptr;
    size_t size = 0;
    I_FILE* file = I_FILE::if_create(open_memstream(&bytes, &size), &world.pkg, "t.c");
    int64_t start = file->if_tell();
    work(*file);
    EXPECT_EQ(I_FILE::if_close(file, false, true), 0);
    std::string text(bytes + start, size - start);
    std::free(bytes);
    return text;
}

TEST(primitives, unsigned_numbers) {
    WORLD world;
    const std::pair<uint32_t, std::string> cases[] = {{0, by({0})},
                                                      {127, by({0x7F})},
                                                      {128, by({0x80, 1})},
                                                      {16383, by({0xFF, 0x7F})},
                                                      {16384, by({0x80, 0x80, 1})},
                                                      {UINT32_MAX, by({0xFF, 0xFF, 0xFF, 0xFF, 0x0F})}};
    for (const auto& [value, bytes] : cases)
        EXPECT_EQ(written(world, [v = value](I_FILE& f) { f.if_write_label(v); }), rec(IFR_LABEL, bytes)) << value;
}

TEST(primitives, signed_numbers_by_way_of_registers) {
    const std::pair<int32_t, std::string> cases[] = {{0, by({0})},
                                                     {-1, by({0x7F})},
                                                     {63, by({0x3F})},
                                                     {64, by({0xC0, 0})},
                                                     {-64, by({0x40})},
                                                     {-65, by({0xBF, 0x7F})},
                                                     {INT32_MAX, by({0xFF, 0xFF, 0xFF, 0xFF, 0x07})},
                                                     {INT32_MIN, by({0x80, 0x80, 0x80, 0x80, 0x78})}};
    for (const auto& [value, bytes] : cases) {
        WORLD world;
        IC_NODE* vreg = world.node(163, nullptr);
        vreg->mk_vreg(value);
        EXPECT_EQ(written(world, [&](I_FILE& f) { f.if_write_expr_node(vreg); }), node(163, 0, bytes)) << value;
        FILE_BUILDER file;
        file.statements = FILE_BUILDER::expr(node(163, 0, bytes));
        world.read(file.build());
        EXPECT_EQ(world.unit.items[3].tree->vreg_id(), value);
    }
}

// A reader takes the low 32 bits of whatever is longer, and the last byte of ten may hold more than the one bit.
TEST(primitives, longer_forms_of_signed_numbers) {
    const std::pair<std::string, int32_t> cases[] = {
        {by({0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0x7F}), -1},
        {by({0xFE, 0xFF, 0xFF, 0xFF, 0x0F}), -2},
        {by({0x81, 0x80, 0}), 1},
        {by({0x80, 0x80, 0x80, 0x80, 0x90, 0}), 0}};
    for (const auto& [bytes, value] : cases) {
        WORLD world;
        FILE_BUILDER file;
        file.statements = FILE_BUILDER::expr(node(163, 0, bytes));
        world.read(file.build());
        EXPECT_EQ(world.unit.items[3].tree->vreg_id(), value);
    }
}

TEST(primitives, positions) {
    WORLD world;
    static const char name[] = "a.c";
    PSN psn{name, 300, 2}, nameless{nullptr, 1, 1};
    std::string same_text = "a.c";
    PSN same{same_text.c_str(), 4, 5};
    std::string bytes = written(world, [&](I_FILE& f) {
        f.if_write_end_locals(nullptr);
        f.if_write_end_locals(&psn);
        f.if_write_end_locals(&nameless);
        f.if_write_end_locals(&same);
        EXPECT_EQ(f.i_get_file_id("a.c"), 1u);
        EXPECT_EQ(f.i_get_file_id("NO_FILE"), 2u);
        EXPECT_EQ(f.i_get_file_id("b.c"), 0u);
        EXPECT_STREQ(f.i_get_file_name(2), "NO_FILE");
        EXPECT_EQ(f.i_get_file_name(0), nullptr);
        EXPECT_EQ(f.i_get_file_name(3), nullptr);
    });
    EXPECT_EQ(bytes, rec(IFR_END_LOCALS, by({0})) + rec(IFR_END_LOCALS, by({1}) + un(300) + by({2})) +
                         rec(IFR_END_LOCALS, by({2, 1, 1})) + rec(IFR_END_LOCALS, by({1, 4, 5})));
}

TEST(primitives, a_stream_that_fails_is_reported_at_the_end) {
    WORLD world;
    FILE* full = std::fopen("/dev/full", "wb");
    ASSERT_NE(full, nullptr);
    I_FILE* file = I_FILE::if_create(full, &world.pkg, "t.c");
    EXPECT_EQ(I_FILE::if_close(file, false, false), 1);
}

TEST(primitives, misuse_ends_the_run) {
    WORLD world;
    IC_SYMBOL sym;
    sym.name = "_lost";
    IC_NODE* name = world.node(2, nullptr);
    name->mk_name(&sym);
    IC_NODE *half = world.node(6, nullptr, name), *in_memory = world.node(176, nullptr);
    auto quiet = [&](auto work) { written(world, work); };
    // Trees of a shape that a reader could not follow never get into a file.
    EXPECT_EXIT(quiet([&](I_FILE& f) { f.if_write_expr_node(half); }), testing::ExitedWithCode(1), "abnormally");
    EXPECT_EXIT(quiet([&](I_FILE& f) { f.if_write_expr_node(in_memory); }), testing::ExitedWithCode(1), "abnormally");
    EXPECT_EXIT(quiet([&](I_FILE& f) { dup2(2, 1), f.if_write_expr_node(name); }), testing::ExitedWithCode(1),
                ">> Symbol _lost is not in the symbol table");
    EXPECT_EXIT(quiet([&](I_FILE& f) { f.if_write_dep_vector(nullptr, 0, 0, 256); }), testing::ExitedWithCode(1),
                "!!! DDVECT too big:  256 elements !!!");
    EXPECT_EXIT((dup2(2, 1), if_enter_node(201, "X", 0)), testing::ExitedWithCode(1),
                "INTERNAL ERROR: Invalid opcode, aborting");
}

} // namespace
