// SPDX-License-Identifier: MIT
#include "tests/testing/recordingobjects.h"

#include <utility>

#include "host/services/text.h"

namespace orin::testing {
namespace {

using datasources::AuxiliaryData;
using datasources::ILevelStore;
using datasources::IRasterReader;
using datasources::IRasterSource;
using datasources::IRasterWriter;

/// One live object of a kind, from construction to destruction.
class Alive {
 public:
  Alive(RecorderPtr recorder, int LiveObjects::*kind)
      : recorder_(std::move(recorder)), kind_(kind) {
    recorder_->Count(kind_, 1);
  }
  ~Alive() { recorder_->Count(kind_, -1); }
  Alive(const Alive&) = delete;
  Alive& operator=(const Alive&) = delete;

 private:
  RecorderPtr recorder_;
  int LiveObjects::*kind_;
};

std::string WindowText(const gobs::Raster& block) {
  return FormatString("(%u,%u,%u,%u)", block.x, block.y, block.width, block.height);
}

/// What readers and writers have in common.
/// \tparam Interface  IRasterReader or IRasterWriter
template <class Interface>
class RecordedReader : public Interface {
 public:
  /// \param kind  "reader" or "writer"; operations are counted as "Reader.Read", "Writer.Read" ...
  RecordedReader(RecorderPtr recorder, std::unique_ptr<Interface> inner, const std::string& kind,
                 std::string operations, int LiveObjects::*live)
      : recorder_(recorder),
        inner_(std::move(inner)),
        name_(kind + FormatString("[%u]", inner_->GetLevel()) +
              ListText(inner_->GetChannelsInfo())),
        operations_(std::move(operations)),
        alive_(recorder, live) {}
  ~RecordedReader() override { recorder_->Note("~" + name_); }

  void SetMargin(unsigned x, unsigned y, int mode) override {
    Call("SetMargin", FormatString("(%u,%u,%d)", x, y, mode));
    inner_->SetMargin(x, y, mode);
  }
  unsigned GetMarginX() const override { return inner_->GetMarginX(); }
  unsigned GetMarginY() const override { return inner_->GetMarginY(); }
  unsigned GetWidth() const override { return inner_->GetWidth(); }
  unsigned GetHeight() const override { return inner_->GetHeight(); }
  unsigned GetChannelCount() const override { return inner_->GetChannelCount(); }
  const gobs::DataType& GetDataType() const override { return inner_->GetDataType(); }
  unsigned GetLevel() const override { return inner_->GetLevel(); }
  unsigned GetTileWidth() const override { return inner_->GetTileWidth(); }
  unsigned GetTileHeight() const override { return inner_->GetTileHeight(); }
  void SetTileSize(unsigned width, unsigned height) override {
    Call("SetTileSize", FormatString("(%u,%u)", width, height));
    inner_->SetTileSize(width, height);
  }
  void SetOptimalTileSize() override {
    Call("SetOptimalTileSize", "()");
    inner_->SetOptimalTileSize();
  }
  void Read(gobs::Raster& block) override {
    Call("Read", WindowText(block));
    inner_->Read(block);
  }
  AuxiliaryData GetAuxiliaryData() const override {
    Call("GetAuxiliaryData", "()");
    return inner_->GetAuxiliaryData();
  }
  std::vector<unsigned> GetChannelsInfo() const override { return inner_->GetChannelsInfo(); }

 protected:
  void Call(const char* operation, const std::string& arguments) const {
    recorder_->Call(operations_ + "." + operation, name_ + "." + operation + arguments);
  }

  RecorderPtr recorder_;
  std::unique_ptr<Interface> inner_;

 private:
  std::string name_;
  std::string operations_;
  Alive alive_;
};

class RecordedWriter final : public RecordedReader<IRasterWriter> {
 public:
  RecordedWriter(RecorderPtr recorder, std::unique_ptr<IRasterWriter> inner)
      : RecordedReader(std::move(recorder), std::move(inner), "writer", "Writer",
                       &LiveObjects::writers) {}
  void Write(const gobs::Raster& block) override {
    Call("Write", WindowText(block));
    inner_->Write(block);
  }
};

class RecordedStore final : public ILevelStore {
 public:
  RecordedStore(RecorderPtr recorder, std::unique_ptr<ILevelStore> owned, ILevelStore& inner,
                std::string name)
      : recorder_(recorder),
        owned_(std::move(owned)),
        inner_(inner),
        name_(std::move(name)),
        alive_(recorder, &LiveObjects::stores) {}
  ~RecordedStore() override { recorder_->Note("~" + name_); }

  std::vector<datasources::LevelDescription> List() const override {
    recorder_->Call("List", name_ + ".List()");
    return inner_.List();
  }
  void Create(unsigned level, const std::vector<unsigned>& channels,
              const std::string& method) override {
    recorder_->Call("Create", name_ + FormatString(".Create(%u,%s,%s)", level,
                                                   ListText(channels).c_str(), method.c_str()));
    inner_.Create(level, channels, method);
  }
  std::unique_ptr<IRasterWriter> OpenWriter(unsigned level,
                                            const std::vector<unsigned>& channels) override {
    recorder_->Call("OpenWriter",
                    name_ + FormatString(".OpenWriter(%u,%s)", level, ListText(channels).c_str()));
    return Recorded(recorder_, inner_.OpenWriter(level, channels));
  }
  void SetValid(unsigned level, const std::vector<unsigned>& channels, bool valid) override {
    recorder_->Call("SetValid",
                    name_ + FormatString(".SetValid(%u,%s,%s)", level, ListText(channels).c_str(),
                                         valid ? "true" : "false"));
    inner_.SetValid(level, channels, valid);
  }
  void Remove(const std::vector<unsigned>& levels) override {
    recorder_->Call("Remove", name_ + ".Remove(" + ListText(levels) + ")");
    inner_.Remove(levels);
  }

 private:
  RecorderPtr recorder_;
  std::unique_ptr<ILevelStore> owned_;
  ILevelStore& inner_;
  std::string name_;
  Alive alive_;
};

class RecordedSource final : public IRasterSource {
 public:
  RecordedSource(RecorderPtr recorder, std::unique_ptr<IRasterSource> inner, bool holdsLevels)
      : recorder_(recorder), inner_(std::move(inner)), alive_(recorder, &LiveObjects::sources) {
    if (holdsLevels)
      levels_ = std::make_unique<RecordedStore>(recorder_, nullptr, *inner_->Levels(), "store");
  }
  ~RecordedSource() override { recorder_->Note("~source"); }

  unsigned Width() const override { return inner_->Width(); }
  unsigned Height() const override { return inner_->Height(); }
  unsigned ChannelCount() const override { return inner_->ChannelCount(); }
  gobs::DataType TypeOf(unsigned channel) const override { return inner_->TypeOf(channel); }
  AuxiliaryData MetadataOf(const std::vector<unsigned>& channels) const override {
    recorder_->Call("MetadataOf", "source.MetadataOf(" + ListText(channels) + ")");
    return inner_->MetadataOf(channels);
  }
  std::unique_ptr<IRasterReader> OpenReader(const std::vector<unsigned>& channels) override {
    recorder_->Call("OpenReader", "source.OpenReader(" + ListText(channels) + ")");
    return Recorded(recorder_, inner_->OpenReader(channels));
  }
  ILevelStore* Levels() override { return levels_.get(); }

 private:
  RecorderPtr recorder_;
  std::unique_ptr<IRasterSource> inner_;
  Alive alive_;
  std::unique_ptr<RecordedStore> levels_;
};

}  // namespace

std::string ListText(const std::vector<unsigned>& numbers) {
  std::string text = "{";
  for (size_t i = 0; i < numbers.size(); ++i)
    text += (i == 0 ? "" : ",") + std::to_string(numbers[i]);
  return text + "}";
}

std::unique_ptr<IRasterReader> Recorded(RecorderPtr recorder,
                                        std::unique_ptr<IRasterReader> reader) {
  return std::make_unique<RecordedReader<IRasterReader>>(std::move(recorder), std::move(reader),
                                                         "reader", "Reader", &LiveObjects::readers);
}

std::unique_ptr<IRasterWriter> Recorded(RecorderPtr recorder,
                                        std::unique_ptr<IRasterWriter> writer) {
  return std::make_unique<RecordedWriter>(std::move(recorder), std::move(writer));
}

std::unique_ptr<ILevelStore> Recorded(RecorderPtr recorder, std::unique_ptr<ILevelStore> store,
                                      const std::string& name) {
  ILevelStore& inner = *store;
  return std::make_unique<RecordedStore>(std::move(recorder), std::move(store), inner, name);
}

std::unique_ptr<IRasterSource> Recorded(RecorderPtr recorder, std::unique_ptr<IRasterSource> source,
                                        bool holdsLevels) {
  return std::make_unique<RecordedSource>(std::move(recorder), std::move(source), holdsLevels);
}

}  // namespace orin::testing
