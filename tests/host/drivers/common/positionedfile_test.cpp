// SPDX-License-Identifier: MIT
#include "host/drivers/common/positionedfile.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <string>

#include "host/services/exception.h"

namespace orin::tests {
namespace {

using drivers::PositionedFile;
using Mode = PositionedFile::Mode;

class Positioned : public ::testing::Test {
 protected:
  Positioned() {
    std::string name = (std::filesystem::temp_directory_path() / "positionedXXXXXX").string();
    folder_ = mkdtemp(name.data());
    path_ = folder_ / "file";
    std::ofstream(path_) << "0123456789";
  }
  ~Positioned() override { std::filesystem::remove_all(folder_); }

  std::string Bytes(const std::string& path) const {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }

  std::filesystem::path folder_;
  std::string path_;
};

std::string MessageOf(const auto& action) {
  try {
    action();
  } catch (const Exception& thrown) {
    return thrown.GetMessage();
  }
  return "nothing was thrown";
}

TEST_F(Positioned, ReadsAndWritesWhereItIsTold) {
  PositionedFile file(path_, Mode::kUpdate);
  char bytes[4] = {};
  file.Read(3, bytes, 4);
  EXPECT_EQ("3456", std::string(bytes, 4));
  file.Write(8, "abcd", 4);
  EXPECT_EQ("01234567abcd", Bytes(path_));
  EXPECT_EQ(12u, file.Size());
}

TEST_F(Positioned, TellsAnEndThatComesTooEarlyFromAPartThatWillDo) {
  const PositionedFile file(path_, Mode::kRead);
  char bytes[8] = {};
  EXPECT_EQ(path_ + ": cannot be read: the file ends too early.",
            MessageOf([&] { file.Read(6, bytes, 8); }));
  const drivers::Transfer part = file.ReadUpTo(6, bytes, 8);
  EXPECT_EQ(4u, part.bytes);
  EXPECT_EQ(0, part.error);
  EXPECT_EQ("6789", std::string(bytes, 4));
}

TEST_F(Positioned, SaysWhyItCannotWrite) {
  PositionedFile file(path_, Mode::kRead);
  const drivers::Transfer none = file.WriteUpTo(0, "x", 1);
  EXPECT_EQ(0u, none.bytes);
  EXPECT_EQ(EBADF, none.error);
  EXPECT_EQ(0u, MessageOf([&] { file.Write(0, "x", 1); }).find(path_ + ": cannot be written: "));
  EXPECT_EQ("0123456789", Bytes(path_));
}

TEST_F(Positioned, OneObjectHoldsTheLockAndTheOtherNamesItsProcess) {
  PositionedFile first(path_, Mode::kUpdate);
  first.Lock();
  {
    PositionedFile second(path_, Mode::kUpdate);
    const std::string message = MessageOf([&] { second.Lock(); });
    EXPECT_EQ(0u, message.find(path_ + ": another build is writing levels into it"));
    EXPECT_NE(std::string::npos, message.find("process " + std::to_string(getpid()))) << message;
  }
}

TEST_F(Positioned, AFileThatWasReplacedIsNotLocked) {
  PositionedFile file(path_, Mode::kUpdate);
  std::ofstream(folder_ / "other") << "other";
  std::filesystem::rename(folder_ / "other", path_);
  EXPECT_EQ(path_ + ": was replaced by another program just now. Run again.",
            MessageOf([&] { file.Lock(); }));
}

TEST_F(Positioned, IsAloneWhileNothingElseHasTheFileOpen) {
  PositionedFile file(path_, Mode::kUpdate);
  unsigned done = 0;
  {
    const PositionedFile other(path_, Mode::kRead);
    EXPECT_EQ(PositionedFile::Alone::kOthersHaveItOpen, file.DoAlone([&] { ++done; }));
    EXPECT_EQ(0u, done);
  }
  EXPECT_EQ(PositionedFile::Alone::kDone, file.DoAlone([&] { ++done; }));
  EXPECT_EQ(1u, done);
}

TEST_F(Positioned, SetsTheTimeToTheNanosecondAlsoBeforeTheEpoch) {
  PositionedFile file(path_, Mode::kUpdate);
  for (const int64_t time : {int64_t{1500000000123456789}, int64_t{-1500000001}}) {
    EXPECT_EQ(time, file.SetModified(time));
    struct stat status {};
    ASSERT_EQ(0, stat(path_.c_str(), &status));
    EXPECT_EQ(time, status.st_mtim.tv_sec * 1000000000 + status.st_mtim.tv_nsec);
  }
}

TEST_F(Positioned, ANewNameReplacesNoFile) {
  std::ofstream(folder_ / "other") << "other";
  PositionedFile file(path_, Mode::kUpdate);
  EXPECT_EQ(
      0u, MessageOf([&] { file.Rename(folder_ / "other"); }).find(path_ + ": cannot be renamed: "));
  EXPECT_EQ("other", Bytes(folder_ / "other"));
  file.Rename(folder_ / "free");
  EXPECT_EQ((folder_ / "free").string(), file.Path());
  EXPECT_EQ("0123456789", Bytes(folder_ / "free"));
  EXPECT_FALSE(std::filesystem::exists(path_));
}

}  // namespace
}  // namespace orin::tests
