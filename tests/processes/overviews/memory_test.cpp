/// A build in which one allocation after the other fails.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <new>
#include <string>
#include <vector>

#include "host/datasources/formats.h"
#include "host/drivers/tiff/tiffdriver.h"
#include "host/services/warning.h"
#include "processes/overviews/createoverviews.h"
#include "processes/overviews/statusqueries.h"
#include "tests/e2e/tiffpicture.h"

namespace {

/// Allocations until one fails; 0: none does.
std::atomic<size_t> untilFailure = 0;
std::atomic<bool> hasFailed = false;

bool IsTurn() {
  size_t left = untilFailure;
  while (left > 0 && !untilFailure.compare_exchange_weak(left, left - 1)) {
  }
  if (left == 1) hasFailed = true;
  return left == 1;
}

}  // namespace

void* operator new(size_t bytes) {
  void* memory = IsTurn() ? nullptr : std::malloc(bytes == 0 ? 1 : bytes);
  if (!memory) throw std::bad_alloc();
  return memory;
}
void* operator new(size_t bytes, std::align_val_t alignment) {
  const auto step = static_cast<size_t>(alignment);
  void* memory = IsTurn() ? nullptr : std::aligned_alloc(step, (bytes + step) / step * step);
  if (!memory) throw std::bad_alloc();
  return memory;
}
// The warning compares with the compiler's own allocation, which is replaced above.
#pragma GCC diagnostic ignored "-Wmismatched-new-delete"
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, size_t) noexcept { std::free(memory); }
void operator delete(void* memory, std::align_val_t) noexcept { std::free(memory); }
void operator delete(void* memory, size_t, std::align_val_t) noexcept { std::free(memory); }

namespace orin::testing {
namespace {

namespace fs = std::filesystem;

std::string BytesOf(const std::string& file) {
  std::ifstream stream(file, std::ios::binary);
  return {std::istreambuf_iterator<char>(stream), {}};
}

/// Takes the library's warnings without an allocation of its own that matters.
class Warnings {
 public:
  Warnings() {
    tarn::Warning::SetSink([this](const tarn::Report& report) {
      ++count_;
      line_ = report.line;
      isAboutMemory_ = report.message.find("memory") != std::string::npos;
    });
  }
  ~Warnings() { tarn::Warning::SetSink({}); }
  bool AreOneOfTheRunAboutMemory() const { return count_ == 1 && line_ == 913 && isAboutMemory_; }
  bool AreNone() const { return count_ == 0; }

 private:
  int count_ = 0;
  unsigned line_ = 0;
  bool isAboutMemory_ = false;
};

class OneFailedAllocation : public ::testing::TestWithParam<QRTOverviewResampleType> {
 protected:
  OneFailedAllocation() {
    fs::create_directories(folder_);
    Picture<uint8_t> picture(96, 80, 3);
    for (size_t i = 0; i < picture.values.size(); ++i)
      picture.values[i] = static_cast<uint8_t>(i * i / 7);
    WritePicture(original_, picture,
                 {.photometric = PHOTOMETRIC_RGB,
                  .tile = 32,
                  .compression = COMPRESSION_ADOBE_DEFLATE,
                  .noData = "7"});
    drivers::RegisterTiffDriver();
  }
  ~OneFailedAllocation() override {
    datasources::FormatRegistry::Instance().Clear();
    fs::remove_all(folder_);
  }

  static CreateFileOverviews JobFor(const std::string& file) {
    CreateFileOverviews job(file);
    job.SetPyramidType(GetParam());
    job.SetPyramidLevels({2, 4}, false);
    return job;
  }

  /// In memory where possible: a thousand builds wait for a disk for minutes.
  static fs::path Scratch() {
    return fs::is_directory("/dev/shm") ? fs::path("/dev/shm") : fs::temp_directory_path();
  }

  std::string folder_ = Scratch() / ("orin-memory-" + std::to_string(getpid()));
  std::string original_ = folder_ + "/original.tif";
};

enum class End { kTrue, kFalse, kBadAlloc };

TEST_P(OneFailedAllocation, NeverEndsTheProcessNorHarmsTheImage) {
  const std::string image = BytesOf(original_);
  const std::string file = folder_ + "/scene.tif";
  size_t reported = 0;
  for (size_t n = 1;; n += n < 300 ? 1 : 2) {
    for (const char* name : {"/scene.tif", "/scene.tif.ovr", "/scene.tif.ovr.partial"})
      fs::remove(folder_ + name);
    fs::copy_file(original_, file);
    End end = End::kBadAlloc;
    {
      const Warnings warnings;
      CreateFileOverviews job = JobFor(file);
      hasFailed = false;
      untilFailure = n;
      try {
        end = job.Generate() ? End::kTrue : End::kFalse;
      } catch (const std::bad_alloc&) {
        // outside the pipeline the run catches the host's exceptions only
      }
      untilFailure = 0;
      EXPECT_TRUE(warnings.AreNone() ||
                  (end == End::kFalse && warnings.AreOneOfTheRunAboutMemory()))
          << n;
      reported += warnings.AreNone() ? 0 : 1;
    }
    // Beside the link to the first level, which is a few bytes, nothing of the image changes.
    const std::string now = BytesOf(file);
    ASSERT_GE(now.size(), image.size()) << n;
    size_t changed = 0;
    for (size_t i = 0; i < image.size(); ++i) changed += image[i] != now[i] ? 1 : 0;
    EXPECT_LE(changed, 4u) << n;
    if (!hasFailed) {
      EXPECT_EQ(End::kTrue, end);
      break;
    }
    ASSERT_TRUE(JobFor(file).Generate()) << n;
  }
  EXPECT_GT(reported, 10u);
}

INSTANTIATE_TEST_SUITE_P(Methods, OneFailedAllocation,
                         ::testing::Values(ResampleNearest, ResampleAverage, ResampleBicubic));

}  // namespace
}  // namespace orin::testing
