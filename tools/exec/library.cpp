// The runtime library: printing, strings, storage, mathematics.
#include "tools/exec/machine.h"

#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <unordered_map>

namespace {
using A = LIBRARY_ARGS;

std::string text_at(MACHINE& m, uint64_t at) {
    std::string s;
    for (;; at++) {
        m.check(at, 1);
        if (!m.memory[at]) return s;
        s += static_cast<char>(m.memory[at]);
    }
}
uint64_t length_at(MACHINE& m, uint64_t at, uint64_t limit = ~uint64_t{0}) {
    uint64_t n = 0;
    for (; n < limit; n++) {
        m.check(at + n, 1);
        if (!m.memory[at + n]) break;
    }
    return n;
}
void copy_units(MACHINE& m, uint64_t to, uint64_t from, uint64_t n) {
    if (!n) return;
    m.check(to, n);
    m.check(from, n);
    std::memmove(&m.memory[to], &m.memory[from], n * 2);
}
void put_text(MACHINE& m, uint64_t to, const std::string& s) {
    m.check(to, s.size() + 1);
    for (size_t i = 0; i < s.size(); i++) m.memory[to + i] = static_cast<unsigned char>(s[i]);
    m.memory[to + s.size()] = 0;
}
int sign(int64_t v) { return v < 0 ? -1 : v > 0; }

// ---- Printing
template <class T>
int64_t put(A& a, const char* format, T v) {
    std::fprintf(a.m.out, format, v);
    return 0;
}

std::string formatted(A& a, size_t format_at) {
    const std::string format = text_at(a.m, a.p(format_at));
    std::string out;
    size_t next = format_at + 1;
    for (size_t i = 0; i < format.size(); i++) {
        if (format[i] != '%') {
            out += format[i];
            continue;
        }
        std::string spec = "%";
        int longs = 0;
        for (i++; i < format.size() && std::strchr("-+ #0123456789.*lhzjtLq", format[i]); i++) {
            const char c = format[i];
            if (c == '*')
                spec += std::to_string(static_cast<int>(a.i(next++)));
            else if (c == 'l' || c == 'z' || c == 't' || c == 'j')
                longs += c == 'j' ? 2 : 1;
            else if (c != 'h' && c != 'L' && c != 'q')
                spec += c;
        }
        const char c = i < format.size() ? format[i] : '%';
        const unsigned width = longs == 0 ? 16 : longs == 1 ? 32 : 64;
        char buffer[1024];
        buffer[0] = 0;
        switch (c) {
        case '%': out += '%'; continue;
        case 'c': out += static_cast<char>(a.i(next++)); continue;
        case 'd':
        case 'i':
            std::snprintf(buffer, sizeof buffer, (spec + "lld").c_str(),
                          static_cast<long long>(wrap(a.i(next++), width, true)));
            break;
        case 'u':
        case 'x':
        case 'X':
        case 'o':
            std::snprintf(buffer, sizeof buffer, (spec + "ll" + c).c_str(),
                          static_cast<unsigned long long>(wrap(a.i(next++), width, false)));
            break;
        case 's': std::snprintf(buffer, sizeof buffer, (spec + "s").c_str(), text_at(a.m, a.p(next++)).c_str()); break;
        case 'p': std::snprintf(buffer, sizeof buffer, "0x%llx", static_cast<unsigned long long>(a.p(next++))); break;
        case 'e':
        case 'E':
        case 'f':
        case 'F':
        case 'g':
        case 'G':
        case 'a':
        case 'A': std::snprintf(buffer, sizeof buffer, (spec + c).c_str(), a.f(next++)); break;
        default: a.m.fail(EXEC_UNSUPPORTED, std::string("printf: conversion %") + c);
        }
        out += buffer;
    }
    return out;
}
int64_t lib_printf(A& a) {
    const std::string s = formatted(a, 0);
    std::fwrite(s.data(), 1, s.size(), a.m.out);
    return static_cast<int64_t>(s.size());
}
int64_t lib_sprintf(A& a) {
    const std::string s = formatted(a, 1);
    put_text(a.m, a.p(0), s);
    return static_cast<int64_t>(s.size());
}

// ---- Strings
int64_t compare_text(A& a, uint64_t limit) {
    const uint64_t x = a.p(0), y = a.p(1);
    for (uint64_t i = 0; i < limit; i++) {
        a.m.check(x + i, 1);
        a.m.check(y + i, 1);
        const int c = a.m.memory[x + i] & 0xFF, d = a.m.memory[y + i] & 0xFF;
        if (c != d) return c < d ? -1 : 1;
        if (!c) break;
    }
    return 0;
}
int64_t copy_text(A& a, uint64_t to) {
    copy_units(a.m, to, a.p(1), length_at(a.m, a.p(1)) + 1);
    return static_cast<int64_t>(a.p(0));
}
int64_t lib_strncpy(A& a) {
    const uint64_t to = a.p(0), n = a.p(2), have = length_at(a.m, a.p(1), n);
    copy_units(a.m, to, a.p(1), have);
    for (uint64_t i = have; i < n; i++) a.m.check(to + i, 1), a.m.memory[to + i] = 0;
    return static_cast<int64_t>(to);
}
int64_t lib_strncat(A& a) {
    const uint64_t to = a.p(0) + length_at(a.m, a.p(0)), n = length_at(a.m, a.p(1), a.p(2));
    copy_units(a.m, to, a.p(1), n);
    a.m.check(to + n, 1);
    a.m.memory[to + n] = 0;
    return static_cast<int64_t>(a.p(0));
}
int64_t find_char(A& a, bool last) {
    int64_t found = 0;
    for (uint64_t at = a.p(0);; at++) {
        a.m.check(at, 1);
        if (a.m.memory[at] == static_cast<uint16_t>(a.i(1))) {
            found = static_cast<int64_t>(at);
            if (!last) return found;
        }
        if (!a.m.memory[at]) return found;
    }
}
int64_t lib_strstr(A& a) {
    const size_t at = text_at(a.m, a.p(0)).find(text_at(a.m, a.p(1)));
    return at == std::string::npos ? 0 : static_cast<int64_t>(a.p(0) + at);
}
int64_t lib_memset(A& a) {
    const uint64_t to = a.p(0), n = a.p(2);
    if (n) a.m.check(to, n);
    std::fill_n(a.m.memory.begin() + static_cast<ptrdiff_t>(to), n, static_cast<uint16_t>(a.i(1)));
    return static_cast<int64_t>(to);
}
int64_t lib_memcmp(A& a) {
    for (uint64_t i = 0; i < a.p(2); i++) {
        a.m.check(a.p(0) + i, 1);
        a.m.check(a.p(1) + i, 1);
        const int d = a.m.memory[a.p(0) + i] - a.m.memory[a.p(1) + i];
        if (d) return sign(d);
    }
    return 0;
}
int64_t lib_memchr(A& a) {
    for (uint64_t i = 0; i < a.p(2); i++) {
        a.m.check(a.p(0) + i, 1);
        if (a.m.memory[a.p(0) + i] == static_cast<uint16_t>(a.i(1))) return static_cast<int64_t>(a.p(0) + i);
    }
    return 0;
}
int64_t parse_int(A& a, bool with_end, bool is_unsigned) {
    const std::string s = text_at(a.m, a.p(0));
    char* end = nullptr;
    const int base = with_end ? static_cast<int>(a.i(2)) : 10;
    const int64_t v =
        is_unsigned ? static_cast<int64_t>(std::strtoull(s.c_str(), &end, base)) : std::strtoll(s.c_str(), &end, base);
    if (with_end && a.p(1)) a.m.store(int_shape(32, false), a.p(1), static_cast<int64_t>(a.p(0)) + (end - s.c_str()));
    return is_unsigned ? static_cast<int64_t>(std::min<uint64_t>(static_cast<uint64_t>(v), UINT32_MAX))
                       : std::clamp<int64_t>(v, INT32_MIN, INT32_MAX);
}
int64_t parse_float(A& a, bool with_end) {
    const std::string s = text_at(a.m, a.p(0));
    char* end = nullptr;
    const double d = std::strtod(s.c_str(), &end);
    if (with_end && a.p(1)) a.m.store(int_shape(32, false), a.p(1), static_cast<int64_t>(a.p(0)) + (end - s.c_str()));
    return from_float(d);
}

// ---- Storage: first fit, lowest address first.
int64_t allocate(MACHINE& m, uint64_t units) {
    units = (std::max<uint64_t>(units, 1) + 3) & ~uint64_t{3};
    for (auto it = m.holes.begin(); it != m.holes.end(); ++it) {
        if (it->second < units) continue;
        const auto [at, size] = *it;
        m.holes.erase(it);
        if (size > units) m.holes[at + units] = size - units;
        m.blocks[at] = units;
        return static_cast<int64_t>(at);
    }
    constexpr uint64_t stack_reserve = 1 << 14;
    if (m.sp < stack_reserve || units > m.sp - stack_reserve || m.heap_end > m.sp - stack_reserve - units) return 0;
    const uint64_t at = m.heap_end;
    m.heap_end += units;
    m.blocks[at] = units;
    return static_cast<int64_t>(at);
}
void release(MACHINE& m, uint64_t at) {
    if (!at) return;
    auto it = m.blocks.find(at);
    if (it == m.blocks.end())
        m.fail(EXEC_BAD_ADDRESS, "free of address " + std::to_string(at) + ", which is no block's");
    auto hole = m.holes.emplace(at, it->second).first;
    m.blocks.erase(it);
    auto after = std::next(hole);
    if (after != m.holes.end() && hole->first + hole->second == after->first) {
        hole->second += after->second;
        m.holes.erase(after);
    }
    if (hole != m.holes.begin()) {
        auto before = std::prev(hole);
        if (before->first + before->second == hole->first) {
            before->second += hole->second;
            m.holes.erase(hole);
        }
    }
}
int64_t lib_calloc(A& a) {
    const uint64_t units = a.p(0) * a.p(1);
    const int64_t at = allocate(a.m, units);
    if (at) std::fill_n(a.m.memory.begin() + at, units, uint16_t{0});
    return at;
}
int64_t lib_realloc(A& a) {
    const uint64_t old = a.p(0), units = a.p(1);
    if (!old) return allocate(a.m, units);
    auto it = a.m.blocks.find(old);
    if (it == a.m.blocks.end()) a.m.fail(EXEC_BAD_ADDRESS, "realloc of an address that is no block's");
    const uint64_t had = it->second;
    const int64_t at = allocate(a.m, units);
    if (!at) return 0;
    copy_units(a.m, static_cast<uint64_t>(at), old, std::min(had, units));
    release(a.m, old);
    return at;
}

// ---- Sorting and searching
int64_t ask(A& a, size_t function, uint64_t x, uint64_t y) {
    const int64_t args[] = {static_cast<int64_t>(x), static_cast<int64_t>(y)};
    const SHAPE pointer = int_shape(32, false), shapes[] = {pointer, pointer};
    TYPE* const types[] = {nullptr, nullptr};
    return a.m.call(a.i(function), args, shapes, types, 2, int_shape(16, true));
}
// Insertion: no order of comparisons is promised, and equal elements keep theirs.
int64_t lib_qsort(A& a) {
    const uint64_t base = a.p(0), n = a.p(1), size = a.p(2);
    if (n && size) a.m.check(base, n * size);
    const uint64_t spare = static_cast<uint64_t>(allocate(a.m, size));
    if (!spare) a.m.fail(EXEC_STACK, "no memory for qsort");
    for (uint64_t i = 1; i < n; i++) {
        uint64_t low = 0, high = i; // the first element that is greater
        while (low < high) {
            const uint64_t middle = (low + high) / 2;
            if (ask(a, 3, base + middle * size, base + i * size) > 0)
                high = middle;
            else
                low = middle + 1;
        }
        copy_units(a.m, spare, base + i * size, size);
        copy_units(a.m, base + (low + 1) * size, base + low * size, (i - low) * size);
        copy_units(a.m, base + low * size, spare, size);
    }
    release(a.m, spare);
    return 0;
}
int64_t lib_bsearch(A& a) {
    uint64_t low = 0, high = a.p(2);
    while (low < high) {
        const uint64_t middle = (low + high) / 2, at = a.p(1) + middle * a.p(3);
        const int64_t c = ask(a, 4, a.p(0), at);
        if (c == 0) return static_cast<int64_t>(at);
        (c < 0 ? high : low) = c < 0 ? middle : middle + 1;
    }
    return 0;
}
int64_t lib_rand(A& a) {
    a.m.random = a.m.random * 1103515245u + 12345u;
    return a.m.random >> 16 & 0x7FFF;
}

double single(double d) { return static_cast<float>(d); }

#define INT(NAME, EXPR)                                                                                                \
    {                                                                                                                  \
        NAME, 'i', [](A& a) -> int64_t {                                                                               \
            (void)a;                                                                                                   \
            return EXPR;                                                                                               \
        }                                                                                                              \
    }
#define FLOAT(NAME, EXPR)                                                                                              \
    {NAME, 'f', [](A& a) -> int64_t { return from_float(EXPR); }},                                                     \
        {NAME "f", 'f', [](A& a) -> int64_t { return from_float(single(EXPR)); }}, {                                   \
        NAME "l", 'f', [](A& a) -> int64_t { return from_float(EXPR); }                                                \
    }
#define NOTHING(NAME, EXPR)                                                                                            \
    {                                                                                                                  \
        NAME, 'v', [](A& a) -> int64_t {                                                                               \
            EXPR;                                                                                                      \
            return 0;                                                                                                  \
        }                                                                                                              \
    }
const LIBRARY_ENTRY entries[] = {
    NOTHING("put_i16", put(a, "%d\n", static_cast<int>(static_cast<int16_t>(a.i(0))))),
    {"zthrow", 'v', [](LIBRARY_ARGS& a) -> int64_t { throw EXEC_THROW{a.i(0)}; }},
    {"zcaught", 'i', [](LIBRARY_ARGS& a) -> int64_t { return a.m.caught; }},
    NOTHING("put_i32", put(a, "%d\n", static_cast<int>(a.i(0)))),
    NOTHING("put_u32", put(a, "%u\n", static_cast<unsigned>(a.i(0)))),
    NOTHING("put_i64", put(a, "%lld\n", static_cast<long long>(a.i(0)))),
    NOTHING("put_f32", put(a, "%.9g\n", single(a.f(0)))),
    NOTHING("put_f64", put(a, "%.17g\n", a.f(0))),
    NOTHING("put_str", put(a, "%s\n", text_at(a.m, a.p(0)).c_str())),
    INT("puts", put(a, "%s\n", text_at(a.m, a.p(0)).c_str())),
    INT("putchar", std::fputc(static_cast<int>(a.i(0)), a.m.out)),
    INT("printf", lib_printf(a)),
    INT("sprintf", lib_sprintf(a)),
    INT("strlen", static_cast<int64_t>(length_at(a.m, a.p(0)))),
    INT("strcmp", compare_text(a, ~uint64_t{0})),
    INT("strncmp", compare_text(a, a.p(2))),
    INT("strcpy", copy_text(a, a.p(0))),
    INT("strcat", copy_text(a, a.p(0) + length_at(a.m, a.p(0)))),
    INT("strncpy", lib_strncpy(a)),
    INT("strncat", lib_strncat(a)),
    INT("strchr", find_char(a, false)),
    INT("strrchr", find_char(a, true)),
    INT("strstr", lib_strstr(a)),
    INT("memcpy", (copy_units(a.m, a.p(0), a.p(1), a.p(2)), a.i(0))),
    INT("memmove", (copy_units(a.m, a.p(0), a.p(1), a.p(2)), a.i(0))),
    INT("memset", lib_memset(a)),
    INT("memcmp", lib_memcmp(a)),
    INT("memchr", lib_memchr(a)),
    INT("atoi", wrap(parse_int(a, false, false), 16, true)),
    INT("atol", parse_int(a, false, false)),
    INT("strtol", parse_int(a, true, false)),
    INT("strtoul", parse_int(a, true, true)),
    {"atof", 'f', [](A& a) -> int64_t { return parse_float(a, false); }},
    {"strtod", 'f', [](A& a) -> int64_t { return parse_float(a, true); }},
    INT("malloc", allocate(a.m, a.p(0))),
    INT("calloc", lib_calloc(a)),
    INT("realloc", lib_realloc(a)),
    NOTHING("free", release(a.m, a.p(0))),
    NOTHING("exit", throw EXEC_EXIT{static_cast<int>(a.i(0) & 255)}),
    NOTHING("abort", a.m.fail(EXEC_ABORT, "abort() was called")),
    INT("atexit", (a.m.at_exit.push_back(a.i(0)), 0)),
    INT("abs", wrap(std::abs(wrap(a.i(0), 16, true)), 16, true)),
    INT("labs", wrap(std::abs(wrap(a.i(0), 32, true)), 32, true)),
    INT("llabs", a.i(0) < 0 ? static_cast<int64_t>(0 - static_cast<uint64_t>(a.i(0))) : a.i(0)),
    NOTHING("qsort", lib_qsort(a)),
    INT("bsearch", lib_bsearch(a)),
    INT("rand", lib_rand(a)),
    NOTHING("srand", a.m.random = static_cast<uint32_t>(a.i(0))),
    INT("isdigit", a.i(0) >= '0' && a.i(0) <= '9'),
    INT("isalpha", a.i(0) >= 0 && a.i(0) < 128 && std::isalpha(static_cast<int>(a.i(0))) != 0),
    INT("isalnum", a.i(0) >= 0 && a.i(0) < 128 && std::isalnum(static_cast<int>(a.i(0))) != 0),
    INT("isspace", a.i(0) >= 0 && a.i(0) < 128 && std::isspace(static_cast<int>(a.i(0))) != 0),
    INT("isupper", a.i(0) >= 'A' && a.i(0) <= 'Z'),
    INT("islower", a.i(0) >= 'a' && a.i(0) <= 'z'),
    INT("isxdigit", a.i(0) >= 0 && a.i(0) < 128 && std::isxdigit(static_cast<int>(a.i(0))) != 0),
    INT("ispunct", a.i(0) >= 0 && a.i(0) < 128 && std::ispunct(static_cast<int>(a.i(0))) != 0),
    INT("isprint", a.i(0) >= 32 && a.i(0) < 127),
    INT("iscntrl", (a.i(0) >= 0 && a.i(0) < 32) || a.i(0) == 127),
    INT("isgraph", a.i(0) > 32 && a.i(0) < 127),
    INT("toupper", a.i(0) >= 'a' && a.i(0) <= 'z' ? a.i(0) - 32 : a.i(0)),
    INT("tolower", a.i(0) >= 'A' && a.i(0) <= 'Z' ? a.i(0) + 32 : a.i(0)),
    FLOAT("sin", std::sin(a.f(0))),
    FLOAT("cos", std::cos(a.f(0))),
    FLOAT("tan", std::tan(a.f(0))),
    FLOAT("asin", std::asin(a.f(0))),
    FLOAT("acos", std::acos(a.f(0))),
    FLOAT("atan", std::atan(a.f(0))),
    FLOAT("atan2", std::atan2(a.f(0), a.f(1))),
    FLOAT("sinh", std::sinh(a.f(0))),
    FLOAT("cosh", std::cosh(a.f(0))),
    FLOAT("tanh", std::tanh(a.f(0))),
    FLOAT("exp", std::exp(a.f(0))),
    FLOAT("log", std::log(a.f(0))),
    FLOAT("log10", std::log10(a.f(0))),
    FLOAT("log2", std::log2(a.f(0))),
    FLOAT("exp2", std::exp2(a.f(0))),
    FLOAT("pow", std::pow(a.f(0), a.f(1))),
    FLOAT("sqrt", std::sqrt(a.f(0))),
    FLOAT("fabs", std::fabs(a.f(0))),
    FLOAT("floor", std::floor(a.f(0))),
    FLOAT("ceil", std::ceil(a.f(0))),
    FLOAT("fmod", std::fmod(a.f(0), a.f(1))),
    FLOAT("trunc", std::trunc(a.f(0))),
    FLOAT("round", std::round(a.f(0))),
    FLOAT("cbrt", std::cbrt(a.f(0))),
    FLOAT("hypot", std::hypot(a.f(0), a.f(1))),
    FLOAT("ldexp", std::ldexp(a.f(0), static_cast<int>(a.i(1)))),
    FLOAT("fmin", std::fmin(a.f(0), a.f(1))),
    FLOAT("fmax", std::fmax(a.f(0), a.f(1))),
};
#undef INT
#undef FLOAT
#undef NOTHING
} // namespace

const LIBRARY_ENTRY* find_library(const std::string& name) {
    static const auto table = [] {
        std::unordered_map<std::string, const LIBRARY_ENTRY*> t;
        for (const LIBRARY_ENTRY& e : entries) t.emplace(e.name, &e);
        return t;
    }();
    auto it = table.find(name);
    if (it != table.end()) return it->second;
    return name.compare(0, 2, "__") == 0 ? find_builtin(name) : nullptr;
}
