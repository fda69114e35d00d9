/// What the GDAL library says of a channel, in the host's terms.
// SPDX-License-Identifier: MIT
#pragma once

#include <gdal.h>

#include <optional>
#include <string>

#include "basic/gobs/datatype.h"
#include "host/datasources/auxiliarydata.h"

namespace orin::drivers {

/// Nothing for a type that no block can hold. Channels of one bit have the bit type and are
/// delivered as one byte a sample.
std::optional<gobs::DataType> TypeOfBand(GDALRasterBandH band);

/// Bits that the file keeps of a sample of `band`, whose type is `type`: fewer where that is said.
unsigned StoredBitsOfBand(GDALRasterBandH band, const gobs::DataType& type);

/// True when numbers of the channel stand for entries of a colour table or for classes.
bool HoldsClassNumbers(GDALRasterBandH band);

/// The declared no-data value with all its digits, whatever the channel's type: "-9999", "nan",
/// "18446744073709551615"; empty when none is declared.
std::string NoDataTextOf(GDALRasterBandH band);

/// Items of the default domain.
datasources::AuxiliaryData::Items ItemsOf(GDALMajorObjectH object);

}  // namespace orin::drivers
