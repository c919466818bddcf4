// The portable stream over files of the portability layer, plain and compressed: the bytes
// it leaves in the file, and the layer's failures turned into the database's errors.
#include "Qmx_CorrStream_UTStr.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "Qmx_CorrException.h"
#include "TempDir.h"
#include "Vesk_File.h"
#include "Vesk_Stream.h"

namespace {

using ::testing::StrEq;
using ::testing::ThrowsMessage;
using Str = Vesk::StringBase<char>;
using Damaged = Qmx_CorrException::InvalidDatabaseFormat;

constexpr int kPlainRead = 1;
constexpr int kPlainWrite = 2;
constexpr int kPortableRead = 9;
constexpr int kPortableWrite = 10;

const std::string kDamagedText =
    "Qmx_CorrException::InvalidDatabaseFormat. Unable to read 'db.cpd'.\n";

class CorrStreamUTStrTest : public ::testing::Test {
protected:
    std::string Path() const { return m_dir / "s"; }
    // A record of every primitive, as a portable stream writes it.
    void WriteRecord(int access) {
        Qmx_CorrStream_UTStr out(Path(), access, true, "db.cpd");
        out.WriteUINT32(258);
        out.WriteString(Str("a\0b", 3));
        out.WriteBool(true);
        out.WriteUINT8(0x7F);
        out.write("zz", 2);
    }
    // Reads the record back; throws where the data cannot satisfy it.
    void ReadRecord(int access) {
        Qmx_CorrStream_UTStr in(Path(), access, false, "db.cpd");
        EXPECT_EQ(in.ReadUINT32(), 258u);
        EXPECT_EQ(in.ReadString(), Str("a\0b", 3));
        EXPECT_TRUE(in.ReadBool());
        EXPECT_EQ(in.ReadUINT8(), 0x7F);
        char raw[2];
        in.read(raw, 2);
        EXPECT_EQ(std::string(raw, 2), "zz");
    }
    // The plain bytes of the file, decompressed where it is compressed.
    std::string PlainBytes() const {
        Vesk::Stream* in = Vesk::File::open(Path(), Vesk::File::kRead, false);
        std::string bytes;
        char buffer[64];
        while (std::size_t got = in->readsome(buffer, sizeof buffer)) bytes.append(buffer, got);
        Vesk::File::close(in);
        return bytes;
    }

    TempDir m_dir;
    const std::string m_record{
        "\x02\x01\0\0"
        "\x03\0\0\0a\0b"
        "\x01\x7Fzz",
        15};
};

TEST_F(CorrStreamUTStrTest, PlainFileHoldsTheRecordBytesAsTheyAre) {
    WriteRecord(kPlainWrite);
    EXPECT_EQ(ReadFileBytes(Path()), m_record);
    Qmx_CorrStream_UTStr in(Path(), kPlainRead, false);
    EXPECT_EQ(in.BytesLeft(), 15);
    in.SeekEnd();
    EXPECT_EQ(in.GetPos(), 15u);
    in.SeekPos(4);
    EXPECT_EQ(in.BytesLeft(), 11);
    EXPECT_EQ(in.ReadString(), Str("a\0b", 3));
}

TEST_F(CorrStreamUTStrTest, PortableFileIsCompressedAndReadsBackExactly) {
    WriteRecord(kPortableWrite);
    const std::string stored = ReadFileBytes(Path());
    EXPECT_EQ(stored.substr(0, 4), "\x28\xB5\x2F\xFD");  // the frame magic, least byte first
    EXPECT_EQ(PlainBytes(), m_record);
    ReadRecord(kPortableRead);
    Qmx_CorrStream_UTStr in(Path(), kPortableRead, false);
    EXPECT_EQ(in.BytesLeft(), -1);  // unknown until decoded
}

TEST_F(CorrStreamUTStrTest, CutOrDamagedFilesAreInvalidDatabaseFormat) {
    WriteRecord(kPlainWrite);
    const std::string plain = ReadFileBytes(Path());
    for (std::size_t length = 0; length < plain.size(); ++length) {
        WriteFileBytes(Path(), plain.substr(0, length));
        EXPECT_THAT([&] { ReadRecord(kPortableRead); }, ThrowsMessage<Damaged>(StrEq(kDamagedText)))
            << "cut at " << length;
    }
    // A compressed file cut only in its frame trailer still decodes every byte asked for;
    // any other cut is refused. Either way no read yields wrong or short data.
    WriteRecord(kPortableWrite);
    const std::string compressed = ReadFileBytes(Path());
    std::size_t refused = 0;
    for (std::size_t length = 0; length < compressed.size(); ++length) {
        WriteFileBytes(Path(), compressed.substr(0, length));
        try {
            ReadRecord(kPortableRead);
        } catch (const Damaged& e) {
            EXPECT_STREQ(e.what(), kDamagedText.c_str());
            ++refused;
        }
    }
    EXPECT_GT(refused, compressed.size() / 2);
    // Compressed data that does not decode.
    WriteFileBytes(Path(), std::string("\x28\xB5\x2F\xFD\xFF\xFF\xFF\xFF\xFF\xFF", 10));
    EXPECT_THAT([&] { ReadRecord(kPortableRead); }, ThrowsMessage<Damaged>(StrEq(kDamagedText)));
}

TEST_F(CorrStreamUTStrTest, StringLongerThanTheFileIsRefused) {
    // The compressed form cannot tell its length: the string is read in pieces until the
    // data ends, never allocated whole.
    for (int access : {kPlainWrite, kPortableWrite}) {
        {
            Vesk::Stream* out = Vesk::File::open(Path(), access, true);
            out->writeuint32(0x7FFFFFFFu);
            out->write("abc", 3);
            Vesk::File::close(out);
        }
        Qmx_CorrStream_UTStr in(Path(), kPortableRead, false, "db.cpd");
        EXPECT_THAT([&] { in.ReadString(); }, ThrowsMessage<Damaged>(StrEq(kDamagedText)))
            << "access " << access;
    }
}

TEST_F(CorrStreamUTStrTest, RefusedWritesAndPositionsBecomeTheDatabasesErrors) {
    WriteRecord(kPortableWrite);
    Qmx_CorrStream_UTStr in(Path(), kPortableRead, false, "db.cpd");
    EXPECT_THAT([&] { in.WriteUINT32(1); },
                ThrowsMessage<Qmx_CorrException::CannotWriteDatabase>(
                    StrEq("Qmx_CorrException::CannotWriteDatabase. Unable to write 'db.cpd'.\n")));
    in.SeekPos(8);  // forward: decoded and dropped
    EXPECT_TRUE(in.ReadBool());
    EXPECT_THAT([&] { in.SeekPos(0); }, ThrowsMessage<Damaged>(StrEq(kDamagedText)));
}

TEST_F(CorrStreamUTStrTest, UnopenableFileNamesItsPath) {
    const std::string text =
        "Qmx_CorrException::CannotReadDatabase. Unable to read '" + m_dir / "none" + "'.\n";
    EXPECT_THAT([&] { Qmx_CorrStream_UTStr s(m_dir / "none", kPortableRead, false, "db.cpd"); },
                ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(StrEq(text)));
    // The compressed form cannot be read and written at once.
    WriteRecord(kPortableWrite);
    EXPECT_THROW(Qmx_CorrStream_UTStr s(Path(), 11, false), Qmx_CorrException::CannotReadDatabase);
}

}  // namespace
