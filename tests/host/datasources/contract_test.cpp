/// Where the contract's operations stand in their classes' tables, and its small value classes.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <type_traits>

#include "host/datasources/auxiliarydata.h"
#include "host/datasources/basicreader.h"
#include "host/datasources/dataset.h"
#include "host/datasources/rasterwriter.h"
#include "tests/testing/virtualslot.h"

namespace orin::datasources {
namespace {

using orin::testing::SlotOf;

// The destructor of an interface that begins with it takes the slots 0 and 1, so that the n-th
// operation of such an interface, counted from 1, stands in slot n.

TEST(Contract, OperationsOfADatasetKeepTheirPlaces) {
  EXPECT_EQ(2u, SlotOf(&IDataset::GetFormatDescriptor));
  EXPECT_EQ(5u, SlotOf(&IDataset::GetFileName));
  EXPECT_EQ(7u, SlotOf(&IRasterDataset::GetWidth));
  EXPECT_EQ(8u, SlotOf(&IRasterDataset::GetHeight));
  EXPECT_EQ(9u, SlotOf(&IRasterDataset::GetChannelCount));
  EXPECT_EQ(10u, SlotOf(&IRasterDataset::GetChannelInfo));
  EXPECT_EQ(12u, SlotOf(&IRasterDataset::GetOverviewInfo));
}

TEST(Contract, OperationsOfDescriptionsKeepTheirPlaces) {
  EXPECT_EQ(4u, SlotOf(&IFormatDescriptor::GetName));
  EXPECT_EQ(2u, SlotOf(&IOverviewInfo::GetLevels));
  EXPECT_EQ(5u, SlotOf(&IOverviewInfo::IsLevelValid));
  EXPECT_EQ(2u, SlotOf(&IChannelInfo::GetDataType));
}

TEST(Contract, AReadersMarginOperationsFollowItsDestructor) {
  EXPECT_EQ(2u, SlotOf(&IRasterReader::SetMargin));
  EXPECT_EQ(3u, SlotOf(&IRasterReader::GetMarginX));
  EXPECT_EQ(4u, SlotOf(&IRasterReader::GetMarginY));
}

TEST(Contract, AWriterIsAReaderAndABasicReaderBeginsAsOne) {
  EXPECT_TRUE((std::is_convertible_v<IRasterWriter*, IRasterReader*>));
  EXPECT_TRUE((std::is_base_of_v<IRasterReader, BasicReader>));
  EXPECT_TRUE((std::is_base_of_v<IDataset, IRasterDataset>));
}

TEST(Contract, InterfacesAreReleasedThroughVirtualDestructors) {
  EXPECT_TRUE(std::has_virtual_destructor_v<IDataset>);
  EXPECT_TRUE(std::has_virtual_destructor_v<IFormatDescriptor>);
  EXPECT_TRUE(std::has_virtual_destructor_v<IOverviewInfo>);
  EXPECT_TRUE(std::has_virtual_destructor_v<IChannelInfo>);
  EXPECT_TRUE(std::has_virtual_destructor_v<IRasterReader>);
  EXPECT_TRUE(std::has_virtual_destructor_v<IRasterWriter>);
}

TEST(Contract, UpdateAccessIsOneAndReadOnlyAccessIsZero) {
  EXPECT_EQ(1, static_cast<int>(kUpdate));
  EXPECT_EQ(0, static_cast<int>(kReadOnly));
}

TEST(AuxiliaryData, MissingKeysAndChannelsReadAsTheEmptyText) {
  const AuxiliaryData data({{"NO_DATA_VALUE", "-9999"}}, {{{"NO_DATA_VALUE", "7"}}, {}});
  EXPECT_EQ("-9999", data.GetFileMetadataValue("NO_DATA_VALUE"));
  EXPECT_EQ("", data.GetFileMetadataValue("no_data_value"));
  EXPECT_EQ("7", data.GetChanMetadataValue("NO_DATA_VALUE", 1));
  EXPECT_EQ("", data.GetChanMetadataValue("NO_DATA_VALUE", 2));
  EXPECT_EQ("", data.GetChanMetadataValue("NO_DATA_VALUE", 0));
  EXPECT_EQ("", data.GetChanMetadataValue("NO_DATA_VALUE", 3));
  EXPECT_EQ("", AuxiliaryData().GetFileMetadataValue("NO_DATA_VALUE"));
}

TEST(HoldsForAll, EveryChannelMustBeThereAndTrue) {
  const std::vector<bool> entries{true, false, true};
  EXPECT_TRUE(HoldsForAll(entries, {1, 3}));
  EXPECT_FALSE(HoldsForAll(entries, {1, 2}));
  EXPECT_FALSE(HoldsForAll(entries, {4}));
  EXPECT_FALSE(HoldsForAll(entries, {0}));
  EXPECT_TRUE(HoldsForAll(entries, {}));
}

}  // namespace
}  // namespace orin::datasources
