#include "Qmx_CorrExplicitRelationship.h"

Qmx_CorrExplicitRelationship::~Qmx_CorrExplicitRelationship() = default;
