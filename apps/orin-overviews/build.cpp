// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/build.h"

#include <algorithm>
#include <filesystem>
#include <memory>
#include <system_error>

#include "apps/orin-overviews/buildplan.h"
#include "apps/orin-overviews/buildreport.h"
#include "apps/orin-overviews/interruption.h"
#include "apps/orin-overviews/numberlist.h"
#include "apps/orin-overviews/progressdisplay.h"
#include "host/datasources/datasetmanager.h"
#include "host/services/counter.h"
#include "host/services/exception.h"
#include "host/services/text.h"
#include "host/services/warning.h"
#include "processes/overviews/createoverviews.h"
#include "processes/overviews/levelplanning.h"
#include "processes/overviews/statusqueries.h"

namespace orin::app {
namespace {

CreateFileOverviews MakeJob(const BuildOptions& options, const std::string& file) {
  CreateFileOverviews job(file, options.channels);
  if (!options.levels.empty()) job.SetPyramidLevels(options.levels, options.force);
  else
    job.SetPyramidFactor(options.factor ? options.factor : GetDefaultDecimationLevels(),
                         options.force);
  job.SetPyramidType(options.method);
  if (options.placement != Placement::kAutomatic)
    job.SaveToKvx(options.placement == Placement::kExternal);
  job.ShowProgress(true);
  return job;
}

/// What one run answered.
struct Outcome {
  bool built = false;
  std::vector<unsigned> warningLines;  ///< source lines of the run's own warnings
};

/// Connects the library's progress and warnings with the tool for the length of one run.
class RunSinks {
 public:
  RunSinks(ProgressReporter& reporter, const Interruption& interruption, Console& console,
           const std::string& file, Outcome& outcome) {
    progress_ = tarn::Counter::SetSink([&](float fraction, const std::string* message) {
      reporter.Report(fraction, message != nullptr);
      return !interruption.Requested();
    });
    warnings_ = tarn::Warning::SetSink([&](const tarn::Report& report) {
      if (report.sourceFile == kRunSource) outcome.warningLines.push_back(report.line);
      console.Error(AfterFileName(file, report.message));
    });
  }
  ~RunSinks() {
    tarn::Counter::SetSink(std::move(progress_));
    tarn::Warning::SetSink(std::move(warnings_));
  }
  RunSinks(const RunSinks&) = delete;
  RunSinks& operator=(const RunSinks&) = delete;

 private:
  static constexpr char kRunSource[] = "processes/overviews/createoverviews";

  tarn::ProgressSink progress_;
  tarn::ReportSink warnings_;
};

Outcome RunJob(CreateFileOverviews& job, const BuildPlan& plan, const BuildOptions& options,
               const std::string& file, const Interruption& interruption, Console& console) {
  Outcome outcome;
  const auto display = MakeProgressDisplay(console, file, options.quiet);
  ProgressReporter reporter(ProgressModel(plan.building, plan.report), *display);
  const RunSinks sinks(reporter, interruption, console, file, outcome);
  outcome.built = job.Generate();
  reporter.Finish(outcome.built);
  return outcome;
}

/// Why the channels asked for cannot be treated; empty when they can.
std::string ChannelProblem(const CreateFileOverviews& job, const BuildPlan& plan,
                           const BuildOptions& options) {
  if (!job.ValidChannelList())
    return FormatString(_("--channels names %s, but the file's channels are 1 to %u."),
                        JoinNumbers(options.channels).c_str(), plan.channelCount);
  for (const unsigned channel : options.channels)
    if (std::binary_search(plan.bitChannels.begin(), plan.bitChannels.end(), channel))
      return FormatString(
          _("channel %u is a mask of one bit, which has no levels. Leave it out of --channels."),
          channel);
  return "";
}

/// Warns of a method that makes values which the image does not hold, where they mean something.
void WarnOfBlending(const BuildPlan& plan, const BuildOptions& options, const std::string& file,
                    Console& console) {
  const auto method = options.method == ResampleInvalid ? GetDefaultPyramidType() : options.method;
  const model::Method* const row = model::FindMethod(method);
  if (row && row->blends && plan.holdsClasses && !plan.building.empty())
    console.Warning(AfterFileName(file, BlendedClassesText()));
}

/// The code of a run that failed; says what is finished and what to do.
ExitCode ReportFailure(const Outcome& outcome, const BuildPlan& plan, const BuildOptions& options,
                       const std::string& file, bool interrupted, Console& console) {
  const LevelState state = LookAtLevels(plan, options, file);
  if (interrupted && outcome.warningLines.empty()) {
    console.Error(AfterFileName(file, InterruptedText(state, options)));
    return kInterrupted;
  }
  const unsigned line = outcome.warningLines.empty() ? 0 : outcome.warningLines.front();
  if (line == 0) console.Error(AfterFileName(file, _("The levels could not be built.")));
  const std::string advice = AdviceAfterFailure(line, state, options);
  if (!advice.empty()) console.Error(AfterFileName(file, advice));
  return CodeOfWarning(line);
}

/// An image beside which the levels go is not opened for writing.
void RefuseUpdatesFor(const BuildOptions& options) {
  datasources::DatasetManager::GetInstance()->RefuseUpdates(options.placement ==
                                                            Placement::kExternal);
}

/// True also for two names of one file.
bool IsSameFile(const std::string& one, const std::string& other) {
  std::error_code unknown;
  return one == other || (std::filesystem::equivalent(one, other, unknown) && !unknown);
}

/// The plan where its levels fit: beside a file that could not hold them, if the user leaves the
/// choice. \throws orin::Exception  they fit nowhere, or not where the user wants them
BuildPlan PlanWithRoom(BuildOptions& options, const std::string& file, Console& console) {
  BuildPlan plan = PlanBuild(options, file);
  if (!plan.room.obstacle.empty() && options.placement == Placement::kAutomatic &&
      IsSameFile(plan.room.file, file)) {
    const std::string reason = plan.room.obstacle;
    options.placement = Placement::kExternal;
    RefuseUpdatesFor(options);
    plan = PlanBuild(options, file);
    if (!plan.building.empty())
      console.Notice(AfterFileName(file, reason + " " + _("They go to a file beside it instead.")));
  }
  datasources::RequireRoom(plan.room);
  return plan;
}

/// \param options  those of the command line; the placement is decided here
ExitCode BuildFile(BuildOptions options, const std::string& file, const Interruption& interruption,
                   Console& console) {
  const BuildPlan plan = PlanWithRoom(options, file, console);
  CreateFileOverviews job = MakeJob(options, file);
  if (const std::string problem = ChannelProblem(job, plan, options); !problem.empty()) {
    console.Error(AfterFileName(file, problem));
    return kWrongUsage;
  }
  if (plan.requested.empty() || plan.channels.empty()) {
    console.Result(file + ": " + NothingToDoText(plan));
    return kDone;
  }
  if (!options.force)
    for (const PlannedLevel& planned : plan.building)
      if (planned.empty) console.Notice(AfterFileName(file, LeftOutText(plan, planned.level)));
  if (const std::string stale = StaleText(plan); !stale.empty())
    console.Notice(AfterFileName(file, stale));
  WarnOfBlending(plan, options, file, console);
  if (plan.room.blursAlpha) console.Warning(AfterFileName(file, BlurredAlphaText()));
  const Outcome outcome = RunJob(job, plan, options, file, interruption, console);
  if (!outcome.built)
    return ReportFailure(outcome, plan, options, file, interruption.Requested(), console);
  const LevelState state = LookAtLevels(plan, options, file);
  console.Result(file + ": " + SummaryText(plan, state));
  if (const std::string hidden = HiddenLevelsText(state); !hidden.empty())
    console.Notice(AfterFileName(file, hidden));
  return kDone;
}

/// Levels that are to stand inside need a file that takes them. The run would say that it does not;
/// only the file's driver says why.
/// \throws orin::Exception  with its reason
void RequireRoomInside(datasources::IDataset& dataset, const std::string& file) {
  if (dataset.GetAccessMode() != datasources::kReadOnly || !SupportsInternalOverviews(&dataset))
    return;
  try {
    const std::unique_ptr<datasources::IDataset> forUpdate(
        datasources::DatasetManager::GetInstance()->Open(file, datasources::kUpdate));
  } catch (const Exception& reason) {
    const std::string advice =
        _("Use --external instead of --internal: the levels go to a file beside it.");
    throw Exception(reason.GetMessage() + " " + advice, "apps/orin-overviews/build",
                    "orin::app::RequireRoomInside", 0);
  }
}

/// Opens the file to see that it can be built, and closes it: space is given back only where nobody
/// has the file open, this program included.
/// \param code  receives what a failure means
/// \throws orin::Exception  it cannot be opened, or takes no levels inside where they must go
void RequireFile(const BuildOptions& options, const std::string& file, ExitCode& code) {
  code = kCannotOpen;
  const auto dataset = OpenForBuild(file, options.placement);
  code = kCannotBuild;
  if (options.placement == Placement::kInternal) RequireRoomInside(*dataset, file);
}

/// The same as BuildFile with every failure reported.
ExitCode TryFile(const BuildOptions& options, const std::string& file,
                 const Interruption& interruption, Console& console) {
  ExitCode code = kCannotBuild;
  RefuseUpdatesFor(options);
  try {
    RequireFile(options, file, code);
    return BuildFile(options, file, interruption, console);
  } catch (const datasources::OptionException& error) {
    console.Error(AfterFileName(file, error.GetMessage()));
    code = kWrongUsage;
  } catch (const Exception& error) {
    console.Error(AfterFileName(file, error.GetMessage()));
  } catch (const std::exception& error) {
    console.Error(AfterFileName(file, FormatString(_("The build failed: %s."), error.what())));
  }
  return code;
}

}  // namespace

ExitCode RunBuild(const BuildOptions& options, Console& console) {
  const Interruption interruption;
  datasources::SetLevelOptions(options.storing);
  ExitCode result = kDone;
  for (size_t i = 0; i < options.files.size(); ++i) {
    if (interruption.Requested()) return kInterrupted;
    const ExitCode code = TryFile(options, options.files[i], interruption, console);
    if (code == kInterrupted) return code;
    if (code != kDone) result = options.files.size() == 1 ? code : kSomeFailed;
  }
  return result;
}

}  // namespace orin::app
