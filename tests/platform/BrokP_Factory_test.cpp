#include "BrokP_Factory.h"

#include <gtest/gtest.h>

namespace {

const Vesk::ClassId kGreeter("0a1b2c3d-0000-4000-8000-00000000beef");

// The test runs with QMX_COMPONENT_PATH naming a missing directory first, then the one that
// holds the test component.
TEST(BrokPFactory, LoadsComponentFromComponentPathAndMakesItsClass) {
    EXPECT_EQ(BrokP::Factory::CreateInstance(kGreeter), nullptr);
    ASSERT_TRUE(BrokP::Factory::LoadLibraryFactory("libTestComponent"));
    EXPECT_TRUE(BrokP::Factory::LoadLibraryFactory("libTestComponent"));

    BrokI::IInterface* instance = BrokP::Factory::CreateInstance(kGreeter);
    ASSERT_NE(instance, nullptr);
    EXPECT_EQ(instance->QueryInterface(Vesk::ClassId("0A1B2C3D-0000-4000-8000-00000000BEEF")),
              instance);
    EXPECT_EQ(instance->QueryInterface(Vesk::ClassId("something-else")), nullptr);
    EXPECT_EQ(BrokP::Factory::CreateInstance(Vesk::ClassId("unknown")), nullptr);
}

TEST(BrokPFactory, MissingOrUnnamedComponentIsNotLoaded) {
    EXPECT_FALSE(BrokP::Factory::LoadLibraryFactory("libNoSuchComponent"));
    EXPECT_FALSE(BrokP::Factory::LoadLibraryFactory(""));
    EXPECT_FALSE(BrokP::Factory::LoadLibraryFactory(nullptr));
}

}  // namespace
