#include "Qmx_CorrPropertyValue.h"

#include "Qmx_CorrException.h"

namespace {
const char* const kSourceFile = "s/Qmx_CorrPropertyValue";
const char* const kRevision = "1";
}  // namespace

int Qmx_CorrPropertyValue::GetINT32() const {
    if (m_type != kINT32) QMX_CORR_THROW(IncorrectPropertyType);
    return m_int;
}

const Vesk::StringBase<char>& Qmx_CorrPropertyValue::GetString() const {
    if (m_type != kString) QMX_CORR_THROW(IncorrectPropertyType);
    return m_string;
}

void Qmx_CorrPropertyValue::SetINT32(int value) {
    m_type = kINT32;
    m_int = value;
}

void Qmx_CorrPropertyValue::SetString(const Vesk::StringBase<char>& value) {
    m_type = kString;
    m_string = value;
}
