#include "Qmx_CorrItemRelOverflowMgr.h"

Qmx_CorrItemRelOverflowMgr::Qmx_CorrItemRelOverflowMgr(Swizzler* swizzler)
    : Qmx_CorrOverflowMgrT(swizzler) {}

Qmx_CorrItemRelOverflowMgr::~Qmx_CorrItemRelOverflowMgr() = default;
