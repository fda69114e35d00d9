/// The levels of one raster in a TIFF file: inside the image's own file, or in a side-car.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "host/datasources/levelstore.h"
#include "host/drivers/tiff/levelbuild.h"
#include "host/drivers/tiff/levelcoding.h"
#include "host/drivers/tiff/leveldirectories.h"
#include "host/drivers/tiff/levelfile.h"
#include "host/drivers/tiff/levelfreshness.h"
#include "host/drivers/tiff/levelmask.h"
#include "host/drivers/tiff/pixelreader.h"
#include "host/drivers/tiff/storedsize.h"

namespace orin::drivers {

/// The levels inside the TIFF file of an image.
/// \param image   format of the file's first directory
/// \param update  levels may be made and changed
/// \param watch   of the image
/// \param inputs  what a run is told of it
/// \throws orin::Exception  the file's structure cannot be read
std::unique_ptr<datasources::ILevelStore> OpenInternalLevels(
    const std::string& file, const PixelFormat& image, bool update,
    std::shared_ptr<datasources::ImageWatch> watch, model::LevelInputs inputs,
    ImageValidity validity = {});

/// A level appears in the file when it is complete: tiles first, then its directory, then the link
/// to it, then its validity, each durable before the next. Until then it is pending here; a pending
/// level that is given up leaves nothing behind. The channels of a level of planes, new or
/// rebuilt, appear together with their mask: finished ones wait for the others, as long as the
/// level is the one being made.
///
/// Operations may be called from several threads.
class TiffLevelStore final : public datasources::ILevelStore {
 public:
  struct Settings {
    ImageShape image;
    LevelCoding coding;  ///< of the image, from which new levels take theirs
    datasources::LevelPlace place = datasources::LevelPlace::kInternal;
    ImageValidity validity;
    unsigned usualSource = 0;  ///< recorded as a level's source when no level was read for it
    std::shared_ptr<datasources::ImageWatch> watch;  ///< of the image
    model::LevelInputs inputs;                       ///< what a run is told of the image
  };
  /// \throws orin::Exception  the file cannot be read
  TiffLevelStore(std::unique_ptr<LevelFile> file, Settings settings);
  /// Gives back the space of levels that were replaced, and inside an image that was opened to be
  /// changed also what a run that was killed left.
  ~TiffLevelStore() override;

  std::vector<datasources::LevelDescription> List() const override;
  std::vector<datasources::LevelDescription> ListHidden() const override;
  void Create(unsigned level, const std::vector<unsigned>& channels,
              const std::string& method) override;
  std::unique_ptr<datasources::IRasterWriter> OpenWriter(
      unsigned level, const std::vector<unsigned>& channels) override;
  void SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) override;
  void SetSource(const datasources::LevelDescription& source) override;
  void KeepAnswers() override;
  void SetOptions(const datasources::LevelOptions& options) override;
  std::vector<unsigned> StoredOtherwise() const override;
  datasources::LevelRoom RoomFor(const std::vector<unsigned>& levels,
                                 const std::vector<unsigned>& channels) const override;
  bool HasReclaimableSpace() const override;
  void Remove(const std::vector<unsigned>& levels) override;

  // For the level writers.

  /// A reader of a level that is in the file. \throws orin::Exception  it is not
  std::unique_ptr<PixelReader> OpenPixels(unsigned level, const std::vector<unsigned>& channels);
  /// A reader of the level's tiles, or null when they do not exist yet.
  std::unique_ptr<PixelReader> OpenStoredTiles(unsigned level);
  /// Marks the channels as not valid and joins or starts the level's build.
  /// \throws orin::Exception  the level was not created for them
  std::shared_ptr<LevelBuild> BeginWriting(unsigned level, const std::vector<unsigned>& channels);
  /// Adds a tile to the file. \returns where it is
  TilePlace AppendTile(const std::vector<uint8_t>& bytes);
  /// The bytes of a tile that was added.
  std::vector<uint8_t> ReadAppended(TilePlace place) const;
  /// A writer of the mask of a level that is being written; null when levels get none, or the build
  /// has one already.
  std::unique_ptr<LevelMaskWriter> BeginMask(unsigned level, const std::vector<unsigned>& channels,
                                             LevelBuild& build);
  /// What says which pixels of a level in the file hold data.
  LevelValidity OpenValidity(unsigned level, const std::vector<unsigned>& channels);
  /// 1-based, 0 when no channel of the image holds opacity.
  unsigned AlphaChannel() const { return settings_.validity.alphaChannel; }
  /// A writer leaves: when it is the last one, complete planes are stored, not valid; else all that
  /// was written is given up.
  void EndWriting(unsigned level, LevelBuild& build) noexcept;

 private:
  /// What a level is computed from.
  struct LevelSource {
    unsigned level = 0;        ///< whose pixels were read since the last Create; 0 none
    std::string bytes;         ///< digest of what it stores; empty when unknown
    model::ImageRecord image;  ///< that it was computed from; blank where it is unknown
    bool isLevel = false;      ///< false: the image itself is, as far as is known
  };

  struct Pending {
    std::vector<bool> channels;  ///< created
    std::string method;
    LevelCoding coding;
    bool isRecoded = false;             ///< stored tiles have another form and are given up
    std::shared_ptr<LevelBuild> build;  ///< null until the first write
    std::optional<LevelFreshness::Start> start;  ///< of its computation
    std::vector<unsigned> together;              ///< channels of one pass, when it treats several
    std::vector<unsigned> waiting;  ///< channels that are finished and wait for the others
    LevelSource waitingSource;      ///< what these were computed from
    std::unique_ptr<LevelBuild> waitingMask;  ///< of these; null when they have none
  };

  bool BlursAlpha(const PixelFormat& level) const;
  bool GetsMask(const PixelFormat& level) const;
  uint64_t MostBytesWithMask(const LevelCoding& level, uint32_t planes, bool isBig) const;
  bool BecomesBig(const LevelCoding& level) const;
  const StoredLevel* Find(unsigned level) const;
  const StoredLevel* FindOurs(unsigned level) const;
  void Reload();
  void CatchUp();
  bool PrepareToReclaim();
  datasources::LevelDescription Describe(const StoredLevel& stored,
                                         const model::Freshness& freshness) const;
  void AddPending(unsigned level, const Pending& pending,
                  std::vector<datasources::LevelDescription>& list) const;
  LevelCoding CodingOfStored(const StoredLevel& stored) const;
  Pending PendingFor(unsigned level) const;
  datasources::LevelRoom RoomOf(const std::vector<unsigned>& levels,
                                const std::vector<unsigned>& channels) const;
  void ExplainLimit(datasources::LevelRoom& room) const;
  void RequireRoomFor(unsigned level, const std::vector<unsigned>& channels);
  Pending& Reopen(unsigned level, const std::vector<unsigned>& channels);
  void Mark(const StoredLevel& stored, const std::vector<unsigned>& channels, char validity);

  model::ImageRecord RecordOrGiveUp(unsigned level, const Pending& pending);
  void NoteSource(const StoredLevel& stored, const std::vector<unsigned>& channels);
  void RequireSource(unsigned level);
  void RequireSourceLevel() const;
  void RecordContent(unsigned level);
  bool IsWhole(const StoredLevel& stored);
  void EndChange();
  void KeepStamps(const LevelFreshness::Answers& answers) const;

  model::LevelRecord RecordFor(unsigned level, const Pending& pending, const StoredLevel* before,
                               const LevelSource& source);
  char ValidityOfOthers(const StoredLevel& before, const model::LevelRecord& now);
  std::vector<uint32_t> PlanesOf(const LevelCoding& coding,
                                 const std::vector<unsigned>& channels) const;
  std::vector<uint32_t> CompletePlanes(const LevelBuild& build) const;
  void RequireStored(const StoredLevel* stored, unsigned level,
                     const std::vector<unsigned>& channels) const;
  bool Waits(Pending& pending, const std::vector<unsigned>& channels,
             const LevelSource& source) const;
  bool WouldMix(unsigned level, const Pending& pending) const;
  bool AnyWaits(unsigned level, const std::vector<unsigned>& channels) const;
  void StoreWaiting(unsigned level);
  void StoreAllWaitingBut(unsigned level);
  void StoreFinished(unsigned level, Pending& pending, const std::vector<unsigned>& channels,
                     const LevelSource& source);
  void MarkStored(unsigned level, const std::vector<unsigned>& channels, bool valid);
  void Store(unsigned level, Pending& pending, const std::vector<uint32_t>& planes,
             std::unique_ptr<LevelBuild> mask, const std::optional<LevelSource>& source);
  Place NewPlace(const PixelFormat& format) const;
  void AddDirectory(const Pending& pending, const model::LevelRecord& record,
                    const std::vector<uint32_t>& planes, const LevelBuild* mask);
  StoredMask MaskBefore(unsigned level, const LevelBuild& mask);
  void TidyMasks(std::optional<uint64_t> strayMask);
  std::vector<size_t> DirectoriesOf(const std::vector<unsigned>& levels) const;
  void RemoveStored(const std::vector<unsigned>& levels);
  void Unlink(const std::vector<size_t>& indices);
  void GiveUp(unsigned level, LevelBuild& build);
  [[noreturn]] void Fail(const char* format, unsigned level, const char* operation) const;

  mutable std::mutex mutex_;
  std::unique_ptr<LevelFile> file_;
  Settings settings_;
  datasources::LevelOptions options_;
  mutable LevelFreshness freshness_;
  mutable std::optional<model::ImageStamp> kept_;  ///< of the last answer that was kept
  std::optional<Catalogue> catalogue_;  ///< of the structure that `levels_` were found in
  std::vector<StoredLevel> levels_;
  std::map<unsigned, Pending> pending_;
  std::map<unsigned, std::vector<unsigned>> maskedChannels_;  ///< whose passes a mask has joined
  LevelSource source_;                                        ///< of the level created last
};

}  // namespace orin::drivers
