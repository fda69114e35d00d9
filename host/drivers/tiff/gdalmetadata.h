/// The metadata tag of raster files (42112): a list of named items as XML text.
// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>
#include <vector>

namespace orin::drivers {

struct MetadataItem {
  std::string name;
  std::optional<unsigned> sample;  ///< 0-based channel; none for an item of the file
  std::string role;                ///< "scale", "offset" ...; mostly empty
  std::string domain;              ///< empty for the default domain
  std::string text;

  friend bool operator==(const MetadataItem&, const MetadataItem&) = default;
};

/// The items of a tag's text, in their order, up to its first NUL. Never fails: what is no item is
/// passed over.
/// \param textAt  receives, if given, where in `xml` the text of each item starts, as it is written
std::vector<MetadataItem> ParseMetadata(const std::string& xml,
                                        std::vector<size_t>* textAt = nullptr);

/// The tag's text for `items`, which ParseMetadata reads back.
std::string ComposeMetadata(const std::vector<MetadataItem>& items);

}  // namespace orin::drivers
