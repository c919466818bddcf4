#include "Qmx_CorrName_Basic.h"

Qmx_CorrName_Basic::~Qmx_CorrName_Basic() = default;

Qmx_CorrName_Basic::Qmx_CorrName_Basic(const Qmx_CorrNameRepo_Basic* repository,
                                       unsigned int refCount, unsigned int index,
                                       unsigned int holderCount)
    : m_refCount(refCount), m_index(index), m_holderCount(holderCount), m_repository(repository) {}
