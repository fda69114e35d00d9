/// Decoded tiles that a later block needs again, the longest unused dropped first.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <list>
#include <memory>
#include <unordered_map>
#include <utility>

namespace orin::drivers {

class TileCache {
 public:
  using Buffer = std::unique_ptr<uint8_t[]>;

  /// \param bytesPerTile  of every buffer
  explicit TileCache(uint64_t bytesPerTile) : bytesPerTile_(bytesPerTile) {}

  /// Room for that many bytes of tiles from now on; at least one tile is always kept.
  void SetLimit(uint64_t bytes) { limit_ = bytes / bytesPerTile_; }

  /// The tile's samples, until the next `Keep`; null when it is not here.
  const uint8_t* Find(uint64_t key) {
    const auto found = index_.find(key);
    if (found == index_.end()) return nullptr;
    tiles_.splice(tiles_.begin(), tiles_, found->second);
    return found->second->second.get();
  }

  /// An empty buffer, taken from the longest unused tile when there is no more room.
  Buffer NewBuffer() {
    Buffer recycled;
    while (!tiles_.empty() && tiles_.size() >= limit_) {
      recycled = std::move(tiles_.back().second);
      index_.erase(tiles_.back().first);
      tiles_.pop_back();
    }
    return recycled ? std::move(recycled)
                    : std::make_unique_for_overwrite<uint8_t[]>(bytesPerTile_);
  }

  /// \returns the samples, as `Find` would
  const uint8_t* Keep(uint64_t key, Buffer samples) {
    tiles_.emplace_front(key, std::move(samples));
    index_[key] = tiles_.begin();
    return tiles_.front().second.get();
  }

 private:
  using Tiles = std::list<std::pair<uint64_t, Buffer>>;  // the latest used first

  uint64_t bytesPerTile_;
  uint64_t limit_ = 1;
  Tiles tiles_;
  std::unordered_map<uint64_t, Tiles::iterator> index_;
};

}  // namespace orin::drivers
