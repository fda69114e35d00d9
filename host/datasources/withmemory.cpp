// SPDX-License-Identifier: MIT
#include "host/datasources/withmemory.h"

namespace orin::datasources {
namespace {

OutOfMemory RefusalOf(const std::string& file, const char* format, const char* function) {
  try {
    return {FormatString(format, file.c_str()), "host/datasources/withmemory", function, 0};
  } catch (const std::bad_alloc&) {
    ThrowOutOfMemory();
  }
}

}  // namespace

void RefuseForMemory(const std::string& file, const char* format, const char* function) {
  throw RefusalOf(file, format, function);
}

}  // namespace orin::datasources
