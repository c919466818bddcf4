// Both stream kinds against the same expectations: what is written reads back, with the
// fixed bytes, and every read the data cannot satisfy is refused.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <sstream>

#include "Qmx_CorrException.h"
#include "Qmx_CorrStream_Internal.h"
#include "Qmx_CorrStream_UTStr.h"
#include "TempDir.h"
#include "Vesk_File.h"
#include "Vesk_Stream.h"

namespace {

using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Str = Vesk::StringBase<char>;

enum class Kind { kInternal, kPortable };

class CorrStreamTest : public ::testing::TestWithParam<Kind> {
protected:
    std::string Path() const { return m_dir / "s"; }
    std::unique_ptr<Qmx_CorrStream> OpenForWriting() {
        if (GetParam() == Kind::kInternal) {
            return std::make_unique<Qmx_CorrStream_Internal>(
                Path(), static_cast<int>(std::ios::out | std::ios::binary | std::ios::trunc),
                "db.cpd");
        }
        return std::make_unique<Qmx_CorrStream_UTStr>(Path(), 10, true, "db.cpd");
    }
    std::unique_ptr<Qmx_CorrStream> OpenForReading() {
        if (GetParam() == Kind::kInternal) {
            return std::make_unique<Qmx_CorrStream_Internal>(
                Path(), static_cast<int>(std::ios::in | std::ios::binary), "db.cpd");
        }
        return std::make_unique<Qmx_CorrStream_UTStr>(Path(), 9, false, "db.cpd");
    }
    // The plain bytes the stream holds (a portable stream's file is compressed).
    std::string PlainBytes() const {
        Vesk::Stream* in = Vesk::File::open(Path(), Vesk::File::kRead, false);
        std::string bytes;
        char buffer[256];
        while (std::size_t got = in->readsome(buffer, sizeof buffer)) bytes.append(buffer, got);
        Vesk::File::close(in);
        return bytes;
    }
    TempDir m_dir;
};

const std::string kDamaged = "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'db.cpd'.\n";

TEST_P(CorrStreamTest, PrimitivesHaveTheirFixedBytesAndReadBack) {
    {
        auto out = OpenForWriting();
        out->WriteUINT32(258);
        out->WriteString("abc");
        out->WriteString("");
        out->WriteString(Str("z\0z", 3));
        out->WriteBool(true);
        out->WriteBool(false);
        out->WriteUINT8(0xFE);
        out->write("\x02", 1);
        out->Flush();
    }
    EXPECT_EQ(PlainBytes(), std::string("\x02\x01\x00\x00"
                                        "\x03\x00\x00\x00"
                                        "abc"
                                        "\x00\x00\x00\x00"
                                        "\x03\x00\x00\x00z\0z"
                                        "\x01\x00\xFE\x02",
                                        26));
    auto in = OpenForReading();
    EXPECT_EQ(in->ReadUINT32(), 258u);
    EXPECT_EQ(in->ReadString(), "abc");
    EXPECT_EQ(in->ReadString(), "");
    EXPECT_EQ(in->ReadString(), Str("z\0z", 3));
    EXPECT_TRUE(in->ReadBool());
    EXPECT_FALSE(in->ReadBool());
    EXPECT_EQ(in->ReadUINT8(), 0xFE);
    EXPECT_TRUE(in->ReadBool());  // any byte but 0 is true
    EXPECT_EQ(in->GetPos(), 26u);
    EXPECT_THAT([&] { in->ReadUINT8(); },
                ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(kDamaged)));
}

TEST_P(CorrStreamTest, ReadsBeyondTheDataAreRefused) {
    {
        auto out = OpenForWriting();
        out->WriteUINT32(0xFFFFFF00u);  // a string length far beyond the data
        out->write("ab", 2);
    }
    auto in = OpenForReading();
    EXPECT_THAT([&] { in->ReadString(); },
                ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(kDamaged)));
    auto again = OpenForReading();
    again->ReadUINT32();
    char buffer[3];
    EXPECT_THROW(again->read(buffer, 3), Qmx_CorrException::InvalidDatabaseFormat);
}

TEST_P(CorrStreamTest, MissingFileIsCannotReadDatabaseWithItsPath) {
    const std::string text =
        "Qmx_CorrException::CannotReadDatabase. Unable to read '" + m_dir / "missing" + "'.\n";
    if (GetParam() == Kind::kInternal) {
        EXPECT_THAT(
            [&] {
                Qmx_CorrStream_Internal s(m_dir / "missing",
                                          static_cast<int>(std::ios::in | std::ios::binary));
            },
            ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(StrEq(text)));
    } else {
        EXPECT_THAT([&] { Qmx_CorrStream_UTStr s(m_dir / "missing", 9, false); },
                    ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(StrEq(text)));
    }
}

INSTANTIATE_TEST_SUITE_P(BothKinds, CorrStreamTest,
                         ::testing::Values(Kind::kInternal, Kind::kPortable));

TEST(CorrStreamInternal, WrapsCallersStreamAndRefusesNullOrBadOnes) {
    const std::string unknown =
        "Qmx_CorrException::CannotReadDatabase. Unable to read 'unknown'.\n";
    EXPECT_THAT([] { Qmx_CorrStream_Internal s(nullptr); },
                ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(StrEq(unknown)));
    std::stringstream bad;
    bad.setstate(std::ios::badbit);
    EXPECT_THROW(Qmx_CorrStream_Internal s(&bad), Qmx_CorrException::CannotReadDatabase);

    std::stringstream bytes;
    {
        Qmx_CorrStream_Internal s(&bytes);
        s.WriteString("hello");
        s.SeekPos(4);
        s.write("J", 1);
        s.SeekEnd();
        EXPECT_EQ(s.GetPos(), 9u);
    }
    EXPECT_EQ(bytes.str(), std::string("\x05\x00\x00\x00Jello", 9));
    Qmx_CorrStream_Internal reader(&bytes);
    reader.SeekPos(0);
    EXPECT_EQ(reader.BytesLeft(), 9);
    EXPECT_EQ(reader.ReadString(), "Jello");
    EXPECT_EQ(reader.BytesLeft(), 0);
    EXPECT_THAT([&] { reader.ReadUINT32(); },
                ThrowsMessage<Qmx_CorrException::InvalidDatabaseFormat>(StrEq(
                    "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'unknown'.\n")));
}

TEST(CorrStreamUTStr, CompressedStreamMovesOnlyForward) {
    TempDir dir;
    {
        Qmx_CorrStream_UTStr out(dir / "p", 14, false);
        out.WriteUINT32(1);
        out.WriteUINT32(2);
        EXPECT_EQ(out.GetPos(), 8u);
    }
    Qmx_CorrStream_UTStr in(dir / "p", 9, false, "db.cpd");
    EXPECT_EQ(in.BytesLeft(), -1);
    in.SeekPos(4);
    EXPECT_EQ(in.ReadUINT32(), 2u);
    EXPECT_THROW(in.SeekPos(0), Qmx_CorrException::InvalidDatabaseFormat);
}

}  // namespace
