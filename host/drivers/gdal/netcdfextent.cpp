// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/netcdfextent.h"

#include <cpl_vsi.h>

#include <algorithm>
#include <memory>
#include <stdexcept>
#include <vector>

namespace orin::drivers {
namespace {

constexpr uint64_t kMostEntries = 1u << 20;  // of a list; more is damage

/// The header is unreadable: nothing can be told.
struct Unknown : std::runtime_error {
  using std::runtime_error::runtime_error;
};

/// A variable's place: its first record when it has records.
struct Variable {
  uint64_t begin;  ///< bytes
  uint64_t bytes;  ///< of the variable, or of one record of it
  bool hasRecords;
};

/// Walks through a header, whose numbers are big-endian.
class Header {
 public:
  explicit Header(const std::string& path)
      : file_(VSIFOpenL(path.c_str(), "rb"), [](VSILFILE* f) { VSIFCloseL(f); }) {
    if (!file_) throw Unknown("no file");
    const std::string magic = Bytes(4);
    version_ = static_cast<unsigned char>(magic[3]);
    if (!magic.starts_with("CDF") || (version_ != 1 && version_ != 2 && version_ != 5))
      throw Unknown("another format");
    records_ = Count();
    isStreamed_ = records_ == (version_ == 5 ? ~uint64_t{0} : 0xFFFFFFFFu);
    ReadDimensions();
    SkipAttributes();
    ReadVariables();
  }

  uint64_t End() const {
    uint64_t end = 0, recordBytes = 0;
    const auto several = std::count_if(variables_.begin(), variables_.end(),
                                       [](const Variable& v) { return v.hasRecords; }) > 1;
    for (const Variable& variable : variables_)
      if (variable.hasRecords) recordBytes += several ? Padded(variable.bytes) : variable.bytes;
    for (const Variable& variable : variables_) {
      if (variable.hasRecords && (isStreamed_ || records_ == 0)) continue;
      const uint64_t before = variable.hasRecords ? (records_ - 1) * recordBytes : 0;
      end = std::max(end, variable.begin + before + variable.bytes);
    }
    return end;
  }

 private:
  static uint64_t Padded(uint64_t bytes) { return (bytes + 3) / 4 * 4; }

  std::string Bytes(uint64_t count) {
    if (count > kMostEntries * 8) throw Unknown("too much");
    std::string bytes(count, '\0');
    if (VSIFReadL(bytes.data(), 1, count, file_.get()) != count) throw Unknown("too short");
    return bytes;
  }
  uint64_t Number(unsigned width) {
    uint64_t number = 0;
    for (const char byte : Bytes(width)) number = number << 8 | static_cast<unsigned char>(byte);
    return number;
  }
  uint64_t Count() { return Number(version_ == 5 ? 8 : 4); }
  uint64_t ListLength() {
    Number(4);  // what the list holds; 0 when it is absent
    const uint64_t length = Count();
    if (length > kMostEntries) throw Unknown("too many entries");
    return length;
  }
  void SkipName() { Bytes(Padded(Count())); }

  static uint64_t TypeBytes(uint64_t type) {
    constexpr uint64_t kBytes[] = {0, 1, 1, 2, 4, 4, 8, 1, 2, 4, 8, 8};
    if (type == 0 || type >= std::size(kBytes)) throw Unknown("unknown type");
    return kBytes[type];
  }

  void ReadDimensions() {
    for (uint64_t left = ListLength(); left > 0; --left) {
      SkipName();
      dimensions_.push_back(Count());
    }
  }
  void SkipAttributes() {
    for (uint64_t left = ListLength(); left > 0; --left) {
      SkipName();
      const uint64_t bytes = TypeBytes(Number(4));
      Bytes(Padded(Count() * bytes));
    }
  }
  void ReadVariables() {
    for (uint64_t left = ListLength(); left > 0; --left) {
      SkipName();
      Variable variable{0, 1, false};
      const uint64_t rank = Count();
      for (uint64_t i = 0; i < rank && i < kMostEntries; ++i) {
        const uint64_t length = dimensions_.at(Count());
        if (length == 0 && i == 0) variable.hasRecords = true;
        else variable.bytes *= length;
      }
      SkipAttributes();
      variable.bytes *= TypeBytes(Number(4));
      Count();  // the size that the file gives: padded, and no more than 32 bits in old versions
      variable.begin = Number(version_ == 1 ? 4 : 8);
      variables_.push_back(variable);
    }
  }

  std::unique_ptr<VSILFILE, void (*)(VSILFILE*)> file_;
  unsigned version_ = 0;
  uint64_t records_ = 0;
  bool isStreamed_ = false;
  std::vector<uint64_t> dimensions_;  ///< 0: as many as there are records
  std::vector<Variable> variables_;
};

}  // namespace

uint64_t EndOfClassicNetcdf(const std::string& path) {
  try {
    return Header(path).End();
  } catch (...) {
    return 0;  // the library reports what it cannot read
  }
}

}  // namespace orin::drivers
