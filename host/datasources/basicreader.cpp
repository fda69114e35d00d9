// SPDX-License-Identifier: MIT
#include "host/datasources/basicreader.h"

#include "host/datasources/levelstore.h"
#include "host/datasources/nodataanswers.h"
#include "host/datasources/withmemory.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

constexpr char kFunction[] =
    "orin::datasources::BasicReader::BasicReader(orin::datasources::IDataset*, "
    "const std::vector<unsigned int>&, bool)";

[[noreturn]] void Refuse(const std::string& text) {
  throw DataException(text, "host/datasources/basicreader", kFunction, 0);
}

IRasterDataset& RasterOf(IDataset* dataset) {
  auto* raster = dynamic_cast<IRasterDataset*>(dataset);
  if (!raster) Refuse(_("A reader was asked for a dataset that is no raster."));
  return *raster;
}

std::unique_ptr<IRasterReader> Open(IRasterDataset& raster, const std::vector<unsigned>& channels) {
  for (const unsigned channel : channels)
    if (channel < 1 || channel > raster.GetChannelCount())
      Refuse(FormatString(_("%s: there is no channel %u; the file has %u."),
                          raster.GetFileName().c_str(), channel, raster.GetChannelCount()));
  return ReadWithMemory(raster.GetFileName(), kFunction,
                        [&] { return raster.GetSource()->OpenReader(channels); });
}

}  // namespace

BasicReader::BasicReader(IDataset* dataset, const std::vector<unsigned>& channels, bool)
    : file_(RasterOf(dataset).GetFileName()),
      noData_(&RasterOf(dataset).GetNoDataAnswers()),
      reader_(Open(RasterOf(dataset), channels)) {}
BasicReader::~BasicReader() = default;

void BasicReader::Read(gobs::Raster& block) {
  ReadWithMemory(file_, "orin::datasources::BasicReader::Read(orin::gobs::Raster&)",
                 [&] { reader_->Read(block); });
}

AuxiliaryData BasicReader::GetAuxiliaryData() const {
  return noData_->Answer(reader_->GetAuxiliaryData(), GetChannelsInfo(), GetDataType());
}

}  // namespace orin::datasources
