// SPDX-License-Identifier: MIT
#include "host/datasources/levelroom.h"

#include <cinttypes>
#include <filesystem>
#include <optional>

#include <sys/statvfs.h>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

/// Bytes that this user may still write beside or into the file; none when that is not known.
std::optional<uint64_t> FreeBytesFor(const std::string& file) {
  const std::string folder = std::filesystem::path(file).parent_path().string();
  struct statvfs status;
  if (statvfs(folder.empty() ? "." : folder.c_str(), &status) != 0 || status.f_blocks == 0)
    return std::nullopt;
  return uint64_t{status.f_bavail} * status.f_frsize;
}

double MiB(uint64_t bytes) { return double(bytes) / (1 << 20); }

}  // namespace

std::string SpaceProblem(const LevelRoom& room) {
  if (room.file.empty()) return "";
  const auto available = FreeBytesFor(room.file);
  if (!available || room.bytes <= *available) return "";
  return FormatString(_("%s: the levels need about %" PRIu64 " bytes (%.1f MiB), and %" PRIu64
                        " bytes (%.1f MiB) are free. Nothing was written. Free space, or ask for "
                        "fewer or smaller levels, then run again."),
                      room.file.c_str(), room.bytes, MiB(room.bytes), *available, MiB(*available));
}

void RequireRoom(const LevelRoom& room) {
  std::string problem = room.obstacle;
  if (!problem.empty() && !room.advice.empty()) problem += " " + room.advice;
  if (problem.empty()) problem = SpaceProblem(room);
  if (!problem.empty())
    throw Exception(problem, "host/datasources/levelroom",
                    "orin::datasources::RequireRoom(const LevelRoom&)", 0);
}

}  // namespace orin::datasources
