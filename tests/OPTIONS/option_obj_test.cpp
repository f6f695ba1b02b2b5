#include "OPTIONS/option_obj.h"

#include <climits>
#include <cstring>
#include <gtest/gtest.h>
#include <set>

namespace {

using O = option_obj;

// Messages in one line each, so that they can be compared.
const bool wrapping_is_off = [] { return DIAGNOSTIC::wrap_enabled_m = false, true; }();

std::vector<const char*> words_to_come;
const char* next_word() {
    if (words_to_come.empty()) return nullptr;
    const char* const word = words_to_come.front();
    words_to_come.erase(words_to_come.begin());
    return word;
}

// Parses words as the command line has them, hyphens included. False if one is refused.
bool parse(O& o, std::vector<const char*> words) {
    O::next_arg = next_word;
    words_to_come = std::move(words);
    while (const char* word = next_word())
        if (!o.process_option(word + 1, nullptr)) return false;
    return true;
}

// Everything present with its arguments, as words.
std::string state(const O& o) {
    std::string text;
    for (const auto& word : o.export_option_list(0)) text += (text.empty() ? "" : " ") + word;
    return text;
}

struct WORDS {
    std::vector<const char*> words;
    const char* want;
};

TEST(OptionParse, SpellingsArgumentsAndChains) {
    const WORDS cases[] = {
        {{"--opt_level=2"}, "--opt_level=2"},
        {{"--opt_level", "off"}, "--opt_level=off"},
        {{"-o3"}, "--opt_level=3"},
        {{"-o", "4"}, "--opt_level=4"},
        {{"-o=0"}, "--opt_level=0"},
        {{"-aej"}, "--aliased_variables --big_endian --nonreentrant"},
        {{"-ao2"}, "--aliased_variables --opt_level=2"},
        {{"-aso", "1"}, "--aliased_variables --opt_level=1 --optimizer_interlist"},
        {{"-ds"}, "--keep_opt_ifile"},
        {{"-dsdi100"}, "--interrupt_threshold=100 --keep_opt_ifile"},
        {{"-du", "0x20"}, "--max_unrolled_loop_size=32"},
        {{"-#3"}, "--print_debug=3"},
        {{"-#", "1"}, "--print_debug=1"},
        {{"-#v"}, "--volit_vars"},
        {{"-#v#2"}, "--print_debug=2 --volit_vars"},
        {{"-h"}, "--std_lib_func_defined"},
        {{"-h1"}, "--std_lib_func_defined"},
        {{"-h2"}, "--std_lib_func_not_defined"},
        {{"-h0"}, "--std_lib_func_redefined"},
        {{"-ha"}, "--aliased_variables --std_lib_func_defined"},
        {{"--plr=x"}, "--program_level_recompile=x"},
        {{"--mem_model:data=flat", "--mem_model:code", "far"}, "--mem_model:code=far --mem_model:data=flat"},
        {{"--debug:abort", "--debug:skip_pass=3,mdebug"}, "--debug:=abort --debug:=skip_pass=3,mdebug"},
        {{"--enable:fusion", "--disable:", "cps"}, "--disable:=cps --enable:=fusion"},
        {{"-x1", "-x", "2"}, "--aux_cmd_flag=1 --aux_cmd_flag=2"},
        {{"--opt_info_filename=a=b"}, "--opt_info_filename=a=b"},
        {{"--opt_info_filename==b"}, "--opt_info_filename==b"},
        {{"--auto_inline=5", "--auto_inline=9"}, "--auto_inline=9"},
        {{"--single_inline", "--single_inline"}, "--single_inline"},
        {{"--FP_mode=RELAXED"}, "--fp_mode=relaxed"},
        {{"-"}, ""},
    };
    for (const WORDS& c : cases) {
        O o;
        EXPECT_TRUE(parse(o, c.words)) << c.words[0];
        EXPECT_EQ(state(o), c.want) << c.words[0];
    }
}

TEST(OptionParse, RefusedWords) {
    const WORDS cases[] = {
        {{"--opt_lev"}, "-opt_lev"},
        {{"--nosuch"}, "-nosuch"},
        {{"--single_inlinex"}, "-single_inlinex"},
        {{"--single_inline=1"}, "-single_inline=1"},
        {{"-aw"}, "w"},
        {{"-b"}, "b"},
        {{"--"}, "-"},
        {{"-+"}, "+"},
        {{"--list_pass"}, "-list_pass"},
    };
    for (const WORDS& c : cases) {
        O o;
        const char* rest = nullptr;
        EXPECT_FALSE(o.process_option(c.words[0] + 1, &rest)) << c.words[0];
        EXPECT_STREQ(rest, c.want);
    }
    O set;
    set.help_allowed = false;
    EXPECT_FALSE(set.process_option("-help", nullptr));
    EXPECT_FALSE(set.process_option("?", nullptr));
}

TEST(OptionParse, BadArgumentsEndTheRun) {
    struct CASE {
        std::vector<const char*> words;
        const char* message;
    };
    const CASE cases[] = {
        {{"--opt_level="}, "error: option --opt_level is missing its parameter 'LEVEL'"},
        {{"-o"}, "error: option -o is missing its parameter 'LEVEL'"},
        {{"-o", ""}, "is missing its parameter"},
        {{"--opt_level=9"}, "bad argument to option --opt_level: should be one of \\{off,0,1,2,3,4\\}"},
        {{"--opt_level=of"}, "should be one of"},
        {{"--auto_inline=x"}, "must be a non-negative_number"},
        {{"--auto_inline=-1"}, "argument to option --auto_inline \\(-1\\) is out of range"},
        {{"--auto_inline=12z"}, "out of range"},
        {{"--auto_inline=0x"}, "out of range"},
        {{"--auto_inline=99999999999999999999999"}, "out of range"},
        {{"--auto_inline=2147483648"}, "out of range"},
        {{"--opt_for_space=4"}, "number from 0 to 3"},
        {{"--use_g2", "--use_g3"}, "option --use_g3 conflicts with previous option --use_g2"},
    };
    for (const CASE& c : cases) {
        O o;
        EXPECT_EXIT(parse(o, c.words), testing::ExitedWithCode(1), c.message) << c.words[0];
    }
    O set;
    set.origin = "x.if: option set 3";
    EXPECT_EXIT(parse(set, {"--opt_level=9"}), testing::ExitedWithCode(1),
                "\"x.if: option set 3\": error: bad argument");
}

TEST(OptionParse, OtherCaseIsTakenWithAWarning) {
    O o;
    testing::internal::CaptureStderr();
    EXPECT_TRUE(parse(o, {"--OPT_LEVEL=2", "-A", "--fp_reassoc=OFF"}));
    const std::string text = testing::internal::GetCapturedStderr();
    EXPECT_NE(text.find("--OPT_LEVEL must be written as"), std::string::npos);
    EXPECT_NE(text.find("-A must be"), std::string::npos);
    EXPECT_EQ(text.find("reassoc"), std::string::npos) << "the case of an argument is free";
    EXPECT_EQ(state(o), "--aliased_variables --fp_reassoc=off --opt_level=2");
}

TEST(OptionParse, NumbersByRadix) {
    const std::pair<const char*, long> numbers[] = {{"0", 0},     {"10", 10},     {"010", 8},
                                                    {"0x1F", 31}, {"0b101", 5},   {"-7", -7},
                                                    {"+7", 7},    {"-0x10", -16}, {"9223372036854775807", LONG_MAX}};
    long value = 0;
    for (const auto& [text, number] : numbers) {
        EXPECT_TRUE(O::strtol_by_radix(text, &value)) << text;
        EXPECT_EQ(value, number) << text;
    }
    for (const char* text : {"", "0x", "--1", "08", "0b2", "1 ", " 1", "9223372036854775808"})
        EXPECT_FALSE(O::strtol_by_radix(text, &value)) << text;
}

// Every option, every item, every kind of argument: what is exported parses to the same state.
TEST(OptionExport, RoundTripsEveryOption) {
    int seen = 0;
    for (int id = 0; id < O::OPTION_COUNT; ++id) {
        const auto& d = O::option_definitions[id];
        if (!d.forms[0]) continue;
        std::vector<std::string> words;
        switch (O::parm_type[id]) {
        case O::PK_NONE: words = {d.forms[0]}; break;
        case O::PK_ENUM:
            for (const auto* item = d.items; item->word; ++item)
                words.push_back(std::string(d.forms[0]) + "=" + item->word);
            break;
        case O::PK_NUMBER: words = {std::string(d.forms[0]) + "=3", std::string(d.forms[0]) + "=0"}; break;
        default: words = {std::string(d.forms[0]) + "=a:b=c,d -e", std::string(d.forms[0]) + "==-x"};
        }
        for (const std::string& word : words) {
            O first, second;
            ASSERT_TRUE(first.process_option(word.c_str() + 1, nullptr)) << word;
            EXPECT_EQ(state(first), word);
            for (const std::string& again : first.export_option_list(0))
                ASSERT_TRUE(second.process_option(again.c_str() + 1, nullptr)) << again;
            EXPECT_EQ(state(second), word);
            EXPECT_EQ(first.getnumarg(id), second.getnumarg(id)) << word;
            ++seen;
        }
        for (int form = 1; form < 10 && d.forms[form]; ++form) {
            O o;
            std::string word = d.forms[form];
            if (d.has_arg) word += d.items ? d.items[0].word : "1";
            ASSERT_TRUE(o.process_option(word.c_str() + 1, nullptr)) << word;
            EXPECT_TRUE(o.getopt(id)) << word;
            EXPECT_EQ(o.format_of_option(id), d.forms[form]);
        }
    }
    EXPECT_GT(seen, 66 + 30);
}

TEST(OptionConflicts, LaterOptionWins) {
    const WORDS cases[] = {
        {{"-h1", "-h0"}, "--std_lib_func_redefined"},   {{"-h0", "-h2"}, "--std_lib_func_not_defined"},
        {{"-e", "--endian=little"}, "--endian=little"}, {{"--endian=little", "-e"}, "--big_endian"},
        {{"-t", "-a"}, "--aliased_variables"},
    };
    for (const WORDS& c : cases) {
        O o;
        testing::internal::CaptureStderr();
        EXPECT_TRUE(parse(o, c.words));
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
        EXPECT_EQ(state(o), c.want);
    }
    O o;
    testing::internal::CaptureStderr();
    EXPECT_TRUE(parse(o, {"-i5", "--disable_inlining"}));
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "warning: option --disable_inlining overrides preceding option -i\n");
    EXPECT_EQ(state(o), "--disable_inlining");
    O quiet;
    quiet.no_conflicts = true;
    EXPECT_TRUE(parse(quiet, {"--use_g2", "--use_g3"}));
    EXPECT_TRUE(quiet.getopt(O::OO_use_g2) && quiet.getopt(O::OO_use_g3));
}

TEST(OptionMerge, Policies) {
    struct CASE {
        std::vector<const char*> ours, theirs;
        const char* want;
        const char* message;
    };
    const CASE cases[] = {
        {{"-i5"}, {"-i7"}, "--auto_inline=7", ""},
        {{"-i7"}, {"-i5"}, "--auto_inline=7", ""},
        {{}, {"-i5"}, "--auto_inline=5", ""},
        {{"--opt_level=off"}, {"--opt_level=2"}, "--opt_level=2", ""}, // by the place in the list, not by the value
        {{"--opt_level=3"}, {"--opt_level=off"}, "--opt_level=3", ""},
        {{"-di50"}, {"-di20"}, "--interrupt_threshold=20", ""},
        {{"--debug:a"}, {"--debug:b"}, "--debug:=a --debug:=b", ""},
        {{}, {"-t"}, "", ""},
        {{"--abi=eabi"}, {"--abi=legacy"}, "--abi=eabi", "option --abi=legacy is set in \"b.if\", and is incompatible"},
        {{"--abi=eabi"}, {}, "--abi=eabi", "option --abi was set in previous files, but not in \"b.if\""},
        {{}, {"-e"}, "", "option -e is set in \"b.if\", but not in previous files"},
    };
    for (const CASE& c : cases) {
        O main_object, ours, theirs;
        ASSERT_TRUE(parse(main_object, c.ours) && parse(theirs, c.theirs));
        testing::internal::CaptureStderr();
        ours.merge_init(main_object, "a.if");
        ours.merge_options(theirs, "b.if");
        const std::string text = testing::internal::GetCapturedStderr();
        EXPECT_EQ(state(ours), c.want);
        EXPECT_EQ(text.empty(), !*c.message) << text;
        EXPECT_EQ(text.find(*c.message ? std::string("error: ") + c.message : ""), 0u) << text;
    }
    O ours, theirs;
    parse(ours, {"-e"});
    parse(theirs, {"--endian=little"});
    EXPECT_EXIT(ours.merge_options(theirs, "b.if"), testing::ExitedWithCode(1),
                "option --endian in file \"b.if\" conflicts with previous option -e");
}

TEST(OptionHelp, ShowsEveryOptionOnce) {
    testing::internal::CaptureStdout();
    O::display_option_help(0, 0, 0);
    const std::string text = testing::internal::GetCapturedStdout();
    for (int id = 0; id < O::OPTION_COUNT; ++id) {
        if (!O::option_definitions[id].forms[0]) continue;
        const std::string line = "\n  " + O::get_opt_txt(id);
        const std::size_t at = text.find(line);
        ASSERT_NE(at, std::string::npos) << line;
        EXPECT_TRUE(text[at + line.size()] == ' ' || text[at + line.size()] == '\n') << line;
        EXPECT_EQ(text.find(line, at + 1), std::string::npos) << line;
        EXPECT_NE(text.find(O::option_definitions[id].help[0], at), std::string::npos) << line;
    }
    EXPECT_NE(text.find("{off,0,1,2,3,4}"), std::string::npos);
    EXPECT_EQ(text.find(" \n"), std::string::npos) << "no blanks at line ends";
    EXPECT_EXIT(O().process_option("-usage", nullptr), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(O().process_option("a?", nullptr), testing::ExitedWithCode(0), "");
}

TEST(OptionState, ClearHistoryAndPersistence) {
    O o;
    EXPECT_TRUE(parse(o, {"-i5", "-x1", "-x2", "-v28", "-a"}));
    EXPECT_EQ(o.events().size(), 5u);
    o.clearopt(O::OO_aux_cmd_flag);
    EXPECT_EQ(o.events().size(), 3u);
    EXPECT_EQ(o.getargcount(O::OO_aux_cmd_flag), 0u);
    testing::internal::CaptureStderr();
    o.clearopt(O::OO_silicon_version);
    EXPECT_NE(testing::internal::GetCapturedStderr().find("clear PERSISTENT option -v ignored"), std::string::npos);
    EXPECT_STREQ(o.getstrarg(O::OO_silicon_version), "28");
    EXPECT_TRUE(o.export_option_list(1).empty()) << "nothing was cleared and set again";
    EXPECT_TRUE(parse(o, {"-x3"}));
    EXPECT_EQ(o.export_option_list(1), std::vector<std::string>{"--aux_cmd_flag=3"});
    o.setopt(99);
    o.setopt(-1);
    EXPECT_FALSE(o.getopt(99));
    const O copy = o;
    o.clearclassmembers(O::CLASS_ALL);
    EXPECT_EQ(state(copy), "--aliased_variables --auto_inline=5 --aux_cmd_flag=3 --silicon_version=28");
}

TEST(OptionState, NumbersAsTextAndWrongKinds) {
    O o;
    o.setarg(O::OO_silicon_version, 27L);
    o.setarg(O::OO_aux_cmd_flag, 4L);
    EXPECT_STREQ(o.getstrarg(O::OO_silicon_version), "27");
    EXPECT_STREQ(o.getstrarg(O::OO_aux_cmd_flag), "4");
    EXPECT_EXIT(o.setarg(O::OO_single_inline, 4L), testing::ExitedWithCode(1), "unhandled clause in setarg");
    EXPECT_EXIT(o.setarg(O::OO_auto_inline, "4"), testing::ExitedWithCode(1), "unhandled clause in setarg");
    o.setarg(O::OO_opt_level, 999L);
    std::string text;
    EXPECT_TRUE(o.export_option(O::OO_opt_level, 0, &text));
    EXPECT_EQ(text, "--opt_level=error");
}

TEST(Rot13, TurnsAndReusesItsBuffers) {
    EXPECT_STREQ(O::rot13("-Opt_level=2%"), "%Bcg_yriry=2-");
    EXPECT_STREQ(O::rot13(O::rot13("--Zz:")), "--Zz:");
    EXPECT_STREQ(O::rot13(nullptr), "");
    const char* const first = O::rot13("a");
    for (const char* text : {"b", "c", "d", "e"}) O::rot13(text);
    EXPECT_STREQ(first, "n") << "five results live";
    O::rot13("f");
    EXPECT_STREQ(first, "s") << "the sixth takes the place of the first";
    EXPECT_EQ(std::strlen(O::rot13(std::string(500, 'a').c_str())), 500u);
}

} // namespace
