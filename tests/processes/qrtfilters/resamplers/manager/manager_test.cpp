// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/resamplermanager.h"

#include <gmock/gmock.h>

#include <type_traits>

#include "host/services/exception.h"
#include "tests/testing/fakekernel.h"

namespace orin::resamplers {
namespace {

using gobs::Raster;
using orin::testing::FakeKernelFactory;
using ::testing::ElementsAre;

class Manager : public ::testing::Test {
 protected:
  Manager() {
    std::fill_n(in_.data, in_.byteSize, uint8_t{5});
    manager_.factory = &factory_;
    manager_.xRatio = 0.5;
    manager_.yRatio = 0.25;
    manager_.noDataValue = 7;
  }

  FakeKernelFactory factory_;
  ResamplerManager manager_;
  Raster in_{{4, 4, 1, gobs::eDT_8U}, {}};
  Raster out_{{2, 1, 1, gobs::eDT_8U}, {}};
};

TEST(ResamplerManager, StartsEmpty) {
  const ResamplerManager manager;
  EXPECT_EQ(nullptr, manager.factory);
  EXPECT_EQ(nullptr, manager.resampler);
  EXPECT_EQ(gobs::DataType(), manager.dataType);
  EXPECT_EQ(1.0, manager.xRatio);
  EXPECT_EQ(1.0, manager.yRatio);
  EXPECT_EQ(nullptr, manager.maskBuilder);
  EXPECT_EQ(0.0, manager.noDataValue);
  EXPECT_FALSE(manager.complex);
}

TEST(ResamplerManager, FieldsStandInTheirOrder) {
  const ResamplerManager m;
  const void* const fields[] = {&m.factory, &m.resampler,   &m.dataType,    &m.xRatio,
                                &m.yRatio,  &m.maskBuilder, &m.noDataValue, &m.complex};
  for (size_t i = 1; i < std::size(fields); ++i) EXPECT_LT(fields[i - 1], fields[i]) << i;
  EXPECT_TRUE(std::has_virtual_destructor_v<ResamplerManager>);
}

TEST_F(Manager, WithoutAFactoryTheFirstBlockIsRefusedEvenWhenAKernelIsThere) {
  manager_.ProcessBlock(&in_, &out_);
  ASSERT_NE(nullptr, manager_.resampler);
  factory_.calls.clear();
  manager_.factory = nullptr;
  try {
    manager_.ProcessBlock(&in_, &out_);
    FAIL() << "processed";
  } catch (const Exception& e) {
    EXPECT_EQ(
        "The ResamplerManager has not been setup correctly. Ensure the IResamplerFactory has been "
        "set "
        "for the ResamplerManager before proceeding.",
        e.GetMessage());
    EXPECT_EQ("processes/qrtfilters/resamplers/resamplermanager", e.GetSourceFile());
    EXPECT_NE(std::string::npos,
              e.GetFunction().find("orin::resamplers::ResamplerManager::ProcessBlock"));
    EXPECT_NE(std::string::npos, e.GetFunction().find("orin::gobs::Raster"));
    EXPECT_EQ(37u, e.GetLine());
  }
  EXPECT_TRUE(factory_.calls.empty());
}

TEST_F(Manager, EveryBlockGetsANewKernelConfiguredBeforeItResamples) {
  manager_.ProcessBlock(&in_, &out_);
  const IRasterResampler* first = manager_.resampler;
  manager_.ProcessBlock(&in_, &out_);
  EXPECT_NE(first, manager_.resampler);
  EXPECT_THAT(factory_.calls, ElementsAre("Create(8)", "SetRatio(0.5,0.25)", "SetNoDataValue(7)",
                                          "SetComplex(false)", "Resample(no mask)", "Create(8)",
                                          "SetRatio(0.5,0.25)", "SetNoDataValue(7)",
                                          "SetComplex(false)", "Resample(no mask)"));
  EXPECT_EQ(5, out_.data[1]);
}

TEST_F(Manager, TheReplacedKernelIsNotReleasedAndTheLastOneIs) {
  {
    ResamplerManager manager;
    manager.factory = &factory_;
    for (int i = 0; i < 3; ++i) manager.ProcessBlock(&in_, &out_);
    EXPECT_EQ(3u, factory_.alive.size());
  }
  EXPECT_EQ(2u, factory_.alive.size());
}

TEST_F(Manager, TheRecordedTypeIsNeverWritten) {
  manager_.ProcessBlock(&in_, &out_);
  EXPECT_EQ(gobs::DataType(), manager_.dataType);
}

TEST_F(Manager, AKernelIsReusedOnlyForABlockWhoseTypeIsAllZero) {
  Raster typeless({4, 4, 1, {}}, {});
  Raster typelessOut({2, 1, 1, {}}, {});
  manager_.ProcessBlock(&typeless, &typelessOut);
  manager_.ProcessBlock(&typeless, &typelessOut);
  manager_.ProcessBlock(&in_, &out_);
  manager_.ProcessBlock(&typeless, &typelessOut);
  EXPECT_THAT(factory_.calls,
              ElementsAre("Create(0)", "SetRatio(0.5,0.25)", "SetNoDataValue(7)",
                          "SetComplex(false)", "Resample(no mask)", "Resample(no mask)",
                          "Create(8)", "SetRatio(0.5,0.25)", "SetNoDataValue(7)",
                          "SetComplex(false)", "Resample(no mask)", "Resample(no mask)"));
}

TEST_F(Manager, ARecordedTypeIsComparedInAllSixFields) {
  manager_.dataType = gobs::eDT_8U;
  manager_.ProcessBlock(&in_, &out_);
  factory_.calls.clear();
  manager_.ProcessBlock(&in_, &out_);
  EXPECT_THAT(factory_.calls, ElementsAre("Resample(no mask)"));
  for (int field = 0; field < 6; ++field) {
    gobs::DataType other = gobs::eDT_8U;
    if (field == 0) other.bits = 16;
    if (field == 1) other.isSigned = true;
    if (field == 2) other.isFloat = true;
    if (field == 3) other.mantissaBits = 7;
    if (field == 4) other.exponentBits = 1;
    if (field == 5) other.isComplex = true;
    manager_.dataType = other;
    factory_.calls.clear();
    manager_.ProcessBlock(&in_, &out_);
    EXPECT_EQ(5u, factory_.calls.size()) << field;
  }
}

TEST_F(Manager, TheComplexFlagReachesTheKernel) {
  manager_.complex = true;
  manager_.ProcessBlock(&in_, &out_);
  EXPECT_EQ("SetComplex(true)", factory_.calls[3]);
}

/// Calls every pixel no data, and counts.
class NothingIsValid final : public gobs::IMaskDecision {
 public:
  void Decide(const Raster& block, gobs::Mask& mask) const override {
    ++decided;
    EXPECT_EQ(block.width, mask.width);
    std::fill(mask.begin, mask.end, uint8_t{0});
  }
  mutable int decided = 0;
};

TEST_F(Manager, WithAMaskBuilderEveryBlockGetsTheMaskOfItsInput) {
  const NothingIsValid decision;
  gobs::MaskDecisionBuilder builder(&decision);
  manager_.maskBuilder = &builder;
  bool sawClearMask = false;
  factory_.before = [&](const Raster&, const gobs::Mask* mask, const Raster&) {
    sawClearMask = mask && !mask->IsValid(3, 3);
  };
  manager_.ProcessBlock(&in_, &out_);
  EXPECT_TRUE(sawClearMask);
  EXPECT_EQ("Resample(mask)", factory_.calls.back());
  manager_.ProcessBlock(&in_, &out_);
  EXPECT_EQ(2, decision.decided);
}

TEST_F(Manager, WhatTheKernelThrowsPassesThroughWithItsType) {
  const NothingIsValid decision;
  gobs::MaskDecisionBuilder builder(&decision);
  manager_.maskBuilder = &builder;
  factory_.before = [](const Raster&, const gobs::Mask*, const Raster&) {
    throw DataException("kernel", "k", "K()", 9);
  };
  EXPECT_THROW(manager_.ProcessBlock(&in_, &out_), DataException);
}

TEST_F(Manager, WhatTheMaskDecisionThrowsPassesThroughBeforeTheKernelRuns) {
  class Broken final : public gobs::IMaskDecision {
    void Decide(const Raster&, gobs::Mask&) const override {
      throw DataException("mask", "m", "M()", 9);
    }
  };
  const Broken decision;
  gobs::MaskDecisionBuilder builder(&decision);
  manager_.maskBuilder = &builder;
  EXPECT_THROW(manager_.ProcessBlock(&in_, &out_), DataException);
  EXPECT_EQ("SetComplex(false)", factory_.calls.back());
}

TEST_F(Manager, AFactoryThatGivesNoKernelEndsInAnExceptionNotInACrash) {
  factory_.makesKernels = false;
  EXPECT_THROW(manager_.ProcessBlock(&in_, &out_), Exception);
  EXPECT_THROW(manager_.ProcessBlock(&in_, &out_), Exception);
}

}  // namespace
}  // namespace orin::resamplers
