#include "Qmx_CorrRelItemOverflowMgrI.h"

Qmx_CorrRelItemOverflowMgrI::~Qmx_CorrRelItemOverflowMgrI() = default;
