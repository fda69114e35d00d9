/// The state that every resampler holds, and its plain setters.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/outofmemory.h"
#include "processes/qrtfilters/resamplers/rasterresampler.h"

namespace orin::resamplers {

/// How destination pixels map to the source, and what fills those without a valid source.
struct ResamplerState {
  bool ratioGiven = false;
  bool georeferenced = false;  ///< once set, never reset
  double ratioX = 0;           ///< destination size / source size
  double ratioY = 0;
  double noDataValue = 0;
  double srcOriginX = 0;  ///< ground units, as all that follow
  double srcOriginY = 0;
  double srcPixelSizeX = 1.0;
  double srcPixelSizeY = 1.0;
  double dstOriginX = 0;
  double dstOriginY = 0;
  double dstPixelSizeX = 1.0;
  double dstPixelSizeY = 1.0;
  bool isComplex = false;
};

/// Base of the kernels: everything of the interface but `Resample` and `GetMargin`.
class Resampler : public IRasterResampler, public ThrowsOutOfMemory {
 public:
  void SetRatio(double ratioX, double ratioY) override {
    state_.ratioX = ratioX;
    state_.ratioY = ratioY;
    state_.ratioGiven = true;
  }
  void SetComplex(bool isComplex) override { state_.isComplex = isComplex; }
  void SetGeoReference(double srcOriginX, double srcOriginY, double srcPixelSizeX,
                       double srcPixelSizeY, double dstOriginX, double dstOriginY,
                       double dstPixelSizeX, double dstPixelSizeY) override {
    state_.srcOriginX = srcOriginX;
    state_.srcOriginY = srcOriginY;
    state_.srcPixelSizeX = srcPixelSizeX;
    state_.srcPixelSizeY = srcPixelSizeY;
    state_.dstOriginX = dstOriginX;
    state_.dstOriginY = dstOriginY;
    state_.dstPixelSizeX = dstPixelSizeX;
    state_.dstPixelSizeY = dstPixelSizeY;
    state_.georeferenced = true;
  }
  void ClearRatio() override { state_.ratioGiven = false; }
  void SetNoDataValue(double value) override { state_.noDataValue = value; }

  const ResamplerState& State() const { return state_; }

 protected:
  ResamplerState state_;
};

}  // namespace orin::resamplers
