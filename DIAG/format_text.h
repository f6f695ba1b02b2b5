// printf into a string of the exact size.
#pragma once

#include <cstdarg>
#include <string>

std::string format_text(const char* format, va_list args);
