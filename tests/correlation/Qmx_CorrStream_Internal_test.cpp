// The internal stream over a caller's string stream and over a file of its own: exact bytes,
// one position for reading and writing, and refused reads that leave the stream usable.
#include "Qmx_CorrStream_Internal.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <sstream>
#include <string>

#include "Qmx_CorrException.h"
#include "TempDir.h"

namespace {

using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Str = Vesk::StringBase<char>;
using Damaged = Qmx_CorrException::InvalidDatabaseFormat;

std::string DamagedText(const std::string& name) {
    return "Qmx_CorrException::InvalidDatabaseFormat. Unable to read '" + name + "'.\n";
}

constexpr int kReadWrite = static_cast<int>(std::ios::in | std::ios::out | std::ios::binary);
constexpr int kCreate = kReadWrite | static_cast<int>(std::ios::trunc);

class CorrStreamInternalTest : public ::testing::Test {
protected:
    CorrStreamInternalTest() : m_stream(&m_bytes, "db.cpd") {}
    // What one primitive writes, on a stream of its own.
    static std::string BytesOf(const std::function<void(Qmx_CorrStream&)>& writeOne) {
        std::stringstream bytes;
        Qmx_CorrStream_Internal stream(&bytes);
        writeOne(stream);
        return bytes.str();
    }
    // Stream contents that a damaged file might hold.
    void Hold(const std::string& bytes) {
        m_bytes.str(bytes);
        m_stream.SeekPos(0);
    }

    std::stringstream m_bytes;
    Qmx_CorrStream_Internal m_stream;
};

TEST_F(CorrStreamInternalTest, EachPrimitiveWritesItsFixedBytes) {
    struct Case {
        const char* what;
        std::function<void(Qmx_CorrStream&)> write;
        std::string bytes;
    };
    const Case cases[] = {
        {"UINT32 258", [](Qmx_CorrStream& s) { s.WriteUINT32(258); },
         std::string("\x02\x01\0\0", 4)},
        {"UINT32 max", [](Qmx_CorrStream& s) { s.WriteUINT32(0xFFFFFFFEu); }, "\xFE\xFF\xFF\xFF"},
        {"string abc", [](Qmx_CorrStream& s) { s.WriteString("abc"); },
         std::string("\x03\0\0\0abc", 7)},
        {"empty string", [](Qmx_CorrStream& s) { s.WriteString(""); }, std::string(4, '\0')},
        {"string with zero", [](Qmx_CorrStream& s) { s.WriteString(Str("a\0", 2)); },
         std::string("\x02\0\0\0a\0", 6)},
        {"true", [](Qmx_CorrStream& s) { s.WriteBool(true); }, "\x01"},
        {"false", [](Qmx_CorrStream& s) { s.WriteBool(false); }, std::string(1, '\0')},
        {"UINT8", [](Qmx_CorrStream& s) { s.WriteUINT8(0x80); }, "\x80"},
        {"raw", [](Qmx_CorrStream& s) { s.write("\0x\0", 3); }, std::string("\0x\0", 3)},
    };
    for (const Case& c : cases) EXPECT_EQ(BytesOf(c.write), c.bytes) << c.what;
}

TEST_F(CorrStreamInternalTest, SeeksPositionReadsAndWritesAlike) {
    m_stream.WriteUINT32(1);
    m_stream.WriteUINT32(2);
    m_stream.WriteUINT32(3);
    m_stream.SeekPos(4);
    EXPECT_EQ(m_stream.ReadUINT32(), 2u);
    m_stream.SeekPos(8);
    m_stream.WriteUINT32(30);
    m_stream.SeekEnd();
    EXPECT_EQ(m_stream.GetPos(), 12u);
    m_stream.WriteUINT8(4);
    m_stream.SeekPos(8);
    EXPECT_EQ(m_stream.ReadUINT32(), 30u);
    EXPECT_EQ(m_stream.ReadUINT8(), 4);
    EXPECT_EQ(m_stream.BytesLeft(), 0);
}

TEST_F(CorrStreamInternalTest, PositionBeyondTheDataIsRefusedAndTheOldOneKept) {
    Hold(std::string("\x05\0\0\0\x06\0\0\0", 8));
    EXPECT_EQ(m_stream.ReadUINT32(), 5u);
    EXPECT_THAT([&] { m_stream.SeekPos(9); }, ThrowsMessage<Damaged>(StrEq(DamagedText("db.cpd"))));
    // Reading on from an unchanged position would misread; reading from the old one is right.
    EXPECT_EQ(m_stream.ReadUINT32(), 6u);
}

TEST_F(CorrStreamInternalTest, RecordCutAtAnyLengthIsRefusedNeverShort) {
    const std::string whole = BytesOf([](Qmx_CorrStream& s) {
        s.WriteUINT32(258);
        s.WriteString("abc");
        s.WriteBool(true);
        s.WriteUINT8(9);
    });
    for (std::size_t length = 0; length < whole.size(); ++length) {
        Hold(whole.substr(0, length));
        EXPECT_THAT(
            [&] {
                m_stream.ReadUINT32();
                m_stream.ReadString();
                m_stream.ReadBool();
                m_stream.ReadUINT8();
            },
            ThrowsMessage<Damaged>(StrEq(DamagedText("db.cpd"))))
            << "cut at " << length;
    }
}

TEST_F(CorrStreamInternalTest, AbsurdStringLengthIsRefusedAndTheStreamStaysUsable) {
    Hold(
        std::string("\xF0\xFF\xFF\xFF"
                    "abc",
                    7));
    EXPECT_THROW(m_stream.ReadString(), Damaged);
    m_stream.SeekPos(4);
    char rest[3];
    m_stream.read(rest, 3);
    EXPECT_EQ(std::string(rest, 3), "abc");
    EXPECT_THROW(m_stream.read(rest, 1), Damaged);
    m_stream.SeekPos(0);
    EXPECT_EQ(m_stream.ReadUINT32(), 0xFFFFFFF0u);
}

TEST_F(CorrStreamInternalTest, CallersStreamWrittenBehindItsBackIsMeasuredAgain) {
    EXPECT_EQ(m_stream.BytesLeft(), 0);
    m_bytes.write("\x2A\0\0\0", 4);
    EXPECT_EQ(m_stream.BytesLeft(), 4);
    EXPECT_EQ(m_stream.ReadUINT32(), 42u);
}

TEST(CorrStreamInternalFile, OwnFileCountsItsOwnWritesInBytesLeft) {
    TempDir dir;
    Qmx_CorrStream_Internal stream(dir / "s", kCreate);
    stream.WriteUINT32(1);
    stream.WriteUINT32(2);
    stream.SeekPos(0);
    EXPECT_EQ(stream.BytesLeft(), 8);
    EXPECT_EQ(stream.ReadUINT32(), 1u);
    EXPECT_EQ(stream.BytesLeft(), 4);
    stream.SeekEnd();
    stream.WriteString("xy");
    stream.SeekPos(4);
    EXPECT_EQ(stream.BytesLeft(), 10);
    EXPECT_EQ(stream.ReadUINT32(), 2u);
    EXPECT_EQ(stream.ReadString(), "xy");
    EXPECT_THAT([&] { stream.ReadBool(); }, ThrowsMessage<Damaged>(StrEq(DamagedText(dir / "s"))));
}

TEST(CorrStreamInternalFile, ErrorsNameThePathOrTheGivenName) {
    TempDir dir;
    WriteFileBytes(dir / "s", "ab");
    Qmx_CorrStream_Internal reader(dir / "s", static_cast<int>(std::ios::in | std::ios::binary),
                                   "db.cpd");
    EXPECT_THAT([&] { reader.ReadUINT32(); }, ThrowsMessage<Damaged>(StrEq(DamagedText("db.cpd"))));
    EXPECT_THAT([&] { reader.WriteUINT32(1); },
                ThrowsMessage<Qmx_CorrException::CannotWriteDatabase>(
                    StrEq("Qmx_CorrException::CannotWriteDatabase. Unable to write 'db.cpd'.\n")));
    // Opening names what could not be opened, whatever name later errors carry.
    EXPECT_THAT(
        [&] { Qmx_CorrStream_Internal s(dir / "none", kReadWrite, "db.cpd"); },
        ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(StrEq(
            "Qmx_CorrException::CannotReadDatabase. Unable to read '" + dir / "none" + "'.\n")));
    std::stringstream bad;
    bad.setstate(std::ios::badbit);
    EXPECT_THAT([&] { Qmx_CorrStream_Internal s(&bad, "db.cpd"); },
                ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(
                    StrEq("Qmx_CorrException::CannotReadDatabase. Unable to read 'unknown'.\n")));
}

}  // namespace
