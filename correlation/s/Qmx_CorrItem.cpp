#include "Qmx_CorrItem.h"

Qmx_CorrItem::~Qmx_CorrItem() = default;
