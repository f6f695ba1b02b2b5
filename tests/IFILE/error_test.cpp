// Files that no correct writer makes: each ends the reading with a text that says what is wrong.
#include "world.h"

#include <functional>

namespace {
struct BAD {
    const char* text;
    std::function<void(FILE_BUILDER&)> spoil;
};

void check(const std::vector<BAD>& cases) {
    for (const BAD& bad : cases) {
        WORLD world;
        FILE_BUILDER file;
        bad.spoil(file);
        testing::internal::CaptureStdout();
        EXPECT_EQ(world.read_error(file.build()), bad.text);
        testing::internal::GetCapturedStdout();
        EXPECT_GE(world.offset, 0);
    }
}

BAD body(const char* text, std::string records) {
    return {text, [records](FILE_BUILDER& f) { f.body = records; }};
}
BAD statement(const char* text, std::string records) {
    return {text, [records](FILE_BUILDER& f) { f.statements = records; }};
}
BAD tree(const char* text, std::string nodes) { return statement(text, FILE_BUILDER::expr(nodes)); }
BAD types(const char* text, std::string records) {
    return {text, [records](FILE_BUILDER& f) { f.types += records; }};
}

const char bad_record[] = "\nINTERNAL ERROR: Invalid I-code record, aborting";
const char bad_eht[] = "\nINTERNAL ERROR: Invalid EHT record in I-code, aborting";

TEST(errors, frames_and_primitives) {
    check({
        body("record of kind 42 (label) runs past the end of the file", by({42}) + un(70000)),
        body("record of kind 42 (label) runs past the end of the file", by({42, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0x7F})),
        body("base-128 number of more than ten bytes", by({42}) + std::string(11, '\xFF')),
        statement("base-128 number of more than ten bytes", rec(IFR_LABEL, std::string(11, '\x80') + '\0')),
        statement("record of kind 42 (label) ends inside its payload", rec(IFR_LABEL, by({0x80}))),
        statement("record of kind 42 (label): its payload ends 2 bytes before its frame",
                  rec(IFR_LABEL, by({1, 2, 3}))),
        statement("record of kind 47 (comment): string without an end", rec(IFR_COMMENT, "abc")),
    });
}

TEST(errors, record_order) {
    std::string begin = rec(IFR_BEGIN_FUNC, no_psn + un(0)), args = rec(IFR_END_ARGS, no_psn);
    std::string end = rec(IFR_END_FUNC, no_psn), begin_block = rec(IFR_BEGIN_BLOCK, no_psn);
    std::string end_block = rec(IFR_END_BLOCK, no_psn);
    check({
        body("the body ends inside a function", begin + args),
        body("begin function inside a function", begin + args + begin),
        body("begin function of level 0, index 50 of 2", FILE_BUILDER::function("", 50)),
        body("begin function names _v, which is no function", FILE_BUILDER::function("", 1)),
        body("function _f is defined twice", FILE_BUILDER::function("") + FILE_BUILDER::function("")),
        body("end of arguments outside a function", args),
        body("second end of arguments", begin + args + args),
        body("end of locals before end of arguments", begin + rec(IFR_END_LOCALS, no_psn)),
        body("begin block before end of arguments", begin + begin_block),
        body("end block without its begin block", begin + args + begin_block + end_block + end_block),
        body("end function before end of arguments", begin + end),
        body("end back-end function outside one", begin + args + rec(IFR_IR_END, no_psn)),
        body("end back-end function outside one", rec(IFR_IR_END, no_psn)),
        body("end function inside a back-end function", rec(IFR_IR_BEGIN, by({1, 2, 3, 4}) + no_psn) + end),
        body("end of arguments outside a function", rec(IFR_IR_BEGIN, by({1, 2, 3, 4}) + no_psn) + args),
        body("expression outside a function", rec(IFR_IR_BEGIN, by({1, 2, 3, 4}) + no_psn) + FILE_BUILDER::expr("")),
        body("expression outside a function", FILE_BUILDER::expr("")),
        body("label outside a function", rec(IFR_LABEL, un(1))),
        body("exception table outside a function", rec(IFR_EHT_HEADER, un(0))),
        body("record of kind 116 (type) in the body", rec(IFR_TYPE, un(0))),
        body("record of unknown kind 200 in the body", rec(200, "abc")),
        {"record of kind 42 (label) in the type section", [](FILE_BUILDER& f) { f.types += rec(IFR_LABEL, un(1)); }},
        {"record of kind 116 (type) in the global symbol section",
         [](FILE_BUILDER& f) { f.globals += rec(IFR_TYPE, un(1)); }},
        {"symbol _w promises 2 pragmas, record of kind 255 (end marker) follows",
         [](FILE_BUILDER& f) { f.globals += f.symbol("_w", 1, 2) + rec(IFR_PRAGMA, un(1) + un(0)); }},
        {"symbol _w has the retention policy 4", [](FILE_BUILDER& f) { f.globals += f.symbol("_w", 1, 0, 4); }},
    });
}

TEST(errors, unknown_kinds_are_also_printed) {
    WORLD world;
    FILE_BUILDER file;
    file.body = rec(200, "abc");
    testing::internal::CaptureStdout();
    world.read_error(file.build());
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "\n///ERROR @0x2c\n\n");
    EXPECT_EQ(world.offset, 0x2c);
}

TEST(errors, counts_beyond_the_payload) {
    check({
        {"option set of 4000000000 options in a record that is too short for them",
         [](FILE_BUILDER& f) { f.options = rec(IFR_OPTION_SET, un(1) + un(4000000000)); }},
        {"option set number 4294967296 does not fit 32 bits",
         [](FILE_BUILDER& f) { f.options = rec(IFR_OPTION_SET, un(uint64_t{1} << 32) + un(0)); }},
        statement("pragma of 99999 arguments in a record that is too short for them",
                  rec(IFR_PRAGMA, un(41) + un(99999) + str("x"))),
        statement("pragma of kind 256", rec(IFR_PRAGMA, un(256) + un(0))),
        statement("exception table of 4000000 entries in a file too short for them", rec(IFR_EHT_HEADER, un(4000000))),
        statement("record of kind 59 (dependence vector) ends inside its payload",
                  rec(IFR_DEP_VECTOR, by({1, 0, 9, 1, 1}))),
        tree("string constant of 4000000000 bytes in a record with 1 left", node(3, 1, un(4000000000) + "x")),
    });
}

TEST(errors, trees) {
    check({
        tree(bad_record, node(164, 1)),
        tree(bad_record, node(200, 1)),
        tree(bad_record, node(28, 1)), // a gap of the table
        tree(bad_record, node(6, 1) + node(4, 1, by({1}))),
        tree(bad_record, node(6, 1) + rec(IFR_LABEL, by({1}))),
        tree("TP>> internal error: invalid forward reference", node(4, 77, by({1}))),
        tree("NAME of level 0, index 900 of 2", node(2, 1, by({0}) + un(900))),
        tree("NAME of level 2, index 5 of 0", node(2, 1, by({2, 5}))),
        tree("reference to label 4294967295", node(1, 0, un(UINT32_MAX))),
        tree("FIELD of kind 2, expected 1", node(26, 1, by({2, 1, 1}))),
        tree("FIELD names type 1, which is no structure", node(26, 1, by({1, 1, 1}))),
        tree("FIELD names type 0, which is no structure", node(26, 1, by({1, 1, 0}))),
        tree("record of kind 101 (expression node): its payload ends 1 bytes before its frame", node(0, 1, "x")),
        {"initializer of level 0, index 7 of 2", [](FILE_BUILDER& f) { f.inits = rec(IFR_INIT, un(7)); }},
        {bad_record, [](FILE_BUILDER& f) { f.inits = rec(IFR_INIT, un(1)); }},
        {"second initializer of _v",
         [](FILE_BUILDER& f) { f.inits = rec(IFR_INIT, un(1)) + node(112, 0) + rec(IFR_INIT, un(1)) + node(112, 0); }},
    });
}

TEST(errors, exception_tables) {
    auto entry = [](int id, int kind, int next, int count = 0) {
        return rec(IFR_EHT_ENTRY, by({id, kind, next, count}));
    };
    std::string one = rec(IFR_EHT_HEADER, un(1)), two = rec(IFR_EHT_HEADER, un(2));
    std::string call = FILE_BUILDER::expr(node(72, 1, un(2)) + node(2, 2, by({0, 0})));
    check({
        statement(bad_eht, one + rec(IFR_LABEL, un(1))),
        statement(bad_eht, one + entry(1, 1, 0) + rec(IFR_LABEL, un(1))),
        statement(bad_eht, one + entry(1, 2, 0) + rec(IFR_LABEL, un(1))),
        statement("exception entry of kind 6", one + entry(1, 6, 0)),
        statement("exception entry 0 with next entry 0 in a table of 1", one + entry(0, 0, 0)),
        statement("exception entry 1 with next entry 2 in a table of 1", one + entry(1, 0, 2)),
        statement("two exception entries of id 1", two + entry(1, 0, 0) + entry(1, 0, 0)),
        statement("exception entry 1 leads back to itself", two + entry(1, 0, 2) + entry(2, 0, 1)),
        statement("catch list too short for its 100 clauses", one + entry(1, 2, 0, 100) + rec(IFR_CATCH_LIST, "")),
        statement("a call names exception entry 2 of 1", call + one + entry(1, 0, 0)),
        statement("second exception table", one + entry(1, 0, 0) + one + entry(1, 0, 0)),
    });
    // Without a table the number means nothing.
    WORLD world;
    FILE_BUILDER file;
    file.statements = call;
    EXPECT_EQ(world.read_error(file.build()), "");
}

TEST(errors, facts_for_the_code_generator) {
    check({
        statement("load speculation of subkind 3", rec(IFR_LDSPEC, by({1, 3, 0}))),
        statement("load speculation region at label 2147483648", rec(IFR_LDSPEC, by({1, 2}) + un(0x80000000))),
        statement("load speculation of level 0, index 2 of 2", rec(IFR_LDSPEC, by({1, 0, 0, 0, 1, 0, 2}))),
        statement("loop variable of level 1, index 0 of 0", rec(IFR_LOOP_VAR, by({1, 1, 0, 0}))),
    });
}

TEST(errors, types) {
    auto structure = [](int n, const char* name, int lists) {
        return type_rec(n, 24, by({0}) + str(name) + by({1, 0, 32, 16, lists, 0, 0, 0}));
    };
    auto member = [](int n, int type) {
        return type_rec(n, 28, by({1}) + str("m") + by({type, 0, 0, 0, 0, 0, 0, 0, 0}));
    };
    const char tp_again[] = "TP>> internal error: read type twice";
    const char tp_forward[] = "TP>> internal error: invalid forward reference";
    const char tp_unexpected[] = "TP>> internal error: Unexpected type attribute";
    const char tp_csu[] = "TP>> internal error: Duplicate CSU attributes";
    check({
        types(tp_again, type_rec(1, 49, "")),
        types("type number 0", type_rec(0, 49, "")),
        types("type record of unknown tag 99", type_rec(9, 99, "")),
        types(tp_forward, type_rec(9, 15, by({77, 32, 32}))),
        types(tp_forward, type_rec(9, 15, by({9, 32, 32}))),
        types(tp_forward, list(77, 7, "")),
        types(tp_unexpected, list(1, 1, "")),
        types(tp_unexpected, list(2, 0, "")),
        types(tp_unexpected, structure(9, "s", 1) + list(9, 7, "") + list(9, 7, "")),
        types(tp_unexpected, structure(9, "s", 1) + list(9, 1, "")),
        types(tp_unexpected, structure(9, "s", 1) + member(9, 1)),
        types(tp_unexpected, structure(9, "s", 1) + type_rec(9, 254, by({7})) + type_rec(9, 32, by({1}))),
        types(tp_csu, type_rec(9, 25, by({0}) + str("s") + by({1, 0, 32, 16, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 0, 0})) +
                          list(9, 7, "") + list(9, 7, "")),
        types("TP>> internal error: Duplicate function parameters",
              type_rec(9, 20, by({1, 0, 1, 0, 0})) + type_rec(9, 254, by({0})) + type_rec(9, 254, by({0}))),
        types("TP>> internal error: Duplicate enumerator attributes",
              type_rec(9, 22, str("e") + by({16, 16, 1, 0, 0})) + type_rec(9, 254, by({1})) + type_rec(9, 254, by({1}))),
        types("a list inside a list",
              structure(9, "s", 1) + structure(10, "t", 1) + type_rec(9, 254, by({7})) + type_rec(10, 254, by({7}))),
        types("a type inside the list of type 9", structure(9, "s", 1) + type_rec(9, 254, by({7})) + type_rec(10, 49, "")),
        types("list trailer without its header", structure(9, "s", 1) + type_rec(9, 255, by({7}))),
        types("the list of type 9 has no trailer", structure(9, "s", 1) + type_rec(9, 254, by({7}))),
        types("1 types still expect lists", structure(9, "s", 1)),
        // A function may not be named by its own parameters: the type would have no end.
        types(tp_forward, type_rec(9, 20, by({1, 0, 1, 0, 0})) + type_rec(10, 15, by({9, 32, 32})) +
                              list(9, 0, type_rec(9, 21, by({10, 0, 0, 0})))),
        types("structure s contains itself", structure(9, "s", 1) + list(9, 7, member(9, 9))),
        types("structure s contains itself", structure(9, "s", 1) + structure(10, "t", 1) +
                                                 type_rec(11, 18, by({9, 2, 64, 16, 0, 1, 0})) +
                                                 list(9, 7, member(9, 10)) + list(10, 7, member(10, 11))),
        types("array without a type", type_rec(9, 18, by({0, 2, 64, 16, 0, 1, 0}))),
        types("array of a type that has no values", type_rec(9, 18, by({2, 2, 64, 16, 0, 1, 0}))),
        types("vector of length 1", type_rec(9, 18, by({1, 1, 16, 16, 0, 1, 1}))),
        types("integer type of 65 bits", type_rec(9, 6, by({0, 65, 16, 0, 0}))),
        types("alignment 4294967296 does not fit 32 bits", type_rec(9, 10, by({32}) + un(uint64_t{1} << 32))),
        types("structure of kind 3", type_rec(9, 24, by({3}) + str("s") + by({1, 0, 32, 16, 0, 0, 0, 0}))),
        types("enumeration of 65 bits", type_rec(9, 22, str("e") + by({65, 16, 1, 0, 0}))),
        types("enumeration over a type that is no integer", type_rec(9, 22, str("e") + by({16, 16, 2, 0, 0}))),
        {"FIELD names member 2 of type 9, which has none of that number",
         [=](FILE_BUILDER& f) {
             f.types += structure(9, "s", 1) + list(9, 7, member(9, 1));
             f.statements = FILE_BUILDER::expr(node(26, 1, by({1, 2, 9})));
         }},
    });
}

TEST(errors, nesting_is_bounded) {
    // A tree, a chain of pointers, a chain of structures within structures.
    WORLD deep_tree, deep_type, deep_struct;
    FILE_BUILDER file;
    std::string minus = node(10, 1), nodes;
    for (int i = 0; i <= IF_MAX_TREE_DEPTH; i++) nodes += minus;
    file.statements = FILE_BUILDER::expr(nodes + node(4, 1, by({1})));
    EXPECT_EQ(deep_tree.read_error(file.build()), "tree deeper than 200000");

    FILE_BUILDER chain;
    for (int i = 3; i < 2100; i++) chain.types += type_rec(i, 15, un(i == 3 ? 1 : i - 1) + by({32, 32}));
    EXPECT_EQ(deep_type.read_error(chain.build()), "type nested deeper than 2000");

    FILE_BUILDER nest;
    for (int i = 3; i < 2100; i++)
        nest.types += type_rec(i, 24, by({0}) + str("s" + std::to_string(i)) + by({1, 0, 32, 16, 1, 0, 0, 0}));
    for (int i = 3; i < 2100; i++)
        nest.types +=
            list(i, 7, type_rec(i, 28, by({1}) + str("m") + un(i == 3 ? 1 : i - 1) + by({0, 0, 0, 0, 0, 0, 0, 0})));
    EXPECT_EQ(deep_struct.read_error(nest.build()), "structures nested deeper than 2000");
}

TEST(limits, the_deepest_tree_that_is_allowed) {
    WORLD world;
    FILE_BUILDER file;
    std::string minus = node(10, 1), nodes;
    for (int i = 0; i < IF_MAX_TREE_DEPTH; i++) nodes += minus;
    file.statements = FILE_BUILDER::expr(nodes + node(4, 1, by({1})));
    world.read(file.build());
    EXPECT_GT(world.write().size(), nodes.size());
}
} // namespace
