// What the repository-backed database asks of its component, and in which order, seen
// through the recording stand-in component (support/Recorder.h).
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include "BrokP_Factory.h"
#include "Qmx_CorrDb_Gorsk.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStream.h"
#include "Recorder.h"

namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::StrEq;
using ::testing::ThrowsMessage;

const char* const kRepository = "projects.repo";
const char* const kCannotRead =
    "Qmx_CorrException::CannotReadDatabase. Unable to read 'projects.repo'.\n";

// The calls of opening a database whose component does everything asked.
const std::vector<std::string> kOpening = {"CreateInstance", "Query IRepository",
                                           "Open Qmx_CorrDb_Gorsk projects.repo 43 0",
                                           "OpenStorage corr 43"};
const std::vector<std::string> kReleasing = {"Query IObject", "Query IDisposable", "Dispose"};

std::vector<std::string> Join(std::vector<std::vector<std::string>> parts) {
    std::vector<std::string> joined;
    for (const auto& part : parts) joined.insert(joined.end(), part.begin(), part.end());
    return joined;
}

class CorrDbGorskCalls : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(BrokP::Factory::LoadLibraryFactory("libGorsk_Repository"));
        m_recorder = static_cast<GorskTest::IRecorder*>(
            BrokP::Factory::CreateInstance(Vesk::ClassId(GorskTest::kRecorderClassId)));
        ASSERT_NE(m_recorder, nullptr);
        m_recorder->Reset();
    }

    std::unique_ptr<Qmx_CorrDb_Gorsk> OpenDb() {
        return std::make_unique<Qmx_CorrDb_Gorsk>(kRepository, "corr");
    }
    std::vector<std::string> Calls() { return m_recorder->TakeCalls(); }

    GorskTest::IRecorder* m_recorder = nullptr;
};

TEST_F(CorrDbGorskCalls, EachStreamOperationIsOneComponentCallBetweenOpenAndRelease) {
    {
        auto db = OpenDb();
        Qmx_CorrStream* stream = db->OpenStream("info", 14);
        ASSERT_NE(stream, nullptr);
        stream->WriteUINT32(258);
        stream->WriteString("abc");
        stream->WriteBool(true);
        stream->WriteUINT8(0);
        stream->write("xy", 2);
        stream->Flush();
        db->CloseStream(stream);
    }
    EXPECT_THAT(Calls(), ElementsAreArray(
                             Join({kOpening,
                                   {"OpenStream info 18", "WriteUInt32 258", "WriteString abc",
                                    "WriteByte 1", "WriteByte 0", "WriteByte 120", "WriteByte 121",
                                    "Flush", "CloseStream", "ReleaseStorage", "Close"},
                                   kReleasing})));
}

TEST_F(CorrDbGorskCalls, ReadsAreCheckedAgainstTheBytesLeftOnlyForRawBlocks) {
    auto db = OpenDb();
    Qmx_CorrStream* stream = db->OpenStream("info", 9);
    ASSERT_NE(stream, nullptr);
    Calls();
    EXPECT_TRUE(stream->ReadBool());  // the component's byte is 2
    EXPECT_EQ(stream->ReadUINT8(), 2);
    EXPECT_EQ(stream->ReadUINT32(), 258u);
    EXPECT_EQ(stream->ReadString(), "abc");
    char buffer[3] = {};
    stream->read(buffer, 3);
    EXPECT_EQ(std::string(buffer, 3), std::string(3, '\2'));
    EXPECT_THAT(Calls(), ElementsAre("ReadByte", "ReadByte", "ReadUInt32", "ReadString",
                                     "BytesLeft", "ReadByte", "ReadByte", "ReadByte"));
    // 8 bytes are left: a block of 9 is refused before the first byte is taken.
    EXPECT_THROW(stream->read(buffer, 3 * 3), Qmx_CorrException::InvalidDatabaseFormat);
    EXPECT_THAT(Calls(), ElementsAre("BytesLeft"));
}

TEST_F(CorrDbGorskCalls, OpenModesBecomeComponentAccessValues) {
    struct Case {
        int mode;
        int access;
    };
    const Case cases[] = {{1, 1}, {2, 2},  {3, 3},  {4, 16},  {6, 18},  {7, 19},
                          {9, 1}, {10, 2}, {11, 3}, {14, 18}, {15, 19}, {8, 0}};
    auto db = OpenDb();
    for (const Case& c : cases) {
        Calls();
        db->CloseStream(db->OpenStream("pool", c.mode));
        EXPECT_THAT(Calls(),
                    ElementsAre("OpenStream pool " + std::to_string(c.access), "CloseStream"))
            << "mode " << c.mode;
    }
}

TEST_F(CorrDbGorskCalls, InstanceIsReleasedThroughTheFirstLifetimeInterfaceItOffers) {
    struct Case {
        std::vector<std::string> failing;
        std::vector<std::string> releasing;
    };
    const Case cases[] = {
        {{}, {"Query IObject", "Query IDisposable", "Dispose"}},
        {{"IDisposable"}, {"Query IObject", "Query IDisposable", "Query IRefCounted", "Release"}},
        {{"IDisposable", "IRefCounted"},
         {"Query IObject", "Query IDisposable", "Query IRefCounted"}},
        {{"IObject"}, {"Query IObject"}},
    };
    for (const Case& c : cases) {
        m_recorder->Reset();
        for (const std::string& call : c.failing) m_recorder->Fail(call);
        OpenDb().reset();
        EXPECT_THAT(Calls(),
                    ElementsAreArray(Join({kOpening, {"ReleaseStorage", "Close"}, c.releasing})))
            << ::testing::PrintToString(c.failing);
    }
}

TEST_F(CorrDbGorskCalls, FailedOpeningUndoesWhatWasDoneAndNamesTheRepository) {
    struct Case {
        std::string failing;
        std::vector<std::string> calls;
    };
    const Case cases[] = {
        {"IRepository", Join({{"CreateInstance", "Query IRepository"}, kReleasing})},
        {"Open", Join({{kOpening[0], kOpening[1], kOpening[2]}, kReleasing})},
        {"OpenStorage", Join({kOpening, {"Close"}, kReleasing})},
    };
    for (const Case& c : cases) {
        m_recorder->Reset();
        m_recorder->Fail(c.failing);
        try {
            OpenDb();
            ADD_FAILURE() << c.failing << ": no exception";
        } catch (const Qmx_CorrException::CannotReadDatabase& e) {
            EXPECT_STREQ(e.what(), kCannotRead);
            EXPECT_EQ(e.getSourceFile(), "s/Qmx_CorrDb_Gorsk");
        }
        EXPECT_THAT(Calls(), ElementsAreArray(c.calls)) << c.failing;
    }
}

TEST_F(CorrDbGorskCalls, StreamFailuresAreReportedAndStreamsLeftOpenAreClosedFirst) {
    auto db = OpenDb();
    m_recorder->Fail("OpenStream");
    EXPECT_EQ(db->OpenStream("info", 6), nullptr);
    m_recorder->Reset();

    Qmx_CorrStream* lost = db->OpenStream("lost", 6);
    ASSERT_NE(lost, nullptr);
    m_recorder->Fail("WriteUInt32");
    m_recorder->Fail("CloseStream");
    EXPECT_THAT([&] { lost->WriteUINT32(7); },
                ThrowsMessage<Qmx_CorrException::CannotWriteDatabase>(StrEq(
                    "Qmx_CorrException::CannotWriteDatabase. Unable to write 'projects.repo'.\n")));
    EXPECT_THROW(db->CloseStream(lost), Qmx_CorrException::CannotWriteDatabase);
    m_recorder->Reset();

    ASSERT_NE(db->OpenStream("left", 6), nullptr);
    db.reset();
    EXPECT_THAT(
        Calls(),
        ElementsAreArray(
            Join({{"OpenStream left 18", "CloseStream", "ReleaseStorage", "Close"}, kReleasing})));
}

}  // namespace
