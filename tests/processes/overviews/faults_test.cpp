/// A fault at every single call of the host during a run.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <clocale>

#include "host/services/text.h"
#include "tests/processes/overviews/overviewstesting.h"

namespace orin::testing {
namespace {

struct Setting {
  const char* file;
  int code;
  Fault fault;
};

class Faults : public ::testing::TestWithParam<Setting> {
 protected:
  static drivers::MemoryRaster Raster() { return NoiseOf(64, 48, 2); }
  static datasources::LevelPlace Place() {
    return GetParam().code == 99 ? datasources::LevelPlace::kSideCar
                                 : datasources::LevelPlace::kInternal;
  }
  struct Undisturbed {
    size_t calls;
    LevelPixels pixels;
  };
  static Undisturbed UndisturbedRun() {
    RecordingHost host;
    host.Put(GetParam().file, Raster(), GetParam().code);
    EXPECT_TRUE(JobFor(GetParam().file, {2, 4}).Generate());
    return {host.CallCount(), PixelsOf(host, GetParam().file, Place())};
  }
};

TEST_P(Faults, AtAnyCallEndWithAWarningAndNoFalseFlag) {
  const auto [file, code, fault] = GetParam();
  const auto [calls, pixels] = UndisturbedRun();
  ASSERT_GT(calls, 15u);
  const auto place = Place();
  for (size_t n = 1; n <= calls; ++n) {
    RecordingHost host;
    host.Put(file, Raster(), code);
    host.FailAt(n, fault);
    const bool answer = JobFor(file, {2, 4}).Generate();
    const bool built = IsValid(host, file, 2, place) && IsValid(host, file, 4, place);
    if (answer) {
      // Only an open may fail without harm: the file is then taken as read-only.
      EXPECT_TRUE(built || IsValid(host, file, 4, datasources::LevelPlace::kSideCar)) << n;
    } else if (!host.Log("store.List()").empty() || !host.Log("sidecar.List()").empty()) {
      ASSERT_EQ(1u, host.Warnings().size()) << n;
      EXPECT_EQ(913u, host.Warnings()[0].line) << n;
      EXPECT_EQ(0u,
                host.Warnings()[0].message.find("Failed to create overviews.\ninjected fault: "))
          << host.Warnings()[0].message;
    }
    EXPECT_EQ(0, host.Live().Total()) << n;
    EXPECT_TRUE(ValidChannelsHold(pixels, host, file, place)) << n;
    EXPECT_TRUE(ValidChannelsHold(pixels, host, file, datasources::LevelPlace::kSideCar)) << n;
    host.Clear();
    EXPECT_TRUE(JobFor(file, {2, 4}).Generate()) << n;
  }
}

INSTANTIATE_TEST_SUITE_P(Places, Faults,
                         ::testing::Values(Setting{"a.tif", kFormatTiff, Fault::kException},
                                           Setting{"a.tif", kFormatTiff, Fault::kDataException},
                                           Setting{"a.odd", 99, Fault::kException}));

TEST(Fault, InALevelStillReportsTheEndOfTheRun) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 1));
  host.FailAt("Create", 2);
  EXPECT_FALSE(JobFor("a.tif", {2, 4}).Generate());
  ExpectOneWarning(host, 913, "Failed to create overviews.\ninjected fault: Create");
  EXPECT_EQ(1.0f, host.Progress().back());
  EXPECT_TRUE(IsValid(host, "a.tif", 2));
  EXPECT_FALSE(IsValid(host, "a.tif", 4));
}

TEST(Fault, ThatIsNoHostExceptionPassesThrough) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 1));
  host.FailAt("Create", 1, Fault::kStdRuntimeError);
  CreateFileOverviews job = JobFor("a.tif", {2});
  EXPECT_THROW(job.Generate(), std::runtime_error);
}

TEST(Fault, WithATextFixedInEnglishIsReportedInTheUsersLanguage) {
  ASSERT_NE(nullptr, std::setlocale(LC_ALL, "C.UTF-8"));
  setenv("LANGUAGE", "fr", 1);
  BindTranslations(ORIN_LOCALE_DIR);
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 1));
  CreateFileOverviews job = JobFor("a.tif", {2});
  job.SetPyramidType(static_cast<QRTOverviewResampleType>(9));
  EXPECT_FALSE(job.Generate());
  unsetenv("LANGUAGE");
  std::setlocale(LC_ALL, "C");
  ASSERT_EQ(1u, host.Warnings().size());
  EXPECT_EQ(std::string::npos, host.Warnings()[0].message.find("Failed"));
  EXPECT_EQ(std::string::npos, host.Warnings()[0].message.find("has not been setup"));
  EXPECT_NE(std::string::npos, host.Warnings()[0].message.find("IResamplerFactory"));
}

TEST(Fault, OfTheProcessingTargetIsReported) {
  RecordingHost host;
  host.Put("a.tif", NoiseOf(64, 48, 1));
  setenv("ORIN_TARGET", "abacus", 1);
  EXPECT_FALSE(JobFor("a.tif", {2}).Generate());
  unsetenv("ORIN_TARGET");
  ASSERT_EQ(1u, host.Warnings().size());
  EXPECT_EQ(913u, host.Warnings()[0].line);
  EXPECT_FALSE(IsValid(host, "a.tif", 2));
}

}  // namespace
}  // namespace orin::testing
