// Text of simulated floats: digit strings, and formatting as `printf` does it.
#include "FPSIM/decimal.h"
#include "FPSIM/fpsim_impl.h"

#include <algorithm>
#include <cctype>
#include <cstdlib>
#include <cstring>

// ---- Digit strings. The buffer is static, callers hold atof_lock.

static char digit_buffer[20480];

static char* keep(const std::string& digits) {
    size_t n = std::min(digits.size(), sizeof digit_buffer - 1);
    memcpy(digit_buffer, digits.data(), n);
    digit_buffer[n] = 0;
    return digit_buffer;
}

// `n` counts digits from the first significant one, or from the point if `fixed`.
static std::string digits_for(const simul_fval* x, int n, bool fixed, int* point) {
    if (is_special(x)) {
        *point = 0;
        return f_is_nan(x) ? "nan" : "inf";
    }
    if (f_is_zero(x)) {
        *point = fixed ? 0 : 1;
        return std::string(n > 0 ? n : 0, '0');
    }
    std::string digits = decimal_digits(x, point);
    if (!fixed) return round_digits(digits, n, point);
    int before = *point;
    std::string rounded = round_digits(digits, before + n, point);
    if (*point > before && before + n >= 0)
        rounded += std::string(before + n > 0, '0'); // one more digit in front of the point
    return rounded;
}

char* f_ecvt(const simul_fval* x, int n, int* decpt, int* sign) {
    *sign = x->sign;
    return keep(digits_for(x, n, false, decpt));
}

char* f_fcvt(const simul_fval* x, int n, int* decpt, int* sign) {
    *sign = x->sign;
    return keep(digits_for(x, n, true, decpt));
}

// Hexadecimal digits of 1.hhh... * 2^`*exp2`, `n` of them behind the leading one, or as many as it takes if `n` is
// negative.
static std::string hex_digits(const simul_fval* x, int n, int* exp2) {
    *exp2 = 0;
    if (f_is_zero(x)) return std::string(n > 0 ? n + 1 : 1, '0');
    UWIDE m = digits_of(x);
    *exp2 = f_findexp(x);
    m <<= 125 - bit_length(m); // the leading one above 31 hexadecimal digits
    if (n >= 0 && n < 31) {
        int cut = 124 - 4 * n;
        UWIDE half = UWIDE{1} << (cut - 1), rest = m & ((half << 1) - 1);
        m = m >> cut << cut;
        if (rest > half || (rest == half && (m >> cut & 1))) m += half << 1;
    }
    std::string digits;
    for (int i = 31; i >= 0; --i) digits += "0123456789abcdef"[static_cast<int>(m >> (4 * i) & 15)];
    if (n < 0)
        digits.erase(std::max<size_t>(1, digits.find_last_not_of('0') + 1));
    else
        digits.resize(n + 1, '0');
    return digits; // rounding up may have made the leading digit 2, which is as good a spelling
}

char* f_acvt(const simul_fval* x, int n, int* exp2, int* sign) {
    *sign = x->sign;
    if (is_special(x)) return keep(digits_for(x, 0, false, exp2));
    return keep(hex_digits(x, n, exp2));
}

// ---- Conversions

static std::string exponent_text(int e) {
    std::string digits = std::to_string(std::abs(e));
    return (e < 0 ? "-" : "+") + (digits.size() < 2 ? "0" + digits : digits);
}

static std::string e_text(const std::string& digits, int exponent, bool keep_point) {
    std::string out = digits.substr(0, 1);
    if (digits.size() > 1 || keep_point) out += "." + digits.substr(1);
    return out + "e" + exponent_text(exponent);
}

static std::string f_text(const simul_fval* x, int precision, bool keep_point) {
    int point;
    std::string digits = digits_for(x, precision, true, &point);
    if (point <= 0) {
        // As many zeros as the digits stand behind the point, and no more than asked for.
        digits = "0" + std::string(std::min(precision, -point), '0') + digits;
        point = 1;
    }
    digits.resize(point + precision, '0');
    std::string out = digits.substr(0, point);
    if (precision > 0 || keep_point) out += "." + digits.substr(point);
    return out;
}

static void drop_zeros(std::string* text) {
    size_t e = text->find('e');
    std::string tail = e == std::string::npos ? "" : text->substr(e);
    text->resize(e == std::string::npos ? text->size() : e);
    if (text->find('.') != std::string::npos) {
        text->erase(text->find_last_not_of('0') + 1);
        if (text->back() == '.') text->pop_back();
    }
    *text += tail;
}

static std::string magnitude_text(const simul_fval* x, int precision, char conversion, bool alternate) {
    if (is_special(x)) return f_is_nan(x) ? "nan" : "inf";
    int point;
    switch (conversion) {
    case 'a': {
        int exp2;
        std::string digits = hex_digits(x, precision, &exp2);
        std::string out = "0x" + digits.substr(0, 1);
        if (digits.size() > 1 || alternate) out += "." + digits.substr(1);
        return out + "p" + (exp2 < 0 ? "-" : "+") + std::to_string(std::abs(exp2));
    }
    case 'f': return f_text(x, precision < 0 ? 6 : precision, alternate);
    case 'e': {
        std::string digits = digits_for(x, (precision < 0 ? 6 : precision) + 1, false, &point);
        return e_text(digits, point - 1, alternate);
    }
    default: {
        int n = precision < 0 ? 6 : precision == 0 ? 1 : precision;
        std::string digits = digits_for(x, n, false, &point);
        std::string out =
            point - 1 < -4 || point - 1 >= n ? e_text(digits, point - 1, alternate) : f_text(x, n - point, alternate);
        if (!alternate) drop_zeros(&out);
        return out;
    }
    }
}

namespace {
struct FLAGS {
    bool left = false, plus = false, space = false, alternate = false, zero = false;
};
} // namespace

static std::string field(const simul_fval* x, int width, int precision, char conversion, const FLAGS& flags) {
    char lower = static_cast<char>(tolower(static_cast<unsigned char>(conversion)));
    std::string sign = x->sign ? "-" : flags.plus ? "+" : flags.space ? " " : "";
    std::string text = magnitude_text(x, precision, lower, flags.alternate);
    size_t length = sign.size() + text.size(), wanted = width > 0 ? static_cast<size_t>(width) : 0;
    std::string fill(wanted > length ? wanted - length : 0, ' ');
    if (flags.left)
        text = sign + text + fill;
    else if (flags.zero && !is_special(x))
        text = sign + (lower == 'a' ? "0x" : "") + std::string(fill.size(), '0') + text.substr(lower == 'a' ? 2 : 0);
    else
        text = fill + sign + text;
    if (lower != conversion)
        for (char& c : text) c = static_cast<char>(toupper(static_cast<unsigned char>(c)));
    return text;
}

int f_f2ascii(char* out, int width, int precision, char conversion, const simul_fval* x) {
    std::string text = field(x, width, precision, conversion, FLAGS());
    memcpy(out, text.c_str(), text.size() + 1);
    return static_cast<int>(text.size());
}

// One conversion; "%%" stands for "%". Without a precision "%a" gives all digits, since its text stands for the value.
int f_ftoa(char* out, const char* format, const simul_fval* x) {
    std::string text;
    const char* p = format;
    for (; *p; ++p) {
        if (*p != '%') {
            text += *p;
            continue;
        }
        if (*++p == '%') {
            text += '%';
            continue;
        }
        FLAGS flags;
        for (; *p && strchr("-+ #0", *p); ++p) {
            flags.left |= *p == '-';
            flags.plus |= *p == '+';
            flags.space |= *p == ' ';
            flags.alternate |= *p == '#';
            flags.zero |= *p == '0';
        }
        char* end;
        long width = isdigit(static_cast<unsigned char>(*p)) ? strtol(p, &end, 10) : (end = const_cast<char*>(p), 0);
        long precision = -1;
        if (*end == '.')
            precision = isdigit(static_cast<unsigned char>(end[1])) ? strtol(end + 1, &end, 10) : (++end, 0);
        for (p = end; *p == 'l' || *p == 'L' || *p == 'h'; ++p) {
        }
        if (!*p) break;
        text += field(x, static_cast<int>(width), static_cast<int>(precision), *p, flags);
    }
    memcpy(out, text.c_str(), text.size() + 1);
    return static_cast<int>(text.size());
}

char* f_utoa(unsigned long v, char* out, int radix) {
    char digits[64];
    int n = 0;
    do {
        digits[n++] = "0123456789abcdefghijklmnopqrstuvwxyz"[v % radix];
        v /= radix;
    } while (v);
    std::reverse_copy(digits, digits + n, out);
    out[n] = 0;
    return out;
}

void f_print(const simul_fval* x) {
    std::string text = field(x, 0, 17, 'g', FLAGS());
    fputs(text.c_str(), stdout);
}

void f_dbg(const char* text, const simul_fval* x) {
    printf("%s mant:", text);
    for (uint16_t digit : x->mant) printf(" %04x", digit);
    printf(" exp:  %d, sign: %d\n", x->exp, x->sign);
}
