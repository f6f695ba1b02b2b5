// What the names of C++ functions tell.

#include "OPT5/ir/funinfo.h"

#include "DECODE/decode.h"

namespace {

// "a::b::f(int)" as its last name and the one before it; both empty for a name that is no C++ name.
struct CPP_NAME {
    std::string scope, name;
};

CPP_NAME cpp_name(const FUNINFO* f) {
    CPP_NAME parts;
    if (!decode_is_cpp_name(f->name.c_str())) return parts;
    std::string text = decode_name(f->name.c_str());
    text = text.substr(0, text.find('('));
    const size_t colon = text.rfind("::");
    parts.name = colon == std::string::npos ? text : text.substr(colon + 2);
    if (colon == std::string::npos) return parts;
    const size_t outer = text.rfind("::", colon ? colon - 1 : 0);
    parts.scope = text.substr(outer == std::string::npos || outer >= colon ? 0 : outer + 2);
    parts.scope = parts.scope.substr(0, parts.scope.find("::"));
    parts.scope = parts.scope.substr(0, parts.scope.find('<'));
    return parts;
}

} // namespace

// The front end's own name for the function that runs a file's dynamic initializations.
bool fun_is_cpp_static_initializer(const FUNINFO* f) { return f->name.compare(0, 7, "__sti__") == 0; }

bool fun_is_cpp_constructor(const FUNINFO* f) {
    const CPP_NAME n = cpp_name(f);
    return !n.name.empty() && n.name.substr(0, n.name.find('<')) == n.scope;
}

bool fun_is_cpp_destructor(const FUNINFO* f) {
    const CPP_NAME n = cpp_name(f);
    return !n.name.empty() && n.name[0] == '~';
}
