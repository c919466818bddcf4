#include "Vesk_Stream.h"

#include <gtest/gtest.h>

#include <memory>
#include <random>

#include "TempDir.h"
#include "Vesk_File.h"
#include "Vesk_IOException.h"

namespace {

using Vesk::File;
using Vesk::IOException;
using Str = Vesk::StringBase<char>;

struct StreamCloser {
    void operator()(Vesk::Stream* stream) const { File::close(stream); }
};
using StreamPtr = std::unique_ptr<Vesk::Stream, StreamCloser>;

class VeskStreamTest : public ::testing::Test {
protected:
    StreamPtr Open(const std::string& name, int access) {
        return StreamPtr(File::open(m_dir / name, access, (access & File::kWrite) != 0));
    }
    // Writes with `fill` into `name` and returns the file's bytes.
    template <typename Fill>
    std::string Written(const std::string& name, int access, Fill fill) {
        StreamPtr out = Open(name, access);
        EXPECT_NE(out, nullptr);
        fill(*out);
        EXPECT_TRUE(File::close(out.release()));
        return ReadFileBytes(m_dir / name);
    }
    // Every byte of a valid compressed file, then its prefixes are read back in turn.
    std::string CompressedSample(const std::string& name, std::string* plain) {
        std::mt19937 random(7);
        plain->clear();
        for (int i = 0; i < 300000; ++i) plain->push_back(static_cast<char>('a' + random() % 7));
        return Written(name, File::kWrite | File::kCompressed,
                       [&](Vesk::Stream& s) { s.write(plain->data(), plain->size()); });
    }

    TempDir m_dir;
};

TEST_F(VeskStreamTest, IntegersAndStringsHaveTheirFixedBytes) {
    const std::string bytes = Written("enc", File::kWrite, [](Vesk::Stream& s) {
        s.writeuint32(258);
        s.writestring("abc");
        s.writestring("");
        s.write(static_cast<unsigned char>(0xFE));
    });
    EXPECT_EQ(bytes, std::string("\x02\x01\x00\x00"
                                 "\x03\x00\x00\x00"
                                 "abc"
                                 "\x00\x00\x00\x00\xFE",
                                 16));
}

TEST_F(VeskStreamTest, StringWithZeroBytesRoundTripsInBothForms) {
    const Str text("a\0b\0", 4);
    for (int access : {File::kWrite, File::kWrite | File::kCompressed}) {
        Written("zero", access, [&](Vesk::Stream& s) {
            s.writestring(text);
            s.writeuint32(0xDEADBEEF);
        });
        StreamPtr in = Open("zero", File::kRead);
        ASSERT_NE(in, nullptr);
        EXPECT_EQ(in->iscompressed(), (access & File::kCompressed) != 0);
        Str back;
        in->readstring(back);
        EXPECT_EQ(back, text);
        EXPECT_EQ(in->readuint32(), 0xDEADBEEFu);
        EXPECT_EQ(in->getfoffset(), 12);
    }
}

TEST_F(VeskStreamTest, ReadingPastTheEndThrowsInsteadOfGivingShortData) {
    Written("short", File::kWrite, [](Vesk::Stream& s) { s.write("abc", 3); });
    StreamPtr in = Open("short", File::kRead);
    char buffer[4];
    try {
        in->read(buffer, 4);
        FAIL() << "short read accepted";
    } catch (const IOException& e) {
        EXPECT_EQ(e.getKind(), IOException::kEndOfData);
    }
    StreamPtr again = Open("short", File::kRead);
    EXPECT_THROW(again->readuint32(), IOException);
}

TEST_F(VeskStreamTest, AbsurdStringLengthIsRefusedBeforeAnyAllocation) {
    Written("huge", File::kWrite, [](Vesk::Stream& s) {
        s.writeuint32(0xFFFFFFF0u);
        s.write("xy", 2);
    });
    StreamPtr in = Open("huge", File::kRead);
    Str text;
    EXPECT_THROW(in->readstring(text), IOException);

    Written("long", File::kWrite, [](Vesk::Stream& s) { s.writestring("0123456789"); });
    StreamPtr small = Open("long", File::kRead);
    char buffer[10];
    try {
        small->readstring(buffer, sizeof buffer);
        FAIL() << "string longer than its buffer accepted";
    } catch (const IOException& e) {
        EXPECT_EQ(e.getKind(), IOException::kDamagedData);
        EXPECT_STREQ(buffer, "");
    }
}

TEST_F(VeskStreamTest, CompressedDataWithAbsurdLengthFailsAtTheEndOfTheRealData) {
    Written("huge.z", File::kWrite | File::kCompressed, [](Vesk::Stream& s) {
        s.writeuint32(0x7FFFFFFFu);
        s.write("xy", 2);
    });
    StreamPtr in = Open("huge.z", File::kRead);
    EXPECT_EQ(in->remaining(), -1);
    Str text;
    EXPECT_THROW(in->readstring(text), IOException);
}

TEST_F(VeskStreamTest, CompressedFormIsSmallerAndDetectedWhateverTheAccessValue) {
    std::string plain;
    const std::string packed = CompressedSample("big.z", &plain);
    EXPECT_LT(packed.size(), plain.size() / 2);
    EXPECT_EQ(packed.substr(0, 4), "\x28\xB5\x2F\xFD");
    for (int access : {File::kRead, File::kRead | File::kCompressed}) {
        StreamPtr in = Open("big.z", access);
        std::string back(plain.size(), '\0');
        in->read(&back[0], back.size());
        EXPECT_EQ(back, plain);
        char extra;
        EXPECT_EQ(in->readsome(&extra, 1), 0u);
    }
    Written("plain", File::kWrite, [](Vesk::Stream& s) { s.writeuint32(1); });
    StreamPtr in = Open("plain", File::kRead | File::kCompressed);
    EXPECT_FALSE(in->iscompressed());
    EXPECT_EQ(in->readuint32(), 1u);
}

TEST_F(VeskStreamTest, TruncatedCompressedFileThrowsAtEveryCut) {
    std::string plain;
    const std::string packed = CompressedSample("cut.z", &plain);
    // Every cut inside the first and last 64 bytes, and a stride through the middle.
    for (std::size_t length = 4; length < packed.size(); ++length) {
        if (length > 64 && length < packed.size() - 64 && length % 97 != 0) continue;
        WriteFileBytes(m_dir / "cut.z", packed.substr(0, length));
        StreamPtr in = Open("cut.z", File::kRead);
        ASSERT_NE(in, nullptr);
        // Even a cut that only loses the end mark is noticed when the reader reaches it.
        char buffer[65536];
        EXPECT_THROW(while (in->readsome(buffer, sizeof buffer) > 0){}, IOException)
            << "cut at " << length;
    }
}

TEST_F(VeskStreamTest, FlippedCompressedByteIsDetected) {
    std::string plain;
    std::string packed = CompressedSample("flip.z", &plain);
    packed[packed.size() / 2] ^= 0x20;
    WriteFileBytes(m_dir / "flip.z", packed);
    StreamPtr in = Open("flip.z", File::kRead);
    std::string back(plain.size(), '\0');
    EXPECT_THROW(in->read(&back[0], back.size()), IOException);
}

TEST_F(VeskStreamTest, PositioningOfPlainAndCompressedStreams) {
    Written("pos", File::kWrite, [](Vesk::Stream& s) { s.write("0123456789", 10); });
    StreamPtr in = Open("pos", File::kRead);
    in->seekend();
    EXPECT_EQ(in->getfoffset(), 10);
    EXPECT_EQ(in->remaining(), 0);
    in->setfoffset(4);
    EXPECT_EQ(in->remaining(), 6);
    unsigned char byte = 0;
    in->read(byte);
    EXPECT_EQ(byte, '4');

    Written("pos.z", File::kWrite | File::kCompressed,
            [](Vesk::Stream& s) { s.write("0123456789", 10); });
    StreamPtr packed = Open("pos.z", File::kRead);
    packed->setfoffset(6);
    packed->read(byte);
    EXPECT_EQ(byte, '6');
    EXPECT_THROW(packed->setfoffset(2), IOException);
    packed->seekend();
    EXPECT_EQ(packed->getfoffset(), 10);
}

TEST_F(VeskStreamTest, ReadWriteAccessOverwritesInPlace) {
    Written("rw", File::kWrite, [](Vesk::Stream& s) { s.write("abcdef", 6); });
    StreamPtr both = Open("rw", File::kRead | File::kWrite);
    ASSERT_NE(both, nullptr);
    both->setfoffset(2);
    both->write("XY", 2);
    unsigned char byte = 0;
    both->read(byte);
    EXPECT_EQ(byte, 'e');
    both.reset();
    EXPECT_EQ(ReadFileBytes(m_dir / "rw"), "abXYef");
    EXPECT_EQ(Open("rw", 11), nullptr);  // compressed cannot be read and written at once
    EXPECT_EQ(Open("missing", File::kRead), nullptr);
}

TEST_F(VeskStreamTest, AccessFourteenWritesAsTen) {
    const std::string ten = Written("ten", 10, [](Vesk::Stream& s) { s.writestring("x"); });
    const std::string fourteen =
        Written("fourteen", 14, [](Vesk::Stream& s) { s.writestring("x"); });
    EXPECT_EQ(ten, fourteen);
}

}  // namespace
