#include "Qmx_CorrRelData.h"

#include "Qmx_CorrStorage.h"

Qmx_CorrRelData::Qmx_CorrRelData(Qmx_CorrObjectOwner* owner, const Vesk::StringBase<char>& name)
    : Qmx_CorrObjectData(owner), m_name(name) {}

Qmx_CorrRelData::Qmx_CorrRelData(Qmx_CorrObjectOwner* owner, Qmx_CorrStorage& storage)
    : Qmx_CorrObjectData(owner, storage), m_name(storage.ReadString()) {}

Qmx_CorrRelData::~Qmx_CorrRelData() = default;

void Qmx_CorrRelData::Archive(Qmx_CorrStorage& storage) const {
    Qmx_CorrObjectData::Archive(storage);
    storage.WriteString(m_name);
}
