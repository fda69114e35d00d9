/// Files that cannot grow: a full disk, and the 4 GiB of a classic TIFF.
// SPDX-License-Identifier: MIT
#include <sys/resource.h>
#include <sys/stat.h>

#include <csignal>
#include <filesystem>

#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace orin::tests {
namespace {

const Layout kImage{
    .width = 200, .height = 160, .samples = 3, .tile = 32, .photometric = PHOTOMETRIC_RGB};

/// No file grows beyond `bytes` while it lives.
class FileSizeLimit {
 public:
  explicit FileSizeLimit(rlim_t bytes) : handler_(std::signal(SIGXFSZ, SIG_IGN)) {
    getrlimit(RLIMIT_FSIZE, &before_);
    const rlimit limit{bytes, before_.rlim_max};
    if (setrlimit(RLIMIT_FSIZE, &limit) != 0) ADD_FAILURE() << "no limit";
  }
  ~FileSizeLimit() {
    setrlimit(RLIMIT_FSIZE, &before_);
    std::signal(SIGXFSZ, handler_);
  }

 private:
  void (*handler_)(int);
  rlimit before_{};
};

TEST_F(TiffStore, DiskThatFillsUpAnywhereLeavesTheImageAndACleanReport) {
  const std::string file = folder_.File("image.tif");
  WriteImage(file, kImage);
  const auto before = BytesOf(file);
  const std::string trial = folder_.File("trial.tif");
  WriteImage(trial, kImage);
  Build(trial, kImage, {.level = 2});
  const size_t whole = BytesOf(trial).size();

  unsigned refused = 0;
  for (size_t limit = before.size(); limit < whole; limit += limit + 700 < whole ? 700 : 1) {
    try {
      const FileSizeLimit full(limit);
      Build(file, kImage, {.level = 2});
      ADD_FAILURE() << "a level was built in " << limit << " bytes";
    } catch (const Exception& failure) {
      EXPECT_NE(std::string::npos, failure.GetMessage().find(file + ": cannot be written: "))
          << failure.GetMessage();
      ++refused;
    }
    ASSERT_EQ(before, BytesOf(file)) << "limit " << limit;
  }
  EXPECT_LT(50u, refused);
  Build(file, kImage, {.level = 2});
  EXPECT_EQ("111", ValidityOf(LevelsOf(file).at(0)));
}

/// Makes the file end at `size` without filling the disk.
void Stretch(const std::string& file, uint64_t size) { std::filesystem::resize_file(file, size); }

TEST_F(TiffStore, ClassicFileNeverPassesFourGiB) {
  const std::string file = folder_.File("image.tif");
  WriteImage(file, kImage);
  const auto before = BytesOf(file);
  for (const uint64_t room : {0u, 100u, 10000u, 36864u /* all tiles, no directory */}) {
    const uint64_t size = (uint64_t{1} << 32) - 1 - room;
    Stretch(file, size);
    try {
      Build(file, kImage, {.level = 2});
      ADD_FAILURE() << "the level fitted into " << room << " bytes";
    } catch (const Exception& failure) {
      EXPECT_NE(std::string::npos, failure.GetMessage().find("could pass 4 GiB"))
          << failure.GetMessage();
    }
    EXPECT_EQ(size, std::filesystem::file_size(file));
  }
  Stretch(file, before.size());
  EXPECT_EQ(before, BytesOf(file));
}

TEST_F(TiffStore, BigTiffGrowsBeyondFourGiB) {
  Layout layout = kImage;
  layout.mode = "w8";
  const std::string file = folder_.File("image.tif");
  WriteImage(file, layout);
  Stretch(file, (uint64_t{1} << 32) + 1001);
  Build(file, layout, {.level = 2});
  EXPECT_EQ("200x160 100x80", SizesOf(file));
  EXPECT_EQ("", WrongTile(file, 1, LevelLayout(layout, 2)));
}

}  // namespace
}  // namespace orin::tests
