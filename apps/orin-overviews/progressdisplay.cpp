// SPDX-License-Identifier: MIT
#include "apps/orin-overviews/progressdisplay.h"

#include <fmt/core.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>

#include "apps/orin-overviews/terminaltext.h"
#include "host/services/environment.h"
#include "host/services/text.h"

namespace orin::app {
namespace {

using Clock = std::chrono::steady_clock;

constexpr auto kRedrawInterval = std::chrono::milliseconds(100);
constexpr unsigned kUsualColumns = 80;
constexpr size_t kLongestName = 30;  // characters of the file name in the bar's line

/// Characters of an UTF-8 text.
size_t LengthOf(const std::string& text) {
  return static_cast<size_t>(
      std::count_if(text.begin(), text.end(), [](char c) { return (c & 0xC0) != 0x80; }));
}

/// The last `count` characters of an UTF-8 text.
std::string LastCharacters(const std::string& text, size_t count) {
  size_t start = text.size();
  while (start > 0 && count > 0)
    if ((text[--start] & 0xC0) != 0x80) --count;
  return text.substr(start);
}

std::string ShortName(const std::string& file) {
  const std::string name = Printable(std::filesystem::path(file).filename().string());
  return LengthOf(name) <= kLongestName ? name : "..." + LastCharacters(name, kLongestName - 3);
}

unsigned TerminalColumns() {
  winsize size = {};
  return ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col
                                                                         : kUsualColumns;
}

class Bar final : public ProgressDisplay {
 public:
  Bar(Console& console, std::string file) : console_(console), file_(std::move(file)) {
    console_.BeforeLine([this] { Clear(); });
  }
  ~Bar() override {
    Clear();
    console_.BeforeLine(nullptr);
  }

  void Show(double overall, unsigned level) override {
    const auto now = Clock::now();
    if (drawn_ && now - lastDrawn_ < kRedrawInterval) return;
    lastDrawn_ = now;
    drawn_ = true;
    fmt::print(stderr, "\r{}\x1b[K", ProgressLine(file_, level, overall, TerminalColumns() - 1));
    std::fflush(stderr);
  }
  void LevelDone(unsigned) override {}
  void Clear() override {
    if (!drawn_) return;
    fmt::print(stderr, "\r\x1b[K");
    std::fflush(stderr);
    drawn_ = false;
  }

 private:
  Console& console_;
  std::string file_;
  Clock::time_point lastDrawn_;
  bool drawn_ = false;
};

class Lines final : public ProgressDisplay {
 public:
  Lines(Console& console, std::string file) : console_(console), file_(std::move(file)) {}
  void Show(double, unsigned) override {}
  void LevelDone(unsigned level) override {
    console_.Result(FormatString(_("%s: level %u done"), Printable(file_).c_str(), level));
  }
  void Clear() override {}

 private:
  Console& console_;
  std::string file_;
};

class Nothing final : public ProgressDisplay {
 public:
  void Show(double, unsigned) override {}
  void LevelDone(unsigned) override {}
  void Clear() override {}
};

bool TerminalCanDraw() {
  return isatty(STDERR_FILENO) && core::QRTGetEnvironmentVariable("TERM") != "dumb";
}

}  // namespace

std::unique_ptr<ProgressDisplay> MakeProgressDisplay(Console& console, const std::string& file,
                                                     bool quiet) {
  if (quiet) return std::make_unique<Nothing>();
  if (TerminalCanDraw()) return std::make_unique<Bar>(console, file);
  return std::make_unique<Lines>(console, file);
}

std::string ProgressLine(const std::string& file, unsigned level, double overall,
                         unsigned columns) {
  constexpr size_t kLeastBar = 5;
  const std::string percent = FormatString("%3d%%", static_cast<int>(overall * 100));
  const std::string label = FormatString(_("%s: level %u"), ShortName(file).c_str(), level);
  const size_t taken = LengthOf(label) + percent.size() + 4;  // two brackets, two blanks
  if (taken + kLeastBar > columns) return percent.size() > columns ? "" : percent;
  const size_t width = columns - taken;
  const auto full = static_cast<size_t>(overall * static_cast<double>(width));
  return label + " [" + std::string(full, '=') + std::string(width - full, ' ') + "] " + percent;
}

}  // namespace orin::app
