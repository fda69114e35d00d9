/// The exceptions that the host throws: message, source file, function and line.
// SPDX-License-Identifier: MIT
#pragma once

#include <exception>
#include <memory>
#include <string>

namespace orin {

/// Thrown by value, caught by reference. Copying one allocates nothing and never fails, so that a
/// failure for want of memory can be kept and thrown again.
class Exception : public std::exception {
 public:
  /// \param message     what happened, for the user
  /// \param sourceFile  path of the source without extension, such as `basic/gobs/mask/mask`; may
  ///                    be empty
  /// \param function    signature text of the function that threw; may be empty
  /// \param line        source line; 0 when none is given
  Exception(const std::string& message, const std::string& sourceFile, const std::string& function,
            unsigned int line);
  Exception(const Exception&) noexcept;
  Exception& operator=(const Exception&) noexcept;
  ~Exception() override;

  const std::string& GetMessage() const noexcept { return report_->message; }
  const std::string& GetSourceFile() const noexcept { return report_->sourceFile; }
  const std::string& GetFunction() const noexcept { return report_->function; }
  unsigned int GetLine() const noexcept { return report_->line; }
  /// The message.
  const char* what() const noexcept override;

 private:
  struct Report {
    std::string message;
    std::string sourceFile;
    std::string function;
    unsigned int line;
  };

  std::shared_ptr<const Report> report_;  ///< never null, never changed
};

/// Bad or unsupported data.
class DataException : public Exception {
 public:
  DataException(const std::string& message, const std::string& sourceFile,
                const std::string& function, unsigned int line);
  DataException(const DataException&) noexcept;
  ~DataException() override;
};

}  // namespace orin
