#include "Qmx_CorrName.h"

Qmx_CorrName::~Qmx_CorrName() = default;
