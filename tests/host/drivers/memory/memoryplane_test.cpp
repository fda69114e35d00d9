// SPDX-License-Identifier: MIT
#include "host/drivers/memory/memoryplane.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <random>
#include <vector>

namespace orin::drivers {
namespace {

using gobs::DataTypeOf;
using gobs::Raster;
using ::testing::ElementsAre;

std::vector<unsigned> BytesOf(const Raster& block) {
  return {block.data, block.data + block.byteSize};
}

TEST(MemoryPlane, ABlockInTheCornerHasRealNeighboursInsideAndEdgePixelsOutside) {
  std::vector<unsigned char> samples{1, 2, 3,  //
                                     4, 5, 6,  //
                                     7, 8, 9};
  Raster block({2, 2, 1, gobs::eDT_8U}, {1, 1, 1, 1});
  ReadPlanes({{3, 3, samples.data()}}, block);
  EXPECT_THAT(BytesOf(block), ElementsAre(1, 2, 3, 3,  //
                                          4, 5, 6, 6,  //
                                          7, 8, 9, 9,  //
                                          7, 8, 9, 9));
}

TEST(MemoryPlane, AMarginWiderThanTheImageIsFilledToo) {
  std::vector<unsigned char> samples{1, 2};
  Raster block({2, 1, 1, gobs::eDT_8U}, {3, 1, 0, 0});
  ReadPlanes({{2, 1, samples.data()}}, block);
  EXPECT_THAT(BytesOf(block), ElementsAre(1, 1, 1, 1, 2, 2, 2, 2,  //
                                          1, 1, 1, 1, 2, 2, 2, 2,  //
                                          1, 1, 1, 1, 2, 2, 2, 2));
}

TEST(MemoryPlane, ChannelsInterleaveInTheOrderOfThePlanes) {
  std::vector<unsigned char> first{1, 2};
  std::vector<unsigned char> second{11, 12};
  Raster block({2, 1, 3, gobs::eDT_8U}, {});
  ReadPlanes({{2, 1, second.data()}, {2, 1, first.data()}, {2, 1, second.data()}}, block);
  EXPECT_THAT(BytesOf(block), ElementsAre(11, 1, 11, 12, 2, 12));
}

TEST(MemoryPlane, OnlyTheUsefulAreaIsWritten) {
  std::vector<unsigned char> samples(9, 0);
  Raster block({2, 1, 1, gobs::eDT_8U}, {1, 1, 1, 2});
  std::fill_n(block.data, block.byteSize, uint8_t{77});
  *PixelAddress(block, 0, 0) = 5;
  *PixelAddress(block, 1, 0) = 6;
  WritePlanes({{3, 3, samples.data()}}, block);
  EXPECT_THAT(samples, ElementsAre(0, 0, 0, 0, 0, 0, 0, 5, 6));
}

template <class T>
class MemoryPlaneOfType : public ::testing::Test {};
using PixelTypes = ::testing::Types<signed char, unsigned char, short, unsigned short, int,
                                    unsigned int, float, double, int64_t, uint64_t>;
TYPED_TEST_SUITE(MemoryPlaneOfType, PixelTypes);

TYPED_TEST(MemoryPlaneOfType, WhatWasWrittenReadsBackRealAndComplexInOneAndThreeChannels) {
  for (const bool isComplex : {false, true})
    for (const unsigned channels : {1u, 3u}) {
      const gobs::DataType type = DataTypeOf<TypeParam>(isComplex);
      std::vector<std::vector<unsigned char>> samples(
          channels, std::vector<unsigned char>(5 * 4 * SampleBytes(type), 0));
      std::vector<MemoryPlane> planes;
      for (auto& plane : samples) planes.push_back({5, 4, plane.data()});
      Raster in({5, 4, channels, type}, {});
      std::mt19937 random(3);
      std::generate_n(in.data, in.byteSize, [&] { return static_cast<uint8_t>(random()); });
      WritePlanes(planes, in);
      Raster out({5, 4, channels, type}, {});
      ReadPlanes(planes, out);
      EXPECT_EQ(BytesOf(in), BytesOf(out));
      Raster pixel({1, 1, channels, type}, {0, 0, 3, 2});
      ReadPlanes(planes, pixel);
      EXPECT_TRUE(std::equal(pixel.data, pixel.data + pixel.byteSize, PixelAddress(in, 3, 2)));
    }
}

TEST(MemoryPlane, BitsArePackedMostSignificantFirstAndRepeatTheEdge) {
  std::vector<unsigned char> samples{1, 0, 1,  //
                                     0, 0, 1};
  Raster block({3, 2, 1, gobs::eDT_BIT}, {1, 0, 0, 0});
  std::fill_n(block.data, block.byteSize, uint8_t{0});
  ReadPlanes({{3, 2, samples.data()}}, block);
  EXPECT_EQ(0b11011000, block.data[0]);  // 1 101 1, 0 00...
  EXPECT_EQ(0b11000000, block.data[1]);  // ...1 1
}

TEST(MemoryPlane, BitsThatWereReadWriteBack) {
  std::vector<unsigned char> first{1, 0, 1, 1, 0, 0, 1, 0, 1, 1};
  std::vector<unsigned char> second{0, 1, 1, 0, 0, 1, 1, 1, 0, 1};
  Raster block({5, 2, 2, gobs::eDT_BIT}, {1, 1, 0, 0});
  ReadPlanes({{5, 2, first.data()}, {5, 2, second.data()}}, block);
  std::vector<unsigned char> firstBack(10, 7);
  std::vector<unsigned char> secondBack(10, 7);
  WritePlanes({{5, 2, firstBack.data()}, {5, 2, secondBack.data()}}, block);
  EXPECT_EQ(first, firstBack);
  EXPECT_EQ(second, secondBack);
}

}  // namespace
}  // namespace orin::drivers
