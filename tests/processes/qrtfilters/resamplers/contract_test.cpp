/// What every resampler and every factory has in common.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <memory>

#include "basic/core/typedispatch/pixeltypes.h"
#include "processes/qrtfilters/resamplers/average.h"
#include "processes/qrtfilters/resamplers/bicubic.h"
#include "processes/qrtfilters/resamplers/bilinear.h"
#include "processes/qrtfilters/resamplers/factories.h"
#include "processes/qrtfilters/resamplers/mode.h"
#include "processes/qrtfilters/resamplers/nearestneighbour.h"
#include "tests/processes/qrtfilters/resamplers/blocks.h"
#include "tests/processes/qrtfilters/resamplers/refusals.h"

namespace orin::resamplers {
namespace {

using testing::BytesOf;
using testing::EmptyBlock;
using testing::ExpectRefusal;
using testing::Shape;

/// Sets `ORIN_TARGET` (null: unsets it) for the length of a scope.
class Target {
 public:
  explicit Target(const char* value) {
    value ? setenv("ORIN_TARGET", value, 1) : unsetenv("ORIN_TARGET");
  }
  ~Target() { unsetenv("ORIN_TARGET"); }
};

template <class Factory>
std::unique_ptr<IRasterResampler> Made(const gobs::DataType& type) {
  return std::unique_ptr<IRasterResampler>(Factory().CreateResampler(type));
}

template <template <class> class Kernel, class Factory>
struct Method {
  template <class T>
  using KernelOf = Kernel<T>;
  using FactoryType = Factory;
};

template <class M>
class EveryMethod : public ::testing::Test {};
using Methods =
    ::testing::Types<Method<NearestNeighbour, NearestNeighbourResamplerFactory>,
                     Method<Average, AverageResamplerFactory>, Method<Mode, ModeResamplerFactory>,
                     Method<Bilinear, BilinearResamplerFactory>,
                     Method<Bicubic, BicubicResamplerFactory>>;
TYPED_TEST_SUITE(EveryMethod, Methods);

template <class... Ms>
constexpr size_t CountOf(::testing::Types<Ms...>) {
  return sizeof...(Ms);
}
static_assert(CountOf(Methods()) == model::kMethods.size(), "a method of the table is not tested");

template <class M, class... Ts>
void ExpectOneClassForRealAndComplex(typedispatch::TypeList<Ts...>) {
  const auto expect = []<class T>(std::type_identity<T>) {
    using Kernel = typename M::template KernelOf<T>;
    for (const bool isComplex : {false, true}) {
      const auto made = Made<typename M::FactoryType>(gobs::DataTypeOf<T>(isComplex));
      EXPECT_NE(nullptr, dynamic_cast<Kernel*>(made.get())) << typedispatch::PixelTypeName<T>();
    }
  };
  (expect(std::type_identity<Ts>{}), ...);
}

TYPED_TEST(EveryMethod, HasOneClassForTheRealAndTheComplexVariantOfEachType) {
  ExpectOneClassForRealAndComplex<TypeParam>(typedispatch::PixelTypes{});
}

TYPED_TEST(EveryMethod, TellsOneMarginThroughFactoryAndKernel) {
  using Factory = typename TypeParam::FactoryType;
  EXPECT_EQ(Factory().GetMargin(), Made<Factory>(gobs::eDT_8U)->GetMargin());
}

TYPED_TEST(EveryMethod, StartsWithoutRatioAndWithUnitPixels) {
  const typename TypeParam::template KernelOf<short> kernel;
  const ResamplerState& state = kernel.State();
  EXPECT_FALSE(state.ratioGiven || state.georeferenced || state.isComplex);
  for (const double value : {state.ratioX, state.ratioY, state.noDataValue, state.srcOriginX,
                             state.srcOriginY, state.dstOriginX, state.dstOriginY})
    EXPECT_EQ(0.0, value);
  for (const double value :
       {state.srcPixelSizeX, state.srcPixelSizeY, state.dstPixelSizeX, state.dstPixelSizeY})
    EXPECT_EQ(1.0, value);
}

TYPED_TEST(EveryMethod, KeepsTheRatioUntilItIsClearedAndGroundCoordinatesForGood) {
  typename TypeParam::template KernelOf<short> kernel;
  kernel.SetRatio(0.5, 0.25);
  EXPECT_TRUE(kernel.State().ratioGiven);
  EXPECT_EQ(0.5, kernel.State().ratioX);
  EXPECT_EQ(0.25, kernel.State().ratioY);
  kernel.SetGeoReference(1, 2, 3, 4, 5, 6, 7, 8);
  kernel.ClearRatio();
  kernel.SetNoDataValue(-7.5);
  const ResamplerState& state = kernel.State();
  EXPECT_FALSE(state.ratioGiven);
  EXPECT_TRUE(state.georeferenced);
  EXPECT_EQ(-7.5, state.noDataValue);
  const double ground[] = {state.srcOriginX,    state.srcOriginY,   state.srcPixelSizeX,
                           state.srcPixelSizeY, state.dstOriginX,   state.dstOriginY,
                           state.dstPixelSizeX, state.dstPixelSizeY};
  for (int i = 0; i < 8; ++i) EXPECT_EQ(i + 1.0, ground[i]);
}

TYPED_TEST(EveryMethod, ServesNoTypeOutsideTheList) {
  gobs::DataType odd = gobs::eDT_8U;
  odd.mantissaBits = 7;
  for (const gobs::DataType& type : {gobs::eDT_BIT, gobs::DataType{}, odd})
    ExpectRefusal("Invalid type to dispatch.", "basic/core/typedispatch/dispatchtype",
                  "static orin::typedispatch::DispatchType::Dispatch(const orin::gobs::DataType&)",
                  316, [&] { Made<typename TypeParam::FactoryType>(type); });
}

TYPED_TEST(EveryMethod, RunsOnTheCpuInAnyLetterCase) {
  for (const char* value : {static_cast<const char*>(nullptr), "", "CPU", "cpu", "Cpu"}) {
    const Target target(value);
    EXPECT_NE(nullptr, Made<typename TypeParam::FactoryType>(gobs::eDT_8U));
  }
}

TYPED_TEST(EveryMethod, HasNothingForOtherTargetsAndOnlyTheGpuIsAnnounced) {
  for (const char* value : {"CPU2", "CPUX", " CPU", "GP", "GPUS", "none", "GPU", "gpu"}) {
    const Target target(value);
    ::testing::internal::CaptureStdout();
    EXPECT_EQ(nullptr, Made<typename TypeParam::FactoryType>(gobs::eDT_8U)) << value;
    EXPECT_EQ(strcasecmp(value, "gpu") == 0 ? "Using the GPU!\n" : "",
              ::testing::internal::GetCapturedStdout());
  }
}

TYPED_TEST(EveryMethod, HasNothingForOtherTargetsEvenForTypesItDoesNotServe) {
  const Target target("TPU");
  EXPECT_EQ(nullptr, Made<typename TypeParam::FactoryType>(gobs::eDT_BIT));
}

TYPED_TEST(EveryMethod, WritesNothingOutsideTheUsefulArea) {
  typename TypeParam::template KernelOf<short> kernel;
  const auto src = EmptyBlock<short>(9, 7, {2, 3, 3, false}, 5);
  const auto dst = EmptyBlock<short>(4, 3, {2, 2, 1, false}, 77);
  kernel.Resample(src.get(), nullptr, dst.get());
  const auto view = gobs::ViewOf<short>(*dst, 1);
  for (int64_t y = -1; y < 4; ++y)
    for (int64_t x = -2; x < 6; ++x) {
      const bool useful = x >= 0 && x < 4 && y >= 0 && y < 3;
      EXPECT_EQ(useful ? 5 : 77, view.At(x, y)[0]) << x << ", " << y;
      EXPECT_EQ(useful ? 5 : 77, view.At(x, y)[1]) << x << ", " << y;
    }
}

TYPED_TEST(EveryMethod, ReadsOnlyInsideTheBufferWhereverGroundCoordinatesPoint) {
  const double inf = std::numeric_limits<double>::infinity();
  const auto src = EmptyBlock<short>(5, 4, {2, 3, 3, false}, 6);
  gobs::Mask mask(5, 4, src->Window());
  const double nan = inf - inf;
  const double origins[] = {-1e300, -5e9, -3e9,  -20., -4.,  3., 20.,
                            3e9,    5e9,  1e300, inf,  -inf, nan};
  for (const double origin : origins)
    for (const double pixel : {1.0, 0.0, -1.0, 1e-9, 1e9, nan})
      for (gobs::Mask* srcMask : {static_cast<gobs::Mask*>(nullptr), &mask}) {
        typename TypeParam::template KernelOf<short> kernel;
        kernel.SetGeoReference(0, 0, pixel, 1, origin, origin, 1, pixel);
        kernel.SetNoDataValue(6);
        const auto dst = EmptyBlock<short>(3, 3, {2, 0, 0, false}, 77);
        kernel.Resample(src.get(), srcMask, dst.get());  // the address sanitizer watches
        for (const auto& line : testing::PictureOf<short>(*dst))
          for (const short value : line) EXPECT_NE(77, value) << origin << " " << pixel;
      }
}

TYPED_TEST(EveryMethod, GivesNoDataForASourceWithoutPixels) {
  for (const auto& [width, height] : {std::pair{0u, 3u}, {3u, 0u}, {0u, 0u}}) {
    typename TypeParam::template KernelOf<short> kernel;
    kernel.SetNoDataValue(9);
    const auto src = EmptyBlock<short>(width, height, {1, 3, 3, false}, 6);
    EXPECT_EQ((testing::Picture<short>{{9, 9}}),
              testing::Resampled<short>(kernel, *src, nullptr, 2, 1));
  }
}

TYPED_TEST(EveryMethod, HasNothingToDoForADestinationWithoutRows) {
  typename TypeParam::template KernelOf<short> kernel;
  const auto src = EmptyBlock<short>(4, 4, {1, 3, 3, false}, 6);
  EXPECT_TRUE(testing::Resampled<short>(kernel, *src, nullptr, 2, 0).empty());
}

TEST(Factories, AskForTheMarginsOfTheirMethods) {
  EXPECT_EQ(0u, NearestNeighbourResamplerFactory().GetMargin());
  EXPECT_EQ(1u, AverageResamplerFactory().GetMargin());
  EXPECT_EQ(1u, ModeResamplerFactory().GetMargin());
  EXPECT_EQ(1u, BilinearResamplerFactory().GetMargin());
  EXPECT_EQ(3u, BicubicResamplerFactory().GetMargin());
}

/// Number of a virtual operation in its class's table, where the ABI tells it.
template <class Pointer>
size_t SlotOf(Pointer member) {
  size_t word = 0;
  std::memcpy(&word, &member, sizeof word);
  return (word - 1) / sizeof(void*);
}

#if defined(__x86_64__) && defined(__GNUC__)
TEST(Interfaces, KeepTheOrderOfTheirVirtualOperations) {
  EXPECT_EQ(0u, SlotOf(&IRasterResampler::Resample));
  EXPECT_EQ(1u, SlotOf(&IRasterResampler::GetMargin));
  EXPECT_EQ(2u, SlotOf(&IRasterResampler::SetRatio));
  EXPECT_EQ(3u, SlotOf(&IRasterResampler::SetComplex));
  EXPECT_EQ(4u, SlotOf(&IRasterResampler::SetGeoReference));
  EXPECT_EQ(5u, SlotOf(&IRasterResampler::ClearRatio));
  EXPECT_EQ(6u, SlotOf(&IRasterResampler::SetNoDataValue));
  EXPECT_EQ(0u, SlotOf(&IResamplerFactory::CreateResampler));
  EXPECT_EQ(1u, SlotOf(&IResamplerFactory::GetMargin));
}
#endif

TEST(Interfaces, AreDestroyedThroughTheBase) {
  EXPECT_TRUE(std::has_virtual_destructor_v<IRasterResampler>);
  EXPECT_TRUE(std::has_virtual_destructor_v<IResamplerFactory>);
}

template <class T>
class EveryType : public ::testing::Test {};
template <class... Ts>
::testing::Types<Ts...> AsTestTypes(typedispatch::TypeList<Ts...>);
TYPED_TEST_SUITE(EveryType, decltype(AsTestTypes(typedispatch::PixelTypes{})));

template <class Kernel>
void ExpectNoComplex(const std::string& name, const char* message, const char* sourceFile,
                     unsigned line, const char* type) {
  Kernel kernel;
  kernel.SetRatio(0.5, 0.5);
  ExpectRefusal(message, sourceFile,
                "void orin::resamplers::" + name + "<" + type + ">::SetComplex(bool)", line,
                [&] { kernel.SetComplex(true); });
  EXPECT_FALSE(kernel.State().isComplex);
  EXPECT_TRUE(kernel.State().ratioGiven);
  kernel.SetComplex(false);
  EXPECT_FALSE(kernel.State().isComplex);
}

TYPED_TEST(EveryType, IsRefusedAsComplexDataByModeBilinearAndBicubicEachInItsOwnWords) {
  const char* type = typedispatch::PixelTypeName<TypeParam>();
  ExpectNoComplex<Mode<TypeParam>>("Mode", "complex data not supported for this resampling method.",
                                   "processes/qrtfilters/resamplers/mode", 218, type);
  ExpectNoComplex<Bilinear<TypeParam>>("Bilinear",
                                       "Complex data is not supported for this resampling method",
                                       "processes/qrtfilters/resamplers/bilinear", 208, type);
  ExpectNoComplex<Bicubic<TypeParam>>("Bicubic",
                                      "complex data not supported for this resampling method.",
                                      "processes/qrtfilters/resamplers/bicubic", 238, type);
}

TYPED_TEST(EveryType, IsTakenAsComplexDataByNearestNeighbourAndAverage) {
  NearestNeighbour<TypeParam> nearest;
  Average<TypeParam> average;
  for (const bool isComplex : {true, false}) {
    nearest.SetComplex(isComplex);
    average.SetComplex(isComplex);
    EXPECT_EQ(isComplex, nearest.State().isComplex);
    EXPECT_EQ(isComplex, average.State().isComplex);
  }
}

TEST(PixelTypeNames, AreThoseOfTheSignatures) {
  const std::vector<std::string> expected = {
      "char",         "unsigned char", "short",  "unsigned short", "int",
      "unsigned int", "float",         "double", "__int64",        "unsigned __int64"};
  std::vector<std::string> names;
  [&]<class... Ts>(typedispatch::TypeList<Ts...>) {
    (names.emplace_back(typedispatch::PixelTypeName<Ts>()), ...);
  }(typedispatch::PixelTypes{});
  EXPECT_EQ(expected, names);
}

/// Expects the refusal of a one-channel source with these margins, and a destination left alone.
template <class Kernel>
void ExpectRefused(uint32_t marginX, uint32_t marginY, uint32_t dstChannels, const char* message) {
  Kernel kernel;
  const auto src = EmptyBlock<uint8_t>(4, 4, {1, marginX, marginY, false}, 5);
  const auto dst = EmptyBlock<uint8_t>(2, 2, {dstChannels, 1, 1, false}, 77);
  const auto before = BytesOf(*dst);
  ExpectRefusal(message, "", "", 0, [&] { kernel.Resample(src.get(), nullptr, dst.get()); });
  EXPECT_EQ(before, BytesOf(*dst));
}

/// Expects that the margin is asked in both directions, and before the channels.
template <class Kernel>
void ExpectMarginThenChannels(uint32_t margin, const char* message) {
  ExpectRefused<Kernel>(margin - 1, 5, 1, message);
  ExpectRefused<Kernel>(5, margin - 1, 1, message);
  ExpectRefused<Kernel>(0, 5, 3, message);
  ExpectRefused<Kernel>(5, 0, 3, message);
  ExpectRefused<Kernel>(margin, margin, 3, testing::kOtherChannels);
}

TEST(Refusals, AskForTheMarginFirstThenForTheChannels) {
  ExpectMarginThenChannels<Mode<uint8_t>>(1, testing::kOnePixelMargin);
  ExpectMarginThenChannels<Bilinear<uint8_t>>(1, testing::kOnePixelMargin);
  ExpectMarginThenChannels<Bicubic<uint8_t>>(3, testing::kThreePixelMargin);
  ExpectRefused<NearestNeighbour<uint8_t>>(0, 0, 3, testing::kOtherChannels);
}

TYPED_TEST(EveryType, IsRefusedWithoutAMarginByTheGeneralAverage) {
  for (const auto& [marginX, marginY] : {std::pair{0u, 5u}, {5u, 0u}, {0u, 0u}}) {
    Average<TypeParam> kernel;
    const auto src = EmptyBlock<TypeParam>(4, 4, {2, marginX, marginY, false}, 5);
    const auto dst = EmptyBlock<TypeParam>(2, 2, {2, 1, 1, false}, 77);
    const auto before = BytesOf(*dst);
    ExpectRefusal(
        "You need a 1 pixel margin to process average resampling.",
        "processes/qrtfilters/resamplers/average",
        std::string("void orin::resamplers::Average<") + typedispatch::PixelTypeName<TypeParam>() +
            ">::ResampleGeneral(orin::gobs::Raster*, orin::gobs::Mask*, orin::gobs::Raster*, "
            "double, double, double, double)",
        133, [&] { kernel.Resample(src.get(), nullptr, dst.get()); });
    EXPECT_EQ(before, BytesOf(*dst));
  }
}

}  // namespace
}  // namespace orin::resamplers
