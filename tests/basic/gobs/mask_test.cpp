// SPDX-License-Identifier: MIT
#include "basic/gobs/mask/mask.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "basic/gobs/mask/maskdecision.h"
#include "basic/gobs/mask/validity.h"
#include "host/services/exception.h"

namespace orin::gobs {
namespace {

using parallelio::ProcessWindow;

TEST(Mask, IsAllValidAtFirstAndHasTheGeometryOfItsBlock) {
  const Mask mask(5, 3, {2, 1, 40, 50});
  EXPECT_EQ(5u, mask.width);
  EXPECT_EQ(3u, mask.height);
  EXPECT_EQ(2u, mask.marginX);
  EXPECT_EQ(1u, mask.marginY);
  EXPECT_EQ(9u, mask.stride);
  EXPECT_EQ((9 * 5 + 7) / 8, mask.end - mask.begin);
  for (int y = -1; y < 4; ++y)
    for (int x = -2; x < 7; ++x) EXPECT_TRUE(mask.IsValid(x, y));
}

TEST(Mask, TheFirstPixelOfAByteIsItsTopBit) {
  Mask mask(16, 1, {});
  mask.SetValid(0, 0, false);
  EXPECT_EQ(0x7F, mask.begin[0]);
  mask.SetValid(7, 0, false);
  EXPECT_EQ(0x7E, mask.begin[0]);
  mask.SetValid(8, 0, false);
  EXPECT_EQ(0x7F, mask.begin[1]);
  mask.SetValid(0, 0, true);
  EXPECT_EQ(0xFE, mask.begin[0]);
}

TEST(Mask, AnIntersectionLeavesWhatIsValidInBoth) {
  Mask mask(10, 1, {});
  mask.SetValid(1, 0, false);
  Mask other(10, 1, {});
  other.SetValid(2, 0, false);
  other.SetValid(9, 0, false);
  mask.Intersect(other);
  for (int x = 0; x < 10; ++x) EXPECT_EQ(x != 1 && x != 2 && x != 9, mask.IsValid(x, 0)) << x;
}

TEST(Mask, ARunIsClearedFromItsFirstToItsLastPixel) {
  for (uint32_t from = 0; from < 40; ++from)
    for (uint32_t count = 0; from + count <= 40; ++count) {
      Mask mask(40, 2, {1, 0, 0, 0});
      mask.ClearRun(from, 1, count);
      for (uint32_t x = 0; x < 40; ++x)
        ASSERT_EQ(x < from || x >= from + count, mask.IsValid(x, 1)) << from << ' ' << count;
      ASSERT_TRUE(mask.IsValid(39, 0) && mask.IsValid(40, 1));
    }
}

TEST(Mask, ThreadsMayClearRunsOfOneMaskAtOnce) {
  constexpr uint32_t kWidth = 13, kHeight = 400;  // lines share bytes
  Mask mask(kWidth, kHeight, {});
  std::vector<std::thread> threads;
  for (uint32_t first = 0; first < 8; ++first)
    threads.emplace_back([&mask, first] {
      for (uint32_t y = first; y < kHeight; y += 8)
        for (uint32_t x = 0; x < kWidth; x += 3) mask.ClearRun(x, y, std::min(2u, kWidth - x));
    });
  for (std::thread& thread : threads) thread.join();
  for (uint32_t y = 0; y < kHeight; ++y)
    for (uint32_t x = 0; x < kWidth; ++x)
      ASSERT_EQ(x % 3 == 2, mask.IsValid(x, y)) << x << ", " << y;
}

TEST(Mask, IsUniformWhenAllPixelsAreAlike) {
  Mask mask(5, 3, {});  // 15 pixels: the last bit of the last byte is none
  EXPECT_EQ(true, mask.Uniform());
  mask.SetValid(4, 2, false);
  EXPECT_EQ(std::nullopt, mask.Uniform());
  mask.ClearRun(0, 0, 15);
  EXPECT_EQ(false, mask.Uniform());
  mask.SetValid(4, 2, true);
  EXPECT_EQ(std::nullopt, mask.Uniform());
  mask.SetValid(4, 2, false);
  mask.SetValid(0, 0, true);
  EXPECT_EQ(std::nullopt, mask.Uniform());
}

TEST(Mask, LinesAreNotPaddedToBytes) {
  Mask mask(3, 3, {1, 1, 0, 0});  // 5 pixels a line: (0, 0) is pixel 6
  mask.SetValid(0, 0, false);
  EXPECT_EQ(0b11111101, mask.begin[0]);
  mask.SetValid(2, 2, false);  // pixel 18
  EXPECT_EQ(0b11011111, mask.begin[2]);
}

TEST(Mask, TheBitTableHoldsEveryBitOfEveryByte) {
  ASSERT_EQ(256u * 8, kBitTable.size());
  for (unsigned b = 0; b < 256; ++b)
    for (unsigned k = 0; k < 8; ++k) EXPECT_EQ((b >> (7 - k)) & 1, kBitTable[b * 8 + k]);
}

TEST(Mask, IntoABitRasterItsBytesAreCopiedVerbatim) {
  Mask mask(11, 3, {1, 2, 0, 0});
  std::mt19937 random(7);
  for (uint8_t* byte = mask.begin; byte != mask.end; ++byte) *byte = static_cast<uint8_t>(random());
  Raster bits({11, 3, 1, eDT_BIT}, {1, 2, 0, 0});
  mask.RetrieveRaster(&bits);
  EXPECT_EQ(std::vector<uint8_t>(mask.begin, mask.end),
            std::vector<uint8_t>(bits.data, bits.data + (mask.end - mask.begin)));
}

TEST(Mask, IntoABitRasterThatIsTooSmallOnlyWhatItHoldsIsCopied) {
  Mask mask(16, 4, {});  // eight bytes
  std::fill(mask.begin, mask.end, uint8_t{0x5A});
  uint8_t buffer[12];
  std::fill(std::begin(buffer), std::end(buffer), uint8_t{77});
  Raster bits({3, 1, 1, eDT_BIT}, {}, buffer);
  mask.RetrieveRaster(&bits);
  for (size_t i = 0; i < std::size(buffer); ++i) EXPECT_EQ(i < 3 ? 0x5A : 77, buffer[i]) << i;
}

TEST(Mask, IntoABitRasterThatIsLargerNothingBehindTheMaskIsRead) {
  Mask mask(3, 1, {});  // one byte
  mask.begin[0] = 0xA5;
  uint8_t buffer[64];
  std::fill(std::begin(buffer), std::end(buffer), uint8_t{77});
  Raster bits({16, 4, 1, eDT_BIT}, {}, buffer);
  mask.RetrieveRaster(&bits);
  for (size_t i = 0; i < std::size(buffer); ++i) EXPECT_EQ(i < 1 ? 0xA5 : 77, buffer[i]) << i;
}

/// 1 and 0 of every buffer pixel, one by one.
std::vector<uint8_t> BytesOf(const Mask& mask) {
  std::vector<uint8_t> bytes;
  for (int64_t y = -int64_t{mask.marginY}; y < mask.height + int64_t{mask.marginY}; ++y)
    for (int64_t x = -int64_t{mask.marginX}; x < mask.width + int64_t{mask.marginX}; ++x)
      bytes.push_back(mask.IsValid(x, y) ? 1 : 0);
  return bytes;
}

TEST(Mask, IntoAByteRasterEveryBitBecomesOneOrZeroAlsoBeyondWholeGroupsOfEight) {
  for (const uint32_t width : {1u, 4u, 7u, 8u, 9u, 13u}) {
    const ProcessWindow window{1, 1, 0, 0};
    Mask mask(width, 3, window);
    std::mt19937 random(width);
    for (uint8_t* byte = mask.begin; byte != mask.end; ++byte)
      *byte = static_cast<uint8_t>(random());
    Raster bytes({width, 3, 1, eDT_8U}, window);
    std::fill_n(bytes.data, bytes.byteSize, uint8_t{77});
    mask.RetrieveRaster(&bytes);
    EXPECT_EQ(BytesOf(mask), std::vector<uint8_t>(bytes.data, bytes.data + bytes.byteSize))
        << width;
  }
}

TEST(Mask, OtherTypesAreRefusedWithMessageFunctionAndLine) {
  const Mask mask(4, 4, {});
  DataType complexByte = eDT_8U;
  complexByte.isComplex = true;
  DataType complexBit = eDT_BIT;
  complexBit.isComplex = true;
  for (const DataType& type : {complexByte, DataTypeOf<signed char>(), DataTypeOf<unsigned short>(),
                               DataTypeOf<float>(), complexBit}) {
    Raster out({4, 4, 1, type}, {});
    std::fill_n(out.data, out.byteSize, uint8_t{77});
    try {
      mask.RetrieveRaster(&out);
      FAIL() << "taken: " << type.bits << " bits";
    } catch (const DataException& e) {
      EXPECT_EQ("We can only rasterize into a eDT_BIT or eDT_8U Raster", e.GetMessage());
      EXPECT_NE(std::string::npos, e.GetFunction().find("orin::gobs::Mask::RetrieveRaster"));
      EXPECT_EQ("basic/gobs/mask/mask", e.GetSourceFile());
      EXPECT_EQ(233u, e.GetLine());
    }
    EXPECT_EQ(77, out.data[0]);
  }
}

TEST(Mask, AsAByteRasterItKeepsGeometryAndMargins) {
  Mask mask(3, 2, {1, 1, 8, 9});
  mask.SetValid(1, 1, false);
  const auto bytes = ByteRasterOf(mask);
  EXPECT_EQ(3u, bytes->width);
  EXPECT_EQ(2u, bytes->height);
  EXPECT_EQ(1u, bytes->channelCount);
  EXPECT_EQ(eDT_8U, bytes->dataType);
  EXPECT_EQ((ProcessWindow{1, 1, 8, 9}), bytes->Window());
  EXPECT_EQ(0, *PixelAddress(*bytes, 1, 1));
  EXPECT_EQ(1, *PixelAddress(*bytes, 0, 1));
}

/// Calls pixels of value 0 no data.
class ZeroIsNoData final : public IMaskDecision {
 public:
  void Decide(const Raster& block, Mask& mask) const override {
    for (int64_t y = -int64_t{block.marginY}; y < block.height + int64_t{block.marginY}; ++y)
      for (int64_t x = -int64_t{block.marginX}; x < block.width + int64_t{block.marginX}; ++x)
        mask.SetValid(x, y, *PixelAddress(block, x, y) != 0);
  }
};

TEST(MaskDecisionBuilder, BuildsANewMaskOfTheBlocksGeometryFromTheDecision) {
  Raster block({2, 1, 1, eDT_8U}, {1, 0, 30, 40});
  const uint8_t pixels[] = {5, 0, 6, 0};
  std::copy_n(pixels, 4, block.data);
  const ZeroIsNoData decision;
  const MaskDecisionBuilder builder(&decision);
  const std::unique_ptr<Mask> mask(builder.BuildMask(block));
  EXPECT_EQ(30u, mask->x);
  EXPECT_EQ(40u, mask->y);
  EXPECT_EQ((std::vector<uint8_t>{1, 0, 1, 0}), BytesOf(*mask));
}

TEST(MaskDecisionBuilder, WhatTheDecisionThrowsPassesThrough) {
  class Broken final : public IMaskDecision {
    void Decide(const Raster&, Mask&) const override { throw DataException("no", "f", "g", 1); }
  };
  const Broken decision;
  const Raster block({2, 1, 1, eDT_8U}, {});
  EXPECT_THROW(MaskDecisionBuilder(&decision).BuildMask(block), DataException);
}

TEST(Validity, WithoutAMaskEverythingIsValidAndTheTestFoldsAway) {
  bool always = false;
  WithValidity(nullptr, [&](const auto& isValid) {
    always = std::decay_t<decltype(isValid)>::kAlways;
    EXPECT_TRUE(isValid(-5, 1000));
  });
  EXPECT_TRUE(always);
}

TEST(Validity, WithAMaskItsBitsDecide) {
  Mask mask(9, 2, {1, 1, 0, 0});
  mask.SetValid(8, 1, false);
  mask.SetValid(-1, -1, false);
  WithValidity(&mask, [&](const auto& isValid) {
    EXPECT_FALSE(isValid(8, 1));
    EXPECT_FALSE(isValid(-1, -1));
    EXPECT_TRUE(isValid(7, 1));
    EXPECT_FALSE(std::decay_t<decltype(isValid)>::kAlways);
  });
}

}  // namespace
}  // namespace orin::gobs
