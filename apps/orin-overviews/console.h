/// What the tool says: results to standard output, everything else to standard error, all to a log
/// file.
// SPDX-License-Identifier: MIT
#pragma once

#include <spdlog/logger.h>

#include <functional>
#include <memory>
#include <string>

namespace orin::app {

/// A text may have several lines.
class Console {
 public:
  struct Settings {
    bool quiet = false;    ///< no results, no notices
    bool verbose = false;  ///< events too
    std::string logFile;   ///< appended to; empty: none
  };

  /// \throws orin::Exception  the log file cannot be written
  explicit Console(const Settings& settings);

  void Result(const std::string& text);
  /// The same for a text that is printed as it is, and not recorded.
  void Output(const std::string& text);
  /// Why results could not be written; empty: they were.
  const std::string& OutputProblem() const { return outputProblem_; }
  /// Something worth knowing that is neither wrong nor asked for.
  void Notice(const std::string& text);
  void Warning(const std::string& text);
  void Error(const std::string& text);
  /// What the library records of its work.
  void Event(const std::string& text);

  /// Called before a line is printed, so that a progress bar can make room; null: nothing is.
  void BeforeLine(std::function<void()> makeRoom) { makeRoom_ = std::move(makeRoom); }

 private:
  void Print(const std::string& text);
  void Say(spdlog::level::level_enum level, bool shown, const std::string& text);

  Settings settings_;
  std::shared_ptr<spdlog::logger> terminal_;  ///< standard error
  std::shared_ptr<spdlog::logger> log_;       ///< null: no log file
  std::function<void()> makeRoom_;
  std::string outputProblem_;
};

/// Warnings and events of the library go to `console` while it lives.
class LibraryReports {
 public:
  explicit LibraryReports(Console& console);
  ~LibraryReports();
  LibraryReports(const LibraryReports&) = delete;
  LibraryReports& operator=(const LibraryReports&) = delete;
};

}  // namespace orin::app
