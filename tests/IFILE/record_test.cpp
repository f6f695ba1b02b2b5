// Records of the body and of the symbol sections: what is read is what was built, and what is written again is the
// same.
#include "tools/model/ic_print.h"
#include "world.h"

#include <regex>

namespace {
std::string listing(const IC_UNIT& unit) {
    char* bytes = nullptr;
    size_t size = 0;
    FILE* out = open_memstream(&bytes, &size);
    ic_print_unit(out, unit, {true, true});
    std::fclose(out);
    std::string text(bytes, size);
    std::free(bytes);
    // Offsets are of the file, not of the unit; nor is a file name that nothing uses.
    return std::regex_replace(text, std::regex("(sections|file [0-9]+):.*\n|, at 0x[0-9a-f]+"), "");
}

// Reads `bytes`, writes them, reads that, and compares all that a listing shows. Returns what was written.
std::string expect_round_trip(const std::string& bytes) {
    std::string first, copy;
    {
        WORLD world;
        world.read(bytes);
        first = listing(world.unit);
        copy = world.write();
    }
    WORLD world;
    world.read(copy);
    EXPECT_EQ(listing(world.unit), first);
    return copy;
}

TEST(records, every_payload_by_opcode) {
    struct CASE {
        std::string nodes;
        std::string text;
    };
    // The struct s (type 9) has the members a (1) and b (2); v is global 1.
    std::string v = node(2, 1, by({0, 1})), one = node(4, 1, by({1})), f = node(2, 2, by({0, 0}));
    std::string s = node(13, 9) + node(4, 1, by({2}));
    const CASE cases[] = {
        {node(2, 1, un(UINT32_MAX) + by({0})), "(no symbol)"},
        {node(2, 1, un(UINT64_MAX) + by({9})), "(no symbol)"},
        {node(3, 1, un(5) + "a\"" + by({0, 255}) + "b"), "\"a\\\"\\000\\377b\""},
        {node(3, 1, un(0)), "\"\""},
        {node(4, 1, by({0x7F})), "-1"},
        {node(4, 8, un(UINT32_MAX)), "4294967295"},
        {node(5, 7, str("1.5e3")), "1500.0"},
        {node(25, 6, str("-99999999999")), "-99999999999"},
        {node(68, 1) + s + node(26, 1, by({1, 2, 9})), "(*2).b"},
        {node(40, 1, un(1)) + v + node(56, 1) + node(47, 1) + one + node(1, 0, by({5})) + node(46, 1) +
             node(1, 0, by({6})),
         "switch (_v) { case 1: L5; default: L6; }"},
        {node(70, 1, by({1, 0})) + node(16, 1) + f + node(56, 1) + one + v, "_f(1, _v){variable 1}"},
        {node(72, 1, by({0})) + v, "_v()"},
        {node(110, 1, un(77)) + v, "EPVAL{77}(_v)"},
        {node(115, 1, un(300)) + v, "SKIP{300}(_v)"},
        {node(119, 1, un(4) + un(5) + by({255})) + v, "DDNODE{4, locale 5, flags 255}(_v)"},
        {node(129, 1, str("__abs")) + v, "__abs(_v)"},
        {node(130, 1, str("__x")), "__x()"},
        {node(132, 1, str("_m")) + node(56, 1) + node(56, 1) + one + v + one, "_m(1, _v, 1)"},
        {node(133, 1, str("_n")), "_n()"},
        {node(163, 1, by({0x7E})), "vreg-2"},
        {node(109, 0) + v + node(1, 0, by({9})), "if (!(_v)) goto L9"},
        {node(114, 0) + node(1, 0, un(300)), "goto L300"},
        {node(36, 1) + f + one, "return 1"},
        {node(118, 0) + f, "return"},
        {node(58, 1) + v + node(21, 1) + v + node(22, 1) + one + node(6, 1) + one + node(11, 1) + v + one,
         "_v = _v ? 1 : 1 + _v * 1"},
        {node(11, 1) + node(6, 1) + v + one + node(10, 1) + node(10, 1) + one, "(_v + 1) * --1"},
        {node(8, 1) + v + node(8, 1) + v + one, "_v - (_v - 1)"},
        {node(104, 7) + one, "(float)1"},
    };
    for (const CASE& c : cases) {
        WORLD world;
        FILE_BUILDER file;
        file.types += type_rec(6, 50, by({1, 64, 32, 0, 0})) + type_rec(7, 10, by({32, 32})) +
                      type_rec(8, 7, by({0, 16, 16, 0, 0})) +
                      type_rec(9, 24, by({0}) + str("s") + by({1, 0, 32, 16, 1, 0, 0, 0})) +
                      list(9, 7,
                           type_rec(9, 28, by({1}) + str("a") + by({1, 0, 0, 0, 0, 0, 0, 0, 0})) +
                               type_rec(9, 28, by({2}) + str("b") + by({1, 0, 16, 0, 0, 0, 0, 0, 0})));
        file.statements = FILE_BUILDER::expr(c.nodes);
        world.read(file.build());
        EXPECT_EQ(ic_expr_text(world.unit.items[3].tree, {}), c.text);
        expect_round_trip(file.build());
    }
}

// A comparison of floating operands takes the floating opcode once both operands are known.
TEST(records, comparisons_of_floats) {
    for (int side = 0; side < 3; side++) {
        WORLD world;
        FILE_BUILDER file;
        file.types += type_rec(7, 10, by({32, 32})) + type_rec(8, 17, by({7, 2, 32, 32})) +
                      type_rec(9, 14, str("t") + by({8, 32, 32, 0, 0, 0}));
        std::string x = node(5, 9, str("1")), i = node(4, 1, by({1}));
        file.statements = FILE_BUILDER::expr(node(76, 1) + node(89, 1) + (side == 0 ? x : i) + (side == 1 ? x : i));
        world.read(file.build());
        EXPECT_EQ(world.unit.items[3].tree->left->op, side == 2 ? 89 : 148);
    }
}

// A function that holds every kind of record.
FILE_BUILDER rich_unit() {
    FILE_BUILDER file;
    file.files = rec(IFR_FILE_NAME, str("a.c")) + rec(IFR_FILE_NAME, str("b.h"));
    std::string psn = by({2}) + un(1000) + by({7}), local = file.symbol("_l", 1), v = node(2, 1, by({0, 1}));
    file.body = rec(IFR_COMMENT, str("outside")) + rec(IFR_ASM, str(" .global x") + psn) +
                rec(IFR_PRAGMA, un(85) + un(2) + str("") + str("y")) + rec(IFR_FILE_NAME, str("c.c")) +
                rec(IFR_BEGIN_FUNC, psn + by({0})) + local + rec(IFR_END_ARGS, psn) + local + rec(IFR_END_LOCALS, psn) +
                rec(IFR_BEGIN_BLOCK, psn) + file.symbol("_inner", 1, 1) + rec(IFR_PRAGMA, un(52) + un(0)) +
                rec(IFR_EXPR, psn) + node(2, 1, by({3, 2})) + rec(IFR_EXPR, no_psn) + rec(IFR_LABEL, un(70)) +
                rec(IFR_END_BLOCK, psn) + v + rec(IFR_FUNC_INFO, "L") +
                rec(IFR_LOOP, by({1, 1, 2}) + un(UINT32_MAX) + by({3, 0xFE, 0})) + rec(IFR_LOOP_VAR, by({1, 1, 0, 3})) +
                rec(IFR_LOOP_VAR, by({2, 0x7F, 0x7F, 0})) + rec(IFR_DEP_VECTOR, by({0, 2, 2, 0x0F, 0xFE, 0x10, 1})) +
                rec(IFR_DEP_VECTOR, by({1, 4, 0})) + rec(IFR_DEP_EDGE, by({1, 2, 0})) +
                rec(IFR_MBANK, by({1, 2, 3, 4, 5})) + rec(IFR_LDSPEC, by({1, 0, 5, 0x7F, 1, 1, 0})) +
                rec(IFR_LDSPEC, by({2, 1, 5, 6, 1, 0x7F, 0})) + rec(IFR_LDSPEC, by({3, 2, 70})) +
                rec(IFR_EHT_HEADER, by({4})) + rec(IFR_EHT_ENTRY, by({1, 2, 0, 1})) +
                rec(IFR_CATCH_LIST, str("T") + by({70, 1})) + rec(IFR_EHT_ENTRY, by({2, 1, 1, 0})) +
                rec(IFR_EXPR, no_psn) + v + rec(IFR_EHT_ENTRY, by({3, 5, 2, 0})) +
                rec(IFR_EHT_ENTRY, by({4, 2, 0, 0})) + rec(IFR_CATCH_LIST, "") + rec(IFR_END_FUNC, psn);
    return file;
}

TEST(records, of_the_body) {
    FILE_BUILDER file = rich_unit();
    WORLD world;
    world.read(file.build());
    std::string text = listing(world.unit);
    text = text.substr(text.find("\nfunction"));
    EXPECT_EQ(text, "\nfunction _f: " + world.unit.globals[0]->type->printstr() +
                        ", b.h:1000:7\n"
                        "   0 _l: int, class 2, qualifiers 0000, 16 bits aligned to 16, level 1, -\n"
                        "    [b.h:1000:7] end of arguments\n"
                        "   1 _l: int, class 2, qualifiers 0000, 16 bits aligned to 16, level 2, -\n"
                        "    [b.h:1000:7] end of locals\n"
                        "    [b.h:1000:7] begin block\n"
                        "   2 _inner: int, class 2, qualifiers 0000, 16 bits aligned to 16, level 3, retention 1, -\n"
                        "         pragma 52 SYM_IS_REFERENCED()\n"
                        "    [b.h:1000:7] _inner\n"
                        "    [-] (no tree)\n"
                        "  L70:\n"
                        "    [b.h:1000:7] end block\n"
                        "    function info 76 (leaf)\n"
                        "    loop 1 in 1: 2 to 4294967295 trips, a multiple of 3, flags 00fe\n"
                        "    loop 1 counts with _l, flags 03\n"
                        "    loop 2 counts with none, flags 00\n"
                        "    dependence vector 0, flags 02: >=<-2 (overflows)\n"
                        "    dependence vector 1, flags 04:\n"
                        "    dependence 1 -> 2 by vector 0\n"
                        "    memory bank hint 1 2 3 4 5\n"
                        "    load speculation 1: induction 5 -1, int, _l\n"
                        "    load speculation 2: random 5 6, int, none\n"
                        "    load speculation 3: region L70\n"
                        "    exception table of 4:\n"
                        "        1: catch, next 0, catch (T, flag) goto L70\n"
                        "        2: cleanup, next 1: _v\n"
                        "        3: throw terminate, next 2\n"
                        "        4: catch, next 0\n"
                        "    [b.h:1000:7] end function\n");
    // But for the stray node, which is dropped, the records come out byte for byte; only type numbers may differ.
    expect_round_trip(file.build());
}

TEST(records, of_back_ends_are_passed_over) {
    WORLD world;
    FILE_BUILDER file;
    file.body = rec(IFR_IR_BEGIN, by({1, 2, 0xFF, 3}) + no_psn) + rec(IFR_IR, no_psn + "whatever this is") +
                rec(IFR_SYMBOL, "a symbol") + rec(IFR_PRAGMA, by({52, 0})) + rec(IFR_COMMENT, str("text")) +
                rec(IFR_ASM, str("text") + no_psn) + rec(IFR_IR_END, no_psn) + FILE_BUILDER::function("");
    world.read(file.build());
    EXPECT_EQ(world.unit.items.size(), 4u);
    EXPECT_EQ(world.unit.globals.size(), 2u);
    EXPECT_EQ(world.unit.file()->level, 0);
}

TEST(symbols, fields_and_retention) {
    WORLD world;
    FILE_BUILDER file;
    std::string pragma[] = {rec(IFR_PRAGMA, un(23) + un(0)), rec(IFR_PRAGMA, un(59) + un(0)),
                            rec(IFR_PRAGMA, un(74) + un(1) + str("a"))};
    file.types += type_rec(3, 15, by({1, 22, 16}));
    file.globals += rec(IFR_SYMBOL, str("_w") + un(200) + un(UINT32_MAX) + by({0xFD}) + little(0xE007, 2) + by({3, 1}) +
                                        un(16) + by({0}) + un(0) + un(3) + no_psn + by({2})) +
                    file.symbol("_kept", 1, 2) + pragma[2] + pragma[0] + file.symbol("_dead", 1, 1) + pragma[1] +
                    file.symbol("_p", 3, 0, 0, 22, 16);
    world.read(file.build());
    const IC_SYMBOL& w = *world.unit.globals[2];
    EXPECT_EQ(w.size, 200u);
    EXPECT_EQ(w.value, UINT32_MAX);
    EXPECT_EQ(w.sclass, -3);
    EXPECT_EQ(w.cqual, 0xE007);
    EXPECT_EQ(w.option_set, 3u);
    EXPECT_EQ(w.retention, I_SYMTAB::RETENTION_2);
    EXPECT_TRUE(w.type->is_pointer());
    EXPECT_EQ(w.type->size, 32u); // 22 bits in the file
    EXPECT_EQ(w.type->align, 32u);
    EXPECT_TRUE(w.cpp_type->is_int());
    const IC_SYMBOL& kept = *world.unit.globals[3];
    EXPECT_EQ(kept.retention, I_SYMTAB::RETENTION_KEEP);
    ASSERT_EQ(kept.pragmas.size(), 2u);
    EXPECT_EQ(kept.sym_pragma()->kind, 74);
    EXPECT_EQ(kept.sym_pragma()->args, std::vector<std::string>{"a"});
    EXPECT_EQ(world.unit.globals[4]->retention, I_SYMTAB::RETENTION_DROP);
    EXPECT_EQ(world.unit.globals[5]->size, 32u);
    EXPECT_EQ(world.unit.globals[5]->align, 32u);
    expect_round_trip(file.build());
}

TEST(symbols, locations_name_definitions) {
    std::string copy;
    {
        WORLD world;
        FILE_BUILDER file;
        file.inits = rec(IFR_INIT, un(1)) + node(4, 1, by({5})) + node(112, 0);
        world.read(file.build());
        copy = world.write();
    }
    WORLD world;
    world.read(copy);
    for (int i : {0, 1}) EXPECT_EQ(copy[world.unit.globals[i]->location], i == 0 ? IFR_BEGIN_FUNC : IFR_INIT);
    EXPECT_EQ(world.unit.file()->off_inits, world.unit.globals[1]->location);
    EXPECT_EQ(world.unit.globals[1]->init.size(), 2u);
}

// Whatever one byte is changed to, the reader comes back: with a unit, or with an error.
TEST(records, every_byte_may_be_wrong) {
    FILE_BUILDER file = rich_unit();
    file.inits = rec(IFR_INIT, un(1)) + node(4, 1, by({5})) + node(112, 0);
    file.options = rec(IFR_OPTION_SET, un(1) + un(1) + str("x"));
    const std::string whole = file.build();
    int refused = 0;
    testing::internal::CaptureStdout();
    for (size_t at = 0; at < whole.size(); at++)
        for (int value : {0, 1, 0x7F, 0x80, 0xFF, whole[at] + 1, whole[at] ^ 0x40}) {
            std::string bytes = whole;
            bytes[at] = static_cast<char>(value);
            WORLD world;
            if (world.read_error(bytes).empty())
                world.write();
            else
                refused++;
        }
    testing::internal::GetCapturedStdout();
    EXPECT_GT(refused, 100);
}

// ---- Graphs

TEST(graphs, edges_of_every_jump) {
    WORLD world;
    FILE_BUILDER file;
    std::string v = node(2, 1, by({0, 1})), one = node(4, 1, by({1}));
    auto label = [](int n) { return node(1, 0, by({n})); };
    file.statements = FILE_BUILDER::expr(node(109, 0) + v + label(3)) + FILE_BUILDER::expr(node(114, 0) + label(1)) +
                      rec(IFR_LABEL, by({3})) +
                      FILE_BUILDER::expr(node(40, 1, un(1)) + v + node(56, 1) + node(47, 1) + one + label(1) +
                                         node(46, 1) + label(2)) +
                      rec(IFR_LABEL, by({1})) + FILE_BUILDER::expr(v) + rec(IFR_LABEL, by({2})) +
                      FILE_BUILDER::expr(node(118, 0) + node(2, 2, by({0, 0})));
    world.read(file.build());
    char* bytes = nullptr;
    size_t size = 0;
    FILE* out = open_memstream(&bytes, &size);
    ic_print_dot(out, world.unit);
    std::fclose(out);
    std::string text(bytes, size);
    std::free(bytes);
    std::vector<std::string> edges;
    for (std::smatch m; std::regex_search(text, m, std::regex("f0_(\\w+) -> f0_(\\w+)(?: \\[label=\"([^\"]*)\"\\])?;"));
         text = m.suffix())
        edges.push_back(m[1].str() + " " + m[2].str() + " " + m[3].str());
    EXPECT_EQ(edges, (std::vector<std::string>{"b0 b2 true", "b0 b1 false", "b1 b3 ", "b2 b4 default", "b2 b3 case 1",
                                               "b3 b4 ", "b4 exit "}));
}

// ---- Whole files

TEST(copying, checked_lengths) {
    struct CASE {
        std::string body, message;
    };
    const CASE cases[] = {
        {rec(33, "a") + rec(43, "") + rec(60, "b") + rec(62, std::string(200, 'x')), ""},
        {rec(IFR_COMMENT, str("ab")) + rec(200, "abcd"), ">>I-file error:@49,id=200,sz=4,prev [@44,id=47,sz=3]\n"},
        {rec(IFR_COMMENT, str("ab")) + by({47}) + un(1000000),
         ">>I-file error:@49,id=47,sz=1000000,prev [@44,id=47,sz=3]\n"},
    };
    for (const CASE& c : cases) {
        WORLD world;
        FILE_BUILDER file;
        file.types = "";
        file.globals = "";
        file.body = c.body;
        std::string bytes = file.build();
        I_FILE* reader = I_FILE::if_open_basic(fmemopen(bytes.data(), bytes.size(), "rb"), &world.unit);
        ASSERT_NE(reader, nullptr);
        int64_t before = reader->if_tell();
        testing::internal::CaptureStdout();
        int good = reader->if_check_lengths();
        std::string message = testing::internal::GetCapturedStdout();
        EXPECT_EQ(good, c.message.empty());
        EXPECT_EQ(message, c.message);
        EXPECT_EQ(good ? reader->if_tell() : before, before);
        I_FILE::if_close(reader, false, false);
    }
}

TEST(copying, raw_bytes_and_symbols) {
    WORLD world;
    FILE_BUILDER file;
    file.globals += file.symbol("_w", 1, 1) + rec(IFR_PRAGMA, un(2) + un(1) + str(".bss"));
    std::string bytes = file.build(), symbols = file.globals + '\xFF';
    I_FILE* reader = I_FILE::if_open_basic(fmemopen(bytes.data(), bytes.size(), "rb"), &world.unit);
    char* out = nullptr;
    size_t size = 0;
    I_FILE* writer = I_FILE::if_create(open_memstream(&out, &size), nullptr, "t.c");
    int64_t start = writer->if_tell();
    reader->if_copy_raw(10, 40, writer);
    EXPECT_THROW(reader->if_copy_raw(10, static_cast<int64_t>(bytes.size()), writer), if_error);
    EXPECT_THROW(reader->if_copy_raw(-1, 1, writer), if_error);
    int64_t before = reader->if_tell();
    reader->if_copy_symbols(writer);
    EXPECT_EQ(reader->if_tell(), before);
    I_FILE::if_close(writer, false, true);
    I_FILE::if_close(reader, false, false);
    EXPECT_EQ(std::string(out + start, size - start), bytes.substr(10, 40) + symbols);
    std::free(out);
}

TEST(copying, single_functions) {
    WORLD world;
    FILE_BUILDER file;
    file.globals += file.symbol("_g", 2);
    file.body = FILE_BUILDER::function(rec(IFR_LABEL, by({1}))) + FILE_BUILDER::function(rec(IFR_LABEL, by({2})), 2);
    std::string bytes = file.build();
    I_FILE* reader = I_FILE::if_open(fmemopen(bytes.data(), bytes.size(), "rb"), &world.unit);
    reader->if_type_init(&world.pkg);
    reader->if_read_type_defs();
    reader->if_read_globals();
    int64_t first = reader->if_tell();
    reader->if_skip_func();
    EXPECT_TRUE(world.unit.items.empty());
    reader->if_read_func(0);
    ASSERT_EQ(world.unit.functions.size(), 1u);
    EXPECT_STREQ(world.unit.functions[0].sym->name, "_g");
    reader->if_read_func(first);
    EXPECT_STREQ(world.unit.functions[1].sym->name, "_f");
    reader->if_skip_func();
    EXPECT_THROW(reader->if_read_func(0), if_error); // the body's end
    I_FILE::if_close(reader, false, false);
}
} // namespace
