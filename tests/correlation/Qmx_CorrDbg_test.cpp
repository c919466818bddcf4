#include "Qmx_CorrDbg.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <iostream>
#include <memory>
#include <sstream>
#include <string>

namespace {

constexpr const char* kSourceFile = "s/Qmx_CorrAlgo";

// Builds a tracer from `value` of the environment variable (null: unset) and keeps what the
// tracer wrote to std::clog while doing so.
class TracerFromEnv {
public:
    explicit TracerFromEnv(const char* value) {
        value ? ::setenv("OBR_QMX_CORR_DBG_TRACE", value, 1) : ::unsetenv("OBR_QMX_CORR_DBG_TRACE");
        std::streambuf* old = std::clog.rdbuf(m_log.rdbuf());
        m_tracer = std::make_unique<Qmx_CorrDbg::Tracer>();
        std::clog.rdbuf(old);
        ::unsetenv("OBR_QMX_CORR_DBG_TRACE");
    }
    Qmx_CorrDbg::Tracer& operator*() { return *m_tracer; }
    Qmx_CorrDbg::Tracer* operator->() { return m_tracer.get(); }
    std::string Log() const { return m_log.str(); }
    std::map<std::string, std::uint32_t> Levels() const { return m_tracer->GetLevels(); }

private:
    std::ostringstream m_log;
    std::unique_ptr<Qmx_CorrDbg::Tracer> m_tracer;
};

using Levels = std::map<std::string, std::uint32_t>;

TEST(CorrDbgTracer, UnsetOrEmptyVariableEnablesNothingAndSaysNothing) {
    for (const char* value : {static_cast<const char*>(nullptr), "", " ; : "}) {
        TracerFromEnv tracer(value);
        EXPECT_FALSE(tracer->IsEnabled());
        EXPECT_TRUE(tracer.Levels().empty());
        EXPECT_EQ(tracer.Log(), "");
        EXPECT_FALSE(tracer->AllowTrace("CORR_ALGO", 0));
    }
}

TEST(CorrDbgTracer, ItemsAreSplitTrimmedAndEchoed) {
    TracerFromEnv tracer(" CORR_ALGO=10 ;\tPOOL=5:all=1");
    EXPECT_TRUE(tracer->IsEnabled());
    EXPECT_EQ(tracer.Levels(), (Levels{{"CORR_ALGO", 10}, {"POOL", 5}, {"all", 1}}));
    EXPECT_EQ(tracer.Log(),
              "TRACE enabled: CORR_ALGO = 10\nTRACE enabled: POOL = 5\nTRACE enabled: all = 1\n");
}

TEST(CorrDbgTracer, MalformedItemsAreReportedAndSkipped) {
    TracerFromEnv tracer("CORR_ALGO;POOL=x;BUILD=2");
    EXPECT_EQ(tracer.Levels(), (Levels{{"BUILD", 2}}));
    EXPECT_EQ(tracer.Log(),
              "Format of TRACE init variable is invalid. No trace level specified.\n"
              "Ignoring item: CORR_ALGO\n"
              "Format of TRACE init variable is invalid. Invalid level specified.\n"
              "Ignoring item: POOL=x\n"
              "TRACE enabled: BUILD = 2\n");
}

TEST(CorrDbgTracer, NamesAreCaseSensitiveExceptAllAndSplitAtTheLastEquals) {
    TracerFromEnv tracer("ALL=3;corr_algo=10;a=b=4;POOL=1;POOL=7");
    EXPECT_EQ(tracer.Levels(), (Levels{{"POOL", 7}, {"a=b", 4}, {"all", 3}, {"corr_algo", 10}}));
    EXPECT_NE(tracer.Log().find("TRACE enabled: all = 3\n"), std::string::npos);
    EXPECT_FALSE(tracer->AllowTrace("CORR_ALGO", 10));  // only "all" = 3 applies
    EXPECT_TRUE(tracer->AllowTrace("CORR_ALGO", 3));
}

TEST(CorrDbgTracer, OwnEntryHidesAllAndRemovalFallsBack) {
    TracerFromEnv tracer("all=10;POOL=1");
    EXPECT_FALSE(tracer->AllowTrace("POOL", 5));
    EXPECT_TRUE(tracer->AllowTrace("POOL", 1));
    EXPECT_TRUE(tracer->AllowTrace("ARCHIVE", 10));
    EXPECT_FALSE(tracer->AllowTrace("ARCHIVE", 11));
    tracer->RemoveTrace("POOL");
    EXPECT_TRUE(tracer->AllowTrace("POOL", 5));
    tracer->RemoveTrace("all");
    EXPECT_FALSE(tracer->IsEnabled());
    tracer->SetTraceLevel("BUILD", 10);
    EXPECT_TRUE(tracer->IsEnabled());
    EXPECT_TRUE(tracer->AllowTrace("BUILD", 10));
    EXPECT_FALSE(tracer->AllowTrace(nullptr, 0));
}

// Points the process-wide tracer at a string for one test.
class CorrDbgTraceStatement : public ::testing::Test {
protected:
    void SetUp() override { Qmx_CorrDbg::s_Tracer->SetOutput(m_out); }
    void TearDown() override {
        Qmx_CorrDbg::s_Tracer->SetOutput(std::clog);
        Qmx_CorrDbg::s_Tracer->RemoveTrace("CORR_ALGO");
    }
    std::ostringstream m_out;
};

int CountedArgument(int* calls) {
    ++*calls;
    return 42;
}

TEST_F(CorrDbgTraceStatement, RecordIsWrittenOnlyWhenAllowedAndBuiltOnlyThen) {
    int calls = 0;
    Qmx_CorrDbg::s_Tracer->SetTraceLevel("CORR_ALGO", 9);
    QMX_CORR_TRACE("CORR_ALGO", 10, "value " << CountedArgument(&calls));
    QMX_CORR_TRACEF("CORR_ALGO", 10, "value %d", CountedArgument(&calls));
    EXPECT_EQ(calls, 0);
    EXPECT_EQ(m_out.str(), "");

    Qmx_CorrDbg::s_Tracer->SetTraceLevel("CORR_ALGO", 10);
    const int line = __LINE__ + 1;
    QMX_CORR_TRACE("CORR_ALGO", 10, "value " << CountedArgument(&calls));
    QMX_CORR_TRACEF("CORR_ALGO", 9, "value %d", CountedArgument(&calls));
    EXPECT_EQ(calls, 2);
    EXPECT_EQ(m_out.str(), "QMX_CORR_TRACE:CORR_ALGO:10:s/Qmx_CorrAlgo(" + std::to_string(line) +
                               "): value 42\nQMX_CORR_TRACE:CORR_ALGO:9:s/Qmx_CorrAlgo(" +
                               std::to_string(line + 1) + "): value 42\n");
}

TEST_F(CorrDbgTraceStatement, HeadOfNullCategoryAndOverlongBody) {
    Qmx_CorrDbg::Tracer& tracer = *Qmx_CorrDbg::s_Tracer;
    tracer.SetSource("s/x", 5);
    tracer.TraceHead(nullptr, 1);
    tracer.TraceFormat("%s", std::string(8191, 'a').c_str());
    tracer.TraceTail();
    EXPECT_EQ(m_out.str(), "QMX_CORR_TRACE: :1:s/x(5): " + std::string(8191, 'a') + "\n");
    m_out.str("");
    tracer.TraceFormat("%s", std::string(8192, 'a').c_str());
    EXPECT_EQ(m_out.str(), "ERROR: Formatted string too long.");
}

TEST(CorrDbgDump, PrintlnIndentsThreeSpacesALevelUpToTheBuffer) {
    std::ostringstream out;
    Qmx_CorrDbg::Println(out, 2, "%s: '%s'", "Qmx_CorrDb_Internal", "a.cpd");
    EXPECT_EQ(out.str(), "      Qmx_CorrDb_Internal: 'a.cpd'\n");
    out.str("");
    Qmx_CorrDbg::Println(out, 3000, "{");
    EXPECT_EQ(out.str(), std::string(8187, ' ') + "{\n");
    out.str("");
    Qmx_CorrDbg::Println(out, 0, "%s", std::string(9000, 'x').c_str());
    EXPECT_EQ(out.str(), "ERROR: Formatted string too long.\n");
    EXPECT_EQ(std::string(Qmx_CorrDbg::GetIndentString(1)), "   ");
    EXPECT_EQ(std::string(Qmx_CorrDbg::GetIndentString(2731)).size(), 8187u);
    EXPECT_EQ(std::string(Qmx_CorrDbg::GetIndentString(2730)).size(), 8190u);
}

TEST(CorrDbgDump, DebugExceptionPrintsOriginNumberAndText) {
    const Qmx_CorrDbg::Exception e("s/Qmx_CorrArchive", 17, -3);
    Qmx_CorrDbg::Exception::Format("pool %u of %s", 4u, "items");
    std::ostringstream out;
    out << e;
    EXPECT_EQ(out.str(), "Qmx_CorrDbg::Exception: s/Qmx_CorrArchive(17): [-3] pool 4 of items\n");
    EXPECT_STREQ(Qmx_CorrDbg::Exception::s_dbg, "pool 4 of items");
}

}  // namespace
