// Vesk_Fmt: printf-style formatting into bounded buffers and into strings. Never writes past
// the buffer it is given; thread-safe (no shared state).
#ifndef VESK_FMT_H
#define VESK_FMT_H
#include <cstdarg>
#include <cstddef>
#include <string>

#include "VeskExport.h"

namespace Vesk_Fmt {

// Formats into `buffer` of `size` bytes (NUL-terminated whenever size > 0). Returns the length
// that the whole text needs without its NUL, so a result >= size means the text was cut; a
// negative result is a formatting error.
VESK_EXPORT int VFormat(char* buffer, std::size_t size, const char* format, std::va_list args);
VESK_EXPORT int Format(char* buffer, std::size_t size, const char* format, ...) VESK_PRINTF(3, 4);

// The whole formatted text, however long. A formatting error gives the empty string.
VESK_EXPORT std::string VFormatString(const char* format, std::va_list args);
VESK_EXPORT std::string FormatString(const char* format, ...) VESK_PRINTF(1, 2);

}  // namespace Vesk_Fmt

#endif
