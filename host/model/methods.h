/// The table of the resampling methods: all that is known of one without its kernel, a row each.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

enum QRTOverviewResampleType : int {
  ResampleInvalid = -1,  ///< answered for an unknown name; in a job it means the default
  ResampleNearest = 0,
  ResampleAverage = 1,
  ResampleMode = 2,
  ResampleBilinear = 3,
  ResampleBicubic = 4,
};

namespace orin::model {

struct Method {
  QRTOverviewResampleType type;
  std::string_view name;  ///< as it is stored with a level
  /// In upper case, empty ones aside: a text that starts like one of them means this method.
  std::array<std::string_view, 2> prefixes;
  bool blends;        ///< makes values that the image does not hold
  bool takesComplex;  ///< computes samples of two components, too
  bool needsDivisor;  ///< computes a level only from one whose factor divides the level's
};

/// In the order of the enumerators, which start at 0.
inline constexpr std::array kMethods{
    Method{ResampleNearest, "NEAREST", {"NEAR"}, false, true, false},
    Method{ResampleAverage, "AVERAGE", {"AVER"}, true, true, true},
    Method{ResampleMode, "MODE", {"MODE"}, false, false, false},
    Method{ResampleBilinear, "BILINEAR", {"BILI"}, true, false, false},
    Method{ResampleBicubic, "BICUBIC", {"BICU", "CUBIC"}, true, false, false},
};

/// Null for a value that is no method.
constexpr const Method* FindMethod(QRTOverviewResampleType type) {
  const auto* row = std::find_if(kMethods.begin(), kMethods.end(),
                                 [type](const Method& method) { return method.type == type; });
  return row == kMethods.end() ? nullptr : row;
}

/// The method that a level's stored name is of; null when it is of none.
constexpr const Method* FindMethod(std::string_view name) {
  const auto* row = std::find_if(kMethods.begin(), kMethods.end(),
                                 [name](const Method& method) { return method.name == name; });
  return row == kMethods.end() ? nullptr : row;
}

}  // namespace orin::model
