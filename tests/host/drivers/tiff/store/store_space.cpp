/// Where a store puts what it writes, and what becomes of the space of replaced levels.
// SPDX-License-Identifier: MIT
#include <filesystem>

#include <sys/wait.h>
#include <unistd.h>

#include "host/drivers/tiff/freespacemap.h"
#include "host/services/exception.h"
#include "tests/host/drivers/common/byterangestext.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

using drivers::ByteRanges;
using drivers::PositionedFile;

const Layout kImage{
    .width = 200, .height = 160, .samples = 3, .tile = 32, .photometric = PHOTOMETRIC_RGB};

class Space : public TiffStore {
 protected:
  Space() : file_(folder_.File("image.tif")) { WriteImage(file_, kImage); }

  void BuildAll(const std::string& method = "NEAREST", unsigned edge = 100) const {
    for (const unsigned level : {2u, 4u, 8u})
      Build(file_, kImage, {.level = level, .edge = edge, .method = method});
  }
  std::string WrongLevels() const {
    std::string wrong;
    for (uint16_t i = 0; i < 3; ++i)
      wrong += WrongTile(file_, uint16_t(i + 1), LevelLayout(kImage, 2u << i));
    return wrong;
  }
  uint64_t Size() const { return std::filesystem::file_size(file_); }
  drivers::FreeSpaceMap Map() const {
    const PositionedFile file(file_, PositionedFile::Mode::kRead);
    return drivers::FindFreeSpace(file, drivers::ParseStructure(file));
  }
  /// Where the values of metadata items stand. \param item  up to and with ">", then what follows
  std::vector<uint64_t> PlacesOf(const std::string& item) const {
    const std::vector<char> bytes = BytesOf(file_);
    const std::string text(bytes.begin(), bytes.end());
    std::vector<uint64_t> places;
    for (size_t at = text.find(item); at != text.npos; at = text.find(item, at + 1))
      places.push_back(at + item.find('>') + 1);
    return places;
  }
  void Append(const std::string& text) const { std::ofstream(file_, std::ios::app) << text; }

  std::string file_;
};

TEST_F(Space, OfTenRebuildsIsThatOfOne) {
  BuildAll();
  const uint64_t first = Size();
  for (int i = 0; i < 10; ++i) {
    BuildAll(i % 2 ? "NEAREST" : "AVERAGE", 31);
    EXPECT_LE(Size(), first + first / 20) << "rebuild " << i;
    EXPECT_EQ("", WrongLevels());
  }
}

TEST_F(Space, OfAReplacedLevelStaysAsItIsWhileAnotherProgramHasTheFileOpen) {
  BuildAll();
  const auto before = BytesOf(file_);
  ByteRanges mayChange;  // the link, the old level's validity, what the others know of the file
  const auto link = LinkOfFirst(file_);
  mayChange.Add({link, link + 4});
  const auto valid = PlacesOf("ORIN_VALID\">111<");
  ASSERT_EQ(3u, valid.size());
  mayChange.Add({valid[0], valid[0] + 3});
  const auto images = PlacesOf("ORIN_IMAGE\">");
  const auto contents = PlacesOf("ORIN_CONTENT\">");
  ASSERT_EQ(3u, images.size());
  ASSERT_EQ(3u, contents.size());
  for (const size_t level : {1u, 2u}) {
    const uint64_t imageEnd = images[level] + model::kImageTextLength;
    mayChange.Add({imageEnd - model::kImageStampTextLength, imageEnd});
    const uint64_t contentEnd = contents[level] + model::kContentTextLength;
    mayChange.Add({contentEnd - model::kFileStampLength, contentEnd});
  }
  std::ifstream reader(file_);
  Build(file_, kImage, {.level = 2});
  const auto after = BytesOf(file_);
  ASSERT_GT(after.size(), before.size());
  EXPECT_EQ("000", std::string(&after[valid[0]], 3));
  for (size_t i = 0; i < before.size(); ++i)
    ASSERT_TRUE(before[i] == after[i] || mayChange.Holds({i, i + 1})) << "byte " << i;
  reader.close();
  Build(file_, kImage, {.level = 2});
  EXPECT_LE(Size(), before.size() + 64);
  EXPECT_EQ("", WrongLevels());
}

TEST_F(Space, ThatAKilledBuildTookIsTakenAgain) {
  uint64_t longest = 0;
  for (int i = 0; i < 5; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      Build(file_, kImage, {.level = 2, .edge = 40, .goesOn = [](unsigned block) {
                              if (block == 4) _exit(0);
                              return true;
                            }});
      _exit(1);
    }
    int status = -1;
    ASSERT_EQ(child, waitpid(child, &status, 0));
    ASSERT_EQ(0, status);
    if (i == 0) longest = Size();
    EXPECT_EQ(longest, Size());
  }
  BuildAll();
  EXPECT_TRUE(Map().free.Size() < 256) << TextOf(Map().free);
  EXPECT_EQ("", WrongLevels());
}

TEST_F(Space, OfOtherProgramsIsNeverTaken) {
  const std::string foreign(5000, 'x');
  Append(foreign);
  BuildAll();
  Append(foreign);
  for (int i = 0; i < 3; ++i) BuildAll("AVERAGE");
  Append(foreign);
  BuildAll();
  const auto bytes = BytesOf(file_);
  EXPECT_EQ(3 * std::count(foreign.begin(), foreign.end(), 'x'), [&] {
    ptrdiff_t count = 0;
    const std::string all(bytes.begin(), bytes.end());
    for (size_t at = all.find(foreign); at != all.npos; at = all.find(foreign, at + foreign.size()))
      count += ptrdiff_t(foreign.size());
    return count;
  }());
  EXPECT_EQ("", WrongLevels());
}

TEST_F(Space, IsNotTakenWhereTheChainIsBrokenAndSomethingMayBeHidden) {
  BuildAll();
  BuildAll("AVERAGE");
  EXPECT_FALSE(Map().segments.empty());
  const auto last = DirectoriesOf(file_).back().offset;
  const auto bytes = BytesOf(file_);
  const size_t link = last + 2 + 12 * size_t(uint8_t(bytes[last]));
  std::fstream stream(file_, std::ios::in | std::ios::out | std::ios::binary);
  stream.seekp(std::streamoff(link));
  stream.write("\xF0\xFF\xFF\x7F", 4);
  stream.close();
  EXPECT_TRUE(Map().segments.empty());
  EXPECT_TRUE(Map().free.IsEmpty());
}

TEST_F(Space, IsNotTakenWhereTheChainIsLongerThanWhatIsRead) {
  BuildAll();
  BuildAll("AVERAGE");
  const auto last = DirectoriesOf(file_).back().offset;
  const size_t link = last + 2 + 12 * size_t(uint8_t(BytesOf(file_)[last]));
  if (Size() % 2 != 0) Append("x");
  const auto number = [](uint32_t value, unsigned width) {
    return std::string(reinterpret_cast<const char*>(&value), width);
  };
  const std::string side = number(3, 2) + number(1, 4) + number(1, 4);  // one SHORT: 1
  const auto start = uint32_t(Size());
  const auto chain = [&](uint32_t count) {
    std::string bytes;
    for (uint32_t i = 1; i <= count; ++i)
      bytes += number(2, 2) + number(256, 2) + side + number(257, 2) + side +
               number(i == count ? 0 : start + i * 30, 4);
    return bytes;
  };
  const uint64_t size = Size();
  for (const uint32_t count : {65535u - 4, 65536u - 4}) {  // behind the image and three levels
    std::filesystem::resize_file(file_, size);
    Append(chain(count));
    std::fstream stream(file_, std::ios::in | std::ios::out | std::ios::binary);
    stream.seekp(std::streamoff(link));
    stream.write(number(start, 4).data(), 4);
    stream.close();
    EXPECT_EQ(count == 65535u - 4, !Map().segments.empty()) << count;
  }
}

TEST_F(Space, OfADamagedMarkerIsLostAndNothingElse) {
  BuildAll();
  const auto map = Map();
  ASSERT_EQ(3u, map.segments.size());
  std::fstream stream(file_, std::ios::in | std::ios::out | std::ios::binary);
  stream.seekp(std::streamoff(map.segments[1].marker + 20));
  stream.put('!');
  stream.close();
  EXPECT_EQ(2u, Map().segments.size());
  BuildAll("AVERAGE");
  EXPECT_EQ("", WrongLevels());
}

TEST_F(Space, OfRemovedLevelsIsGivenBackAndTheImageIsWhatItWas) {
  const auto before = BytesOf(file_);
  BuildAll();
  Open(file_, datasources::kUpdate)->GetSource()->Levels()->Remove({4});
  EXPECT_EQ("200x160 100x80 25x20", SizesOf(file_));
  Open(file_, datasources::kUpdate)->GetSource()->Levels()->Remove({2, 8});
  EXPECT_EQ("200x160", SizesOf(file_));
  const auto after = BytesOf(file_);
  ASSERT_EQ(before.size(), after.size());
  EXPECT_EQ(before, after);
}

TEST_F(Space, IsFoundBehindBytesOfOtherProgramsAndBetweenThemWithoutAnyLevel) {
  const uint64_t before = Size();
  Append(std::string(77, 'x'));
  const uint64_t start = Size();
  BuildAll();
  const uint64_t end = Size();
  Append(std::string(5000, 'y'));
  Open(file_, datasources::kUpdate)->GetSource()->Levels()->Remove({2, 4, 8});
  const auto map = Map();
  EXPECT_EQ(before, map.used.End());
  ASSERT_FALSE(map.segments.empty());
  EXPECT_EQ(start, map.segments.front().start);
  EXPECT_EQ(end, map.segments.back().end);
  BuildAll();
  EXPECT_EQ(end + 5000, Size());  // into the space of before
  EXPECT_EQ("", WrongLevels());
}

TEST_F(Space, OfAMarkerInACopyOfTheFileInsideItIsNotTaken) {
  BuildAll();
  const auto bytes = BytesOf(file_);
  const std::string copy(bytes.begin(), bytes.end());
  const size_t before = Map().segments.size();
  Append(std::string(64 - Size() % 64, 'x') + copy);
  EXPECT_EQ(before, Map().segments.size());
  BuildAll("AVERAGE");
  const auto after = BytesOf(file_);
  EXPECT_NE(std::string::npos, std::string(after.begin(), after.end()).find(copy));
}

TEST_F(Space, OfAnOpenSegmentEndsWhereAnotherProgramsBytesAreReferredTo) {
  const uint64_t start = Size();
  const auto writeMarker = [&](drivers::Segment segment) {
    const auto marker = drivers::ComposeMarker(segment);
    std::fstream stream(file_, std::ios::in | std::ios::out | std::ios::binary);
    stream.seekp(std::streamoff(segment.marker));
    stream.write(reinterpret_cast<const char*>(marker.data()), std::streamsize(marker.size()));
  };
  const drivers::Segment open = drivers::SegmentAt(start);
  std::filesystem::resize_file(file_, open.Body() + 1000);
  writeMarker(open);
  auto map = Map();
  ASSERT_EQ(1u, map.segments.size());
  EXPECT_EQ(Size(), map.segments[0].end);
  EXPECT_EQ(1u, map.unclosed.size());
  writeMarker(
      {open.start, open.marker, open.Body() + 5000});  // behind the end: not all was written
  map = Map();
  ASSERT_EQ(1u, map.segments.size());
  EXPECT_EQ(Size(), map.segments[0].end);
  BuildAll();
  EXPECT_TRUE(Map().unclosed.empty());
  EXPECT_EQ("", WrongLevels());
}

TEST_F(Space, OfRemovedLevelsInFrontOfOtherBytesStays) {
  BuildAll();
  Append("others");
  const uint64_t size = Size();
  Open(file_, datasources::kUpdate)->GetSource()->Levels()->Remove({2, 4, 8});
  EXPECT_EQ("200x160", SizesOf(file_));
  EXPECT_EQ(size, Size());
  const auto bytes = BytesOf(file_);
  EXPECT_EQ("others", std::string(bytes.end() - 6, bytes.end()));
}

}  // namespace
}  // namespace orin::tests
