/// One pass over one level: read from the best source, resample, write, mark valid.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>
#include <vector>

#include "host/datasources/dataset.h"
#include "processes/qrtfilters/resamplers/parallelio/tarnupdatestrategy.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"

namespace orin::overviews {

struct PassRequest {
  datasources::IRasterDataset* raster;     ///< outlives the pass
  unsigned level;                          ///< not larger than the image
  std::vector<unsigned> channels;          ///< 1-based
  resamplers::IResamplerFactory* factory;  ///< null for a method that does not exist
  std::string methodName;                  ///< recorded with the level
  bool onlyFromDivisors;                   ///< the source level must divide the level
  bool marksWholeLevel;                    ///< validity is told for all channels at once
};

/// Where the reports of a pass go, and which part of the whole they are.
struct PassReports {
  float start = 0.0f;
  float end = 1.0f;
  parallelio::TARNUpdateStrategy::Callback callback = nullptr;  ///< null: the host's counter
  void* userData = nullptr;
};

struct PassResult {
  bool isComplete = false;   ///< all blocks are written, and the level is marked valid
  bool isCancelled = false;  ///< a report was refused; possibly after the last block
  unsigned sourceLevel = 1;  ///< 1: the image
};

/// \throws orin::Exception  what the host or the method throws
PassResult BuildPass(const PassRequest& request, const PassReports& reports);

}  // namespace orin::overviews
