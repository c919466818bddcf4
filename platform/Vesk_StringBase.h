// Vesk::StringBase<char>: the owned, length-counted 8-bit string of the whole system. It is a
// std::string (bytes, embedded zero bytes included) with the few operations that the library's
// call sites use on top. Plain value type; one thread at a time per object.
#ifndef VESK_STRINGBASE_H
#define VESK_STRINGBASE_H
#include <cstdint>
#include <string>

#include "VeskExport.h"

namespace Vesk {

template <typename CharT>
class StringBase;

template <>
class VESK_EXPORT StringBase<char> : public std::string {
public:
    StringBase() = default;
    // A null pointer gives the empty string.
    StringBase(const char* text);  // NOLINT: implicit by design
    StringBase(const char* text, size_type length);
    StringBase(const std::string& text);  // NOLINT
    StringBase(std::string&& text);       // NOLINT
    StringBase(size_type count, char c);

    StringBase& operator=(const char* text);
    StringBase& operator=(const std::string& text);
    StringBase& operator=(std::string&& text);

    // Replaces the content by the printf-style formatted text.
    StringBase& Format(const char* format, ...) VESK_PRINTF(2, 3);

    // Byte-wise comparison (bytes as unsigned): negative, zero or positive.
    int Compare(const StringBase& other) const;
    // ASCII letters compared without regard to case, other bytes as in Compare.
    int CompareNoCase(const StringBase& other) const;

    // Replaces every non-overlapping occurrence of `from` (not empty) by `to`, left to right.
    // Returns the number of replacements.
    size_type Replace(const StringBase& from, const StringBase& to);

    // Appends `count` copies of `c`.
    StringBase& Append(char c, size_type count);

    // Shortens the string to `length` bytes; a longer length leaves it as it is.
    void Truncate(size_type length);

    // Removes the bytes of `blanks` (by default space and tab) at both ends.
    void Trim(const char* blanks = " \t");

    // Token scanner. Start with `pos` 0; each call yields the range [start, start + length) up
    // to the next byte of `separators` (or the end) and moves `pos` past it. Empty tokens
    // between adjacent separators are yielded too. Returns false once the text is used up.
    bool NextTokenRange(const char* separators, size_type& pos, size_type& start,
                        size_type& length) const;

    // Index of the last occurrence of `c`, or npos.
    size_type GetIndexOfLastChar(char c) const;

    // Reads the whole string as a decimal unsigned 32-bit number (digits only, no sign, no
    // blanks). Returns false, leaving `value` alone, when it is not one or does not fit.
    bool GetUINT32(std::uint32_t& value) const;

    // In-place filling: LockBuffer gives room for at least `length` bytes (the old content
    // kept) and UnlockBuffer fixes the length: `length`, or with npos the bytes before the
    // first zero byte of the buffer.
    char* LockBuffer(size_type length);
    void UnlockBuffer(size_type length = npos);
};

}  // namespace Vesk

#endif
