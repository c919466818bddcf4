#include "Vesk_Exception.h"

#include <cstdarg>

#include "Vesk_Fmt.h"
#include "Vesk_MsgManData.h"

namespace Vesk {

Exception::Exception(const char* component, const char* sourceFile, const char* revision, int line,
                     const char* description)
    : m_component(component),
      m_sourceFile(sourceFile),
      m_revision(revision),
      m_line(line),
      m_description(description) {}

Exception::Exception(const Exception& other) = default;

Exception& Exception::operator=(const Exception& other) = default;

Exception::~Exception() = default;

void Exception::setDescription(const char* format, ...) {
    std::va_list args;
    va_start(args, format);
    m_description = Vesk_Fmt::VFormatString(format, args);
    va_end(args);
}

void Exception::report() const {
    Vesk_MsgManData::createObject(m_component.c_str(), m_sourceFile.c_str(), m_line,
                                  m_revision.c_str())
        .issueError("%s", m_description.c_str());
}

const wchar_t* Exception::getLocalized() const {
    // Texts are 8-bit; each byte becomes one wide character, which keeps ASCII exact.
    m_localized.clear();
    for (unsigned char c : m_description) m_localized.push_back(static_cast<wchar_t>(c));
    return m_localized.c_str();
}

const char* Exception::what() const noexcept { return m_description.c_str(); }

}  // namespace Vesk
