/// The block driver as a run composes it: processing, access and progress.
// SPDX-License-Identifier: MIT
#pragma once

#include "processes/qrtfilters/resamplers/parallelio/defaultprocesspolicy.h"
#include "processes/qrtfilters/resamplers/parallelio/iodriver.h"
#include "processes/qrtfilters/resamplers/parallelio/resampleraccesspolicy.h"
#include "processes/qrtfilters/resamplers/parallelio/tarnupdatestrategy.h"
#include "processes/qrtfilters/resamplers/resamplermanager.h"

namespace orin::parallelio {

template <class Processing, class Access, class Update>
class FilterIODriver
    : public IODriver<Processing, Access, DefaultProcessPolicy<Processing, Access, Update>> {
  using Driver = IODriver<Processing, Access, DefaultProcessPolicy<Processing, Access, Update>>;

 public:
  ~FilterIODriver() override = default;
  void ComputeBlocks(std::vector<BlockJob>& blocks, datasources::IRasterReader* reader,
                     datasources::IRasterWriter* writer) override {
    Driver::ComputeBlocks(blocks, reader, writer);
  }
};

/// What builds one level.
using LevelDriver =
    FilterIODriver<resamplers::ResamplerManager, ResamplerAccessPolicy, TARNUpdateStrategy>;

}  // namespace orin::parallelio
