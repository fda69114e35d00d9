/// The size of the blocks in which a level is computed.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/processwindow.h"
#include "host/datasources/rasterreader.h"
#include "host/datasources/rasterwriter.h"

/// Sets the width and height of the output blocks, in pixels of the writer, at least 1 each.
///
/// With S the reader's level and L the writer's, blocks are multiples of S / gcd(S, L), so that
/// every block starts on a whole source pixel and no pixel of the level depends on the block size.
/// Where the budget allows, they are multiples of the writer's tiles, and as wide as the level when
/// the source is stored in strips. Where the scale S / L has no exact arithmetic (75, or 3 from 2),
/// the size is fixed by S and L alone.
///
/// \param pixelBudget  input plus output pixels of one step; twice that many are alive at a time
/// \param window       not used
void FindOptimalRasterSize(orin::datasources::IRasterReader* reader,
                           orin::datasources::IRasterWriter* writer, unsigned int pixelBudget,
                           unsigned int& width, unsigned int& height,
                           const orin::parallelio::ProcessWindow& window);
