// From option words to options: names, short forms in chains, arguments.
//
// Every name is matched without regard to case and must be written out in full; of the names that a word begins with,
// the longest counts ("-h1" before "-h", "-#v" before "-#"). Behind a name that takes an argument the rest of the word
// is the argument; behind another, a "--" word must end and a chain of short options goes on.
#include "OPTIONS/optgen.h"
#include "OPTIONS/option_obj.h"

#include <cctype>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <strings.h>

namespace {

constexpr int FORMS = 10;

struct NAME_MATCH {
    int id = -1;
    int form = 0;
    std::size_t length = 0; // of the name less its first hyphen
};

// The longest name that `word`, an option less its first hyphen, begins with.
NAME_MATCH find_name(const char* word) {
    NAME_MATCH best;
    for (int id = 0; id < option_obj::OPTION_COUNT; ++id) {
        const auto& forms = option_obj::option_definitions[id].forms;
        for (int form = 0; form < FORMS && forms[form]; ++form) {
            const char* const name = forms[form] + 1;
            const std::size_t length = std::strlen(name);
            if (length > best.length && strncasecmp(word, name, length) == 0) best = {id, form, length};
        }
    }
    return best;
}

bool is_help_word(const char* word) {
    return strcasecmp(word, "-help") == 0 || strcasecmp(word, "-usage") == 0 || *word == '?';
}

option_obj::parse_option_type parse_type_of(int id) {
    switch (option_obj::parm_type[id]) {
    case option_obj::PK_STRING: return option_obj::PT_STRING;
    case option_obj::PK_NUMBER: return option_obj::PT_NUM;
    case option_obj::PK_UNSIGNED: return option_obj::PT_UNUM;
    case option_obj::PK_ENUM: return option_obj::PT_ONEOF;
    case option_obj::PK_NUMBER_LIST: return option_obj::PT_NUM_LIST;
    case option_obj::PK_UNSIGNED_LIST: return option_obj::PT_UNUM_LIST;
    default: return option_obj::PT_STRING_LIST;
    }
}

enum ARG_TEXT { ARG_STRING, ARG_ONEOF, ARG_SIGNED, ARG_UNSIGNED, ARG_UNKNOWN };
ARG_TEXT text_of_type(option_obj::parse_option_type type) {
    switch (type) {
    case option_obj::PT_NUM:
    case option_obj::PT_NUM_LIST:
    case option_obj::PT_ATTACHED_NUM:
    case option_obj::PT_ATTACHED_NUM_LIST: return ARG_SIGNED;
    case option_obj::PT_UNUM:
    case option_obj::PT_UNUM_LIST:
    case option_obj::PT_ATTACHED_UNUM:
    case option_obj::PT_ATTACHED_UNUM_LIST: return ARG_UNSIGNED;
    case option_obj::PT_ONEOF:
    case option_obj::PT_ATTACHED_ONEOF: return ARG_ONEOF;
    case option_obj::PT_STRING:
    case option_obj::PT_STRING_LIST:
    case option_obj::PT_ATTACHED_STRING:
    case option_obj::PT_ATTACHED_STRING_LIST: return ARG_STRING;
    }
    return ARG_UNKNOWN;
}

} // namespace

void option_obj::report(DIAGNOSTIC&& message) const {
    const DIAG_SRCINFO_DATA where(origin.c_str(), 0, 0);
    message.set_src(origin.empty() ? nullptr : &where)->report();
}

void option_obj::report_and_exit(DIAGNOSTIC&& message) const {
    report(std::move(message));
    std::exit(1);
}

bool option_obj::process_option(const char* word, const char** rest) {
    while (*word) {
        current_word = word;
        const char* const next = parse_one(word);
        if (!next) {
            current_word = "<internal>";
            if (rest) *rest = word;
            return false;
        }
        word = next;
    }
    current_word = "<internal>";
    return true;
}

// Takes one option off the front of the word. Returns what is left, null if no option accepts it.
const char* option_obj::parse_one(const char* word) {
    if (help_allowed && is_help_word(word)) {
        display_option_help(0, 0, 0);
        std::fflush(stdout);
        std::exit(0);
    }
    const NAME_MATCH match = find_name(word);
    if (match.id < 0) return nullptr;
    const char* const end = word + match.length;
    const bool has_arg = option_definitions[match.id].has_arg;
    if (!has_arg && *word == '-' && *end) return nullptr;
    deprecated_case(word, option_definitions[match.id].forms[match.form] + 1);
    parsed_option(match.id, match.form);
    if (debug)
        std::printf("%s: Parsed option id %s/%d\n", "opt option debug", option_definitions[match.id].forms[0],
                    match.id);
    if (!has_arg) {
        setopt(match.id);
        return end;
    }
    parse_arg(match.id, end, option_definitions[match.id].forms[match.form], parse_type_of(match.id),
              &option_definitions[match.id].range);
    return end + std::strlen(end);
}

void option_obj::deprecated_case(const char* written, const char* spelling) {
    const std::string as_written(written, std::strlen(spelling));
    if (as_written == spelling) return;
    report(DIAG::optgen_case_insensitivity_deprecated(__FILE__, __LINE__, ("-" + as_written).c_str(),
                                                      (std::string("-") + spelling).c_str()));
}

void option_obj::parse_arg(int id, const char* text, const char* option_name, parse_option_type type,
                           const arg_range* range) {
    const ARG_TEXT kind = text_of_type(type);
    if (kind == ARG_UNKNOWN) report_and_exit(DIAG::optgen_option_handler_corruption(__FILE__, __LINE__));
    if (*text == '=') ++text;
    const bool may_follow = type < PT_ATTACHED_NUM;
    if (!*text && may_follow) text = next_arg ? next_arg() : nullptr;
    if (!text || !*text)
        report_and_exit(
            DIAG::optgen_missing_parameter(__FILE__, __LINE__, option_name, option_definitions[id].arg_text));
    switch (kind) {
    case ARG_ONEOF: parse_oneof(id, text, option_name); break;
    case ARG_SIGNED: check_numerical_arg(id, text, option_name, true, range); break;
    case ARG_UNSIGNED: check_numerical_arg(id, text, option_name, false, range); break;
    default: setarg(id, text); break;
    }
}

void option_obj::parse_oneof(int id, const char* text, const char* option_name) {
    std::string words;
    for (const option_item* item = option_definitions[id].items; item && item->word; ++item) {
        if (strcasecmp(item->word, text) == 0) {
            setarg(id, static_cast<long>(item->value));
            return;
        }
        words += (words.empty() ? "" : ",") + std::string(item->word);
    }
    report_and_exit(DIAG::optgen_bad_argument(__FILE__, __LINE__, option_name, words.c_str()));
}

void option_obj::check_numerical_arg(int id, const char* text, const char* option_name, bool is_signed,
                                     const arg_range* range) {
    long value = 0;
    bool good;
    if (is_signed) {
        good = strtol_by_radix(text, &value);
    } else {
        unsigned long bits = 0;
        good = strtoul_by_radix(text, &bits) && bits <= static_cast<unsigned long>(LONG_MAX);
        value = static_cast<long>(bits);
    }
    if (debug && good && range) {
        if (is_signed)
            std::printf("%s: check %ld <= %ld <= %ld\n", "opt option debug", range->low, value, range->high);
        else
            std::printf("%s: check 0x%lX <= 0x%lX <= 0x%lX\n", "opt option debug", range->low, value, range->high);
    }
    if (good && (!range || (range->low <= value && value <= range->high))) {
        setarg(id, value);
        return;
    }
    if (range && range->low == 0 && range->high >= INT_MAX)
        report_and_exit(DIAG::optgen_arg_out_of_range_non_neg(__FILE__, __LINE__, option_name, text));
    if (range && range->low >= 0)
        report_and_exit(DIAG::optgen_arg_out_of_range2(__FILE__, __LINE__, option_name, text,
                                                       static_cast<unsigned>(range->low),
                                                       static_cast<unsigned>(range->high)));
    report_and_exit(DIAG::optgen_arg_out_of_range(__FILE__, __LINE__, option_name, text));
}

int option_obj::get_radix(const char* text) {
    if (*text == '-' || *text == '+') ++text;
    if (text[0] != '0' || !text[1]) return 10;
    const int letter = std::tolower(static_cast<unsigned char>(text[1]));
    return letter == 'x' ? 16 : letter == 'b' ? 2 : 8;
}

namespace {
// The digits behind sign and prefix; null if there are none, so that "0x" and "--1" are no numbers.
const char* digits_of(const char* text, int radix) {
    if (*text == '-' || *text == '+') ++text;
    if (radix == 16 || radix == 2) text += 2;
    return std::isxdigit(static_cast<unsigned char>(*text)) ? text : nullptr;
}
} // namespace

bool option_obj::strtoul_by_radix(const char* text, unsigned long* value) {
    const int radix = get_radix(text);
    const char* const digits = digits_of(text, radix);
    if (!digits || *text == '-') return false;
    char* end = nullptr;
    errno = 0;
    *value = std::strtoul(digits, &end, radix);
    return errno == 0 && *end == '\0';
}

bool option_obj::strtol_by_radix(const char* text, long* value) {
    unsigned long magnitude = 0;
    const bool negative = *text == '-';
    if (negative && (text[1] == '-' || text[1] == '+')) return false;
    if (!strtoul_by_radix(text + negative, &magnitude) || magnitude > static_cast<unsigned long>(LONG_MAX))
        return false;
    *value = negative ? -static_cast<long>(magnitude) : static_cast<long>(magnitude);
    return true;
}
