#include "Qmx_CorrStream.h"

Qmx_CorrStream::~Qmx_CorrStream() = default;

std::int64_t Qmx_CorrStream::BytesLeft() const { return -1; }

bool Qmx_CorrStream::HasMoreBytes() {
    const std::int64_t left = BytesLeft();
    if (left >= 0) return left > 0;
    const unsigned int pos = GetPos();
    SeekEnd();
    return GetPos() != pos;
}
