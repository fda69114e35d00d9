/// Failures in the sections, before the first and after the last of them.
// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <optional>
#include <stdexcept>
#include <typeinfo>

#include "tests/processes/qrtfilters/resamplers/parallelio/levelsetup.h"

namespace orin::parallelio {
namespace {

using gobs::Raster;
using orin::testing::Fault;

constexpr size_t kBlocks = LevelSetup::kBlocks;

struct Caught {
  std::string message;
  std::string function;
  unsigned line;
  bool isData;  ///< the derived type was kept
};

std::optional<Caught> ErrorOf(LevelSetup& level) {
  try {
    level.Process();
  } catch (const Exception& e) {
    return Caught{e.GetMessage(), e.GetFunction(), e.GetLine(), typeid(e) == typeid(DataException)};
  }
  return std::nullopt;
}

TEST(Errors, AFailedReadAheadEndsTheRunAfterItsStepAndTheBlockInHandIsNotWritten) {
  for (size_t block = 1; block < kBlocks; ++block) {
    LevelSetup level;
    level.host.FailAt("Reader.Read", block + 1, Fault::kDataException);
    const auto caught = ErrorOf(level);
    ASSERT_TRUE(caught) << block;
    EXPECT_EQ("injected fault: Reader.Read", caught->message);
    EXPECT_EQ("Reader.Read", caught->function);
    EXPECT_EQ(2u, caught->line);
    EXPECT_FALSE(caught->isData);  // inside the sections the derived type is lost
    EXPECT_LE(level.Writes(), block - 1);
    EXPECT_LE(level.Processed(), block);
    EXPECT_FALSE(level.driver.HasWrittenAll());
    EXPECT_FALSE(level.driver.IsCancelled());
    EXPECT_EQ(block, level.host.Progress().size());
  }
}

TEST(Errors, AFailedFirstReadKeepsItsTypeAndNothingElseHappens) {
  LevelSetup level;
  level.host.FailAt("Reader.Read", 1, Fault::kDataException);
  const auto caught = ErrorOf(level);
  ASSERT_TRUE(caught);
  EXPECT_TRUE(caught->isData);
  EXPECT_EQ(0u, level.Processed() + level.Writes() + level.host.Progress().size());
}

TEST(Errors, AFailedLastWriteKeepsItsTypeAndIsNotReportedAsDone) {
  LevelSetup level;
  level.host.FailAt("Writer.Write", kBlocks, Fault::kDataException);
  const auto caught = ErrorOf(level);
  ASSERT_TRUE(caught);
  EXPECT_TRUE(caught->isData);
  EXPECT_FALSE(level.driver.HasWrittenAll());
  EXPECT_EQ(kBlocks, level.host.Progress().size());  // no final report
}

TEST(Errors, AFailedWriteBehindLosesItsTypeAndNoLaterBlockIsWritten) {
  LevelSetup level(24);
  level.host.FailAt("Writer.Write", 2, Fault::kDataException);
  const auto caught = ErrorOf(level);
  ASSERT_TRUE(caught);
  EXPECT_FALSE(caught->isData);
  EXPECT_EQ("injected fault: Writer.Write", caught->message);
  EXPECT_EQ(2u, level.Writes());
}

TEST(Errors, AFailedKernelLosesItsTypeAndKeepsItsFields) {
  LevelSetup level;
  size_t blocks = 0;
  level.factory.before = [&](const Raster&, const gobs::Mask*, const Raster&) {
    if (++blocks == 2) throw DataException("margin too small", "some/kernel", "K()", 77);
  };
  const auto caught = ErrorOf(level);
  ASSERT_TRUE(caught);
  EXPECT_EQ("margin too small", caught->message);
  EXPECT_EQ("K()", caught->function);
  EXPECT_EQ(77u, caught->line);
  EXPECT_FALSE(caught->isData);
  EXPECT_EQ(2u, blocks);
  EXPECT_LE(level.Writes(), 1u);
}

TEST(Errors, AFailedPreloadIsAFailureOfTheProcessingSection) {
  LevelSetup level;
  level.driver.preloadOutput = true;
  level.host.FailAt("Writer.Read", 2);
  const auto caught = ErrorOf(level);
  ASSERT_TRUE(caught);
  EXPECT_EQ("injected fault: Writer.Read", caught->message);
}

TEST(Errors, WithoutAFactoryTheRunEndsInTheManagersException) {
  LevelSetup level;
  level.driver.factory = nullptr;
  const auto caught = ErrorOf(level);
  ASSERT_TRUE(caught);
  EXPECT_EQ(37u, caught->line);
  EXPECT_EQ(0u, level.Writes());
}

TEST(Errors, WithoutAKernelTheRunEndsInAnExceptionToo) {
  LevelSetup level;
  level.factory.makesKernels = false;
  EXPECT_TRUE(ErrorOf(level));
  EXPECT_EQ(0u, level.Writes());
}

TEST(Errors, WhenTwoSectionsFailInOneStepOneWholeExceptionComesOut) {
  for (int attempt = 0; attempt < 50; ++attempt) {
    LevelSetup level;
    level.factory.before = [&](const Raster& src, const gobs::Mask*, const Raster&) {
      if (src.y == 4) throw Exception("kernel", "kernel file", "Kernel()", 10);
    };
    level.host.FailAt("Reader.Read", 3);
    const auto caught = ErrorOf(level);
    ASSERT_TRUE(caught);
    const bool fromKernel =
        caught->message == "kernel" && caught->function == "Kernel()" && caught->line == 10;
    const bool fromReader = caught->message == "injected fault: Reader.Read" &&
                            caught->function == "Reader.Read" && caught->line == 1;
    EXPECT_TRUE(fromKernel || fromReader) << caught->message;
  }
}

TEST(Errors, EveryCallThatFailsEndsInItsExceptionAndNeverInAFinishedLevel) {
  size_t calls = 0;
  {
    LevelSetup level;
    level.Process();
    calls = level.host.CallCount();
  }
  ASSERT_EQ(2 * kBlocks, calls);
  for (size_t n = 1; n <= calls; ++n) {
    LevelSetup level;
    level.host.FailAt(n);
    EXPECT_TRUE(ErrorOf(level)) << n;
    EXPECT_FALSE(level.driver.HasWrittenAll()) << n;
  }
}

TEST(Errors, OtherTypesBeforeTheSectionsPassThrough) {
  LevelSetup level;
  level.host.FailAt("Reader.Read", 1, Fault::kStdRuntimeError);
  EXPECT_THROW(level.Process(), std::runtime_error);
}

TEST(Errors, ADriverRunsAgainAfterAnError) {
  LevelSetup level;
  level.host.FailAt("Writer.Write", 1);
  EXPECT_TRUE(ErrorOf(level));
  EXPECT_FALSE(ErrorOf(level));
  EXPECT_TRUE(level.driver.HasWrittenAll());
  EXPECT_TRUE(level.LevelIsRight());
}

TEST(ErrorHolder, KeepsTheFirstExceptionWhole) {
  ErrorHolder holder;
  EXPECT_FALSE(holder.IsSet());
  EXPECT_EQ("", holder.Get().GetMessage());
  EXPECT_EQ(0u, holder.Get().GetLine());
  holder.Offer(DataException("first", "a", "A()", 1));
  holder.Offer(Exception("second", "b", "B()", 2));
  EXPECT_TRUE(holder.IsSet());
  EXPECT_EQ("first", holder.Get().GetMessage());
  EXPECT_EQ("a", holder.Get().GetSourceFile());
  EXPECT_EQ("A()", holder.Get().GetFunction());
  EXPECT_EQ(1u, holder.Get().GetLine());
}

}  // namespace
}  // namespace orin::parallelio
