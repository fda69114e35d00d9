/// Between the fill of a run and what a level stores in its place.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "basic/gobs/datatype.h"
#include "basic/gobs/raster.h"
#include "host/datasources/rasterwriter.h"
#include "host/model/nodata.h"

namespace orin::datasources {

/// The no-data values of one pass over some channels.
struct NoDataOfPass {
  std::optional<model::NoData> answered;               ///< what the run was told to fill with
  std::optional<model::NoData> fill;                   ///< the declared value that this stands for
  std::vector<std::optional<model::NoData>> declared;  ///< one for each of the pass's channels
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
std::shared_ptr<const INoDataFill> MakeNoDataFill(const NoDataOfPass& pass,
                                                  const gobs::DataType& type);

/// `level` with its blocks changed by `fill` on their way in and out.
std::unique_ptr<IRasterWriter> WithNoDataFill(std::unique_ptr<IRasterWriter> level,
                                              std::shared_ptr<const INoDataFill> fill);

}  // namespace orin::datasources
