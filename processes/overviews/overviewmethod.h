/// What a run takes of a method: its kernels and the name that levels record.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "processes/overviews/resampletype.h"
#include "processes/qrtfilters/resamplers/resamplerfactory.h"

namespace orin::overviews {

struct OverviewMethod {
  std::unique_ptr<resamplers::IResamplerFactory> factory;  ///< null for a type that does not exist
  std::string name;                                        ///< "NEAREST" ...; then empty
};

OverviewMethod MethodOf(QRTOverviewResampleType type);

/// "NEAREST" ...; empty for a type that does not exist.
std::string StoredNameOf(QRTOverviewResampleType type);

/// The method that a level records; `ResampleInvalid` when the name is none of ours.
QRTOverviewResampleType TypeOfStoredName(const std::string& name);

/// True for a method that makes values which the image does not hold.
bool Blends(QRTOverviewResampleType type);

}  // namespace orin::overviews
