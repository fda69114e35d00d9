/// Metadata of a reader, one set for the file and one for each of the reader's channels, and the
/// facts beside it.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/model/sourcefacts.h"

namespace orin::datasources {

/// The key of the no-data value: a decimal number in text.
inline constexpr char kNoDataKey[] = "NO_DATA_VALUE";
/// Items are texts, a user's own among them. What the host itself has to know of a raster are
/// facts, which no item can change but the one that declares a no-data value.
class AuxiliaryData {
 public:
  using Items = std::map<std::string, std::string>;

  AuxiliaryData() = default;
  /// Items of the no-data value that are numbers declare it.
  /// \param origin  where the driver found them
  AuxiliaryData(Items file, std::vector<Items> channels,
                model::NoDataOrigin origin = model::NoDataOrigin::kItem)
      : file_(std::move(file)), channels_(std::move(channels)) {
    facts_.noData = DeclaredIn(file_, origin);
    for (const Items& items : channels_)
      facts_.channels.push_back({DeclaredIn(items, origin), false});
  }

  /// Empty when the file has no such item.
  std::string GetFileMetadataValue(const std::string& key) const { return ValueOf(file_, key); }
  /// \param channel  1-based within the reader's channels. Empty when it has no such item.
  std::string GetChanMetadataValue(const std::string& key, unsigned channel) const {
    return channel < 1 || channel > channels_.size() ? "" : ValueOf(channels_[channel - 1], key);
  }
  /// Changes, adds or, with an empty text, removes an item; declares nothing.
  void SetFileMetadataValue(const std::string& key, const std::string& text) {
    Set(file_, key, text);
  }
  /// The same for a channel, 1-based within the reader's channels.
  void SetChanMetadataValue(const std::string& key, unsigned channel, const std::string& text) {
    if (channel > channels_.size()) channels_.resize(channel);
    if (channel > 0) Set(channels_[channel - 1], key, text);
  }

  const model::SourceFacts& Facts() const { return facts_; }
  model::SourceFacts& Facts() { return facts_; }

  /// Declares a no-data value of the file, and tells it by its item.
  void DeclareNoData(const model::NoData& value) {
    SetFileMetadataValue(kNoDataKey, value.Text());
    facts_.noData = value;
  }
  /// The same of a channel, 1-based within the reader's channels.
  void DeclareNoData(unsigned channel, const model::NoData& value) {
    SetChanMetadataValue(kNoDataKey, channel, value.Text());
    if (channel > facts_.channels.size()) facts_.channels.resize(channel);
    facts_.channels[channel - 1].noData = value;
  }

 private:
  static std::optional<model::NoData> DeclaredIn(const Items& items, model::NoDataOrigin origin) {
    return model::NoData::Parse(ValueOf(items, kNoDataKey), origin);
  }
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
  model::SourceFacts facts_;
};

}  // namespace orin::datasources
