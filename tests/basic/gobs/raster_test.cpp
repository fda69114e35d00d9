// SPDX-License-Identifier: MIT
#include "basic/gobs/raster.h"

#include <gtest/gtest.h>

#include <type_traits>

#include "basic/gobs/blockmemory.h"
#include "host/services/exception.h"

namespace orin::gobs {
namespace {

using parallelio::ProcessWindow;

TEST(Raster, WithoutMarginsTheFirstPixelIsTheStartOfTheBuffer) {
  const Raster raster({5, 3, 2, eDT_8U}, {0, 0, 0, 0});
  EXPECT_EQ(5u, raster.stride);
  EXPECT_EQ(3u, raster.bufferLines);
  EXPECT_EQ(5u * 3 * 2, raster.byteSize);
  EXPECT_EQ(raster.data, PixelAddress(raster, 0, 0));
}

TEST(Raster, MarginsLieOnAllFourSides) {
  const Raster raster({5, 3, 2, DataTypeOf<short>()}, {2, 1, 40, 50});
  EXPECT_EQ(5u + 2 * 2, raster.stride);
  EXPECT_EQ(3u + 2 * 1, raster.bufferLines);
  EXPECT_EQ(2u * 9 * 5 * 2, raster.byteSize);
  const uint64_t pixel = 2 * 2;
  EXPECT_EQ(raster.data + (1 * 9 + 2) * pixel, PixelAddress(raster, 0, 0));
  EXPECT_EQ(raster.data + (3 * 9 + 6) * pixel, PixelAddress(raster, 4, 2));
  EXPECT_EQ(raster.data, PixelAddress(raster, -2, -1));
  EXPECT_EQ(raster.data + raster.byteSize, PixelAddress(raster, 6, 3) + pixel);
}

TEST(Raster, KeepsTheWholeQuadrupleOfItsWindow) {
  const Raster raster({5, 3, 1, eDT_8U}, {2, 1, 40, 50});
  EXPECT_EQ(2u, raster.marginX);
  EXPECT_EQ(1u, raster.marginY);
  EXPECT_EQ((ProcessWindow{2, 1, 40, 50}), raster.Window());
  EXPECT_TRUE(raster.ownsData);
}

TEST(Raster, AComplexBlockTakesTwiceTheBytesOfTheRealOne) {
  const Raster real({4, 3, 3, DataTypeOf<float>()}, {1, 1, 0, 0});
  const Raster complex({4, 3, 3, DataTypeOf<float>(true)}, {1, 1, 0, 0});
  EXPECT_EQ(2 * real.byteSize, complex.byteSize);
  EXPECT_EQ(2u * 3 * 4, PixelAddress(complex, 1, 0) - PixelAddress(complex, 0, 0));
}

TEST(Raster, ABitBlockTakesAByteASampleAndIsAddressedByBits) {
  const Raster raster({16, 2, 1, eDT_BIT}, {0, 0, 0, 0});
  EXPECT_EQ(32u, raster.byteSize);
  EXPECT_EQ(raster.data + 1, PixelAddress(raster, 8, 0));
  EXPECT_EQ(raster.data + 2, PixelAddress(raster, 0, 1));
  EXPECT_EQ(raster.data + 2, PixelAddress(raster, 7, 1));
}

TEST(Raster, AViewOfSomebodyElsesBufferDoesNotOwnIt) {
  uint8_t buffer[12] = {};
  {
    const Raster raster({4, 3, 1, eDT_8U}, {0, 0, 0, 0}, buffer);
    EXPECT_FALSE(raster.ownsData);
    *PixelAddress(raster, 3, 2) = 9;
  }
  EXPECT_EQ(9, buffer[11]);
}

TEST(Raster, ADestroyedBlockGivesBackWhatItOwnsAndNothingElse) {
  const int before = LiveBlocks();
  uint8_t buffer[12] = {};
  {
    const Raster small({4, 3, 1, eDT_8U}, {});
    const Raster large({2048, 1024, 1, eDT_8U}, {});
    EXPECT_EQ(before + 2, LiveBlocks());
    const Raster view({4, 3, 1, eDT_8U}, {}, buffer);
    EXPECT_EQ(before + 2, LiveBlocks());
  }
  EXPECT_EQ(before, LiveBlocks());
}

TEST(Raster, BlocksOfFourGigabytesAreRefused) {
  const auto make = [](uint32_t width, uint32_t height, uint32_t channels, ProcessWindow window) {
    uint8_t nothing = 0;
    const Raster raster({width, height, channels, DataTypeOf<double>(true)}, window, &nothing);
    return raster.byteSize;
  };
  EXPECT_EQ(4294967280u, make(268435455, 1, 1, {}));
  EXPECT_THROW(make(268435456, 1, 1, {}), DataException);
  EXPECT_THROW(make(65536, 65536, 1, {}), DataException);
  EXPECT_THROW(make(1, 1, 1, {4294967295u, 0, 0, 0}), DataException);
  EXPECT_THROW(make(1, 1, 1, {0, 4294967295u, 0, 0}), DataException);
  EXPECT_EQ(0u, make(0, 4294967295u, 4, {}));
}

TEST(Raster, CopiesOfTheInformationHoldAllItsFields) {
  const RasterInfo info(7, 8, 9, DataTypeOf<double>(true));
  const RasterInfo copy(info);
  EXPECT_EQ(7u, copy.width);
  EXPECT_EQ(8u, copy.height);
  EXPECT_EQ(9u, copy.channelCount);
  EXPECT_EQ(DataTypeOf<double>(true), copy.dataType);
}

TEST(Raster, FieldsStandInTheirOrder) {
  const Raster r({1, 1, 1, eDT_8U}, {});
  const void* const fields[] = {
      &r.width, &r.height, &r.channelCount, &r.dataType, &r.marginX,  &r.marginY, &r.x,
      &r.y,     &r.stride, &r.bufferLines,  &r.data,     &r.byteSize, &r.ownsData};
  for (size_t i = 1; i < std::size(fields); ++i) EXPECT_LT(fields[i - 1], fields[i]) << i;
}

TEST(Raster, TheInformationHasOneVirtualOperationItsDestructor) {
  EXPECT_TRUE(std::has_virtual_destructor_v<RasterInfo>);
  EXPECT_TRUE((std::is_base_of_v<RasterInfo, Raster>));
  EXPECT_TRUE((std::is_base_of_v<RasterContext, Raster>));
  EXPECT_FALSE(std::is_polymorphic_v<RasterContext>);
}

TEST(BufferLayout, IndexesIn64BitArithmetic) {
  const BufferLayout layout{3, 2, 100000};
  EXPECT_EQ((2 + uint64_t{4000000}) * 100000 + 3 + 5, layout.Index(5, 4000000));
  EXPECT_EQ(0u, layout.Index(-3, -2));
}

TEST(PixelView, ReachesChannelsAndComponentsOfAPixel) {
  const Raster raster({2, 2, 3, DataTypeOf<short>(true)}, {1, 1, 0, 0});
  const PixelView<short> view = ViewOf<short>(raster, 2);
  EXPECT_EQ(reinterpret_cast<short*>(raster.data) + (1 * 4 + 1) * 6, view.At(0, 0));
  EXPECT_EQ(view.At(0, 0) + 6, view.At(1, 0));
  EXPECT_EQ(view.At(0, 0) + 4 * 6, view.At(0, 1));
  EXPECT_EQ(static_cast<void*>(view.At(1, 1)), PixelAddress(raster, 1, 1));
}

}  // namespace
}  // namespace orin::gobs
