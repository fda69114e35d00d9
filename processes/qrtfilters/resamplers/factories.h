/// The factories of the methods, by name and by the table of methods. Stateless.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "host/model/methods.h"
#include "processes/qrtfilters/resamplers/average.h"
#include "processes/qrtfilters/resamplers/bicubic.h"
#include "processes/qrtfilters/resamplers/bilinear.h"
#include "processes/qrtfilters/resamplers/mode.h"
#include "processes/qrtfilters/resamplers/nearestneighbour.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"

namespace orin::resamplers {

/// A new factory of a method; null for a value that is no method.
std::unique_ptr<IResamplerFactory> MakeResamplerFactory(QRTOverviewResampleType type);

}  // namespace orin::resamplers
