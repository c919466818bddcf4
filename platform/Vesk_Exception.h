// Vesk::Exception: the base of every exception the system throws. Records where it was raised
// (component, source file, revision stamp, line) and a description, which what() returns.
// Copyable value type.
#ifndef VESK_EXCEPTION_H
#define VESK_EXCEPTION_H
#include <exception>
#include <string>

#include "VeskExport.h"
#include "Vesk_StringBase.h"

namespace Vesk {

class VESK_EXPORT Exception : public std::exception {
public:
    // Null texts are recorded as empty ones.
    Exception(const char* component, const char* sourceFile, const char* revision, int line,
              const char* description = nullptr);
    Exception(const Exception& other);
    Exception& operator=(const Exception& other);
    ~Exception() override;

    // Replaces the description by the printf-style formatted text.
    void setDescription(const char* format, ...) VESK_PRINTF(2, 3);

    // Sends the description to the message manager's error output.
    virtual void report() const;
    // The description as a wide string; valid until the exception changes or is destroyed.
    virtual const wchar_t* getLocalized() const;

    const char* what() const noexcept override;
    const StringBase<char>& getComponent() const { return m_component; }
    const StringBase<char>& getSourceFile() const { return m_sourceFile; }
    const StringBase<char>& getRevision() const { return m_revision; }
    int getLine() const { return m_line; }
    const StringBase<char>& getDescription() const { return m_description; }

private:
    StringBase<char> m_component;
    StringBase<char> m_sourceFile;
    StringBase<char> m_revision;
    int m_line;
    StringBase<char> m_description;
    mutable std::wstring m_localized;  // filled by getLocalized
};

}  // namespace Vesk

#endif
