// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tiffsource.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <map>
#include <new>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

#include "host/datasources/validityreader.h"
#include "host/drivers/common/auxiliaryfile.h"
#include "host/drivers/tiff/declarednodata.h"
#include "host/drivers/tiff/file/catalogue.h"
#include "host/drivers/tiff/imagecoding.h"
#include "host/drivers/tiff/pixelreader.h"
#include "host/drivers/tiff/tifffingerprint.h"
#include "host/drivers/tiff/tifflevelstore.h"
#include "host/drivers/tiff/tiffmask.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::AuxiliaryData;

/// A reader of full-resolution pixels.
class TiffReader final : public datasources::ReaderState<datasources::IRasterReader> {
 public:
  TiffReader(const std::string& file, std::vector<unsigned> channels, AuxiliaryData metadata)
      : file_(file),
        channels_(std::move(channels)),
        metadata_(std::move(metadata)),
        pixels_(file, 0, channels_) {}

  unsigned GetWidth() const override { return pixels_.Format().width; }
  unsigned GetHeight() const override { return pixels_.Format().height; }
  unsigned GetChannelCount() const override { return static_cast<unsigned>(channels_.size()); }
  const gobs::DataType& GetDataType() const override { return pixels_.Format().type; }
  unsigned GetLevel() const override { return 1; }
  AuxiliaryData GetAuxiliaryData() const override { return metadata_; }
  std::vector<unsigned> GetChannelsInfo() const override { return channels_; }
  void Read(gobs::Raster& block) override {
    RequireFittingBlock(block, *this, file_);
    pixels_.Read(block);
  }

 protected:
  unsigned StoredTileWidth() const override { return pixels_.Format().tileWidth; }
  unsigned StoredTileHeight() const override { return pixels_.Format().tileHeight; }

 private:
  std::string file_;
  std::vector<unsigned> channels_;
  AuxiliaryData metadata_;
  PixelReader pixels_;
};

/// Asks without opening the file for writing: that is left to the first change.
void RequireWritable(const std::string& file) {
  std::error_code ignored;
  const bool isFolder = std::filesystem::is_directory(file, ignored);
  if (!isFolder && faccessat(AT_FDCWD, file.c_str(), W_OK, AT_EACCESS) == 0) return;
  const char* reason = std::strerror(isFolder ? EISDIR : errno);
  throw Exception(FormatString(_("%s: cannot be opened for writing: %s."), file.c_str(), reason),
                  "host/drivers/tiff/tiffsource", "RequireWritable(const std::string&)", 0);
}

/// The first extra sample that is declared as opacity, 1-based; 0 without one.
unsigned AlphaChannelOf(const TiffHandle& tiff, const PixelFormat& format) {
  uint16_t count = 0;
  uint16_t* meanings = nullptr;
  if (TIFFGetField(tiff.Get(), TIFFTAG_EXTRASAMPLES, &count, &meanings) != 1) return 0;
  for (uint16_t i = 0; i < count && count <= format.samplesPerPixel; ++i)
    if (meanings[i] == EXTRASAMPLE_ASSOCALPHA || meanings[i] == EXTRASAMPLE_UNASSALPHA)
      return format.samplesPerPixel - count + i + 1;
  return 0;
}

/// \throws std::bad_alloc  it is there, but libtiff had no memory for it: it says nothing then, or
///                         something that it also says of damage, and goes on without the text,
///                         which may declare no-data
std::string MetadataTextOf(const TiffHandle& tiff, const std::string& path) {
  std::string text = tiff.TextOf(TIFFTAG_GDAL_METADATA);
  if (!text.empty()) return text;
  const PositionedFile file(path, PositionedFile::Mode::kRead);
  const TiffStructure structure = ParseStructure(file);
  const TiffEntry* entry = structure.directories.at(0).Find(TIFFTAG_GDAL_METADATA);
  if (!entry || entry->type != TIFF_ASCII || entry->bytes == 0) return text;
  const bool isInFile =
      entry->position <= file.Size() && entry->bytes <= file.Size() - entry->position;
  if (!isInFile || entry->bytes >= uint64_t{TiffHandle::kLargestAllocation}) return text;
  char first = 0;
  file.Read(entry->position, &first, 1);
  if (first != '\0') throw std::bad_alloc();
  return text;
}

/// Whether text behind the header says so. An edit that ends it leaves its mark there.
bool IsCloudOptimizedTiff(const PositionedFile& file, const TiffStructure& structure) {
  constexpr size_t kMaxBytes = 4096;
  const uint64_t size = file.Size();
  const uint64_t start = std::min<uint64_t>(size, structure.HeaderBytes());
  std::string text(std::min<uint64_t>(kMaxBytes, size - start), '\0');
  file.Read(start, text.data(), text.size());
  return text.starts_with("GDAL_STRUCTURAL_METADATA_SIZE=") &&
         text.find("LAYOUT=IFDS_BEFORE_DATA") != text.npos &&
         text.find("KNOWN_INCOMPATIBLE_EDITION=YES") == text.npos;
}

}  // namespace

TiffSource::TiffSource(std::string file, datasources::AccessMode access) : file_(std::move(file)) {
  if (access == datasources::kUpdate) RequireWritable(file_);
  {
    const TiffHandle tiff = TiffHandle::OpenAt(file_, 0);
    format_ = FormatOf(tiff);
    metadata_ = ParseMetadata(MetadataTextOf(tiff, file_));
    alphaChannel_ = AlphaChannelOf(tiff, format_);
  }  // closed: who gives space back asks whether somebody has the file open
  const AuxiliaryFile auxiliary = ReadAuxiliaryFile(file_);
  namesCategories_ = auxiliary.namesCategories;
  noDataOrigin_ = DeclareNoData(metadata_, format_, auxiliary);
  watch_ = std::make_shared<datasources::ImageWatch>(
      file_, [path = file_](const std::stop_token& stop) { return FingerprintOfTiff(path, stop); });
  FindMasks();
  const ImageValidity validity = ValidityOf(*this);
  levels_ = OpenInternalLevels(file_, format_, access == datasources::kUpdate, watch_, Inputs(),
                               validity);
}

void TiffSource::FindMasks() {
  const PositionedFile file(file_, PositionedFile::Mode::kRead);
  const TiffStructure structure = ParseStructure(file);
  if (const auto mask = Catalogue(file, structure, true).MaskOf(0))
    maskOffset_ = structure.directories[*mask].offset;
  isCloudOptimized_ = IsCloudOptimizedTiff(file, structure);
  coding_ = CodingDigestOf(file, structure, structure.directories[0]);
  palette_ = PaletteDigestOf(file, structure, structure.directories[0]);
  hasMaskBeside_ = OpenMaskBeside(file_, format_.width, format_.height) != nullptr;
}

std::unique_ptr<datasources::IValidityReader> TiffSource::OpenMask() {
  datasources::ValidityReaders masks;
  if (maskOffset_) masks.push_back(OpenTiffMask(file_, *maskOffset_));
  if (hasMaskBeside_) masks.push_back(OpenMaskBeside(file_, format_.width, format_.height));
  return datasources::AllOf(std::move(masks));
}

TiffSource::~TiffSource() = default;

model::LevelInputs TiffSource::Inputs() const {
  model::LevelInputs inputs = datasources::InputsOf(*this);
  inputs.mask = maskOffset_ ? "inside" : "";
  if (hasMaskBeside_) inputs.mask += maskOffset_ ? ",beside" : "beside";
  inputs.coding = coding_;
  inputs.palette = palette_;
  return inputs;
}

AuxiliaryData TiffSource::MetadataOf(const std::vector<unsigned>& channels) const {
  std::map<std::optional<unsigned>, AuxiliaryData::Items> bySample;  // none: of the file
  for (const MetadataItem& item : metadata_)
    if (item.domain.empty()) bySample[item.sample].emplace(item.name, item.text);
  std::vector<AuxiliaryData::Items> channelItems;
  for (const unsigned channel : channels) channelItems.push_back(bySample[channel - 1]);
  return {bySample[std::nullopt], std::move(channelItems), noDataOrigin_};
}

bool TiffSource::HoldsClasses() const {
  return format_.photometric == PHOTOMETRIC_PALETTE || namesCategories_;
}

std::unique_ptr<datasources::IRasterReader> TiffSource::OpenReader(
    const std::vector<unsigned>& channels) {
  const auto open = [this](const std::vector<unsigned>& numbers) {
    return std::make_unique<TiffReader>(file_, numbers, MetadataOf(numbers));
  };
  return datasources::WithValidity(
      open(channels), {OpenMask(), alphaChannel_, [&] { return open({alphaChannel_}); }});
}

}  // namespace orin::drivers
