#include "Vesk_StringBase.h"

#include <cstdarg>
#include <cstring>

#include "Vesk_Fmt.h"

namespace Vesk {

namespace {

unsigned char LowerAscii(unsigned char c) {
    return (c >= 'A' && c <= 'Z') ? static_cast<unsigned char>(c - 'A' + 'a') : c;
}

}  // namespace

StringBase<char>::StringBase(const char* text) : std::string(text ? text : "") {}

StringBase<char>::StringBase(const char* text, size_type length) : std::string(text, length) {}

StringBase<char>::StringBase(const std::string& text) : std::string(text) {}

StringBase<char>::StringBase(std::string&& text) : std::string(std::move(text)) {}

StringBase<char>::StringBase(size_type count, char c) : std::string(count, c) {}

StringBase<char>& StringBase<char>::operator=(const char* text) {
    assign(text ? text : "");
    return *this;
}

StringBase<char>& StringBase<char>::operator=(const std::string& text) {
    assign(text);
    return *this;
}

StringBase<char>& StringBase<char>::operator=(std::string&& text) {
    std::string::operator=(std::move(text));
    return *this;
}

StringBase<char>& StringBase<char>::Format(const char* format, ...) {
    va_list args;
    va_start(args, format);
    assign(Vesk_Fmt::VFormatString(format, args));
    va_end(args);
    return *this;
}

int StringBase<char>::Compare(const StringBase& other) const {
    const size_type common = size() < other.size() ? size() : other.size();
    const int result = common == 0 ? 0 : std::memcmp(data(), other.data(), common);
    if (result != 0) return result;
    return size() < other.size() ? -1 : (size() > other.size() ? 1 : 0);
}

int StringBase<char>::CompareNoCase(const StringBase& other) const {
    const size_type common = size() < other.size() ? size() : other.size();
    for (size_type i = 0; i < common; ++i) {
        const unsigned char a = LowerAscii(static_cast<unsigned char>((*this)[i]));
        const unsigned char b = LowerAscii(static_cast<unsigned char>(other[i]));
        if (a != b) return a < b ? -1 : 1;
    }
    return size() < other.size() ? -1 : (size() > other.size() ? 1 : 0);
}

StringBase<char>::size_type StringBase<char>::Replace(const StringBase& from,
                                                      const StringBase& to) {
    if (from.empty()) return 0;
    size_type count = 0;
    size_type pos = find(from);
    while (pos != npos) {
        replace(pos, from.size(), to);
        ++count;
        pos = find(from, pos + to.size());
    }
    return count;
}

StringBase<char>& StringBase<char>::Append(char c, size_type count) {
    append(count, c);
    return *this;
}

void StringBase<char>::Truncate(size_type length) {
    if (length < size()) resize(length);
}

void StringBase<char>::Trim(const char* blanks) {
    const size_type first = find_first_not_of(blanks);
    if (first == npos) {
        clear();
        return;
    }
    const size_type last = find_last_not_of(blanks);
    assign(substr(first, last - first + 1));
}

bool StringBase<char>::NextTokenRange(const char* separators, size_type& pos, size_type& start,
                                      size_type& length) const {
    if (pos == npos || pos > size()) return false;
    start = pos;
    const size_type end = find_first_of(separators, pos);
    if (end == npos) {
        length = size() - pos;
        pos = npos;
    } else {
        length = end - pos;
        pos = end + 1;
    }
    return true;
}

StringBase<char>::size_type StringBase<char>::GetIndexOfLastChar(char c) const { return rfind(c); }

bool StringBase<char>::GetUINT32(std::uint32_t& value) const {
    if (empty()) return false;
    std::uint64_t result = 0;
    for (char c : *this) {
        if (c < '0' || c > '9') return false;
        result = result * 10 + static_cast<std::uint64_t>(c - '0');
        if (result > 0xFFFFFFFFull) return false;
    }
    value = static_cast<std::uint32_t>(result);
    return true;
}

char* StringBase<char>::LockBuffer(size_type length) {
    if (size() < length) resize(length);
    return &(*this)[0];
}

void StringBase<char>::UnlockBuffer(size_type length) {
    if (length == npos) length = std::strlen(c_str());
    resize(length < size() ? length : size());
}

}  // namespace Vesk
