#include "Vesk_Fmt.h"

#include <cstdio>

namespace Vesk_Fmt {

int VFormat(char* buffer, std::size_t size, const char* format, std::va_list args) {
    // The caller's format is checked at its call site (VESK_PRINTF); here it is only passed on.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
    return std::vsnprintf(buffer, size, format, args);
#pragma GCC diagnostic pop
}

int Format(char* buffer, std::size_t size, const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    const int result = VFormat(buffer, size, format, args);
    va_end(args);
    return result;
}

std::string VFormatString(const char* format, std::va_list args) {
    char small[256];
    std::va_list copy;
    va_copy(copy, args);
    const int needed = VFormat(small, sizeof small, format, copy);
    va_end(copy);
    if (needed < 0) return std::string();
    if (static_cast<std::size_t>(needed) < sizeof small) return std::string(small, needed);
    std::string result(static_cast<std::size_t>(needed) + 1, '\0');
    VFormat(&result[0], result.size(), format, args);
    result.resize(static_cast<std::size_t>(needed));
    return result;
}

std::string FormatString(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    std::string result = VFormatString(format, args);
    va_end(args);
    return result;
}

}  // namespace Vesk_Fmt
