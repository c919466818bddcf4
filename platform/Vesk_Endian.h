// Vesk_Endian: 32-bit values as the 4 bytes every stored record uses, least significant
// first, whatever the host's byte order.
#ifndef VESK_ENDIAN_H
#define VESK_ENDIAN_H
#include <cstdint>

namespace Vesk_Endian {

inline void EncodeUINT32LE(std::uint32_t value, char bytes[4]) {
    for (int i = 0; i < 4; ++i) bytes[i] = static_cast<char>((value >> (8 * i)) & 0xFF);
}

inline std::uint32_t DecodeUINT32LE(const char bytes[4]) {
    std::uint32_t value = 0;
    for (int i = 3; i >= 0; --i) value = value << 8 | static_cast<unsigned char>(bytes[i]);
    return value;
}

}  // namespace Vesk_Endian

#endif
