/// The levels inside an ERDAS Imagine file.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "host/datasources/levelstore.h"
#include "host/drivers/common/byteranges.h"
#include "host/drivers/common/positionedfile.h"
#include "host/drivers/gdal/gdalformats.h"
#include "host/drivers/gdal/sourceuse.h"
#include "host/drivers/hfa/hfacatalogue.h"
#include "host/drivers/hfa/hfafreshness.h"
#include "host/drivers/hfa/hfalevelbuild.h"
#include "host/drivers/hfa/hfaview.h"

namespace orin::drivers {

/// The levels inside `name`, or null when it holds none that are its own and cannot take any.
/// \param image  its full resolution; outlives the store
/// \throws orin::Exception  the file cannot be read, or it cannot be used so
std::unique_ptr<datasources::ILevelStore> OpenHfaLevels(const std::string& name,
                                                        const GdalFormat& format,
                                                        datasources::IRasterSource& image,
                                                        SourceUse use);

/// Where the library finds the pixels of a level.
struct HfaLevelPixels {
  std::shared_ptr<HfaView> view;  ///< that shows channels which wait; null when none does
  std::string name;               ///< to open
  std::vector<int> positions;     ///< of the level in the lists of the channels
};

/// A level appears in the file when all of its channels are finished and on the disk; one that is
/// written anew stays what it was until then.
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
  /// \throws orin::Exception  a channel's level is neither stored nor finished
  HfaLevelPixels PixelsOf(unsigned level, const std::vector<unsigned>& channels);
  /// Opens the file, and makes room for the pixels.
  std::shared_ptr<HfaLevelBuild> BeginWriting(unsigned level,
                                              const std::vector<unsigned>& channels);
  /// Gives up what is not stored.
  void EndWriting(HfaLevelBuild& build) noexcept;

 private:
  /// A level that was created, and is not in the file yet.
  struct Created {
    std::vector<bool> channels;
    std::string method;
  };

  [[noreturn]] void Fail(const char* format, unsigned level) const;
  void LockFile();
  void Reload();
  datasources::LevelDescription Describe(unsigned level, const std::string& fingerprint) const;
  bool IsFinished(unsigned level) const;
  void RequireOwnSize(unsigned level) const;
  HfaRecord RecordOfBuild() const;
  void StoreBuild(const std::vector<unsigned>& validChannels);
  void Mark(unsigned level, const std::vector<unsigned>& channels, bool valid);
  void ReclaimSpace();
  void CommitStamps();

  std::string path_;
  const GdalFormat& format_;
  datasources::IRasterSource& image_;
  bool mayChange_;
  std::unique_ptr<PositionedFile> file_;  ///< locked, from the first change on
  HfaFreshness freshness_;
  HfaCatalogue catalogue_;
  std::map<unsigned, Created> created_;
  std::shared_ptr<HfaLevelBuild> build_;
  ByteRanges freed_;        ///< used when the store was opened, and no more
  bool isChanged_ = false;  ///< space may be given back
  unsigned lastRead_ = 0;   ///< level read since the last Create
  mutable std::mutex mutex_;
};

}  // namespace orin::drivers
