// SPDX-License-Identifier: MIT
#include "host/services/exception.h"

namespace orin {

Exception::Exception(const std::string& message, const std::string& sourceFile,
                     const std::string& function, unsigned int line)
    : report_(std::make_shared<const Report>(Report{message, sourceFile, function, line})) {}
Exception::Exception(const Exception&) noexcept = default;
Exception& Exception::operator=(const Exception&) noexcept = default;
Exception::~Exception() = default;

const char* Exception::what() const noexcept { return report_->message.c_str(); }

DataException::DataException(const std::string& message, const std::string& sourceFile,
                             const std::string& function, unsigned int line)
    : Exception(message, sourceFile, function, line) {}
DataException::DataException(const DataException&) noexcept = default;
DataException::~DataException() = default;

}  // namespace orin
