// Loading the repository component: the program starts without a component path, so the
// test decides where the factory looks. GORSK_COMPONENT_DIR is where the build puts the real
// component.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "Qmx_CorrDb_Gorsk.h"
#include "Qmx_CorrException.h"
#include "Qmx_CorrStream.h"
#include "TempDir.h"
#include "Vesk_File.h"

namespace {

using ::testing::StrEq;
using ::testing::ThrowsMessage;

void SetComponentPath(const std::string& path) { ::setenv("QMX_COMPONENT_PATH", path.c_str(), 1); }

TEST(CorrDbGorskLoading, MissingOrInvalidComponentGivesCannotReadDatabaseUntilOneLoads) {
    TempDir empty;
    TempDir broken;
    WriteFileBytes(broken / "libGorsk_Repository.so", "not a shared library\n");
    const std::string repository = broken / "projects.repo";
    const std::string refusal =
        "Qmx_CorrException::CannotReadDatabase. Unable to read '" + repository + "'.\n";

    for (const std::string& path : {empty.Path(), broken.Path()}) {
        SetComponentPath(path);
        EXPECT_THAT([&] { Qmx_CorrDb_Gorsk db(repository, "corr"); },
                    ThrowsMessage<Qmx_CorrException::CannotReadDatabase>(StrEq(refusal)))
            << path;
    }
    EXPECT_FALSE(Vesk::File::exist(repository));

    // A failed load is not remembered: with the real component behind the broken one the
    // next database loads it.
    SetComponentPath(broken.Path() + ":" + GORSK_COMPONENT_DIR);
    Qmx_CorrDb_Gorsk db(repository, "corr");
    Qmx_CorrStream* stream = db.OpenStream("info", 6);
    ASSERT_NE(stream, nullptr);
    stream->WriteUINT32(5);
    db.CloseStream(stream);
    stream = db.OpenStream("info", 1);
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(stream->ReadUINT32(), 5u);
    EXPECT_TRUE(Vesk::File::exist(repository));
}

}  // namespace
