#include "Qmx_CorrManagedItemPool.h"

Qmx_CorrManagedItemPool::~Qmx_CorrManagedItemPool() = default;
