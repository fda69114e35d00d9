/// Fuzzes the reading of the preference file: usable values whatever it holds, and a warning that
/// says where it is wrong.
// SPDX-License-Identifier: MIT
#include "host/services/preferences.h"

#include "fuzz/check.h"
#include "fuzz/scratchfile.h"
#include "host/services/warning.h"

namespace {

using namespace orin;

constexpr char kFile[] = "preferences.toml";

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const fuzz::ScratchFolder folder;
  const std::string path = folder.Write(kFile, data, size);
  unsigned warnings = 0;
  const auto former = tarn::Warning::SetSink([&](const tarn::Report& report) {
    ++warnings;
    fuzz::Demand(report.message.starts_with(path + ":"), "a warning names file and line");
  });
  const auto registry = LoadPreferences(path);
  tarn::Warning::SetSink(former);
  const auto* layer = registry->Find<RasterLayerPreference>("");
  fuzz::Demand(layer != nullptr, "there are preferences");
  const int method = layer->GetOverviewGenerationMethod(), factor = layer->GetDecimationLevels();
  fuzz::Demand(method >= 0 && method <= 2, "the method is one of three");
  fuzz::Demand(factor == 2 || factor == 3, "the factor is 2 or 3");
  fuzz::Demand(warnings <= 2, "a file gives one warning, or one for each of its two keys");
  fuzz::Demand(warnings < 2 || (method == 0 && factor == 2), "what is warned of is not used");
  return 0;
}
