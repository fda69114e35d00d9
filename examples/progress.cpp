/// Builds the levels of one file: progress on the terminal, and Ctrl-C to stop.
// SPDX-License-Identifier: MIT
//
//     progress FILE [PERCENT]     stops by itself when that much is done
//
// Exit code: 0 the levels are there, 1 stopped, 2 failed, 3 there is nothing to build.
#include <atomic>
#include <csignal>
#include <cstdio>
#include <cstdlib>

#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/counter.h"
#include "host/services/logger.h"
#include "host/services/warning.h"
#include "processes/overviews/createoverviews.h"
#include "processes/overviews/diagnosis.h"

namespace {

std::atomic<bool> isStopWanted = false;

void InstallSinks(double stopAt) {
  // Warnings and events can come from several threads at once; stdio locks its streams.
  orin::tarn::Warning::SetSink([](const orin::tarn::Report& report) {
    std::fprintf(stderr, "warning: %s\n", report.message.c_str());
  });
  orin::tarn::Logger::SetSink(
      [](const orin::tarn::Report& report) { std::printf("%s\n", report.message.c_str()); });
  // Progress comes from the thread that called Generate, and from no other.
  orin::tarn::Counter::SetSink([stopAt](float fraction, const std::string* message) {
    if (message) std::printf("%3.0f %%  %s\n", 100 * fraction, message->c_str());
    if (100 * fraction >= stopAt) isStopWanted = true;
    return !isStopWanted;
  });
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    std::fprintf(stderr, "usage: %s FILE [PERCENT]\n", argv[0]);
    return 2;
  }
  std::signal(SIGINT, [](int) { isStopWanted = true; });
  orin::drivers::RegisterTiffDriver();
  InstallSinks(argc > 2 ? std::atof(argv[2]) : 101);

  CreateFileOverviews job(argv[1]);
  job.SetPyramidFactor(2, false);
  if (job.Generate()) return 0;

  const auto [obstacle, text] = orin::overviews::Diagnose(job);
  if (obstacle != orin::overviews::Obstacle::kNone) {
    std::fprintf(stderr, "%s\n", text.c_str());
    return obstacle == orin::overviews::Obstacle::kNoLevelNeeded ? 3 : 2;
  }
  if (!isStopWanted) return 2;  // a warning told why
  std::fprintf(stderr, "stopped; the next run goes on with the levels that are missing\n");
  return 1;
}
