/// The pixels of one level of an ERDAS Imagine file that are being written, and which of them are.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/datasources/imagerecord.h"
#include "host/drivers/hfa/hfacatalogue.h"
#include "host/drivers/hfa/hfaupdate.h"

namespace orin::drivers {

class HfaLevelBuild {
 public:
  struct Target {
    unsigned level = 0;
    std::vector<unsigned> channels;
    unsigned width = 0, height = 0;  ///< pixels, rounded down
  };

  /// Opens the file, and makes room for the pixels: the stored ones stay where they are.
  /// \throws orin::Exception  it cannot be written, or the level is damaged
  HfaLevelBuild(const std::string& path, const HfaCatalogue& catalogue, Target target);

  unsigned Level() const { return target_.level; }
  const std::vector<unsigned>& Channels() const { return target_.channels; }
  /// \param block  its channels are those of the target
  /// \throws orin::Exception  it cannot be written
  void Write(const gobs::Raster& block);
  /// Whether every pixel was written.
  bool IsComplete() const;
  /// Makes what was written durable, apart from the tree, and closes.
  /// \returns where the nodes stand that may become the channels' level
  /// \throws orin::Exception  it cannot be written; nothing of it is kept
  std::map<unsigned, uint32_t> Store();
  /// Gives up what is not stored.
  void Close() { update_.reset(); }
  bool IsClosed() const { return !update_; }

  /// The image of the level that it is computed from; none: it is computed from the image.
  std::optional<datasources::ImageRecord> source = {};

 private:
  Target target_;
  std::unique_ptr<HfaUpdate> update_;
  std::vector<GDALRasterBandH> bands_;  ///< one a channel of the target
  std::vector<bool> covered_;           ///< one a pixel of the level
};

}  // namespace orin::drivers
