/// Turns what the GDAL library reports into exceptions.
// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace orin::drivers {

/// Collects what the library reports on this thread while the object lives; nothing is printed.
/// Some of its functions report a failure and still answer that all is well, so what was reported
/// counts as well as what was answered. Objects nest; each is used by the thread that made it.
class GdalErrors {
 public:
  GdalErrors();
  ~GdalErrors();
  GdalErrors(const GdalErrors&) = delete;
  GdalErrors& operator=(const GdalErrors&) = delete;

  bool Any() const { return any_; }
  /// The first failure in words, without a full stop.
  std::string Reason() const;
  /// Throws when a failure was reported or `succeeded` is false.
  /// \param format  a translated text with "%s" for the file and "%s" for the reason
  /// \throws orin::Exception
  void Require(bool succeeded, const char* format, const std::string& file) const;

  /// For the library.
  void Add(bool isFailure, const char* message);

 private:
  bool any_ = false;
  std::string first_;
};

/// Keeps the library from printing on threads of its own. For the process.
void SilenceGdal();

}  // namespace orin::drivers
