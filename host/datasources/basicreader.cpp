// SPDX-License-Identifier: MIT
#include "host/datasources/basicreader.h"

#include "host/datasources/levelstore.h"
#include "host/datasources/withmemory.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

std::unique_ptr<IRasterReader> Open(IDataset* dataset, const std::vector<unsigned>& channels) {
  static constexpr char kFunction[] =
      "orin::datasources::BasicReader::BasicReader(orin::datasources::IDataset*, "
      "const std::vector<unsigned int>&, bool)";
  const auto refuse = [](const std::string& text) {
    throw DataException(text, "host/datasources/basicreader", kFunction, 0);
  };
  auto* raster = dynamic_cast<IRasterDataset*>(dataset);
  if (!raster) refuse(_("A reader was asked for a dataset that is no raster."));
  for (const unsigned channel : channels)
    if (channel < 1 || channel > raster->GetChannelCount())
      refuse(FormatString(_("%s: there is no channel %u; the file has %u."),
                          raster->GetFileName().c_str(), channel, raster->GetChannelCount()));
  return WithMemory(raster->GetFileName(), kFunction,
                    [&] { return raster->GetSource()->OpenReader(channels); });
}

}  // namespace

BasicReader::BasicReader(IDataset* dataset, const std::vector<unsigned>& channels, bool)
    : reader_(Open(dataset, channels)) {}
BasicReader::~BasicReader() = default;

}  // namespace orin::datasources
