/// Work that runs out of memory refuses its file by name.
// SPDX-License-Identifier: MIT
#pragma once

#include <new>
#include <stdexcept>
#include <string>
#include <utility>

#include "basic/gobs/outofmemory.h"
#include "host/services/text.h"

namespace orin::datasources {

/// \throws orin::OutOfMemory  with the text, or, where there is no memory even for that, without
[[noreturn]] void RefuseForMemory(const std::string& file, const char* format,
                                  const char* function);

/// Calls `work` and returns what it returns.
/// \param format    of the text, which takes the file's name
/// \param function  signature of the caller, for the exception
/// \throws orin::OutOfMemory  the text, when there is not enough memory; what else `work` throws
///                            passes through
template <class Work>
auto WithMemory(const std::string& file, const char* format, const char* function, Work&& work) {
  try {
    return work();
  } catch (const std::bad_alloc&) {
    RefuseForMemory(file, format, function);
  } catch (const std::length_error&) {  // a size that no memory has
    RefuseForMemory(file, format, function);
  }
}

/// The same for what reads the file, with the text "FILE: cannot be read: ...".
template <class Read>
auto ReadWithMemory(const std::string& file, const char* function, Read&& read) {
  return WithMemory(file,
                    _("%s: cannot be read: there is not enough memory. Free memory, "
                      "then run again."),
                    function, std::forward<Read>(read));
}

}  // namespace orin::datasources
