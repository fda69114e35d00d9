// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/imagecoding.h"

#include <algorithm>
#include <cstdint>
#include <vector>

#include <tiff.h>

#include "host/datasources/fingerprint.h"

namespace orin::drivers {
namespace {

using datasources::Fingerprinter;

/// A tag of numbers.
struct CodingTag {
  uint16_t tag;
  uint64_t usual;  ///< a tag of nothing but this number is as if left out
};

constexpr uint64_t kNoUsual = ~uint64_t{0};

constexpr CodingTag kNumberTags[] = {
    {TIFFTAG_IMAGEWIDTH, kNoUsual},      {TIFFTAG_IMAGELENGTH, kNoUsual},
    {TIFFTAG_BITSPERSAMPLE, 1},          {TIFFTAG_COMPRESSION, COMPRESSION_NONE},
    {TIFFTAG_PHOTOMETRIC, kNoUsual},     {TIFFTAG_FILLORDER, FILLORDER_MSB2LSB},
    {TIFFTAG_SAMPLESPERPIXEL, 1},        {TIFFTAG_PLANARCONFIG, PLANARCONFIG_CONTIG},
    {TIFFTAG_GROUP3OPTIONS, 0},          {TIFFTAG_GROUP4OPTIONS, 0},
    {TIFFTAG_PREDICTOR, PREDICTOR_NONE}, {TIFFTAG_TILEWIDTH, kNoUsual},
    {TIFFTAG_TILELENGTH, kNoUsual},      {TIFFTAG_INKSET, INKSET_CMYK},
    {TIFFTAG_EXTRASAMPLES, kNoUsual},    {TIFFTAG_SAMPLEFORMAT, SAMPLEFORMAT_UINT},
    {TIFFTAG_YCBCRSUBSAMPLING, 2},       {TIFFTAG_YCBCRPOSITIONING, YCBCRPOSITION_CENTERED},
    {TIFFTAG_LERC_PARAMETERS, kNoUsual},
};

/// Tags that are compared byte by byte, elements in the machine's order.
constexpr uint16_t kByteTags[] = {TIFFTAG_JPEGTABLES, TIFFTAG_YCBCRCOEFFICIENTS,
                                  TIFFTAG_REFERENCEBLACKWHITE};

/// Reads the values of one directory, without those that are too many to mean anything.
class TagReader {
 public:
  TagReader(const PositionedFile& file, const TiffStructure& structure,
            const TiffDirectory& directory)
      : file_(file), structure_(structure), directory_(directory) {}

  std::vector<uint64_t> Numbers(uint16_t tag) const {
    const TiffEntry* entry = Find(tag);
    return entry ? ReadNumbers(file_, structure_, *entry) : std::vector<uint64_t>();
  }
  std::vector<uint8_t> Bytes(uint16_t tag) const {
    const TiffEntry* entry = Find(tag);
    return entry ? ReadBytes(file_, structure_, *entry) : std::vector<uint8_t>();
  }
  uint64_t Number(uint16_t tag, uint64_t otherwise) const {
    return NumberOf(file_, structure_, directory_, tag, otherwise);
  }

 private:
  const TiffEntry* Find(uint16_t tag) const {
    constexpr uint64_t kMaxBytes = uint64_t{1} << 20;
    const TiffEntry* entry = directory_.Find(tag);
    return entry && entry->bytes <= kMaxBytes ? entry : nullptr;
  }

  const PositionedFile& file_;
  const TiffStructure& structure_;
  const TiffDirectory& directory_;
};

void AddNumbers(uint16_t tag, const std::vector<uint64_t>& numbers, Fingerprinter& digest) {
  digest.AddNumber(tag);
  digest.AddNumber(numbers.size());
  for (const uint64_t number : numbers) digest.AddNumber(number);
}

/// Strips that reach beyond the image are those that end with it.
void AddStripRows(const TagReader& tags, Fingerprinter& digest) {
  if (!tags.Numbers(TIFFTAG_TILEWIDTH).empty()) return;
  const uint64_t rows = tags.Number(TIFFTAG_IMAGELENGTH, 0);
  AddNumbers(TIFFTAG_ROWSPERSTRIP, {std::min(tags.Number(TIFFTAG_ROWSPERSTRIP, rows), rows)},
             digest);
}

/// Bytes of wider samples are read in the file's order.
void AddByteOrder(const TagReader& tags, const ByteOrder& byteOrder, Fingerprinter& digest) {
  constexpr uint64_t kByteBits = 8;
  const std::vector<uint64_t> bits = tags.Numbers(TIFFTAG_BITSPERSAMPLE);
  const bool isWide =
      std::any_of(bits.begin(), bits.end(), [](uint64_t count) { return count > kByteBits; });
  if (isWide) digest.AddNumber(byteOrder.order == std::endian::big ? 'M' : 'I');
}

}  // namespace

std::string CodingDigestOf(const PositionedFile& file, const TiffStructure& structure,
                           const TiffDirectory& directory) {
  const TagReader tags(file, structure, directory);
  Fingerprinter digest;
  for (const auto& [tag, usual] : kNumberTags) {
    const std::vector<uint64_t> numbers = tags.Numbers(tag);
    const bool isUsual = std::all_of(numbers.begin(), numbers.end(),
                                     [usual = usual](uint64_t number) { return number == usual; });
    if (!isUsual) AddNumbers(tag, numbers, digest);
  }
  AddStripRows(tags, digest);
  AddByteOrder(tags, structure.byteOrder, digest);
  for (const uint16_t tag : kByteTags) {
    const std::vector<uint8_t> bytes = tags.Bytes(tag);
    if (bytes.empty()) continue;
    AddNumbers(tag, {bytes.size()}, digest);
    digest.Add(bytes.data(), bytes.size());
  }
  return digest.Text();
}

std::string PaletteDigestOf(const PositionedFile& file, const TiffStructure& structure,
                            const TiffDirectory& directory) {
  const std::vector<uint64_t> colours =
      TagReader(file, structure, directory).Numbers(TIFFTAG_COLORMAP);
  if (colours.empty()) return "";
  Fingerprinter digest;
  AddNumbers(TIFFTAG_COLORMAP, colours, digest);
  return digest.Text();
}

}  // namespace orin::drivers
