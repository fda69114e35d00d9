// SPDX-License-Identifier: MIT
#include "processes/qrtfilters/resamplers/parallelio/tarnupdatestrategy.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "tests/testing/recordinghost.h"
#include "tests/testing/virtualslot.h"

namespace orin::parallelio {
namespace {

using logging::IAlgorithmStatusManager;
using orin::testing::RecordingHost;
using orin::testing::SlotOf;
using ::testing::ElementsAre;

TEST(TARNUpdateStrategy, OperationsStandInTheirSlots) {
  using Plain = void (IAlgorithmStatusManager::*)(float);
  using WithText = void (IAlgorithmStatusManager::*)(float, const std::string&);
  EXPECT_EQ(0u, SlotOf(&IAlgorithmStatusManager::IsCancelled));
  EXPECT_EQ(1u, SlotOf(static_cast<WithText>(&IAlgorithmStatusManager::Update)));
  EXPECT_EQ(2u, SlotOf(static_cast<Plain>(&IAlgorithmStatusManager::Update)));
  EXPECT_EQ(3u, SlotOf(&IAlgorithmStatusManager::SetRange));
  EXPECT_EQ(4u, SlotOf(&IAlgorithmStatusManager::SetEnabled));
  EXPECT_EQ(5u, SlotOf(&IAlgorithmStatusManager::GetStart));
  EXPECT_EQ(6u, SlotOf(&IAlgorithmStatusManager::GetEnd));
  struct Longer : IAlgorithmStatusManager {
    virtual void Next() = 0;
  };
  EXPECT_EQ(9u, SlotOf(&Longer::Next));  // the destructor took 7 and 8
}

TEST(TARNUpdateStrategy, StartsWithTheWholeRangeEnabledAndGoingOn) {
  const TARNUpdateStrategy update;
  EXPECT_EQ(0.0f, update.start);
  EXPECT_EQ(1.0f, update.end);
  EXPECT_TRUE(update.enabled);
  EXPECT_FALSE(update.cancelled);
  EXPECT_EQ(nullptr, update.callback);
  EXPECT_EQ(nullptr, update.userData);
  EXPECT_FALSE(update.IsCancelled());
}

TEST(TARNUpdateStrategy, FieldsStandInTheirOrder) {
  const TARNUpdateStrategy u;
  const void* const fields[] = {&u.start,     &u.end,      &u.enabled,
                                &u.cancelled, &u.callback, &u.userData};
  for (size_t i = 1; i < std::size(fields); ++i) EXPECT_LT(fields[i - 1], fields[i]) << i;
}

TEST(TARNUpdateStrategy, MapsFractionsIntoItsRangeInSinglePrecision) {
  RecordingHost host;
  TARNUpdateStrategy update;
  update.SetRange(0.1f, 0.7f);
  EXPECT_EQ(0.1f, update.GetStart());
  EXPECT_EQ(0.7f, update.GetEnd());
  const volatile float width = 0.7f - 0.1f;
  const volatile float product = width * (1.0f / 3.0f);
  update.Update(1.0f / 3.0f);
  update.Update(0.0f);
  EXPECT_THAT(host.Progress(), ElementsAre(product + 0.1f, 0.1f));
}

TEST(TARNUpdateStrategy, TheCounterGetsTheTextWhenThereIsOne) {
  RecordingHost host;
  TARNUpdateStrategy update;
  update.Update(0.5f, "half");
  update.Update(0.75f);
  EXPECT_THAT(host.Log(), ElementsAre("Update(0.5,half)", "Update(0.75)"));
}

struct Seen {
  std::vector<std::string> calls;
  int answer = 1;
};

int Remember(double fraction, const char* message, void* userData) {
  auto& seen = *static_cast<Seen*>(userData);
  seen.calls.push_back(std::to_string(fraction) + " " + (message ? message : "null"));
  return seen.answer;
}

TEST(TARNUpdateStrategy, ACallbackReplacesTheCounter) {
  RecordingHost host;
  Seen seen;
  TARNUpdateStrategy update;
  update.callback = &Remember;
  update.userData = &seen;
  update.Update(0.25f);
  update.Update(0.5f, "half");
  EXPECT_THAT(seen.calls, ElementsAre("0.250000 null", "0.500000 half"));
  EXPECT_TRUE(host.Log().empty());
  seen.answer = -1;  // anything but 0 means go on
  update.Update(0.6f);
  EXPECT_FALSE(update.IsCancelled());
  seen.answer = 0;
  update.Update(0.7f);
  EXPECT_TRUE(update.IsCancelled());
}

TEST(TARNUpdateStrategy, ARefusalCancelsOnlyBelowTheEndOfTheWholeRun) {
  RecordingHost host;
  host.RefuseProgressAt(1, true);
  TARNUpdateStrategy update;
  update.Update(1.0f);
  EXPECT_FALSE(update.IsCancelled());
  update.SetRange(0.0f, 0.5f);
  update.Update(1.0f);
  EXPECT_TRUE(update.IsCancelled());
}

TEST(TARNUpdateStrategy, OnceCancelledStaysCancelled) {
  RecordingHost host;
  host.RefuseProgressAt(1);
  TARNUpdateStrategy update;
  update.Update(0.5f, "half");
  update.Update(0.6f);
  EXPECT_TRUE(update.IsCancelled());
}

TEST(TARNUpdateStrategy, DisabledItReportsNothingAndCannotBeCancelled) {
  RecordingHost host;
  host.RefuseProgressAt(1, true);
  TARNUpdateStrategy update;
  update.SetEnabled(false);
  update.Update(0.5f);
  update.Update(0.5f, "half");
  EXPECT_TRUE(host.Log().empty());
  EXPECT_FALSE(update.IsCancelled());
}

}  // namespace
}  // namespace orin::parallelio
