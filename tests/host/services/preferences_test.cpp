// SPDX-License-Identifier: MIT
#include "host/services/preferences.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <vector>

#include "host/services/warning.h"

namespace orin {
namespace {

using std::filesystem::path;
using tarn::Report;

/// A directory of its own, the warnings so far, and the environment as it was.
class Preferences : public ::testing::Test {
 protected:
  void SetUp() override {
    directory_ =
        std::filesystem::temp_directory_path() / ("orin-preferences-" + std::to_string(::getpid()));
    std::filesystem::create_directories(directory_);
    former_ = tarn::Warning::SetSink([this](const Report& report) { warnings_.push_back(report); });
  }
  void TearDown() override {
    tarn::Warning::SetSink(former_);
    std::filesystem::remove_all(directory_);
  }

  std::string File(const std::string& text) const {
    const path file = directory_ / "preferences.toml";
    std::ofstream(file) << text;
    return file.string();
  }
  static const RasterLayerPreference& LayerOf(const PreferenceRegistry& registry) {
    const auto* layer = registry.Find<RasterLayerPreference>("");
    if (!layer) throw std::runtime_error("the registry holds no raster-layer preference");
    return *layer;
  }
  void ExpectDefaults(const PreferenceRegistry& registry) const {
    EXPECT_EQ(0, LayerOf(registry).GetOverviewGenerationMethod());
    EXPECT_EQ(2, LayerOf(registry).GetDecimationLevels());
  }

  path directory_;
  std::vector<Report> warnings_;
  tarn::ReportSink former_;
};

TEST_F(Preferences, AFileThatIsNotThereGivesTheDefaultsInSilence) {
  ExpectDefaults(*LoadPreferences((directory_ / "absent.toml").string()));
  ExpectDefaults(*LoadPreferences(""));
  EXPECT_TRUE(warnings_.empty());
}

TEST_F(Preferences, AnEmptyFileGivesTheDefaultsInSilence) {
  ExpectDefaults(*LoadPreferences(File("")));
  EXPECT_TRUE(warnings_.empty());
}

TEST_F(Preferences, NamesAndNumbersOfMethodsAreRead) {
  const struct {
    const char* text;
    int method;
  } kCases[] = {{"\"nearest\"", 0}, {"\"average\"", 1}, {"\"mode\"", 2},
                {"0", 0},           {"1", 1},           {"2", 2}};
  for (const auto& c : kCases) {
    const auto registry = LoadPreferences(File(std::string("[raster-layer]\noverview-method = ") +
                                               c.text + "\ndecimation-factor = 3\n"));
    EXPECT_EQ(c.method, LayerOf(*registry).GetOverviewGenerationMethod()) << c.text;
    EXPECT_EQ(3, LayerOf(*registry).GetDecimationLevels()) << c.text;
  }
  EXPECT_TRUE(warnings_.empty());
}

TEST_F(Preferences, ATextThatIsNotTomlNamesFileAndLineAndTheDefaultsApply) {
  const std::string file = File("[raster-layer]\noverview-method = \"mode\"\n\nthis is not toml\n");
  ExpectDefaults(*LoadPreferences(file));
  ASSERT_EQ(1u, warnings_.size());
  EXPECT_EQ(0u, warnings_[0].message.find(file + ":4: ")) << warnings_[0].message;
  EXPECT_NE(std::string::npos, warnings_[0].message.find("The defaults apply."));
  EXPECT_EQ("host/services/preferences", warnings_[0].sourceFile);
  EXPECT_EQ(4u, warnings_[0].line);
}

TEST_F(Preferences, AWrongValueNamesItsLineAndLeavesTheOtherOneAlone) {
  const std::string file =
      File("[raster-layer]\n\noverview-method = \"bilinear\"\ndecimation-factor = 3\n");
  const auto registry = LoadPreferences(file);
  EXPECT_EQ(0, LayerOf(*registry).GetOverviewGenerationMethod());
  EXPECT_EQ(3, LayerOf(*registry).GetDecimationLevels());
  ASSERT_EQ(1u, warnings_.size());
  EXPECT_EQ(
      file +
          ":3: overview-method must be \"nearest\", \"average\" or \"mode\". The defaults apply.",
      warnings_[0].message);
  EXPECT_EQ(3u, warnings_[0].line);
}

TEST_F(Preferences, WrongKindsAndRangesOfValuesAreRefused) {
  for (const char* value : {"4", "1", "0", "-2", "2.0", "\"2\"", "true", "[2]"}) {
    warnings_.clear();
    const std::string file =
        File(std::string("[raster-layer]\ndecimation-factor = ") + value + "\n");
    ExpectDefaults(*LoadPreferences(file));
    ASSERT_EQ(1u, warnings_.size()) << value;
    EXPECT_EQ(file + ":2: decimation-factor must be 2 or 3. The defaults apply.",
              warnings_[0].message);
  }
  for (const char* value : {"3", "-1", "4294967296", "\"Average\"", "1.0"}) {
    warnings_.clear();
    ExpectDefaults(
        *LoadPreferences(File(std::string("[raster-layer]\noverview-method = ") + value + "\n")));
    EXPECT_EQ(1u, warnings_.size()) << value;
  }
}

TEST_F(Preferences, AFileThatCannotBeReadIsReported) {
  ExpectDefaults(*LoadPreferences(directory_.string()));
  ASSERT_EQ(1u, warnings_.size());
  EXPECT_EQ(directory_.string() + ": The preference file cannot be read. The defaults apply.",
            warnings_[0].message);
}

TEST_F(Preferences, TheRegistryKeepsObjectsByTypeAndName) {
  struct OtherPreference : Preference {};
  PreferenceRegistry registry;
  EXPECT_EQ(nullptr, registry.Find<RasterLayerPreference>(""));
  registry.Set("", RasterLayerPreference(1, 3));
  registry.Set("second", RasterLayerPreference(2, 2));
  EXPECT_EQ(1, registry.Find<RasterLayerPreference>("")->GetOverviewGenerationMethod());
  EXPECT_EQ(2, registry.Find<RasterLayerPreference>("second")->GetOverviewGenerationMethod());
  EXPECT_EQ(nullptr, registry.Find<OtherPreference>(""));
  registry.Set("", RasterLayerPreference(0, 2));
  EXPECT_EQ(0, registry.Find<RasterLayerPreference>("")->GetOverviewGenerationMethod());
}

TEST_F(Preferences, ThereIsNoRegistryUntilOneIsInstalled) {
  PreferenceRegistry::Install(nullptr);
  EXPECT_EQ(nullptr, PreferenceRegistry::Get());
  auto registry = std::make_unique<PreferenceRegistry>();
  const PreferenceRegistry* installed = registry.get();
  PreferenceRegistry::Install(std::move(registry));
  EXPECT_EQ(installed, PreferenceRegistry::Get());
  PreferenceRegistry::Install(nullptr);
  EXPECT_EQ(nullptr, PreferenceRegistry::Get());
}

TEST_F(Preferences, ThePathComesFromTheFirstVariableThatIsSet) {
  const char* home = std::getenv("HOME");
  const std::string formerHome = home ? home : "";
  ::setenv("ORIN_PREFERENCES", "/a/own.toml", 1);
  ::setenv("XDG_CONFIG_HOME", "/b", 1);
  ::setenv("HOME", "/c", 1);
  EXPECT_EQ("/a/own.toml", PreferenceFilePath());
  ::unsetenv("ORIN_PREFERENCES");
  EXPECT_EQ("/b/orin/preferences.toml", PreferenceFilePath());
  ::unsetenv("XDG_CONFIG_HOME");
  EXPECT_EQ("/c/.config/orin/preferences.toml", PreferenceFilePath());
  ::unsetenv("HOME");
  EXPECT_EQ("", PreferenceFilePath());
  if (home) ::setenv("HOME", formerHome.c_str(), 1);
}

}  // namespace
}  // namespace orin
