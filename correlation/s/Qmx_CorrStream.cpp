#include "Qmx_CorrStream.h"

Qmx_CorrStream::~Qmx_CorrStream() = default;

std::int64_t Qmx_CorrStream::BytesLeft() const { return -1; }
