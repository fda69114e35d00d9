/// The levels of some channels of a raster: what is there, and making more.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "host/datasources/levelstore.h"

namespace orin::datasources {

/// Forwards to the level store of the dataset's driver. The dataset outlives it.
class BasicOverviewReaderAccessor {
 public:
  /// \param channels  1-based numbers of the raster
  BasicOverviewReaderAccessor(IRasterDataset* dataset, const std::vector<unsigned>& channels);

  /// Levels present for these channels, ascending.
  std::vector<unsigned> GetLevels() const;
  /// True when the level is present and up to date for all of these channels.
  bool IsLevelValid(unsigned level) const;

 private:
  ILevelStore* store_;
  std::vector<unsigned> channels_;
};

/// Forwards to the level store of the dataset's driver. The dataset outlives it.
class BasicOverviewWriterAccessor {
 public:
  /// \param channels  1-based numbers of the raster
  BasicOverviewWriterAccessor(IRasterDataset* dataset, const std::vector<unsigned>& channels);

  /// Records the method with the levels that this accessor creates: "NEAREST" ...
  void SetResamplingName(const std::string& name) { method_ = name; }
  /// Makes `level` exist for the channels; a level that exists is kept.
  /// \throws orin::Exception  the format holds no levels, or the level cannot be made
  void CreateLevel(unsigned level);
  /// A new writer of an existing level, owned by the caller; where the run fills with what readers
  /// answered, the level stores the declared no-data value. \throws orin::Exception
  IRasterWriter* CreateRasterWriter(unsigned level);
  /// Levels present for these channels, ascending, but for those that are out of date: a level may
  /// be computed from any of these.
  std::vector<unsigned> GetLevels() const;
  /// \param channel  1-based within this accessor's channels
  /// \throws orin::Exception  no such channel or level, or it cannot be stored
  void SetValid(unsigned channel, unsigned level, bool valid);
  /// `SetValid` of all of this accessor's channels at once.
  void SetLevelValid(unsigned level, bool valid);

 private:
  ILevelStore& Store() const;

  ILevelStore* store_;
  const NoDataAnswers& noData_;
  std::vector<unsigned> channels_;
  std::string file_;
  std::string method_;
};

}  // namespace orin::datasources
