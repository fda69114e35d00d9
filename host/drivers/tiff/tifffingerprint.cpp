// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/tifffingerprint.h"

#include <algorithm>
#include <unordered_map>
#include <vector>

#include <tiff.h>

#include "host/datasources/fingerprint.h"
#include "host/drivers/tiff/file/catalogue.h"
#include "host/drivers/tiff/structure.h"
#include "host/drivers/tiff/tiffhandle.h"
#include "host/services/text.h"

namespace orin::drivers {
namespace {

using datasources::Fingerprinter;

/// What stands before a tile's bytes, so that no two lists of tiles look alike.
enum TileKind : uint64_t { kLeftOut, kSharedWithEarlier, kStored };

/// Adds stretches of a file, which mostly follow each other, with few large reads.
class StretchReader {
 public:
  StretchReader(const PositionedFile& file, Fingerprinter& fingerprint)
      : file_(file), fingerprint_(fingerprint), size_(file.Size()) {}

  /// \pre the stretch lies inside the file
  void Add(uint64_t position, uint64_t count) {
    constexpr uint64_t kNear = uint64_t{64} << 10;
    const bool goesOn = position >= end_ && position - end_ <= kNear;
    end_ = position + count;
    while (count > 0) {
      if (position < start_ || position >= start_ + buffer_.size())
        Fill(position, goesOn ? kReadBytes : std::min(count, kReadBytes));
      const uint64_t at = position - start_;
      const uint64_t part = std::min(count, buffer_.size() - at);
      fingerprint_.Add(&buffer_[at], part);
      position += part;
      count -= part;
    }
  }

 private:
  static constexpr uint64_t kReadBytes = uint64_t{4} << 20;

  void Fill(uint64_t position, uint64_t count) {
    start_ = position;
    buffer_.resize(std::min(count, size_ - position));
    file_.Read(position, buffer_.data(), buffer_.size());
  }

  const PositionedFile& file_;
  Fingerprinter& fingerprint_;
  uint64_t size_;
  uint64_t start_ = 0;  ///< of the buffer, in the file
  uint64_t end_ = 0;    ///< of the last stretch
  std::vector<uint8_t> buffer_;
};

struct TileTables {
  std::vector<uint64_t> offsets;
  std::vector<uint64_t> counts;  ///< bytes
};

TileTables TablesOf(const PositionedFile& file, const TiffStructure& structure,
                    const TiffDirectory& directory) {
  const auto numbers = [&](uint16_t tileTag, uint16_t stripTag) {
    const TiffEntry* entry = directory.Find(tileTag);
    if (!entry) entry = directory.Find(stripTag);
    return entry ? ReadNumbers(file, structure, *entry) : std::vector<uint64_t>();
  };
  TileTables tables{numbers(TIFFTAG_TILEOFFSETS, TIFFTAG_STRIPOFFSETS),
                    numbers(TIFFTAG_TILEBYTECOUNTS, TIFFTAG_STRIPBYTECOUNTS)};
  if (tables.offsets.empty() || tables.offsets.size() != tables.counts.size())
    FailToRead(file.Path(), _("its table of tiles is not whole"));
  return tables;
}

/// \returns false when `stop` was requested
bool AddTilesOf(const PositionedFile& file, const TileTables& tables, Fingerprinter& fingerprint,
                const std::stop_token& stop) {
  const uint64_t size = file.Size();
  uint64_t left = size;  // tiles that overlap could make a small file take for ever
  std::unordered_map<uint64_t, size_t> firstAt;
  StretchReader stretches(file, fingerprint);
  fingerprint.AddNumber(tables.offsets.size());
  for (size_t i = 0; i < tables.offsets.size(); ++i) {
    if (stop.stop_requested()) return false;
    const uint64_t offset = tables.offsets[i];
    const uint64_t count = tables.counts[i];
    if (offset == 0 || count == 0) {
      fingerprint.AddNumber(kLeftOut);
      continue;
    }
    const auto [first, isNew] = firstAt.emplace(offset, i);
    if (!isNew && tables.counts[first->second] == count) {
      fingerprint.AddNumber(kSharedWithEarlier);
      fingerprint.AddNumber(first->second);
      continue;
    }
    if (offset > size || count > size - offset || count > left)
      FailToRead(file.Path(), _("a tile lies outside the file"));
    left -= count;
    fingerprint.AddNumber(kStored);
    fingerprint.AddNumber(count);
    stretches.Add(offset, count);
  }
  return true;
}

}  // namespace

bool AddStoredTiles(const PositionedFile& file, const TiffStructure& structure,
                    const TiffDirectory& directory, Fingerprinter& fingerprint,
                    const std::stop_token& stop) {
  return AddTilesOf(file, TablesOf(file, structure, directory), fingerprint, stop);
}

void AddTileSizes(const PositionedFile& file, const TiffStructure& structure,
                  const TiffDirectory& directory, Fingerprinter& fingerprint) {
  const TileTables tables = TablesOf(file, structure, directory);
  fingerprint.AddNumber(tables.counts.size());
  for (size_t i = 0; i < tables.counts.size(); ++i)
    fingerprint.AddNumber(tables.offsets[i] == 0 ? 0 : tables.counts[i]);
}

std::string FingerprintOfTiff(const std::string& path, const std::stop_token& stop) {
  const PositionedFile file(path, PositionedFile::Mode::kRead);
  const TiffStructure structure = ParseStructure(file);
  const TiffDirectory& image = structure.directories[0];
  Fingerprinter fingerprint;
  if (const TiffEntry* tables = image.Find(TIFFTAG_JPEGTABLES)) {
    const std::vector<uint8_t> bytes = ReadBytes(file, structure, *tables);
    fingerprint.Add(bytes.data(), bytes.size());
  }
  if (!AddStoredTiles(file, structure, image, fingerprint, stop)) return {};
  const auto mask = Catalogue(file, structure, true).MaskOf(0);
  if (mask && !AddStoredTiles(file, structure, structure.directories[*mask], fingerprint, stop))
    return {};
  return fingerprint.Text();
}

}  // namespace orin::drivers
