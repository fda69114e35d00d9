// SPDX-License-Identifier: MIT
#include "host/datasources/imagewatch.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <fstream>
#include <future>
#include <stdexcept>
#include <thread>

#include "host/datasources/fingerprint.h"

namespace orin::datasources {
namespace {

const std::string kSome(kFingerprintLength, 'a');

class Watched : public ::testing::Test {
 protected:
  Watched() {
    folder_ = std::filesystem::temp_directory_path() /
              ("orin-watch-" + std::to_string(getpid()) + "-" +
               ::testing::UnitTest::GetInstance()->current_test_info()->name());
    std::filesystem::create_directory(folder_);
    Write("image", "the pixels");
  }
  ~Watched() override { std::filesystem::remove_all(folder_); }

  std::string Path(const std::string& name) const { return (folder_ / name).string(); }
  void Write(const std::string& name, const std::string& text) const {
    std::ofstream(Path(name), std::ios::binary) << text;
  }
  void SetTime(const std::string& name, time_t seconds) const {
    const timespec times[2] = {{seconds, 7}, {seconds, 7}};
    ASSERT_EQ(0, utimensat(AT_FDCWD, Path(name).c_str(), times, 0));
  }
  /// A watch that counts how often it computes.
  ImageWatch Counting(const std::string& result = kSome) {
    return ImageWatch(Path("image"), [this, result](const std::stop_token&) {
      ++computations_;
      return result;
    });
  }

  std::filesystem::path folder_;
  std::atomic<int> computations_{0};
};

TEST(ImageRecord, IsReadBackFromATextOfOneLength) {
  for (const ImageRecord& record : std::vector<ImageRecord>{
           {},
           {kSome, {}},
           {std::string(32, '0'), {1, -1, 0xfedcba9876543210}},
           {"0123456789abcdef0123456789abcdef", {UINT64_MAX, INT64_MIN, UINT64_MAX}},
           {kSome, {314585770, 1795290000123456789, 1}},
           {kSome, {0, INT64_MAX, 0}}}) {
    const std::string text = datasources::TextOf(record);
    EXPECT_EQ(kImageRecordLength, text.size()) << text;
    EXPECT_EQ(record, ParseImageRecord(text)) << text;
    if (!record.IsBlank()) {
      EXPECT_EQ(TextOf(record.stamp), text.substr(kImageRecordLength - kImageStampLength));
    }
  }
}

TEST(ImageRecord, OfADamagedTextIsBlank) {
  const std::string text = datasources::TextOf(ImageRecord{kSome, {12, 34, 56}});
  for (size_t i = 0; i < text.size(); ++i) {
    if (i == kFingerprintLength || text[i] == ' ') continue;
    std::string damaged = text;
    damaged[i] = 'x';
    EXPECT_TRUE(ParseImageRecord(damaged).IsBlank()) << damaged;
    EXPECT_TRUE(ParseImageRecord(text.substr(0, i)).IsBlank());
  }
  EXPECT_TRUE(ParseImageRecord(text + " ").IsBlank());
}

TEST(Fingerprint, IsTheSameOnEveryMachineAndTellsPartsApart) {
  Fingerprinter empty;
  EXPECT_EQ("99aa06d3014798d86001c324468d497f", empty.Text());  // XXH3, 128 bits, of nothing
  Fingerprinter one, other;
  one.AddText("ab"), one.AddText("c");
  other.AddText("a"), other.AddText("bc");
  EXPECT_NE(one.Text(), other.Text());
}

TEST_F(Watched, FileIsRecognisedByItsBytes) {
  const std::string before = FingerprintOfFile(Path("image"), {});
  SetTime("image", 1000);
  EXPECT_EQ(before, FingerprintOfFile(Path("image"), {}));
  Write("image", "the Pixels");
  EXPECT_NE(before, FingerprintOfFile(Path("image"), {}));
}

TEST_F(Watched, ImageIsComputedOnceForEachStateItShows) {
  ImageWatch watch = Counting();
  SetTime("image", 1000);
  const ImageStamp first = *watch.Stamp();
  EXPECT_EQ((ImageStamp{10, 1000000000007, 0}), first);
  EXPECT_EQ(kSome, watch.Fingerprint(first));
  EXPECT_EQ(kSome, watch.Fingerprint(first));
  watch.Start(first);
  EXPECT_EQ(1, computations_);
  EXPECT_EQ(kSome, Counting().Fingerprint(first)) << "nor when it is opened again";
  EXPECT_EQ(1, computations_);
  SetTime("image", 2000);
  EXPECT_EQ(kSome, watch.Fingerprint(*watch.Stamp()));
  EXPECT_EQ(2, computations_);
}

TEST_F(Watched, WhatIsLearntNeedsNoComputation) {
  ImageWatch watch = Counting();
  const ImageStamp stamp = *watch.Stamp();
  EXPECT_FALSE(watch.Known(stamp));
  watch.Learn(stamp, "b");
  EXPECT_EQ("b", watch.Fingerprint(stamp));
  EXPECT_EQ(0, computations_);
}

TEST_F(Watched, ComputationInTheBackgroundIsWaitedFor) {
  std::promise<void> mayEnd;
  ImageWatch watch(Path("image"), [&](const std::stop_token&) {
    mayEnd.get_future().wait();
    return kSome;
  });
  const ImageStamp stamp = *watch.Stamp();
  watch.Start(stamp);
  watch.Start(stamp);
  EXPECT_FALSE(watch.Known(stamp));
  mayEnd.set_value();
  EXPECT_EQ(kSome, watch.Fingerprint(stamp));
}

TEST_F(Watched, ComputationThatNobodyWaitsForIsStopped) {
  std::atomic<bool> wasStopped{false};
  {
    ImageWatch watch(Path("image"), [&](const std::stop_token& stop) {
      while (!stop.stop_requested()) std::this_thread::yield();
      wasStopped = true;
      return std::string();
    });
    watch.Start(*watch.Stamp());
  }
  EXPECT_TRUE(wasStopped);
}

TEST_F(Watched, ImageThatCannotBeReadHasNoFingerprint) {
  ImageWatch watch(Path("image"), [](const std::stop_token&) -> std::string {
    throw std::runtime_error("damaged");
  });
  EXPECT_EQ("", watch.Fingerprint(*watch.Stamp()));
  EXPECT_FALSE(ImageWatch(Path("absent")).Stamp());
  EXPECT_FALSE(ImageWatch(folder_.string()).Stamp()) << "a folder is no image";
}

TEST_F(Watched, ExternalMaskBelongsToTheImage) {
  ImageWatch watch = Counting();
  const ImageStamp without = *watch.Stamp();
  Write("image.msk", "the mask");
  SetTime("image.msk", 1000);
  const ImageStamp with = *watch.Stamp();
  EXPECT_NE(without, with);
  const std::string fingerprint = watch.Fingerprint(with);
  EXPECT_NE(kSome, fingerprint);
  Write("image.msk", "the Mask");
  SetTime("image.msk", 2000);
  EXPECT_NE(with, *watch.Stamp());
  EXPECT_NE(fingerprint, watch.Fingerprint(*watch.Stamp()));
}

TEST_F(Watched, CompanionsBelongToWhatTheImageShows) {
  Write("source", "a");
  const ImageWatch watch(Path("image"), {}, {Path("source")});
  const ImageStamp before = *watch.Stamp();
  SetTime("source", 1000);
  EXPECT_NE(before, *watch.Stamp());
}

}  // namespace
}  // namespace orin::datasources
