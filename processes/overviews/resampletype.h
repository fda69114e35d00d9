/// The resampling methods, their names, and the user's default.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

enum QRTOverviewResampleType : int {
  ResampleInvalid = -1,  ///< answered for an unknown name; in a job it means the default
  ResampleNearest = 0,
  ResampleAverage = 1,
  ResampleMode = 2,
  ResampleBilinear = 3,
  ResampleBicubic = 4,
};

/// The method whose name starts like `name`: "near", "aver", "mode", "bili", "bicu" or "cubic" in
/// any letter case, whatever follows; `ResampleInvalid` for any other text. Blanks are not trimmed.
QRTOverviewResampleType GetPyramidType(std::string name);

/// The user's preferred method, nearest neighbour when there is none. Never bilinear or bicubic.
QRTOverviewResampleType GetDefaultPyramidType();
