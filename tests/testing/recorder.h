/// The ordered log of a recording host: calls, live objects, armed faults.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <map>
#include <mutex>
#include <string>
#include <vector>

namespace orin::testing {

/// What an armed fault throws; its message is "injected fault: OPERATION".
enum class Fault { kException, kDataException, kStdRuntimeError };

/// How many host objects are alive.
struct LiveObjects {
  int sources = 0;
  int stores = 0;
  int readers = 0;
  int writers = 0;
  int Total() const { return sources + stores + readers + writers; }
};

/// Shared by a recording host and all its objects, so that late releases are recorded too.
/// Thread-safe.
class Recorder {
 public:
  /// Logs `text`, counts the call of `operation`, and throws when a fault is armed for it.
  void Call(const std::string& operation, const std::string& text);
  /// Logs without counting: progress, reports, releases.
  void Note(const std::string& text);

  /// Throws at the n-th call (1-based, counted from now) of `operation`, or of any when it is
  /// empty.
  void Arm(const std::string& operation, size_t n, Fault fault);
  void DisarmAll();
  /// Calls since the start or the last `Clear`; of all operations when `operation` is empty.
  size_t CallCount(const std::string& operation) const;
  /// Empties the log, the counts of calls and the armed faults.
  void Clear();
  std::vector<std::string> Log() const;

  /// Adds `change` to a member of the live counts.
  void Count(int LiveObjects::*kind, int change);
  LiveObjects Live() const;

 private:
  struct ArmedFault {
    std::string operation;
    size_t callsLeft;
    Fault fault;
  };

  mutable std::mutex mutex_;
  std::vector<std::string> log_;
  std::map<std::string, size_t> calls_;
  std::vector<ArmedFault> armed_;
  LiveObjects live_;
};

}  // namespace orin::testing
