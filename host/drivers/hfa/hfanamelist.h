/// A channel's list of levels in an ERDAS Imagine file.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace orin::drivers {

/// An entry of a channel's list of levels.
struct HfaLevelName {
  std::string file;     ///< name, without folder, of the file that is said to hold the level;
                        ///< empty: this one, without a list
  unsigned factor = 0;  ///< decimation factor
};

/// Of "scene.img(:Layer_1:_ss_4_)"; factor 0 for what is no level.
HfaLevelName ParseHfaLevelName(std::string_view text);

/// Which levels of a channel there are, in the order that other programs number them. What is
/// damaged ends the list.
class HfaNameList {
 public:
  /// An empty list of a channel that has had none.
  HfaNameList() = default;
  /// \param data  of the node that holds it
  explicit HfaNameList(const std::string& data);

  bool IsEmpty() const { return names_.empty(); }
  std::vector<HfaLevelName> Levels() const;
  bool Has(unsigned factor) const;
  /// Takes the levels of `factors` out. \returns whether there were any
  bool Remove(const std::vector<unsigned>& factors);
  /// \param text  "scene.img(:Layer_1:_ss_4_)"
  void Add(const std::string& text) { names_.push_back(text + '\0'); }

  /// The data of a node for it, which stands at `position` of the file. It is no shorter than the
  /// data that the list was read from, so that other programs find room in it to add levels.
  std::string DataAt(uint32_t position) const;

 private:
  std::string method_;  ///< its first text, with the zero at its end: how the first level was made
  std::vector<std::string> names_;  ///< with the zeros at their ends
  size_t dataBytes_ = 0;
};

/// Where the numbers stand in the `data` of a list that lead to its own bytes.
std::vector<uint32_t> PointersInHfaNameList(const std::string& data);

}  // namespace orin::drivers
