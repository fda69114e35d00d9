/// How finished channels of a level become a level of an ERDAS Imagine file.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <string>

#include "host/datasources/levelstore.h"
#include "host/drivers/hfa/hfacatalogue.h"

namespace orin::drivers {

/// Channels are finished one by one, and other programs are to see them all at once: those that
/// are finished wait, known to an item of the file alone, until none is missing.
///
///     channel 1   pixels, part 1, sync;  tree' with the item "part 1, -, -",  sync;  root   *
///     channel 2   pixels, part 2, sync;  the item's text: where part 2 is,    sync;  valid  *
///     channel 3   pixels, part 3, sync;  tree' without the item, with parts and record, sync; root
///
/// Wherever that stops, other programs see the level as it was before, or as it is at the end; at
/// each * the channels so far are finished, and the next run makes the missing ones only.
class HfaLevelCommit {
 public:
  /// All of them outlive the commit.
  HfaLevelCommit(const std::string& path, const HfaCatalogue& catalogue,
                 const datasources::IRasterSource& image)
      : path_(path), catalogue_(catalogue), image_(image) {}

  /// What the level's channels that wait are with these `parts`, nodes in the file, which `record`
  /// describes. Those that were computed in another way, or from another image, wait no more.
  HfaPendingLevel Joined(unsigned level, const HfaRecord& record,
                         const std::map<unsigned, uint32_t>& parts) const;
  /// Stores channels that wait: as a level, where none that gets levels is missing or not valid.
  /// \throws orin::Exception  the file cannot be written: it is what it was
  void Store(unsigned level, const HfaPendingLevel& pending) const;
  /// Puts another text over that of the stored level's record.
  /// \throws orin::Exception  the file cannot be written
  void StoreRecord(unsigned level, const HfaRecord& record) const;

 private:
  bool IsWhole(unsigned level, const HfaPendingLevel& pending) const;
  bool IsStoredAlike(unsigned channel, unsigned level, const HfaRecord& record) const;
  void StoreLevel(unsigned level, const HfaPendingLevel& pending) const;
  void StoreWaiting(unsigned level, const HfaPendingLevel& pending) const;

  const std::string& path_;
  const HfaCatalogue& catalogue_;
  const datasources::IRasterSource& image_;
};

}  // namespace orin::drivers
