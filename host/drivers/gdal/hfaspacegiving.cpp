/// How levels leave an ERDAS Imagine file, and how the space goes that replaced and removed levels
/// had.
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <exception>
#include <optional>

#include "host/drivers/gdal/hfalevelstore.h"
#include "host/drivers/gdal/hfaremoval.h"
#include "host/drivers/gdal/hfaspace.h"
#include "host/services/text.h"

namespace orin::drivers {

void HfaLevelStore::Remove(const std::vector<unsigned>& levels) {
  const std::lock_guard lock(mutex_);
  std::vector<std::string> items;
  std::optional<unsigned> going;
  for (const auto& names : pyramid_.channels)
    for (const HfaLevelName& name : names)
      if (std::find(levels.begin(), levels.end(), name.factor) != levels.end()) {
        going = name.factor;
        items.push_back(HfaRecordKey(name.factor));
      }
  if (!going) return;
  if (!mayChange_) Fail(_("%s: is open for reading only; level %u cannot be removed."), *going);
  LockFile();
  BeginChange();
  freed_.Add(RemoveHfaLevels(path_, levels, items));
  Reload();
  GiveBackSpace();
  Settle();
}

/// Cuts off the end of the file that nothing uses, if nobody may be reading what a level was
/// before; where there are no levels any more, even so.
void HfaLevelStore::Shorten() {
  const HfaSpace space = FindHfaSpace(path_, freed_);
  if (space.end >= space.size) return;
  const auto cut = [&] {
    if (lock_->Size() != space.size) return;
    lock_->Truncate(space.end);
    lock_->Sync();
  };
  const bool isEmpty = std::all_of(pyramid_.channels.begin(), pyramid_.channels.end(),
                                   [](const auto& levels) { return levels.empty(); });
  try {
    if (lock_->DoAlone(cut) != PositionedFile::Alone::kDone && isEmpty) cut();
  } catch (const std::exception&) {
    // deliberate: nothing is lost but space, which the next change finds again
  }
}

/// Moves levels into the space of those that they replaced, and makes the file shorter. While
/// somebody reads the file, it waits: for he may be reading what was replaced.
void HfaLevelStore::GiveBackSpace() {
  constexpr int kMostPasses = 12;         // what one pass leaves room for, the next one moves
  constexpr uint64_t kWorthAPass = 4096;  // that the last one moved
  isChanged_ = false;
  if (!lock_ || pyramid_.isSpilled) return;
  if (FindHfaSpace(path_, freed_).free.Size() == 0) return;
  BeginChange();
  const auto isAlone = [&] { return lock_->DoAlone([] {}) == PositionedFile::Alone::kDone; };
  for (int pass = 0; pass < kMostPasses && isAlone(); ++pass)
    if (MoveHfaLevelsDown(path_, FindHfaSpace(path_, freed_)) < kWorthAPass) break;
  Shorten();
  freed_ = {};
}

}  // namespace orin::drivers
