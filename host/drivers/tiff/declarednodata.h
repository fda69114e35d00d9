/// The no-data values that a TIFF image declares, and where.
// SPDX-License-Identifier: MIT
#pragma once

#include <vector>

#include "host/drivers/common/auxiliaryfile.h"
#include "host/drivers/tiff/gdalmetadata.h"
#include "host/drivers/tiff/pixelformat.h"
#include "host/model/nodata.h"

namespace orin::drivers {

/// Adds the declared values to `items`: for the file where all channels agree, else one a channel.
/// Where the items of the metadata tag hold numbers already, they stay as they are; what stands
/// beside the image goes before its no-data tag, as for other programs.
/// \param format  its no-data text becomes the one that counts for the first channel
/// \returns where they were declared; of several places the one that other programs ask first
model::NoDataOrigin DeclareNoData(std::vector<MetadataItem>& items, PixelFormat& format,
                                  const AuxiliaryFile& auxiliary);

}  // namespace orin::drivers
