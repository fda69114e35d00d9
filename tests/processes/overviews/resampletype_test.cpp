/// Method names, and the defaults that preferences give.
// SPDX-License-Identifier: MIT
#include "processes/overviews/resampletype.h"

#include <gtest/gtest.h>

#include "host/services/preferences.h"
#include "processes/overviews/levelplanning.h"

namespace {

/// Preferences for the length of a test.
class Preferences {
 public:
  Preferences(int method, int factor) {
    auto registry = std::make_unique<PreferenceRegistry>();
    registry->Set("", RasterLayerPreference(method, factor));
    PreferenceRegistry::Install(std::move(registry));
  }
  ~Preferences() { PreferenceRegistry::Install(nullptr); }
};

TEST(GetPyramidType, TakesEachMethodByTheStartOfItsNameInAnyCase) {
  EXPECT_EQ(ResampleNearest, GetPyramidType("near"));
  EXPECT_EQ(ResampleNearest, GetPyramidType("NEAREST"));
  EXPECT_EQ(ResampleNearest, GetPyramidType("Nearest Neighbour"));
  EXPECT_EQ(ResampleAverage, GetPyramidType("averaging"));
  EXPECT_EQ(ResampleMode, GetPyramidType("mode"));
  EXPECT_EQ(ResampleBilinear, GetPyramidType("BILINEAR"));
  EXPECT_EQ(ResampleBicubic, GetPyramidType("bicubic spline"));
  EXPECT_EQ(ResampleBicubic, GetPyramidType("CUBIC"));
  EXPECT_EQ(ResampleBicubic, GetPyramidType("cubic convolution"));
}

TEST(GetPyramidType, KnowsNoOtherName) {
  for (const char* name : {"", "AVE", "CUB", "BIC", "NEA", " near", "lanczos", "mod"})
    EXPECT_EQ(ResampleInvalid, GetPyramidType(name)) << name;
}

TEST(GetPyramidType, KnowsEveryMethodOfTheTableByItsStoredName) {
  for (const orin::model::Method& method : orin::model::kMethods)
    EXPECT_EQ(method.type, GetPyramidType(std::string(method.name))) << method.name;
}

TEST(PyramidTypeNames, AreOfAllMethods) {
  EXPECT_EQ("nearest, average, mode, bilinear, bicubic", PyramidTypeNames());
}

TEST(ResampleTypes, HaveFixedValues) {
  EXPECT_EQ(-1, ResampleInvalid);
  EXPECT_EQ(0, ResampleNearest);
  EXPECT_EQ(1, ResampleAverage);
  EXPECT_EQ(2, ResampleMode);
  EXPECT_EQ(3, ResampleBilinear);
  EXPECT_EQ(4, ResampleBicubic);
  EXPECT_EQ(4u, sizeof(QRTOverviewResampleType));
}

TEST(Defaults, AreNearestAndTwoWithoutRegistryOrPreference) {
  PreferenceRegistry::Install(nullptr);
  EXPECT_EQ(ResampleNearest, GetDefaultPyramidType());
  EXPECT_EQ(2u, GetDefaultDecimationLevels());
  PreferenceRegistry::Install(std::make_unique<PreferenceRegistry>());
  EXPECT_EQ(ResampleNearest, GetDefaultPyramidType());
  EXPECT_EQ(2u, GetDefaultDecimationLevels());
  PreferenceRegistry::Install(nullptr);
}

TEST(Defaults, ComeFromThePreferenceWithTheEmptyName) {
  const Preferences preferences(1, 3);
  EXPECT_EQ(ResampleAverage, GetDefaultPyramidType());
  EXPECT_EQ(3u, GetDefaultDecimationLevels());
  PreferenceRegistry::Get()->Set("another", RasterLayerPreference(2, 2));
  EXPECT_EQ(ResampleAverage, GetDefaultPyramidType());
}

TEST(Defaults, AreNeverBilinearBicubicOrAnotherFactor) {
  for (const int method : {3, 4, 5, -1}) {
    const Preferences preferences(method, 2);
    EXPECT_EQ(ResampleNearest, GetDefaultPyramidType()) << method;
  }
  for (const int factor : {4, 0, 1, -2}) {
    const Preferences preferences(0, factor);
    EXPECT_EQ(2u, GetDefaultDecimationLevels()) << factor;
  }
  const Preferences mode(2, 2);
  EXPECT_EQ(ResampleMode, GetDefaultPyramidType());
}

}  // namespace
