/// A raster in memory as an opened source.
// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "host/datasources/levelstore.h"
#include "host/drivers/memory/memorydriver.h"
#include "host/drivers/memory/memorylevels.h"

namespace orin::drivers {

/// A raster and the levels built for it.
struct MemoryEntry {
  MemoryRaster raster;
  std::shared_ptr<MemoryLevelTable> levels;
};

/// \param file  the name of the raster, for messages
/// \throws orin::DataException  a channel's size does not fit
std::shared_ptr<MemoryEntry> MakeMemoryEntry(const std::string& file, MemoryRaster raster);

/// A source over `entry`, which it shares, as its readers and writers do.
/// \param writable  false: creating and writing levels is refused
std::unique_ptr<datasources::IRasterSource> OpenMemorySource(std::shared_ptr<MemoryEntry> entry,
                                                             bool writable);

}  // namespace orin::drivers
