/// What readers answer for declared no-data values, and what levels store in their place.
// SPDX-License-Identifier: MIT
#include "host/datasources/nodataanswers.h"

#include <gmock/gmock.h>

#include <cmath>
#include <cstring>
#include <limits>
#include <memory>
#include <optional>

#include "basic/gobs/cancelled.h"
#include "host/datasources/basicreader.h"
#include "host/datasources/datasetmanager.h"
#include "host/datasources/overviewaccessors.h"
#include "tests/testing/pictures.h"
#include "tests/testing/recordinghost.h"

namespace orin::datasources {
namespace {

using orin::testing::ChannelOf;
using orin::testing::PictureOf;
using orin::testing::RecordingHost;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr float kLowest = std::numeric_limits<float>::lowest();

class NoDataAnswersOf : public ::testing::Test {
 protected:
  void Open(drivers::MemoryRaster raster) {
    host_.Put("a.tif", std::move(raster));
    dataset_.reset(DatasetManager::GetInstance()->Open("a.tif", kUpdate));
  }
  AuxiliaryData Metadata(const std::vector<unsigned>& channels) {
    return BasicReader(dataset_.get(), channels, false).GetAuxiliaryData();
  }
  /// The answer for the file; the raster holds one channel, two rows of the values.
  template <class T>
  std::string AnswerFor(const std::string& declared, std::vector<T> values = {T(1)}) {
    drivers::MemoryRaster raster = PictureOf<T>({values, values});
    raster.metadata["NO_DATA_VALUE"] = declared;
    Open(std::move(raster));
    return Metadata({1}).GetFileMetadataValue("NO_DATA_VALUE");
  }
  /// The one pixel of level 2 after `values`, one a channel, were written to it.
  template <class T>
  std::vector<T> Stored(const std::vector<T>& values, const gobs::DataType& type,
                        const std::vector<unsigned>& channels) {
    BasicOverviewWriterAccessor accessor(dynamic_cast<IRasterDataset*>(dataset_.get()), channels);
    accessor.CreateLevel(2);
    const std::unique_ptr<IRasterWriter> writer(accessor.CreateRasterWriter(2));
    gobs::Raster block({1, 1, uint32_t(channels.size()), type}, {});
    std::memcpy(block.data, values.data(), block.byteSize);
    writer->Write(block);
    std::vector<T> stored;
    for (const unsigned channel : channels) {
      const auto& samples = host_.Levels("a.tif").levels.at(2).channels[channel - 1].samples;
      const auto* first = reinterpret_cast<const T*>(samples.data());
      stored.insert(stored.end(), first, first + samples.size() / sizeof(T));
    }
    return stored;
  }
  template <class T>
  std::vector<T> ReadLevelTwo(const gobs::DataType& type, const std::vector<unsigned>& channels) {
    BasicOverviewWriterAccessor accessor(dynamic_cast<IRasterDataset*>(dataset_.get()), channels);
    const std::unique_ptr<IRasterWriter> level(accessor.CreateRasterWriter(2));
    gobs::Raster block({1, 1, uint32_t(channels.size()), type}, {});
    level->Read(block);
    const T* first = reinterpret_cast<const T*>(block.data);
    return {first, first + block.byteSize / sizeof(T)};
  }

  RecordingHost host_;
  std::unique_ptr<IDataset> dataset_;
};

TEST_F(NoDataAnswersOf, DecimalNumbersAreTheDeclaredTexts) {
  EXPECT_EQ("-9999", AnswerFor<float>("-9999"));
  EXPECT_EQ("-3.4028234663852886e+38", AnswerFor<float>("-3.4028234663852886e+38"));
  EXPECT_EQ("0.10", AnswerFor<double>("0.10"));
  EXPECT_EQ("-1", AnswerFor<short>("-1"));
  EXPECT_EQ("300", AnswerFor<unsigned char>("300"));
  EXPECT_EQ("18446744073709551615", AnswerFor<uint64_t>("18446744073709551615"));
  EXPECT_EQ("9223372036854775807", AnswerFor<int64_t>("9223372036854775807"));
  EXPECT_EQ("5", AnswerFor<float>(" +5 "));
  EXPECT_EQ("1.5", AnswerFor<float>("1,5"));
  EXPECT_THAT(host_.Log("reader[1]{1}.Read"), IsEmpty());
}

TEST_F(NoDataAnswersOf, WhatIsNoNumberAreNone) {
  for (const char* text : {"none", "12abc", ""}) EXPECT_EQ("", AnswerFor<float>(text)) << text;
  for (const char* text : {"nan", "-inf"}) EXPECT_EQ("", AnswerFor<short>(text)) << text;
}

TEST_F(NoDataAnswersOf, NaNIsTheLowestFiniteValueThatDoesNotOccur) {
  const float second = std::nextafter(kLowest, 0.0f);
  const float third = std::nextafter(second, 0.0f);
  const auto answer = [&](std::vector<float> values) {
    return std::stod(AnswerFor<float>("nan", std::move(values)));
  };
  EXPECT_EQ(kLowest, answer({1, NAN, -HUGE_VALF}));
  EXPECT_EQ(second, answer({1, NAN, kLowest}));
  EXPECT_EQ(third, answer({second, kLowest, second, 0}));
  EXPECT_EQ(second, answer({third, kLowest, -NAN}));
  EXPECT_EQ(std::numeric_limits<double>::lowest(), std::stod(AnswerFor<double>("-inf")));
  EXPECT_EQ(kLowest, std::stod(AnswerFor<float>("-1.7976931348623157e+308")));
}

TEST_F(NoDataAnswersOf, AllPixelsAreSearchedOnceAndOnlyWhenSomebodyAsks) {
  const drivers::MemoryRaster raster = [] {
    drivers::MemoryRaster made = PictureOf<float>({{1, 2}, {3, kLowest}});
    made.channels.push_back(ChannelOf<float>({{5, 6}, {std::nextafter(kLowest, 0.0f), 8}}));
    made.metadata["NO_DATA_VALUE"] = "nan";
    return made;
  }();
  Open(raster);
  const float third = std::nextafter(std::nextafter(kLowest, 0.0f), 0.0f);
  EXPECT_THAT(host_.Log("source.OpenReader"), IsEmpty());
  for (const std::vector<unsigned>& channels : {std::vector<unsigned>{1}, {2}, {1, 2}})
    EXPECT_EQ(third, std::stod(Metadata(channels).GetFileMetadataValue("NO_DATA_VALUE")));
  EXPECT_THAT(host_.Log("reader[1]{1,2}.Read"), SizeIs(1));
}

TEST_F(NoDataAnswersOf, AnImageThatCannotBeReadFailsWhenItIsReadForItsPixels) {
  drivers::MemoryRaster raster = PictureOf<float>({{kLowest}});
  raster.metadata["NO_DATA_VALUE"] = "nan";
  Open(raster);
  host_.FailAt("Reader.Read", 1);
  EXPECT_EQ(kLowest, std::stod(Metadata({1}).GetFileMetadataValue("NO_DATA_VALUE")));
}

TEST_F(NoDataAnswersOf, ASearchThatIsStoppedGivesNoAnswerAndIsMadeAgain) {
  drivers::MemoryRaster raster = PictureOf<float>({{kLowest}});
  raster.metadata["NO_DATA_VALUE"] = "nan";
  Open(raster);
  host_.RefuseProgressAt(1);
  EXPECT_THROW(Metadata({1}), Cancelled);
  EXPECT_GT(std::stod(Metadata({1}).GetFileMetadataValue("NO_DATA_VALUE")), kLowest);
}

TEST_F(NoDataAnswersOf, SixtyFourBitIntegersThatADoubleCannotCarryHaveAStandInToo) {
  EXPECT_EQ("9223372036854774784", AnswerFor<int64_t>("-9999"));
  EXPECT_EQ("9223372036854773760", AnswerFor<int64_t>("-9999", {9223372036854774784, INT64_MAX}));
  EXPECT_EQ("18446744073709549568", AnswerFor<uint64_t>("9007199254740993", {UINT64_MAX, 1}));
  EXPECT_EQ("9007199254740992", AnswerFor<int64_t>("9007199254740992"));
}

TEST_F(NoDataAnswersOf, ALevelStoresTheDeclaredValueForTheStandIn) {
  AnswerFor<float>("nan", {1, kLowest});
  const float standIn = std::nextafter(kLowest, 0.0f);
  EXPECT_TRUE(std::isnan(Stored<float>({standIn}, gobs::DataTypeOf<float>(), {1}).at(0)));
  EXPECT_THAT(Stored<float>({kLowest}, gobs::DataTypeOf<float>(), {1}), ElementsAre(kLowest));
  AnswerFor<float>("-inf", {1, 2});
  EXPECT_THAT(Stored<float>({kLowest}, gobs::DataTypeOf<float>(), {1}), ElementsAre(-HUGE_VALF));
  AnswerFor<int64_t>("-9999", {1, 2});
  EXPECT_THAT(Stored<int64_t>({9223372036854774784}, gobs::DataTypeOf<int64_t>(), {1}),
              ElementsAre(-9999));
}

TEST_F(NoDataAnswersOf, AComplexLevelStoresNaNWhateverTheFormOfTheFill) {
  drivers::MemoryRaster raster = PictureOf<float>({{1, 2, 3, 4}, {1, 2, 3, 4}});
  raster.width = 2;
  raster.channels[0].type = gobs::DataTypeOf<float>(true);
  raster.channels.push_back(raster.channels[0]);
  raster.metadata["NO_DATA_VALUE"] = "nan";
  Open(raster);
  Metadata({1, 2});
  const gobs::DataType type = gobs::DataTypeOf<float>(true);
  for (const std::vector<float>& fill :
       {std::vector<float>{kLowest, kLowest, kLowest, kLowest}, {kLowest, kLowest, 0, 0}}) {
    const auto stored = Stored<float>(fill, type, {1, 2});
    EXPECT_TRUE(std::isnan(stored[0]) && std::isnan(stored[2]));
    EXPECT_EQ(0, stored[1]);
  }
}

TEST_F(NoDataAnswersOf, EachChannelHasItsOwnAnswer) {
  drivers::MemoryRaster raster = PictureOf<float>({{1, 2}});
  raster.channels.push_back(raster.channels[0]);
  raster.channels[0].metadata["NO_DATA_VALUE"] = "-5";
  raster.channels[1].metadata["NO_DATA_VALUE"] = "nan";
  Open(raster);
  EXPECT_EQ("-5", Metadata({1}).GetChanMetadataValue("NO_DATA_VALUE", 1));
  EXPECT_EQ(kLowest, std::stod(Metadata({2}).GetChanMetadataValue("NO_DATA_VALUE", 1)));
  EXPECT_EQ("nan", Metadata({2}).Facts().OfChannel(1)->Text());
  EXPECT_EQ("-5", Metadata({1}).Facts().OfChannel(1)->Text());
}

TEST_F(NoDataAnswersOf, AFillWithTheFirstChannelsValueIsRecognisedInTheNextLevel) {
  drivers::MemoryRaster raster = PictureOf<float>({{1, 2}, {1, 2}});
  raster.channels.push_back(raster.channels[0]);
  raster.channels[0].metadata["NO_DATA_VALUE"] = "-5";
  raster.channels[1].metadata["NO_DATA_VALUE"] = "nan";
  Open(raster);
  Metadata({1, 2});
  const gobs::DataType type = gobs::DataTypeOf<float>();
  EXPECT_THAT(Stored<float>({-5, -5}, type, {1, 2}), ElementsAre(-5, -5));
  const auto read = ReadLevelTwo<float>(type, {1, 2});
  EXPECT_EQ(-5, read[0]);
  EXPECT_TRUE(std::isnan(read[1]));
  Stored<float>({-5, 7}, type, {1, 2});
  EXPECT_THAT(ReadLevelTwo<float>(type, {1, 2}), ElementsAre(-5, 7));
}

TEST_F(NoDataAnswersOf, AComplexFillOfTwoEqualPartsIsRecognisedInTheNextLevel) {
  drivers::MemoryRaster raster = PictureOf<short>({{1, 2, 3, 4}, {1, 2, 3, 4}});
  raster.width = 2;
  raster.channels[0].type = gobs::DataTypeOf<short>(true);
  raster.metadata["NO_DATA_VALUE"] = "-7";
  Open(raster);
  Metadata({1});
  const gobs::DataType type = gobs::DataTypeOf<short>(true);
  EXPECT_THAT(Stored<short>({-7, -7}, type, {1}), ElementsAre(-7, -7));
  EXPECT_THAT(ReadLevelTwo<short>(type, {1}), ElementsAre(-7, 0));
}

}  // namespace
}  // namespace orin::datasources
