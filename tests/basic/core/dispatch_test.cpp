/// The ten pixel types: their order, the dispatch over them, and its refusal.
// SPDX-License-Identifier: MIT
#include "basic/core/typedispatch/dispatchtype.h"

#include <gtest/gtest.h>

#include <string>
#include <type_traits>
#include <vector>

namespace orin::typedispatch {
namespace {

template <class T>
struct NameFactory {
  static std::string Create() { return PixelTypeName<T>(); }
};

template <class T>
struct FirstFactory {
  static std::string Create() { return "first"; }
};

std::string NameOf(const gobs::DataType& type) {
  return DispatchType<PixelTypes, NameFactory>::Dispatch(type);
}

TEST(Dispatch, TheListHoldsTheTenTypesInTheirFixedOrder) {
  EXPECT_TRUE(
      (std::is_same_v<PixelTypes, TypeList<signed char, unsigned char, short, unsigned short, int,
                                           unsigned int, float, double, int64_t, uint64_t>>));
}

TEST(Dispatch, EveryDescriptorReachesItsTypeRealAndComplex) {
  const struct {
    gobs::DataType real;
    const char* name;
  } kTypes[] = {
      {{8, true, false, 8, 0, false}, "char"},
      {{8, false, false, 8, 0, false}, "unsigned char"},
      {{16, true, false, 16, 0, false}, "short"},
      {{16, false, false, 16, 0, false}, "unsigned short"},
      {{32, true, false, 32, 0, false}, "int"},
      {{32, false, false, 32, 0, false}, "unsigned int"},
      {{32, true, true, 23, 8, false}, "float"},
      {{64, true, true, 52, 11, false}, "double"},
      {{64, true, false, 64, 0, false}, "__int64"},
      {{64, false, false, 64, 0, false}, "unsigned __int64"},
  };
  for (const auto& type : kTypes) {
    EXPECT_EQ(type.name, NameOf(type.real));
    gobs::DataType complex = type.real;
    complex.isComplex = true;
    EXPECT_EQ(type.name, NameOf(complex));
  }
}

TEST(Dispatch, EachOfTheSixFieldsDecides) {
  const gobs::DataType byte = gobs::eDT_8U;
  std::vector<gobs::DataType> others(5, byte);
  others[0].bits = 7;
  others[1].isFloat = true;
  others[2].mantissaBits = 7;
  others[3].exponentBits = 1;
  others[4].bits = 24;
  for (const gobs::DataType& type : others) EXPECT_THROW(NameOf(type), Exception);
  gobs::DataType isSigned = byte;
  isSigned.isSigned = true;
  EXPECT_EQ("char", NameOf(isSigned));
}

TEST(Dispatch, TheBitTypeIsRefusedWithMessageAndLine) {
  try {
    NameOf(gobs::eDT_BIT);
    FAIL() << "the bit type was taken";
  } catch (const Exception& e) {
    EXPECT_EQ("Invalid type to dispatch.", e.GetMessage());
    EXPECT_EQ(316u, e.GetLine());
    EXPECT_NE(std::string::npos, e.GetFunction().find("orin::typedispatch::DispatchType"));
    EXPECT_NE(std::string::npos, e.GetFunction().find("Dispatch(const orin::gobs::DataType&)"));
  }
}

TEST(Dispatch, AnEmptyDescriptorIsRefused) { EXPECT_THROW(NameOf({}), Exception); }

TEST(Dispatch, TheFirstEntryThatFitsDecides) {
  int made = 0;
  WithPixelType(gobs::DataTypeOf<float>(true), [&]<class T>(std::type_identity<T>) {
    ++made;
    EXPECT_TRUE((std::is_same_v<T, float>));
  });
  EXPECT_EQ(1, made);
  EXPECT_EQ(
      "first",
      (DispatchType<TypeList<short, short>, FirstFactory>::Dispatch(gobs::DataTypeOf<short>())));
}

TEST(Dispatch, WithPixelTypeAnswersFalseForTheBitTypeAndCallsNothing) {
  EXPECT_FALSE(WithPixelType(gobs::eDT_BIT, [](auto) { FAIL() << "called"; }));
}

}  // namespace
}  // namespace orin::typedispatch
