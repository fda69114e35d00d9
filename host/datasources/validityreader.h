/// A reader whose blocks carry the validity that a raster's masks and alpha channel give.
// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <memory>

#include "host/datasources/rasterreader.h"
#include "host/datasources/validity.h"

namespace orin::datasources {

/// What says which pixels of an image hold data.
struct ValidityParts {
  std::unique_ptr<IValidityReader> mask;  ///< null: none
  unsigned alphaChannel = 0;              ///< 1-based, 0: none
  /// Opens the alpha channel alone; called when it is not among the reader's channels.
  std::function<std::unique_ptr<IRasterReader>()> openAlpha;
};

/// `pixels` itself when there is neither mask nor alpha. Otherwise a reader that declares the fill
/// 0 where its file declares no no-data value, so that runs mask its pixels.
/// \param pixels  full resolution
std::unique_ptr<IRasterReader> WithValidity(std::unique_ptr<IRasterReader> pixels,
                                            ValidityParts parts);

}  // namespace orin::datasources
