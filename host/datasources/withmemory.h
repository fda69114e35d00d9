/// Reading that runs out of memory refuses the file by its name.
// SPDX-License-Identifier: MIT
#pragma once

#include <new>
#include <stdexcept>
#include <string>

#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {

/// Calls `read` and returns what it returns.
/// \param function  signature of the caller, for the exception
/// \throws orin::Exception  "FILE: cannot be read: ..." when there is not enough memory; what else
///                          `read` throws passes through
template <class Read>
auto WithMemory(const std::string& file, const char* function, Read&& read) {
  const auto refuse = [&] {
    return Exception(FormatString(_("%s: cannot be read: there is not enough memory. Free memory, "
                                    "then run again."),
                                  file.c_str()),
                     "host/datasources/withmemory", function, 0);
  };
  try {
    return read();
  } catch (const std::bad_alloc&) {
    throw refuse();
  } catch (const std::length_error&) {  // a size that no memory has
    throw refuse();
  }
}

}  // namespace orin::datasources
