/// The driver's side of a raster: where its pixels come from and where its levels are kept.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/datatype.h"
#include "host/datasources/auxiliarydata.h"
#include "host/datasources/overviewinfo.h"
#include "host/datasources/rasterreader.h"
#include "host/datasources/rasterwriter.h"

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

  /// A reader of full-resolution pixels on a handle of its own; it must not outlive the source.
  /// \throws orin::Exception  the channels differ in type, or the file cannot be read
  virtual std::unique_ptr<IRasterReader> OpenReader(const std::vector<unsigned>& channels) = 0;

  /// The levels kept with this raster, or null when its format holds none. Owned by the source.
  virtual ILevelStore* Levels() = 0;
};

}  // namespace orin::datasources
