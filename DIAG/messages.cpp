// Messages with a text, and USER_MSG, which makes them.
#include "DIAG/diagnostic.h"

#include "DIAG/format_text.h"

std::string format_text(const char* format, va_list args) {
    va_list again;
    va_copy(again, args);
    const int size = std::vsnprintf(nullptr, 0, format, again);
    va_end(again);
    std::string text(size > 0 ? size : 0, '\0');
    if (size > 0) std::vsnprintf(text.data(), size + 1, format, args);
    return text;
}

namespace DIAG {

std::string text_message::fill(int code, ...) {
    va_list args;
    va_start(args, code);
    const std::string text = format_text(get_info(code)->std_msg, args);
    va_end(args);
    return text;
}

void text_message::report() {
    print_header();
    print("%s", text_m.c_str());
    flush();
}

bool gadvice::is_equal(const DIAGNOSTIC* other) const {
    if (!DIAGNOSTIC::is_equal(other)) return false;
    const char* const theirs = other->get_sp_buffer();
    return !has_text_m || !theirs || text_m == theirs;
}

void gadvice::free_mem() {
    text_m.clear();
    has_text_m = false;
}

void gadvice::dump() const {
    DIAGNOSTIC::dump();
    if (has_text_m) std::printf("Text : %s\n", text_m.c_str());
}

} // namespace DIAG

USER_MSG* USER_MSG::get_umsg_obj() {
    static USER_MSG object;
    return &object;
}

// Makes a message of class `kind` from the format and its arguments and reports it at `position`, which may be null.
#define REPORT(kind, position, format)                                                                                 \
    do {                                                                                                               \
        va_list args;                                                                                                  \
        va_start(args, format);                                                                                        \
        DIAG::kind message(__FILE__, __LINE__, format_text(format, args));                                             \
        va_end(args);                                                                                                  \
        message.set_src(position)->report();                                                                           \
    } while (0)

constexpr const DIAG_SRCINFO* NO_POSITION = nullptr;

void USER_MSG::debug(const char* format, ...) { REPORT(gdebug, NO_POSITION, format); }
void USER_MSG::remark(const char* format, ...) { REPORT(gremark, NO_POSITION, format); }
void USER_MSG::advice(const char* format, ...) { REPORT(gadvice, NO_POSITION, format); }
void USER_MSG::advice(const DIAG_SRCINFO* src, const char* format, ...) { REPORT(gadvice, src, format); }
void USER_MSG::error(const char* format, ...) { REPORT(gerror, NO_POSITION, format); }
void USER_MSG::error(const DIAG_SRCINFO* src, const char* format, ...) { REPORT(gerror, src, format); }
void USER_MSG::apperror(const char* format, ...) { REPORT(gapperror, NO_POSITION, format); }
void USER_MSG::fatal(const char* format, ...) { REPORT(gfatal, NO_POSITION, format); }
void USER_MSG::fatal(const DIAG_SRCINFO* src, const char* format, ...) { REPORT(gfatal, src, format); }

void USER_MSG::warning(unsigned, const char* format, ...) {
    if (warnings_are_errors)
        REPORT(gerror, NO_POSITION, format);
    else
        REPORT(gwarning, NO_POSITION, format);
}

void USER_MSG::warning(const DIAG_SRCINFO* src, unsigned, const char* format, ...) {
    if (warnings_are_errors)
        REPORT(gerror, src, format);
    else
        REPORT(gwarning, src, format);
}

void USER_MSG::die(const char* prefix, const char* format, ...) {
    va_list args;
    va_start(args, format);
    const std::string text = std::string(prefix) + ": " + format_text(format, args);
    va_end(args);
    DIAG::gdie(__FILE__, __LINE__, text).report();
}
