#include "Qmx_CorrStream_Buffer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "Qmx_CorrException.h"

namespace {

using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

TEST(CorrStreamBuffer, WritesReadBackAndOverwriteInPlace) {
    Qmx_CorrStream_Buffer buffer("db.cpd");
    buffer.WriteUINT32(0x01020304);
    buffer.WriteString(std::string("a\0b", 3));
    buffer.WriteBool(true);
    EXPECT_EQ(buffer.GetBytes(), std::string("\x04\x03\x02\x01\x03\0\0\0a\0b\x01", 12));
    // Overwriting inside, then across the end.
    buffer.SeekPos(1);
    buffer.WriteUINT8(0xAA);
    buffer.SeekPos(10);
    buffer.WriteUINT32(7);
    EXPECT_EQ(buffer.GetBytes().size(), 14u);
    buffer.SeekPos(0);
    EXPECT_EQ(buffer.ReadUINT32(), 0x0102AA04u);
    EXPECT_EQ(buffer.ReadString(), std::string("a\0", 2) + "\x07");
    EXPECT_EQ(buffer.BytesLeft(), 3);
}

TEST(CorrStreamBuffer, ShortReadsAndFarSeeksAreRefusedWithTheName) {
    Qmx_CorrStream_Buffer buffer("db.cpd");
    buffer.Assign(std::string("\x09\0\0\0abc", 7));
    // A string longer than what is left is refused before anything is copied.
    EXPECT_THAT([&] { buffer.ReadString(); },
                ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(HasSubstr("db.cpd")));
    buffer.SeekPos(4);
    char bytes[4];
    EXPECT_THROW(buffer.read(bytes, 4), Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_EQ(buffer.GetPos(), 4u) << "a refused read moves nothing";
    EXPECT_THROW(buffer.SeekPos(8), Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_EQ(buffer.GetPos(), 4u);
    buffer.SeekEnd();
    EXPECT_EQ(buffer.BytesLeft(), 0);
    EXPECT_THROW(buffer.ReadUINT8(), Qmx_CorrException::InvalidDatabaseFormat);
}

}  // namespace
