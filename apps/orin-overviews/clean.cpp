// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/clean.h"

#include <algorithm>
#include <memory>

#include "apps/orin-overviews/numberlist.h"
#include "apps/orin-overviews/terminaltext.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/formats.h"
#include "host/datasources/levelstore.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

using datasources::DatasetManager;
using datasources::IDataset;
using datasources::ILevelStore;
using datasources::IRasterDataset;
using datasources::LevelDescription;
using datasources::LevelPlace;

/// The levels of an opened file in one place; null when its format holds none there.
ILevelStore* LevelsOf(IDataset& dataset) {
  auto* raster = dynamic_cast<IRasterDataset*>(&dataset);
  return raster ? raster->GetSource()->Levels() : nullptr;
}

/// The levels to remove that are there.
std::vector<LevelDescription> Chosen(const ILevelStore* store, LevelPlace place,
                                     const CleanOptions& options) {
  std::vector<LevelDescription> chosen = store ? store->List() : std::vector<LevelDescription>();
  std::erase_if(chosen, [&](const LevelDescription& level) {
    const auto& asked = options.levels;
    return level.place != place ||
           (!asked.empty() && std::find(asked.begin(), asked.end(), level.level) == asked.end());
  });
  return chosen;
}

std::vector<unsigned> FactorsOf(const std::vector<LevelDescription>& levels) {
  std::vector<unsigned> factors;
  for (const LevelDescription& level : levels) factors.push_back(level.level);
  return factors;
}

struct Removed {
  std::vector<LevelDescription> levels;
  std::string leftOver;       ///< a side-car of an image of another size; empty: none
  bool hasReclaimed = false;  ///< free space was given back
};

/// Removes what was chosen; where no levels are named, also those that only then show, having
/// shared a factor with another one.
void RemoveFrom(ILevelStore& store, const std::vector<LevelDescription>& chosen,
                const CleanOptions& options) {
  constexpr int kMaxRounds = 1000;  // one removes all but those that share a factor
  store.Remove(FactorsOf(chosen));
  if (!options.levels.empty() || chosen.empty()) return;
  const LevelPlace place = chosen.front().place;
  auto rest = Chosen(&store, place, options);
  for (int round = 0; round < kMaxRounds && !rest.empty(); ++round) {
    store.Remove(FactorsOf(rest));
    rest = Chosen(&store, place, options);
  }
}

/// Free space that a command left which was killed is given back as well.
Removed CleanInside(const CleanOptions& options, const std::string& file) {
  std::unique_ptr<IDataset> dataset(
      DatasetManager::GetInstance()->Open(file, datasources::kReadOnly));
  ILevelStore* store = LevelsOf(*dataset);
  const auto chosen = Chosen(store, LevelPlace::kInternal, options);
  if (chosen.empty() && !(store && store->HasReclaimableSpace())) return {};
  dataset.reset();
  ZMBFormatType code = kFormatUnknown;
  datasources::IFormatDriver* driver = datasources::FormatRegistry::Instance().DriverOf(file, code);
  RemoveFrom(*driver->OpenToRemoveLevels(file)->Levels(), chosen, options);
  return {chosen, "", true};
}

/// What a build that was killed left of a side-car goes as well, and a side-car of an image of
/// another size, unless single levels are named.
Removed CleanBeside(const CleanOptions& options, const std::string& file) {
  const auto site = DatasetManager::GetInstance()->OpenSite(file, datasources::kReadOnly);
  ILevelStore* store = site->LevelsIn(LevelPlace::kSideCar);
  const auto chosen = Chosen(store, LevelPlace::kSideCar, options);
  const auto leftOver = options.levels.empty() ? site->FindLeftOver() : std::nullopt;
  if (leftOver) {
    site->RemoveLeftOver();
    return {{}, leftOver->file, false};
  }
  const bool reclaims = store && store->HasReclaimableSpace();
  if (store && (reclaims || !chosen.empty() || options.levels.empty()))
    RemoveFrom(*store, chosen, options);
  return {chosen, "", reclaims};
}

std::string RemovedText(const std::vector<LevelDescription>& removed) {
  const std::string levels = JoinNumbers(FactorsOf(removed));
  return removed.front().place == LevelPlace::kInternal
             ? FormatString(_("levels removed: %s (inside the file)"), levels.c_str())
             : FormatString(_("levels removed: %s (in %s)"), levels.c_str(),
                            removed.front().file.c_str());
}

/// One place of one file, every failure reported.
ExitCode TryPlace(const auto& clean, const CleanOptions& options, const std::string& file,
                  bool& hasRemoved, bool& hasReclaimed, Console& console) {
  try {
    const Removed removed = clean(options, file);
    hasReclaimed = hasReclaimed || removed.hasReclaimed;
    if (removed.levels.empty() && removed.leftOver.empty()) return kDone;
    hasRemoved = true;
    if (!removed.levels.empty()) console.Result(AfterFileName(file, RemovedText(removed.levels)));
    if (!removed.leftOver.empty())
      console.Result(AfterFileName(
          file, FormatString(_("removed %s, which held levels of an image of another size"),
                             removed.leftOver.c_str())));
    return kDone;
  } catch (const Exception& error) {
    console.Error(AfterFileName(file, error.GetMessage()));
  } catch (const std::exception& error) {
    console.Error(
        AfterFileName(file, FormatString(_("The levels cannot be removed: %s."), error.what())));
  }
  return kCannotBuild;
}

/// The file opens as a raster; otherwise says why not.
bool CanOpen(const std::string& file, Console& console) {
  try {
    const std::unique_ptr<IDataset> dataset(
        DatasetManager::GetInstance()->Open(file, datasources::kReadOnly));
    return true;
  } catch (const Exception& error) {
    console.Error(AfterFileName(file, error.GetMessage()));
  }
  return false;
}

ExitCode CleanFile(const CleanOptions& options, const std::string& file, Console& console) {
  if (!CanOpen(file, console)) return kCannotOpen;
  ExitCode code = kDone;
  bool hasRemoved = false;
  bool hasReclaimed = false;
  if (options.placement != Placement::kExternal)
    code = TryPlace(CleanInside, options, file, hasRemoved, hasReclaimed, console);
  if (options.placement != Placement::kInternal)
    code = std::max(code, TryPlace(CleanBeside, options, file, hasRemoved, hasReclaimed, console));
  if (code == kDone && !hasRemoved && hasReclaimed)
    console.Result(AfterFileName(file, _("no levels to remove; free space was given back")));
  else if (code == kDone && !hasRemoved)
    console.Result(AfterFileName(file, options.levels.empty()
                                           ? _("nothing to do: there are no levels")
                                           : _("nothing to do: there are no such levels")));
  return code;
}

}  // namespace

ExitCode RunClean(const CleanOptions& options, Console& console) {
  ExitCode result = kDone;
  for (const std::string& file : options.files) {
    const ExitCode code = CleanFile(options, file, console);
    if (code != kDone) result = options.files.size() == 1 ? code : kSomeFailed;
  }
  return result;
}

}  // namespace orin::app
