/// Reading and writing when memory runs out.
// SPDX-License-Identifier: MIT
#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <new>

#include "host/datasources/basicreader.h"
#include "host/services/exception.h"
#include "tests/host/drivers/tiff/store/storesupport.h"

namespace {

std::atomic<size_t> mostBytes = SIZE_MAX;  // of one allocation

}  // namespace

void* operator new(size_t bytes) {
  void* memory = bytes > mostBytes ? nullptr : std::malloc(bytes == 0 ? 1 : bytes);
  if (!memory) throw std::bad_alloc();
  return memory;
}
// The warning compares with the compiler's own allocation, which is replaced above.
#pragma GCC diagnostic ignored "-Wmismatched-new-delete"
void operator delete(void* memory) noexcept { std::free(memory); }
void operator delete(void* memory, size_t) noexcept { std::free(memory); }

namespace orin::tests {
namespace {

const Layout kImage{.width = 200,
                    .height = 160,
                    .samples = 3,
                    .tile = 64,
                    .compression = COMPRESSION_ADOBE_DEFLATE,
                    .photometric = PHOTOMETRIC_RGB};

/// The message of the exception that `action` ends with while no allocation passes 2000 bytes.
std::string FailureOf(const auto& action) {
  std::string message;
  mostBytes = 2000;
  try {
    action();
  } catch (const Exception& failure) {
    message = failure.GetMessage();
  }
  mostBytes = SIZE_MAX;
  return message;
}

class Memory : public TiffStore {
 protected:
  Memory() : file_(folder_.File("image.tif")) { WriteImage(file_, kImage); }
  std::string file_;
};

TEST_F(Memory, ThatIsMissingForReadingIsAnExceptionThatNamesTheFile) {
  const auto dataset = Open(file_, datasources::kReadOnly);
  datasources::BasicReader reader(dataset.get(), {1, 2, 3}, false);
  gobs::Raster block({200, 160, 3, gobs::eDT_8U}, {});
  EXPECT_EQ(file_ + ": cannot be read: there is not enough memory. Free memory, then run again.",
            FailureOf([&] { reader.Read(block); }));
  EXPECT_EQ("", FailureOf([] {}));
  reader.Read(block);  // goes on when there is memory again
}

TEST_F(Memory, ThatIsMissingForWritingIsAnExceptionAndTheFileStaysAsItWas) {
  const auto before = BytesOf(file_);
  {
    const auto dataset = Open(file_, datasources::kUpdate);
    datasources::BasicOverviewWriterAccessor accessor(dataset.get(), {1, 2, 3});
    accessor.CreateLevel(2);
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
    const gobs::Raster block({100, 80, 3, gobs::eDT_8U}, {});
    EXPECT_EQ(file_ +
                  ": its levels cannot be written: there is not enough memory. Free memory, then "
                  "run the same command again to resume.",
              FailureOf([&] { writer->Write(block); }));
  }
  EXPECT_EQ(before, BytesOf(file_));
}

}  // namespace
}  // namespace orin::tests
