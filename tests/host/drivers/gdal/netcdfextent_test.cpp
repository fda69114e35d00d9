// SPDX-License-Identifier: MIT
#include "host/drivers/gdal/netcdfextent.h"

#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

/// A header, byte by byte.
class Header {
 public:
  explicit Header(int version) : version_(version) { bytes_ = std::string("CDF") + char(version); }
  Header& Number(uint64_t number, int width) {
    for (int i = width - 1; i >= 0; --i) bytes_ += char(number >> (8 * i) & 255);
    return *this;
  }
  Header& Count(uint64_t number) { return Number(number, version_ == 5 ? 8 : 4); }
  Header& List(uint64_t tag, uint64_t length) { return Number(tag, 4).Count(length); }
  Header& Name(std::string name) {
    Count(name.size());
    name.resize((name.size() + 3) / 4 * 4);
    bytes_ += name;
    return *this;
  }
  Header& Begin(uint64_t position) { return Number(position, version_ == 1 ? 4 : 8); }
  const std::string& Bytes() const { return bytes_; }

 private:
  int version_;
  std::string bytes_;
};

constexpr uint64_t kDimensions = 10, kVariables = 11, kAttributes = 12;
constexpr uint64_t kShort = 3, kFloat = 5;

/// Two variables: heights (rows, 7) of shorts at 1000, and a record of 7 floats at 2000.
Header TwoVariables(int version, uint64_t records) {
  Header header(version);
  header.Count(records);
  header.List(kDimensions, 3).Name("time").Count(0).Name("rows").Count(5).Name("x").Count(7);
  header.List(kAttributes, 1).Name("title").Number(2, 4).Count(3).Number(0x61626300, 4);
  header.List(kVariables, 2);
  header.Name("heights").Count(2).Count(1).Count(2).List(0, 0).Number(kShort, 4).Count(72);
  header.Begin(1000);
  header.Name("field").Count(2).Count(0).Count(2).List(0, 0).Number(kFloat, 4).Count(28);
  return header.Begin(2000);
}

class NetcdfExtent : public GdalFiles {
 protected:
  uint64_t EndOf(const std::string& bytes) {
    WriteBytes(File("field.nc"), bytes);
    return drivers::EndOfClassicNetcdf(File("field.nc"));
  }
};

TEST_F(NetcdfExtent, IsTheEndOfTheLastRecordInEveryVersion) {
  for (const int version : {1, 2, 5})
    EXPECT_EQ(2000u + 4 * 28, EndOf(TwoVariables(version, 4).Bytes())) << version;
}

TEST_F(NetcdfExtent, IsTheEndOfTheFixedVariablesWithoutRecords) {
  EXPECT_EQ(1000u + 5 * 7 * 2, EndOf(TwoVariables(1, 0).Bytes()));
  EXPECT_EQ(1000u + 5 * 7 * 2, EndOf(TwoVariables(1, 0xFFFFFFFF).Bytes()));  // still being written
}

TEST_F(NetcdfExtent, IsUnknownForOtherFilesAndEveryPrefixOfAHeader) {
  EXPECT_EQ(0u, EndOf(""));
  EXPECT_EQ(0u, EndOf("\x89HDF\r\n\x1a\n"));
  EXPECT_EQ(0u, EndOf(std::string("CDF\x7f") + std::string(100, '\xff')));
  EXPECT_EQ(0u, EndOf(std::string("CDF\x01") + std::string(100, '\xff')));
  const std::string whole = TwoVariables(2, 4).Bytes();
  for (size_t length = 0; length < whole.size(); ++length)
    EXPECT_EQ(0u, EndOf(whole.substr(0, length))) << length;
}

}  // namespace
}  // namespace orin::tests
