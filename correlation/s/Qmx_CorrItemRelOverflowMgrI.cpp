#include "Qmx_CorrItemRelOverflowMgrI.h"

Qmx_CorrItemRelOverflowMgrI::~Qmx_CorrItemRelOverflowMgrI() = default;
