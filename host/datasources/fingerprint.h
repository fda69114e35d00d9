/// Fingerprints of stored data: equal data has equal ones, on every machine.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <stop_token>
#include <string>

namespace orin::datasources {

class IRasterReader;

/// Characters of a fingerprint: lower-case hexadecimal digits.
inline constexpr size_t kFingerprintLength = 32;

/// XXH3, 128 bits, of everything added, in order. It tells edits from copies, not from forgeries.
class Fingerprinter {
 public:
  Fingerprinter();
  ~Fingerprinter();
  Fingerprinter(const Fingerprinter&) = delete;
  Fingerprinter& operator=(const Fingerprinter&) = delete;

  void Add(const void* bytes, size_t count);
  void AddNumber(uint64_t number);
  void AddText(const std::string& text);  ///< with its length, so that texts in a row stay apart
  std::string Text() const;

 private:
  struct State;
  std::unique_ptr<State> state_;
};

/// Of a file's bytes. \returns empty when `stop` was requested
/// \throws orin::Exception  the file cannot be read; the text names it
std::string FingerprintOfFile(const std::string& path, const std::stop_token& stop);

/// Of the pixels that `reader` delivers, for files whose own bytes change with their levels. The
/// reader's margins must be 0; it reads in blocks as wide as the raster.
/// \returns empty when `stop` was requested. \throws orin::Exception  as the reader does
std::string FingerprintOfPixels(IRasterReader& reader, const std::stop_token& stop);

}  // namespace orin::datasources
