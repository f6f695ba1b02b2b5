// The message object: header, wrapped text, end of line with the error count.
#include "DIAG/diagnostic.h"

#include "DIAG/format_text.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>

DIAG_INFO diag_info[] = {
#define DIAG_ROW(code, text, severity, internal, fixed) {code, text, nullptr, severity, internal, fixed},
#include "DIAG/diag_messages.def"
#undef DIAG_ROW
    {0, nullptr, nullptr, dc_suppressed, false, false},
};

int DIAGNOSTIC::diag_cols_m = 79, DIAGNOSTIC::wrap_indent_m = 3, DIAGNOSTIC::indent_m = 0,
    DIAGNOSTIC::max_errors_m = 100;
bool DIAGNOSTIC::wrap_enabled_m = true, DIAGNOSTIC::wrap_headers_m = false, DIAGNOSTIC::warnings_m = true,
     DIAGNOSTIC::remarks_m = false, DIAGNOSTIC::advice_m = false, DIAGNOSTIC::debug_m = false,
     DIAGNOSTIC::display_code_m = false, DIAGNOSTIC::display_ipos_m = false, DIAGNOSTIC::verbose_m = false,
     DIAGNOSTIC::debug_mode_m = false;
FILE* DIAGNOSTIC::fp_m = nullptr;
int DIAGNOSTIC::error_count_m = 0;
std::vector<bool> DIAGNOSTIC::debug_mode_stack_m;
std::vector<int> DIAGNOSTIC::indent_stack_m;

namespace {

// The index of the last character of `text` that a line with `cols` columns left may end with; 0 if not even the first
// word fits. Without wrapping everything fits.
std::size_t last_printable_char(const char* text, int cols, bool wrap) {
    const std::size_t length = std::strlen(text);
    if (length == 0) return 0;
    if (!wrap || static_cast<long>(length) <= cols) return length - 1;
    if (cols < 1) return 0;
    if (text[cols] == ' ') return cols - 1;
    std::size_t i = cols;
    while (i > 0 && text[i - 1] != ' ') --i;
    while (i > 0 && text[i - 1] == ' ') --i;
    return i > 0 ? i - 1 : 0;
}

} // namespace

bool DIAG_SRCINFO::is_equal(const DIAG_SRCINFO* other) const {
    if (!other || line() != other->line() || column() != other->column()) return false;
    const char *a = file(), *b = other->file();
    return a && b ? std::strcmp(a, b) == 0 : a == b;
}

DIAGNOSTIC::DIAGNOSTIC(DIAG_INFO* info, const char* file, unsigned line)
    : info(info), cols_left(diag_cols_m), file(file), line(line) {
    OPT_ASSERT(info);
}

DIAGNOSTIC::DIAGNOSTIC(const DIAGNOSTIC& other)
    : info(other.info), cols_left(other.cols_left), file(other.file), line(other.line), header_done(other.header_done) {
    set_src(other.src.get());
}

DIAGNOSTIC::~DIAGNOSTIC() = default;

DIAGNOSTIC* DIAGNOSTIC::set_src(const DIAG_SRCINFO* position) {
    if (position)
        src = std::make_unique<DIAG_SRCINFO_DATA>(*position);
    else
        src.reset();
    return this;
}

void DIAGNOSTIC::report() { print_header(); }

// ---- What is shown, and where

bool DIAGNOSTIC::suppress() const {
    switch (info->severity) {
    case dc_suppressed: return true;
    case dc_advice: return !advice_m;
    case dc_debug: return !debug_m;
    case dc_remark: return !remarks_m;
    case dc_warning: return !warnings_m;
    default: return false;
    }
}

FILE* DIAGNOSTIC::fp() const {
    if (fp_m) return fp_m;
    return info->severity < dc_warning ? stdout : stderr;
}

const char* DIAGNOSTIC::sev_str() const {
    static const char* const words[] = {"(suppressed)", "(no error)", "advice", "debug",
                                        "remark",       "warning",    "error",  "fatal error"};
    return info->severity >= 0 && info->severity <= dc_fatal ? words[info->severity] : "(unknown)";
}

bool DIAGNOSTIC::is_discretionary() const {
    return !info->fixed && !info->internal && info->severity != dc_advice && info->severity < dc_fatal;
}

std::string DIAGNOSTIC::srcinfo_str() const {
    if (!src || !src->file()) return {};
    std::string text = std::string("\"") + src->file() + "\"";
    if (src->line()) text += ", line " + std::to_string(src->line());
    if (src->approx()) text += " (approximate)";
    return text;
}

// ---- Printing

void DIAGNOSTIC::print_header() {
    header_done = true;
    if (suppress()) return;
    flush();
    const bool wrap = wrap_enabled_m;
    if (!wrap_headers_m) wrap_enabled_m = false;
    cols_left -= std::fprintf(fp(), "%*s", indent_m, "");
    if (display_ipos_m || info->internal) print("%s:%u:", file, line);
    const std::string position = srcinfo_str();
    if (!position.empty()) print("%s: ", position.c_str());
    if (display_code_m || info->internal)
        print("%s%s #%u%s: ", info->internal ? "internal " : "", sev_str(), info->code, is_discretionary() ? "-D" : "");
    else
        print("%s: ", sev_str());
    wrap_enabled_m = wrap;
}

int DIAGNOSTIC::print(const char* format, ...) {
    if (suppress()) return 0;
    va_list args;
    va_start(args, format);
    const std::string text = format_text(format, args);
    va_end(args);
    if (wrap_enabled_m && cols_left < 1) start_new_line();
    return print_formatted(text.c_str(), fp(), nullptr, &cols_left, diag_cols_m, indent_m, wrap_indent_m);
}

void DIAGNOSTIC::start_new_line() {
    std::fprintf(fp(), "\n%*s", indent_m + wrap_indent_m, "");
    cols_left = diag_cols_m - indent_m - wrap_indent_m;
}

// Writes `text` to `stream`, or to `buffer` if one is given, in pieces that fit the line. Returns the characters of the
// text that were written.
int DIAGNOSTIC::print_formatted(const char* text, FILE* stream, std::string* buffer, int* cols_left, int diag_cols,
                                int indent, int wrap_indent) {
    OPT_ASSERT(diag_cols > (indent + wrap_indent));
    const int full = diag_cols - indent - wrap_indent;
    const bool wrap = wrap_enabled_m;
    int written = 0;
    const auto put = [&](const char* piece, int length) {
        if (buffer)
            buffer->append(piece, length);
        else
            std::fprintf(stream, "%.*s", length, piece);
    };
    const auto new_line = [&] {
        const std::string start = "\n" + std::string(indent + wrap_indent, ' ');
        put(start.c_str(), static_cast<int>(start.size()));
        *cols_left = full;
    };
    while (*text) {
        std::size_t end = last_printable_char(text, *cols_left, wrap);
        if (end == 0 && last_printable_char(text, full, wrap) > 0) {
            new_line();
            end = last_printable_char(text, full, wrap);
        }
        std::size_t length = end + 1;
        if (end == 0) length = std::min<std::size_t>(std::strlen(text), std::max(*cols_left, 0));
        const char* const newline = static_cast<const char*>(std::memchr(text, '\n', length));
        if (newline) length = newline - text;
        put(text, static_cast<int>(length));
        written += static_cast<int>(length);
        *cols_left -= static_cast<int>(length);
        text += length + (newline != nullptr);
        if (!*text) break;
        text += std::strspn(text, " ");
        if (!*text) break;
        new_line();
    }
    return written;
}

char* DIAGNOSTIC::sp_print(const char* format, ...) {
    constexpr int width = 79, first_line = 66, wrap_indent = 10;
    char* formatted = nullptr;
    va_list args;
    va_start(args, format);
    const int size = vasprintf(&formatted, format, args);
    va_end(args);
    if (size < 0) {
        std::fputs("OUT OF MEMORY - APPLICATION ABORTED\n", stderr);
        std::exit(1);
    }
    std::string text;
    text.reserve(size + (size / (width - wrap_indent) + 1) * (wrap_indent + 1));
    int cols_left = first_line;
    print_formatted(formatted, nullptr, &text, &cols_left, width, 0, wrap_indent);
    std::free(formatted);
    return safestrdup(text.c_str());
}

// ---- The end of a message

void DIAGNOSTIC::show_annotated_source() const {
    if (!src || !src->file() || !src->line() || src->approx()) return;
    FILE* source = std::fopen(src->file(), "r");
    if (!source) return;
    std::string text;
    unsigned number = 1;
    for (int c; number <= src->line() && (c = std::getc(source)) != EOF;) {
        if (number == src->line()) text += static_cast<char>(c);
        if (c == '\n') ++number;
    }
    std::fclose(source);
    std::fputs(text.c_str(), fp());
    if (src->column()) std::fprintf(fp(), "%-*s^\n", static_cast<int>(src->column() - 1), "");
}

int DIAGNOSTIC::flush() {
    if (cols_left >= diag_cols_m) return 0;
    cols_left = diag_cols_m;
    std::fputc('\n', fp());
    if (verbose_m) show_annotated_source();
    if (debug_mode_m) return 1;
    if (info->severity >= dc_error) ++error_count_m;
    if (info->severity == dc_fatal) {
        std::fflush(fp());
        if (info->internal) std::abort();
        std::exit(1);
    }
    if (error_count_m > max_errors_m) DIAG::max_errors(__FILE__, __LINE__, max_errors_m).report();
    return 1;
}

bool DIAGNOSTIC::is_equal(const DIAGNOSTIC* other) const {
    if (!other || info != other->info) return false;
    return src ? src->is_equal(other->src.get()) : !other->src;
}

void DIAGNOSTIC::dump() const {
    std::printf("Code : %d\nstd_msg : %s\nvrb_msg : %s\n", static_cast<int>(info->code),
                info->std_msg ? info->std_msg : "", info->vrb_msg ? info->vrb_msg : "");
    if (!src) return;
    std::printf("File : %s\nLine : %d\nColumn: %d\n", src->file() ? src->file() : "", static_cast<int>(src->line()),
                static_cast<int>(src->column()));
}

// ---- The table

DIAG_INFO* DIAGNOSTIC::get_info(int code) {
    static std::map<int, DIAG_INFO*> rows = [] {
        std::map<int, DIAG_INFO*> all;
        for (DIAG_INFO* row = diag_info; row->code; ++row) all[static_cast<int>(row->code)] = row;
        return all;
    }();
    return rows[code]; // an unknown number gets a null entry
}

void DIAGNOSTIC::override_severity(int code, dc_SEVERITY severity) {
    DIAG_INFO* const row = get_info(code);
    if (!row || row->fixed || row->internal || row->severity == dc_advice || row->severity == dc_fatal) return;
    if (severity == dc_no_error || severity == dc_advice || severity == dc_debug) return;
    row->severity = severity;
}

void DIAGNOSTIC::override_severity(const char* list, dc_SEVERITY severity) {
    long number = 0;
    for (const char* p = list;; ++p) {
        if (*p >= '0' && *p <= '9') {
            number = std::min(number * 10 + (*p - '0'), 1000000L); // no row has a number as large
        } else if (*p == ',' || *p == '\0') {
            override_severity(static_cast<int>(number), severity);
            number = 0;
            if (*p == '\0') return;
        }
    }
}

void DIAGNOSTIC::override_severity(dc_SEVERITY from, dc_SEVERITY to) {
    for (DIAG_INFO* row = diag_info; row->code; ++row)
        if (row->severity == from) override_severity(static_cast<int>(row->code), to);
}

void DIAGNOSTIC::push_debug_mode(bool mode) {
    debug_mode_stack_m.push_back(debug_mode_m);
    debug_mode_m = mode;
}

void DIAGNOSTIC::pop_debug_mode() {
    OPT_ASSERT(!debug_mode_stack_m.empty());
    debug_mode_m = debug_mode_stack_m.back();
    debug_mode_stack_m.pop_back();
}

void DIAGNOSTIC::push_indent(int indent) {
    indent_stack_m.push_back(indent_m);
    indent_m = indent;
}

void DIAGNOSTIC::pop_indent() {
    OPT_ASSERT(!indent_stack_m.empty());
    indent_m = indent_stack_m.back();
    indent_stack_m.pop_back();
}
