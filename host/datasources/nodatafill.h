/// Between the fill of a run and what a level stores in its place.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "basic/gobs/datatype.h"
#include "basic/gobs/raster.h"
#include "host/datasources/rasterwriter.h"

namespace orin::datasources {

/// The texts of one pass over some channels.
struct NoDataTexts {
  std::string answered;               ///< what the run was told to fill with: a decimal number
  std::string fill;                   ///< the declared value that this stands for
  std::vector<std::string> declared;  ///< one for each of the pass's channels
};

/// Changes the pixels without data of a level's blocks.
class INoDataFill {
 public:
  virtual ~INoDataFill() = default;
  /// A copy of the useful area of `block` with the declared value where the run filled with another
  /// one; null when there is no such pixel.
  virtual std::unique_ptr<gobs::Raster> ToStore(const gobs::Raster& block) const = 0;
  /// Gives each channel its own declared value where a level holds the fill, margins included, so
  /// that the mask's decision, which goes by the declared values, knows these pixels again.
  virtual void Recognise(gobs::Raster& block) const = 0;
};

/// Null when the level can store what the run writes, and the decision knows it: mostly.
std::shared_ptr<const INoDataFill> MakeNoDataFill(const NoDataTexts& texts,
                                                  const gobs::DataType& type);

/// `level` with its blocks changed by `fill` on their way in and out.
std::unique_ptr<IRasterWriter> WithNoDataFill(std::unique_ptr<IRasterWriter> level,
                                              std::shared_ptr<const INoDataFill> fill);

}  // namespace orin::datasources
