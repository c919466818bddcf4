#include "Qmx_CorrStream.h"

#include "Vesk_Endian.h"

Qmx_CorrStream::~Qmx_CorrStream() = default;

bool Qmx_CorrStream::ReadBool() { return ReadUINT8() != 0; }

void Qmx_CorrStream::WriteBool(bool value) { WriteUINT8(value ? 1 : 0); }

unsigned char Qmx_CorrStream::ReadUINT8() {
    char byte;
    read(&byte, 1);
    return static_cast<unsigned char>(byte);
}

void Qmx_CorrStream::WriteUINT8(unsigned char value) {
    const char byte = static_cast<char>(value);
    write(&byte, 1);
}

unsigned int Qmx_CorrStream::ReadUINT32() {
    char bytes[4];
    read(bytes, 4);
    return Vesk_Endian::DecodeUINT32LE(bytes);
}

void Qmx_CorrStream::WriteUINT32(unsigned int value) {
    char bytes[4];
    Vesk_Endian::EncodeUINT32LE(value, bytes);
    write(bytes, 4);
}

std::int64_t Qmx_CorrStream::BytesLeft() const { return -1; }

bool Qmx_CorrStream::HasMoreBytes() {
    const std::int64_t left = BytesLeft();
    if (left >= 0) return left > 0;
    const unsigned int pos = GetPos();
    SeekEnd();
    return GetPos() != pos;
}
