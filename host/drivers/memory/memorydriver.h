/// Rasters in memory: arrays that the embedding program hands over.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <string>
#include <vector>

#include "basic/gobs/datatype.h"
#include "host/datasources/auxiliarydata.h"

namespace orin::drivers {

/// One channel: rows from the top, samples without gaps, native byte order, complex samples as real
/// then imaginary; the bit type takes one byte a sample, 0 or 1.
struct MemoryChannel {
  gobs::DataType type;
  std::vector<unsigned char> samples;
  datasources::AuxiliaryData::Items metadata;
};

struct MemoryRaster {
  unsigned width = 0;   ///< pixels
  unsigned height = 0;  ///< pixels
  std::vector<MemoryChannel> channels;
  datasources::AuxiliaryData::Items metadata;
  bool readOnly = false;  ///< an open for update is refused
};

/// Adds the format "TESSRA" to the registry.
void RegisterMemoryDriver();

/// Makes `raster` open under `name` (by custom "mem:..."), replacing what had the name. Levels
/// built for it live as long as the name. \throws orin::DataException  a channel's size does not
/// fit
void PutMemoryRaster(const std::string& name, MemoryRaster raster);
/// Forgets the raster and its levels. Datasets that are open keep them until they are released.
void RemoveMemoryRaster(const std::string& name);

/// Pixels of one level of one channel, packed as in `MemoryChannel`; empty when there is no such
/// level.
/// \param level  1 is the raster itself
std::vector<unsigned char> MemoryLevelSamples(const std::string& name, unsigned channel,
                                              unsigned level);

}  // namespace orin::drivers
