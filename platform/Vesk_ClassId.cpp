#include "Vesk_ClassId.h"

#include <cctype>

namespace Vesk {

ClassId::ClassId(const char* text) : m_text(text) {
    for (char& c : m_text) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
}

bool ClassId::operator==(const ClassId& other) const { return m_text == other.m_text; }

}  // namespace Vesk
