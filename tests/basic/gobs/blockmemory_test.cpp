// SPDX-License-Identifier: MIT
#include "basic/gobs/blockmemory.h"

#include <gtest/gtest.h>
#include <sys/resource.h>

#include <fstream>
#include <memory>
#include <thread>
#include <vector>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/outofmemory.h"
#include "basic/gobs/raster.h"

namespace orin::gobs {
namespace {

constexpr uint64_t kMiB = 1 << 20;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kIsWatched = true;  // every block comes from the heap then
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr bool kIsWatched = true;
#else
constexpr bool kIsWatched = false;
#endif
#else
constexpr bool kIsWatched = false;
#endif

class BlockMemory : public ::testing::Test {
 protected:
  void SetUp() override {
    if (kIsWatched) GTEST_SKIP() << "a sanitizer watches the heap";
  }
};

std::unique_ptr<Raster> BlockOf(uint32_t megabytes) {
  return std::make_unique<Raster>(RasterInfo(1 << 20, megabytes, 1, eDT_8U),
                                  parallelio::ProcessWindow{});
}

/// Of the whole process, as the system counts it.
uint64_t AddressSpace() {
  uint64_t pages = 0;
  std::ifstream("/proc/self/statm") >> pages;
  return pages * 4096;
}

TEST_F(BlockMemory, ADestroyedBlockGivesItsMemoryBack) {
  const uint64_t before = MappingsOfBlocks().bytes;
  const uint64_t spaceBefore = AddressSpace();
  {
    std::vector<std::unique_ptr<Raster>> blocks;
    for (int i = 0; i < 4; ++i) blocks.push_back(BlockOf(40));
    EXPECT_EQ(before + 160 * kMiB, MappingsOfBlocks().bytes);
    EXPECT_GE(AddressSpace(), spaceBefore + 160 * kMiB);
  }
  EXPECT_EQ(before, MappingsOfBlocks().bytes);
  EXPECT_LT(AddressSpace(), spaceBefore + 20 * kMiB);
}

TEST_F(BlockMemory, BuffersAreHandedFromBlockToBlockOfOneSize) {
  const BlockMappings before = MappingsOfBlocks();
  {
    BlockBuffers buffers;
    const BlockBuffers::Use use(buffers);
    for (int i = 0; i < 10; ++i) {
      const auto first = BlockOf(3);
      const auto second = BlockOf(5);
    }
    EXPECT_EQ(before.count + 2, MappingsOfBlocks().count);
    EXPECT_EQ(before.bytes + 8 * kMiB, MappingsOfBlocks().bytes);
  }
  EXPECT_EQ(before.bytes, MappingsOfBlocks().bytes);
}

TEST_F(BlockMemory, NoMoreThanTheirLimitIsKept) {
  const uint64_t before = MappingsOfBlocks().bytes;
  BlockBuffers buffers;
  const BlockBuffers::Use use(buffers);
  {
    std::vector<std::unique_ptr<Raster>> blocks;
    for (int i = 0; i < 4; ++i) blocks.push_back(BlockOf(30));
  }
  EXPECT_EQ(before + 60 * kMiB, MappingsOfBlocks().bytes);
  BlockOf(100).reset();
  EXPECT_EQ(before + 60 * kMiB, MappingsOfBlocks().bytes);
}

TEST_F(BlockMemory, OtherThreadsGiveTheirBlocksBack) {
  BlockBuffers buffers;
  const BlockBuffers::Use use(buffers);
  const uint64_t before = MappingsOfBlocks().bytes;
  std::thread([] { BlockOf(4).reset(); }).join();
  EXPECT_EQ(before, MappingsOfBlocks().bytes);
  {
    BlockBuffers inner;
    const BlockBuffers::Use innerUse(inner);
    BlockOf(4).reset();
    EXPECT_EQ(before + 4 * kMiB, MappingsOfBlocks().bytes);
  }
  EXPECT_EQ(before, MappingsOfBlocks().bytes);
  BlockOf(4).reset();
  EXPECT_EQ(before + 4 * kMiB, MappingsOfBlocks().bytes);
}

TEST_F(BlockMemory, ThreadsShareBuffersWithoutLosingOrSharingOne) {
  const uint64_t before = MappingsOfBlocks().bytes;
  {
    BlockBuffers buffers;
    std::vector<std::thread> threads;
    for (uint8_t n = 1; n <= 3; ++n)
      threads.emplace_back([&buffers, n] {
        const BlockBuffers::Use use(buffers);
        for (uint32_t i = 0; i < 300; ++i) {
          const auto block = BlockOf(1 + (i + n) % 3);
          block->data[100] = n;
          std::this_thread::yield();
          EXPECT_EQ(n, block->data[100]);
        }
      });
    for (std::thread& thread : threads) thread.join();
  }
  EXPECT_EQ(before, MappingsOfBlocks().bytes);
}

/// Makes a block where the system has no memory for it; for a process of its own.
[[noreturn]] void MakeABlockWithoutMemory() {
  const rlimit limit{AddressSpace() + 32 * kMiB, AddressSpace() + 32 * kMiB};
  setrlimit(RLIMIT_AS, &limit);
  int caught = 0;
  try {
    BlockOf(2000);
  } catch (const Exception& e) {
    caught += e.GetMessage().find("not enough memory") != std::string::npos ? 1 : 0;
  }
  try {
    BlockOf(2000);
  } catch (const std::bad_alloc&) {
    caught += 2;
  }
  try {
    const Mask mask(1 << 20, 1 << 14, {});
  } catch (const OutOfMemory&) {
    caught += 4;
  }
  _exit(caught);
}

TEST_F(BlockMemory, WantOfItIsAFailureOfTheHostsAndOfTheLanguages) {
  EXPECT_EXIT(MakeABlockWithoutMemory(), ::testing::ExitedWithCode(7), "");
}

TEST(OutOfMemory, KeepsItsTextAsAHostException) {
  Exception holder("", "", "", 0);
  try {
    ThrowOutOfMemory();
  } catch (const Exception& e) {
    EXPECT_NE(nullptr, dynamic_cast<const std::bad_alloc*>(&e));
    holder = e;
  }
  EXPECT_NE(std::string::npos, holder.GetMessage().find("run the same command again"));
}

TEST(Scratch, RefusesWhatNoMemoryHolds) {
  Scratch<double> scratch;
  EXPECT_THROW(scratch.resize(size_t{1} << 58), OutOfMemory);
  scratch.assign(3, 1.5);
  const Scratch<double> copy(scratch);
  EXPECT_EQ(scratch, copy);
}

}  // namespace
}  // namespace orin::gobs
