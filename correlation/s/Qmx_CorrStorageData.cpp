#include "Qmx_CorrStorageData.h"

Qmx_CorrStorageData::Qmx_CorrStorageData()
    : containers(1, nullptr),
      implicitRelationships(1, nullptr),
      itemSwizzler(nullptr),
      expRelSwizzler(nullptr),
      containerVersion(kContainerVersion),
      itemVersion(kItemVersion),
      expRelVersion(kExpRelVersion),
      impRelVersion(kImpRelVersion),
      objectDataVersion(kObjectDataVersion) {}
