/// Metadata of a reader: one set for the file, one for each of the reader's channels.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <string>
#include <utility>
#include <vector>

namespace orin::datasources {

/// The key of the no-data value: a decimal number in text.
inline constexpr char kNoDataKey[] = "NO_DATA_VALUE";
/// File item of a reader whose blocks carry a validity, whatever its text.
inline constexpr char kValidityKey[] = "VALIDITY";
/// File item: the file's no-data value is a fill only, no pixel is no data for being equal to it.
inline constexpr char kFillOnlyKey[] = "NO_DATA_VALUE_IS_FILL";
/// Channel item: the channel is alpha, and no part of what a no-data value is compared with.
inline constexpr char kAlphaKey[] = "ALPHA";

class AuxiliaryData {
 public:
  using Items = std::map<std::string, std::string>;

  AuxiliaryData() = default;
  AuxiliaryData(Items file, std::vector<Items> channels)
      : file_(std::move(file)), channels_(std::move(channels)) {}

  /// Empty when the file has no such item.
  std::string GetFileMetadataValue(const std::string& key) const { return ValueOf(file_, key); }
  /// \param channel  1-based within the reader's channels. Empty when it has no such item.
  std::string GetChanMetadataValue(const std::string& key, unsigned channel) const {
    return channel < 1 || channel > channels_.size() ? "" : ValueOf(channels_[channel - 1], key);
  }
  /// Changes, adds or, with an empty text, removes an item.
  void SetFileMetadataValue(const std::string& key, const std::string& text) {
    Set(file_, key, text);
  }
  /// The same for a channel, 1-based within the reader's channels.
  void SetChanMetadataValue(const std::string& key, unsigned channel, const std::string& text) {
    if (channel > channels_.size()) channels_.resize(channel);
    if (channel > 0) Set(channels_[channel - 1], key, text);
  }

 private:
  static void Set(Items& items, const std::string& key, const std::string& text) {
    if (text.empty()) items.erase(key);
    else items[key] = text;
  }
  static std::string ValueOf(const Items& items, const std::string& key) {
    const auto found = items.find(key);
    return found == items.end() ? "" : found->second;
  }

  Items file_;
  std::vector<Items> channels_;
};

}  // namespace orin::datasources
