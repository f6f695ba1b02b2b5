// Demangling through the C++ run-time.
//
// The text of a mangled name may be exponentially longer than the name, since each substitution may stand for a text
// that holds two earlier ones. Names come from the input file, so a name is only spelled out when it is short and has
// few substitutions; it is a matter of looks alone, and the mangled name serves as well.
#include "DECODE/decode.h"

#include <cctype>
#include <cstdlib>
#include <cstring>
#include <cxxabi.h>

int decode_mangle_scheme = 0;
std::mutex demangle_lock;

static const size_t max_length = 4096;
static const int max_substitutions = 32;

static bool is_type_encoding(const char* name) {
    // A source name begins with its length, which no identifier of the source does. A nested name begins like an
    // identifier, so it only counts where names are known to be of this scheme.
    if (isdigit(static_cast<unsigned char>(name[0]))) return true;
    return decode_mangle_scheme == 1 && name[0] == 'N' && isdigit(static_cast<unsigned char>(name[1])) &&
           name[strlen(name) - 1] == 'E';
}

static int substitutions(const char* name) {
    int n = 0;
    for (; *name; ++name)
        if ((*name == 'S' || *name == 'T') && (name[1] == '_' || isalnum(static_cast<unsigned char>(name[1])))) ++n;
    return n;
}

// The spelling on the heap, or null.
static char* spelling(const char* name) {
    if (strncmp(name, "_Z", 2) != 0 && !is_type_encoding(name)) return nullptr;
    if (strlen(name) > max_length || substitutions(name) > max_substitutions) return nullptr;
    int status = 0;
    return abi::__cxa_demangle(name, nullptr, nullptr, &status);
}

bool decode_is_cpp_name(const char* name) {
    if (!name || !*name) return false;
    if (strncmp(name, "_Z", 2) == 0) return true;
    if (!is_type_encoding(name)) return false;
    char* text = spelling(name);
    free(text);
    return text != nullptr;
}

std::string decode_name(const char* name) {
    if (!name) return "";
    char* text = spelling(name);
    if (!text) return name;
    std::string result(text);
    free(text);
    return result;
}
