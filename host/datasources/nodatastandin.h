/// Finds a value that can stand for no data where the declared one cannot be handed to a run.
// SPDX-License-Identifier: MIT
#pragma once

#include "basic/gobs/datatype.h"

namespace orin::datasources {

class IRasterSource;

/// A finite value that no channel of this type holds in any of the image's pixels, exact in double
/// and in the type: the lowest finite value of a floating type, the largest multiple of a power of
/// two of a 64-bit integer, or the next one that is free.
///
/// Reads the whole image, in blocks of 16 MiB, and gives the progress sink a chance to stop that
/// (fraction 0). What cannot be read is passed over: whoever needs those pixels reports it.
/// \param type     32- or 64-bit floating point, or 64-bit integer; components of complex samples
///                 are looked at one by one
/// \param stopped  set to true when the user asked to stop: the value is not certain then
double FindNoDataStandIn(IRasterSource& source, const gobs::DataType& type, bool& stopped);

}  // namespace orin::datasources
