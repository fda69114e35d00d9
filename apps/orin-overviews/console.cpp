// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/console.h"

#include <fmt/core.h>
#include <spdlog/sinks/basic_file_sink.h>
#include <spdlog/sinks/stdout_sinks.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string_view>

#include "apps/orin-overviews/terminaltext.h"
#include "host/services/exception.h"
#include "host/services/logger.h"
#include "host/services/text.h"
#include "host/services/warning.h"

namespace orin::app {
namespace {

std::shared_ptr<spdlog::logger> Terminal() {
  auto logger = std::make_shared<spdlog::logger>("terminal",
                                                 std::make_shared<spdlog::sinks::stderr_sink_mt>());
  logger->set_pattern("orin-overviews: %v");
  logger->set_level(spdlog::level::trace);
  return logger;
}

std::shared_ptr<spdlog::logger> LogFile(const std::string& path) {
  if (path.empty()) return nullptr;
  try {
    auto logger = std::make_shared<spdlog::logger>(
        "log", std::make_shared<spdlog::sinks::basic_file_sink_mt>(path));
    logger->set_pattern("%Y-%m-%dT%H:%M:%S.%e%z %l: %v");
    logger->set_level(spdlog::level::trace);
    logger->flush_on(spdlog::level::trace);
    return logger;
  } catch (const spdlog::spdlog_ex& error) {
    throw Exception(
        FormatString(_("%s: the log file cannot be written: %s."), path.c_str(), error.what()),
        "apps/orin-overviews/console", "orin::app::Console::Console(const Settings&)", 0);
  }
}

template <class Say>
void ForEachLine(std::string_view text, Say say) {
  while (!text.empty()) {
    const size_t end = text.find('\n');
    say(text.substr(0, end));
    if (end == std::string_view::npos) return;
    text.remove_prefix(end + 1);
  }
}

}  // namespace

Console::Console(const Settings& settings)
    : settings_(settings), terminal_(Terminal()), log_(LogFile(settings.logFile)) {}

void Console::Say(spdlog::level::level_enum level, bool shown, const std::string& text) {
  if (shown && makeRoom_) makeRoom_();
  ForEachLine(text, [&](std::string_view line) {
    const std::string printable = Printable(line);
    if (shown) terminal_->log(level, printable);
    if (log_) log_->log(level, printable);
  });
}

/// A reader at the other end of a pipe sees it when it happens, or is gone, which ends no build.
void Console::Print(const std::string& text) {
  if (!outputProblem_.empty()) return;
  if (makeRoom_) makeRoom_();
  errno = 0;
  const bool isWritten = std::fwrite(text.data(), 1, text.size(), stdout) == text.size();
  if (std::fflush(stdout) != 0 || !isWritten) outputProblem_ = std::strerror(errno);
}

void Console::Output(const std::string& text) { Print(text); }

void Console::Result(const std::string& text) {
  if (!settings_.quiet) {
    std::string lines;
    ForEachLine(text, [&](std::string_view line) { lines += Printable(line) + '\n'; });
    Print(lines);
  }
  Say(spdlog::level::info, false, text);
}

void Console::Notice(const std::string& text) { Say(spdlog::level::info, !settings_.quiet, text); }

void Console::Warning(const std::string& text) { Say(spdlog::level::warn, true, text); }

void Console::Error(const std::string& text) { Say(spdlog::level::err, true, text); }

void Console::Event(const std::string& text) { Say(spdlog::level::debug, settings_.verbose, text); }

LibraryReports::LibraryReports(Console& console) {
  tarn::Warning::SetSink([&](const tarn::Report& report) { console.Warning(report.message); });
  tarn::Logger::SetSink([&](const tarn::Report& report) { console.Event(report.message); });
}

LibraryReports::~LibraryReports() {
  tarn::Warning::SetSink(nullptr);
  tarn::Logger::SetSink(nullptr);
}

}  // namespace orin::app
