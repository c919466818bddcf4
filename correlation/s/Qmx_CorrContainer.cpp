#include "Qmx_CorrContainer.h"

Qmx_CorrContainer::~Qmx_CorrContainer() = default;

const Qmx_CorrContainer* Qmx_CorrContainer::GetContainer(const Vesk::StringBase<char>& name) const {
    return const_cast<Qmx_CorrContainer*>(this)->GetContainer(name);
}

const Qmx_CorrItem* Qmx_CorrContainer::GetItem(const Vesk::StringBase<char>& name) const {
    return const_cast<Qmx_CorrContainer*>(this)->GetItem(name);
}
