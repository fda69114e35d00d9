// SPDX-License-Identifier: MIT
#include "host/services/exception.h"

namespace orin {

Exception::Exception(const std::string& message, const std::string& sourceFile,
                     const std::string& function, unsigned int line)
    : message_(message), sourceFile_(sourceFile), function_(function), line_(line) {}
Exception::Exception(const Exception&) = default;
Exception& Exception::operator=(const Exception&) = default;
Exception::~Exception() = default;

const char* Exception::what() const noexcept { return message_.c_str(); }

DataException::DataException(const std::string& message, const std::string& sourceFile,
                             const std::string& function, unsigned int line)
    : Exception(message, sourceFile, function, line) {}
DataException::DataException(const DataException&) = default;
DataException::~DataException() = default;

}  // namespace orin
