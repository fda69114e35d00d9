/// The decimation factor of a pyramid that names no levels.
// SPDX-License-Identifier: MIT
#pragma once

/// The factor between the levels of a pyramid that the user prefers, 2 or 3; 2 without a
/// preference.
unsigned int GetDefaultDecimationLevels();

namespace orin::overviews {

/// `factor` when it is 2 or 3, else the user's preference.
unsigned int PyramidFactorOrDefault(long long factor);

}  // namespace orin::overviews
