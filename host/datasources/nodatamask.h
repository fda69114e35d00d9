/// The validity decision that a file's declared no-data values define.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/mask/maskdecision.h"
#include "host/datasources/rasterreader.h"

/// A new decision, owned by the caller: a pixel is no data when all of the reader's channels equal
/// their declared no-data value (the channel's own, else the file's), compared in the channels'
/// type, NaN as any NaN; of complex samples the real component counts and the imaginary one must be
/// 0, or either is NaN when NaN is declared. Null when no text is a number.
orin::gobs::IMaskDecision* GetFileMetadataSrcMask(orin::datasources::IRasterReader* reader);
