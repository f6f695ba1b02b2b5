// Floating literals: reading and canonical spelling.
//
// A decimal text is read exactly: all its digits as one integer, one scaling by a power of ten, and one rounding to
// odd. So the float or double of the target that a text stands for is the nearest one, as the language wants it.
#include "FPSIM/decimal.h"
#include "FPSIM/fpsim_impl.h"
#include "UTIL/safemem.h"

#include <cctype>
#include <cstdlib>
#include <cstring>
#include <strings.h>

// Leading decimal exponents beyond these are infinity and zero to every target format.
static const long max_exponent = 512;
// More digits than decide any rounding; of the rest it matters only whether there is any.
static const size_t max_digits = 800;

namespace {
// 0.d1d2d3... * 10^point, d1 and the last digit not zero; no digits for zero.
struct DECIMAL {
    bool has_sign = false, negative = false, any = false;
    std::string digits;
    long point = 0;
};
} // namespace

static const char* skip_space(const char* p) {
    while (isspace(static_cast<unsigned char>(*p))) ++p;
    return p;
}

static const char* read_sign(const char* p, DECIMAL* d) {
    if (*p == '+' || *p == '-') {
        d->has_sign = true;
        d->negative = *p++ == '-';
    }
    return p;
}

// The exponent behind its letter, or 0 if there is no number; held within limits that no text's digits make up for.
static long read_exponent(const char* p) {
    char* end;
    long e = strtol(p, &end, 10);
    const long limit = 1000000000;
    return e < -limit ? -limit : e > limit ? limit : e;
}

static DECIMAL read_decimal(const char* p) {
    DECIMAL d;
    p = read_sign(skip_space(p), &d);
    bool behind_point = false, tail = false;
    for (;; ++p) {
        if (*p == '.' && !behind_point) {
            behind_point = true;
            continue;
        }
        if (!isdigit(static_cast<unsigned char>(*p))) break;
        d.any = true;
        if (d.digits.empty() && *p == '0') {
            if (behind_point) --d.point;
            continue;
        }
        if (!behind_point) ++d.point;
        if (d.digits.size() < max_digits)
            d.digits += *p;
        else
            tail |= *p != '0';
    }
    if (tail) d.digits += '1';
    d.digits.erase(d.digits.find_last_not_of('0') + 1);
    if (d.any && (*p == 'e' || *p == 'E')) d.point += read_exponent(p + 1);
    return d;
}

static int read_hex(const char* p, int sign, simul_fval* x) {
    UWIDE m = 0;
    int64_t e = 0;
    bool behind_point = false, sticky = false;
    for (;; ++p) {
        if (*p == '.' && !behind_point) {
            behind_point = true;
            continue;
        }
        if (!isxdigit(static_cast<unsigned char>(*p))) break;
        int digit = *p <= '9' ? *p - '0' : (*p | 0x20) - 'a' + 10;
        if (m >> 124) {
            sticky |= digit != 0;
            e += behind_point ? 0 : 4;
        } else {
            m = m << 4 | static_cast<unsigned>(digit);
            e -= behind_point ? 4 : 0;
        }
    }
    if (*p == 'p' || *p == 'P') e += read_exponent(p + 1);
    return pack(x, sign, m, e, sticky);
}

int f_atof(const char* text, simul_fval* x) {
    DECIMAL sign;
    const char* p = read_sign(skip_space(text), &sign);
    if (strncasecmp(p, "nan", 3) == 0) {
        *x = a_nan;
        return 0;
    }
    if (strncasecmp(p, "inf", 3) == 0) return set_inf(x, sign.negative);
    if (p[0] == '0' && (p[1] | 0x20) == 'x') return read_hex(p + 2, sign.negative, x);
    DECIMAL d = read_decimal(text);
    if (d.digits.empty()) return set_zero(x, d.negative);
    if (d.point > max_exponent) {
        set_inf(x, d.negative);
        return fp_mark(FPE_OVER);
    }
    if (d.point < -max_exponent) {
        set_zero(x, d.negative);
        return fp_mark(FPE_UNDER);
    }
    return decimal_value(d.digits, static_cast<int>(d.point - static_cast<long>(d.digits.size())), d.negative, x);
}

// With `flag` a positive number is spelled with its sign even if the text has none.
char* normalize_fcon(const char* text, int flag) {
    DECIMAL sign;
    const char* start = skip_space(text);
    const char* p = read_sign(start, &sign);
    // Special words and hexadecimal numbers have one spelling only.
    bool word = strncasecmp(p, "nan", 3) == 0 || strncasecmp(p, "inf", 3) == 0;
    if (word || (p[0] == '0' && (p[1] | 0x20) == 'x')) return safestrdup(start);
    DECIMAL d = read_decimal(text);
    if (!d.any) return safestrdup("+0.0");
    std::string out = d.negative ? "-" : d.has_sign || flag ? "+" : "";
    if (d.digits.empty()) return safestrdup((out + "0.0").c_str());
    long exponent = d.point - 1;
    if (exponent < -3 || exponent > 4) {
        out += d.digits.substr(0, 1) + "." + (d.digits.size() > 1 ? d.digits.substr(1) : "0") + "e" +
               std::to_string(exponent);
    } else if (exponent < 0) {
        out += "0." + std::string(-exponent - 1, '0') + d.digits;
    } else {
        size_t whole = static_cast<size_t>(exponent) + 1;
        if (d.digits.size() <= whole) d.digits.append(whole + 1 - d.digits.size(), '0');
        out += d.digits.substr(0, whole) + "." + d.digits.substr(whole);
    }
    return safestrdup(out.c_str());
}
