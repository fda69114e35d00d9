// SPDX-License-Identifier: MIT
#include "host/drivers/tiff/levelcontents.h"

#include <functional>

#include "host/datasources/fingerprint.h"
#include "host/drivers/tiff/imagecoding.h"
#include "host/drivers/tiff/tifffingerprint.h"
#include "host/services/exception.h"

namespace orin::drivers {
namespace {

using datasources::Fingerprinter;

constexpr char kUnreadable[] = "unreadable";

void VisitDirectories(const TiffStructure& structure, const StoredLevel& level,
                      const std::function<void(const TiffDirectory&)>& visit) {
  visit(structure.directories.at(level.index));
  if (level.mask) visit(structure.directories.at(*level.mask));
}

}  // namespace

std::string TableDigestOf(const PositionedFile& file, const TiffStructure& structure,
                          const StoredLevel& level) {
  try {
    Fingerprinter digest;
    VisitDirectories(structure, level, [&](const TiffDirectory& directory) {
      digest.AddText(CodingDigestOf(file, structure, directory));
      digest.AddText(PaletteDigestOf(file, structure, directory));
      AddTileSizes(file, structure, directory, digest);
    });
    return digest.Text();
  } catch (const Exception&) {
    return {};
  }
}

std::string BytesDigestOf(const PositionedFile& file, const TiffStructure& structure,
                          const StoredLevel& level) {
  try {
    Fingerprinter digest;
    VisitDirectories(structure, level, [&](const TiffDirectory& directory) {
      digest.AddText(CodingDigestOf(file, structure, directory));
      AddStoredTiles(file, structure, directory, digest, {});
    });
    return digest.Text();
  } catch (const Exception&) {
    return kUnreadable;
  }
}

std::string LevelContents::KnownBytes(const StoredLevel& level,
                                      const model::FileStamp& holder) const {
  const auto found = known_.find(KeyOf(level));
  const bool isOfNow = found != known_.end() && found->second.first == holder;
  return isOfNow ? found->second.second : "";
}

void LevelContents::Learn(const StoredLevel& level, const model::FileStamp& holder,
                          const std::string& bytes) {
  known_[KeyOf(level)] = {holder, bytes};
}

bool LevelContents::IsWhole(const StoredLevel& level, const model::FileStamp& holder) const {
  const model::ContentRecord& content = level.metadata.content;
  return !content.IsBlank() && KnownBytes(level, holder) == content.bytes;
}

void LevelContents::Carry(const model::FileStamp& before, const model::FileStamp& now) {
  std::erase_if(known_, [&](const auto& entry) { return entry.second.first != before; });
  for (auto& [key, content] : known_) content.first = now;
}

}  // namespace orin::drivers
