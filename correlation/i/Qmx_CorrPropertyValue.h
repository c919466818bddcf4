// Qmx_CorrPropertyValue: one typed property value, a 32-bit signed integer or a string, and
// the property map of an object's data (Qmx_CorrObjectData). Both value fields always exist:
// changing a property's type changes the tag and the field of the new type only, so the other
// field keeps what it held. Plain value type.
#ifndef QMX_CORRPROPERTYVALUE_H
#define QMX_CORRPROPERTYVALUE_H
#include <cstring>
#include <map>

#include "QmxCorrExport.h"
#include "Vesk_StringBase.h"

class QMX_CORR_EXPORT Qmx_CorrPropertyValue {
public:
    // The stored type tags; no other value is valid.
    enum : unsigned int { kINT32 = 0, kString = 1 };

    // An INT32 of 0 with an empty string.
    Qmx_CorrPropertyValue() = default;

    unsigned int GetType() const { return m_type; }
    // Throw Qmx_CorrException::IncorrectPropertyType (no name) for the other tag.
    int GetINT32() const;
    const Vesk::StringBase<char>& GetString() const;

    // Set the tag and the field of that type.
    void SetINT32(int value);
    void SetString(const Vesk::StringBase<char>& value);
    // Any tag, as a damaged record may hold; the writers refuse what is not 0 or 1.
    void SetType(unsigned int type) { m_type = type; }

private:
    unsigned int m_type = kINT32;
    int m_int = 0;
    Vesk::StringBase<char> m_string;
};

// Property names compare as unsigned bytes; on a common prefix the shorter name is first.
struct Qmx_CorrPropertyNameLess {
    bool operator()(const Vesk::StringBase<char>& a, const Vesk::StringBase<char>& b) const {
        const std::size_t common = a.size() < b.size() ? a.size() : b.size();
        const int order = std::memcmp(a.data(), b.data(), common);
        return order != 0 ? order < 0 : a.size() < b.size();
    }
};

typedef std::map<Vesk::StringBase<char>, Qmx_CorrPropertyValue, Qmx_CorrPropertyNameLess>
    Qmx_CorrPropertyMap;

#endif
