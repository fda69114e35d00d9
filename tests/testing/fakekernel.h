/// A resampling method for tests: logs how it is used, and takes one source pixel for each output
/// pixel.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstring>
#include <functional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "host/services/text.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"
#include "processes/qrtfilters/resamplers/resamplerstate.h"

namespace orin::testing {

class FakeKernelFactory;

/// Copies the pixel at the truncated quotient of position and ratio.
class FakeKernel final : public resamplers::Resampler {
 public:
  explicit FakeKernel(FakeKernelFactory& factory);
  ~FakeKernel() override;
  void Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) override;
  uint32_t GetMargin() override { return 0; }
  void SetRatio(double ratioX, double ratioY) override;
  void SetNoDataValue(double value) override;
  void SetComplex(bool isComplex) override;

 private:
  FakeKernelFactory& factory_;
};

/// Outlives whoever uses its kernels; releases those that nobody released.
class FakeKernelFactory final : public resamplers::IResamplerFactory {
 public:
  using Hook =
      std::function<void(const gobs::Raster& src, const gobs::Mask* mask, const gobs::Raster& dst)>;

  ~FakeKernelFactory() override {
    while (!alive.empty()) delete *alive.begin();
  }
  IRasterResampler* CreateResampler(const gobs::DataType& type) override {
    calls.push_back(FormatString("Create(%u)", type.bits));
    return makesKernels ? new FakeKernel(*this) : nullptr;
  }
  uint32_t GetMargin() override { return 0; }

  bool makesKernels = true;        ///< false: answers null
  Hook before;                     ///< called at the start of each `Resample`; may throw
  std::vector<std::string> calls;  ///< "Create(8)", "SetRatio(0.5,0.5)", "Resample(no mask)" ...
  std::set<FakeKernel*> alive;
};

inline FakeKernel::FakeKernel(FakeKernelFactory& factory) : factory_(factory) {
  factory_.alive.insert(this);
}
inline FakeKernel::~FakeKernel() { factory_.alive.erase(this); }

inline void FakeKernel::SetRatio(double ratioX, double ratioY) {
  factory_.calls.push_back(FormatString("SetRatio(%g,%g)", ratioX, ratioY));
  Resampler::SetRatio(ratioX, ratioY);
}
inline void FakeKernel::SetNoDataValue(double value) {
  factory_.calls.push_back(FormatString("SetNoDataValue(%g)", value));
  Resampler::SetNoDataValue(value);
}
inline void FakeKernel::SetComplex(bool isComplex) {
  factory_.calls.push_back(isComplex ? "SetComplex(true)" : "SetComplex(false)");
  Resampler::SetComplex(isComplex);
}

inline void FakeKernel::Resample(gobs::Raster* src, gobs::Mask* srcMask, gobs::Raster* dst) {
  factory_.calls.push_back(srcMask ? "Resample(mask)" : "Resample(no mask)");
  if (factory_.before) factory_.before(*src, srcMask, *dst);
  for (uint32_t y = 0; y < dst->height; ++y)
    for (uint32_t x = 0; x < dst->width; ++x)
      std::memcpy(PixelAddress(*dst, x, y),
                  PixelAddress(*src, static_cast<int64_t>(x / state_.ratioX),
                               static_cast<int64_t>(y / state_.ratioY)),
                  PixelBytes(*dst));
}

}  // namespace orin::testing
