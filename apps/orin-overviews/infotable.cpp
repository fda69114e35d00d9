/// What `info` tells, for people.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include "apps/orin-overviews/numberlist.h"
#include "apps/orin-overviews/rasterinfo.h"
#include "apps/orin-overviews/terminaltext.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

using datasources::LevelDescription;

using Row = std::vector<std::string>;

/// Columns that a terminal shows of an UTF-8 text without wide characters.
size_t LengthOf(const std::string& text) {
  return static_cast<size_t>(
      std::count_if(text.begin(), text.end(), [](char c) { return (c & 0xC0) != 0x80; }));
}

/// "uint8", or all types in order when they differ.
std::string TypesText(const std::vector<gobs::DataType>& channels) {
  const bool same = std::all_of(channels.begin(), channels.end(), [&](const gobs::DataType& type) {
    return type == channels.front();
  });
  if (same) return channels.empty() ? "-" : TypeName(channels.front());
  std::string text;
  for (const gobs::DataType& type : channels) text += (text.empty() ? "" : ", ") + TypeName(type);
  return text;
}

/// A line that names what tells, beside a no-data value, which pixels hold data; empty: nothing.
std::string ValidityText(const RasterInfo& info) {
  if (info.hasMask && info.alphaChannel)
    return FormatString(_("no data by: a mask, alpha (channel %u)\n"), info.alphaChannel);
  if (info.hasMask) return _("no data by: a mask\n");
  if (info.alphaChannel)
    return FormatString(_("no data by: alpha (channel %u)\n"), info.alphaChannel);
  return "";
}

std::string PlaceText(const LevelDescription& level) {
  if (level.isInSubDirectory) return _("inside (SubIFD)");
  if (level.place == datasources::LevelPlace::kInternal) return _("inside");
  return Printable(std::filesystem::path(level.file).filename().string());
}

/// "yes", "no", the channels that are up to date, or what else is known.
std::string ValidText(const LevelDescription& level) {
  std::vector<unsigned> valid;
  for (unsigned i = 0; i < level.validChannels.size(); ++i)
    if (level.validChannels[i]) valid.push_back(i + 1);
  if (level.status == datasources::LevelStatus::kStale) return _("stale");
  if (level.status == datasources::LevelStatus::kChanged) return _("changed");
  if (valid.empty()) return _("no");
  const bool isUnverified = level.status == datasources::LevelStatus::kUnverified;
  if (valid.size() == level.validChannels.size()) return isUnverified ? _("unverified") : _("yes");
  if (isUnverified) return FormatString(_("channels %s unverified"), JoinNumbers(valid).c_str());
  return FormatString(_("channels %s"), JoinNumbers(valid).c_str());
}

/// A text that a file holds, which may be anything: cut short, and safe to print.
std::string ShownText(const std::string& text) {
  constexpr size_t kMaxBytes = 60;
  const std::string shown = Printable(text.substr(0, kMaxBytes));
  return shown.empty() ? "-" : shown;
}

/// The masks of levels are worth a column where there are any, or should be.
bool TellsOfMasks(const RasterInfo& info) {
  return info.hasMask || std::any_of(info.levels.begin(), info.levels.end(),
                                     [](const LevelDescription& level) { return level.hasMask; });
}

Row RowOf(const LevelDescription& level, bool tellsOfMasks) {
  Row row = {std::to_string(level.level),
             std::to_string(level.width) + " x " + std::to_string(level.height),
             PlaceText(level),
             ShownText(level.method),
             level.sourceLevel == 0 ? "-" : std::to_string(level.sourceLevel),
             ValidText(level)};
  if (tellsOfMasks) row.push_back(level.hasMask ? _("yes") : _("no"));
  row.push_back(ShownText(level.program));
  return row;
}

/// \pre there is a row, and all have as many columns
std::string TextOf(const std::vector<Row>& rows) {
  const size_t columns = rows.front().size();
  std::vector<size_t> widths(columns);
  for (const Row& row : rows)
    for (size_t i = 0; i < columns; ++i) widths[i] = std::max(widths[i], LengthOf(row[i]));
  std::string text;
  for (const Row& row : rows) {
    for (size_t i = 0; i < columns; ++i) {
      text += row[i];
      if (i + 1 < columns) text.append(widths[i] - LengthOf(row[i]) + 2, ' ');
    }
    text += '\n';
  }
  return text;
}

/// A line for each level that says why it is not what its image asks for, as far as that is known.
std::string ReasonsText(const RasterInfo& info) {
  std::string text;
  for (const LevelDescription& level : info.levels) {
    if (level.status == datasources::LevelStatus::kChanged)
      text += FormatString(_("level %u: another program wrote into it after it was built\n"),
                           level.level);
    if (level.reason != datasources::StaleReason::kNone)
      text += FormatString(_("level %u: stale: %s\n"), level.level,
                           model::TextOf(level.reason).c_str());
  }
  return text;
}

}  // namespace

std::string TableOf(const RasterInfo& info) {
  std::string text =
      FormatString(_("%s: %u x %u pixels, channels: %zu (%s), %s\n"), Printable(info.file).c_str(),
                   info.width, info.height, info.channels.size(), TypesText(info.channels).c_str(),
                   info.formatDescription.c_str());
  if (info.isCloudOptimized) text += _("layout: cloud optimized GeoTIFF\n");
  text += ValidityText(info);
  if (info.leftOver)
    text += FormatString(_("%s holds levels of an image of another size (%u x %u pixels), which "
                           "other programs read. "
                           "build --external replaces it, clean removes it.\n"),
                         Printable(info.leftOver->file).c_str(), info.leftOver->width,
                         info.leftOver->height);
  if (info.levels.empty()) return text + _("no overview levels\n");
  const bool tellsOfMasks = TellsOfMasks(info);
  Row heading = {_("level"), _("size"), _("place"), _("method"), _("from"), _("valid")};
  if (tellsOfMasks) heading.push_back(_("mask"));
  heading.push_back(_("program"));
  std::vector<Row> rows = {heading};
  for (const LevelDescription& level : info.levels) rows.push_back(RowOf(level, tellsOfMasks));
  return text + TextOf(rows) + ReasonsText(info);
}

}  // namespace orin::app
