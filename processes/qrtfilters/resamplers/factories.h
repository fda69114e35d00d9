/// The five methods' factories. Stateless.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/resamplerfactory.h"

namespace orin::resamplers {

class NearestNeighbourResamplerFactory final : public IResamplerFactory {
 public:
  IRasterResampler* CreateResampler(const gobs::DataType& type) override;
  uint32_t GetMargin() override { return 0; }
};

class AverageResamplerFactory final : public IResamplerFactory {
 public:
  IRasterResampler* CreateResampler(const gobs::DataType& type) override;
  uint32_t GetMargin() override { return 1; }
};

class ModeResamplerFactory final : public IResamplerFactory {
 public:
  IRasterResampler* CreateResampler(const gobs::DataType& type) override;
  uint32_t GetMargin() override { return 1; }
};

class BilinearResamplerFactory final : public IResamplerFactory {
 public:
  IRasterResampler* CreateResampler(const gobs::DataType& type) override;
  uint32_t GetMargin() override { return 1; }
};

class BicubicResamplerFactory final : public IResamplerFactory {
 public:
  IRasterResampler* CreateResampler(const gobs::DataType& type) override;
  uint32_t GetMargin() override { return 3; }
};

}  // namespace orin::resamplers
