/// The file in which raster programs keep what an image's own file has no place for:
/// NAME.EXT.aux.xml.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <string>
#include <string_view>

namespace orin::drivers {

struct AuxiliaryFile {
  std::map<unsigned, std::string> noData;  ///< by channel, 1-based: declared values, as written
  bool namesCategories = false;            ///< of some channel

  friend bool operator==(const AuxiliaryFile&, const AuxiliaryFile&) = default;
};

/// What the text says. Nothing when it is damaged or another kind of XML text, as for other
/// programs.
/// \param isWhole  false for the beginning of a text, of which what is complete counts
AuxiliaryFile ParseAuxiliaryText(std::string_view text, bool isWhole = true);

/// Of the file beside an image; nothing when there is none, when it cannot be read, or when it is
/// no regular file. Of files above 64 MiB only the beginning is read. Never waits, never fails for
/// what the file holds.
AuxiliaryFile ReadAuxiliaryFile(const std::string& imageFile);

}  // namespace orin::drivers
