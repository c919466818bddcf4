#include "Qmx_CorrManagedExpRelPool.h"

Qmx_CorrManagedExpRelPool::~Qmx_CorrManagedExpRelPool() = default;
