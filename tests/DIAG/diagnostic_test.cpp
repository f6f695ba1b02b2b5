#include "DIAG/diagnostic.h"

#include <cstdlib>
#include <cstring>
#include <gtest/gtest.h>

namespace {

// Messages go to a file in memory; the layer's state is put back afterwards.
class Diag : public testing::Test {
protected:
    void SetUp() override {
        DIAGNOSTIC::fp_m = stream = open_memstream(&buffer, &size);
        DIAGNOSTIC::error_count_m = 0;
    }
    void TearDown() override {
        std::fclose(stream);
        std::free(buffer);
        DIAGNOSTIC::fp_m = nullptr;
        DIAGNOSTIC::max_errors_m = 100;
        DIAGNOSTIC::diag_cols_m = 79;
        DIAGNOSTIC::indent_m = 0;
        DIAGNOSTIC::wrap_enabled_m = DIAGNOSTIC::warnings_m = true;
        DIAGNOSTIC::wrap_headers_m = false;
        DIAGNOSTIC::remarks_m = DIAGNOSTIC::advice_m = DIAGNOSTIC::debug_m = false;
        DIAGNOSTIC::display_code_m = DIAGNOSTIC::display_ipos_m = DIAGNOSTIC::verbose_m = DIAGNOSTIC::debug_mode_m =
            false;
    }
    std::string take() {
        std::fflush(stream);
        std::string text(buffer, size);
        std::rewind(stream);
        std::fflush(stream);
        return text;
    }
    USER_MSG* const umsg = USER_MSG::get_umsg_obj();
    FILE* stream = nullptr;
    char* buffer = nullptr;
    std::size_t size = 0;
};

TEST_F(Diag, HeaderBySeverityAndPosition) {
    umsg->warning(0, "w %d", 1);
    EXPECT_EQ(take(), "warning: w 1\n");
    const DIAG_SRCINFO_DATA at("x.c", 7, 3), no_line("x.c", 0, 0), near("x.c", 7, 0, true), no_file(nullptr, 7, 3);
    umsg->error(&at, "e");
    EXPECT_EQ(take(), "\"x.c\", line 7: error: e\n");
    umsg->error(&no_line, "e");
    EXPECT_EQ(take(), "\"x.c\": error: e\n");
    umsg->error(&near, "e");
    EXPECT_EQ(take(), "\"x.c\", line 7 (approximate): error: e\n");
    umsg->error(&no_file, "e");
    EXPECT_EQ(take(), "error: e\n");
    EXPECT_EQ(umsg->get_error_count(), 4);
}

class row_message : public DIAG::text_message {
public:
    row_message(int code, const char* text) : text_message(code, "tool.cpp", 42, text) {}
};

TEST_F(Diag, CodesAndMarks) {
    DIAGNOSTIC::display_code_m = DIAGNOSTIC::remarks_m = true;
    row_message(24003, "t").report();
    EXPECT_EQ(take(), "warning #24003-D: t\n");
    row_message(99922, "t").report();
    EXPECT_EQ(take(), "warning #99922: t\n") << "a fixed row shows no mark";
    row_message(24004, "t").report();
    EXPECT_EQ(take(), "remark #24004-D: t\n");
    DIAGNOSTIC::display_code_m = false;
    row_message(99924, "t").report();
    EXPECT_EQ(take(), "tool.cpp:42:internal error #99924: t\n");
    DIAGNOSTIC::display_ipos_m = true;
    row_message(24003, "t").report();
    EXPECT_EQ(take(), "tool.cpp:42:warning: t\n");
}

TEST_F(Diag, VisibilityBySeverity) {
    umsg->remark("r");
    umsg->advice("a");
    umsg->debug("d");
    EXPECT_EQ(take(), "");
    DIAGNOSTIC::remarks_m = DIAGNOSTIC::advice_m = DIAGNOSTIC::debug_m = true;
    umsg->remark("r");
    umsg->advice("a");
    EXPECT_EQ(take(), "remark: r\nadvice: a\n");
    umsg->debug("d");
    EXPECT_NE(take().find("internal debug #99920: (d)\n"), std::string::npos);
    DIAGNOSTIC::warnings_m = false;
    umsg->warning(0, "w");
    EXPECT_EQ(take(), "");
    EXPECT_EQ(umsg->get_error_count(), 0);
}

TEST_F(Diag, WrapsAtBlanks) {
    DIAGNOSTIC::diag_cols_m = 20;
    const char* const cases[][2] = {
        // "error: " takes 7 of 20 columns, a continuation line has 17.
        {"one two three four", "error: one two three\n   four\n"},
        {"one two three  four", "error: one two three\n   four\n"},
        {"one two threes four", "error: one two\n   threes four\n"},
        {"abcdefghijklm", "error: abcdefghijklm\n"},
        {"abcdefghijklmn", "error: \n   abcdefghijklmn\n"},
        {"abcdefghijklmnopqrstuvwxyz", "error: abcdefghijklm\n   nopqrstuvwxyz\n"},
        {"one\ntwo", "error: one\n   two\n"},
        {"one\n\n  two\n", "error: one\n   \n   two\n"},
        {"word, blanks       ", "error: word, blanks \n"},
        {"", "error: \n"},
    };
    for (const auto& c : cases) {
        umsg->error("%s", c[0]);
        std::string text = take();
        EXPECT_EQ(text, c[1]) << c[0];
    }
}

TEST_F(Diag, IndentAndNoWrapping) {
    DIAGNOSTIC::diag_cols_m = 20;
    DIAGNOSTIC::push_indent(2);
    umsg->error("one two three four");
    EXPECT_EQ(take(), "  error: one two\n     three four\n");
    DIAGNOSTIC::pop_indent();
    DIAGNOSTIC::wrap_enabled_m = false;
    umsg->error("one two three four five six");
    EXPECT_EQ(take(), "error: one two three four five six\n");
}

TEST_F(Diag, SeverityOverrides) {
    struct CASE {
        int code;
        dc_SEVERITY to, want;
    };
    const CASE cases[] = {
        {24003, dc_error, dc_error},     {24003, dc_advice, dc_error}, // a refused target leaves it
        {24003, dc_warning, dc_warning}, {24001, dc_warning, dc_fatal},         {99922, dc_error, dc_warning},
        {99920, dc_error, dc_debug},     {24003, dc_suppressed, dc_suppressed}, {24003, dc_warning, dc_warning},
    };
    for (const CASE& c : cases) {
        DIAGNOSTIC::override_severity(c.code, c.to);
        EXPECT_EQ(DIAGNOSTIC::get_info(c.code)->severity, c.want) << c.code << " to " << c.to;
    }
    DIAGNOSTIC::override_severity(123456, dc_error);
    EXPECT_EQ(DIAGNOSTIC::get_info(123456), nullptr);
    DIAGNOSTIC::override_severity("24003, 24006,99999999999", dc_error);
    EXPECT_EQ(DIAGNOSTIC::get_info(24003)->severity, dc_error);
    EXPECT_EQ(DIAGNOSTIC::get_info(24006)->severity, dc_error);
    DIAGNOSTIC::override_severity("24003,24006", dc_warning);
    DIAGNOSTIC::override_severity(dc_remark, dc_warning);
    EXPECT_EQ(DIAGNOSTIC::get_info(24004)->severity, dc_warning);
    EXPECT_EQ(DIAGNOSTIC::get_info(99921)->severity, dc_remark) << "fixed";
    DIAGNOSTIC::override_severity("24004,24038", dc_remark);
}

TEST_F(Diag, WarningsAsErrorsCount) {
    umsg->emit_warnings_as_errors() = true;
    umsg->warning(1, "w");
    umsg->emit_warnings_as_errors() = false;
    EXPECT_EQ(take(), "error: w\n");
    EXPECT_EQ(umsg->get_error_count(), 1);
}

TEST_F(Diag, DebugModeNeitherCountsNorEnds) {
    DIAGNOSTIC::push_debug_mode(true);
    umsg->fatal("f");
    umsg->die("p", "100%% %s", "d");
    DIAGNOSTIC::pop_debug_mode();
    EXPECT_NE(take().find("fatal error: f\n"), std::string::npos);
    EXPECT_EQ(umsg->get_error_count(), 0);
    EXPECT_FALSE(DIAGNOSTIC::debug_mode_m);
}

TEST_F(Diag, ShowsTheSourceLine) {
    char name[] = "/tmp/diagXXXXXX";
    FILE* const source = fdopen(mkstemp(name), "w");
    std::fputs("first\nint x;\nthird", source);
    std::fclose(source);
    DIAGNOSTIC::verbose_m = true;
    const DIAG_SRCINFO_DATA second(name, 2, 5), last(name, 3, 1), approximate(name, 2, 5, true), beyond(name, 9, 1);
    umsg->error(&second, "e");
    EXPECT_NE(take().find("error: e\nint x;\n    ^\n"), std::string::npos);
    umsg->error(&last, "e");
    EXPECT_NE(take().find("error: e\nthird^\n"), std::string::npos);
    umsg->error(&approximate, "e");
    EXPECT_EQ(take().find("int x"), std::string::npos);
    umsg->error(&beyond, "e");
    EXPECT_EQ(take().find("third"), std::string::npos);
    std::remove(name);
}

TEST(DiagEnds, ErrorLimitFatalAndDie) {
    const auto many_errors = [](int n) {
        DIAGNOSTIC::error_count_m = 0;
        for (int i = 0; i < n; ++i) USER_MSG::get_umsg_obj()->error("e");
        std::exit(9);
    };
    EXPECT_EXIT(many_errors(101), testing::ExitedWithCode(1), "fatal error: error limit reached; 100 errors detected");
    EXPECT_EXIT(many_errors(100), testing::ExitedWithCode(9), "");
    EXPECT_EXIT(USER_MSG::get_umsg_obj()->fatal("gone"), testing::ExitedWithCode(1), "fatal error: gone");
    EXPECT_EXIT(USER_MSG::get_umsg_obj()->die("here", "gone"), testing::KilledBySignal(SIGABRT),
                "internal fatal error #99926: \\(here: gone\\)");
}

TEST_F(Diag, AdviceComparesItsText) {
    const DIAG_SRCINFO_DATA at("x.c", 7, 3), elsewhere("x.c", 8, 3);
    DIAG::gadvice a("f", 1, "same"), b("f", 2, "same"), c("f", 1, "other"), d("f", 1, "same"), e("f", 1, "same");
    d.set_src(&at);
    e.set_src(&elsewhere);
    EXPECT_TRUE(a.is_equal(&b));
    EXPECT_FALSE(a.is_equal(&c));
    EXPECT_FALSE(a.is_equal(&d));
    EXPECT_FALSE(d.is_equal(&e));
    DIAGNOSTIC* const copy = d.alloc();
    EXPECT_TRUE(copy->is_equal(&d));
    EXPECT_STREQ(copy->get_sp_buffer(), "same");
    delete copy;
    c.free_mem();
    EXPECT_TRUE(a.is_equal(&c)) << "one without text equals any";
}

TEST_F(Diag, BufferFormWrapsAt79WithIndent10) {
    const std::string word(30, 'w');
    char* const text = DIAGNOSTIC::sp_print("%s %s %s", word.c_str(), word.c_str(), word.c_str());
    EXPECT_EQ(std::string(text), word + " " + word + "\n          " + word);
    std::free(text);
}

TEST_F(Diag, LineThatIsFullStartsANewOne) {
    DIAGNOSTIC::diag_cols_m = 20;
    class two_parts : public DIAG::text_message {
    public:
        two_parts() : text_message(24003, "f", 1, "") {}
        void report() override {
            print_header();
            print("%s", "12345678901"); // "warning: " and these fill the line
            print("%s", "x");
            flush();
        }
    };
    two_parts().report();
    EXPECT_EQ(take(), "warning: 12345678901\n   x\n");
}

} // namespace
