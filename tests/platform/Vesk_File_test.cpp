#include "Vesk_File.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <set>

#include "TempDir.h"
#include "Vesk_FaultInjector.h"
#include "Vesk_IOException.h"
#include "Vesk_Stream.h"

namespace {

using Vesk::FaultInjector;
using Vesk::File;
using Str = Vesk::StringBase<char>;

class VeskFileTest : public ::testing::Test {
protected:
    void TearDown() override { FaultInjector::Disarm(); }
    TempDir m_dir;
};

TEST_F(VeskFileTest, TemporaryDirectoriesAreFreshPrivateAndRemovedWhole) {
    std::set<std::string> seen;
    for (int i = 0; i < 20; ++i) {
        const Str dir = File::tmpnam(m_dir.Path().c_str());
        ASSERT_FALSE(dir.empty());
        EXPECT_EQ(dir.compare(0, m_dir.Path().size(), m_dir.Path()), 0);
        EXPECT_TRUE(seen.insert(dir).second) << dir;
        struct stat info;
        ASSERT_EQ(::stat(dir.c_str(), &info), 0);
        EXPECT_EQ(info.st_mode & 0777, 0700u);
    }
    const Str dir = *seen.begin();
    ASSERT_TRUE(File::mkdir(dir + "/a/b/c", true));
    ASSERT_TRUE(File::touchfile(dir + "/a/b/c/f"));
    ASSERT_TRUE(File::touchfile(dir + "/top"));
    EXPECT_TRUE(File::remove_r(dir + "/"));
    EXPECT_FALSE(File::exist(dir));
    File::remtmpnam(*seen.rbegin());
    EXPECT_FALSE(File::exist(*seen.rbegin()));
}

TEST_F(VeskFileTest, TemporaryDirectoryHonoursTmpdir) {
    const char* old = std::getenv("TMPDIR");
    const std::string saved = old ? old : "";
    ::setenv("TMPDIR", m_dir.Path().c_str(), 1);
    const Str dir = File::tmpnam(nullptr);
    old ? ::setenv("TMPDIR", saved.c_str(), 1) : ::unsetenv("TMPDIR");
    EXPECT_EQ(dir.compare(0, m_dir.Path().size(), m_dir.Path()), 0);
    EXPECT_TRUE(File::isdir(dir));
}

TEST_F(VeskFileTest, FilesAreMadeSizedListedRenamedAndRemoved) {
    const Str file = m_dir / "b";
    EXPECT_FALSE(File::exist(file));
    EXPECT_EQ(File::getsize_noopen(file), -1);
    ASSERT_TRUE(File::touchfile(file));
    EXPECT_EQ(File::getsize_noopen(file), 0);
    WriteFileBytes(file, "12345");
    EXPECT_EQ(File::getsize_noopen(file), 5);
    ASSERT_TRUE(File::touchfile(m_dir / "a"));
    ASSERT_TRUE(File::mkdir(m_dir / "sub", false));
    EXPECT_EQ(File::listdir(m_dir.Path()), (std::vector<Str>{"a", "b"}));

    EXPECT_TRUE(File::rename_f(file, m_dir / "a"));
    EXPECT_EQ(File::getsize_noopen(m_dir / "a"), 5);
    EXPECT_TRUE(File::remove_f(m_dir / "a"));
    EXPECT_TRUE(File::remove_f(m_dir / "a"));  // already gone is no error
    EXPECT_EQ(File::listdir(m_dir.Path()), std::vector<Str>{});
    EXPECT_TRUE(File::listdir(m_dir / "missing").empty());
    EXPECT_TRUE(File::canwrite_dir(m_dir.Path()));
    EXPECT_FALSE(File::canwrite_dir(m_dir / "missing"));
    EXPECT_TRUE(File::sync_dir(m_dir.Path()));
}

TEST_F(VeskFileTest, FaultInjectorFailsExactlyTheArmedOperation) {
    FaultInjector::Arm(0);
    Vesk::Stream* out = File::open(m_dir / "f", File::kWrite, true);
    ASSERT_NE(out, nullptr);
    out->write("abc", 3);
    out->sync();
    EXPECT_TRUE(File::close(out));
    EXPECT_TRUE(File::rename_f(m_dir / "f", m_dir / "g"));
    const unsigned count = FaultInjector::Count();  // open, write, flush, sync, close, rename
    EXPECT_EQ(count, 6u);

    for (unsigned n = 1; n <= count; ++n) {
        FaultInjector::Arm(n);
        bool failed = false;
        Vesk::Stream* stream = File::open(m_dir / "f", File::kWrite, true);
        if (!stream) {
            failed = true;
        } else {
            try {
                stream->write("abc", 3);
                stream->sync();
            } catch (const Vesk::IOException& e) {
                EXPECT_EQ(e.getKind(), Vesk::IOException::kSystemError);
                failed = true;
            }
            failed = !File::close(stream) || failed;
            failed = !File::rename_f(m_dir / "f", m_dir / "g") || failed;
        }
        EXPECT_TRUE(failed) << "operation " << n;
        EXPECT_TRUE(FaultInjector::Fired());
    }
    FaultInjector::Disarm();
    Vesk::Stream* stream = File::open(m_dir / "f", File::kWrite, true);
    EXPECT_NE(stream, nullptr);
    EXPECT_TRUE(File::close(stream));
}

}  // namespace
