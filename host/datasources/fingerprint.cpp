// SPDX-License-Identifier: MIT
#include "host/datasources/fingerprint.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <vector>

#include <fcntl.h>
#include <unistd.h>
#include <xxhash.h>

#include "basic/gobs/raster.h"
#include "host/datasources/rasterreader.h"
#include "host/services/exception.h"
#include "host/services/text.h"

namespace orin::datasources {
namespace {

constexpr size_t kReadBytes = size_t{4} << 20;
constexpr uint64_t kBlockBytes = uint64_t{16} << 20;

/// Closes its file when it goes.
class Descriptor {
 public:
  explicit Descriptor(const std::string& path)
      : number_(open(path.c_str(), O_RDONLY | O_CLOEXEC)) {}
  ~Descriptor() {
    if (number_ >= 0) close(number_);
  }
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  int Number() const { return number_; }

 private:
  int number_;
};

}  // namespace

struct Fingerprinter::State {
  XXH3_state_t* xxh = XXH3_createState();
  State() { XXH3_128bits_reset(xxh); }
  ~State() { XXH3_freeState(xxh); }
};

Fingerprinter::Fingerprinter() : state_(std::make_unique<State>()) {}
Fingerprinter::~Fingerprinter() = default;

void Fingerprinter::Add(const void* bytes, size_t count) {
  XXH3_128bits_update(state_->xxh, bytes, count);
}

void Fingerprinter::AddNumber(uint64_t number) {
  std::array<unsigned char, 8> bytes;
  for (unsigned char& byte : bytes) {
    byte = static_cast<unsigned char>(number);
    number >>= 8;
  }
  Add(bytes.data(), bytes.size());
}

void Fingerprinter::AddText(const std::string& text) {
  AddNumber(text.size());
  Add(text.data(), text.size());
}

std::string Fingerprinter::Text() const {
  XXH128_canonical_t bytes;
  XXH128_canonicalFromHash(&bytes, XXH3_128bits_digest(state_->xxh));
  std::string text;
  for (const unsigned char byte : bytes.digest) text += FormatString("%02x", unsigned{byte});
  return text;
}

std::string FingerprintOfFile(const std::string& path, const std::stop_token& stop) {
  const auto fail = [&path] {
    throw Exception(FormatString(_("%s: cannot be read: %s."), path.c_str(), std::strerror(errno)),
                    "host/datasources/fingerprint", "FingerprintOfFile(const std::string&)", 0);
  };
  const Descriptor file(path);
  if (file.Number() < 0) fail();
  std::vector<char> bytes(kReadBytes);
  Fingerprinter fingerprint;
  while (!stop.stop_requested()) {
    const ssize_t got = read(file.Number(), bytes.data(), bytes.size());
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) fail();
    if (got == 0) return fingerprint.Text();
    fingerprint.Add(bytes.data(), static_cast<size_t>(got));
  }
  return {};
}

std::string FingerprintOfPixels(IRasterReader& reader, const std::stop_token& stop) {
  const gobs::DataType& type = reader.GetDataType();
  const uint64_t rowBytes = uint64_t{reader.GetWidth()} * reader.GetChannelCount() *
                            BytesPerComponent(type) * ComponentsPerSample(type);
  // Whole rows of stored tiles, so that none is decoded twice.
  const unsigned tileRows = std::max(1u, reader.GetTileHeight());
  const uint64_t tiles =
      std::max<uint64_t>(1, kBlockBytes / std::max<uint64_t>(1, rowBytes * tileRows));
  const auto rows = static_cast<unsigned>(std::min<uint64_t>(tiles * tileRows, reader.GetHeight()));
  Fingerprinter fingerprint;
  fingerprint.AddNumber(reader.GetWidth());
  fingerprint.AddNumber(reader.GetHeight());
  for (unsigned y = 0; y < reader.GetHeight(); y += rows) {
    if (stop.stop_requested()) return {};
    const unsigned height = std::min(rows, reader.GetHeight() - y);
    gobs::Raster block({reader.GetWidth(), height, reader.GetChannelCount(), type}, {0, 0, 0, y});
    reader.Read(block);
    fingerprint.Add(block.data, rowBytes * height);
  }
  return fingerprint.Text();
}

}  // namespace orin::datasources
