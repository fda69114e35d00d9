// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/detail/copypixels.h"

#include <cstring>

#include "basic/gobs/mask/validity.h"
#include "processes/qrtfilters/resamplers/detail/filledrun.h"
#include "processes/qrtfilters/resamplers/detail/parallelrows.h"

namespace orin::resamplers::detail {
namespace {

/// A pixel size that the compiler knows.
template <uint64_t kBytes>
struct FixedSize {
  constexpr operator uint64_t() const { return kBytes; }
};

/// Copies one destination row; the only loop that the pixel's size is compiled into.
template <class Size, class Valid>
void CopyRow(const PixelCopy& job, Size pixelBytes, const Valid& valid, uint32_t row) {
  const uint32_t srcRow = job.rows[row];
  const uint8_t* const line = job.src.At(0, srcRow);
  uint8_t* out = job.dst.At(0, row);
  for (const uint32_t column : job.columns) {
    const bool copies = valid(column, srcRow);
    std::memcpy(out, copies ? line + column * uint64_t{pixelBytes} : job.noData, pixelBytes);
    out += pixelBytes;
  }
}

/// Marks what `CopyRow` fills: apart from it, so that it stays one loop without a branch.
template <class Valid>
void MarkFilled(const PixelCopy& job, const Valid& valid, uint32_t row) {
  if (Valid::kAlways || !job.dstValidity) return;
  FilledRun filled(job.dstValidity, row);
  for (size_t i = 0; i < job.columns.size(); ++i)
    if (!valid(job.columns[i], job.rows[row])) filled.Add(static_cast<int64_t>(i));
}

template <class Size>
void CopyPixelsOf(const PixelCopy& job, Size pixelBytes) {
  gobs::WithValidity(job.srcMask, [&](const auto& valid) {
    ParallelRows(static_cast<uint32_t>(job.rows.size()), [&](uint32_t row) {
      CopyRow(job, pixelBytes, valid, row);
      MarkFilled(job, valid, row);
    });
  });
}

}  // namespace

void CopyPixels(const PixelCopy& job) {
  switch (job.src.components) {
    case 1:
      return CopyPixelsOf(job, FixedSize<1>{});
    case 2:
      return CopyPixelsOf(job, FixedSize<2>{});
    case 3:
      return CopyPixelsOf(job, FixedSize<3>{});
    case 4:
      return CopyPixelsOf(job, FixedSize<4>{});
    case 6:
      return CopyPixelsOf(job, FixedSize<6>{});
    case 8:
      return CopyPixelsOf(job, FixedSize<8>{});
    case 12:
      return CopyPixelsOf(job, FixedSize<12>{});
    case 16:
      return CopyPixelsOf(job, FixedSize<16>{});
    case 24:
      return CopyPixelsOf(job, FixedSize<24>{});
    case 32:
      return CopyPixelsOf(job, FixedSize<32>{});
    default:
      return CopyPixelsOf(job, job.src.components);
  }
}

}  // namespace orin::resamplers::detail
