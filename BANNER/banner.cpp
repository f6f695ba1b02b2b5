// The names and the version stand here and nowhere else.
#include "BANNER/banner.h"

namespace {
constexpr char FAMILY[] = "Zelkova";
constexpr char VERSION[] = "1.0.0";
} // namespace

const char* tool_name() { return "C/C++ Optimizer"; }

const char* isa_and_tool_name() {
    static const struct NAME {
        char text[80];
        NAME() { std::snprintf(text, sizeof text, "%s %s", FAMILY, tool_name()); }
    } name;
    return name.text;
}

const char* tool_version() { return VERSION; }

void print_toolversion(FILE* out) { std::fprintf(out, "%s v%s\n", isa_and_tool_name(), tool_version()); }
