/// Speed of the resampling methods when halving; set OMP_NUM_THREADS=1 for one thread.
// SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cctype>
#include <memory>
#include <random>
#include <string>
#include <type_traits>

#include "basic/gobs/mask/mask.h"
#include "basic/gobs/raster.h"
#include "processes/qrtfilters/resamplers/factories.h"

namespace orin::resamplers {
namespace {

constexpr uint32_t kSide = 1024;  // source pixels
constexpr uint32_t kMargin = 3;   // enough for every method

/// A block whose samples, margin included, are random bytes; floats are small whole numbers.
template <class T>
std::unique_ptr<gobs::Raster> RandomBlock(uint32_t side, uint32_t channels, uint32_t margin) {
  auto block =
      std::make_unique<gobs::Raster>(gobs::RasterInfo(side, side, channels, gobs::DataTypeOf<T>()),
                                     parallelio::ProcessWindow{margin, margin, 0, 0});
  std::minstd_rand random(1);
  T* const samples = reinterpret_cast<T*>(block->data);
  for (uint64_t i = 0; i < block->byteSize / sizeof(T); ++i)
    samples[i] = static_cast<T>(random() >> 8);
  return block;
}

/// A tenth of the pixels, at random, is no data.
std::unique_ptr<gobs::Mask> RandomMask(const gobs::Raster& block) {
  auto mask = std::make_unique<gobs::Mask>(block.width, block.height, block.Window());
  std::minstd_rand random(2);
  for (uint32_t y = 0; y < block.height; ++y)
    for (uint32_t x = 0; x < block.width; ++x) mask->SetValid(x, y, random() % 10 != 0);
  return mask;
}

/// Items are destination samples.
template <class T>
void Halve(benchmark::State& state, QRTOverviewResampleType type, uint32_t channels, bool masked) {
  const std::unique_ptr<IRasterResampler> kernel(
      MakeResamplerFactory(type)->CreateResampler(gobs::DataTypeOf<T>()));
  const auto src = RandomBlock<T>(kSide, channels, kMargin);
  const auto dst = RandomBlock<T>(kSide / 2, channels, 0);
  const auto mask = masked ? RandomMask(*src) : nullptr;
  kernel->SetRatio(0.5, 0.5);
  for (auto _ : state) {
    kernel->Resample(src.get(), mask.get(), dst.get());
    benchmark::ClobberMemory();
  }
  state.SetItemsProcessed(state.iterations() * int64_t{dst->width} * dst->height * channels);
}

/// "Bicubic/uint16/1ch/masked/half"
template <class T>
void Register(const model::Method& method, const std::string& type, uint32_t channels) {
  std::string name(method.name);
  std::transform(name.begin() + 1, name.end(), name.begin() + 1,
                 [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
  for (const bool masked : {false, true}) {
    const std::string full = name + "/" + type + "/" + std::to_string(channels) + "ch/" +
                             (masked ? "masked" : "unmasked") + "/half";
    benchmark::RegisterBenchmark(full.c_str(), Halve<T>, method.type, channels, masked);
  }
}

[[maybe_unused]] const bool kRegistered = [] {
  for (const model::Method& method : model::kMethods) {
    Register<uint8_t>(method, "uint8", 1);
    Register<uint8_t>(method, "uint8", 3);
    Register<uint16_t>(method, "uint16", 1);
    Register<float>(method, "float32", 1);
  }
  return true;
}();

}  // namespace
}  // namespace orin::resamplers
