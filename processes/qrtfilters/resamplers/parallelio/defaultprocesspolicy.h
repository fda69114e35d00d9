/// Cuts an output raster into blocks that fit a memory budget.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <limits>
#include <vector>

#include "host/datasources/blocksize.h"
#include "host/datasources/rasterreader.h"
#include "host/datasources/rasterwriter.h"
#include "processes/qrtfilters/resamplers/parallelio/blockjob.h"

namespace orin::parallelio {

/// \tparam Processing  turns an input block into an output block
/// \tparam Access      maps an output block to its input block
/// \tparam Update      reports progress
template <class Processing, class Access, class Update>
class DefaultProcessPolicy : public Processing, public Access, public Update {
 public:
  ~DefaultProcessPolicy() override = default;

  /// Plans the whole output: rows outer, columns inner, from the top-left; no block is empty.
  virtual void ComputeBlocks(std::vector<BlockJob>& blocks, datasources::IRasterReader* reader,
                             datasources::IRasterWriter* writer);

  uint32_t memoryBudget = 268435456;  ///< bytes that the blocks alive in one step may take together
  bool preloadOutput = false;         ///< fill output blocks with the writer's pixels first
  bool keepOutputMargins = false;     ///< give output blocks the margins of input blocks

 private:
  unsigned PixelBudget(const datasources::IRasterReader& reader,
                       const datasources::IRasterReader& writer) const;
  BlockJob JobAt(const ProcessWindow& window, uint32_t width, uint32_t height,
                 const datasources::IRasterReader& writer) const;
};

/// Input plus output pixels of one block, such that two of each stay within the memory budget.
template <class Processing, class Access, class Update>
unsigned DefaultProcessPolicy<Processing, Access, Update>::PixelBudget(
    const datasources::IRasterReader& reader, const datasources::IRasterReader& writer) const {
  const double rx = Access::xRatio;
  const double ry = Access::yRatio;
  const double k = 1 / (rx * ry + 1);
  const double sIn = reader.GetDataType().bits;
  const double cIn = reader.GetChannelCount();
  const double sOut = writer.GetDataType().bits;
  const double cOut = writer.GetChannelCount();
  const double pixels =
      memoryBudget / (2.0 * (cOut * k * rx * ry * sOut * 0.125 + cIn * k * sIn * 0.125));
  return static_cast<unsigned>(std::min(pixels, double{std::numeric_limits<unsigned>::max()}));
}

template <class Processing, class Access, class Update>
BlockJob DefaultProcessPolicy<Processing, Access, Update>::JobAt(
    const ProcessWindow& window, uint32_t width, uint32_t height,
    const datasources::IRasterReader& writer) const {
  BlockJob job;
  job.outputInfo = {width, height, writer.GetChannelCount(), writer.GetDataType()};
  job.inputInfo = Access::InputOf(job.outputInfo, window, job.inputWindow);
  job.outputWindow = keepOutputMargins ? window : ProcessWindow{0, 0, window.x, window.y};
  return job;
}

template <class Processing, class Access, class Update>
void DefaultProcessPolicy<Processing, Access, Update>::ComputeBlocks(
    std::vector<BlockJob>& blocks, datasources::IRasterReader* reader,
    datasources::IRasterWriter* writer) {
  Access::sourceWidth = reader->GetWidth();
  Access::sourceHeight = reader->GetHeight();
  unsigned width = 0;
  unsigned height = 0;
  FindOptimalRasterSize(reader, writer, PixelBudget(*reader, *writer), width, height, {});
  width = std::max(width, 1u);
  height = std::max(height, 1u);
  for (uint32_t rowsLeft = writer->GetHeight(); rowsLeft != 0;) {
    const uint32_t blockHeight = std::min(height, rowsLeft);
    for (uint32_t colsLeft = writer->GetWidth(); colsLeft != 0;) {
      const uint32_t blockWidth = std::min(width, colsLeft);
      const ProcessWindow window{reader->GetMarginX(), reader->GetMarginY(),
                                 writer->GetWidth() - colsLeft, writer->GetHeight() - rowsLeft};
      blocks.push_back(JobAt(window, blockWidth, blockHeight, *writer));
      colsLeft -= blockWidth;
    }
    rowsLeft -= blockHeight;
  }
}

}  // namespace orin::parallelio
