#include "Qmx_CorrDb.h"

Qmx_CorrDb::~Qmx_CorrDb() = default;
