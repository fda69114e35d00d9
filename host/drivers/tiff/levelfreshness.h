/// How the levels of a TIFF file stand to the image that they were computed from.
// SPDX-License-Identifier: MIT
//
// Levels beside an image: nobody but other programs writes to the image. What was read between two
// equal stamps, the first of them settled, is the data that the fingerprint is of.
//
// Levels inside it: every write of ours changes what the file shows, and hides a write of another
// program in the same tick of the clock. So the fingerprint is complete before our first write, and
// is computed again after our last one:
//
//   stamp -- pixels are read -- our writes ......... stamps into the file, its time set -- verified
//   |<- fingerprint, stamp as before ->|             |<- the image is read again, and so are the  |
//                                                    |   levels; the time must still be that ---->|
//
// A difference at the end takes the stamps back, and the next question reads.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/datasources/imagewatch.h"
#include "host/drivers/tiff/levelcontents.h"
#include "host/drivers/tiff/levelfile.h"
#include "host/model/freshness.h"

namespace orin::drivers {

class LevelFreshness {
 public:
  /// \param isInImage  the levels stand in the image's own file
  /// \param inputs     what a run is told of the image
  LevelFreshness(std::shared_ptr<datasources::ImageWatch> watch, bool isInImage,
                 model::LevelInputs inputs);

  bool IsInImage() const { return isInImage_; }
  const model::LevelInputs& Inputs() const { return inputs_; }

  struct Answers {
    std::vector<model::Freshness> levels;  ///< one a level
    bool areStampsOld = false;             ///< of some level that is current
    std::optional<model::ImageStamp> now;
  };
  Answers CheckFreshness(const LevelFile& file, const std::vector<StoredLevel>& levels);
  /// Digest of what a level stores: as known, else read.
  std::string BytesOf(const LevelFile& file, const StoredLevel& level);
  /// The content of a level that was linked just now; its holder's stamp is blank.
  model::ContentRecord ContentOf(const LevelFile& file, const StoredLevel& level);

  /// The first change to the file that holds `levels` comes next.
  void BeginChange(const LevelFile& file, const std::vector<StoredLevel>& levels);
  bool IsChanging() const { return isChanging_; }
  /// Somebody else may have changed the image since the changes began: what it was tells nothing.
  void Doubt() { before_.reset(); }
  /// All is written but stamps.
  void EndChange(const LevelFile& file);

  /// When the computation of a level from the image began.
  struct Start {
    model::ImageStamp stamp;
    bool isKnown = false;  ///< what the image held then
  };
  /// Begins to compute the fingerprint in the background, unless it is known. None: nothing can be
  /// told of the image.
  /// \throws orin::Exception  the image has changed since this object was made
  std::optional<Start> Begin(const std::vector<StoredLevel>& levels);
  /// Comes before the first write of a level that is computed from the image in its own file. Waits
  /// for the fingerprint.
  /// \throws orin::Exception  the image has changed since `start`
  void RequireUnchanged(const std::optional<Start>& start);
  /// What a level that was computed from the image records; blank when nothing can be told.
  /// \param wasTouched  somebody else may have written to the image's file since then, while levels
  ///                    were written into it
  /// \throws orin::Exception  another program has changed the image since `start`
  model::ImageRecord RecordSince(const std::optional<Start>& start, bool wasTouched);

  /// Lets levels that are what they should be say how image and file look from now on. Reads them,
  /// and an image in the same file, to be sure. The last change of all to `file`.
  /// \param modified  the time that the file gets; none: now
  void CommitStamps(PositionedFile& file, const TiffStructure& structure,
                    const std::vector<StoredLevel>& levels, std::optional<int64_t> modified);

 private:
  std::optional<model::ImageStamp> Now() const;
  std::optional<model::FileStamp> HolderNow(const std::string& file) const;
  void Trust(const std::vector<StoredLevel>& levels);
  std::string KnownFingerprint() const;
  std::string FingerprintOf(const model::ImageStamp& now);
  [[noreturn]] void FailAsChanged(const char* operation) const;

  std::shared_ptr<datasources::ImageWatch> watch_;
  bool isInImage_;
  model::LevelInputs inputs_;
  LevelContents contents_;
  std::optional<model::ImageStamp> opened_;  ///< when this object was made
  bool hasChanged_ = false;                  ///< the file, by this object's owner
  bool isChanging_ = false;
  std::optional<model::ImageStamp> before_;       ///< of the image, when the changes began
  std::optional<model::FileStamp> holderBefore_;  ///< of the levels' file, when the changes began
  std::optional<model::ImageStamp> proven_;  ///< settled, and the fingerprint is of the data then
};

}  // namespace orin::drivers
