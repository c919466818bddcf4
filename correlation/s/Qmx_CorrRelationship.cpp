#include "Qmx_CorrRelationship.h"

Qmx_CorrRelationship::~Qmx_CorrRelationship() = default;
