// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/build.h"

#include <filesystem>
#include <memory>
#include <system_error>

#include "apps/orin-overviews/abruptend.h"
#include "apps/orin-overviews/buildnotices.h"
#include "apps/orin-overviews/buildprogress.h"
#include "apps/orin-overviews/buildreport.h"
#include "apps/orin-overviews/interruption.h"
#include "apps/orin-overviews/progressdisplay.h"
#include "apps/orin-overviews/terminaltext.h"
#include "host/datasources/datasetmanager.h"
#include "host/services/exception.h"
#include "host/services/text.h"
#include "processes/overviews/levelplanning.h"

namespace orin::app {
namespace {

using datasources::LevelPlace;
using datasources::LevelSite;
using overviews::BuildEnd;
using overviews::BuildPlan;
using overviews::BuildRequest;
using overviews::BuildResult;
using overviews::RasterFacts;

BuildRequest RequestOf(const BuildOptions& options) {
  BuildRequest request;
  request.channels = options.channels;
  request.levels = options.levels;
  request.factor = options.factor ? options.factor : GetDefaultDecimationLevels();
  if (options.method != ResampleInvalid) request.method = options.method;
  request.usualMethod =
      options.usualMethod != ResampleInvalid ? options.usualMethod : GetDefaultPyramidType();
  if (options.placement == Placement::kInternal) request.place = LevelPlace::kInternal;
  if (options.placement == Placement::kExternal) request.place = LevelPlace::kSideCar;
  request.storing = options.storing;
  request.force = options.force;
  return request;
}

/// True also for two names of one file.
bool IsSameFile(const std::string& one, const std::string& other) {
  std::error_code unknown;
  return one == other || (std::filesystem::equivalent(one, other, unknown) && !unknown);
}

/// One file, opened once: plan, build and summary.
class FileBuild {
 public:
  FileBuild(LevelSite& site, const BuildOptions& options, const Interruption& interruption,
            Console& console)
      : site_(site),
        options_(options),
        interruption_(interruption),
        console_(console),
        request_(RequestOf(options)),
        facts_(overviews::FactsOf(site, request_.storing)) {}

  /// \throws orin::Exception  the levels fit nowhere, or not where the user wants them
  ExitCode Run();

 private:
  void Error(const std::string& text) { console_.Error(AfterFileName(site_.File(), text)); }
  void Notice(const std::string& text) { console_.Notice(AfterFileName(site_.File(), text)); }
  void Result(const std::string& text) { console_.Result(AfterFileName(site_.File(), text)); }

  void Plan();
  datasources::LevelRoom Space();
  void TellBefore();
  BuildResult Build();
  ExitCode ReportEnd(const BuildResult& result);

  LevelSite& site_;
  const BuildOptions& options_;
  const Interruption& interruption_;
  Console& console_;
  BuildRequest request_;
  RasterFacts facts_;
  BuildPlan plan_;
  bool blursAlpha_ = false;
};

/// What the levels to be built take.
datasources::LevelRoom FileBuild::Space() {
  std::vector<unsigned> levels;
  for (const auto& planned : plan_.building) levels.push_back(planned.level);
  const datasources::ILevelStore* store = site_.LevelsIn(plan_.place);
  return store && !levels.empty() ? store->RoomFor(levels, plan_.channels)
                                  : datasources::LevelRoom();
}

/// Plans where the levels fit: beside a file that could not hold them, if the user leaves the
/// choice.
void FileBuild::Plan() {
  plan_ = overviews::PlanBuild(facts_, request_);
  if (plan_.fault != overviews::Fault::kNone) return;
  datasources::LevelRoom space = Space();
  if (!space.obstacle.empty() && !request_.place && IsSameFile(space.file, site_.File())) {
    const std::string reason = space.obstacle;
    request_.place = LevelPlace::kSideCar;
    plan_ = overviews::PlanBuild(facts_, request_);
    space = Space();
    if (!plan_.building.empty()) Notice(reason + " " + _("They go to a file beside it instead."));
  }
  datasources::RequireRoom(space);
  blursAlpha_ = space.blursAlpha;
}

void FileBuild::TellBefore() {
  for (const std::string& text : NoticesOf(plan_, request_, facts_, site_.File())) Notice(text);
  for (const std::string& text : WarningsOf(plan_, facts_, blursAlpha_))
    console_.Warning(AfterFileName(site_.File(), text));
}

BuildResult FileBuild::Build() {
  if (plan_.building.empty()) return {};
  if (plan_.replacesLeftOver) {
    site_.RemoveLeftOver();
    site_.LevelsIn(plan_.place)->SetOptions(request_.storing);
  }
  const auto dataset = site_.DatasetFor(plan_.place);
  const auto display = MakeProgressDisplay(console_, site_.File(), options_.quiet);
  BuildProgress progress(*display, interruption_, console_, site_.File(),
                         PlaceText(plan_.place, site_.File() + ".ovr"));
  const AbruptEnd guard([this] {
    Error(
        _("The system allows no more threads. Set OMP_NUM_THREADS=1, or raise the limit (ulimit "
          "-u), then run the same command again to resume."));
  });
  const BuildResult result = overviews::ExecuteBuild(*dataset, plan_, progress);
  display->Clear();
  return result;
}

ExitCode FileBuild::ReportEnd(const BuildResult& result) {
  const LevelState state = StateOf(site_, plan_);
  switch (result.end) {
    case BuildEnd::kCancelled:
      Error(InterruptedText(state, request_.force));
      return kInterrupted;
    case BuildEnd::kFailed:
      Error(result.reason);
      if (const std::string advice = RetryText(state, request_.force); !advice.empty())
        Error(advice);
      return kCannotBuild;
    case BuildEnd::kComplete:
      break;
  }
  Result(SummaryText(plan_, facts_, state));
  if (const std::string both = BothPlacesText(state); !both.empty() && !plan_.building.empty())
    Notice(both);
  for (const unsigned level : plan_.empty) Error(EmptyLevelText(level, facts_));
  return plan_.empty.empty() ? kDone : kWrongUsage;
}

ExitCode FileBuild::Run() {
  Plan();
  if (plan_.fault != overviews::Fault::kNone) {
    Error(FaultText(plan_, facts_, site_));
    return CodeOf(plan_.fault);
  }
  TellBefore();
  return ReportEnd(Build());
}

/// The same with every failure reported.
ExitCode TryFile(const BuildOptions& options, const std::string& file,
                 const Interruption& interruption, Console& console) {
  ExitCode code = kCannotOpen;
  try {
    // An image beside which the levels go is not opened for writing.
    const auto access =
        options.placement == Placement::kExternal ? datasources::kReadOnly : datasources::kUpdate;
    const auto site = datasources::DatasetManager::GetInstance()->OpenSite(file, access);
    FileBuild build(*site, options, interruption, console);
    code = kCannotBuild;  // the file and its side-car could be read
    return build.Run();
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
