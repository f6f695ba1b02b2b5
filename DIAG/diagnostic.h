// The tool chain's message layer: numbered messages with severities, a header, word wrapping, and an error limit.
//
// A message is an object on the stack for the time of its report: it prints its header, its text, and ends its line.
// The end of the line counts errors; a fatal message ends the process there.
#pragma once

#include <cstdarg>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <vector>

enum dc_SEVERITY : int {
    dc_suppressed = 0,
    dc_no_error = 1,
    dc_advice = 2,
    dc_debug = 3,
    dc_remark = 4,
    dc_warning = 5,
    dc_error = 6,
    dc_fatal = 7,
};

struct DIAG_INFO {
    unsigned code; // 0 ends the table
    const char* std_msg;
    const char* vrb_msg;
    dc_SEVERITY severity;
    bool internal; // a failure of the tool: shows its own position, and a fatal one ends in abort()
    bool fixed;    // its severity cannot be changed
};
extern DIAG_INFO diag_info[];

// A place in the user's source.
class DIAG_SRCINFO {
public:
    virtual const char* file() const = 0; // may be null
    virtual unsigned line() const = 0;    // 0: unknown
    virtual unsigned column() const = 0;  // 0: unknown
    virtual bool approx() const = 0;
    virtual ~DIAG_SRCINFO() = default;
    virtual bool is_equal(const DIAG_SRCINFO* other) const;
};

class DIAG_SRCINFO_DATA final : public DIAG_SRCINFO {
public:
    DIAG_SRCINFO_DATA(const char* file, unsigned line, unsigned column, bool approx = false)
        : file_m(file ? file : ""), line_m(line), column_m(column), approx_m(approx), has_file_m(file != nullptr) {}
    explicit DIAG_SRCINFO_DATA(const DIAG_SRCINFO& s) : DIAG_SRCINFO_DATA(s.file(), s.line(), s.column(), s.approx()) {}
    const char* file() const override { return has_file_m ? file_m.c_str() : nullptr; }
    unsigned line() const override { return line_m; }
    unsigned column() const override { return column_m; }
    bool approx() const override { return approx_m; }

private:
    std::string file_m;
    unsigned line_m, column_m;
    bool approx_m, has_file_m;
};

class DIAGNOSTIC {
public:
    // `file` and `line` tell where in the tool the report is made; `file` is borrowed.
    DIAGNOSTIC(DIAG_INFO* info, const char* file, unsigned line);
    DIAGNOSTIC(const DIAGNOSTIC& other);
    DIAGNOSTIC& operator=(const DIAGNOSTIC&) = delete;
    virtual ~DIAGNOSTIC();
    virtual DIAGNOSTIC* alloc() const = 0; // a copy on the heap, the caller's
    virtual void report();
    virtual const char* get_sp_buffer() const { return nullptr; } // the text, for a message that keeps one
    virtual bool is_equal(const DIAGNOSTIC* other) const;
    virtual void free_mem() {} // drops the text
    virtual void dump() const; // on standard output

    DIAGNOSTIC* set_src(const DIAG_SRCINFO* src); // stores a copy; null leaves it out
    void print_header();
    int print(const char* format, ...) __attribute__((format(printf, 2, 3))); // characters written
    int flush();                                                              // ends the line; 0 if there is none
    void start_new_line();
    bool suppress() const;
    FILE* fp() const;
    const char* sev_str() const;
    bool is_discretionary() const; // the user may change its severity
    DIAG_INFO* row() const { return info; }

    // A wrapped text in a heap buffer that the caller frees.
    static char* sp_print(const char* format, ...) __attribute__((format(printf, 1, 2)));
    static DIAG_INFO* get_info(int code); // null for a number that is none
    static void override_severity(int code, dc_SEVERITY severity);
    static void override_severity(const char* list, dc_SEVERITY severity); // numbers separated by commas
    static void override_severity(dc_SEVERITY from, dc_SEVERITY to);       // every row that has severity `from`
    static void push_debug_mode(bool mode);
    static void pop_debug_mode();
    static void push_indent(int indent);
    static void pop_indent();

    static int diag_cols_m, wrap_indent_m, indent_m, max_errors_m;
    static bool wrap_enabled_m, wrap_headers_m, warnings_m, remarks_m, advice_m, debug_m, display_code_m,
        display_ipos_m, verbose_m;
    static bool debug_mode_m; // messages neither count nor end the run
    static FILE* fp_m;        // null: standard output below warnings, standard error from there on
    static int error_count_m;

protected:
    DIAG_INFO* info;
    int cols_left;
    std::unique_ptr<DIAG_SRCINFO> src;
    const char* file;
    unsigned line;
    bool header_done = false;

private:
    static int print_formatted(const char* text, FILE* stream, std::string* buffer, int* cols_left, int cols,
                               int indent, int wrap_indent);
    std::string srcinfo_str() const;
    void show_annotated_source() const;

    static std::vector<bool> debug_mode_stack_m;
    static std::vector<int> indent_stack_m;
};

namespace DIAG {

// A message whose text is made when it is built: the row's own format, filled in, or any text in its place.
class text_message : public DIAGNOSTIC {
public:
    DIAGNOSTIC* alloc() const override { return new text_message(*this); }
    void report() override;

protected:
    text_message(int code, const char* file, unsigned line, const std::string& text)
        : DIAGNOSTIC(get_info(code), file, line), text_m(text) {}
    static std::string fill(int code, ...); // the row's format with its arguments

    std::string text_m;
};

#define DIAG_TEXT_CLASS(name, code)                                                                                    \
    class name : public text_message {                                                                                 \
    public:                                                                                                            \
        name(const char* file, unsigned line, const std::string& text) : text_message(code, file, line, text) {}       \
        DIAGNOSTIC* alloc() const override { return new name(*this); }                                                 \
    };
#define DIAG_PARENTHESIZED_CLASS(name, code)                                                                           \
    class name : public text_message {                                                                                 \
    public:                                                                                                            \
        name(const char* file, unsigned line, const std::string& text)                                                 \
            : text_message(code, file, line, "(" + text + ")") {}                                                      \
        DIAGNOSTIC* alloc() const override { return new name(*this); }                                                 \
    };
DIAG_PARENTHESIZED_CLASS(gdebug, 99920)
DIAG_TEXT_CLASS(gremark, 99921)
DIAG_TEXT_CLASS(gwarning, 99922)
DIAG_TEXT_CLASS(gerror, 99923)
DIAG_PARENTHESIZED_CLASS(gapperror, 99924)
DIAG_TEXT_CLASS(gfatal, 99925)
DIAG_PARENTHESIZED_CLASS(gdie, 99926)
#undef DIAG_TEXT_CLASS
#undef DIAG_PARENTHESIZED_CLASS

class gadvice : public text_message {
public:
    gadvice(const char* file, unsigned line, const std::string& text)
        : text_message(99927, file, line, text), has_text_m(true) {}
    DIAGNOSTIC* alloc() const override { return new gadvice(*this); }
    const char* get_sp_buffer() const override { return has_text_m ? text_m.c_str() : nullptr; }
    bool is_equal(const DIAGNOSTIC* other) const override; // the text too, unless one of them has none
    void free_mem() override;
    void dump() const override;

private:
    bool has_text_m;
};

class max_errors : public text_message {
public:
    max_errors(const char* file, unsigned line, unsigned limit) : text_message(99900, file, line, fill(99900, limit)) {}
    DIAGNOSTIC* alloc() const override { return new max_errors(*this); }
};

} // namespace DIAG

// General entry to the layer: makes the message and reports it.
class USER_MSG {
public:
    static USER_MSG* get_umsg_obj();
    bool& emit_warnings_as_errors() { return warnings_are_errors; }

    void debug(const char* format, ...) __attribute__((format(printf, 2, 3)));
    void remark(const char* format, ...) __attribute__((format(printf, 2, 3)));
    void advice(const char* format, ...) __attribute__((format(printf, 2, 3)));
    void advice(const DIAG_SRCINFO* src, const char* format, ...) __attribute__((format(printf, 3, 4)));
    void warning(unsigned number, const char* format, ...) __attribute__((format(printf, 3, 4)));
    void warning(const DIAG_SRCINFO* src, unsigned number, const char* format, ...)
        __attribute__((format(printf, 4, 5)));
    void error(const char* format, ...) __attribute__((format(printf, 2, 3)));
    void error(const DIAG_SRCINFO* src, const char* format, ...) __attribute__((format(printf, 3, 4)));
    void apperror(const char* format, ...) __attribute__((format(printf, 2, 3)));
    void fatal(const char* format, ...) __attribute__((format(printf, 2, 3)));
    void fatal(const DIAG_SRCINFO* src, const char* format, ...) __attribute__((format(printf, 3, 4)));
    void die(const char* prefix, const char* format, ...) __attribute__((format(printf, 3, 4)));
    int get_error_count() const { return DIAGNOSTIC::error_count_m; }

private:
    USER_MSG() = default;
    bool warnings_are_errors = false;
};
