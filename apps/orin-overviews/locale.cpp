// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/locale.h"

#include <clocale>
#include <filesystem>
#include <string>

#include "host/services/environment.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

namespace fs = std::filesystem;

/// Relative to the directory of the program: in the build tree, and as installed.
constexpr const char* kNearby[] = {"../../locale", ORIN_LOCALE_FROM_BIN};

std::string LocaleDirectory() {
  const std::string chosen = core::QRTGetEnvironmentVariable("ORIN_LOCALE_DIR");
  if (!chosen.empty()) return chosen;
  std::error_code error;
  const fs::path program = fs::read_symlink("/proc/self/exe", error);
  for (const char* const nearby : kNearby) {
    const fs::path directory = program.parent_path() / nearby;
    if (!error && fs::is_directory(directory, error)) return directory.string();
    error.clear();
  }
  return ORIN_LOCALE_DIR;
}

}  // namespace

void ChooseLanguage() {
  std::setlocale(LC_CTYPE, "");
  std::setlocale(LC_MESSAGES, "");
  BindTranslations(LocaleDirectory());
}

}  // namespace orin::app
