// Options of the I-file and of the command line together, and the flags that come of them.
#include "IFILE/pragma.h"
#include "OPT5/driver/driver.h"
#include "OPT5/ir/global.h"
#include "TYPES/type.h"
#include "run.h"

#include <gtest/gtest.h>

namespace {

bool contains(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

TEST(OptionSets, BadOnesNameTheirPlace) {
    struct ROW {
        OPTION_SETS sets;
        const char* err;
    };
    const ROW rows[] = {
        {{{0, {"--opt_level=9"}}}, "\"a.if: option set 0\": error: bad argument to option --opt_level"},
        {{{0, {}}, {1, {"--nosuch"}}}, "\"a.if: option set 1\": fatal error: invalid option:  --nosuch"},
        {{{0, {"opt_level=2"}}}, "invalid option:  opt_level=2"},
        {{{0, {""}}}, "invalid option:  "},
        {{{0, {"-"}}}, "invalid option:  -"},
        {{{0, {"--help"}}}, "invalid option:  --help"},
        {{{0, {"--opt_level="}}}, "is missing its parameter"},
        {{{4000000000u, {}}}, "zopt: a.if: option set number 4000000000 is out of range"},
    };
    for (const ROW& row : rows) {
        WORKPLACE w;
        w.put("a.if", unit(row.sets));
        const RESULT r = w.run({"a.if", "b.if"});
        EXPECT_EQ(r.status, 1) << row.err;
        EXPECT_TRUE(contains(r.err, row.err)) << r.err;
        EXPECT_FALSE(w.has("b.if"));
    }
}

TEST(OptionSets, OutputCarriesThemUnchanged) {
    WORKPLACE w;
    w.put("a.if", unit({{0, {"--opt_level=2"}}, {1, {"--opt_level=0", "-a"}}, {2, {}}}));
    EXPECT_EQ(w.run({"-#1", "-o3", "a.if", "b.if"}).status, 0);
    const std::string log = w.get("a.odb");
    EXPECT_TRUE(contains(log,
                         "Option set 0 (file-level options):\n\t--opt_level=2\nOption set 1:\n\t--opt_level=0\n\t-a\n"
                         "Option set 2:\n"))
        << log.substr(0, 400);
    EXPECT_TRUE(contains(w.get("b.if"), std::string("--opt_level=0\0-a\0", 17)));
}

// ---- Flags, in this process

class Flags : public testing::Test {
protected:
    void SetUp() override { clear(); }
    void TearDown() override { clear(); }
    void clear() {
        for (option_obj* set : all_option_sets) delete set;
        all_option_sets.clear();
        file_options = nullptr;
        icode_optionlist.clear();
        reset_global_flags();
        cpu_version = -1;
        register_option::reset_state();
        TYPE_PKG::abi = TYPE_PKG::flat_memory_model = 0;
    }
    // Sets up the option sets as a run does.
    void set_up(const OPTION_SETS& sets, std::vector<std::string> words) {
        clear();
        words.insert(words.begin(), "zopt");
        argv.clear();
        storage = words;
        for (std::string& word : storage) argv.push_back(word.data());
        parse_command_line(static_cast<int>(argv.size()), argv.data());
        for (const auto& [id, strings] : sets) icode_optionlist.push_back({id, strings});
        build_option_sets();
        set_global_flags(file_options);
    }
    std::vector<std::string> storage;
    std::vector<char*> argv;
};

TEST_F(Flags, CommandLineWinsInEverySet) {
    struct ROW {
        const char* set;
        const char* word;
        const char* want;
    };
    const ROW rows[] = {
        {"--opt_level=1", "-o3", "--opt_level=3"},
        {"-e", "--endian=little", "--endian=little"},
        {"-a", "-t", "--no_bad_aliases"},
        {"-i5", "--disable_inlining", "--disable_inlining"},
        {"-v27", "-v28", "--silicon_version=28"},
        {"-x1", "-x2", "--aux_cmd_flag=1 --aux_cmd_flag=2"},
    };
    for (const ROW& row : rows) {
        testing::internal::CaptureStderr();
        set_up({{0, {row.set}}, {2, {row.set}}}, {row.word});
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "") << row.word;
        ASSERT_EQ(all_option_sets.size(), 3u);
        for (int n : {0, 2}) {
            std::string all;
            for (const std::string& word : all_option_sets[n]->export_option_list(0))
                all += (all.empty() ? "" : " ") + word;
            EXPECT_EQ(all, row.want);
        }
        EXPECT_TRUE(all_option_sets[1]->getargcount(option_obj::OO_opt_level) <= 1)
            << "a gap holds the command line's alone";
    }
}

TEST_F(Flags, LevelsAndGoals) {
    const std::pair<const char*, int> levels[] = {{"off", 0}, {"0", 0}, {"1", 1}, {"2", 2}, {"3", 3}, {"4", 4}};
    for (const auto& [word, level] : levels) {
        set_up({}, {std::string("--opt_level=") + word, "-t"});
        EXPECT_EQ(opt_level(), level);
        EXPECT_EQ(alias_vars_option, level == 0) << "without optimization nothing is promised about aliases";
        EXPECT_EQ(inhibit_clustering, level == 0);
        EXPECT_EQ(auto_inline(), level >= 2 ? 20 : 0);
    }
    for (int goal = 0; goal <= 5; ++goal) {
        set_up({}, {"--size_speed_goal=" + std::to_string(goal)});
        EXPECT_EQ(size_speed_goal(), goal);
    }
    set_up({}, {});
    EXPECT_EQ(opt_level(), 1);
    EXPECT_EQ(size_speed_goal(), 4);
    set_up({{0, {"-o2"}}, {3, {"--opt_level=off"}}}, {});
    EXPECT_EQ(inhibit_clustering, 1) << "one function without optimization is enough";
    EXPECT_EQ(alias_vars_option, 0);
}

TEST_F(Flags, FromOptions) {
    struct ROW {
        std::vector<std::string> words;
        int* flag;
        int want;
    };
    const ROW rows[] = {
        {{"-a"}, &alias_vars_option, 1},
        {{"-t"}, &pointer_args_are_disjoint, 1},
        {{"-t"}, &chars_alias_other_types, 0},
        {{"-y"}, &loop_increments_are_not_zero, 1},
        {{"-y"}, &pointer_args_are_disjoint, 0},
        {{"-e"}, &memory_is_big_endian, 1},
        {{"--endian=little"}, &memory_is_big_endian, 0},
        {{"-p2"}, &program_mode, 2},
        {{"--fp_mode=strict"}, &strict_fp, 1},
        {{"-du40"}, &max_unrolled_loop_size, 40},
        {{}, &max_unrolled_loop_size, 195},
        {{"-h0"}, &cache_sys_funinfo, 0},
        {{"-vfp64"}, &cpu_version, -1},
        {{"--abi=eabi"}, &TYPE_PKG::abi, 1},
    };
    for (const ROW& row : rows) {
        set_up({}, row.words);
        EXPECT_EQ(*row.flag, row.want) << (row.words.empty() ? "" : row.words[0]);
    }
}

TEST_F(Flags, ListsAndSwitches) {
    set_up({}, {"-x1", "-x7"});
    EXPECT_EQ(aux_cmd_flag[1], 0) << "only with a debug level";
    set_up({{0, {"-x3"}}}, {"-x1", "-x7", "-xa", "-#1"});
    for (int i = 0; i < 10; ++i) EXPECT_EQ(aux_cmd_flag[i], i == 1 || i == 3 || i == 7) << i;
    register_reserved_switches();
    set_up({{0, {"--debug:mdebug=4"}}}, {"--debug:nthreads=3,mdebug=0x10", "--disable:cps", "--enable:groupall=2"});
    EXPECT_EQ(*register_option::get_option("debug:nthreads"), 3);
    EXPECT_EQ(*register_option::get_option("debug:mdebug"), 16);
    EXPECT_EQ(*register_option::get_option("disable:cps"), 1);
    EXPECT_EQ(*register_option::get_option("enable:groupall"), 2);
}

TEST_F(Flags, OutsideWorldByProgramMode) {
    struct ROW {
        std::vector<std::string> words;
        int callers, writers;
    };
    const ROW rows[] = {
        {{"-o3", "-p0"}, 0, 0}, {{"-o3", "-p1"}, 1, 0}, {{"-o3", "-p2"}, 1, 1}, {{"-o4", "-p3"}, 0, 1},
        {{"-o3", "-p9"}, 1, 1}, {{"-o3"}, 0, 0},        {{"-o2", "-p2"}, 0, 0}, {{"-p2"}, 0, 0},
    };
    for (const ROW& row : rows) {
        set_up({}, row.words);
        init_fileopts();
        EXPECT_EQ(no_outside_callers, row.callers) << row.words.back();
        EXPECT_EQ(no_outside_writers, row.writers) << row.words.back();
    }
}

} // namespace
