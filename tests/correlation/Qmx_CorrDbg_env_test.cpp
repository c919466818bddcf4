// Runs with OBR_QMX_CORR_DBG_TRACE set in the environment before the library is loaded, so
// it checks what the process-wide tracer made of it at load time.
#include <gtest/gtest.h>

#include "Qmx_CorrDbg.h"

namespace {

TEST(CorrDbgLoad, TracerReadsTheVariableWhenTheLibraryIsLoaded) {
    ASSERT_NE(Qmx_CorrDbg::s_Tracer, nullptr);
    const std::map<std::string, std::uint32_t> expected{{"CORR_ALGO", 10}, {"a=b", 4}, {"all", 3}};
    EXPECT_EQ(Qmx_CorrDbg::s_Tracer->GetLevels(), expected);
    EXPECT_TRUE(Qmx_CorrDbg::s_Tracer->IsEnabled());
    EXPECT_TRUE(Qmx_CorrDbg::s_Tracer->AllowTrace("POOL", 3));
    EXPECT_FALSE(Qmx_CorrDbg::s_Tracer->AllowTrace("POOL", 4));
    EXPECT_TRUE(Qmx_CorrDbg::s_Tracer->AllowTrace("CORR_ALGO", 10));
}

}  // namespace
