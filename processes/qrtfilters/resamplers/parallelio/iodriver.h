/// Runs the blocks of a level through a pipeline: read the next, resample this one, write the last.
// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <memory>
#include <vector>

#include "basic/gobs/blockmemory.h"
#include "host/datasources/rasterreader.h"
#include "host/datasources/rasterwriter.h"
#include "host/services/exception.h"
#include "host/services/ompnested.h"
#include "processes/qrtfilters/resamplers/parallelio/blockjob.h"

namespace orin::parallelio {

/// The first exception of a step's sections.
class ErrorHolder {
 public:
  bool IsSet() const { return set_.load(std::memory_order_acquire); }
  /// Keeps a copy of the first exception offered; later ones are dropped.
  void Offer(const Exception& exception) {
    if (claimed_.exchange(true)) return;
    exception_ = exception;
    set_.store(true, std::memory_order_release);
  }
  const Exception& Get() const { return exception_; }

 private:
  Exception exception_{"", "", "", 0};
  std::atomic<bool> claimed_ = false;
  std::atomic<bool> set_ = false;
};

/// \tparam Base  the process policy: block planning, processing and progress
template <class Processing, class Access, class Base>
class IODriver : public Base {
 public:
  ~IODriver() override = default;
  void ComputeBlocks(std::vector<BlockJob>& blocks, datasources::IRasterReader* reader,
                     datasources::IRasterWriter* writer) override {
    Base::ComputeBlocks(blocks, reader, writer);
  }

  /// Resamples the whole of `reader` into the whole of `writer`. Returns when all is written, or
  /// when progress was refused, which `IsCancelled` tells. `reader` may be null when every block is
  /// preloaded by a derived planning.
  /// \throws orin::Exception  the first failure of reading, resampling or writing
  void Process(datasources::IRasterReader* reader, datasources::IRasterWriter* writer);

  /// True when the last `Process` wrote every block, even if the report of that was refused.
  bool HasWrittenAll() const { return hasWrittenAll_; }

 private:
  /// What one `Process` works on.
  struct Level {
    datasources::IRasterReader* reader;
    datasources::IRasterWriter* writer;
    gobs::BlockBuffers buffers;
    std::vector<BlockJob> blocks;
  };

  static gobs::Raster* ReadInput(const BlockJob& job, datasources::IRasterReader& reader);
  static void WriteOutput(BlockJob& job, datasources::IRasterWriter& writer);
  void ProcessOutput(BlockJob& job, datasources::IRasterWriter& writer);
  void RunStep(Level& level, size_t step, ErrorHolder& error);
  void RunSteps(Level& level);
  static void Discard(std::vector<BlockJob>& blocks);

  bool hasWrittenAll_ = false;
};

template <class Processing, class Access, class Base>
gobs::Raster* IODriver<Processing, Access, Base>::ReadInput(const BlockJob& job,
                                                            datasources::IRasterReader& reader) {
  auto block = std::make_unique<gobs::Raster>(job.inputInfo, job.inputWindow);
  reader.Read(*block);
  return block.release();
}

template <class Processing, class Access, class Base>
void IODriver<Processing, Access, Base>::WriteOutput(BlockJob& job,
                                                     datasources::IRasterWriter& writer) {
  writer.Write(*job.raster);
  delete job.raster;
  job.raster = nullptr;
}

template <class Processing, class Access, class Base>
void IODriver<Processing, Access, Base>::ProcessOutput(BlockJob& job,
                                                       datasources::IRasterWriter& writer) {
  auto output = std::make_unique<gobs::Raster>(job.outputInfo, job.outputWindow);
  if (this->preloadOutput) writer.Read(*output);
  this->ProcessBlock(job.raster, output.get());
  delete job.raster;
  job.raster = output.release();
}

template <class Processing, class Access, class Base>
void IODriver<Processing, Access, Base>::RunStep(Level& level, size_t step, ErrorHolder& error) {
  std::vector<BlockJob>& blocks = level.blocks;
  const auto guarded = [&](auto&& work) {
    if (error.IsSet() || this->IsCancelled()) return;
    const gobs::BlockBuffers::Use use(level.buffers);
    try {
      work();
    } catch (const Exception& exception) {
      error.Offer(exception);
    }
  };
#pragma omp parallel sections num_threads(3)
  {
#pragma omp section
    guarded([&] {
      if (step + 1 < blocks.size() && level.reader)
        blocks[step + 1].raster = ReadInput(blocks[step + 1], *level.reader);
    });
#pragma omp section
    guarded([&] { ProcessOutput(blocks[step], *level.writer); });
#pragma omp section
    guarded([&] {
      if (step != 0) WriteOutput(blocks[step - 1], *level.writer);
    });
  }
}

template <class Processing, class Access, class Base>
void IODriver<Processing, Access, Base>::RunSteps(Level& level) {
  std::vector<BlockJob>& blocks = level.blocks;
  ErrorHolder error;
  if (level.reader) blocks.front().raster = ReadInput(blocks.front(), *level.reader);
  for (size_t step = 0; step < blocks.size(); ++step) {
    if (this->IsCancelled()) break;
    this->Update(static_cast<float>(step) / static_cast<float>(blocks.size()));
    if (this->IsCancelled()) break;
    RunStep(level, step, error);
    // Deliberate: the blocks still held are neither written nor destroyed, whatever state they are
    // in.
    if (error.IsSet()) throw Exception(error.Get());
  }
}

template <class Processing, class Access, class Base>
void IODriver<Processing, Access, Base>::Discard(std::vector<BlockJob>& blocks) {
  for (BlockJob& job : blocks) {
    delete job.raster;
    job.raster = nullptr;
  }
}

template <class Processing, class Access, class Base>
void IODriver<Processing, Access, Base>::Process(datasources::IRasterReader* reader,
                                                 datasources::IRasterWriter* writer) {
  hasWrittenAll_ = false;
  Level level{reader, writer, {}, {}};
  std::vector<BlockJob>& blocks = level.blocks;
  this->ComputeBlocks(blocks, reader, writer);
  const OMPNested nested(true);
  const gobs::BlockBuffers::Use use(level.buffers);
  if (!blocks.empty()) RunSteps(level);
  if (this->IsCancelled()) {
    Discard(blocks);
    return;
  }
  if (!blocks.empty()) WriteOutput(blocks.back(), *writer);
  hasWrittenAll_ = true;
  this->Update(1.0f);
}

}  // namespace orin::parallelio
