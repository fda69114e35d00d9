// SPDX-License-Identifier: MIT
#include "host/services/preferences.h"

#include <toml++/toml.h>
#include <filesystem>
#include <fstream>
#include <optional>
#include <sstream>
#include <string_view>

#include "host/services/environment.h"
#include "host/services/text.h"
#include "host/services/warning.h"

namespace {

constexpr char kSource[] = "host/services/preferences";
constexpr int kDefaultMethod = 0;
constexpr int kDefaultFactor = 2;

std::unique_ptr<PreferenceRegistry>& Installed() {
  static std::unique_ptr<PreferenceRegistry> registry;
  return registry;
}

void WarnAt(const std::string& path, unsigned int line, const std::string& problem) {
  const std::string place = line == 0 ? path : path + ":" + std::to_string(line);
  orin::tarn::Warning::Warn(
      FormatString(_("%s: %s The defaults apply."), place.c_str(), problem.c_str()), kSource, line);
}

std::optional<int> MethodOf(const toml::node& node) {
  if (const auto name = node.value_exact<std::string>()) {
    if (*name == "nearest") return 0;
    if (*name == "average") return 1;
    if (*name == "mode") return 2;
    return std::nullopt;
  }
  const auto number = node.value_exact<int64_t>();
  return number && *number >= 0 && *number <= 2 ? std::optional<int>(int(*number)) : std::nullopt;
}

std::optional<int> FactorOf(const toml::node& node) {
  const auto number = node.value_exact<int64_t>();
  return number && (*number == 2 || *number == 3) ? std::optional<int>(int(*number)) : std::nullopt;
}

template <class Parse>
int Entry(const toml::table& file, std::string_view key, int otherwise, const char* problem,
          const std::string& path, Parse parse) {
  const toml::node* node = file["raster-layer"][key].node();
  if (!node) return otherwise;
  if (const auto value = parse(*node)) return *value;
  WarnAt(path, node->source().begin.line, problem);
  return otherwise;
}

std::optional<toml::table> Parse(const std::string& path) {
  std::ifstream stream(path, std::ios::binary);
  std::ostringstream text;
  const bool isEmpty = stream.peek() == std::ifstream::traits_type::eof();
  // A directory opens well; its first read sets the bad bit.
  if (!stream.is_open() || stream.bad() || (!isEmpty && !(text << stream.rdbuf()))) {
    WarnAt(path, 0, _("The preference file cannot be read."));
    return std::nullopt;
  }
  try {
    return toml::parse(text.str(), path);
  } catch (const toml::parse_error& error) {
    WarnAt(path, error.source().begin.line, std::string(error.description()) + ".");
    return std::nullopt;
  }
}

void WarnOfUnknownKey(const toml::key& key, const std::string& path) {
  const unsigned int line = key.source().begin.line;
  orin::tarn::Warning::Warn(
      FormatString(_("%s:%u: Unknown key \"%s\"; in [raster-layer] there are overview-method and "
                     "decimation-factor."),
                   path.c_str(), line, std::string(key.str()).c_str()),
      kSource, line);
}

void WarnOfUnknownKeys(const toml::table& file, const std::string& path) {
  for (const auto& [key, node] : file)
    if (key != "raster-layer") WarnOfUnknownKey(key, path);
  const toml::table* known = file["raster-layer"].as_table();
  if (!known) return;
  for (const auto& [key, node] : *known)
    if (key != "overview-method" && key != "decimation-factor") WarnOfUnknownKey(key, path);
}

}  // namespace

PreferenceRegistry* PreferenceRegistry::Get() { return Installed().get(); }

void PreferenceRegistry::Install(std::unique_ptr<PreferenceRegistry> registry) {
  Installed() = std::move(registry);
}

namespace orin {

std::string PreferenceFilePath() {
  using core::QRTGetEnvironmentVariable;
  if (std::string path = QRTGetEnvironmentVariable("ORIN_PREFERENCES"); !path.empty()) return path;
  if (const std::string base = QRTGetEnvironmentVariable("XDG_CONFIG_HOME"); !base.empty())
    return base + "/orin/preferences.toml";
  if (const std::string home = QRTGetEnvironmentVariable("HOME"); !home.empty())
    return home + "/.config/orin/preferences.toml";
  return "";
}

bool IsPreferenceFileNamed() {
  return !core::QRTGetEnvironmentVariable("ORIN_PREFERENCES").empty();
}

std::unique_ptr<PreferenceRegistry> LoadPreferences(const std::string& path, bool mustExist) {
  auto registry = std::make_unique<PreferenceRegistry>();
  int method = kDefaultMethod;
  int factor = kDefaultFactor;
  std::error_code ignored;
  if (!path.empty() && std::filesystem::exists(path, ignored)) {
    if (const auto file = Parse(path)) {
      WarnOfUnknownKeys(*file, path);
      method =
          Entry(*file, "overview-method", method,
                _("overview-method must be \"nearest\", \"average\" or \"mode\"."), path, MethodOf);
      factor = Entry(*file, "decimation-factor", factor, _("decimation-factor must be 2 or 3."),
                     path, FactorOf);
    }
  } else if (mustExist) WarnAt(path, 0, _("The preference file does not exist."));
  registry->Set("", RasterLayerPreference(method, factor));
  return registry;
}

}  // namespace orin
