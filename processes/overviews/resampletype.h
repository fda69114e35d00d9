/// The resampling methods by name, and the user's default.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "host/model/methods.h"

/// The method whose name starts like `name`, in any letter case, whatever follows: "near", "aver",
/// "mode", "bili", "bicu" or "cubic"; `ResampleInvalid` for any other text. Blanks are not trimmed.
QRTOverviewResampleType GetPyramidType(std::string name);

/// The user's preferred method, nearest neighbour when there is none. Never bilinear or bicubic.
QRTOverviewResampleType GetDefaultPyramidType();

/// The names by which a user may call the methods, in lower case, separated by commas.
std::string PyramidTypeNames();
