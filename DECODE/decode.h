// Names of C++ entities as the source spells them.
#pragma once

#include <mutex>
#include <string>

// 0: names of the older scheme, which have no mangled form known here; 1: names of the Itanium scheme. Set by the
// options.
extern int decode_mangle_scheme;
// Held by whoever prints names, so that the lines of one dump stay together. The functions here have no static state and
// take no lock.
extern std::mutex demangle_lock;

// The source's spelling of a mangled function, variable or type name; any other name comes back as it is. A null name
// gives an empty text. A mangled name too large to be spelled out in reasonable space stays mangled.
std::string decode_name(const char* name);

// Whether the name has the form of a mangled C++ name.
bool decode_is_cpp_name(const char* name);
