/// The exceptions that the host throws: message, source file, function and line.
// SPDX-License-Identifier: MIT
#pragma once

#include <exception>
#include <string>

namespace orin {

/// Thrown by value, caught by reference. Copies share nothing.
class Exception : public std::exception {
 public:
  /// \param message     what happened, for the user
  /// \param sourceFile  path of the source without extension, such as `basic/gobs/mask/mask`; may
  ///                    be empty
  /// \param function    signature text of the function that threw; may be empty
  /// \param line        source line; 0 when none is given
  Exception(const std::string& message, const std::string& sourceFile, const std::string& function,
            unsigned int line);
  Exception(const Exception&);
  Exception& operator=(const Exception&);
  ~Exception() override;

  const std::string& GetMessage() const noexcept { return message_; }
  const std::string& GetSourceFile() const noexcept { return sourceFile_; }
  const std::string& GetFunction() const noexcept { return function_; }
  unsigned int GetLine() const noexcept { return line_; }
  /// The message.
  const char* what() const noexcept override;

 private:
  std::string message_;
  std::string sourceFile_;
  std::string function_;
  unsigned int line_;
};

/// Bad or unsupported data.
class DataException : public Exception {
 public:
  DataException(const std::string& message, const std::string& sourceFile,
                const std::string& function, unsigned int line);
  DataException(const DataException&);
  ~DataException() override;
};

}  // namespace orin
