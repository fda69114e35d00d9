/// Whether levels are what their image asks for: the one state machine behind every answer.
// SPDX-License-Identifier: MIT
//
//                       record?  --no--------------------------------> unverified
//                          | yes
//   inputs and image as recorded?  --no------------------------------> stale, with its reason
//                          | yes, or unknown
//        stored bytes as recorded?  --no, and some channel was valid-> changed
//                          | yes, or unknown
//             every channel valid?  --no-----------------------------> unfinished
//                          | yes
//  all of the above known and proved?  --no--------------------------> unverified
//                          | yes
//                       current
//
// A driver fills in what it sees of the image and of each level. What costs reading is asked for
// through the two functions, and only where stamps do not answer.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "host/model/levelrecord.h"

namespace orin::model {

/// How a level stands to its image.
enum class LevelStatus {
  kUnverified,  ///< present and usable; nothing proves what it was computed from
  kUnfinished,  ///< some channel is being built, or its build did not end
  kStale,       ///< computed from something else than the image gives now: no channel is valid
  kCurrent,     ///< proved: it is what its record says, computed from what the image gives now
  kChanged      ///< another program wrote into it: no channel is valid
};

/// The image as it is now.
struct ObservedImage {
  std::optional<ImageStamp> stamp;  ///< none: nothing can be told of it
  /// What a run would be told now; `channels` and `noDataOrigin` do not matter. None: unknown.
  std::optional<LevelInputs> inputs;
  /// Reads the image, at most once if it is wise. Empty when it cannot, or when the image changes.
  std::function<std::string()> fingerprint;
};

/// A stored level as it is now.
struct ObservedLevel {
  std::optional<FileStamp> holder;     ///< none: unknown
  std::string table;                   ///< digest; empty: unknown
  std::function<std::string()> bytes;  ///< reads the level; empty when it cannot
};

struct Freshness {
  LevelStatus status = LevelStatus::kUnverified;
  StaleReason reason = StaleReason::kNone;
  /// Current, but found so by reading: its stamps could be brought up to date.
  bool isStampOld = false;

  friend bool operator==(const Freshness&, const Freshness&) = default;
};

/// One answer a record, in their order. Records whose stamps agree with the image's are believed
/// what it holds, unless they contradict one another.
/// \pre as many levels as records
std::vector<Freshness> CheckFreshness(const std::vector<LevelRecord>& records,
                                      const ObservedImage& image,
                                      const std::vector<ObservedLevel>& levels);

/// A level among all levels of an image, inside and beside it.
struct Provenance {
  unsigned level = 0;
  std::string bytes;         ///< digest of what it stores; empty when unknown
  unsigned sourceLevel = 0;  ///< 1 for the image
  std::string sourceBytes;   ///< of the level that it was computed from; empty when unknown
};

/// Makes those stale that were computed from a level that is there no more as it was, and those
/// above them. A source level that was removed leaves its descendants what they are.
/// \param answers  one a level; `kCurrent`, `kUnverified` and `kUnfinished` may become `kStale`
void CheckSources(const std::vector<Provenance>& levels, std::vector<Freshness>& answers);

}  // namespace orin::model
