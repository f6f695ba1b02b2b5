// Names are taken apart as text; whether two of them lead to one file is asked of the system.
#include "HOST/file_names.h"

#include <cstdlib>
#include <sys/stat.h>
#include <unistd.h>

std::string name_without_extension(const std::string& name) {
    const std::size_t slash = name.rfind('/');
    const std::size_t start = slash == std::string::npos ? 0 : slash + 1;
    const std::size_t dot = name.rfind('.');
    if (dot == std::string::npos || dot <= start) return name;
    return name.substr(0, dot);
}

std::string replace_extension(const std::string& name, const std::string& extension) {
    return name_without_extension(name) + extension;
}

std::string debug_file_name(const std::string& name, const char* suffix) {
    std::string text = name_without_extension(name);
    if (suffix) text += std::string(".") + suffix;
    if (text.size() > DEBUG_NAME_LIMIT) text.resize(DEBUG_NAME_LIMIT);
    return text + ".odb";
}

bool is_same_file(const std::string& a, const std::string& b) {
    struct stat x, y;
    if (stat(a.c_str(), &x) != 0 || stat(b.c_str(), &y) != 0) return false;
    return S_ISREG(x.st_mode) && x.st_dev == y.st_dev && x.st_ino == y.st_ino;
}

bool is_standard_output(const std::string& name) {
    struct stat x, y;
    if (stat(name.c_str(), &x) != 0 || fstat(STDOUT_FILENO, &y) != 0 || S_ISCHR(x.st_mode)) return false;
    return x.st_dev == y.st_dev && x.st_ino == y.st_ino;
}

std::string real_file_name(const std::string& name) {
    char* const real = realpath(name.c_str(), nullptr);
    if (!real) return name;
    const std::string text = real;
    std::free(real);
    return text;
}

bool is_regular_file(const std::string& name) {
    struct stat s;
    return stat(name.c_str(), &s) == 0 && S_ISREG(s.st_mode);
}
