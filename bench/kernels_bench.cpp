/// Speed of the resampling methods when halving; set OMP_NUM_THREADS=1 for one thread.
// SPDX-License-Identifier: MIT
#include <benchmark/benchmark.h>

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
template <class Factory, class T>
void Halve(benchmark::State& state, uint32_t channels, bool masked) {
  const std::unique_ptr<IRasterResampler> kernel(Factory().CreateResampler(gobs::DataTypeOf<T>()));
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

template <class Factory, class T>
void Register(const std::string& method, const std::string& type, uint32_t channels) {
  for (const bool masked : {false, true}) {
    const std::string name = method + "/" + type + "/" + std::to_string(channels) + "ch/" +
                             (masked ? "masked" : "unmasked") + "/half";
    benchmark::RegisterBenchmark(name.c_str(), Halve<Factory, T>, channels, masked);
  }
}

template <class Factory>
bool RegisterTypes(const std::string& method) {
  Register<Factory, uint8_t>(method, "uint8", 1);
  Register<Factory, uint8_t>(method, "uint8", 3);
  Register<Factory, uint16_t>(method, "uint16", 1);
  Register<Factory, float>(method, "float32", 1);
  return true;
}

[[maybe_unused]] const bool kRegistered =
    RegisterTypes<NearestNeighbourResamplerFactory>("Nearest") &&
    RegisterTypes<AverageResamplerFactory>("Average") &&
    RegisterTypes<ModeResamplerFactory>("Mode") &&
    RegisterTypes<BilinearResamplerFactory>("Bilinear") &&
    RegisterTypes<BicubicResamplerFactory>("Bicubic");

}  // namespace
}  // namespace orin::resamplers
