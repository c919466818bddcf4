// Vesk::ClassId: the identifier of a component class or interface, made from its identifier
// text (conventionally a UUID such as "6f1c0d3e-5b7a-4c2e-9d41-0a8b3c5e7f90"). Value type.
#ifndef VESK_CLASSID_H
#define VESK_CLASSID_H
#include "VeskExport.h"
#include "Vesk_StringBase.h"

namespace Vesk {

class VESK_EXPORT ClassId {
public:
    explicit ClassId(const char* text);

    const StringBase<char>& GetText() const { return m_text; }
    bool operator==(const ClassId& other) const;
    bool operator!=(const ClassId& other) const { return !(*this == other); }

private:
    StringBase<char> m_text;  // lower case: identifiers are compared without regard to case
};

}  // namespace Vesk

#endif
