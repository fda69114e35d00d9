/// What `info` tells, for programs.
// SPDX-License-Identifier: MIT
#include <nlohmann/json.hpp>

#include "apps/orin-overviews/rasterinfo.h"

namespace orin::app {
namespace {

using datasources::LevelDescription;
using Json = nlohmann::ordered_json;

Json OrNull(const std::string& text) { return text.empty() ? Json() : Json(text); }

const char* NameOf(datasources::LevelStatus status) {
  switch (status) {
    case datasources::LevelStatus::kCurrent:
      return "current";
    case datasources::LevelStatus::kStale:
      return "stale";
    case datasources::LevelStatus::kUnfinished:
      return "unfinished";
    case datasources::LevelStatus::kChanged:
      return "changed";
    case datasources::LevelStatus::kUnverified:
      break;
  }
  return "unverified";
}

/// A word for programs; null for a level that is not stale.
Json NameOf(datasources::StaleReason reason) {
  using datasources::StaleReason;
  switch (reason) {
    case StaleReason::kNone:
      break;
    case StaleReason::kImageData:
      return "image";
    case StaleReason::kCoding:
      return "storage";
    case StaleReason::kNoData:
      return "no-data";
    case StaleReason::kMask:
      return "mask";
    case StaleReason::kAlpha:
      return "alpha";
    case StaleReason::kPalette:
      return "palette";
    case StaleReason::kSourceRebuilt:
      return "source-level";
  }
  return {};
}

Json ChannelsOf(const LevelDescription& level) {
  Json channels = Json::array();
  for (size_t i = 0; i < level.validChannels.size(); ++i)
    channels.push_back({{"channel", i + 1},
                        {"present", i < level.presentChannels.size() && level.presentChannels[i]},
                        {"valid", bool(level.validChannels[i])}});
  return channels;
}

Json JsonOf(const LevelDescription& level) {
  const bool inside = level.place == datasources::LevelPlace::kInternal;
  const char* place = level.isInSubDirectory ? "subifd" : inside ? "internal" : "side-car";
  return {{"level", level.level},
          {"width", level.width},
          {"height", level.height},
          {"place", place},
          {"file", level.file},
          {"method", OrNull(level.method)},
          {"sourceLevel", level.sourceLevel ? Json(level.sourceLevel) : Json()},
          {"program", OrNull(level.program)},
          {"state", NameOf(level.status)},
          {"staleReason", NameOf(level.reason)},
          {"fingerprint", OrNull(level.image.fingerprint)},
          {"mask", level.hasMask},
          {"channels", ChannelsOf(level)}};
}

Json LeftOverOf(const RasterInfo& info) {
  if (!info.leftOver) return {};
  return {{"file", info.leftOver->file},
          {"width", info.leftOver->width},
          {"height", info.leftOver->height}};
}

}  // namespace

std::string JsonOf(const RasterInfo& info) {
  Json channels = Json::array();
  for (size_t i = 0; i < info.channels.size(); ++i)
    channels.push_back({{"channel", i + 1}, {"type", TypeName(info.channels[i])}});
  Json levels = Json::array();
  for (const LevelDescription& level : info.levels) levels.push_back(JsonOf(level));
  const Json all = {
      {"file", info.file},
      {"format", {{"name", info.formatName}, {"description", info.formatDescription}}},
      {"width", info.width},
      {"height", info.height},
      {"channels", channels},
      {"cloudOptimized", info.isCloudOptimized},
      {"mask", info.hasMask},
      {"alphaChannel", info.alphaChannel ? Json(info.alphaChannel) : Json()},
      {"levels", levels},
      {"leftOver", LeftOverOf(info)}};
  // A file name need not be UTF-8, JSON must be.
  return all.dump(2, ' ', false, Json::error_handler_t::replace) + "\n";
}

}  // namespace orin::app
