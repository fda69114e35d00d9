/// A raster's levels in memory.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "host/datasources/levelstore.h"
#include "host/drivers/memory/memorydriver.h"

namespace orin::drivers {

/// The pixels and the state of one channel of one level.
struct MemoryLevelChannel {
  std::vector<unsigned char> samples;  ///< packed as in `MemoryChannel`; empty when not created
  std::vector<bool> written;           ///< one entry a pixel: written in the current round
  bool present = false;
  bool valid = false;
};

struct MemoryLevel {
  datasources::LevelDescription description;  ///< the two channel lists stand in `channels` instead
  std::vector<MemoryLevelChannel> channels;   ///< one for each channel of the raster
};

/// The levels of one raster, shared by all that have it open. Lists and flags are guarded by the
/// mutex; pixels are not: nobody reads a block while another thread writes it.
struct MemoryLevelTable {
  std::string file;    ///< named in messages
  unsigned width = 0;  ///< of the raster, pixels
  unsigned height = 0;
  datasources::LevelPlace place = datasources::LevelPlace::kInternal;
  std::vector<gobs::DataType> types;  ///< one for each channel of the raster
  std::map<unsigned, MemoryLevel> levels;
  mutable std::mutex mutex;
};

/// One opened view of the levels.
class MemoryLevels final : public datasources::ILevelStore {
 public:
  /// \param writable  false: creating, writing and marking are refused
  MemoryLevels(std::shared_ptr<MemoryLevelTable> table, bool writable)
      : table_(std::move(table)), writable_(writable) {}

  std::vector<datasources::LevelDescription> List() const override;
  void Create(unsigned level, const std::vector<unsigned>& channels,
              const std::string& method) override;
  std::unique_ptr<datasources::IRasterWriter> OpenWriter(
      unsigned level, const std::vector<unsigned>& channels) override;
  /// True needs every pixel of the channels written since the level was created or since the first
  /// write to it after it was complete.
  void SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) override;
  void Remove(const std::vector<unsigned>& levels) override;

 private:
  void RequireWritable(const char* function) const;
  MemoryLevel& PresentLevel(unsigned level, const std::vector<unsigned>& channels,
                            const char* function) const;

  std::shared_ptr<MemoryLevelTable> table_;
  bool writable_;
};

/// The one data type of `channels`.
/// \throws orin::DataException  no channel, one that does not exist, or channels of different types
gobs::DataType CommonType(const std::vector<gobs::DataType>& types,
                          const std::vector<unsigned>& channels, const std::string& file);

/// Width and height of the nominal tiles of rasters in memory, pixels.
inline constexpr unsigned kMemoryTile = 256;

}  // namespace orin::drivers
