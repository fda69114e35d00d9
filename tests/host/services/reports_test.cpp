/// Events, warnings and progress on their way to the sinks.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "host/services/counter.h"
#include "host/services/logger.h"
#include "host/services/warning.h"

namespace orin::tarn {
namespace {

/// Gives the sinks that it found back.
class Sinks : public ::testing::Test {
 protected:
  Sinks()
      : events_(Logger::SetSink({})),
        warnings_(Warning::SetSink({})),
        progress_(Counter::SetSink({})) {}
  ~Sinks() override {
    Logger::SetSink(events_);
    Warning::SetSink(warnings_);
    Counter::SetSink(progress_);
  }

 private:
  ReportSink events_;
  ReportSink warnings_;
  ProgressSink progress_;
};

TEST_F(Sinks, EventsAndWarningsArriveWithTextFileAndLineEachInItsOwnSink) {
  std::vector<Report> events;
  std::vector<Report> warnings;
  Logger::SetSink([&](const Report& report) { events.push_back(report); });
  Warning::SetSink([&](const Report& report) { warnings.push_back(report); });
  Logger::LogEvent("nothing to do", "processes/overviews/createoverviews", 724);
  Warning::Warn("bad level", "processes/overviews/createoverviews", 625);
  ASSERT_EQ(1u, events.size());
  EXPECT_EQ("nothing to do", events[0].message);
  EXPECT_EQ("processes/overviews/createoverviews", events[0].sourceFile);
  EXPECT_EQ(724u, events[0].line);
  ASSERT_EQ(1u, warnings.size());
  EXPECT_EQ("bad level", warnings[0].message);
  EXPECT_EQ(625u, warnings[0].line);
}

TEST_F(Sinks, ASinkThatThrowsDoesNotStopTheWork) {
  Logger::SetSink([](const Report&) { throw std::runtime_error("the disk is full"); });
  Warning::SetSink([](const Report&) { throw 7; });
  EXPECT_NO_THROW(Logger::LogEvent("event", "file", 1));
  EXPECT_NO_THROW(Warning::Warn("warning", "file", 1));
}

TEST_F(Sinks, WithoutSinksReportsAreDroppedAndNobodyAsksToStop) {
  EXPECT_NO_THROW(Logger::LogEvent("event", "file", 1));
  EXPECT_NO_THROW(Warning::Warn("warning", "file", 1));
  EXPECT_TRUE(Counter::Update(0.5f));
  EXPECT_TRUE(Counter::Update(0.5f, "half", nullptr));
}

TEST_F(Sinks, TheCounterPassesFractionTextAndAnswer) {
  std::vector<std::string> seen;
  Counter::SetSink([&](float fraction, const std::string* message) {
    seen.push_back(std::to_string(fraction) + (message ? " " + *message : " no text"));
    return fraction < 0.5f;
  });
  EXPECT_TRUE(Counter::Update(0.25f));
  EXPECT_FALSE(Counter::Update(0.5f, "half", nullptr));
  EXPECT_EQ((std::vector<std::string>{"0.250000 no text", "0.500000 half"}), seen);
}

TEST_F(Sinks, FractionsBeyondTheEndsAreCut) {
  std::vector<float> seen;
  Counter::SetSink([&](float fraction, const std::string*) {
    seen.push_back(fraction);
    return true;
  });
  for (const float fraction : {1.0000002f, -0.1f, 0.5f}) Counter::Update(fraction);
  EXPECT_EQ((std::vector<float>{1.0f, 0.0f, 0.5f}), seen);
}

TEST_F(Sinks, ASinkThatThrowsAtTheEndOfAllWorkIsIgnored) {
  Counter::SetSink([](float, const std::string*) -> bool { throw std::runtime_error("gone"); });
  EXPECT_THROW(Counter::Update(0.99f), std::runtime_error);
  EXPECT_TRUE(Counter::Update(1.0f));
  EXPECT_TRUE(Counter::Update(1.0f, "end", nullptr));
}

/// A sink whose state shows whether it is alive.
struct Replacing {
  std::shared_ptr<int> state = std::make_shared<int>(7);
  std::vector<int>* seen;
  void Run() const {
    Logger::SetSink({});
    Warning::SetSink({});
    Counter::SetSink({});
    seen->push_back(*state);
  }
};

TEST_F(Sinks, ASinkThatIsReplacedWhileItRunsLivesUntilItReturns) {
  std::vector<int> seen;
  const auto watch = [&] {
    Replacing sink{std::make_shared<int>(7), &seen};
    std::weak_ptr<int> alive = sink.state;
    return std::pair(sink, alive);
  };
  auto [warning, warned] = watch();
  Warning::SetSink([sink = std::move(warning)](const Report&) { sink.Run(); });
  Warning::Warn("warning", "file", 1);
  EXPECT_TRUE(warned.expired());
  auto [counter, counted] = watch();
  Counter::SetSink([sink = std::move(counter)](float, const std::string*) {
    sink.Run();
    return true;
  });
  EXPECT_TRUE(Counter::Update(0.5f));
  EXPECT_TRUE(counted.expired());
  EXPECT_EQ((std::vector<int>{7, 7}), seen);
}

TEST_F(Sinks, ASinkMayReportItself) {
  std::vector<std::string> events;
  Logger::SetSink([&](const Report& report) { events.push_back(report.message); });
  Warning::SetSink([](const Report& report) { Logger::LogEvent(report.message, "file", 1); });
  Counter::SetSink([](float fraction, const std::string*) {
    if (fraction < 0.5f) Warning::Warn("early", "file", 1);
    return fraction >= 0.5f || Counter::Update(0.75f);
  });
  EXPECT_TRUE(Counter::Update(0.25f));
  EXPECT_EQ(std::vector<std::string>{"early"}, events);
}

TEST_F(Sinks, SettingASinkReturnsTheOneReplaced) {
  int calls = 0;
  Warning::SetSink([&](const Report&) { ++calls; });
  const ReportSink former = Warning::SetSink({});
  Warning::Warn("dropped", "file", 1);
  EXPECT_EQ(0, calls);
  former({"direct", "file", 1});
  EXPECT_EQ(1, calls);
}

}  // namespace
}  // namespace orin::tarn
