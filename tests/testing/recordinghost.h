/// A host for tests: rasters in memory under any format, every call logged, faults on demand.
// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "host/datasources/formats.h"
#include "host/drivers/memory/memorysource.h"
#include "host/services/counter.h"
#include "host/services/logger.h"
#include "tests/testing/recorder.h"

namespace orin::testing {

/// Installs itself as the only driver, as the side-car format and as the sink of warnings, events
/// and progress; gives the sinks back, and leaves an empty registry, when it is destroyed.
///
///     RecordingHost host;
///     host.Put("a.tif", Picture(), kFormatTiff);
///     host.FailAt("Writer.Write", 3);
///     ... run ...
///     EXPECT_EQ(0, host.Live().Total());
///
/// The log holds, in order, lines such as
///
///     Open(a.tif,update)            sidecar.Open(a.tif)          source.OpenReader({1,2,3})
///     source.MetadataOf({1})        store.List()                 store.Create(2,{1,2,3},NEAREST)
///     store.OpenWriter(2,{1})       store.SetValid(2,{1},true)   sidecar.Create(2,{1},MODE)
///     reader[1]{1,2}.SetMargin(1,1,2)      reader[1]{1,2}.Read(0,0,64,64)      ~reader[1]{1,2}
///     writer[2]{1,2}.Write(0,0,32,32)      writer[2]{1,2}.Read(0,0,32,32)      ~writer[2]{1,2}
///     Update(0.25)      Update(0.25,Generating overview level: 2)
///     Warn(MESSAGE,FILE,LINE)      LogEvent(MESSAGE,FILE,LINE)      ~source      ~store
///
/// where a window is (x,y,width,height) without margins. Plain getters are not logged. The calls
/// that count, and that a fault can hit, are Open, SideCar.Open, OpenReader, MetadataOf, List,
/// Create, OpenWriter, SetValid, Writer.Write, and Read, SetMargin, SetTileSize, SetOptimalTileSize
/// and GetAuxiliaryData of Reader and Writer. A call that fails is logged and has no other effect.
class RecordingHost {
 public:
  /// The formats served; one without native overviews keeps no levels in its files. By default TIFF
  /// (58) and TESSRA (3) with native overviews, ODD (99) without.
  explicit RecordingHost(std::vector<ZMBInfo_s> formats = DefaultFormats());
  ~RecordingHost();
  RecordingHost(const RecordingHost&) = delete;
  RecordingHost& operator=(const RecordingHost&) = delete;

  static std::vector<ZMBInfo_s> DefaultFormats();

  /// Makes `raster` open under `file`; its `readOnly` makes an open for update fail.
  void Put(const std::string& file, drivers::MemoryRaster raster, int code = kFormatTiff);
  /// Makes a finished level (method "NEAREST", pixels 0) exist for all channels.
  /// \param valid  whether its channels are marked valid
  void AddLevel(const std::string& file, unsigned level, bool valid = true,
                datasources::LevelPlace place = datasources::LevelPlace::kInternal);
  /// The stored levels of a file: pixels, flags, methods; free to be changed by a test.
  drivers::MemoryLevelTable& Levels(
      const std::string& file, datasources::LevelPlace place = datasources::LevelPlace::kInternal);

  /// Lines so far; with `start`, those that begin with it.
  std::vector<std::string> Log(const std::string& start = "") const;
  /// Adds a line of the test's own, from any thread.
  void Note(const std::string& line) { recorder_->Note(line); }
  /// Forgets lines, counts, reports and everything armed.
  void Clear();
  LiveObjects Live() const { return recorder_->Live(); }
  /// Calls that count, of one operation ("Writer.Write"), or of all of them.
  size_t CallCount(const std::string& operation = "") const {
    return recorder_->CallCount(operation);
  }

  /// The n-th call from now (1-based), of any operation or of the named one, throws.
  void FailAt(size_t n, Fault fault = Fault::kException) { recorder_->Arm("", n, fault); }
  void FailAt(const std::string& operation, size_t n, Fault fault = Fault::kException) {
    recorder_->Arm(operation, n, fault);
  }
  /// The n-th progress call from now (1-based) is refused; with `onwards`, all later ones too.
  void RefuseProgressAt(size_t n, bool onwards = false);

  const std::vector<tarn::Report>& Warnings() const { return warnings_; }
  const std::vector<tarn::Report>& Events() const { return events_; }
  /// Fractions of all progress calls, with and without a text.
  const std::vector<float>& Progress() const { return progress_; }

 private:
  class Driver;
  class SideCar;
  struct File {
    std::shared_ptr<drivers::MemoryEntry> entry;
    std::shared_ptr<drivers::MemoryLevelTable> sideCar;
    int code;
  };

  bool OnProgress(float fraction, const std::string* message);

  std::vector<ZMBInfo_s> formats_;
  std::map<std::string, File> files_;
  std::shared_ptr<Recorder> recorder_ = std::make_shared<Recorder>();
  std::vector<tarn::Report> warnings_;
  std::vector<tarn::Report> events_;
  std::vector<float> progress_;
  size_t refuseAfter_ = 0;  ///< progress calls until the refused one; 0: none
  bool refuseOnwards_ = false;
  tarn::ReportSink formerEvents_;
  tarn::ReportSink formerWarnings_;
  tarn::ProgressSink formerProgress_;
};

}  // namespace orin::testing
