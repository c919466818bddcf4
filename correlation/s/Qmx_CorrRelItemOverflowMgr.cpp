#include "Qmx_CorrRelItemOverflowMgr.h"

Qmx_CorrRelItemOverflowMgr::Qmx_CorrRelItemOverflowMgr(Swizzler* swizzler)
    : Qmx_CorrOverflowMgrT(swizzler) {}

Qmx_CorrRelItemOverflowMgr::~Qmx_CorrRelItemOverflowMgr() = default;
