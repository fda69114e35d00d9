/// The driver's side of a raster: where its pixels come from and where its levels are kept.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/datatype.h"
#include "host/datasources/auxiliarydata.h"
#include "host/datasources/imagewatch.h"
#include "host/datasources/leveloptions.h"
#include "host/datasources/levelroom.h"
#include "host/datasources/overviewinfo.h"
#include "host/datasources/rasterreader.h"
#include "host/datasources/rasterwriter.h"
#include "host/datasources/sourceinputs.h"
#include "host/datasources/validity.h"

namespace orin::datasources {

/// The levels of one raster in one place. Channels are 1-based numbers of the raster.
class ILevelStore {
 public:
  virtual ~ILevelStore() = default;

  /// What is stored (created levels included), ascending by factor; one entry a factor.
  virtual std::vector<LevelDescription> List() const = 0;

  /// Makes `level` (width / level by height / level pixels) exist for `channels`; a level that
  /// exists is kept, one that another program made is replaced.
  /// \param method  recorded with the level: "NEAREST" ...
  /// \throws orin::Exception  it cannot be made; the text names the file
  virtual void Create(unsigned level, const std::vector<unsigned>& channels,
                      const std::string& method) = 0;

  /// Reader and writer of an existing level's `channels`. The returned object must not outlive the
  /// store.
  /// \throws orin::Exception  no such level, or it cannot be opened
  virtual std::unique_ptr<IRasterWriter> OpenWriter(unsigned level,
                                                    const std::vector<unsigned>& channels) = 0;

  /// Marks `channels` of `level`. For true, everything written before is made durable first.
  /// \throws orin::Exception  no such level, its pixels are not complete, or it cannot be stored
  virtual void SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) = 0;

  /// The level created last is computed from `source`, a level that another store keeps. Without
  /// this call it is the level of this store whose pixels are read, or else the image.
  virtual void SetSource(const LevelDescription& /*source*/) {}

  /// Levels that `List` leaves out and other programs may read: those inside the file that stand
  /// beside it, too; those that share a factor with another one; those that cannot be managed.
  virtual std::vector<LevelDescription> ListHidden() const { return {}; }

  /// Where `List` had to read the image or a level to tell what is up to date, keeps the answer
  /// with the levels, if their file may be written, so that the next one comes at once. Never
  /// fails.
  virtual void KeepAnswers() {}

  /// How levels are stored from now on; a format that leaves no choice takes no notice.
  virtual void SetOptions(const LevelOptions& /*options*/) {}

  /// The levels whose stored form is not what the options say; none where these say nothing.
  /// \throws orin::OptionException  an option does not fit the raster
  virtual std::vector<unsigned> StoredOtherwise() const { return {}; }

  /// What it takes to make all of `levels` for `channels`, the ones that exist anew; those larger
  /// than the image are left out. `Create` checks the same for its own level.
  /// \throws orin::Exception  an option in force does not fit the raster
  virtual LevelRoom RoomFor(const std::vector<unsigned>& /*levels*/,
                            const std::vector<unsigned>& /*channels*/) const {
    return {};
  }

  /// Whether the levels' file holds free space of this program that is worth to be given back: a
  /// run that was killed left it.
  /// \throws orin::Exception  the file cannot be read
  virtual bool HasReclaimableSpace() const { return false; }

  /// Removes the levels named, those of other programs too, as far as there are such; their masks
  /// go with them, the image's pixels stay. None of them is being written. Free space is given back
  /// when the store goes, and also where there is no such level.
  /// \throws orin::Exception  they cannot be removed; the text names the file
  virtual void Remove(const std::vector<unsigned>& levels) = 0;
};

/// One opened raster as its driver sees it.
class IRasterSource {
 public:
  virtual ~IRasterSource() = default;

  virtual unsigned Width() const = 0;
  virtual unsigned Height() const = 0;
  virtual unsigned ChannelCount() const = 0;
  /// \param channel  1-based
  virtual gobs::DataType TypeOf(unsigned channel) const = 0;
  /// Bits that the file keeps of a sample of this channel, 1-based: 12 of a type of 16, say. Levels
  /// hold nothing that takes more.
  virtual unsigned StoredBitsOf(unsigned channel) const { return TypeOf(channel).bits; }
  /// Metadata of the file and of `channels`, in their order; no-data texts as they were declared.
  virtual AuxiliaryData MetadataOf(const std::vector<unsigned>& channels) const = 0;
  /// True when pixels number entries of a palette or named classes: a mean of two numbers means
  /// something else altogether.
  virtual bool HoldsClasses() const { return false; }

  /// True when the file is laid out for readers on a network, which levels added inside would end.
  virtual bool IsCloudOptimized() const { return false; }

  /// A reader of full-resolution pixels on a handle of its own; it must not outlive the source.
  /// \throws orin::Exception  the channels differ in type, or the file cannot be read
  virtual std::unique_ptr<IRasterReader> OpenReader(const std::vector<unsigned>& channels) = 0;

  /// The 1-based number of the channel that holds opacity, 0 when none does.
  virtual unsigned AlphaChannel() const { return 0; }
  /// Whether a mask inside the file or beside it says which pixels hold data.
  virtual bool HasMask() const { return false; }
  /// A reader of that mask at full resolution on a handle of its own, null when there is none.
  /// \throws orin::Exception  it cannot be read
  virtual std::unique_ptr<IValidityReader> OpenMask() { return nullptr; }
  /// Whether the blocks of its readers carry the validity that mask and alpha channel give.
  virtual bool DeliversValidity() const { return false; }

  /// The levels kept with this raster, or null when its format holds none. Owned by the source.
  virtual ILevelStore* Levels() = 0;

  /// What a run is told beside pixels, as the record of a level keeps it.
  virtual model::LevelInputs Inputs() const { return InputsOf(*this); }

  /// Knows whether the image's data is what it was. Null: the bytes of its file tell.
  virtual std::shared_ptr<ImageWatch> Watch() { return nullptr; }
};

}  // namespace orin::datasources
