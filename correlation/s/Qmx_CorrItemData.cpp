#include "Qmx_CorrItemData.h"

#include "Qmx_CorrStorage.h"

Qmx_CorrItemData::Qmx_CorrItemData(Qmx_CorrObjectOwner* owner, Qmx_CorrContainer* container)
    : Qmx_CorrObjectData(owner), m_container(container) {}

Qmx_CorrItemData::Qmx_CorrItemData(Qmx_CorrObjectOwner* owner, Qmx_CorrStorage& storage)
    : Qmx_CorrObjectData(owner, storage), m_container(storage.ReadContainerPtr()) {}

Qmx_CorrItemData::~Qmx_CorrItemData() = default;

void Qmx_CorrItemData::Archive(Qmx_CorrStorage& storage) const {
    Qmx_CorrObjectData::Archive(storage);
    storage.WriteContainerPtr(m_container);
}
