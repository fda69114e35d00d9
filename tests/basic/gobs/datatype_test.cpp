// SPDX-License-Identifier: MIT
#include "basic/gobs/datatype.h"

#include <gtest/gtest.h>

#include <vector>

namespace orin::gobs {
namespace {

TEST(DataType, TheDescriptorsOfTheTenTypesHoldTheirSixFields) {
  EXPECT_EQ((DataType{8, true, false, 8, 0, false}), DataTypeOf<signed char>());
  EXPECT_EQ((DataType{8, false, false, 8, 0, false}), DataTypeOf<unsigned char>());
  EXPECT_EQ((DataType{16, true, false, 16, 0, false}), DataTypeOf<short>());
  EXPECT_EQ((DataType{16, false, false, 16, 0, false}), DataTypeOf<unsigned short>());
  EXPECT_EQ((DataType{32, true, false, 32, 0, false}), DataTypeOf<int>());
  EXPECT_EQ((DataType{32, false, false, 32, 0, false}), DataTypeOf<unsigned int>());
  EXPECT_EQ((DataType{32, true, true, 23, 8, false}), DataTypeOf<float>());
  EXPECT_EQ((DataType{64, true, true, 52, 11, false}), DataTypeOf<double>());
  EXPECT_EQ((DataType{64, true, false, 64, 0, false}), DataTypeOf<int64_t>());
  EXPECT_EQ((DataType{64, false, false, 64, 0, false}), DataTypeOf<uint64_t>());
  EXPECT_EQ((DataType{8, false, false, 8, 0, false}), eDT_8U);
  EXPECT_EQ((DataType{1, false, false, 1, 0, false}), eDT_BIT);
}

TEST(DataType, TheComplexVariantDiffersInOneFieldOnly) {
  EXPECT_EQ((DataType{32, true, true, 23, 8, true}), DataTypeOf<float>(true));
  DataType real = DataTypeOf<float>(true);
  real.isComplex = false;
  EXPECT_EQ(DataTypeOf<float>(), real);
}

TEST(DataType, DescriptorsAreEqualOnlyWhenAllSixFieldsAre) {
  const DataType base = DataTypeOf<short>();
  std::vector<DataType> others(6, base);
  others[0].bits = 8;
  others[1].isSigned = false;
  others[2].isFloat = true;
  others[3].mantissaBits = 15;
  others[4].exponentBits = 1;
  others[5].isComplex = true;
  for (const DataType& other : others) EXPECT_FALSE(base == other);
  EXPECT_TRUE(base == DataTypeOf<short>());
}

TEST(DataType, AnEmptyDescriptorIsAllZero) {
  EXPECT_EQ((DataType{0, false, false, 0, 0, false}), DataType());
}

TEST(DataType, FieldsStandInTheirOrder) {
  const DataType type;
  EXPECT_LT(static_cast<const void*>(&type.bits), static_cast<const void*>(&type.isSigned));
  EXPECT_LT(static_cast<const void*>(&type.isSigned), static_cast<const void*>(&type.isFloat));
  EXPECT_LT(static_cast<const void*>(&type.isFloat), static_cast<const void*>(&type.mantissaBits));
  EXPECT_LT(static_cast<const void*>(&type.mantissaBits),
            static_cast<const void*>(&type.exponentBits));
  EXPECT_LT(static_cast<const void*>(&type.exponentBits),
            static_cast<const void*>(&type.isComplex));
}

TEST(DataType, ComponentSizesCountWholeBytes) {
  EXPECT_EQ(1u, BytesPerComponent(eDT_BIT));
  EXPECT_EQ(1u, BytesPerComponent(eDT_8U));
  EXPECT_EQ(8u, BytesPerComponent(DataTypeOf<double>(true)));
  EXPECT_EQ(1u, ComponentsPerSample(DataTypeOf<double>()));
  EXPECT_EQ(2u, ComponentsPerSample(DataTypeOf<double>(true)));
}

}  // namespace
}  // namespace orin::gobs
