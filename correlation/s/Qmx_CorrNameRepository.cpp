#include "Qmx_CorrNameRepository.h"

Qmx_CorrNameRepository::~Qmx_CorrNameRepository() = default;
