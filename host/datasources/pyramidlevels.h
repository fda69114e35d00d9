/// Which levels the pyramid of an image needs.
// SPDX-License-Identifier: MIT
#pragma once

#include <vector>

/// Decimation levels f, f^2, f^3 ... as long as the larger side divided by the level before exceeds
/// 256 pixels, so that the last level fits into one tile of that size. The pyramid of a thin image
/// ends at the last level that its shorter side has a pixel for. Empty for a factor below 2.
/// \param width, height  of the image in pixels
std::vector<unsigned int> ComputePyramidLevel(double width, double height, unsigned int factor);
