/// The parser of TIFF structure: what it understands, and that no file makes it misbehave.
// SPDX-License-Identifier: MIT
#include <random>

#include "host/drivers/tiff/structure.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

using drivers::ParseStructure;
using drivers::PositionedFile;
using drivers::TiffStructure;

class Structure : public TiffStore {
 protected:
  /// A parsed file of these bytes.
  TiffStructure Parse(const std::vector<char>& bytes) {
    const std::string name = folder_.File("structure.tif");
    std::ofstream(name, std::ios::binary).write(bytes.data(), std::streamsize(bytes.size()));
    const PositionedFile file(name, PositionedFile::Mode::kRead);
    const TiffStructure structure = ParseStructure(file);
    for (const auto& directory : structure.directories)
      for (const auto& entry : directory.entries) {
        EXPECT_LE(entry.position + entry.bytes, bytes.size());
        EXPECT_EQ(entry.bytes, ReadBytes(file, structure, entry).size());
      }
    return structure;
  }
  std::vector<char> Written(const char* mode) {
    const std::string name = folder_.File("written.tif");
    const Layout layout{.width = 90, .height = 70, .tile = 32, .mode = mode};
    WriteImage(name, layout);
    Build(name, layout, {.level = 2});
    Build(name, layout, {.level = 4});
    return BytesOf(name);
  }
};

TEST_F(Structure, IsReadInBothSizesAndByteOrders) {
  for (const char* mode : {"wl", "wb", "w8l", "w8b"}) {
    const auto bytes = Written(mode);
    const TiffStructure structure = Parse(bytes);
    EXPECT_EQ(std::string(mode).find('8') != std::string::npos, structure.isBig);
    EXPECT_EQ(bytes[0] == 'I' ? std::endian::little : std::endian::big, structure.byteOrder.order);
    ASSERT_EQ(3u, structure.directories.size());
    const PositionedFile file(folder_.File("structure.tif"), PositionedFile::Mode::kRead);
    EXPECT_EQ(90u, NumberOf(file, structure, structure.directories[0], TIFFTAG_IMAGEWIDTH, 0));
    EXPECT_EQ(22u, NumberOf(file, structure, structure.directories[2], TIFFTAG_IMAGEWIDTH, 0));
    EXPECT_EQ(5u, NumberOf(file, structure, structure.directories[2], 60000, 5));
    EXPECT_EQ(structure.directories[2].offset, structure.directories[1].next);
    EXPECT_EQ(0u, structure.directories[2].next);
    const auto* offsets = structure.directories[0].Find(TIFFTAG_TILEOFFSETS);
    ASSERT_NE(nullptr, offsets);
    EXPECT_EQ(9u, ReadNumbers(file, structure, *offsets).size());
  }
}

TEST_F(Structure, OfEveryPrefixOfAFileIsReadOrRefused) {
  for (const char* mode : {"wl", "w8b"}) {
    const auto bytes = Written(mode);
    unsigned read = 0, refused = 0;
    for (size_t length = 0; length < bytes.size(); length += length < 600 ? 1 : 37) {
      try {
        EXPECT_GE(
            3u, Parse({bytes.begin(), bytes.begin() + std::ptrdiff_t(length)}).directories.size());
        ++read;
      } catch (const Exception&) {
        ++refused;
      }
    }
    EXPECT_LT(10u, read);
    EXPECT_LT(8u, refused);
  }
}

TEST_F(Structure, OfDamagedFilesIsReadOrRefused) {
  std::mt19937 random(20);
  for (const char* mode : {"wl", "w8b"}) {
    const auto bytes = Written(mode);
    const auto directories = Parse(bytes).directories;
    unsigned read = 0;
    for (unsigned round = 0; round < 600; ++round) {
      auto damaged = bytes;
      for (unsigned change = 0; change < 1 + round % 4; ++change) {
        const size_t near = round % 3 == 0 ? 0 : directories[random() % directories.size()].offset;
        damaged[std::min(near + random() % 260, damaged.size() - 1)] = char(random());
      }
      try {
        Parse(damaged);
        ++read;
      } catch (const Exception&) {
      }
    }
    EXPECT_LT(100u, read);
  }
}

TEST_F(Structure, OfWhatIsNoTiffIsRefused) {
  const std::vector<std::string> texts = {"",
                                          "II*",
                                          "PNG....8888",
                                          std::string("II*\0\0\0\0\0", 8),
                                          std::string("MM\0*\xFF\xFF\xFF\xFF", 8),
                                          std::string("II+\0\x04\0\0\0\x10\0\0\0\0\0\0\0", 16)};
  for (const std::string& text : texts)
    EXPECT_THROW(Parse({text.begin(), text.end()}), Exception) << text;
}

}  // namespace
}  // namespace orin::tests
