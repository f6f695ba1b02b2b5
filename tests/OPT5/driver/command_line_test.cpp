// The command line, the files and their ends, as a user sees them.
#include "run.h"

#include <gtest/gtest.h>
#include <unistd.h>

namespace {

bool contains(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

struct CASE {
    std::vector<std::string> words;
    int status;
    const char* err; // a part of it
};

TEST(CommandLine, WrongOnes) {
    const CASE cases[] = {
        {{}, 1, "Usage: zopt [-options] filename\n"},
        {{"-o2"}, 1, "Usage: zopt [-options] filename\n"},
        {{"none.if"}, 1, "\n>> Cannot Open Input icode File, No such file or directory : none.if, Aborting\n"},
        {{"--nosuch", "a.if", "b.if"}, 1, "fatal error: invalid option:  --nosuch\n"},
        {{"-aw", "a.if"}, 1, "fatal error: invalid option:  -aw\n"},
        {{"a.if", "b.if", "--opt_level"}, 1, "option --opt_level is missing its parameter 'LEVEL'"},
        {{"--opt_level=7", "a.if", "b.if"}, 1, "bad argument to option --opt_level: should be one of {off,0,1,2,3,4}"},
        {{"a.if", "b.if", "c.if"}, 1, "\n>>>> OPTIMIZER ERROR: Unexpected options: a.if b.if c.if\n"},
        {{"a.if", "b.if", "c.if"}, 1, "\n>>>> OPTIMIZER ERROR: Garbage on command line\n\n"},
        {{"a.if", "no/such/b.if"},
         1,
         "\n>> Cannot Open Output icode File, No such file or directory : no/such/b.if, Aborting\n"},
        {{"-o3", "-n2", "--opt_info_filename=no/such", "a.if", "b.if"}, 1, "\n>> Cannot Open Info File, No such file"},
        {{"a.if", "a.if"}, 1, "a.if: would overwrite the input file"},
        {{"a.if", "./link.if"}, 1, "would overwrite the input file"},
        {{"-o3", "-n1", "--opt_info_filename=a.if", "a.if", "b.if"}, 1, "would overwrite the input file"},
        {{"-o3", "-n1", "--opt_info_filename=b.if", "a.if", "b.if"}, 1, "b.if: would overwrite the output file"},
        {{"-#1", "-o3", "--opt_info_filename=a.odb", "a.if", "b.if"}, 1, "a.odb: would overwrite the debug file"},
        {{"-#1", "-o3", "--opt_info_filename=./a.odb", "a.if", "b.if"}, 1, "Cannot Open Debug File, File exists"},
        {{"-#1", "a.if", "a.odb"}, 1, "\n>> Cannot Open Debug File, File exists : a.odb, Aborting\n"},
        {{"text.if", "b.if"}, 1, "\n>> Error when opening input icode file : text.if, Aborting\n"},
    };
    WORKPLACE w;
    w.put("a.if", unit());
    w.put("text.if", "int main(void) { return 7; }\n");
    ASSERT_EQ(symlink("a.if", (w.dir + "/link.if").c_str()), 0);
    for (const CASE& c : cases) {
        const RESULT r = w.run(c.words);
        EXPECT_EQ(r.status, c.status) << c.err;
        EXPECT_TRUE(contains(r.err, c.err)) << r.err;
        EXPECT_FALSE(contains(r.err, "ENTIRE error message")) << "no fault of the program";
        EXPECT_EQ(w.get("a.if"), unit()) << "the input is untouched: " << c.err;
        EXPECT_EQ(w.get("b.if"), "") << c.err;
    }
}

TEST(CommandLine, RequestsForText) {
    WORKPLACE w;
    RESULT r = w.run({"--help"});
    EXPECT_EQ(r.status, 0);
    EXPECT_TRUE(contains(r.out, "--opt_level=LEVEL, -o"));
    EXPECT_EQ(w.run({"-?"}).out, r.out);
    EXPECT_EQ(w.run({"--usage", "--nosuch"}).status, 0);
    r = w.run({"--toolversion"});
    EXPECT_EQ(r.status, 0);
    EXPECT_TRUE(contains(r.out, "Zelkova C/C++ Optimizer"));
    r = w.run({"--list_passes"});
    EXPECT_EQ(r.status, 0);
    EXPECT_EQ(r.err.substr(0, r.err.find('\n')), " 0:  pass 1 fcp/eda");
    for (const char* line : {"\n10:  set call-graph order\n", "\n28:  forward_substitution\n", "\n32:  SSA_deadasg\n",
                             "\n59:  SSA_deadasg\n", "\n61:  CD ILP\n", "\n80:  late LIR\n"})
        EXPECT_TRUE(contains(r.err, line)) << line;
    EXPECT_FALSE(contains(r.err, "81:"));
}

TEST(Files, NamesThatFollowFromTheInput) {
    WORKPLACE w;
    w.put("a.if", unit());
    const RESULT r = w.run({"-#1", "a.if"});
    EXPECT_EQ(r.status, 0) << r.err;
    EXPECT_TRUE(contains(r.out, "Zelkova C/C++ Optimizer Pass 2\n"));
    EXPECT_TRUE(w.has("a.opt"));
    EXPECT_TRUE(contains(w.get("a.odb"), "ENTERING step 0 'pass 1 fcp/eda'"));
    EXPECT_TRUE(contains(w.get("a.odb"), "ENTERING step 81 'output function'"));
    EXPECT_TRUE(contains(w.get("a.odb"), "Pass list is normal order.\n"));
    EXPECT_TRUE(contains(w.get("a.odb"), "== END OF DEBUG OUTPUT==\n"));
    EXPECT_TRUE(contains(w.get("a.nfo"), "== END OF INFO OUTPUT==\n")) << "the debug option brings an info file";
    EXPECT_EQ(w.get("a.if"), unit());
}

TEST(Files, InfoFileByLevel) {
    struct ROW {
        std::vector<std::string> words;
        bool info;
    };
    const ROW rows[] = {
        {{"-o3", "-n1"}, true}, {{"-o4", "-n2"}, true},  {{"-o2", "-n1"}, false},
        {{"-o3"}, false},       {{"-o3", "-n0"}, false},
    };
    for (const ROW& row : rows) {
        WORKPLACE w;
        w.put("a.if", unit());
        std::vector<std::string> words = row.words;
        words.push_back("a.if");
        EXPECT_EQ(w.run(words).status, 0);
        EXPECT_EQ(w.has("a.nfo"), row.info) << row.words[0];
        EXPECT_FALSE(w.has("a.odb"));
    }
}

TEST(Files, UnitWithoutFunctions) {
    WORKPLACE w;
    w.put("a.if", unit({}, 0));
    const RESULT r = w.run({"a.if", "b.if"});
    EXPECT_EQ(r.status, 0) << r.err;
    w.put("c.if", w.get("b.if"));
    EXPECT_EQ(w.run({"c.if", "d.if"}).status, 0);
}

TEST(Files, FullDeviceIsAMessage) {
    WORKPLACE w;
    w.put("a.if", unit());
    const RESULT r = w.run({"a.if", "/dev/full"});
    EXPECT_EQ(r.status, 1);
    EXPECT_TRUE(contains(r.err, "zopt: /dev/full: cannot write: ")) << r.err;
    EXPECT_EQ(access("/dev/full", F_OK), 0) << "a device is not removed";
    ASSERT_EQ(symlink("/dev/full", (w.dir + "/a.nfo").c_str()), 0);
    const RESULT info = w.run({"-o3", "-n1", "a.if", "b.if"});
    EXPECT_EQ(info.status, 1);
    EXPECT_TRUE(contains(info.err, "zopt: a.nfo: cannot write: ")) << info.err;
    EXPECT_FALSE(w.has("b.if"));
    EXPECT_EQ(w.run({"a.if", "/dev/null"}).status, 0);
}

TEST(Files, BadInputLeavesNoOutput) {
    const std::string good = unit();
    WORKPLACE w;
    for (std::size_t size = 0; size < good.size(); ++size) {
        w.put("a.if", good.substr(0, size));
        const RESULT r = w.run({"a.if", "b.if"});
        ASSERT_EQ(r.status, 1) << "cut after " << size << "\n" << r.err;
        ASSERT_TRUE(contains(r.err, "zopt: a.if: ")) << "cut after " << size << "\n" << r.err;
        ASSERT_FALSE(contains(r.err, "ENTIRE error message")) << "cut after " << size << "\n" << r.err;
        ASSERT_FALSE(w.has("b.if")) << "cut after " << size;
    }
}

TEST(Files, OutputUnderOtherNames) {
    WORKPLACE w;
    w.put("a.if", unit());
    std::string bad = unit();
    bad.replace(bad.find("e\x02$"), 3, "e\x02\xC8"); // no such operator
    w.put("bad.if", bad);
    ASSERT_EQ(symlink("target.if", (w.dir + "/sym.if").c_str()), 0);
    ASSERT_EQ(w.run({"a.if", "sym.if"}).status, 0);
    EXPECT_EQ(w.run({"target.if", "b.if"}).status, 0);
    ASSERT_EQ(link((w.dir + "/target.if").c_str(), (w.dir + "/hard.if").c_str()), 0);
    EXPECT_EQ(w.run({"bad.if", "sym.if"}).status, 1);
    EXPECT_FALSE(w.has("target.if"));
    EXPECT_EQ(w.get("hard.if"), "") << "no half of an output";
    w.put("target.if", "");
    EXPECT_TRUE(w.has("sym.if")) << "the link is not ours";
    const RESULT r = w.run({"a.if", "/dev/stdout"});
    EXPECT_EQ(r.status, 0);
    w.put("out.if", r.out);
    EXPECT_EQ(w.run({"out.if", "b.if"}).status, 0) << "nothing that the run prints stands in it";
    EXPECT_TRUE(contains(r.err, "Pass 2")) << r.err;
}

TEST(Files, SplitDebugFiles) {
    WORKPLACE w;
    w.put("a.if", unit());
    w.put("a._main.odb", "old");
    EXPECT_EQ(w.run({"-#1", "--debug:split_odb", "a.if", "b.if"}).status, 0);
    const std::string own = w.get("a._main.odb"), common = w.get("a.odb");
    EXPECT_FALSE(contains(own, "old"));
    EXPECT_TRUE(contains(own, "ENTERING step 81"));
    EXPECT_TRUE(contains(common, ">>>> SWITCHING LOG TO a._main.odb\n"));
    EXPECT_FALSE(contains(common, "ENTERING step 81"));
    EXPECT_TRUE(contains(common, "ENTERING step 10 "));
}

} // namespace
