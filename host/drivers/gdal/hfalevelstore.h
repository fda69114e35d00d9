/// The levels inside an ERDAS Imagine file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "host/datasources/imagewatch.h"
#include "host/datasources/levelstore.h"
#include "host/drivers/common/byteranges.h"
#include "host/drivers/common/positionedfile.h"
#include "host/drivers/gdal/gdalformats.h"
#include "host/drivers/gdal/hfarecord.h"
#include "host/drivers/gdal/hfatree.h"
#include "host/drivers/gdal/hfaupdate.h"
#include "host/drivers/gdal/sourceuse.h"

namespace orin::drivers {

/// A file that grows beyond it would go on in a second one; bytes.
inline constexpr uint64_t kMostHfaBytes = 2'000'000'000;

/// The levels inside `name`, or null when it holds none that are its own and cannot take any.
/// \param image  its full resolution; outlives the store
/// \throws orin::Exception  the file cannot be read, or it cannot be used so
std::unique_ptr<datasources::ILevelStore> OpenHfaLevels(const std::string& name,
                                                        const GdalFormat& format,
                                                        datasources::IRasterSource& image,
                                                        SourceUse use);

/// The pixels of one level that are being written, and which of them are.
struct HfaBuild {
  std::unique_ptr<HfaUpdate> update;
  unsigned level = 0;
  std::vector<unsigned> channels;
  std::vector<GDALRasterBandH> bands;  ///< one for each of `channels`
  std::vector<bool> covered;           ///< one for each pixel of the level
  ByteRanges replaced;                 ///< where the pixels stand that these ones replace
  std::optional<HfaRecord> record;     ///< to be put over the level's before they do
  bool isClosed = false;               ///< stored or given up
  /// Of the level that it is computed from; none: it is computed from the image.
  std::optional<datasources::ImageRecord> source;
};

/// A level appears in the file when all of its pixels are on the disk, and is marked not valid at
/// first. One that is written anew stays what it was until then.
///
/// Operations may be called from several threads; one level is written at a time.
class HfaLevelStore final : public datasources::ILevelStore {
 public:
  /// \param path  of the file, links resolved
  HfaLevelStore(std::string path, const GdalFormat& format, datasources::IRasterSource& image,
                bool mayChange);
  ~HfaLevelStore() override;

  std::vector<datasources::LevelDescription> List() const override;
  void Create(unsigned level, const std::vector<unsigned>& channels,
              const std::string& method) override;
  std::unique_ptr<datasources::IRasterWriter> OpenWriter(
      unsigned level, const std::vector<unsigned>& channels) override;
  void SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) override;
  void KeepAnswers() override;
  datasources::LevelRoom RoomFor(const std::vector<unsigned>& levels,
                                 const std::vector<unsigned>& channels) const override;
  void Remove(const std::vector<unsigned>& levels) override;

  // For the level writers.

  const GdalFormat& Format() const { return format_; }
  /// Where the stored level stands in the lists of `channels`. \throws orin::Exception  it does not
  std::vector<int> PositionsOf(unsigned level, const std::vector<unsigned>& channels);
  /// Opens the file, and makes room for the pixels.
  std::shared_ptr<HfaBuild> BeginWriting(unsigned level, const std::vector<unsigned>& channels);
  /// Gives up what is not stored.
  void EndWriting(HfaBuild& build) noexcept;

 private:
  struct Pending {
    std::vector<bool> channels;
    std::string method;
  };

  [[noreturn]] void Fail(const char* format, unsigned level) const;
  void Reload();
  void LockFile();
  datasources::LevelDescription Describe(unsigned level, const std::string& fingerprint) const;
  uint64_t MostBytesOf(unsigned level, unsigned channel) const;
  uint64_t ExpectedBytesOf(unsigned level, unsigned channel) const;
  uint64_t TreeBytesOf(const std::vector<unsigned>& levels,
                       const std::vector<unsigned>& channels) const;
  datasources::LevelRoom RoomOf(const std::vector<unsigned>& levels,
                                const std::vector<unsigned>& channels) const;
  HfaRecord RecordToWrite(unsigned level, const std::vector<unsigned>& channels);
  void Record(unsigned level, const HfaRecord& record);
  std::optional<datasources::ImageRecord> SourceImage() const;
  void OpenBuild(HfaBuild& build, const std::vector<unsigned>& missing);
  void StoreBuild();
  void GiveBackSpace();
  void Shorten();

  std::optional<datasources::ImageStamp> Now() const;
  void Trust(const datasources::ImageStamp& now) const;
  std::string FingerprintNow() const;
  datasources::LevelStatus StatusOf(unsigned level, const std::string& fingerprint) const;
  void BeginChange();
  void Settle();
  void Restamp(const std::string& fingerprint, const datasources::ImageStamp& stamp) const;
  void RememberImage(HfaRecord& record) const;

  unsigned WidthOf(unsigned level, bool isOurs) const;
  unsigned HeightOf(unsigned level, bool isOurs) const;

  std::string path_;
  const GdalFormat& format_;
  datasources::IRasterSource& image_;
  bool mayChange_;
  std::unique_ptr<PositionedFile> lock_;  ///< holds the lock, from the first change on
  HfaPyramid pyramid_;
  std::map<unsigned, HfaRecord> records_;
  std::map<unsigned, Pending> pending_;
  std::shared_ptr<HfaBuild> build_;
  std::shared_ptr<datasources::ImageWatch> watch_;  ///< of the image; null when nothing can be told
  ByteRanges freed_;         ///< that levels had which were written anew since the store was opened
  bool isChanged_ = false;   ///< space may be given back
  bool isChanging_ = false;  ///< from the first write into the file to the last
  std::optional<datasources::ImageStamp> before_;  ///< of the image, when the changes began
  unsigned lastRead_ = 0;                          ///< level read since the last Create
  mutable std::mutex mutex_;
};

}  // namespace orin::drivers
