// SPDX-License-Identifier: MIT
#include "host/drivers/hfa/patchedfile.h"

#include <cpl_vsi.h>

#include "tests/host/drivers/gdal/gdalfiles.h"

namespace orin::tests {
namespace {

using drivers::PatchedFile;

class Patched : public GdalFiles {
 protected:
  Patched() : path_(File("file.bin")), before_(10000, 'a') { WriteBytes(path_, before_); }

  std::string path_;
  std::string before_;
};

/// What the library reads.
std::string Seen(const PatchedFile& file) {
  std::string bytes(20000, '\0');
  VSILFILE* handle = VSIFOpenL(file.LibraryName().c_str(), "rb");
  bytes.resize(VSIFReadL(bytes.data(), 1, bytes.size(), handle));
  VSIFCloseL(handle);
  return bytes;
}

void PutAt(const PatchedFile& file, uint64_t position, const std::string& bytes) {
  VSILFILE* handle = VSIFOpenL(file.LibraryName().c_str(), "r+b");
  ASSERT_TRUE(handle);
  VSIFSeekL(handle, position, SEEK_SET);
  EXPECT_EQ(bytes.size(), VSIFWriteL(bytes.data(), 1, bytes.size(), handle));
  VSIFCloseL(handle);
}

TEST_F(Patched, ShowsTheLibraryWhatItWroteAndKeepsItFromTheFile) {
  PatchedFile file(path_);
  PutAt(file, 4090, "0123456789");
  std::string expected = before_;
  expected.replace(4090, 10, "0123456789");
  EXPECT_TRUE(expected == Seen(file));
  EXPECT_TRUE(before_ == BytesOf(path_));
}

TEST_F(Patched, KeepsWhatWasAppendedAndNothingElse) {
  {
    PatchedFile file(path_);
    PutAt(file, 9998, "0123");
    EXPECT_TRUE(before_ + "23" == BytesOf(path_));
    EXPECT_TRUE(before_.substr(0, 9998) + "0123" == Seen(file));
    file.Keep();
  }
  EXPECT_TRUE(before_ + "23" == BytesOf(path_));
}

TEST_F(Patched, IsAsItWasWhenNothingIsKept) {
  {
    PatchedFile file(path_);
    PutAt(file, 10, "x");
    PutAt(file, 10000, std::string(5000, 'z'));
  }
  EXPECT_TRUE(before_ == BytesOf(path_));
}

TEST_F(Patched, OverwritesAtOnceWhatIsToChangeNow) {
  {
    PatchedFile file(path_);
    PutAt(file, 20, "y");  // of the same page
    file.WriteNow(10, "x", 1);
    EXPECT_EQ('x', BytesOf(path_)[10]);
    EXPECT_EQ('x', Seen(file)[10]);
    EXPECT_EQ('y', Seen(file)[20]);
  }
  EXPECT_EQ('x', BytesOf(path_)[10]);
  EXPECT_EQ('a', BytesOf(path_)[20]);
}

TEST_F(Patched, LetsTheLibraryMakeNoOtherFile) {
  PatchedFile file(path_);
  const std::string folder = file.LibraryName().substr(0, file.LibraryName().rfind('/') + 1);
  EXPECT_EQ("file.bin", file.LibraryName().substr(folder.size()));
  EXPECT_EQ(nullptr, VSIFOpenL((folder + "file.ige").c_str(), "wb"));
  EXPECT_EQ(nullptr, VSIFOpenL((folder + "file.ige").c_str(), "r+b"));
}

TEST_F(Patched, ThatCannotBeOpenedIsRefusedByName) {
  EXPECT_EQ(File("none") + ": cannot be opened for writing: No such file or directory.",
            RefusalOf([&] { PatchedFile(File("none")); }));
}

}  // namespace
}  // namespace orin::tests
