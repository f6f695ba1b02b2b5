// File names: extensions, the same file under two names.
#pragma once

#include <cstddef>
#include <string>

// The name less its extension: what stands before the last "." of the last component. A name that begins with its only
// dot has none.
std::string name_without_extension(const std::string& name);
std::string replace_extension(const std::string& name, const std::string& extension); // extension with its dot

// Name of a debug file: `name` less its extension, "." and the suffix if there is one, cut at 250 characters, ".odb".
constexpr std::size_t DEBUG_NAME_LIMIT = 250;
std::string debug_file_name(const std::string& name, const char* suffix);

// Whether both names lead to one existing regular file, by whatever links.
bool is_same_file(const std::string& a, const std::string& b);
bool is_regular_file(const std::string& name);
// Whether what is printed on the standard output goes to this file or pipe.
bool is_standard_output(const std::string& name);
// Where the name leads when all its links are followed; the name itself if it leads nowhere.
std::string real_file_name(const std::string& name);
