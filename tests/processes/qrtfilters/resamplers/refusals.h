/// Catches the exception of a call that must be refused.
// SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>

#include <cstring>
#include <optional>
#include <string>
#include <vector>

#include "basic/gobs/raster.h"
#include "host/services/exception.h"

namespace orin::resamplers::testing {

constexpr char kOnePixelMargin[] = "Input rasters must have at least a one pixel margin.";
constexpr char kThreePixelMargin[] = "Input rasters must have at least a 3 pixels margin.";
constexpr char kOtherChannels[] =
    "Input and output rasters must have an equal number of channels. Aborting.";

/// What `call` threw, or nothing.
template <class Call>
std::optional<Exception> RefusalOf(Call&& call) {
  try {
    call();
  } catch (const Exception& refusal) {
    return refusal;
  }
  return std::nullopt;
}

/// Expects exactly this exception from `call`.
template <class Call>
void ExpectRefusal(const std::string& message, const std::string& sourceFile,
                   const std::string& function, unsigned line, Call&& call) {
  const auto refusal = RefusalOf(call);
  ASSERT_TRUE(refusal.has_value()) << "nothing was thrown instead of: " << message;
  EXPECT_EQ(message, refusal->GetMessage());
  EXPECT_EQ(sourceFile, refusal->GetSourceFile());
  EXPECT_EQ(function, refusal->GetFunction());
  EXPECT_EQ(line, refusal->GetLine());
}

/// The whole buffer, margins included.
inline std::vector<uint8_t> BytesOf(const gobs::Raster& block) {
  return {block.data, block.data + block.byteSize};
}

}  // namespace orin::resamplers::testing
